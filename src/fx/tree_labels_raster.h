#pragma once

#include "fx/tree_cut.h"
#include "raster/raster_def.h"
#include "views/computed_raster.h"

namespace lumo {

/// Shows the segments of a tree at one cost as a raster of labels: one band, the number of the
/// segment of each pixel, and 0, which is no data, for those of none.
///
/// Ownership: shares the tree.
/// Threads:   every operation may run on many threads at once.
/// Failure:   a read gives false where the tree is damaged.
/// Cost:      reading and unpacking the strips of the tree that a block lies in, so blocks had
///            better be those strips, as TileDimensions says; 4 bytes of memory a basin.
class VEXG_EXPORT TreeLabelsRaster final : public ComputedRaster<std::int32_t> {
 public:
  /// @param cut  of the tree.
  TreeLabelsRaster(const SegmentTreePtr& tree, TreeCut&& cut);
  ~TreeLabelsRaster() override { StopComputing(); }

  URI GetURI() const override { return DefaultURI("TreeLabelsRaster"); }
  bool IsValid() const override { return Object::IsValid(); }
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }
  unsigned Bands() const override { return 1; }
  bool HasNoDataValue(unsigned band) const override { return band == 0; }
  std::int32_t NoDataValue(unsigned /*band*/) const override { return 0; }
  lumo::TileDimensions TileDimensions() const override;

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<std::int32_t>& pixels, Array<unsigned char>& state) override;

 private:
  SegmentTreePtr tree_;
  TreeCut cut_;
  RasterDef def_;
};

}  // namespace lumo
