#include <algorithm>
#include <charconv>
#include <cstdlib>

#include "options/option_values.h"
#include "pictures/palette_reading.h"
#include "pictures/picture_writer.h"
#include "pictures/quicklook_maker.h"
#include "rasters/band_notes.h"
#include "rasters/file_verb.h"
#include "rasters/value_names.h"

namespace lumo::host {
namespace {

/// "none", or two percentiles.
QuicklookPicture::Stretch ParseStretch(const std::string& text) {
  QuicklookPicture::Stretch stretch;
  if (text.empty()) return stretch;
  stretch.isPercentile = text != "none";
  if (!stretch.isPercentile) return stretch;
  char* end = nullptr;
  stretch.low = std::strtod(text.c_str(), &end);
  bool isGood = end != text.c_str() && *end == ',';
  if (isGood) {
    const char* const second = end + 1;
    stretch.high = std::strtod(second, &end);
    isGood = end != second && *end == '\0' && stretch.low >= 0.0 && stretch.high <= 100.0 &&
             stretch.low < stretch.high;
  }
  if (isGood) return stretch;
  throw HostError(kExitUsage,
                  "--stretch: \"" + text + "\" is neither none nor two percentiles such as 2,98");
}

/// The smallest level of the pyramid that is as large as the picture; 0 for the raster itself.
unsigned ChooseLevel(const RasterInfo& info, unsigned size) {
  if (!info.hasPyramid) return 0;
  const unsigned longer = std::max(info.samples, info.lines);
  unsigned level = info.levelMax;
  while (level >= std::max(info.levelMin, 1U) && (longer >> level) < size) --level;
  const bool isThere = level >= info.levelMin && (std::min(info.samples, info.lines) >> level) != 0;
  return isThere ? level : 0;
}

/// The level of the pyramid that a picture is made from. One of means serves averages as it is. One
/// of picked pixels has to be eight times as large as the picture, so that a mean is one of 64
/// pixels; and single pixels are those of no level of means.
unsigned ChooseLevelFor(PictureSampling sampling, const RasterInfo& info, const std::string& method,
                        unsigned size) {
  constexpr unsigned kPickedBits = 3;
  const bool areMeans = method == "Average";
  if (sampling == PictureSampling::kNearest) return areMeans ? 0 : ChooseLevel(info, size);
  return ChooseLevel(info, areMeans ? size : size << kPickedBits);
}

class QuicklookVerb final : public FileVerb {
 public:
  explicit QuicklookVerb(OptionSet& line) : FileVerb(line) {
    line.AddNote(
        "A band with a palette shows its colours, unless --stretch is given. Pixels without data "
        "are transparent; in a JPEG white.");
    line.AddExample("vexg quicklook scene.tif scene.png --bands 3,2,1 --stretch 1,99");
    line.Add("output", output_, "The picture, a PNG, JPEG or WebP as its name tells")
        .IsFile("OUT.png|jpg|webp")
        .Required();
    line.Add("--bands", bandsText_,
             "One band, or red,green,blue; by default 2,1,0 of four bands or more, 0,1,2 of "
             "three, else 0")
        .Shows("B[,B,B]");
    AddAreaTo(line);
    line.Add("--stretch", stretchText_,
             "Percentiles of each band that become black and white, 2,98 by default; or "
             "none, to cut values to 0 and 255")
        .Shows("LO,HI")
        .Example("0,3000");
    line.Add("--outlines", outlines_,
             "A raster of labels of the same size, whose borders are drawn over the picture")
        .IsFile("LABELS");
    line.Add("--legend", hasLegend_,
             "Draw the names of the values that have some, and their colours");
    line.Add("--resampling", resampling_,
             "What a pixel of a reduced picture shows: average, the mean of the valid pixels that "
             "it covers, or nearest, the one in their middle; by default average, and nearest of "
             "codes: of bands with a palette, which have no other, and of whole numbers of 32 bits")
        .Takes(OneOf({"average", "nearest"}));
    line.Add("--size", size_, "Pixels of the longer side at most").Within(1, 16384).ShowsDefault();
    AddOverwriteTo(line, "a file that is there");
  }

 private:
  void CheckOptions() override {
    stretch_ = ParseStretch(stretchText_);
    CheckPictureName(output_);
  }

  std::vector<std::string> GetOutputs() const override { return {output_}; }
  std::vector<std::string> GetFurtherInputs() const override {
    return outlines_.empty() ? std::vector<std::string>() : std::vector{outlines_};
  }

  void AddOpening(JobDraft& draft) const override {
    AddOpenWithPyramid(draft, "raster", GetSource());
    AddQuery(draft, "raster", "$raster");
    AddNotesQuery(draft, "$raster");
  }

