#include "data/file_uri.h"
#include "data/plain_factory.h"
#include "foundation/fault.h"
#include "mosaic_reader.h"

namespace lumo {
namespace {

/// The definition file that a source names; empty for another source.
std::string PathOf(const Array<String>& connStrings) {
  Array<String> rest;
  RemoveFormatNames(connStrings, rest);
  return rest.GetCount() == 1 ? rest[0].ToUTF8() : std::string();
}

/// An open definition.
class MosaicConnection final : public PlainRasterConnection {
 public:
  bool Connect(const Array<String>& connStrings, const GeoRefPtr& /*geoRef*/,
               const MetadataPtr& /*metadata*/) override {
    const std::string path = PathOf(connStrings);
    if (path.empty()) {
      SetFault("a mosaic is named by its definition file alone");
      return false;
    }
    MosaicDocument document;
    std::string fault;
    if (!LoadMosaic(path, document, fault)) {
      SetFault(fault);
      return false;
    }
    return DispatchType(EightTypes{}, document.dataType, [&]<typename T>() {
      const RasterReaderPtr<T> reader(new MosaicReader<T>(this, path, document));
      SetOpened(connStrings, FileURI(path), reader);
      return true;
    });
  }
};

class MosaicFactory final : public PlainFactory {
 public:
  MosaicFactory() : PlainFactory("EXTERNAL") {}

  bool CanConnect(const Array<String>& connStrings) override {
    return IsMosaicFile(PathOf(connStrings));
  }
  DataConnectionPtr CreateRaster(const Array<String>&, const RasterDef&) override {
    return FailWith("a mosaic is made of scenes, by CreateMosaicCommand");
  }

 private:
  DataConnection* Make() override { return new MosaicConnection; }
};

}  // namespace
}  // namespace lumo

/// The entry point of the plug-in.
extern "C" VEXG_EXPORT lumo::DataConnectionFactory* CreateDataConnectionFactory(
    lumo::FormatRecord* record) {
  static lumo::MosaicFactory factory;
  return record->name == "EXTERNAL" ? &factory : nullptr;
}
