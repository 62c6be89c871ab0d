#include <algorithm>

#include <fmt/format.h>

#include "commands/share_scope.h"
#include "foundation/fault.h"
#include "raster/raster_command.h"
#include "stats/saving_command.h"
#include "stats/turn.h"

namespace lumo {
namespace {

/// Base of the commands that compute statistics and write them.
class ComputeStatsCommand : public RasterCommand {
 protected:
  /// Computes what `mode` asks for, and writes it.
  CommandResult Compute(StatsMode mode) {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const AsyncPtr pyramid = raster->PyramidAsync();
    if (pyramid) pyramid->WaitFinished();
    ShareScope shares;
    if (!shares.Begin({HasInput(kShareInput), Read<Array<unsigned>>(kShareInput),
                       Read<String>(kShareFileInput), Read<Array<String>>(kShareFilesInput)},
                      KeyOfShares(*raster, mode))) {
      return Fail();
    }
    const Turn turn(raster, Read<Waiting>("Wait"), GetIPC());
    raster->SetStatsMode(mode);
    // While a computation goes on the mode stays what it was.
    while (raster->StatsMode() != mode && turn.AwaitRuns()) raster->SetStatsMode(mode);
    const bool typed = DispatchType(TenTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      if (!source) return false;
      WriteStats(*source, mode, shares.IsShare());
      return true;
    });
    if (!typed) return Fail("statistics are of real numbers, and the raster has others");
    if (GetIPC().abort->IsSet()) return Fail("the computation was aborted");
    for (unsigned band = 0; band < raster->Bands(); ++band) {
      if (raster->StatsExist(band, MaskOf(mode))) continue;
      const String fault = TakeFault();
      return Fail(fault.GetLength() != 0 ? fault : "the statistics could not be computed");
    }
    return shares.End() ? Succeed() : Fail();
  }

 private:
  static std::string KeyOfShares(const BasicRaster& raster, StatsMode mode) {
    return fmt::format("statistics {} {} {} {} {}", MaskOf(mode), raster.DataType(), raster.Bands(),
                       raster.Samples(), raster.Lines());
  }

  static unsigned MaskOf(StatsMode mode) {
    return mode == StatsMode::kExtended ? StatsMask::Extended : StatsMask::Basic;
  }

