#include "mosaic/scene_tables.h"

#include <algorithm>

#include "foundation/fault.h"

namespace lumo {

template <typename T>
SceneTables<T>::SceneTables(const BasicMosaicRasterDef& definition, unsigned bands,
                            std::optional<T> noData)
    : base_(definition.TablesInUse().ToUTF8()),
      bins_(definition.Bins()),
      scenes_(definition.SceneCount()),
      bands_(bands),
      noData_(noData),
      kept_(RoomFor(bands)) {}

template <typename T>
std::size_t SceneTables<T>::RoomFor(unsigned bands) {
  constexpr std::size_t kOne = sizeof(T) <= 2 ? (std::size_t{1} << (8 * sizeof(T))) * sizeof(T)
                                              : std::size_t{65536} * sizeof(double);
  return std::clamp<std::size_t>(kKeptBytes / (kOne * std::max(bands, 1U)), 2, 64);
}

template <typename T>
typename SceneTables<T>::Tables SceneTables<T>::Of(unsigned scene) {
  if (base_.empty()) return none_;
  return kept_.Get(scene, [&] { return Read(scene); });
}

template <typename T>
typename SceneTables<T>::Tables SceneTables<T>::Read(unsigned /*scene*/) const {
  return none_;
}

VEXG_INSTANCES(EIGHT, SceneTables);

}  // namespace lumo
