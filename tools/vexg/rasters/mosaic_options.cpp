#include "rasters/mosaic_options.h"

#include "options/option_values.h"

namespace lumo::host {

void MosaicCreationOptions::AddTo(OptionSet& line) {
  line.Add("--grid", grid,
           "create, build: coordinate system of the mosaic (EPSG:n, WKT, PROJ text), or a raster "
           "whose grid it gets; by default the first scene's")
      .Shows("CS|FILE")
      .Example("EPSG:32633");
  line.Add("--pixel-size", pixelSize, "create, build: side of a pixel in units of the system")
      .Shows("SIZE");
  line.Add("--resampling", resampling,
           "create, build: how pixels are made of scenes that don't lie on the grid")
      .Takes(OneOf({"nearest", "linear", "cubic"}))
      .ShowsDefault();
  line.Add("--reference", reference,
           "create, build: the scene that others are matched to; the first by default")
      .Shows("SCENE");
  line.Add("--keep-colours", unmatched, "create, build: a scene that is not matched")
      .Shows("SCENE");
  line.Add("--match-by", matchBy,
           "create, build: scenes are matched where they overlap with the reference, or as "
           "wholes")
      .Takes(OneOf({"overlaps", "scenes"}))
      .ShowsDefault();
  line.Add("--feather", feather,
           "create, build: width in which scenes go over into each other at seams, in pixels")
      .Shows("PIXELS");
  line.Add("--no-data", noData,
           "create, build: value of pixels without a scene; by default the scenes'")
      .Shows("VALUE");
  line.Add("--work-dir", workingDirectory,
           "create: folder of footprints, tables and seams; by default that of the definition")
      .IsFile("FOLDER");
  line.Add("--asset", asset, "create, build: key of the raster in STAC items").Shows("KEY");
}

void MosaicFootprintOptions::AddTo(OptionSet& line) {
  line.Add("--outside", noData,
           "footprints, build: pixels with this value in all bands are outside; by default the "
           "no-data values")
      .Shows("VALUE");
  line.Add("--tolerance", tolerance,
           "footprints, build: values so close to no data are outside as well, where they touch "
           "the outside")
      .Shows("N");
  line.Add("--mask", mask,
           "footprints: rasters whose zeros are outside; * stands for a scene's name without its "
           "ending")
      .Shows("PATTERN")
      .Example("masks/*_valid.tif");
  line.Add("--smooth", smooth, "footprints, build: how far outlines may lie from the pixels")
      .Shows("PIXELS2")
      .ShowsDefault();
  line.Add("--again", again, "footprints: of all scenes, also those that have one");
}

}  // namespace lumo::host
