#include <algorithm>
#include <map>
#include <mutex>

#include "foundation/fault.h"
#include "fx/attribute_inputs.h"
#include "fx/class_samples.h"
#include "raster/tile_functions.h"
#include "views/shapes_raster.h"

namespace lumo {
namespace {

const CommandDeclaration kExamples{
    "FindClassExamplesCommand",
    "Feature extraction",
    "Finds the regions that samples of known classes hit, as examples of these classes. A command "
    "of this library's own.",
    {{"LabelURI", Presence::kRequired, ValueKind::kURI, "the labels, of type Int32"},
     {"Vectors", Presence::kRequired, ValueKind::kText, "the file of samples, of any shape"},
     {"ClassField", Presence::kRequired, ValueKind::kText, "the field with the class of a sample"},
     {"Layer", Presence::kOptional, ValueKind::kText,
      "a layer of the file, by its name or its number from 0; the first when absent"},
     {"Where", Presence::kOptional, ValueKind::kText,
      "FIELD=VALUE: only records with that value; all when absent"},
     {"Classes", Presence::kOptional, ValueKind::kTextList,
      "the names of the classes in their order; those of the samples when absent"}},
    {{"Classes", ValueKind::kTextList, "the names of the classes"},
     {"ExampleDefinition", ValueKind::kIntegerArray, "rows of class and region, by region"},
     {"Counts", ValueKind::kIntegerArray, "how many examples each class has"},
     {"Outside", ValueKind::kInteger, "samples that hit no region"},
     {"Conflicts", ValueKind::kInteger,
      "regions that samples of several classes hit; they are of that of most pixels"}}};

class FindClassExamplesCommand final : public RegionCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr labels = FindLabels(nullptr, false);
    if (!labels) return Fail();
    if (!ReadSamples(*labels) || !OrderClasses()) return Fail();
    const RasterPtr<std::int32_t> samples(new ShapesRaster<std::int32_t>(shapes_));
    if (!samples->IsValid()) return Fail(TakeFaultOr("the samples can't be carried to the labels"));
    if (!CountPairs(RasterPtr<std::int32_t>(labels), samples)) {
      return Fail(TakeFaultOr("the labels could not be read"));
    }
    WriteExamples();
    return Succeed();
  }

  bool ReadSamples(const BasicRaster& labels) {
    const SampleSource source{Read<String>("Vectors").ToUTF8(), Read<String>("Layer").ToUTF8(),
                              Read<String>("Where").ToUTF8(), Read<String>("ClassField").ToUTF8()};
    ClassSamples samples;
    if (!ReadClassSamples(source, GetIPC(), samples)) return false;
    ofSample_ = samples.classes;
    for (std::size_t i = 0; i < ofSample_.size(); ++i) {
      shapes_.values.push_back(static_cast<double>(i + 1));
    }
    shapes_.geometry = samples.shapes;
    shapes_.geoRef = labels.GetRasterDef().geoRef;
    shapes_.samples = labels.Samples();
    shapes_.lines = labels.Lines();
    shapes_.options = SampleScan();
    return true;
  }

  bool OrderClasses() {
    if (HasInput("Classes")) {
      for (const String& name : Read<Array<String>>("Classes")) classes_.push_back(name.ToUTF8());
    } else {
      classes_ = OrderClassNames(ofSample_);
    }
    for (const std::string& name : ofSample_) {
      const auto found = std::find(classes_.begin(), classes_.end(), name);
      if (found == classes_.end()) {
        SetFault(
            String("ClassField: a sample is of class \"" + name + "\", which isn't among them"));
        return false;
      }
      classOfSample_.push_back(static_cast<unsigned>(found - classes_.begin()));
    }
    return true;
  }

  /// Counts the pixels that each region has of each sample.
  bool CountPairs(const RasterPtr<std::int32_t>& labels, const RasterPtr<std::int32_t>& samples) {
    const auto tiles = TilesBy(
        LabelTiles(labels, WideTiles(labels.Get(), sizeof(std::int32_t), kComputedTile, 0)));
    const auto count = [&](const Tile<std::int32_t>& label, const Tile<std::int32_t>& sample) {
      std::map<Pair, std::uint64_t> found;
      for (std::size_t i = 0; i < sample.PixelArray().GetCount(); ++i) {
        const std::int32_t region = label.PixelArray()[i], number = sample.PixelArray()[i];
        if (number == 0 || region <= 0 || !IsValidState(label.StateArray()[i])) continue;
        ++found[{static_cast<unsigned>(region), static_cast<unsigned>(number - 1)}];
      }
      const std::lock_guard lock(mutex_);
      for (const auto& [pair, pixels] : found) pairs_[pair] += pixels;
    };
    const bool well = ForEachTile("FindClassExamples", tiles.With(samples), count, GetIPC());
    if (GetIPC().abort->IsSet()) SetFault("the work was aborted");
    return well && !GetIPC().abort->IsSet();
  }

  void WriteExamples() {
    std::vector<bool> hits(ofSample_.size());
    std::map<unsigned, std::map<unsigned, std::uint64_t>> regions;  // pixels of each class
    for (const auto& [pair, pixels] : pairs_) {
      hits[pair.second] = true;
      regions[pair.first][classOfSample_[pair.second]] += pixels;
    }
    Array<unsigned> examples{ArrayDims(static_cast<unsigned>(regions.size()), 2)};
    Array<unsigned> counts{ArrayDims(static_cast<unsigned>(classes_.size()))};
    std::fill(counts.begin(), counts.end(), 0U);
    unsigned at = 0, conflicts = 0;
    for (const auto& [region, classes] : regions) {
      const auto most =
          std::max_element(classes.begin(), classes.end(),
                           [](const auto& a, const auto& b) { return a.second < b.second; });
      if (classes.size() > 1) ++conflicts;
      examples[at++] = most->first;
      examples[at++] = region;
      ++counts[most->first];
    }
    Array<String> names{ArrayDims(static_cast<unsigned>(classes_.size()))};
    for (unsigned i = 0; i < names.GetCount(); ++i) names[i] = String(classes_[i]);
    Write("Classes", names);
    Write("ExampleDefinition", examples);
    Write("Counts", counts);
    Write("Outside", static_cast<unsigned>(std::count(hits.begin(), hits.end(), false)));
    Write("Conflicts", conflicts);
  }

  using Pair = std::pair<unsigned, unsigned>;  // region, and number of the sample

  ValuedShapes shapes_;
  std::vector<std::string> ofSample_;  // the class of each
  std::vector<std::string> classes_;
  std::vector<unsigned> classOfSample_;
  std::mutex mutex_;
  std::map<Pair, std::uint64_t> pairs_;  // pixels, under mutex_
};

const CommandFactoryT<FindClassExamplesCommand> findClassExamplesFactory(kExamples);

}  // namespace
}  // namespace lumo
