#pragma once

#include <span>
#include <string>

#include "platform/export.h"

namespace lumo {

/// A kind of store of regions, as the names of its attributes tell it.
enum class AttributeKind { kSpectral, kTexture, kMeans, kEntropy, kShape };

/// Says how an attribute is called in tables, and whether it is a whole number.
struct AttributeName {
  const char* name;
  bool isWhole = false;
};

/// The names of the attributes of a kind in their order, without the mark of presence at the end of
/// shapes.
VEXG_EXPORT std::span<const AttributeName> NamesOf(AttributeKind kind);

/// The name of a column: that of the attribute, and the band behind it where there are bands.
VEXG_EXPORT std::string ColumnName(AttributeKind kind, const AttributeName& attribute,
                                   unsigned band);

/// The kind of a store: by its number of attributes and, where that leaves several, by the ending
/// of its name, as "scene.texture.fxa". Of 5 attributes kSpectral unless the name says otherwise.
/// @return false for another number.
VEXG_EXPORT bool FindKind(const std::string& path, unsigned attributes, AttributeKind& kind);

}  // namespace lumo
