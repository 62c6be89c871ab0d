#include "regions/shape_file.h"

#include <algorithm>
#include <charconv>
#include <cmath>

#include "commands/value_text.h"
#include "foundation/fault.h"
#include "foundation/near_name.h"
#include "geometry/packed_geometry.h"

namespace lumo {
namespace {

char Lower(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c;
}

/// A text from outside as it stands in a message.
std::string Quoted(const std::string& text) {
  return std::string("\"").append(Printable(text)).append("\"");
}

/// Reads a whole text as a number.
template <typename T>
bool ReadWhole(const std::string& text, T& value) {
  const auto [end, fault] = std::from_chars(text.data(), text.data() + text.size(), value);
  return fault == std::errc() && end == text.data() + text.size();
}

/// Reads the value of a field out of a text. @return false when the field can't have it.
bool ReadValueOf(const std::string& text, VectorFieldType type, VectorValue& value) {
  std::int64_t integer = 0;
  double real = 0;
  if (type == VectorFieldType::kText) {
    value = text;
  } else if (type == VectorFieldType::kInteger && ReadWhole(text, integer)) {
    value = integer;
  } else if (ReadWhole(text, real)) {
    value = real;
  } else {
    return false;
  }
  return true;
}

/// NaN for a value that is none.
double NumberOf(const VectorValue& value) {
  if (const auto* integer = std::get_if<std::int64_t>(&value)) return static_cast<double>(*integer);
  const auto* real = std::get_if<double>(&value);
  return real != nullptr ? *real : std::nan("");
}

/// FindField of one that holds numbers.
std::optional<std::size_t> FindNumberField(const VectorLayer& layer, const std::string& name) {
  const std::optional<std::size_t> found = FindField(layer, name);
  if (!found || layer.fields[*found].type != VectorFieldType::kText) return found;
  SetFault(String("field " + Quoted(layer.fields[*found].name) + " holds no numbers"));
  return {};
}

}  // namespace

bool AreSameName(const std::string& a, const std::string& b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](char one, char other) { return Lower(one) == Lower(other); });
}

VectorRecordSourcePtr OpenShapes(const std::string& path) {
  VectorRecordFactory* const factory = GetVectorRecordFactory();
  return factory != nullptr ? factory->Open(path) : VectorRecordSourcePtr();
}

std::vector<std::uint32_t> FindLayers(VectorRecordSource& source, const std::string& text) {
  std::vector<std::uint32_t> found;
  std::vector<std::string> names;
  for (std::uint32_t i = 0; i < source.LayerCount(); ++i) {
    names.push_back(source.Layer(i).name);
    if (text.empty()) found.push_back(i);
  }
  if (text.empty()) {
    if (found.empty()) SetFault("the file has no layer");
    return found;
  }
  const auto named = std::find(names.begin(), names.end(), text);
  if (named != names.end()) return {static_cast<std::uint32_t>(named - names.begin())};
  std::uint32_t number = 0;
  if (ReadWhole(text, number) && number < names.size()) return {number};
  SetFault(String("the file has no layer " + Quoted(text) + DidYouMean(text, names)));
  return {};
}

std::optional<std::size_t> FindField(const VectorLayer& layer, const std::string& name) {
  std::vector<std::string> names;
  for (const VectorField& field : layer.fields) names.push_back(field.name);
  auto found = std::find(names.begin(), names.end(), name);
  if (found == names.end()) {
    found = std::find_if(names.begin(), names.end(),
                         [&](const std::string& known) { return AreSameName(known, name); });
  }
  if (found != names.end()) return static_cast<std::size_t>(found - names.begin());
  SetFault(String("layer " + Quoted(layer.name) + " has no field " + Quoted(name) +
                  DidYouMean(name, names)));
  return {};
}

bool RecordFilter::Set(const VectorLayer& layer, const std::string& text) {
  field_.reset();
  if (text.empty()) return true;
  const std::size_t at = text.find('=');
  if (at == std::string::npos) {
    SetFault(String(Quoted(text) + " isn't of the form FIELD=VALUE"));
    return false;
  }
  field_ = FindField(layer, text.substr(0, at));
  if (!field_) return false;
  const std::string wanted = text.substr(at + 1);
  if (!ReadValueOf(wanted, layer.fields[*field_].type, value_)) {
    SetFault(String("field " + Quoted(layer.fields[*field_].name) + " holds numbers, which " +
                    Quoted(wanted) + " isn't"));
    return false;
  }
  return true;
}

