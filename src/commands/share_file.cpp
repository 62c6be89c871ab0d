#include "commands/share_file.h"

#include <algorithm>
#include <array>

#include "foundation/fault.h"
#include "foundation/packing.h"
#include "platform/random_access_file.h"

namespace lumo {
namespace {

using platform::RandomAccessFile;

constexpr std::array<char, 8> kMagic{'S', 'H', 'A', 'R', 'E', '0', '2', '\n'};

/// The header in front of the numbers, behind which the table of the sections stands.
struct ShareHeader {
  std::array<char, 8> magic = kMagic;
  std::uint64_t checksum = 0;  // of the table
  std::uint64_t key = 0;       // checksum of its text
  std::uint64_t bytes = 0;     // behind the header
  std::uint32_t index = 0;
  std::uint32_t count = 0;
  std::uint64_t sections = 0;
};

constexpr std::size_t kPiece = 1 << 20;

std::uint64_t KeyOf(const std::string& key) {
  return Checksum(key.data(), key.size());
}

/// The checksum of all pieces up to one, out of that of those before it.
std::uint64_t ChecksumWith(std::uint64_t before, const unsigned char* piece, std::size_t bytes) {
  return Checksum(&before, sizeof before, piece, bytes);
}

/// Reads the table of sections, and looks whether the file is that of a share. False for another
/// one, or one that isn't whole.
bool ReadTable(const RandomAccessFile& file, const std::string& key, const Share& share,
               std::vector<ShareSection>& table) {
  std::uint64_t size = 0;
  ShareHeader header;
  if (!file.GetSize(size) || size < sizeof header || !file.Read(0, &header, sizeof header)) {
    return false;
  }
  const bool isOfShare = header.magic == kMagic && header.bytes == size - sizeof header &&
                         header.key == KeyOf(key) && header.index == share.index &&
                         header.count == share.count &&
                         header.sections <= header.bytes / sizeof(ShareSection);
  if (!isOfShare) return false;
  table.resize(header.sections);
  const std::size_t bytes = table.size() * sizeof(ShareSection);
  if (!file.Read(size - bytes, table.data(), bytes) ||
      Checksum(table.data(), bytes) != header.checksum) {
    return false;
  }
  std::uint64_t left = header.bytes - bytes;
  for (const ShareSection& section : table) {
    if (section.bytes > left) return false;
    left -= section.bytes;
  }
  return left == 0;
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
  std::vector<unsigned char>& held = held_.back();
  while (file_ != nullptr && held.size() + bytes >= kPiece) {
    const std::size_t count = kPiece - held.size();
    held.insert(held.end(), first, first + count);
    first += count, bytes -= count;
    WritePiece(held.data(), kPiece);
    held.clear();
  }
  held.insert(held.end(), first, first + bytes);
}

void ShareWriter::WritePiece(const unsigned char* piece, std::size_t bytes) {
  ShareSection& section = sections_.back();
  section.checksum = ChecksumWith(section.checksum, piece, bytes);
  section.bytes += bytes;
  if (fault_.empty()) file_->Write(sizeof(ShareHeader) + written_, piece, bytes, &fault_);
  written_ += bytes;
}

/// Writes what is left of the last section.
void ShareWriter::WriteSection(const std::vector<unsigned char>& rest) {
  for (std::size_t at = 0; at < rest.size(); at += kPiece) {
    WritePiece(rest.data() + at, std::min(kPiece, rest.size() - at));
  }
}

void ShareWriter::EndSection() {
  if (file_ == nullptr) {
    held_.emplace_back();
    return;
  }
  WriteSection(held_.back());
  held_.back().clear();
  sections_.emplace_back();
}

bool ShareWriter::Write(const std::string& path, const std::string& key, const Share& share) {
  if (file_ == nullptr && !StreamTo(path)) return false;
  for (std::size_t i = 0; i < held_.size(); ++i) {
    if (i != 0) sections_.emplace_back();
    WriteSection(held_[i]);
  }
  const std::size_t tableBytes = sections_.size() * sizeof(ShareSection);
  ShareHeader header;
  header.checksum = Checksum(sections_.data(), tableBytes);
  header.key = KeyOf(key);
  header.bytes = written_ + tableBytes;
  header.index = share.index;
  header.count = share.count;
  header.sections = sections_.size();
  const bool isWritten =
      fault_.empty() &&
      file_->Write(sizeof header + written_, sections_.data(), tableBytes, &fault_) &&
      file_->Write(0, &header, sizeof header, &fault_) && file_->Close(&fault_);
  if (!isWritten) SetFault(String(fault_));
  return isWritten;
}

void SetShareFault(const std::string& path) {
  SetFault(String(path + ": is no whole file of a share of this work"));
}

bool ShareReader::Open(const std::string& path, const std::string& key, const Share& share,
                       std::uint64_t section) {
  *this = {};
  path_ = path;
  std::string fault;
  const auto file = RandomAccessFile::Open(path, RandomAccessFile::Access::kRead, &fault);
  if (!file) {
    SetFault(String(fault));
    return false;
  }
  std::vector<ShareSection> table;
  bool isWhole = ReadTable(*file, key, share, table) && section < table.size();
  place_ = sizeof(ShareHeader);
  for (std::uint64_t before = 0; isWhole && before < section; ++before) {
    place_ += table[before].bytes;
  }
  std::uint64_t checksum = 0;
  std::vector<unsigned char> piece;
  const std::uint64_t bytes = isWhole ? table[section].bytes : 0;
  for (std::uint64_t at = 0; isWhole && at < bytes; at += piece.size()) {
    piece.resize(static_cast<std::size_t>(std::min<std::uint64_t>(kPiece, bytes - at)));
    isWhole = file->Read(place_ + at, piece.data(), piece.size());
    if (isWhole) checksum = ChecksumWith(checksum, piece.data(), piece.size());
  }
  if (isWhole && checksum == table[section].checksum) {
    size_ = bytes;
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
  if (file && file->Read(place_ + at_, window_.data(), window_.size(), &fault)) return true;
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
