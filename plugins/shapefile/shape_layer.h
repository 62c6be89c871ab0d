#pragma once

#include <memory>

#include "gdal_common/shape_geometry.h"
#include "gdal_common/source.h"

namespace lumo::shapefile {

/// The shapes of an open shapefile.
///
/// An existing one is opened for reading, and again for writing by the first operation that changes
/// it. A new one lies beside its place under a temporary name until it is closed.
/// Failure: false or null, with the fault set.
class Layer {
 public:
  /// True for a name that ends as those of shapefiles do.
  static bool HasShapeName(const std::string& path);

  static std::unique_ptr<Layer> Open(const gdal::Format& format, const gdal::Source& source);
  static std::unique_ptr<Layer> Create(const gdal::Format& format, const gdal::Source& source,
                                       const VectorDef& def);
  ~Layer() { Close(); }
  Layer(const Layer&) = delete;
  Layer& operator=(const Layer&) = delete;

  /// Lets go of the file; a new one takes its place. False when something is lost.
  bool Close();

  const std::string& Name() const { return source_.name; }
  VectorDef Describe() const;

  unsigned Features() const { return static_cast<unsigned>(numbers_.size()); }
  /// Feature `index`, which is kept until another one is asked for.
  OGRFeatureH Get(std::int32_t index);

  /// True when the file can be changed. Opens nothing with GDAL.
  bool CanWrite();
  /// Puts a feature that Get gave, and that was changed, back into the file.
  bool Put(OGRFeatureH feature);
  /// @param geometry  changes hands.
  bool Append(OGRGeometryH geometry);

 private:
  Layer(const gdal::Format& format, const gdal::Source& source)
      : format_(format), source_(source) {}
  bool TakeDataset(gdal::DatasetPtr dataset);
  bool NumberFeatures();
  bool OpenForUpdate();
  bool Sync();
  bool TakePlace();
  void Discard() const;

  gdal::Format format_;
  gdal::Source source_;
  std::string temporary_;  // path of a new file that isn't finished; else empty
  gdal::DatasetPtr dataset_;
  OGRLayerH layer_ = nullptr;
  std::vector<GIntBig> numbers_;  // GDAL's, of the features that are not deleted
  gdal::FeaturePtr last_;
  std::int32_t lastIndex_ = -1;
  bool isUpdated_ = false;
  bool isDoomed_ = false;
};

}  // namespace lumo::shapefile
