#include "orva/orva_factory.h"

#include "foundation/fault.h"
#include "orva/orva_connection.h"

namespace lumo {
namespace {

class OrvaFactory final : public DataConnectionFactory {
 public:
  bool IsAvailable() override { return true; }

  bool CanConnect(const Array<String>& connStrings) override {
    const std::string path = orva::FindPath(connStrings);
    return !path.empty() && orva::HasHeader(path);
  }

  DataConnectionPtr Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                            const MetadataPtr& metadata) override {
    return Open([&](DataConnection& made) { return made.Connect(connStrings, geoRef, metadata); });
  }

  DataConnectionPtr CreateRaster(const Array<String>& connStrings, const RasterDef& def) override {
    return Open([&](RasterDataConnection& made) { return made.CreateRaster(connStrings, def); });
  }

  DataConnectionPtr CreateVector(const Array<String>&, const VectorDef&) override {
    SetFault("ORVA: no vectors");
    return {};
  }

 private:
  template <typename Start>
  static DataConnectionPtr Open(Start&& start) {
    auto* const made = new orva::Connection;
    DataConnectionPtr owner(made);
    return start(*made) ? owner : DataConnectionPtr();
  }
};

}  // namespace

DataConnectionFactory* MakeOrvaFactory(FormatRecord&) {
  return new OrvaFactory;
}

}  // namespace lumo
