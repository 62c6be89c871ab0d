#include <cmath>
#include <iostream>

#include <fmt/format.h>

#include "commands/value_text.h"
#include "foundation/near_name.h"
#include "options/option_values.h"
#include "output/json_number.h"
#include "rasters/attribute_steps.h"
#include "rasters/file_verb.h"
#include "rasters/raster_target.h"
#include "rasters/vector_info.h"

namespace lumo::host {
namespace {

constexpr const char* kQueryStep = "query";
constexpr const char* kQueries[] = {"info", "stats", "hist"};

/// Holds what QueryAttributesCommand gives of a file of regions.
struct StoreInfo {
  unsigned bands = 0;
  unsigned attributes = 0;
  Array<String> names;
  std::uint64_t records = 0;
  std::uint64_t regions = 0;
  Array<double> mean, deviation, min, max, count;  // bands by attributes
  Array<double> lower, upper;
  Array<unsigned> bins;  // bands by attributes by bins

  unsigned PairOf(unsigned band, unsigned attribute) const { return band * attributes + attribute; }
};

StoreInfo ReadStore(const Map<String, String>& returns) {
  const auto numbers = [&](const char* name) {
    return ParseValue<Array<double>>(returns.Find(name));
  };
  StoreInfo info;
  info.bands = ParseValue<unsigned>(returns.Find("Bands"));
  info.attributes = ParseValue<unsigned>(returns.Find("Attributes"));
  info.names = ParseValue<Array<String>>(returns.Find("Names"));
  info.records = ParseValue<std::uint64_t>(returns.Find("Records"));
  info.regions = ParseValue<std::uint64_t>(returns.Find("Regions"));
  info.mean = numbers("Mean");
  info.deviation = numbers("Std");
  info.min = numbers("Min");
  info.max = numbers("Max");
  info.count = numbers("Count");
  info.lower = numbers("Lower");
  info.upper = numbers("Upper");
  info.bins = ParseValue<Array<unsigned>>(returns.Find("Bins"));
  return info;
}

Json InfoAsJson(const std::string& file, const StoreInfo& info) {
  Json names = Json::array();
  for (const String& name : info.names) names.push_back(name.ToUTF8());
  return {{"file", file},
          {"bands", info.bands},
          {"attributes", names},
          {"records", info.records},
          {"regions", info.regions}};
}

std::string InfoAsText(const std::string& file, const StoreInfo& info) {
  std::string names;
  for (const String& name : info.names) names += (names.empty() ? "" : ", ") + name.ToUTF8();
  return fmt::format(
      "{}\n  bands          {}\n  attributes     {}: {}\n  records        {}\n  regions        "
      "{}\n",
      Printable(file), info.bands, info.attributes, names, info.records, info.regions);
}

Json StatsAsJson(const std::string& file, const StoreInfo& info) {
  Json list = Json::array();
  for (unsigned band = 0; band < info.bands; ++band) {
    for (unsigned i = 0; i < info.attributes; ++i) {
      const unsigned at = info.PairOf(band, i);
      list.push_back({{"band", band},
                      {"attribute", info.names[i].ToUTF8()},
                      {"count", NumberAsJson(info.count[at])},
                      {"mean", NumberAsJson(info.mean[at])},
                      {"std", NumberAsJson(info.deviation[at])},
                      {"min", NumberAsJson(info.min[at])},
                      {"max", NumberAsJson(info.max[at])}});
    }
  }
  return {{"file", file}, {"attributes", list}};
}

std::string StatsAsText(const std::string& file, const StoreInfo& info) {
  std::string text =
      fmt::format("{}\nband {:<20} {:>10} {:>14} {:>14} {:>14} {:>14}\n", Printable(file),
                  "attribute", "count", "mean", "std", "min", "max");
  for (unsigned band = 0; band < info.bands; ++band) {
    for (unsigned i = 0; i < info.attributes; ++i) {
      const unsigned at = info.PairOf(band, i);
      text += fmt::format("{:>4} {:<20} {:>10.0f} {:>14.7g} {:>14.7g} {:>14.7g} {:>14.7g}\n", band,
                          info.names[i].ToUTF8(), info.count[at], info.mean[at], info.deviation[at],
                          info.min[at], info.max[at]);
    }
  }
  return text;
}

/// The bins of a pair of band and attribute.
struct PairBins {
  unsigned band;
  unsigned attribute;
};

/// The lowest value of a bin.
double LowerOf(const StoreInfo& info, unsigned pair, unsigned bin) {
  const unsigned bins = info.bins.GetCount() / info.lower.GetCount();
  return info.lower[pair] + (info.upper[pair] - info.lower[pair]) * bin / (bins - 1);
}

Json HistAsJson(const std::string& file, const StoreInfo& info,
                const std::vector<PairBins>& pairs) {
  Json list = Json::array();
  for (const PairBins& pair : pairs) {
    const unsigned at = info.PairOf(pair.band, pair.attribute);
    const unsigned bins = info.bins.GetCount() / info.lower.GetCount();
    Json counts = Json::array();
    for (unsigned bin = 0; bin < bins; ++bin) counts.push_back(info.bins[at * bins + bin]);
    list.push_back({{"band", pair.band},
                    {"attribute", info.names[pair.attribute].ToUTF8()},
                    {"lower", NumberAsJson(info.lower[at])},
                    {"upper", NumberAsJson(info.upper[at])},
                    {"counts", counts}});
  }
  return {{"file", file}, {"histograms", list}};
}

std::string HistAsText(const std::string& file, const StoreInfo& info,
                       const std::vector<PairBins>& pairs) {
  std::string text = Printable(file) + "\n";
  for (const PairBins& pair : pairs) {
    const unsigned at = info.PairOf(pair.band, pair.attribute);
    const unsigned bins = info.bins.GetCount() / info.lower.GetCount();
    text += fmt::format("band {}, {}\n", pair.band, info.names[pair.attribute].ToUTF8());
    for (unsigned bin = 0; bin < bins; ++bin) {
      const unsigned count = info.bins[at * bins + bin];
      if (count != 0) text += fmt::format("{:>14.7g} {:>10}\n", LowerOf(info, at, bin), count);
    }
  }
  return text;
}

class AttributesVerb final : public FileVerb {
 public:
  explicit AttributesVerb(OptionSet& line) : FileVerb(line) {
    line.AddNote(
        "Makes NAME.spectral.fxa, NAME.texture.fxa with NAME.entropy.fxa, and NAME.shape.fxa, "
        "whose records are the regions by label, and a table with a row for each region; without "
        "--spectral, --texture, --index and --shape the first and the last. --index makes "
        "NAME.index.fxa. Labels are whole numbers of up "
        "to 32 bits, in a raster of the scene's size; label 0 is a region too. Sums are exact, and "
        "several "
        "polygons of one label are one shape. The ending of the table chooses its format: .csv, "
        ".gpkg, .fgb and others, all but the first with polygons. docs/attributes.md has the "
        "formulas.");
    line.AddNote(
        "In place of the rasters: info FILE.fxa tells what a file of regions holds, stats FILE.fxa "
        "the statistics of each attribute over all regions, hist FILE.fxa their histograms. (For a "
        "raster of such a name write ./info.)");
    line.AddExample("vexg attributes scene.tif labels.tif -o fields --table fields.gpkg");
    line.AddExample("vexg attributes scene.tif labels.tif -o f --texture --kernel 5 --bands 3,2");
    line.AddExample("vexg attributes stats fields.spectral.fxa");
    line.Add("labels", labels_, "The label raster; or the file of regions")
        .IsFile("LABELS")
        .Required();
    line.Add("--output,-o", name_, "The files without their endings").IsFile("NAME");
    line.Add("--spectral", request_.spectral, "Mean, deviation, minimum, maximum and count");
    line.Add("--texture", request_.texture, "Range, mean, variance and entropy of windows");
    line.Add("--kernel", request_.kernel, "Side of the windows, in pixels").ShowsDefault();
    line.Add("--shape", request_.shape, "Area, perimeter, compactness and so on");
    line.Add("--index", request_.indices,
             "Spectral values of what an expression makes of the bands, see vexg calc; may come "
             "again")
        .Shows("NAME=EXPRESSION")
        .Example("ndvi=(b3-b2)/(b3+b2)");
    line.Add("--bands", bandsText_, "Bands, from 0; all by default")
        .Shows("B,B...")
        .Example("3,2,1");
    line.Add("--table", table_, "A table of all that is made").IsFile("OUT");
    line.Add("--band", band_, "With hist, the one band").Shows("B");
    line.Add("--attribute", attribute_, "With hist, the one attribute, by name or number")
        .Shows("NAME|N");
    line.Add("--json", isJson_, "With info, stats and hist: as JSON");
    AddOverwriteTo(line, "files that are there");
  }

