#include "geometry/polygon_file.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <filesystem>

#include "foundation/fault.h"
#include "platform/file_moves.h"
#include "platform/temporary_file.h"

namespace lumo {
namespace {

constexpr std::uint16_t kCoordinateType = 13;

static_assert(std::endian::native == std::endian::little, "the files are little-endian");

/// The header, as it stands in the file. Its fields follow the mark without gaps.
struct Header {
  unsigned char bytes[kPolygonHeaderSize] = {};
  const std::size_t fields;  // where the mark ends

  explicit Header(const PolygonFileKind& kind) : fields(kind.mark.size()) {}

  static constexpr std::size_t kSwap = 0, kLabel = 1, kCoordinate = 3, kCount = 5;

  template <typename T>
  void Set(std::size_t field, T value) {
    std::memcpy(&bytes[fields + field], &value, sizeof(value));
  }
  template <typename T>
  T Get(std::size_t field, bool isSwapped) const {
    unsigned char number[sizeof(T)];
    std::memcpy(number, &bytes[fields + field], sizeof(T));
    if (isSwapped) std::reverse(std::begin(number), std::end(number));
    return std::bit_cast<T>(number);
  }
};

/// The elements of a list as they lie in a file.
template <typename To, typename List>
std::vector<To> Flat(const List& list) {
  std::vector<To> flat;
  flat.reserve(list.GetCount());
  for (const auto& value : list) flat.push_back(static_cast<To>(value));
  return flat;
}

}  // namespace

namespace detail {

PolygonFileOutput::PolygonFileOutput(const PolygonFileKind& kind, const std::string& path,
                                     unsigned bufferSize, PolygonFileGrowth growth,
                                     ErrorState& error)
    : kind_(kind),
      path_(path),
      growing_(growth == PolygonFileGrowth::kInPlace ? path : platform::TemporaryPathBeside(path)),
      error_(error),
      buffer_(std::max(bufferSize, kPolygonHeaderSize)) {
  std::string fault;
  file_ = platform::RandomAccessFile::CreateOrEmpty(growing_, &fault);
  if (!file_) {
    Fail(fault);
    return;
  }
  const Header empty(kind);
  if (!file_->Write(0, empty.bytes, sizeof(empty.bytes), &fault)) Fail(fault);
}

PolygonFileOutput::~PolygonFileOutput() {
  Abandon();
}

bool PolygonFileOutput::Fail(const std::string& why) {
  SetFault(String(why));
  error_.SetErrorState(ObjectErrorIO());
  return false;
}

bool PolygonFileOutput::Flush() {
  std::string fault;
  if (!IsOpen()) return false;
  if (held_ != 0 && !file_->Write(place_, buffer_.data(), held_, &fault)) return Fail(fault);
  place_ += held_;
  held_ = 0;
  return true;
}

bool PolygonFileOutput::Put(const void* data, std::size_t bytes) {
  const auto* from = static_cast<const unsigned char*>(data);
  while (bytes != 0) {
    if (held_ == buffer_.size() && !Flush()) return false;
    const std::size_t part = std::min(bytes, buffer_.size() - held_);
    std::memcpy(buffer_.data() + held_, from, part);
    held_ += part;
    from += part;
    bytes -= part;
  }
  return true;
}

bool PolygonFileOutput::Complete(std::uint16_t labelType, std::uint32_t count) {
  std::string fault;
  Header header(kind_);
  std::copy(kind_.mark.begin(), kind_.mark.end(), header.bytes);
  header.Set(Header::kLabel, labelType);
  header.Set(Header::kCoordinate, kCoordinateType);
  header.Set(Header::kCount, count);
  const bool isWritten =
      Flush() && (file_->Write(0, header.bytes, sizeof(header.bytes), &fault) || Fail(fault));
  const bool isWhole = file_ && (file_->Close(&fault) || Fail(fault)) && isWritten;
  file_.reset();
  if (growing_ == path_) return isWhole;
  if (isWhole && platform::RenameFile(growing_, path_, &fault)) return true;
  RemoveGrowing();
  return isWhole ? Fail(fault) : false;
}

/// Removes what lies beside the place of the file.
void PolygonFileOutput::RemoveGrowing() {
  std::error_code ignored;
  if (growing_ != path_) std::filesystem::remove(growing_, ignored);
}

void PolygonFileOutput::Abandon() {
  if (!file_) return;
  file_.reset();
  RemoveGrowing();
}

PolygonFileInput::PolygonFileInput(const PolygonFileKind& kind, std::uint16_t labelType,
                                   const std::string& path, unsigned bufferSize, ErrorState& error)
    : error_(error), buffer_(std::max(bufferSize, kPolygonHeaderSize)) {
  std::string fault;
  file_ = platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &fault);
  Header header(kind);
  if (!file_ || !file_->GetSize(size_, &fault) ||
      !file_->Read(0, header.bytes, sizeof(header.bytes), &fault)) {
    Fail(fault);
    return;
  }
  isSwapped_ = header.Get<unsigned char>(Header::kSwap, false) != 0;
  if (!std::equal(kind.mark.begin(), kind.mark.end(), header.bytes) ||
      header.Get<std::uint16_t>(Header::kCoordinate, isSwapped_) != kCoordinateType) {
    Fail(path + ": is no whole " + kind.name);
    return;
  }
  if (header.Get<std::uint16_t>(Header::kLabel, isSwapped_) != labelType) {
    Fail(path + ": the " + kind.name + " has labels of another type");
    return;
  }
  count_ = header.Get<std::uint32_t>(Header::kCount, isSwapped_);
}

bool PolygonFileInput::Fail(const std::string& why) {
  SetFault(String(why));
  error_.SetErrorState(ObjectErrorIO());
  file_.reset();
  return false;
}

bool PolygonFileInput::Get(void* data, std::size_t bytes) {
  if (!file_ || bytes > Left()) return false;
  auto* to = static_cast<unsigned char*>(data);
  while (bytes != 0) {
    if (place_ < bufferPlace_ || place_ >= bufferPlace_ + held_) {
      std::string fault;
      bufferPlace_ = place_;
      held_ = 0;
      if (!file_->ReadUpTo(place_, buffer_.data(), buffer_.size(), held_, &fault)) {
        return Fail(fault);
      }
      if (held_ == 0) return false;  // the file has become shorter
    }
    const auto skip = static_cast<std::size_t>(place_ - bufferPlace_);
    const std::size_t part = std::min(bytes, held_ - skip);
    std::memcpy(to, buffer_.data() + skip, part);
    to += part;
    place_ += part;
    bytes -= part;
  }
  return true;
}

bool PolygonFileInput::GetNumbers(void* data, std::size_t count, unsigned size) {
  if (!Get(data, count * size)) return false;
  auto* const bytes = static_cast<unsigned char*>(data);
  for (std::size_t i = 0; isSwapped_ && i < count; ++i) {
    std::reverse(bytes + i * size, bytes + (i + 1) * size);
  }
  return true;
}

}  // namespace detail

