#include "views/publish_raster.h"

#include "commands/catalog.h"
#include "foundation/fault.h"

namespace lumo {

CommandResult PublishCommand::Publish(const CatalogRasterRef& entered) {
  const BasicRasterPtr& raster = entered.Raster();
  if (!raster || !raster->IsValid()) {
    catalog::Remove(raster);
    return Fail();
  }
  Write("URI", raster->GetURI());
  Write("DataType", DataTypeName(entered.DataType()));
  return Succeed();
}

std::vector<BasicRasterPtr> PublishCommand::FindRasters(const char* name) const {
  std::vector<BasicRasterPtr> rasters;
  for (const URI& uri : Read<Array<URI>>(name)) {
    rasters.emplace_back(CatalogFind(uri));
    if (rasters.back() && rasters.back()->IsValid()) continue;
    SetFault(std::string(name) + ": no open raster [" + uri.ToUTF8() + "]");
    return {};
  }
  if (rasters.empty()) SetFault(std::string(name) + " names no raster");
  return rasters;
}

std::vector<const char*> EightTypeWords() {
  return {"Byte", "Char", "UInt16", "Int16", "UInt32", "Int32", "Single", "Double"};
}

std::vector<OutputDeclaration> PublishedOutputs() {
  return {{"URI", ValueKind::kURI, "the raster, by which further commands find it"},
          {"DataType", ValueKind::kWord, "its pixel type"}};
}

}  // namespace lumo
