#pragma once

#include "data/vector_reader.h"
#include "shape_layer.h"

namespace lumo::shapefile {

/// Reads and changes the shapes of a shapefile. Heights and measures of vertices are not read.
///
/// A shapefile's outer rings run clockwise and its inner rings the other way: GDAL turns those that
/// don't, when it writes them.
class Reader final : public VectorReader<double> {
 public:
  /// @param layer  outlives the reader.
  Reader(VectorDataConnection* connection, Layer& layer, const GeoRefPtr& geoRef)
      : VectorReader<double>(connection), layer_(layer), geoRef_(geoRef) {}

  bool OpBool() override { return true; }
  std::int32_t ReaderType() override { return 0; }
  lumo::VectorDef VectorDef() override;
  std::int32_t Vertices() override;
  bool CanWriteGeometry(std::int32_t) override { return layer_.CanWrite(); }

  bool ReadGeometryT2(double* vertices, unsigned* featureEnds) override;
  bool ReadGeometryT1(std::int32_t feature, double* vertices, unsigned* partEnds) override;
  bool WriteGeometryT1(std::int32_t feature, const double* vertices,
                       const unsigned* partEnds) override;
  bool AppendGeometry(std::int32_t geometry, std::int32_t vertexCount,
                      const double* vertices) override;
  bool GetFeatureInfo(std::int32_t feature, std::int32_t* geometry, unsigned* parts,
                      unsigned* vertexCount) override;

 private:
  Layer& layer_;
  const GeoRefPtr geoRef_;  // in place of the file's own, unless it is empty
};

}  // namespace lumo::shapefile