  int Run() override {
    for (const char* const query : kQueries) {
      if (GetSource().file == query) return RunQuery(query);
    }
    return FileVerb::Run();
  }

 private:
  // Queries of a file of regions.

  int RunQuery(const std::string& query) {
    if (!name_.empty() || !table_.empty()) {
      throw HostError(kExitUsage, query + " makes no files; leave -o and --table out");
    }
    JobDraft draft;
    JobWriterCommand& step = draft.Step(kQueryStep, "QueryAttributesCommand");
    step.AddInput("AttributeFXA", String(AbsoluteName(labels_)));
    if (query == "stats") step.AddInput("Statistics", true);
    if (query == "hist") step.AddInput("Histograms", true);
    if (GetJobOptions().printJob) {
      std::cout << draft.Write().ToUTF8() << '\n';
      return kExitSuccess;
    }
    JobSession session(GetJobOptions());
    const StoreInfo info = ReadStore(session.Run(draft).Find(kQueryStep).returns);
    std::cout << ShowStore(query, info);
    return kExitSuccess;
  }

  std::string ShowStore(const std::string& query, const StoreInfo& info) const {
    if (query == "info") {
      return isJson_ ? InfoAsJson(labels_, info).dump(2) + "\n" : InfoAsText(labels_, info);
    }
    if (query == "stats") {
      return isJson_ ? StatsAsJson(labels_, info).dump(2) + "\n" : StatsAsText(labels_, info);
    }
    const std::vector<PairBins> pairs = ChoosePairs(info);
    return isJson_ ? HistAsJson(labels_, info, pairs).dump(2) + "\n"
                   : HistAsText(labels_, info, pairs);
  }

