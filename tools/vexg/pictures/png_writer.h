#pragma once

#include <memory>

#include "pictures/picture_writer.h"

namespace lumo::host {

/// Makes a writer of a PNG file.
/// @param channels  1 grey, 2 grey and alpha, 3 colours, 4 colours and alpha.
/// @param bits      of a channel, 8 or 16; 16 in the byte order of the machine.
/// Throws HostError for a picture that PNG can't hold.
std::unique_ptr<PictureWriter> MakePngWriter(const OutputFile& output, unsigned width,
                                             unsigned height, unsigned channels, unsigned bits);

}  // namespace lumo::host
