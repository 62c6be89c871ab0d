#pragma once

#include <atomic>
#include <mutex>

#include "pyramid/dynamic_raster_pyramid.h"
#include "raster/block_states.h"
#include "views/computed_raster.h"
#include "views/sources/source_raster.h"

namespace lumo {

/// The raster that stands on a data source. Exists for TwelveTypes.
///
/// It turns the operations of a raster into calls of a reader, in whatever interleave is asked for.
/// Statistics and histograms that the source stores are at hand without computing; computed ones
/// can be stored there. A second reader, when there is one, stands on a pyramid that the library
/// keeps in a file of its own; where it has something it goes first.
///
/// Once pixels have been written, statistics and histograms that the source and the pyramid's file
/// store are given no more. The pyramid's file loses them then, the source at the next WriteStats
/// or WriteHistogram, unless it has lost them already.
///
/// Ownership: shares both connections, which stay open as long as the raster lives. The readers
///            belong to them.
/// Threads:   every operation may run on many threads at once; one block is transferred at a time.
/// Failure:   without a reader, operations give false, 0 or empty; those that a source refuses have
///            the fault set.
template <typename T>
class ReaderRaster final : public ComputedRaster<T>, public SourceRaster, public StatesOnDemand<T> {
 public:
  /// @param pyramidReader  may be empty, and then so is `pyramidConnection`. A source that is a
  ///                       pyramid file itself is its own.
  /// @param uri            in place of the connection's, unless empty.
  ReaderRaster(const RasterReaderPtr<T>& reader, const RasterDataConnectionPtr& connection,
               const RasterReaderPtr<T>& pyramidReader = {},
               const RasterDataConnectionPtr& pyramidConnection = {}, const URI& uri = {});
  ~ReaderRaster() override;

  URI GetURI() const override;
  bool IsUpToDate() const override;
  bool IsValid() const override { return Object::IsValid(); }
  bool CanWrite() const override;
  RasterDef GetRasterDef() const override;

  bool PyramidExists() const override;
  PyramidDef GetPyramidDef() const override;
  lumo::URI PyramidURI() const override {
    return pyramidConnection_ ? pyramidConnection_->URI() : lumo::URI();
  }
  AsyncPtr PyramidBuild(const PyramidDef& def, const lumo::TileDimensions& tiles,
                        const AsyncCallbackPtr& callback) override;
  AsyncPtr PyramidAsync() const override;
  bool PyramidDelete() override;
  bool PyramidRefresh() override;

  bool StatsExist(unsigned band, unsigned mask) const override;
  bool WriteStats() override;
  RasterBandStats<T> BandStats(unsigned band) const override;
  /// The value at hand, or else computed, one caller after the other.
  StatValue<T> StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                      const IPC& ipc) override;

  bool WriteHistogram() override;
  /// The histograms that the pyramid's file, this raster and the source hold, each once.
  Array<RasterBandHistogram<T>> BandHistogram(unsigned band) const override;

  unsigned Samples() const override { return samples_; }
  unsigned Lines() const override { return lines_; }
  unsigned Bands() const override { return bands_; }
  lumo::TileDimensions TileDimensions() const override { return tiles_; }
  /// A level of the pyramid's file, when that has levels, else of the source.
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned level) override;

  bool HasNoDataValue(unsigned band) const override;
  T NoDataValue(unsigned band) const override;
  bool HasPalette(unsigned band) const override;
  PalettePtr Palette(unsigned band) const override;
  bool WritePalette(unsigned band, const PalettePtr& palette) override;
  bool DeletePalette(unsigned band) override;

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool GetBlock(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                Array<T>& pixels, BlockStates& states) override;
  bool OnlyReadsStates() const override { return true; }
  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  std::uint64_t WriteCount() const override { return reader_ ? reader_->WriteCount(0) : 0; }

 private:
  template <typename Call>
  bool AnyReader(const Call& call) const;
  template <typename Call>
  bool AnyReaderWithStats(const Call& call) const;
  bool HistogramsHold(const RasterReaderPtr<T>& reader) const;
  void DropStatsOfPyramid();
  template <typename Can, typename Store>
  bool StoreIn(const Can& can, const Store& store);
  bool Holds(const SubRect& rect, const Array<unsigned>& bands) const;

  // The connections go last: they own the readers.
  RasterDataConnectionPtr connection_;
  RasterDataConnectionPtr pyramidConnection_;
  RasterReaderPtr<T> reader_;
  RasterReaderPtr<T> pyramidReader_;
  URI uri_;
  unsigned samples_ = 0;  // sizes never change while a source is open
  unsigned lines_ = 0;
  unsigned bands_ = 0;
  lumo::TileDimensions tiles_;
  std::atomic<bool> written_{false};  // something may have been, to the source
  std::mutex pixelLock_;
  std::mutex statsLock_;                // held while a getter of statistics computes
  DynamicRasterPyramidPtr<T> pyramid_;  // empty without a reader of a pyramid
};

VEXG_EXTERN(TWELVE, ReaderRaster);

}  // namespace lumo
