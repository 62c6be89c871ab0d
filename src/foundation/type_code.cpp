#include "foundation/type_code.h"

#include <atomic>
#include <map>
#include <mutex>

#include "foundation/string.h"

namespace lumo {

// Both counters live inside functions, so that static data of any source may be the first to ask.

unsigned GloballyUniqueObjectErrorCode() {
  static std::atomic<unsigned> last{0};
  return ++last;
}

unsigned GloballyUniqueObjectTypeCode(const String& name) {
  static std::mutex mutex;
  static std::map<String, unsigned> codes;
  const std::lock_guard lock(mutex);
  return codes.try_emplace(name, static_cast<unsigned>(codes.size() + 1)).first->second;
}

}  // namespace lumo
