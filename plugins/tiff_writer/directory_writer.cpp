#include "tiff_writer/directory_writer.h"

#include <algorithm>
#include <cstring>

namespace lumo::tiff {
namespace {

constexpr std::uint16_t kShort = 3, kLong = 4, kLong8 = 16;  // types of values

/// Appends the low bytes of a number, of this machine's order, little endian.
void Append(std::vector<unsigned char>& out, std::uint64_t number, unsigned bytes) {
  for (unsigned i = 0; i < bytes; ++i) out.push_back(static_cast<unsigned char>(number >> (8 * i)));
}

template <typename T>
std::vector<unsigned char> BytesOf(const std::vector<T>& values) {
  std::vector<unsigned char> bytes(values.size() * sizeof(T));
  if (!bytes.empty()) std::memcpy(bytes.data(), values.data(), bytes.size());
  return bytes;
}

std::uint64_t Even(std::uint64_t bytes) {
  return bytes + bytes % 2;
}

}  // namespace

void DirectoryWriter::Drop(std::uint16_t tag) {
  std::erase_if(tags_, [&](const TagValue& value) { return value.tag == tag; });
}

void DirectoryWriter::Set(const TagValue& value) {
  Drop(value.tag);
  const auto at = std::find_if(tags_.begin(), tags_.end(),
                               [&](const TagValue& other) { return other.tag > value.tag; });
  tags_.insert(at, value);
}

void DirectoryWriter::SetShorts(std::uint16_t tag, const std::vector<std::uint16_t>& values) {
  Set({tag, kShort, values.size(), BytesOf(values)});
}

void DirectoryWriter::SetLongs(std::uint16_t tag, const std::vector<std::uint32_t>& values) {
  Set({tag, kLong, values.size(), BytesOf(values)});
}

void DirectoryWriter::SetOffsets(std::uint16_t tag, const std::vector<std::uint64_t>& values) {
  if (isBig_) {
    Set({tag, kLong8, values.size(), BytesOf(values)});
    return;
  }
  SetLongs(tag, std::vector<std::uint32_t>(values.begin(), values.end()));
}

std::uint64_t DirectoryWriter::TableBytes() const {
  return isBig_ ? 8 + tags_.size() * 20 + 8 : 2 + tags_.size() * 12 + 4;
}

std::uint64_t DirectoryWriter::Bytes() const {
  std::uint64_t bytes = TableBytes();
  for (const TagValue& value : tags_) {
    if (value.bytes.size() > InsideBytes()) bytes += Even(value.bytes.size());
  }
  return bytes;
}

void DirectoryWriter::AppendTo(std::vector<unsigned char>& out, std::uint64_t start,
                               std::uint64_t next) const {
  std::uint64_t at = start + TableBytes();
  Append(out, tags_.size(), isBig_ ? 8 : 2);
  for (const TagValue& value : tags_) {
    Append(out, value.tag, 2);
    Append(out, value.type, 2);
    Append(out, value.count, InsideBytes());
    if (value.bytes.size() <= InsideBytes()) {
      out.insert(out.end(), value.bytes.begin(), value.bytes.end());
      out.resize(out.size() + InsideBytes() - value.bytes.size());
    } else {
      Append(out, at, InsideBytes());
      at += Even(value.bytes.size());
    }
  }
  Append(out, next, InsideBytes());
  for (const TagValue& value : tags_) {
    if (value.bytes.size() <= InsideBytes()) continue;
    out.insert(out.end(), value.bytes.begin(), value.bytes.end());
    out.resize(out.size() + value.bytes.size() % 2);
  }
}

std::vector<unsigned char> FileHeader(bool isBig, std::uint64_t directory) {
  std::vector<unsigned char> out = {'I', 'I'};
  Append(out, isBig ? 43 : 42, 2);
  if (isBig) {
    Append(out, 8, 2);  // bytes of a place
    Append(out, 0, 2);
  }
  Append(out, directory, isBig ? 8 : 4);
  return out;
}

}  // namespace lumo::tiff
