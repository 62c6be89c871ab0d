#include <fmt/format.h>

#include "raster/pixel_types.h"
#include "rasters/pixel_conversion.h"
#include "rasters/raster_verb.h"

namespace lumo::host {
namespace {

class StackVerb final : public RasterVerb {
 public:
  explicit StackVerb(OptionSet& line) {
    line.AddNote(
        "All rasters have the size and the place of the first one: vexg warp carries others there. "
        "Bands keep their names, units, scales and no-data values.");
    line.AddExample("vexg stack scene.tif B2.tif B3.tif B4.tif");
    line.AddExample("vexg stack layers.tif scene.tif slope.tif --type Single");
    AddOutputTo(line, "The raster of all bands");
    GetSource().AddTo(line);
    line.Add("further", further_, "Further rasters, whose bands follow").IsFile();
    line.Add("--bands", bandsText_,
             "Bands in the order wanted, from 0, counted through all rasters; all by default")
        .Shows("B,B...")
        .Example("3,2,1");
    conversion_.AddTypeTo(line, "Pixel type of all bands; by default the rasters have to have one");
    AddAreaTo(line);
  }

 private:
  std::vector<std::string> GetFurtherInputs() const override { return further_; }

  /// Opens all: what doesn't go together is found before anything is made.
  void AddQuestions(JobDraft& draft) const override {
    for (std::size_t i = 0; i < further_.size(); ++i) {
      AddOpen(draft, NameOf(i), {further_[i], {}});
      AddQuery(draft, QueryOf(i), String(fmt::format("${}", NameOf(i))));
    }
  }

  RasterInfo PlanRaster(JobSession& /*session*/, const JobResults& opened,
                        const RasterInfo& source) override {
    types_ = {source.dataType};
    haveCodes_ = HoldsCodes(source, ParseBands("", source));
    RasterInfo all = source;
    for (std::size_t i = 0; i < further_.size(); ++i) {
      const RasterInfo next = ReadInfo(opened, QueryOf(i));
      types_.push_back(next.dataType);
      haveCodes_ = haveCodes_ || HoldsCodes(next, ParseBands("", next));
      all.bands += next.bands;
      if (conversion_.type.empty() && next.dataType != source.dataType) {
        throw HostError(kExitFailed,
                        fmt::format("{}: its pixels are {}, those of {} are {}; --type makes all "
                                    "bands one type",
                                    further_[i], DataTypeName(next.dataType).ToUTF8(),
                                    GetSource().file, DataTypeName(source.dataType).ToUTF8()));
      }
    }
    all.dataType = conversion_.TypeOf(source.dataType);
    bands_ = ParseBands(bandsText_, all);
    all.bands = bands_.GetCount();
    return all;
  }

  void AddViews(RasterChain& chain) const override {
    conversion_.AddView(chain, "converted", types_.front());
    std::string rasters = chain.GetTop().ToUTF8();
    for (std::size_t i = 0; i < further_.size(); ++i) {
      const std::string name = NameOf(i);
      AddOpen(chain.GetDraft(), name, {further_[i], {}});
      chain.Take(name);
      GetArea().AddViewsOfFurther(chain, name, types_[i + 1]);
      conversion_.AddView(chain, fmt::format("{}.converted", name), types_[i + 1]);
      rasters.append(" ").append(chain.GetTop().ToUTF8());
    }
    JobWriterCommand& stack = chain.GetDraft().Open("stack", "CreateBandStackRasterCommand");
    stack.AddExpandedInput("SrcURI", String(rasters));
    stack.AddInput("Bands", String("Exact"));
    chain.Take("stack");
    if (bandsText_.empty()) return;
    AddBandView(chain.GetDraft(), "bands", chain.GetTop(), bands_);
    chain.Take("bands");
  }

  bool KeepsPalettes() const override { return true; }
  std::string GetOverviewMethod() const override { return haveCodes_ ? "Nearest" : "Average"; }

  /// Rasters of several files have no blocks in common.
  bool CopiesBlocksOfSource() const override { return false; }

  static std::string QueryOf(std::size_t index) { return fmt::format("query{}", index + 2); }
  static std::string NameOf(std::size_t index) { return fmt::format("raster{}", index + 2); }

  std::vector<std::string> further_;
  std::string bandsText_;
  PixelConversion conversion_;

  std::vector<unsigned> types_;  // of the rasters
  Array<unsigned> bands_;
  bool haveCodes_ = false;  // some of them
};

const VerbRegistration stackRegistration("stack", "Puts the bands of several rasters into one file",
                                         &SetUp<StackVerb>);

}  // namespace
}  // namespace lumo::host
