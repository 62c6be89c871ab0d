#include <filesystem>

#include "foundation/fault.h"
#include "fx/attribute_inputs.h"
#include "fx/attribute_names.h"
#include "fx/attribute_statistics.h"

namespace lumo {
namespace {

const CommandDeclaration kQueryAttributes{
    "QueryAttributesCommand",
    "Feature extraction",
    "Tells what a file of regions holds, and the statistics and histograms of its attributes. A "
    "command of this library's own.",
    {{"AttributeFXA", Presence::kRequired, ValueKind::kText, "the file of regions"},
     {"Statistics", Presence::kOptional, ValueKind::kBoolean, "whether they are computed"},
     {"Histograms", Presence::kOptional, ValueKind::kBoolean, "whether they are computed"}},
    {{"Bands", ValueKind::kInteger, "how many there are"},
     {"Attributes", ValueKind::kInteger, "how many there are in a band"},
     {"Names", ValueKind::kTextList, "of the attributes; numbers where they have none"},
     {"Records", ValueKind::kInteger, "one above the largest label"},
     {"Regions", ValueKind::kInteger, "of the records, those that hold a region"},
     {"Mean", ValueKind::kNumberArray, "of bands by attributes, over all regions"},
     {"Std", ValueKind::kNumberArray, "deviation of a sample"},
     {"Min", ValueKind::kNumberArray, "smallest value"},
     {"Max", ValueKind::kNumberArray, "largest value"},
     {"Count", ValueKind::kNumberArray, "how many values there are"},
     {"Lower", ValueKind::kNumberArray,
      "of bands by attributes, the lowest value of the first bin"},
     {"Upper", ValueKind::kNumberArray, "the lowest value of the last bin"},
     {"Bins", ValueKind::kIntegerArray,
      "of bands by attributes by bins, how many values there are"}}};

class QueryAttributesCommand final : public RegionCommand {
  CommandResult Execute() override {
    URI from;
    if (!CheckInputs() || !TakeExisting("AttributeFXA", from)) return Fail();
    RegionAttributesFile<float> regions(from, false);
    if (!regions.IsValid()) {
      return Fail(String("AttributeFXA: " + from.ToUTF8() + " is no file of regions"));
    }
    if (!IsWhole(from.ToUTF8(), regions)) {
      return Fail(String("AttributeFXA: " + from.ToUTF8() + " ends within a record"));
    }
    Write("Bands", regions.Bands());
    Write("Attributes", regions.Attributes());
    WriteNames(from.ToUTF8(), regions.Attributes());
    Write("Records", regions.RegionCount());
    Write("Regions", CountRegions(regions));
    const bool wantsBins = Read<bool>("Histograms");
    if (!Read<bool>("Statistics") && !wantsBins) return Succeed();
    const std::vector<AttributeFigures> figures = FindAttributeFigures(regions, GetIPC());
    if (figures.empty() && regions.Bands() != 0 && regions.Attributes() != 0) {
      return Fail(TakeFaultOr("the file can't be read"));
    }
    WriteFigures(figures, regions);
    if (wantsBins && !WriteHistograms(figures, regions)) {
      return Fail(TakeFaultOr("the file can't be read"));
    }
    return Succeed();
  }

  static bool IsWhole(const std::string& path, RegionAttributesFile<float>& regions) {
    std::error_code none;
    const std::uintmax_t bytes = std::filesystem::file_size(path, none);
    const std::uintmax_t record =
        sizeof(float) * std::uintmax_t{regions.Bands()} * regions.Attributes();
    return record == 0 || (bytes - BasicBuffer::kHeaderSize) % record == 0;
  }

  void WriteNames(const std::string& path, unsigned attributes) {
    Array<String> names{ArrayDims(attributes)};
    AttributeKind kind{};
    const bool isKnown = FindKind(path, attributes, kind);
    for (unsigned i = 0; i < attributes; ++i) {
      names[i] = String(std::to_string(i));
      if (!isKnown) continue;
      names[i] = String(i < NamesOf(kind).size() ? NamesOf(kind)[i].name : "presence");
    }
    Write("Names", names);
  }

  static std::uint64_t CountRegions(RegionAttributesFile<float>& regions) {
    std::uint64_t count = 0;
    const unsigned records = regions.RegionCount();
    for (unsigned region = 0; region < records; ++region) {
      for (unsigned band = 0; band < regions.Bands(); ++band) {
        if (!regions.RegionExists(region, band)) continue;
        ++count;
        break;
      }
    }
    return count;
  }

  void WriteFigures(const std::vector<AttributeFigures>& figures,
                    const RegionAttributesFile<float>& regions) {
    const auto write = [&](const char* name, double AttributeFigures::*field) {
      Array<double> values{ArrayDims(regions.Bands(), regions.Attributes())};
      double* next = values.begin();
      for (const AttributeFigures& figure : figures) *next++ = figure.*field;
      Write(name, values);
    };
    write("Mean", &AttributeFigures::mean);
    write("Std", &AttributeFigures::deviation);
    write("Min", &AttributeFigures::min);
    write("Max", &AttributeFigures::max);
    write("Count", &AttributeFigures::count);
  }

  bool WriteHistograms(const std::vector<AttributeFigures>& figures,
                       RegionAttributesFile<float>& regions) {
    const unsigned bands = regions.Bands(), attributes = regions.Attributes();
    RegionAttributeHistogramMap<float> counts(bands, attributes,
                                              RegionAttributeHistogramFile<float>::kBins);
    if (!counts.IsValid()) return false;
    SetLimits(figures, counts);
    if (!CountAttributes(regions, counts, GetIPC())) return false;
    Array<double> lower{ArrayDims(bands, attributes)}, upper{ArrayDims(bands, attributes)};
    Array<unsigned> bins{ArrayDims(bands, attributes, counts.Bins())};
    unsigned at = 0;
    for (unsigned band = 0; band < bands; ++band) {
      for (unsigned i = 0; i < attributes; ++i, ++at) {
        lower[at] = counts.LowerLimit(band, i);
        upper[at] = counts.UpperLimit(band, i);
        for (unsigned bin = 0; bin < counts.Bins(); ++bin) {
          bins[at * counts.Bins() + bin] = counts.Count(band, i, bin);
        }
      }
    }
    Write("Lower", lower);
    Write("Upper", upper);
    Write("Bins", bins);
    return true;
  }
};

const CommandFactoryT<QueryAttributesCommand> queryAttributesFactory(kQueryAttributes);

}  // namespace
}  // namespace lumo
