#include "proj_coordsys.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstring>

#include "foundation/fault.h"
#include "foundation/thrown.h"
#include "georef/coordsys_log.h"
#include "proj_context.h"

namespace lumo::pe {
namespace {

/// x and y of points that lie next to one another, or with other values between them.
struct PointSpan {
  double* x = nullptr;
  std::size_t count = 0;
  std::size_t stride = 2;  // values from one x to the next

  explicit PointSpan(Array<double>& points) : x(points.GetData()), count(points.GetCount()) {
    if (points.GetRank() == 2 && points.GetExtent(1) > 2) stride = points.GetExtent(1);
    count /= stride;
  }

  double& X(std::size_t i) const { return x[i * stride]; }
  double& Y(std::size_t i) const { return x[i * stride + 1]; }
};

void SetFailed(const PointSpan& points) {
  for (std::size_t i = 0; i < points.count; ++i) {
    points.X(i) = HUGE_VAL;
    points.Y(i) = HUGE_VAL;
  }
}

/// Marks points that are not finite as those that can't be carried.
void MarkFailed(const PointSpan& points) {
  for (std::size_t i = 0; i < points.count; ++i) {
    if (std::isfinite(points.X(i)) && std::isfinite(points.Y(i))) continue;
    points.X(i) = HUGE_VAL;
    points.Y(i) = HUGE_VAL;
  }
}

/// Gives what `find` does; null, with the shortage noted, where memory is too short to make it.
template <typename Find>
PJ* FindOrNull(Find&& find) {
  try {
    return find();
  } catch (...) {
    LogCoordSys(CoordSysLog::kErrors, "%s", DescribeException().c_str());
    return nullptr;
  }
}

/// All points in one call; null `transform` fails them.
void Run(PJ* transform, PJ_DIRECTION direction, const PointSpan& points) {
  if (transform == nullptr) {
    SetFailed(points);
    return;
  }
  MarkFailed(points);
  const std::size_t bytes = points.stride * sizeof(double);
  proj_errno_reset(transform);
  proj_trans_generic(transform, direction, points.x, bytes, points.count, points.x + 1, bytes,
                     points.count, nullptr, 0, 0, nullptr, 0, 0);
  MarkFailed(points);
}

/// Own geographic coordinates of a system to degrees east of Greenwich.
void ToDegrees(const Definition& system, const PointSpan& points) {
  if (system.degrees == 1 && system.meridian == 0) return;
  for (std::size_t i = 0; i < points.count; ++i) {
    points.X(i) = points.X(i) * system.degrees + system.meridian;
    points.Y(i) *= system.degrees;
  }
}

void FromDegrees(const Definition& system, const PointSpan& points) {
  if (system.degrees == 1 && system.meridian == 0) return;
  for (std::size_t i = 0; i < points.count; ++i) {
    points.X(i) = (points.X(i) - system.meridian) / system.degrees;
    points.Y(i) /= system.degrees;
  }
}

PjPtr MakeTransform(PJ_CONTEXT* context, const std::string& from, const std::string& to,
                    PJ_AREA* area) {
  const PjPtr source(proj_create_from_wkt(context, from.c_str(), nullptr, nullptr, nullptr));
  const PjPtr target(proj_create_from_wkt(context, to.c_str(), nullptr, nullptr, nullptr));
  if (source == nullptr || target == nullptr) return nullptr;
  const PjPtr made(
      proj_create_crs_to_crs_from_pj(context, source.get(), target.get(), area, nullptr));
  return PjPtr(made != nullptr ? proj_normalize_for_visualization(context, made.get()) : nullptr);
}

std::string Key(char kind, std::uint64_t id) {
  return std::string(1, kind).append(std::to_string(id));
}

/// From a system's geographic coordinates to its map coordinates; the other way is its inverse.
PJ* Projection(const Definition& system) {
  return FindOrNull([&system] {
    return CachedTransform(Key('p', system.id), [&system](PJ_CONTEXT* context) {
      return MakeTransform(context, system.geodeticText, system.mapText, nullptr);
    });
  });
}

/// West, south, east, north; not `known` when nothing is known of the place.
struct Area {
  bool known = false;
  double bounds[4] = {};

