#include "fx/region_means_raster.h"

#include "fx/label_census.h"
#include "fx/label_painting.h"
#include "raster/tile_functions.h"
#include "tasks/task_errors.h"

namespace lumo {

template <typename File, typename T>
RasterApplyRegionMeansTask<File, T>::RasterApplyRegionMeansTask(ArgList& setup)
    : SequentialTask("RasterApplyRegionMeansTask"), file_(setup.Get(0)) {
  if (file_.IsNull() || !file_->IsValid()) SetErrorState(TaskErrorBadParams());
}

template <typename File, typename T>
bool RasterApplyRegionMeansTask<File, T>::Execute(ArgList& args) {
  if (HasError()) return false;
  const ObjectPtr object = args.Get(0);
  bool isDone = false;
  if (const TilePtr<std::int32_t> whole(object); whole && whole->IsValid()) {
    isDone = Apply(*whole, args);
  } else if (const TilePtr<std::uint32_t> natural(object); natural && natural->IsValid()) {
    isDone = Apply(*natural, args);
  }
  if (!isDone) SetErrorState(TaskErrorBadArgs());
  return isDone;
}

template <typename File, typename T>
template <typename L>
bool RasterApplyRegionMeansTask<File, T>::Apply(const Tile<L>& labels, ArgList& args) {
  const unsigned bands = file_->Bands();
  const TilePtr<T> out = pool_.Take();
  // The means of the regions of this tile lie together, away from the pages of the file.
  const auto readMeans = [&](const std::vector<std::uint32_t>& regions, T* means) {
    for (const std::uint32_t region : regions) {
      for (unsigned band = 0; band < bands; ++band) {
        *means++ = std::as_const(*file_).Value(region, band, RegionMeans::kMean);
      }
    }
    return true;
  };
  return PaintLabels(labels, bands, *out, readMeans) && args.Set(1, out);
}

template class RasterApplyRegionMeansTask<RegionMeansFile, float>;

ApplyRegionMeansProcess::ApplyRegionMeansProcess(const BasicRasterPtr& labels,
                                                 const Pointer<RegionMeansFile>& means,
                                                 const RasterPtr<float>& output, const IPC& ipc)
    : TileProcess("ApplyRegionMeansProcess", ipc) {
  DispatchType(LabelTypes{}, labels->DataType(), [&]<typename L>() {
    const RasterPtr<L> source(labels);
    const RasterIteratorPtr<L> tiles =
        LabelTiles(source, WideTiles(source.Get(), sizeof(L), kComputedTile, 0));
    const TileSlot<L> in = Read(tiles);
    const auto out = TakeSlot<TileSlot<float>>();
    AddTask<RasterApplyRegionMeansTask<RegionMeansFile, float>>(ArgIDs({in.id, out.id}), means);
    Write(out,
          RasterIteratorPtr<float>(new RasterIteratorFromTemplateSpatial<float>(output, *tiles)));
    return true;
  });
  Close();
}

}  // namespace lumo
