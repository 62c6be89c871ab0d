#include "views/sources/raster_decorator.h"

#include <map>
#include <mutex>

namespace lumo {
namespace {

struct Decorators {
  std::mutex lock;
  std::map<String, RasterDecorator> byFormat;
};

Decorators& GetDecorators() {
  static Decorators decorators;
  return decorators;
}

}  // namespace

bool RegisterRasterDecorator(const String& format, RasterDecorator decorate) {
  Decorators& decorators = GetDecorators();
  const std::lock_guard lock(decorators.lock);
  return decorators.byFormat.try_emplace(format, decorate).second;
}

RasterDecorator FindRasterDecorator(const String& format) {
  Decorators& decorators = GetDecorators();
  const std::lock_guard lock(decorators.lock);
  const auto at = decorators.byFormat.find(format);
  return at != decorators.byFormat.end() ? at->second : nullptr;
}

}  // namespace lumo
