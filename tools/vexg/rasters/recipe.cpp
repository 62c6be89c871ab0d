#include "rasters/recipe.h"

#include <filesystem>

#include "rasters/shape_options.h"
#include "rasters/vector_info.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// Reads the parts of a recipe one after the other.
class Reader {
 public:
  explicit Reader(const std::string& file)
      : root_(JsonFile(file).GetRoot()), folder_(std::filesystem::path(file).parent_path()) {}

  Recipe Read() {
    root_.Allow(
        {"$schema", "calibrate", "segment", "attributes", "classify", "polygons", "accuracy"});
    if (root_.Has("calibrate")) ReadCalibration(root_.Get("calibrate"));
    if (root_.Has("segment")) ReadSegments(root_.Get("segment"));
    if (root_.Has("attributes")) ReadAttributes(root_.Get("attributes"));
    if (!recipe_.attributes.spectral && !recipe_.attributes.texture && !recipe_.attributes.shape &&
        recipe_.attributes.indices.empty()) {
      recipe_.attributes.spectral = recipe_.attributes.shape = true;
    }
    ReadClasses(root_.Get("classify"));
    if (root_.Has("polygons")) ReadPolygons(root_.Get("polygons"));
    if (root_.Has("accuracy")) recipe_.check = ReadSamples(root_.Get("accuracy"));
    return std::move(recipe_);
  }

 private:
  std::string FileIn(const JsonField& field) {
    const std::string text = field.Text();
    if (text.empty()) field.Refuse("a name of a file is expected");
    return (folder_ / text).string();
  }

  static std::vector<double> Numbers(const JsonField& field, const char* name) {
    std::vector<double> numbers;
    if (!field.Has(name)) return numbers;
    for (const JsonField& number : field.Get(name).List()) numbers.push_back(number.Number());
    return numbers;
  }

  static std::optional<double> NumberIn(const JsonField& field, const char* name) {
    return field.Has(name) ? std::optional(field.Get(name).Number()) : std::nullopt;
  }

  void ReadCalibration(const JsonField& field) {
    field.Allow({"quantity", "metadata", "gain", "offset", "irradiance", "k1", "k2", "sunElevation",
                 "distance", "scale", "reflectanceGain", "reflectanceOffset", "metadataBands",
                 "unit"});
    CalibrationRequest& request = recipe_.calibration.emplace();
    recipe_.calibrationPlace = field.Where();
    request.quantity = field.Get("quantity").OneOf({"radiance", "reflectance", "temperature"});
    if (field.Has("metadata")) {
      request.metadata = FileIn(field.Get("metadata"));
    }
    request.gain = Numbers(field, "gain");
    request.offset = Numbers(field, "offset");
    request.irradiance = Numbers(field, "irradiance");
    request.k1 = Numbers(field, "k1");
    request.k2 = Numbers(field, "k2");
    request.reflectanceGain = Numbers(field, "reflectanceGain");
    request.reflectanceOffset = Numbers(field, "reflectanceOffset");
    if (field.Has("metadataBands")) {
      for (const JsonField& band : field.Get("metadataBands").List()) {
        request.metadataBands.push_back(band.Text());
      }
    }
    if (field.Has("unit")) request.unit = field.Get("unit").OneOf({"kelvin", "celsius"});
    request.sunElevation = NumberIn(field, "sunElevation");
    request.distance = NumberIn(field, "distance");
    request.scale = field.NumberOr("scale", 1);
  }

  void ReadSegments(const JsonField& field) {
    field.Allow({"bands", "algorithm", "segmentValue", "segmentPercent", "mergeValue",
                 "mergePercent", "mergeAlgorithm", "tiled", "tileMemory", "tileBorder", "tree"});
    SegmentRequest& request = recipe_.segments;
    if (field.Has("bands")) recipe_.segmentBands = field.Get("bands");
    if (field.Has("algorithm")) {
      request.algorithm = field.Get("algorithm").OneOf({"sobel", "intensity"});
    }
    if (field.Has("mergeAlgorithm")) {
      request.mergeAlgorithm = field.Get("mergeAlgorithm").OneOf({"schedule", "rigorous"});
    }
    request.segmentValue = NumberIn(field, "segmentValue");
    request.segmentPercent = NumberIn(field, "segmentPercent");
    request.mergeValue = NumberIn(field, "mergeValue");
    request.mergePercent = NumberIn(field, "mergePercent");
    if (request.segmentValue && request.segmentPercent) {
      field.Refuse("\"segmentValue\" and \"segmentPercent\" exclude each other");
    }
    if (request.mergeValue && request.mergePercent) {
      field.Refuse("\"mergeValue\" and \"mergePercent\" exclude each other");
    }
    for (const char* const name : {"segmentPercent", "mergePercent"}) {
      const std::optional<double> percent = NumberIn(field, name);
      if (percent && !(*percent >= 0 && *percent <= 100)) {
        field.Get(name).Refuse("a percentage from 0 to 100 is expected");
      }
    }
    if (field.Has("tileMemory")) {
      request.tileMemory = field.Get("tileMemory").Whole(1, 4294967295U);
    }
    request.isTiled = field.FlagOr("tiled", false);
    recipe_.keepsTree = field.FlagOr("tree", false);
    if (recipe_.keepsTree && (request.isTiled || request.mergeAlgorithm != "schedule")) {
      field.Get("tree").Refuse("it goes with \"schedule\", and without \"tiled\"");
    }
    if (field.Has("tileBorder") && !request.isTiled) {
      field.Get("tileBorder").Refuse("it goes with \"tiled\"");
    }
    if (field.Has("tileBorder")) request.tileBorder = field.Get("tileBorder").Whole(0, 65535);
  }

