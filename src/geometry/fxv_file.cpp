#include "geometry/fxv_file.h"

#include <algorithm>
#include <bit>
#include <cctype>
#include <cstring>
#include <filesystem>

#include "foundation/fault.h"
#include "foundation/text_case.h"

namespace lumo {
namespace {

constexpr char kMark[] = {'F', 'X', 'V', '5', '0'};
constexpr std::uint16_t kLabelType = 3;
constexpr std::uint16_t kCoordinateType = 13;

// Elements of a list that pass through a local buffer at once.
constexpr std::size_t kChunk = 4096;

static_assert(std::endian::native == std::endian::little, "the file is little-endian");

/// The header, as it stands in the file.
struct Header {
  unsigned char bytes[kFxvHeaderSize] = {};

  template <typename T>
  void Set(std::size_t at, T value) {
    std::memcpy(bytes + at, &value, sizeof(value));
  }
  template <typename T>
  T Get(std::size_t at) const {
    T value;
    std::memcpy(&value, bytes + at, sizeof(value));
    return value;
  }
};

std::uint16_t Swapped(std::uint16_t value) {
  return static_cast<std::uint16_t>(value >> 8 | value << 8);
}
std::uint32_t Swapped(std::uint32_t value) {
  return __builtin_bswap32(value);
}

/// Hands a list over in pieces that lie together, as bytes of To.
template <typename To, typename List, typename Put>
bool PutInChunks(const List& list, Put&& put) {
  To chunk[kChunk];
  std::size_t count = 0;
  for (const auto& value : list) {
    chunk[count++] = static_cast<To>(value);
    if (count < kChunk) continue;
    if (!put(chunk, sizeof(chunk))) return false;
    count = 0;
  }
  return count == 0 || put(chunk, count * sizeof(To));
}

}  // namespace

bool IsFxvName(const std::string& path) {
  return LowerCase(std::filesystem::path(path).extension().string()) == ".fxv";
}

FxvPolygonWriter<std::int32_t, std::uint32_t>::FxvPolygonWriter(const URI& uri, unsigned bufferSize)
    : buffer_(std::max(bufferSize, kFxvHeaderSize)), place_(kFxvHeaderSize) {
  std::string fault;
  file_ = platform::RandomAccessFile::CreateOrEmpty(uri.ToUTF8(), &fault);
  if (!file_) {
    Fail(fault);
    return;
  }
  const Header empty;
  if (!file_->Write(0, empty.bytes, sizeof(empty.bytes), &fault)) Fail(fault);
}

FxvPolygonWriter<std::int32_t, std::uint32_t>::~FxvPolygonWriter() {
  Close();
}

bool FxvPolygonWriter<std::int32_t, std::uint32_t>::Fail(const std::string& why) {
  SetFault(why);
  SetErrorState(ObjectErrorIO());
  return false;
}

bool FxvPolygonWriter<std::int32_t, std::uint32_t>::Flush() {
  std::string fault;
  if (HasError() || !file_) return false;
  if (held_ != 0 && !file_->Write(place_, buffer_.data(), held_, &fault)) return Fail(fault);
  place_ += held_;
  held_ = 0;
  return true;
}

bool FxvPolygonWriter<std::int32_t, std::uint32_t>::Put(const void* data, std::size_t bytes) {
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

bool FxvPolygonWriter<std::int32_t, std::uint32_t>::WriteFlat(
    const std::int32_t& label, std::size_t rings, const unsigned char* holes,
    const std::uint32_t* starts, std::size_t coordinateCount, const std::uint32_t* coordinates) {
  if (HasError() || !file_) return false;
  const std::uint32_t counts[] = {static_cast<std::uint32_t>(rings),
                                  static_cast<std::uint32_t>(coordinateCount)};
  if (!Put(&label, sizeof(label)) || !Put(counts, sizeof(counts)) || !Put(holes, rings) ||
      !Put(starts, rings * sizeof(*starts)) ||
      !Put(coordinates, coordinateCount * sizeof(*coordinates))) {
    return false;
  }
  ++count_;
  return true;
}

bool FxvPolygonWriter<std::int32_t, std::uint32_t>::Write(const std::int32_t& label,
                                                          const Deque<bool>& holes,
                                                          const Deque<unsigned>& starts,
                                                          const Deque<std::uint32_t>& coordinates) {
  if (HasError() || !file_) return false;
  const auto put = [this](const void* data, std::size_t bytes) { return Put(data, bytes); };
  const std::uint32_t counts[] = {holes.GetCount(), coordinates.GetCount()};
  if (!Put(&label, sizeof(label)) || !Put(counts, sizeof(counts)) ||
      !PutInChunks<unsigned char>(holes, put) || !PutInChunks<std::uint32_t>(starts, put) ||
      !PutInChunks<std::uint32_t>(coordinates, put)) {
    return false;
  }
  ++count_;
  return true;
}

bool FxvPolygonWriter<std::int32_t, std::uint32_t>::Write(const std::int32_t& label,
                                                          const Array<bool>& holes,
                                                          const Array<unsigned>& starts,
                                                          const Array<std::uint32_t>& coordinates) {
  static_assert(sizeof(bool) == 1);
  return WriteFlat(label, holes.GetCount(), reinterpret_cast<const unsigned char*>(holes.GetData()),
                   starts.GetData(), coordinates.GetCount(), coordinates.GetData());
}

bool FxvPolygonWriter<std::int32_t, std::uint32_t>::Close() {
  if (!file_) return !HasError();
  std::string fault;
  Header header;
  std::memcpy(header.bytes, kMark, sizeof(kMark));
  header.Set(6, kLabelType);
  header.Set(8, kCoordinateType);
  header.Set(10, count_);
  if (Flush() && !file_->Write(0, header.bytes, sizeof(header.bytes), &fault)) Fail(fault);
  if (!file_->Close(&fault) && !HasError()) Fail(fault);
  file_.reset();
  return !HasError();
}

void FxvPolygonWriter<std::int32_t, std::uint32_t>::Abandon() {
  file_.reset();
}

FxvPolygonReader<std::int32_t, std::uint32_t>::FxvPolygonReader(const URI& uri, unsigned bufferSize)
    : buffer_(std::max(bufferSize, kFxvHeaderSize)) {
  const std::string path = uri.ToUTF8();
  std::string fault;
  file_ = platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &fault);
  Header header;
  if (!file_ || !file_->GetSize(size_, &fault) ||
      !file_->Read(0, header.bytes, sizeof(header.bytes), &fault)) {
    SetFault(fault);
    SetErrorState(ObjectErrorIO());
    file_.reset();
    return;
  }
  isSwapped_ = header.bytes[5] != 0;
  const auto order = [this](auto value) { return isSwapped_ ? Swapped(value) : value; };
  if (std::memcmp(header.bytes, kMark, sizeof(kMark)) != 0 ||
      order(header.Get<std::uint16_t>(6)) != kLabelType ||
      order(header.Get<std::uint16_t>(8)) != kCoordinateType) {
    SetFault(path + ": is no whole FXV file");
    SetErrorState(ObjectErrorIO());
    file_.reset();
    return;
  }
  count_ = order(header.Get<std::uint32_t>(10));
  place_ = kFxvHeaderSize;
}

FxvPolygonReader<std::int32_t, std::uint32_t>::~FxvPolygonReader() = default;

bool FxvPolygonReader<std::int32_t, std::uint32_t>::Get(void* data, std::size_t bytes) {
  if (!file_ || bytes > size_ - place_) return false;
  auto* to = static_cast<unsigned char*>(data);
  while (bytes != 0) {
    if (place_ < bufferPlace_ || place_ >= bufferPlace_ + held_) {
      std::string fault;
      bufferPlace_ = place_;
      held_ = 0;
      if (!file_->ReadUpTo(place_, buffer_.data(), buffer_.size(), held_, &fault)) {
        SetFault(fault);
        SetErrorState(ObjectErrorIO());
        return false;
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

std::uint32_t FxvPolygonReader<std::int32_t, std::uint32_t>::Ordered(std::uint32_t value) const {
  return isSwapped_ ? Swapped(value) : value;
}

void FxvPolygonReader<std::int32_t, std::uint32_t>::OrderAll(Array<std::uint32_t>& values) const {
  for (std::uint32_t& value : values) value = Ordered(value);
}

bool FxvPolygonReader<std::int32_t, std::uint32_t>::Read(std::int32_t& label, Array<bool>& holes,
                                                         Array<unsigned>& starts,
                                                         Array<std::uint32_t>& coordinates) {
  std::uint32_t head[3];
  if (HasError() || !Get(head, sizeof(head))) return false;
  for (std::uint32_t& value : head) value = Ordered(value);
  const std::uint64_t rings = head[1], count = head[2];
  // Nothing is allocated for what the file can't hold.
  if (rings * 5 + count * 4 > size_ - place_) return false;
  if (!holes.Resize(ArrayDims(head[1])) || !starts.Resize(ArrayDims(head[1])) ||
      !coordinates.Resize(ArrayDims(head[2]))) {
    SetErrorState(ObjectErrorOutOfMemory());
    return false;
  }
  std::vector<unsigned char> flags(head[1]);
  if (!Get(flags.data(), flags.size()) ||
      !Get(starts.GetData(), std::size_t{starts.GetCount()} * sizeof(unsigned)) ||
      !Get(coordinates.GetData(), std::size_t{coordinates.GetCount()} * sizeof(std::uint32_t))) {
    return false;
  }
  std::transform(flags.begin(), flags.end(), holes.begin(),
                 [](unsigned char flag) { return flag != 0; });
  OrderAll(starts);
  OrderAll(coordinates);
  label = static_cast<std::int32_t>(head[0]);
  return true;
}

bool FxvPolygonReader<std::int32_t, std::uint32_t>::Read(std::int32_t& label, Deque<bool>& holes,
                                                         Deque<unsigned>& starts,
                                                         Deque<std::uint32_t>& coordinates) {
  Array<bool> holeArray;
  Array<unsigned> startArray;
  Array<std::uint32_t> coordinateArray;
  return Read(label, holeArray, startArray, coordinateArray) &&
         detail::CopyToDeque(holeArray, holes) && detail::CopyToDeque(startArray, starts) &&
         detail::CopyToDeque(coordinateArray, coordinates);
}

}  // namespace lumo
