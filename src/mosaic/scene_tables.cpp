#include "mosaic/scene_tables.h"

#include <algorithm>

#include <fmt/format.h>

#include "foundation/fault.h"
#include "mosaic/mosaic_matching.h"
#include "mosaic/mosaic_tables.h"
#include "stats/raster_histogram.h"

namespace lumo {

template <typename T>
SceneTables<T>::SceneTables(const BasicMosaicRasterDef& definition, const MosaicSideFiles& files,
                            unsigned bands, std::optional<T> noData)
    : base_(files.tables.ToUTF8()),
      bins_(definition.Bins()),
      scenes_(definition.SceneCount()),
      reference_(definition.ReferenceIndex()),
      bands_(bands),
      noData_(noData),
      kept_(RoomFor(bands)) {}

template <typename T>
std::size_t SceneTables<T>::RoomFor(unsigned bands) {
  constexpr std::size_t kOne = sizeof(T) <= 2 ? (std::size_t{1} << (8 * sizeof(T))) * sizeof(T)
                                              : std::size_t{65536} * sizeof(double);
  return std::clamp<std::size_t>(kKeptBytes / (kOne * std::max(bands, 1U)), 2, 64);
}

template <typename T>
typename SceneTables<T>::Tables SceneTables<T>::Of(unsigned scene) {
  if (base_.empty() || scene == reference_) return none_;
  return kept_.Get(scene, [&] { return Read(scene); });
}

/// The width of the bins of the histogram that a table was made by.
template <typename T>
double BinSizeOf(const MosaicTable& table, Form bins) {
  const auto low = NearestPixel<T>(table.minimum), high = NearestPixel<T>(table.maximum);
  const HistogramRequest<T> request = MatchingHistogram<T>(low, high, bins);
  if (request.binSize > 0) return request.binSize;
  const auto one = [](auto value) {
    Array<decltype(value)> list{ArrayDims(1)};
    list[0] = value;
    return list;
  };
  RasterHistogram<T> histogram(1, one(request.binCount), one(request.lower), one(request.upper),
                               request.sign, bins);
  histogram.FillBins();
  return histogram.BinSize(0);
}

template <typename T>
typename SceneTables<T>::Tables SceneTables<T>::Read(unsigned scene) const {
  TakeFault();
  MosaicTableReader reader{String(base_)};
  if (!reader.IsValid()) {
    SetFault(TakeFaultOr((base_ + ".mlh: the tables can't be read").c_str()));
    return {};
  }
  if (reader.Scenes() != scenes_ || reader.Bands() != bands_) {
    SetFault(fmt::format("{}.mlh: the tables are of {} scenes with {} bands, not of {} with {}",
                         base_, reader.Scenes(), reader.Bands(), scenes_, bands_));
    return {};
  }
  auto tables = std::make_shared<std::vector<ColourTable<T>>>();
  bool areAllIdentity = true;
  for (unsigned band = 0; band < bands_; ++band) {
    MosaicTable table;
    if (!reader.Read(scene, band, table)) {
      SetFault(TakeFaultOr((base_ + ".mlt: the tables can't be read").c_str()));
      return {};
    }
    const double size = BinSizeOf<T>(table, bins_);
    tables->emplace_back(table.minimum, table.maximum, size, std::move(table.entries), noData_);
    areAllIdentity = areAllIdentity && tables->back().IsIdentity();
  }
  return areAllIdentity ? none_ : tables;
}

VEXG_INSTANCES(EIGHT, SceneTables);

}  // namespace lumo
