#include "warp/reprojection_geometry.h"

#include <cmath>
#include <limits>
#include <vector>

#include "georef/affine_link.h"
#include "georef/coordsys_log.h"

namespace lumo {
namespace {

/// Smallest and largest coordinates of points; of points that can't be carried nothing is known.
struct Bounds {
  double minX = HUGE_VAL, minY = HUGE_VAL, maxX = -HUGE_VAL, maxY = -HUGE_VAL;
  bool isWhole = true;

  explicit Bounds(const Array<double>& points) { Add(points); }
  void Add(const Array<double>& points) {
    for (unsigned i = 0; i + 1 < points.GetCount(); i += 2) {
      const double x = points[i], y = points[i + 1];
      if (!std::isfinite(x) || !std::isfinite(y)) {
        isWhole = false;
        continue;
      }
      minX = std::min(minX, x);
      maxX = std::max(maxX, x);
      minY = std::min(minY, y);
      maxY = std::max(maxY, y);
    }
  }
  bool IsEmpty() const { return minX > maxX; }
};

/// Points as they are gathered: x and y next to one another.
class PointList {
 public:
  void Add(double x, double y) {
    values_.push_back(x);
    values_.push_back(y);
  }
  Array<double> Take() const {
    Array<double> points{ArrayDims(static_cast<unsigned>(values_.size() / 2), 2)};
    std::copy(values_.begin(), values_.end(), points.begin());
    return points;
  }

