#include <algorithm>
#include <cmath>
#include <limits>

#include "foundation/fault.h"
#include "raster/pixel_value.h"
#include "regions/shape_file.h"
#include "views/publish_raster.h"
#include "views/shapes_raster.h"

namespace lumo {
namespace {

std::vector<InputDeclaration> Inputs() {
  return {{"Vectors", Presence::kRequired, ValueKind::kText, "the file of shapes"},
          {"LikeURI", Presence::kRequired, ValueKind::kURI, "the raster whose grid it gets"},
          {"Layer", Presence::kOptional, ValueKind::kText,
           "a layer of the file, by its name or its number from 0; the first when absent"},
          {"Where", Presence::kOptional, ValueKind::kText,
           "FIELD=VALUE: only records with that value; all when absent"},
          {"Value", Presence::kOptional, ValueKind::kNumber, "of all shapes; 1 when absent"},
          {"Field", Presence::kOptional, ValueKind::kText,
           "the field whose numbers are the values, in place of Value; records without one are "
           "left out"},
          {"Background", Presence::kOptional, ValueKind::kNumber,
           "of the pixels outside; 0 when absent"},
          {"NoData", Presence::kOptional, ValueKind::kNumber,
           "in place of Background: the no-data value of the pixels outside"},
          {"DataType", Presence::kOptional, ValueKind::kWord,
           "pixel type; the smallest that holds all values when absent", "", &EightTypeWords},
          {"Pixels", Presence::kOptional, ValueKind::kWord,
           "Told: the pixels of the inclusive scan of regions; Center: those whose centre lies "
           "inside; Touched: those whose area is touched",
           "", &WordsIn<PixelRule>},
          {"ScanRules", Presence::kOptional, ValueKind::kWord, "see CreateGeometryROIDefCommand",
           "", &WordsIn<ScanRules>},
          {"Coordinates", Presence::kOptional, ValueKind::kWord, "see CreateGeometryROIDefCommand",
           "", &WordsIn<ShapeCoordinates>}};
}

std::vector<OutputDeclaration> Outputs() {
  std::vector<OutputDeclaration> outputs = PublishedOutputs();
  outputs.push_back({"Shapes", ValueKind::kInteger, "how many records it shows"});
  return outputs;
}

const CommandDeclaration kRasterize{
    "RasterizeCommand", "Regions",
    "Shows the shapes of a vector file as a raster on the grid of another one. A command of this "
    "library's own.",
    Inputs(), Outputs()};

class RasterizeCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr like = FindRaster("LikeURI");
    if (!like) return Fail();
    shapes_.geoRef = like->GetRasterDef().geoRef;
    shapes_.samples = like->Samples();
    shapes_.lines = like->Lines();
    if (HasInput("Pixels")) shapes_.options.pixels = Read<PixelRule>("Pixels");
    if (HasInput("ScanRules")) shapes_.options.rules = Read<ScanRules>("ScanRules");
    if (HasInput("Coordinates")) {
      shapes_.options.coordinates = Read<ShapeCoordinates>("Coordinates");
    }
    shapes_.isNoData = HasInput("NoData");
    shapes_.background = Read<double>(shapes_.isNoData ? "NoData" : "Background");
    const std::string path = Read<String>("Vectors").ToUTF8();
    if (!ReadFile(path)) return Fail(FaultOfShapes(path));
    if (shapes_.values.empty()) return Fail("Vectors: there is no shape to show in it");
    const unsigned dataType =
        HasInput("DataType") ? ParseDataType(Read<String>("DataType")) : SmallestType();
    BasicRasterPtr raster;
    const bool isKnown = DispatchType(EightTypes{}, dataType, [&]<typename T>() {
      raster = BasicRasterPtr(RasterPtr<T>(new ShapesRaster<T>(shapes_)));
      return true;
    });
    if (!isKnown) return Fail("DataType: no such raster can be made");
    if (!raster->IsValid()) return Fail("DataType: the pixel type can't hold all values");
    Write("Shapes", shapes_.values.size());
    return Publish(raster);
  }

  bool ReadFile(const std::string& path) {
    const VectorRecordSourcePtr source = OpenShapes(path);
    if (!source) return false;
    const std::string layer = Read<String>("Layer").ToUTF8();
    const std::vector<std::uint32_t> layers = FindLayers(*source, layer);
    if (layers.empty()) return false;
    ShapeSelection selection{layers.front(), Read<String>("Where").ToUTF8(),
                             Read<String>("Field").ToUTF8()};
    shapes_.geometry = ReadShapes(*source, selection, GetIPC(), &shapes_.values);
    if (!shapes_.geometry) return false;
    if (selection.field.empty()) {
      const double value = HasInput("Value") ? Read<double>("Value") : 1;
      shapes_.values.assign(shapes_.geometry->RecordCount(), value);
    }
    return true;
  }

  /// The smallest pixel type that holds all values and the background.
  unsigned SmallestType() const {
    const auto fits = [&](unsigned type) {
      return FitsPixel(type, shapes_.background) &&
             std::all_of(shapes_.values.begin(), shapes_.values.end(),
                         [&](double value) { return FitsPixel(type, value); });
    };
    constexpr unsigned kByRange[] = {kDataTypeOf<std::uint8_t>,  kDataTypeOf<std::int16_t>,
                                     kDataTypeOf<std::uint16_t>, kDataTypeOf<std::int32_t>,
                                     kDataTypeOf<std::uint32_t>, kDataTypeOf<double>};
    const auto* const found = std::find_if(std::begin(kByRange), std::end(kByRange), fits);
    return found != std::end(kByRange) ? *found : kDataTypeOf<double>;
  }

  ValuedShapes shapes_;
};

const CommandFactoryT<RasterizeCommand> rasterizeFactory(kRasterize);

}  // namespace
}  // namespace lumo
