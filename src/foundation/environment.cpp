#include "foundation/environment.h"

#include <cstdlib>
#include <filesystem>
#include <vector>

#include "foundation/type_code.h"
#include "platform/module.h"

namespace lumo {
namespace {

// Registered for hosts that ask for the code by name; no class of the library answers to it.
[[maybe_unused]] const unsigned kLockedEnvironmentTypeCode =
    GloballyUniqueObjectTypeCode("LockedEnvironment");

using Paths = std::vector<std::filesystem::path>;

/// Sets a key that is not set to the first of the folders that is there.
void SetMissing(const ContextKey& key, const Paths& folders) {
  EnvironmentImpl& environment = GetGlobalEnvironmentImpl();
  if (environment.Find(key).GetLength() != 0) return;
  for (const std::filesystem::path& folder : folders) {
    std::error_code ignored;
    if (folder.empty() || !std::filesystem::is_directory(folder, ignored)) continue;
    environment[key].text = String(folder.lexically_normal().string() + "/");
    return;
  }
}

/// The value of a variable of the process; an empty path when it isn't set.
std::filesystem::path Variable(const char* name) {
  const char* const value = std::getenv(name);
  return value != nullptr ? value : "";
}

/// The folders of data of one user.
Paths UserFolders() {
  Paths folders;
  if (const auto data = Variable("XDG_DATA_HOME"); data.is_absolute()) folders.push_back(data);
  if (const auto home = Variable("HOME"); home.is_absolute()) {
    folders.push_back(home / ".local/share");
  }
  return folders;
}

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

void InitEnvironment() {
  const std::filesystem::path library = platform::LibraryDirectory();
  SetMissing(Environment::kBinDirectory, {library});
  Paths shares;
  for (const char* const share : {"../share", VEXG_DATA_FROM_LIBRARY}) {
    shares.push_back(library / share);
  }
  Paths definitions, texts, gdal{Variable("GDAL_DATA")}, projections;
  for (const std::filesystem::path& share : shares) {
    definitions.push_back(share / "vexg/mdf");
    texts.push_back(share / "vexg");
    gdal.push_back(share / "gdal");
    projections.push_back(share / "vexg/pedata");
  }
  gdal.emplace_back("/usr/share/gdal");
  for (const std::filesystem::path& folder : UserFolders()) {
    projections.push_back(folder / "vexg/pedata");
  }
  SetMissing(Environment::kMdfDirectory, definitions);
  SetMissing(Environment::kXmlDirectory, texts);
  SetMissing(Environment::kGdalDirectory, gdal);
  SetMissing(Environment::kPeDirectory, projections);
}

EnvironmentImpl& GetGlobalEnvironmentImpl() {
  static auto& environment = *new EnvironmentImpl;
  return environment;
}

}  // namespace lumo