 private:
  std::vector<double> values_;
};

/// Points on the edges and the diagonals of a raster, about ten along its shorter side.
Array<double> RasterPoints(unsigned samples, unsigned lines) {
  const double x = std::max(samples / 10.0, lines / 10.0);
  const double n = std::floor(x);
  const double dx = samples / x, dy = lines / x;
  const double right = samples - 1.0, bottom = lines - 1.0;
  PointList points;
  for (double i = 0; i < n; ++i) {
    points.Add(i * dx, 0);
    points.Add(i * dx, bottom);
    points.Add(0, i * dy);
    points.Add(right, i * dy);
    points.Add(i * dx, i * dy);
    points.Add((n - 1 - i) * dx, i * dy);
  }
  points.Add(0, 0);
  points.Add(right, 0);
  points.Add(0, bottom);
  points.Add(right, bottom);
  return points.Take();
}

/// (3 n + 3) x 2 points on the border and the diagonals of a rectangle, all four edges reached.
Array<double> RectPoints(const SubRectProj& rect) {
  const auto width = static_cast<double>(rect.Width());
  const auto height = static_cast<double>(rect.Height());
  const double x = std::max(height / 10.0, width / 10.0);
  const double n = std::max(1.0, std::floor(x));
  PointList points;
  for (double i = 0; i <= n; ++i) {
    const double alongX = rect.left + width * i / n, alongY = rect.top + height * i / n;
    points.Add(alongX, rect.top);
    points.Add(alongX, rect.top + height);
    points.Add(rect.left, alongY);
    points.Add(rect.left + width, alongY);
    points.Add(alongX, alongY);
    points.Add(rect.left + width - width * i / n, alongY);
  }
  return points.Take();
}

/// The corners of all pixels of a rectangle.
Array<double> PixelPoints(const SubRectProj& rect) {
  PointList points;
  for (std::int64_t y = 0; y <= rect.Height(); ++y) {
    for (std::int64_t x = 0; x <= rect.Width(); ++x) {
      points.Add(rect.left + static_cast<double>(x), rect.top + static_cast<double>(y));
    }
  }
  return points.Take();
}

/// Points along each side of a net over a rectangle.
constexpr unsigned kNet = 11;

/// A net over a rectangle, line by line: what the edges and diagonals leave out.
Array<double> NetPoints(const SubRectProj& rect) {
  PointList points;
  for (unsigned j = 0; j < kNet; ++j) {
    for (unsigned i = 0; i < kNet; ++i) {
      points.Add(rect.left + rect.Width() * (double(i) / (kNet - 1)),
                 rect.top + rect.Height() * (double(j) / (kNet - 1)));
    }
  }
  return points.Take();
}

/// True when two neighbours of a carried net lie more than half of the second raster apart: its
/// left and right edges meet between them, as those of a global raster do at the date line.
bool GoesRound(const Array<double>& net, unsigned samples) {
  const auto isFar = [&](unsigned a, unsigned b) {
    return std::isfinite(net[2 * a]) && std::isfinite(net[2 * b]) &&
           std::abs(net[2 * a] - net[2 * b]) > samples / 2.0;
  };
  for (unsigned j = 0; j < kNet; ++j) {
    for (unsigned i = 0; i < kNet; ++i) {
      const unsigned at = j * kNet + i;
      if (i + 1 < kNet && isFar(at, at + 1)) return true;
      if (j + 1 < kNet && isFar(at, at + kNet)) return true;
    }
  }
  return false;
}

/// Where the second raster has the poles that lie in a rectangle of the base grid, on every
/// meridian.
Array<double> PolePoints(const GeoRef& base, const SubRectProj& rect, const GeoRef& second) {
  PointList points;
  if (base.CoordinateSystem().Type() != 2 || second.CoordinateSystem().Type() == 0) return {};
  for (const double latitude : {-90.0, 90.0}) {
    PointList pole;
    pole.Add(0, latitude);
    Array<double> inBase = pole.Take();
    base.CoordinateSystem().Project(inBase);
    InvertPixelToMap(base, inBase);
    const double x = inBase[0], y = inBase[1];
    const bool isInside = x >= rect.left && x <= rect.left + rect.Width() && y >= rect.top &&
                          y <= rect.top + rect.Height();
    constexpr double kStep = 15;
    for (double longitude = -180; isInside && longitude <= 180; longitude += kStep) {
      points.Add(longitude, latitude);
    }
  }
  Array<double> meridians = points.Take();
  if (meridians.GetCount() == 0) return meridians;
  second.CoordinateSystem().Project(meridians);
  InvertPixelToMap(second, meridians);
  return meridians;
}

/// A rounded coordinate inside 0 to size - 1.
std::int32_t Inside(double value, unsigned size) {
  return static_cast<std::int32_t>(std::clamp(value, 0.0, size - 1.0));
}

constexpr unsigned kTerms = 4;
using Normal = std::array<std::array<double, kTerms + 2>, kTerms>;

/// Solves the normal equations for both right sides by elimination with row pivots. False where
/// they are singular.
bool Solve(Normal& m) {
  for (unsigned column = 0; column < kTerms; ++column) {
    unsigned pivot = column;
    for (unsigned row = column + 1; row < kTerms; ++row) {
      if (std::abs(m[row][column]) > std::abs(m[pivot][column])) pivot = row;
    }
    constexpr double kTiny = 1e-12;
    double largest = 0;
    for (unsigned k = 0; k < kTerms; ++k) largest = std::max(largest, std::abs(m[pivot][k]));
    if (!(std::abs(m[pivot][column]) > kTiny * largest)) return false;
    std::swap(m[pivot], m[column]);
    for (unsigned row = 0; row < kTerms; ++row) {
      if (row == column) continue;
      const double factor = m[row][column] / m[column][column];
      for (unsigned k = column; k < kTerms + 2; ++k) m[row][k] -= factor * m[column][k];
    }
  }
  return true;
}

/// The points of the fit in the source: at least ten by ten, the last on the last column and line.
Array<double> BaseGrid(const SubRectProj& rect, double centre) {
  constexpr double kSpacing = 100.0;
  const auto width = static_cast<double>(rect.Width());
  const auto height = static_cast<double>(rect.Height());
  const double nx = std::max(10.0, std::floor(width / kSpacing));
  const double ny = std::max(10.0, std::floor(height / kSpacing));
  PointList points;
  for (double j = 0; j < ny; ++j) {
    const double y = j * kSpacing * (height - 1) / ((ny - 1) * kSpacing);
    for (double i = 0; i < nx; ++i) {
      const double x = i * kSpacing * (width - 1) / ((nx - 1) * kSpacing);
      points.Add(rect.left + x + centre, rect.top + y + centre);
    }
  }
  return points.Take();
}

/// The largest difference between a fit and its points inside the rectangle.
double WorstOf(const WarpPolynomial& fit, const SubRectProj& rect, const Array<double>& inGrid,
               const Array<double>& inSource) {
  double worst = 0;
  for (unsigned i = 0; i + 1 < inGrid.GetCount(); i += 2) {
    const double x = inGrid[i] - rect.left, y = inGrid[i + 1] - rect.top;
    if (x < 0 || x > rect.Width() || y < 0 || y > rect.Height()) continue;
    const auto at = [&](const std::array<double, 4>& k) {
      return k[0] + k[1] * y + k[2] * x + k[3] * x * y;
    };
    worst =
        std::max({worst, std::abs(at(fit.u) - inSource[i]), std::abs(at(fit.v) - inSource[i + 1])});
  }
  return worst;
}

}  // namespace

std::span<const EnumWord<ReprojectionMethod>> WordsOf(ReprojectionMethod) {
  using enum ReprojectionMethod;
  static constexpr EnumWord<ReprojectionMethod> kWords[] = {
      {"Polynomial", kPolynomial}, {"Triangulation", kTriangulation}, {"Rigorous", kRigorous}};
  return kWords;
}

bool ComputeOutputGrid(const GeoRef& target, const GeoRef& source, unsigned samples, unsigned lines,
                       OutputGrid& grid) {
  if (samples == 0 || lines == 0) return false;
  Array<double> points = RasterPoints(samples, lines);
  source.PixelToPixel(points, target);
  const Bounds bounds(points);
  if (bounds.IsEmpty() || target.PixelSizeX() == 0 || target.PixelSizeY() == 0) return false;
  grid.pixelSizeX = source.PixelSizeX();
  grid.pixelSizeY = source.PixelSizeY();
  const CoordSysInfo& from = *source.CoordinateSystem().Info();
  const CoordSysInfo& to = *target.CoordinateSystem().Info();
  if (from.unitCode != to.unitCode) {
    CoordSys::ConvertUnits(source.PixelSizeX(), source.PixelSizeY(), from.unitCode, to.unitCode,
                           grid.pixelSizeX, grid.pixelSizeY, source.CenterLatitude());
  }
  const double width =
      std::ceil((bounds.maxX - bounds.minX) * target.PixelSizeX() / grid.pixelSizeX);
  const double height =
      std::ceil((bounds.maxY - bounds.minY) * target.PixelSizeY() / grid.pixelSizeY);
  constexpr double kMost = std::numeric_limits<std::int32_t>::max();
  if (!(width >= 1 && width <= kMost && height >= 1 && height <= kMost)) return false;
  grid.samples = static_cast<unsigned>(width);
  grid.lines = static_cast<unsigned>(height);
  return target.PixelToMap(bounds.minX, bounds.minY, grid.tieX, grid.tieY);
}

std::int32_t SamplingMargin(PyramidResamplingMethod resampling) {
  switch (resampling) {
    case PyramidResamplingMethod::kNearest:
      return 1;
    case PyramidResamplingMethod::kLinear:
      return 3;
    case PyramidResamplingMethod::kCubic:
      return 5;
    default:
      return 0;
  }
}

CoveredRect BaseSubRectToSecSubRect(const GeoRef& base, const SubRectProj& rect,
                                    const GeoRef& second, unsigned samples, unsigned lines,
                                    PyramidResamplingMethod resampling, bool everyPixel) {
  Array<double> points = everyPixel ? PixelPoints(rect) : RectPoints(rect);
  CarryPixels(base, second, points);
  Bounds bounds(points);
  if (!base.CoordinateSystem().IsEqual(second.CoordinateSystem())) {
    Array<double> net = NetPoints(rect);
    CarryPixels(base, second, net);
    bounds.Add(net);
    const bool isWhole = bounds.isWhole;
    if (GoesRound(net, samples)) {
      bounds.minX = std::min(bounds.minX, 0.0);
      bounds.maxX = std::max(bounds.maxX, double(samples));
    }
    bounds.Add(PolePoints(base, rect, second));
    bounds.isWhole = isWhole;
  }
  CoveredRect covered;
  covered.isPartial = !bounds.isWhole;
  const double lastX = bounds.maxX - 1, lastY = bounds.maxY - 1;
  covered.misses =
      bounds.IsEmpty() || lastX < 0 || bounds.minX > samples || lastY < 0 || bounds.minY > lines;
  if (covered.misses) {
    LogCoordSys(CoordSysLog::kReprojection,
                "Reprojection::BaseSubRectToSecSubRect: dMinX:%#12.12g, dMaxX:%#12.12g, "
                "dMinY:%#12.12g, dMaxY:%#12.12g, nSamples:%d, nLines:%d",
                bounds.minX, bounds.maxX, bounds.minY, bounds.maxY, static_cast<int>(samples),
                static_cast<int>(lines));
    return covered;
  }
  const double margin = SamplingMargin(resampling);
  covered.rect = SubRectProj(Inside(std::floor(bounds.minX) - margin, samples),
                             Inside(std::floor(bounds.minY) - margin, lines),
                             Inside(std::ceil(lastX) + margin, samples),
                             Inside(std::ceil(lastY) + margin, lines));
  return covered;
}

bool FitWarp(const GeoRef& grid, const SubRectProj& rect, const GeoRef& source,
             const SubRectProj& sourceRect, double centre, WarpPolynomial& fit) {
  const Array<double> inSource = BaseGrid(sourceRect, centre);
  Array<double> inGrid = inSource;
  if (!CarryPixels(source, grid, inGrid)) return false;
  // All sides run from 0 to about 1 in the equations, which keeps them well conditioned.
  const auto width = static_cast<double>(rect.Width());
  const auto height = static_cast<double>(rect.Height());
  Normal m{};
  for (unsigned i = 0; i + 1 < inGrid.GetCount(); i += 2) {
    const double x = (inGrid[i] - rect.left) / width;
    const double y = (inGrid[i + 1] - rect.top) / height;
    if (!std::isfinite(x) || !std::isfinite(y)) return false;
    const double row[kTerms + 2] = {
        1, y, x, x * y, inSource[i] - sourceRect.left, inSource[i + 1] - sourceRect.top};
    for (unsigned j = 0; j < kTerms; ++j) {
      for (unsigned k = 0; k < kTerms + 2; ++k) m[j][k] += row[j] * row[k];
    }
  }
  if (!Solve(m)) return false;
  constexpr double kNothing = 1e-9;
  const double scales[kTerms] = {1, height, width, width * height};
  const auto coefficient = [&](unsigned term, unsigned side) {
    const double value = m[term][kTerms + side] / m[term][term] / scales[term];
    return std::abs(value) < kNothing ? 0.0 : value;
  };
  for (unsigned term = 0; term < kTerms; ++term) {
    fit.u[term] = coefficient(term, 0);
    fit.v[term] = coefficient(term, 1);
  }
  fit.u[0] += sourceRect.left;
  fit.v[0] += sourceRect.top;
  fit.worst = WorstOf(fit, rect, inGrid, inSource);
  return true;
}

}  // namespace lumo
