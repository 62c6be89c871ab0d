#pragma once

#include <algorithm>
#include <cmath>

#include "data/access_policy.h"
#include "data/data_manager.h"
#include "foundation/fault.h"
#include "foundation/progress.h"
#include "pyramid/dynamic_raster_pyramid.h"
#include "pyramid/pyramid_builders.h"
#include "pyramid/pyramid_process.h"
#include "pyramid/reduced_levels.h"
#include "pyramid/shared_levels.h"
#include "stats/exact_bins.h"
#include "stats/raster_histogram.h"
#include "stats/raster_histogram_process.h"

namespace lumo {

namespace detail {

/// A connection of the builder's own, let go of under the lock of the data manager.
template <typename T>
class BuilderConnection {
 public:
  explicit BuilderConnection(const Array<String>& strings) {
    const AdmittedSourceScope admitted;
    source_ = GetGlobalDataManager().Connect(strings, GeoRefPtr(), MetadataPtr());
    const RasterReaderDispatchPtr dispatch =
        source_ ? source_->RasterReaderDispatch() : RasterReaderDispatchPtr();
    if (dispatch) reader_ = dispatch->Get<T>();
  }
  ~BuilderConnection() {
    reader_ = RasterReaderPtr<T>();
    DataConnectionPtr connection(source_);
    source_ = RasterDataConnectionPtr();
    GetGlobalDataManager().ReleaseConnection(connection);
  }
  BuilderConnection(const BuilderConnection&) = delete;
  BuilderConnection& operator=(const BuilderConnection&) = delete;

  const RasterDataConnectionPtr& Source() const { return source_; }
  const RasterReaderPtr<T>& Reader() const { return reader_; }

 private:
  RasterDataConnectionPtr source_;
  RasterReaderPtr<T> reader_;
};

/// A histogram of some 256 bins for each band, whose sizes are whole numbers.
template <typename T>
RasterHistogramPtr<T> ToldHistogram(const Array<T>& mins, const Array<T>& maxes) {
  constexpr double kBins = 255;
  const unsigned bands = mins.GetCount();
  Array<double> binSizes{ArrayDims(bands)};
  for (unsigned band = 0; band < bands; ++band) {
    const double range = static_cast<double>(maxes[band]) - static_cast<double>(mins[band]);
    binSizes[band] = mins[band] != maxes[band] ? std::ceil(range / kBins) : 1.0;
  }
  return RasterHistogramPtr<T>(
      new RasterHistogram<T>(bands, binSizes, mins, maxes, HistogramSign::kBoth));
}

/// A histogram of 256 bins for each band in the exact form; of integers one for each value where
/// there are fewer.
template <typename T>
RasterHistogramPtr<T> ExactHistogram(const Array<T>& mins, const Array<T>& maxes) {
  constexpr unsigned kBins = 256;
  const unsigned bands = mins.GetCount();
  Array<unsigned> binCounts{ArrayDims(bands)};
  for (unsigned band = 0; band < bands; ++band) {
    binCounts[band] = kBins;
    if constexpr (std::is_integral_v<T>) {
      if (mins[band] <= maxes[band] && ValuesBetween(mins[band], maxes[band]) < kBins) {
        binCounts[band] = static_cast<unsigned>(ValuesBetween(mins[band], maxes[band]));
      }
    }
  }
  return RasterHistogramPtr<T>(
      new RasterHistogram<T>(bands, binCounts, mins, maxes, HistogramSign::kBoth, Form::kExact));
}

/// Hands what a build has computed to the owner of the pyramid.
template <typename T>
class BuildResults final : public HistogramCallback<T> {
 public:
  explicit BuildResults(DynamicRasterPyramid<T>& owner) : owner_(owner) {}
  void TakeResults(const RasterStatsPtr<T>& stats, const RasterHistogramPtr<T>& histogram,
                   HistogramSign sign) override {
    areStored_ = owner_.TakeHistogram(*histogram, sign) && owner_.TakeStats(*stats);
    fault_ = TakeFault();
    owner_.Refresh();
  }

  /// False, with the fault set, unless the owner took them and could store them.
  bool AreStored() const {
    if (!areStored_ && fault_.GetLength() != 0) SetFault(fault_);
    return areStored_;
  }

 private:
  DynamicRasterPyramid<T>& owner_;
  bool areStored_ = false;
  String fault_;
};

}  // namespace detail

template <typename T>
AsyncPyramidBuilder<T>::AsyncPyramidBuilder(DynamicRasterPyramid<T>& owner,
                                            const PyramidOrder& order,
                                            const AsyncCallbackPtr& callback)
    : PyramidBuilder(callback), owner_(owner), order_(order) {}

template <typename T>
void AsyncPyramidBuilder<T>::Execute() {
  const detail::BuilderConnection<T> pyramid(order_.pyramid);
  built_ = pyramid.Reader() &&
           pyramid.Reader()->PyramidBuild(static_cast<std::int32_t>(order_.def.levelMin),
                                          static_cast<std::int32_t>(order_.def.levelMax),
                                          static_cast<std::int32_t>(order_.def.resamplingMethod),
                                          order_.tiles);
  if (!built_) Fail("the driver of the format could not build the pyramid");
  SetProgress(1.0);
}

/// The owner shows the new levels before a waiter goes on.
template <typename T>
void AsyncPyramidBuilder<T>::Finish() {
  if (built_ && !IsAborted()) owner_.OnLevelsWritten();
  PyramidBuilder::Finish();
}

/// The rasters of a build.
template <typename T>
struct AsyncOrvaPyramidBuilder<T>::Rasters {
  Rasters(const PyramidOrder& order) : source(order.source), pyramid(order.pyramid) {}

