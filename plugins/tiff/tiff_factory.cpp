#include "tiff/tiff_factory.h"

#include <filesystem>

#include "data/file_uri.h"
#include "foundation/fault.h"
#include "tiff/tiff_reader.h"

namespace lumo {
namespace tiff {
namespace {

namespace fs = std::filesystem;

using FindFactory = DataConnectionFactory*();

/// The file that connection strings name, absolute; empty when they name anything else.
std::string FindPath(const Array<String>& connStrings) {
  Array<String> rest;
  SplitConnStr(connStrings, rest);
  std::error_code fault;
  if (rest.GetCount() != 1 || !fs::is_regular_file(rest[0].ToUTF8(), fault)) return {};
  return fs::absolute(rest[0].ToUTF8(), fault).string();
}

class Connection final : public PlainRasterConnection {
 public:
  ~Connection() override { Connection::Disconnect(); }

  /// Takes over an open source.
  bool Take(std::unique_ptr<Source> source, const Array<String>& connStrings,
            const GeoRefPtr& geoRef, const MetadataPtr& metadata) {
    source_ = std::move(source);
    lumo::RasterDef def = source_->Def();
    if (geoRef) def.SetGeoRef(geoRef);
    if (metadata) def.metadata = *metadata;
    return DispatchType(TwelveTypes{}, def.dataType, [&]<typename T>() {
      SetOpened(connStrings, FileURI(source_->Path()),
                RasterReaderPtr<T>(new Reader<T>(this, *source_, def)));
      return true;
    });
  }

  void Disconnect() override {
    PlainRasterConnection::Disconnect();
    source_.reset();
  }
  bool CanWrite() override { return source_ != nullptr && source_->CanWrite(); }
  bool GetMetadata(const String& mdfPath, const LockableMetadataImplPtr& store) override {
    const RasterDataConnectionPtr inner =
        source_ != nullptr ? source_->Inner() : RasterDataConnectionPtr();
    return inner && inner->GetMetadata(mdfPath, store);
  }

 private:
  std::unique_ptr<Source> source_;
};

class Factory final : public DataConnectionFactory {
 public:
  Factory(const FormatRecord& record, FindFactory* findGdal)
      : key_(record.name), findGdal_(findGdal) {}

  bool IsAvailable() override { return true; }

  bool CanConnect(const Array<String>& connStrings) override {
    const std::string path = FindPath(connStrings);
    if (!path.empty()) {
      unsigned char head[16];
      const auto file =
          platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead);
      if (file != nullptr && file->Read(0, head, sizeof head) && File::HasMark(head, sizeof head)) {
        return true;
      }
    }
    DataConnectionFactory* const gdal = findGdal_();
    return gdal != nullptr && gdal->CanConnect(connStrings);
  }

  DataConnectionPtr Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                            const MetadataPtr& metadata) override {
    const std::string path = FindPath(connStrings);
    const auto byGdal = [this](const Array<String>& strings, const GeoRefPtr& place,
                               const MetadataPtr& texts) {
      DataConnectionFactory* const gdal = findGdal_();
      return gdal != nullptr ? gdal->Connect(strings, place, texts) : DataConnectionPtr();
    };
    std::unique_ptr<Source> source;
    if (!path.empty()) {
      source = Source::Open(path, key_, [byGdal, connStrings, geoRef, metadata] {
        return byGdal(connStrings, geoRef, metadata);
      });
    }
    if (source == nullptr) return byGdal(connStrings, geoRef, metadata);
    auto* const made = new Connection;
    const DataConnectionPtr owner(made);
    return made->Take(std::move(source), connStrings, geoRef, metadata) ? owner
                                                                        : DataConnectionPtr();
  }

  DataConnectionPtr CreateRaster(const Array<String>& connStrings, const RasterDef& def) override {
    DataConnectionFactory* const gdal = findGdal_();
    return gdal != nullptr ? gdal->CreateRaster(connStrings, def) : DataConnectionPtr();
  }

  DataConnectionPtr CreateVector(const Array<String>& connStrings, const VectorDef& def) override {
    DataConnectionFactory* const gdal = findGdal_();
    return gdal != nullptr ? gdal->CreateVector(connStrings, def) : DataConnectionPtr();
  }

 private:
  const String key_;
  FindFactory* const findGdal_;
};

}  // namespace
}  // namespace tiff

DataConnectionFactory* MakeTiffFactory(const FormatRecord& record,
                                       DataConnectionFactory* (*findGdal)()) {
  return new tiff::Factory(record, findGdal);
}

}  // namespace lumo
