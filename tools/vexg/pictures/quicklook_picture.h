#pragma once

#include <array>
#include <vector>

#include "foundation/color.h"
#include "output/output_file.h"
#include "pictures/block_reader.h"

namespace lumo::host {

/// A raster seen from far: every pixel of the picture is the raster's pixel in its middle.
class QuicklookPicture {
 public:
  /// @param size   pixels of the longer side at most; a smaller raster stays as it is.
  /// @param bands  one, or three: red, green, blue.
  QuicklookPicture(const RasterInfo& info, unsigned size, const Array<unsigned>& bands);

  unsigned GetWidth() const { return static_cast<unsigned>(columns_.size()); }
  unsigned GetHeight() const { return static_cast<unsigned>(lines_.size()); }

  /// The blocks that hold the picture's pixels. No block of the source that holds none of them is
  /// touched, and none is touched twice where it is within the budget.
  std::vector<SubRect> GetBlocks() const;

  /// Takes the picture's pixels out of a block of GetBlocks, which was read as BIP. Complex pixels
  /// show their magnitude.
  void Take(const SubRect& block, const unsigned char* pixels, const unsigned char* states);

  /// How the values become 0 to 255.
  struct Stretch {
    bool isPercentile = true;  ///< else values are cut to 0 and 255
    double low = 2.0;          ///< percentile of the valid pixels that becomes 0
    double high = 98.0;
  };

  /// The picture as rows of grey, or red, green and blue, with alpha behind where `hasAlpha`.
  struct Bytes {
    unsigned channels = 0;
    std::vector<unsigned char> pixels;
  };
  Bytes Draw(const Stretch& stretch) const;
  /// The picture in the colours of a table.
  Bytes Draw(const Palette& palette) const;

  /// Draws lines over a picture of the same size: where the value of the first band differs from
  /// that of the pixel on the right or below.
  void DrawOutlines(const std::array<unsigned char, 3>& colour, Bytes& picture) const;

 private:
  bool IsShown(std::size_t pixel) const;
  Bytes MakeBytes(unsigned colors) const;
  template <typename T>
  void TakeTyped(const SubRect& block, const T* pixels, const unsigned char* states);

  const RasterInfo& info_;
  Array<unsigned> bands_;
  std::vector<unsigned> columns_;  // of the raster, for each of the picture
  std::vector<unsigned> lines_;
  std::vector<std::vector<double>> values_;  // by band; NaN where not valid
};

}  // namespace lumo::host
