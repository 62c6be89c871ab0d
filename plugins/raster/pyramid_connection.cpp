#include "pyramid_connection.h"

#include <filesystem>

#include "data/file_uri.h"
#include "foundation/fault.h"
#include "foundation/file_faults.h"
#include "pyramid_reader.h"

namespace lumo::pyramid {
namespace {

constexpr std::string_view kCompression = "COMPRESSION=";

bool ReadCompression(std::string_view word, Packing& compression) {
  if (word != "LZ4" && word != "NONE") return false;
  compression = word == "LZ4" ? Packing::kLz4 : Packing::kNone;
  return true;
}

lumo::RasterDef DefOf(const Header& header) {
  lumo::RasterDef def;
  def.samples = header.samples;
  def.lines = header.lines;
  def.bands = header.bands;
  def.dataType = header.dataType;
  def.tileWidth = def.tileHeight = header.Tiling().side;
  def.interleave = Interleave::BIP;
  def.format = "Pyramid";
  return def;
}

bool IsOf(const Header& header, const lumo::RasterDef& def) {
  return header.samples == def.samples && header.lines == def.lines && header.bands == def.bands &&
         header.dataType == def.dataType;
}

}  // namespace

bool FindPlace(const Array<String>& connStrings, Place& place) {
  Array<String> pieces;
  RemoveFormatNames(connStrings, pieces);
  for (const String& piece : pieces) {
    const std::string text = piece.ToUTF8();
    if (text.starts_with(kCompression) &&
        ReadCompression(std::string_view(text).substr(kCompression.size()), place.compression)) {
      continue;
    }
    if (!place.path.empty()) {
      SetFault("Pyramid: \"" + text + "\" is one piece too many");
      return false;
    }
    place.path = PathOfFileURI(FileURI(text));
  }
  if (place.path.empty()) SetFault("Pyramid: no file named");
  return !place.path.empty();
}

bool Connection::Fail(const std::string& fault) const {
  SetFault(path_ + ": " + fault);
  return false;
}

bool Connection::Begin(const Array<String>& connStrings) {
  Disconnect();
  Place place;
  if (!FindPlace(connStrings, place)) return false;
  path_ = place.path;
  compression_ = place.compression;
  return true;
}

bool Connection::Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                         const MetadataPtr& metadata) {
  if (!Begin(connStrings)) return false;
  build_ = Build::Find(path_);
  if (build_ != nullptr) {
    def_ = DefOf(build_->GetHeader());
    std::error_code ignored;
    if (std::filesystem::exists(path_, ignored)) OpenFile();  // what stands there may be of no use
    TakeFault();
  } else {
    file_ = PyramidFile::Open(path_);
    if (file_ == nullptr) return false;
    def_ = DefOf(file_->GetHeader());
  }
  if (geoRef) def_.SetGeoRef(geoRef);
  if (metadata) def_.metadata = *metadata;
  return MakeReader();
}

bool Connection::CreateRaster(const Array<String>& connStrings, const lumo::RasterDef& def) {
  if (!Begin(connStrings)) return false;
  def_ = def;
  def_.interleave = Interleave::BIP;
  def_.format = "Pyramid";
  def_.tileWidth = def_.tileHeight = 0;
  if (def.samples == 0 || def.lines == 0 || def.bands == 0 || DataTypeBytes(def.dataType) == 0) {
    return Fail("a pyramid of a raster without pixels can't be made");
  }
  return MakeReader();
}

bool Connection::MakeReader() {
  Array<String> strings{ArrayDims(2)};
  strings[0] = "Pyramid";
  strings[1] = String(path_);
  return DispatchType(TwelveTypes{}, def_.dataType, [&]<typename T>() {
    auto* const reader = new Reader<T>(this);
    const RasterReaderPtr<T> owner(reader);
    if (!reader->LoadValues()) return false;
    SetOpened(strings, FileURI(path_), owner);
    return true;
  });
}

