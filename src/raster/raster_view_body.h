#pragma once

#include "raster/raster_view.h"

namespace lumo {

/// What `call` gives for the parent; 0, false or empty when there is none.
template <typename T>
template <typename Call>
auto RasterView<T>::Ask(const Call& call) const {
  using Result = decltype(call(*parent_));
  if constexpr (std::is_void_v<Result>) {
    if (!parent_.IsNull()) call(*parent_);
  } else {
    return parent_.IsNull() ? Result() : call(*parent_);
  }
}

template <typename T>
bool RasterView<T>::IsValid() const {
  return Raster<T>::IsValid() && Ask([](Raster<T>& parent) { return parent.IsValid(); });
}

template <typename T>
bool RasterView<T>::CanWrite() const {
  return Ask([](Raster<T>& parent) { return parent.CanWrite(); });
}

template <typename T>
RasterDef RasterView<T>::GetRasterDef() const {
  return Ask([](Raster<T>& parent) { return parent.GetRasterDef(); });
}

template <typename T>
bool RasterView<T>::PyramidExists() const {
  return Ask([](Raster<T>& parent) { return parent.PyramidExists(); });
}

template <typename T>
PyramidDef RasterView<T>::GetPyramidDef() const {
  return Ask([](Raster<T>& parent) { return parent.GetPyramidDef(); });
}

template <typename T>
AsyncPtr RasterView<T>::PyramidBuild(const PyramidDef& def, const lumo::TileDimensions& tiles,
                                     const AsyncCallbackPtr& callback) {
  return Ask([&](Raster<T>& parent) { return parent.PyramidBuild(def, tiles, callback); });
}

template <typename T>
AsyncPtr RasterView<T>::PyramidAsync() const {
  return Ask([](Raster<T>& parent) { return parent.PyramidAsync(); });
}

template <typename T>
bool RasterView<T>::PyramidDelete() {
  return Ask([](Raster<T>& parent) { return parent.PyramidDelete(); });
}

template <typename T>
bool RasterView<T>::PyramidRefresh() {
  return Ask([](Raster<T>& parent) { return parent.PyramidRefresh(); });
}

template <typename T>
bool RasterView<T>::StatsExist(unsigned band, unsigned mask) const {
  return Ask([&](Raster<T>& parent) { return parent.StatsExist(band, mask); });
}

template <typename T>
AsyncPtr RasterView<T>::StatsBuild(const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.StatsBuild(ipc); });
}

template <typename T>
AsyncPtr RasterView<T>::StatsAsync() const {
  return Ask([](Raster<T>& parent) { return parent.StatsAsync(); });
}

template <typename T>
void RasterView<T>::SetStatsMode(lumo::StatsMode mode) {
  return Ask([&](Raster<T>& parent) { return parent.SetStatsMode(mode); });
}

template <typename T>
lumo::StatsMode RasterView<T>::StatsMode() const {
  return Ask([](Raster<T>& parent) { return parent.StatsMode(); });
}

template <typename T>
bool RasterView<T>::WriteStats() {
  return Ask([](Raster<T>& parent) { return parent.WriteStats(); });
}

template <typename T>
double RasterView<T>::Mean(unsigned band, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.Mean(band, ipc); });
}

template <typename T>
double RasterView<T>::Std(unsigned band, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.Std(band, ipc); });
}

template <typename T>
double RasterView<T>::Sum(unsigned band, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.Sum(band, ipc); });
}

template <typename T>
double RasterView<T>::Sum2(unsigned band, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.Sum2(band, ipc); });
}

template <typename T>
double RasterView<T>::RMS(unsigned band, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.RMS(band, ipc); });
}

template <typename T>
double RasterView<T>::SumXY(unsigned band, unsigned otherBand, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.SumXY(band, otherBand, ipc); });
}

template <typename T>
double RasterView<T>::Cov(unsigned band, unsigned otherBand, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.Cov(band, otherBand, ipc); });
}

template <typename T>
AsyncPtr RasterView<T>::HistogramAsync() const {
  return Ask([](Raster<T>& parent) { return parent.HistogramAsync(); });
}

template <typename T>
bool RasterView<T>::WriteHistogram() {
  return Ask([](Raster<T>& parent) { return parent.WriteHistogram(); });
}

template <typename T>
unsigned RasterView<T>::Samples() const {
  return Ask([](Raster<T>& parent) { return parent.Samples(); });
}

template <typename T>
unsigned RasterView<T>::Lines() const {
  return Ask([](Raster<T>& parent) { return parent.Lines(); });
}

template <typename T>
unsigned RasterView<T>::Bands() const {
  return Ask([](Raster<T>& parent) { return parent.Bands(); });
}

