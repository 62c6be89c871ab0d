#pragma once

#include <cstddef>
#include <cstdint>
#include <iosfwd>

#include "foundation/array.h"
#include "foundation/pointer.h"
#include "foundation/sub_rect.h"
#include "georef/coordsys.h"

namespace lumo {

class GeoRef;
class GeoRefCache;
using GeoRefPtr = Pointer<GeoRef>;

/// A rectangle in map units, or in pixels where a model converts it; min <= max on both axes.
struct MapRect {
  double minX = 0;
  double minY = 0;
  double maxX = 0;
  double maxY = 0;
};

/// Says where the pixels of a raster lie on the ground.
///
/// Pixel coordinates are real numbers, x along the line and y down, (0, 0) the upper left corner of
/// the first pixel of an affine model. Map coordinates are easting and northing, or longitude and
/// latitude, in the unit of the coordinate system. A points array has x and y of a point next to
/// one another, dimensions (points, 2).
///
///     const GeoRefPtr model = raster->GetRasterDef().geoRef;  // empty for an unknown place
///     if (model.IsNull()) return false;
///     double east = 0, north = 0;
///     if (!model->PixelToMap(x + 0.5, y + 0.5, east, north)) return false;  // a pixel's middle
///
/// Many points in one array cost far less than one by one where coordinate systems or a camera take
/// part.
///
/// Threads:   conversions may run on many threads at once once SetDimensions has filled the caches;
///            a thread that changes the model must be alone.
/// Failure:   an array of another shape, and an affine model whose pixel size is 0, give false and
///            an array of zeros. A point that the coordinate systems can't carry comes out with
///            HUGE_VAL in both coordinates and makes the result false; the other points are right.
class VEXG_EXPORT GeoRef {
 public:
  using PointerRoot = GeoRef;

  /// The class of the model, for files and commands.
  enum Type : std::uint32_t { kUnknown = 0, kStd = 1, kRpc = 2, kStdRpc = 3 };

  /// Names what IsEqual leaves out.
  enum EqualFlags : std::uint32_t { kSkipPixelSize = 1, kSkipTiePoint = 2 };

  virtual ~GeoRef() = default;

  virtual GeoRef* Clone() const = 0;  ///< a deep copy that belongs to the caller

  /// Compares types and rotations, pixel sizes to within 1e-6, tie points exactly, and coordinate
  /// systems.
  virtual bool IsEqual(const GeoRefPtr& other, std::uint32_t flags = 0) const;

  /// Pixels to map coordinates, in place. The corners of a rectangle are put in order again.
  virtual bool PixelToMap(MapRect& rect) const = 0;
  /// Pixels to map coordinates for the points of an array, in place.
  virtual bool PixelToMap(Array<double>& points) const = 0;
  /// Pixels to map coordinates for one point.
  virtual bool PixelToMap(double x, double y, double& mapX, double& mapY) const = 0;

  /// Map coordinates to pixels, in place.
  virtual bool MapToPixel(MapRect& rect) const = 0;
  /// Map coordinates to pixels for the points of an array, in place.
  virtual bool MapToPixel(Array<double>& points) const = 0;
  /// Map coordinates to pixels for one point.
  virtual bool MapToPixel(double mapX, double mapY, double& x, double& y) const = 0;

  /// Carries pixels of this model to pixels of `other`, in place, through the coordinate systems of
  /// both.
  virtual bool PixelToPixel(Array<double>& points, const GeoRef& other) const;

  /// Carries map coordinates of this model to the coordinate system of `other`, in place.
  virtual bool MapToMap(Array<double>& points, const GeoRef& other) const;

  /// Sets the size of the raster and fills the caches.
  virtual void SetDimensions(unsigned samples, unsigned lines) = 0;

  /// Latitude of the middle of the raster, in degrees.
  /// @param force  forget what was computed before.
  virtual double CenterLatitude(bool force = false) const = 0;

  /// The map rectangle that the raster covers: min x, min y, max x, max y; zeros without a size.
  virtual Array<double> MapExtent(bool force = false) const = 0;

  /// The model of a part of the raster whose pixel (0, 0) is (rect.left, rect.top) here.
  virtual GeoRefPtr SubRectGeoRef(const SubRect& rect) const = 0;

  /// The model of the raster with pixels of another size, in map units.
  virtual GeoRefPtr ResampledGeoRef(double pixelSizeX, double pixelSizeY) const = 0;

