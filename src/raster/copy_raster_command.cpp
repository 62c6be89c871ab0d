#include "foundation/fault.h"
#include "raster/raster_command.h"
#include "raster/raster_tasks.h"
#include "tasks/process_builder.h"

namespace lumo {
namespace {

/// Copies what one iterator reads to where another writes, on the same grid.
template <typename T>
class CopyProcess final : public ProcessBuilder<Process> {
 public:
  CopyProcess(const RasterIteratorPtr<T>& source, const RasterIteratorPtr<T>& target,
              const IPC& ipc)
      : ProcessBuilder("CopyProcess", ipc) {
    Process& process = GetPipeline();
    const ArgID sourceId = process.TakeSetupArg();
    const ArgID targetId = process.TakeSetupArg();
    const ArgID tile = process.TakeTokenArg();
    const bool placed =
        process.AddTask(0, TaskDescriptor(&read_, ArgIDs({tile}), ArgIDs({sourceId}))) &&
        process.AddTask(1, TaskDescriptor(&write_, ArgIDs({tile}), ArgIDs({targetId})));
    SetArg(sourceId, source);
    SetArg(targetId, target);
    process.SetTotalTokens(std::uint64_t{source->Columns()} * source->Rows());
    if (placed) SetBuilt();
  }

 private:
  ManagedTask<RasterReadTask<T>> read_;
  ManagedTask<RasterWriteTask<T>> write_;
};

const CommandDeclaration kCopy{
    "CopyRasterCommand",
    "Pixels",
    "Copies the pixels of a raster into another one of the same size and pixel type.",
    {{"SrcURI", Presence::kRequired, ValueKind::kURI, "the raster to read"},
     {"DstURI", Presence::kRequired, ValueKind::kURI, "the raster to write"},
     {"Bands", Presence::kOptional, ValueKind::kIntegerArray,
      "which bands to read, in the order of those written; all when absent"}},
    {}};

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
    const RasterIteratorPtr<T> from(new RasterIteratorSmart<T>(source, bands));
    const RasterIteratorPtr<T> to(new RasterIteratorFromTemplate<T>(target, *from));
    CopyProcess<T> process(from, to, GetIPC());
    return process.RunProcess(process.kHere);
  }

  static Array<unsigned> AllBands(const BasicRaster& raster) {
    Array<unsigned> bands{ArrayDims(raster.Bands())};
    for (unsigned i = 0; i < bands.GetCount(); ++i) bands[i] = i;
    return bands;
  }
};

const CommandFactoryT<CopyRasterCommand> factory(kCopy);

}  // namespace
}  // namespace lumo