  void Plan(JobSession& session, const JobResults& opened) override {
    whole_ = ReadInfo(opened, "raster");
    const OpenRaster shown = ShowArea(session, {URIOf(opened, "$raster"), whole_});
    raster_ = shown.uri;
    info_ = shown.info;
    bands_ = ChoosePictureBands(bandsText_, info_);
    hasPalette_ = bands_.GetCount() == 1 && info_.hasPalette[bands_[0]] && stretchText_.empty();
    if (hasLegend_ && !hasPalette_) {
      throw HostError(kExitFailed, GetSource().file + ": --legend: the picture is in no palette");
    }
    sampling_ = ChooseSampling(info_, bands_);
    const bool hasPalette = std::any_of(bands_.begin(), bands_.end(),
                                        [&](unsigned band) { return info_.hasPalette[band]; });
    if (resampling_ == "average") sampling_ = PictureSampling::kAverage;
    if (resampling_ == "average" && hasPalette) {
      throw HostError(kExitUsage, "--resampling: the values of a band with a palette have no mean");
    }
    if (resampling_ == "nearest") sampling_ = PictureSampling::kNearest;
    shown_ = raster_;
    if (outlines_.empty()) {  // labels have no levels
      const std::string method = ReadNotes(opened, whole_.bands).pyramidMethod;
      level_ = ChooseLevelFor(sampling_, info_, method, size_);
    }
    if (level_ != 0) ShowLevel(session);
  }

  /// Shows a level as a raster of its own.
  void ShowLevel(JobSession& session) {
    JobDraft draft;
    AddLevel(draft, "level", raster_, level_);
    AddQuery(draft, "level", "$level");
    const JobResults results = session.Run(draft);
    shown_ = results.Find("level").returns.Find("PyramidURI");
    info_ = ReadInfo(results, "level");
  }

  /// Each block has memory of its own there.
  JobDraft GetJob(const Outputs& /*outputs*/) const override {
    JobDraft draft;
    RasterChain chain(draft);
    AddOpenWithPyramid(draft, "raster", GetSource());
    chain.Take("raster");
    GetArea().AddViews(chain);
    if (level_ != 0) {
      AddLevel(draft, "level", chain.GetTop(), level_);
      chain.Take("level");
    }
    const QuicklookPicture picture(info_, size_, bands_, sampling_);
    AddBlockSteps(draft, chain.GetTop(), info_, bands_, Interleave::BIP, picture.GetBlocks());
    chain.Close();
    return draft;
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    QuicklookRequest request{
        {shown_, info_, GetSource().file}, bands_, size_, stretch_, {}, {}, {}, sampling_};
    if (hasPalette_) request.palette = ReadPalette(session, raster_, bands_[0]);
    if (hasLegend_) request.legend = ReadLegend(session, *request.palette);
    if (!outlines_.empty()) request.outlines.push_back({OpenOutlines(session), {255, 255, 0}});
    MakeQuicklook(session, request, outputs.Get(0), GetProgressStyle());
  }

  /// The names of values, as far as the band has some.
  std::vector<LegendRow> ReadLegend(JobSession& session, Palette palette) const {
    JobDraft draft;
    JobWriterCommand& ask = draft.Step("categories", "GetRasterCategoriesCommand");
    ask.AddInput("URI", raster_);
    ask.AddInput("Band", bands_[0]);
    const String text = session.Run(draft).Find("categories").returns.Find("Categories");
    std::vector<LegendRow> legend;
    unsigned value = 0;
    for (const std::string& name : ReadValueNames(text)) {
      if (!name.empty() && value < palette.GetCount()) legend.push_back({name, *palette.At(value)});
      ++value;
    }
    if (!legend.empty()) return legend;
    throw HostError(kExitFailed, GetSource().file + ": --legend: its values have no names");
  }

  /// The labels, in the area that is shown.
  ShownRaster OpenOutlines(JobSession& session) const {
    JobDraft draft;
    RasterChain chain(draft);
    AddOpen(draft, "labels", {outlines_, ""});
    chain.Take("labels");
    AddQuery(draft, "whole", "$labels");
    if (GetArea().IsPart()) {
      chain.AddView("part", "CreateSpatialSubsetRasterCommand")
          .AddInput("SubRect", GetArea().GetRect());
    }
    AddQuery(draft, "shown", chain.GetTop());
    const JobResults opened = session.Run(draft);
    const RasterInfo whole = ReadInfo(opened, "whole");
    if (whole.samples == whole_.samples && whole.lines == whole_.lines) {
      return {URIOf(opened, chain.GetTop()), ReadInfo(opened, "shown"), outlines_};
    }
    throw HostError(kExitFailed, outlines_ + ": --outlines: the labels have another size");
  }

  std::string output_, bandsText_, stretchText_, outlines_, resampling_;
  unsigned size_ = 1024;
  bool hasLegend_ = false;

  QuicklookPicture::Stretch stretch_;
  PictureSampling sampling_ = PictureSampling::kAverage;
  String raster_;       // URI
  unsigned level_ = 0;  // of the pyramid that the picture is made from
  String shown_;        // URI of the level, or of the raster
  RasterInfo info_;     // of that
  RasterInfo whole_;    // of the raster without an area
  Array<unsigned> bands_;
  bool hasPalette_ = false;  // the picture is in the colours of the band
};

const VerbRegistration quicklookRegistration("quicklook",
                                             "Makes a picture of a raster at the size of a screen",
                                             &SetUp<QuicklookVerb>);

}  // namespace
}  // namespace lumo::host
