#include "shape_connection.h"

#include "shape_reader.h"

namespace lumo::shapefile {

bool Connection::Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                         const MetadataPtr&) {
  Disconnect();
  gdal::Source source;
  if (!ParseSource(connStrings, source)) return false;
  layer_ = Layer::Open(format_, source);
  return layer_ != nullptr && MakeReader(connStrings, source, geoRef);
}

bool Connection::CreateVector(const Array<String>& connStrings, const lumo::VectorDef& def) {
  Disconnect();
  gdal::Source source;
  if (!ParseSource(connStrings, source) || !ParseTarget(source)) return false;
  layer_ = Layer::Create(format_, source, def);
  return layer_ != nullptr &&
         MakeReader(ConnStrings({String(format_.key), String(source.name)}), source, def.geoRef);
}

bool Connection::MakeReader(const Array<String>& connStrings, const gdal::Source& source,
                            const GeoRefPtr& geoRef) {
  connStrings_ = connStrings;
  uri_ = source.uri;
  const VectorReaderPtr<double> reader(new Reader(this, *layer_, geoRef));
  dispatch_.Reset(new lumo::VectorReaderDispatch(reader));
  return true;
}

void Connection::Disconnect() {
  dispatch_.Reset(new lumo::VectorReaderDispatch);
  if (layer_ != nullptr) layer_->Close();
  layer_.reset();
}

lumo::VectorDef Connection::VectorDef() {
  const auto& reader = dispatch_->GetBasic();
  return reader ? reader->VectorDef() : lumo::VectorDef();
}

}  // namespace lumo::shapefile
