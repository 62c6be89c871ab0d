#pragma once

#include "foundation/async.h"
#include "foundation/color.h"
#include "foundation/sub_rect.h"
#include "raster/statistics_by_name.h"
#include "raster/tile_dimensions.h"

namespace lumo {

struct PyramidDef;
struct RasterDef;

/// A grid of Samples() by Lines() by Bands() pixels of one type, evaluated when somebody asks: the
/// part of Raster<T> that needs no pixel type. Bands are numbered from 0.
///
/// Nothing is computed until a block is asked for with Raster<T>::GetSubRect. A source reads or
/// holds pixels; a view asks the raster that it stands on and changes the answer.
///
/// Ownership: held by BasicRasterPtr and RasterPtr<T>, and never copied. A view shares its parent,
///            which does not know it.
/// Threads:   every operation may be called on any thread, at the same time.
/// Failure:   operations give false, 0 or empty. A raster that could not be made has IsValid()
///            false.
class VEXG_EXPORT BasicRaster : public Object, public NumbersByName<BasicRaster> {
 public:
  static const unsigned TypeCode;

  BasicRaster() = default;
  BasicRaster(const BasicRaster&) = delete;
  BasicRaster& operator=(const BasicRaster&) = delete;

  bool IsA(unsigned typeCode) const override;

  /// The code of the pixel type, see pixel_types.h.
  virtual unsigned DataType() const = 0;
  /// True when PutSubRect can succeed.
  virtual bool CanWrite() const = 0;
  /// The description of this raster as it shows itself: a view's own size, bands and place, not its
  /// parent's. It is put together at each call, so ask once.
  virtual RasterDef GetRasterDef() const = 0;

  /// True when a pyramid of any kind can be read.
  virtual bool PyramidExists() const = 0;
  /// The pyramid that can be read; pyramidType kNone when there is none.
  virtual PyramidDef GetPyramidDef() const = 0;
  /// Starts to build a pyramid, in the background.
  /// @param tiles     how the levels are stored; all zero for no preference.
  /// @param callback  hears start, progress and end; may be empty.
  /// @return the build, to be waited for; empty when none could be started.
  virtual AsyncPtr PyramidBuild(const PyramidDef& def, const lumo::TileDimensions& tiles,
                                const AsyncCallbackPtr& callback) = 0;
  /// The build that runs now; empty when none does.
  virtual AsyncPtr PyramidAsync() const = 0;
  /// Removes the pyramid that the source keeps. False when that can't be done.
  virtual bool PyramidDelete() = 0;
  /// Looks again at the pyramid that the source keeps, so that levels which others have made can be
  /// read. False when it holds none that is whole.
  virtual bool PyramidRefresh() = 0;

  /// True when all statistics of `mask`, bits of StatsMask, are at hand without reading pixels.
  virtual bool StatsExist(unsigned band, unsigned mask) const = 0;
  /// Starts to compute statistics in the current mode. Empty when that could not be started.
  virtual AsyncPtr StatsBuild(const IPC& ipc) = 0;
  /// The computation that runs now; empty when none does.
  virtual AsyncPtr StatsAsync() const = 0;
  /// Chooses what computations from now on give: kBasic is quicker, kExtended has the pairs of
  /// bands.
  virtual void SetStatsMode(lumo::StatsMode mode) = 0;
  virtual lumo::StatsMode StatsMode() const = 0;
  /// Stores the statistics at hand through the data source. False for a source that keeps none.
  virtual bool WriteStats() = 0;

  /// A statistic as a number, as Mean and the like give it: Raster<T>::StatOf without the pixel.
  virtual double NumberOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                          const IPC& ipc) = 0;

  /// The histogram run that goes on now; empty when none does.
  virtual AsyncPtr HistogramAsync() const = 0;
  /// Stores the histograms at hand through the data source. False for a source that keeps none.
  virtual bool WriteHistogram() = 0;

  virtual unsigned Samples() const = 0;  ///< pixels of a line
  virtual unsigned Lines() const = 0;    ///< lines of the raster
  virtual unsigned Bands() const = 0;    ///< values of a pixel
  /// True when pixels of the band that hold one value, NoDataValue, are not valid.
  virtual bool HasNoDataValue(unsigned band) const = 0;
  /// True when the band's values are indices of colours.
  virtual bool HasPalette(unsigned band) const = 0;
  /// The colour table of a band; empty when it has none.
  virtual PalettePtr Palette(unsigned band) const = 0;
  /// Stores a colour table for the band through the data source. False when it can't be stored.
  virtual bool WritePalette(unsigned band, const PalettePtr& palette) = 0;
  /// Removes the band's colour table from the data source. False when it can't.
  virtual bool DeletePalette(unsigned band) = 0;

  /// Sets the preferred blocks, of a raster that has a use for it.
  virtual void SetTileDimensions(const lumo::TileDimensions& tiles) = 0;
  /// The native blocks of the source: width and height, the rest 0.
  virtual lumo::TileDimensions TileDimensions() const = 0;

