#include "tiff/tiff_source.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <limits>

#include "foundation/fault.h"
#include "gdal_common/color_name.h"
#include "gdal_common/level_number.h"
#include "raster/pixel_types.h"
#include "raster/raster_details.h"
#include "raster/raster_storage.h"
#include "tiff/tiff_place.h"
#include "tiff/tiff_siblings.h"

namespace lumo::tiff {
namespace {

/// Tags that are texts about the raster, by GDAL's names of them.
struct NamedTag {
  Tag tag;
  const char* name;
};
constexpr NamedTag kTexts[] = {{kImageDescription, "TIFFTAG_IMAGEDESCRIPTION"},
                               {kSoftware, "TIFFTAG_SOFTWARE"},
                               {kDateTime, "TIFFTAG_DATETIME"},
                               {kArtist, "TIFFTAG_ARTIST"},
                               {kHostComputer, "TIFFTAG_HOSTCOMPUTER"},
                               {kCopyright, "TIFFTAG_COPYRIGHT"}};

/// Tags that are understood here. A file with another one is GDAL's.
bool IsKnown(std::uint16_t tag) {
  static constexpr std::uint16_t kTags[] = {kSubfileType,
                                            kImageWidth,
                                            kImageLength,
                                            kBitsPerSample,
                                            kCompression,
                                            kPhotometric,
                                            kFillOrder,
                                            kImageDescription,
                                            kStripOffsets,
                                            kOrientation,
                                            kSamplesPerPixel,
                                            kRowsPerStrip,
                                            kStripByteCounts,
                                            kPlanarConfiguration,
                                            kSoftware,
                                            kDateTime,
                                            kArtist,
                                            kHostComputer,
                                            kPredictor,
                                            kTileWidth,
                                            kTileLength,
                                            kTileOffsets,
                                            kTileByteCounts,
                                            kExtraSamples,
                                            kColorMap,
                                            kSampleFormat,
                                            kCopyright,
                                            kModelPixelScale,
                                            kModelTiepoint,
                                            kGeoKeyDirectory,
                                            kGeoDoubleParams,
                                            kGeoAsciiParams,
                                            kGdalMetadata,
                                            kNoData,
                                            kJpegTables,
                                            kYCbCrSubsampling,
                                            kReferenceBlackWhite};
  return std::find(std::begin(kTags), std::end(kTags), tag) != std::end(kTags);
}

/// Settings by which GDAL reads such files in other ways.
bool HasSettings() {
  for (const char* const name :
       {"GTIFF_POINT_GEO_IGNORE", "GDAL_GEOREF_SOURCES", "GTIFF_HONOUR_NEGATIVE_SCALEY",
        "GDAL_PAM_PROXY_DIR", "GTIFF_LINEAR_UNITS", "GTIFF_REPORT_COMPD_CS"}) {
    if (std::getenv(name) != nullptr) return true;
  }
  return false;
}

/// Tells what the bands of an image mean.
struct Meaning {
  bool isRgb = false;
  bool isPalette = false;
  bool hasAlpha = false;  ///< the last band is alpha

