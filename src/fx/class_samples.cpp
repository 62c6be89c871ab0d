#include "fx/class_samples.h"

#include <algorithm>
#include <charconv>

#include "foundation/fault.h"
#include "regions/shape_file.h"

namespace lumo {
namespace {

bool IsInFront(const std::string& a, const std::string& b) {
  double x = 0, y = 0;
  const auto isNumber = [](const std::string& text, double& value) {
    const char* const end = text.data() + text.size();
    return std::from_chars(text.data(), end, value).ptr == end;
  };
  const bool first = isNumber(a, x), second = isNumber(b, y);
  if (first && second && x != y) return x < y;
  return first != second ? first : a < b;
}

bool ReadFrom(const SampleSource& from, const IPC& ipc, ClassSamples& samples) {
  const VectorRecordSourcePtr source = OpenShapes(from.path);
  if (!source) return false;
  const std::vector<std::uint32_t> layers = FindLayers(*source, from.layer);
  if (layers.empty()) return false;
  const ShapeSelection selection{layers.front(), from.where, from.field};
  samples.shapes = ReadNamedShapes(*source, selection, ipc, samples.classes);
  if (!samples.shapes) return false;
  if (samples.classes.empty()) SetFault("there is no sample");
  return !samples.classes.empty();
}

}  // namespace

bool ReadClassSamples(const SampleSource& source, const IPC& ipc, ClassSamples& samples) {
  if (ReadFrom(source, ipc, samples)) return true;
  SetFault(String(FaultOfShapes(source.path)));
  return false;
}

ScanOptions SampleScan() {
  ScanOptions options;
  options.pixels = PixelRule::kCenter;
  options.rules = ScanRules::kSteady;
  options.coordinates = ShapeCoordinates::kMap;
  return options;
}

std::vector<std::string> OrderClassNames(std::vector<std::string> names) {
  std::sort(names.begin(), names.end(), IsInFront);
  names.erase(std::unique(names.begin(), names.end()), names.end());
  return names;
}

}  // namespace lumo
