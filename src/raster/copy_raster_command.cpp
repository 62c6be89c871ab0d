#include <algorithm>
#include <optional>
#include <vector>

#include "commands/division.h"
#include "commands/share_file.h"
#include "foundation/fault.h"
#include "raster/block_strides.h"
#include "raster/copy_blocks.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"
#include "raster/rows_files.h"
#include "raster/tile_functions.h"
#include "raster/valid_pixels.h"

namespace lumo {
namespace {

/// How the values of pixels that are not valid are copied.
enum class InvalidPixels : unsigned {
  kTold = 0,   ///< they are copied
  kNoData = 1  ///< the target's no-data value takes their place, where a band has one
};

std::span<const EnumWord<InvalidPixels>> WordsOf(InvalidPixels) {
  static constexpr EnumWord<InvalidPixels> kWords[] = {{"Told", InvalidPixels::kTold},
                                                       {"NoData", InvalidPixels::kNoData}};
  return kWords;
}

/// Puts the values of `fill` where the pixels of a band, which has one, are not valid.
template <typename T>
void Fill(Tile<T>& tile, const std::vector<std::optional<T>>& fill) {
  if (tile.HasNoStates()) return;
  const BlockStrides strides(tile.Order(), tile.Width(), tile.Height(), tile.Bands());
  for (std::size_t band = 0; band < fill.size(); ++band) {
    if (!fill[band]) continue;
    for (std::size_t line = 0; line < tile.Height(); ++line) {
      std::size_t at = band * strides.band + line * strides.line;
      for (unsigned x = 0; x < tile.Width(); ++x, at += strides.pixel) {
        const bool isValid = IsValidState(tile.StateArray().GetData()[at]);
        if (!isValid) tile.PixelArray().GetData()[at] = *fill[band];
      }
    }
  }
}

const CommandDeclaration kCopy{
    "CopyRasterCommand",
    "Pixels",
    "Copies the pixels of a raster into another one of the same size and pixel type.",
    {{"SrcURI", Presence::kRequired, ValueKind::kURI, "the raster to read"},
     {"DstURI", Presence::kRequired, ValueKind::kURI, "the raster to write"},
     {"Bands", Presence::kOptional, ValueKind::kIntegerArray,
      "which bands to read, in the order of those written; all when absent"},
     {"Invalid", Presence::kOptional, ValueKind::kWord,
      "Told: the values of pixels that aren't valid are copied; NoData: the target's no-data value "
      "takes their place, where a band has one",
      "", &WordsIn<InvalidPixels>},
     {"Blocks", Presence::kOptional, ValueKind::kWord,
      "Told: squares or lines of 8 MiB; Stream: blocks as the source stores them, which costs less",
      "", &WordsIn<CopyBlocks>},
     {kShareInput, Presence::kOptional, ValueKind::kIntegerArray,
      "which of several parts of a raster's lines the source is, from 0, and of how many"},
     {kShareFileInput, Presence::kOptional, ValueKind::kText,
      "the file to make of ValidPixels, with Share"},
     {kShareFilesInput, Presence::kOptional, ValueKind::kTextList,
      "such files of all parts, for a target that has taken the pixels out of files already"}},
    {{"ValidPixels", ValueKind::kIntegerArray, "of each band that was copied"}}};

class CopyRasterCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (!source) return Fail();
    const BasicRasterPtr target = FindRaster("DstURI");
    if (!target) return Fail();
    if (source.Get() == target.Get()) return Fail("SrcURI and DstURI are the same raster");
    if (!target->CanWrite()) return Fail("DstURI: the raster can't be written");
    if (source->DataType() != target->DataType()) return Fail("the pixel types differ");
    if (source->Samples() != target->Samples() || source->Lines() != target->Lines()) {
      return Fail("the sizes differ");
    }
    Array<unsigned> bands = AllBands(*source);
    if (HasInput("Bands")) bands = Read<Array<unsigned>>("Bands");
    if (!CheckBands(*source, bands)) return Fail();
    if (bands.GetCount() != target->Bands()) return Fail("the numbers of bands differ");

