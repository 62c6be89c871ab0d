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

/// A letter of 5 by 7 dots, a row to a byte, the leftmost dot in bit 4.
struct Glyph {
  char letter;
  unsigned char rows[7];
};

constexpr Glyph kGlyphs[] = {
    {'0', {14, 17, 19, 21, 25, 17, 14}}, {'1', {4, 12, 4, 4, 4, 4, 14}},
    {'2', {14, 17, 1, 2, 4, 8, 31}},     {'3', {31, 2, 4, 2, 1, 17, 14}},
    {'4', {2, 6, 10, 18, 31, 2, 2}},     {'5', {31, 16, 30, 1, 1, 17, 14}},
    {'6', {6, 8, 16, 30, 17, 17, 14}},   {'7', {31, 1, 2, 4, 8, 8, 8}},
    {'8', {14, 17, 17, 14, 17, 17, 14}}, {'9', {14, 17, 17, 15, 1, 2, 12}},
    {'-', {0, 0, 0, 31, 0, 0, 0}},       {'+', {0, 4, 4, 31, 4, 4, 0}},
    {'.', {0, 0, 0, 0, 0, 12, 12}},      {'e', {0, 0, 14, 17, 31, 16, 14}},
    {'b', {16, 16, 22, 25, 17, 17, 30}}, {'a', {0, 0, 14, 1, 15, 17, 15}},
    {'n', {0, 0, 22, 25, 17, 17, 17}},   {'d', {1, 1, 13, 19, 17, 17, 15}},
    {'i', {4, 0, 12, 4, 4, 4, 14}},      {'f', {6, 9, 8, 28, 8, 8, 8}},
    {'g', {0, 0, 15, 17, 15, 1, 14}},    {'r', {0, 0, 22, 25, 16, 16, 16}},
    {'t', {8, 8, 28, 8, 8, 9, 6}},       {'s', {0, 0, 15, 16, 14, 1, 30}},
    {'c', {0, 0, 14, 17, 16, 17, 14}},   {'o', {0, 0, 14, 17, 17, 17, 14}}};
constexpr unsigned kGlyphWidth = 6;

unsigned TextWidth(const std::string& text) {
  return static_cast<unsigned>(text.size()) * kGlyphWidth;
}

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
  DrawText(histogram.title, kLeft, top + 10);
  const double high =
      histogram.lower + histogram.binSize * static_cast<double>(histogram.counts.size());
  const auto label = [](double value) { return fmt::format("{:.6g}", value == 0 ? 0.0 : value); };
  for (const double tick : Ticks(histogram.lower, high)) {
    const double share =
        high > histogram.lower ? (tick - histogram.lower) / (high - histogram.lower) : 0.0;
    const unsigned x = kLeft + static_cast<unsigned>(std::lround(share * (kRight - kLeft)));
    Fill(x, top + kTop, x + 1, top + kBottom, kGrid);
    Fill(x, top + kBottom, x + 1, top + kBottom + 5, kInk);
    const std::string text = label(tick);
    DrawText(text, x - TextWidth(text) / 2, top + kBottom + 10);
  }
  for (const double part : {0.5, 1.0}) {
    const unsigned y = top + kBottom - static_cast<unsigned>(part * (kBottom - kTop));
    Fill(kLeft, y, kRight, y + 1, kGrid);
    const std::string text = label(part * highest);
    DrawText(text, kLeft - 8 - std::min(kLeft - 8, TextWidth(text)), y - 3);
  }
  Fill(kLeft - 1, top + kTop, kLeft, top + kBottom + 1, kInk);
  Fill(kLeft - 1, top + kBottom, kRight + 1, top + kBottom + 1, kInk);
}

void HistogramPlot::DrawText(const std::string& text, unsigned x, unsigned y) {
  for (const char letter : text) {
    const auto* const glyph =
        std::find_if(std::begin(kGlyphs), std::end(kGlyphs),
                     [&](const Glyph& candidate) { return candidate.letter == letter; });
    for (unsigned row = 0; glyph != std::end(kGlyphs) && row < 7; ++row) {
      for (unsigned dot = 0; dot < 5; ++dot) {
        if ((glyph->rows[row] >> (4 - dot) & 1) == 0) continue;
        Fill(x + dot, y + row, x + dot + 1, y + row + 1, kInk);
      }
    }
    x += kGlyphWidth;
  }
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
