#include "raster/raster.h"

#include <bit>
#include <cstdio>
#include <string>

#include "foundation/progress.h"
#include "foundation/type_code.h"
#include "raster/raster_view_body.h"

namespace lumo {

const unsigned BasicRaster::TypeCode = GloballyUniqueObjectTypeCode("BasicRaster");

bool BasicRaster::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

URI BasicRaster::DefaultURI(const char* className) const {
  char address[32];
  std::snprintf(address, sizeof(address), "%llx",
                static_cast<unsigned long long>(reinterpret_cast<std::uintptr_t>(this)));
  return URI(String("{" + std::string(className) + "}@" + address));
}

template <typename T>
const unsigned Raster<T>::TypeCode =
    GloballyUniqueObjectTypeCode(String("Raster<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

namespace {

/// True when all statistics of `mask` are there, and those between bands for all bands.
template <typename T>
bool IsWhole(const RasterBandStats<T>& stats, unsigned mask, unsigned bands) {
  const auto hasPairs = [&](unsigned bit, const Array<double>& pairs) {
    return (mask & bit) == 0 || pairs.GetCount() == bands;
  };
  return (stats.mask & mask) == mask && hasPairs(StatsMask::SumXY, stats.sumXY) &&
         hasPairs(StatsMask::Cov, stats.cov);
}

}  // namespace

template <typename T>
RasterBandStats<T> Raster<T>::ComputeBandStats(unsigned band, unsigned mask, const IPC& ipc,
                                               unsigned shares) {
  const unsigned bands = Bands();
  double left = std::popcount(mask & ~StatsMask::Pairs) +
                1.0 * bands * std::popcount(mask & StatsMask::Pairs);
  const double divisor = left * shares;
  const auto share = [&](double weight) {
    left -= weight;
    return ProgressReportPtr(new ScaledProgressReport(ipc.progress, divisor, weight));
  };
  RasterBandStats<T> stats;
  stats.band = band;
  const auto ask = [&](StatsMask::Code stat, unsigned otherBand) {
    return StatOf(stat, band, otherBand, IPC(ipc.abort, share(1)));
  };
  for (unsigned bit = StatsMask::Min; bit <= StatsMask::Cov; bit <<= 1) {
    const auto stat = static_cast<StatsMask::Code>(mask & bit);
    if (stat == StatsMask::None) continue;
    if ((stat & StatsMask::Pairs) != 0) {
      Array<double>& pairs = stat == StatsMask::SumXY ? stats.sumXY : stats.cov;
      if (!pairs.Resize(ArrayDims(bands))) return stats;
      for (unsigned other = 0; other < bands; ++other) pairs[other] = ask(stat, other).number;
    } else if (const auto field = RasterBandStats<T>::NumberField(stat)) {
      stats.*field = ask(stat, 0).number;
    } else {
      (stat == StatsMask::Min ? stats.min : stats.max) = ask(stat, 0).pixel;
    }
    if (stats.mask == StatsMask::None && !StatsExist(band, stat)) return stats;  // nor will others
    stats.mask |= stat;
    const RasterBandStats<T> whole = BandStats(band);
    if (!IsWhole(whole, mask, bands)) continue;
    if (left > 0) share(left)->Update(1.0);
    return whole;
  }
  return stats;
}

VEXG_INSTANCES(TWELVE, Raster);
VEXG_INSTANCES(TWELVE, RasterView);

}  // namespace lumo