 protected:
  /// The default identifier under the name of a class: "{name}@" and the address.
  URI DefaultURI(const char* className) const;
};

using BasicRasterPtr = Pointer<BasicRaster>;

template <typename T>
class Raster;
template <typename T>
using RasterPtr = Pointer<Raster<T>>;

/// A raster of pixel type T, one of TwelveTypes: BasicRaster with the operations that see pixels.
///
///     const RasterPtr<float> raster(catalog::Find(uri));  // empty for another pixel type
///     if (raster.IsNull()) return false;
///     const Array<unsigned> bands = AllBands(*raster);
///     Array<float> pixels;
///     Array<unsigned char> state;
///     if (!raster->GetSubRect({0, 0, 255, 255}, bands, Interleave::BSQ, pixels, state)) {
///       return false;  // TakeFault() says why
///     }
///     if (IsValidState(state[0])) total += pixels[0];
///
/// Whoever reads all of a raster uses an iterator, or the functions of tile_functions.h, which
/// choose blocks that suit the source. Each call costs a way through all views down to the source's
/// thread.
template <typename T>
class Raster : public BasicRaster,
               public ExtremesByName<Raster<T>, T>,
               public HistogramsByName<Raster<T>, T> {
 public:
  static const unsigned TypeCode;

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || BasicRaster::IsA(typeCode);
  }
  unsigned DataType() const override { return kDataTypeOf<T>; }

  /// A raster of a reduced level, from 1: each level halves samples and lines. Empty when there is
  /// none.
  virtual RasterPtr<T> PyramidLevel(unsigned level) = 0;
  /// As PyramidLevel, but only from a pyramid that the library keeps in a file of its own.
  virtual RasterPtr<T> StoredPyramidLevel(unsigned level) = 0;

  /// Enters known statistics of one band by hand.
  virtual void SetBandStats(const RasterBandStats<T>& stats) = 0;
  /// The statistics at hand, without computing; `mask` of the result says which ones.
  virtual RasterBandStats<T> BandStats(unsigned band) const = 0;
  /// How many valid pixels were counted; 0 for a raster that does not count them.
  virtual std::uint64_t PixelCount(unsigned /*band*/, const IPC& /*ipc*/) { return 0; }
  /// The value of one statistic, computed when it isn't at hand: the one question behind Min, Max,
  /// Mean and the like. 0 on a failure.
  /// @param otherBand  of SumXY and Cov alone, which need StatsMode::kExtended.
  virtual StatValue<T> StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                              const IPC& ipc) = 0;
  double NumberOf(StatsMask::Code stat, unsigned band, unsigned otherBand, const IPC& ipc) final {
    return StatOf(stat, band, otherBand, ipc).number;
  }
  /// The statistics of a band that `mask` names, those not at hand computed. A source may hold some
  /// of them, of pixels that have changed since; then all come from one computation. The mask of
  /// the result says which ones are there: none after a failure.
  /// @param shares  how many such calls, one after the other, share the progress.
  RasterBandStats<T> ComputeBandStats(unsigned band, unsigned mask, const IPC& ipc,
                                      unsigned shares = 1);

  /// Enters a known histogram by hand.
  virtual void SetBandHistogram(const RasterBandHistogram<T>& histogram) = 0;
  /// All the histograms at hand for the band.
  virtual Array<RasterBandHistogram<T>> BandHistogram(unsigned band) const = 0;
  /// Starts to count histograms, in either form of bins. Empty when that could not be started.
  virtual AsyncPtr CountHistogram(const HistogramRequest<T>& request, const IPC& ipc) = 0;

  /// The value that makes a pixel of the band count for nothing; 0 when HasNoDataValue is false.
  virtual T NoDataValue(unsigned band) const = 0;

  /// Reads a block: the one way by which pixels travel.
  /// @param rect    pixels of this raster, corners inclusive; the caller stays within Samples() by
  ///                Lines().
  /// @param bands   in the order wanted; one may come twice.
  /// @param interleave  the order of the axes; None for one band.
  /// @param pixels  [out] resized to BlockDims of the block.
  /// @param state   [out] same shape, bits of PixelValueState; 0 is a valid pixel. A pixel that
  ///                isn't valid has whatever value the source holds there.
  /// @return false unless the whole block was delivered; the arrays then mean nothing.
  virtual bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                          Array<T>& pixels, Array<unsigned char>& state) = 0;

  /// Writes a block; arguments as for GetSubRect, with `state` as the caller holds it, which a
  /// raster may ignore. @return false unless the whole block was taken.
  virtual bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                          Array<T>& pixels, Array<unsigned char>& state) = 0;

  /// How often pixels that this raster shows have been written, by whatever way: a view gives what
  /// the rasters that it stands on give. Statistics and histograms hold for one such number.
  virtual std::uint64_t WriteCount() const { return 0; }
};

VEXG_EXTERN(TWELVE, Raster);

}  // namespace lumo
