#pragma once

#include <array>
#include <atomic>
#include <tuple>

#include "data/data_connection.h"
#include "data/data_errors.h"
#include "foundation/color.h"
#include "foundation/sub_rect.h"
#include "raster/band_values.h"
#include "raster/interleave.h"
#include "raster/tile_dimensions.h"

namespace lumo {

class BlockStates;

/// Answers for a raster source what needs no pixel type. Level 0 is the source itself, each further
/// one a stored reduction. See data_connection.h for threads and failure.
class VEXG_EXPORT BasicRasterReader {
 public:
  using PointerRoot = BasicRasterReader;

  /// True when the reader is usable.
  virtual bool OpBool() = 0;
  /// The plug-in's own number for this kind of reader; nothing here reads it.
  virtual std::int32_t ReaderType() = 0;
  /// The description of the source.
  virtual lumo::RasterDef RasterDef() = 0;
  virtual unsigned Samples(unsigned level) = 0;  ///< pixels of a line of the level
  virtual unsigned Lines(unsigned level) = 0;    ///< lines of the level
  virtual unsigned Bands() = 0;                  ///< of every level

  virtual std::int32_t PyramidType() = 0;              ///< a lumo::PyramidType
  virtual std::int32_t PyramidResamplingMethod() = 0;  ///< a lumo::PyramidResamplingMethod
  virtual std::int32_t PyramidLevelMin() = 0;          ///< first level stored
  virtual std::int32_t PyramidLevelMax() = 0;          ///< last level stored
  virtual bool PyramidExists() = 0;                    ///< levels can be read
  /// Makes the levels `levelMin` to `levelMax`. A source of the type kOrva only gets ready to be
  /// given their pixels: what it held before stays to be read until PyramidRefresh finds them
  /// whole.
  /// @param tiles  how the levels are to be stored: squares of its height.
  virtual bool PyramidBuild(std::int32_t levelMin, std::int32_t levelMax,
                            std::int32_t resamplingMethod, const TileDimensions& tiles) = 0;
  /// Makes the levels that are there once more, from the pixels as they are now.
  virtual bool PyramidRebuild() = 0;
  /// Removes the levels. False when there are none, or they can't be removed.
  virtual bool PyramidDelete() = 0;
  /// Looks again at the levels that the source holds, those that others have made among them.
  virtual bool PyramidRefresh() = 0;

  /// The statistics that the source can keep, bits of lumo::StatsMask.
  virtual std::int32_t StatsMask() = 0;
  /// True when the source holds statistics of the band now.
  virtual bool StatsExist(unsigned band) = 0;
  /// True when WriteStats can succeed.
  virtual bool CanWriteStats() = 0;
  /// True when WriteHistogram can succeed.
  virtual bool CanWriteHistogram() = 0;

  /// True when one value marks pixels of the band that aren't valid.
  virtual bool HasNoDataValue(unsigned band) = 0;
  /// True for a source that takes its no-data values from another one, as a pyramid file does.
  virtual bool CanInheritNoDataValues() = 0;
  /// Takes the values over, for a source that can.
  virtual void InheritNoDataValues(const lumo::RasterDef& from) = 0;

  /// True when the band has a colour table.
  virtual bool HasPalette(unsigned band) = 0;
  /// The colour table of the band; without colours when it has none.
  virtual lumo::Palette Palette(unsigned band) = 0;
  /// Stores a colour table for the band.
  virtual bool WritePalette(unsigned band, const lumo::Palette& palette) = 0;
  /// Removes the colour table of the band.
  virtual bool DeletePalette(unsigned band) = 0;

  /// True when WritePixels can succeed for the level.
  virtual bool CanWritePixels(unsigned level) = 0;

  virtual ~BasicRasterReader() = default;
};

/// The face of a raster source for pixel type T, one of TwelveTypes.
template <typename T>
class RasterReader : public BasicRasterReader {
 public:
  /// @param connection  the owner, which outlives the reader.
  explicit RasterReader(RasterDataConnection* connection) : connection_(connection) {}

  /// The connection that owns this reader.
  virtual RasterDataConnection* Connection() { return connection_; }

  /// The stored statistics of a band; mask None when there are none.
  virtual RasterBandStats<T> ReadStats(unsigned band) = 0;
  /// Stores statistics of some bands, each under its `band`.
  virtual bool WriteStats(const Array<RasterBandStats<T>>& stats) = 0;
  /// The stored histograms of a band; none when the source keeps none.
  virtual Array<RasterBandHistogram<T>> Histogram(unsigned band) = 0;
  /// Stores histograms of some bands, each under its `band`.
  virtual bool WriteHistogram(const Array<RasterBandHistogram<T>>& histograms) = 0;

