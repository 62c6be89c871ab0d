#include <filesystem>
#include <functional>

#include "commands/catalog.h"
#include "commands/division.h"
#include "data/data_manager.h"
#include "data/file_uri.h"
#include "data/raster_reader.h"
#include "foundation/abortable_call.h"
#include "foundation/fault.h"
#include "foundation/warnings.h"
#include "views/publish_raster.h"
#include "views/sources/catalog_raster_ref.h"
#include "views/sources/file_state.h"
#include "views/sources/source_raster.h"

namespace lumo {
namespace {

/// Which levels a raster shows that has some of its own beside a pyramid file.
enum class LevelChoice : unsigned { kTold = 0, kBest = 1 };

std::span<const EnumWord<LevelChoice>> WordsOf(LevelChoice) {
  static constexpr EnumWord<LevelChoice> kWords[] = {{"Told", LevelChoice::kTold},
                                                     {"Best", LevelChoice::kBest}};
  return kWords;
}

std::vector<OutputDeclaration> OpenOutputs() {
  std::vector<OutputDeclaration> outputs = PublishedOutputs();
  outputs.push_back({"Note", ValueKind::kText,
                     "what of the inputs had no effect, or which levels are shown where Levels is "
                     "Best and there are two sets of them; only then"});
  outputs.push_back({"Warning", ValueKind::kText,
                     "what was found beside the source and left out, and why; only then"});
  return outputs;
}

/// When the levels that a file has itself were last written.
std::filesystem::file_time_type TimeOfOwnLevels(const std::string& path) {
  std::error_code fault;
  const auto beside = std::filesystem::last_write_time(path + ".ovr", fault);
  return fault ? std::filesystem::last_write_time(path, fault) : beside;
}

/// True when the levels of a source itself are newer than those of a pyramid file, or finer.
bool AreOwnLevelsBetter(BasicRasterReader& own, const std::string& path, BasicRasterReader& pyramid,
                        const std::string& pyramidPath) {
  if (!pyramid.PyramidExists() || own.PyramidLevelMin() < pyramid.PyramidLevelMin()) return true;
  std::error_code fault;
  const auto time = std::filesystem::last_write_time(pyramidPath, fault);
  return !fault && TimeOfOwnLevels(path) > time;
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
     {"GeoRef", Presence::kOptional, ValueKind::kGeoRef, "in place of the source's own"},
     {"Levels", Presence::kOptional, ValueKind::kWord,
      "of a source that has levels of its own beside a pyramid file. Told: those of the pyramid "
      "file; Best: its own where they are newer, or begin with a finer one",
      "", &WordsIn<LevelChoice>},
     {"PyramidCheck", Presence::kOptional, ValueKind::kWord,
      "Told: a pyramid file that can't be read, or is of a raster of another size or pixel type, "
      "makes the command fail; Fitting: any that was not built from the source as it is is left "
      "out, with a warning",
      "", &WordsIn<PyramidCheck>},
     {"CheckSource", Presence::kOptional, ValueKind::kWord,
      "Told: a source that is open is shared, whatever has become of its file; Compared: one whose "
      "file is another one now, or has changed its size or time, gives a raster of its own, whose "
      "URI has a counter behind it",
      "", &WordsIn<SourceCheck>}},
    OpenOutputs()};

/// The result of opening a source.
struct Opened {
  DataConnectionPtr source;
  DataConnectionPtr pyramid;
  std::vector<std::string> warnings;
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
    WriteWarnings(opened.warnings);
    if (opened.pyramid && Read<LevelChoice>("Levels") == LevelChoice::kBest &&
        ChoosesOwn(opened.source, opened.pyramid)) {
      opened.pyramid = DataConnectionPtr();
    }
    const CatalogRasterRef raster(opened.source, opened.pyramid, Read<SourceCheck>("CheckSource"));
    if (opened.pyramid && raster.Raster() && PyramidOf(*raster.Raster()) != opened.pyramid->URI()) {
      Write("Note", String("the raster is open already, without this pyramid; it is opened with it "
                           "once everybody has closed it"));
    }
    return Publish(raster);
  }

