#include <algorithm>
#include <filesystem>
#include <iostream>
#include <optional>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "mosaic/scene_raster.h"
#include "options/option_values.h"
#include "output/json_number.h"
#include "pictures/picture_writer.h"
#include "pictures/quicklook_maker.h"
#include "platform/temporary_file.h"
#include "rasters/mosaic_options.h"
#include "rasters/raster_verb.h"
#include "rasters/scene_list.h"
#include "rasters/vector_info.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

constexpr const char* kWorkStep = "work";

bool IsFile(const std::string& name) {
  std::error_code missing;
  return fs::is_regular_file(name, missing);
}

std::string Capital(std::string word) {
  if (!word.empty() && word[0] >= 'a' && word[0] <= 'z') word[0] += 'A' - 'a';
  return word;
}

class MosaicVerb final : public RasterVerb {
 public:
  explicit MosaicVerb(OptionSet& line) {
    line.AddNote(
        "A mosaic is a definition file that names its scenes; every verb reads it as a raster. "
        "create writes it, footprints finds where scenes have pixels, match makes tables that give "
        "them the colours of the reference scene, seams decides which scene shows what, and build "
        "does all that and writes the raster. Scenes are files, patterns such as \"a/*.tif\", "
        "lists (*.txt, or @FILE), or STAC item collections; the first one with a pixel shows it.");
    line.AddExample("vexg mosaic create city.vmosaic a.tif b.tif c.tif --feather 20");
    line.AddExample("vexg mosaic build city.tif \"scenes/*.tif\" --grid EPSG:32633 --feather 20");
    line.Add("action", action_, "create, footprints, match, seams, info, show, export or build")
        .Shows("ACTION")
        .Takes(OneOf({"create", "footprints", "match", "seams", "info", "show", "export", "build"}))
        .Required();
    line.Add("file", file_, "The definition; with build the raster to make")
        .IsFile("MOSAIC")
        .Required();
    line.Add("more", more_, "create, build: the scenes; show, export: the file to make")
        .IsFile("SCENE|OUT");
    creation_.AddTo(line);
    footprints_.AddTo(line);
    line.Add("--level", level_, "match: pyramid level of the scenes whose pixels are counted")
        .Within(0, 31)
        .ShowsDefault();
    line.Add("--no-matching", isUnmatched_, "build: all scenes keep their colours");
    line.Add("--no-seams", isSeamless_,
             "build: without footprints and seams; the first scene with a pixel shows it");
    line.Add("--layer", layer_, "export: these polygons alone, for formats of one layer")
        .Takes(OneOf({"footprints", "seams"}));
    line.Add("--bands", bandsText_, "show: one band, or red,green,blue").Shows("B[,B,B]");
    line.Add("--size", size_, "show: pixels of the longer side at most")
        .Within(1, 16384)
        .ShowsDefault();
    line.Add("--json", isJson_, "info: as JSON");
    AddFormatTo(line);
  }

  ~MosaicVerb() override {
    std::error_code ignored;
    if (!folder_.empty()) fs::remove_all(folder_, ignored);
  }

  int Run() override {
    if (Is("create") || Is("build")) {
      scenes_ = ExpandScenes(more_, creation_.asset);
      if (scenes_.empty()) throw HostError(kExitUsage, action_ + ": which scenes?");
      GetSource().file = scenes_.front();
    } else {
      GetSource().file = file_;
      const bool makesFile = Is("show") || Is("export");
      if (more_.size() != (makesFile ? 1U : 0U)) {
        throw HostError(kExitUsage, makesFile
                                        ? action_ + ": name the file to make behind the mosaic"
                                        : action_ + " takes a mosaic alone");
      }
    }
    if (Is("build")) SetTargetName(file_);
    return Is("info") ? Info() : RasterVerb::Run();
  }

 private:
  bool Is(const char* action) const { return action_ == action; }

  // Steps.

  void CheckOptions() override {
    if (Is("build")) {
      RasterVerb::CheckOptions();
    } else if (Is("create") && !file_.ends_with(".vmosaic")) {
      throw HostError(kExitUsage, file_ + ": the name of a definition ends in .vmosaic");
    } else if (Is("show")) {
      CheckPictureName(more_[0]);
    } else if (Is("export") && !IsVectorName(more_[0])) {
      throw HostError(kExitUsage, more_[0] + ": no vector format has this ending");
    }
    if (footprints_.mask.empty()) return;
    if (footprints_.mask.find('*') == std::string::npos) {
      throw HostError(kExitUsage, "--mask: a * has to stand for the names of scenes");
    }
    if (Is("build")) throw HostError(kExitUsage, "--mask is for footprints alone");
  }

