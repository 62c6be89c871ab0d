#pragma once

#include "foundation/fault.h"
#include "mosaic/mosaic_raster.h"
#include "mosaic/scene_shares.h"
#include "raster/raster_command.h"

namespace lumo {

/// Helps commands that work on the definition of a mosaic to find it.
class MosaicCommand : public RasterCommand {
 protected:
  /// Calls `work(mosaic)` with the mosaic of the input MosaicURI, a MosaicRasterPtr<T>, and gives
  /// its result. It holds the definition's lock meanwhile, and has the definition stored after a
  /// success. False, with the fault set, when there is no such mosaic.
  /// @param storing  kNothing for work that changes nothing.
  enum class Storing { kDefinition, kNothing };
  template <typename Work>
  bool OnMosaic(const Work& work, Storing storing = Storing::kDefinition) {
    const BasicRasterPtr raster = FindRaster("MosaicURI");
    if (!raster) return false;
    bool isDone = false;
    const bool isKnown = DispatchType(EightTypes{}, raster->DataType(), [&]<typename T>() {
      isDone = OnTyped<T>(raster, work, storing);
      return true;
    });
    if (!isKnown) SetFault("MosaicURI: a raster of this pixel type is no mosaic");
    return isDone;
  }

  /// Reads the inputs of work that may be done in shares of the scenes.
  /// @param what  says of which work.
  template <typename T>
  bool BeginShares(const char* what, const MosaicRasterDef<T>& definition,
                   SceneShares& shares) const {
    const ShareInputs inputs{HasInput(kShareInput), Read<Array<unsigned>>(kShareInput),
                             Read<String>(kShareFileInput), Read<Array<String>>(kShareFilesInput)};
    std::string key = what;
    for (unsigned i = 0; i < definition.SceneCount(); ++i) {
      key.append(" ").append(definition.SceneKey(i).ToUTF8());
    }
    return shares.Begin(inputs, key, definition.SceneCount());
  }

  /// Stores the output Success, and ends the command by it.
  CommandResult End(bool isDone) {
    Write("Success", isDone);
    return isDone ? Succeed() : Fail(TakeFaultOr("the work on the mosaic failed"));
  }

 private:
  template <typename T, typename Work>
  bool OnTyped(const BasicRasterPtr& raster, const Work& work, Storing storing) {
    const MosaicRasterPtr<T> mosaic(LevelOf(RasterPtr<T>(raster)));
    if (!mosaic || !mosaic->IsValid() || !mosaic->Definition()) {
      SetFault("MosaicURI: the raster is no mosaic");
      return false;
    }
    const MutexLock lock(mosaic->Definition()->Lock());
    if (!work(mosaic)) return false;
    if (storing == Storing::kNothing) return true;
    std::string reason;
    if (mosaic->Definition()->Keep(reason)) return true;
    SetFault(String(reason));
    return false;
  }

  /// The pyramid level that the input Level names, or the raster itself.
  template <typename T>
  RasterPtr<T> LevelOf(const RasterPtr<T>& raster) {
    const unsigned level = HasInput("Level") ? Read<unsigned>("Level") : 0;
    const PyramidDef pyramid = raster->GetPyramidDef();
    const bool isThere = level != 0 && level >= pyramid.levelMin && level <= pyramid.levelMax;
    return isThere ? raster->PyramidLevel(level) : raster;
  }
};

}  // namespace lumo
