#pragma once

#include <atomic>

#include "data/data_connection.h"
#include "foundation/locks.h"

namespace lumo {

/// Finds the format of a source and opens it, directly or behind a proxy. It is the factory that
/// the rest of the library sees; a DataManager owns it.
/// Failure: an empty pointer, with the fault set.
class VEXG_EXPORT MtDataConnectionFactory final : public DataConnectionFactory {
 public:
  bool IsAvailable() override { return true; }
  bool CanConnect(const Array<String>&) override { return false; }
  /// Opens a source on a server thread of its own, behind a MtRasterDataConnection or
  /// MtVectorDataConnection. A source without a format's key is opened on this thread first, to
  /// find out what it is.
  DataConnectionPtr Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                            const MetadataPtr& metadata) override;
  /// Makes a raster on a server thread of its own.
  DataConnectionPtr CreateRaster(const Array<String>& connStrings, const RasterDef& def) override;
  /// Empty: a new vector source is made through a proxy's CreateVector.
  DataConnectionPtr CreateVector(const Array<String>&, const VectorDef&) override { return {}; }

  /// Opens a source straight from the plug-in, to be used on this thread only. Without a format's
  /// key in the strings every row of the table is asked, and the willing ones are tried in order.
  DataConnectionPtr ConnectDirect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                                  const MetadataPtr& metadata);
  /// Makes a source straight from the plug-in of `def.format`; a format's key in the strings is
  /// dropped.
  DataConnectionPtr CreateRasterDirect(const Array<String>& connStrings, const RasterDef& def);
  /// Makes a vector source, likewise.
  DataConnectionPtr CreateVectorDirect(const Array<String>& connStrings, const VectorDef& def);
};

/// The gate to the plug-ins. There is one for the process, and one for each thread that serves a
/// source.
///
/// Threads: any number may open sources at the same time. No lock is held while a plug-in is
///          called, so that a source whose opening takes long, or never ends, holds up nobody else.
class VEXG_EXPORT DataManager : public ErrorState, public Lockable {
 public:
  // Each does what the factory's operation of the same name does.
  DataConnectionPtr ConnectDirect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                                  const MetadataPtr& metadata);
  DataConnectionPtr CreateRasterDirect(const Array<String>& connStrings, const RasterDef& def);
  DataConnectionPtr CreateVectorDirect(const Array<String>& connStrings, const VectorDef& def);
  DataConnectionPtr Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                            const MetadataPtr& metadata);
  DataConnectionPtr CreateRaster(const Array<String>& connStrings, const RasterDef& def);

  /// Empties the pointer; the last reference to a connection goes here.
  void ReleaseConnection(DataConnectionPtr& connection);

 private:
  friend VEXG_EXPORT DataManager& GetLocalDataManager();
  friend VEXG_EXPORT void FreeLocalDataManager();

  MtDataConnectionFactory factory_;
  std::recursive_mutex refMutex_;
  unsigned refCount_ = 1;
};

/// The manager of the process; null until VEXInit or the first GetGlobalDataManager.
VEXG_EXPORT extern DataManager* gpGlobalDataManager;
/// Guards the managers of the threads.
VEXG_EXPORT extern std::recursive_mutex* gpLocalDataManagerMutex;

/// The manager of the process, which ordinary code uses.
VEXG_EXPORT DataManager& GetGlobalDataManager();

/// The manager of this thread, made at the first call. Each call is paired with one of
/// FreeLocalDataManager on the same thread; the last of them deletes the manager.
VEXG_EXPORT DataManager& GetLocalDataManager();
/// Takes back one GetLocalDataManager of this thread.
VEXG_EXPORT void FreeLocalDataManager();

}  // namespace lumo