  std::vector<std::string> GetOutputs() const override {
    if (Is("build")) return RasterVerb::GetOutputs();
    if (Is("create")) return {file_};
    return Is("show") || Is("export") ? more_ : std::vector<std::string>();
  }

  std::vector<std::string> GetFurtherInputs() const override {
    std::vector<std::string> inputs = scenes_;
    if (IsFile(creation_.grid)) inputs.push_back(creation_.grid);
    return inputs;
  }

  std::vector<std::string> GetChangedFiles() const override {
    const bool changes = Is("footprints") || Is("match") || Is("seams");
    return changes ? std::vector{file_} : std::vector<std::string>();
  }

  void AddOpening(JobDraft& draft) const override {
    if (Is("build")) {
      RasterVerb::AddOpening(draft);
    } else if (Is("create")) {
      if (IsFile(creation_.grid)) AddOpen(draft, "like", {creation_.grid, ""});
    } else {
      AddOpenWithPyramid(draft, "mosaic", GetSource());
      AddQuery(draft, "mosaic", "$mosaic");
      draft.Step(kQueryStep, "QueryMosaicCommand").AddInput("MosaicURI", String("$mosaic"));
    }
  }

  void Plan(JobSession& session, const JobResults& opened) override {
    if (Is("build")) {
      session.GetInterruption().AddRemains(folder_);
      RasterVerb::Plan(session, opened);
    } else if (!Is("create")) {
      mosaic_ = URIOf(opened, "$mosaic");
      info_ = ReadInfo(opened, "mosaic");
      asked_ = opened.Find(kQueryStep).returns;
      if (Is("show")) bands_ = ChoosePictureBands(bandsText_, info_);
    }
  }

  JobDraft GetJob(const Outputs& outputs) const override {
    if (Is("build")) {
      isPrinting_ = true;
      return RasterVerb::GetJob(outputs);
    }
    JobDraft draft;
    if (Is("create")) {
      AddCreation(draft, outputs.Get(0).GetName(), outputs.Get(0).GetName());
      return draft;
    }
    AddOpen(draft, "mosaic", GetSource());
    AddWork(draft, "$mosaic", Is("export") || Is("show") ? outputs.Get(0).GetName() : "");
    draft.Close("close", "$mosaic");
    return draft;
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    if (Is("build")) {
      Prepare(session);
      RasterVerb::Make(session, outputs);
      return;
    }
    if (Is("show")) return Show(session, outputs.Get(0));
    JobDraft draft;
    if (Is("create")) {
      AddCreation(draft, outputs.Get(0).GetWorkName(), outputs.Get(0).GetName());
    } else {
      AddWork(draft, mosaic_, Is("export") ? outputs.Get(0).GetWorkName() : "");
    }
    const bool changes = !GetChangedFiles().empty();
    JobResults results;
    {
      const ProgressView view(ProgressOfStep(session, draft, kWorkStep), GetProgressStyle());
      results = session.Run(draft, changes ? Interrupts::kEndUnlessDone : Interrupts::kEnd);
    }
    if (changes) session.GetInterruption().SetDone();
  }

  /// Adds the work of an action on an open mosaic.
  /// @param made  the file to make, or none.
  void AddWork(JobDraft& draft, const String& mosaic, const std::string& made) const {
    if (Is("footprints")) AddFootprints(draft, kWorkStep, mosaic);
    if (Is("match")) AddMatching(draft, kWorkStep, mosaic);
    if (Is("seams")) AddSeams(draft, kWorkStep, mosaic);
    if (Is("export")) {
      JobWriterCommand& step = draft.Step(kWorkStep, "CreateMosaicVectorsCommand");
      step.AddInput("MosaicURI", mosaic);
      step.AddInput("Vectors", String(AbsoluteName(made)));
      if (!layer_.empty()) step.AddInput("Layer", String(Capital(layer_)));
    }
    if (Is("show")) AddLabels(draft, mosaic);
  }

  // Creating.

  /// The number of a scene that the user names. Throws HostError.
  unsigned NumberOf(const char* option, const std::string& scene) const {
    const auto at = std::find(scenes_.begin(), scenes_.end(), scene);
    if (at != scenes_.end()) return static_cast<unsigned>(at - scenes_.begin());
    for (unsigned i = 0; i < scenes_.size(); ++i) {
      if (std::to_string(i) == scene || fs::path(scenes_[i]).filename() == scene) return i;
    }
    throw HostError(kExitUsage, fmt::format("{}: {} is none of the scenes{}", option,
                                            Printable(scene), DidYouMean(scene, scenes_)));
  }

