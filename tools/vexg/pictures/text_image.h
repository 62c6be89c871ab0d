#pragma once

#include <string>
#include <vector>

namespace lumo::host {

/// A line of text as grey shares.
struct TextImage {
  unsigned width = 0;
  unsigned height = 0;
  std::vector<unsigned char> cover;  ///< of 255, row by row

  /// Draws text over pixels of some channels, in black.
  /// @param pixels  rows of `rowPixels` pixels. What lies outside of them is left out.
  /// @param x,y     of the upper left corner.
  void DrawOn(std::vector<unsigned char>& pixels, unsigned rowPixels, unsigned channels, unsigned x,
              unsigned y) const;
};

constexpr double kTextSize = 11;  ///< pixels

/// Draws a line of text. Throws HostError where the plug-in that draws can't be loaded.
TextImage DrawText(const std::string& text, double size = kTextSize);

}  // namespace lumo::host
