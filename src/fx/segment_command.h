#pragma once

#include <optional>

#include "fx/segment_process.h"
#include "fx/segment_shares.h"
#include "raster/raster_command.h"

namespace lumo {

/// "Sobel", "Intensity".
VEXG_EXPORT std::span<const EnumWord<SegmentAlgorithm>> WordsOf(SegmentAlgorithm);

/// "Told", "Local".
VEXG_EXPORT std::span<const EnumWord<MergeOrder>> WordsOf(MergeOrder);

/// The bins in which the costs of merges are counted.
inline constexpr unsigned kLambdaBins = 10000;

/// Helps the commands that segment.
class VEXG_EXPORT SegmentCommand : public RasterCommand {
 protected:
  /// The input "SegmentAlgorithm": 1 for Sobel, every other number for intensity.
  SegmentAlgorithm ReadAlgorithm() const;

  /// True when both rasters have one pixel type and size; else sets the fault text.
  static bool CheckAlike(const BasicRaster& segment, const BasicRaster& merge);

  /// Reads the inputs of WithShareInputs for work of some rounds: which share of the next round is
  /// done, or the files of all rounds. False, with the fault set, for ones that don't fit.
  /// @param key  says of what rasters and inputs the shares are.
  bool ReadShares(const std::string& key, unsigned rounds);
  /// True where a share is done alone: nothing but its file is made.
  bool IsShare() const { return HasInput(kShareInput); }
  const Share& GetShare() const { return share_; }
  std::string ShareFile() const { return Read<String>(kShareFileInput).ToUTF8(); }
  /// The files of the rounds that are done; null for work that is not done in shares.
  const SegmentShares* Shares() const { return shares_ ? &*shares_ : nullptr; }

 private:
  Share share_;
  std::optional<SegmentShares> shares_;
};

/// The gradients that are counted, and in which bins.
struct GradientBins {
  double min = 0;
  double max = 0;
  /// How many bins; without it bins of width 1, or 65,000 where the bounds are 65,001 and more
  /// apart, as RasterHistogram has them in its told form.
  std::optional<unsigned> count;
};

/// How the gradients of a raster are distributed.
struct GradientHistogram {
  Array<double> shares;  ///< of the gradients up to the end of each bin, of all that count
  double binSize = 0;
};

/// Counts the gradients of a raster. False, with the fault set where there is one, for a raster of
/// another type than EightTypes, or when it could not be read.
VEXG_EXPORT bool CountGradients(const BasicRasterPtr& raster, SegmentAlgorithm algorithm,
                                const GradientBins& bins, const IPC& ipc,
                                GradientHistogram& histogram);

/// The same in two steps: counts of some tiles (GradientGrid), which are added up, and what they
/// make. @param counts  [out] by bin.
VEXG_EXPORT bool CountGradientsOf(const BasicRasterPtr& raster, SegmentAlgorithm algorithm,
                                  const GradientBins& bins, const TileRange& tiles, const IPC& ipc,
                                  std::vector<std::uint64_t>& counts);
VEXG_EXPORT bool MakeHistogram(const GradientBins& bins, const std::vector<std::uint64_t>& counts,
                               GradientHistogram& histogram);

}  // namespace lumo
