#pragma once

#include <cstddef>

#include "georef/rpc_georef.h"

namespace lumo {

/// Points that are computed together, one array for each coordinate.
struct RpcBlock {
  static constexpr std::size_t kPoints = 64;

  double longitude[kPoints];  ///< degrees
  double latitude[kPoints];   ///< degrees
  double height[kPoints];     ///< normalised
  double sample[kPoints];     ///< of the pixel grid before any subset
  double line[kPoints];
  std::size_t count = 0;  ///< points in use
};

/// The bare rational polynomials: ground positions in degrees, and heights, to pixels and back.
class RpcModel {
 public:
  /// Height of a point that has none; it stands for HEIGHT_OFF.
  static constexpr double kNoHeight = -99999.0;

  /// @param rpc  outlives the model.
  explicit RpcModel(const RpcCoefficients& rpc) : rpc_(rpc) {}

  /// A height in metres as the polynomials take it; 0 for kNoHeight.
  double NormalisedHeight(double height) const {
    return height == kNoHeight ? 0 : (height - rpc_.heightOffset) / rpc_.heightScale;
  }

  /// Computes samples and lines of the block's ground positions.
  void Project(RpcBlock& block) const;

  /// Changes the block's ground positions, by Newton's method with difference quotients, until they
  /// fall on its samples and lines to within 0.0001 pixel, or for 50 rounds. A point that is not a
  /// number, or where the derivatives have no inverse, becomes NaN.
  void Locate(RpcBlock& block) const;

 private:
  const RpcCoefficients& rpc_;
};

}  // namespace lumo
