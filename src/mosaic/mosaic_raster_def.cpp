#include "mosaic/mosaic_raster_def.h"

#include <filesystem>

#include "foundation/type_code.h"
#include "mosaic/match_mode.h"

namespace lumo {

std::span<const EnumWord<MatchMode>> WordsOf(MatchMode) {
  static constexpr EnumWord<MatchMode> kWords[] = {{"Overlaps", MatchMode::kOverlaps},
                                                   {"Scenes", MatchMode::kScenes}};
  return kWords;
}

const unsigned BasicMosaicRasterDef::TypeCode =
    GloballyUniqueObjectTypeCode("BasicMosaicRasterDef");

/// A name that others may ask for; no class of this library has it.
[[maybe_unused]] const unsigned kFastMosaicRaster =
    GloballyUniqueObjectTypeCode("FastMosaicRaster");

BasicMosaicRasterDef::BasicMosaicRasterDef(MosaicSettings settings)
    : settings_(std::move(settings)) {}

String BasicMosaicRasterDef::TablesInUse() const {
  std::error_code fault;
  const std::string path = settings_.lutPath.ToUTF8();
  return !path.empty() && std::filesystem::exists(path + ".mlh", fault) ? settings_.lutPath
                                                                        : String();
}

bool BasicMosaicRasterDef::Keep(std::string& /*reason*/) {
  ++revision_;
  const std::shared_ptr<const MosaicSideFiles> files = TakeSideFiles();
  const std::lock_guard lock(sideFilesLock_);
  sideFiles_ = files;
  return true;
}

std::shared_ptr<const MosaicSideFiles> BasicMosaicRasterDef::TakeSideFiles() {
  const auto files = std::make_shared<MosaicSideFiles>();
  files->revision = revision_;
  files->footprints = settings_.footprints;
  files->seamFiles = settings_.seamFiles;
  files->tables = TablesInUse();
  files->lutPath = settings_.lutPath;
  return files;
}

std::shared_ptr<const MosaicSideFiles> BasicMosaicRasterDef::SideFiles() {
  const std::lock_guard lock(sideFilesLock_);
  if (!sideFiles_) sideFiles_ = TakeSideFiles();
  return sideFiles_;
}

template <typename T>
const unsigned MosaicRasterDef<T>::TypeCode = GloballyUniqueObjectTypeCode(
    String("MosaicRasterDef<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

template <typename T>
MosaicRasterDef<T>::MosaicRasterDef(const Array<RasterPtr<T>>& scenes, MosaicSettings settings)
    : BasicMosaicRasterDef(std::move(settings)), scenes_(scenes) {
  Array<unsigned> flags{ArrayDims(scenes.GetCount())};
  for (unsigned i = 0; i < flags.GetCount(); ++i) {
    flags[i] = i < settings_.matchFlags.GetCount() ? settings_.matchFlags[i] : 1;
  }
  settings_.matchFlags = flags;
}

template <typename T>
String MosaicRasterDef<T>::SceneKey(unsigned scene) const {
  return scenes_[scene] ? String(scenes_[scene]->GetURI()) : String();
}

template <typename T>
RasterPtr<T> MosaicRasterDef<T>::ReferenceScene() const {
  return settings_.reference < scenes_.GetCount() ? scenes_[settings_.reference] : RasterPtr<T>();
}

VEXG_INSTANCES(EIGHT, MosaicRasterDef);

}  // namespace lumo
