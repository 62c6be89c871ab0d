#include <optional>

#include "options/option_values.h"
#include "pictures/figure.h"
#include "pictures/picture_writer.h"
#include "pictures/quicklook_maker.h"
#include "raster/pixel_types.h"
#include "rasters/raster_target.h"
#include "rasters/raster_verb.h"
#include "rasters/segment_curves.h"
#include "rasters/segment_steps.h"
#include "rasters/tree_steps.h"

namespace lumo::host {
namespace {

constexpr const char* kGradientStep = "gradients";
constexpr const char* kCostStep = "costs";

class SegmentVerb final : public RasterVerb {
 public:
  explicit SegmentVerb(OptionSet& line) {
    line.AddNote(
        "The gradients of the bands are flooded from their minima: each minimum becomes a segment. "
        "Neighbours whose merging costs little, by the difference of their mean values, their "
        "sizes "
        "and the length of their common border, become one. LABELS holds the number of the segment "
        "of each pixel, 0 where there is none, as 32-bit integers.");
    line.AddNote(
        "The segments are those of the raster as a whole, of any size, and don't depend on memory "
        "or "
        "threads. With --tiled it is worked on in tiles that overlap by --tile-border: a segment "
        "that reaches into the next tile keeps its number there, and two that met in an earlier "
        "tile stay two.");
    line.AddNote(
        "--estimate makes no labels. It says which gradient and which cost a percentage stands "
        "for, "
        "-o draws both curves, --json prints them.");
    line.AddNote(
        "--tree keeps all merges in a file, from which segments of every other cost can be made "
        "without segmenting again: cut TREE LABELS makes those of one --merge-value or "
        "--merge-percent, levels TREE those of several --values, as NAME.1.tif and so on, each "
        "within those of the next, with a table of their parents, NAME.csv. (For a raster of such "
        "a name write ./cut.)");
    line.AddExample("vexg segment scene.tif segments.tif --merge-percent 90");
    line.AddExample("vexg segment scene.tif segments.tif --merge-value 100 --tree scene.tree");
    line.AddExample("vexg segment cut scene.tree segments.tif --merge-value 250");
    line.AddExample("vexg segment levels scene.tree --values 50,200,800 -o levels");
    line.AddNote(
        "--suggest TREE makes no labels. It gives costs at which segments are likely to be whole "
        "objects: where the local variance, the mean deviation inside segments, begins to grow "
        "faster with the cost. The most prominent comes first; -o draws the curve, --json prints "
        "it.");
    line.AddExample("vexg segment --suggest scene.tree");
    line.AddExample("vexg segment --estimate scene.tif -o curves.png");
    AddFilesTo(line, "The labels; with cut and levels the tree", false);
    line.Add("more", more_, "With cut, the labels").IsFile("LABELS");
    line.Add("--tiled", request_.isTiled,
             "Segment tile by tile, which takes less memory and leaves seams");
    line.Add("--estimate", request_.isEstimate,
             "Say what percentages stand for, and make no labels");
    line.Add("--suggest", isSuggest_, "Say which costs suit a tree, and make no labels");
    line.AllowOneOf({"--estimate", "--suggest"});
    line.Add("--output,-o", picture_,
             "With --estimate and --suggest: a plot of the curves, as SVG, PNG, JPEG or WebP; with "
             "levels: "
             "the files "
             "without "
             "their endings")
        .IsFile("OUT");
    line.Add("--json", isJson_, "With --estimate and --suggest: the curves as JSON");
    AddAreaTo(line);
    line.Add("--bands", bandsText_, "Bands, from 0; all by default")
        .Shows("B,B...")
        .Example("3,2,1");
    line.Add("--algorithm", request_.algorithm,
             "What is flooded: sobel, the largest gradient of the bands; intensity, their mean")
        .Takes(OneOf({"sobel", "intensity"}))
        .ShowsDefault();
    line.Add("--segment-value", request_.segmentValue,
             "Gradients up to this one are one flat level")
        .Shows("GRADIENT");
    line.Add("--segment-percent", request_.segmentPercent,
             "Percentage of the pixels whose gradients are one flat level")
        .Shows("P")
        .Example("20");
    line.Add("--merge-value", request_.mergeValue, "Merge up to this cost; no merging by default")
        .Shows("COST");
    line.Add("--merge-percent", request_.mergePercent, "Percentage of all merges to do")
        .Shows("P")
        .Example("90");
    line.Add("--merge-algorithm", request_.mergeAlgorithm,
             "schedule: the cheapest pair first, with new costs after each; rigorous: all pairs "
             "below "
             "--merge-value at once")
        .Takes(OneOf({"schedule", "rigorous"}))
        .ShowsDefault();
    line.Add("--order", request_.order,
             "global: the cheapest pair anywhere is merged first; local: in rounds, all pairs at "
             "once "
             "that cost both of their segments least")
        .Takes(OneOf({"global", "local"}))
        .ShowsDefault();
    line.Add("--rounds", request_.rounds, "With --order local: how many; 12 by default")
        .Within(1, 1000);
    line.Add("--merge-raster", mergeRaster_,
             "A raster of the same size and pixel type whose bands drive merging, instead of "
             "INPUT's")
        .IsFile();
    line.Add("--min-size", request_.minSize,
             "Smaller segments join at the end the neighbour that costs least, the smallest first")
        .Shows("PIXELS");
    line.Add("--max-size", request_.maxSize,
             "Segments that have more pixels together are not merged, except by --min-size")
        .Shows("PIXELS")
        .Within(1, 4294967295U);
    line.Add("--compactness", request_.compactness,
             "Costs are divided by the length of the common border to this power besides, 0 to 10; "
             "0 "
             "by default")
        .Shows("W");
    line.Add("--tree", tree_, "Make a file of all merges as well, for cut and levels")
        .IsFile("TREE");
    line.Add("--values", valuesText_, "With levels: the costs up to which to merge")
        .Shows("COST,COST...")
        .Example("50,200,800");
    line.Add("--tile-memory", request_.tileMemory,
             "Bytes of the pixels of a tile, or of the strips in which a whole raster is read; "
             "8388608 by default")
        .Shows("BYTES");
    line.Add("--tile-border", request_.tileBorder,
             "With --tiled: overlap of tiles on each side, in pixels; 10 by default")
        .Shows("PIXELS")
        .Within(0, 65535);
    line.Add("--memory", request_.memory,
             "Bytes that merging may take, else it fails; half the machine's by default")
        .Shows("BYTES")
        .Within(1, 1ULL << 62U);
    line.Add("--borders", request_.isBorders,
             "Make an image of the borders of segments, of 0 and 1");
    line.Add("--polygons", polygons_, "Make polygons of the segments as well, in this vector file")
        .IsFile("OUT");
    line.Add("--quicklook", quicklook_, "Draw the borders over the scene as well, in this picture")
        .IsFile("OUT.png|jpg|webp");
  }

