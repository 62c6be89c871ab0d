#pragma once

#include <cmath>
#include <cstdint>
#include <mutex>
#include <optional>
#include <unordered_map>
#include <vector>

#include "commands/value_text.h"
#include "georef/affine_link.h"
#include "warp/reprojection_geometry.h"
#include "warp/warp_kernel.h"

namespace lumo {

/// A rectangle of a grid whose pixels are carried to a source in one way.
struct WarpPiece {
  /// The ways of carrying its pixels.
  enum class Way {
    kOutside,    ///< no pixel of it lies in the source
    kFit,        ///< by `fit`
    kTransform,  ///< each by a transform of its own
  };
  SubRectProj rect;
  Way way = Way::kOutside;
  WarpPolynomial fit;
  std::int32_t originX = 0;  ///< the pixel of the grid where the fit counts from
  std::int32_t originY = 0;
  WarpFootprint footprint{};  ///< of its pixels, where the map measures them
};

/// Writes an affine map as a polynomial.
VEXG_EXPORT WarpPolynomial PolynomialOf(const AffineLink& link);

/// Carries the centres of the pixels of a grid to positions in a source raster, so that a pixel's
/// position depends on nothing but the pixel: not on the rectangle that is asked for.
///
/// Within one coordinate system all positions come from one affine map. Otherwise the grid is cut
/// into fixed squares of 256 pixels, counted from its pixel (0, 0), and a bilinear polynomial is
/// fitted to each by a net of points. A square where the polynomial is off by more than the
/// tolerance at one of them is cut into four, down to squares of 32, whose pixels are then
/// transformed one by one. So it goes too where some point can't be carried, and where the source
/// comes to an end and begins anew, as at the date line and the poles.
///
/// Pixels of both count from the corner of the first one, whatever their models. A camera counts
/// from its middle, half a pixel on.
///
/// Threads:   every operation may run on many threads at once.
///
///     const WarpMap map(grid, source, samples, lines, WarpMap::kUsualTolerance);
///     std::vector<WarpPiece> pieces;
///     map.Cut({0, 0, 1023, 1023}, pieces);
class VEXG_EXPORT WarpMap {
 public:
  /// Pixels of the source by which a position may be off, unless another tolerance is asked for.
  static constexpr double kUsualTolerance = 0.125;

  /// The geo-references are copied.
  /// @param samples,lines  of the source.
  /// @param tolerance      pixels of the source; 0 has every pixel transformed.
  /// @param form           kTold: the positions of cameras stay as these count them.
  WarpMap(const GeoRefPtr& grid, const GeoRefPtr& source, unsigned samples, unsigned lines,
          double tolerance, Form form = Form::kExact);

  /// Has pieces say how large their pixels are in the source, one footprint for each square.
  void MeasureFootprints() { measuresFootprints_ = true; }

  /// True within one coordinate system.
  bool IsAffine() const { return affine_.has_value(); }

  /// Cuts a rectangle of the grid into the pieces that the squares make of it.
  void Cut(const SubRectProj& rect, std::vector<WarpPiece>& pieces) const;

  /// Transforms the centres of the pixels of a rectangle, line by line, x before y. A position that
  /// there is not is infinite.
  /// @param positions  room for two numbers for each pixel.
  void Transform(const SubRectProj& rect, double* positions) const;

 private:
  struct Node {
    enum class Kind { kOutside, kFit, kTransform, kSplit } kind = Kind::kSplit;
    WarpPolynomial fit;
    WarpFootprint footprint;
  };
  struct Square {
    std::int32_t left, top, side;
  };

  Node MakeNode(const Square& square) const;
  Node NodeOf(const Square& square) const;
  void CutSquare(const Square& square, const SubRectProj& rect,
                 std::vector<WarpPiece>& pieces) const;
  bool CarryNet(const SubRectProj& rect, std::vector<double>& points) const;
  WarpFootprint FootprintOf(const SubRectProj& rect) const;
  bool MayTouch(const std::vector<double>& points) const;

  GeoRefPtr grid_;
  GeoRefPtr source_;
  double tolerance_;
  bool measuresFootprints_ = false;
  double gridShift_;    // from coordinates that count from a corner to the grid's own
  double sourceShift_;  // from the source's to such
  std::optional<AffineLink> affine_;
  mutable std::mutex lock_;
  mutable std::unordered_map<std::uint64_t, Node> nodes_;  // some that were needed
};

/// Gathers the bounds of the source's pixels on which positions of pieces fall.
class VEXG_EXPORT WarpBounds {
 public:
  /// @param samples,lines  of the source; positions outside don't count.
  WarpBounds(unsigned samples, unsigned lines) : width_(samples), height_(lines) {}

  /// Takes the corners of a bilinear piece in, between which all its positions lie.
  void AddFit(const WarpPiece& piece);
  /// Takes positions in, x before y; infinite ones don't count.
  void AddPositions(const double* positions, std::size_t count);

  /// True while no position fell into the source.
  bool IsEmpty() const { return !(minX_ <= maxX_ && minY_ <= maxY_); }
  /// The pixels with `margin` more on each side, cut to the source.
  SubRectProj Pixels(std::int32_t margin) const;

 private:
  void AddBox(double minX, double minY, double maxX, double maxY);

  double width_, height_;
  double minX_ = HUGE_VAL, minY_ = HUGE_VAL, maxX_ = -HUGE_VAL, maxY_ = -HUGE_VAL;
};

}  // namespace lumo
