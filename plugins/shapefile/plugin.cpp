#include "data/plain_factory.h"
#include "foundation/own_plugin.h"
#include "gdal_common/source.h"
#include "shape_connection.h"

VEXG_OWN_PLUGIN;

namespace lumo::shapefile {
namespace {

class Factory final : public PlainFactory {
 public:
  explicit Factory(gdal::Format format) : PlainFactory(format.key), format_(std::move(format)) {}

  bool CanConnect(const Array<String>& connStrings) override {
    gdal::Source source;
    return gdal::ParseSource(connStrings, source) && Layer::HasShapeName(source.name) &&
           gdal::IsOfFormat(source, format_, GDAL_OF_VECTOR);
  }

 private:
  DataConnection* Make() override { return new Connection(format_); }

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
