#include "foundation/environment.h"

#include "foundation/type_code.h"

namespace lumo {
namespace {

// Registered for hosts that ask for the code by name; no class of the library answers to it.
[[maybe_unused]] const unsigned kLockedEnvironmentTypeCode =
    GloballyUniqueObjectTypeCode("LockedEnvironment");

}  // namespace

const unsigned Context::TypeCode = GloballyUniqueObjectTypeCode("Context");
const unsigned Environment::TypeCode = GloballyUniqueObjectTypeCode("Environment");

const ContextKey Context::kWorkingDirectory{"LUMO::WorkingDirectory"};
const ContextKey Environment::kBinDirectory{"LUMO::Environment::BinDirectory"};
const ContextKey Environment::kXmlDirectory{"LUMO::Environment::XmlDirectory"};
const ContextKey Environment::kPeDirectory{"LUMO::Environment::PeDirectory"};
const ContextKey Environment::kGdalDirectory{"LUMO::Environment::GdalDirectory"};
const ContextKey Environment::kMdfDirectory{"LUMO::Environment::MdfDirectory"};

Context::Context() : values_(ContextValue{""}) {}

bool Context::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

String Context::WorkingDirectory() const {
  return Find(kWorkingDirectory);
}

bool Environment::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

EnvironmentImpl& GetGlobalEnvironmentImpl() {
  static auto& environment = *new EnvironmentImpl;
  return environment;
}

}  // namespace lumo
