#include "rasters/attribute_steps.h"

#include <cmath>
#include <functional>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "options/option_values.h"
#include "rasters/raster_source.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr const char* kNameLetters =
    "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789_";

double SizeOr1(double size) {
  return std::isfinite(size) && size != 0 ? std::abs(size) : 1;
}

/// Which of the commands makes a file.
enum class Maker { kBands, kIndices, kShapes };

Maker MakerOf(const std::string& input) {
  return input == "SpatialFXA" ? Maker::kShapes
         : input == "IndexFXA" ? Maker::kIndices
                               : Maker::kBands;
}

class Steps {
 public:
  Steps(JobDraft& draft, const AttributeRequest& request, const std::vector<AttributeFile>& files)
      : draft_(draft), request_(request), files_(files) {}

  void AddOfBands(const AttributeSources& sources) {
    const bool hasSome = request_.hasBands;
    if (hasSome) AddBandView(draft_, "bands", sources.scene, request_.bands);
    JobWriterCommand& pixels = draft_.Step("pixels", "FxComputePixelAttributesCommand");
    pixels.AddVariableInput("SrcURI", hasSome ? String("$bands") : sources.scene);
    pixels.AddVariableInput("LabelURI", sources.labels);
    pixels.AddInput("Values", String(!request_.texture    ? "spectral"
                                     : !request_.spectral ? "texture"
                                                          : "spectral|texture"));
    AddFiles(pixels, Maker::kBands);
    if (request_.texture) pixels.AddInput("TextureKernelSize", request_.kernel);
    pixels.AddInput("Sums", String("Exact"));
    if (hasSome) draft_.Close("close.bands", "$bands");
  }

  void AddOfIndices(const AttributeSources& sources) {
    JobWriterCommand& view = draft_.Open("index", "CreateExpressionRasterCommand");
    view.AddExpandedInput("SrcURI", sources.scene);
    view.AddInput("Expressions", String(fmt::format("{}", fmt::join(request_.indices, ";"))));
    JobWriterCommand& pixels = draft_.Step("indices", "FxComputePixelAttributesCommand");
    pixels.AddVariableInput("SrcURI", "$index");
    pixels.AddVariableInput("LabelURI", sources.labels);
    pixels.AddInput("Values", String("spectral"));
    for (const AttributeFile& file : files_) {
      if (MakerOf(file.input) == Maker::kIndices) {
        pixels.AddInput("SpectralFXA", String(file.file));
      }
    }
    pixels.AddInput("Sums", String("Exact"));
    draft_.Close("close.index", "$index");
  }

  void AddShapes(const String& labels) {
    JobWriterCommand& shapes = draft_.Step("shapes", "FxComputeVectorAttributesCommand");
    shapes.AddVariableInput("LabelURI", labels);
    AddFiles(shapes, Maker::kShapes);
    shapes.AddInput("PixelXSize", request_.pixelX);
    shapes.AddInput("PixelYSize", request_.pixelY);
    shapes.AddInput("Parts", String("Together"));
  }

  void AddTable(const String& labels, const std::string& name) {
    JobWriterCommand& table = draft_.Step("table", "CreateAttributeTableCommand");
    table.AddInput("Table", String(name));
    for (const Maker maker : {Maker::kBands, Maker::kIndices, Maker::kShapes}) {
      AddFiles(table, maker);
    }
    std::string names;
    for (const std::string& index : request_.indices) {
      names.append(names.empty() ? "" : "|").append(IndexName(index));
    }
    if (!names.empty()) table.AddInput("IndexNames", String(names));
    if (!name.ends_with(".csv")) table.AddVariableInput("LabelURI", labels);
    if (request_.hasBands && (request_.spectral || request_.texture)) {
      table.AddInput("Bands", request_.bands);
    }
  }

 private:
  void AddFiles(JobWriterCommand& step, Maker maker) {
    for (const AttributeFile& file : files_) {
      if (MakerOf(file.input) == maker) step.AddInput(file.input, String(file.file));
    }
  }

  JobDraft& draft_;
  const AttributeRequest& request_;
  const std::vector<AttributeFile>& files_;
};

}  // namespace

void AttributeRequest::TakePixelSize(const GeoRefPtr& geoRef) {
  if (geoRef.IsNull() || geoRef->GetType() == GeoRef::kRpc) return;
  pixelX = SizeOr1(geoRef->PixelSizeX());
  pixelY = SizeOr1(geoRef->PixelSizeY());
}

std::vector<AttributeFile> FilesOf(const AttributeRequest& request, const std::string& name) {
  std::vector<AttributeFile> files;
  if (request.spectral) files.push_back({"SpectralFXA", name + ".spectral.fxa"});
  if (request.texture) {
    files.push_back({"TextureFXA", name + ".texture.fxa"});
    files.push_back({"EntropyFXA", name + ".entropy.fxa"});
  }
  if (!request.indices.empty()) files.push_back({"IndexFXA", name + ".index.fxa"});
  if (request.shape) files.push_back({"SpatialFXA", name + ".shape.fxa"});
  return files;
}

void CheckIndex(const std::string& index, const std::string& where) {
  const std::size_t equals = index.find('=');
  const bool isNamed = equals != 0 && equals != index.npos && index[equals + 1] != '=' &&
                       index.find_first_not_of(kNameLetters) == equals;
  if (isNamed && index.find(';') == index.npos) return;
  throw HostError(kExitUsage, fmt::format("{}: \"{}\" isn't of the form NAME=EXPRESSION", where,
                                          Printable(index)));
}

std::string IndexName(const std::string& index) {
  return index.substr(0, index.find('='));
}

void AddAttributes(JobDraft& draft, const AttributeRequest& request,
                   const AttributeSources& sources, const std::vector<AttributeFile>& files,
                   const std::string& table) {
  AttributeSources used = sources;
  if (request.isNarrow) {
    draft.Open("whole", "CreateLabelsRasterCommand").AddVariableInput("SrcURI", sources.labels);
    used.labels = "$whole";
  }
  Steps steps(draft, request, files);
  if (request.spectral || request.texture) steps.AddOfBands(used);
  if (!request.indices.empty()) steps.AddOfIndices(used);
  if (request.shape) steps.AddShapes(used.labels);
  if (!table.empty()) steps.AddTable(used.labels, table);
  if (request.isNarrow) draft.Close("close.whole", "$whole");
}

}  // namespace lumo::host