  bool operator==(const Meaning&) const = default;
};

/// The meaning of colours, numbers, or numbers of colours, and of an alpha band behind these that
/// GDAL takes for a mask. Nothing for another one.
std::optional<Meaning> FindMeaning(const File& file, const Image& image) {
  const Directory& directory = *image.directory;
  const unsigned bands = image.bands;
  const std::uint64_t photometric = file.Number(directory, kPhotometric, 0);
  Meaning meaning;
  meaning.isRgb = photometric == kRgb || (image.jpeg != nullptr && image.jpeg->isYcc);
  meaning.isPalette = photometric == kIndexed;
  const bool isUsable =
      photometric == kGray || (meaning.isRgb && bands >= 3) ||
      (meaning.isPalette && bands == 1 && image.DataType() == kDataTypeOf<std::uint8_t>);
  if (!isUsable || meaning.isPalette != directory.contains(kColorMap)) return std::nullopt;
  const unsigned extra = bands - (meaning.isRgb ? 3 : 1);
  std::vector<std::uint64_t> kinds;
  if (extra == 0) {
    return directory.contains(kExtraSamples) ? std::nullopt : std::optional(meaning);
  }
  if (!file.ReadNumbers(directory, kExtraSamples, bands, kinds) || kinds.size() != extra) {
    return std::nullopt;
  }
  const bool isOfMasks = bands == 2 || bands == 4;
  const unsigned type = image.DataType();
  const bool isOfAlpha =
      isOfMasks && (type == kDataTypeOf<std::uint8_t> || type == kDataTypeOf<std::uint16_t>);
  meaning.hasAlpha = isOfAlpha && (kinds.back() == 1 || kinds.back() == 2);
  if (meaning.hasAlpha) kinds.pop_back();
  const bool isPlain =
      std::all_of(kinds.begin(), kinds.end(), [](std::uint64_t kind) { return kind == 0; });
  return isPlain ? std::optional(meaning) : std::nullopt;
}

/// The colours of a palette. False for numbers of another range than the usual one, which GDAL
/// guesses.
bool ReadColors(const File& file, const Directory& directory, const std::optional<double>& noData,
                Palette& colors) {
  constexpr std::size_t kCount = 256;
  std::vector<std::uint64_t> parts;
  if (!file.ReadNumbers(directory, kColorMap, 3 * kCount, parts) || parts.size() != 3 * kCount ||
      *std::max_element(parts.begin(), parts.end()) < 256) {
    return false;
  }
  for (std::size_t i = 0; i < kCount; ++i) {
    const auto part = [&](std::size_t of) {
      return static_cast<std::uint8_t>(parts[of * kCount + i] / 256);
    };
    const bool isClear = noData && static_cast<double>(i) == *noData;
    const std::uint8_t r = part(0), g = part(1), b = part(2), a = isClear ? 0 : 255;
    colors.Append(Color(gdal::ColorNameOf(r, g, b, a), r, g, b, a));
  }
  return true;
}

const char* WordOf(const Image& image) {
  switch (image.compression) {
    case Compression::kJpeg:
      return image.jpeg->isYcc ? "YCbCr JPEG" : "JPEG";
    case Compression::kLzw:
      return "LZW";
    case Compression::kDeflate:
    case Compression::kOldDeflate:
      return "DEFLATE";
    case Compression::kZstd:
      return "ZSTD";
    default:
      return nullptr;
  }
}

/// The value that marks pixels as not valid; false for a text that isn't plainly a number.
bool ReadNoData(const File& file, const Image& image, std::optional<double>& value) {
  if (!image.directory->contains(kNoData)) return true;
  std::string text;
  if (!file.ReadText(*image.directory, kNoData, text) || image.elementBytes == 8) return false;
  double number = 0;
  const char* const end = text.data() + text.size();
  if (text == "nan") {
    number = std::numeric_limits<double>::quiet_NaN();
  } else if (const auto [stop, fault] = std::from_chars(text.data(), end, number);
             fault != std::errc() || stop != end || !std::isfinite(number)) {
    return false;
  }
  if (image.sampleFormat == 3 && !std::isnan(number)) {
    // Texts of the largest float differ in their last digits.
    constexpr double kMost = std::numeric_limits<float>::max();
    if (std::abs(std::abs(number) - kMost) < 1e-10 * kMost) number = std::copysign(kMost, number);
    if (std::abs(number) > kMost) return false;
    number = static_cast<float>(number);
  }
  value = number;
  return true;
}

/// Tells whether GDAL laid the file out as "cloud optimised"; nothing for one that was changed
/// afterwards.
std::optional<bool> IsCloudOptimised(const File& file) {
  const std::string head = file.Head();
  if (!head.starts_with("GDAL_STRUCTURAL_METADATA_SIZE=")) return false;
  const std::string_view words(head.data(), std::min<std::size_t>(head.size(), 4096));
  if (words.find("KNOWN_INCOMPATIBLE_EDITION=YES") != words.npos) return std::nullopt;
  return words.find("LAYOUT=IFDS_BEFORE_DATA") != words.npos;
}

/// The bits of a byte as bytes of 0 and 1, the highest first.
const unsigned char* SpreadBits(unsigned char byte) {
  constexpr unsigned kBits = 8;
  using Table = std::array<std::array<unsigned char, kBits>, 256>;
  static constexpr Table kTable = [] {
    Table table{};
    for (unsigned number = 0; number < table.size(); ++number) {
      for (unsigned bit = 0; bit < kBits; ++bit) {
        table[number][bit] = number >> (kBits - 1 - bit) & 1;
      }
    }
    return table;
  }();
  return kTable[byte].data();
}

/// The text of a whole file. False when it can't be read, or is too long for what is looked for.
bool ReadWhole(const std::string& path, std::string& text) {
  constexpr std::uint64_t kMostBytes = 4 << 20;
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead);
  std::uint64_t size = 0;
  if (file == nullptr || !file->GetSize(size) || size > kMostBytes) return false;
  text.resize(size);
  return file->Read(0, text.data(), text.size());
}

}  // namespace

