#include "drawing/text_drawing.h"

#include <algorithm>
#include <cmath>

#include "drawing/canvas.h"
#include "platform/export.h"

extern "C" VEXG_EXPORT bool VexgDrawText(const char* text, double size, unsigned* width,
                                         unsigned* height, unsigned char* cover) {
  const bool isMeasured = cover == nullptr;
  const Canvas canvas(CAIRO_FORMAT_A8, isMeasured ? 1 : static_cast<int>(*width),
                      isMeasured ? 1 : static_cast<int>(*height));
  cairo_set_font_size(canvas.Context(), size);
  cairo_font_extents_t font{};
  cairo_font_extents(canvas.Context(), &font);
  if (isMeasured) {
    cairo_text_extents_t extents{};
    cairo_text_extents(canvas.Context(), text, &extents);
    *width = static_cast<unsigned>(std::ceil(std::max(extents.x_advance, 1.0)));
    *height = static_cast<unsigned>(std::ceil(font.ascent + font.descent));
    return canvas.IsGood();
  }
  cairo_move_to(canvas.Context(), 0, std::round(font.ascent));
  cairo_show_text(canvas.Context(), text);
  const unsigned char* const data = canvas.GetPixels();
  if (data == nullptr) return false;
  for (unsigned y = 0; y < *height; ++y) {
    std::copy_n(data + std::ptrdiff_t{canvas.GetStride()} * y, *width,
                cover + std::size_t{*width} * y);
  }
  return true;
}
