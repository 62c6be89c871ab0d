#pragma once

#include "commands/value_text.h"
#include "georef/georef.h"

// The models of rasters that show some pixels of another one. Of a model with a camera the camera
// goes along.

namespace lumo {

/// The model of a raster whose pixel coordinates are those of `model` divided by two factors: of
/// every n-th pixel, where the factors are whole.
/// @param samples,lines  of that raster.
VEXG_EXPORT GeoRefPtr ReducedGeoRef(const GeoRef& model, double factorX, double factorY,
                                    unsigned samples, unsigned lines);

/// The model of a part of a raster.
/// @param form  kTold: the grid as StdGeoRef::SubRectGeoRef gives it, which leaves the tie pixel
///              where it was, so that the part lies beside its place unless that is (0, 0). kExact:
///              the grid tied at the part's first pixel.
VEXG_EXPORT GeoRefPtr PartGeoRef(const GeoRef& model, const SubRect& rect, Form form);

/// Has the camera of a model, if it has one, count from another pixel.
/// @param x,y  the new origin in pixels of the model; they need not be whole.
VEXG_EXPORT void MoveCamera(GeoRef& model, double x, double y);

}  // namespace lumo