  /// Writes the fields in their text form, without the word for the type; numbers have 17 digits,
  /// so that they read back to the same bits.
  virtual void Write(std::ostream& out) const;

  /// Reads what Write writes. A text that breaks off or holds no numbers fails the stream, and the
  /// model then means nothing.
  virtual void Read(std::istream& in);

  /// True for an object of the class with `TypeCode`, or of one derived from it.
  bool IsA(unsigned typeCode) const;

  /// A Type.
  std::uint32_t GetType() const { return type_; }
  double PixelSizeX() const { return pixelSizeX_; }  ///< map units, along the line
  double PixelSizeY() const {
    return pixelSizeY_;
  }                                            ///< map units; positive for a raster with north up
  double TieMapX() const { return tieMapX_; }  ///< map coordinates of the tie point
  double TieMapY() const { return tieMapY_; }
  double TiePixelX() const { return tiePixelX_; }  ///< its pixel coordinates
  double TiePixelY() const { return tiePixelY_; }
  /// The system of the map coordinates; empty when it isn't known.
  const CoordSys& CoordinateSystem() const { return coordSys_; }
  /// Size of the raster, as SetDimensions has set it; 0 before.
  unsigned Samples() const { return samples_; }
  unsigned Lines() const { return lines_; }
  /// Degrees by which the grid is turned about the tie point.
  double Rotation() const { return rotation_; }

  // Each setter also fills the caches again when the size of the raster is known.

  /// Map units for a pixel. y is positive: map y falls as the line number rises.
  void SetPixelSize(double x, double y);
  /// Map coordinates of the tie point.
  void SetTieMap(double x, double y);
  /// Pixel coordinates of the tie point.
  void SetTiePixel(double x, double y);
  /// Turns the grid about the tie point.
  void SetRotation(double degrees);
  /// Sets the system of the map coordinates, which stay as they are.
  void SetCoordinateSystem(const CoordSys& coordSys);

 protected:
  GeoRef() = default;
  GeoRef(const GeoRef&) = default;
  GeoRef& operator=(const GeoRef&) = default;

  /// Called when a field has changed: fills the caches again when the size is known.
  void Changed();

  /// The extent in `cache`, computed first when it isn't there.
  /// @param force  forget what was computed before.
  Array<double> CachedExtent(GeoRefCache& cache, bool force) const;

  /// The shared parts of the conversions: a rectangle, or a point, as an array of points.
  static bool ConvertRect(MapRect& rect, bool (*convert)(const GeoRef&, Array<double>&),
                          const GeoRef& model);
  static bool ConvertPoint(double x, double y, double& outX, double& outY,
                           bool (*convert)(const GeoRef&, Array<double>&), const GeoRef& model);
  static bool ToMap(const GeoRef& model, Array<double>& points) { return model.PixelToMap(points); }
  static bool ToPixel(const GeoRef& model, Array<double>& points) {
    return model.MapToPixel(points);
  }
  /// The extent of a raster of the size that the model has, see MapExtent.
  MapRect SampleExtent() const;

  std::uint32_t type_ = kUnknown;
  double pixelSizeX_ = 1.0;
  double pixelSizeY_ = 1.0;
  double tieMapX_ = 0;
  double tieMapY_ = 0;
  double tiePixelX_ = 0;
  double tiePixelY_ = 0;
  CoordSys coordSys_;
  unsigned samples_ = 0;
  unsigned lines_ = 0;
  double rotation_ = 0;  // degrees
};

/// Makes a deep copy of a model; empty when `source` is.
VEXG_EXPORT GeoRefPtr CloneOf(const GeoRefPtr& source);

/// The text form: the word "Std", "Rpc" or "StdRpc", a blank, and what Write gives. A null pointer
/// is "Unknown ".
VEXG_EXPORT std::ostream& operator<<(std::ostream& out, const GeoRef& geoRef);
/// The text form of the model that a pointer holds.
VEXG_EXPORT std::ostream& operator<<(std::ostream& out, const GeoRefPtr& geoRef);

/// Reads the word and, when it names the type of `geoRef`, the rest; otherwise fails the stream.
VEXG_EXPORT std::istream& operator>>(std::istream& in, GeoRef& geoRef);

/// Makes the model that the text describes; null for "Unknown", another word, or a text that breaks
/// off.
VEXG_EXPORT std::istream& operator>>(std::istream& in, GeoRefPtr& geoRef);

}  // namespace lumo