  void ReadAttributes(const JsonField& field) {
    field.Allow({"spectral", "texture", "kernel", "shape", "indices", "bands"});
    AttributeRequest& request = recipe_.attributes;
    request.spectral = field.FlagOr("spectral", false);
    request.texture = field.FlagOr("texture", false);
    request.shape = field.FlagOr("shape", false);
    if (field.Has("kernel")) request.kernel = field.Get("kernel").Whole(1, 65535);
    if (field.Has("bands")) recipe_.attributeBands = field.Get("bands");
    if (!field.Has("indices")) return;
    for (const auto& [name, expression] : field.Get("indices").Members()) {
      request.indices.push_back(name + "=" + expression.Text());
      CheckIndex(request.indices.back(), expression.Where());
    }
  }

  SampleSet ReadSamples(const JsonField& field) {
    SampleSet samples;
    samples.file = FileIn(field.Get("samples"));
    samples.field = field.Get("field").Text();
    return samples;
  }

  void ReadClasses(const JsonField& field) {
    field.Allow({"rules", "samples", "field", "method", "neighbors", "use", "colors"});
    if (field.Has("rules") == field.Has("samples")) {
      field.Refuse("either \"rules\" or \"samples\" is wanted");
    }
    if (field.Has("rules")) {
      for (const char* const name : {"field", "method", "neighbors", "use", "colors"}) {
        if (field.Has(name)) field.Get(name).Refuse("it goes with \"samples\"");
      }
      recipe_.rules = field.Get("rules");
      if (recipe_.rules->GetJson().is_string()) {
        recipe_.classFile = FileIn(*recipe_.rules);
        recipe_.rules = JsonFile(recipe_.classFile).GetRoot();
      }
      return;
    }
    ClassRequest& request = recipe_.classes;
    request.samples = ReadSamples(field);
    recipe_.classFile = SplitLayer(request.samples.file).file;
    if (field.Has("method")) request.method = field.Get("method").OneOf({"knn", "pca"});
    if (field.Has("neighbors")) {
      if (request.method == "pca") field.Get("neighbors").Refuse("it goes with \"knn\"");
      request.neighbors = field.Get("neighbors").Whole(1, 1000000);
    }
    if (field.Has("use")) {
      recipe_.use = field.Get("use");
      for (const JsonField& name : recipe_.use->List()) recipe_.used.push_back(name.Text());
    }
    if (!field.Has("colors")) return;
    for (const auto& [name, color] : field.Get("colors").Members()) {
      color.AsColor();  // is one
      recipe_.colors.emplace_back(name, color);
    }
  }

  void ReadPolygons(const JsonField& field) {
    recipe_.polygons = field.Text();
    if (recipe_.polygons.find('/') != std::string::npos) {
      field.Refuse("it is a name in the folder of the results");
    }
    if (!IsVectorName(recipe_.polygons)) field.Refuse("no vector format has this ending");
  }

  const JsonField root_;
  const std::filesystem::path folder_;
  Recipe recipe_;
};

}  // namespace

Recipe ReadRecipe(const std::string& file) {
  return Reader(file).Read();
}

Array<unsigned> BandsOf(const std::optional<JsonField>& list, unsigned bands) {
  std::vector<unsigned> chosen;
  if (list) {
    for (const JsonField& band : list->List()) chosen.push_back(band.Whole(0, bands - 1));
  } else {
    for (unsigned band = 0; band < bands; ++band) chosen.push_back(band);
  }
  Array<unsigned> all{ArrayDims(static_cast<unsigned>(chosen.size()))};
  std::copy(chosen.begin(), chosen.end(), all.begin());
  return all;
}

}  // namespace lumo::host
