#pragma once

#include <memory>

#include "output_file.h"

namespace lumo::host {

/// Writes a picture into a JPEG file, line by line, at quality 90.
class JpegWriter {
 public:
  /// @param channels  1 grey, 3 colours. Throws HostError for a picture that JPEG can't hold.
  JpegWriter(const OutputFile& output, unsigned width, unsigned height, unsigned channels);
  ~JpegWriter();
  JpegWriter(const JpegWriter&) = delete;
  JpegWriter& operator=(const JpegWriter&) = delete;

  void WriteLine(const unsigned char* line);
  /// Ends the file, after the last line.
  void Close();

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

}  // namespace lumo::host
