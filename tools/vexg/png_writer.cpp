#include "png_writer.h"

#include <bit>
#include <csetjmp>
#include <exception>
#include <png.h>

#include "verb.h"

namespace lumo::host {

/// What libpng works on. Its errors jump back into Guard; nothing that has a destructor may stand
/// between.
struct PngWriter::Impl {
  explicit Impl(const OutputFile& output) : file(output), shown(output.GetShownName()) {}
  ~Impl() { png_destroy_write_struct(&png, &info); }

  /// Runs calls of libpng; throws what went wrong in them.
  template <typename Calls>
  void Guard(const Calls& calls) {
    if (setjmp(png_jmpbuf(png)) == 0) {
      calls();
      return;
    }
    if (thrown) std::rethrow_exception(thrown);
    throw HostError(kExitFailed, shown + ": " + fault);
  }

  static Impl& Of(void* pointer) { return *static_cast<Impl*>(pointer); }

  static void OnError(png_structp png, png_const_charp message) {
    Of(png_get_error_ptr(png)).fault = message;
    png_longjmp(png, 1);
  }
  static void OnWarning(png_structp, png_const_charp) {}
  static void OnFlush(png_structp) {}

  static void OnWrite(png_structp png, png_bytep data, std::size_t bytes) {
    if (!Of(png_get_io_ptr(png)).TryWrite(data, bytes)) png_error(png, "can't be written");
  }

  bool TryWrite(const unsigned char* data, std::size_t bytes) {
    try {
      file.Write(data, bytes);
      return true;
    } catch (...) {
      thrown = std::current_exception();
      return false;
    }
  }

  FileWriter file;
  const std::string shown;
  png_structp png = nullptr;
  png_infop info = nullptr;
  const char* fault = "";
  std::exception_ptr thrown;
};

namespace {

int ColorType(unsigned channels) {
  constexpr int kTypes[] = {PNG_COLOR_TYPE_GRAY, PNG_COLOR_TYPE_GRAY_ALPHA, PNG_COLOR_TYPE_RGB,
                            PNG_COLOR_TYPE_RGB_ALPHA};
  return kTypes[channels - 1];
}

}  // namespace

PngWriter::PngWriter(const OutputFile& output, unsigned width, unsigned height, unsigned channels,
                     unsigned bits)
    : impl_(std::make_unique<Impl>(output)) {
  Impl& impl = *impl_;
  impl.png =
      png_create_write_struct(PNG_LIBPNG_VER_STRING, &impl, &Impl::OnError, &Impl::OnWarning);
  if (impl.png != nullptr) impl.info = png_create_info_struct(impl.png);
  if (impl.info == nullptr) throw std::bad_alloc();
  impl.Guard([&] {
    png_set_write_fn(impl.png, &impl, &Impl::OnWrite, &Impl::OnFlush);
    png_set_user_limits(impl.png, PNG_UINT_31_MAX, PNG_UINT_31_MAX);
    png_set_IHDR(impl.png, impl.info, width, height, static_cast<int>(bits), ColorType(channels),
                 PNG_INTERLACE_NONE, PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
    png_write_info(impl.png, impl.info);
    if (bits == 16 && std::endian::native == std::endian::little) png_set_swap(impl.png);
  });
}

PngWriter::~PngWriter() = default;

void PngWriter::WriteLine(const unsigned char* line) {
  impl_->Guard([&] { png_write_row(impl_->png, line); });
}

void PngWriter::Close() {
  impl_->Guard([&] { png_write_end(impl_->png, nullptr); });
  impl_->file.Close();
}

}  // namespace lumo::host
