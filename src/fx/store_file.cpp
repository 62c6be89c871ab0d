#include "fx/store_file.h"

#include <algorithm>

#include "foundation/fault.h"

namespace lumo::detail {

std::optional<StoreCounts> ReadStoreHeader(const BasicBuffer& buffer, std::string_view mark) {
  const std::span<const unsigned char> header = buffer.Header();
  const bool isWhole = buffer.GetErrorState().severity == kSeverityNone;
  if (!isWhole || !std::equal(mark.begin(), mark.end(), header.begin())) return {};
  std::uint16_t counts[2];
  std::memcpy(counts, &header[mark.size()], sizeof counts);
  return StoreCounts{counts[0], counts[1]};
}

StoreCounts WriteStoreHeader(BasicBuffer& buffer, std::string_view mark,
                             std::initializer_list<unsigned> counts) {
  auto at = std::copy(mark.begin(), mark.end(), buffer.Header().begin());
  for (const unsigned count : counts) {
    const auto number = static_cast<std::uint16_t>(count);
    std::memcpy(&*at, &number, sizeof number);
    at += sizeof number;
  }
  return {counts.begin()[0], counts.begin()[1]};
}

bool FitsStoreHeader(const URI& uri, std::initializer_list<unsigned> counts) {
  for (const unsigned count : counts) {
    if (count <= UINT16_MAX) continue;
    SetFault(String(uri.ToUTF8() + ": no region file has " + std::to_string(count) +
                    " bands or attributes"));
    return false;
  }
  return true;
}

}  // namespace lumo::detail
