#include "foundation/abandonment.h"

namespace lumo {
namespace {

thread_local bool tIsAbandoning = false;

}  // namespace

AbandonScope::AbandonScope(bool abandons) : before_(tIsAbandoning) {
  tIsAbandoning = abandons;
}

AbandonScope::~AbandonScope() {
  tIsAbandoning = before_;
}

bool IsAbandoning() {
  return tIsAbandoning;
}

}  // namespace lumo