  /// The opening with all that it needs, since it may outlive the command.
  std::function<Opened()> MakeOpening(const GeoRefPtr& geoRef) const {
    const auto sourceStrings = Read<Array<String>>("ConnStr");
    const auto pyramidStrings = Read<Array<String>>("PyramidConnStr");
    const auto isNew = Read<bool>("PyramidNew");
    const auto check = Read<PyramidCheck>("PyramidCheck");
    return [=] {
      Opened opened;
      TakeWarnings();
      opened.source = GetGlobalDataManager().Connect(sourceStrings, geoRef, MetadataPtr());
      const RasterDataConnectionPtr source(opened.source);
      if (opened.source && pyramidStrings.GetCount() != 0) {
        opened.pyramid = ConnectPyramid(pyramidStrings, isNew, source);
        if (check == PyramidCheck::kFitting && !isNew) {
          KeepFitting(source, pyramidStrings, opened.pyramid);
        } else if (!opened.pyramid) {
          return Opened();
        }
      }
      opened.warnings = TakeWarnings();
      return opened;
    };
  }

  /// Lets go of a pyramid that is not that of the source, and says so.
  static void KeepFitting(const RasterDataConnectionPtr& source, const Array<String>& strings,
                          DataConnectionPtr& connection) {
    Array<String> names;
    SplitConnStr(strings, names);
    const std::string name = names.GetCount() != 0 ? names[0].ToUTF8() : "the pyramid";
    const RasterDataConnectionPtr pyramid(connection);
    if (!source || !pyramid) {
      AddWarning(TakeFaultOr((name + ": can't be opened").c_str()).ToUTF8() + "; it is not used");
      return;
    }
    const std::string mismatch = FindMismatch(*source, *pyramid);
    if (mismatch.empty()) return;
    AddWarning(name + " " + mismatch + " and is not used; vexg pyramid build makes it anew");
    connection = DataConnectionPtr();
  }

  void WriteWarnings(const std::vector<std::string>& warnings) {
    std::string text;
    for (const std::string& warning : warnings) {
      text.append(text.empty() ? "" : "; ").append(warning);
    }
    if (!text.empty()) Write("Warning", String(text));
  }

  /// True when the levels of the source itself are to be shown; notes which are where there are two
  /// sets.
  bool ChoosesOwn(const DataConnectionPtr& source, const DataConnectionPtr& pyramid) {
    const auto own = ReaderOf(source), beside = ReaderOf(pyramid);
    if (!own || !beside || !own->PyramidExists()) return false;
    const std::string path = PathOfFileURI(source->URI());
    const std::string pyramidPath = PathOfFileURI(pyramid->URI());
    const bool isBetter = AreOwnLevelsBetter(*own, path, *beside, pyramidPath);
    if (beside->PyramidExists()) {
      Write("Note", String(path + ": has levels of its own and a pyramid file; " +
                           (isBetter ? "its own are used, which are newer or begin with a finer one"
                                     : "those of the pyramid file are used")));
    }
    return isBetter;
  }

  static Pointer<BasicRasterReader> ReaderOf(const DataConnectionPtr& connection) {
    const RasterDataConnectionPtr source(connection);
    const RasterReaderDispatchPtr dispatch =
        source ? source->RasterReaderDispatch() : RasterReaderDispatchPtr();
    return dispatch ? dispatch->GetBasic() : Pointer<BasicRasterReader>();
  }

  /// The source that the pyramid of an open raster was opened from; no text for none.
  static URI PyramidOf(const BasicRaster& raster) {
    const auto* const source = dynamic_cast<const SourceRaster*>(&raster);
    return source != nullptr ? source->PyramidURI() : URI();
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
const DivisionRegistration openDivision({.command = "OpenRasterCommand",
                                         .makes = {"PyramidConnStr"},
                                         .makesWhen = "PyramidNew"});

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
