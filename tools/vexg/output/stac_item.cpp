#include "output/stac_item.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <ctime>
#include <filesystem>
#include <map>
#include <optional>
#include <regex>

#include <fmt/chrono.h>
#include <fmt/format.h>

#include "georef/coordsys.h"
#include "raster/pixel_types.h"

namespace lumo::host {
namespace {

constexpr const char* kExtensions = "https://stac-extensions.github.io/";

std::map<std::string, std::string> SplitDetails(const RasterContents& contents) {
  std::map<std::string, std::string> split;
  for (const std::string& detail : contents.details) {
    const std::size_t equals = detail.find('=');
    if (equals != detail.npos) split[detail.substr(0, equals)] = detail.substr(equals + 1);
  }
  return split;
}

/// The word of the raster extension for a pixel type.
const char* TypeWordOf(unsigned dataType) {
  static constexpr std::pair<const char*, const char*> kWords[] = {{"Byte", "uint8"},
                                                                   {"Char", "int8"},
                                                                   {"UInt16", "uint16"},
                                                                   {"Int16", "int16"},
                                                                   {"UInt32", "uint32"},
                                                                   {"Int32", "int32"},
                                                                   {"UInt64", "uint64"},
                                                                   {"Int64", "int64"},
                                                                   {"Single", "float32"},
                                                                   {"Double", "float64"},
                                                                   {"ComplexSingle", "cfloat32"},
                                                                   {"ComplexDouble", "cfloat64"}};
  for (const auto& [name, word] : kWords) {
    if (DataTypeName(dataType) == String(name)) return word;
  }
  return "other";
}

std::string TextOf(std::time_t time) {
  return fmt::format("{:%Y-%m-%dT%H:%M:%SZ}", fmt::gmtime(time));
}

/// A time as the item has it; nothing for a text that is none.
std::optional<std::string> TimeOf(const std::string& text) {
  static const std::regex kForm(R"((\d{4})[:-](\d\d)[:-](\d\d)[ T](\d\d):(\d\d):(\d\d)(\.\d+)?Z?)");
  std::smatch part;
  if (!std::regex_match(text, part, kForm)) return std::nullopt;
  const auto number = [&](std::size_t i) { return std::stoi(part[i]); };
  const bool isTime = number(2) >= 1 && number(2) <= 12 && number(3) >= 1 && number(3) <= 31 &&
                      number(4) < 24 && number(5) < 60 && number(6) <= 60;
  if (!isTime) return std::nullopt;
  return fmt::format("{}-{}-{}T{}:{}:{}Z", part[1].str(), part[2].str(), part[3].str(),
                     part[4].str(), part[5].str(), part[6].str());
}

Json NumbersAsJson(const std::vector<double>& numbers) {
  Json list = Json::array();
  for (const double number : numbers) list.push_back(NumberAsJson(number));
  return list;
}

/// The number of a system in the registry EPSG, that stands at the end of its text.
std::optional<int> EpsgOf(const CoordSys& system) {
  static const std::regex kForm(
      R"re((?:^EPSG:(\d+)$|(?:ID|AUTHORITY)\["EPSG",\s*"?(\d+)"?\]\]\s*$))re", std::regex::icase);
  String text("");
  system.ToString(text);
  const std::string wkt = text.ToUTF8();
  std::smatch part;
  if (!std::regex_search(wkt, part, kForm)) return std::nullopt;
  return std::stoi(part[1].matched ? part[1] : part[2]);
}

/// Points on the border of the raster, from the upper left corner against the clock, in pixels.
std::vector<std::pair<double, double>> BorderOf(const RasterInfo& info) {
  constexpr int kSteps = 8;  // of a side
  const double first = info.geoRef->GetType() == GeoRef::kRpc ? -0.5 : 0.0;
  const double corners[5][2] = {{0, 0}, {0, 1}, {1, 1}, {1, 0}, {0, 0}};
  std::vector<std::pair<double, double>> border;
  for (int side = 0; side < 4; ++side) {
    for (int step = 0; step < kSteps; ++step) {
      const double at = 1.0 * step / kSteps;
      const auto along = [&](int axis) {
        return corners[side][axis] + (corners[side + 1][axis] - corners[side][axis]) * at;
      };
      border.emplace_back(first + along(0) * info.samples, first + along(1) * info.lines);
    }
  }
  border.push_back(border.front());
  return border;
}

/// Adds where the raster lies, in degrees of WGS 84.
void AddGeometry(const RasterInfo& info, Json& item) {
  item["geometry"] = nullptr;
  if (!info.geoRef || info.geoRef->CoordinateSystem().Type() == 0) return;
  CoordSys geographic;
  if (!geographic.SetGeographic()) return;
  const auto border = BorderOf(info);
  Array<double> points(ArrayDims(static_cast<unsigned>(border.size()), 2));
  for (unsigned i = 0; i < border.size(); ++i) {
    double x = NAN, y = NAN;
    if (!info.geoRef->PixelToMap(border[i].first, border[i].second, x, y)) return;
    points[2 * i] = x;
    points[2 * i + 1] = y;
  }
  const CoordSys& system = info.geoRef->CoordinateSystem();
  system.Unproject(points);
  system.GeoTransform(geographic, points, {});
  Json ring = Json::array();
  double west = 180, south = 90, east = -180, north = -90;
  for (unsigned i = 0; i < border.size(); ++i) {
    const double longitude = points[2 * i], latitude = points[2 * i + 1];
    if (!std::isfinite(longitude) || !std::isfinite(latitude)) return;
    const bool crosses =
        std::abs(longitude) > 180 || (i > 0 && std::abs(longitude - points[2 * i - 2]) > 180);
    if (crosses) return;  // a polygon across the 180th meridian would enclose the rest of the Earth
    ring.push_back(NumbersAsJson({longitude, latitude}));
    west = std::min(west, longitude), east = std::max(east, longitude);
    south = std::min(south, latitude), north = std::max(north, latitude);
  }
  item["geometry"] = {{"type", "Polygon"}, {"coordinates", Json::array({ring})}};
  item["bbox"] = NumbersAsJson({west, south, east, north});
}

void AddProjection(const RasterInfo& info, Json& properties) {
  properties["proj:epsg"] = nullptr;
  properties["proj:shape"] = {info.lines, info.samples};
  if (!info.geoRef || info.geoRef->GetType() == GeoRef::kRpc) return;
  const CoordSys& system = info.geoRef->CoordinateSystem();
  if (const auto epsg = EpsgOf(system)) properties["proj:epsg"] = *epsg;
  double x = 0, y = 0, right[2] = {}, below[2] = {};
  if (!info.geoRef->PixelToMap(0, 0, x, y) ||
      !info.geoRef->PixelToMap(info.samples, 0, right[0], right[1]) ||
      !info.geoRef->PixelToMap(0, info.lines, below[0], below[1])) {
    return;
  }
  const double samples = info.samples, lines = info.lines;
  properties["proj:transform"] =
      NumbersAsJson({(right[0] - x) / samples, (below[0] - x) / lines, x, (right[1] - y) / samples,
                     (below[1] - y) / lines, y});
}

/// The classes of a band that has names of its values.
Json ClassesOf(const std::vector<std::string>& names, Palette palette) {
  Json classes = Json::array();
  for (unsigned value = 0; value < names.size(); ++value) {
    if (names[value].empty()) continue;
    Json entry{{"value", value}, {"description", names[value]}};
    if (value < palette.GetCount()) {
      const ColorPtr color = palette.At(value);
      entry["color_hint"] = fmt::format("{:02X}{:02X}{:02X}", color->r, color->g, color->b);
    }
    classes.push_back(entry);
  }
  return classes;
}

/// The no-data value of a band, as the raster extension writes it.
Json NoDataOfBand(const RasterInfo& info, unsigned band) {
  Json value;
  if (!info.hasNoData[band]) return value;
  DispatchType(TenTypes{}, info.dataType, [&]<typename T>() {
    const auto values = ParseValue<Array<T>>(info.noData);
    if (band >= values.GetCount()) return true;
    if constexpr (std::is_floating_point_v<T>) {
      const T number = values[band];
      if (std::isnan(number)) value = "nan";
      if (std::isinf(number)) value = number > 0 ? "inf" : "-inf";
      if (std::isfinite(number)) value = static_cast<double>(number);
    } else {
      value = values[band];
    }
    return true;
  });
  return value;
}

/// The mean of a pixel's width and height in metres, of one in degrees at the middle of the raster;
/// nothing where the size of a pixel isn't known.
std::optional<double> ResolutionOf(const RasterInfo& info) {
  if (!info.geoRef || info.geoRef->GetType() == GeoRef::kRpc) return std::nullopt;
  const CoordSys& system = info.geoRef->CoordinateSystem();
  const double factor = system.Info()->unitFactor;
  double width = std::abs(info.geoRef->PixelSizeX()) * factor;
  double height = std::abs(info.geoRef->PixelSizeY()) * factor;
  if (system.Type() == 1) {
    constexpr std::int32_t kMetre = 9001, kDegree = 9102;
    double x = 0, y = 0;
    if (!info.geoRef->PixelToMap(info.samples / 2.0, info.lines / 2.0, x, y)) return std::nullopt;
    CoordSys::ConvertUnits(width, height, kDegree, kMetre, width, height, y * factor);
  }
  const double mean = (width + height) / 2;
  const bool isKnown = system.Type() != 0 && std::isfinite(mean) && mean > 0;
  return isKnown ? std::optional(mean) : std::nullopt;
}

Json BandOf(const StacRaster& raster, const std::map<std::string, std::string>& details,
            unsigned band) {
  const RasterInfo& info = raster.contents.info;
  const auto detail = [&](const char* name) {
    const auto found = details.find(fmt::format("Bands/{}/{}", band, name));
    return found != details.end() ? found->second : std::string();
  };
  Json entry{{"data_type", TypeWordOf(info.dataType)}};
  if (!detail("Description").empty()) entry["name"] = detail("Description");
  const Json noData = NoDataOfBand(info, band);
  if (!noData.is_null()) entry["nodata"] = noData;
  if (!detail("Unit").empty()) entry["unit"] = detail("Unit");
  if (!detail("Scale").empty()) entry["scale"] = std::stod(detail("Scale"));
  if (!detail("Offset").empty()) entry["offset"] = std::stod(detail("Offset"));
  if (const auto metres = ResolutionOf(info)) entry["spatial_resolution"] = *metres;
  const Json classes = ClassesOf(raster.categories[band], raster.palettes[band]);
  if (!classes.empty()) entry["classification:classes"] = classes;
  return entry;
}

std::string MediaTypeOf(const StacRaster& raster) {
  static const std::pair<const char*, const char*> kTypes[] = {{"JPEG", "image/jpeg"},
                                                               {"PNG", "image/png"},
                                                               {"JPEG2000", "image/jp2"},
                                                               {"GIF", "image/gif"},
                                                               {"BMP", "image/bmp"}};
  const std::string format = raster.contents.info.format.ToUTF8();
  if (format == "TIFF") {
    return raster.isCog ? "image/tiff; application=geotiff; profile=cloud-optimized"
                        : "image/tiff; application=geotiff";
  }
  for (const auto& [key, type] : kTypes) {
    if (format == key) return type;
  }
  return "application/octet-stream";
}

}  // namespace

std::string StacNameOf(const std::string& file) {
  return std::filesystem::path(file).replace_extension(".stac.json").string();
}

Json StacItemOf(const StacRaster& raster) {
  const RasterInfo& info = raster.contents.info;
  const auto details = SplitDetails(raster.contents);
  Json bands = Json::array();
  bool hasClasses = false;
  for (unsigned band = 0; band < info.bands; ++band) {
    bands.push_back(BandOf(raster, details, band));
    hasClasses = hasClasses || bands.back().contains("classification:classes");
  }
  const std::string root = kExtensions;
  Json extensions{root + "projection/v1.1.0/schema.json", root + "raster/v1.1.0/schema.json"};
  if (hasClasses) extensions.push_back(root + "classification/v1.1.0/schema.json");

  const std::string now = TextOf(std::time(nullptr));
  std::optional<std::string> taken;
  for (const char* const name : {"Items/ACQUISITIONDATETIME", "Items/TIFFTAG_DATETIME"}) {
    const auto found = details.find(name);
    if (!taken && found != details.end()) taken = TimeOf(found->second);
  }
  Json properties{{"datetime", taken.value_or(now)}, {"created", now}};
  AddProjection(info, properties);

  Json item{{"type", "Feature"},
            {"stac_version", "1.0.0"},
            {"stac_extensions", extensions},
            {"id", std::filesystem::path(raster.file).stem().string()}};
  AddGeometry(info, item);
  item["properties"] = properties;
  item["links"] = Json::array();
  item["assets"] = {{"data",
                     {{"href", "./" + raster.file},
                      {"type", MediaTypeOf(raster)},
                      {"roles", Json::array({"data"})},
                      {"raster:bands", bands}}}};
  return item;
}

}  // namespace lumo::host
