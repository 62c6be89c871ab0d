#pragma once

#include <cstdint>
#include <memory>
#include <span>

#include "pyramid_header.h"

namespace lumo::pyramid {

/// Bytes that are not cleared when they are made.
class Bytes {
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
/// @param packed  [out] what is to be stored instead; empty when that would not save an eighth.
void Pack(Compression compression, std::span<const unsigned char> bytes, Bytes& packed);

/// False when so many stored bytes can't stand for `bytes`.
bool MayUnpackTo(Compression compression, std::uint64_t stored, std::uint64_t bytes);

/// Unpacks to exactly `bytes.size()` bytes; as many stored ones are those themselves.
bool Unpack(std::span<const unsigned char> stored, std::span<unsigned char> bytes);

}  // namespace lumo::pyramid
