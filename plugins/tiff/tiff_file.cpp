#include "tiff/tiff_file.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <set>

namespace lumo::tiff {
namespace {

constexpr std::size_t kHeadBytes = 16384;
constexpr std::size_t kMostDirectories = 64;
constexpr std::uint64_t kMostEntries = 4096;
constexpr std::uint64_t kMostTextBytes = 1 << 20;

/// Bytes of a value of a type; 0 for a type that there isn't.
std::uint64_t BytesOf(std::uint16_t type) {
  constexpr std::uint64_t kBytes[] = {0, 1, 1, 2, 4, 8, 1, 1, 2, 4, 8, 4, 8, 4, 0, 0, 8, 8, 8};
  return type < std::size(kBytes) ? kBytes[type] : 0;
}

bool IsWhole(std::uint16_t type) {
  constexpr std::uint16_t kTypes[] = {1, 3, 4, 16};  // BYTE, SHORT, LONG, LONG8
  return std::find(std::begin(kTypes), std::end(kTypes), type) != std::end(kTypes);
}

}  // namespace

bool File::HasMark(const unsigned char* bytes, std::size_t count) {
  if (std::endian::native != std::endian::little || count < 16) return false;
  return bytes[0] == 'I' && bytes[1] == 'I' && (bytes[2] == 42 || bytes[2] == 43) && bytes[3] == 0;
}

std::unique_ptr<File> File::Open(const std::string& path) {
  auto opened = platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead);
  if (opened == nullptr) return nullptr;
  std::unique_ptr<File> file(new File(std::move(opened)));
  return file->ReadDirectories() ? std::move(file) : nullptr;
}

bool File::Get(std::uint64_t offset, void* to, std::size_t bytes) const {
  if (offset + bytes <= head_.size() && offset + bytes >= offset) {
    std::memcpy(to, head_.data() + offset, bytes);
    return true;
  }
  return file_->Read(offset, to, bytes);
}

bool File::ReadDirectories() {
  head_.resize(kHeadBytes);
  std::size_t got = 0;
  if (!file_->ReadUpTo(0, head_.data(), head_.size(), got)) return false;
  head_.resize(got);
  if (!HasMark(head_.data(), head_.size())) return false;
  isBig_ = head_[2] == 43;
  std::uint64_t next = 0;
  if (isBig_ && (head_[4] != 8 || head_[5] != 0 || head_[6] != 0 || head_[7] != 0)) return false;
  if (!Get(isBig_ ? 8 : 4, &next, isBig_ ? 8 : 4)) return false;
  std::set<std::uint64_t> seen;
  while (next != 0) {
    if (!seen.insert(next).second || seen.size() > kMostDirectories) return false;
    if (!ReadDirectory(next, next)) return false;
  }
  return !directories_.empty();
}

bool File::ReadDirectory(std::uint64_t offset, std::uint64_t& next) {
  std::uint64_t count = 0;
  const unsigned countBytes = isBig_ ? 8 : 2, entryBytes = isBig_ ? 20 : 12;
  const unsigned placeBytes = isBig_ ? 8 : 4;
  if (!Get(offset, &count, countBytes) || count == 0 || count > kMostEntries) return false;
  std::vector<unsigned char> bytes(count * entryBytes + placeBytes);
  offset += countBytes;
  if (!Get(offset, bytes.data(), bytes.size())) return false;
  Directory& directory = directories_.emplace_back();
  for (std::uint64_t i = 0; i < count; ++i) {
    const unsigned char* const at = &bytes[i * entryBytes];
    std::uint16_t tag = 0;
    Entry entry;
    std::memcpy(&tag, at, 2);
    std::memcpy(&entry.type, at + 2, 2);
    std::memcpy(&entry.count, at + 4, placeBytes);
    const std::uint64_t each = BytesOf(entry.type);
    if (each == 0 || entry.count == 0 || entry.count > std::uint64_t{1} << 32) return false;
    if (entry.count * each <= placeBytes) {
      entry.offset = offset + i * entryBytes + 4 + placeBytes;
    } else {
      std::memcpy(&entry.offset, at + 4 + placeBytes, placeBytes);
    }
    if (!directory.emplace(tag, entry).second) return false;
  }
  next = 0;
  std::memcpy(&next, &bytes[count * entryBytes], placeBytes);
  return true;
}

bool File::ReadNumbers(const Directory& directory, Tag tag, std::uint64_t most,
                       std::vector<std::uint64_t>& values) const {
  const auto at = directory.find(tag);
  values.clear();
  if (at == directory.end() || !IsWhole(at->second.type) || at->second.count > most) return false;
  const std::size_t each = BytesOf(at->second.type);
  std::vector<unsigned char> bytes(at->second.count * each);
  if (!Get(at->second.offset, bytes.data(), bytes.size())) return false;
  values.resize(at->second.count);
  for (std::size_t i = 0; i < values.size(); ++i) std::memcpy(&values[i], &bytes[i * each], each);
  return true;
}

std::uint64_t File::Number(const Directory& directory, Tag tag, std::uint64_t absent) const {
  constexpr std::uint64_t kMostSamples = 65535;
  std::vector<std::uint64_t> values;
  if (!ReadNumbers(directory, tag, kMostSamples, values)) return absent;
  const bool areSame = std::all_of(values.begin(), values.end(),
                                   [&](std::uint64_t value) { return value == values.front(); });
  return areSame ? values.front() : absent;
}

bool File::ReadDoubles(const Directory& directory, Tag tag, std::vector<double>& values) const {
  constexpr std::uint16_t kDouble = 12;
  const auto at = directory.find(tag);
  if (at == directory.end() || at->second.type != kDouble || at->second.count > 65535) return false;
  values.resize(at->second.count);
  return Get(at->second.offset, values.data(), values.size() * sizeof(double));
}

bool File::ReadBytes(const Directory& directory, Tag tag, std::vector<unsigned char>& bytes) const {
  constexpr std::uint16_t kByte = 1, kUndefined = 7;
  const auto at = directory.find(tag);
  const bool isUsable = at != directory.end() && at->second.count <= 65535 &&
                        (at->second.type == kUndefined || at->second.type == kByte);
  if (!isUsable) return false;
  bytes.resize(at->second.count);
  return Get(at->second.offset, bytes.data(), bytes.size());
}

bool File::ReadText(const Directory& directory, Tag tag, std::string& text) const {
  constexpr std::uint16_t kAscii = 2;
  const auto at = directory.find(tag);
  if (at == directory.end() || at->second.type != kAscii || at->second.count > kMostTextBytes) {
    return false;
  }
  text.assign(at->second.count, '\0');
  if (!Get(at->second.offset, text.data(), text.size())) return false;
  text.resize(std::min(text.find('\0'), text.size()));
  return true;
}

std::string File::Head() const {
  return std::string(head_.begin() + (isBig_ ? 16 : 8), head_.end());
}

}  // namespace lumo::tiff