  template <typename T>
  void WriteStats(Raster<T>& raster, StatsMode mode, bool isShare) {
    const unsigned bands = raster.Bands();
    const bool extended = mode == StatsMode::kExtended;
    const ArrayDims each(bands);
    Array<T> min(each), max(each);
    Array<unsigned long long> count(each);
    Array<double> mean(each), std(each), sum(each), sum2(each), rms(each);
    Array<double> sumXY, cov;
    if (extended) {
      sumXY.Resize(ArrayDims(bands, bands));
      cov.Resize(ArrayDims(bands, bands));
      std::fill(sumXY.begin(), sumXY.end(), 0.0);
      std::fill(cov.begin(), cov.end(), 0.0);
    }
    for (unsigned band = 0; band < bands; ++band) {
      const auto stats = raster.ComputeBandStats(band, MaskOf(mode), GetIPC(), bands);
      if (stats.mask == StatsMask::None) break;
      min[band] = stats.min;
      max[band] = stats.max;
      mean[band] = stats.mean;
      std[band] = stats.std;
      sum[band] = stats.sum;
      sum2[band] = stats.sum2;
      rms[band] = stats.rms;
      count[band] = stats.pixelCount;
      for (unsigned other = 0; extended && other < bands; ++other) {
        const std::size_t at = std::size_t{band} * bands + other;
        if (other < stats.sumXY.GetCount()) sumXY[at] = stats.sumXY[other];
        if (other < stats.cov.GetCount()) cov[at] = stats.cov[other];
      }
    }
    if (isShare) return;
    Write("Min", min);
    Write("Max", max);
    Write("Mean", mean);
    Write("Std", std);
    Write("Sum", sum);
    Write("Sum2", sum2);
    Write("RMS", rms);
    Write("Count", count);
    if (!extended) return;
    Write("SumXY", sumXY);
    Write("Cov", cov);
  }
};

const std::vector<OutputDeclaration> kBasicOutputs{
    {"Min", ValueKind::kNumberArray, "smallest value of each band; 0 in a band without any"},
    {"Max", ValueKind::kNumberArray, "largest value of each band"},
    {"Mean", ValueKind::kNumberArray, "mean of each band"},
    {"Std", ValueKind::kNumberArray, "deviation of each band, as of a sample: divided by n - 1"},
    {"Sum", ValueKind::kNumberArray, "sum of each band"},
    {"Sum2", ValueKind::kNumberArray, "sum of the squares of each band"},
    {"RMS", ValueKind::kNumberArray, "root of the mean of the squares of each band"},
    {"Count", ValueKind::kNumberArray,
     "values that counted in each band; 0 where statistics were entered or stored without it"}};

std::vector<OutputDeclaration> ExtendedOutputs() {
  std::vector<OutputDeclaration> outputs = kBasicOutputs;
  outputs.insert(
      outputs.end(),
      {{"SumXY", ValueKind::kNumberArray, "sums of the products of two bands, bands by bands"},
       {"Cov", ValueKind::kNumberArray, "covariances of two bands, bands by bands"}});
  return outputs;
}

const CommandDeclaration kBasic{
    "GetBasicRasterStatsCommand", "Statistics",
    "Gives the statistics of each band, computed where they are not at hand.",
    WithShareInputs({RasterURIInput(), WaitInput()}), kBasicOutputs};

class GetBasicRasterStatsCommand final : public ComputeStatsCommand {
  CommandResult Execute() override { return Compute(StatsMode::kBasic); }
};

const CommandFactoryT<GetBasicRasterStatsCommand> basicFactory(kBasic);
const DivisionRegistration basicDivision({.command = "GetBasicRasterStatsCommand",
                                          .kind = DivisionKind::kShares,
                                          .source = "URI"});

const CommandDeclaration kExtended{
    "GetExtendedRasterStatsCommand", "Statistics",
    "Gives the statistics of each band and between bands, computed where they are not at hand.",
    WithShareInputs({RasterURIInput(), WaitInput()}), ExtendedOutputs()};

class GetExtendedRasterStatsCommand final : public ComputeStatsCommand {
  CommandResult Execute() override { return Compute(StatsMode::kExtended); }
};

const CommandFactoryT<GetExtendedRasterStatsCommand> extendedFactory(kExtended);
const DivisionRegistration extendedDivision({.command = "GetExtendedRasterStatsCommand",
                                             .kind = DivisionKind::kShares,
                                             .source = "URI"});

const CommandDeclaration kSetMode{
    "SetRasterStatsModeCommand",
    "Statistics",
    "Sets which statistics a raster computes.",
    {RasterURIInput(),
     {"StatsMode", Presence::kRequired, ValueKind::kWord,
      "DoBasic, or DoExtended: with those between bands", "", &WordsIn<StatsMode>},
     WaitInput()},
    {{"StatsMode", ValueKind::kWord, "the mode from now on"}}};

class SetRasterStatsModeCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const Turn turn(raster, Read<Waiting>("Wait"), GetIPC());
    raster->SetStatsMode(Read<StatsMode>("StatsMode"));
    Write("StatsMode", raster->StatsMode());
    return Succeed();
  }
};

const CommandFactoryT<SetRasterStatsModeCommand> setModeFactory(kSetMode);

const CommandDeclaration kSetStats{"SetRasterBandStatsCommand",
                                   "Statistics",
                                   "Enters known statistics of one band.",
                                   {RasterURIInput(),
                                    {"RasterBandStats", Presence::kRequired, ValueKind::kText,
                                     "band, mask, min, max, mean, deviation, sum, sum of squares, "
                                     "root mean square, and the arrays "
                                     "of products and covariances"},
                                    WaitInput()},
                                   {}};

class SetRasterBandStatsCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const Turn turn(raster, Read<Waiting>("Wait"), GetIPC());
    const bool set = DispatchType(TenTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      const auto stats = Read<RasterBandStats<T>>("RasterBandStats");
      if (!source || stats.mask == StatsMask::None || stats.band >= source->Bands()) return false;
      source->SetBandStats(stats);
      return true;
    });
    return set ? Succeed() : Fail("RasterBandStats holds no statistics of a band of the raster");
  }
};

const CommandFactoryT<SetRasterBandStatsCommand> setStatsFactory(kSetStats);

const CommandDeclaration kSaveStats{
    "SaveRasterStatsCommand",
    "Statistics",
    "Stores the statistics of a raster through its data source.",
    {RasterURIInput(), WaitInput()},
    {{"Return", ValueKind::kBoolean, "they are stored, or the source has no place for them"},
     {"Fault", ValueKind::kText, "why they could not be stored; only then"}}};

class SaveRasterStatsCommand final : public SavingCommand {
  bool Save(BasicRaster& raster) override { return raster.WriteStats(); }
};

const CommandFactoryT<SaveRasterStatsCommand> saveRasterStatsFactory(kSaveStats);

}  // namespace
}  // namespace lumo