  int Run() override {
    const std::string word = GetSource().file;
    action_ = isSuggest_         ? Action::kSuggest
              : word == "cut"    ? Action::kCut
              : word == "levels" ? Action::kLevels
                                 : Action::kSegment;
    if (Is(Action::kSegment)) {
      if (!more_.empty()) throw HostError(kExitUsage, "there is a word too many: " + more_.front());
      return RasterVerb::Run();
    }
    if (Is(Action::kSuggest)) {
      if (!GetTargetName().empty()) throw HostError(kExitUsage, "--suggest takes a tree alone");
      return RasterVerb::Run();
    }
    GetSource().file = GetTargetName();
    if (GetSource().file.empty()) throw HostError(kExitUsage, word + ": which tree?");
    if (more_.size() != (Is(Action::kCut) ? 1U : 0U)) {
      throw HostError(kExitUsage, Is(Action::kCut) ? "cut: name the labels to make behind the tree"
                                                   : "levels takes a tree alone, and -o");
    }
    SetTargetName(Is(Action::kCut) ? more_.front() : "");
    return RasterVerb::Run();
  }

 private:
  /// Says which files are made of which.
  enum class Action { kSegment, kCut, kLevels, kSuggest };

  bool Is(Action action) const { return action_ == action; }

  /// Throws HostError for options that segment a raster, where there is a tree.
  void CheckTreeOptions() {
    const auto refuse = [](const std::string& line) { throw HostError(kExitUsage, line); };
    if (request_.IsSegmenting() || !bandsText_.empty() || !mergeRaster_.empty() ||
        !polygons_.empty() || !quicklook_.empty() || !tree_.empty() || GetArea().IsGiven() ||
        (isJson_ && !Is(Action::kSuggest))) {
      refuse("cut, levels and --suggest take a tree as it is, with no option that segments");
    }
    if (Is(Action::kSuggest)) {
      if (request_.mergeValue || request_.mergePercent || !valuesText_.empty()) {
        refuse("--suggest takes no costs");
      }
      if (!picture_.empty()) CheckFigureName(picture_);
      return;
    }
    if (Is(Action::kCut)) {
      if (!picture_.empty() || !valuesText_.empty()) refuse("-o and --values go with levels");
      request_.Check();
      RasterVerb::CheckOptions();
      return;
    }
    if (request_.mergeValue || request_.mergePercent) refuse("levels takes its costs by --values");
    if (picture_.empty()) refuse("--output is required");
    if (valuesText_.empty()) refuse("--values is required");
    levels_ = {GetSource().file, ReadMergeValues(valuesText_)};
    SetTargetName(levels_.FilesOf(picture_).front());
    RasterVerb::CheckOptions();
  }

