#include "fx/store_header.h"

#include <algorithm>
#include <cstdint>

#include "foundation/fault.h"

namespace lumo::detail {

void WriteStoreHeader(std::span<unsigned char> header, std::string_view mark,
                      std::initializer_list<unsigned> counts) {
  auto at = std::copy(mark.begin(), mark.end(), header.begin());
  for (const unsigned count : counts) {
    const auto number = static_cast<std::uint16_t>(count);
    std::memcpy(&*at, &number, sizeof number);
    at += sizeof number;
  }
}

std::optional<StoreCounts> ReadStoreHeader(const BasicBuffer& buffer, std::string_view mark) {
  const std::span<const unsigned char> header = buffer.Header();
  const bool isWhole = buffer.GetErrorState().severity == kSeverityNone;
  if (!isWhole || !std::equal(mark.begin(), mark.end(), header.begin())) return {};
  std::uint16_t counts[2];
  std::memcpy(counts, &header[mark.size()], sizeof counts);
  return StoreCounts{counts[0], counts[1]};
}

bool FitsStoreHeader(const String& path, std::initializer_list<unsigned> counts) {
  for (const unsigned count : counts) {
    if (count <= UINT16_MAX) continue;
    SetFault(String(path.ToUTF8() + ": no region file has " + std::to_string(count) +
                    " bands or attributes"));
    return false;
  }
  return true;
}

}  // namespace lumo::detail