std::unique_ptr<Source> Source::Open(const std::string& path, const String& formatKey,
                                     Opener opener) {
  const Company company = HasSettings() ? Company::kOthers : CompanyOf(path);
  if (company == Company::kOthers) return nullptr;
  std::unique_ptr<File> file = File::Open(path);
  if (file == nullptr) return nullptr;
  std::unique_ptr<Source> source(new Source(std::move(file), std::move(opener)));
  const bool isOwn = source->FindLevels() && source->Describe(formatKey) &&
                     (company == Company::kNone || source->TakeSideFile());
  return isOwn ? std::move(source) : nullptr;
}

/// Bits of the tag SubfileType.
constexpr std::uint64_t kReduced = 1, kIsMask = 4;

bool Source::FindLevels() {
  const std::vector<Directory>& directories = file_->Directories();
  for (const Directory& directory : directories) {
    for (const auto& [tag, entry] : directory) {
      if (!IsKnown(tag)) return false;
    }
    const bool isFirst = &directory == &directories.front();
    if (directory.contains(kGdalMetadata)) {
      std::string text;
      const auto bands = static_cast<unsigned>(file_->Number(directory, kSamplesPerPixel, 1));
      if (!isFirst || !file_->ReadText(directory, kGdalMetadata, text) ||
          !stored_.TakeTag(text, bands)) {
        return false;
      }
    }
    if (!isFirst && (file_->Number(directory, kSubfileType, 0) & kIsMask) != 0) continue;
    const std::optional<Image> image = FindImage(*file_, directory);
    if (!image || file_->Number(directory, kSubfileType, 0) != (isFirst ? 0 : kReduced)) {
      return false;
    }
    if (isFirst) {
      levels_.emplace(0, *image);
      continue;
    }
    const Image& full = levels_.at(0);
    if (image->bands != full.bands || image->DataType() != full.DataType() ||
        image->byPixel != full.byPixel) {
      return false;
    }
    const unsigned number =
        gdal::LevelNumber(full.samples, full.lines, image->samples, image->lines);
    if (number != 0) levels_.emplace(number, *image);
  }
  // Without gaps, from the first one that there is.
  unsigned last = 0;
  for (auto at = std::next(levels_.begin()); at != levels_.end(); ++at) {
    if (last != 0 && at->first != last + 1) {
      levels_.erase(at, levels_.end());
      break;
    }
    last = at->first;
  }
  return FindMasks();
}

/// Finds the mask of each level. False where some level has none though another one has.
bool Source::FindMasks() {
  for (const Directory& directory : file_->Directories()) {
    const std::uint64_t kind = file_->Number(directory, kSubfileType, 0);
    if ((kind & kIsMask) == 0) continue;
    std::optional<Image> mask;
    for (auto level = levels_.begin(); !mask && level != levels_.end(); ++level) {
      if (kind != (level->first == 0 ? kIsMask : kIsMask | kReduced)) continue;
      mask = FindMask(*file_, directory, level->second);
      if (mask && !masks_.emplace(level->first, *mask).second) return false;
    }
    if (!mask) return false;
  }
  return masks_.empty() || masks_.size() == levels_.size();
}

/// Takes the values in the file beside this one; those in the file itself were taken before.
bool Source::TakeSideFile() {
  std::string text;
  return ReadWhole(Path() + ".aux.xml", text) && stored_.TakeSideFile(text, def_.bands);
}