  /// @param file   where the definition is made.
  /// @param place  where it will be.
  void AddCreation(JobDraft& draft, const std::string& file, const std::string& place) const {
    const bool isLike = IsFile(creation_.grid);
    if (isLike) AddOpen(draft, "like", {creation_.grid, ""});
    JobWriterCommand& step = draft.Step(Is("build") ? "create" : kWorkStep, "CreateMosaicCommand");
    step.AddInput("File", String(AbsoluteName(file)));
    if (file != place) step.AddInput("Place", String(AbsoluteName(place)));
    Array<String> names{ArrayDims(static_cast<unsigned>(scenes_.size()))};
    for (unsigned i = 0; i < names.GetCount(); ++i) names[i] = String(AbsoluteName(scenes_[i]));
    step.AddInput("Scenes", names);
    if (isLike) step.AddVariableInput("LikeURI", "$like");
    if (!isLike && !creation_.grid.empty()) step.AddInput("CoordSys", String(creation_.grid));
    if (creation_.pixelSize) step.AddInput("PixelSize", *creation_.pixelSize);
    if (!creation_.reference.empty()) {
      step.AddInput("Reference", NumberOf("--reference", creation_.reference));
    }
    if (!creation_.unmatched.empty()) {
      Array<unsigned> numbers{ArrayDims(static_cast<unsigned>(creation_.unmatched.size()))};
      for (unsigned i = 0; i < numbers.GetCount(); ++i) {
        numbers[i] = NumberOf("--keep-colours", creation_.unmatched[i]);
      }
      step.AddInput("Unmatched", numbers);
    }
    step.AddInput("MatchMode", String(Capital(creation_.matchBy)));
    step.AddInput("Bins", Form::kExact);
    step.AddInput("ResamplingMethod", String(Capital(creation_.resampling)));
    if (creation_.feather != 0) step.AddInput("FeatherWidth", creation_.feather);
    if (creation_.noData) step.AddInput("NoData", *creation_.noData);
    if (!creation_.workingDirectory.empty()) {
      step.AddInput("WorkingDirectory", String(AbsoluteName(creation_.workingDirectory)));
    }
    if (isLike) draft.Close("close.like", "$like");
  }

  void AddFootprints(JobDraft& draft, const char* name, const String& mosaic) const {
    std::vector<std::string> masks;
    if (!footprints_.mask.empty()) masks = FindMasks();
    std::string uris;
    for (std::size_t i = 0; i < masks.size(); ++i) {
      const std::string variable = fmt::format("mask{}", i);
      AddOpen(draft, variable, {masks[i], ""});
      uris.append("$").append(variable);
    }
    JobWriterCommand& step = draft.Step(name, "MakeMosaicFootPrintsCommand");
    step.AddInput("MosaicURI", mosaic);
    step.AddInput("SmoothParameter", footprints_.smooth);
    if (footprints_.noData) step.AddInput("NoData", *footprints_.noData);
    if (footprints_.tolerance != 0) step.AddInput("Tolerance", footprints_.tolerance);
    if (footprints_.again) step.AddInput("Again", true);
    if (!uris.empty()) step.AddExpandedInput("MaskURIs", String(uris));
    for (std::size_t i = 0; i < masks.size(); ++i) {
      draft.Close(fmt::format("close.mask{}", i), String(fmt::format("$mask{}", i)));
    }
  }

  /// The mask of each scene, by the pattern.
  std::vector<std::string> FindMasks() const {
    std::vector<std::string> masks;
    for (const URI& scene : ParseValue<Array<URI>>(asked_.Find("Scenes"))) {
      std::string mask = footprints_.mask;
      mask.replace(mask.find('*'), 1, fs::path(SceneFileOf(scene)).stem().string());
      if (!IsFile(mask)) throw HostError(kExitFailed, mask + ": --mask: no such file");
      masks.push_back(mask);
    }
    return masks;
  }

  void AddMatching(JobDraft& draft, const char* name, const String& mosaic) const {
    JobWriterCommand& step = draft.Step(name, "MosaicStatsCommand");
    step.AddInput("MosaicURI", mosaic);
    step.AddInput("Level", level_);
  }

