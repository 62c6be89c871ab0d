#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "commands/value_text.h"
#include "foundation/containers.h"
#include "raster/raster.h"

namespace lumo {

/// Holds what is known of a mosaic beside its scenes: how they are matched, where their side files
/// lie, and how pixels are made of them.
struct MosaicSettings {
  /// Names how the pixels of a scene get into the grid of the mosaic, where it isn't on the grid.
  PyramidResamplingMethod resampling = PyramidResamplingMethod::kNearest;
  unsigned reference = 0;          ///< number of the scene that the others are matched to
  unsigned colourMatchMode = 0;    ///< 0: match in overlaps, 1: match whole scenes
  Array<unsigned> matchFlags;      ///< one for each scene, not 0: it takes part; shorter: 1
  String lutPath;                  ///< base of the names of the `.mlh` and the `.mlt` file
  Map<String, String> footprints;  ///< text of a scene's URI to its footprint file
  Map<String, String> seamFiles;   ///< text of a scene's URI to its `.emp` file
  String workingDirectory;         ///< prefix of side files, ends with the separator
  Form bins = Form::kTold;         ///< rule of the histograms that scenes are matched by
  double featherWidth = 0;         ///< pixels of the mosaic, across a seam; 0 for a sharp one
  std::optional<double> noData;    ///< of pixels without a scene, in all bands
};

/// Holds the names of the files that pixels of a mosaic are made with, as they were at one moment.
struct MosaicSideFiles {
  std::uint64_t revision = 0;      ///< of the definition
  Map<String, String> footprints;  ///< see MosaicSettings
  Map<String, String> seamFiles;   ///< see MosaicSettings
  String tables;                   ///< see BasicMosaicRasterDef::TablesInUse
  String lutPath;                  ///< where the next tables go
};

/// Holds all of a mosaic's definition that doesn't depend on the type of its pixels.
///
/// Threads: Lock() is held for a whole run of a command that changes the maps; readers of a map
///          hold it as well. Who reads pixels meanwhile goes by SideFiles, which change with Keep
///          alone. The rest doesn't change.
class VEXG_EXPORT BasicMosaicRasterDef : public Object {
 public:
  static const unsigned TypeCode;

  explicit BasicMosaicRasterDef(MosaicSettings settings);
  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || Object::IsA(typeCode);
  }

  /// The mutex of the definition: `const MutexLock lock(definition->Lock());`.
  virtual std::recursive_mutex& Lock() const { return lock_; }

  virtual unsigned SceneCount() const = 0;
  /// The text of a scene's URI, the key of Footprints and SeamFiles.
  virtual String SceneKey(unsigned scene) const = 0;
  /// The number of the scene that the others are matched to.
  unsigned ReferenceIndex() const { return settings_.reference; }
  unsigned ColourMatchMode() const { return settings_.colourMatchMode; }
  /// One for each scene; not 0 where it takes part in matching.
  const Array<unsigned>& MatchFlags() const { return settings_.matchFlags; }
  const String& LutPath() const { return settings_.lutPath; }
  Map<String, String>& Footprints() { return settings_.footprints; }
  Map<String, String>& SeamFiles() { return settings_.seamFiles; }
  const String& WorkingDirectory() const { return settings_.workingDirectory; }
  Form Bins() const { return settings_.bins; }
  const MosaicSettings& Settings() const { return settings_; }

  /// The base of the table files that pixels are made with; no text while there are none. LutPath
  /// is where the next tables go.
  virtual String TablesInUse() const;
  /// False when the files that the definition came from have changed since.
  virtual bool IsUpToDate() const { return true; }

  /// Stores the definition once footprints, tables or seams have come in, and has the mosaic's
  /// pixels made with them from then on. A definition in memory alone has nothing to store.
  /// @param reason  [out] why it can't be stored, in one line.
  virtual bool Keep(std::string& reason);
  /// The files that pixels are made with, as of the last Keep or the first call, which comes before
  /// any command that changes them.
  std::shared_ptr<const MosaicSideFiles> SideFiles();
  /// How often Keep has been called: pixels that were made before may be other ones now.
  std::uint64_t Revision() const { return revision_; }

 protected:
  MosaicSettings settings_;

 private:
  std::shared_ptr<const MosaicSideFiles> TakeSideFiles();

  mutable std::recursive_mutex lock_;
  std::mutex sideFilesLock_;
  std::shared_ptr<const MosaicSideFiles> sideFiles_;
  std::atomic<std::uint64_t> revision_{0};
};

using BasicMosaicRasterDefPtr = Pointer<BasicMosaicRasterDef>;

/// Defines a mosaic: its scenes in their order, and what BasicMosaicRasterDef holds. Exists for
/// EightTypes.
///
///     Array<RasterPtr<float>> scenes{ArrayDims(2)};
///     …
///     MosaicSettings settings;
///     settings.workingDirectory = "/tmp/";
///     const MosaicRasterDefPtr<float> definition(new MosaicRasterDef<float>(scenes, settings));
///
/// Ownership: shares the scenes. It lasts as long as a raster or a command holds it.
template <typename T>
class MosaicRasterDef : public BasicMosaicRasterDef {
 public:
  static const unsigned TypeCode;

  /// @param scenes  in the order of the mosaic; they may open their files when they are read.
  MosaicRasterDef(const Array<RasterPtr<T>>& scenes, MosaicSettings settings);
  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || BasicMosaicRasterDef::IsA(typeCode);
  }

  unsigned SceneCount() const override { return scenes_.GetCount(); }
  String SceneKey(unsigned scene) const override;
  const Array<RasterPtr<T>>& Scenes() const { return scenes_; }
  /// The scene that the others are matched to; empty without scenes.
  RasterPtr<T> ReferenceScene() const;
  /// The overlaps of scenes that have been needed, by the texts of both scenes' identities.
  Map<String, RasterPtr<T>>& Overlaps() { return overlaps_; }

 private:
  Array<RasterPtr<T>> scenes_;
  Map<String, RasterPtr<T>> overlaps_;
};

VEXG_EXTERN(EIGHT, MosaicRasterDef);

template <typename T>
using MosaicRasterDefPtr = Pointer<MosaicRasterDef<T>>;

}  // namespace lumo