  /// The value of pixels that aren't valid; without a meaning unless HasNoDataValue.
  virtual T NoDataValue(unsigned band) = 0;

  /// Reads a block in the source's own interleave, the one of RasterDef().
  /// @param left,top,width,height  in pixels of the level, inside it.
  /// @param bands   in the order wanted; one may come twice.
  /// @param pixels  width * height * bands elements of the caller, all of which are filled.
  /// @param state   as many bytes, 0 on entry; bits of PixelValueState are set where pixels are not
  ///                valid.
  virtual bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                          const Array<unsigned>& bands, unsigned level, T* pixels,
                          unsigned char* state) = 0;
  /// Writes a block; arguments as for ReadPixels. `state` may be ignored.
  virtual bool WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                           const Array<unsigned>& bands, unsigned level, const T* pixels,
                           const unsigned char* state) = 0;

  /// The interleave of RasterDef(), which is asked for once.
  Interleave NativeInterleave();

  /// Reads a block in any interleave.
  /// @param rect    corners inclusive, in pixels of the level, inside it.
  /// @param pixels  [out] resized to BlockDims of the block.
  /// @param state   [out] same shape.
  /// @return false, with the arrays cleared or partly filled, when the source fails, an array can't
  ///         be sized or there is no such interleave.
  bool ReadBlock(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                 Interleave interleave, Array<T>& pixels, Array<unsigned char>& state);

  /// The same, with states where the source has some to tell, see OrderedReads.
  bool ReadBlock(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                 Interleave interleave, Array<T>& pixels, BlockStates& states);

  /// Writes a block that the caller holds in any interleave; arguments as for ReadBlock.
  bool WriteBlock(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                  Interleave interleave, const Array<T>& pixels, const Array<unsigned char>& state);

  /// How often WriteBlock has handed pixels of a level to the source, well or not.
  std::uint64_t WriteCount(unsigned level) const { return writes_[PlaceOf(level)]; }

  // The number of writes to its raster's pixels for which the stored values hold: 0 for those that
  // the source was opened with, UINT64_MAX for none. Whoever has new ones stored sets it.
  std::uint64_t StatsHoldFor() const { return statsHoldFor_; }
  void SetStatsHoldFor(std::uint64_t writes) { statsHoldFor_ = writes; }
  std::uint64_t HistogramsHoldFor() const { return histogramsHoldFor_; }
  void SetHistogramsHoldFor(std::uint64_t writes) { histogramsHoldFor_ = writes; }

 protected:
  RasterDataConnection* connection_;

 private:
  static constexpr std::int32_t kNotAsked = -2;
  static constexpr unsigned kLevels = 32;
  static unsigned PlaceOf(unsigned level) { return level < kLevels ? level : kLevels - 1; }
  bool WriteNative(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                   const T* pixels, const unsigned char* state);

  std::atomic<std::int32_t> nativeInterleave_{kNotAsked};
  std::array<std::atomic<std::uint64_t>, kLevels> writes_{};
  std::atomic<std::uint64_t> statsHoldFor_{0};
  std::atomic<std::uint64_t> histogramsHoldFor_{0};
};

template <typename T>
using RasterReaderPtr = Pointer<RasterReader<T>>;

/// Holds the one typed reader of a source.
/// Failure: one without a reader has RasterReaderErrorInvalid stored, and type code 0.
class VEXG_EXPORT RasterReaderDispatch : public ErrorState {
 public:
  /// A dispatch without a reader.
  RasterReaderDispatch() { SetErrorState(RasterReaderErrorInvalid()); }

  template <typename T>
  explicit RasterReaderDispatch(const RasterReaderPtr<T>& reader)
      : basic_(reader), dataType_(reader ? kDataTypeOf<T> : 0) {
    std::get<RasterReaderPtr<T>>(readers_) = reader;
    if (!reader) SetErrorState(RasterReaderErrorInvalid());
  }

  /// Code of the pixel type of the reader; 0 when there is none.
  unsigned DataType() const { return dataType_; }

  /// The reader, when it is one of pixel type T; else empty.
  template <typename T>
  const RasterReaderPtr<T>& Get() const {
    return std::get<RasterReaderPtr<T>>(readers_);
  }

  /// The reader whatever its type; empty when there is none.
  const Pointer<BasicRasterReader>& GetBasic() const { return basic_; }

 private:
  template <typename... Ts>
  static std::tuple<RasterReaderPtr<Ts>...> NoReaders(TypeList<Ts...>);

  decltype(NoReaders(TwelveTypes{})) readers_;  // at most one is not empty
  Pointer<BasicRasterReader> basic_;            // the same one
  unsigned dataType_ = 0;
};

VEXG_EXTERN(TWELVE, RasterReader);

}  // namespace lumo
