#pragma once

#include <cstdint>
#include <vector>

#include "tiff_writer/tiff_directory.h"

namespace lumo::tiff {

/// The tags of an image of a TIFF file that is being made, and their bytes in it.
class DirectoryWriter {
 public:
  explicit DirectoryWriter(bool isBig) : isBig_(isBig) {}

  /// Sets a tag, in the place of one of that number.
  void Set(const TagValue& value);
  void Drop(std::uint16_t tag);
  /// Sets a tag of numbers of 16 or 32 bits.
  void SetShorts(std::uint16_t tag, const std::vector<std::uint16_t>& values);
  void SetLongs(std::uint16_t tag, const std::vector<std::uint32_t>& values);
  /// Sets a tag of places in the file.
  void SetOffsets(std::uint16_t tag, const std::vector<std::uint64_t>& values);

  /// Bytes of the directory with all values; an even number.
  std::uint64_t Bytes() const;
  /// Appends those bytes.
  /// @param start  where they lie in the file, an even number.
  /// @param next   where the next directory lies; 0 for none.
  void AppendTo(std::vector<unsigned char>& out, std::uint64_t start, std::uint64_t next) const;

 private:
  unsigned InsideBytes() const { return isBig_ ? 8 : 4; }
  std::uint64_t TableBytes() const;

  const bool isBig_;
  std::vector<TagValue> tags_;  // by their numbers
};

/// The first bytes of a file: 8, of a BigTIFF 16.
/// @param directory  where the first directory lies.
std::vector<unsigned char> FileHeader(bool isBig, std::uint64_t directory);

}  // namespace lumo::tiff
