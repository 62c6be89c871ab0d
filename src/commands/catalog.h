#pragma once

#include "foundation/containers.h"
#include "foundation/pointer.h"

namespace lumo {

/// One row of the catalog.
struct CatalogEntry {
  ObjectPtr object;    ///< the catalog's own reference
  unsigned count = 0;  ///< opens that were not closed yet
};

/// The catalog: the open objects of the process by their identifier, which is how a command of a
/// job finds what an earlier one opened. Made by VEXInit, never emptied; an identifier is taken
/// when the object is added and not looked at again.
VEXG_EXPORT extern LockableMap<URI, CatalogEntry>* gpDataMap;

/// The catalog behind gpDataMap, which is made first when VEXInit has not run.
VEXG_EXPORT LockableMap<URI, CatalogEntry>& GetGlobalDataMap();

/// The operations on the catalog. Each is atomic and may be called on any thread; an object that
/// goes is destroyed after the catalog's lock was let go.
///
///     catalog::Add(raster);  // the command that opens
///     const BasicRasterPtr found(catalog::Find(raster->GetURI()));  // another, later
///     catalog::Release(raster->GetURI());  // the command that closes
namespace catalog {

/// Adds an object with count 1. When its identifier is there already the count goes up by 1, and
/// the object of the first Add stays. Nothing for an empty pointer.
VEXG_EXPORT void Add(const ObjectPtr& object);

/// The object under `uri`, or empty. The count stays.
VEXG_EXPORT ObjectPtr Find(const URI& uri);

/// Find, with the count up by 1 when there is an object.
VEXG_EXPORT ObjectPtr Access(const URI& uri);

/// Takes 1 from the count; the row goes when it was 1. Nothing for an identifier that isn't there.
VEXG_EXPORT void Release(const URI& uri);

/// Release of the object's own identifier. Nothing for an empty pointer.
VEXG_EXPORT void Remove(const ObjectPtr& object);

}  // namespace catalog

}  // namespace lumo
