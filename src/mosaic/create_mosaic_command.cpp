#include <filesystem>
#include <set>

#include <fmt/format.h>

#include "commands/division.h"
#include "data/access_policy.h"
#include "data/file_uri.h"
#include "foundation/fault.h"
#include "mosaic/match_mode.h"
#include "mosaic/mosaic_file.h"
#include "mosaic/mosaic_grid.h"
#include "mosaic/scene_raster.h"
#include "raster/pixel_value.h"
#include "raster/raster_command.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

const CommandDeclaration kCreate{
    "CreateMosaicCommand",
    "Mosaics",
    "Writes the definition file of a mosaic: its scenes, with what their headers say, and its "
    "grid. A command of this library's own.",
    {{"File", Presence::kRequired, ValueKind::kText,
      "the definition file, whose name ends in .vmosaic; one that is there is replaced"},
     {"Scenes", Presence::kRequired, ValueKind::kTextList,
      "files of rasters in their order; of pixels that several have the first one's are shown"},
     {"Place", Presence::kOptional, ValueKind::kText,
      "the path that the file will have once it has been moved; its paths are relative to that"},
     {"LikeURI", Presence::kOptional, ValueKind::kURI, "a raster whose grid the mosaic gets"},
     {"CoordSys", Presence::kOptional, ValueKind::kText,
      "coordinate system of the grid; that of the first scene when absent"},
     {"PixelSize", Presence::kOptional, ValueKind::kNumber,
      "of the grid; about that of the first scene when absent", "units of the system"},
     {"Reference", Presence::kOptional, ValueKind::kInteger,
      "number of the scene, from 0, that others are matched to; 0 when absent"},
     {"Unmatched", Presence::kOptional, ValueKind::kIntegerArray,
      "numbers of scenes that keep their colours"},
     {"MatchMode", Presence::kOptional, ValueKind::kWord,
      "Overlaps: scenes are matched where they overlap with the reference; Scenes: as wholes", "",
      &WordsIn<MatchMode>},
     {"Bins", Presence::kOptional, ValueKind::kWord,
      "bins of the histograms that colours are matched by. Told: those of floating-point numbers "
      "count hardly a value; Exact: every value",
      "", &WordsIn<Form>},
     {"ResamplingMethod", Presence::kOptional, ValueKind::kWord,
      "Nearest, Linear or Cubic, for scenes that don't lie on the grid", "",
      &WordsIn<PyramidResamplingMethod>},
     {"FeatherWidth", Presence::kOptional, ValueKind::kNumber,
      "width in which scenes go over into each other at seams; 0 when absent",
      "pixels of the mosaic"},
     {"NoData", Presence::kOptional, ValueKind::kNumber,
      "of pixels that no scene has; that of the first scene that has one when absent"},
     {"WorkingDirectory", Presence::kOptional, ValueKind::kText,
      "folder of footprints, tables and seams; that of the file when absent"}},
    {{"Scenes", ValueKind::kInteger, "how many there are"},
     {"Samples", ValueKind::kInteger, "of the mosaic"},
     {"Lines", ValueKind::kInteger, "of the mosaic"}}};

class CreateMosaicCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const std::string file = Read<String>("File").ToUTF8();
    if (!file.ends_with(kMosaicEnding)) return Fail(file + ": the name has to end in .vmosaic");
    if (!MayReachFile(file, true)) return Fail();
    place_ = HasInput("Place") ? Read<String>("Place").ToUTF8() : file;
    std::string fault;
    if (!ReadScenes(fault) || !ReadSettings(fault) || !ChooseGrid(fault) ||
        !WriteMosaicFile(file, document_, fault, place_)) {
      return Fail(fault);
    }
    Write("Scenes", document_.scenes.size());
    Write("Samples", document_.grid->Samples());
    Write("Lines", document_.grid->Lines());
    return Succeed();
  }

  bool ReadScenes(std::string& fault) {
    const auto names = Read<Array<String>>("Scenes");
    std::set<std::string> seen;
    unsigned done = 0;
    for (const String& name : names) {
      if (GetIPC().abort->IsSet()) {
        fault = "the making of the mosaic was aborted";
        return false;
      }
      MosaicScene scene;
      scene.file = name.ToUTF8();
      const bool isFile = IsThere(scene.file);
      if (isFile) scene.file = fs::absolute(scene.file).lexically_normal().string();
      if (!seen.insert(isFile ? FileURI(scene.file).ToUTF8() : scene.file).second) {
        fault = scene.file + ": the scene is there twice";
        return false;
      }
      if (IsMosaicFile(scene.file) && FileURI(scene.file).ToUTF8() == FileURI(place_).ToUTF8()) {
        fault = scene.file + ": the mosaic would be a scene of itself";
        return false;
      }
      if (!ReadScene(scene, fault)) return false;
      document_.scenes.push_back(std::move(scene));
      GetIPC().progress->Update(double(++done) / names.GetCount());
    }
    if (document_.scenes.empty()) fault = "Scenes: a mosaic has one scene at least";
    return !document_.scenes.empty();
  }

  static bool IsThere(const std::string& file) {
    std::error_code missing;
    return fs::exists(file, missing);
  }

  bool ReadScene(MosaicScene& scene, std::string& fault) {
    if (!document_.scenes.empty()) scene.header.format = document_.scenes.back().header.format;
    const BasicRasterPtr raster = OpenScene(scene, SceneThread::kThis);
    if (!raster) {
      fault = TakeFaultOr((scene.file + ": can't be opened").c_str()).ToUTF8();
      return false;
    }
    if (!ReadSceneHeader(*raster, scene, scene.header, fault)) return false;
    if (document_.scenes.empty()) {
      document_.bands = scene.header.bands;
      document_.dataType = scene.header.dataType;
      return true;
    }
    if (document_.bands == scene.header.bands && document_.dataType == scene.header.dataType) {
      return true;
    }
    fault =
        fmt::format("{}: the raster has {} bands of type {}, and the first scene {} of {}",
                    scene.file, scene.header.bands, DataTypeName(scene.header.dataType).ToUTF8(),
                    document_.bands, DataTypeName(document_.dataType).ToUTF8());
    return false;
  }

  bool ReadSettings(std::string& fault) {
    const auto scenes = static_cast<unsigned>(document_.scenes.size());
    document_.reference = HasInput("Reference") ? Read<unsigned>("Reference") : 0;
    if (document_.reference >= scenes) {
      fault = "Reference: there is no such scene";
      return false;
    }
    for (const unsigned scene : Read<Array<unsigned>>("Unmatched")) {
      if (scene >= scenes) {
        fault = "Unmatched: there is no such scene";
        return false;
      }
      document_.scenes[scene].matches = false;
    }
    document_.matchMode = static_cast<unsigned>(Read<MatchMode>("MatchMode"));
    document_.bins = Read<Form>("Bins");
    if (HasInput("ResamplingMethod")) {
      document_.resampling = Read<PyramidResamplingMethod>("ResamplingMethod");
    } else {
      document_.resampling = PyramidResamplingMethod::kNearest;
    }
    document_.featherWidth = HasInput("FeatherWidth") ? Read<double>("FeatherWidth") : 0;
    if (!(document_.featherWidth >= 0 && document_.featherWidth <= kMostFeatherWidth)) {
      fault = fmt::format("FeatherWidth: has to be 0 to {} pixels", kMostFeatherWidth);
      return false;
    }
    document_.workingDirectory =
        HasInput("WorkingDirectory")
            ? fs::absolute(Read<String>("WorkingDirectory").ToUTF8()).string()
            : fs::absolute(place_).parent_path().string();
    if (!document_.workingDirectory.ends_with('/')) document_.workingDirectory += '/';
    if (!IsThere(document_.workingDirectory)) {
      fault = document_.workingDirectory + ": no such folder";
      return false;
    }
    return ReadNoData(fault);
  }

  bool ReadNoData(std::string& fault) {
    if (HasInput("NoData")) {
      document_.noData = Read<double>("NoData");
      if (FitsPixel(document_.dataType, *document_.noData)) return true;
      fault = "NoData: the pixel type can't hold this value";
      return false;
    }
    for (const MosaicScene& scene : document_.scenes) {
      for (const std::optional<double>& value : scene.header.noData) {
        if (!value || !FitsPixel(document_.dataType, *value)) continue;
        document_.noData = value;
        return true;
      }
    }
    return true;
  }

  bool ChooseGrid(std::string& fault) {
    if (HasInput("LikeURI")) {
      const BasicRasterPtr like = FindRaster("LikeURI");
      const GeoRefPtr grid = like ? CloneOf(like->GetRasterDef().geoRef) : GeoRefPtr();
      if (!grid || grid->GetType() != GeoRef::kStd || grid->CoordinateSystem().IsEmpty()) {
        fault = like ? "LikeURI: the raster has no plain grid with a coordinate system"
                     : TakeFault().ToUTF8();
        return false;
      }
      grid->SetDimensions(like->Samples(), like->Lines());
      document_.grid = grid;
      return true;
    }
    MosaicGridWish wish;
    if (HasInput("CoordSys") && !wish.system.SetFromString(Read<String>("CoordSys"))) {
      fault = TakeFaultOr("CoordSys: no coordinate system").ToUTF8();
      return false;
    }
    wish.pixelSize = HasInput("PixelSize") ? Read<double>("PixelSize") : 0;
    if (HasInput("PixelSize") && !(wish.pixelSize > 0)) {
      fault = "PixelSize: has to be above 0";
      return false;
    }
    document_.grid = ChooseMosaicGrid(document_.scenes, wish, fault);
    return bool(document_.grid);
  }

  std::string place_;
  MosaicDocument document_;
};

const CommandFactoryT<CreateMosaicCommand> createMosaicFactory(kCreate);
const DivisionRegistration createMosaicDivision({.command = "CreateMosaicCommand",
                                                 .kind = DivisionKind::kFirst,
                                                 .makes = {"File"}});

}  // namespace
}  // namespace lumo
