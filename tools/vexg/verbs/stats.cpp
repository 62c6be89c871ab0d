#include <algorithm>
#include <cmath>

#include <fmt/format.h>

#include "foundation/fault.h"
#include "foundation/near_name.h"
#include "output/json_number.h"
#include "output/saved_values.h"
#include "rasters/band_table.h"
#include "rasters/file_verb.h"
#include "rasters/raster_target.h"
#include "regions/zonal_figures.h"
#include "stats/raster_percentiles.h"
#include "stats/turn.h"

namespace lumo::host {
namespace {

constexpr const char* kStatsStep = "stats";
constexpr const char* kPercentilesStep = "percentiles";
constexpr const char* kSaveCommand = "SaveRasterStatsCommand";

void AppendMatrix(std::string& text, const char* title, const BandTable& table,
                  const std::vector<Column>& rows) {
  text += fmt::format("\n{}\n{:>4}", title, "");
  for (const unsigned band : table.bands) text += fmt::format(" {:>16}", band);
  text += '\n';
  for (std::size_t i = 0; i < rows.size(); ++i) {
    text += fmt::format("{:>4}", table.bands[i]);
    for (const Cell& value : rows[i]) text += fmt::format(" {:>16}", value.text);
    text += '\n';
  }
}

std::string AsText(const std::string& file, const BandTable& table) {
  std::string text = fmt::format("{}\nband", Printable(file));
  for (const auto& [name, column] : table.columns) text += fmt::format(" {:>16}", name);
  text += '\n';
  for (std::size_t i = 0; i < table.bands.size(); ++i) {
    text += fmt::format("{:>4}", table.bands[i]);
    for (const auto& [name, column] : table.columns) {
      text += fmt::format(" {:>16}", column[i].text);
    }
    text += '\n';
  }
  if (table.cov.empty()) return text;
  AppendMatrix(text, "covariances", table, table.cov);
  AppendMatrix(text, "sums of products", table, table.sumXY);
  return text;
}

class StatsVerb final : public FileVerb {
 public:
  explicit StatsVerb(OptionSet& line) : FileVerb(line) {
    line.AddNote(
        "Pixels without data, masked ones, NaN and infinities do not count. The deviation is that "
        "of a sample, divided by n - 1. With --json: \"file\" and \"bands\", a list of objects "
        "with \"band\" (from 0), \"count\", \"min\", \"max\", \"mean\", \"std\", \"sum\", "
        "\"sum2\", \"rms\", and with --extended \"sumXY\" and \"cov\", one value for each band. Of "
        "a band without a valid pixel all but the count is null, and a dash in the table; a count "
        "that isn't known is null, and NaN and infinities are.");
    line.AddExample("vexg stats scene.tif --bands 3,2,1 --extended");
    line.Add("--bands", bandsText_, "Bands, from 0; all by default")
        .Shows("B,B...")
        .Example("3,2,1");
    AddAreaTo(line);
    line.Add("--extended", isExtended_, "With covariances and sums of products");
    line.Add("--median", hasMedian_, "With the median");
    line.Add("--percentiles", percentilesText_, "With percentiles, each from 0 to 100")
        .Shows("P,P...")
        .Example("2,50,98");
    line.Add("--save", saves_, "Store them with the raster, so that they are known from now on");
    line.Add("--json", isJson_, "As JSON");
  }

 private:
  void CheckOptions() override {
    ReadPercentages();
    if (saves_ && !bandsText_.empty()) {
      throw HostError(kExitUsage,
                      "--save: the statistics of all bands are saved together; leave --bands out");
    }
    if (saves_ && GetArea().IsGiven()) {
      throw HostError(kExitUsage, "--save: the statistics of some pixels are not the raster's");
    }
  }

  /// Finds out which percentiles are wanted, and what their columns are called.
  void ReadPercentages() {
    if (hasMedian_) AddPercentage("median", 50);
    for (std::size_t at = 0; !percentilesText_.empty() && at <= percentilesText_.size();) {
      const std::size_t end = std::min(percentilesText_.find(',', at), percentilesText_.size());
      const std::string name = fmt::format("p{}", percentilesText_.substr(at, end - at));
      ZonalRequest request;
      if (!ParseZonalRequest(name, request) || request.figure != ZonalFigure::kPercentile) {
        TakeFault();
        throw HostError(kExitUsage,
                        fmt::format("--percentiles: \"{}\" is no percentage from 0 to 100",
                                    Printable(name.substr(1))));
      }
      AddPercentage(name, request.percent);
      at = end + 1;
    }
    if (percents_.size() <= kMostPercentages) return;
    throw HostError(kExitUsage,
                    fmt::format("--percentiles: more than {} of them", kMostPercentages));
  }

