#include "drawing/text_drawing.h"

#include <algorithm>
#include <cairo.h>
#include <cmath>
#include <memory>

#include "platform/export.h"

namespace {

/// A drawing of grey shares on an image.
class Drawing {
 public:
  Drawing(int width, int height, double size)
      : image_(cairo_image_surface_create(CAIRO_FORMAT_A8, width, height)),
        context_(cairo_create(image_.get())) {
    cairo_select_font_face(context_.get(), "sans-serif", CAIRO_FONT_SLANT_NORMAL,
                           CAIRO_FONT_WEIGHT_NORMAL);
    cairo_set_font_size(context_.get(), size);
  }

  cairo_t* Context() const { return context_.get(); }
  cairo_surface_t* Image() const { return image_.get(); }
  bool IsGood() const { return cairo_status(context_.get()) == CAIRO_STATUS_SUCCESS; }

 private:
  struct Destroy {
    void operator()(cairo_surface_t* surface) const { cairo_surface_destroy(surface); }
    void operator()(cairo_t* context) const { cairo_destroy(context); }
  };
  std::unique_ptr<cairo_surface_t, Destroy> image_;
  std::unique_ptr<cairo_t, Destroy> context_;
};

}  // namespace

extern "C" VEXG_EXPORT bool VexgDrawText(const char* text, double size, unsigned* width,
                                         unsigned* height, unsigned char* cover) {
  const bool isMeasured = cover == nullptr;
  const Drawing drawing(isMeasured ? 1 : static_cast<int>(*width),
                        isMeasured ? 1 : static_cast<int>(*height), size);
  cairo_font_extents_t font{};
  cairo_font_extents(drawing.Context(), &font);
  if (isMeasured) {
    cairo_text_extents_t extents{};
    cairo_text_extents(drawing.Context(), text, &extents);
    *width = static_cast<unsigned>(std::ceil(std::max(extents.x_advance, 1.0)));
    *height = static_cast<unsigned>(std::ceil(font.ascent + font.descent));
    return drawing.IsGood();
  }
  cairo_move_to(drawing.Context(), 0, std::round(font.ascent));
  cairo_show_text(drawing.Context(), text);
  cairo_surface_flush(drawing.Image());
  const unsigned char* const data = cairo_image_surface_get_data(drawing.Image());
  if (!drawing.IsGood() || data == nullptr) return false;
  const int stride = cairo_image_surface_get_stride(drawing.Image());
  for (unsigned y = 0; y < *height; ++y) {
    std::copy_n(data + std::ptrdiff_t{stride} * y, *width, cover + std::size_t{*width} * y);
  }
  return true;
}
