#pragma once

#include "raster/raster.h"
#include "raster/raster_def.h"

namespace lumo {

/// A raster that stands on another one and leaves every operation to it: the base of the views,
/// which write only what they change. A view of other places overrides PlaceInParent, one of other
/// bands BandOrder, and one of other states or values GetSubRect.
///
///     template <typename T>
///     class LowerHalf final : public RasterView<T> {
///      public:
///       using RasterView<T>::RasterView;
///       unsigned Lines() const override { return RasterView<T>::Lines() - First(); }
///
///      protected:
///       SubRect PlaceInParent(const SubRect& rect) const override {
///         return {rect.left, rect.top + First(), rect.right, rect.bottom + First()};
///       }
///
///      private:
///       unsigned First() const { return RasterView<T>::Lines() / 2; }
///     };
///
/// Such a view also overrides GetRasterDef, for its size and place, and the statistics, which are
/// the parent's unless it says otherwise; views/computed_raster.h has views with statistics of
/// their own.
///
/// Over an empty parent IsValid() is false, and operations give false, 0 or empty. GetURI and
/// PixelCount are the view's own. Exists for TwelveTypes.
template <typename T>
class RasterView : public Raster<T> {
 public:
  /// @param parent  is shared; an empty one makes a view that is not valid.
  explicit RasterView(const RasterPtr<T>& parent = {}) : parent_(parent) {}

  /// True over a valid parent.
  bool IsValid() const override;
  /// As the parent's.
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
  StatValue<T> StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                      const IPC& ipc) override;
  void SetBandHistogram(const RasterBandHistogram<T>& histogram) override;
  Array<RasterBandHistogram<T>> BandHistogram(unsigned band) const override;
  AsyncPtr CountHistogram(const HistogramRequest<T>& request, const IPC& ipc) override;
  T NoDataValue(unsigned band) const override;
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  std::uint64_t WriteCount() const override;

 protected:
  /// The raster that this one stands on; may be empty.
  const RasterPtr<T>& Parent() const { return parent_; }
  /// The pixels of the parent that a block of the view stands on.
  virtual SubRect PlaceInParent(const SubRect& rect) const { return rect; }
  /// The parent's band behind each band of the view, in order; null where they are the same. Every
  /// answer about a band then is the parent's with its numbers translated, in arrays of statistics
  /// between bands as well. A band that the view doesn't have is the parent's first.
  virtual const Array<unsigned>* BandOrder() const { return nullptr; }
  /// Lets go of the parent, as a destructor does that needs it closed.
  void ResetParent() { parent_ = RasterPtr<T>(); }

 private:
  template <typename Call>
  auto Ask(const Call& call) const;
  template <typename Call>
  auto AskBand(unsigned band, const Call& call) const;
  template <typename Call>
  bool AskBlock(const Array<unsigned>& bands, const Call& call) const;

  RasterPtr<T> parent_;
};

VEXG_EXTERN(TWELVE, RasterView);

}  // namespace lumo
