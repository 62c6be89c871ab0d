#include "data/data_connection.h"
#include "foundation/own_plugin.h"
#include "gdal_common/library.h"
#include "gdal_factory.h"
#include "vector_sink.h"
#include "vector_source.h"

VEXG_OWN_PLUGIN;

namespace {

class GdalVectorRecordFactory final : public lumo::VectorRecordFactory {
 public:
  std::vector<std::string> SinkEndings() override { return lumo::VectorSinkEndings(); }
  lumo::VectorRecordSourcePtr Open(const std::string& path) override {
    return lumo::OpenVectorSource(path);
  }
  lumo::VectorRecordSinkPtr Create(const std::string& path,
                                   const lumo::VectorLayer& layer) override {
    return lumo::CreateVectorSink(path, layer);
  }
};

}  // namespace

/// The entry point for rasters, which libvexgdal.so calls.
extern "C" VEXG_EXPORT lumo::DataConnectionFactory* CreateDataConnectionFactory(
    lumo::FormatRecord* record) {
  return lumo::MakeGdalFactory(*record);
}

/// The entry point for files of records.
extern "C" VEXG_EXPORT lumo::VectorRecordFactory* CreateVectorRecordFactory() {
  lumo::gdal::StartGdal();
  static GdalVectorRecordFactory factory;
  return &factory;
}
