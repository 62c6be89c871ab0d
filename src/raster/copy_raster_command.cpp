#include <optional>
#include <vector>

#include "foundation/fault.h"
#include "raster/block_strides.h"
#include "raster/raster_command.h"
#include "raster/raster_tasks.h"
#include "raster/valid_pixels.h"
#include "tasks/process_builder.h"

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

/// The orders of the middle stage of a copy, and what it found.
template <typename T>
struct CopyPlan : Object {
  explicit CopyPlan(unsigned bands) : valid(bands), fill(bands) {}

  ValidPixels valid;
  std::vector<std::optional<T>> fill;  ///< by band, for pixels that are not valid
};

/// Counts the valid pixels of the tile in slot 0, and fills the others. Setup arguments: the plan.
template <typename T>
class CheckPixelsTask final : public SequentialTask {
 public:
  explicit CheckPixelsTask(ArgList& setup)
      : SequentialTask("CheckPixelsTask"), plan_(dynamic_cast<CopyPlan<T>*>(setup.Get(0).Get())) {
    if (plan_ == nullptr) SetErrorState(TaskErrorBadParams());
  }

  bool Execute(ArgList& args) override {
    const TilePtr<T> tile(args.Get(0));
    if (plan_ == nullptr || !tile || !tile->IsValid()) {
      SetErrorState(TaskErrorBadArgs());
      return false;
    }
    plan_->valid.Add(*tile);
    Fill(*tile);
    return true;
  }

 private:
  void Fill(Tile<T>& tile) const {
    const BlockStrides strides(tile.Order(), tile.Width(), tile.Height(), tile.Bands());
    for (std::size_t band = 0; band < plan_->fill.size(); ++band) {
      if (!plan_->fill[band]) continue;
      for (std::size_t line = 0; line < tile.Height(); ++line) {
        std::size_t at = band * strides.band + line * strides.line;
        for (unsigned x = 0; x < tile.Width(); ++x, at += strides.pixel) {
          const bool isValid = (tile.StateArray().GetData()[at] & PixelValueState::NotValid) == 0;
          if (!isValid) tile.PixelArray().GetData()[at] = *plan_->fill[band];
        }
      }
    }
  }

  CopyPlan<T>* plan_;  // the process holds it
};

/// Copies what one iterator reads to where another writes, on the same grid.
template <typename T>
class CopyProcess final : public ProcessBuilder<Process> {
 public:
  CopyProcess(const RasterIteratorPtr<T>& source, const Pointer<CopyPlan<T>>& plan,
              const RasterIteratorPtr<T>& target, const IPC& ipc)
      : ProcessBuilder("CopyProcess", ipc) {
    Process& process = GetPipeline();
    const ArgID sourceId = process.TakeSetupArg();
    const ArgID planId = process.TakeSetupArg();
    const ArgID targetId = process.TakeSetupArg();
    const ArgID tile = process.TakeTokenArg();
    const bool placed =
        process.AddTask(0, TaskDescriptor(&read_, ArgIDs({tile}), ArgIDs({sourceId}))) &&
        process.AddTask(1, TaskDescriptor(&check_, ArgIDs({tile}), ArgIDs({planId}))) &&
        process.AddTask(2, TaskDescriptor(&write_, ArgIDs({tile}), ArgIDs({targetId})));
    SetArg(sourceId, source);
    SetArg(planId, plan);
    SetArg(targetId, target);
    process.SetTotalTokens(std::uint64_t{source->Columns()} * source->Rows());
    if (placed) SetBuilt();
  }

 private:
  ManagedTask<RasterReadTask<T>> read_;
  ManagedTask<CheckPixelsTask<T>> check_;
  ManagedTask<RasterWriteTask<T>> write_;
};

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
      "", &WordsIn<InvalidPixels>}},
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
    const Pointer<CopyPlan<T>> plan(new CopyPlan<T>(bands.GetCount()));
    const bool fills =
        HasInput("Invalid") && Read<InvalidPixels>("Invalid") != InvalidPixels::kTold;
    for (unsigned band = 0; fills && band < bands.GetCount(); ++band) {
      if (target->HasNoDataValue(band)) plan->fill[band] = target->NoDataValue(band);
    }
    const RasterIteratorPtr<T> from(new RasterIteratorSmart<T>(source, bands));
    const RasterIteratorPtr<T> to(new RasterIteratorFromTemplate<T>(target, *from));
    CopyProcess<T> process(from, plan, to, GetIPC());
    if (!process.RunProcess(process.kHere)) return false;
    Write("ValidPixels", plan->valid.Get());
    return true;
  }
};

const CommandFactoryT<CopyRasterCommand> factory(kCopy);

}  // namespace
}  // namespace lumo
