#pragma once

#include "raster/band_order.h"
#include "raster/raster_view.h"

namespace lumo {

/// Gives the result of `call` for the parent; 0, false or empty when there is none.
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

/// Gives the result of `call(parent, its number of the band)`.
template <typename T>
template <typename Call>
auto RasterView<T>::AskBand(unsigned band, const Call& call) const {
  return Ask([&](Raster<T>& parent) { return call(parent, BandIn(BandOrder(), band)); });
}

/// Gives the result of `call(parent, its numbers of the bands)`.
template <typename T>
template <typename Call>
bool RasterView<T>::AskBlock(const Array<unsigned>& bands, const Call& call) const {
  return Ask([&](Raster<T>& parent) {
    const Array<unsigned>* const order = BandOrder();
    return order != nullptr ? call(parent, BandsIn(*order, bands)) : call(parent, bands);
  });
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
  return Ask([&](Raster<T>& parent) {
    RasterDef def = parent.GetRasterDef();
    if (const Array<unsigned>* const order = BandOrder()) ChooseBands(def, *order);
    return def;
  });
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
  return AskBand(band,
                 [&](Raster<T>& parent, unsigned asked) { return parent.StatsExist(asked, mask); });
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
  return Ask([&](Raster<T>& parent) {
    const Array<unsigned>* const order = BandOrder();
    return order != nullptr ? order->GetCount() : parent.Bands();
  });
}

template <typename T>
bool RasterView<T>::HasNoDataValue(unsigned band) const {
  return AskBand(band,
                 [&](Raster<T>& parent, unsigned asked) { return parent.HasNoDataValue(asked); });
}

template <typename T>
bool RasterView<T>::HasPalette(unsigned band) const {
  return AskBand(band, [&](Raster<T>& parent, unsigned asked) { return parent.HasPalette(asked); });
}

template <typename T>
PalettePtr RasterView<T>::Palette(unsigned band) const {
  return AskBand(band, [&](Raster<T>& parent, unsigned asked) { return parent.Palette(asked); });
}

template <typename T>
bool RasterView<T>::WritePalette(unsigned band, const PalettePtr& palette) {
  return AskBand(
      band, [&](Raster<T>& parent, unsigned asked) { return parent.WritePalette(asked, palette); });
}

template <typename T>
bool RasterView<T>::DeletePalette(unsigned band) {
  return AskBand(band,
                 [](Raster<T>& parent, unsigned asked) { return parent.DeletePalette(asked); });
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
  Ask([&](Raster<T>& parent) {
    const Array<unsigned>* const order = BandOrder();
    if (order == nullptr) return parent.SetBandStats(stats);
    const RasterBandStats<T> known = parent.BandStats(BandIn(order, stats.band));
    parent.SetBandStats(StatsOfParent(stats, *order, known, parent.Bands()));
  });
}

template <typename T>
RasterBandStats<T> RasterView<T>::BandStats(unsigned band) const {
  return AskBand(band, [&](Raster<T>& parent, unsigned asked) {
    RasterBandStats<T> stats = parent.BandStats(asked);
    if (const Array<unsigned>* const order = BandOrder()) stats = StatsOfView(stats, *order, band);
    return stats;
  });
}

template <typename T>
StatValue<T> RasterView<T>::StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                                   const IPC& ipc) {
  const unsigned other = BandIn(BandOrder(), otherBand);
  return AskBand(band, [&](Raster<T>& parent, unsigned asked) {
    return parent.StatOf(stat, asked, other, ipc);
  });
}

template <typename T>
void RasterView<T>::SetBandHistogram(const RasterBandHistogram<T>& histogram) {
  AskBand(histogram.band, [&](Raster<T>& parent, unsigned asked) {
    RasterBandHistogram<T> mapped = histogram;
    mapped.band = asked;
    parent.SetBandHistogram(mapped);
  });
}

template <typename T>
Array<RasterBandHistogram<T>> RasterView<T>::BandHistogram(unsigned band) const {
  return AskBand(band, [&](Raster<T>& parent, unsigned asked) {
    auto histograms = parent.BandHistogram(asked);
    if (asked != band) {
      for (RasterBandHistogram<T>& histogram : histograms) histogram.band = band;
    }
    return histograms;
  });
}

template <typename T>
T RasterView<T>::NoDataValue(unsigned band) const {
  return AskBand(band,
                 [&](Raster<T>& parent, unsigned asked) { return parent.NoDataValue(asked); });
}

template <typename T>
bool RasterView<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                               Interleave interleave, Array<T>& pixels,
                               Array<unsigned char>& state) {
  return AskBlock(bands, [&](Raster<T>& parent, const Array<unsigned>& asked) {
    return parent.GetSubRect(PlaceInParent(rect), asked, interleave, pixels, state);
  });
}

template <typename T>
bool RasterView<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                               Interleave interleave, Array<T>& pixels,
                               Array<unsigned char>& state) {
  return AskBlock(bands, [&](Raster<T>& parent, const Array<unsigned>& asked) {
    return parent.PutSubRect(PlaceInParent(rect), asked, interleave, pixels, state);
  });
}

template <typename T>
AsyncPtr RasterView<T>::CountHistogram(const HistogramRequest<T>& request, const IPC& ipc) {
  return Ask([&](Raster<T>& parent) {
    const Array<unsigned>* const order = BandOrder();
    if (order == nullptr) return parent.CountHistogram(request, ipc);
    HistogramRequest<T> mapped = request;
    mapped.bands = request.bands.GetCount() != 0 ? BandsIn(*order, request.bands) : *order;
    return parent.CountHistogram(mapped, ipc);
  });
}

template <typename T>
std::uint64_t RasterView<T>::WriteCount() const {
  return Ask([](Raster<T>& parent) { return parent.WriteCount(); });
}

}  // namespace lumo
