#include "pictures/text_image.h"

#include "drawing/text_drawing.h"
#include "pictures/drawing_plugin.h"

namespace lumo::host {
void TextImage::DrawOn(std::vector<unsigned char>& pixels, unsigned rowPixels, unsigned channels,
                       unsigned x, unsigned y) const {
  const std::size_t rows = pixels.size() / (std::size_t{rowPixels} * channels);
  const unsigned colors = channels < 3 ? 1 : 3;
  for (unsigned v = 0; v < height && y + v < rows; ++v) {
    for (unsigned u = 0; u < width && x + u < rowPixels; ++u) {
      unsigned char* const pixel = &pixels[(std::size_t{y + v} * rowPixels + x + u) * channels];
      const unsigned paper = 255U - cover[std::size_t{v} * width + u];
      for (unsigned c = 0; c < colors; ++c) {
        pixel[c] = static_cast<unsigned char>(pixel[c] * paper / 255);
      }
    }
  }
}

TextImage DrawText(const std::string& text, double size) {
  auto* const draw = FindDrawing<VexgDrawTextFunction>("VexgDrawText");
  const std::string line = Printable(text);
  TextImage image;
  bool isDone = draw(line.c_str(), size, &image.width, &image.height, nullptr);
  image.cover.resize(std::size_t{image.width} * image.height);
  isDone = isDone && draw(line.c_str(), size, &image.width, &image.height, image.cover.data());
  if (!isDone) throw HostError(kExitFailed, "the text \"" + line + "\" can't be drawn");
  return image;
}

}  // namespace lumo::host
