#pragma once

#include "foundation/async.h"
#include "raster/band_values.h"

// The statistics and histograms of a raster by their names: each name is one line over the one
// question that the class answers.

namespace lumo {

/// Gives the statistics that are numbers, each over `Class::NumberOf(stat, band, otherBand, ipc)`.
/// They are of the valid pixels of a band, and computed when they are not at hand. 0 on a failure.
template <typename Class>
class NumbersByName {
 public:
  /// Mean of the valid values. Standard deviation of a sample; 0 for fewer than two values.
  double Mean(unsigned band, const IPC& ipc) { return Ask(StatsMask::Mean, band, 0, ipc); }
  /// Standard deviation of a sample, divided by n - 1; 0 for fewer than two values.
  double Std(unsigned band, const IPC& ipc) { return Ask(StatsMask::Std, band, 0, ipc); }
  /// Sum of the valid values.
  double Sum(unsigned band, const IPC& ipc) { return Ask(StatsMask::Sum, band, 0, ipc); }
  /// Sum of their squares. Sum of their squares.
  double Sum2(unsigned band, const IPC& ipc) { return Ask(StatsMask::Sum2, band, 0, ipc); }
  /// Square root of the mean of their squares.
  double RMS(unsigned band, const IPC& ipc) { return Ask(StatsMask::RMS, band, 0, ipc); }
  // Between two bands, of the pixels that are valid in both; need StatsMode::kExtended.
  double SumXY(unsigned band, unsigned otherBand, const IPC& ipc) {
    return Ask(StatsMask::SumXY, band, otherBand, ipc);
  }
  /// Covariance of a sample, divided by n - 1.
  double Cov(unsigned band, unsigned otherBand, const IPC& ipc) {
    return Ask(StatsMask::Cov, band, otherBand, ipc);
  }

 private:
  double Ask(StatsMask::Code stat, unsigned band, unsigned otherBand, const IPC& ipc) {
    return static_cast<Class*>(this)->NumberOf(stat, band, otherBand, ipc);
  }
};

/// Gives the statistics that are pixels, over `Class::StatOf(stat, band, otherBand, ipc)`.
template <typename Class, typename T>
class ExtremesByName {
 public:
  /// Smallest valid value of the band.
  T Min(unsigned band, const IPC& ipc) { return Ask(StatsMask::Min, band, ipc); }
  /// Largest valid value of the band.
  T Max(unsigned band, const IPC& ipc) { return Ask(StatsMask::Max, band, ipc); }

 private:
  T Ask(StatsMask::Code stat, unsigned band, const IPC& ipc) {
    return static_cast<Class*>(this)->StatOf(stat, band, 0, ipc).pixel;
  }
};

/// Starts histograms in bins of the told form, over `Class::CountHistogram(request, ipc)`: of the
/// values from `lower` to `upper`, both inclusive, of the bands given, or of all for an empty list.
/// Empty when that could not be started.
template <typename Class, typename T>
class HistogramsByName {
 public:
  /// Bins of a width from `lower` on.
  AsyncPtr HistogramByBinSize(T lower, T upper, double binSize, const Array<unsigned>& bands,
                              HistogramSign sign, const IPC& ipc) {
    return Start({lower, upper, binSize, 0, bands, sign}, ipc);
  }
  /// A number of bins that share the range.
  AsyncPtr HistogramByBinCount(T lower, T upper, unsigned binCount, const Array<unsigned>& bands,
                               HistogramSign sign, const IPC& ipc) {
    return Start({lower, upper, 0, binCount, bands, sign}, ipc);
  }
  /// HistogramByBinCount over all bands.
  AsyncPtr HistogramAllBands(T lower, T upper, unsigned binCount, HistogramSign sign,
                             const IPC& ipc) {
    return Start({lower, upper, 0, binCount, {}, sign}, ipc);
  }

 private:
  AsyncPtr Start(const HistogramRequest<T>& request, const IPC& ipc) {
    return static_cast<Class*>(this)->CountHistogram(request, ipc);
  }
};

}  // namespace lumo
