#include "viewer/viewer_site.h"

#include <charconv>
#include <cmath>
#include <limits>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "foundation/thrown.h"
#include "verb.h"
#include "viewer/region_statistics.h"
#include "viewer/tile_picture.h"

namespace lumo::host {
namespace {

constexpr unsigned kTileSide = 256;
constexpr std::size_t kMostBands = 64;  // of a request
constexpr std::size_t kMostCorners = 10000;

/// A request that asks for what isn't there.
struct NotThere {};

std::vector<std::string> SplitAt(const std::string& text, char separator) {
  std::vector<std::string> parts;
  std::size_t at = 0;
  for (;;) {
    const std::size_t end = text.find(separator, at);
    parts.push_back(text.substr(at, end - at));
    if (end == text.npos) return parts;
    at = end + 1;
  }
}

unsigned WholeOf(const std::string& text) {
  unsigned value = 0;
  const char* const end = text.data() + text.size();
  const auto [next, fault] = std::from_chars(text.data(), end, value);
  if (fault != std::errc() || next != end) throw NotThere();
  return value;
}

double RealOf(const std::string& text) {
  double value = 0;
  const char* const end = text.data() + text.size();
  const auto [next, fault] = std::from_chars(text.data(), end, value);
  if (fault != std::errc() || next != end || !std::isfinite(value)) throw NotThere();
  return value;
}

/// The number of a query, or another one where it isn't asked.
double RealOr(const http::Request& request, const char* name, double otherwise) {
  const std::string text = request.Query(name);
  return text.empty() ? otherwise : RealOf(text);
}

double CostOf(const http::Request& request) {
  return RealOr(request, "cost", 0);
}

/// The part that "rect=LEFT,TOP,RIGHT,BOTTOM&step=STEP" names; none where it isn't asked.
std::optional<ShapeView> ViewOf(const http::Request& request) {
  const std::string rect = request.Query("rect");
  if (rect.empty()) return {};
  const std::vector<std::string> sides = SplitAt(rect, ',');
  if (sides.size() != 4) throw NotThere();
  const ShapeView view{RealOf(sides[0]), RealOf(sides[1]), RealOf(sides[2]), RealOf(sides[3]),
                       RealOr(request, "step", 1)};
  if (!(view.step > 0)) throw NotThere();
  return view;
}

TileStretch::Curve CurveOf(const std::string& word) {
  constexpr const char* kWords[] = {"linear", "sqrt", "gamma", "log"};
  if (word.empty()) return TileStretch::Curve::kLinear;
  for (int i = 0; i < 4; ++i) {
    if (word == kWords[i]) return static_cast<TileStretch::Curve>(i);
  }
  throw NotThere();
}

/// The ends "LOW,HIGH" of every band, or of all bands at once.
std::vector<std::pair<double, double>> EndsOf(const std::string& text, std::size_t bands) {
  const std::vector<std::string> parts = SplitAt(text, ',');
  std::vector<std::pair<double, double>> ends;
  for (std::size_t i = 0; i + 1 < parts.size(); i += 2) {
    ends.emplace_back(RealOf(parts[i]), RealOf(parts[i + 1]));
    if (!(ends.back().second > ends.back().first)) throw NotThere();
  }
  if (ends.size() == 1) ends.resize(bands, ends.front());
  if (parts.size() % 2 != 0 || ends.size() != bands) throw NotThere();
  return ends;
}

std::vector<std::uint32_t> BandsOf(const std::string& text, const ViewedRaster& raster) {
  std::vector<std::uint32_t> bands;
  for (const std::string& part : SplitAt(text, ',')) {
    bands.push_back(WholeOf(part));
    if (bands.back() >= raster.Bands() || bands.size() > kMostBands) throw NotThere();
  }
  return bands;
}

http::Answer AsAnswer(const Json& json, int status = 200) {
  return {status, "application/json", json.dump(-1, ' ', false, Json::error_handler_t::replace)};
}

/// Reads the corners of a polygon, and closes it.
PixelRing RingOf(const std::string& body) {
  const Json told = Json::parse(body, nullptr, false);
  if (!told.is_object() || !told.contains("ring") || !told["ring"].is_array()) throw NotThere();
  PixelRing ring;
  for (const Json& corner : told["ring"]) {
    const bool isPair = corner.is_array() && corner.size() == 2 && corner[0].is_number() &&
                        corner[1].is_number() && ring.size() < kMostCorners;
    if (!isPair) throw NotThere();
    ring.emplace_back(corner[0], corner[1]);
  }
  if (ring.size() < 3) throw NotThere();
  if (ring.front() != ring.back()) ring.push_back(ring.front());
  return ring;
}

}  // namespace

ViewerSite::ViewerSite(ViewedScene& scene)
    : scene_(scene), last_(std::chrono::steady_clock::now()) {}

double ViewerSite::GetSilence() const {
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - last_.load()).count();
}

