#include "pictures/jpeg_writer.h"

#include <csetjmp>
#include <cstdio>
#include <cstdlib>
#include <jpeglib.h>

#include "verb.h"

namespace lumo::host {

namespace {

/// libjpeg writes into memory, so that only its own errors jump back into Guard; nothing that has a
/// destructor may stand between.
class JpegWriter final : public PictureWriter {
 public:
  JpegWriter(const OutputFile& output, unsigned width, unsigned height, unsigned channels)
      : file_(output), shown_(output.GetShownName()) {
    jpeg_.err = jpeg_std_error(&errors_);
    errors_.error_exit = &OnError;
    errors_.output_message = &OnMessage;
    jpeg_.client_data = this;
    Guard([&] {
      constexpr int kQuality = 90;
      jpeg_create_compress(&jpeg_);
      jpeg_mem_dest(&jpeg_, &bytes_, &count_);
      jpeg_.image_width = width;
      jpeg_.image_height = height;
      jpeg_.input_components = static_cast<int>(channels);
      jpeg_.in_color_space = channels == 1 ? JCS_GRAYSCALE : JCS_RGB;
      jpeg_set_defaults(&jpeg_);
      jpeg_set_quality(&jpeg_, kQuality, TRUE);
      jpeg_start_compress(&jpeg_, TRUE);
    });
  }
  ~JpegWriter() override {
    // A buffer that has grown is reported only at its end: bytes_ leads to an older one before.
    if (jpeg_.dest != nullptr) jpeg_.dest->term_destination(&jpeg_);
    jpeg_destroy_compress(&jpeg_);
    std::free(bytes_);
  }

  void WriteLine(const unsigned char* line) override {
    Guard([&] {
      JSAMPROW row = const_cast<JSAMPROW>(line);  // libjpeg only reads it
      jpeg_write_scanlines(&jpeg_, &row, 1);
    });
  }

  void Close() override {
    Guard([&] { jpeg_finish_compress(&jpeg_); });
    file_.Write(bytes_, count_);
    file_.Close();
  }

 private:
  /// Runs calls of libjpeg; throws what went wrong in them.
  template <typename Calls>
  void Guard(const Calls& calls) {
    if (setjmp(back_) == 0) {
      calls();
      return;
    }
    throw HostError(kExitFailed, shown_ + ": " + fault_);
  }

  static void OnError(j_common_ptr common) {
    JpegWriter& writer = *static_cast<JpegWriter*>(common->client_data);
    common->err->format_message(common, writer.fault_);
    std::longjmp(writer.back_, 1);
  }
  static void OnMessage(j_common_ptr) {}

  FileWriter file_;
  const std::string shown_;
  jpeg_compress_struct jpeg_{};
  jpeg_error_mgr errors_{};
  std::jmp_buf back_{};
  char fault_[JMSG_LENGTH_MAX] = "";
  unsigned char* bytes_ = nullptr;  // libjpeg's; to be freed
  unsigned long count_ = 0;
};

}  // namespace

std::unique_ptr<PictureWriter> MakeJpegWriter(const OutputFile& output, unsigned width,
                                              unsigned height, unsigned channels) {
  return std::make_unique<JpegWriter>(output, width, height, channels);
}

}  // namespace lumo::host
