#pragma once

#include <mutex>
#include <utility>
#include <vector>

#include "regions/rasterized_roi.h"

namespace lumo {

/// Several regions on the grid of a raster: a pixel is inside when it is in one of them, and counts
/// once where it is in two. Children are put on the grid when they are first asked for, and again
/// after a change of the definition's list.
class VEXG_EXPORT RasterizedGroupROI final : public RasterizedROI {
 public:
  static const unsigned TypeCode;
  /// @param geoRef  of the raster; where it is null, `samples` and `lines` count.
  RasterizedGroupROI(const GroupROIDefPtr& definition, unsigned samples, unsigned lines,
                     const GeoRefPtr& geoRef);
  bool IsA(unsigned typeCode) const override;

  /// The hit of the first child that has one.
  bool HitTest(const Point2D<unsigned>& point, ROIHitInfoPtr& info) override;
  bool Mask(const SubRect& rect, Array<unsigned char>& mask, std::uint64_t& count) override;
  ROIDefPtr ROIDef() const override { return definition_; }

  /// Marks the pixels of each child. False, with the fault set, when one can't be carried.
  bool Mark(RegionMarks& marks) override;
  RegionCover Cover(const RegionWindow& window) override;

 private:
  std::vector<RasterizedROIPtr> Children();
  void Refresh();

  GroupROIDefPtr definition_;
  std::mutex mutex_;
  bool isFresh_ = false;
  std::uint32_t seenRevision_ = 0;
  std::pair<std::int32_t, std::int32_t> seenOffset_;  // that the children have
  Map<ROIDefPtr, RasterizedROIPtr> forms_;
  std::vector<RasterizedROIPtr> children_;  // in the order of the definition
};

}  // namespace lumo
