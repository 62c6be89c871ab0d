#include "data/data_manager.h"

#include <map>

#include "foundation/library.h"

namespace lumo {

DataManager* gpGlobalDataManager = nullptr;
std::recursive_mutex* gpLocalDataManagerMutex = nullptr;

namespace {

/// Makes the part of VEXInit that lies here; it lives as long as the process.
bool MakeManagers() {
  static auto* const mutex = new std::recursive_mutex;
  static auto* const manager = new DataManager;
  gpLocalDataManagerMutex = mutex;
  gpGlobalDataManager = manager;
  return true;
}

const InitStep gMakeManagers(20, [] { MakeManagers(); });

void EnsureManagers() {
  static const bool made = MakeManagers();
  static_cast<void>(made);
}

std::map<std::uint32_t, DataManager*>& LocalManagers() {
  static auto* const managers = new std::map<std::uint32_t, DataManager*>;
  return *managers;
}

/// A number of this thread that no other thread ever had.
std::uint32_t ThreadNumber() {
  static std::atomic<std::uint32_t> last{0};
  thread_local const std::uint32_t number = ++last;
  return number;
}

}  // namespace

DataManager& GetGlobalDataManager() {
  EnsureManagers();
  return *gpGlobalDataManager;
}

DataManager& GetLocalDataManager() {
  EnsureManagers();
  const MutexLock lock(*gpLocalDataManagerMutex);
  DataManager*& manager = LocalManagers()[ThreadNumber()];
  if (manager == nullptr) {
    manager = new DataManager;
  } else {
    const MutexLock countLock(manager->refMutex_);
    ++manager->refCount_;
  }
  return *manager;
}

void FreeLocalDataManager() {
  EnsureManagers();
  const MutexLock lock(*gpLocalDataManagerMutex);
  const auto at = LocalManagers().find(ThreadNumber());
  if (at == LocalManagers().end()) return;
  DataManager* const manager = at->second;
  unsigned left = 0;
  if (manager != nullptr) {
    const MutexLock countLock(manager->refMutex_);
    if (manager->refCount_ > 0) --manager->refCount_;
    left = manager->refCount_;
  }
  if (left != 0) return;
  LocalManagers().erase(at);
  delete manager;
}

DataConnectionPtr DataManager::ConnectDirect(const Array<String>& connStrings,
                                             const GeoRefPtr& geoRef, const MetadataPtr& metadata) {
  return factory_.ConnectDirect(connStrings, geoRef, metadata);
}

DataConnectionPtr DataManager::CreateRasterDirect(const Array<String>& connStrings,
                                                  const RasterDef& def) {
  return factory_.CreateRasterDirect(connStrings, def);
}

DataConnectionPtr DataManager::CreateVectorDirect(const Array<String>& connStrings,
                                                  const VectorDef& def) {
  return factory_.CreateVectorDirect(connStrings, def);
}

DataConnectionPtr DataManager::Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                                       const MetadataPtr& metadata) {
  return factory_.Connect(connStrings, geoRef, metadata);
}

DataConnectionPtr DataManager::CreateRaster(const Array<String>& connStrings,
                                            const RasterDef& def) {
  return factory_.CreateRaster(connStrings, def);
}

void DataManager::ReleaseConnection(DataConnectionPtr& connection) {
  connection = DataConnectionPtr();
}

}  // namespace lumo
