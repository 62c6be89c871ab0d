#include "mosaic/mosaic_opening.h"

#include <algorithm>
#include <filesystem>

#include <fmt/format.h>

#include "data/access_policy.h"
#include "data/file_uri.h"
#include "foundation/fault.h"
#include "mosaic/scene_raster.h"
#include "views/sources/raster_decorator.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

/// Compares a scene with its file; reads its header anew where that has changed.
bool RefreshScene(MosaicScene& scene, const MosaicDocument& document, std::string& fault) {
  if (AreFilesLimited() && !MayUseSource(ConnStringsOf(scene), false)) {
    fault = TakeFault().ToUTF8();
    return false;
  }
  const std::string state = StateOfScene(scene);
  if (state == scene.header.state && !state.empty()) return true;
  const BasicRasterPtr raster = OpenScene(scene, SceneThread::kThis);
  if (!raster) {
    fault = TakeFaultOr("can't be opened").ToUTF8();
    return false;
  }
  if (!ReadSceneHeader(*raster, scene, scene.header, fault)) return false;
  if (scene.header.dataType == document.dataType && scene.header.bands == document.bands) {
    return true;
  }
  fault = fmt::format("{}: the raster has {} bands of type {} by now, and the mosaic {} of {}",
                      scene.file, scene.header.bands, DataTypeName(scene.header.dataType).ToUTF8(),
                      document.bands, DataTypeName(document.dataType).ToUTF8());
  return false;
}

/// A name for new tables, where no file is.
std::string FreeTables(const MosaicDocument& document, const std::string& path) {
  const std::string stem = fs::path(path).stem().string();
  for (unsigned number = 1;; ++number) {
    std::string base = fmt::format("{}{}_{}", document.workingDirectory, stem, number);
    std::error_code fault;
    if (!fs::exists(base + ".mlh", fault) && !fs::exists(base + ".mlt", fault)) return base;
  }
}

MosaicSettings SettingsOf(const MosaicDocument& document, const std::string& path) {
  MosaicSettings settings;
  settings.resampling = document.resampling;
  settings.reference = document.reference;
  settings.colourMatchMode = document.matchMode;
  settings.lutPath = String(FreeTables(document, path));
  settings.workingDirectory = String(document.workingDirectory);
  settings.bins = document.bins;
  settings.featherWidth = document.featherWidth;
  settings.noData = document.noData;
  settings.matchFlags.Resize(ArrayDims(static_cast<unsigned>(document.scenes.size())));
  for (unsigned i = 0; i < settings.matchFlags.GetCount(); ++i) {
    settings.matchFlags[i] = document.scenes[i].matches ? 1 : 0;
  }
  return settings;
}

/// The definition of a mosaic in a file.
template <typename T>
class FileMosaicRasterDef final : public MosaicRasterDef<T> {
 public:
  FileMosaicRasterDef(const std::string& path, const MosaicDocument& document,
                      const Array<RasterPtr<T>>& scenes)
      : MosaicRasterDef<T>(scenes, SettingsOf(document, path)),
        path_(path),
        tables_(document.tables),
        identity_(platform::IdentifyFile(path)) {
    for (unsigned i = 0; i < scenes.GetCount(); ++i) {
      const MosaicScene& scene = document.scenes[i];
      scenes_.push_back(scene);
      const String key = this->SceneKey(i);
      if (!scene.footprint.empty()) this->settings_.footprints[key] = String(scene.footprint);
      if (!scene.seam.empty()) this->settings_.seamFiles[key] = String(scene.seam);
    }
  }

  String TablesInUse() const override {
    const std::lock_guard lock(stateLock_);
    return String(tables_);
  }

  bool IsUpToDate() const override {
    const std::lock_guard lock(stateLock_);
    if (!(platform::IdentifyFile(path_) == identity_)) return false;
    return std::all_of(scenes_.begin(), scenes_.end(), [](const MosaicScene& scene) {
      return scene.header.state.empty() || StateOfScene(scene) == scene.header.state;
    });
  }

  bool Keep(std::string& reason) override {
    const MutexLock lock(this->Lock());
    const std::string made = this->settings_.lutPath.ToUTF8();
    std::error_code missing;
    const bool hasNewTables =
        fs::exists(made + ".mlh", missing) && fs::exists(made + ".mlt", missing);
    MosaicDocument kept;
    const auto merge = [&](MosaicDocument& document, std::string& fault) {
      if (document.scenes.size() != scenes_.size()) {
        fault = path_ + ": the definition has other scenes by now";
        return false;
      }
      for (unsigned i = 0; i < scenes_.size(); ++i) {
        MosaicScene& scene = document.scenes[i];
        if (scene.file != scenes_[i].file || scene.options != scenes_[i].options) {
          fault = path_ + ": the definition has other scenes by now";
          return false;
        }
        const String key = this->SceneKey(i);
        TakeOver(scene.footprint, this->settings_.footprints, key);
        TakeOver(scene.seam, this->settings_.seamFiles, key);
        scene.header = scenes_[i].header;
      }
      if (hasNewTables) document.tables = made;
      kept = document;
      return true;
    };
    if (!UpdateMosaicFile(path_, merge, reason)) return false;
    std::string older;
    {
      const std::lock_guard state(stateLock_);
      identity_ = platform::IdentifyFile(path_);
      if (hasNewTables) older = std::exchange(tables_, made);
    }
    if (hasNewTables) this->settings_.lutPath = String(FreeTables(kept, path_));
    if (!MosaicRasterDef<T>::Keep(reason)) return false;
    RemoveTables(older);  // which nobody begins to read any more
    return true;
  }

