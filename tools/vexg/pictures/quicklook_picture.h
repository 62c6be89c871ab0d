#pragma once

#include <array>
#include <vector>

#include "foundation/color.h"
#include "output/output_file.h"
#include "pictures/block_reader.h"

namespace lumo::host {

/// Says what becomes of the raster's pixels that one of a reduced picture covers.
enum class PictureSampling {
  kNearest,  ///< the one in their middle stands for them
  kAverage,  ///< the mean of the valid ones, weighed by the area that is covered
};

/// A raster seen from far. Pixels that aren't valid, and numbers that aren't finite, don't show.
class QuicklookPicture {
 public:
  /// @param size   pixels of the longer side at most; a smaller raster stays as it is.
  /// @param bands  one, or three: red, green, blue.
  QuicklookPicture(const RasterInfo& info, unsigned size, const Array<unsigned>& bands,
                   PictureSampling sampling);

  unsigned GetWidth() const { return static_cast<unsigned>(columns_.size()); }
  unsigned GetHeight() const { return static_cast<unsigned>(lines_.size()); }

  /// The blocks that hold the picture's pixels: for an average all of the raster, else no block of
  /// the source that holds none of them. None is touched twice where it is within the budget.
  std::vector<SubRect> GetBlocks() const;

  /// Takes the picture's pixels out of a block of GetBlocks, which was read as BIP. Complex pixels
  /// show their magnitude.
  void Take(const SubRect& block, const unsigned char* pixels, const unsigned char* states);

  /// Ends the averages, after the last block.
  void Finish();

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
  template <typename T>
  void AddTyped(const SubRect& block, const T* pixels, const unsigned char* states);

  /// Where a pixel of the raster goes on one axis: a share of it to a pixel of the picture, and the
  /// rest to the next one.
  struct Shares {
    unsigned at;
    double first;
    double rest;  ///< 0 where there is none
  };
  static std::vector<Shares> ShareOut(unsigned extent, unsigned count);

  const RasterInfo& info_;
  Array<unsigned> bands_;
  std::vector<unsigned> columns_;  // of the raster, for each of the picture
  std::vector<unsigned> lines_;
  std::vector<std::vector<double>> values_;  // by band; NaN where not valid
  bool averages_ = false;
  std::vector<std::vector<double>> weights_;  // of the values, which are sums until Finish
};

}  // namespace lumo::host
