#include <algorithm>
#include <cmath>
#include <optional>

#include "foundation/fault.h"
#include "fx/accuracy.h"
#include "fx/class_samples.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"
#include "raster/raster_details.h"
#include "regions/zonal_pass.h"

namespace lumo {
namespace {

const CommandDeclaration kAccuracy{
    "AccuracyCommand",
    "Feature extraction",
    "Compares a map of classes with samples of known classes. A command of this library's own.",
    {{"MapURI", Presence::kRequired, ValueKind::kURI, "the map; its first band counts"},
     {"Vectors", Presence::kRequired, ValueKind::kText,
      "the file of samples: points, or shapes, which are of the class of most of their pixels"},
     {"ClassField", Presence::kRequired, ValueKind::kText, "the field with the class of a sample"},
     {"Layer", Presence::kOptional, ValueKind::kText,
      "a layer of the file, by its name or its number from 0; the first when absent"},
     {"Where", Presence::kOptional, ValueKind::kText,
      "FIELD=VALUE: only records with that value; all when absent"},
     {"Classes", Presence::kOptional, ValueKind::kTextList,
      "the names of the map's values from 1 on; when absent those that the map has, and where it "
      "has "
      "none the field holds values"}},
    {{"Classes", ValueKind::kTextList, "the classes, in the order of the matrix"},
     {"Matrix", ValueKind::kIntegerArray,
      "samples: a row for each class that is known, a column for each class of the map"},
     {"Overall", ValueKind::kNumberArray,
      "share of the samples whose class the map has, and the bounds of its 95 % interval"},
     {"Kappa", ValueKind::kNumber, "agreement beyond chance"},
     {"Producer", ValueKind::kNumberArray,
      "for each class: of its samples the share that the map has, and the bounds"},
     {"User", ValueKind::kNumberArray,
      "for each class: of the samples that it has in the map the share that is right, and the "
      "bounds"},
     {"F1", ValueKind::kNumberArray, "for each class the harmonic mean of both"},
     {"Outside", ValueKind::kInteger, "samples without a pixel that counts"},
     {"NoClass", ValueKind::kInteger, "samples on pixels of no class"}}};

class AccuracyCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr map = FindRaster("MapURI");
    if (!map) return Fail();
    ReadNames(*map);
    if (!ReadSamples()) return Fail();
    std::vector<double> figures;
    bool isDone = false;
    const bool isKnown = DispatchType(EightTypes{}, map->DataType(), [&]<typename T>() {
      ZonalPass<T> pass(RasterPtr<T>(map), plan_);
      isDone = pass.Run(GetIPC());
      figures = pass.GetFigures();
      return true;
    });
    if (!isKnown) return Fail("MapURI: a map of classes has no pixels of this type");
    if (!isDone) return Fail(TakeFaultOr("the map can't be read"));
    if (!NameClasses(figures)) return Fail();
    WriteResults(figures);
    return Succeed();
  }

  /// The names of the map's values from 1 on: those given, else its own.
  void ReadNames(const BasicRaster& map) {
    if (HasInput("Classes")) {
      for (const String& name : Read<Array<String>>("Classes")) names_.push_back(name.ToUTF8());
    } else {
      names_ = FindCategories(map.GetRasterDef().metadata, 0);
      if (!names_.empty()) names_.erase(names_.begin());
      while (!names_.empty() && names_.back().empty()) names_.pop_back();
    }
    isNamed_ = !names_.empty();
  }

  bool ReadSamples() {
    const SampleSource source{Read<String>("Vectors").ToUTF8(), Read<String>("Layer").ToUTF8(),
                              Read<String>("Where").ToUTF8(), Read<String>("ClassField").ToUTF8()};
    ClassSamples samples;
    if (!ReadClassSamples(source, GetIPC(), samples)) return false;
    known_ = samples.classes;
    plan_.geometry = samples.shapes;
    plan_.options = SampleScan();
    for (const char* const figure : {"count", "majority"}) {
      plan_.requests.emplace_back();
      ParseZonalRequest(figure, plan_.requests.back());
    }
    plan_.bands.Resize(ArrayDims(1));
    plan_.bands[0] = 0;
    return true;
  }

