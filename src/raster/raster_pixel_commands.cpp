#include <algorithm>

#include "commands/shared_memory_channel.h"
#include "foundation/fault.h"
#include "raster/raster_command.h"

namespace lumo {
namespace {

std::vector<InputDeclaration> BlockInputs() {
  return {
      RasterURIInput(),
      {"SubRect", Presence::kRequired, ValueKind::kRectangle, "the block, pixels of the raster"},
      {"Bands", Presence::kRequired, ValueKind::kIntegerArray, "the bands, in any order"},
      {"Interleave", Presence::kRequired, ValueKind::kWord,
       "BIP, BIL, BSQ: the order in memory; any other word for one band", "", &WordsIn<Interleave>},
      {"PixelDataBufName", Presence::kRequired, ValueKind::kText, "named memory of the pixels"},
      {"PixelDataBufSize", Presence::kRequired, ValueKind::kInteger, "its size", "bytes"},
      {"PixelValueStateBufName", Presence::kRequired, ValueKind::kText,
       "named memory of the states, a byte for each pixel value: 1 no data, 2 masked, 4 "
       "outside the region, 0 valid"},
      {"PixelValueStateBufSize", Presence::kRequired, ValueKind::kInteger, "its size", "bytes"}};
}

const OutputDeclaration kFault{"Fault", ValueKind::kText, "why not, where Return is 0"};

/// The elements of a block in memory of its own.
template <typename T>
Array<T> CopyOf(const Array<T>& block) {
  Array<T> copy(block.GetDims());
  if (copy.GetCount() == block.GetCount()) std::copy(block.begin(), block.end(), copy.begin());
  return copy;
}

/// Moves a block of pixels between a raster and named memory of another process.
class BlockCommand : public RasterCommand {
 protected:
  template <typename Transfer>
  CommandResult TransferBlock(const Transfer& transfer) {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const bool moved = DispatchType(TwelveTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> typed(raster);
      return typed && Transferred(*typed, transfer);
    });
    return moved ? Succeed() : Fail(TakeFaultOr("the block could not be moved"));
  }

 private:
  template <typename T, typename Transfer>
  bool Transferred(Raster<T>& raster, const Transfer& transfer) {
    const auto rect = Read<SubRect>("SubRect");
    const auto bands = Read<Array<unsigned>>("Bands");
    if (!CheckBlock(raster, rect, bands)) return false;
    const std::uint64_t elements = std::uint64_t{rect.Width()} * rect.Height() * bands.GetCount();
    const auto pixelBytes = Read<unsigned>("PixelDataBufSize");
    const auto stateBytes = Read<unsigned>("PixelValueStateBufSize");
    if (pixelBytes < elements * sizeof(T))
      return TooSmall("PixelDataBufSize", elements * sizeof(T));
    if (stateBytes < elements) return TooSmall("PixelValueStateBufSize", elements);

    const ConnectSharedMemory pixelMemory(Read<String>("PixelDataBufName"), pixelBytes,
                                          elements * sizeof(T));
    const ConnectSharedMemory stateMemory(Read<String>("PixelValueStateBufName"), stateBytes,
                                          elements);
    if (pixelMemory.GetData() == nullptr) return NoMemory(pixelMemory);
    if (stateMemory.GetData() == nullptr) return NoMemory(stateMemory);
    const ArrayDims dims(static_cast<unsigned>(elements));
    Array<T> pixels(reinterpret_cast<T*>(pixelMemory.GetData()), dims);
    Array<unsigned char> state(stateMemory.GetData(), dims);
    const auto memoryIsWhole = [&] { return IsWhole(pixelMemory) && IsWhole(stateMemory); };
    const bool whole =
        transfer(raster, rect, bands, Read<Interleave>("Interleave"), pixels, state, memoryIsWhole);
    if (!memoryIsWhole()) return false;
    Write("Return", whole);
    if (!whole) Write("Fault", TakeFault());
    return true;
  }

  template <typename T>
  static bool CheckBlock(const Raster<T>& raster, const SubRect& rect,
                         const Array<unsigned>& bands) {
    if (!CheckBands(raster, bands)) return false;
    if (rect.right < raster.Samples() && rect.bottom < raster.Lines()) return true;
    SetFault("SubRect reaches over the raster's " + std::to_string(raster.Samples()) + " by " +
             std::to_string(raster.Lines()) + " pixels");
    return false;
  }

  static bool TooSmall(const char* input, std::uint64_t needed) {
    SetFault(std::string(input) + " is too small: the block takes " + std::to_string(needed) +
             " bytes");
    return false;
  }

  static bool NoMemory(const SharedMemory& memory) {
    SetFault("no named memory " + memory.GetName().ToUTF8() + " of " +
             std::to_string(memory.GetSize()) + " bytes");
    return false;
  }

  static bool IsWhole(const SharedMemory& memory) {
    if (!memory.WasCut()) return true;
    SetFault("the named memory " + memory.GetName().ToUTF8() +
             " became smaller while it was in use");
    return false;
  }
};

const CommandDeclaration kGet{
    "GetRasterSubRectCommand",
    "Pixels",
    "Reads a block of pixels into named memory.",
    BlockInputs(),
    {{"Return", ValueKind::kBoolean, "the whole block was read; else the memory means nothing"},
     kFault}};

class GetRasterSubRectCommand final : public BlockCommand {
  CommandResult Execute() override {
    return TransferBlock([](auto& raster, const SubRect& rect, const Array<unsigned>& bands,
                            Interleave interleave, auto& pixels, auto& state, const auto&) {
      return raster.GetSubRect(rect, bands, interleave, pixels, state);
    });
  }
};

const CommandFactoryT<GetRasterSubRectCommand> getRasterSubRectFactory(kGet);

const CommandDeclaration kPut{
    "PutRasterSubRectCommand",
    "Pixels",
    "Writes a block of pixels from named memory.",
    BlockInputs(),
    {{"Return", ValueKind::kBoolean, "the whole block was taken"}, kFault}};

class PutRasterSubRectCommand final : public BlockCommand {
  CommandResult Execute() override {
    return TransferBlock([](auto& raster, const SubRect& rect, const Array<unsigned>& bands,
                            Interleave interleave, auto& pixels, auto& state,
                            const auto& memoryIsWhole) {
      // A copy is what is written: the zeros that come in place of memory that has gone are not to
      // get into the raster.
      auto ownPixels = CopyOf(pixels);
      auto ownState = CopyOf(state);
      if (ownPixels.GetCount() != pixels.GetCount() || ownState.GetCount() != state.GetCount()) {
        SetFault("memory is short");
        return false;
      }
      return memoryIsWhole() && raster.PutSubRect(rect, bands, interleave, ownPixels, ownState);
    });
  }
};

const CommandFactoryT<PutRasterSubRectCommand> putFactory(kPut);

}  // namespace
}  // namespace lumo
