#include "tiff/tiff_image.h"

#include <algorithm>

#include "raster/pixel_types.h"

namespace lumo::tiff {
namespace {

constexpr std::uint64_t kMostSide = INT32_MAX;
/// A block beyond this is left to readers that don't decode blocks whole.
constexpr std::uint64_t kMostBlockBytes = 16 << 20;

unsigned TypeCode(unsigned format, unsigned bytes) {
  constexpr unsigned kUnsigned = 1, kSigned = 2, kFloat = 3;
  switch (format * 16 + bytes) {
    case kUnsigned * 16 + 1:
      return kDataTypeOf<std::uint8_t>;
    case kUnsigned * 16 + 2:
      return kDataTypeOf<std::uint16_t>;
    case kUnsigned * 16 + 4:
      return kDataTypeOf<std::uint32_t>;
    case kUnsigned * 16 + 8:
      return kDataTypeOf<std::uint64_t>;
    case kSigned * 16 + 2:
      return kDataTypeOf<std::int16_t>;
    case kSigned * 16 + 4:
      return kDataTypeOf<std::int32_t>;
    case kSigned * 16 + 8:
      return kDataTypeOf<std::int64_t>;
    case kFloat * 16 + 4:
      return kDataTypeOf<float>;
    case kFloat * 16 + 8:
      return kDataTypeOf<double>;
    default:
      return 0;
  }
}

/// Takes in what JPEG needs to know. False for a form that GDAL has to read.
bool FindJpegForm(const File& file, Image& image) {
  const Directory& directory = *image.directory;
  auto form = std::make_shared<JpegForm>();
  form->isYcc = file.Number(directory, kPhotometric, 0) == kYCbCr;
  form->components = image.byPixel ? image.bands : 1;
  constexpr unsigned kMostComponents = 4;  // that GDAL writes
  if (image.elementBytes != 1 || image.sampleFormat != 1 || image.predictor != 1 ||
      form->components > kMostComponents || !file.ReadBytes(directory, kJpegTables, form->tables)) {
    return false;
  }
  if (form->isYcc) {
    std::vector<std::uint64_t> sampling;
    const bool isUsable = image.bands == 3 && image.byPixel &&
                          file.ReadNumbers(directory, kYCbCrSubsampling, 2, sampling) &&
                          sampling.size() == 2 && sampling[0] <= 4 && sampling[1] <= 4;
    if (!isUsable) return false;
    form->acrossSampling = static_cast<unsigned>(sampling[0]);
    form->downSampling = static_cast<unsigned>(sampling[1]);
  }
  image.jpeg = form;
  return true;
}

/// Takes in how an image is cut into blocks. False for a form that GDAL has to read.
/// @param tileWidth  in samples, where there are tiles.
bool FindBlocks(const File& file, Image& image, std::uint64_t tileWidth) {
  const Directory& directory = *image.directory;
  image.isTiled = directory.contains(kTileOffsets);
  if (image.isTiled == directory.contains(kStripOffsets)) return false;
  const std::uint64_t rows =
      file.Number(directory, kRowsPerStrip, directory.contains(kRowsPerStrip) ? 0 : image.lines);
  const std::uint64_t width = image.isTiled ? tileWidth : image.samples;
  const std::uint64_t height = image.isTiled ? file.Number(directory, kTileLength, 0)
                                             : std::min<std::uint64_t>(rows, image.lines);
  const bool hasBlocks = width != 0 && height != 0 && width <= kMostSide && height <= kMostSide &&
                         width * image.PixelBytes() <= kMostBlockBytes / height;
  if (!hasBlocks) return false;
  image.blockWidth = static_cast<unsigned>(width);
  image.blockHeight = static_cast<unsigned>(height);
  const auto at = directory.find(image.isTiled ? kTileOffsets : kStripOffsets);
  const auto sizes = directory.find(image.isTiled ? kTileByteCounts : kStripByteCounts);
  return sizes != directory.end() && at->second.count == image.Blocks() &&
         sizes->second.count == image.Blocks();
}

}  // namespace

unsigned Image::DataType() const {
  return TypeCode(sampleFormat, elementBytes);
}

std::optional<Image> FindMask(const File& file, const Directory& directory, const Image& of) {
  constexpr std::uint64_t kMask = 4;
  const auto number = [&](Tag tag, std::uint64_t absent) {
    return file.Number(directory, tag, absent);
  };
  const bool isUsable = number(kImageWidth, 0) == of.samples &&
                        number(kImageLength, 0) == of.lines && number(kBitsPerSample, 1) == 1 &&
                        number(kSamplesPerPixel, 1) == 1 && number(kPhotometric, 0) == kMask &&
                        number(kSampleFormat, 1) == 1 && number(kPredictor, 1) == 1 &&
                        number(kFillOrder, 1) == 1 && number(kOrientation, 1) == 1 &&
                        IsKnown(number(kCompression, 0)) && !directory.contains(kJpegTables);
  Image mask;
  mask.compression = static_cast<Compression>(number(kCompression, 0));
  if (!isUsable || mask.compression == Compression::kJpeg) return std::nullopt;
  constexpr unsigned kBits = 8;
  mask.samples = (of.samples - 1) / kBits + 1;
  mask.lines = of.lines;
  mask.bands = mask.elementBytes = 1;
  mask.directory = &directory;
  const std::uint64_t width = number(kTileWidth, 0);
  if (width % kBits != 0) return std::nullopt;
  return FindBlocks(file, mask, width / kBits) ? std::optional(mask) : std::nullopt;
}

std::optional<Image> FindImage(const File& file, const Directory& directory) {
  const auto number = [&](Tag tag, std::uint64_t absent) {
    return file.Number(directory, tag, absent);
  };
  const std::uint64_t samples = number(kImageWidth, 0), lines = number(kImageLength, 0);
  const std::uint64_t bands = number(kSamplesPerPixel, 1), bits = number(kBitsPerSample, 0);
  const std::uint64_t compression = number(kCompression, 0), format = number(kSampleFormat, 1);
  const std::uint64_t planar = number(kPlanarConfiguration, 1), predictor = number(kPredictor, 1);
  const bool isUsable = samples != 0 && lines != 0 && bands != 0 && samples <= kMostSide &&
                        lines <= kMostSide && bands <= 65535 && bits != 0 && bits % 8 == 0 &&
                        bits <= 64 && IsKnown(compression) && format >= 1 && format <= 3 &&
                        (planar == 1 || planar == 2) && predictor >= 1 && predictor <= 3 &&
                        number(kFillOrder, 1) == 1 && number(kOrientation, 1) == 1;
  if (!isUsable) return std::nullopt;
  // A tag whose values differ gives what is passed for a missing one: there are none of these.
  if (directory.contains(kSampleFormat) && number(kSampleFormat, 0) == 0) return std::nullopt;
  Image image;
  image.samples = static_cast<unsigned>(samples);
  image.lines = static_cast<unsigned>(lines);
  image.bands = static_cast<unsigned>(bands);
  image.elementBytes = static_cast<unsigned>(bits / 8);
  image.sampleFormat = static_cast<unsigned>(format);
  image.compression = static_cast<Compression>(compression);
  image.predictor = compression == 1 ? 1 : static_cast<unsigned>(predictor);
  image.byPixel = planar == 1 && bands > 1;
  image.directory = &directory;
  const bool isJpeg = image.compression == Compression::kJpeg;
  const bool hasJpegTags = directory.contains(kJpegTables) ||
                           directory.contains(kYCbCrSubsampling) ||
                           directory.contains(kReferenceBlackWhite);
  if (isJpeg ? !FindJpegForm(file, image) : hasJpegTags) return std::nullopt;
  if (!FindBlocks(file, image, number(kTileWidth, 0)) || image.DataType() == 0) return std::nullopt;
  if (image.predictor == 3 && image.sampleFormat != 3) return std::nullopt;
  if (image.predictor == 2 && image.sampleFormat == 3) return std::nullopt;
  return image;
}

}  // namespace lumo::tiff
