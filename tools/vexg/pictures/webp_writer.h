#pragma once

#include <memory>

#include "pictures/picture_writer.h"

namespace lumo::host {

/// Makes a writer of a WebP file, which is made when the last line is there: without loss where the
/// picture has no more than 256 colours, as maps of classes have, else of quality 90.
/// @param channels  1 grey, 2 grey and alpha, 3 colours, 4 colours and alpha.
/// Throws HostError for a picture that WebP can't hold.
std::unique_ptr<PictureWriter> MakeWebpWriter(const OutputFile& output, unsigned width,
                                              unsigned height, unsigned channels);

}  // namespace lumo::host
