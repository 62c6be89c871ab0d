#include "gdal_factory.h"

#include "gdal_common/messages.h"
#include "gdal_connection.h"

namespace lumo {
namespace {

class GdalFactory final : public DataConnectionFactory {
 public:
  explicit GdalFactory(gdal::Format format) : format_(std::move(format)) {}

  bool IsAvailable() override { return true; }

  bool CanConnect(const Array<String>& connStrings) override {
    gdal::Source source;
    return gdal::ParseSource(connStrings, source) &&
           gdal::IsOfFormat(source, format_, GDAL_OF_RASTER);
  }

  DataConnectionPtr Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                            const MetadataPtr& metadata) override {
    return Open([&](DataConnection& made) { return made.Connect(connStrings, geoRef, metadata); });
  }

  DataConnectionPtr CreateRaster(const Array<String>& connStrings, const RasterDef& def) override {
    return Open([&](RasterDataConnection& made) { return made.CreateRaster(connStrings, def); });
  }

  DataConnectionPtr CreateVector(const Array<String>&, const VectorDef&) override {
    gdal::FailWith(format_.key, "holds no vectors");
    return {};
  }

 private:
  template <typename Start>
  DataConnectionPtr Open(Start&& start) {
    auto* const made = new gdal::Connection(format_);
    DataConnectionPtr owner(made);
    return start(*made) ? owner : DataConnectionPtr();
  }

  const gdal::Format format_;
};

}  // namespace

DataConnectionFactory* MakeGdalFactory(const FormatRecord& record) {
  gdal::Format format = gdal::FindDrivers(record);
  return format.drivers.empty() ? nullptr : new GdalFactory(std::move(format));
}

}  // namespace lumo
