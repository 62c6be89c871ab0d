#include "pictures/plot.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>

namespace lumo::host {
namespace {

// Lengths in units of a figure.
constexpr unsigned kWidth = 720, kPanelHeight = 260;
constexpr double kLeft = 78, kRight = kWidth - 24.0;  // of the frame, in the figure
constexpr double kTop = 36, kBottom = kPanelHeight - 52.0;

constexpr unsigned kInk = 0x222222, kGrid = 0xDDDDDD, kBar = 0x4878A8, kCurve = 0x1F5A96;
constexpr unsigned kPlace = 0xC8501E;

/// Round numbers of one distance.
struct Ticks {
  double step = 1;
  std::vector<double> at;

  /// Those within two values, about as many as wanted.
  Ticks(double low, double high, double wanted) {
    const double raw = (high - low) / wanted;
    if (!(raw > 0) || !std::isfinite(raw)) {
      at = {low};
      return;
    }
    const double decade = std::pow(10, std::floor(std::log10(raw)));
    step = 10 * decade;
    for (const double factor : {5.0, 2.0, 1.0}) {
      if (factor * decade >= raw) step = factor * decade;
    }
    constexpr double kSlack = 1e-9;  // of a step, for what rounding takes away
    for (double k = std::ceil(low / step - kSlack); k * step <= high + kSlack * step; ++k) {
      at.push_back(k * step);
    }
  }

  /// A number with as many decimals as the distance needs.
  std::string TextOf(double value) const {
    constexpr double kMost = 1e7, kLeast = 1e-5;
    if (std::abs(value) < step / 2) return "0";
    if (std::abs(value) >= kMost || step < kLeast) return fmt::format("{:.6g}", value);
    const int decimals = std::max(0, static_cast<int>(-std::floor(std::log10(step) + 1e-9)));
    return fmt::format("{:.{}f}", value, decimals);
  }
};

/// Draws one panel. The coordinates of its parts count from its corner.
class PanelDrawing {
 public:
  PanelDrawing(const PlotPanel& panel, const FigurePoint& corner, Figure& figure)
      : panel_(panel),
        left_(corner.x + kLeft),
        right_(corner.x + kRight),
        top_(corner.y),
        figure_(figure) {
    const bool isBars = panel.form == PlotPanel::Form::kBars;
    const auto count = static_cast<double>(panel.values.size());
    first_ = panel.lower;
    last_ = panel.lower + panel.step * (isBars ? count : std::max(count - 1, 1.0));
    const auto [least, most] = std::minmax_element(panel.values.begin(), panel.values.end());
    low_ = std::min(*least, 0.0);
    high_ = *most > low_ ? *most : low_ + 1;
    constexpr double kWanted = 5;
    const double step = Ticks(low_, high_, kWanted).step;
    low_ = std::floor(low_ / step) * step;
    high_ = std::ceil(high_ / step - 1e-9) * step;
  }

  void Draw() {
    DrawGrid();
    panel_.form == PlotPanel::Form::kBars ? DrawBars() : DrawCurve();
    for (const double place : panel_.places) {
      constexpr double kLine = 1.2;
      if (place >= first_ && place <= last_) {
        figure_.Line({{X(place), Y(low_)}, {X(place), Y(high_)}}, kLine, kPlace);
      }
    }
    DrawFrame();
  }

 private:
  double X(double value) const {
    return last_ > first_ ? left_ + (value - first_) / (last_ - first_) * (right_ - left_) : left_;
  }
  double Y(double value) const {
    return top_ + kBottom - (value - low_) / (high_ - low_) * (kBottom - kTop);
  }

  std::string AcrossText(const Ticks& ticks, double value) const {
    if (panel_.axis == PlotPanel::Axis::kPlain) return ticks.TextOf(value);
    return fmt::format("{:.6g}", std::exp2(value));
  }

