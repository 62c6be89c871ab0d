#include "verb.h"

#include <algorithm>
#include <map>

namespace lumo::host {
namespace {

struct Registered {
  const char* summary;
  VerbRegistration::Setup setup;
};

std::map<std::string, Registered>& Registry() {
  static std::map<std::string, Registered> registry;
  return registry;
}

}  // namespace

VerbRegistration::VerbRegistration(const char* name, const char* summary, Setup setup) {
  Registry()[name] = {summary, setup};
}

const std::vector<Verb>& GetVerbs() {
  static const std::vector<Verb> verbs = [] {
    std::vector<Verb> made;
    for (const auto& [name, registered] : Registry()) {
      Verb& verb = made.emplace_back();
      verb.name = name;
      verb.summary = registered.summary;
      verb.work = registered.setup(verb.options);
    }
    return made;
  }();
  return verbs;
}

const Verb* FindVerb(const std::string& name) {
  const auto at = std::find_if(GetVerbs().begin(), GetVerbs().end(),
                               [&](const Verb& verb) { return verb.name == name; });
  return at != GetVerbs().end() ? &*at : nullptr;
}

}  // namespace lumo::host
