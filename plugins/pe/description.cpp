#include "description.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <string_view>
#include <vector>

#include "foundation/text_case.h"
#include "georef/coordsys.h"

namespace lumo::pe {
namespace {

constexpr double kRadiansPerDegree = 0.017453292519943295;

// Places of the parameters; those that have none of their own follow in the order of the method.
constexpr unsigned kFirstFreePlace = 9;
constexpr unsigned kMethodPlace = 14;
constexpr unsigned kMeridianPlace = 15;

struct ParameterPlace {
  int epsgCode;
  unsigned place;
};
constexpr ParameterPlace kPlaces[] = {
    {8806, 0}, {8826, 0}, {8816, 0},             // false easting
    {8807, 1}, {8827, 1}, {8817, 1},             // false northing
    {8802, 2}, {8822, 2}, {8812, 2}, {8833, 2},  // longitude of origin
    {8801, 3}, {8821, 3}, {8811, 3},             // latitude of origin
    {8823, 4}, {8832, 4}, {8818, 4},             // first standard parallel
    {8824, 5},                                   // second standard parallel
    {8805, 6}, {8815, 6}, {8819, 6},             // scale factor
    {8813, 7}, {1036, 7},                        // azimuth, co-latitude of the cone axis
    {8814, 8},                                   // angle to the skew grid
};

/// A value in degrees, metres or ones. The common units keep the very number of the text.
double InBaseUnit(double value, double toSi, std::string_view category) {
  const bool angular = category == "angular";
  const double factor = angular ? toSi / kRadiansPerDegree : toSi;
  return std::abs(factor - 1.0) < 1e-12 ? value : value * factor;
}

/// Gives the text in quotes after the first `keyword["`.
std::string Quoted(const std::string& wkt, const std::string& keyword) {
  const std::string head = std::string(keyword).append("[\"");
  const std::size_t at = wkt.find(head);
  if (at == std::string::npos) return {};
  const std::size_t start = at + head.size();
  return wkt.substr(start, wkt.find('"', start) - start);
}

std::string NumberText(double value) {
  char digits[32];
  const auto end = std::to_chars(digits, digits + sizeof digits, value).ptr;
  const std::string text(digits, end);
  const bool isWhole = text.find_first_of(".en") == std::string::npos;
  return isWhole ? std::string(text).append(".0") : text;
}

/// Names that stand for no name: two systems that have them are not the same for that.
bool IsNoName(const std::string& text) {
  const std::string name = LowerCase(text);
  return name.empty() || name == "unknown" || name == "unnamed" || name == "undefined" ||
         name == "custom";
}

void FillParameters(PJ_CONTEXT* context, const PJ* map, CoordSysInfo& info) {
  const PjPtr conversion(proj_crs_get_coordoperation(context, map));
  if (conversion == nullptr) return;
  const char* methodName = nullptr;
  const char* methodCode = nullptr;
  proj_coordoperation_get_method_info(context, conversion.get(), &methodName, nullptr, &methodCode);
  if (info.projectionName.GetLength() == 0 && methodName != nullptr) {
    info.projectionName = methodName;
  }
  double method = methodCode != nullptr ? std::atof(methodCode) : 0;
  if (method == 0 && methodName != nullptr) {  // a method outside the registry: a mark of its name
    for (const char c : std::string_view(methodName)) {
      method = std::fmod(method * 31 + static_cast<unsigned char>(c), 1e9);
    }
    method = -1 - method;
  }
  info.parameters[kMethodPlace] = method;

  unsigned next = kFirstFreePlace;
  const int count = proj_coordoperation_get_param_count(context, conversion.get());
  for (int i = 0; i < count; ++i) {
    const char* code = nullptr;
    const char* category = nullptr;
    double value = 0, toSi = 1;
    if (proj_coordoperation_get_param(context, conversion.get(), i, nullptr, nullptr, &code, &value,
                                      nullptr, &toSi, nullptr, nullptr, nullptr, &category) == 0) {
      continue;
    }
    const int epsg = code != nullptr ? std::atoi(code) : 0;
    const auto* const known =
        std::find_if(std::begin(kPlaces), std::end(kPlaces),
                     [epsg](const ParameterPlace& entry) { return entry.epsgCode == epsg; });
    unsigned place = known != std::end(kPlaces) ? known->place : next++;
    if (place >= kMethodPlace) place = kMethodPlace - 1;
    info.parameters[place] = InBaseUnit(value, toSi, category != nullptr ? category : "");
  }
}

/// Names of units as the Esri dialect has them; PROJ keeps those of the text for some.
struct UnitName {
  std::int32_t code;
  const char* name;
};
constexpr UnitName kUnitNames[] = {{9001, "Meter"},     {9002, "Foot"},   {9003, "Foot_US"},
                                   {9036, "Kilometer"}, {9102, "Degree"}, {9101, "Radian"},
                                   {9105, "Grad"}};

void FillUnit(PJ_CONTEXT* context, const PJ* map, bool angular, CoordSysInfo& info) {
  const PjPtr axes(proj_crs_get_coordinate_system(context, map));
  double toSi = 1;
  const char* name = nullptr;
  const char* code = nullptr;
  if (axes == nullptr || proj_cs_get_axis_info(context, axes.get(), 0, nullptr, nullptr, nullptr,
                                               &toSi, &name, nullptr, &code) == 0) {
    return;
  }
  info.unitKind = angular ? 1 : 0;
  info.unitFactor = InBaseUnit(1.0, toSi, angular ? "angular" : "linear");
  info.unitCode = code != nullptr ? std::atoi(code) : 0;
  const MapUnit* row = FindMapUnit(info.unitCode);
  for (const MapUnit* unit = kMapUnits; row == nullptr && unit->code != -1; ++unit) {
    const bool same = unit->kind == info.unitKind &&
                      std::abs(unit->factor - info.unitFactor) < unit->factor * 1e-12;
    if (same) row = unit;
  }
  if (row != nullptr) {
    info.unitCode = row->code;
    info.unitFactor = row->factor;
  }
  info.unitName = name != nullptr ? name : "";
  for (const UnitName& entry : kUnitNames) {
    if (entry.code == info.unitCode) info.unitName = entry.name;
  }
}

void FillSpheroid(PJ_CONTEXT* context, const PJ* geodetic, CoordSysInfo& info) {
  const PjPtr ellipsoid(proj_get_ellipsoid(context, geodetic));
  double semiMajor = 0, inverseFlattening = 0;
  if (ellipsoid == nullptr ||
      proj_ellipsoid_get_parameters(context, ellipsoid.get(), &semiMajor, nullptr, nullptr,
                                    &inverseFlattening) == 0) {
    return;
  }
  info.semiMajor = semiMajor;
  info.semiMajorText = NumberText(semiMajor);
  info.inverseFlattening = inverseFlattening;
  info.inverseFlatteningText = NumberText(inverseFlattening);
}

/// The values of a transform that came with a text. Systems that differ in them are different.
std::string TransformMark(PJ_CONTEXT* context, const PJ* transform) {
  if (transform == nullptr) return {};
  std::string mark;
  double values[7] = {};
  if (proj_coordoperation_get_towgs84_values(context, transform, values, 7, 0) != 0) {
    for (const double value : values) {
      mark.append(mark.empty() ? " TOWGS84[" : ",").append(NumberText(value));
    }
    return mark.append("]");
  }
  return mark.append(" ").append(ToWkt(context, transform, PJ_WKT2_2019));
}

}  // namespace

std::string ToWkt(PJ_CONTEXT* context, const PJ* object, PJ_WKT_TYPE form) {
  const char* const options[] = {"MULTILINE=NO", nullptr};
  const char* const text = proj_as_wkt(context, object, form, options);
  return text != nullptr ? text : "";
}

int EpsgCode(const PJ* object) {
  const char* const authority = proj_get_id_auth_name(object, 0);
  if (authority == nullptr || std::strcmp(authority, "EPSG") != 0) return 0;
  const char* const code = proj_get_id_code(object, 0);
  return code != nullptr ? std::atoi(code) : 0;
}

double DegreesPerUnit(PJ_CONTEXT* context, const PJ* geodetic) {
  const PjPtr axes(proj_crs_get_coordinate_system(context, geodetic));
  double radians = kRadiansPerDegree;
  if (axes != nullptr) {
    proj_cs_get_axis_info(context, axes.get(), 0, nullptr, nullptr, nullptr, &radians, nullptr,
                          nullptr, nullptr);
  }
  return InBaseUnit(1.0, radians, "angular");
}

double MeridianDegrees(PJ_CONTEXT* context, const PJ* geodetic) {
  const PjPtr meridian(proj_get_prime_meridian(context, geodetic));
  double longitude = 0, toRadians = kRadiansPerDegree;
  if (meridian == nullptr || proj_prime_meridian_get_parameters(context, meridian.get(), &longitude,
                                                                &toRadians, nullptr) == 0) {
    return 0;
  }
  return InBaseUnit(longitude, toRadians, "angular");
}

void Describe(PJ_CONTEXT* context, const SystemParts& parts, CoordSysInfo& info) {
  const std::string map = ToWkt(context, parts.map, PJ_WKT1_ESRI);
  const std::string geodetic = ToWkt(context, parts.geodetic, PJ_WKT1_ESRI);
  const bool projected = proj_get_type(parts.map) == PJ_TYPE_PROJECTED_CRS;
  const std::string mark = TransformMark(context, parts.transform);

  std::string name = Quoted(map, projected ? "PROJCS" : "GEOGCS");
  if (name.empty() && proj_get_name(parts.map) != nullptr) name = proj_get_name(parts.map);
  info.name = IsNoName(name) ? std::string() : name + mark;
  if (info.name.GetLength() == 0) info.name = "";
  info.value = EpsgCode(parts.map);
  info.projectionName = projected ? Quoted(map, "PROJECTION").c_str() : "";
  info.geographicName = Quoted(geodetic, "GEOGCS").c_str();
  const std::string datum = Quoted(geodetic, "DATUM");
  if (!datum.empty()) info.datumName = datum + mark;
  info.spheroidName = Quoted(geodetic, "SPHEROID").c_str();
  info.primeMeridian = MeridianDegrees(context, parts.geodetic);
  info.primeMeridianText = NumberText(info.primeMeridian);
  info.parameters[kMeridianPlace] = info.primeMeridian;
  FillSpheroid(context, parts.geodetic, info);
  FillUnit(context, parts.map, !projected, info);
  FillParameters(context, parts.map, info);
}

}  // namespace lumo::pe
