#include "tiff/tiff_place.h"

#include <cmath>
#include <string_view>

#include "georef/std_georef.h"

namespace lumo::tiff {
namespace {

enum Key : std::uint16_t {
  kModelType = 1024,
  kRasterType = 1025,
  kCitation = 1026,
  kGeographicType = 2048,
  kGeogCitation = 2049,
  kAngularUnits = 2054,
  kSemiMajorAxis = 2057,
  kInverseFlattening = 2059,
  kProjectedType = 3072,
  kLinearUnits = 3076
};

/// The keys of a coordinate system (OGC 19-008r4, GeoTIFF 1.1).
struct GeoKeys {
  std::map<std::uint16_t, std::uint16_t> numbers;
  std::map<std::uint16_t, std::string> texts;
  std::map<std::uint16_t, double> doubles;

  unsigned Number(Key key) const {
    const auto at = numbers.find(key);
    return at != numbers.end() ? at->second : 0;
  }
};

bool ReadKeys(const File& file, const Directory& directory, GeoKeys& keys) {
  std::vector<std::uint64_t> values;
  if (!file.ReadNumbers(directory, kGeoKeyDirectory, 1024, values)) return false;
  if (values.size() < 4 || values[0] != 1 || values[3] * 4 + 4 > values.size()) return false;
  std::string texts;
  std::vector<double> doubles;
  file.ReadText(directory, kGeoAsciiParams, texts);
  if (directory.contains(kGeoDoubleParams)) file.ReadDoubles(directory, kGeoDoubleParams, doubles);
  for (std::size_t i = 1; i <= values[3]; ++i) {
    const auto key = static_cast<std::uint16_t>(values[i * 4]);
    const std::uint64_t where = values[i * 4 + 1], count = values[i * 4 + 2];
    const std::uint64_t value = values[i * 4 + 3];
    if (where == 0 && count == 1) {
      keys.numbers[key] = static_cast<std::uint16_t>(value);
    } else if (where == kGeoAsciiParams && value + count <= texts.size()) {
      keys.texts[key] = texts.substr(value, count);
    } else if (where == kGeoDoubleParams && count == 1 && value < doubles.size()) {
      keys.doubles[key] = doubles[value];
    } else {
      return false;
    }
  }
  return true;
}

/// Puts a datum in the place of the ensemble of its realisations, as GDAL does where a process has
/// only read files. False when the text has another form than PROJ's.
bool NameDatum(std::string& wkt) {
  constexpr std::string_view kEnsemble = "ENSEMBLE[\"", kEnd = " ensemble\",";
  const std::size_t start = wkt.find(kEnsemble);
  if (start == wkt.npos) return true;
  const std::size_t end = wkt.find(kEnd, start), ellipsoid = wkt.find("ELLIPSOID[", start);
  const std::size_t accuracy = wkt.find(",ENSEMBLEACCURACY[", start);
  if (end == wkt.npos || ellipsoid == wkt.npos || accuracy == wkt.npos || end > ellipsoid ||
      ellipsoid > accuracy) {
    return false;
  }
  const std::size_t close = wkt.find(']', accuracy);
  if (close == wkt.npos || wkt.find(kEnsemble, close) != wkt.npos) return false;
  const std::string name = wkt.substr(start + kEnsemble.size(), end - start - kEnsemble.size());
  wkt = wkt.substr(0, start) + "DATUM[\"" + name + "\"," +
        wkt.substr(ellipsoid, accuracy - ellipsoid) + wkt.substr(close + 1);
  return true;
}

/// The text between the first quotes behind a word.
std::string NameBehind(const std::string& wkt, const std::string& word) {
  const std::size_t at = wkt.find(word);
  if (at == wkt.npos) return {};
  const std::size_t start = at + word.size();
  return wkt.substr(start, wkt.find('"', start) - start);
}

/// Says whether what else the keys tell of a system is what the registry has.
bool IsPlain(const GeoKeys& keys, const std::string& wkt, const CoordSysInfo& info) {
  const bool isProjected = keys.Number(kModelType) == 1;
  const std::string name = NameBehind(wkt, isProjected ? "PROJCRS[\"" : "GEOGCRS[\"");
  const std::string geographic = isProjected ? NameBehind(wkt, "BASEGEOGCRS[\"") : name;
  for (const auto& [key, text] : keys.texts) {
    const bool isName = (key == kCitation && text == name + "|") ||
                        (key == kGeogCitation && text == geographic + "|");
    if (!isName) return false;
  }
  for (const auto& [key, number] : keys.doubles) {
    const bool isSame = (key == kSemiMajorAxis && number == info.semiMajor) ||
                        (key == kInverseFlattening && number == info.inverseFlattening);
    if (!isSame) return false;
  }
  constexpr unsigned kMetre = 9001, kDegree = 9102;
  for (const auto& [key, number] : keys.numbers) {
    const bool isKnown =
        key == kModelType || key == kRasterType || (key == kProjectedType && isProjected) ||
        (key == kGeographicType && !isProjected) || (key == kAngularUnits && number == kDegree) ||
        (key == kLinearUnits && number == kMetre && isProjected);
    if (!isKnown) return false;
  }
  return info.unitCode == static_cast<std::int32_t>(isProjected ? kMetre : kDegree);
}

/// The system of the keys; an empty one, and false, for a system that isn't of the registry.
bool FindCoordSys(const GeoKeys& keys, CoordSys& system) {
  const unsigned model = keys.Number(kModelType);
  const unsigned code = keys.Number(model == 1 ? kProjectedType : kGeographicType);
  constexpr unsigned kFirstCode = 1024, kLastCode = 32766;
  // GDAL makes other geographic systems of their keys rather than of the registry.
  constexpr unsigned kWgs84 = 4326;
  const bool isTaken =
      model == 1 ? code >= kFirstCode && code <= kLastCode : model == 2 && code == kWgs84;
  if (!isTaken) return false;
  CoordSys registered;
  String text;
  if (!registered.SetFromString(String("EPSG:" + std::to_string(code)))) return false;
  registered.ToString(text);
  std::string wkt = text.ToUTF8();
  const bool isOfKind = wkt.starts_with(model == 1 ? "PROJCRS[" : "GEOGCRS[");
  return isOfKind && NameDatum(wkt) && IsPlain(keys, wkt, *registered.Info()) &&
         system.SetFromString(String(wkt));
}

}  // namespace

std::optional<Place> FindPlace(const File& file, const Image& image) {
  const Directory& directory = *image.directory;
  Place place;
  GeoKeys keys;
  const bool hasKeys = directory.contains(kGeoKeyDirectory);
  const bool hasGrid = directory.contains(kModelPixelScale) || directory.contains(kModelTiepoint);
  if (!hasKeys && (directory.contains(kGeoAsciiParams) || directory.contains(kGeoDoubleParams))) {
    return std::nullopt;
  }
  if (hasKeys && (!hasGrid || !ReadKeys(file, directory, keys))) return std::nullopt;
  if (!hasGrid) return place;
  place.rasterType = static_cast<int>(keys.Number(kRasterType));
  if (place.rasterType > 2) return std::nullopt;
  std::vector<double> scale, tie;
  if (!file.ReadDoubles(directory, kModelPixelScale, scale) || scale.size() < 2 ||
      !file.ReadDoubles(directory, kModelTiepoint, tie) || tie.size() != 6) {
    return std::nullopt;
  }
  const double sizeX = scale[0], sizeY = scale[1];
  double mapX = tie[3] - tie[0] * sizeX, mapY = tie[4] + tie[1] * sizeY;
  if (place.rasterType == 2) mapX -= sizeX * 0.5, mapY += sizeY * 0.5;
  const bool isUsable = std::isfinite(mapX) && std::isfinite(mapY) && std::isfinite(sizeX) &&
                        std::isfinite(sizeY) && sizeX > 0 && sizeY > 0;
  if (!isUsable) return std::nullopt;
  auto* const grid = new StdGeoRef;
  place.geoRef = GeoRefPtr(grid);
  grid->SetPixelSize(sizeX, sizeY);
  grid->SetRotation(0);
  grid->SetTieMap(mapX, mapY);
  CoordSys system;
  if (hasKeys) {
    if (!FindCoordSys(keys, system)) return std::nullopt;
    grid->SetCoordinateSystem(system);
  }
  return place;
}

}  // namespace lumo::tiff
