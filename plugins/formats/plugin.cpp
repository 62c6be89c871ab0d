#include "data/data_connection.h"
#include "data/vector_records.h"
#include "foundation/fault.h"
#include "foundation/own_plugin.h"
#include "foundation/plugin_library.h"
#include "orva/orva_factory.h"
#include "tiff/tiff_factory.h"

VEXG_OWN_PLUGIN;

namespace {

/// A function of the library that has GDAL behind it; null, with the fault set, without that.
template <typename Function>
Function* FindInCore(const char* name) {
  std::string fault;
  const lumo::platform::Module core =
      lumo::LoadPlugin(lumo::platform::ModuleFileName("vexgdalcore"), fault);
  if (!core.IsLoaded()) lumo::SetFault(fault);
  return core.Find<Function>(name);
}

lumo::DataConnectionFactory* MakeByGdal(lumo::FormatRecord& record) {
  auto* const create =
      FindInCore<lumo::CreateDataConnectionFactoryFunction>("CreateDataConnectionFactory");
  return create != nullptr ? create(&record) : nullptr;
}

lumo::FormatRecord* gTiffRecord = nullptr;

/// GDAL's factory of TIFF files, made at the first call; tried again where it could not be.
lumo::DataConnectionFactory* FindTiffByGdal() {
  static std::mutex mutex;
  static lumo::DataConnectionFactory* factory = nullptr;
  const std::lock_guard lock(mutex);
  if (factory == nullptr) factory = MakeByGdal(*gTiffRecord);
  return factory;
}

}  // namespace

/// The entry point of the plug-in.
extern "C" VEXG_EXPORT lumo::DataConnectionFactory* CreateDataConnectionFactory(
    lumo::FormatRecord* record) {
  if (record->driver == "ORVA") return lumo::MakeOrvaFactory(*record);
  if (record->driver != "GTiff") return MakeByGdal(*record);
  gTiffRecord = record;
  return lumo::MakeTiffFactory(*record, &FindTiffByGdal);
}

/// The formats by GDAL beside those of the table; the link libvexgformat_gdal.so brings them.
extern "C" VEXG_EXPORT const lumo::FormatDescription* DescribeFormats(std::uint32_t* count) {
  static constexpr lumo::FormatDescription kFormats[] = {
      {"VRT", "VRT", lumo::DataSourceKind::kRaster},
      {"netCDF", "netCDF", lumo::DataSourceKind::kRaster},
      {"Zarr", "Zarr", lumo::DataSourceKind::kRaster}};
  *count = static_cast<std::uint32_t>(std::size(kFormats));
  return kFormats;
}

/// The entry point for files of records.
extern "C" VEXG_EXPORT lumo::VectorRecordFactory* CreateVectorRecordFactory() {
  auto* const create =
      FindInCore<lumo::CreateVectorRecordFactoryFunction>("CreateVectorRecordFactory");
  return create != nullptr ? create() : nullptr;
}
