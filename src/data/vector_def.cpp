#include "data/vector_def.h"

namespace lumo {

VectorDef::VectorDef(const VectorDef& other)
    : geometry(other.geometry),
      format(other.format),
      geoRef(CloneOf(other.geoRef)),
      dataType(other.dataType),
      features(other.features),
      bounds(other.bounds) {}

VectorDef& VectorDef::operator=(const VectorDef& other) {
  if (this != &other) *this = VectorDef(other);
  return *this;
}

}  // namespace lumo
