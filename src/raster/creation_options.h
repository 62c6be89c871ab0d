#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "commands/declaration.h"
#include "commands/value_text.h"

namespace lumo {

struct RasterDef;
struct RowsFiles;

/// The codec that packs the blocks of a file. WebP loses nothing unless it is given a level; JPEG
/// always does.
enum class BlockCompression : unsigned { kTold, kNone, kDeflate, kZstd, kLzw, kLzma, kWebp, kJpeg };
/// How values become differences before they are packed: 2 of whole numbers, 3 of floating-point
/// numbers; Auto is the one that suits the pixel type.
enum class BlockPredictor : unsigned { kTold, kAuto, kNone, kWhole, kFloat };
/// Whether a file has places of 64 bits; Auto where it needs them.
enum class BigTiffChoice : unsigned { kTold, kAuto, kYes, kNo };
/// The order of what a file holds: as its writer likes, or cloud-optimised with levels inside.
enum class FileLayout : unsigned { kTold, kCog };
/// How a pixel of a level comes from four of the level below: their mean, the upper left one, or
/// their most frequent value, of those that are valid. None: a file without levels.
enum class OverviewMethod : unsigned { kTold, kAverage, kNearest, kMode, kNone };

VEXG_EXPORT std::span<const EnumWord<BlockCompression>> WordsOf(BlockCompression);
VEXG_EXPORT std::span<const EnumWord<BlockPredictor>> WordsOf(BlockPredictor);
VEXG_EXPORT std::span<const EnumWord<BigTiffChoice>> WordsOf(BigTiffChoice);
VEXG_EXPORT std::span<const EnumWord<FileLayout>> WordsOf(FileLayout);
VEXG_EXPORT std::span<const EnumWord<OverviewMethod>> WordsOf(OverviewMethod);

/// How a new raster lies in its file; the pixels are the same for all of it, but for codecs that
/// lose something. The default is the file that a format has always made: of TIFF one without
/// compression, whose pixels can be written in any order at no cost.
struct VEXG_EXPORT CreationOptions {
  BlockCompression compression = BlockCompression::kTold;
  std::optional<unsigned> level;  ///< of the codec; its usual one without a value
  BlockPredictor predictor = BlockPredictor::kTold;
  std::optional<unsigned> tile;  ///< pixels of a side; 0 strips of whole lines
  BigTiffChoice bigTiff = BigTiffChoice::kTold;
  FileLayout layout = FileLayout::kTold;
  OverviewMethod overviews = OverviewMethod::kTold;
  bool worldFile = false;  ///< the grid also lies in a text file beside the raster
  /// Files whose packed blocks the new one is to take as they are; null for none. The description
  /// of a raster that was made has them when it did, and so holds their pixels already.
  std::shared_ptr<const RowsFiles> rows;

  /// True when nothing is asked for.
  bool IsTold() const;
  /// True when the blocks are packed.
  bool IsPacked() const {
    return compression != BlockCompression::kTold && compression != BlockCompression::kNone;
  }
  /// True when pixels come back as others than were written.
  bool LosesValues() const {
    return compression == BlockCompression::kJpeg ||
           (compression == BlockCompression::kWebp && level.has_value());
  }

  friend bool operator==(const CreationOptions&, const CreationOptions&) = default;
};

/// One of the values of CreationOptions by its names: an input of the commands that make rasters,
/// and an option of the verbs.
struct CreationValue {
  const char* input;   ///< "Compress"
  const char* option;  ///< "--compress"
  ValueKind kind;
  const char* meaning;            ///< without a full stop
  const char* shown;              ///< the form of a value that is no word
  WordsFunction words = nullptr;  ///< the told one in front
};

/// The one list of the creation options.
VEXG_EXPORT std::span<const CreationValue> CreationValues();

/// Reads options from their texts.
/// @param textOf  the text of an input, empty for none.
/// @param fault   [out] one line on a text that makes no sense.
/// @return false for such a text.
VEXG_EXPORT bool ReadCreationOptions(const std::function<std::string(const char* input)>& textOf,
                                     CreationOptions& options, std::string& fault);

/// One line on the first option of a definition that its format, pixel type or bands don't go with;
/// empty where all do.
VEXG_EXPORT std::string FindCreationMisfit(const RasterDef& def);

/// The predictor that is applied: kNone, kWhole or kFloat.
VEXG_EXPORT BlockPredictor PredictorOf(const RasterDef& def);

}  // namespace lumo