  static void AddSeams(JobDraft& draft, const char* name, const String& mosaic) {
    JobWriterCommand& seams = draft.Step(name, "MosaicAutoSeamGenCommand");
    seams.AddInput("MosaicURI", mosaic);
    seams.AddInput("Sides", Form::kExact);
  }

  // Building.

  /// The definition of a mosaic that is built lies in a folder of its own until the end.
  std::string DefinitionOfBuild() const {
    if (isPrinting_) return AbsoluteName(file_) + ".vmosaic";
    if (folder_.empty()) {
      folder_ = platform::TemporaryFolderBeside(AbsoluteName(file_));
      std::error_code fault;
      if (!fs::create_directory(folder_, fault)) {
        throw HostError(kExitFailed, file_ + ": " + fault.message());
      }
    }
    return folder_ + "/mosaic.vmosaic";
  }

  void AddSource(RasterChain& chain) const override {
    JobDraft& draft = chain.GetDraft();
    const std::string definition = DefinitionOfBuild();
    if (!isCreated_ || isPrinting_) AddCreation(draft, definition, definition);
    isCreated_ = true;
    AddOpen(draft, "source", {definition, ""});
    chain.Take("source");
    if (isPrinting_) AddPreparation(draft, "$source");
  }

  void AddPreparation(JobDraft& draft, const String& mosaic) const {
    if (!isSeamless_) AddFootprints(draft, "footprints", mosaic);
    if (!isUnmatched_) AddMatching(draft, "match", mosaic);
    if (!isSeamless_) AddSeams(draft, "seams", mosaic);
  }

  void Prepare(JobSession& session) {
    if (isSeamless_ && isUnmatched_) return;
    JobDraft draft;
    RasterChain chain(draft);
    AddSource(chain);
    AddPreparation(draft, chain.GetTop());
    chain.Close();
    const ProgressView view(session.GetProgress(), GetProgressStyle());
    session.Run(draft);
  }

  RasterInfo PlanRaster(JobSession& /*session*/, const JobResults& /*opened*/,
                        const RasterInfo& source) override {
    haveCodes_ = HoldsCodes(source, ParseBands("", source));
    return source;
  }
  bool CopiesBlocksOfSource() const override { return false; }
  /// Values that are matched or mixed aren't those that the palettes are of.
  bool KeepsPalettes() const override {
    return isUnmatched_ && creation_.feather == 0 && creation_.resampling == "nearest";
  }
  std::string GetOverviewMethod() const override {
    return haveCodes_ && KeepsPalettes() ? "Nearest" : "Average";
  }

  // Showing.

  void AddLabels(JobDraft& draft, const String& mosaic) const {
    for (const char* const labels : {"Footprints", "Seams"}) {
      JobWriterCommand& step = draft.Open(labels, "CreateMosaicLabelsCommand");
      step.AddInput("MosaicURI", mosaic);
      step.AddInput("Labels", String(labels));
      AddQuery(draft, labels, String(std::string("$") + labels));
    }
  }

  void Show(JobSession& session, const OutputFile& output) {
    JobDraft draft;
    AddLabels(draft, mosaic_);
    const JobResults labels = session.Run(draft);
    QuicklookRequest request{{mosaic_, info_, file_},      bands_, size_, {}, {}, {}, {},
                             ChooseSampling(info_, bands_)};
    const auto add = [&](const char* name, const std::array<unsigned char, 3>& colour) {
      request.outlines.push_back(
          {{URIOf(labels, String(std::string("$") + name)), ReadInfo(labels, name), file_},
           colour});
    };
    add("Footprints", {0, 255, 255});
    add("Seams", {255, 255, 0});
    MakeQuicklook(session, request, output, GetProgressStyle());
  }

  // Telling.

  static constexpr const char* kQueryStep = "mosaic.scenes";

  int Info() {
    JobDraft draft;
    AddOpening(draft);
    if (GetJobOptions().printJob) {
      draft.Close("close", "$mosaic");
      std::cout << draft.Write().ToUTF8() << '\n';
      return kExitSuccess;
    }
    JobSession session(GetJobOptions());
    const JobResults opened = session.Run(draft);
    const Json all = InfoAsJson(ReadInfo(opened, "mosaic"), opened.Find(kQueryStep).returns);
    std::cout << (isJson_ ? all.dump(2) + "\n" : AsText(all));
    return kExitSuccess;
  }

