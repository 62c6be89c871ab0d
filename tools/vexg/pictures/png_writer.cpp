#include "pictures/png_writer.h"

#include <bit>
#include <csetjmp>
#include <exception>
#include <functional>
#include <png.h>

#include "verb.h"

namespace lumo::host {
namespace {

int ColorType(unsigned channels) {
  constexpr int kTypes[] = {PNG_COLOR_TYPE_GRAY, PNG_COLOR_TYPE_GRAY_ALPHA, PNG_COLOR_TYPE_RGB,
                            PNG_COLOR_TYPE_RGB_ALPHA};
  return kTypes[channels - 1];
}

/// Errors of libpng jump back into Guard; nothing that has a destructor may stand between.
class PngWriter final : public PictureWriter {
 public:
  using Sink = std::function<void(const unsigned char*, std::size_t)>;

  /// @param shown  what the user calls the picture.
  PngWriter(Sink sink, std::string shown, unsigned width, unsigned height, unsigned channels,
            unsigned bits)
      : sink_(std::move(sink)), shown_(std::move(shown)) {
    png_ = png_create_write_struct(PNG_LIBPNG_VER_STRING, this, &OnError, &OnWarning);
    if (png_ != nullptr) info_ = png_create_info_struct(png_);
    if (info_ == nullptr) throw std::bad_alloc();
    Guard([&] {
      png_set_write_fn(png_, this, &OnWrite, &OnFlush);
      png_set_user_limits(png_, PNG_UINT_31_MAX, PNG_UINT_31_MAX);
      png_set_IHDR(png_, info_, width, height, static_cast<int>(bits), ColorType(channels),
                   PNG_INTERLACE_NONE, PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
      png_write_info(png_, info_);
      if (bits == 16 && std::endian::native == std::endian::little) png_set_swap(png_);
    });
  }
  ~PngWriter() override { png_destroy_write_struct(&png_, &info_); }

  void WriteLine(const unsigned char* line) override {
    Guard([&] { png_write_row(png_, line); });
  }

  void Close() override {
    Guard([&] { png_write_end(png_, nullptr); });
  }

 private:
  /// Runs calls of libpng; throws what went wrong in them.
  template <typename Calls>
  void Guard(const Calls& calls) {
    if (setjmp(png_jmpbuf(png_)) == 0) {
      calls();
      return;
    }
    if (thrown_) std::rethrow_exception(thrown_);
    throw HostError(kExitFailed, shown_ + ": " + fault_);
  }

  static PngWriter& Of(void* pointer) { return *static_cast<PngWriter*>(pointer); }

  static void OnError(png_structp png, png_const_charp message) {
    Of(png_get_error_ptr(png)).fault_ = message;
    png_longjmp(png, 1);
  }
  static void OnWarning(png_structp, png_const_charp) {}
  static void OnFlush(png_structp) {}

  static void OnWrite(png_structp png, png_bytep data, std::size_t bytes) {
    if (!Of(png_get_io_ptr(png)).TryWrite(data, bytes)) png_error(png, "can't be written");
  }

  bool TryWrite(const unsigned char* data, std::size_t bytes) {
    try {
      sink_(data, bytes);
      return true;
    } catch (...) {
      thrown_ = std::current_exception();
      return false;
    }
  }

  const Sink sink_;
  const std::string shown_;
  png_structp png_ = nullptr;
  png_infop info_ = nullptr;
  const char* fault_ = "";
  std::exception_ptr thrown_;
};

class PngFileWriter final : public PictureWriter {
 public:
  PngFileWriter(const OutputFile& output, unsigned width, unsigned height, unsigned channels,
                unsigned bits)
      : file_(output),
        writer_([this](const unsigned char* data, std::size_t bytes) { file_.Write(data, bytes); },
                output.GetShownName(), width, height, channels, bits) {}

  void WriteLine(const unsigned char* line) override { writer_.WriteLine(line); }
  void Close() override {
    writer_.Close();
    file_.Close();
  }

 private:
  FileWriter file_;
  PngWriter writer_;
};

}  // namespace

std::unique_ptr<PictureWriter> MakePngWriter(const OutputFile& output, unsigned width,
                                             unsigned height, unsigned channels, unsigned bits) {
  return std::make_unique<PngFileWriter>(output, width, height, channels, bits);
}

std::string EncodePng(const unsigned char* pixels, unsigned width, unsigned height,
                      unsigned channels) {
  constexpr unsigned kBits = 8;
  std::string text;
  PngWriter writer(
      [&text](const unsigned char* data, std::size_t bytes) { text.append(data, data + bytes); },
      "picture", width, height, channels, kBits);
  for (unsigned line = 0; line < height; ++line) {
    writer.WriteLine(pixels + std::size_t{line} * width * channels);
  }
  writer.Close();
  return text;
}

}  // namespace lumo::host