  void CheckOptions() override {
    const auto refuse = [](const std::string& line) { throw HostError(kExitUsage, line); };
    if (!Is(Action::kSegment)) return CheckTreeOptions();
    if (!valuesText_.empty()) refuse("--values goes with levels");
    request_.tree = tree_;
    request_.Check();
    if (!mergeRaster_.empty() && GetArea().IsGiven()) {
      refuse("--merge-raster goes with no area");
    }
    if (request_.isEstimate) {
      if (!GetTargetName().empty()) refuse("--estimate makes no labels");
      if (!polygons_.empty() || !quicklook_.empty()) refuse("--estimate makes one picture at most");
      if (!picture_.empty()) CheckFigureName(picture_);
      return;
    }
    if (GetTargetName().empty()) refuse("LABELS, the file to make, is missing");
    if (!picture_.empty() || isJson_) refuse("-o and --json go with --estimate");
    if (request_.isBorders && !polygons_.empty())
      refuse("--borders makes no segments for --polygons");
    if (!quicklook_.empty()) CheckPictureName(quicklook_);
    RasterVerb::CheckOptions();
  }

  std::vector<std::string> GetFurtherInputs() const override {
    return mergeRaster_.empty() ? std::vector<std::string>() : std::vector{mergeRaster_};
  }
  std::vector<std::string> GetOutputs() const override {
    if (Is(Action::kLevels)) return levels_.FilesOf(picture_);
    if (!request_.isEstimate && !Is(Action::kSuggest)) return RasterVerb::GetOutputs();
    return picture_.empty() ? std::vector<std::string>() : std::vector{picture_};
  }
  std::uint64_t GetBytes(std::size_t output) const override {
    return request_.isEstimate || Is(Action::kLevels) || Is(Action::kSuggest)
               ? 0
               : RasterVerb::GetBytes(output);
  }
  std::vector<std::string> GetFurtherOutputs() const override {
    std::vector<std::string> files;
    if (!polygons_.empty()) files.push_back(polygons_);
    if (!quicklook_.empty()) files.push_back(quicklook_);
    if (!tree_.empty()) files.push_back(tree_);
    return files;
  }

  std::string GetOverviewMethod() const override { return "Nearest"; }

  RasterInfo PlanRaster(JobSession& /*session*/, const JobResults& /*opened*/,
                        const RasterInfo& source) override {
    if (!Is(Action::kSegment)) return source;
    bands_ = ParseBands(bandsText_, source);
    scene_ = source;
    if (!DispatchType(EightTypes{}, source.dataType, []<typename T>() { return true; })) {
      throw HostError(kExitFailed, GetSource().file +
                                       ": its pixels are not real numbers of at most "
                                       "32 bits, or floating-point");
    }
    RasterInfo planned = source;
    planned.bands = 1;
    planned.dataType = kDataTypeOf<std::int32_t>;
    return planned;
  }

  void AddSource(RasterChain& chain) const override {
    if (Is(Action::kSegment)) return RasterVerb::AddSource(chain);
    AddTreeLabels(chain.GetDraft(), "source",
                  {GetSource().file, request_.mergeValue, request_.mergePercent});
    chain.Take("source");
  }

  void AddViews(RasterChain& chain) const override {
    if (bandsText_.empty()) return;
    AddBandView(chain.GetDraft(), "bands", chain.GetTop(), bands_);
    chain.Take("bands");
  }

