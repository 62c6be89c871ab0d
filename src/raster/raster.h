#pragma once

#include "foundation/async.h"
#include "foundation/color.h"
#include "foundation/sub_rect.h"
#include "raster/statistics_by_name.h"
#include "raster/tile_dimensions.h"

namespace lumo {

struct PyramidDef;
struct RasterDef;

/// A grid of Samples() by Lines() by Bands() pixels of one type, evaluated when somebody asks: what
/// is known of it without its pixel type. Bands are numbered from 0.
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
  /// The description of this raster as it shows itself.
  virtual RasterDef GetRasterDef() const = 0;

  /// True when a pyramid of any kind can be read.
  virtual bool PyramidExists() const = 0;
  virtual PyramidDef GetPyramidDef() const = 0;
  /// Starts to build a pyramid. Empty when none could be started.
  virtual AsyncPtr PyramidBuild(const PyramidDef& def, const lumo::TileDimensions& tiles,
                                const AsyncCallbackPtr& callback) = 0;
  /// The build that runs now; empty when none does.
  virtual AsyncPtr PyramidAsync() const = 0;
  virtual bool PyramidDelete() = 0;
  /// Builds what is out of date.
  virtual bool PyramidRefresh() = 0;

  /// True when all statistics of `mask`, bits of StatsMask, are at hand without reading pixels.
  virtual bool StatsExist(unsigned band, unsigned mask) const = 0;
  /// Starts to compute statistics in the current mode. Empty when that could not be started.
  virtual AsyncPtr StatsBuild(const IPC& ipc) = 0;
  /// The computation that runs now; empty when none does.
  virtual AsyncPtr StatsAsync() const = 0;
  virtual void SetStatsMode(lumo::StatsMode mode) = 0;
  virtual lumo::StatsMode StatsMode() const = 0;
  /// Stores the statistics through the data source.
  virtual bool WriteStats() = 0;

  /// A statistic as a number, as Mean and the like give it: Raster<T>::StatOf without the pixel.
  virtual double NumberOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                          const IPC& ipc) = 0;

  /// The histogram run that goes on now; empty when none does.
  virtual AsyncPtr HistogramAsync() const = 0;
  virtual bool WriteHistogram() = 0;

  virtual unsigned Samples() const = 0;  ///< pixels of a line
  virtual unsigned Lines() const = 0;
  virtual unsigned Bands() const = 0;

  virtual bool HasNoDataValue(unsigned band) const = 0;
  virtual bool HasPalette(unsigned band) const = 0;
  /// The colour table of a band; empty when it has none.
  virtual PalettePtr Palette(unsigned band) const = 0;
  virtual bool WritePalette(unsigned band, const PalettePtr& palette) = 0;
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

/// A raster of pixel type T, one of TwelveTypes.
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

  /// A raster of a reduced level: each level halves samples and lines. Empty when there is none.
  virtual RasterPtr<T> PyramidLevel(unsigned level) = 0;
  /// As PyramidLevel, but only from a pyramid that the library keeps in a file of its own.
  virtual RasterPtr<T> StoredPyramidLevel(unsigned level) = 0;

  /// Enters known statistics of one band by hand.
  virtual void SetBandStats(const RasterBandStats<T>& stats) = 0;
  /// What is at hand, without computing.
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
  /// the result tells which ones are there: none after a failure.
  /// @param shares  how many such calls, one after the other, share the progress.
  RasterBandStats<T> ComputeBandStats(unsigned band, unsigned mask, const IPC& ipc,
                                      unsigned shares = 1);

  /// Enters a known histogram by hand.
  virtual void SetBandHistogram(const RasterBandHistogram<T>& histogram) = 0;
  /// All the histograms at hand for the band.
  virtual Array<RasterBandHistogram<T>> BandHistogram(unsigned band) const = 0;
  /// Starts to count histograms, in either form of bins. Empty when that could not be started.
  virtual AsyncPtr CountHistogram(const HistogramRequest<T>& request, const IPC& ipc) = 0;

  virtual T NoDataValue(unsigned band) const = 0;

  /// Reads a block: the one way by which pixels travel.
  /// @param rect    pixels of this raster; the caller stays within Samples() by Lines().
  /// @param bands   in the order wanted; one may come twice.
  /// @param pixels  [out] resized to BlockDims of the block.
  /// @param state   [out] same shape, bits of PixelValueState; 0 is a valid pixel.
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
