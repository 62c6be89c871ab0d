#include <numeric>

#include "foundation/fault.h"
#include "raster/raster_command.h"
#include "stats/raster_percentiles.h"

namespace lumo {
namespace {

const CommandDeclaration kPercentiles{
    "GetRasterPercentilesCommand",
    "Statistics",
    "Gives percentiles of the valid pixels of each band, exactly. A command of this library's own.",
    {{"URI", Presence::kRequired, ValueKind::kURI, "the raster"},
     {"Percents", Presence::kRequired, ValueKind::kNumberArray,
      "0 to 100, 128 of them at most; 50 is the median"},
     {"Bands", Presence::kOptional, ValueKind::kIntegerArray, "from 0; all when absent"}},
    {{"Percentiles", ValueKind::kNumberArray,
      "bands by percentages; between the values at the two ranks next to (n - 1) p / 100, and nan "
      "in a band without a valid pixel"}}};

class GetRasterPercentilesCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    auto bands = Read<Array<unsigned>>("Bands");
    if (!HasInput("Bands")) {
      bands.Resize(ArrayDims(raster->Bands()));
      std::iota(bands.begin(), bands.end(), 0U);
    }
    if (!CheckBands(*raster, bands)) return Fail();
    const auto percents = Read<Array<double>>("Percents");
    const bool isGood = percents.GetCount() != 0 && percents.GetCount() <= kMostPercentages &&
                        std::all_of(percents.begin(), percents.end(),
                                    [](double percent) { return percent >= 0 && percent <= 100; });
    if (!isGood) return Fail("Percents: not 1 to 128 numbers from 0 to 100");
    std::vector<double> found;
    bool isDone = false;
    const bool typed = DispatchType(TenTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      isDone = source && ComputePercentiles<T>(source, {bands.begin(), bands.end()},
                                               {percents.begin(), percents.end()}, GetIPC(), found);
      return true;
    });
    if (!typed) return Fail("percentiles are of real numbers, and the raster has others");
    if (!isDone) return Fail(TakeFaultOr("the percentiles could not be computed"));
    Array<double> table{ArrayDims(bands.GetCount(), percents.GetCount())};
    std::copy(found.begin(), found.end(), table.begin());
    Write("Percentiles", table);
    return Succeed();
  }
};

const CommandFactoryT<GetRasterPercentilesCommand> percentilesFactory(kPercentiles);

}  // namespace
}  // namespace lumo
