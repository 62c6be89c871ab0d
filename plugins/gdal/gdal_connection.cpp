#include "gdal_connection.h"

#include "gdal_common/messages.h"
#include "gdal_metadata.h"
#include "gdal_reader.h"
#include "metadata/metadata_parser.h"
#include "metadata/metadata_readers.h"

namespace lumo::gdal {

bool Connection::Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                         const MetadataPtr& metadata) {
  Disconnect();
  Source source;
  if (!ParseSource(connStrings, source)) return false;
  raster_ = OpenRaster::Open(format_, source);
  if (raster_ == nullptr) return false;
  lumo::RasterDef def = raster_->Describe(geoRef.IsNull());
  const bool hasGrid = def.geoRef && def.geoRef->GetType() != GeoRef::kRpc;
  if (geoRef) def.SetGeoRef(geoRef);
  def.metadata = metadata ? *metadata : ReadMetadata(raster_->Dataset(), hasGrid);
  return MakeReader(connStrings, source, def);
}

bool Connection::CreateRaster(const Array<String>& connStrings, const lumo::RasterDef& def) {
  Disconnect();
  Source source;
  if (!ParseSource(connStrings, source) || !ParseTarget(source)) return false;
  raster_ = OpenRaster::Create(format_, source, def);
  if (raster_ == nullptr) return false;
  lumo::RasterDef made = raster_->Describe();
  made.noData = raster_->KeptNoData();
  made.SetGeoRef(def.geoRef);
  made.metadata = def.metadata;
  if (raster_->HasRows()) made.creation.rows = def.creation.rows;
  return MakeReader(ConnStrings({String(format_.key), String(source.name)}), source, made);
}

bool Connection::MakeReader(const Array<String>& connStrings, const Source& source,
                            const lumo::RasterDef& def) {
  return DispatchType(TwelveTypes{}, def.dataType, [&]<typename T>() {
    SetOpened(connStrings, source.uri, RasterReaderPtr<T>(new Reader<T>(this, *raster_, def)));
    return true;
  });
}

bool Connection::GetMetadata(const String& mdfPath, const LockableMetadataImplPtr& store) {
  if (raster_ == nullptr || !store) return FailWith(format_.key, "no raster is open");
  MetadataContainer texts;
  CollectTexts(*raster_, texts);
  const auto say = [&](const char* path, const std::string& text) {
    texts.Put(path, std::make_unique<MetadataString>(std::vector<String>{String(text)}));
  };
  say(kParserUri, raster_->Name());
  say(kParserType, "GdalParser - " + raster_->FormatKey());
  return CollectedMetadataReader().Read(texts, mdfPath, *store);
}

void Connection::Disconnect() {
  PlainRasterConnection::Disconnect();
  if (raster_ != nullptr) raster_->Close();
  raster_.reset();
}

}  // namespace lumo::gdal
