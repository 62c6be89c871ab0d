#include "commands/share_file.h"

#include <algorithm>
#include <array>
#include <filesystem>

#include "foundation/fault.h"
#include "foundation/packing.h"
#include "platform/random_access_file.h"

namespace lumo {
namespace {

using platform::RandomAccessFile;

constexpr std::array<char, 8> kMagic{'S', 'H', 'A', 'R', 'E', '0', '2', '\n'};

/// The header in front of the numbers.
struct ShareHeader {
  std::array<char, 8> magic = kMagic;
  std::uint64_t checksum = 0;  // of the numbers, piece by piece
  std::uint64_t key = 0;       // checksum of its text
  std::uint64_t bytes = 0;     // of the numbers
  std::uint32_t index = 0;
  std::uint32_t count = 0;
};

constexpr std::size_t kPiece = 1 << 20;

std::uint64_t KeyOf(const std::string& key) {
  return Checksum(key.data(), key.size());
}

/// The checksum of all pieces up to one, out of that of those before it.
std::uint64_t ChecksumWith(std::uint64_t before, const unsigned char* piece, std::size_t bytes) {
  return Checksum(&before, sizeof before, piece, bytes);
}

}  // namespace

ShareWriter::ShareWriter() = default;
ShareWriter::~ShareWriter() = default;

bool ShareWriter::StreamTo(const std::string& path) {
  std::string fault;
  // The header comes last, so that a file which broke off has none.
  file_ = RandomAccessFile::CreateOrEmpty(path, &fault);
  if (file_ == nullptr) SetFault(String(fault));
  return file_ != nullptr;
}

void ShareWriter::PutBytes(const void* data, std::size_t bytes) {
  const auto* first = static_cast<const unsigned char*>(data);
  while (file_ != nullptr && bytes_.size() + bytes >= kPiece) {
    const std::size_t count = kPiece - bytes_.size();
    bytes_.insert(bytes_.end(), first, first + count);
    first += count, bytes -= count;
    WritePiece(bytes_.data(), kPiece);
    bytes_.clear();
  }
  bytes_.insert(bytes_.end(), first, first + bytes);
}

void ShareWriter::WritePiece(const unsigned char* piece, std::size_t bytes) {
  checksum_ = ChecksumWith(checksum_, piece, bytes);
  if (fault_.empty()) file_->Write(sizeof(ShareHeader) + written_, piece, bytes, &fault_);
  written_ += bytes;
}

bool ShareWriter::Write(const std::string& path, const std::string& key, const Share& share) {
  if (file_ == nullptr && !StreamTo(path)) return false;
  for (std::size_t at = 0; at < bytes_.size(); at += kPiece) {
    WritePiece(bytes_.data() + at, std::min(kPiece, bytes_.size() - at));
  }
  ShareHeader header;
  header.checksum = checksum_;
  header.key = KeyOf(key);
  header.bytes = written_;
  header.index = share.index;
  header.count = share.count;
  const bool isWritten =
      fault_.empty() && file_->Write(0, &header, sizeof header, &fault_) && file_->Close(&fault_);
  if (!isWritten) SetFault(String(fault_));
  return isWritten;
}

void SetShareFault(const std::string& path) {
  SetFault(String(path + ": is no whole file of a share of this work"));
}

bool ShareReader::Open(const std::string& path, const std::string& key, const Share& share) {
  *this = {};
  path_ = path;
  std::string fault;
  const auto file = RandomAccessFile::Open(path, RandomAccessFile::Access::kRead, &fault);
  std::uint64_t size = 0;
  ShareHeader header;
  if (!file || !file->GetSize(size, &fault)) {
    SetFault(String(fault));
    return false;
  }
  const bool hasHeader = size >= sizeof header && file->Read(0, &header, sizeof header, &fault) &&
                         header.magic == kMagic && header.bytes == size - sizeof header;
  bool isWhole = hasHeader && header.key == KeyOf(key) && header.index == share.index &&
                 header.count == share.count;
  std::uint64_t checksum = 0;
  std::vector<unsigned char> piece;
  for (std::uint64_t at = 0; isWhole && at < header.bytes; at += piece.size()) {
    piece.resize(static_cast<std::size_t>(std::min<std::uint64_t>(kPiece, header.bytes - at)));
    isWhole = file->Read(sizeof header + at, piece.data(), piece.size(), &fault);
    if (isWhole) checksum = ChecksumWith(checksum, piece.data(), piece.size());
  }
  if (isWhole && checksum == header.checksum) {
    size_ = header.bytes;
    if (size_ <= kPiece) window_ = std::move(piece);
    return true;
  }
  SetShareFault(path);
  return false;
}

/// Reads what comes next. False, with the fault set, when the file has gone or is shorter by now.
bool ShareReader::ReadWindow() {
  std::string fault;
  const auto file = RandomAccessFile::Open(path_, RandomAccessFile::Access::kRead, &fault);
  window_.resize(static_cast<std::size_t>(std::min<std::uint64_t>(kPiece, size_ - at_)));
  windowAt_ = at_;
  if (file && file->Read(sizeof(ShareHeader) + at_, window_.data(), window_.size(), &fault)) {
    return true;
  }
  window_ = {};
  SetFault(String(fault));
  return false;
}

bool ShareReader::GetBytes(void* data, std::size_t bytes) {
  if (bytes > Left()) return false;
  auto* to = static_cast<unsigned char*>(data);
  while (bytes != 0) {
    if (at_ - windowAt_ >= window_.size() && !ReadWindow()) return false;
    const auto from = static_cast<std::size_t>(at_ - windowAt_);
    const std::size_t count = std::min(bytes, window_.size() - from);
    to = std::copy_n(window_.data() + from, count, to);
    at_ += count, bytes -= count;
  }
  if (IsAtEnd()) Rest();
  return true;
}

}  // namespace lumo
