#include "pyramid_codec.h"

#include <algorithm>
#include <lz4.h>

namespace lumo::pyramid {

void Pack(Compression compression, std::span<const unsigned char> bytes, Bytes& packed) {
  packed.Resize(0);
  if (compression == Compression::kNone || bytes.size() > LZ4_MAX_INPUT_SIZE) return;
  const std::size_t most = bytes.size() - bytes.size() / 8 - 1;
  packed.Resize(most);
  const int count = LZ4_compress_default(reinterpret_cast<const char*>(bytes.data()),
                                         reinterpret_cast<char*>(packed.Get()),
                                         static_cast<int>(bytes.size()), static_cast<int>(most));
  packed.Resize(static_cast<std::size_t>(std::max(count, 0)));
}

bool MayUnpackTo(Compression compression, std::uint64_t stored, std::uint64_t bytes) {
  constexpr std::uint64_t kMostRatio = 255;  // of a block of LZ4
  if (stored == bytes) return true;
  return compression == Compression::kLz4 && stored != 0 && stored < bytes &&
         bytes / kMostRatio <= stored && bytes <= LZ4_MAX_INPUT_SIZE;
}

bool Unpack(std::span<const unsigned char> stored, std::span<unsigned char> bytes) {
  if (stored.size() == bytes.size()) {
    std::ranges::copy(stored, bytes.begin());
    return true;
  }
  const int count = LZ4_decompress_safe(
      reinterpret_cast<const char*>(stored.data()), reinterpret_cast<char*>(bytes.data()),
      static_cast<int>(stored.size()), static_cast<int>(bytes.size()));
  return count >= 0 && static_cast<std::size_t>(count) == bytes.size();
}

}  // namespace lumo::pyramid
