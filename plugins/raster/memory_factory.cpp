#include "memory_factory.h"

#include "foundation/fault.h"
#include "memory_connection.h"

namespace lumo {
namespace {

class MemoryFactory final : public DataConnectionFactory {
 public:
  bool IsAvailable() override { return true; }

  /// Only by name: a text of unknown format is not to be taken for the address of a block.
  bool CanConnect(const Array<String>& connStrings) override {
    memory::Description block;
    return FindFormatName(connStrings) == "MemoryRaster" &&
           memory::ReadDescription(connStrings, block);
  }

  DataConnectionPtr Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                            const MetadataPtr& metadata) override {
    auto* const made = new memory::Connection;
    DataConnectionPtr owner(made);
    return made->Connect(connStrings, geoRef, metadata) ? owner : DataConnectionPtr();
  }

  DataConnectionPtr CreateRaster(const Array<String>&, const RasterDef&) override {
    SetFault("MemoryRaster: a block of memory is opened, not made");
    return {};
  }

  DataConnectionPtr CreateVector(const Array<String>&, const VectorDef&) override {
    SetFault("MemoryRaster: no vectors");
    return {};
  }
};

}  // namespace

DataConnectionFactory* MakeMemoryFactory() {
  return new MemoryFactory;
}

}  // namespace lumo
