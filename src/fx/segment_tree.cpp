#include "fx/segment_tree.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <sstream>
#include <string_view>
#include <type_traits>

#include "data/access_policy.h"
#include "foundation/fault.h"
#include "foundation/text_form.h"
#include "platform/file_moves.h"
#include "platform/temporary_file.h"
#include "raster/pixel_types.h"

namespace lumo {
namespace {

using detail::TreeExtent;
using detail::TreeHeader;
using platform::RandomAccessFile;

static_assert(std::is_trivially_copyable_v<TreeHeader> && sizeof(TreeHeader) == 192);
static_assert(offsetof(TreeHeader, checksum) == 184);

constexpr char kMark[16] = "VEXGSEGTREE01\n";
constexpr std::string_view kAnyVersion = "VEXGSEGTREE";
constexpr std::uint64_t kBlock = 65536;           // basins or merges of a stretch
constexpr std::uint64_t kStripPixels = 1U << 18;  // of a strip of several lines
constexpr std::uint64_t kMostStrip = 1U << 30;    // pixels
constexpr std::uint64_t kMostValueBytes = 256U << 20U;
constexpr std::size_t kBasinBytes = 4 + 8, kMergeBytes = 8 + 3 * 4;
constexpr const char* kGeoRef = "georeference ";

std::uint64_t BlocksOf(std::uint64_t values, std::uint64_t inEach) {
  return (values + inEach - 1) / inEach;
}

/// Puts values of a stretch one kind behind the other.
class Columns {
 public:
  explicit Columns(std::size_t bytes) : bytes_(bytes) {}
  template <typename T>
  void Add(const T& value) {
    std::memcpy(bytes_.data() + at_, &value, sizeof value);
    at_ += sizeof value;
  }
  template <typename T>
  T Take(std::size_t first, std::size_t number) const {
    T value;
    std::memcpy(&value, bytes_.data() + first + number * sizeof value, sizeof value);
    return value;
  }
  std::vector<unsigned char>& Bytes() { return bytes_; }

