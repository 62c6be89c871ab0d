#include "regions/roi_changes.h"

#include "regions/pixel_address_roi_def.h"

namespace lumo {
namespace {

std::uint64_t ChangesOfPixels(const PixelAddressROIDef& definition) {
  std::uint64_t changes = definition.GridRevision();
  for (unsigned row = 0; row < definition.TileRows(); ++row) {
    for (unsigned column = 0; column < definition.TileColumns(); ++column) {
      const PixelAddressTilePtr tile = definition.Tile(row, column);
      if (tile) changes += tile->Revision();
    }
  }
  return changes;
}

}  // namespace

std::uint64_t ChangesOf(const ROIDefPtr& definition) {
  if (const PixelAddressROIDefPtr pixels{definition}) return ChangesOfPixels(*pixels);
  if (const GeometryROIDefPtr shapes{definition}) {
    std::uint64_t changes = 0;
    if (shapes->Geometry()) shapes->Geometry()->ReadChanges(changes);
    return changes;
  }
  const GroupROIDefPtr group{definition};
  if (!group) return 0;
  std::uint64_t changes = group->Revision();
  for (const ROIDefPtr& child : group->Children()) changes += ChangesOf(child);
  return changes;
}

}  // namespace lumo
