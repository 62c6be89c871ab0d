#include <algorithm>
#include <cmath>
#include <filesystem>
#include <numeric>
#include <optional>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "output/json_number.h"
#include "output/saved_values.h"
#include "pictures/plot.h"
#include "raster/pixel_types.h"
#include "rasters/band_bins.h"
#include "rasters/band_notes.h"
#include "rasters/file_verb.h"
#include "rasters/raster_target.h"

namespace lumo::host {
namespace {

constexpr unsigned kMostBins = 1U << 24;
constexpr const char* kSaveCommand = "SaveRasterHistogramCommand";

std::string AsText(const std::string& file, const std::vector<BandBins>& all) {
  std::string text = Printable(file) + "\n";
  for (const BandBins& bins : all) {
    const std::uint64_t counted =
        std::accumulate(bins.counts.begin(), bins.counts.end(), std::uint64_t{0});
    text += fmt::format("\nband {}: {} bins of {} from {}, {} values\n", bins.band,
                        bins.counts.size(), bins.size, bins.range, counted);
    for (std::size_t i = 0; i < bins.counts.size(); ++i) {
      if (bins.counts[i] == 0) continue;
      const double from = bins.lower + static_cast<double>(i) * bins.size;
      text += fmt::format("{:>16.10g} {:>14}\n", from, bins.counts[i]);
    }
  }
  return text;
}

/// A count and its unit, such that the highest of an axis is a short number.
struct CountUnit {
  const char* words;
  double pixels;
};

CountUnit UnitOf(std::uint64_t most) {
  constexpr double kThousand = 1e3, kMillion = 1e6, kShort = 20;
  if (static_cast<double>(most) >= kShort * kMillion) return {"million pixels", kMillion};
  if (static_cast<double>(most) >= kShort * kThousand) return {"thousand pixels", kThousand};
  return {"pixels", 1};
}

PlotPanel PanelOf(const std::string& file, const BandBins& bins, const BandNotes& notes) {
  const CountUnit unit = UnitOf(*std::max_element(bins.counts.begin(), bins.counts.end()));
  const std::string& name = notes.name.empty() ? notes.meaning : notes.name;
  constexpr std::size_t kLongest = 40;  // letters of a name that a title has room for
  PlotPanel panel{fmt::format("{}, band {}{}{}",
                              Printable(std::filesystem::path(file).filename().string(), kLongest),
                              bins.band, name.empty() ? "" : ": ", Printable(name, kLongest)),
                  "pixel value",
                  unit.words,
                  bins.lower,
                  bins.size,
                  {}};
  const std::string in = notes.unit.empty() ? "" : fmt::format(" ({})", notes.unit);
  if (notes.IsScaled()) {
    panel.across = fmt::format("pixel; value{} = {}", in, notes.GetScaling());
  } else {
    panel.across += in;
  }
  for (const std::uint64_t count : bins.counts) {
    panel.values.push_back(static_cast<double>(count) / unit.pixels);
  }
  return panel;
}

class HistVerb final : public FileVerb {
 public:
  explicit HistVerb(OptionSet& line) : FileVerb(line) {
    line.AddNote(
        "Without bounds, the bins reach from the smallest to the largest value of each band, or "
        "over all values of an 8-bit type; there are 256, or fewer where whole numbers fill fewer "
        "bins of one whole size. Every value within the bounds is in one bin; the last bin holds "
        "the upper bound too. Values outside the bounds do not count; bounds that the pixels can't "
        "reach are limited to what they can. With --json: \"file\" and \"bands\", a list of "
        "objects with \"band\", \"min\", \"max\", \"binSize\" and \"counts\". -o draws them.");
    line.AddExample("vexg hist scene.tif --bands 0,1,2 -o scene-histogram.png");
    line.Add("--bands", bandsText_, "Bands, from 0; all by default")
        .Shows("B,B...")
        .Example("3,2,1");
    AddAreaTo(line);
    line.Add("--lower", limits_.lower, "Smallest value that counts").Shows("VALUE");
    line.Add("--upper", limits_.upper, "Largest value that counts").Shows("VALUE");
    line.Add("--bins", limits_.binCount, "How many bins; no more than there are whole numbers")
        .Within(1, kMostBins);
    line.Add("--bin-size", limits_.binSize, "Width of a bin").Shows("SIZE");
    line.Add("--output,-o", output_, "A plot of the histograms, as SVG, PNG, JPEG or WebP")
        .IsFile("OUT.svg|png");
    AddOverwriteTo(line, "a picture that is there");
    line.Add("--save", saves_, "Store the histograms with the raster");
    line.Add("--json", isJson_, "As JSON");
  }

