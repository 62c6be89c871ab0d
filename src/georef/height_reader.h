#pragma once

#include <unordered_map>

#include "georef/elevation_model.h"

namespace lumo {

/// Reads single heights of an elevation model through tiles that it keeps for as long as it lives:
/// one conversion of an array.
class HeightReader {
 public:
  /// @param model  outlives the reader; nearest and bilinear heights are in metres, as it has them.
  explicit HeightReader(const ElevationModel& model)
      : model_(model), samples_(model.Samples()), lines_(model.Lines()) {}

  /// Height of the pixel nearest to (x, y) when that is neither outside the grid nor in its first
  /// column or line. False, with `height` as it was, otherwise or where there is no height.
  bool Nearest(double x, double y, double& height);

  /// Height at (x, y) between the four pixels whose first is the truncated one; of one pixel on the
  /// last column or line. False as above.
  bool Bilinear(double x, double y, double& height);

 private:
  static constexpr unsigned kTile = 128;

  double At(unsigned column, unsigned row);
  const Array<double>& Tile(unsigned column, unsigned row);

  const ElevationModel& model_;
  const unsigned samples_;
  const unsigned lines_;
  std::unordered_map<std::uint64_t, Array<double>> tiles_;
};

}  // namespace lumo
