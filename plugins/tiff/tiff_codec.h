#pragma once

#include <cstddef>
#include <cstdint>

namespace lumo::tiff {

enum class Compression : std::uint16_t {
  kNone = 1,
  kLzw = 5,
  kJpeg = 7,  // which DecodeJpeg decodes
  kDeflate = 8,
  kOldDeflate = 32946,
  kZstd = 50000
};

/// Says whether the compression is one of these.
bool IsKnown(std::uint64_t compression);

/// Decodes a block. True when all `bytes` came out of the packed data and nothing was wrong with
/// these.
///
/// Threads: any number at once.
bool Decode(Compression compression, const unsigned char* packed, std::size_t packedBytes,
            unsigned char* out, std::size_t bytes);

/// How the values of a row were made differences before it was packed.
struct Prediction {
  unsigned predictor;     ///< 1 none, 2 of whole numbers, 3 of floating-point numbers
  unsigned elementBytes;  ///< of a value
  unsigned stride;        ///< values from one to the next of its band
};

/// Makes values of the differences of one row again, in place.
void Undo(const Prediction& prediction, unsigned char* row, std::size_t bytes);

}  // namespace lumo::tiff