std::vector<std::pair<std::string, std::string>> ViewerSite::GetHeaders() {
  return {{"Content-Security-Policy",
           "default-src 'self'; img-src 'self' data: blob:; style-src 'self'; object-src 'none'; "
           "base-uri 'none'; form-action 'none'; frame-ancestors 'none'"},
          {"X-Content-Type-Options", "nosniff"},
          {"X-Frame-Options", "DENY"},
          {"Referrer-Policy", "no-referrer"},
          {"Cross-Origin-Opener-Policy", "same-origin"},
          {"Cross-Origin-Resource-Policy", "same-origin"},
          {"Cache-Control", "no-store"}};
}

http::Answer ViewerSite::Answer(const http::Request& request) {
  try {
    return Route(request);
  } catch (const NotThere&) {
    return AsAnswer({{"fault", "there is nothing of this name"}}, 404);
  } catch (...) {
    return AsAnswer({{"fault", Printable(DescribeException())}}, 422);
  }
}

std::size_t ViewerSite::NumberOf(const std::string& text, std::size_t count) const {
  const unsigned number = WholeOf(text);
  if (number >= count) throw NotThere();
  return number;
}

http::Answer ViewerSite::Route(const http::Request& request) {
  const std::vector<std::string> parts = SplitAt(request.path, '/');
  if (parts.size() < 3 || parts[1] != "api") {
    const PageFiles::File* const file = page_.Find(request.path);
    if (file == nullptr) throw NotThere();
    return {200, file->type, file->text};
  }
  last_ = std::chrono::steady_clock::now();
  const std::string& what = parts[2];
  const bool isPost = request.method == "POST";
  if (parts.size() == 3 && !isPost) {
    if (what == "scene") return AsAnswer(scene_.Describe());
    if (what == "alive") {
      scene_.Check();
      return AsAnswer({{"alive", true}});
    }
    if (what == "pyramid") return AsAnswer(scene_.TellPyramid());
    if (what == "pixel") {
      return AsAnswer(scene_.ReadPixel(WholeOf(request.Query("x")), WholeOf(request.Query("y")),
                                       CostOf(request)));
    }
    throw NotThere();
  }
  if (parts.size() < 4) throw NotThere();
  if (what == "shapes" && !isPost) {
    return AsAnswer(
        scene_.GetShapes(NumberOf(parts[3], scene_.ShapesCount())).Give(ViewOf(request)));
  }
  const std::size_t number = NumberOf(parts[3], scene_.RasterCount());
  if (what == "tile" && !isPost) return GiveTile(parts, request);
  if (what == "picture" && !isPost) return GivePicture(parts, request);
  if (parts.size() != 4) throw NotThere();
  if (what == "region" && isPost) return AsAnswer(GiveRegion(number, request.body));
  if (what == "pyramid" && isPost) return AsAnswer(scene_.BuildPyramid(number));
  if (isPost) throw NotThere();
  if (what == "bands") {
    const std::shared_ptr<const ViewedRaster> raster = scene_.GetRaster(number);
    return AsAnswer(CountBands(*raster, BandsOf(request.Query("bands"), *raster)));
  }
  if (what == "scales") return AsAnswer(scene_.FindScales(number));
  if (what == "segment") {
    return AsAnswer(scene_.FindSegment(number, WholeOf(request.Query("x")),
                                       WholeOf(request.Query("y")), CostOf(request)));
  }
  throw NotThere();
}

