#include "raster/creation_options.h"

#include <charconv>

#include <fmt/format.h>

#include "raster/pixel_types.h"
#include "raster/raster_def.h"

namespace lumo {
namespace {

constexpr unsigned kTileStep = 16;  // TIFF 6.0, section 15: sides are multiples of 16
constexpr unsigned kMaxTile = 4096;

/// A codec, and what it goes with.
struct Codec {
  BlockCompression compression;
  unsigned lowest, highest;  ///< levels
  bool predicts;             ///< takes differences in the place of values
};
constexpr Codec kCodecs[] = {
    {BlockCompression::kDeflate, 1, 12, true}, {BlockCompression::kZstd, 1, 22, true},
    {BlockCompression::kLzw, 0, 0, true},      {BlockCompression::kLzma, 0, 9, false},
    {BlockCompression::kWebp, 1, 100, false},  {BlockCompression::kJpeg, 1, 100, false},
};

const Codec* FindCodec(BlockCompression compression) {
  for (const Codec& codec : kCodecs) {
    if (codec.compression == compression) return &codec;
  }
  return nullptr;
}

bool IsWholeType(unsigned dataType) {
  return DispatchType(TwelveTypes{}, dataType, []<typename T>() { return std::is_integral_v<T>; });
}

bool IsFloatType(unsigned dataType) {
  return DispatchType(TwelveTypes{}, dataType,
                      []<typename T>() { return std::is_floating_point_v<T>; });
}

bool ReadNumber(const std::string& text, unsigned& number) {
  const char* const end = text.data() + text.size();
  const auto [at, fault] = std::from_chars(text.data(), end, number);
  return fault == std::errc() && at == end;
}

/// Reads a word. False for one that the enumeration lacks.
template <typename E>
bool ReadWord(const std::string& text, E& value) {
  if (text.empty()) return true;
  for (const EnumWord<E>& entry : WordsOf(E())) {
    if (text != entry.word) continue;
    value = entry.value;
    return true;
  }
  return false;
}

bool ReadTile(const std::string& text, std::optional<unsigned>& tile) {
  if (text.empty()) return true;
  unsigned side = 0;
  if (text != "strip") {
    const bool fits =
        ReadNumber(text, side) && side != 0 && side <= kMaxTile && side % kTileStep == 0;
    if (!fits) return false;
  }
  tile = side;
  return true;
}

std::string CheckCodec(const RasterDef& def) {
  const CreationOptions& wanted = def.creation;
  const Codec* const codec = FindCodec(wanted.compression);
  if (wanted.level && codec == nullptr)
    return "a level belongs to a compression, and none is given";
  if (codec == nullptr) return {};
  const std::string word = FormatValue(wanted.compression).ToUTF8();
  if (wanted.level && codec->highest == 0) return word + " has no levels";
  if (wanted.level && (*wanted.level < codec->lowest || *wanted.level > codec->highest)) {
    return fmt::format("{} has levels from {} to {}", word, codec->lowest, codec->highest);
  }
  const bool isBytes = def.dataType == kDataTypeOf<std::uint8_t>;
  const bool isByPixel = wanted.layout == FileLayout::kCog || def.interleave == Interleave::BIP ||
                         def.interleave == Interleave::BIL;
  if (wanted.compression == BlockCompression::kWebp &&
      !(isBytes && isByPixel && (def.bands == 3 || def.bands == 4))) {
    return "WebP packs three or four bands of bytes, interleaved by pixel";
  }
  if (wanted.compression == BlockCompression::kJpeg &&
      !(isBytes && (def.bands == 1 || def.bands == 3))) {
    return "JPEG packs one or three bands of bytes";
  }
  return {};
}

std::string CheckPredictor(const RasterDef& def) {
  const BlockPredictor predictor = def.creation.predictor;
  if (predictor == BlockPredictor::kTold || predictor == BlockPredictor::kNone) return {};
  const bool isChosen = predictor != BlockPredictor::kAuto;
  const Codec* const codec = FindCodec(def.creation.compression);
  if (isChosen && codec == nullptr)
    return "a predictor belongs to a compression, and none is given";
  if (isChosen && !codec->predicts) {
    return FormatValue(codec->compression).ToUTF8() + " takes no predictor";
  }
  if (predictor == BlockPredictor::kFloat && !IsFloatType(def.dataType)) {
    return "predictor 3 is for floating-point numbers, and the pixels are " +
           DataTypeName(def.dataType).ToUTF8();
  }
  const bool isReal = IsWholeType(def.dataType) || IsFloatType(def.dataType);
  if (predictor == BlockPredictor::kWhole && !isReal) {
    return "predictor 2 is not for complex numbers";
  }
  return {};
}

std::string CheckLayout(const RasterDef& def) {
  const CreationOptions& wanted = def.creation;
  const bool isCog = wanted.layout == FileLayout::kCog;
  if (isCog && wanted.tile == 0U) return "a cloud-optimised file has tiles, no strips";
  if (!isCog && wanted.overviews != OverviewMethod::kTold) {
    return "levels are built into a cloud-optimised file alone";
  }
  return {};
}

}  // namespace

std::span<const EnumWord<BlockCompression>> WordsOf(BlockCompression) {
  static constexpr EnumWord<BlockCompression> kWords[] = {
      {"Told", BlockCompression::kTold},       {"None", BlockCompression::kNone},
      {"DEFLATE", BlockCompression::kDeflate}, {"ZSTD", BlockCompression::kZstd},
      {"LZW", BlockCompression::kLzw},         {"LZMA", BlockCompression::kLzma},
      {"WebP", BlockCompression::kWebp},       {"JPEG", BlockCompression::kJpeg}};
  return kWords;
}

std::span<const EnumWord<BlockPredictor>> WordsOf(BlockPredictor) {
  static constexpr EnumWord<BlockPredictor> kWords[] = {{"Told", BlockPredictor::kTold},
                                                        {"Auto", BlockPredictor::kAuto},
                                                        {"None", BlockPredictor::kNone},
                                                        {"2", BlockPredictor::kWhole},
                                                        {"3", BlockPredictor::kFloat}};
  return kWords;
}

std::span<const EnumWord<BigTiffChoice>> WordsOf(BigTiffChoice) {
  static constexpr EnumWord<BigTiffChoice> kWords[] = {{"Told", BigTiffChoice::kTold},
                                                       {"Auto", BigTiffChoice::kAuto},
                                                       {"Yes", BigTiffChoice::kYes},
                                                       {"No", BigTiffChoice::kNo}};
  return kWords;
}

std::span<const EnumWord<FileLayout>> WordsOf(FileLayout) {
  static constexpr EnumWord<FileLayout> kWords[] = {{"Told", FileLayout::kTold},
                                                    {"COG", FileLayout::kCog}};
  return kWords;
}

std::span<const EnumWord<OverviewMethod>> WordsOf(OverviewMethod) {
  static constexpr EnumWord<OverviewMethod> kWords[] = {{"Told", OverviewMethod::kTold},
                                                        {"Average", OverviewMethod::kAverage},
                                                        {"Nearest", OverviewMethod::kNearest},
                                                        {"Mode", OverviewMethod::kMode},
                                                        {"None", OverviewMethod::kNone}};
  return kWords;
}

bool CreationOptions::IsTold() const {
  return *this == CreationOptions();
}

std::span<const CreationValue> CreationValues() {
  static constexpr CreationValue kValues[] = {
      {"Compress", "--compress", ValueKind::kWord,
       "how the blocks of a TIFF file are packed; Told: not at all", "",
       &WordsIn<BlockCompression>},
      {"Level", "--compress-level", ValueKind::kInteger,
       "effort of the compression, of WebP, which loses nothing without it, and JPEG the quality; "
       "the codec's usual one when absent",
       "N"},
      {"Predictor", "--predictor", ValueKind::kWord,
       "which differences are packed in the place of values: 2 of whole numbers, 3 of "
       "floating-point "
       "numbers; Auto: those that suit the pixel type; Told: none",
       "", &WordsIn<BlockPredictor>},
      {"Tile", "--tile", ValueKind::kText,
       "side of the tiles of a TIFF file in pixels, a multiple of 16, or strip", "N|strip"},
      {"BigTIFF", "--bigtiff", ValueKind::kWord,
       "whether a TIFF file may take more than 4 GiB; Auto: where it needs to; Told: where it "
       "might",
       "", &WordsIn<BigTiffChoice>},
      {"Layout", "--cog", ValueKind::kWord,
       "COG: a cloud-optimised TIFF file, with its reduced levels in front; Told: pixels alone", "",
       &WordsIn<FileLayout>},
      {"Overviews", "--overviews", ValueKind::kWord,
       "how a pixel of a level of a COG comes from four: their mean, the upper left one, or the "
       "most "
       "frequent value; Told: the mean; None: no levels",
       "", &WordsIn<OverviewMethod>},
      {"WorldFile", "--world-file", ValueKind::kBoolean,
       "whether the grid also lies in a world file beside the raster", ""}};
  return kValues;
}

bool ReadCreationOptions(const std::function<std::string(const char* input)>& textOf,
                         CreationOptions& options, std::string& fault) {
  const auto fail = [&](const char* input, const char* form) {
    fault = fmt::format("{}: {} is not {}", input, textOf(input), form);
    return false;
  };
  const char* const words = "one of its words";
  if (!ReadWord(textOf("Compress"), options.compression)) return fail("Compress", words);
  if (!ReadWord(textOf("Predictor"), options.predictor)) return fail("Predictor", words);
  if (!ReadWord(textOf("BigTIFF"), options.bigTiff)) return fail("BigTIFF", words);
  if (!ReadWord(textOf("Layout"), options.layout)) return fail("Layout", words);
  if (!ReadWord(textOf("Overviews"), options.overviews)) return fail("Overviews", words);
  options.worldFile = textOf("WorldFile") == "1";
  const std::string level = textOf("Level");
  unsigned number = 0;
  if (!level.empty() && !ReadNumber(level, number)) return fail("Level", "a whole number");
  if (!level.empty()) options.level = number;
  if (!ReadTile(textOf("Tile"), options.tile)) {
    return fail("Tile", "strip or a multiple of 16 up to 4096");
  }
  return true;
}

std::string FindCreationMisfit(const RasterDef& def) {
  if (def.format == "ORVA" && def.creation.worldFile) return "the format ORVA takes no world file";
  CreationOptions ofTiff = def.creation;
  ofTiff.worldFile = false;
  ofTiff.rows.reset();
  if (def.format != "TIFF" && !ofTiff.IsTold()) {
    return fmt::format(
        "compression, level, predictor, tiles, BigTIFF and COG are of TIFF files, and the format "
        "is {}",
        def.format.ToUTF8());
  }
  for (const auto check : {&CheckCodec, &CheckPredictor, &CheckLayout}) {
    const std::string misfit = check(def);
    if (!misfit.empty()) return misfit;
  }
  return {};
}

BlockPredictor PredictorOf(const RasterDef& def) {
  const BlockPredictor wanted = def.creation.predictor;
  if (wanted == BlockPredictor::kWhole || wanted == BlockPredictor::kFloat) return wanted;
  const Codec* const codec = FindCodec(def.creation.compression);
  if (wanted != BlockPredictor::kAuto || codec == nullptr || !codec->predicts) {
    return BlockPredictor::kNone;
  }
  if (IsFloatType(def.dataType)) return BlockPredictor::kFloat;
  // Whole numbers of 64 bits as differences are more than older readers know.
  const bool isUsual = IsWholeType(def.dataType) && DataTypeBytes(def.dataType) <= 4;
  return isUsual ? BlockPredictor::kWhole : BlockPredictor::kNone;
}

}  // namespace lumo
