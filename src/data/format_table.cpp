#include "data/format_table.h"

#include <algorithm>
#include <atomic>
#include <deque>
#include <exception>
#include <filesystem>
#include <mutex>
#include <set>
#include <vector>

#include "data/data_connection.h"
#include "foundation/fault.h"
#include "foundation/near_name.h"
#include "foundation/thrown.h"

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

/// Loads the plug-in of a format, unless it has a factory.
void Load(FormatRecord& record) {
  if (GetFactory(record) != nullptr) return;
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

/// Adds the formats that a library brings. One whose key is taken is left out.
void AddFormatsOf(const std::string& library, std::deque<FormatRecord>& formats) {
  std::string fault;
  const platform::Module module = LoadPlugin(library, fault);
  auto* const describe =
      module.IsLoaded() ? module.Find<DescribeFormatsFunction>("DescribeFormats") : nullptr;
  if (describe == nullptr) return;
  std::uint32_t count = 0;
  const FormatDescription* const described = describe(&count);
  for (std::uint32_t i = 0; i < count; ++i) {
    const auto hasKey = [&](const FormatRecord& record) {
      return record.name == described[i].name;
    };
    const bool isTaken =
        std::any_of(std::begin(gCdfFormatRecords), std::end(gCdfFormatRecords), hasKey) ||
        std::any_of(formats.begin(), formats.end(), hasKey);
    if (isTaken) continue;
    FormatRecord& record = formats.emplace_back();
    record.name = described[i].name;
    record.windowsLibrary = record.linuxLibrary = record.macLibrary = library;
    record.driver = described[i].driver;
    record.kind = static_cast<std::int32_t>(described[i].kind);
  }
}

/// Finds the libraries in PluginDirectories that bring formats, by their names.
std::set<std::string> FindLibrariesOfFormats() {
  std::set<std::string> libraries;
  const std::filesystem::path sample = platform::ModuleFileName(kFormatPlugin);
  for (const std::string& directory : PluginDirectories()) {
    std::error_code fault;
    for (std::filesystem::directory_iterator at(directory, fault), end; !fault && at != end;
         at.increment(fault)) {
      const std::string name = at->path().filename().string();
      const bool isOne =
          name.starts_with(sample.stem().string()) && at->path().extension() == sample.extension();
      if (isOne) libraries.insert(name);
    }
  }
  return libraries;
}

/// The formats that plug-ins bring, in the order of the names of their libraries. Like those of the
/// table they hold their factories until the process ends.
std::deque<FormatRecord>& FurtherFormats() {
  static auto& further = *[] {
    auto* const formats = new std::deque<FormatRecord>;
    for (const std::string& library : FindLibrariesOfFormats()) AddFormatsOf(library, *formats);
    return formats;
  }();
  return further;
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

DataConnectionFactory* GetFactory(const FormatRecord& record) {
  return std::atomic_ref(const_cast<FormatRecord&>(record).factory).load();
}

std::uint32_t FormatCount() {
  return kFormatCount + static_cast<std::uint32_t>(FurtherFormats().size());
}

FormatRecord& GetFormat(std::uint32_t row) {
  return row < kFormatCount ? gCdfFormatRecords[row] : FurtherFormats()[row - kFormatCount];
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
  for (std::uint32_t row = 0; row < FormatCount(); ++row) {
    if (GetFormat(row).name == name) return &GetFormat(row);
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

void LoadFormat(std::uint32_t row) {
  if (row < FormatCount()) Load(GetFormat(row));
}

DataConnectionFactory* FactoryForFormat(const String& name) {
  FormatRecord* const record = FindFormat(name);
  if (record == nullptr) {
    std::vector<std::string> known;
    for (std::uint32_t row = 0; row < FormatCount(); ++row) {
      known.push_back(GetFormat(row).name.ToUTF8());
    }
    const std::string text = name.ToUTF8();
    SetFault(text + ": no such format" + DidYouMean(text, known));
    return nullptr;
  }
  Load(*record);
  return GetFactory(*record);
}

}  // namespace lumo