bool Source::Describe(const String& formatKey) {
  const Image& image = levels_.at(0);
  const Directory& directory = *image.directory;
  const std::optional<Meaning> meaning = FindMeaning(*file_, image);
  const std::optional<bool> isCloudOptimised = IsCloudOptimised(*file_);
  if (!meaning || !isCloudOptimised || !ReadNoData(*file_, image, noData_)) return false;
  for (const auto& [number, level] : levels_) {
    if (FindMeaning(*file_, level) != meaning) return false;
  }
  if (meaning->isPalette && !ReadColors(*file_, directory, noData_, colors_)) return false;
  if (meaning->hasAlpha && HasMasks()) return false;  // which of them counts is GDAL's to say
  if (meaning->hasAlpha && !noData_) maskingBand_ = image.bands - 1;
  const std::optional<Place> place = FindPlace(*file_, image);
  if (!place) return false;
  def_.samples = image.samples;
  def_.lines = image.lines;
  def_.bands = image.bands;
  def_.interleave = image.byPixel ? Interleave::BIP : Interleave::BSQ;
  def_.dataType = image.DataType();
  def_.format = formatKey;
  const bool isTiled = image.blockWidth != image.samples && image.blockHeight > 1;
  def_.tileWidth = image.blockWidth;
  def_.tileHeight = isTiled ? image.blockHeight : 1;
  def_.SetGeoRef(place->geoRef);

  Metadata& metadata = def_.metadata;
  const auto item = [&](const std::string& name, const std::string& text, bool isDetail) {
    metadata.Set(String("/GDAL/Items/" + name), String(text));
    if (isDetail) metadata.Set(DetailPath("Items/" + name), String(text));
  };
  const auto structure = [&](const char* name, const std::string& text) {
    metadata.Set(String(std::string("/GDAL/IMAGE_STRUCTURE/") + name), String(text));
  };
  if (place->rasterType == 1) item("AREA_OR_POINT", "Area", false);
  if (place->rasterType == 2) item("AREA_OR_POINT", "Point", true);
  for (const NamedTag& named : kTexts) {
    std::string text;
    if (!directory.contains(named.tag)) continue;
    if (!file_->ReadText(directory, named.tag, text)) return false;
    item(named.name, text, true);
  }
  structure("INTERLEAVE", image.byPixel ? "PIXEL" : "BAND");
  const char* const word = WordOf(image);
  if (word != nullptr) structure("COMPRESSION", word);
  SetStorage(metadata, {image.blockWidth, image.blockHeight, word != nullptr ? word : "none"});
  if (image.jpeg != nullptr) {
    const std::optional<JpegTables> tables = FindJpegTables(*image.jpeg);
    if (!tables) return false;
    structure("JPEGTABLESMODE", std::to_string(tables->mode));
    structure("JPEG_QUALITY", std::to_string(tables->quality));
    if (image.jpeg->isYcc) structure("SOURCE_COLOR_SPACE", "YCbCr");
  }
  if (image.predictor != 1) structure("PREDICTOR", std::to_string(image.predictor));
  if (*isCloudOptimised) structure("LAYOUT", "COG");
  const char* const colors[] = {"Red", "Green", "Blue"};
  for (unsigned band = 0; meaning->isRgb && band < 3; ++band) {
    metadata.Set(BandDetailPath(band, "Meaning"), String(colors[band]));
  }
  if (meaning->hasAlpha) metadata.Set(BandDetailPath(image.bands - 1, "Meaning"), String("Alpha"));
  for (unsigned band = 0; band < image.bands; ++band) {
    for (const auto& [name, text] : stored_.Details(band)) {
      const String path = BandDetailPath(band, name);
      if (text.empty()) {
        metadata.Remove(path);
      } else {
        metadata.Set(path, String(text));
      }
    }
  }
  return true;
}

bool Source::Read(const Rect& rect, const Array<unsigned>& bands, unsigned level, Interleave order,
                  unsigned char* pixels) {
  const auto image = levels_.find(level);
  if (image == levels_.end()) return false;
  std::unique_ptr<Window>& window = windows_[level];
  if (window == nullptr) window = std::make_unique<Window>(*file_, image->second);
  return window->Read(rect, bands, order, pixels);
}

bool Source::ReadMask(const Rect& rect, unsigned level, std::vector<unsigned char>& mask) {
  const auto image = masks_.find(level);
  if (image == masks_.end()) return false;
  std::unique_ptr<Window>& window = maskWindows_[level];
  if (window == nullptr) window = std::make_unique<Window>(*file_, image->second);
  constexpr unsigned kBits = 8;
  const unsigned first = rect.left / kBits, end = (rect.left + rect.width - 1) / kBits + 1;
  const Rect bytes{first, rect.top, end - first, rect.height};
  Array<unsigned> band(ArrayDims(1));
  band[0] = 0;
  std::vector<unsigned char> packed(std::size_t{bytes.width} * bytes.height);
  if (!window->Read(bytes, band, Interleave::BSQ, packed.data())) return false;
  mask.resize(std::size_t{rect.width} * rect.height);
  const unsigned shift = rect.left % kBits;
  std::vector<unsigned char> row(std::size_t{bytes.width} * kBits);
  for (std::size_t y = 0; y < rect.height; ++y) {
    for (std::size_t x = 0; x < bytes.width; ++x) {
      std::memcpy(&row[x * kBits], SpreadBits(packed[y * bytes.width + x]), kBits);
    }
    std::copy_n(&row[shift], rect.width, &mask[y * rect.width]);
  }
  return true;
}

bool Source::CanWrite() {
  if (!canWrite_) {
    canWrite_ = platform::RandomAccessFile::Open(
                    Path(), platform::RandomAccessFile::Access::kUpdate) != nullptr;
  }
  return *canWrite_;
}

RasterDataConnectionPtr Source::Inner() {
  if (inner_) return inner_;
  const RasterDataConnectionPtr opened(opener_());
  if (!opened) return {};
  const RasterDef def = opened->RasterDef();
  if (def.samples != def_.samples || def.lines != def_.lines || def.bands != def_.bands ||
      def.dataType != def_.dataType || def.interleave != def_.interleave) {
    SetFault(Path() + ": has become another raster since it was opened");
    return {};
  }
  inner_ = opened;
  return inner_;
}

}  // namespace lumo::tiff
