#include "rasters/raster_chain.h"

namespace lumo::host {

JobWriterCommand& RasterChain::AddView(const std::string& name, const char* command) {
  JobWriterCommand& view = draft_.Open(name, command);
  view.AddInput("SrcURI", GetTop());
  Take(name);
  return view;
}

void RasterChain::Close() {
  for (auto raster = opened_.rbegin(); raster != opened_.rend(); ++raster) {
    draft_.Close("close." + raster->ToUTF8().substr(1), *raster);
  }
}

String URIOf(const JobResults& opened, const String& variable) {
  const std::string name = variable.ToUTF8();
  const Map<String, String>& returns = opened.Find(String(name.substr(1))).returns;
  return returns.Find(returns.HasKey("PyramidURI") ? "PyramidURI" : "URI");
}

}  // namespace lumo::host