  std::vector<PairBins> ChoosePairs(const StoreInfo& info) const {
    if (band_ && *band_ >= info.bands) {
      throw HostError(kExitUsage, fmt::format("--band: the file has {} bands", info.bands));
    }
    std::vector<PairBins> pairs;
    std::vector<std::string> known;
    for (unsigned i = 0; i < info.attributes; ++i) {
      known.push_back(info.names[i].ToUTF8());
      if (!attribute_.empty() && attribute_ != known.back() && attribute_ != std::to_string(i)) {
        continue;
      }
      for (unsigned band = 0; band < info.bands; ++band) {
        if (!band_ || *band_ == band) pairs.push_back({band, i});
      }
    }
    if (!pairs.empty() || attribute_.empty()) return pairs;
    throw HostError(kExitUsage, fmt::format("--attribute: the file has no \"{}\"{}",
                                            Printable(attribute_), DidYouMean(attribute_, known)));
  }

  // Values of the regions of a scene.

  void CheckOptions() override {
    if (name_.empty()) throw HostError(kExitUsage, "--output is required");
    if (isJson_ || band_ || !attribute_.empty()) {
      throw HostError(kExitUsage,
                      "--json, --band and --attribute are for info, stats and hist of a file");
    }
    for (const std::string& index : request_.indices) CheckIndex(index, "--index");
    if (!request_.spectral && !request_.texture && !request_.shape && request_.indices.empty())
      request_.spectral = request_.shape = true;
    if (!table_.empty() && (!IsVectorName(table_) || table_.ends_with(".fxv"))) {
      throw HostError(kExitUsage, table_ + ": --table: no vector format has this ending");
    }
  }

