#include "definition.h"

#include <algorithm>
#include <atomic>
#include <cctype>
#include <mutex>
#include <proj_experimental.h>
#include <string_view>
#include <unordered_map>

#include "description.h"
#include "foundation/fault.h"
#include "georef/coordsys_log.h"
#include "platform/random_access_file.h"
#include "proj_context.h"

namespace lumo::pe {
namespace {

constexpr std::size_t kMostDefinitions = 512;  // kept by text

PjPtr CreateFromProjString(PJ_CONTEXT* context, std::string text) {
  if (text.find("type=crs") == std::string::npos) text += " +type=crs";
  return PjPtr(proj_create(context, text.c_str()));
}

/// A system from an authority's name and a number, such as "EPSG:32618".
PjPtr CreateFromCode(PJ_CONTEXT* context, const std::string& text) {
  const std::size_t colon = text.find(':');
  if (colon == std::string::npos || colon == 0) return nullptr;
  std::string authority = text.substr(0, colon);
  std::transform(authority.begin(), authority.end(), authority.begin(),
                 [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
  return PjPtr(proj_create_from_database(context, authority.c_str(), text.substr(colon + 1).c_str(),
                                         PJ_CATEGORY_CRS, 0, nullptr));
}

/// Reads a text in one of the forms. Bare names are not taken: PROJ would look for similar ones.
PjPtr CreateAny(PJ_CONTEXT* context, const std::string& given) {
  const std::size_t start = given.find_first_not_of(" \t\r\n");
  if (start == std::string::npos || given.find('\0') != std::string::npos) return nullptr;
  const std::string text = given.substr(start, given.find_last_not_of(" \t\r\n") - start + 1);
  if (text.find('[') != std::string::npos) {
    return PjPtr(proj_create_from_wkt(context, text.c_str(), nullptr, nullptr, nullptr));
  }
  if (text.find("proj=") != std::string::npos || text.rfind("+init=", 0) == 0) {
    return CreateFromProjString(context, text);
  }
  if (text.rfind("urn:ogc:def:crs:", 0) == 0) return PjPtr(proj_create(context, text.c_str()));
  return CreateFromCode(context, text);
}

/// Sets the fault when PROJ's database can't be read, without which most systems are unknown.
void TellOfDatabase(PJ_CONTEXT* context) {
  if (proj_context_get_database_metadata(context, "EPSG.VERSION") != nullptr) return;
  const char* const path = proj_context_get_database_path(context);
  std::string why;
  if (path != nullptr && *path != '\0') {
    platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &why,
                                     platform::RandomAccessFile::Gate::kPassed);
  }
  SetFault(why.empty() ? "the database of coordinate systems, proj.db, can't be read" : why);
}

/// CreateAny, and the fault where it fails for want of the database.
PjPtr CreateOrTell(PJ_CONTEXT* context, const std::string& text) {
  PjPtr made = CreateAny(context, text);
  if (made == nullptr) TellOfDatabase(context);
  return made;
}

bool IsGeographic(PJ_TYPE type) {
  return type == PJ_TYPE_GEOGRAPHIC_2D_CRS || type == PJ_TYPE_GEOGRAPHIC_3D_CRS;
}

/// The horizontal part of a system, without its third axis; the transform that is bound to it is
/// kept aside.
struct Horizontal {
  PjPtr map;
  PjPtr hub;
  PjPtr transform;
};

Horizontal TakeHorizontal(PJ_CONTEXT* context, PjPtr system) {
  Horizontal parts;
  parts.map = std::move(system);
  while (parts.map != nullptr) {
    const PJ_TYPE type = proj_get_type(parts.map.get());
    if (type == PJ_TYPE_COMPOUND_CRS) {
      parts.map.reset(proj_crs_get_sub_crs(context, parts.map.get(), 0));
    } else if (type == PJ_TYPE_BOUND_CRS) {
      parts.hub.reset(proj_get_target_crs(context, parts.map.get()));
      parts.transform.reset(proj_crs_get_coordoperation(context, parts.map.get()));
      parts.map.reset(proj_get_source_crs(context, parts.map.get()));
    } else {
      break;
    }
  }
  if (parts.map != nullptr) {
    if (PJ* const flat = proj_crs_demote_to_2D(context, nullptr, parts.map.get())) {
      parts.map.reset(flat);
    }
  }
  return parts;
}

PjPtr TakeGeodetic(PJ_CONTEXT* context, const PJ* map) {
  const bool derived = proj_crs_is_derived(context, map) != 0;
  PjPtr geodetic(derived && IsGeographic(proj_get_type(map))
                     ? proj_get_source_crs(context, map)
                     : proj_crs_get_geodetic_crs(context, map));
  if (geodetic == nullptr) return nullptr;
  if (PJ* const flat = proj_crs_demote_to_2D(context, nullptr, geodetic.get())) {
    geodetic.reset(flat);
  }
  return IsGeographic(proj_get_type(geodetic.get())) ? std::move(geodetic) : nullptr;
}

/// Whether the two, which share a datum, have different coordinates.
bool NeedsConversion(PJ_CONTEXT* context, const PJ* map) {
  return proj_get_type(map) == PJ_TYPE_PROJECTED_CRS || proj_crs_is_derived(context, map) != 0;
}

void FillHorizontal(PJ_CONTEXT* context, const Horizontal& parts, Definition& made) {
  if (parts.map == nullptr) return;
  const PJ_TYPE type = proj_get_type(parts.map.get());
  if (type != PJ_TYPE_PROJECTED_CRS && !IsGeographic(type)) return;
  const PjPtr geodetic = TakeGeodetic(context, parts.map.get());
  if (geodetic == nullptr) return;

  made.mapText = ToWkt(context, parts.map.get(), PJ_WKT2_2019);
  made.geodeticText = ToWkt(context, geodetic.get(), PJ_WKT2_2019);
  made.datumText = made.geodeticText;
  if (parts.hub != nullptr && parts.transform != nullptr) {
    const PjPtr bound(
        proj_crs_create_bound_crs(context, geodetic.get(), parts.hub.get(), parts.transform.get()));
    if (bound != nullptr) made.datumText = ToWkt(context, bound.get(), PJ_WKT2_2019);
  }
  if (made.mapText.empty() || made.datumText.empty()) return;
  made.type = type == PJ_TYPE_PROJECTED_CRS ? 2 : 1;
  made.code = EpsgCode(parts.map.get());
  made.converts = NeedsConversion(context, parts.map.get());
  made.degrees = DegreesPerUnit(context, geodetic.get());
  made.meridian = MeridianDegrees(context, geodetic.get());
  Describe(context, {parts.map.get(), geodetic.get(), parts.transform.get()}, made.info);
}

DefinitionPtr ReadDefinition(const std::string& text) {
  static std::atomic<std::uint64_t> ids{0};
  PJ_CONTEXT* const context = ThreadContext();
  PjPtr system = CreateOrTell(context, text);
  if (system == nullptr || proj_is_crs(system.get()) == 0) return nullptr;
  auto made = std::make_shared<Definition>();
  made->id = ++ids;
  made->text = ToWkt(context, system.get(), PJ_WKT2_2019);
  if (made->text.empty()) return nullptr;
  // The mark ends the text where it stands among other texts.
  std::replace(made->text.begin(), made->text.end(), '|', '/');
  FillHorizontal(context, TakeHorizontal(context, std::move(system)), *made);
  made->info.text = made->text;
  const std::uint32_t level =
      made->type == 2 ? CoordSysLog::kProjectedMade : CoordSysLog::kGeographicMade;
  LogCoordSys(level, "made: %s", made->text.c_str());
  return made;
}

std::mutex gDefinitionsMutex;

std::unordered_map<std::string, DefinitionPtr>& Definitions() {
  static auto& definitions = *new std::unordered_map<std::string, DefinitionPtr>;
  return definitions;
}

}  // namespace

DefinitionPtr FindDefinition(const std::string& text) {
  {
    const std::lock_guard lock(gDefinitionsMutex);
    const auto at = Definitions().find(text);
    if (at != Definitions().end()) return at->second;
  }
  DefinitionPtr made = ReadDefinition(text);
  if (made == nullptr) {
    LogCoordSys(CoordSysLog::kErrors, "no coordinate system: %s", text.c_str());
    return nullptr;
  }
  const std::lock_guard lock(gDefinitionsMutex);
  if (Definitions().size() >= kMostDefinitions) Definitions().clear();
  // Under its own text too, which others will come with.
  made = Definitions().try_emplace(made->text, made).first->second;
  return Definitions().try_emplace(text, made).first->second;
}

}  // namespace lumo::pe