  const char* GetKeptDetails() const override { return "Told"; }
  FillValues GetNoData(const FillValues& /*chosen*/) const override {
    return request_.isBorders ? FillValues() : FillValues{0.0};
  }
  bool MayChooseNoData() const override { return false; }
  const char* GetFirstStep() const override { return Is(Action::kSegment) ? kFitStep : kMakeStep; }

  void AddToCreate(JobDraft& /*draft*/, JobWriterCommand& create) const override {
    if (Is(Action::kSegment)) AddLabels(create, request_);
  }

  /// Opens the raster that drives merging, where there is one of its own.
  SegmentSources OpenMerge(JobDraft& draft, const String& shown) const {
    if (mergeRaster_.empty()) return {shown, shown};
    AddOpen(draft, "merge", {mergeRaster_, ""});
    return {shown, "$merge"};
  }

  void CloseMerge(JobDraft& draft) const {
    if (!mergeRaster_.empty()) draft.Close("close.merge", "$merge");
  }

  void AddMaking(JobDraft& draft, const Making& making) const override {
    if (!Is(Action::kSegment)) return RasterVerb::AddMaking(draft, making);
    const SegmentSources sources = OpenMerge(draft, making.shown);
    SegmentRequest request = request_;
    request.tree = treePlace_;
    AddFit(draft, request, sources);
    AddSegment(draft, kMakeStep, request, sources);
    CloseMerge(draft);
  }

  RasterContents ReadWanted(const JobResults& results) const override {
    if (!Is(Action::kSegment)) return RasterVerb::ReadWanted(results);
    RasterContents wanted = ReadContents(results, kShown);
    wanted.info.dataType = kDataTypeOf<std::int32_t>;
    wanted.info.bands = 1;
    wanted.details.clear();
    return wanted;
  }

  void Compare(MadeRaster& raster, Losses& losses) const override {
    if (!Is(Action::kSegment)) return RasterVerb::Compare(raster, losses);
    raster.put.info.hasNoData = raster.made.info.hasNoData;
    raster.put.info.hasPalette = raster.made.info.hasPalette;
    raster.isFilled = true;
    CompareKept(raster, losses);
  }

  void AddFurther(JobDraft& draft, const TargetPlace& made,
                  const std::vector<std::string>& files) const override {
    if (polygons_.empty()) return;
    AddOpen(draft, "labels", {made.file, made.format});
    JobWriterCommand& polygons = draft.Step("polygons", "PolygonizeCommand");
    polygons.AddVariableInput("URI", "$labels");
    polygons.AddInput("Vectors", String(files.front()));
    draft.Close("close.labels", "$labels");
  }

  JobDraft GetJob(const Outputs& outputs) const override {
    if (Is(Action::kSuggest)) {
      JobDraft draft;
      AddSuggest(draft, GetSource().file);
      return draft;
    }
    if (Is(Action::kLevels)) {
      JobDraft draft;
      levels_.AddMaking(draft, NamesOf(outputs, &OutputFile::GetName), GetFormat());
      return draft;
    }
    if (!tree_.empty()) treePlace_ = outputs.Get(GetOutputs().size() - 1).GetName();
    return request_.isEstimate ? MakeEstimate() : RasterVerb::GetJob(outputs);
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    if (request_.isEstimate) return Estimate(session, outputs);
    if (Is(Action::kLevels)) return MakeLevels(session, outputs);
    if (Is(Action::kSuggest)) {
      scales_ = ScaleCurve::Read(session.Run(GetJob(outputs)));
      if (!picture_.empty()) scales_.Draw(outputs.Get(0));
      return;
    }
    if (!tree_.empty()) treePlace_ = outputs.Get(GetOutputs().size() - 1).GetWorkName();
    RasterVerb::Make(session, outputs);
    if (!quicklook_.empty()) DrawQuicklook(session, outputs);
  }

  std::vector<std::string> NamesOf(const Outputs& outputs,
                                   std::string (OutputFile::*name)() const) const {
    std::vector<std::string> names;
    for (std::size_t i = 0; i < GetOutputs().size(); ++i) {
      names.push_back((outputs.Get(i).*name)());
    }
    return names;
  }

