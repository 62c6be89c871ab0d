#include "jpeg_writer.h"

#include <csetjmp>
#include <cstdio>
#include <cstdlib>
#include <jpeglib.h>
#include <vector>

#include "verb.h"

namespace lumo::host {

/// The state that libjpeg works on. It writes into memory, so that only its own errors jump back
/// into Guard; nothing that has a destructor may stand between.
struct JpegWriter::Impl {
  explicit Impl(const OutputFile& output) : file(output), shown(output.GetShownName()) {
    jpeg.err = jpeg_std_error(&errors);
    errors.error_exit = &OnError;
    errors.output_message = &OnMessage;
    jpeg.client_data = this;
  }
  ~Impl() {
    jpeg_destroy_compress(&jpeg);
    std::free(bytes);
  }

  /// Runs calls of libjpeg; throws what went wrong in them.
  template <typename Calls>
  void Guard(const Calls& calls) {
    if (setjmp(back) == 0) {
      calls();
      return;
    }
    throw HostError(kExitFailed, shown + ": " + fault);
  }

  static void OnError(j_common_ptr common) {
    Impl& impl = *static_cast<Impl*>(common->client_data);
    common->err->format_message(common, impl.fault);
    std::longjmp(impl.back, 1);
  }
  static void OnMessage(j_common_ptr) {}

  FileWriter file;
  const std::string shown;
  jpeg_compress_struct jpeg{};
  jpeg_error_mgr errors{};
  std::jmp_buf back{};
  char fault[JMSG_LENGTH_MAX] = "";
  unsigned char* bytes = nullptr;  // libjpeg's; to be freed
  unsigned long count = 0;
};

JpegWriter::JpegWriter(const OutputFile& output, unsigned width, unsigned height, unsigned channels)
    : impl_(std::make_unique<Impl>(output)) {
  Impl& impl = *impl_;
  impl.Guard([&] {
    constexpr int kQuality = 90;
    jpeg_create_compress(&impl.jpeg);
    jpeg_mem_dest(&impl.jpeg, &impl.bytes, &impl.count);
    impl.jpeg.image_width = width;
    impl.jpeg.image_height = height;
    impl.jpeg.input_components = static_cast<int>(channels);
    impl.jpeg.in_color_space = channels == 1 ? JCS_GRAYSCALE : JCS_RGB;
    jpeg_set_defaults(&impl.jpeg);
    jpeg_set_quality(&impl.jpeg, kQuality, TRUE);
    jpeg_start_compress(&impl.jpeg, TRUE);
  });
}

JpegWriter::~JpegWriter() = default;

void JpegWriter::WriteLine(const unsigned char* line) {
  impl_->Guard([&] {
    JSAMPROW row = const_cast<JSAMPROW>(line);  // libjpeg only reads it
    jpeg_write_scanlines(&impl_->jpeg, &row, 1);
  });
}

void JpegWriter::Close() {
  impl_->Guard([&] { jpeg_finish_compress(&impl_->jpeg); });
  impl_->file.Write(impl_->bytes, impl_->count);
  impl_->file.Close();
}

}  // namespace lumo::host
