#pragma once

#include <algorithm>
#include <cstdint>

namespace lumo {

/// Gives the lines of the strips of a packed file: enough to be packed well, at most all.
/// @param lineBytes  of a line of a strip.
inline unsigned StripLines(unsigned lines, std::uint64_t lineBytes) {
  constexpr std::uint64_t kStripBytes = 256 << 10;
  const std::uint64_t most = kStripBytes / std::max<std::uint64_t>(lineBytes, 1);
  return static_cast<unsigned>(std::clamp<std::uint64_t>(most, 1, std::max(lines, 1U)));
}

}  // namespace lumo
