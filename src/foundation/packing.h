#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>

#include "platform/export.h"

namespace lumo {

// Stretches of our own files: packed where that saves enough, with a checksum.

/// Says how stretches of a file are packed, by the number that stands in the file.
enum class Packing : std::uint32_t { kNone = 0, kLz4 = 1 };

/// Bytes that are not cleared when they are made.
class RawBytes {
 public:
  /// Makes room for `count`; what was there is gone.
  void Resize(std::size_t count) {
    if (count > capacity_) {
      bytes_ = std::make_unique_for_overwrite<unsigned char[]>(count);
      capacity_ = count;
    }
    count_ = count;
  }
  unsigned char* Get() const { return bytes_.get(); }
  std::size_t Count() const { return count_; }
  std::span<unsigned char> All() const { return {bytes_.get(), count_}; }

 private:
  std::unique_ptr<unsigned char[]> bytes_;
  std::size_t count_ = 0;
  std::size_t capacity_ = 0;
};

/// Packs bytes.
/// @param packed  [out] the bytes to store instead; empty when that would not save an eighth.
VEXG_EXPORT void PackBytes(Packing packing, std::span<const unsigned char> bytes, RawBytes& packed);

/// False when so many stored bytes can't stand for `bytes`.
VEXG_EXPORT bool MayUnpackTo(Packing packing, std::uint64_t stored, std::uint64_t bytes);

/// Unpacks to exactly `bytes.size()` bytes; as many stored ones are those themselves.
VEXG_EXPORT bool UnpackBytes(std::span<const unsigned char> stored, std::span<unsigned char> bytes);

/// The checksum of our file formats: XXH3, 64 bits.
VEXG_EXPORT std::uint64_t Checksum(const void* bytes, std::size_t count);
/// Of two runs that follow one another in the file.
VEXG_EXPORT std::uint64_t Checksum(const void* first, std::size_t firstCount, const void* second,
                                   std::size_t secondCount);

}  // namespace lumo
