#include "commands/share_file.h"

#include <algorithm>
#include <array>
#include <filesystem>

#include "foundation/fault.h"
#include "foundation/packing.h"
#include "platform/random_access_file.h"

namespace lumo {
namespace {

constexpr std::array<char, 8> kMagic{'S', 'H', 'A', 'R', 'E', '0', '1', '\n'};

/// The header in front of the numbers.
struct ShareHeader {
  std::array<char, 8> magic = kMagic;
  std::uint64_t checksum = 0;  // of the numbers
  std::uint64_t key = 0;       // checksum of its text
  std::uint64_t bytes = 0;     // of the numbers
  std::uint32_t index = 0;
  std::uint32_t count = 0;
};

std::uint64_t KeyOf(const std::string& key) {
  return Checksum(key.data(), key.size());
}

}  // namespace

void ShareWriter::PutBytes(const void* data, std::size_t bytes) {
  const auto* const first = static_cast<const unsigned char*>(data);
  bytes_.insert(bytes_.end(), first, first + bytes);
}

bool ShareWriter::Write(const std::string& path, const std::string& key, const Share& share) const {
  ShareHeader header;
  header.checksum = Checksum(bytes_.data(), bytes_.size());
  header.key = KeyOf(key);
  header.bytes = bytes_.size();
  header.index = share.index;
  header.count = share.count;
  std::string fault;
  const auto file = platform::RandomAccessFile::CreateOrEmpty(path, &fault);
  // The header comes last, so that a file which broke off has none.
  const bool isWritten = file && file->Write(sizeof header, bytes_.data(), bytes_.size(), &fault) &&
                         file->Write(0, &header, sizeof header, &fault) && file->Close(&fault);
  if (!isWritten) SetFault(String(fault));
  return isWritten;
}

void SetShareFault(const std::string& path) {
  SetFault(String(path + ": is no whole file of a share of this work"));
}

bool ShareReader::Open(const std::string& path, const std::string& key, const Share& share) {
  bytes_.clear();
  at_ = 0;
  std::string fault;
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &fault);
  std::uint64_t size = 0;
  ShareHeader header;
  if (!file || !file->GetSize(size, &fault)) {
    SetFault(String(fault));
    return false;
  }
  const bool hasHeader = size >= sizeof header && file->Read(0, &header, sizeof header, &fault) &&
                         header.magic == kMagic && header.bytes == size - sizeof header;
  const bool isOfShare = hasHeader && header.key == KeyOf(key) && header.index == share.index &&
                         header.count == share.count;
  if (isOfShare) {
    bytes_.resize(header.bytes);
    if (file->Read(sizeof header, bytes_.data(), bytes_.size(), &fault) &&
        Checksum(bytes_.data(), bytes_.size()) == header.checksum) {
      return true;
    }
  }
  SetShareFault(path);
  return false;
}

bool ShareReader::GetBytes(void* data, std::size_t bytes) {
  if (bytes > bytes_.size() - at_) return false;
  std::copy_n(bytes_.data() + at_, bytes, static_cast<unsigned char*>(data));
  at_ += bytes;
  if (!IsAtEnd()) return true;
  bytes_ = {};  // not needed any more
  at_ = 0;
  return true;
}

}  // namespace lumo
