#pragma once

#include <string>
#include <vector>

#include "foundation/containers.h"
#include "foundation/string.h"
#include "output/output_file.h"

namespace lumo::host {

/// A cumulative curve of gradients, or of what merging costs.
struct SegmentCurve {
  double low = 0;
  double binSize = 0;
  std::vector<double> shares;  ///< of all, up to the end of each bin

  /// Where a share is reached.
  double At(double share) const;
};

/// The curves by which a user chooses how a raster is divided into segments.
struct SegmentCurves {
  SegmentCurve gradients, costs;

  /// Reads them from the results of the commands that fit, count gradients and estimate costs.
  static SegmentCurves Read(const Map<String, String>& fit, const Map<String, String>& gradients,
                            const Map<String, String>& costs);

  std::string AsText() const;
  std::string AsJson(const std::string& file) const;
  void Draw(const OutputFile& output) const;
};

}  // namespace lumo::host
