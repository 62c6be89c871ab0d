#include "warp/warp_map.h"

#include <algorithm>

namespace lumo {
namespace {

constexpr std::int32_t kSide = 256;      // of the squares
constexpr std::int32_t kLeastSide = 32;  // that are not cut any more
constexpr unsigned kNet = 9;             // points along a side of the net, corners included
/// Some more on each edge, as what cuts a square in two, such as the date line, comes in there.
constexpr unsigned kBetween = kNet - 1;
constexpr unsigned kNetPoints = kNet * kNet + 4 * kBetween;
constexpr double kCentre = 0.5;

/// The square that a coordinate lies in, also left of or above the grid.
std::int32_t SquareOf(std::int32_t at) {
  return at >= 0 ? at / kSide : -((-std::int64_t{at} + kSide - 1) / kSide);
}

/// The part of a rectangle inside another one; false when there is none.
bool Intersect(const SubRectProj& a, const SubRectProj& b, SubRectProj& both) {
  const std::int32_t left = std::max(a.left, b.left), right = std::min(a.right, b.right);
  const std::int32_t top = std::max(a.top, b.top), bottom = std::min(a.bottom, b.bottom);
  if (left > right || top > bottom) return false;
  both = SubRectProj(left, top, right, bottom);
  return true;
}

/// From the pixels of a model to those that count from the corner of the first one.
double CornerShift(const GeoRef& model, Form form) {
  return model.GetType() == GeoRef::kRpc && form == Form::kExact ? 0.5 : 0.0;
}

/// Places of the net in a rectangle, counted from its corner: x, then y.
std::vector<double> NetOf(const SubRectProj& rect) {
  const auto at = [](double i, double last) { return kCentre + i * last / (kNet - 1); };
  const double right = static_cast<double>(rect.Width() - 1);
  const double bottom = static_cast<double>(rect.Height() - 1);
  std::vector<double> points;
  points.reserve(2 * kNetPoints);
  const auto add = [&](double i, double j) {
    points.push_back(at(i, right));
    points.push_back(at(j, bottom));
  };
  for (unsigned j = 0; j < kNet; ++j)
    for (unsigned i = 0; i < kNet; ++i) add(i, j);
  for (unsigned i = 0; i < kBetween; ++i) {
    add(i + 0.5, 0);
    add(i + 0.5, kNet - 1);
    add(0, i + 0.5);
    add(kNet - 1, i + 0.5);
  }
  return points;
}

/// One side of a bilinear polynomial, fitted by least squares to the regular part of a net. About
/// the middle of the net its four terms are orthogonal, so each coefficient stands alone.
/// @param places   the net, see NetOf.
/// @param values   the positions; those of this side begin at `side` and are two apart.
/// @param worst    [out] the largest difference to all points.
std::array<double, 4> FitSide(const std::vector<double>& places, const std::vector<double>& values,
                              unsigned side, double& worst) {
  const double middleX = (places[0] + places[2 * (kNet - 1)]) / 2;
  const double middleY = (places[1] + places[2 * (kNet * kNet - 1) + 1]) / 2;
  double sum = 0, sumX = 0, sumY = 0, sumXY = 0, xx = 0, yy = 0, xxyy = 0;
  for (unsigned i = 0; i < kNet * kNet; ++i) {
    const double x = places[2 * i] - middleX, y = places[2 * i + 1] - middleY;
    const double value = values[2 * i + side];
    sum += value;
    sumX += value * x;
    sumY += value * y;
    sumXY += value * x * y;
    xx += x * x;
    yy += y * y;
    xxyy += x * x * y * y;
  }
  const auto share = [](double part, double of) { return of > 0 ? part / of : 0.0; };
  const double kx = share(sumX, xx), ky = share(sumY, yy), kxy = share(sumXY, xxyy);
  std::array<double, 4> k = {
      sum / (kNet * kNet) - kx * middleX - ky * middleY + kxy * middleX * middleY,
      ky - kxy * middleX, kx - kxy * middleY, kxy};
  // The constant that makes the largest difference to both sides the same.
  double low = HUGE_VAL, high = -HUGE_VAL;
  for (std::size_t i = 0; i < places.size(); i += 2) {
    const double x = places[i], y = places[i + 1];
    const double difference = values[i + side] - (k[0] + k[1] * y + k[2] * x + k[3] * x * y);
    low = std::min(low, difference);
    high = std::max(high, difference);
  }
  k[0] += (low + high) / 2;
  worst = (high - low) / 2;
  return k;
}

}  // namespace

WarpPolynomial PolynomialOf(const AffineLink& link) {
  WarpPolynomial fit;
  fit.u = {link.x0, link.xy, link.xx, 0};
  fit.v = {link.y0, link.yy, link.yx, 0};
  return fit;
}

WarpMap::WarpMap(const GeoRefPtr& grid, const GeoRefPtr& source, unsigned samples, unsigned lines,
                 double tolerance, Form form)
    : grid_(CloneOf(grid)),
      source_(CloneOf(source)),
      tolerance_(tolerance),
      gridShift_(-CornerShift(*grid_, form)),
      sourceShift_(CornerShift(*source_, form)),
      affine_(FindAffineLink(*grid_, *source_)) {
  source_->SetDimensions(samples, lines);
}

void WarpMap::Cut(const SubRectProj& rect, std::vector<WarpPiece>& pieces) const {
  if (affine_) {
    WarpPiece piece{rect, WarpPiece::Way::kFit, PolynomialOf(*affine_)};
    piece.footprint = {std::hypot(affine_->xx, affine_->xy), std::hypot(affine_->yx, affine_->yy)};
    pieces.push_back(piece);
    return;
  }
  for (std::int32_t y = SquareOf(rect.top); y <= SquareOf(rect.bottom); ++y) {
    for (std::int32_t x = SquareOf(rect.left); x <= SquareOf(rect.right); ++x) {
      CutSquare({x * kSide, y * kSide, kSide}, rect, pieces);
    }
  }
}

void WarpMap::CutSquare(const Square& square, const SubRectProj& rect,
                        std::vector<WarpPiece>& pieces) const {
  const SubRectProj whole(square.left, square.top, square.left + (square.side - 1),
                          square.top + (square.side - 1));
  WarpPiece piece;
  if (!Intersect(whole, rect, piece.rect)) return;
  const Node node = NodeOf(square);
  if (node.kind == Node::Kind::kSplit) {
    const std::int32_t half = square.side / 2;
    for (const std::int32_t y : {0, half}) {
      for (const std::int32_t x : {0, half}) {
        CutSquare({square.left + x, square.top + y, half}, rect, pieces);
      }
    }
    return;
  }
  piece.footprint = node.footprint;
  if (node.kind == Node::Kind::kTransform) piece.way = WarpPiece::Way::kTransform;
  if (node.kind == Node::Kind::kFit) {
    piece.way = WarpPiece::Way::kFit;
    piece.fit = node.fit;
    piece.originX = square.left;
    piece.originY = square.top;
  }
  pieces.push_back(piece);
}

/// The node of a square, computed when it isn't at hand.
WarpMap::Node WarpMap::NodeOf(const Square& square) const {
  constexpr std::size_t kMostNodes = 16384;
  const auto word = [](std::int32_t at) { return static_cast<std::uint32_t>(at / kLeastSide); };
  // The sides 32 to 256 are the lowest four bits of a number of 28.
  const std::uint64_t key = (std::uint64_t{word(square.left)} << 36) ^
                            (std::uint64_t{word(square.top) & 0xFFFFFFFU} << 8) ^
                            static_cast<std::uint64_t>(square.side / kLeastSide);
  {
    const std::lock_guard lock(lock_);
    if (const auto found = nodes_.find(key); found != nodes_.end()) return found->second;
  }
  const Node node = MakeNode(square);
  const std::lock_guard lock(lock_);
  if (nodes_.size() >= kMostNodes) nodes_.clear();
  nodes_.emplace(key, node);
  return node;
}

WarpMap::Node WarpMap::MakeNode(const Square& square) const {
  const bool isWhole = square.side <= kLeastSide || tolerance_ <= 0;
  Node node;
  node.kind = isWhole ? Node::Kind::kTransform : Node::Kind::kSplit;
  SubRectProj rect(square.left, square.top, square.left + (square.side - 1),
                   square.top + (square.side - 1));
  // Beyond the grid there may be places that can't be carried.
  const auto last = [](unsigned size) {
    return static_cast<std::int32_t>(std::min(size, 0x7FFFFFFFU)) - 1;
  };
  Intersect(rect, SubRectProj(0, 0, last(grid_->Samples()), last(grid_->Lines())), rect);
  if (measuresFootprints_ && isWhole) node.footprint = FootprintOf(rect);
  const std::vector<double> places = NetOf(rect);
  std::vector<double> points = places;
  if (!CarryNet(rect, points)) return node;
  if (!MayTouch(points)) {
    node.kind = Node::Kind::kOutside;
    return node;
  }
  if (tolerance_ <= 0) return node;
  double worstU = 0, worstV = 0;
  node.fit.u = FitSide(places, points, 0, worstU);
  node.fit.v = FitSide(places, points, 1, worstV);
  node.fit.worst = std::max(worstU, worstV);
  if (node.fit.worst > tolerance_) return node;
  node.kind = Node::Kind::kFit;
  if (measuresFootprints_ && !isWhole) node.footprint = FootprintOf(rect);
  return node;
}

/// The medians of the steps in the source that go with steps of a pixel, at nine places of a
/// rectangle: an edge between some of them, where the source begins anew, doesn't count.
WarpFootprint WarpMap::FootprintOf(const SubRectProj& rect) const {
  constexpr unsigned kPlaces = 3, kEnds = 4;
  std::vector<double> points;
  points.reserve(2 * kPlaces * kPlaces * kEnds);
  const auto add = [&](double x, double y) {
    points.push_back(x);
    points.push_back(y);
  };
  for (unsigned j = 0; j < kPlaces; ++j) {
    for (unsigned i = 0; i < kPlaces; ++i) {
      const double x = (i + 0.5) * double(rect.Width()) / kPlaces;
      const double y = (j + 0.5) * double(rect.Height()) / kPlaces;
      add(x - 0.5, y);
      add(x + 0.5, y);
      add(x, y - 0.5);
      add(x, y + 0.5);
    }
  }
  CarryNet(rect, points);
  std::array<std::vector<double>, 4> steps;  // of x and y of the source along x, then along y
  for (std::size_t i = 0; i < points.size(); i += 4) {
    for (const std::size_t side : {0U, 1U}) {
      const double step = std::abs(points[i + 2 + side] - points[i + side]);
      if (std::isfinite(step)) steps[(i / 4 % 2) * 2 + side].push_back(step);
    }
  }
  const auto median = [](std::vector<double>& of) {
    if (of.empty()) return 0.0;
    const auto middle = of.begin() + static_cast<std::ptrdiff_t>(of.size() / 2);
    std::nth_element(of.begin(), middle, of.end());
    return *middle;
  };
  const double width = std::hypot(median(steps[0]), median(steps[2]));
  const double height = std::hypot(median(steps[1]), median(steps[3]));
  return {width > 0 ? width : 1.0, height > 0 ? height : 1.0};
}

/// Carries places in a rectangle of the grid to the source. False unless all can be carried.
bool WarpMap::CarryNet(const SubRectProj& rect, std::vector<double>& points) const {
  for (std::size_t i = 0; i < points.size(); i += 2) {
    points[i] += rect.left + gridShift_;
    points[i + 1] += rect.top + gridShift_;
  }
  Array<double> wrapped(points.data(), ArrayDims(static_cast<unsigned>(points.size() / 2), 2));
  CarryPixels(*grid_, *source_, wrapped);
  bool isWhole = true;
  for (double& value : points) {
    value += sourceShift_;
    isWhole = isWhole && std::isfinite(value);
  }
  return isWhole;
}

/// False when what the net spans, and as much again on each side of it, lies outside the source.
bool WarpMap::MayTouch(const std::vector<double>& points) const {
  for (const unsigned side : {0U, 1U}) {
    double low = HUGE_VAL, high = -HUGE_VAL;
    for (std::size_t i = side; i < points.size(); i += 2) {
      low = std::min(low, points[i]);
      high = std::max(high, points[i]);
    }
    const double size = side == 0 ? source_->Samples() : source_->Lines();
    const double more = high - low + 1;
    if (high + more < 0 || low - more > size) return false;
  }
  return true;
}

void WarpMap::Transform(const SubRectProj& rect, double* positions) const {
  const auto count = static_cast<unsigned>(rect.Width() * rect.Height());
  double* at = positions;
  for (std::int64_t y = rect.top; y <= rect.bottom; ++y) {
    for (std::int64_t x = rect.left; x <= rect.right; ++x) {
      *at++ = static_cast<double>(x) + kCentre + gridShift_;
      *at++ = static_cast<double>(y) + kCentre + gridShift_;
    }
  }
  Array<double> points(positions, ArrayDims(count, 2));
  CarryPixels(*grid_, *source_, points);
  if (sourceShift_ == 0) return;
  for (at = positions; at != positions + 2 * std::size_t{count}; ++at) *at += sourceShift_;
}

void WarpBounds::AddFit(const WarpPiece& piece) {
  double minX = HUGE_VAL, minY = HUGE_VAL, maxX = -HUGE_VAL, maxY = -HUGE_VAL;
  for (const std::int32_t column : {piece.rect.left, piece.rect.right}) {
    for (const std::int32_t line : {piece.rect.top, piece.rect.bottom}) {
      const double x = double(column) - piece.originX + kCentre;
      const double y = double(line) - piece.originY + kCentre;
      const auto& [u, v, worst] = piece.fit;
      const double atX = u[0] + u[1] * y + u[2] * x + u[3] * x * y;
      const double atY = v[0] + v[1] * y + v[2] * x + v[3] * x * y;
      minX = std::min(minX, atX);
      maxX = std::max(maxX, atX);
      minY = std::min(minY, atY);
      maxY = std::max(maxY, atY);
    }
  }
  AddBox(minX, minY, maxX, maxY);
}

void WarpBounds::AddPositions(const double* positions, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    AddBox(positions[2 * i], positions[2 * i + 1], positions[2 * i], positions[2 * i + 1]);
  }
}

/// A box counts where it lies in the source, or as near as what is snapped to its edge.
void WarpBounds::AddBox(double minX, double minY, double maxX, double maxY) {
  constexpr double kNear = 0.01;
  if (!(maxX >= -kNear && minX <= width_ + kNear && maxY >= -kNear && minY <= height_ + kNear)) {
    return;
  }
  minX_ = std::min(minX_, std::max(minX, 0.0));
  maxX_ = std::max(maxX_, std::min(maxX, width_));
  minY_ = std::min(minY_, std::max(minY, 0.0));
  maxY_ = std::max(maxY_, std::min(maxY, height_));
}

SubRectProj WarpBounds::Pixels(std::int32_t margin) const {
  const auto inside = [](double value, double size) {
    return static_cast<std::int32_t>(std::clamp(value, 0.0, size - 1));
  };
  return SubRectProj(
      inside(std::floor(minX_) - margin, width_), inside(std::floor(minY_) - margin, height_),
      inside(std::floor(maxX_) + margin, width_), inside(std::floor(maxY_) + margin, height_));
}

}  // namespace lumo
