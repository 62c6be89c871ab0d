#include "commands/division.h"
#include "foundation/fault.h"
#include "geometry/fxv_file.h"
#include "geometry/raster_to_vector.h"
#include "raster/raster_command.h"

namespace lumo {
namespace {

const CommandDeclaration kRasterToVector{
    "FxRasterToVectorCommand",
    "Feature extraction",
    "Turns a label raster into polygons.",
    {{"LabelURI", Presence::kRequired, ValueKind::kURI,
      "the label raster, of type Int or UInt; its first band counts"},
     {"VectorFXV", Presence::kRequired, ValueKind::kText, "the FXV file to create"}},
    {}};

using FxvWriter = FxvPolygonWriter<std::int32_t, std::uint32_t>;

class FxRasterToVectorCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr labels = FindRaster("LabelURI");
    if (!labels) return Fail();
    bool isDone = false;
    const bool isKnown = DispatchType(TypeList<std::int32_t, std::uint32_t>{}, labels->DataType(),
                                      [&]<typename T>() {
                                        isDone = Vectorize<T>(RasterPtr<T>(labels));
                                        return true;
                                      });
    if (!isKnown) return Fail("LabelURI: the raster is of neither type Int nor UInt");
    return isDone ? Succeed() : Fail(TakeFaultOr("the raster could not be vectorized"));
  }

  /// The file has a header only when all polygons are in it.
  template <typename T>
  bool Vectorize(const RasterPtr<T>& labels) {
    const Pointer<FxvWriter> writer(new FxvWriter(URI(Read<String>("VectorFXV"))));
    if (!writer->IsValid()) return false;
    RasterToVectorProcess<T> process(labels, 0, writer, GetIPC());
    const bool hasRun = process.RunProcess(process.kHere);
    const bool isAborted = GetIPC().abort->IsSet();
    if (hasRun && !isAborted) return writer->Close();
    writer->Abandon();
    SetFault(isAborted ? String("the vectorizing was aborted") : process.GetFault());
    return false;
  }
};

const CommandFactoryT<FxRasterToVectorCommand> fxRasterToVectorFactory(kRasterToVector);
const DivisionRegistration fxRasterToVectorDivision({.command = "FxRasterToVectorCommand",
                                                     .makes = {"VectorFXV"}});

}  // namespace
}  // namespace lumo
