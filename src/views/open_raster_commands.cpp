#include <filesystem>
#include <functional>

#include "commands/catalog.h"
#include "data/data_manager.h"
#include "foundation/abortable_call.h"
#include "foundation/fault.h"
#include "views/publish_raster.h"

namespace lumo {
namespace {

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
     {"GeoRef", Presence::kOptional, ValueKind::kGeoRef, "in place of the source's own"},
     {"CheckSource", Presence::kOptional, ValueKind::kWord,
      "Told: a source that is open is shared, whatever has become of its file; Compared: one whose "
      "file is another one now, or has changed its size or time, gives a raster of its own, whose "
      "URI has a counter behind it",
      "", &WordsIn<SourceCheck>}},
    PublishedOutputs()};

/// What the opening of a source gives.
struct Opened {
  DataConnectionPtr source;
  DataConnectionPtr pyramid;
};

class OpenRasterCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    GeoRefPtr geoRef;
    if (HasInput("GeoRef")) {
      geoRef = Read<GeoRefPtr>("GeoRef");
      if (!geoRef) return Fail("GeoRef makes no geo-reference");
    }
    Opened opened;
    if (!RunAbortable<Opened>(*GetIPC().abort, MakeOpening(geoRef), opened)) {
      return Fail("aborted while the source was being opened");
    }
    if (!opened.source) return Fail();
    return Publish(
        CatalogRasterRef(opened.source, opened.pyramid, Read<SourceCheck>("CheckSource")));
  }

  /// The opening with all that it needs, since it may outlive the command.
  std::function<Opened()> MakeOpening(const GeoRefPtr& geoRef) const {
    const auto sourceStrings = Read<Array<String>>("ConnStr");
    const auto pyramidStrings = Read<Array<String>>("PyramidConnStr");
    const auto isNew = Read<bool>("PyramidNew");
    return [=] {
      Opened opened;
      opened.source = GetGlobalDataManager().Connect(sourceStrings, geoRef, MetadataPtr());
      if (!opened.source || pyramidStrings.GetCount() == 0) return opened;
      opened.pyramid =
          ConnectPyramid(pyramidStrings, isNew, RasterDataConnectionPtr(opened.source));
      return opened.pyramid ? opened : Opened();
    };
  }

  /// Opens a pyramid; one of the library's own that isn't there, or is to be replaced, has no file
  /// until it is built.
  static DataConnectionPtr ConnectPyramid(const Array<String>& strings, bool isNew,
                                          const RasterDataConnectionPtr& source) {
    DataManager& manager = GetGlobalDataManager();
    Array<String> names;
    const bool isOurs = SplitConnStr(strings, names) == "Pyramid" && names.GetCount() != 0;
    std::error_code ignored;
    if (!source || !isOurs || (!isNew && std::filesystem::exists(names[0].ToUTF8(), ignored))) {
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
