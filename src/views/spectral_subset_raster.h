#pragma once

#include "raster/raster_def.h"
#include "raster/raster_view.h"

namespace lumo {

/// Shows bands of its parent in an order of its own; one may come twice. Its statistics and
/// histograms are the parent's, with the numbers of the bands translated, those in arrays of values
/// between bands as well. Exists for EightTypes.
///
/// Ownership: shares the parent, which does not know the view.
/// Threads:   every operation may run on many threads at once; nothing is stored per call.
/// Failure:   over an empty parent IsValid() is false and operations give false, 0 or empty. A band
///            that the view doesn't have reads as the parent's first.
template <typename T>
class SpectralSubsetRaster final : public RasterView<T> {
 public:
  /// @param bands  of the parent, in the order wanted.
  SpectralSubsetRaster(const RasterPtr<T>& parent, const Array<unsigned>& bands);

  URI GetURI() const override { return this->DefaultURI("SpectralSubsetRaster"); }
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Bands() const override { return def_.bands; }

  bool StatsExist(unsigned band, unsigned mask) const override;
  void SetBandStats(const RasterBandStats<T>& stats) override;
  RasterBandStats<T> BandStats(unsigned band) const override;
  T Min(unsigned band, const IPC& ipc) override;
  T Max(unsigned band, const IPC& ipc) override;
  double Mean(unsigned band, const IPC& ipc) override;
  double Std(unsigned band, const IPC& ipc) override;
  double Sum(unsigned band, const IPC& ipc) override;
  double Sum2(unsigned band, const IPC& ipc) override;
  double RMS(unsigned band, const IPC& ipc) override;
  double SumXY(unsigned band, unsigned otherBand, const IPC& ipc) override;
  double Cov(unsigned band, unsigned otherBand, const IPC& ipc) override;

  void SetBandHistogram(const RasterBandHistogram<T>& histogram) override;
  Array<RasterBandHistogram<T>> BandHistogram(unsigned band) const override;
  AsyncPtr HistogramByBinSize(T lower, T upper, double binSize, const Array<unsigned>& bands,
                              HistogramSign sign, const IPC& ipc) override;
  AsyncPtr HistogramByBinCount(T lower, T upper, unsigned binCount, const Array<unsigned>& bands,
                               HistogramSign sign, const IPC& ipc) override;
  AsyncPtr HistogramAllBands(T lower, T upper, unsigned binCount, HistogramSign sign,
                             const IPC& ipc) override;
  AsyncPtr CountHistogram(const HistogramRequest<T>& request, const IPC& ipc) override;

  bool HasNoDataValue(unsigned band) const override;
  T NoDataValue(unsigned band) const override;
  bool HasPalette(unsigned band) const override;
  PalettePtr Palette(unsigned band) const override;
  bool WritePalette(unsigned band, const PalettePtr& palette) override;
  bool DeletePalette(unsigned band) override;

  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;

 private:
  unsigned InParent(unsigned band) const { return band < map_.GetCount() ? map_[band] : 0; }
  Array<unsigned> InParent(const Array<unsigned>& bands) const;

  Array<unsigned> map_;  // the parent's band of each of the view's
  RasterDef def_;
};

VEXG_EXTERN(EIGHT, SpectralSubsetRaster);

}  // namespace lumo