  void MakeLevels(JobSession& session, const Outputs& outputs) const {
    JobDraft draft;
    levels_.AddMaking(draft, NamesOf(outputs, &OutputFile::GetWorkName), GetFormat());
    const ProgressView view(session.GetProgress(), GetProgressStyle());
    levels_.CheckMade(session.Run(draft));
  }

  void DrawQuicklook(JobSession& session, const Outputs& outputs) const {
    JobDraft draft;
    RasterChain chain(draft);
    AddSource(chain);
    GetArea().AddViews(chain);
    AddOpen(draft, "labels", {outputs.Get(0).GetWorkName(), GetFormat()});
    AddQuery(draft, "scene", chain.GetTop());
    AddQuery(draft, "labels", "$labels");
    const JobResults opened = session.Run(draft);
    QuicklookRequest request;
    request.raster = {URIOf(opened, chain.GetTop()), ReadInfo(opened, "scene"), GetSource().file};
    request.bands = ChoosePictureBands(
        bands_.GetCount() == 1 || bands_.GetCount() == 3 ? bandsText_ : std::string(),
        request.raster.info);
    request.size = kQuicklookSize;
    request.sampling = ChooseSampling(request.raster.info, request.bands);
    request.outlines.push_back(
        {{URIOf(opened, "$labels"), ReadInfo(opened, "labels"), GetTargetName()}, {255, 255, 0}});
    const std::size_t picture = polygons_.empty() ? 1 : 2;
    MakeQuicklook(session, request, outputs.Get(picture), ProgressStyle::kNone);
  }

  /// The gradients in bins that suit the pixel type, and the costs of all merges.
  JobDraft MakeEstimate() const {
    JobDraft draft;
    RasterChain chain(draft);
    AddSource(chain);
    GetArea().AddViews(chain);
    AddViews(chain);
    const String shown = chain.GetTop();
    const SegmentSources sources = OpenMerge(draft, shown);
    AddFit(draft, request_, sources);
    JobWriterCommand& gradients = draft.Step(kGradientStep, "FxTileSegmentHistogramCommand");
    gradients.AddVariableInput("SegmentURI", shown);
    gradients.AddVariableInput("HistogramMin", "$least");
    gradients.AddVariableInput("HistogramMax", "$most");
    gradients.AddInput("SegmentAlgorithm", request_.algorithm == "sobel" ? 1 : 2);
    const bool isWhole = DispatchType(EightTypes{}, scene_.dataType,
                                      []<typename T>() { return std::is_integral_v<T>; });
    if (!isWhole) gradients.AddInput("HistogramBins", kFloatBins);
    AddSegment(draft, kCostStep, request_, sources);
    CloseMerge(draft);
    chain.Close();
    return draft;
  }

  void Estimate(JobSession& session, const Outputs& outputs) {
    const JobDraft draft = MakeEstimate();
    JobResults results;
    {
      const ProgressView view(ProgressOfSteps(session, draft, kFitStep, kCostStep),
                              GetProgressStyle());
      results = session.Run(draft);
    }
    curves_ =
        SegmentCurves::Read(results.Find(kFitStep).returns, results.Find(kGradientStep).returns,
                            results.Find(kCostStep).returns);
    if (!picture_.empty()) curves_.Draw(outputs.Get(0));
  }

  std::string Describe() const override {
    if (Is(Action::kSuggest)) {
      if (isJson_) return scales_.AsJson(GetSource().file);
      return picture_.empty() ? scales_.AsText() : std::string();
    }
    if (!request_.isEstimate) return {};
    if (isJson_) return curves_.AsJson(GetSource().file);
    return picture_.empty() ? curves_.AsText() : std::string();
  }

  static constexpr unsigned kFloatBins = 65000;
  static constexpr unsigned kQuicklookSize = 2048;

  bool isJson_ = false, isSuggest_ = false;
  Action action_ = Action::kSegment;
  std::vector<std::string> more_;
  std::string picture_, bandsText_, mergeRaster_, polygons_, quicklook_, tree_, valuesText_;
  mutable std::string treePlace_;  // where the tree is made, or where it will be
  TreeLevels levels_;
  ScaleCurve scales_;
  SegmentRequest request_;

  RasterInfo scene_;
  Array<unsigned> bands_;
  SegmentCurves curves_;
};

const VerbRegistration segmentRegistration("segment",
                                           "Divides a raster into segments of alike pixels",
                                           &SetUp<SegmentVerb>);

}  // namespace
}  // namespace lumo::host
