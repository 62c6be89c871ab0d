#pragma once

#include <cstdint>
#include <mutex>

#include "georef/coordsys_impl.h"
#include "platform/export.h"

namespace lumo {

/// Guards the counts of all CoordSysImpl objects, their making and release, and every geographic
/// transform. Shared with the plug-in; there from load on.
VEXG_EXPORT extern std::mutex* gpCoordSysMutex;

/// A handle on a coordinate system: the projection plug-in's object, or nothing, which is the empty
/// system. Without the plug-in every CoordSys is empty and work goes on without transforms.
///
///     CoordSys utm, geographic;
///     if (!utm.SetFromString("EPSG:32633") || !geographic.SetGeographic()) return false;
///     Array<double> points(ArrayDims(1, 2));
///     points[0] = 500000;   // easting, in metres
///     points[1] = 5400000;  // northing
///     utm.Unproject(points);                    // longitude and latitude on the system's datum
///     utm.GeoTransform(geographic, points, {});  // on that of WGS 84
///
/// Cost:      making one from a text takes the plug-in's parser; copies are cheap.
/// Ownership: copies share the plug-in's object.
/// Threads:   many readers or one writer; different handles on one object are independent.
class VEXG_EXPORT CoordSys {
 public:
  /// The empty system.
  CoordSys();
  CoordSys(const CoordSys& other);
  CoordSys& operator=(const CoordSys& other);
  ~CoordSys();

  /// Takes the system that `text` describes: WKT 1 in both dialects, WKT 2, "EPSG:n" or a PROJ
  /// string, whatever the plug-in reads. What was held before is let go in any case.
  /// @return false, and an empty system, when there is no plug-in or it can't read the text.
  bool SetFromString(const String& text);

  /// Takes WGS 84 in longitude and latitude, EPSG code 4326. False as in SetFromString.
  bool SetGeographic();

  /// @param text  [out] the plug-in's text; the empty text for the empty system.
  void ToString(String& text) const;

  /// True for the system that is none.
  bool IsEmpty() const { return impl_ == nullptr; }

  /// 0 none or empty, 1 geographic, 2 projected.
  std::int32_t Type() const;

  /// Never null; lives as long as this handle holds its system.
  const CoordSysInfo* Info() const;

  /// True when both have one name, ignoring case; else when the unit names, all parameters and the
  /// datum names agree, where an unknown datum agrees with every other.
  bool IsEqual(const CoordSys& other) const;

  /// True when geographic positions of the two can be used for one another.
  bool SameDatum(const CoordSys& other) const;

  /// Converts map coordinates to geographic positions, in place, see CoordSysImpl; nothing for type
  /// 0.
  void Unproject(Array<double>& points) const;
  /// Converts geographic positions to map coordinates, in place; nothing for type 0.
  void Project(Array<double>& points) const;
  /// Unproject for one point, longitude and latitude in degrees.
  void MapToGeo(double x, double y, double& longitude, double& latitude) const;

  /// Carries geographic positions to the datum of `other`, under the global mutex. Nothing when
  /// either is empty.
  void GeoTransform(const CoordSys& other, Array<double>& points,
                    const Array<double>& extent) const;

  /// A number of its own for each handle of the process.
  std::uint32_t Identifier() const { return identifier_; }

  /// Converts a pair of lengths, such as a pixel size, between two units of kMapUnits. Between
  /// linear and angular units the radii of curvature of WGS 84 at `latitude` count, in degrees
  /// (Snyder, Map Projections: A Working Manual, 1987, equations 4-18 to 4-21). An unknown code
  /// passes the values through.
  static void ConvertUnits(double x, double y, std::int32_t fromCode, std::int32_t toCode,
                           double& outX, double& outY, double latitude);

 private:
  template <typename Make>
  bool Remake(Make&& make);
  void ReleaseLocked();

  CoordSysImpl* impl_ = nullptr;
  std::uint32_t identifier_;
};

/// One row of the table of units.
struct MapUnit {
  const char* name;         ///< as in the text of a coordinate system
  const char* displayName;  ///< for people
  double factor;            ///< to metres, or to degrees
  std::int32_t kind;        ///< 0 linear, 1 angular
  std::int32_t code;        ///< of the EPSG registry; from 109001 on, of the projection engine
};

/// The units, ended by a row with code -1.
VEXG_EXPORT extern const MapUnit kMapUnits[];

/// The row with `code`; null when the table has none.
VEXG_EXPORT const MapUnit* FindMapUnit(std::int32_t code);

}  // namespace lumo