void Connection::Disconnect() {
  PlainRasterConnection::Disconnect();
  LeaveBuild();
  file_.reset();
  cache_.Clear();
  def_.Clear();
}

/// Opens what stands on the disk, in place of what was open.
bool Connection::OpenFile() {
  std::unique_ptr<PyramidFile> file = PyramidFile::Open(PathShown());
  if (file == nullptr) {
    ShowFault();
    return false;
  }
  if (!IsOf(file->GetHeader(), def_)) return Fail("has become the pyramid of another raster");
  file_ = std::move(file);
  cache_.Clear();
  def_.tileWidth = def_.tileHeight = file_->GetHeader().Tiling().side;
  return true;
}

void Connection::LeaveBuild() {
  if (build_ != nullptr) build_->Leave(this);
  build_.reset();
}

const std::string& Connection::PathShown() const {
  return IsPending() ? build_->TemporaryPath() : path_;
}

bool Connection::BeginBuild(const Header& wanted) {
  LeaveBuild();
  Header header = wanted;
  header.samples = def_.samples;
  header.lines = def_.lines;
  header.bands = def_.bands;
  header.dataType = def_.dataType;
  header.compression = compression_;
  build_ = Build::Begin(path_, header, this);
  return build_ != nullptr;
}

bool Connection::Refresh(const std::string& values, bool getsStats) {
  bool hasTakenPlace = false;
  const bool isWhole = build_ != nullptr && !build_->IsOver() && build_->IsWhole();
  if (isWhole) build_->Complete(values);
  if (build_ != nullptr && build_->HasFailed()) {
    LeaveBuild();
    return false;
  }
  if (isWhole && build_->MayTakePlace(this)) {
    const bool isMissing = getsStats && build_->IsOfAnother(this) && !build_->HasValues();
    const bool hasPlace = !isMissing && build_->TakePlace();
    if (isMissing) build_->GiveUp();
    LeaveBuild();
    if (!isMissing && !hasPlace) return false;
    hasTakenPlace = hasPlace;
  }
  if (build_ != nullptr && (build_->IsOver() || build_.use_count() == 1)) LeaveBuild();
  if (file_ != nullptr && file_->IsCurrent() && file_->Path() == PathShown()) return true;
  std::error_code ignored;
  // The file that stands in its place is whole, also where it can't be shown here.
  if (std::filesystem::exists(PathShown(), ignored)) {
    const bool isShown = OpenFile();
    if (!isShown && IsPending()) {
      const String fault = TakeFault();
      build_->GiveUp(fault.ToUTF8());  // what can't be read again isn't given its place
      SetFault(fault);
      LeaveBuild();
    }
    return isShown || hasTakenPlace;
  }
  file_.reset();
  cache_.Clear();
  return Fail("there is no pyramid");
}

bool Connection::ChangeValues(const std::function<bool(const std::string&, std::string&)>& change) {
  const std::shared_ptr<Build> pending = IsPending() ? build_ : nullptr;
  const bool isStored = pyramid::ChangeValues(PathShown(), change);
  if (pending != nullptr) pending->NoteValues(isStored);
  if (!isStored) ShowFault();
  return isStored;
}

/// Sets the fault of this thread by the path that the user knows.
void Connection::ShowFault() const {
  const std::string fault = TakeFault().ToUTF8();
  const std::string& shown = PathShown();
  SetFault(fault.starts_with(shown) ? path_ + fault.substr(shown.size()) : fault);
}

bool Connection::Delete() {
  LeaveBuild();
  file_.reset();
  cache_.Clear();
  const FileFaults faults;
  if (!IsPyramidFile(path_)) {
    const FileFault* const unread = faults.FirstOf(path_);
    return Fail(unread != nullptr ? unread->Text() : "there is no pyramid");
  }
  std::error_code fault;
  return std::filesystem::remove(path_, fault) || Fail(fault.message());
}

}  // namespace lumo::pyramid
