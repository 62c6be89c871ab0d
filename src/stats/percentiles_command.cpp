#include <numeric>

#include <fmt/format.h>

#include "commands/division.h"
#include "foundation/fault.h"
#include "raster/raster_command.h"
#include "stats/raster_percentiles.h"

namespace lumo {
namespace {

const CommandDeclaration kPercentiles{
    "GetRasterPercentilesCommand",
    "Statistics",
    "Gives percentiles of the valid pixels of each band, exactly. A command of this library's own.",
    WithShareInputs(
        {RasterURIInput(),
         {"Percents", Presence::kRequired, ValueKind::kNumberArray,
          "0 to 100, 128 of them at most; 50 is the median"},
         {"Bands", Presence::kOptional, ValueKind::kIntegerArray, "from 0; all when absent"}}),
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
    PercentileShares shares;
    if (!ReadShares(KeyOfShares(*raster, bands, percents), shares)) return Fail();
    std::vector<double> found;
    bool isDone = false;
    const bool typed = DispatchType(TenTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      isDone = source &&
               ComputePercentiles<T>(source, {bands.begin(), bands.end()},
                                     {percents.begin(), percents.end()}, GetIPC(), found, shares);
      return true;
    });
    if (!typed) return Fail("percentiles are of real numbers, and the raster has others");
    if (!isDone) return Fail(TakeFaultOr("the percentiles could not be computed"));
    if (shares.hasShare) return Succeed();
    Array<double> table{ArrayDims(bands.GetCount(), percents.GetCount())};
    std::copy(found.begin(), found.end(), table.begin());
    Write("Percentiles", table);
    return Succeed();
  }

  bool ReadShares(const std::string& key, PercentileShares& shares) const {
    shares.key = key;
    for (const String& file : Read<Array<String>>(kShareFilesInput)) {
      shares.files.push_back(file.ToUTF8());
    }
    shares.hasShare = HasInput(kShareInput);
    shares.file = Read<String>(kShareFileInput).ToUTF8();
    if (shares.hasShare == shares.file.empty()) {
      SetFault("Share and ShareFile go together");
      return false;
    }
    return !shares.hasShare || ReadShare(Read<Array<unsigned>>(kShareInput), shares.share);
  }

  static std::string KeyOfShares(const BasicRaster& raster, const Array<unsigned>& bands,
                                 const Array<double>& percents) {
    std::string key =
        fmt::format("percentiles {} {} {}", raster.DataType(), raster.Samples(), raster.Lines());
    for (const unsigned band : bands) key += fmt::format(" {}", band);
    for (const double percent : percents) key += fmt::format(" {}", percent);
    return key;
  }
};

const CommandFactoryT<GetRasterPercentilesCommand> percentilesFactory(kPercentiles);
const DivisionRegistration getRasterPercentilesDivision({.command = "GetRasterPercentilesCommand",
                                                         .kind = DivisionKind::kShares,
                                                         .source = "URI",
                                                         .rounds = [](unsigned dataType,
                                                                      const DivisionInputs&) {
                                                           return PercentilePasses(dataType);
                                                         }});

}  // namespace
}  // namespace lumo
