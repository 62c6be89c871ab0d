#pragma once

#include <cstddef>

/// The other half of the contract of libvexgdrawing.so: figures of areas, lines and texts.
extern "C" {

/// A mark of a figure. Places and lengths are in units of the figure, from its upper left corner.
struct VexgMark {
  int kind;              ///< 0 a filled area, 1 a line, 2 a text
  const double* points;  ///< x, y of the corners of the area or line, or of the anchor of the text
  std::size_t count;     ///< of the points
  unsigned colour;       ///< 0xRRGGBB
  double size;           ///< of letters, or the width of the line
  const char* text;      ///< UTF-8, of one line; null where there is none
  double align;          ///< share of the text that stands before its anchor, which is on its base
  bool isUpright;        ///< the text reads upwards
  bool isBold;           ///< the text is in bold letters
};

/// Draws marks on white paper, one over the other.
/// @param scale   pixels of a unit.
/// @param pixels  width x height pixels of red, green and blue; the upper line first.
/// @return false when they can't be drawn.
using VexgDrawFigureFunction = bool(const VexgMark* marks, std::size_t count, double scale,
                                    unsigned width, unsigned height, unsigned char* pixels);
VexgDrawFigureFunction VexgDrawFigure;
}
