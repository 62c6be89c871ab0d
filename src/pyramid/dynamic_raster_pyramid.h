#pragma once

#include <mutex>
#include <vector>

#include "pyramid/pyramid_builders.h"
#include "pyramid/pyramid_process.h"
#include "stats/raster_histogram.h"

namespace lumo {

/// The pyramid of one raster that has a reader for it: builds it in the background, and holds the
/// statistics and histograms that the last build has left, until pixels of the raster are written.
/// A build that a write has overtaken leaves none. Exists for TwelveTypes; for complex numbers
/// there are neither.
///
/// Ownership: shares the connections. Its destructor aborts a build that goes on and waits for it.
/// Threads:   every operation may be called on any thread. The lock is never held during a build.
/// Failure:   an empty AsyncPtr, with the fault set, when no build could be started. A build that
///            failed has its error stored; PyramidAsync sets the fault.
template <typename T>
class DynamicRasterPyramid final : public PyramidCallback<T> {
 public:
  /// @param reader,connection                of the raster.
  /// @param pyramidReader,pyramidConnection  of the store of its levels.
  /// @param makeRaster                       makes the rasters that a build works on.
  DynamicRasterPyramid(const RasterReaderPtr<T>& reader, const RasterDataConnectionPtr& connection,
                       const RasterReaderPtr<T>& pyramidReader,
                       const RasterDataConnectionPtr& pyramidConnection,
                       const MakeSourceRaster<T>& makeRaster);
  /// Aborts a build that goes on, and waits for its end.
  ~DynamicRasterPyramid() override;
  DynamicRasterPyramid(const DynamicRasterPyramid&) = delete;
  DynamicRasterPyramid& operator=(const DynamicRasterPyramid&) = delete;

  /// Starts a build. While one runs, gives one that has ended and does nothing else. Where a
  /// ShareScope lives on this thread the build is of a share, or joins all; the scope outlives it.
  /// @param tiles  the levels are stored in squares of its height; 0 stands for 256.
  AsyncPtr PyramidBuild(const PyramidDef& def, const TileDimensions& tiles,
                        const AsyncCallbackPtr& callback);
  /// The build that runs now; empty when none does.
  AsyncPtr PyramidAsync() const;

  /// True when the last build has left all statistics of `mask` for the band. False while one runs.
  bool StatsExist(unsigned band, unsigned mask) const;
  /// The statistics that the last build has left; mask 0 when it left none.
  RasterBandStats<T> BandStats(unsigned band) const;
  /// The histograms that the last build has left for the band.
  Array<RasterBandHistogram<T>> BandHistogram(unsigned band) const;

  // A build calls these on its thread. The values that it has computed go into the pyramid's store
  // too: false, with the fault set, when the store can't take it, or the raster has been written to
  // meanwhile.
  void OnLevelsWritten() override;
  bool TakeHistogram(const RasterHistogram<T>& histogram,
                     HistogramSign sign) requires(std::is_arithmetic_v<T>);
  bool TakeStats(const RasterStats<T>& stats) requires(std::is_arithmetic_v<T>);
  /// Looks again at the levels in the store of the pyramid; false when there are none.
  bool Refresh();

 private:
  bool IsRunning() const;
  bool CanTakeResults() const;
  bool ResultsHold() const { return reader_->WriteCount(0) == writes_; }
  bool IsKeptByTheLibrary() const;
  bool AreLevelsShown() const;
  AsyncPtr Start(const PyramidBuilderPtr& builder);

  mutable std::mutex lock_;  // guards the results and the builder
  // The connections go last: they own the readers.
  const RasterDataConnectionPtr connection_;
  const RasterDataConnectionPtr pyramidConnection_;
  const RasterReaderPtr<T> reader_;
  const RasterReaderPtr<T> pyramidReader_;
  const MakeSourceRaster<T> makeRaster_;
  PyramidBuilderPtr builder_;  // that runs, or was the last one
  mutable bool isEndTaken_ = true;
  std::uint64_t writes_ = 0;  // of the raster's pixels, when the last build began
  String levelsFault_;        // why the levels of the last build can't be shown
  std::vector<RasterBandStats<T>> bandStats_;
  std::vector<RasterBandHistogram<T>> bandHistograms_;
};

template <typename T>
using DynamicRasterPyramidPtr = Pointer<DynamicRasterPyramid<T>>;

VEXG_EXTERN(TWELVE, DynamicRasterPyramid);

}  // namespace lumo
