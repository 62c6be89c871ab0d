#include "pyramid/reduced_levels_body.h"

namespace lumo {

std::vector<Array<unsigned>> GroupsOfBands(unsigned bands, unsigned side) {
  const unsigned together = TilingOf(bands, side).bands;
  std::vector<Array<unsigned>> groups;
  for (unsigned first = 0; first < bands; first += together) {
    groups.emplace_back(ArrayDims(together));
    for (unsigned i = 0; i < together; ++i) groups.back()[i] = first + i;
  }
  return groups;
}

VEXG_INSTANCES(TWELVE, ReducedLevels);

}  // namespace lumo
