#include "orva/orva_georef.h"

#include <cmath>

#include "commands/value_text.h"
#include "georef/affine_link.h"
#include "georef/std_georef.h"
#include "orva/orva_header.h"

namespace lumo::orva {
namespace {

constexpr const char* kModel = "georeference";
constexpr const char* kCoordSys = "coordinate system string";
constexpr const char* kMapPoints = "map points";
constexpr const char* kGeoPoints = "geo points";

/// A pixel, and where it lies.
struct TiePoint {
  double sample, line;  // (0, 0) is the corner of the first pixel
  double x, y;          // easting and northing, or longitude and latitude
};
constexpr std::size_t kNumbersOfPoint = 4;

// In the header the corner of the first pixel is (1, 1), and y stands before x.

void WritePoints(const std::vector<TiePoint>& points, const char* name, HeaderText& text) {
  std::vector<std::string> items;
  for (const TiePoint& point : points) {
    for (const double number : {point.sample + 1, point.line + 1, point.y, point.x}) {
      if (!std::isfinite(number)) return;
      items.push_back(FormatValue(number).ToUTF8());
    }
  }
  text.SetList(name, items);
}

bool ReadPoints(const HeaderText::Entry& entry, std::vector<TiePoint>& points) {
  const std::vector<std::string> items = ItemsOf(entry);
  if (items.empty() || items.size() % kNumbersOfPoint != 0) return false;
  for (std::size_t i = 0; i < items.size(); i += kNumbersOfPoint) {
    double numbers[kNumbersOfPoint];
    for (std::size_t k = 0; k < kNumbersOfPoint; ++k) {
      if (!ParseNumber(items[i + k], numbers[k]) || !std::isfinite(numbers[k])) return false;
    }
    points.push_back({numbers[0] - 1, numbers[1] - 1, numbers[3], numbers[2]});
  }
  return true;
}

/// An affine map of pixels, x = x0 + xs * sample + xl * line and so on.
struct AffineFit {
  double xs = 0, xl = 0, ys = 0, yl = 0;
};

/// The affine map with the least squares of distances, about the mean of the points. Points on one
/// line, of which two are enough, define a grid that isn't turned, unless the line goes along it.
bool FitAffine(const std::vector<TiePoint>& points, const TiePoint& mean, AffineFit& fit) {
  double ss = 0, sl = 0, ll = 0, sx = 0, lx = 0, sy = 0, ly = 0;
  for (const TiePoint& point : points) {
    const double s = point.sample - mean.sample, l = point.line - mean.line;
    const double x = point.x - mean.x, y = point.y - mean.y;
    ss += s * s, sl += s * l, ll += l * l;
    sx += s * x, lx += l * x, sy += s * y, ly += l * y;
  }
  if (ss == 0 || ll == 0) return false;
  const double determinant = ss * ll - sl * sl;
  constexpr double kOnOneLine = 1e-9;  // of the determinant of points that fill a square
  if (determinant > kOnOneLine * ss * ll) {
    fit = {(sx * ll - lx * sl) / determinant, (lx * ss - sx * sl) / determinant,
           (sy * ll - ly * sl) / determinant, (ly * ss - sy * sl) / determinant};
  } else {
    fit = {sx / ss, 0, 0, ly / ll};
  }
  return true;
}

/// The grid through the points. Empty when there is none within half a pixel of all of them.
GeoRefPtr FitGrid(const std::vector<TiePoint>& points, const CoordSys& system) {
  TiePoint mean{};
  const double count = static_cast<double>(points.size());
  for (const TiePoint& point : points) {
    mean.sample += point.sample / count;
    mean.line += point.line / count;
    mean.x += point.x / count;
    mean.y += point.y / count;
  }
  AffineFit fit;
  if (!FitAffine(points, mean, fit)) return {};
  auto* const grid = new StdGeoRef;
  GeoRefPtr owner(grid);
  grid->SetCoordinateSystem(system);
  // The second axis is at right angles to the first, either way round.
  const double angle = std::atan2(fit.ys, fit.xs);
  grid->SetPixelSize(std::hypot(fit.xs, fit.ys),
                     fit.xl * std::sin(angle) - fit.yl * std::cos(angle));
  constexpr double kNotTurned = 1e-9;  // degrees
  const double turn = angle / StdGeoRef::kRadiansPerDegree;
  grid->SetRotation(std::abs(turn) < kNotTurned ? 0 : turn);
  grid->SetTiePixel(mean.sample, mean.line);
  grid->SetTieMap(mean.x, mean.y);

  constexpr double kTolerance = 0.5;  // pixels
  Array<double> places{ArrayDims(static_cast<unsigned>(points.size()), 2)};
  for (unsigned i = 0; i < points.size(); ++i) {
    places[2 * i] = points[i].x;
    places[2 * i + 1] = points[i].y;
  }
  if (!InvertPixelToMap(*grid, places)) return {};
  for (unsigned i = 0; i < points.size(); ++i) {
    const double off =
        std::hypot(places[2 * i] - points[i].sample, places[2 * i + 1] - points[i].line);
    if (!(off <= kTolerance)) return {};
  }
  return owner;
}

}  // namespace

void WriteGeoRef(const GeoRef& model, HeaderText& text) {
  std::ostringstream form = MakeTextWriter();
  form << model;
  text.SetText(kModel, form.str());
  const CoordSys& system = model.CoordinateSystem();
  if (!system.IsEmpty()) {
    String definition;
    system.ToString(definition);
    text.SetBracedText(kCoordSys, definition.ToUTF8());
  }
  if (model.GetType() == GeoRef::kRpc) return;
  const double samples = model.Samples(), lines = model.Lines();
  std::vector<TiePoint> corners = {
      {0, 0, 0, 0}, {samples, 0, 0, 0}, {samples, lines, 0, 0}, {0, lines, 0, 0}};
  for (TiePoint& corner : corners) {
    if (!model.PixelToMap(corner.sample, corner.line, corner.x, corner.y)) return;
  }
  WritePoints(corners, kMapPoints, text);
  if (system.Type() == 0) return;
  for (TiePoint& corner : corners) system.MapToGeo(corner.x, corner.y, corner.x, corner.y);
  WritePoints(corners, kGeoPoints, text);
}

bool ReadGeoRef(const HeaderText& text, GeoRefPtr& model, std::string& fault) {
  const auto fail = [&](const HeaderText::Entry& entry, const std::string& what) {
    fault = "line " + std::to_string(entry.line) + ": " + what;
    return false;
  };
  if (const HeaderText::Entry* const form = text.Find(kModel)) {
    model = ParseValue<GeoRefPtr>(String(TextOf(*form)));
    return !model.IsNull() || fail(*form, "no georeference in its text form");
  }
  const HeaderText::Entry* const map = text.Find(kMapPoints);
  const HeaderText::Entry* const entry = map != nullptr ? map : text.Find(kGeoPoints);
  if (entry == nullptr) return true;
  std::vector<TiePoint> points;
  if (!ReadPoints(*entry, points)) return fail(*entry, "not four numbers for each point");
  // Without the projection plug-in the system stays empty, as everywhere.
  CoordSys system;
  if (map == nullptr) {
    system.SetGeographic();
  } else if (const HeaderText::Entry* const definition = text.Find(kCoordSys)) {
    system.SetFromString(String(TextOf(*definition)));
  }
  model = FitGrid(points, system);
  return !model.IsNull() || fail(*entry, "the points do not lie in a grid of pixels");
}

}  // namespace lumo::orva
