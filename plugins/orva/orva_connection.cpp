#include "orva/orva_connection.h"

#include "data/file_uri.h"
#include "foundation/fault.h"
#include "orva/orva_reader.h"

namespace lumo::orva {

bool Connection::Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                         const MetadataPtr& metadata) {
  Disconnect();
  const std::string path = FindPath(connStrings);
  if (path.empty()) return false;
  file_ = File::Open(path);
  if (file_ == nullptr || !MakeReader()) return false;
  if (geoRef) def_.SetGeoRef(geoRef);
  if (metadata) def_.metadata = *metadata;
  return true;
}

bool Connection::CreateRaster(const Array<String>& connStrings, const lumo::RasterDef& def) {
  Disconnect();
  const std::string path = FindPath(connStrings);
  if (path.empty()) return false;
  file_ = File::Create(path, def);
  if (file_ == nullptr || !MakeReader()) return false;
  def_.metadata = def.metadata;
  return true;
}

bool Connection::MakeReader() {
  const Header& header = file_->GetHeader();
  def_ = MakeRasterDef(header);
  std::string fault;
  const bool made = DispatchType(TwelveTypes{}, header.dataType, [&]<typename T>() {
    BandValues<T> values;
    if (!values.Read(header, fault)) return false;
    dispatch_.Reset(
        new lumo::RasterReaderDispatch(RasterReaderPtr<T>(new Reader<T>(this, std::move(values)))));
    return true;
  });
  if (made) return true;
  SetFault(HeaderPath(file_->Path()) + ": " + fault);
  Disconnect();
  return false;
}

void Connection::Disconnect() {
  dispatch_.Reset(new lumo::RasterReaderDispatch);
  if (file_ != nullptr) file_->Close();
  file_.reset();
  def_.Clear();
}

Array<String> Connection::ConnectionStrings() {
  Array<String> strings;
  if (file_ == nullptr || !strings.Resize(ArrayDims(2))) return strings;
  strings[0] = "ORVA";
  strings[1] = String(file_->Path());
  return strings;
}

lumo::URI Connection::URI() {
  return file_ != nullptr ? FileURI(file_->Path()) : lumo::URI();
}

bool Connection::GetMetadata(const String&, const LockableMetadataImplPtr&) {
  SetFault("ORVA: a header is not translated by a definition file here");
  return false;
}

}  // namespace lumo::orva
