#pragma once

#include "foundation/array.h"
#include "metadata/metadata.h"

namespace lumo {

/// Holds the functions by which the floors above serve Metadata::Open; null until they are set.
struct MetadataSources {
  /// True when the process may read a file or address; else sets the fault.
  bool (*mayOpen)(const String& name) = nullptr;
  /// Fills a store from a source's own metadata, through its plug-in.
  bool (*readConnection)(const Array<String>& connStrings, const String& mdfPath,
                         const LockableMetadataImplPtr& store, bool& connected) = nullptr;
};

/// Those of the process; set at load.
VEXG_EXPORT MetadataSources& GetMetadataSources();

}  // namespace lumo
