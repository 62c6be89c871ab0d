#include "metadata/metadata_sources.h"

#include "data/access_policy.h"
#include "data/data_manager.h"
#include "foundation/fault.h"
#include "foundation/thrown.h"

// The part of this floor in Metadata::Open.

namespace lumo {
namespace {

bool MayOpen(const String& name) {
  return MayUseSource(ConnStrings({name}), false);
}

bool ReadConnection(const Array<String>& connStrings, const String& mdfPath,
                    const LockableMetadataImplPtr& store, bool& connected) {
  if (!MayUseSource(connStrings, false)) return false;
  DataManager& manager = GetGlobalDataManager();
  DataConnectionPtr connection = manager.ConnectDirect(connStrings, GeoRefPtr(), MetadataPtr());
  connected = bool(connection);
  if (!connected) return false;
  bool read = false;
  try {
    read = connection->GetMetadata(mdfPath, store);
  } catch (...) {
    SetFault("the plug-in failed when it was asked for its metadata: " + DescribeException());
  }
  manager.ReleaseConnection(connection);
  return read;
}

const bool gIsSet = [] {
  GetMetadataSources() = {MayOpen, ReadConnection};
  return true;
}();

}  // namespace
}  // namespace lumo