 private:
  void CheckOptions() override {
    if (limits_.binCount && limits_.binSize) {
      throw HostError(kExitUsage, "--bins and --bin-size exclude each other");
    }
    if (limits_.binSize && !(*limits_.binSize > 0 && std::isfinite(*limits_.binSize))) {
      throw HostError(kExitUsage, "--bin-size: the size of a bin is above 0");
    }
    if (!output_.empty()) CheckFigureName(output_);
    if (saves_ && GetArea().IsGiven()) {
      throw HostError(kExitUsage, "--save: the histograms of some pixels are not the raster's");
    }
  }

  std::vector<std::string> GetOutputs() const override {
    return output_.empty() ? std::vector<std::string>() : std::vector{output_};
  }

  std::vector<std::string> GetChangedFiles() const override {
    return saves_ ? FilesOfSavedValues(GetSource()) : std::vector<std::string>();
  }

  void AddOpening(JobDraft& draft) const override {
    AddOpenWithPyramid(draft, "raster", GetSource());
    AddQuery(draft, "raster", "$raster");
    AddNotesQuery(draft, "$raster");
  }

  void Plan(JobSession& session, const JobResults& opened) override {
    const auto [uri, info] =
        ShowArea(session, {URIOf(opened, "$raster"), ReadInfo(opened, "raster")});
    raster_ = uri;
    notes_ = ReadNotes(opened, info.bands);
    dataType_ = info.dataType;
    bands_ = ParseBands(bandsText_, info);
    if (DispatchType(TenTypes{}, dataType_, []<typename T>() { return true; })) return;
    throw HostError(kExitFailed, GetSource().file + ": complex pixels have no histogram");
  }

  JobDraft GetJob(const Outputs& /*outputs*/) const override {
    JobDraft draft;
    RasterChain chain(draft);
    AddOpenWithPyramid(draft, "raster", GetSource());
    chain.Take("raster");
    GetArea().AddViews(chain);
    AddCounting(draft, chain.GetTop(), bands_, dataType_, limits_);
    if (saves_) AddSave(draft, kSaveCommand, "$raster");
    chain.Close();
    return draft;
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    JobDraft draft;
    AddCounting(draft, raster_, bands_, dataType_, limits_);
    {
      const ProgressView view(session.GetProgress(), GetProgressStyle());
      const JobResults results = session.Run(draft);
      all_ = ReadBins(results, dataType_);
    }
    if (!output_.empty()) Draw(outputs.Get(0));
  }

  void Draw(const OutputFile& output) const {
    std::vector<PlotPanel> panels;
    for (const BandBins& bins : all_) {
      panels.push_back(PanelOf(GetSource().file, bins, notes_.bands[bins.band]));
    }
    DrawPlot(panels).Write(output);
  }

  void Save(JobSession& session) override {
    if (saves_) SaveValues(session, GetSource(), kSaveCommand, raster_, "histograms");
  }

  std::string Describe() const override {
    const std::string& file = GetSource().file;
    if (isJson_) return Json{{"file", file}, {"bands", AsJson(all_)}}.dump(2) + "\n";
    return output_.empty() ? AsText(file, all_) : std::string();
  }

  std::string bandsText_;
  BinLimits limits_;
  std::string output_;
  bool saves_ = false;
  bool isJson_ = false;

  String raster_;  // URI
  unsigned dataType_ = 0;
  Array<unsigned> bands_;
  RasterNotes notes_;
  std::vector<BandBins> all_;
};

const VerbRegistration histRegistration("hist", "Counts the values of a raster's bands into bins",
                                        &SetUp<HistVerb>);

}  // namespace
}  // namespace lumo::host
