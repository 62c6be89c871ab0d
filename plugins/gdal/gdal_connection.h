#pragma once

#include <memory>

#include "data/plain_raster_reader.h"
#include "gdal_raster.h"

namespace lumo::gdal {

/// An open raster of one of GDAL's formats.
class Connection final : public PlainRasterConnection {
 public:
  explicit Connection(const Format& format) : format_(format) {}
  ~Connection() override { Disconnect(); }

  bool Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
               const MetadataPtr& metadata) override;
  /// A new raster takes its place; the fault says why when it can't.
  void Disconnect() override;
  bool CanWrite() override { return raster_ != nullptr && raster_->CanWrite(); }
  bool GetMetadata(const String& mdfPath, const LockableMetadataImplPtr& store) override;
  bool CreateRaster(const Array<String>& connStrings, const lumo::RasterDef& def) override;

 private:
  bool MakeReader(const Array<String>& connStrings, const Source& source,
                  const lumo::RasterDef& def);

  const Format format_;
  std::unique_ptr<OpenRaster> raster_;
};

}  // namespace lumo::gdal
