#pragma once

#include <string>
#include <vector>

#include "pictures/figure.h"

namespace lumo::host {

/// A part of a plot: values over an axis.
struct PlotPanel {
  /// How the values are drawn.
  enum class Form {
    kBars,   ///< value i as high as it is over lower + i * step to lower + (i + 1) * step
    kCurve,  ///< a line through value i at lower + i * step
  };
  /// How the numbers of the lower axis are written.
  enum class Axis {
    kPlain,
    kPowersOfTwo,  ///< 2 to the places: the values are over binary logarithms
  };

  std::string title;
  std::string across;  ///< what the lower axis shows, with its unit
  std::string up;      ///< what the left axis shows, with its unit
  double lower = 0;
  double step = 1;
  std::vector<double> values;    ///< finite
  std::vector<double> places{};  ///< on the lower axis, marked by lines
  Form form = Form::kBars;
  Axis axis = Axis::kPlain;
};

/// Draws panels one above the other, more than six in columns, each with its title, axes with round
/// numbers, and a grid. The left axis begins at zero unless there are values below, and ends at a
/// round number.
///
/// Of more bars than there are half units a place shows the highest of its own; each bar that isn't
/// zero shows, however small it is.
/// @param panels  one at least, each of one value at least.
Figure DrawPlot(const std::vector<PlotPanel>& panels);

}  // namespace lumo::host