 private:
  std::vector<unsigned char> bytes_;
  std::size_t at_ = 0;
};

}  // namespace

SegmentTreeWriter::~SegmentTreeWriter() {
  file_.reset();
  if (isMade_) std::remove(workPath_.c_str());
}

/// Sets a fault of the file, by the path that its user knows.
bool SegmentTreeWriter::FailBy(const std::string& fault) {
  SetFault(String(fault.starts_with(workPath_) ? path_ + fault.substr(workPath_.size()) : fault));
  return false;
}

bool SegmentTreeWriter::Begin(const std::string& path, const TreeScene& scene) {
  path_ = path;
  scene_ = scene;
  if (!MayReachFile(path, true)) return false;
  std::error_code ignored;
  if (std::filesystem::exists(path, ignored) && !SegmentTree::IsTree(path)) {
    SetFault(String(path + ": is there, and no tree of segments: it stays"));
    return false;
  }
  platform::RemoveAbandonedFiles(path);
  workPath_ = platform::TemporaryPathBeside(path);
  std::string fault;
  file_ = RandomAccessFile::Create(workPath_, &fault);
  if (!file_) return FailBy(fault);
  isMade_ = true;
  header_ = {};
  header_.samples = scene.samples;
  header_.lines = scene.lines;
  header_.bands = scene.bands;
  header_.dataType = scene.dataType;
  header_.tileWidth = scene.tileWidth;
  header_.tileHeight = scene.tileHeight;
  header_.interleave = static_cast<std::int32_t>(scene.interleave);
  header_.isNested = scene.isNested ? 1 : 0;
  header_.compactness = scene.compactness;
  header_.mostPixels = scene.mostPixels;
  const std::uint64_t width = std::max(scene.samples, 1U);
  header_.stripLines = static_cast<std::uint32_t>(
      std::clamp<std::uint64_t>(kStripPixels / width, 1, std::max(scene.lines, 1U)));
  end_ = sizeof header_;
  return file_->Write(0, &header_, sizeof header_, &fault) || FailBy(fault);  // without a mark
}

/// Writes a stretch behind the last one.
bool SegmentTreeWriter::Put(const void* data, std::size_t bytes, Packing packing,
                            TreeExtent& extent) {
  PackBytes(packing, {static_cast<const unsigned char*>(data), bytes}, packed_);
  const bool isPacked = packed_.Count() != 0;
  if (isPacked) {
    data = packed_.Get();
    bytes = packed_.Count();
  }
  extent = {end_, bytes, Checksum(data, bytes)};
  std::string fault;
  if (!file_ || !file_->Write(end_, data, bytes, &fault)) return FailBy(fault);
  end_ += bytes;
  return true;
}

bool SegmentTreeWriter::PutStrip() {
  const bool isPut = Put(strip_.data(), strip_.size() * sizeof strip_[0], Packing::kLz4,
                         labelIndex_.emplace_back());
  strip_.clear();
  return isPut;
}

bool SegmentTreeWriter::AddLines(const std::uint32_t* basins, std::size_t lines) {
  const std::size_t most = std::size_t{header_.stripLines} * header_.samples;
  for (std::size_t left = lines * header_.samples; left != 0;) {
    const std::size_t part = std::min(left, most - strip_.size());
    strip_.insert(strip_.end(), basins, basins + part);
    basins += part;
    left -= part;
    if (strip_.size() == most && !PutStrip()) return false;
  }
  return true;
}

bool SegmentTreeWriter::AddBasins(const TreeBasins& basins) {
  if (!strip_.empty() && !PutStrip()) return false;
  strip_ = {};
  header_.basins = static_cast<std::uint32_t>(basins.pixels.size());
  for (std::size_t begin = 0; begin < basins.pixels.size(); begin += kBlock) {
    const std::size_t end = std::min<std::size_t>(basins.pixels.size(), begin + kBlock);
    Columns block((end - begin) * kBasinBytes);
    for (std::size_t i = begin; i < end; ++i) block.Add(basins.squares[i]);
    for (std::size_t i = begin; i < end; ++i) block.Add(basins.pixels[i]);
    if (!Put(block.Bytes().data(), block.Bytes().size(), Packing::kLz4,
             basinIndex_.emplace_back())) {
      return false;
    }
  }
  return true;
}

bool SegmentTreeWriter::PutMerges() {
  Columns block(merges_.size() * kMergeBytes);
  for (const TreeMerge& merge : merges_) block.Add(merge.cost);
  for (const TreeMerge& merge : merges_) block.Add(merge.lower);
  for (const TreeMerge& merge : merges_) block.Add(merge.higher);
  for (const TreeMerge& merge : merges_) block.Add(merge.border);
  merges_.clear();
  return Put(block.Bytes().data(), block.Bytes().size(), Packing::kLz4, mergeIndex_.emplace_back());
}

bool SegmentTreeWriter::AddMerge(const TreeMerge& merge) {
  merges_.push_back(merge);
  ++header_.merges;
  return merges_.size() < kBlock || PutMerges();
}

bool SegmentTreeWriter::Complete() {
  if (!merges_.empty() && !PutMerges()) return false;
  std::ostringstream values = MakeTextWriter();
  if (scene_.geoRef) values << kGeoRef << scene_.geoRef << '\n';
  const std::string text = std::move(values).str();
  const auto putIndex = [this](const Index& index, TreeExtent& extent) {
    return Put(index.data(), index.size() * sizeof(TreeExtent), Packing::kNone, extent);
  };
  if (!Put(text.data(), text.size(), Packing::kNone, header_.values) ||
      !putIndex(labelIndex_, header_.labelIndex) || !putIndex(basinIndex_, header_.basinIndex) ||
      !putIndex(mergeIndex_, header_.mergeIndex)) {
    return false;
  }
  std::memcpy(header_.mark, kMark, sizeof kMark);
  header_.fileBytes = end_;
  header_.checksum = Checksum(&header_, offsetof(TreeHeader, checksum));
  std::string fault;
  const bool isWhole = file_->Write(0, &header_, sizeof header_, &fault) && file_->Close(&fault);
  file_.reset();
  return isWhole || FailBy(fault);
}

bool SegmentTreeWriter::Place() {
  std::string fault;
  if (!platform::RenameFile(workPath_, path_, &fault)) return FailBy(fault);
  isMade_ = false;
  return true;
}

bool SegmentTree::IsTree(const std::string& path) {
  char mark[sizeof kMark];
  const auto file = RandomAccessFile::Open(path, RandomAccessFile::Access::kRead);
  return file && file->Read(0, mark, sizeof mark) &&
         std::string_view(mark, sizeof mark).starts_with(kAnyVersion);
}

SegmentTreePtr SegmentTree::Open(const std::string& path) {
  const std::shared_ptr<SegmentTree> tree(new SegmentTree);
  std::string fault;
  tree->file_ = RandomAccessFile::Open(path, RandomAccessFile::Access::kRead, &fault);
  if (!tree->file_) {
    SetFault(String(fault));
    return nullptr;
  }
  const bool isWhole = tree->ReadHeader() && tree->ReadIndices() && tree->ReadValues();
  return isWhole ? tree : nullptr;
}

bool SegmentTree::Fail(const std::string& fault) const {
  SetFault(String(Path() + ": " + fault));
  return false;
}

bool SegmentTree::ReadHeader() {
  std::uint64_t fileBytes = 0;
  std::size_t got = 0;
  std::string fault;
  if (!file_->GetSize(fileBytes, &fault) ||
      !file_->ReadUpTo(0, &header_, sizeof header_, got, &fault)) {
    SetFault(String(fault));
    return false;
  }
  if (got != sizeof header_) header_ = {};
  const std::string_view mark(header_.mark, sizeof header_.mark);
  if (!mark.starts_with(kAnyVersion)) return Fail("isn't a whole tree of segments");
  if (mark != std::string_view(kMark, sizeof kMark)) {
    return Fail("the tree of segments is of another version");
  }
  if (header_.checksum != Checksum(&header_, offsetof(TreeHeader, checksum))) {
    return Fail("the header of the tree of segments is damaged");
  }
  const char* const why = FindFault(fileBytes);
  return why == nullptr || Fail(std::string("no tree of segments can be like this: ") + why);
}

const char* SegmentTree::FindFault(std::uint64_t fileBytes) const {
  const TreeHeader& h = header_;
  if (h.fileBytes != fileBytes) return "the file is cut off, or goes on";
  if (h.samples == 0 || h.lines == 0 || h.bands == 0) return "a raster without pixels";
  if (!DispatchType(EightTypes{}, h.dataType, []<typename T>() { return true; })) {
    return "no such pixel type";
  }
  if (h.interleave < static_cast<std::int32_t>(Interleave::None) ||
      h.interleave > static_cast<std::int32_t>(Interleave::BSQ)) {
    return "no such interleave";
  }
  if (h.stripLines == 0 || h.stripLines > h.lines ||
      std::uint64_t{h.samples} * h.stripLines > kMostStrip) {
    return "its strips have no lines, or too many";
  }
  if (h.basins > static_cast<std::uint32_t>(std::numeric_limits<std::int32_t>::max()) ||
      h.basins > std::uint64_t{h.samples} * h.lines) {
    return "more basins than pixels";
  }
  if (h.merges >= std::max(h.basins, 1U)) return "more merges than basins";
  if (h.isNested > 1) return "no such order of merges";
  if (!std::isfinite(h.compactness) || !(h.compactness >= 0)) return "no such compactness";
  if (!(h.mostPixels >= 1)) return "no such limit of sizes";
  return nullptr;
}

/// Reads a stretch that stands for so many bytes.
bool SegmentTree::Get(const TreeExtent& extent, void* data, std::uint64_t bytes) const {
  constexpr auto kBegin = sizeof(TreeHeader);
  if (extent.offset < kBegin || extent.offset > header_.fileBytes ||
      extent.bytes > header_.fileBytes - extent.offset) {
    return Fail("a stretch of the tree of segments lies outside of it");
  }
  if (!MayUnpackTo(Packing::kLz4, extent.bytes, bytes)) {
    return Fail("a stretch of the tree of segments has another size");
  }
  const bool isPlain = extent.bytes == bytes;
  RawBytes packed;
  if (!isPlain) packed.Resize(extent.bytes);
  auto* const to = static_cast<unsigned char*>(data);
  unsigned char* const into = isPlain ? to : packed.Get();
  std::string fault;
  if (!file_->Read(extent.offset, into, extent.bytes, &fault)) {
    SetFault(String(fault));
    return false;
  }
  const bool isWhole =
      Checksum(into, extent.bytes) == extent.checksum &&
      (isPlain || UnpackBytes({into, extent.bytes}, {to, static_cast<std::size_t>(bytes)}));
  return isWhole || Fail("a stretch of the tree of segments is damaged");
}

bool SegmentTree::ReadIndex(const TreeExtent& extent, std::uint64_t count, Index& index) const {
  if (extent.bytes != count * sizeof(TreeExtent) || extent.bytes > header_.fileBytes) {
    return Fail("an index of the tree of segments has another size");
  }
  index.resize(count);
  return count == 0 || Get(extent, index.data(), extent.bytes);
}

bool SegmentTree::ReadIndices() {
  return ReadIndex(header_.labelIndex, BlocksOf(header_.lines, header_.stripLines), labelIndex_) &&
         ReadIndex(header_.basinIndex, BlocksOf(header_.basins, kBlock), basinIndex_) &&
         ReadIndex(header_.mergeIndex, BlocksOf(header_.merges, kBlock), mergeIndex_) &&
         std::ranges::all_of(basinIndex_, [this](const TreeExtent& extent) {
           const std::uint64_t bytes = ValuesIn(&extent - basinIndex_.data(), header_.basins);
           return MayUnpackTo(Packing::kLz4, extent.bytes, bytes * kBasinBytes) ||
                  Fail("a stretch of the tree of segments has another size");
         });
}

bool SegmentTree::ReadValues() {
  scene_.samples = header_.samples;
  scene_.lines = header_.lines;
  scene_.bands = header_.bands;
  scene_.dataType = header_.dataType;
  scene_.tileWidth = header_.tileWidth;
  scene_.tileHeight = header_.tileHeight;
  scene_.interleave = static_cast<Interleave>(header_.interleave);
  scene_.isNested = header_.isNested != 0;
  scene_.compactness = header_.compactness;
  scene_.mostPixels = header_.mostPixels;
  const std::uint64_t bytes = header_.values.bytes;
  if (bytes > kMostValueBytes || bytes > header_.fileBytes) {
    return Fail("the values of the tree of segments are too long");
  }
  std::string text(bytes, '\0');
  if (bytes == 0) return true;
  if (!Get(header_.values, text.data(), bytes)) return false;
  if (!text.starts_with(kGeoRef)) return Fail("the values of the tree of segments can't be read");
  std::istringstream in = MakeTextReader(String(text.substr(std::string_view(kGeoRef).size())));
  in >> scene_.geoRef;
  return scene_.geoRef || Fail("the georeference of the tree of segments can't be read");
}

std::uint64_t SegmentTree::ValuesIn(std::uint64_t block, std::uint64_t all) const {
  return std::min(kBlock, all - block * kBlock);
}

std::uint32_t SegmentTree::LinesOf(unsigned strip) const {
  const std::uint64_t begin = std::uint64_t{strip} * header_.stripLines;
  return static_cast<std::uint32_t>(
      std::min<std::uint64_t>(header_.stripLines, header_.lines - begin));
}

bool SegmentTree::ReadStrip(unsigned strip, std::vector<std::uint32_t>& basins) const {
  const std::size_t count = std::size_t{header_.samples} * LinesOf(strip);
  if (!MayUnpackTo(Packing::kLz4, labelIndex_[strip].bytes, count * sizeof basins[0])) {
    return Fail("a stretch of the tree of segments has another size");
  }
  basins.resize(count);
  if (!Get(labelIndex_[strip], basins.data(), count * sizeof basins[0])) return false;
  const std::uint32_t most = header_.basins;
  std::uint32_t highest = 0;
  for (const std::uint32_t basin : basins) highest = std::max(highest, basin);
  return highest <= most || Fail("the tree of segments has pixels of no basin");
}

bool SegmentTree::ReadBasins(TreeBasins& basins) const {
  basins.pixels.clear();
  basins.squares.clear();
  basins.pixels.reserve(header_.basins);
  basins.squares.reserve(header_.basins);
  for (std::size_t i = 0; i < basinIndex_.size(); ++i) {
    const auto count = static_cast<std::size_t>(ValuesIn(i, header_.basins));
    Columns block(count * kBasinBytes);
    if (!Get(basinIndex_[i], block.Bytes().data(), block.Bytes().size())) return false;
    for (std::size_t at = 0; at < count; ++at) {
      basins.squares.push_back(block.Take<double>(0, at));
      basins.pixels.push_back(block.Take<std::uint32_t>(count * sizeof(double), at));
      if (basins.pixels.back() == 0) return Fail("the tree of segments has a basin without pixels");
    }
  }
  return true;
}

bool SegmentTree::ForEachMerge(const std::function<bool(const TreeMerge&)>& visit) const {
  for (std::size_t i = 0; i < mergeIndex_.size(); ++i) {
    const auto count = static_cast<std::size_t>(ValuesIn(i, header_.merges));
    Columns block(count * kMergeBytes);
    if (!Get(mergeIndex_[i], block.Bytes().data(), block.Bytes().size())) return false;
    for (std::size_t at = 0; at < count; ++at) {
      constexpr std::size_t kCost = sizeof(double), kNumber = sizeof(std::uint32_t);
      TreeMerge merge;
      merge.cost = block.Take<double>(0, at);
      merge.lower = block.Take<std::uint32_t>(count * kCost, at);
      merge.higher = block.Take<std::uint32_t>(count * (kCost + kNumber), at);
      merge.border = block.Take<std::uint32_t>(count * (kCost + 2 * kNumber), at);
      const bool areBasins = merge.lower != 0 && merge.higher != 0 &&
                             merge.lower <= header_.basins && merge.higher <= header_.basins &&
                             merge.lower != merge.higher;
      if (!areBasins || std::isnan(merge.cost))
        return Fail("the tree of segments has merges of no basins");
      if (!visit(merge)) return true;
    }
  }
  return true;
}

}  // namespace lumo
