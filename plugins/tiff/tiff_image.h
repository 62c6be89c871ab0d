#pragma once

#include <optional>

#include "tiff/tiff_codec.h"
#include "tiff/tiff_file.h"
#include "tiff/tiff_jpeg.h"

namespace lumo::tiff {

/// Meanings of the tag Photometric.
enum Photometric : std::uint16_t { kGray = 1, kRgb = 2, kIndexed = 3, kYCbCr = 6 };

/// How the pixels of one directory lie in its file.
struct Image {
  unsigned samples = 0, lines = 0, bands = 0;
  unsigned elementBytes = 0;  ///< of a value
  unsigned sampleFormat = 1;  ///< 1 unsigned, 2 signed, 3 floating-point
  Compression compression = Compression::kNone;
  unsigned predictor = 1;
  bool byPixel = false;  ///< several bands, those of a pixel together
  bool isTiled = false;
  unsigned blockWidth = 0, blockHeight = 0;
  const Directory* directory = nullptr;
  std::shared_ptr<const JpegForm> jpeg;  ///< of that compression

  unsigned BlocksAcross() const { return (samples + blockWidth - 1) / blockWidth; }
  unsigned BlocksDown() const { return (lines + blockHeight - 1) / blockHeight; }
  std::uint64_t Blocks() const {
    return std::uint64_t{BlocksAcross()} * BlocksDown() * (byPixel ? 1 : bands);
  }
  std::size_t PixelBytes() const { return std::size_t{elementBytes} * (byPixel ? bands : 1); }
  std::size_t RowBytes() const { return blockWidth * PixelBytes(); }
  /// Lines that a block of a row of blocks has in the file: the last strip ends with the raster.
  unsigned LinesOf(unsigned row) const {
    return isTiled ? blockHeight : std::min(blockHeight, lines - row * blockHeight);
  }
  /// Code of the pixel type.
  unsigned DataType() const;
};

/// Describes the pixels of a directory. Nothing for what Window can't read.
std::optional<Image> FindImage(const File& file, const Directory& directory);

/// Describes a mask of one bit for each pixel, as an image whose samples are the bytes that hold
/// eight of them. Nothing for another form.
/// @param of  the image whose pixels it masks.
std::optional<Image> FindMask(const File& file, const Directory& directory, const Image& of);

}  // namespace lumo::tiff