  Json InfoAsJson(const RasterInfo& info, const Map<String, String>& asked) const {
    const auto scenes = ParseValue<Array<URI>>(asked.Find("Scenes"));
    const auto footprints = ParseValue<Array<URI>>(asked.Find("Footprints"));
    const auto seams = ParseValue<Array<URI>>(asked.Find("Seams"));
    const auto sizes = ParseValue<Array<unsigned>>(asked.Find("Sizes"));
    const auto onGrid = ParseValue<Array<bool>>(asked.Find("OnGrid"));
    const auto matched = ParseValue<Array<bool>>(asked.Find("Matched"));
    const auto textOrNull = [](const std::string& text) {
      return text.empty() ? Json() : Json(text);
    };
    Json list = Json::array();
    for (unsigned i = 0; i < scenes.GetCount(); ++i) {
      list.push_back({{"scene", i},
                      {"file", SceneFileOf(scenes[i])},
                      {"samples", sizes[2 * i]},
                      {"lines", sizes[2 * i + 1]},
                      {"onGrid", onGrid[i]},
                      {"matched", matched[i]},
                      {"footprint", textOrNull(footprints[i].ToUTF8())},
                      {"seam", textOrNull(seams[i].ToUTF8())}});
    }
    return {{"file", file_},
            {"samples", info.samples},
            {"lines", info.lines},
            {"bands", info.bands},
            {"dataType", DataTypeName(info.dataType).ToUTF8()},
            {"reference", ParseValue<unsigned>(asked.Find("Reference"))},
            {"matchBy", asked.Find("MatchMode").ToUTF8()},
            {"bins", asked.Find("Bins").ToUTF8()},
            {"resampling", asked.Find("ResamplingMethod").ToUTF8()},
            {"featherWidth", NumberAsJson(ParseValue<double>(asked.Find("FeatherWidth")))},
            {"tables", textOrNull(asked.Find("Tables").ToUTF8())},
            {"workingDirectory", asked.Find("WorkingDirectory").ToUTF8()},
            {"scenes", list}};
  }

  static std::string AsText(const Json& all) {
    std::string text = fmt::format(
        "{}\n  size        {} samples, {} lines, {} bands of {}\n  reference   scene {}, matched "
        "by {}\n  tables      {}\n  resampling  {}\n  feather     {} pixels\n"
        "  scene       samples    lines  on grid  matched  footprint  seam  file\n",
        Printable(all["file"].get<std::string>()), all["samples"].get<unsigned>(),
        all["lines"].get<unsigned>(), all["bands"].get<unsigned>(),
        all["dataType"].get<std::string>(), all["reference"].get<unsigned>(),
        all["matchBy"].get<std::string>(),
        all["tables"].is_null() ? "none" : Printable(all["tables"].get<std::string>()),
        all["resampling"].get<std::string>(), all["featherWidth"].get<double>());
    const auto yesNo = [](bool is) { return is ? "yes" : "no"; };
    for (const Json& scene : all["scenes"]) {
      text +=
          fmt::format("  {:>5}    {:>10} {:>8}  {:>7}  {:>7}  {:>9}  {:>4}  {}\n",
                      scene["scene"].get<unsigned>(), scene["samples"].get<unsigned>(),
                      scene["lines"].get<unsigned>(), yesNo(scene["onGrid"].get<bool>()),
                      yesNo(scene["matched"].get<bool>()), yesNo(!scene["footprint"].is_null()),
                      yesNo(!scene["seam"].is_null()), Printable(scene["file"].get<std::string>()));
    }
    return text;
  }

  std::string action_, file_, layer_, bandsText_;
  std::vector<std::string> more_;
  MosaicCreationOptions creation_;
  MosaicFootprintOptions footprints_;
  unsigned level_ = 0;
  bool isUnmatched_ = false;
  bool haveCodes_ = false;
  bool isSeamless_ = false;
  bool isJson_ = false;
  unsigned size_ = 1024;

  std::vector<std::string> scenes_;  // expanded
  mutable std::string folder_;       // of the definition that build makes
  mutable bool isCreated_ = false;   // that definition is there
  mutable bool isPrinting_ = false;  // the job of build as a whole
  String mosaic_;                    // URI
  RasterInfo info_;                  // of the mosaic
  Map<String, String> asked_;        // what QueryMosaicCommand gave
  Array<unsigned> bands_;
};

const VerbRegistration mosaicRegistration(
    "mosaic", "Joins scenes into one raster: footprints, colours, seams", &SetUp<MosaicVerb>);

}  // namespace
}  // namespace lumo::host
