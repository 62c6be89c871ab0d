#include "gdal_common/library.h"

#include <cpl_conv.h>
#include <gdal.h>
#include <map>
#include <mutex>

#include "foundation/environment.h"
#include "gdal_common/file_guard.h"
#include "gdal_common/file_system.h"
#include "gdal_common/messages.h"

namespace lumo::gdal {
namespace {

/// GDAL's names for what the table calls otherwise, the best first.
const std::map<std::string, std::vector<std::string>> kDriverNames = {
    {"JPEG2000", {"JP2OpenJPEG", "JPEG2000"}},
    {"HDF5Image", {"HDF5Image", "HDF5"}},
    {"CEOS", {"CEOS", "SAR_CEOS"}},
    {"Shapefile", {"ESRI Shapefile"}},
};

/// Threads of GDAL's own speak to the process's handler, which by default writes to the standard
/// error stream. A handler that a host has set stays.
void Silence() {
  const CPLErrorHandler before = CPLSetErrorHandler(CPLQuietErrorHandler);
  if (before != nullptr && before != CPLDefaultErrorHandler) CPLSetErrorHandler(before);
}

}  // namespace

void StartGdal() {
  static std::once_flag started;
  std::call_once(started, [] {
    const std::string data = GetGlobalEnvironmentImpl().Find(Environment::kGdalDirectory).ToUTF8();
    if (!data.empty()) CPLSetConfigOption("GDAL_DATA", data.c_str());
    const Messages messages;  // so that a failure that is fatal to GDAL ends no process
    Silence();
    InstallFileSystem();
    GDALAllRegister();
    InstallFileGuard();
  });
}

Format FindDrivers(const FormatRecord& record) {
  StartGdal();
  Format format{record.name.ToUTF8(), {}};
  const std::string driver = record.driver.ToUTF8();
  const auto row = kDriverNames.find(driver);
  const auto names = row != kDriverNames.end() ? row->second : std::vector{driver};
  for (const std::string& name : names) {
    if (GDALGetDriverByName(name.c_str()) != nullptr) format.drivers.push_back(name);
  }
  if (format.drivers.empty()) FailWith(format.key, "this GDAL has no driver " + names.front());
  return format;
}

}  // namespace lumo::gdal
