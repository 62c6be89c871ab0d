#pragma once

#include <atomic>
#include <iosfwd>

#include "georef/georef.h"

namespace lumo {

/// Keeps what a model has computed of itself: the latitude of its middle, and its extent. Threads
/// that read it, or write the same values once more, do not disturb one another.
class GeoRefCache {
 public:
  /// The latitude, in degrees, while none is computed.
  static constexpr double kNoLatitude = -9999.0;

  GeoRefCache() = default;
  GeoRefCache(const GeoRefCache& other) { *this = other; }
  GeoRefCache& operator=(const GeoRefCache& other) {
    SetCenterLatitude(other.CenterLatitude());
    SetExtent(other.Extent());
    return *this;
  }

  /// Latitude of the middle of the raster, in degrees; kNoLatitude when not computed.
  double CenterLatitude() const { return Get(centerLatitude_); }
  void SetCenterLatitude(double latitude) { Put(centerLatitude_, latitude); }

  /// Map rectangle of the raster; all four 0 when not computed.
  MapRect Extent() const { return {Get(minX_), Get(minY_), Get(maxX_), Get(maxY_)}; }
  void SetExtent(const MapRect& extent) {
    Put(minX_, extent.minX);
    Put(minY_, extent.minY);
    Put(maxX_, extent.maxX);
    Put(maxY_, extent.maxY);
  }
  /// True when an extent was computed, unless it was all 0.
  bool HasExtent() const {
    const MapRect extent = Extent();
    return extent.minX != 0 || extent.minY != 0 || extent.maxX != 0 || extent.maxY != 0;
  }

  /// The extent as min x, min y, max x, max y.
  Array<double> ExtentArray() const {
    const MapRect extent = Extent();
    Array<double> values{ArrayDims(4)};
    values[0] = extent.minX;
    values[1] = extent.minY;
    values[2] = extent.maxX;
    values[3] = extent.maxY;
    return values;
  }

  void Write(std::ostream& out) const;  ///< the five values, the latitude first
  void Read(std::istream& in);          ///< what Write writes
 private:
  static double Get(const std::atomic<double>& value) {
    return value.load(std::memory_order_relaxed);
  }
  static void Put(std::atomic<double>& value, double number) {
    value.store(number, std::memory_order_relaxed);
  }

  std::atomic<double> centerLatitude_{kNoLatitude};
  std::atomic<double> minX_{0};
  std::atomic<double> minY_{0};
  std::atomic<double> maxX_{0};
  std::atomic<double> maxY_{0};
};

}  // namespace lumo