bool RecordFilter::Accepts(const VectorRecord& record) const {
  if (!field_) return true;
  if (*field_ >= record.values.size()) return false;
  const VectorValue& own = record.values[*field_];
  return own == value_ || NumberOf(own) == NumberOf(value_);
}

std::optional<GeometryKind> KindOf(const VectorRecord& record) {
  const auto refuse = [&](const char* text) {
    SetFault(String("record " + std::to_string(record.id) + text));
    return std::optional<GeometryKind>();
  };
  const bool areNumbers = std::all_of(record.coordinates.begin(), record.coordinates.end(),
                                      [](double c) { return std::isfinite(c); });
  if (!areNumbers) return refuse(": a coordinate is not a number");
  switch (record.geometry) {
    case VectorGeometry::kPoint:
      return kPointsRecord;
    case VectorGeometry::kLine:
      return kPolylineRecord;
    case VectorGeometry::kPolygon:
      return kPolygonRecord;
    case VectorGeometry::kUnknown:
      break;
  }
  return refuse(" isn't made of points, lines or polygons alone");
}

std::string TextOf(const VectorValue& value) {
  if (const auto* text = std::get_if<std::string>(&value)) return *text;
  const double number = NumberOf(value);
  if (std::isnan(number)) return {};
  return FormatValue(number).ToUTF8();
}

namespace {

/// Reads the shapes that are selected, of those whose values `take(record)` takes.
template <typename Take>
GeometryPtr ReadTaken(VectorRecordSource& source, const ShapeSelection& selection,
                      const VectorLayer& description, const IPC& ipc, const Take& take) {
  constexpr unsigned kLookEvery = 1024;
  RecordFilter filter;
  if (!filter.Set(description, selection.where) || !source.Begin(selection.layer, nullptr)) {
    return {};
  }
  auto* const shapes = new PackedGeometry(description.coordSys);
  GeometryPtr geometry(shapes);
  VectorRecord record;
  TakeFault();
  for (unsigned read = 0; source.Next(record); ++read) {
    if (read % kLookEvery == 0 && ipc.abort->IsSet()) {
      SetFault("the reading was aborted");
      return {};
    }
    if (record.partEnds.empty() || !filter.Accepts(record) || !take(record)) continue;
    const std::optional<GeometryKind> kind = KindOf(record);
    if (!kind) return {};
    shapes->Add(*kind, record);
  }
  const String fault = TakeFault();
  if (fault.GetLength() == 0) return geometry;
  SetFault(fault);
  return {};
}

}  // namespace

GeometryPtr ReadShapes(VectorRecordSource& source, const ShapeSelection& selection, const IPC& ipc,
                       std::vector<double>* values) {
  const VectorLayer description = source.Layer(selection.layer);
  std::optional<std::size_t> field;
  if (!selection.field.empty()) {
    field = FindNumberField(description, selection.field);
    if (!field) return {};
  }
  return ReadTaken(source, selection, description, ipc, [&](const VectorRecord& record) {
    if (!field) return true;
    const double value = NumberOf(record.values[*field]);
    if (std::isnan(value)) return false;
    if (values != nullptr) values->push_back(value);
    return true;
  });
}

GeometryPtr ReadNamedShapes(VectorRecordSource& source, const ShapeSelection& selection,
                            const IPC& ipc, std::vector<std::string>& texts) {
  const VectorLayer description = source.Layer(selection.layer);
  const std::optional<std::size_t> field = FindField(description, selection.field);
  if (!field) return {};
  return ReadTaken(source, selection, description, ipc, [&](const VectorRecord& record) {
    texts.push_back(TextOf(record.values[*field]));
    if (!texts.back().empty()) return true;
    texts.pop_back();
    return false;
  });
}

std::string FaultOfShapes(const std::string& path) {
  const std::string fault = TakeFaultOr("the shapes can't be read").ToUTF8();
  return fault.find(path) != std::string::npos ? fault : path + ": " + fault;
}

}  // namespace lumo
