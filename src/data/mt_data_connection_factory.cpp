#include <algorithm>
#include <filesystem>

#include "data/access_policy.h"
#include "data/data_manager.h"
#include "data/format_detection.h"
#include "data/mt_connection.h"
#include "foundation/fault.h"
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

void SetUnrecognised(const FormatDetection& detection, const Array<String>& connStrings) {
  SetFault(detection.unread.GetLength() != 0 ? detection.unread
                                             : DescribeUnrecognised(connStrings));
}

/// The kind of a source that only plug-ins of the library were asked for: they are of the kinds
/// that their rows say, so that none need be opened to find out. 0 where it has to be.
std::int32_t KindOf(const FormatDetection& detection) {
  if (!detection.isOwn || detection.willing.empty()) return 0;
  const std::int32_t kind = GetFormat(detection.willing.front()).kind;
  const bool areSame =
      std::all_of(detection.willing.begin(), detection.willing.end(),
                  [kind](std::uint32_t row) { return GetFormat(row).kind == kind; });
  return areSame ? kind : 0;
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
  // The first that recognises a source is given its metadata where it is the only one.
  const DetectionExtent extent = metadata ? DetectionExtent::kAll : DetectionExtent::kToFirst;
  const FormatDetection* known = DetectedScope::Current();
  if (known != nullptr && !known->isWhole && metadata) known = nullptr;
  FormatDetection detection = known != nullptr ? *known : DetectFormats(connStrings, extent);
  TakeFault();  // of rows that don't load: they are none of this source's
  if (detection.willing.empty()) {
    SetUnrecognised(detection, connStrings);
  }
  const auto connect = [&](std::uint32_t row, const MetadataPtr& more) {
    return TryConnect(*GetFactory(GetFormat(row)), connStrings, geoRef, more);
  };
  std::size_t tried = 0;  // of the willing
  if (!detection.isWhole) {
    const std::uint32_t first = detection.willing.front();
    if (const DataConnectionPtr made = connect(first, MetadataPtr())) return made;
    const String fault = TakeFault();
    detection = DetectFormats(connStrings);
    if (fault.GetLength() != 0) SetFault(fault);
    const bool isSame = !detection.willing.empty() && detection.willing.front() == first;
    tried = isSame && detection.willing.size() > 1 ? 1 : 0;
  } else if (detection.willing.size() == 1) {
    if (const DataConnectionPtr made = connect(detection.willing.front(), metadata)) return made;
  }
  for (; tried < detection.willing.size(); ++tried) {
    const DataConnectionPtr made = connect(detection.willing[tried], MetadataPtr());
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
  FormatDetection detection;
  bool isDetected = false;
  if (kind == 0) {
    detection = DetectFormats(connStrings, DetectionExtent::kToFirst);
    TakeFault();
    kind = KindOf(detection);
    isDetected = kind != 0;
  }
  const DetectedScope scope(isDetected ? &detection : nullptr);
  if (kind == 0) {
    if (detection.isOwn && detection.willing.empty()) {
      SetUnrecognised(detection, connStrings);
      return {};
    }
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
