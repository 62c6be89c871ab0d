#pragma once

#include <algorithm>
#include <memory>
#include <string>

#include "mosaic/mosaic_file.h"
#include "mosaic/scene_pool.h"
#include "views/computed_raster.h"

namespace lumo {

/// The scenes of one mosaic that are open; the one used longest ago is closed for another.
using OpenScenes = RecentScenes<BasicRasterPtr>;
/// The file of a scene out of the text of its URI, the key of footprints and seams.
VEXG_EXPORT std::string SceneFileOf(const String& key);

/// How many scenes of a mosaic are open at once, beside those that are just being read.
inline constexpr unsigned kMostOpenScenes = 64;

/// Where the source of a scene lives.
enum class SceneThread {
  kOwn,   ///< on a thread of its own, as all sources that are shared
  kThis,  ///< on this thread, which lets go of it too: for a look at its header
};

/// Opens a scene, with the pyramid file beside it where that is one of it.
/// @return empty, with the fault set, when it can't be opened, or isn't of a type of EightTypes.
VEXG_EXPORT BasicRasterPtr OpenScene(const MosaicScene& scene,
                                     SceneThread thread = SceneThread::kOwn);

/// The header of an open scene. False, with the fault, when it can't be part of a mosaic: it has no
/// geo-reference or no coordinate system.
VEXG_EXPORT bool ReadSceneHeader(const BasicRaster& raster, const MosaicScene& scene,
                                 MosaicSceneHeader& header, std::string& fault);

/// Shows a scene of a definition. Its header is at hand; its source is opened when pixels are read,
/// and closed when others are needed more. Exists for EightTypes.
///
/// Statistics and histograms are its own. Its identifier is that of the file with "//scene" behind
/// it, which the raster of a file that was opened plainly doesn't have.
///
/// Ownership: shares the open scenes of its mosaic.
/// Threads:   every operation may run on many threads at once.
/// Failure:   a source that can't be opened, or is another one than the header says, makes blocks
///            fail, with the fault set. Nothing can be written.
template <typename T>
class SceneRaster final : public ComputedRaster<T> {
 public:
  /// @param number  of the scene in its mosaic.
  SceneRaster(const MosaicScene& scene, unsigned number, std::shared_ptr<OpenScenes> open);
  ~SceneRaster() override { this->StopComputing(); }

  bool IsValid() const override { return Object::IsValid() && def_.samples != 0; }
  URI GetURI() const override;
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override { return def_; }
  bool PyramidExists() const override { return level_ == 0 && scene_.header.levelMax != 0; }
  PyramidDef GetPyramidDef() const override;
  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }
  unsigned Bands() const override { return def_.bands; }
  bool HasNoDataValue(unsigned band) const override;
  T NoDataValue(unsigned band) const override;
  bool HasPalette(unsigned band) const override {
    return std::find(scene_.header.palettes.begin(), scene_.header.palettes.end(), band) !=
           scene_.header.palettes.end();
  }
  PalettePtr Palette(unsigned band) const override;
  lumo::TileDimensions TileDimensions() const override;

  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned level) override { return PyramidLevel(level); }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect&, const Array<unsigned>&, Interleave, Array<T>&,
                  Array<unsigned char>&) override {
    return false;
  }

 private:
  SceneRaster(const SceneRaster& base, unsigned level);
  RasterPtr<T> Source() const;

  MosaicScene scene_;
  unsigned number_;
  unsigned level_ = 0;
  std::shared_ptr<OpenScenes> open_;
  RasterDef def_;
};

VEXG_EXTERN(EIGHT, SceneRaster);

}  // namespace lumo
