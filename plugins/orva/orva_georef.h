#pragma once

#include "georef/georef.h"
#include "orva/orva_text.h"

namespace lumo::orva {

/// Writes a model into a header: its text form, which alone is read back, and for people and other
/// programs the coordinate system and the corners of an affine grid.
void WriteGeoRef(const GeoRef& model, HeaderText& text);

/// Reads the model of a header: its text form; else the grid through the map points or the geo
/// points; empty when the header has none of these.
/// @param fault  [out] "line N: what".
bool ReadGeoRef(const HeaderText& text, GeoRefPtr& model, std::string& fault);

}  // namespace lumo::orva
