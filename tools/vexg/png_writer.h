#pragma once

#include <memory>

#include "output_file.h"

namespace lumo::host {

/// Writes a picture into a PNG file, line by line.
class PngWriter {
 public:
  /// @param channels  1 grey, 2 grey and alpha, 3 colours, 4 colours and alpha.
  /// @param bits      of a channel, 8 or 16. Throws HostError for a picture that PNG can't hold.
  PngWriter(const OutputFile& output, unsigned width, unsigned height, unsigned channels,
            unsigned bits);
  ~PngWriter();
  PngWriter(const PngWriter&) = delete;
  PngWriter& operator=(const PngWriter&) = delete;

  /// Writes the next line: the channels of a pixel next to one another, 16 bits in the byte order
  /// of the machine.
  void WriteLine(const unsigned char* line);
  /// Ends the file, after the last line.
  void Close();

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

}  // namespace lumo::host
