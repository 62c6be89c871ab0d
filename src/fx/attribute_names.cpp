#include "fx/attribute_names.h"

#include "fx/region_kinds.h"

namespace lumo {

std::span<const AttributeName> NamesOf(AttributeKind kind) {
  static constexpr AttributeName kSpectral[] = {
      {"mean"}, {"std"}, {"min"}, {"max"}, {"count", true}};
  static constexpr AttributeName kTexture[] = {{"texture_range"},
                                               {"texture_mean"},
                                               {"texture_variance"},
                                               {"texture_entropy"},
                                               {"texture_count", true}};
  static constexpr AttributeName kMeans[] = {{"mean"}, {"count", true}};
  static constexpr AttributeName kEntropy[] = {{"texture_entropy_n"}, {"texture_count", true}};
  static constexpr AttributeName kShape[] = {{"area"},
                                             {"perimeter"},
                                             {"compactness"},
                                             {"convexity"},
                                             {"solidity"},
                                             {"roundness"},
                                             {"form_factor"},
                                             {"elongation"},
                                             {"rectangular_fit"},
                                             {"main_direction"},
                                             {"major_length"},
                                             {"minor_length"},
                                             {"hole_count", true},
                                             {"hole_to_solid_ratio"}};
  switch (kind) {
    case AttributeKind::kTexture:
      return kTexture;
    case AttributeKind::kMeans:
      return kMeans;
    case AttributeKind::kEntropy:
      return kEntropy;
    case AttributeKind::kShape:
      return kShape;
    default:
      return kSpectral;
  }
}

std::string ColumnName(AttributeKind kind, const AttributeName& attribute, unsigned band) {
  std::string name = attribute.name;
  if (kind != AttributeKind::kShape) name.append("_b").append(std::to_string(band));
  return name;
}

bool FindKind(const std::string& path, unsigned attributes, AttributeKind& kind) {
  switch (attributes) {
    case SpectralRegionAttributes::kAttributes:
      kind = path.ends_with(".texture.fxa") ? AttributeKind::kTexture : AttributeKind::kSpectral;
      return true;
    case RegionMeans::kAttributes:
      kind = path.ends_with(".entropy.fxa") ? AttributeKind::kEntropy : AttributeKind::kMeans;
      return true;
    case SpatialRegionAttributes::kAttributes:
      kind = AttributeKind::kShape;
      return true;
    default:
      return false;
  }
}

}  // namespace lumo
