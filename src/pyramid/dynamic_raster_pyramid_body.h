#pragma once

#include <algorithm>

#include "commands/share_scope.h"
#include "data/packed_levels.h"
#include "foundation/fault.h"
#include "pyramid/dynamic_raster_pyramid.h"

namespace lumo {

template <typename T>
DynamicRasterPyramid<T>::DynamicRasterPyramid(const RasterReaderPtr<T>& reader,
                                              const RasterDataConnectionPtr& connection,
                                              const RasterReaderPtr<T>& pyramidReader,
                                              const RasterDataConnectionPtr& pyramidConnection,
                                              const MakeSourceRaster<T>& makeRaster)
    : connection_(connection),
      pyramidConnection_(pyramidConnection),
      reader_(reader),
      pyramidReader_(pyramidReader),
      makeRaster_(makeRaster) {}

template <typename T>
DynamicRasterPyramid<T>::~DynamicRasterPyramid() {
  PyramidBuilderPtr builder;
  {
    const std::lock_guard lock(lock_);
    builder = builder_;
  }
  if (!builder) return;
  builder->Abort();
  builder->WaitFinished();
}

/// True while a build runs. The end of one is seen here first: what it has made is shown from then
/// on. Under the lock.
template <typename T>
bool DynamicRasterPyramid<T>::IsRunning() const {
  if (!builder_) return false;
  if (!builder_->IsFinished()) return true;
  if (!isEndTaken_ && !pyramidReader_->PyramidRefresh()) TakeFault();  // there need not be one
  isEndTaken_ = true;
  return false;
}

template <typename T>
bool DynamicRasterPyramid<T>::IsKeptByTheLibrary() const {
  return static_cast<PyramidType>(pyramidReader_->PyramidType()) == PyramidType::kOrva;
}

/// Runs a builder in the background. Under the lock.
template <typename T>
AsyncPtr DynamicRasterPyramid<T>::Start(const PyramidBuilderPtr& builder) {
  bandStats_.clear();
  bandHistograms_.clear();
  writes_ = reader_->WriteCount(0);
  builder_ = builder;
  isEndTaken_ = false;
  return SubmitAsync(builder, true) ? AsyncPtr(builder) : AsyncPtr();
}

template <typename T>
AsyncPtr DynamicRasterPyramid<T>::PyramidBuild(const PyramidDef& def, const TileDimensions& tiles,
                                               const AsyncCallbackPtr& callback) {
  const std::lock_guard lock(lock_);
  if (IsRunning()) return AsyncPtr(new DoneAsync(callback));
  PyramidOrder order{connection_->ConnectionStrings(), pyramidConnection_->ConnectionStrings(), def,
                     tiles};
  if (order.source.GetCount() == 0 || order.pyramid.GetCount() == 0) return {};
  constexpr unsigned kUsualSide = 256;
  if (order.tiles.height == 0) order.tiles.width = order.tiles.height = kUsualSide;

  PyramidShares shares{ShareScope::Current()};
  if (shares.scope != nullptr) {
    auto* const store = dynamic_cast<PackedLevels*>(pyramidReader_.Get());
    const auto packing = store != nullptr ? store->GetLevelPacking() : std::nullopt;
    if (!IsKeptByTheLibrary() || !packing) {
      SetFault("only pyramids in a file of the library's own are built in shares");
      return {};
    }
    shares.packing = *packing;
  }
  if (shares.scope != nullptr && shares.scope->IsShare()) {
    return Start(PyramidBuilderPtr(
        new AsyncOrvaPyramidBuilder<T>(*this, order, makeRaster_, callback, shares)));
  }
  if (IsKeptByTheLibrary()) {
    const bool isPrepared = pyramidReader_->PyramidBuild(
        static_cast<std::int32_t>(def.levelMin), static_cast<std::int32_t>(def.levelMax),
        static_cast<std::int32_t>(def.resamplingMethod), order.tiles);
    const bool isInside = std::ranges::equal(order.source, order.pyramid);
    if (isInside || !isPrepared) return {};
    return Start(PyramidBuilderPtr(
        new AsyncOrvaPyramidBuilder<T>(*this, order, makeRaster_, callback, shares)));
  }
  const auto type = static_cast<PyramidType>(pyramidReader_->PyramidType());
  if (type != PyramidType::kDriver) return {};
  return Start(PyramidBuilderPtr(new AsyncPyramidBuilder<T>(*this, order, callback)));
}

template <typename T>
AsyncPtr DynamicRasterPyramid<T>::PyramidAsync() const {
  const std::lock_guard lock(lock_);
  if (IsRunning()) return AsyncPtr(builder_);
  if (builder_ && builder_->HasError()) SetFault(builder_->GetFault());
  return {};
}

template <typename T>
bool DynamicRasterPyramid<T>::StatsExist(unsigned band, unsigned mask) const {
  const std::lock_guard lock(lock_);
  return !IsRunning() && ResultsHold() &&
         std::ranges::any_of(bandStats_, [&](const RasterBandStats<T>& stats) {
           return stats.band == band && (stats.mask & mask) == mask;
         });
}

template <typename T>
RasterBandStats<T> DynamicRasterPyramid<T>::BandStats(unsigned band) const {
  const std::lock_guard lock(lock_);
  for (const RasterBandStats<T>& stats : bandStats_) {
    if (stats.band == band && ResultsHold()) return stats;
  }
  RasterBandStats<T> none;
  none.band = band;
  return none;
}

template <typename T>
Array<RasterBandHistogram<T>> DynamicRasterPyramid<T>::BandHistogram(unsigned band) const {
  const std::lock_guard lock(lock_);
  Array<RasterBandHistogram<T>> list;
  if constexpr (std::is_arithmetic_v<T>) {
    const auto ofBand = [band](const auto& histogram) { return histogram.band == band; };
    const auto count = static_cast<unsigned>(std::ranges::count_if(bandHistograms_, ofBand));
    if (count != 0 && ResultsHold() && list.Resize(ArrayDims(count))) {
      std::ranges::copy_if(bandHistograms_, list.begin(), ofBand);
    }
  }
  return list;
}

namespace detail {

template <typename E>
Array<E> ArrayOf(const std::vector<E>& values) {
  Array<E> array;
  if (!values.empty() && array.Resize(ArrayDims(static_cast<unsigned>(values.size())))) {
    std::ranges::copy(values, array.begin());
  }
  return array;
}

}  // namespace detail

template <typename T>
void DynamicRasterPyramid<T>::OnLevelsWritten() {
  Array<RasterBandStats<T>> stats;
  {
    const std::lock_guard lock(lock_);
    stats = detail::ArrayOf(bandStats_);
  }
  if (stats.GetCount() != 0 && IsKeptByTheLibrary() && pyramidReader_->CanWriteStats()) {
    pyramidReader_->WriteStats(stats);
  }
  if (Refresh()) return;
  const std::lock_guard lock(lock_);
  levelsFault_ = TakeFault();
}

/// False, with the fault set, where the levels that were made can't be shown: what belongs to them
/// would go elsewhere.
template <typename T>
bool DynamicRasterPyramid<T>::AreLevelsShown() const {
  if (!IsKeptByTheLibrary() || pyramidReader_->PyramidExists()) return true;
  const std::lock_guard lock(lock_);
  SetFault(levelsFault_);
  return false;
}

template <typename T>
bool DynamicRasterPyramid<T>::Refresh() {
  return pyramidReader_->PyramidRefresh();
}

/// False, with the fault set, when the raster has been written to since the build began: nothing
/// that was computed on the way is known to hold. Under the lock.
template <typename T>
bool DynamicRasterPyramid<T>::CanTakeResults() const {
  if (ResultsHold()) return true;
  SetFault(connection_->URI().ToUTF8() + ": was written to while its pyramid was built");
  return false;
}

template <typename T>
bool DynamicRasterPyramid<T>::TakeHistogram(const RasterHistogram<T>& histogram,
                                            HistogramSign sign) requires(std::is_arithmetic_v<T>) {
  Array<RasterBandHistogram<T>> all;
  std::uint64_t writes = 0;
  {
    const std::lock_guard lock(lock_);
    if (!CanTakeResults()) return false;
    writes = writes_;
    for (unsigned band = 0; band < histogram.BandCount(); ++band) {
      RasterBandHistogram<T> taken = histogram.BandHistogram(band, band);
      taken.source = StatsSource::kDynamic;
      taken.sign = sign;
      if (std::ranges::find(bandHistograms_, taken) == bandHistograms_.end()) {
        bandHistograms_.push_back(taken);
      }
    }
    all = detail::ArrayOf(bandHistograms_);
  }
  if (!AreLevelsShown()) return false;
  if (!pyramidReader_->CanWriteHistogram()) return true;
  if (!pyramidReader_->WriteHistogram(all)) return false;
  pyramidReader_->SetHistogramsHoldFor(writes);
  return true;
}

template <typename T>
bool DynamicRasterPyramid<T>::TakeStats(const RasterStats<T>& stats) requires(
    std::is_arithmetic_v<T>) {
  Array<RasterBandStats<T>> all;
  std::uint64_t writes = 0;
  {
    const std::lock_guard lock(lock_);
    if (!CanTakeResults()) return false;
    writes = writes_;
    for (unsigned band = 0; band < stats.Mins().GetCount(); ++band) {
      const auto same = std::ranges::find(bandStats_, band, &RasterBandStats<T>::band);
      if (same != bandStats_.end()) {
        *same = stats.BandStats(band);
      } else {
        bandStats_.push_back(stats.BandStats(band));
      }
    }
    all = detail::ArrayOf(bandStats_);
  }
  if (!AreLevelsShown()) return false;
  if (!pyramidReader_->CanWriteStats()) return true;
  if (!pyramidReader_->WriteStats(all)) return false;
  pyramidReader_->SetStatsHoldFor(writes);
  return true;
}

}  // namespace lumo
