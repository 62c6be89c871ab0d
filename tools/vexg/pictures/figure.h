#pragma once

#include <string>
#include <vector>

#include "output/output_file.h"

namespace lumo::host {

/// A place in a figure, from its upper left corner.
struct FigurePoint {
  double x = 0, y = 0;
};

/// A drawing of areas, lines and texts, one over the other, on white paper. Its unit is a
/// ninety-sixth of an inch.
///
/// As SVG it is these shapes, with texts that stay texts; as a picture Cairo draws them, with two
/// pixels to a unit.
class Figure {
 public:
  /// The place and look of a text.
  struct TextForm {
    FigurePoint at;          ///< of its anchor, on the base line
    double size = 11;        ///< of its letters
    double align = 0;        ///< share of it that stands before the anchor: 0, 0.5 or 1
    bool isUpright = false;  ///< it reads upwards
    bool isBold = false;
  };

  Figure(unsigned width, unsigned height) : width_(width), height_(height) {}

  /// @param colour  0xRRGGBB, here and below.
  void Fill(std::vector<FigurePoint> corners, unsigned colour);
  void Line(std::vector<FigurePoint> points, double width, unsigned colour);
  void Text(const std::string& text, const TextForm& form, unsigned colour);

  /// Writes the figure in the format that the ending of the output's name stands for. Throws
  /// HostError.
  void Write(const OutputFile& output) const;

 private:
  enum class Kind { kArea, kLine, kText };
  struct Mark {
    Kind kind;
    std::vector<FigurePoint> points;
    unsigned colour;
    double width;
    std::string text;
    TextForm form;
  };

  std::string AsSvg() const;
  void WritePicture(const OutputFile& output) const;

  unsigned width_, height_;
  std::vector<Mark> marks_;
};

/// Throws HostError unless the name's ending stands for a format of figures: .svg, or one of
/// pictures.
void CheckFigureName(const std::string& name);

}  // namespace lumo::host
