#include "drawing/figure_drawing.h"

#include <cmath>
#include <cstdint>
#include <cstring>

#include "drawing/canvas.h"
#include "platform/export.h"

namespace {

void SetColour(cairo_t* context, unsigned colour) {
  const auto part = [&](unsigned shift) { return ((colour >> shift) & 255U) / 255.0; };
  cairo_set_source_rgb(context, part(16), part(8), part(0));
}

void DrawShape(cairo_t* context, const VexgMark& mark) {
  for (std::size_t i = 0; i < mark.count; ++i) {
    cairo_line_to(context, mark.points[2 * i], mark.points[2 * i + 1]);
  }
  if (mark.kind == 0) {
    cairo_fill(context);
    return;
  }
  cairo_set_line_width(context, mark.size);
  cairo_set_line_join(context, CAIRO_LINE_JOIN_ROUND);
  cairo_stroke(context);
}

void DrawLetters(const Canvas& canvas, const VexgMark& mark) {
  cairo_t* const context = canvas.Context();
  canvas.SetFont(mark.isBold);
  cairo_set_font_size(context, mark.size);
  cairo_text_extents_t extents{};
  cairo_text_extents(context, mark.text, &extents);
  cairo_save(context);
  cairo_translate(context, mark.points[0], mark.points[1]);
  if (mark.isUpright) cairo_rotate(context, -std::acos(0.0));
  cairo_move_to(context, -mark.align * extents.x_advance, 0);
  cairo_show_text(context, mark.text);
  cairo_restore(context);
}

}  // namespace

extern "C" VEXG_EXPORT bool VexgDrawFigure(const VexgMark* marks, std::size_t count, double scale,
                                           unsigned width, unsigned height, unsigned char* pixels) {
  const Canvas canvas(CAIRO_FORMAT_RGB24, static_cast<int>(width), static_cast<int>(height));
  cairo_t* const context = canvas.Context();
  cairo_set_source_rgb(context, 1, 1, 1);
  cairo_paint(context);
  cairo_scale(context, scale, scale);
  for (std::size_t i = 0; i < count; ++i) {
    SetColour(context, marks[i].colour);
    marks[i].kind == 2 ? DrawLetters(canvas, marks[i]) : DrawShape(context, marks[i]);
    cairo_new_path(context);
  }
  const unsigned char* const data = canvas.GetPixels();
  if (data == nullptr) return false;
  for (unsigned y = 0; y < height; ++y) {
    const unsigned char* from = data + std::ptrdiff_t{canvas.GetStride()} * y;
    for (unsigned x = 0; x < width; ++x, from += sizeof(std::uint32_t), pixels += 3) {
      std::uint32_t pixel = 0;
      std::memcpy(&pixel, from, sizeof pixel);
      pixels[0] = static_cast<unsigned char>(pixel >> 16U);
      pixels[1] = static_cast<unsigned char>(pixel >> 8U);
      pixels[2] = static_cast<unsigned char>(pixel);
    }
  }
  return true;
}
