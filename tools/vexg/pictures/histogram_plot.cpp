#include "pictures/histogram_plot.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>

#include "pictures/picture_writer.h"

namespace lumo::host {
namespace {

constexpr unsigned kWidth = 720;
constexpr unsigned kPanelHeight = 190;
constexpr unsigned kLeft = 80;  // of the bars, in a panel
constexpr unsigned kRight = kWidth - 40;
constexpr unsigned kTop = 30;
constexpr unsigned kBottom = kPanelHeight - 34;

constexpr unsigned char kPaper = 255;
constexpr unsigned char kBar = 90;
constexpr unsigned char kGrid = 225;
constexpr unsigned char kInk = 0;

/// About eight round numbers of one distance between two values.
std::vector<double> Ticks(double low, double high) {
  const double raw = (high - low) / 8;
  if (!(raw > 0) || !std::isfinite(raw)) return {low};
  const double decade = std::pow(10, std::floor(std::log10(raw)));
  double step = 10 * decade;
  for (const double factor : {1.0, 2.0, 5.0}) {
    if (factor * decade >= raw) {
      step = factor * decade;
      break;
    }
  }
  std::vector<double> ticks;
  for (double k = std::ceil(low / step); k * step <= high && ticks.size() < 20; ++k) {
    ticks.push_back(k * step);
  }
  return ticks;
}

}  // namespace

HistogramPlot::HistogramPlot(const std::vector<PlottedHistogram>& histograms)
    : height_(kPanelHeight * static_cast<unsigned>(histograms.size())),
      pixels_(std::size_t{kWidth} * height_, kPaper) {
  unsigned top = 0;
  for (const PlottedHistogram& histogram : histograms) {
    DrawPanel(histogram, top);
    top += kPanelHeight;
  }
}

void HistogramPlot::DrawPanel(const PlottedHistogram& histogram, unsigned top) {
  const std::uint64_t most = *std::max_element(histogram.counts.begin(), histogram.counts.end());
  const double highest = most > 0 ? static_cast<double>(most) : 1.0;
  DrawAxes(histogram, top, highest);
  DrawBars(histogram, top, highest);
}

/// A column of the picture shows the highest of the bins that it touches.
void HistogramPlot::DrawBars(const PlottedHistogram& histogram, unsigned top, double highest) {
  const std::size_t bins = histogram.counts.size();
  constexpr std::size_t kColumns = kRight - kLeft;
  for (std::size_t column = 0; column < kColumns; ++column) {
    const std::size_t first = column * bins / kColumns;
    const std::size_t last = std::max(first + 1, ((column + 1) * bins + kColumns - 1) / kColumns);
    const std::uint64_t count = *std::max_element(
        histogram.counts.begin() + static_cast<std::ptrdiff_t>(first),
        histogram.counts.begin() + static_cast<std::ptrdiff_t>(std::min(last, bins)));
    // A bin with a count shows, however small that is.
    const auto tall =
        static_cast<unsigned>(std::ceil(static_cast<double>(count) / highest * (kBottom - kTop)));
    const unsigned x = kLeft + static_cast<unsigned>(column);
    Fill(x, top + kBottom - tall, x + 1, top + kBottom, kBar);
  }
}

void HistogramPlot::DrawAxes(const PlottedHistogram& histogram, unsigned top, double highest) {
  Put(DrawText(histogram.title), kLeft, top + 8);
  const double high =
      histogram.lower + histogram.binSize * static_cast<double>(histogram.counts.size());
  const auto label = [](double value) { return fmt::format("{:.6g}", value == 0 ? 0.0 : value); };
  for (const double tick : Ticks(histogram.lower, high)) {
    const double share =
        high > histogram.lower ? (tick - histogram.lower) / (high - histogram.lower) : 0.0;
    const unsigned x = kLeft + static_cast<unsigned>(std::lround(share * (kRight - kLeft)));
    Fill(x, top + kTop, x + 1, top + kBottom, kGrid);
    Fill(x, top + kBottom, x + 1, top + kBottom + 5, kInk);
    const TextImage text = DrawText(label(tick));
    Put(text, x - std::min(x, text.width / 2), top + kBottom + 6);
  }
  for (const double part : {0.5, 1.0}) {
    const unsigned y = top + kBottom - static_cast<unsigned>(part * (kBottom - kTop));
    Fill(kLeft, y, kRight, y + 1, kGrid);
    const TextImage text = DrawText(label(part * highest));
    Put(text, kLeft - 8 - std::min(kLeft - 8, text.width), y - text.height / 2);
  }
  Fill(kLeft - 1, top + kTop, kLeft, top + kBottom + 1, kInk);
  Fill(kLeft - 1, top + kBottom, kRight + 1, top + kBottom + 1, kInk);
}

void HistogramPlot::Put(const TextImage& text, unsigned x, unsigned y) {
  text.DrawOn(pixels_, kWidth, 1, x, y);
}

/// Right and bottom are beyond the last pixel. What lies outside the picture is left out.
void HistogramPlot::Fill(unsigned left, unsigned top, unsigned right, unsigned bottom,
                         unsigned char grey) {
  for (unsigned y = top; y < std::min(bottom, height_); ++y) {
    for (unsigned x = left; x < std::min(right, kWidth); ++x) {
      pixels_[std::size_t{y} * kWidth + x] = grey;
    }
  }
}

void HistogramPlot::Write(const OutputFile& output) const {
  const auto writer = MakePictureWriter(output, kWidth, height_, 1);
  for (unsigned y = 0; y < height_; ++y) writer->WriteLine(&pixels_[std::size_t{y} * kWidth]);
  writer->Close();
}

}  // namespace lumo::host
