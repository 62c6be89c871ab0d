#include "pictures/picture_writer.h"

#include <filesystem>
#include <vector>

#include "foundation/text_case.h"
#include "pictures/jpeg_writer.h"
#include "pictures/png_writer.h"
#include "pictures/webp_writer.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// A JPEG of a picture that may have alpha.
class OpaquePicture final : public PictureWriter {
 public:
  OpaquePicture(const OutputFile& output, unsigned width, unsigned height, unsigned channels)
      : shown_(output.GetShownName()),
        width_(width),
        colors_(channels < 3 ? 1 : 3),
        hasAlpha_(channels % 2 == 0),
        writer_(MakeJpegWriter(output, width, height, colors_)),
        opaque_(std::size_t{width} * colors_) {}

  void WriteLine(const unsigned char* line) override {
    if (!hasAlpha_) {
      writer_->WriteLine(line);
      return;
    }
    for (std::size_t x = 0; x < width_; ++x, line += colors_ + 1) {
      constexpr unsigned char kWhite = 255;
      const bool isOpaque = line[colors_] != 0;
      for (std::size_t i = 0; i < colors_; ++i) {
        opaque_[x * colors_ + i] = isOpaque ? line[i] : kWhite;
      }
    }
    writer_->WriteLine(opaque_.data());
  }

  void Close() override {
    writer_->Close();
    if (!hasAlpha_) return;
    Say(shown_ + ": note: a JPEG has no transparent pixels: those that are not valid are white");
  }

 private:
  const std::string shown_;
  const unsigned width_;
  const unsigned colors_;
  const bool hasAlpha_;
  const std::unique_ptr<PictureWriter> writer_;
  std::vector<unsigned char> opaque_;
};

enum class Format { kNone, kPng, kJpeg, kWebp };

Format FormatOf(const std::string& name) {
  static constexpr std::pair<const char*, Format> kEndings[] = {{".png", Format::kPng},
                                                                {".jpg", Format::kJpeg},
                                                                {".jpeg", Format::kJpeg},
                                                                {".webp", Format::kWebp}};
  const std::string ending = LowerCase(std::filesystem::path(name).extension().string());
  for (const auto& [known, format] : kEndings) {
    if (ending == known) return format;
  }
  return Format::kNone;
}

}  // namespace

bool IsPictureName(const std::string& name) {
  return FormatOf(name) != Format::kNone;
}

void CheckPictureName(const std::string& name) {
  if (IsPictureName(name)) return;
  throw HostError(kExitUsage, name + ": a picture is named .png, .jpg, .jpeg or .webp");
}

std::unique_ptr<PictureWriter> MakePictureWriter(const OutputFile& output, unsigned width,
                                                 unsigned height, unsigned channels) {
  CheckPictureName(output.GetShownName());
  constexpr unsigned kBits = 8;
  switch (FormatOf(output.GetShownName())) {
    case Format::kJpeg:
      return std::make_unique<OpaquePicture>(output, width, height, channels);
    case Format::kWebp:
      return MakeWebpWriter(output, width, height, channels);
    default:
      return MakePngWriter(output, width, height, channels, kBits);
  }
}

}  // namespace lumo::host
