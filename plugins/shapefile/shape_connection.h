#pragma once

#include <memory>

#include "data/vector_reader.h"
#include "shape_layer.h"

namespace lumo::shapefile {

/// An open shapefile.
class Connection final : public VectorDataConnection {
 public:
  explicit Connection(const gdal::Format& format) : format_(format) {}
  ~Connection() override { Disconnect(); }

  /// Shapes have no metadata here: what is given is not used.
  bool Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
               const MetadataPtr& metadata) override;
  /// A new file takes its place; the fault says why when it can't.
  void Disconnect() override;
  bool IsConnected() override { return layer_ != nullptr; }
  Array<String> ConnectionStrings() override { return connStrings_; }
  lumo::URI URI() override { return uri_; }
  std::int32_t DataSourceType() override {
    return static_cast<std::int32_t>(DataSourceKind::kVector);
  }
  std::int32_t DataType() override { return static_cast<std::int32_t>(dispatch_->DataType()); }
  bool CanWrite() override { return layer_ != nullptr && layer_->CanWrite(); }
  bool GetMetadata(const String&, const LockableMetadataImplPtr&) override { return false; }

  VectorReaderDispatchPtr VectorReaderDispatch() override { return dispatch_; }
  lumo::VectorDef VectorDef() override;
  bool CreateVector(const Array<String>& connStrings, const lumo::VectorDef& def) override;
  DataConnectionPtr SelfPointer() override { return DataConnectionPtr(this, true); }

 private:
  bool MakeReader(const Array<String>& connStrings, const gdal::Source& source,
                  const GeoRefPtr& geoRef);

  const gdal::Format format_;
  std::unique_ptr<Layer> layer_;
  Array<String> connStrings_;
  lumo::URI uri_;
  VectorReaderDispatchPtr dispatch_{new lumo::VectorReaderDispatch};
};

}  // namespace lumo::shapefile
