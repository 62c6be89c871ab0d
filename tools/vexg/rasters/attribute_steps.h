#pragma once

#include <string>
#include <vector>

#include "foundation/array.h"
#include "georef/georef.h"
#include "jobs/raster_job.h"

namespace lumo::host {

/// Which values of the regions of labels are computed.
struct AttributeRequest {
  bool spectral = false;
  bool texture = false;
  bool shape = false;
  unsigned kernel = 3;               ///< side of the windows of textures, in pixels
  std::vector<std::string> indices;  ///< NAME=EXPRESSION
  bool hasBands = false;             ///< only some bands count
  Array<unsigned> bands;             ///< the bands that count, in their order
  bool isNarrow = false;             ///< labels are of fewer than 32 bits
  double pixelX = 1;                 ///< size of a pixel, in map units
  double pixelY = 1;

  /// Takes the size of a pixel from where the raster lies; 1 where that isn't known.
  void TakePixelSize(const GeoRefPtr& geoRef);
};

/// A file of regions, and the input of the commands that names it.
struct AttributeFile {
  const char* input;
  std::string file;
};

/// The files that a request makes, by a name in front of their endings.
std::vector<AttributeFile> FilesOf(const AttributeRequest& request, const std::string& name);

/// Throws HostError for an index that isn't of the form NAME=EXPRESSION. @param where  it stands.
void CheckIndex(const std::string& index, const std::string& where);
/// The name in front of the expression of an index.
std::string IndexName(const std::string& index);

/// The rasters that attributes are of, as variables.
struct AttributeSources {
  String scene;
  String labels;
};

/// Adds the commands that make the files, and a table of all. @param table  empty for none.
void AddAttributes(JobDraft& draft, const AttributeRequest& request,
                   const AttributeSources& sources, const std::vector<AttributeFile>& files,
                   const std::string& table);

}  // namespace lumo::host