    const bool hasCounts = Read<Array<String>>(kShareFilesInput).GetCount() != 0;
    if (hasCounts && HoldsPixels(*source, *target)) return TakeCounts(bands);

    const bool copied = DispatchType(TwelveTypes{}, source->DataType(), [&]<typename T>() {
      return Copied<T>(RasterPtr<T>(source), RasterPtr<T>(target), bands);
    });
    // A half copy never passes for a whole one.
    if (GetIPC().abort->IsSet()) return Fail("the copy was aborted");
    return copied ? Succeed() : Fail(TakeFaultOr("the pixels could not be copied"));
  }

  template <typename T>
  bool Copied(const RasterPtr<T>& source, const RasterPtr<T>& target,
              const Array<unsigned>& bands) {
    ValidPixels valid(bands.GetCount());
    std::vector<std::optional<T>> fill(bands.GetCount());  // for pixels that are not valid
    const bool fills =
        HasInput("Invalid") && Read<InvalidPixels>("Invalid") != InvalidPixels::kTold;
    for (unsigned band = 0; fills && band < bands.GetCount(); ++band) {
      if (target->HasNoDataValue(band)) fill[band] = target->NoDataValue(band);
    }
    const RasterIteratorPtr<T> from =
        MakeCopyIterator<T>(source, bands, Read<CopyBlocks>("Blocks"), *target);
    const auto check = [&](Tile<T>& tile) {
      valid.Add(tile);
      Fill(tile, fill);
    };
    if (!CopyTiles("CopyProcess", TilesBy(from), target, check, GetIPC())) return false;
    const Array<std::uint64_t> counts = valid.Get();
    Write("ValidPixels", counts);
    return !HasInput(kShareInput) || KeepCounts(counts);
  }

  /// True when a new raster has taken all pixels of the source out of the files that hold them.
  static bool HoldsPixels(const BasicRaster& source, const BasicRaster& target) {
    const auto* const files = dynamic_cast<const RowsSource*>(&source);
    return files != nullptr && files->GetRows() == target.GetRasterDef().creation.rows;
  }

  static constexpr const char* kKey = "CopyRasterCommand";

  /// Writes how many pixels of a part are valid.
  bool KeepCounts(const Array<std::uint64_t>& counts) const {
    Share share;
    if (!ReadShare(Read<Array<unsigned>>(kShareInput), share)) return false;
    ShareWriter out;
    out.PutAll(counts.GetData(), counts.GetCount());
    return out.Write(Read<String>(kShareFileInput).ToUTF8(), kKey, share);
  }

  /// Gives how many pixels of all parts are valid.
  CommandResult TakeCounts(const Array<unsigned>& bands) {
    const auto files = Read<Array<String>>(kShareFilesInput);
    Array<std::uint64_t> sums(ArrayDims(bands.GetCount())), counts(sums);
    std::fill(sums.begin(), sums.end(), 0);
    for (unsigned i = 0; i < files.GetCount(); ++i) {
      ShareReader in;
      if (!in.Open(files[i].ToUTF8(), kKey, {i, files.GetCount()})) return Fail();
      if (!in.GetAll(counts.GetData(), counts.GetCount()) || !in.IsAtEnd()) {
        SetShareFault(files[i].ToUTF8());
        return Fail();
      }
      for (unsigned band = 0; band < counts.GetCount(); ++band) sums[band] += counts[band];
    }
    Write("ValidPixels", sums);
    return Succeed();
  }
};

const CommandFactoryT<CopyRasterCommand> copyRasterFactory(kCopy);
const DivisionRegistration copyRasterDivision({"CopyRasterCommand", DivisionKind::kRows, "SrcURI",
                                               "DstURI"});

}  // namespace
}  // namespace lumo