  explicit Area(const Array<double>& extent) {
    if (extent.GetCount() < 4) return;
    bounds[0] = std::clamp(std::min(extent[0], extent[2]), -180.0, 180.0);
    bounds[1] = std::clamp(std::min(extent[1], extent[3]), -90.0, 90.0);
    bounds[2] = std::clamp(std::max(extent[0], extent[2]), -180.0, 180.0);
    bounds[3] = std::clamp(std::max(extent[1], extent[3]), -90.0, 90.0);
    known = std::all_of(extent.begin(), extent.begin() + 4,
                        [](double v) { return std::isfinite(v); }) &&
            (bounds[0] < bounds[2] || bounds[1] < bounds[3]);
  }
};

struct AreaDeleter {
  void operator()(PJ_AREA* area) const { proj_area_destroy(area); }
};

PJ* DatumTransform(const Definition& from, const Definition& to, const Area& area) {
  std::string key = Key('g', from.id).append(Key(',', to.id));
  if (area.known) {
    key.append(reinterpret_cast<const char*>(area.bounds), sizeof area.bounds);
  }
  return CachedTransform(key, [&](PJ_CONTEXT* context) {
    std::unique_ptr<PJ_AREA, AreaDeleter> bounds;
    if (area.known) {
      bounds.reset(proj_area_create());
      proj_area_set_bbox(bounds.get(), area.bounds[0], area.bounds[1], area.bounds[2],
                         area.bounds[3]);
    }
    PjPtr made = MakeTransform(context, from.datumText, to.datumText, bounds.get());
    LogCoordSys(CoordSysLog::kFirstTransform, "geographic transform: %s to %s",
                from.info.geographicName.GetUTF8(), to.info.geographicName.GetUTF8());
    const char* const used = made != nullptr ? proj_pj_info(made.get()).description : nullptr;
    LogCoordSys(CoordSysLog::kTransformUsed, "transform used: %s",
                used != nullptr ? used : "one of several, by place");
    return made;
  });
}

void LogTransform(const Definition& from, const Definition& to, const Area& area) {
  LogCoordSys(CoordSysLog::kAllTransforms, "geographic transform: %s to %s",
              from.info.geographicName.GetUTF8(), to.info.geographicName.GetUTF8());
  LogCoordSys(CoordSysLog::kTransformTexts, "from %s", from.text.c_str());
  LogCoordSys(CoordSysLog::kTransformTexts, "to %s", to.text.c_str());
  LogCoordSys(CoordSysLog::kTransformExtent, "bounding box: %.9g %.9g %.9g %.9g", area.bounds[0],
              area.bounds[1], area.bounds[2], area.bounds[3]);
}

}  // namespace

void ProjCoordSys::Unproject(Array<double>& points) const {
  const PointSpan span(points);
  if (definition_->type == 0) return SetFailed(span);
  if (definition_->converts) Run(Projection(*definition_), PJ_INV, span);
  ToDegrees(*definition_, span);
}

void ProjCoordSys::Project(Array<double>& points) const {
  const PointSpan span(points);
  if (definition_->type == 0) return SetFailed(span);
  FromDegrees(*definition_, span);
  if (definition_->converts) Run(Projection(*definition_), PJ_FWD, span);
}

void ProjCoordSys::MapToGeo(double& x, double& y, double& longitude, double& latitude) const {
  double point[] = {x, y};
  Array<double> points(point, ArrayDims(1, 2));
  Unproject(points);
  longitude = point[0];
  latitude = point[1];
}

void ProjCoordSys::GeoToMap(double longitude, double latitude, double& x, double& y) const {
  double point[] = {longitude, latitude};
  Array<double> points(point, ArrayDims(1, 2));
  Project(points);
  x = point[0];
  y = point[1];
}

void ProjCoordSys::GeoTransform(const String& target, Array<double>& points, Array<double>&,
                                const Array<double>& extent) const {
  const PointSpan span(points);
  const DefinitionPtr to = FindDefinition(target.ToUTF8());
  if (to == nullptr || to->type == 0 || definition_->type == 0) return SetFailed(span);
  const Area area(extent);
  LogTransform(*definition_, *to, area);
  if (span.count != 0) {
    LogCoordSys(CoordSysLog::kTransformValues, "first in: %.12g %.12g", span.X(0), span.Y(0));
  }
  FromDegrees(*definition_, span);
  Run(FindOrNull([&] { return DatumTransform(*definition_, *to, area); }), PJ_FWD, span);
  ToDegrees(*to, span);
  if (span.count != 0) {
    LogCoordSys(CoordSysLog::kTransformValues, "first out: %.12g %.12g", span.X(0), span.Y(0));
  }
}

}  // namespace lumo::pe
