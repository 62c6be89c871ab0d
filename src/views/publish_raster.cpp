#include "views/publish_raster.h"

#include <cmath>

#include "commands/catalog.h"
#include "foundation/fault.h"
#include "georef/affine_link.h"
#include "raster/raster_def.h"

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

void CombineCommand::WriteApart(const std::vector<BasicRasterPtr>& rasters) {
  const RasterDef first = rasters.front()->GetRasterDef();
  std::string apart;
  for (std::size_t i = 1; i < rasters.size(); ++i) {
    const RasterDef def = rasters[i]->GetRasterDef();
    if (!first.geoRef || !def.geoRef) continue;
    Array<double> corners{ArrayDims(2, 2)};
    corners[0] = corners[1] = 0;
    corners[2] = first.samples;
    corners[3] = first.lines;
    if (!CarryPixels(*first.geoRef, *def.geoRef, corners)) continue;
    const double off = std::max(std::hypot(corners[0], corners[1]),
                                std::hypot(corners[2] - first.samples, corners[3] - first.lines));
    constexpr double kRounding = 0.01;  // pixels
    if (!(off > kRounding)) continue;
    apart.append(apart.empty() ? "" : ", ").append(rasters[i]->GetURI().ToUTF8());
  }
  if (apart.empty()) return;
  apart += ": not where " + rasters.front()->GetURI().ToUTF8() +
           " lies; pixels are taken by their sample and line";
  Write("Warning", String(apart));
}

std::vector<const char*> EightTypeWords() {
  return {"Byte", "Char", "UInt16", "Int16", "UInt32", "Int32", "Single", "Double"};
}

std::vector<OutputDeclaration> PublishedOutputs() {
  return {{"URI", ValueKind::kURI, "the raster, by which further commands find it"},
          {"DataType", ValueKind::kWord, "its pixel type"}};
}

std::vector<OutputDeclaration> CombinedOutputs() {
  std::vector<OutputDeclaration> outputs = PublishedOutputs();
  outputs.push_back({"Warning", ValueKind::kText,
                     "which rasters lie elsewhere than the first one; absent when none does"});
  return outputs;
}

}  // namespace lumo
