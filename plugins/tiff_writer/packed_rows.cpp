#include "tiff_writer/packed_rows.h"

#include <algorithm>
#include <cstring>

#include "foundation/fault.h"
#include "tiff_writer/tiff_directory.h"
#include "tiff_writer/tiff_tags.h"

namespace lumo::tiff {
namespace {

constexpr unsigned kContiguous = 1, kSeparate = 2;

/// All values of a tag of whole numbers; none of another type, or where the tag is absent.
std::vector<std::uint64_t> NumbersOf(const std::vector<TagValue>& tags, Tag tag) {
  const auto at = std::find_if(tags.begin(), tags.end(),
                               [&](const TagValue& value) { return value.tag == tag; });
  if (at == tags.end()) return {};
  const unsigned each = at->type == 3 ? 2 : at->type == 4 ? 4 : at->type == 16 ? 8 : 0;
  if (each == 0) return {};
  std::vector<std::uint64_t> numbers(at->count);
  for (std::size_t i = 0; i < numbers.size(); ++i) {
    std::memcpy(&numbers[i], &at->bytes[i * each], each);  // little endian
  }
  return numbers;
}

/// True when all values of a tag are `value`; of an absent one when that is the usual one.
bool IsAll(const std::vector<TagValue>& tags, Tag tag, std::uint64_t value, std::uint64_t usual) {
  const auto numbers = NumbersOf(tags, tag);
  return numbers.empty() ? value == usual
                         : std::all_of(numbers.begin(), numbers.end(),
                                       [&](std::uint64_t number) { return number == value; });
}

/// True when the blocks of a file are packed as those of the layout are.
bool IsAlike(const std::vector<TagValue>& tags, const BlockLayout& layout, const Packing& packing) {
  const bool hasSides = layout.isTiled
                            ? IsAll(tags, kTileWidth, layout.blockWidth, 0) &&
                                  IsAll(tags, kTileLength, layout.blockHeight, 0)
                            : IsAll(tags, kRowsPerStrip, layout.blockHeight, layout.lines);
  const unsigned planes = layout.byPixel ? kContiguous : kSeparate;
  return hasSides && IsAll(tags, kImageWidth, layout.samples, 0) &&
         IsAll(tags, kImageLength, layout.lines, 0) &&
         IsAll(tags, kBitsPerSample, packing.bits, 1) &&
         IsAll(tags, kCompression, packing.CompressionTag(), 1) && IsAll(tags, kFillOrder, 1, 1) &&
         IsAll(tags, kSamplesPerPixel, layout.bands, 1) &&
         (layout.bands == 1 || IsAll(tags, kPlanarConfiguration, planes, kContiguous)) &&
         IsAll(tags, kPredictor, packing.PredictorTag(), 1) &&
         IsAll(tags, kSampleFormat, packing.sampleFormat, 1);
}

}  // namespace

std::unique_ptr<PackedRows> PackedRows::Find(const RowsFiles& rows, const BlockLayout& layout,
                                             const Packing& packing) {
  std::unique_ptr<PackedRows> found(new PackedRows(rows, layout, packing));
  std::uint64_t line = 0;
  for (const RowsFile& file : rows.files) {
    if (line % layout.blockHeight != 0) return nullptr;
    found->firsts_.push_back(static_cast<unsigned>(line / layout.blockHeight));
    line += file.lines;
  }
  found->firsts_.push_back(layout.Rows());
  if (line != layout.lines) return nullptr;
  for (std::size_t number = rows.files.size(); number-- > 0;) {
    if (found->Open(number, found->open_)) continue;
    TakeFault();  // the pixels are copied then, which says why a file can't be read
    return nullptr;
  }
  return found;
}

bool PackedRows::Open(std::size_t number, Part& part) const {
  BlockLayout own = layout_;
  own.lines = rows_.files[number].lines;
  if (!own.isTiled) own.blockHeight = std::min(own.blockHeight, own.lines);
  const std::string path = rows_.files[number].file.ToUTF8();
  std::string why;
  std::vector<TagValue> tags;
  part.file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &why);
  if (part.file == nullptr || !ReadTags(*part.file, tags, why)) {
    SetFault(why);
    return false;
  }
  part.offsets = NumbersOf(tags, own.isTiled ? kTileOffsets : kStripOffsets);
  part.counts = NumbersOf(tags, own.isTiled ? kTileByteCounts : kStripByteCounts);
  std::uint64_t size = 0;
  if (!part.file->GetSize(size, &why)) {
    SetFault(why);
    return false;
  }
  bool fits = own.lines != 0 && IsAlike(tags, own, packing_) &&
              part.offsets.size() == own.Blocks() && part.counts.size() == own.Blocks();
  for (std::size_t block = 0; fits && block < part.offsets.size(); ++block) {
    fits = part.offsets[block] <= size && part.counts[block] <= size - part.offsets[block] &&
           part.counts[block] != 0;
  }
  if (fits) return true;
  SetFault(path + ": isn't packed as the file that is to be made");
  return false;
}

bool PackedRows::Read(std::uint64_t block, std::vector<unsigned char>& packed) {
  const unsigned row = layout_.RowOf(block);
  const auto behind = std::upper_bound(firsts_.begin(), firsts_.end(), row);
  const auto number = static_cast<std::size_t>(behind - firsts_.begin()) - 1;
  if (number != number_ && !Open(number, open_)) return false;
  number_ = number;
  const std::uint64_t rowsOfPart = firsts_[number + 1] - firsts_[number];
  const std::uint64_t own = block / layout_.PlaneBlocks() * rowsOfPart * layout_.Columns() +
                            std::uint64_t{row - firsts_[number]} * layout_.Columns() +
                            layout_.ColumnOf(block);
  packed.resize(open_.counts[own]);
  std::string why;
  if (open_.file->Read(open_.offsets[own], packed.data(), packed.size(), &why)) return true;
  SetFault(why);
  return false;
}

}  // namespace lumo::tiff