/// Reads the tile /.../.../NUMBER/LEVEL/COLUMN/ROW?bands=B,B..., with edge=1 one pixel more to the
/// right and below, by which the page finds the borders between segments.
ViewedTile ViewerSite::ReadTile(const std::vector<std::string>& parts, const http::Request& request,
                                std::shared_ptr<const ViewedRaster>& raster) {
  if (parts.size() != 7) throw NotThere();
  raster = scene_.GetRaster(NumberOf(parts[3], scene_.RasterCount()), CostOf(request));
  const unsigned level = WholeOf(parts[4]), column = WholeOf(parts[5]), row = WholeOf(parts[6]);
  constexpr unsigned kMostTiles = std::numeric_limits<unsigned>::max() / kTileSide - 1;
  if (level >= raster->LevelCount() || column > kMostTiles || row > kMostTiles) throw NotThere();
  const unsigned last = kTileSide - (request.Query("edge") == "1" ? 0 : 1);
  const unsigned left = column * kTileSide, top = row * kTileSide;
  const std::optional<ViewedTile> tile = raster->ReadTile(
      level, {left, top, left + last, top + last}, BandsOf(request.Query("bands"), *raster));
  if (!tile) throw NotThere();
  return *tile;
}

http::Answer ViewerSite::GiveTile(const std::vector<std::string>& parts,
                                  const http::Request& request) {
  std::shared_ptr<const ViewedRaster> raster;
  const ViewedTile tile = ReadTile(parts, request, raster);
  return {200,
          "application/octet-stream",
          tile.bytes,
          {{"X-Vexg-Size", fmt::format("{} {}", tile.width, tile.height)}}};
}

/// A tile as a PNG: of one band, by its palette where it has one and no ends are asked for, or of
/// three.
http::Answer ViewerSite::GivePicture(const std::vector<std::string>& parts,
                                     const http::Request& request) {
  std::shared_ptr<const ViewedRaster> raster;
  const ViewedTile tile = ReadTile(parts, request, raster);
  const std::size_t number = NumberOf(parts[3], scene_.RasterCount());
  const std::vector<std::uint32_t> bands = BandsOf(request.Query("bands"), *raster);
  if (bands.size() != 1 && bands.size() != 3) throw NotThere();
  const Json legend = scene_.GetLegend(number);
  const std::string ends = request.Query("ends");
  if (!legend.is_null() && ends.empty() && bands == std::vector<std::uint32_t>{0}) {
    return {200, "image/png", DrawTile(tile, raster->Code(), legend)};
  }
  TileStretch stretch;
  stretch.curve = CurveOf(request.Query("curve"));
  stretch.gamma = RealOr(request, "gamma", stretch.gamma);
  const double cut = RealOr(request, "cut", 2);
  if (!(stretch.gamma > 0) || !(cut >= 0 && cut < 50)) throw NotThere();
  if (!ends.empty()) {
    stretch.ends = EndsOf(ends, bands.size());
  } else {
    for (const std::uint32_t band : bands) {
      stretch.ends.push_back(ends_.Find(*raster, number, band, cut));
    }
  }
  return {200, "image/png", DrawTile(tile, raster->Code(), stretch)};
}

Json ViewerSite::GiveRegion(std::size_t number, const std::string& body) {
  const std::shared_ptr<const ViewedRaster> raster = scene_.GetRaster(number);
  const Json geoJson = RegionAsGeoJson(*raster, RingOf(body));
  Json told = RegionStatistics(*raster, geoJson, scene_.GetFolder());
  told["geoJson"] = geoJson;
  return told;
}

}  // namespace lumo::host