  void AddPercentage(const std::string& name, double percent) {
    if (std::find(columns_.begin(), columns_.end(), name) != columns_.end()) return;
    columns_.push_back(name);
    percents_.push_back(percent);
  }

  std::vector<std::string> GetChangedFiles() const override {
    return saves_ ? FilesOfSavedValues(GetSource()) : std::vector<std::string>();
  }

  void AddOpening(JobDraft& draft) const override {
    AddOpenWithPyramid(draft, "raster", GetSource());
    AddQuery(draft, "raster", "$raster");
  }

  void Plan(JobSession& session, const JobResults& opened) override {
    const OpenRaster shown =
        ShowArea(session, {URIOf(opened, "$raster"), ReadInfo(opened, "raster")});
    raster_ = shown.uri;
    info_ = shown.info;
    bands_ = ParseBands(bandsText_, info_);
  }

  /// @param raster  a variable or URI.
  void AddStats(JobDraft& draft, const String& raster) const {
    if (!bandsText_.empty()) AddBandView(draft, "bands", raster, bands_);
    JobWriterCommand& stats = draft.Step(
        kStatsStep, isExtended_ ? "GetExtendedRasterStatsCommand" : "GetBasicRasterStatsCommand");
    stats.AddInput("URI", bandsText_.empty() ? raster : "$bands");
    stats.AddInput("Wait", Waiting::kAlways);
    if (!percents_.empty()) {
      JobWriterCommand& percentiles = draft.Step(kPercentilesStep, "GetRasterPercentilesCommand");
      percentiles.AddInput("URI", bandsText_.empty() ? raster : "$bands");
      Array<double> percents{ArrayDims(static_cast<unsigned>(percents_.size()))};
      std::copy(percents_.begin(), percents_.end(), percents.begin());
      percentiles.AddInput("Percents", percents);
    }
    if (!bandsText_.empty()) draft.Close("close.bands", "$bands");
  }

  JobDraft GetJob(const Outputs& /*outputs*/) const override {
    JobDraft draft;
    RasterChain chain(draft);
    AddOpenWithPyramid(draft, "raster", GetSource());
    chain.Take("raster");
    GetArea().AddViews(chain);
    AddStats(draft, chain.GetTop());
    if (saves_) AddSave(draft, kSaveCommand, "$raster");
    chain.Close();
    return draft;
  }

  void Make(JobSession& session, const Outputs& /*outputs*/) override {
    JobDraft draft;
    AddStats(draft, raster_);
    JobResults results;
    {
      const char* const last = percents_.empty() ? kStatsStep : kPercentilesStep;
      const ProgressView view(ProgressOfSteps(session, draft, kStatsStep, last),
                              GetProgressStyle());
      results = session.Run(draft);
    }
    table_ = ReadTable(results.Find(kStatsStep).returns, GetSource().file, isExtended_, bands_,
                       info_.dataType);
    if (percents_.empty()) return;
    AddPercentiles(results.Find(kPercentilesStep).returns.Find("Percentiles"), columns_, table_);
  }

  void Save(JobSession& session) override {
    if (saves_) SaveValues(session, GetSource(), kSaveCommand, raster_, "statistics");
  }

  std::string Describe() const override {
    const Json json{{"file", GetSource().file}, {"bands", AsJson(table_)}};
    return isJson_ ? json.dump(2) + "\n" : AsText(GetSource().file, table_);
  }

  std::string bandsText_, percentilesText_;
  bool hasMedian_ = false;
  bool isExtended_ = false;
  bool saves_ = false;
  bool isJson_ = false;

  String raster_;  // URI
  RasterInfo info_;
  Array<unsigned> bands_;
  std::vector<double> percents_;      // those that are wanted
  std::vector<std::string> columns_;  // what the table calls each
  BandTable table_;
};

const VerbRegistration statsRegistration("stats", "Tells the statistics of a raster's bands",
                                         &SetUp<StatsVerb>);

}  // namespace
}  // namespace lumo::host
