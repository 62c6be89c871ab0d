#pragma once

#include "data/raster_reader.h"
#include "memory_description.h"

namespace lumo::memory {

/// A block of memory as a raster source. Nothing but the connection text describes the block, which
/// outlives the connection.
class Connection final : public RasterDataConnection {
 public:
  ~Connection() override { Disconnect(); }

  bool Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
               const MetadataPtr& metadata) override;
  void Disconnect() override;
  bool IsConnected() override { return block_.pixels != nullptr; }
  Array<String> ConnectionStrings() override { return connStrings_; }
  /// The key of the format, the name, and the address.
  lumo::URI URI() override;
  std::int32_t DataSourceType() override {
    return static_cast<std::int32_t>(DataSourceKind::kRaster);
  }
  std::int32_t DataType() override { return static_cast<std::int32_t>(def_.dataType); }
  bool CanWrite() override { return IsConnected(); }
  bool GetMetadata(const String&, const LockableMetadataImplPtr&) override { return false; }

  RasterReaderDispatchPtr RasterReaderDispatch() override { return dispatch_; }
  lumo::RasterDef RasterDef() override { return def_; }
  bool CreateRaster(const Array<String>&, const lumo::RasterDef&) override { return false; }
  DataConnectionPtr SelfPointer() override { return DataConnectionPtr(this, true); }

  const Description& Block() const { return block_; }

 private:
  Array<String> connStrings_;
  Description block_;
  lumo::RasterDef def_;
  RasterReaderDispatchPtr dispatch_{new lumo::RasterReaderDispatch};
};

}  // namespace lumo::memory