 private:
  /// Takes a side file over that is there.
  static void TakeOver(std::string& file, const Map<String, String>& files, const String& key) {
    std::error_code missing;
    const std::string made = files.Find(key).ToUTF8();
    if (!made.empty() && fs::is_regular_file(made, missing)) file = made;
  }
  static void RemoveTables(const std::string& base) {
    std::error_code ignored;
    if (base.empty()) return;
    fs::remove(base + ".mlh", ignored);
    fs::remove(base + ".mlt", ignored);
  }

  const std::string path_;
  std::vector<MosaicScene> scenes_;
  mutable std::mutex stateLock_;  // of what follows
  std::string tables_;            // in use
  platform::FileIdentity identity_;
};

RasterDef GridOf(const MosaicDocument& document) {
  RasterDef def;
  def.samples = document.grid->Samples();
  def.lines = document.grid->Lines();
  def.bands = document.bands;
  def.dataType = document.dataType;
  def.format = "EXTERNAL";
  if (document.noData) {
    for (unsigned band = 0; band < def.bands; ++band) def.noData[band] = *document.noData;
  }
  def.SetGeoRef(document.grid);
  return def;
}

/// False, with the fault, when a definition has itself among its scenes, or among theirs.
bool CheckLoops(const std::string& path, const MosaicDocument& document,
                std::vector<std::string>& above, std::string& fault) {
  above.push_back(FileURI(path).ToUTF8());
  for (const MosaicScene& scene : document.scenes) {
    if (!IsMosaicFile(scene.file)) continue;
    if (std::find(above.begin(), above.end(), FileURI(scene.file).ToUTF8()) != above.end()) {
      fault = scene.file + ": the mosaic is a scene of itself";
      return false;
    }
    MosaicDocument below;
    if (!ReadMosaicFile(scene.file, below, fault)) return false;
    if (!CheckLoops(scene.file, below, above, fault)) return false;
  }
  above.pop_back();
  return true;
}

/// Stands a mosaic on the source of a definition.
BasicRasterPtr DecorateMosaic(const BasicRasterPtr& plain, RasterDataConnection& source,
                              const URI& uri) {
  const std::string path = PathOfFileURI(source.URI());
  if (!IsMosaicFile(path)) return plain;
  MosaicDocument document;
  std::string fault;
  if (!LoadMosaic(path, document, fault)) {
    SetFault(fault);
    return {};
  }
  return MakeMosaicRaster(path, document, plain, uri.GetLength() != 0 ? uri : source.URI());
}

const bool isRegistered = RegisterRasterDecorator("EXTERNAL", &DecorateMosaic);

}  // namespace

bool LoadMosaic(const std::string& path, MosaicDocument& document, std::string& fault) {
  std::vector<std::string> above;
  if (!ReadMosaicFile(path, document, fault) || !CheckLoops(path, document, above, fault)) {
    return false;
  }
  for (MosaicScene& scene : document.scenes) {
    std::string why;
    if (RefreshScene(scene, document, why)) continue;
    fault = fmt::format("{}: scene {}", path, why);
    return false;
  }
  return true;
}

BasicRasterPtr MakeMosaicRaster(const std::string& path, const MosaicDocument& document,
                                const BasicRasterPtr& plain, const URI& uri) {
  BasicRasterPtr made;
  const auto open = std::make_shared<OpenScenes>(kMostOpenScenes);
  DispatchType(EightTypes{}, document.dataType, [&]<typename T>() {
    Array<RasterPtr<T>> scenes{ArrayDims(static_cast<unsigned>(document.scenes.size()))};
    for (unsigned i = 0; i < scenes.GetCount(); ++i) {
      scenes[i].Reset(new SceneRaster<T>(document.scenes[i], i, open));
    }
    const MosaicRasterDefPtr<T> definition(new FileMosaicRasterDef<T>(path, document, scenes));
    made.Reset(new MosaicRaster<T>(definition, GridOf(document), RasterPtr<T>(plain), uri));
    return true;
  });
  return made;
}

}  // namespace lumo
