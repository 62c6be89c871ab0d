#include "plan/file_checksum.h"

#include <algorithm>
#include <vector>

#include <fmt/format.h>

#include "foundation/packing.h"
#include "platform/random_access_file.h"
#include "verb.h"

namespace lumo::host {

std::string ChecksumOf(const std::string& file, const AbortFlag& abort) {
  using platform::RandomAccessFile;
  constexpr std::uint64_t kPiece = 1 << 20;
  std::string fault;
  const auto opened = RandomAccessFile::Open(file, RandomAccessFile::Access::kRead, &fault);
  std::uint64_t size = 0;
  bool isRead = opened != nullptr && opened->GetSize(size, &fault);
  std::uint64_t checksum = 0;
  std::vector<unsigned char> piece(static_cast<std::size_t>(std::min(kPiece, size)));
  for (std::uint64_t at = 0; isRead && at < size; at += piece.size()) {
    if (abort.IsSet()) return {};
    piece.resize(static_cast<std::size_t>(std::min(kPiece, size - at)));
    isRead = opened->Read(at, piece.data(), piece.size(), &fault);
    checksum = Checksum(&checksum, sizeof checksum, piece.data(), piece.size());
  }
  if (!isRead) throw HostError(kExitFailed, fault);
  return fmt::format("{:016x}", checksum);
}

}  // namespace lumo::host
