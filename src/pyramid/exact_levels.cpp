#include "pyramid/exact_levels.h"

namespace lumo {
namespace {

thread_local bool areWanted = false;

}  // namespace

ExactLevels::ExactLevels(bool wanted) : before_(areWanted) {
  areWanted = areWanted || wanted;
}

ExactLevels::~ExactLevels() {
  areWanted = before_;
}

bool ExactLevels::AreWanted() {
  return areWanted;
}

}  // namespace lumo
