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

Verb MakeVerb(const std::string& name) {
  Verb verb;
  const auto at = Registry().find(name);
  if (at == Registry().end()) return verb;
  verb.name = name;
  verb.summary = at->second.summary;
  verb.work = at->second.setup(verb.options);
  return verb;
}

const std::vector<Verb>& GetVerbs() {
  static const std::vector<Verb> verbs = [] {
    std::vector<Verb> made;
    for (const auto& [name, registered] : Registry()) made.push_back(MakeVerb(name));
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
