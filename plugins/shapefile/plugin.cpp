#include "foundation/own_plugin.h"
#include "gdal_common/messages.h"
#include "gdal_common/source.h"
#include "shape_connection.h"

VEXG_OWN_PLUGIN;

namespace lumo::shapefile {
namespace {

class Factory final : public DataConnectionFactory {
 public:
  explicit Factory(gdal::Format format) : format_(std::move(format)) {}

  bool IsAvailable() override { return true; }

  bool CanConnect(const Array<String>& connStrings) override {
    gdal::Source source;
    return gdal::ParseSource(connStrings, source) && Layer::HasShapeName(source.name) &&
           gdal::IsOfFormat(source, format_, GDAL_OF_VECTOR);
  }

  DataConnectionPtr Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                            const MetadataPtr& metadata) override {
    return Open([&](DataConnection& made) { return made.Connect(connStrings, geoRef, metadata); });
  }

  DataConnectionPtr CreateRaster(const Array<String>&, const RasterDef&) override {
    gdal::FailWith(format_.key, "holds no rasters");
    return {};
  }

  DataConnectionPtr CreateVector(const Array<String>& connStrings, const VectorDef& def) override {
    return Open([&](VectorDataConnection& made) { return made.CreateVector(connStrings, def); });
  }

 private:
  template <typename Start>
  DataConnectionPtr Open(Start&& start) {
    auto* const made = new Connection(format_);
    DataConnectionPtr owner(made);
    return start(*made) ? owner : DataConnectionPtr();
  }

  const gdal::Format format_;
};

}  // namespace
}  // namespace lumo::shapefile

/// The entry point of the plug-in.
extern "C" VEXG_EXPORT lumo::DataConnectionFactory* CreateDataConnectionFactory(
    lumo::FormatRecord* record) {
  lumo::gdal::Format format = lumo::gdal::FindDrivers(*record);
  return format.drivers.empty() ? nullptr : new lumo::shapefile::Factory(std::move(format));
}
