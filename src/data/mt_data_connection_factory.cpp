#include <cerrno>
#include <cstring>
#include <filesystem>
#include <vector>

#include "data/access_policy.h"
#include "data/data_manager.h"
#include "data/mt_connection.h"
#include "foundation/fault.h"
#include "foundation/file_faults.h"
#include "foundation/thrown.h"
#include "platform/memory_shortage.h"

namespace lumo {
namespace {

/// Gives the result of `call`; its default, with the fault set, when the plug-in throws.
template <typename Call>
auto Guarded(Call&& call) -> decltype(call()) {
  try {
    return call();
  } catch (...) {
    SetFault("the plug-in failed: " + DescribeException());
  }
  return {};
}

DataConnectionPtr TryConnect(DataConnectionFactory& factory, const Array<String>& connStrings,
                             const GeoRefPtr& geoRef, const MetadataPtr& metadata) {
  return Guarded([&] { return factory.Connect(connStrings, geoRef, metadata); });
}

std::string Describe(const FileFault& fault) {
  return fault.path + ": " + fault.Text();
}

/// Takes the fault of a row that has no factory; gives it where the plug-in is there and the system
/// would not load it, and nothing where there is no such plug-in.
String WhyNotLoaded(const FormatRecord& record) {
  const String why = TakeFault();
  const bool isAbsent = why.ToUTF8().find(std::strerror(ENOENT)) != std::string::npos;
  return record.library == nullptr && !isAbsent ? why : String();
}

/// The factories that recognise the source, in the order of the table.
/// @param unread  [out] why a file could not be read that had to be, to recognise the source: its
///                own, one beside it or a plug-in. Where that is the source's own file, the formats
///                that follow are not asked: what they make of it is nothing to go by.
std::vector<DataConnectionFactory*> FindWilling(const Array<String>& connStrings, String& unread) {
  std::vector<DataConnectionFactory*> willing;
  std::error_code fault;
  const std::string own = connStrings.GetCount() != 0
                              ? std::filesystem::absolute(connStrings[0].ToUTF8(), fault).string()
                              : std::string();
  const FileFaults faults;
  for (std::uint32_t row = 0; row < FormatCount(); ++row) {
    const FormatRecord& format = GetFormat(row);
    if (!MayUseFormat(format)) continue;
    LoadFormat(row);
    DataConnectionFactory* const factory = GetFactory(format);
    if (factory == nullptr) {
      if (unread.GetLength() == 0) unread = WhyNotLoaded(format);
      continue;
    }
    if (Guarded([&] { return factory->CanConnect(connStrings); })) willing.push_back(factory);
    if (const FileFault* const found = faults.FirstOf(own)) {
      unread = Describe(*found);
      return {};
    }
  }
  if (unread.GetLength() == 0 && faults.First() != nullptr) unread = Describe(*faults.First());
  return willing;
}

/// Why no format recognises a source, in one line.
String DescribeUnrecognised(const Array<String>& connStrings) {
  if (connStrings.GetCount() == 0) return "no source named";
  const std::string name = connStrings[0].ToUTF8();
  std::error_code fault;
  const auto status = std::filesystem::status(name, fault);
  if (fault && status.type() != std::filesystem::file_type::not_found) {
    return name + ": " + platform::SystemErrorText(fault.value());
  }
  if (!std::filesystem::exists(status)) return name + ": no such file";
  if (std::filesystem::is_directory(status)) return name + ": is a directory in no known format";
  if (std::filesystem::is_regular_file(status) && std::filesystem::file_size(name, fault) == 0) {
    return name + ": the file is empty";
  }
  return name + ": in no known format";
}

template <typename Proxy>
DataConnectionPtr ConnectProxy(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                               const MetadataPtr& metadata) {
  const DataConnectionPtr proxy(new Proxy);
  return proxy->Connect(connStrings, geoRef, metadata) ? proxy : DataConnectionPtr();
}

}  // namespace

DataConnectionPtr MtDataConnectionFactory::ConnectDirect(const Array<String>& connStrings,
                                                         const GeoRefPtr& geoRef,
                                                         const MetadataPtr& metadata) {
  const String name = FindFormatName(connStrings);
  if (name.GetLength() != 0) {
    DataConnectionFactory* const factory = FactoryForFormat(name);
    if (factory == nullptr) return {};
    return TryConnect(*factory, connStrings, geoRef, metadata);
  }
  String unread;
  const std::vector<DataConnectionFactory*> willing = FindWilling(connStrings, unread);
  TakeFault();  // of rows that don't load: they are none of this source's
  if (willing.empty()) {
    SetFault(unread.GetLength() != 0 ? unread : DescribeUnrecognised(connStrings));
  }
  if (willing.size() == 1) {
    const DataConnectionPtr made = TryConnect(*willing.front(), connStrings, geoRef, metadata);
    if (made) return made;
  }
  for (DataConnectionFactory* const factory : willing) {
    const DataConnectionPtr made = TryConnect(*factory, connStrings, geoRef, MetadataPtr());
    if (made) return made;
  }
  return {};
}

DataConnectionPtr MtDataConnectionFactory::CreateRasterDirect(const Array<String>& connStrings,
                                                              const RasterDef& def) {
  Array<String> rest;
  RemoveFormatNames(connStrings, rest);
  DataConnectionFactory* const factory = FactoryForFormat(def.format);
  if (factory == nullptr) return {};
  return Guarded([&] { return factory->CreateRaster(rest, def); });
}

DataConnectionPtr MtDataConnectionFactory::CreateVectorDirect(const Array<String>& connStrings,
                                                              const VectorDef& def) {
  Array<String> rest;
  RemoveFormatNames(connStrings, rest);
  DataConnectionFactory* const factory = FactoryForFormat(def.format);
  if (factory == nullptr) return {};
  return Guarded([&] { return factory->CreateVector(rest, def); });
}

DataConnectionPtr MtDataConnectionFactory::Connect(const Array<String>& connStrings,
                                                   const GeoRefPtr& geoRef,
                                                   const MetadataPtr& metadata) {
  if (!MayUseSource(connStrings, false)) return {};
  const FormatRecord* const record = FindFormat(FindFormatName(connStrings));
  std::int32_t kind = record != nullptr ? record->kind : 0;
  if (kind == 0) {
    const DataConnectionPtr probe = ConnectDirect(connStrings, geoRef, metadata);
    if (!probe) return {};
    kind = Guarded([&] { return probe->DataSourceType(); });
  }
  switch (static_cast<DataSourceKind>(kind)) {
    case DataSourceKind::kRaster:
      return ConnectProxy<MtRasterDataConnection>(connStrings, geoRef, metadata);
    case DataSourceKind::kVector:
      return ConnectProxy<MtVectorDataConnection>(connStrings, geoRef, metadata);
    default:
      return {};
  }
}

DataConnectionPtr MtDataConnectionFactory::CreateRaster(const Array<String>& connStrings,
                                                        const RasterDef& def) {
  const FormatRecord* const format = FindFormat(def.format);
  if (format != nullptr && !MayUseFormat(*format)) return {};
  if (!MayUseSource(connStrings, true)) return {};
  const RasterDataConnectionPtr proxy(new MtRasterDataConnection);
  return proxy->CreateRaster(connStrings, def) ? DataConnectionPtr(proxy) : DataConnectionPtr();
}

}  // namespace lumo
