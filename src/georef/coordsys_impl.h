#pragma once

#include <cstdint>

#include "foundation/array.h"
#include "georef/coordsys_info.h"

namespace lumo {

/// A coordinate system as the projection plug-in implements it. The order of the virtual operations
/// is part of the plug-in contract.
///
/// "Geographic" positions are longitude, then latitude, in degrees east of Greenwich on the
/// system's own datum. Map coordinates are easting, then northing, in the system's unit; those of a
/// geographic system are longitude and latitude in its own angular unit and from its own prime
/// meridian. A points array has x and y next to one another, dimensions (points, 2); an array of
/// rank 1 is taken in pairs.
///
/// Ownership: counted by AddRef and Release; the library lets the plug-in delete it when Release
///            gives less than 1.
/// Threads:   the count is only touched under the global coordinate system mutex; the rest may be
///            called on many threads at once.
/// Failure:   a point that can't be carried comes out with HUGE_VAL for both coordinates.
class CoordSysImpl {
 public:
  virtual ~CoordSysImpl() = default;

  /// The text of the system, from which the plug-in makes an equal one.
  virtual void ToString(String& text) const = 0;
  /// 0 none: a local or otherwise unplaceable system; 1 geographic; 2 projected.
  virtual std::int32_t Type() const = 0;
  /// Map coordinates to geographic positions, in place.
  virtual void Unproject(Array<double>& points) const = 0;
  /// Unproject for one point.
  virtual void MapToGeo(double& x, double& y, double& longitude, double& latitude) const = 0;
  /// Geographic positions to map coordinates, in place.
  virtual void Project(Array<double>& points) const = 0;
  /// Project for one point.
  virtual void GeoToMap(double longitude, double latitude, double& x, double& y) const = 0;
  /// Carries geographic positions on this system's datum to that of the system with the text
  /// `target`, in place.
  /// @param second  [out] reserved; left as it is.
  /// @param extent  geographic min x, min y, max x, max y of the work, by which the operation is
  ///                chosen; all equal or empty when it isn't known.
  virtual void GeoTransform(const String& target, Array<double>& points, Array<double>& second,
                            const Array<double>& extent) const = 0;
  /// Owned by this object; never null.
  virtual const CoordSysInfo* Info() const = 0;
  /// Code of the system in the EPSG registry, 0 when it has none.
  virtual std::int32_t Code() const = 0;
  /// Adds 1 to the count.
  virtual void AddRef() = 0;
  /// @return the remaining count.
  virtual std::int32_t Release() = 0;
};

}  // namespace lumo