  void DrawGrid() {
    constexpr double kMany = 9, kFew = 5, kThin = 0.8, kTick = 4;
    constexpr double kSize = 11;
    Ticks across(first_, last_, kMany);
    if (panel_.axis == PlotPanel::Axis::kPowersOfTwo && across.step < 1) {
      across = Ticks(std::ceil(first_), std::floor(last_), std::floor(last_) - std::ceil(first_));
    }
    for (const double value : across.at) {
      const double x = X(value);
      figure_.Line({{x, top_ + kTop}, {x, top_ + kBottom}}, kThin, kGrid);
      figure_.Line({{x, top_ + kBottom}, {x, top_ + kBottom + kTick}}, kThin, kInk);
      figure_.Text(AcrossText(across, value),
                   {.at = {x, top_ + kBottom + 16}, .size = kSize, .align = 0.5}, kInk);
    }
    const Ticks up(low_, high_, kFew);
    for (const double value : up.at) {
      const double y = Y(value);
      figure_.Line({{left_, y}, {right_, y}}, kThin, kGrid);
      figure_.Line({{left_ - kTick, y}, {left_, y}}, kThin, kInk);
      figure_.Text(up.TextOf(value), {.at = {left_ - 7, y + 4}, .size = kSize, .align = 1}, kInk);
    }
  }

  /// One area under all bars.
  void DrawBars() {
    constexpr double kUnit = 0.5, kLeast = 0.75;
    const std::vector<double>& values = panel_.values;
    const auto most = static_cast<std::size_t>((right_ - left_) / kUnit);
    const std::size_t columns = std::min(values.size(), most);
    const double base = Y(0);
    std::vector<FigurePoint> area{{left_, base}};
    for (std::size_t column = 0; column < columns; ++column) {
      const std::size_t first = column * values.size() / columns;
      const std::size_t end = std::max(first + 1, ((column + 1) * values.size()) / columns);
      const double value = *std::max_element(&values[first], &values[0] + end);
      const double y = value > 0 ? std::min(Y(value), base - kLeast) : Y(value);
      const auto edge = [&](std::size_t at) {
        return left_ +
               (right_ - left_) * static_cast<double>(at) / static_cast<double>(values.size());
      };
      area.push_back({edge(first), y});
      area.push_back({edge(end), y});
    }
    area.push_back({right_, base});
    figure_.Fill(std::move(area), kBar);
  }

  void DrawCurve() {
    constexpr double kLine = 1.8;
    std::vector<FigurePoint> points;
    for (std::size_t i = 0; i < panel_.values.size(); ++i) {
      points.push_back(
          {X(panel_.lower + panel_.step * static_cast<double>(i)), Y(panel_.values[i])});
    }
    figure_.Line(std::move(points), kLine, kCurve);
  }

  void DrawFrame() {
    constexpr double kThin = 1, kTitle = 13, kLabel = 12;
    figure_.Line({{left_, top_ + kTop}, {left_, top_ + kBottom}, {right_, top_ + kBottom}}, kThin,
                 kInk);
    figure_.Text(panel_.title, {.at = {left_, top_ + 22}, .size = kTitle, .isBold = true}, kInk);
    figure_.Text(panel_.across,
                 {.at = {(left_ + right_) / 2, top_ + kBottom + 35}, .size = kLabel, .align = 0.5},
                 kInk);
    figure_.Text(panel_.up,
                 {.at = {left_ - 60, top_ + (kTop + kBottom) / 2},
                  .size = kLabel,
                  .align = 0.5,
                  .isUpright = true},
                 kInk);
  }

  const PlotPanel& panel_;
  const double left_, right_, top_;  // of the panel; the frame's on its sides
  Figure& figure_;
  double first_, last_;  // values at the ends of the lower axis
  double low_, high_;    // of the left one
};

}  // namespace

Figure DrawPlot(const std::vector<PlotPanel>& panels) {
  constexpr std::size_t kColumn = 6, kMostColumns = 22;
  const std::size_t count = panels.size();
  const auto side = static_cast<std::size_t>(std::ceil(std::sqrt(static_cast<double>(count) / 2)));
  const std::size_t columns = count <= kColumn ? 1 : std::min(side, kMostColumns);
  const std::size_t rows = (count + columns - 1) / columns;
  Figure figure(kWidth * static_cast<unsigned>(columns),
                kPanelHeight * static_cast<unsigned>(rows));
  for (std::size_t i = 0; i < count; ++i) {
    const FigurePoint corner{static_cast<double>(kWidth * (i / rows)),
                             static_cast<double>(kPanelHeight * (i % rows))};
    PanelDrawing(panels[i], corner, figure).Draw();
  }
  return figure;
}

}  // namespace lumo::host
