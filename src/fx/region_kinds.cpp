#include "fx/region_kinds.h"

#include "foundation/type_code.h"

namespace lumo {

template <typename Kind>
const unsigned RegionMapOf<Kind>::TypeCode =
    GloballyUniqueObjectTypeCode(String(std::string(Kind::kName) + "Map"));
template <typename Kind>
const unsigned RegionFileOf<Kind>::TypeCode =
    GloballyUniqueObjectTypeCode(String(std::string(Kind::kName) + "File"));

template class RegionMapOf<RegionMeans>;
template class RegionFileOf<RegionMeans>;
template class RegionMapOf<SpectralRegionAttributes>;
template class RegionFileOf<SpectralRegionAttributes>;
template class RegionMapOf<TextureRegionAttributes>;
template class RegionFileOf<TextureRegionAttributes>;
template class RegionMapOf<SpatialRegionAttributes>;
template class RegionFileOf<SpatialRegionAttributes>;

const unsigned RegionClassificationProbabilityMap::TypeCode =
    GloballyUniqueObjectTypeCode("RegionClassificationProbabilityMap");
const unsigned RegionClassificationProbabilityFile::TypeCode =
    GloballyUniqueObjectTypeCode("RegionClassificationProbabilityFile");

bool RegionClassificationProbabilityMap::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || RegionAttributesMap::IsA(typeCode);
}

bool RegionClassificationProbabilityFile::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || RegionAttributesFile::IsA(typeCode);
}

}  // namespace lumo
