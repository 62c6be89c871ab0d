#include <optional>
#include <vector>

#include "commands/division.h"
#include "foundation/fault.h"
#include "raster/block_strides.h"
#include "raster/raster_command.h"
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

/// The blocks in which pixels are copied.
enum class CopyBlocks : unsigned {
  kTold = 0,    ///< squares, or lines, of 8 MiB
  kStream = 1,  ///< those of the source's storage
  kTarget = 2   ///< those of the target's storage
};

std::span<const EnumWord<CopyBlocks>> WordsOf(CopyBlocks) {
  static constexpr EnumWord<CopyBlocks> kWords[] = {{"Told", CopyBlocks::kTold},
                                                    {"Stream", CopyBlocks::kStream},
                                                    {"Target", CopyBlocks::kTarget}};
  return kWords;
}

/// Reads a raster in the blocks and the order in which another one of its size is stored, so that
/// whole blocks are written there.
template <typename T>
class IteratorOfTarget final : public RasterIterator<T> {
 public:
  IteratorOfTarget(const RasterPtr<T>& source, const Array<unsigned>& bands,
                   const BasicRaster& target)
      : RasterIterator<T>(source, StreamTiles(&target, sizeof(T), kBudget, bands.GetCount()),
                          bands) {
    this->order_ = StreamOrder(&target);
  }

 private:
  /// Measured with warps: a block stays in the caches from its making to its writing, and is worth
  /// the reading of what lies around it in the source.
  static constexpr unsigned kBudget = 0x200000;
};

/// Puts the values of `fill` where the pixels of a band, which has one, are not valid.
template <typename T>
void Fill(Tile<T>& tile, const std::vector<std::optional<T>>& fill) {
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
      "Told: squares or lines of 8 MiB; Stream: blocks as the source stores them, which costs "
      "less; Target: as the target stores them, for sources that are computed",
      "", &WordsIn<CopyBlocks>}},
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
    RasterIteratorPtr<T> from;
    const auto blocks = HasInput("Blocks") ? Read<CopyBlocks>("Blocks") : CopyBlocks::kTold;
    if (blocks == CopyBlocks::kStream) {
      from.Reset(new RasterIteratorStream<T>(source, bands));
    } else if (blocks == CopyBlocks::kTarget) {
      from.Reset(new IteratorOfTarget<T>(source, bands, *target));
    } else {
      from.Reset(new RasterIteratorSmart<T>(source, bands));
    }
    const auto check = [&](Tile<T>& tile) {
      valid.Add(tile);
      Fill(tile, fill);
    };
    if (!CopyTiles("CopyProcess", TilesBy(from), target, check, GetIPC())) return false;
    Write("ValidPixels", valid.Get());
    return true;
  }
};

const CommandFactoryT<CopyRasterCommand> factory(kCopy);
const DivisionRegistration division({"CopyRasterCommand", DivisionKind::kRows, "SrcURI", "DstURI"});

}  // namespace
}  // namespace lumo
