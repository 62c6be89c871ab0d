#pragma once

#include "raster/raster.h"
#include "raster/raster_def.h"

namespace lumo {

/// A raster that stands on another one and leaves every operation to it: the base of the views,
/// which write only what they change.
///
/// Over an empty parent IsValid() is false, and operations give false, 0 or empty. GetURI and
/// PixelCount are the view's own. Exists for TwelveTypes.
template <typename T>
class RasterView : public Raster<T> {
 public:
  explicit RasterView(const RasterPtr<T>& parent = {}) : parent_(parent) {}

  bool IsValid() const override;
  bool CanWrite() const override;
  RasterDef GetRasterDef() const override;
  bool PyramidExists() const override;
  PyramidDef GetPyramidDef() const override;
  AsyncPtr PyramidBuild(const PyramidDef& def, const lumo::TileDimensions& tiles,
                        const AsyncCallbackPtr& callback) override;
  AsyncPtr PyramidAsync() const override;
  bool PyramidDelete() override;
  bool PyramidRefresh() override;
  bool StatsExist(unsigned band, unsigned mask) const override;
  AsyncPtr StatsBuild(const IPC& ipc) override;
  AsyncPtr StatsAsync() const override;
  void SetStatsMode(lumo::StatsMode mode) override;
  lumo::StatsMode StatsMode() const override;
  bool WriteStats() override;
  double Mean(unsigned band, const IPC& ipc) override;
  double Std(unsigned band, const IPC& ipc) override;
  double Sum(unsigned band, const IPC& ipc) override;
  double Sum2(unsigned band, const IPC& ipc) override;
  double RMS(unsigned band, const IPC& ipc) override;
  double SumXY(unsigned band, unsigned otherBand, const IPC& ipc) override;
  double Cov(unsigned band, unsigned otherBand, const IPC& ipc) override;
  AsyncPtr HistogramAsync() const override;
  bool WriteHistogram() override;
  unsigned Samples() const override;
  unsigned Lines() const override;
  unsigned Bands() const override;
  bool HasNoDataValue(unsigned band) const override;
  bool HasPalette(unsigned band) const override;
  PalettePtr Palette(unsigned band) const override;
  bool WritePalette(unsigned band, const PalettePtr& palette) override;
  bool DeletePalette(unsigned band) override;
  void SetTileDimensions(const lumo::TileDimensions& tiles) override;
  lumo::TileDimensions TileDimensions() const override;
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned level) override;
  void SetBandStats(const RasterBandStats<T>& stats) override;
  RasterBandStats<T> BandStats(unsigned band) const override;
  T Min(unsigned band, const IPC& ipc) override;
  T Max(unsigned band, const IPC& ipc) override;
  void SetBandHistogram(const RasterBandHistogram<T>& histogram) override;
  Array<RasterBandHistogram<T>> BandHistogram(unsigned band) const override;
  AsyncPtr HistogramByBinSize(T lower, T upper, double binSize, const Array<unsigned>& bands,
                              HistogramSign sign, const IPC& ipc) override;
  AsyncPtr HistogramByBinCount(T lower, T upper, unsigned binCount, const Array<unsigned>& bands,
                               HistogramSign sign, const IPC& ipc) override;
  AsyncPtr HistogramAllBands(T lower, T upper, unsigned binCount, HistogramSign sign,
                             const IPC& ipc) override;
  T NoDataValue(unsigned band) const override;
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  AsyncPtr CountHistogram(const HistogramRequest<T>& request, const IPC& ipc) override;
  std::uint64_t WriteCount() const override;

 protected:
  const RasterPtr<T>& Parent() const { return parent_; }
  /// Lets go of the parent, as a destructor does that needs it closed.
  void ResetParent() { parent_ = RasterPtr<T>(); }

 private:
  template <typename Call>
  auto Ask(const Call& call) const;

  RasterPtr<T> parent_;
};

VEXG_EXTERN(TWELVE, RasterView);

}  // namespace lumo