  std::vector<std::string> GetOutputs() const override {
    std::vector<std::string> outputs;
    for (const AttributeFile& made : FilesOf(request_, name_)) outputs.push_back(made.file);
    if (!table_.empty()) outputs.push_back(table_);
    return outputs;
  }

  std::vector<std::string> GetFurtherInputs() const override { return {labels_}; }

  void AddOpening(JobDraft& draft) const override {
    AddOpen(draft, "source", GetSource());
    AddQuery(draft, "source", "$source");
    AddOpen(draft, "labels", {labels_, ""});
    AddQuery(draft, "labels", "$labels");
  }

  void Plan(JobSession& /*session*/, const JobResults& opened) override {
    const RasterInfo scene = ReadInfo(opened, "source");
    const RasterInfo labels = ReadInfo(opened, "labels");
    request_.bands = ParseBands(bandsText_, scene);
    request_.hasBands = !bandsText_.empty();
    if (labels.samples != scene.samples || labels.lines != scene.lines) {
      throw HostError(kExitFailed,
                      fmt::format("{}: the labels have {} x {} pixels, the scene {} x {}", labels_,
                                  labels.samples, labels.lines, scene.samples, scene.lines));
    }
    request_.isNarrow =
        DispatchType(TypeList<std::uint8_t, std::int8_t, std::uint16_t, std::int16_t>{},
                     labels.dataType, [&]<typename T>() { return true; });
    if (!request_.isNarrow && labels.dataType != kDataTypeOf<std::int32_t> &&
        labels.dataType != kDataTypeOf<std::uint32_t>) {
      throw HostError(kExitFailed,
                      fmt::format("{}: labels are whole numbers of up to 32 bits, not {}", labels_,
                                  DataTypeName(labels.dataType).ToUTF8()));
    }
    request_.TakePixelSize(labels.geoRef.IsNull() ? scene.geoRef : labels.geoRef);
  }

  /// @param names  of the outputs, in their order.
  JobDraft MakeDraft(const std::vector<std::string>& names) const {
    JobDraft draft;
    AddOpen(draft, "source", GetSource());
    AddOpen(draft, "labels", {labels_, ""});
    std::vector<AttributeFile> files = FilesOf(request_, name_);
    for (std::size_t i = 0; i < files.size(); ++i) files[i].file = names[i];
    AddAttributes(draft, request_, {"$source", "$labels"}, files,
                  table_.empty() ? std::string() : names.back());
    draft.Close("close.labels", "$labels");
    draft.Close("close", "$source");
    return draft;
  }

  JobDraft GetJob(const Outputs& outputs) const override {
    std::vector<std::string> names;
    for (std::size_t i = 0; i < GetOutputs().size(); ++i) names.push_back(outputs.Get(i).GetName());
    return MakeDraft(names);
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    std::vector<std::string> names;
    for (std::size_t i = 0; i < GetOutputs().size(); ++i) {
      names.push_back(outputs.Get(i).GetWorkName());
    }
    const JobDraft draft = MakeDraft(names);
    const ProgressView view(session.GetProgress(), GetProgressStyle());
    session.Run(draft);
  }

  std::string labels_, name_, bandsText_, table_, attribute_;
  std::optional<unsigned> band_;
  bool isJson_ = false;
  AttributeRequest request_;
};

const VerbRegistration attributesRegistration(
    "attributes", "Computes values and shapes of the regions of a label raster",
    &SetUp<AttributesVerb>);

}  // namespace
}  // namespace lumo::host
