#include "commands/catalog.h"

#include "commands/catalog_owners.h"
#include "foundation/library.h"

namespace lumo {

LockableMap<URI, CatalogEntry>* gpDataMap = nullptr;

namespace {

void MakeDataMap() {
  static auto* const map = new LockableMap<URI, CatalogEntry>;
  gpDataMap = map;
}

const InitStep gMakeDataMap(10, MakeDataMap);

}  // namespace

LockableMap<URI, CatalogEntry>& GetGlobalDataMap() {
  static const bool made = (MakeDataMap(), true);
  static_cast<void>(made);
  return *gpDataMap;
}

namespace catalog {

void Add(const ObjectPtr& object) {
  if (object.IsNull()) return;
  const URI uri = object->GetURI();
  auto& map = GetGlobalDataMap();
  const MutexLock lock = map.Lock();
  CatalogEntry& entry = map[uri];
  if (entry.count++ == 0) entry.object = object;
  NoteOpen(uri);
}

ObjectPtr Find(const URI& uri) {
  auto& map = GetGlobalDataMap();
  const MutexLock lock = map.Lock();
  return map.Find(uri).object;
}

ObjectPtr Access(const URI& uri) {
  auto& map = GetGlobalDataMap();
  const MutexLock lock = map.Lock();
  if (!map.HasKey(uri)) return {};
  CatalogEntry& entry = map[uri];
  ++entry.count;
  NoteOpen(uri);
  return entry.object;
}

void Release(const URI& uri) {
  ObjectPtr last;  // outlives the lock
  auto& map = GetGlobalDataMap();
  const MutexLock lock = map.Lock();
  if (!map.HasKey(uri)) return;
  CatalogEntry& entry = map[uri];
  NoteClose(uri, entry.count);
  if (--entry.count != 0) return;
  last = entry.object;
  Unfinished().erase(uri);
  map.Remove(uri);
}

void Remove(const ObjectPtr& object) {
  if (!object.IsNull()) Release(object->GetURI());
}

}  // namespace catalog

}  // namespace lumo
