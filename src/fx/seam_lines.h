#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "platform/random_access_file.h"

namespace lumo {

/// Keeps the lines at which the strips of an image meet in a part of a file: what SeamlessWatershed
/// knows of the first and the last line of each strip.
///
/// Threads: any may read and write at once; what they do to one line is theirs to order. Failure:
///          false, with the fault set.
class SeamLines {
 public:
  /// Says what is known of a line, a value for each column.
  enum Kind : std::uint8_t {
    kFirstDistances,  ///< of the pixels of the first line from lower ground
    kLastDistances,
    kFirstLabels,  ///< where the pixels of the first line drain to
    kLastLabels,
    kSame,  ///< the cells of the first line, as MarkLine made them; bytes
  };

  /// @param file   outlives this.
  /// @param begin  of the part, which goes to the end of the file.
  void Begin(platform::RandomAccessFile& file, std::uint64_t begin, std::uint32_t width) {
    file_ = &file;
    begin_ = begin;
    width_ = width;
  }

  /// Reads a line that was written. @param line  [out] of the width of the image.
  template <typename T>
  bool Read(unsigned strip, Kind kind, std::vector<T>& line) const {
    line.resize(width_);
    return ReadBytes(PlaceOf(strip, kind), line.data(), line.size() * sizeof(T));
  }
  template <typename T>
  bool Write(unsigned strip, Kind kind, const std::vector<T>& line) {
    return WriteBytes(PlaceOf(strip, kind), line.data(), line.size() * sizeof(T));
  }

 private:
  std::uint64_t PlaceOf(unsigned strip, Kind kind) const {
    constexpr std::uint64_t kOfColumn = kSame * sizeof(std::uint32_t) + 1;
    return begin_ + width_ * (strip * kOfColumn + kind * sizeof(std::uint32_t));
  }
  bool ReadBytes(std::uint64_t place, void* bytes, std::size_t count) const;
  bool WriteBytes(std::uint64_t place, const void* bytes, std::size_t count);

  platform::RandomAccessFile* file_ = nullptr;
  std::uint64_t begin_ = 0;
  std::uint32_t width_ = 0;
};

}  // namespace lumo
