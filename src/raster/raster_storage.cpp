#include "raster/raster_storage.h"

#include <sstream>

#include <fmt/format.h>

namespace lumo {
namespace {

String StoragePath() {
  return "/private/Storage";
}

}  // namespace

void SetStorage(Metadata& metadata, const RasterStorage& storage) {
  metadata.Set(StoragePath(), String(fmt::format("{} {} {}", storage.blockWidth,
                                                 storage.blockHeight, storage.compression)));
}

std::optional<RasterStorage> FindStorage(const Metadata& metadata) {
  String text;
  if (!metadata.GetString(StoragePath(), text)) return std::nullopt;
  std::istringstream in(text.ToUTF8());
  RasterStorage storage;
  if (!(in >> storage.blockWidth >> storage.blockHeight)) return std::nullopt;
  std::getline(in >> std::ws, storage.compression);
  return storage;
}

void DropStorage(Metadata& metadata) {
  if (FindStorage(metadata)) metadata.Remove(StoragePath());
}

}  // namespace lumo