  /// Finds the classes of the map and of the samples.
  bool NameClasses(const std::vector<double>& figures) {
    if (isNamed_) {
      for (const std::string& known : known_) {
        if (std::find(names_.begin(), names_.end(), known) != names_.end()) continue;
        SetFault(String("ClassField: a sample is of class \"" + known + "\", which the map lacks"));
        return false;
      }
      return true;
    }
    names_ = known_;
    for (std::size_t i = 0; i < known_.size(); ++i) {
      if (figures[2 * i] > 0) names_.push_back(FormatValue(figures[2 * i + 1]).ToUTF8());
    }
    names_ = OrderClassNames(std::move(names_));
    return true;
  }

  /// The place of a value of the map among the classes.
  std::optional<std::size_t> FindClass(double value) const {
    if (isNamed_) {
      const bool isClass = value >= 1 && value <= static_cast<double>(names_.size());
      return isClass ? std::optional(static_cast<std::size_t>(value) - 1) : std::nullopt;
    }
    return PlaceOf(FormatValue(value).ToUTF8());
  }

  std::optional<std::size_t> PlaceOf(const std::string& name) const {
    const auto found = std::find(names_.begin(), names_.end(), name);
    if (found == names_.end()) return {};
    return static_cast<std::size_t>(found - names_.begin());
  }

  void WriteResults(const std::vector<double>& figures) {
    const std::size_t classes = names_.size();
    std::vector<std::uint64_t> matrix(classes * classes);
    unsigned outside = 0, noClass = 0;
    for (std::size_t sample = 0; sample < known_.size(); ++sample) {
      if (!(figures[2 * sample] > 0)) {
        ++outside;
        continue;
      }
      const std::optional<std::size_t> mapped = FindClass(figures[2 * sample + 1]);
      if (mapped) {
        ++matrix[*PlaceOf(known_[sample]) * classes + *mapped];
      } else {
        ++noClass;
      }
    }
    const Accuracy accuracy = Accuracy::Of(matrix, classes);
    Array<String> names{ArrayDims(static_cast<unsigned>(classes))};
    for (unsigned i = 0; i < classes; ++i) names[i] = String(names_[i]);
    Write("Classes", names);
    Write("Matrix", TableOf(matrix, classes));
    Write("Overall", TableOf({accuracy.overall}));
    Write("Kappa", accuracy.kappa);
    Write("Producer", TableOf(accuracy.producer));
    Write("User", TableOf(accuracy.user));
    Array<double> f1{ArrayDims(static_cast<unsigned>(classes))};
    std::copy(accuracy.f1.begin(), accuracy.f1.end(), f1.begin());
    Write("F1", f1);
    Write("Outside", outside);
    Write("NoClass", noClass);
  }

  static Array<unsigned> TableOf(const std::vector<std::uint64_t>& counts, std::size_t columns) {
    const auto side = static_cast<unsigned>(columns);
    Array<unsigned> table{ArrayDims(side, side)};
    std::transform(counts.begin(), counts.end(), table.begin(),
                   [](std::uint64_t count) { return static_cast<unsigned>(count); });
    return table;
  }
  static Array<double> TableOf(const std::vector<ShareEstimate>& shares) {
    Array<double> table{ArrayDims(static_cast<unsigned>(shares.size()), 3)};
    double* to = table.GetData();
    for (const ShareEstimate& estimate : shares) {
      *to++ = estimate.share;
      *to++ = estimate.low;
      *to++ = estimate.high;
    }
    return table;
  }

  ZonalPlan plan_;
  std::vector<std::string> known_;  // class of each sample
  std::vector<std::string> names_;  // of the classes
  bool isNamed_ = false;            // they are names of the values from 1 on
};

const CommandFactoryT<AccuracyCommand> accuracyFactory(kAccuracy);

}  // namespace
}  // namespace lumo
