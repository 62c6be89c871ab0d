#include "data/plain_factory.h"

#include "foundation/fault.h"

namespace lumo {

PlainFactory::PlainFactory(std::string name) : name_(std::move(name)) {}

bool PlainFactory::IsAvailable() {
  return true;
}

DataConnectionPtr PlainFactory::FailWith(const std::string& what) const {
  SetFault(name_ + ": " + what);
  return {};
}

/// A new connection of this kind that `start` could open.
/// @param what  the sources of this kind, for the fault.
template <typename Kind, typename Start>
DataConnectionPtr PlainFactory::Open(const char* what, const Start& start) {
  const DataConnectionPtr owner(Make());
  const Pointer<Kind> made(owner);
  if (!made) return FailWith(std::string("no ") + what);
  return start(*made) ? owner : DataConnectionPtr();
}

DataConnectionPtr PlainFactory::Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                                        const MetadataPtr& metadata) {
  return Open<DataConnection>(
      "sources", [&](DataConnection& made) { return made.Connect(connStrings, geoRef, metadata); });
}

DataConnectionPtr PlainFactory::CreateRaster(const Array<String>& connStrings,
                                             const RasterDef& def) {
  return Open<RasterDataConnection>(
      "rasters", [&](RasterDataConnection& made) { return made.CreateRaster(connStrings, def); });
}

DataConnectionPtr PlainFactory::CreateVector(const Array<String>& connStrings,
                                             const VectorDef& def) {
  return Open<VectorDataConnection>(
      "vectors", [&](VectorDataConnection& made) { return made.CreateVector(connStrings, def); });
}

}  // namespace lumo
