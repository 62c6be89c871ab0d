#include "data/format_table.h"

#include <algorithm>
#include <atomic>
#include <exception>
#include <filesystem>
#include <mutex>
#include <vector>

#include "data/data_connection.h"
#include "foundation/environment.h"
#include "foundation/fault.h"
#include "foundation/near_name.h"
#include "foundation/thrown.h"
#include "platform/module.h"

namespace lumo {
namespace {

FormatRecord Row(const char* name, const char* library, const char* driver,
                 DataSourceKind kind = DataSourceKind::kRaster) {
  FormatRecord record;
  record.name = name;
  record.windowsLibrary = std::string(library) + ".dll";
  record.linuxLibrary = std::string("lib") + library + ".so";
  record.macLibrary = std::string("lib") + library + ".dylib";
  record.driver = driver;
  record.kind = static_cast<std::int32_t>(kind);
  return record;
}

/// Held while a plug-in is loaded and asked for a factory.
std::recursive_mutex& LoadMutex() {
  static std::recursive_mutex mutex;
  return mutex;
}

DataConnectionFactory* AskForFactory(const platform::Module& module, FormatRecord& record) {
  auto* const create =
      module.Find<CreateDataConnectionFactoryFunction>("CreateDataConnectionFactory");
  const std::string library = LibraryName(record).ToUTF8();
  if (create == nullptr) {
    SetFault(library + ": no entry point CreateDataConnectionFactory");
    return nullptr;
  }
  try {
    DataConnectionFactory* const factory = create(&record);
    if (factory == nullptr) SetFault(library + ": doesn't serve " + record.name.ToUTF8());
    return factory;
  } catch (...) {
    SetFault(library + ": " + DescribeException());
  }
  return nullptr;
}

}  // namespace

FormatRecord gCdfFormatRecords[kFormatCount] = {
    Row("MemoryRaster", "vexraster", "MemoryRaster"),
    Row("Pyramid", "vexraster", "Pyramid"),
    Row("GDBRaster", "vexgdb", ""),
    Row("ORVA", "vexgdal", "ORVA"),
    Row("TIFF", "vexgdal", "GTiff"),
    Row("JPEG", "vexgdal", "JPEG"),
    Row("PNG", "vexgdal", "PNG"),
    Row("BMP", "vexgdal", "BMP"),
    Row("GIF", "vexgdal", "GIF"),
    Row("GRIB", "vexgdal", "GRIB"),
    Row("MrSID", "vexgdal", "MrSID"),
    Row("Esri", "vexgdal", "AIG"),
    Row("HDF5", "vexgdal", "HDF5Image"),
    Row("DTED", "vexgdal", "DTED"),
    Row("PDS", "vexgdal", "PDS"),
    Row("Erdas", "vexgdal", "HFA"),
    Row("Spot", "vexgdal", "DIMAP"),
    Row("WMS", "vexgdal", "WMS"),
    Row("WCS", "vexgdal", "WCS"),
    Row("NITF", "vexnitf", "NITF"),
    Row("JPEG2000", "vexjpeg2000", "JPEG2000"),
    Row("Shapefile", "vexshapefile", "Shapefile", DataSourceKind::kVector),
    Row("JPIP", "vexjpip", "JPIP"),
    Row("EsriImageService", "vexremote", "EsriImageService"),
    Row("EsriRasterCatalogItem", "vexremote", "EsriRasterCatalogItem"),
    Row("EXTERNAL", "vexzep", "EXTERNAL"),
    Row("CEOS", "vexgdal", "CEOS"),
};

const std::uint32_t gCdfFormatRecordCount = kFormatCount;

platform::Module LoadPlugin(const std::string& name, std::string& fault) {
  const String binDirectory = GetGlobalEnvironmentImpl().Find(Environment::kBinDirectory);
  for (const std::string& directory : {binDirectory.ToUTF8(), platform::LibraryDirectory()}) {
    if (directory.empty()) continue;
    const std::filesystem::path path = std::filesystem::path(directory) / name;
    std::error_code missing;
    if (std::filesystem::exists(path, missing)) {
      return platform::Module::Load(path.string(), &fault);
    }
  }
  return platform::Module::Load(name, &fault);
}

const String& LibraryName(const FormatRecord& record) {
#if defined(_WIN32)
  return record.windowsLibrary;
#elif defined(__APPLE__)
  return record.macLibrary;
#else
  return record.linuxLibrary;
#endif
}

FormatRecord* FindFormat(const String& name) {
  for (FormatRecord& record : gCdfFormatRecords) {
    if (record.name == name) return &record;
  }
  return nullptr;
}

Array<String> ConnStrings(std::initializer_list<String> pieces) {
  Array<String> strings{ArrayDims(static_cast<unsigned>(pieces.size()))};
  std::copy(pieces.begin(), pieces.end(), strings.begin());
  return strings;
}

String FindFormatName(const Array<String>& connStrings) {
  for (const String& piece : connStrings) {
    if (FindFormat(piece) != nullptr) return piece;
  }
  return {};
}

bool RemoveFormatNames(const Array<String>& connStrings, Array<String>& out) {
  Array<String> rest;
  for (const String& piece : connStrings) {
    if (FindFormat(piece) != nullptr) continue;
    const unsigned at = rest.GetCount();
    if (rest.Resize(ArrayDims(at + 1))) rest[at] = piece;
  }
  out = rest;
  return true;
}

String SplitConnStr(const Array<String>& connStrings, Array<String>& rest) {
  RemoveFormatNames(connStrings, rest);
  return FindFormatName(connStrings);
}

DataConnectionFactory* GetFactory(const FormatRecord& record) {
  return std::atomic_ref(const_cast<FormatRecord&>(record).factory).load();
}

void LoadFormat(std::uint32_t row) {
  if (row >= kFormatCount || GetFactory(gCdfFormatRecords[row]) != nullptr) return;
  FormatRecord& record = gCdfFormatRecords[row];
  const std::lock_guard lock(LoadMutex());
  if (GetFactory(record) != nullptr) return;
  std::string fault;
  const platform::Module module = LoadPlugin(LibraryName(record).ToUTF8(), fault);
  if (!module.IsLoaded()) {
    SetFault(fault);
    return;
  }
  record.library = module.Handle();
  std::atomic_ref(record.factory).store(AskForFactory(module, record));
}

DataConnectionFactory* FactoryForFormat(const String& name) {
  FormatRecord* const record = FindFormat(name);
  if (record == nullptr) {
    std::vector<std::string> known;
    for (const FormatRecord& row : gCdfFormatRecords) known.push_back(row.name.ToUTF8());
    const std::string text = name.ToUTF8();
    SetFault(text + ": no such format" + DidYouMean(text, known));
    return nullptr;
  }
  LoadFormat(static_cast<std::uint32_t>(record - gCdfFormatRecords));
  return GetFactory(*record);
}

}  // namespace lumo