template <typename L>
PolygonFileWriter<L>::PolygonFileWriter(const PolygonFileKind& kind, const URI& uri,
                                        unsigned bufferSize, PolygonFileGrowth growth)
    : output_(kind, uri.ToUTF8(), bufferSize, growth, *this) {}

template <typename L>
PolygonFileWriter<L>::~PolygonFileWriter() {
  Close();
}

template <typename L>
bool PolygonFileWriter<L>::PutRecord(const L& label, std::size_t rings, const unsigned char* holes,
                                     const std::uint32_t* starts, std::size_t coordinateCount,
                                     const std::uint32_t* coordinates) {
  const std::uint32_t counts[] = {static_cast<std::uint32_t>(rings),
                                  static_cast<std::uint32_t>(coordinateCount)};
  if (!IsOpen() || !output_.Put(&label, sizeof(label)) || !output_.Put(counts, sizeof(counts)) ||
      !output_.Put(holes, rings) || !output_.Put(starts, rings * sizeof(*starts)) ||
      !output_.Put(coordinates, coordinateCount * sizeof(*coordinates))) {
    return false;
  }
  ++count_;
  return true;
}

template <typename L>
bool PolygonFileWriter<L>::WriteFlat(const L& label, std::size_t rings, const unsigned char* holes,
                                     const std::uint32_t* starts, std::size_t coordinateCount,
                                     const std::uint32_t* coordinates) {
  return PutRecord(label, rings, holes, starts, coordinateCount, coordinates);
}

