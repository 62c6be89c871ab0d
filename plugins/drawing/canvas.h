#pragma once

#include <cairo.h>
#include <memory>

/// An image of Cairo's and what draws on it, in letters without serifs.
class Canvas {
 public:
  Canvas(cairo_format_t format, int width, int height)
      : image_(cairo_image_surface_create(format, width, height)),
        context_(cairo_create(image_.get())) {
    SetFont(false);
  }

  void SetFont(bool isBold) const {
    cairo_select_font_face(Context(), "sans-serif", CAIRO_FONT_SLANT_NORMAL,
                           isBold ? CAIRO_FONT_WEIGHT_BOLD : CAIRO_FONT_WEIGHT_NORMAL);
  }

  cairo_t* Context() const { return context_.get(); }

  /// The pixels as they are now; null where something has failed. A line takes GetStride bytes.
  const unsigned char* GetPixels() const {
    cairo_surface_flush(image_.get());
    return IsGood() ? cairo_image_surface_get_data(image_.get()) : nullptr;
  }
  int GetStride() const { return cairo_image_surface_get_stride(image_.get()); }
  bool IsGood() const { return cairo_status(context_.get()) == CAIRO_STATUS_SUCCESS; }

 private:
  struct Destroy {
    void operator()(cairo_surface_t* surface) const { cairo_surface_destroy(surface); }
    void operator()(cairo_t* context) const { cairo_destroy(context); }
  };
  std::unique_ptr<cairo_surface_t, Destroy> image_;
  std::unique_ptr<cairo_t, Destroy> context_;
};
