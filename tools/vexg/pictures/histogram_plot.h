#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "output/output_file.h"
#include "pictures/text_image.h"

namespace lumo::host {

/// The part of a plot that shows one band.
struct PlottedHistogram {
  std::string title;
  double lower = 0;  ///< where the first bin begins
  double binSize = 1;
  std::vector<std::uint64_t> counts;
};

/// Draws histograms as a picture, one above the other: bars over an axis of values, their height a
/// share of the highest bar, whose count stands beside it.
class HistogramPlot {
 public:
  /// @param histograms  one at least, each of one bin at least.
  explicit HistogramPlot(const std::vector<PlottedHistogram>& histograms);

  /// Writes the picture, in the format that the ending of the output's name stands for.
  void Write(const OutputFile& output) const;

 private:
  void DrawPanel(const PlottedHistogram& histogram, unsigned top);
  void DrawBars(const PlottedHistogram& histogram, unsigned top, double highest);
  void DrawAxes(const PlottedHistogram& histogram, unsigned top, double highest);
  void Put(const TextImage& text, unsigned x, unsigned y);
  void Fill(unsigned left, unsigned top, unsigned right, unsigned bottom, unsigned char grey);

  unsigned height_;
  std::vector<unsigned char> pixels_;  // grey, row by row
};

}  // namespace lumo::host
