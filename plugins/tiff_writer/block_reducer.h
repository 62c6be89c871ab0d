#pragma once

#include <cstdint>
#include <vector>

#include "raster/creation_options.h"
#include "raster/raster_def.h"

namespace lumo::tiff {

/// A rectangle of a level, and where the pixels go that come of it. All lie without gaps but for
/// the given steps, in elements.
struct Reduction {
  const unsigned char* pixels;     ///< of the level below
  unsigned width, height;          ///< of it, in pixels
  std::size_t line;                ///< bytes from a line to the next
  const unsigned char* excluded;   ///< a byte for each pixel, not 0 where it doesn't count; or null
  std::size_t excludedLine;        ///< bytes from a line of those to the next
  unsigned firstBand;              ///< of the values of a pixel
  unsigned char* reduced;          ///< [out] (width + 1) / 2 by (height + 1) / 2 pixels
  unsigned char* reducedExcluded;  ///< [out] of them; null where `excluded` is
};

/// Makes a pixel of each two by two.
///
/// Pixels that hold the no-data value of their band, NaN, those that are excluded or whose alpha is
/// 0 don't count. Where none of the four counts the pixel is excluded as they are, and holds the
/// band's no-data value, else the first of them.
class BlockReducer {
 public:
  /// @param def    of the raster.
  /// @param depth  values of a pixel in a block.
  BlockReducer(const RasterDef& def, unsigned depth, bool hasAlpha);

  void Reduce(const Reduction& work) const;
  /// Excludes pixels that hold the no-data values of all bands of a block; does nothing for a
  /// raster where a band has none.
  /// @param excluded  width by height bytes.
  void ExcludeNoData(const unsigned char* pixels, unsigned width, unsigned height, std::size_t line,
                     std::vector<unsigned char>& excluded) const;

 private:
  template <typename T>
  void ReduceAs(const Reduction& work) const;

  const unsigned dataType_;
  const unsigned depth_;
  const unsigned bands_;
  const bool hasAlpha_;
  const OverviewMethod method_;
  std::vector<bool> hasNoData_;                     // by band
  std::vector<std::vector<unsigned char>> noData_;  // bytes of the value
};

}  // namespace lumo::tiff
