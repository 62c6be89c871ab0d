#pragma once

#include "foundation/array.h"
#include "metadata/metadata.h"

namespace lumo {

/// What the floors above do for Metadata::Open.
struct MetadataSources {
  /// True when the process may read a file or address; else tells the fault.
  bool (*mayOpen)(const String& name) = nullptr;
  /// Fills a store from a source's own metadata, through its plug-in.
  bool (*readConnection)(const Array<String>& connStrings, const String& mdfPath,
                         const LockableMetadataImplPtr& store, bool& connected) = nullptr;
};

/// Those of the process; set at load.
VEXG_EXPORT MetadataSources& GetMetadataSources();

}  // namespace lumo
