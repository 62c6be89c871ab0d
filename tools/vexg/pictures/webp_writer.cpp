#include "pictures/webp_writer.h"

#include <set>
#include <vector>
#include <webp/encode.h>

#include <fmt/format.h>

#include "verb.h"

namespace lumo::host {
namespace {

class WebpWriter final : public PictureWriter {
 public:
  WebpWriter(const OutputFile& output, unsigned width, unsigned height, unsigned channels)
      : file_(output),
        shown_(output.GetShownName()),
        width_(width),
        height_(height),
        channels_(channels),
        hasAlpha_(channels % 2 == 0) {
    if (width > WEBP_MAX_DIMENSION || height > WEBP_MAX_DIMENSION) {
      throw HostError(kExitFailed, fmt::format("{}: a WebP has at most {} pixels on a side", shown_,
                                               WEBP_MAX_DIMENSION));
    }
    pixels_.reserve(std::size_t{width} * height * (hasAlpha_ ? 4 : 3));
  }

  void WriteLine(const unsigned char* line) override {
    const bool isGrey = channels_ < 3;
    for (unsigned x = 0; x < width_; ++x, line += channels_) {
      for (unsigned i = 0; i < 3; ++i) pixels_.push_back(line[isGrey ? 0 : i]);
      if (hasAlpha_) pixels_.push_back(line[channels_ - 1]);
    }
  }

  void Close() override {
    const std::vector<unsigned char> bytes = Pack();
    file_.Write(bytes.data(), bytes.size());
    file_.Close();
  }

 private:
  /// Owns the buffers of a picture of libwebp.
  struct Picture : WebPPicture {
    Picture() : WebPPicture{} {
      if (WebPPictureInit(this) == 0) throw HostError(kExitFailed, "libwebp is of another version");
    }
    ~Picture() { WebPPictureFree(this); }
    Picture(const Picture&) = delete;
    Picture& operator=(const Picture&) = delete;
  };

  bool HasFewColours() const {
    constexpr std::size_t kFew = 256;
    const std::size_t step = hasAlpha_ ? 4 : 3;
    std::set<unsigned> colours;
    unsigned last = 0;
    for (std::size_t i = 0; i < pixels_.size(); i += step) {
      unsigned colour = 0;
      for (std::size_t c = 0; c < step; ++c) colour = colour << 8U | pixels_[i + c];
      if (i != 0 && colour == last) continue;
      last = colour;
      colours.insert(colour);
      if (colours.size() > kFew) return false;
    }
    return true;
  }

  static int OnBytes(const std::uint8_t* data, std::size_t count, const WebPPicture* picture) {
    auto& bytes = *static_cast<std::vector<unsigned char>*>(picture->custom_ptr);
    bytes.insert(bytes.end(), data, data + count);
    return 1;
  }

  std::vector<unsigned char> Pack() const {
    constexpr float kQuality = 90;
    WebPConfig config;
    bool isGood = WebPConfigInit(&config) != 0;
    config.quality = kQuality;
    config.thread_level = 1;
    Picture picture;
    picture.width = static_cast<int>(width_);
    picture.height = static_cast<int>(height_);
    if (HasFewColours()) {
      config.lossless = config.exact = 1;
      picture.use_argb = 1;
    }
    const int stride = static_cast<int>(width_) * (hasAlpha_ ? 4 : 3);
    const auto import = hasAlpha_ ? &WebPPictureImportRGBA : &WebPPictureImportRGB;
    isGood = isGood && import(&picture, pixels_.data(), stride) != 0;
    std::vector<unsigned char> bytes;
    picture.writer = &OnBytes;
    picture.custom_ptr = &bytes;
    if (isGood && WebPEncode(&config, &picture) != 0) return bytes;
    const bool isShort = picture.error_code == VP8_ENC_ERROR_OUT_OF_MEMORY ||
                         picture.error_code == VP8_ENC_ERROR_BITSTREAM_OUT_OF_MEMORY;
    throw HostError(kExitFailed, isShort ? shown_ + ": out of memory"
                                         : fmt::format("{}: libwebp fails with error {}", shown_,
                                                       static_cast<int>(picture.error_code)));
  }

  FileWriter file_;
  const std::string shown_;
  const unsigned width_, height_, channels_;
  const bool hasAlpha_;
  std::vector<unsigned char> pixels_;  // red, green, blue, and alpha where it has some
};

}  // namespace

std::unique_ptr<PictureWriter> MakeWebpWriter(const OutputFile& output, unsigned width,
                                              unsigned height, unsigned channels) {
  return std::make_unique<WebpWriter>(output, width, height, channels);
}

}  // namespace lumo::host
