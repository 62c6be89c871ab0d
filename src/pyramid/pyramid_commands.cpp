#include <mutex>

#include <fmt/format.h>

#include "commands/share_scope.h"
#include "foundation/fault.h"
#include "pyramid/exact_levels.h"
#include "pyramid/reduced_levels.h"
#include "raster/level_reduction.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"

namespace lumo {
namespace {

constexpr const char* kGroup = "Pyramids";

const CommandDeclaration kGet{
    "GetRasterPyramidCommand",
    kGroup,
    "Gives a level of the pyramid of a raster as a raster of its own.",
    {RasterURIInput(),
     {"Level", Presence::kRequired, ValueKind::kInteger,
      "halves samples and lines so many times; 0 is the size of the raster"},
     {"Placing", Presence::kOptional, ValueKind::kWord,
      "Told: pixels grow by the whole part of the quotient of the sizes; Exact: by 2^Level, as the "
      "level's pixel x is the raster's pixel x * 2^Level",
      "", &WordsIn<Form>}},
    {{"PyramidURI", ValueKind::kURI, "the level, by which further commands find it"}}};

class GetRasterPyramidCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const auto number = Read<unsigned>("Level");
    const ExactLevels exactly(HasInput("Placing") && Read<Form>("Placing") == Form::kExact);
    BasicRasterPtr level;
    DispatchType(TwelveTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> typed(raster);
      if (typed) level = typed->PyramidLevel(number);
      return bool(level);
    });
    if (!level || !level->IsValid()) return Fail("the raster has no pyramid");
    if (level->Samples() == 0 || level->Lines() == 0) {
      return Fail(String("the pyramid has no pixels at level " + std::to_string(number)));
    }
    CatalogAdd(level);
    Write("PyramidURI", level->GetURI());
    return Succeed();
  }
};

const CommandFactoryT<GetRasterPyramidCommand> getRasterPyramidFactory(kGet);

/// Carries the progress of a build to a command, and the abort of the command to the build.
class BuildObserver final : public AsyncCallback {
 public:
  explicit BuildObserver(const IPC& ipc) : ipc_(ipc) {}

  /// Chooses the build that is to be aborted; empty for none any more.
  void Watch(const AsyncPtr& build) {
    {
      const std::lock_guard lock(lock_);
      build_ = build;
    }
    PassAbort();
  }

  void OnProgress(double progress) override {
    ipc_.progress->Update(progress);
    PassAbort();
  }

 private:
  void PassAbort() {
    const std::lock_guard lock(lock_);
    if (build_ && ipc_.abort->IsSet() && !build_->IsAborted()) build_->Abort();
  }

  const IPC ipc_;
  std::mutex lock_;
  AsyncPtr build_;
};

const CommandDeclaration kBuild{
    "BuildRasterPyramidCommand",
    kGroup,
    "Builds the pyramid of a raster, with its statistics and a histogram, where it was opened.",
    WithShareInputs(
        {RasterURIInput(),
         {"PyramidType", Presence::kRequired, ValueKind::kWord,
          "ORVA: a file of the library's own; DRIVER: by the driver of the format", "",
          &WordsIn<PyramidType>},
         {"PyramidResamplingMethod", Presence::kRequired, ValueKind::kWord,
          "Impl, Nearest, Linear, Cubic or Majority; ORVA takes every 2^level-th pixel", "",
          &WordsIn<PyramidResamplingMethod>},
         {"PyramidLevelMin", Presence::kRequired, ValueKind::kInteger, "first level; 0 is a copy"},
         {"PyramidLevelMax", Presence::kRequired, ValueKind::kInteger, "last level, up to 31"},
         {"PyramidCanBuild", Presence::kRequired, ValueKind::kBoolean,
          "of the description; not read"},
         {"TileDimensions", Presence::kRequired, ValueKind::kTiles,
          "the levels are stored in squares of this height; of 9 bands and more in squares of 256"},
         {"Bins", Presence::kOptional, ValueKind::kWord,
          "of the histogram. Told: each a whole number wide, 256 at most; Exact: 256 that share "
          "the range of the values, or one for each of fewer integers",
          "", &WordsIn<Form>},
         {"Reduction", Presence::kOptional, ValueKind::kWord,
          "in place of the resampling method. Told: that; Average: means of the valid pixels "
          "below; Mode: the most frequent ones",
          "", &WordsIn<LevelReduction>}}),
    {}};

class BuildRasterPyramidCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    PyramidDef def;
    def.pyramidType = Read<PyramidType>("PyramidType");
    def.resamplingMethod = Read<PyramidResamplingMethod>("PyramidResamplingMethod");
    if (const auto method = MethodOf(Read<LevelReduction>("Reduction"))) {
      def.resamplingMethod = *method;
    }
    def.levelMin = Read<unsigned>("PyramidLevelMin");
    def.levelMax = Read<unsigned>("PyramidLevelMax");
    def.canBuild = Read<bool>("PyramidCanBuild");
    def.bins = Read<Form>("Bins");
    const auto tiles = Read<TileDimensions>("TileDimensions");
    ShareScope shares;
    if (!shares.Begin({HasInput(kShareInput), Read<Array<unsigned>>(kShareInput),
                       Read<String>(kShareFileInput), Read<Array<String>>(kShareFilesInput)},
                      KeyOfShares(*raster, def, tiles))) {
      return Fail();
    }

    auto* const observer = new BuildObserver(GetIPC());
    const AsyncCallbackPtr callback(observer);
    const AsyncPtr build = raster->PyramidBuild(def, tiles, callback);
    if (!build) return Fail(TakeFaultOr("no build of the pyramid could be started"));
    observer->Watch(build);
    build->WaitFinished();
    observer->Watch(AsyncPtr());
    if (build->HasError()) {
      raster->PyramidAsync();  // sets the fault
      return Fail(TakeFaultOr("the build of the pyramid failed"));
    }
    if (build->IsAborted()) return Fail("the build was aborted");
    return shares.End() ? Succeed() : Fail();
  }

  static std::string KeyOfShares(const BasicRaster& raster, const PyramidDef& def,
                                 const TileDimensions& tiles) {
    return fmt::format("pyramid {} {} {} {} {} {} {} {}",
                       static_cast<unsigned>(def.resamplingMethod), def.levelMin, def.levelMax,
                       tiles.height, raster.DataType(), raster.Bands(), raster.Samples(),
                       raster.Lines());
  }
};

const CommandFactoryT<BuildRasterPyramidCommand> buildFactory(kBuild);

/// Drivers make their levels themselves; bands that are stored apart are read along Z, unless means
/// or modes are made of them.
std::string WhyNotShared(const DivisionInputs& inputs, unsigned bands) {
  const auto input = [&](const char* name) {
    const std::string* const text = inputs(name);
    return text != nullptr ? *text : std::string();
  };
  if (input("PyramidType") != "ORVA") return "the driver of the format makes the levels";
  const bool isReduced =
      MethodOf(ParseValue<LevelReduction>(String(input("Reduction")))).has_value();
  const bool isApart = GroupsOfBands(bands, 1).size() > 1;
  return isReduced || !isApart
             ? ""
             : "every 2^level-th pixel of more than 8 bands is taken band by band";
}

const DivisionRegistration buildDivision({.command = "BuildRasterPyramidCommand",
                                          .kind = DivisionKind::kShares,
                                          .source = "URI",
                                          .whyNot = &WhyNotShared});

const CommandDeclaration kRefresh{
    "RefreshRasterPyramidCommand",
    kGroup,
    "Has a raster show the levels that its pyramid holds by now.",
    {RasterURIInput()},
    {{"Return", ValueKind::kBoolean, "it has a pyramid that could be looked at"}}};

class RefreshRasterPyramidCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    Write("Return", raster->PyramidRefresh());
    return Succeed();
  }
};

const CommandFactoryT<RefreshRasterPyramidCommand> refreshFactory(kRefresh);

const CommandDeclaration kDelete{"DeleteRasterPyramidCommand",
                                 kGroup,
                                 "Removes the pyramid of a raster.",
                                 {RasterURIInput()},
                                 {{"Return", ValueKind::kBoolean, "it is gone"},
                                  {"Fault", ValueKind::kText, "why it is not; only then"}}};

class DeleteRasterPyramidCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    TakeFault();
    const bool isGone = raster->PyramidDelete();
    const String fault = TakeFault();
    Write("Return", isGone);
    if (!isGone && fault.GetLength() != 0) Write("Fault", fault);
    return Succeed();
  }
};

const CommandFactoryT<DeleteRasterPyramidCommand> deleteFactory(kDelete);

}  // namespace
}  // namespace lumo
