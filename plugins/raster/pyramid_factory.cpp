#include "pyramid_factory.h"

#include "foundation/fault.h"
#include "pyramid_connection.h"

namespace lumo {
namespace {

class PyramidFactory final : public DataConnectionFactory {
 public:
  bool IsAvailable() override { return true; }

  bool CanConnect(const Array<String>& connStrings) override {
    pyramid::Place place;
    return pyramid::FindPlace(connStrings, place) && pyramid::IsPyramidFile(place.path);
  }

  DataConnectionPtr Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                            const MetadataPtr& metadata) override {
    return Open([&](DataConnection& made) { return made.Connect(connStrings, geoRef, metadata); });
  }

  DataConnectionPtr CreateRaster(const Array<String>& connStrings, const RasterDef& def) override {
    return Open([&](RasterDataConnection& made) { return made.CreateRaster(connStrings, def); });
  }

  DataConnectionPtr CreateVector(const Array<String>&, const VectorDef&) override {
    SetFault("Pyramid: no vectors");
    return {};
  }

 private:
  template <typename Start>
  static DataConnectionPtr Open(Start&& start) {
    auto* const made = new pyramid::Connection;
    DataConnectionPtr owner(made);
    return start(*made) ? owner : DataConnectionPtr();
  }
};

}  // namespace

DataConnectionFactory* MakePyramidFactory() {
  return new PyramidFactory;
}

}  // namespace lumo
