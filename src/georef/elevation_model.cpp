#include "georef/elevation_model.h"

#include <atomic>

namespace lumo {
namespace {

std::atomic<ElevationModelPtr (*)(const URI&)> gFinder{nullptr};

}  // namespace

ElevationModelPtr ElevationModel::Find(const URI& uri) {
  ElevationModelPtr (*const finder)(const URI&) = gFinder.load();
  return finder != nullptr ? finder(uri) : ElevationModelPtr();
}

void ElevationModel::SetFinder(ElevationModelPtr (*finder)(const URI&)) {
  gFinder = finder;
}

}  // namespace lumo
