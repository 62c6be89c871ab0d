#include "geometry/fxv_file.h"

#include <filesystem>

#include "foundation/text_case.h"

namespace lumo {
namespace {

constexpr PolygonFileKind kFxvFile{"FXV50", "FXV file"};

}  // namespace

bool IsFxvName(const std::string& path) {
  return LowerCase(std::filesystem::path(path).extension().string()) == ".fxv";
}

FxvPolygonWriter<std::int32_t, std::uint32_t>::FxvPolygonWriter(const URI& uri, unsigned bufferSize)
    : PolygonFileWriter(kFxvFile, uri, bufferSize, PolygonFileGrowth::kInPlace) {}

FxvPolygonReader<std::int32_t, std::uint32_t>::FxvPolygonReader(const URI& uri, unsigned bufferSize)
    : PolygonFileReader(kFxvFile, uri, bufferSize) {}

}  // namespace lumo
