#pragma once

#include "fx/region_kinds.h"
#include "raster/tile_process.h"

namespace lumo {

/// Turns a tile of labels, of int or unsigned int, in slot 0 into a tile of the means of their
/// regions in slot 1, which is not looked at before. Label 0 and pixels that do not count become 0
/// in every band. Setup arguments: the file of the means. Exists for RegionMeansFile and float.
template <typename File, typename T>
class RasterApplyRegionMeansTask final : public SequentialTask {
 public:
  explicit RasterApplyRegionMeansTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  template <typename L>
  bool Apply(const Tile<L>& labels, ArgList& args);

  Pointer<File> file_;
  TilePool<T> pool_;
};

extern template class VEXG_EXPORT RasterApplyRegionMeansTask<RegionMeansFile, float>;

/// Writes the raster of the means of regions: of each pixel the means of its region.
class VEXG_EXPORT ApplyRegionMeansProcess final : public TileProcess<> {
 public:
  /// @param labels  of int or unsigned int; the first band counts.
  /// @param output  of the labels' size, with as many bands as the file has.
  ApplyRegionMeansProcess(const BasicRasterPtr& labels, const Pointer<RegionMeansFile>& means,
                          const RasterPtr<float>& output, const IPC& ipc = {});
};

}  // namespace lumo
