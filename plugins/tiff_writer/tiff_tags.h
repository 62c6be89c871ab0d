#pragma once

#include <cstdint>

namespace lumo::tiff {

/// The numbers of the entries of a directory that files are read and written by (TIFF 6.0, and the
/// extensions of GeoTIFF and GDAL).
enum Tag : std::uint16_t {
  kSubfileType = 254,
  kImageWidth = 256,
  kImageLength = 257,
  kBitsPerSample = 258,
  kCompression = 259,
  kPhotometric = 262,
  kFillOrder = 266,
  kImageDescription = 270,
  kStripOffsets = 273,
  kOrientation = 274,
  kSamplesPerPixel = 277,
  kRowsPerStrip = 278,
  kStripByteCounts = 279,
  kPlanarConfiguration = 284,
  kSoftware = 305,
  kDateTime = 306,
  kArtist = 315,
  kHostComputer = 316,
  kPredictor = 317,
  kColorMap = 320,
  kTileWidth = 322,
  kTileLength = 323,
  kTileOffsets = 324,
  kTileByteCounts = 325,
  kExtraSamples = 338,
  kSampleFormat = 339,
  kJpegTables = 347,
  kYCbCrSubsampling = 530,
  kReferenceBlackWhite = 532,
  kCopyright = 33432,
  kModelPixelScale = 33550,
  kModelTiepoint = 33922,
  kGeoKeyDirectory = 34735,
  kGeoDoubleParams = 34736,
  kGeoAsciiParams = 34737,
  kGdalMetadata = 42112,
  kNoData = 42113
};

}  // namespace lumo::tiff