template <typename T>
bool RasterView<T>::HasNoDataValue(unsigned band) const {
  return Ask([&](Raster<T>& parent) { return parent.HasNoDataValue(band); });
}

template <typename T>
bool RasterView<T>::HasPalette(unsigned band) const {
  return Ask([&](Raster<T>& parent) { return parent.HasPalette(band); });
}

template <typename T>
PalettePtr RasterView<T>::Palette(unsigned band) const {
  return Ask([&](Raster<T>& parent) { return parent.Palette(band); });
}

template <typename T>
bool RasterView<T>::WritePalette(unsigned band, const PalettePtr& palette) {
  return Ask([&](Raster<T>& parent) { return parent.WritePalette(band, palette); });
}

template <typename T>
bool RasterView<T>::DeletePalette(unsigned band) {
  return Ask([&](Raster<T>& parent) { return parent.DeletePalette(band); });
}

template <typename T>
void RasterView<T>::SetTileDimensions(const lumo::TileDimensions& tiles) {
  return Ask([&](Raster<T>& parent) { return parent.SetTileDimensions(tiles); });
}

template <typename T>
lumo::TileDimensions RasterView<T>::TileDimensions() const {
  return Ask([](Raster<T>& parent) { return parent.TileDimensions(); });
}

template <typename T>
RasterPtr<T> RasterView<T>::PyramidLevel(unsigned level) {
  return Ask([&](Raster<T>& parent) { return parent.PyramidLevel(level); });
}

template <typename T>
RasterPtr<T> RasterView<T>::StoredPyramidLevel(unsigned level) {
  return Ask([&](Raster<T>& parent) { return parent.StoredPyramidLevel(level); });
}

template <typename T>
void RasterView<T>::SetBandStats(const RasterBandStats<T>& stats) {
  return Ask([&](Raster<T>& parent) { return parent.SetBandStats(stats); });
}

template <typename T>
RasterBandStats<T> RasterView<T>::BandStats(unsigned band) const {
  return Ask([&](Raster<T>& parent) { return parent.BandStats(band); });
}

template <typename T>
T RasterView<T>::Min(unsigned band, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.Min(band, ipc); });
}

template <typename T>
T RasterView<T>::Max(unsigned band, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.Max(band, ipc); });
}

template <typename T>
void RasterView<T>::SetBandHistogram(const RasterBandHistogram<T>& histogram) {
  return Ask([&](Raster<T>& parent) { return parent.SetBandHistogram(histogram); });
}

template <typename T>
Array<RasterBandHistogram<T>> RasterView<T>::BandHistogram(unsigned band) const {
  return Ask([&](Raster<T>& parent) { return parent.BandHistogram(band); });
}

template <typename T>
AsyncPtr RasterView<T>::HistogramByBinSize(T lower, T upper, double binSize,
                                           const Array<unsigned>& bands, HistogramSign sign,
                                           const IPC& ipc) {
  return Ask([&](Raster<T>& parent) {
    return parent.HistogramByBinSize(lower, upper, binSize, bands, sign, ipc);
  });
}

template <typename T>
AsyncPtr RasterView<T>::HistogramByBinCount(T lower, T upper, unsigned binCount,
                                            const Array<unsigned>& bands, HistogramSign sign,
                                            const IPC& ipc) {
  return Ask([&](Raster<T>& parent) {
    return parent.HistogramByBinCount(lower, upper, binCount, bands, sign, ipc);
  });
}

template <typename T>
AsyncPtr RasterView<T>::HistogramAllBands(T lower, T upper, unsigned binCount, HistogramSign sign,
                                          const IPC& ipc) {
  return Ask([&](Raster<T>& parent) {
    return parent.HistogramAllBands(lower, upper, binCount, sign, ipc);
  });
}

template <typename T>
T RasterView<T>::NoDataValue(unsigned band) const {
  return Ask([&](Raster<T>& parent) { return parent.NoDataValue(band); });
}

template <typename T>
bool RasterView<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                               Interleave interleave, Array<T>& pixels,
                               Array<unsigned char>& state) {
  return Ask(
      [&](Raster<T>& parent) { return parent.GetSubRect(rect, bands, interleave, pixels, state); });
}

template <typename T>
bool RasterView<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                               Interleave interleave, Array<T>& pixels,
                               Array<unsigned char>& state) {
  return Ask(
      [&](Raster<T>& parent) { return parent.PutSubRect(rect, bands, interleave, pixels, state); });
}

template <typename T>
AsyncPtr RasterView<T>::CountHistogram(const HistogramRequest<T>& request, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) { return parent.CountHistogram(request, ipc); });
}

template <typename T>
std::uint64_t RasterView<T>::WriteCount() const {
  return Ask([](Raster<T>& parent) { return parent.WriteCount(); });
}

}  // namespace lumo
