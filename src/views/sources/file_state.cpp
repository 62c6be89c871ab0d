#include "views/sources/file_state.h"

#include <algorithm>

#include "data/file_uri.h"
#include "data/mt_connection.h"
#include "raster/raster_details.h"

namespace lumo {
namespace {

using platform::FileIdentity;

/// The file behind a source as it was when that was opened.
FileIdentity IdentityOf(RasterDataConnection& source) {
  std::string path = PathOfFileURI(source.URI());
  path.resize(std::min(path.find('|'), path.size()));  // a raster in a file
  auto* const proxy = dynamic_cast<MtRasterDataConnection*>(&source);
  if (proxy != nullptr) {
    const SourceStamp stamp = proxy->Stamp();
    for (const SourceStamp::File& file : stamp.GetFiles()) {
      if (file.identity.exists && PathOfFileURI(file.uri) == path) return file.identity;
    }
  }
  return platform::IdentifyFile(path);
}

}  // namespace

std::string FileStateOf(RasterDataConnection& source) {
  const FileIdentity file = IdentityOf(source);
  if (!file.exists) return {};
  return std::to_string(file.size).append(" ").append(std::to_string(file.time));
}

std::string FindMismatch(RasterDataConnection& source, RasterDataConnection& pyramid) {
  const RasterDef raster = source.RasterDef(), levels = pyramid.RasterDef();
  if (source.DataType() != pyramid.DataType()) return "has another pixel type than the raster";
  if (raster.samples != levels.samples || raster.lines != levels.lines ||
      raster.bands != levels.bands) {
    return "is of a raster of another size";
  }
  const std::string kept = FindDetail(levels.metadata, FileStatePath());
  if (!kept.empty()) {
    const std::string now = FileStateOf(source);
    return now.empty() || now == kept ? "" : "was built from another state of the raster";
  }
  const FileIdentity file = IdentityOf(source), built = IdentityOf(pyramid);
  return file.exists && built.exists && built.time < file.time ? "is older than the raster" : "";
}

}  // namespace lumo
