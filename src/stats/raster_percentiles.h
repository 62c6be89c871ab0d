#pragma once

#include <string>
#include <vector>

#include "commands/division.h"
#include "raster/pixel_types.h"
#include "raster/raster.h"

namespace lumo {

/// The percentages of one call at most.
inline constexpr std::size_t kMostPercentages = 128;

/// Says which part of the work of percentiles is done here, where it is done in shares: each pass
/// over the raster in shares of its own, which begin with the tables of all shares of the passes
/// before.
struct PercentileShares {
  bool hasShare = false;  ///< one share of one pass is done
  Share share{};
  std::string file;                  ///< to make of it
  std::vector<std::string> files{};  ///< of passes that are done, pass by pass; each of all shares
  std::string key;                   ///< says of what command, raster and inputs the shares are

  /// True when nothing is done in shares.
  bool IsNone() const { return !hasShare && files.empty(); }
};

/// Passes over a raster of this pixel type; 1 for types without percentiles.
unsigned PercentilePasses(unsigned dataType);

/// Computes percentiles of the valid pixels of a raster, band by band, exactly. Pixels without
/// data, masked ones, NaN and infinities don't count. Exists for TenTypes.
///
///     std::vector<double> median;
///     if (!ComputePercentiles(raster, bands, {50}, ipc, median)) return TakeFault();
///
/// The values are counted digit by digit, 16 bits at a time, the highest first, and each further
/// pass only counts those that share the digits of a value that is wanted. So a raster of 8 or 16
/// bits is read once, one of 32 twice, and one of 64 four times; where the tables of many bands
/// would take more than 128 MiB, several bands at a time. The result depends neither on the
/// number of threads nor on how the raster is cut.
///
/// @param bands     of the raster.
/// @param percents  0 to 100, kMostPercentages at most; QuantileRank tells where each lies.
/// @param result    [out] bands by percents; NaN in a band without a valid pixel. Values of 64
///                  bits are rounded to a double.
/// @param shares    of a share, nothing comes out; with the files of all passes nothing is read.
/// @return false, with the fault set, when the raster or a file can't be read, and at an abort.
template <typename T>
bool ComputePercentiles(const RasterPtr<T>& raster, const std::vector<unsigned>& bands,
                        const std::vector<double>& percents, const IPC& ipc,
                        std::vector<double>& result, const PercentileShares& shares = {});

}  // namespace lumo
