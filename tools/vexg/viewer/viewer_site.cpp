#include "viewer/viewer_site.h"

#include <charconv>
#include <cmath>
#include <limits>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "foundation/thrown.h"
#include "verb.h"
#include "viewer/band_histograms.h"
#include "viewer/region_statistics.h"

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

double CostOf(const http::Request& request) {
  const std::string text = request.Query("cost");
  if (text.empty()) return 0;
  double value = 0;
  const char* const end = text.data() + text.size();
  const auto [next, fault] = std::from_chars(text.data(), end, value);
  if (fault != std::errc() || next != end || !std::isfinite(value)) throw NotThere();
  return value;
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
    return AsAnswer(scene_.GetShapes(NumberOf(parts[3], scene_.ShapesCount())));
  }
  const std::size_t number = NumberOf(parts[3], scene_.RasterCount());
  if (what == "tile" && !isPost) return GiveTile(parts, request);
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

/// /api/tile/NUMBER/LEVEL/COLUMN/ROW?bands=B,B..., with edge=1 one pixel more to the right and
/// below, by which the page finds the borders between segments.
http::Answer ViewerSite::GiveTile(const std::vector<std::string>& parts,
                                  const http::Request& request) {
  if (parts.size() != 7) throw NotThere();
  const std::shared_ptr<const ViewedRaster> raster =
      scene_.GetRaster(NumberOf(parts[3], scene_.RasterCount()), CostOf(request));
  const unsigned level = WholeOf(parts[4]), column = WholeOf(parts[5]), row = WholeOf(parts[6]);
  constexpr unsigned kMostTiles = std::numeric_limits<unsigned>::max() / kTileSide - 1;
  if (level >= raster->LevelCount() || column > kMostTiles || row > kMostTiles) throw NotThere();
  const unsigned last = kTileSide - (request.Query("edge") == "1" ? 0 : 1);
  const unsigned left = column * kTileSide, top = row * kTileSide;
  const std::optional<ViewedTile> tile = raster->ReadTile(
      level, {left, top, left + last, top + last}, BandsOf(request.Query("bands"), *raster));
  if (!tile) throw NotThere();
  return {200,
          "application/octet-stream",
          tile->bytes,
          {{"X-Vexg-Size", fmt::format("{} {}", tile->width, tile->height)}}};
}

Json ViewerSite::GiveRegion(std::size_t number, const std::string& body) {
  const std::shared_ptr<const ViewedRaster> raster = scene_.GetRaster(number);
  const Json geoJson = RegionAsGeoJson(*raster, RingOf(body));
  Json told = RegionStatistics(*raster, geoJson, scene_.GetFolder());
  told["geoJson"] = geoJson;
  return told;
}

}  // namespace lumo::host
