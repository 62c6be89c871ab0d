#pragma once

#include <cstddef>
#include <optional>
#include <vector>

namespace lumo::tiff {

/// Describes what the blocks of a JPEG-compressed image have in common.
struct JpegForm {
  std::vector<unsigned char> tables;  ///< a stream of tables that are left out of the blocks
  unsigned components = 1;
  bool isYcc = false;                             ///< to be converted to RGB
  unsigned acrossSampling = 1, downSampling = 1;  ///< pixels to one value of colour, of YCbCr
};

/// Decodes a block of 8-bit values, pixel by pixel. False for one that isn't of the form and the
/// size, or of which the library has anything to remark.
///
/// Threads: any number at once.
bool DecodeJpeg(const JpegForm& form, unsigned width, unsigned height, const unsigned char* packed,
                std::size_t packedBytes, unsigned char* out);

/// The tables of a form, as GDAL tells of them.
struct JpegTables {
  unsigned mode = 0;     ///< 1 for quantization tables, 2 for those of the entropy code, 3 for both
  unsigned quality = 0;  ///< of those that the JPEG library makes of it
};

/// Finds the quality from which tables were made; nothing where there is none.
std::optional<JpegTables> FindJpegTables(const JpegForm& form);

}  // namespace lumo::tiff
