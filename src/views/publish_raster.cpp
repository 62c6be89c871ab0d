#include "views/publish_raster.h"

#include "commands/catalog.h"

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

std::vector<OutputDeclaration> PublishedOutputs() {
  return {{"URI", ValueKind::kURI, "the raster, by which further commands find it"},
          {"DataType", ValueKind::kWord, "its pixel type"}};
}

}  // namespace lumo
