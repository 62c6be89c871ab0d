#pragma once

#include <cstdint>
#include <map>
#include <mutex>
#include <utility>
#include <vector>

#include "viewer/viewed_raster.h"

namespace lumo::host {

/// Counts the values of bands for the stretch of the page: {"level", "bands"}, the latter as
/// `vexg hist --json` has them. Of a large raster a reduced level is counted, which the page says.
/// Throws HostError.
Json CountBands(const ViewedRaster& raster, const std::vector<std::uint32_t>& bands);

/// The ends of a stretch that cuts a share of the counted values off at each side, as the page
/// finds them; the histograms are kept.
///
/// Threads: any.
class BandEnds {
 public:
  /// @param number  of the raster.
  /// @param cut     percent at each end.
  std::pair<double, double> Find(const ViewedRaster& raster, std::size_t number, std::uint32_t band,
                                 double cut);

 private:
  std::mutex mutex_;
  std::map<std::pair<std::size_t, std::uint32_t>, Json> histograms_;
};

}  // namespace lumo::host