  detail::BuilderConnection<T> source;
  detail::BuilderConnection<T> pyramid;
  RasterPtr<T> plain;  // on the source alone
  RasterPtr<T> full;   // on both
};

template <typename T>
AsyncOrvaPyramidBuilder<T>::AsyncOrvaPyramidBuilder(DynamicRasterPyramid<T>& owner,
                                                    const PyramidOrder& order,
                                                    const MakeSourceRaster<T>& makeRaster,
                                                    const AsyncCallbackPtr& callback,
                                                    const PyramidShares& shares)
    : PyramidBuilder(callback),
      owner_(owner),
      order_(order),
      makeRaster_(makeRaster),
      shares_(shares) {}

/// The abort flag of the build, with a share of its progress: so many of 20 parts.
template <typename T>
IPC AsyncOrvaPyramidBuilder<T>::Share(double weight) const {
  constexpr double kParts = 20;
  return {GetIPC().abort,
          ProgressReportPtr(new ScaledProgressReport(GetIPC().progress, kParts, weight))};
}

template <typename T>
bool AsyncOrvaPyramidBuilder<T>::Open(Rasters& rasters) {
  if (!rasters.source.Reader() || !rasters.pyramid.Reader()) return false;
  rasters.plain = makeRaster_(rasters.source.Reader(), rasters.source.Source(),
                              RasterReaderPtr<T>(), RasterDataConnectionPtr());
  rasters.full = makeRaster_(rasters.source.Reader(), rasters.source.Source(),
                             rasters.pyramid.Reader(), rasters.pyramid.Source());
  return rasters.plain && rasters.full;
}

template <typename T>
void AsyncOrvaPyramidBuilder<T>::Execute() {
  if (shares_.scope != nullptr && shares_.scope->IsShare()) {
    if (!MakeShare()) this->Fail("the levels of the share could not be made");
    return;
  }
  if (!Build() || IsAborted()) return;
  // The store's other connection has gone: what is whole takes its place.
  if (!owner_.Refresh()) Fail("the pyramid could not take its place");
}

/// False when something failed. True as well after an abort.
template <typename T>
bool AsyncOrvaPyramidBuilder<T>::Build() {
  const auto fail = [this](const char* otherwise) {
    this->Fail(otherwise);
    return false;
  };
  Rasters rasters(order_);
  if (!Open(rasters)) return fail("the raster or its pyramid can't be opened again");
  if (!MakeLevels(rasters)) return fail("the levels could not be made");
  if (IsAborted()) return true;
  if (!rasters.full->PyramidRefresh()) return fail("the levels are not whole");
  if (!MakeHistogram(rasters)) return fail("the statistics could not be stored");
  return true;
}

/// Writes the levels; with them, or behind them, the statistics. True as well after an abort.
template <typename T>
bool AsyncOrvaPyramidBuilder<T>::MakeLevels(const Rasters& rasters) {
  const PyramidPlan<T> plan{rasters.plain, rasters.full, order_.def.levelMin, order_.def.levelMax,
                            order_.tiles.height};
  if (shares_.scope != nullptr) return JoinShares(rasters);
  const LevelReduction reduction = ReductionOf(order_.def.resamplingMethod);
  if (reduction != LevelReduction::kTold) return MakeReduced(plan, reduction);
  if constexpr (std::is_arithmetic_v<T>) {
    const bool isMorten = ChoosePyramidPath(rasters.plain->GetRasterDef()) == PyramidPath::kMorten;
    constexpr double kWithoutStats = 18, kWithStats = 19;
    stats_.Reset(new RasterStats<T>);
    RasterPyramidDecimateRasterStatsProcess<T, RasterStats<T>> levels(
        plan, stats_, &owner_, Share(isMorten ? kWithoutStats : kWithStats));
    if (!levels.RunProcess(levels.kHere)) return false;
    return !isMorten || IsAborted() || CollectStats(rasters.plain);
  } else {
    RasterPyramidDecimateRasterProcess<T> levels(plan, &owner_, GetIPC());
    return levels.RunProcess(levels.kHere);
  }
}

/// The statistics of the raster, in a pass of their own.
template <typename T>
bool AsyncOrvaPyramidBuilder<T>::CollectStats(const RasterPtr<T>& raster) {
  if constexpr (std::is_arithmetic_v<T>) {
    const RasterIteratorPtr<T> blocks(new RasterIteratorStream<T>(raster));
    RasterStatsProcess<T, RasterStats<T>> stats(blocks, stats_, Share(1));
    return stats.RunProcess(stats.kHere);
  } else {
    return true;
  }
}

/// Makes the levels of a share, with the sums of its statistics, and no pyramid file.
template <typename T>
bool AsyncOrvaPyramidBuilder<T>::MakeShare() {
  const detail::BuilderConnection<T> source(order_.source);
  if (!source.Reader()) return false;
  const RasterPtr<T> plain = makeRaster_(source.Reader(), source.Source(), RasterReaderPtr<T>(),
                                         RasterDataConnectionPtr());
  if (!plain) return false;
  ObjectPtr stats;
  if constexpr (std::is_arithmetic_v<T>) {
    stats_.Reset(new RasterStats<T>);
    stats = stats_;
  }
  const PyramidPlan<T> plan{plain, RasterPtr<T>(), order_.def.levelMin, order_.def.levelMax,
                            order_.tiles.height};
  return SharedLevels<T>(plan, ReductionOf(order_.def.resamplingMethod), *shares_.scope, stats,
                         GetIPC())
      .MakeShare(shares_.packing);
}

/// MakeLevels, out of the files of shares.
template <typename T>
bool AsyncOrvaPyramidBuilder<T>::JoinShares(const Rasters& rasters) {
  auto* const store = dynamic_cast<PackedLevels*>(rasters.pyramid.Reader().Get());
  if (store == nullptr) return false;
  ObjectPtr stats;
  if constexpr (std::is_arithmetic_v<T>) {
    stats_.Reset(new RasterStats<T>);
    stats_->Reset(rasters.plain->Bands());
    stats = stats_;
  }
  constexpr double kAll = 19;  // of 20 parts of the progress
  const PyramidPlan<T> plan{rasters.plain, rasters.full, order_.def.levelMin, order_.def.levelMax,
                            order_.tiles.height};
  SharedLevels<T> levels(plan, ReductionOf(order_.def.resamplingMethod), *shares_.scope, stats,
                         Share(kAll));
  if (!levels.Join(*store)) return false;
  if (IsAborted()) return true;
  if constexpr (std::is_arithmetic_v<T>) {
    if (!stats_->Finish()) return false;
  }
  owner_.OnLevelsWritten();
  return true;
}

/// MakeLevels, of means or modes.
template <typename T>
bool AsyncOrvaPyramidBuilder<T>::MakeReduced(const PyramidPlan<T>& plan, LevelReduction reduction) {
  const auto groups = GroupsOfBands(plan.source->Bands(), plan.tileSide);
  const bool isTogether = groups.size() == 1;
  ObjectPtr stats;
  if constexpr (std::is_arithmetic_v<T>) {
    stats_.Reset(new RasterStats<T>);
    stats_->Reset(plan.source->Bands());
    if (isTogether) stats = stats_;
  }
  constexpr double kAll = 18;  // of 20 parts of the progress
  for (const Array<unsigned>& bands : groups) {
    const IPC share = Share(kAll / static_cast<double>(groups.size()));
    if (!ReducedLevels<T>::Make(plan, reduction, bands, stats, share)) return false;
    if (IsAborted()) return true;
  }
  owner_.OnLevelsWritten();
  return isTogether || CollectStats(plan.source);
}

/// Counts a histogram of a small level, and leaves the owner with it and with the statistics.
template <typename T>
bool AsyncOrvaPyramidBuilder<T>::MakeHistogram(const Rasters& rasters) {
  if constexpr (std::is_arithmetic_v<T>) {
    const unsigned number = ChooseHistogramLevel(rasters.full->Samples(), rasters.full->Lines(),
                                                 order_.def.levelMin, order_.def.levelMax);
    const bool isStored = number != 0 || order_.def.levelMin == 0;
    const RasterPtr<T> level = isStored ? rasters.full->PyramidLevel(number) : rasters.full;
    if (!level || !level->IsValid()) return false;

    level->SetStatsMode(StatsMode::kBasic);
    const IPC apart(GetIPC().abort, ProgressReportPtr(new StandardProgressReport));
    const unsigned bands = level->Bands();
    Array<T> mins{ArrayDims(bands)}, maxes{ArrayDims(bands)};
    for (unsigned band = 0; band < bands; ++band) {
      constexpr unsigned kWanted = StatsMask::Min | StatsMask::Max;
      const auto stats = level->ComputeBandStats(band, kWanted, apart);
      if ((stats.mask & kWanted) != kWanted && !IsAborted()) return false;  // with the fault set
      mins[band] = stats.min;
      maxes[band] = stats.max;
    }
    if (IsAborted()) return true;
    const RasterHistogramPtr<T> histogram = order_.def.bins == Form::kExact
                                                ? detail::ExactHistogram(mins, maxes)
                                                : detail::ToldHistogram(mins, maxes);
    const RasterIteratorPtr<T> blocks(new RasterIteratorStream<T>(level));
    detail::BuildResults<T> results(owner_);
    RasterHistogramCallbackProcess<T> counting(blocks, histogram, stats_, &results, Share(1));
    return counting.RunProcess(counting.kHere) && (IsAborted() || results.AreStored());
  } else {
    return true;  // complex pixels have none
  }
}

}  // namespace lumo
