#pragma once

#include <memory>
#include <string>

#include "pictures/picture_writer.h"

namespace lumo::host {

/// Makes a writer of a PNG file.
/// @param channels  1 grey, 2 grey and alpha, 3 colours, 4 colours and alpha.
/// @param bits      of a channel, 8 or 16; 16 in the byte order of the machine.
/// Throws HostError for a picture that PNG can't hold.
std::unique_ptr<PictureWriter> MakePngWriter(const OutputFile& output, unsigned width,
                                             unsigned height, unsigned channels, unsigned bits);

/// Makes a PNG of a picture with channels of 8 bits, line after line.
std::string EncodePng(const unsigned char* pixels, unsigned width, unsigned height,
                      unsigned channels);

}  // namespace lumo::host