template <typename L>
bool PolygonFileWriter<L>::Write(const L& label, const Deque<bool>& holes,
                                 const Deque<unsigned>& starts,
                                 const Deque<std::uint32_t>& coordinates) {
  const auto flags = Flat<unsigned char>(holes);
  const auto begins = Flat<std::uint32_t>(starts);
  const auto points = Flat<std::uint32_t>(coordinates);
  return WriteFlat(label, flags.size(), flags.data(), begins.data(), points.size(), points.data());
}

template <typename L>
bool PolygonFileWriter<L>::Write(const L& label, const Array<bool>& holes,
                                 const Array<unsigned>& starts,
                                 const Array<std::uint32_t>& coordinates) {
  static_assert(sizeof(bool) == 1);
  return PutRecord(label, holes.GetCount(), reinterpret_cast<const unsigned char*>(holes.GetData()),
                   starts.GetData(), coordinates.GetCount(), coordinates.GetData());
}

template <typename L>
bool PolygonFileWriter<L>::Close() {
  if (!isClosed_) output_.Complete(static_cast<std::uint16_t>(kDataTypeOf<L>), count_);
  isClosed_ = true;
  return !this->HasError();
}

template <typename L>
void PolygonFileWriter<L>::Abandon() {
  output_.Abandon();
  isClosed_ = true;
}

template <typename L>
PolygonFileReader<L>::PolygonFileReader(const PolygonFileKind& kind, const URI& uri,
                                        unsigned bufferSize)
    : input_(kind, static_cast<std::uint16_t>(kDataTypeOf<L>), uri.ToUTF8(), bufferSize, *this) {}

template <typename L>
bool PolygonFileReader<L>::Read(L& label, Array<bool>& holes, Array<unsigned>& starts,
                                Array<std::uint32_t>& coordinates) {
  std::uint32_t counts[2];
  if (this->HasError() || !input_.GetNumbers(&label, 1, sizeof(L)) ||
      !input_.GetNumbers(counts, 2, sizeof(*counts))) {
    return false;
  }
  const std::uint64_t rings = counts[0], count = counts[1];
  // Nothing is allocated for what the file can't hold.
  if (rings * 5 + count * 4 > input_.Left()) return false;
  if (!holes.Resize(ArrayDims(counts[0])) || !starts.Resize(ArrayDims(counts[0])) ||
      !coordinates.Resize(ArrayDims(counts[1]))) {
    this->SetErrorState(ObjectErrorOutOfMemory());
    return false;
  }
  std::vector<unsigned char> flags(rings);
  if (!input_.Get(flags.data(), flags.size()) ||
      !input_.GetNumbers(starts.GetData(), rings, sizeof(unsigned)) ||
      !input_.GetNumbers(coordinates.GetData(), count, sizeof(std::uint32_t))) {
    return false;
  }
  std::transform(flags.begin(), flags.end(), holes.begin(),
                 [](unsigned char flag) { return flag != 0; });
  return true;
}

template <typename L>
bool PolygonFileReader<L>::Read(L& label, Deque<bool>& holes, Deque<unsigned>& starts,
                                Deque<std::uint32_t>& coordinates) {
  Array<bool> holeArray;
  Array<unsigned> startArray;
  Array<std::uint32_t> coordinateArray;
  return Read(label, holeArray, startArray, coordinateArray) &&
         detail::CopyToDeque(holeArray, holes) && detail::CopyToDeque(startArray, starts) &&
         detail::CopyToDeque(coordinateArray, coordinates);
}

VEXG_INSTANCES(EIGHT, PolygonFileWriter);
VEXG_INSTANCES(EIGHT, PolygonFileReader);

}  // namespace lumo
