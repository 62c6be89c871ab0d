#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "mosaic/colour_table.h"
#include "mosaic/mosaic_raster_def.h"
#include "mosaic/scene_pool.h"

namespace lumo {

/// The colour tables of a mosaic's scenes, out of its table files. Those used last are kept. The
/// reference scene, to which the others are matched, has its values as they are. Exists for
/// EightTypes.
///
/// Threads: any number.
template <typename T>
class SceneTables {
 public:
  using Tables = std::shared_ptr<const std::vector<ColourTable<T>>>;

  /// @param noData  a value that no pixel may get.
  SceneTables(const BasicMosaicRasterDef& definition, const MosaicSideFiles& files, unsigned bands,
              std::optional<T> noData);

  /// The tables of a scene's bands; an empty list where there are none. Null, with the fault set,
  /// when the files can't be read, or are of other scenes or bands.
  Tables Of(unsigned scene);

 private:
  Tables Read(unsigned scene) const;

  static constexpr std::size_t kKeptBytes = std::size_t{48} << 20;
  static std::size_t RoomFor(unsigned bands);

  const std::string base_;
  const Form bins_;
  const unsigned scenes_;
  const unsigned reference_;
  const unsigned bands_;
  const std::optional<T> noData_;
  const Tables none_ = std::make_shared<const std::vector<ColourTable<T>>>();
  RecentScenes<Tables> kept_;
};

VEXG_EXTERN_HIDDEN(EIGHT, SceneTables);

}  // namespace lumo
