#pragma once

#include <memory>

#include "pictures/picture_writer.h"

namespace lumo::host {

/// Makes a writer of a JPEG file of quality 90.
/// @param channels  1 grey, 3 colours. Throws HostError for a picture that JPEG can't hold.
std::unique_ptr<PictureWriter> MakeJpegWriter(const OutputFile& output, unsigned width,
                                              unsigned height, unsigned channels);

}  // namespace lumo::host
