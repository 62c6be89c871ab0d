#pragma once

#include "data/dc_srv_call.h"
#include "data/mt_connection.h"

namespace lumo {

/// The proxy of a vector reader. It belongs to its connection, on whose thread every call runs.
template <typename T>
class MtVectorReader final : public VectorReader<T> {
 public:
  explicit MtVectorReader(MtVectorDataConnection* connection)
      : VectorReader<T>(connection), proxy_(connection) {}

  // These two are answered here: a proxy is usable when its source has a reader of the type.
  bool OpBool() override { return proxy_->DataType() == static_cast<int>(kDataTypeOf<T>); }
  std::int32_t ReaderType() override { return 0; }

  lumo::VectorDef VectorDef() override {
    return Call<lumo::VectorDef>(48, "DcSrvCmdVrVectorDef",
                                 [](auto& reader) { return reader.VectorDef(); });
  }
  bool ReadGeometryT1(std::int32_t feature, T* vertices, unsigned* partEnds) override {
    return Call<bool>(49, "DcSrvCmdVrReadGeometryT1", [&](auto& reader) {
      return reader.ReadGeometryT1(feature, vertices, partEnds);
    });
  }
  bool ReadGeometryT2(T* vertices, unsigned* featureEnds) override {
    return Call<bool>(50, "DcSrvCmdVrReadGeometryT2",
                      [&](auto& reader) { return reader.ReadGeometryT2(vertices, featureEnds); });
  }
  bool WriteGeometryT1(std::int32_t feature, const T* vertices, const unsigned* partEnds) override {
    return Call<bool>(51, "DcSrvCmdVrWriteGeometryT1", [&](auto& reader) {
      return reader.WriteGeometryT1(feature, vertices, partEnds);
    });
  }
  bool CanWriteGeometry(std::int32_t mode) override {
    return Call<bool>(52, "DcSrvCmdRrCanWriteGeometry",
                      [&](auto& reader) { return reader.CanWriteGeometry(mode); });
  }
  bool GetFeatureInfo(std::int32_t feature, std::int32_t* geometry, unsigned* parts,
                      unsigned* vertexCount) override {
    return Call<bool>(54, "DcSrvCmdVrGetFeatureInfo", [&](auto& reader) {
      return reader.GetFeatureInfo(feature, geometry, parts, vertexCount);
    });
  }
  std::int32_t Vertices() override {
    return Call<std::int32_t>(55, "DcSrvCmdVrVertices",
                              [](auto& reader) { return reader.Vertices(); });
  }
  bool AppendGeometry(std::int32_t geometry, std::int32_t vertexCount, const T* vertices) override {
    return Call<bool>(56, "DcSrvCmdVrAppendGeometry", [&](auto& reader) {
      return reader.AppendGeometry(geometry, vertexCount, vertices);
    });
  }

 private:
  /// As MtRasterReader<T>::Call.
  template <typename Result, typename Body>
  Result Call(std::int32_t code, const char* name, Body&& body) {
    return detail::CallServer(
        proxy_->Server(), code, name, Result(), [&](DcSrvContext& context, Result& result) {
          const VectorDataConnectionPtr source(context.conn);
          if (!source) return;
          const VectorReaderDispatchPtr dispatch = source->VectorReaderDispatch();
          if (!dispatch) return;
          const VectorReaderPtr<T> reader = dispatch->template Get<T>();
          if (reader) result = body(*reader);
        });
  }

  MtVectorDataConnection* proxy_;
};

}  // namespace lumo
