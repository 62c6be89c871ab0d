#include "commands/share_file.h"

#include <algorithm>
#include <array>
#include <filesystem>

#include "foundation/fault.h"
#include "foundation/packing.h"
#include "platform/random_access_file.h"

namespace lumo {
namespace {

constexpr std::array<char, 8> kMagic{'S', 'H', 'A', 'R', 'E', '0', '2', '\n'};

/// The header in front of the table of sections.
struct ShareHeader {
  std::array<char, 8> magic = kMagic;
  std::uint64_t checksum = 0;  // of the table
  std::uint64_t key = 0;       // checksum of its text
  std::uint64_t bytes = 0;     // behind the header
  std::uint32_t index = 0;
  std::uint32_t count = 0;
  std::uint64_t sections = 0;
};

/// A section, in the table; their numbers stand one after the other behind it.
struct ShareSection {
  std::uint64_t bytes = 0;
  std::uint64_t checksum = 0;
};

std::uint64_t KeyOf(const std::string& key) {
  return Checksum(key.data(), key.size());
}

/// Reads the table of sections, and looks whether the file is that of a share. False for another
/// one, or one that isn't whole.
bool ReadTable(const platform::RandomAccessFile& file, const std::string& key, const Share& share,
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
  if (!file.Read(sizeof header, table.data(), bytes) ||
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

void ShareWriter::PutBytes(const void* data, std::size_t bytes) {
  const auto* const first = static_cast<const unsigned char*>(data);
  sections_.back().insert(sections_.back().end(), first, first + bytes);
}

bool ShareWriter::Write(const std::string& path, const std::string& key, const Share& share) const {
  std::vector<ShareSection> table;
  std::vector<platform::ConstFilePiece> pieces{{nullptr, sections_.size() * sizeof(ShareSection)}};
  ShareHeader header;
  for (const std::vector<unsigned char>& section : sections_) {
    table.push_back({section.size(), Checksum(section.data(), section.size())});
    pieces.push_back({section.data(), section.size()});
    header.bytes += section.size();
  }
  pieces.front().data = table.data();
  header.checksum = Checksum(table.data(), pieces.front().bytes);
  header.key = KeyOf(key);
  header.bytes += pieces.front().bytes;
  header.index = share.index;
  header.count = share.count;
  header.sections = table.size();
  std::string fault;
  const auto file = platform::RandomAccessFile::CreateOrEmpty(path, &fault);
  // The header comes last, so that a file which broke off has none.
  const bool isWritten = file && file->Write(sizeof header, pieces, &fault) &&
                         file->Write(0, &header, sizeof header, &fault) && file->Close(&fault);
  if (!isWritten) SetFault(String(fault));
  return isWritten;
}

void SetShareFault(const std::string& path) {
  SetFault(String(path + ": is no whole file of a share of this work"));
}

bool ShareReader::Open(const std::string& path, const std::string& key, const Share& share,
                       std::uint64_t section) {
  bytes_.clear();
  at_ = 0;
  std::string fault;
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &fault);
  if (!file) {
    SetFault(String(fault));
    return false;
  }
  std::vector<ShareSection> table;
  if (ReadTable(*file, key, share, table) && section < table.size()) {
    std::uint64_t place = sizeof(ShareHeader) + table.size() * sizeof(ShareSection);
    for (std::uint64_t before = 0; before < section; ++before) place += table[before].bytes;
    bytes_.resize(table[section].bytes);
    if (file->Read(place, bytes_.data(), bytes_.size()) &&
        Checksum(bytes_.data(), bytes_.size()) == table[section].checksum) {
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
