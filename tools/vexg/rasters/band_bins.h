#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "jobs/raster_job.h"
#include "output/json_number.h"

namespace lumo::host {

/// A histogram of one band, whatever its pixel type.
struct BandBins {
  unsigned band = 0;
  Json min;  ///< the bounds as numbers of the pixel type
  Json max;
  std::string range;  ///< "0 to 255"
  double lower = 0;
  double size = 0;
  std::vector<std::uint64_t> counts;
};

/// Which values are counted, and in which bins; of what isn't said the library decides.
struct BinLimits {
  std::optional<double> lower;
  std::optional<double> upper;
  std::optional<unsigned> binCount;
  std::optional<double> binSize;
};

/// Adds the commands that count, behind one that finds the smallest and largest values of the bands
/// where these decide on the bins.
/// @param raster  a variable or URI.
void AddCounting(JobDraft& draft, const String& raster, const Array<unsigned>& bands,
                 unsigned dataType, const BinLimits& limits);

/// Reads what the commands of AddCounting gave.
std::vector<BandBins> ReadBins(const JobResults& results, unsigned dataType);

/// The histograms as a list of objects.
Json AsJson(const std::vector<BandBins>& all);

}  // namespace lumo::host
