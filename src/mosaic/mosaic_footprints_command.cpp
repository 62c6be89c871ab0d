#include <chrono>
#include <cstdlib>
#include <filesystem>

#include <fmt/format.h>

#include "commands/catalog.h"
#include "foundation/fault.h"
#include "foundation/progress.h"
#include "mosaic/mosaic_command.h"

namespace lumo {
namespace {

constexpr double kUsualSmoothing = 3.1;

const CommandDeclaration kMake{
    "MakeMosaicFootPrintsCommand",
    "Mosaics",
    "Makes the footprints of a mosaic's scenes that have none, and stores them in its definition. "
    "A command of this library's own.",
    {{"MosaicURI", Presence::kRequired, ValueKind::kURI, "the mosaic"},
     {"Again", Presence::kOptional, ValueKind::kBoolean, "1: of all scenes"},
     {"SmoothParameter", Presence::kOptional, ValueKind::kNumber,
      "how far outlines may lie from the pixels; 3.1 when absent", "square pixels"},
     {"NoData", Presence::kOptional, ValueKind::kNumber, "see MosaicFootPrintsCommand"},
     {"Tolerance", Presence::kOptional, ValueKind::kNumber, "see MosaicFootPrintsCommand",
      "pixel values"},
     {"MaskURIs", Presence::kOptional, ValueKind::kURIArray,
      "for each scene a mask, see MosaicFootPrintsCommand; empty for none"}},
    {{"Made", ValueKind::kInteger, "how many footprints were made"}}};

/// Holds an object in the catalog, where commands find it, while it lives.
class CatalogEntryScope {
 public:
  explicit CatalogEntryScope(const ObjectPtr& object) : object_(object) { catalog::Add(object_); }
  ~CatalogEntryScope() { catalog::Remove(object_); }
  CatalogEntryScope(const CatalogEntryScope&) = delete;
  CatalogEntryScope& operator=(const CatalogEntryScope&) = delete;

 private:
  const ObjectPtr object_;
};

class MakeMosaicFootPrintsCommand final : public MosaicCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const bool isDone = OnMosaic([&]<typename T>(const MosaicRasterPtr<T>& mosaic) {
      return MakeAll(*mosaic->Definition());
    });
    return isDone ? Succeed() : Fail(TakeFaultOr("the footprints could not be made"));
  }

  template <typename T>
  bool MakeAll(MosaicRasterDef<T>& definition) {
    const auto isAgain = Read<bool>("Again");
    const auto masks = Read<Array<URI>>("MaskURIs");
    const unsigned count = definition.SceneCount();
    if (masks.GetCount() != 0 && masks.GetCount() != count) {
      SetFault("MaskURIs: there has to be one for each scene, or an empty one");
      return false;
    }
    std::vector<unsigned> wanted;
    for (unsigned i = 0; i < count; ++i) {
      if (isAgain || !definition.Footprints().HasKey(definition.SceneKey(i))) wanted.push_back(i);
    }
    unsigned made = 0;
    Write("Made", made);
    for (const unsigned scene : wanted) {
      const ProgressReportPtr share(
          new ScaledProgressReport(GetIPC().progress, static_cast<double>(wanted.size()), 1));
      const URI mask = masks.GetCount() != 0 ? masks[scene] : URI();
      if (!Make(definition, scene, mask, IPC(GetIPC().abort, share))) {
        KeepWhatIsThere(definition);
        return false;
      }
      Write("Made", ++made);
      KeepNowAndThen(definition);
    }
    return true;
  }

  template <typename T>
  bool Make(MosaicRasterDef<T>& definition, unsigned scene, const URI& mask, const IPC& ipc) {
    if (ipc.abort->IsSet()) {
      SetFault("the making of footprints was aborted");
      return false;
    }
    const RasterPtr<T>& raster = definition.Scenes()[scene];
    const String key = definition.SceneKey(scene);
    String file = definition.Footprints().Find(key);
    if (file.GetLength() == 0) file = FreeName(definition.WorkingDirectory().ToUTF8());
    const CatalogEntryScope entry{ObjectPtr(raster)};
    ParameterMap inputs;
    const auto add = [&](const char* name, const auto& value) {
      inputs[name].object = MakeText(FormatValue(value));
    };
    add("RasterURI", URI(key));
    add("Level", 0U);
    add("SmoothParameter",
        HasInput("SmoothParameter") ? Read<double>("SmoothParameter") : kUsualSmoothing);
    add("VectorMSCFP", URI(file));
    for (const char* const name : {"NoData", "Tolerance"}) {
      if (HasInput(name)) inputs[name].object = GetInput(name);
    }
    if (mask.GetLength() != 0) add("MaskURI", mask);
    const CommandPtr command = CreateCommand("MosaicFootPrintsCommand");
    command->SetState(CommandState::kStarted);
    command->Run(inputs, ipc);
    if (command->GetResult() == CommandResult::kSuccess) {
      definition.Footprints()[key] = file;
      return true;
    }
    const std::string why = command->GetReason().ToUTF8();
    SetFault(
        fmt::format("scene {}: {}", scene, why.empty() ? "the footprint could not be made" : why));
    return false;
  }

  /// A name in a folder that no file has, from a random number on.
  static String FreeName(const std::string& folder) {
    constexpr unsigned kNumbers = 10000;
    static thread_local unsigned seed =
        static_cast<unsigned>(std::chrono::steady_clock::now().time_since_epoch().count());
    seed = seed * 1103515245U + 12345U;  // ISO C, 7.22.2.2
    for (unsigned number = (seed >> 16) % kNumbers;; ++number) {
      const std::string name = fmt::format("{}{}_footprint.msf", folder, number);
      std::error_code fault;
      if (!std::filesystem::exists(name, fault)) return String(name);
    }
  }

  /// Stores what has come in so far every few seconds, so that a killed run need not begin anew.
  void KeepNowAndThen(BasicMosaicRasterDef& definition) {
    const auto now = std::chrono::steady_clock::now();
    if (now - kept_ < std::chrono::seconds(5)) return;
    KeepWhatIsThere(definition);
    kept_ = now;
  }

  /// Stores what has come in, without a word of whether that succeeds.
  static void KeepWhatIsThere(BasicMosaicRasterDef& definition) {
    const String fault = TakeFault();
    std::string ignored;
    definition.Keep(ignored);
    SetFault(fault);
  }

  std::chrono::steady_clock::time_point kept_ = std::chrono::steady_clock::now();
};

const CommandFactoryT<MakeMosaicFootPrintsCommand> factory(kMake);

}  // namespace
}  // namespace lumo
