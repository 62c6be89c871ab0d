#include "fx/region_means_raster.h"

#include <algorithm>

#include "fx/label_census.h"
#include "fx/strip_regions.h"
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
  TileDimensions size = labels.Dimensions();
  size.bands = bands;
  const TilePtr<T> out = pool_.Take();
  if (!out->Resize(size)) return false;
  out->SetIndex(labels.Index());
  out->SetOrigin(labels.Origin());

  // The means of the regions of this tile lie together, away from the pages of the file.
  StripRegions regions;
  const std::size_t width = labels.FullWidth(), height = labels.FullHeight();
  for (std::size_t y = 0; y < height; ++y) {
    const std::size_t at = y * width * labels.Bands();
    regions.AddLine(labels.PixelArray().GetData() + at, labels.StateArray().GetData() + at, nullptr,
                    width);
  }
  std::vector<std::uint32_t> order(regions.Labels().size());
  for (std::size_t i = 0; i < order.size(); ++i) order[i] = static_cast<std::uint32_t>(i);
  std::sort(order.begin(), order.end(), [&](std::uint32_t a, std::uint32_t b) {
    return regions.Labels()[a] < regions.Labels()[b];
  });
  std::vector<T> means(order.size() * bands);
  for (const std::uint32_t local : order) {
    const std::uint32_t label = regions.Labels()[local];
    if (label == 0) continue;
    for (unsigned band = 0; band < bands; ++band) {
      means[std::size_t{local} * bands + band] =
          std::as_const(*file_).Value(label, band, RegionMeans::kMean);
    }
  }

  T* line = out->PixelArray().GetData();
  std::fill_n(line, width * height * bands, T());
  for (std::size_t y = 0; y < height; ++y, line += width * bands) {
    for (const LabelRun& run : regions.RunsOf(y)) {
      const T* const from = means.data() + std::size_t{run.region} * bands;
      T* to = line + std::size_t{run.first} * bands;
      for (std::uint32_t i = 0; i < run.count; ++i, to += bands) std::copy_n(from, bands, to);
    }
  }
  return args.Set(1, out);
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
