#include "foundation/packing.h"

#include <algorithm>
#include <lz4.h>

#define XXH_INLINE_ALL
#include <xxhash.h>

namespace lumo {
namespace {

constexpr std::size_t kLeastGain = 8;  // an eighth

/// True when samples of the bytes can be packed: most pixels can't be, and to find that out of all
/// of them takes as long as everything else that becomes of a tile.
bool IsWorthwhile(std::span<const unsigned char> bytes) {
  constexpr std::size_t kSample = 8192, kSamples = 3;
  if (bytes.size() < 4 * kSample * kSamples) return true;
  std::size_t total = 0;
  char packed[LZ4_COMPRESSBOUND(kSample)];
  for (std::size_t i = 0; i < kSamples; ++i) {
    const std::size_t at = (2 * i + 1) * bytes.size() / (2 * kSamples) - kSample / 2;
    total += static_cast<std::size_t>(
        LZ4_compress_default(reinterpret_cast<const char*>(bytes.data()) + at, packed,
                             static_cast<int>(kSample), static_cast<int>(sizeof packed)));
  }
  return total <= kSamples * kSample - kSamples * kSample / kLeastGain;
}

}  // namespace

void PackBytes(Packing packing, std::span<const unsigned char> bytes, RawBytes& packed) {
  packed.Resize(0);
  constexpr std::size_t kLeast = 64;
  if (packing == Packing::kNone || bytes.size() < kLeast || bytes.size() > LZ4_MAX_INPUT_SIZE ||
      !IsWorthwhile(bytes)) {
    return;
  }
  const std::size_t most = bytes.size() - bytes.size() / kLeastGain - 1;
  packed.Resize(most);
  const int count = LZ4_compress_default(reinterpret_cast<const char*>(bytes.data()),
                                         reinterpret_cast<char*>(packed.Get()),
                                         static_cast<int>(bytes.size()), static_cast<int>(most));
  packed.Resize(static_cast<std::size_t>(std::max(count, 0)));
}

bool MayUnpackTo(Packing packing, std::uint64_t stored, std::uint64_t bytes) {
  constexpr std::uint64_t kMostRatio = 255;  // of a block of LZ4
  if (stored == bytes) return true;
  return packing == Packing::kLz4 && stored != 0 && stored < bytes &&
         bytes / kMostRatio <= stored && bytes <= LZ4_MAX_INPUT_SIZE;
}

bool UnpackBytes(std::span<const unsigned char> stored, std::span<unsigned char> bytes) {
  if (stored.size() == bytes.size()) {
    std::ranges::copy(stored, bytes.begin());
    return true;
  }
  const int count = LZ4_decompress_safe(
      reinterpret_cast<const char*>(stored.data()), reinterpret_cast<char*>(bytes.data()),
      static_cast<int>(stored.size()), static_cast<int>(bytes.size()));
  return count >= 0 && static_cast<std::size_t>(count) == bytes.size();
}

std::uint64_t Checksum(const void* bytes, std::size_t count) {
  return XXH3_64bits(bytes, count);
}

std::uint64_t Checksum(const void* first, std::size_t firstCount, const void* second,
                       std::size_t secondCount) {
  XXH3_state_t state;
  XXH3_64bits_reset(&state);
  XXH3_64bits_update(&state, first, firstCount);
  XXH3_64bits_update(&state, second, secondCount);
  return XXH3_64bits_digest(&state);
}

}  // namespace lumo
