#include "gdal_factory.h"

#include "data/plain_factory.h"
#include "gdal_connection.h"

namespace lumo {
namespace {

class GdalFactory final : public PlainFactory {
 public:
  explicit GdalFactory(gdal::Format format)
      : PlainFactory(format.key), format_(std::move(format)) {}

  bool CanConnect(const Array<String>& connStrings) override {
    gdal::Source source;
    return gdal::ParseSource(connStrings, source) &&
           gdal::IsOfFormat(source, format_, GDAL_OF_RASTER);
  }

 private:
  DataConnection* Make() override { return new gdal::Connection(format_); }

  const gdal::Format format_;
};

}  // namespace

DataConnectionFactory* MakeGdalFactory(const FormatRecord& record) {
  gdal::Format format = gdal::FindDrivers(record);
  return format.drivers.empty() ? nullptr : new GdalFactory(std::move(format));
}

}  // namespace lumo
