#include "georef/coordsys_factory.h"

#include <filesystem>
#include <memory>
#include <mutex>

#include "foundation/environment.h"
#include "foundation/plugin_library.h"
#include "georef/coordsys_log.h"

namespace lumo {

void (*fp_Esri_Pe_Initialize)(String&, String&) = nullptr;
CoordSysImpl* (*fp_Esri_Pe_CreateFromString)(const String&) = nullptr;
CoordSysImpl* (*fp_Esri_Pe_CreateFromCode)(int) = nullptr;
int (*fp_Esri_Pe_Release)(CoordSysImpl*) = nullptr;
CoordSysFactory* gpCoordSysFactoryInstance = nullptr;

namespace {

std::mutex gFactoryMutex;

String ReadEnvironment(const ContextKey& key) {
  const String text = GetGlobalEnvironmentImpl().Find(key);
  return text.GetLength() != 0 ? text : String("Not Set");
}

/// The first directory that holds the plug-in; `preferred` when none does.
String PluginDirectory(const String& preferred) {
  const std::string name = platform::ModuleFileName("vexpe");
  std::error_code fault;
  for (const std::string& directory : PluginDirectories()) {
    if (std::filesystem::exists(directory + "/" + name, fault)) return String(directory);
  }
  return preferred;
}

}  // namespace

bool CoordSysFuncPtrs::LoadFuncPtrs(const String& directory) {
  if (directory.GetLength() == 0) {
    LogCoordSys(CoordSysLog::kErrors, "CoordSysFuncPtrs::LoadFuncPtrs - error invalid path.");
    return false;
  }
  const std::string path = directory.ToUTF8() + "/" + platform::ModuleFileName("vexpe");
  std::string fault;
  module_ = LoadPluginFile(path, fault);
  if (!module_.IsLoaded()) {
    LogCoordSys(CoordSysLog::kErrors, "CoordSysFuncPtrs::LoadFuncPtrs - error loading vexpe dll.");
    return false;
  }
  auto* const initialize = module_.Find<void(String&, String&)>("Esri_Pe_Initialize");
  auto* const fromString = module_.Find<CoordSysImpl*(const String&)>("Esri_Pe_CreateFromString");
  auto* const fromCode = module_.Find<CoordSysImpl*(int)>("Esri_Pe_CreateFromCode");
  auto* const release = module_.Find<int(CoordSysImpl*)>("Esri_Pe_Release");
  if (initialize == nullptr || fromString == nullptr || fromCode == nullptr || release == nullptr) {
    LogCoordSys(CoordSysLog::kErrors,
                "CoordSysFuncPtrs::LoadFuncPtrs - error did not find vexpe function.");
    return false;
  }
  fp_Esri_Pe_Initialize = initialize;
  fp_Esri_Pe_CreateFromString = fromString;
  fp_Esri_Pe_CreateFromCode = fromCode;
  fp_Esri_Pe_Release = release;
  LogCoordSys(CoordSysLog::kErrors, "CoordSysFuncPtrs::LoadFuncPtrs - %s loaded.", path.c_str());
  return true;
}

CoordSysFactory* CoordSysFactory::GetFactory() {
  const std::lock_guard lock(gFactoryMutex);
  if (gpCoordSysFactoryInstance == nullptr) {
    auto factory = std::make_unique<CoordSysFactory>();
    if (factory->Init()) gpCoordSysFactoryInstance = factory.release();
  }
  return gpCoordSysFactoryInstance;
}

bool CoordSysFactory::Init() {
  const String binDirectory = ReadEnvironment(Environment::kBinDirectory);
  String peDirectory = ReadEnvironment(Environment::kPeDirectory);
  String gdalDirectory = ReadEnvironment(Environment::kGdalDirectory);
  MakeCoordSysLog(peDirectory);
  LogCoordSys(CoordSysLog::kErrors,
              ";-----------------------------------------------------------------------------");
  LogCoordSys(CoordSysLog::kErrors, "CoordSysFactory::Init - pedata directory (%s).",
              peDirectory.GetUTF8());
  if (!functions_.LoadFuncPtrs(PluginDirectory(binDirectory))) return false;
  fp_Esri_Pe_Initialize(peDirectory, gdalDirectory);
  return true;
}

}  // namespace lumo
