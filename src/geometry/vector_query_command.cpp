#include <filesystem>

#include "commands/command.h"
#include "data/vector_records.h"
#include "foundation/fault.h"
#include "geometry/fxv_file.h"

namespace lumo {
namespace {

const CommandDeclaration kQueryVectors{
    "QueryVectorsCommand",
    "Vectors",
    "Tells what a layer of a vector file is. A command of this library's own.",
    {{"Vectors", Presence::kRequired, ValueKind::kText, "the file"},
     {"Layer", Presence::kOptional, ValueKind::kInteger, "its number, from 0; 0 when absent"}},
    {{"Layers", ValueKind::kInteger, "how many the file has"},
     {"Name", ValueKind::kText, "of the layer"},
     {"Geometry", ValueKind::kText, "Point, Line or Polygon; Unknown for shapes of several kinds"},
     {"Records", ValueKind::kInteger, "how many there are"},
     {"Bounds", ValueKind::kNumberArray,
      "min x, min y, max x, max y of all records; absent where they are not known"},
     {"CoordSys", ValueKind::kText, "the coordinate system; empty when there is none"},
     {"Fields", ValueKind::kTextList, "names of the columns"},
     {"FieldTypes", ValueKind::kTextList, "for each column Integer, Real or Text"}}};

const char* WordOf(VectorGeometry geometry) {
  switch (geometry) {
    case VectorGeometry::kPoint:
      return "Point";
    case VectorGeometry::kLine:
      return "Line";
    case VectorGeometry::kPolygon:
      return "Polygon";
    case VectorGeometry::kUnknown:
      break;
  }
  return "Unknown";
}

const char* WordOf(VectorFieldType type) {
  return type == VectorFieldType::kInteger ? "Integer"
         : type == VectorFieldType::kReal  ? "Real"
                                           : "Text";
}

/// True for bounds that nobody has computed.
bool IsZero(const MapRect& bounds) {
  return bounds.minX == 0 && bounds.minY == 0 && bounds.maxX == 0 && bounds.maxY == 0;
}

class QueryVectorsCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const std::string path = Read<String>("Vectors").ToUTF8();
    if (IsFxvName(path)) return TellFxv(path);
    VectorRecordFactory* const factory = GetVectorRecordFactory();
    if (factory == nullptr) return Fail();
    const VectorRecordSourcePtr source = factory->Open(path);
    if (!source) return Fail(TakeFaultOr("the file can't be opened"));
    const unsigned number = HasInput("Layer") ? Read<unsigned>("Layer") : 0;
    const std::uint32_t layers = source->LayerCount();
    if (number >= layers) {
      return Fail("Layer: the file has " + std::to_string(layers) + " layers");
    }
    TakeFault();
    const VectorLayer layer = source->Layer(number);
    const String fault = TakeFault();
    if (fault.GetLength() != 0) return Fail(fault);
    Write("Layers", layers);
    Tell(layer);
    return Succeed();
  }

  CommandResult TellFxv(const std::string& path) {
    const FxvPolygonReader<std::int32_t, std::uint32_t> reader{URI(String(path))};
    if (!reader.IsValid()) return Fail();
    VectorLayer layer;
    layer.name = std::filesystem::path(path).stem().string();
    layer.geometry = VectorGeometry::kPolygon;
    layer.fields = {{"label", VectorFieldType::kInteger}};
    layer.records = reader.Count();
    Write("Layers", 1);
    Tell(layer);
    return Succeed();
  }

  void Tell(const VectorLayer& layer) {
    Write("Name", String(layer.name));
    Write("Geometry", String(WordOf(layer.geometry)));
    Write("Records", layer.records);
    if (layer.records > 0 && layer.bounds.minX <= layer.bounds.maxX && !IsZero(layer.bounds)) {
      Array<double> bounds{ArrayDims(4)};
      bounds[0] = layer.bounds.minX;
      bounds[1] = layer.bounds.minY;
      bounds[2] = layer.bounds.maxX;
      bounds[3] = layer.bounds.maxY;
      Write("Bounds", bounds);
    }
    String system;
    layer.coordSys.ToString(system);
    Write("CoordSys", system);
    Array<String> names{ArrayDims(static_cast<unsigned>(layer.fields.size()))};
    Array<String> types{names.GetDims()};
    for (unsigned i = 0; i < names.GetCount(); ++i) {
      names[i] = String(layer.fields[i].name);
      types[i] = String(WordOf(layer.fields[i].type));
    }
    Write("Fields", names);
    Write("FieldTypes", types);
  }
};

const CommandFactoryT<QueryVectorsCommand> queryVectorsFactory(kQueryVectors);

}  // namespace
}  // namespace lumo
