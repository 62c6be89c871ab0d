#pragma once

#include <optional>

#include "fx/segment_process.h"
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

}  // namespace lumo
