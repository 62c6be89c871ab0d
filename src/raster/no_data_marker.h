#pragma once

#include <optional>
#include <vector>

#include "raster/pixel_types.h"
#include "raster/raster_enums.h"

namespace lumo {

/// Marks the pixels of a block that hold the no-data value of their band: they get the state bit
/// NoData, and other bits stay. Values are compared exactly; NaN is equal to every NaN. Exists for
/// TwelveTypes.
///
///     const NoDataMarker<float> marker({-9999.0F, std::nullopt}, Interleave::BIP, width, height);
///     if (marker.IsNeeded()) marker.Mark(0, count, pixels, state);
///
/// Threads: runs of a block may be marked on several at once.
template <typename T>
class NoDataMarker {
 public:
  /// @param values  of the bands in the order of the block; a band without one is left as it is.
  /// @param width,height  of the block, whose axes `interleave` orders.
  NoDataMarker(std::vector<std::optional<T>> values, Interleave interleave, unsigned width,
               unsigned height);

  /// False when no band has a value.
  bool IsNeeded() const { return isNeeded_; }

  /// Looks at a run of the block.
  /// @param first   its first element, counted in the block.
  /// @param pixels  that element and those behind it.
  void Mark(std::uint64_t first, std::uint64_t count, const T* pixels, unsigned char* state) const;

 private:
  void MarkPattern(std::uint64_t first, std::uint64_t count, const T* pixels,
                   unsigned char* state) const;

  std::vector<std::optional<T>> values_;
  std::uint64_t runLength_;  // elements of one band that follow one another
  bool isNeeded_ = false;
  // Of bands that change from element to element: a whole number of pixels, and one more, so that a
  // run may begin within a pixel.
  std::vector<T> patternValues_;
  std::vector<unsigned char> patternBits_;
  std::uint64_t patternLength_ = 0;
};

}  // namespace lumo
