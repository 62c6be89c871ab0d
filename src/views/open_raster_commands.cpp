#include <filesystem>

#include "commands/catalog.h"
#include "data/data_manager.h"
#include "foundation/fault.h"
#include "views/publish_raster.h"
#include "views/reader_raster.h"

namespace lumo {
namespace {

std::vector<OutputDeclaration> OpenOutputs() {
  std::vector<OutputDeclaration> outputs = PublishedOutputs();
  outputs.push_back({"Note", ValueKind::kText, "what of the inputs had no effect; only then"});
  return outputs;
}

const CommandDeclaration kOpen{
    "OpenRasterCommand",
    "Rasters",
    "Opens a raster source. One that is open already is shared.",
    {{"ConnStr", Presence::kRequired, ValueKind::kTextList,
      "the source: a file, with or without the key of its format"},
     {"PyramidConnStr", Presence::kOptional, ValueKind::kTextList,
      "a pyramid file that belongs to it; one that isn't there yet can be built"},
     {"PyramidNew", Presence::kOptional, ValueKind::kBoolean,
      "1: a pyramid file that is there is not looked at, only replaced by a build"},
     {"GeoRef", Presence::kOptional, ValueKind::kGeoRef, "in place of the source's own"}},
    OpenOutputs()};

class OpenRasterCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    GeoRefPtr geoRef;
    if (HasInput("GeoRef")) {
      geoRef = Read<GeoRefPtr>("GeoRef");
      if (!geoRef) return Fail("GeoRef makes no geo-reference");
    }
    const auto connStrings = Read<Array<String>>("ConnStr");
    const auto pyramidStrings = Read<Array<String>>("PyramidConnStr");
    if (pyramidStrings.GetCount() != 0) return OpenWithPyramid(connStrings, pyramidStrings, geoRef);
    const CatalogRasterRef opened(connStrings, geoRef, MetadataPtr(), true, false);
    return Publish(opened);
  }

  CommandResult OpenWithPyramid(const Array<String>& connStrings,
                                const Array<String>& pyramidStrings, const GeoRefPtr& geoRef) {
    DataManager& manager = GetGlobalDataManager();
    const DataConnectionPtr source = manager.Connect(connStrings, geoRef, MetadataPtr());
    if (!source) return Fail();
    const DataConnectionPtr pyramid =
        ConnectPyramid(pyramidStrings, RasterDataConnectionPtr(source));
    if (!pyramid) return Fail();
    BasicRasterPtr raster(catalog::Find(source->URI()));
    if (!raster) {
      raster = MakeReaderRaster(source, pyramid);
    } else if (PyramidOf(*raster) != pyramid->URI()) {
      Write("Note", String("the raster is open already, without this pyramid; it is opened with it "
                           "once everybody has closed it"));
    }
    return Publish(CatalogRasterRef(raster, false));
  }

  /// The source that the pyramid of an open raster was opened from; no text for none.
  static URI PyramidOf(const BasicRaster& raster) {
    URI uri;
    DispatchType(TwelveTypes{}, raster.DataType(), [&]<typename T>() {
      const auto* const reader = dynamic_cast<const ReaderRaster<T>*>(&raster);
      if (reader != nullptr) uri = reader->PyramidURI();
      return true;
    });
    return uri;
  }

  /// Opens a pyramid; one of the library's own that isn't there, or is to be replaced, has no file
  /// until it is built.
  DataConnectionPtr ConnectPyramid(const Array<String>& strings,
                                   const RasterDataConnectionPtr& source) {
    DataManager& manager = GetGlobalDataManager();
    Array<String> names;
    const bool isOurs = SplitConnStr(strings, names) == "Pyramid" && names.GetCount() != 0;
    std::error_code ignored;
    if (!source || !isOurs ||
        (!Read<bool>("PyramidNew") && std::filesystem::exists(names[0].ToUTF8(), ignored))) {
      return manager.Connect(strings, GeoRefPtr(), MetadataPtr());
    }
    RasterDef def = source->RasterDef();
    def.format = "Pyramid";
    return manager.CreateRaster(strings, def);
  }
};

const CommandFactoryT<OpenRasterCommand> openFactory(kOpen);

const CommandDeclaration kAccess{"AccessRasterCommand",
                                 "Rasters",
                                 "Adds one to the opens of an open raster.",
                                 {{"SrcURI", Presence::kRequired, ValueKind::kURI, "the raster"}},
                                 PublishedOutputs()};

class AccessRasterCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster("SrcURI");
    if (!raster) return Fail();
    return Publish(CatalogRasterRef(raster, false));
  }
};

const CommandFactoryT<AccessRasterCommand> accessFactory(kAccess);

/// Lets go of one open of whatever object; one that isn't there is no failure. A source that can't
/// be finished as the last open goes says so in the outputs: it is closed all the same.
class CloseCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    TakeFault();
    catalog::Release(Read<URI>("URI"));
    const String fault = TakeFault();
    if (fault.GetLength() != 0) Write("Fault", fault);
    return Succeed();
  }
};

const OutputDeclaration kCloseFault{"Fault", ValueKind::kText,
                                    "why a new source could not be finished; only then"};

const InputDeclaration kClosed{"URI", Presence::kRequired, ValueKind::kURI,
                               "what to close; nothing happens when it isn't open"};
const CommandDeclaration kCloseRaster{"CloseRasterCommand",
                                      "Rasters",
                                      "Takes one from the opens of a raster.",
                                      {kClosed},
                                      {kCloseFault}};
const CommandDeclaration kCloseMask{"CloseRasterMaskCommand",
                                    "Rasters",
                                    "Takes one from the opens of a mask.",
                                    {kClosed},
                                    {kCloseFault}};
const CommandDeclaration kCloseMetadata{"CloseMetadataCommand",
                                        "Metadata",
                                        "Takes one from the opens of metadata.",
                                        {kClosed},
                                        {kCloseFault}};

const CommandFactoryT<CloseCommand> closeRasterFactory(kCloseRaster);
const CommandFactoryT<CloseCommand> closeMaskFactory(kCloseMask);
const CommandFactoryT<CloseCommand> closeMetadataFactory(kCloseMetadata);

}  // namespace
}  // namespace lumo
