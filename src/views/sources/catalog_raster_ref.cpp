#include "views/sources/catalog_raster_ref.h"

#include "commands/catalog.h"
#include "data/access_policy.h"
#include "data/data_manager.h"
#include "data/file_uri.h"
#include "foundation/fault.h"
#include "views/sources/raster_decorator.h"
#include "views/sources/reader_raster.h"
#include "views/sources/source_raster.h"

namespace lumo {
namespace {

/// True when a pyramid is one of a raster of the same size and pixel type; else sets the fault.
bool BelongTogether(RasterDataConnection& source, RasterDataConnection& pyramid) {
  const RasterDef raster = source.RasterDef(), levels = pyramid.RasterDef();
  const bool isSameType = source.DataType() == pyramid.DataType();
  if (isSameType && raster.samples == levels.samples && raster.lines == levels.lines &&
      raster.bands == levels.bands) {
    return true;
  }
  SetFault(source.URI().ToUTF8() + (isSameType ? ": the pyramid is of a raster of another size"
                                               : ": the pyramid has another pixel type"));
  return false;
}

/// False for a raster on a source whose files have changed since it was opened.
bool IsUpToDate(const BasicRasterPtr& raster) {
  const auto* const source = dynamic_cast<const SourceRaster*>(raster.Get());
  return source == nullptr || source->IsUpToDate();
}

}  // namespace

std::span<const EnumWord<PyramidCheck>> WordsOf(PyramidCheck) {
  static constexpr EnumWord<PyramidCheck> kWords[] = {{"Told", PyramidCheck::kTold},
                                                      {"Fitting", PyramidCheck::kFitting}};
  return kWords;
}

std::span<const EnumWord<SourceCheck>> WordsOf(SourceCheck) {
  static constexpr EnumWord<SourceCheck> kWords[] = {{"Told", SourceCheck::kTold},
                                                     {"Compared", SourceCheck::kCompared}};
  return kWords;
}

BasicRasterPtr MakeReaderRaster(const DataConnectionPtr& connection,
                                const DataConnectionPtr& pyramidConnection, const URI& uri) {
  const RasterDataConnectionPtr source(connection);
  if (!source) {
    if (connection) SetFault(connection->URI().ToUTF8() + ": the source is no raster");
    return {};
  }
  const RasterReaderDispatchPtr dispatch = source->RasterReaderDispatch();
  const RasterDataConnectionPtr pyramid(pyramidConnection);
  const RasterReaderDispatchPtr pyramidDispatch =
      pyramid ? pyramid->RasterReaderDispatch() : RasterReaderDispatchPtr();
  if (pyramid && !BelongTogether(*source, *pyramid)) return {};
  BasicRasterPtr made;
  if (dispatch) {
    DispatchType(TwelveTypes{}, dispatch->DataType(), [&]<typename T>() {
      const RasterReaderPtr<T> pyramidReader =
          pyramidDispatch ? pyramidDispatch->Get<T>() : RasterReaderPtr<T>();
      made.Reset(new ReaderRaster<T>(dispatch->Get<T>(), source, pyramidReader, pyramid, uri));
      return true;
    });
  }
  if (!made) {
    SetFault(source->URI().ToUTF8() + ": the pixel type of the source can't be read");
    return made;
  }
  const RasterDecorator decorate = FindRasterDecorator(source->RasterDef().format);
  return decorate != nullptr ? decorate(made, *source, uri) : made;
}

CatalogRasterRef::CatalogRasterRef(const BasicRasterPtr& raster, bool releaseOnDestroy)
    : releaseOnDestroy_(releaseOnDestroy) {
  Enter(raster);
}

CatalogRasterRef::CatalogRasterRef(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                                   const MetadataPtr& metadata, bool useProxy,
                                   bool releaseOnDestroy)
    : releaseOnDestroy_(releaseOnDestroy) {
  if (!MayUseSource(connStrings, false)) return;
  DataManager& manager = GetGlobalDataManager();
  DataConnectionPtr connection = useProxy ? manager.Connect(connStrings, geoRef, metadata)
                                          : manager.ConnectDirect(connStrings, geoRef, metadata);
  if (!connection) return;
  BasicRasterPtr raster(catalog::Find(connection->URI()));
  if (!raster) raster = MakeReaderRaster(connection);
  manager.ReleaseConnection(connection);
  Enter(raster);
}

CatalogRasterRef::CatalogRasterRef(const DataConnectionPtr& connection,
                                   const DataConnectionPtr& pyramid, SourceCheck check)
    : releaseOnDestroy_(false) {
  const URI uri = connection->URI();
  if (check == SourceCheck::kTold) {
    BasicRasterPtr raster(catalog::Find(uri));
    if (!raster) raster = MakeReaderRaster(connection, pyramid);
    Enter(raster);
    return;
  }
  // Each round looks at one more raster that has been opened on the source.
  for (unsigned counter = 1;; ++counter) {
    const URI counted = CountedURI(uri, counter);
    const BasicRasterPtr raster(catalog::Find(counted));
    if (raster && !IsUpToDate(raster)) continue;
    Enter(raster ? raster : MakeReaderRaster(connection, pyramid, counted));
    return;
  }
}

CatalogRasterRef::~CatalogRasterRef() {
  if (releaseOnDestroy_) catalog::Remove(raster_);
}

void CatalogRasterRef::Enter(const BasicRasterPtr& raster) {
  if (!raster) return;
  raster_ = raster;
  dataType_ = raster->DataType();
  catalog::Add(raster);
}

}  // namespace lumo
