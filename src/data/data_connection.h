#pragma once

#include "data/format_table.h"
#include "data/vector_def.h"
#include "foundation/pointer.h"
#include "raster/raster_def.h"

// The interfaces that a plug-in implements. Nothing here is const: a source may have to read before
// it can answer. The order of the virtual operations is part of the plug-in contract.
//
// Connection strings name a source: the format's key, when it is known, then whatever the plug-in
// takes, which is a path for a file. See format_table.h.
//
// Threads: a plug-in's connection and its readers are called on one thread, on which they were
//          made. The library puts proxies in front, which may be called on any thread.
// Failure: false, 0 or empty, with the reason set by SetFault. An exception that leaves a plug-in
//          ends as the failure of that one call.

namespace lumo {

class RasterReaderDispatch;
class VectorReaderDispatch;
using RasterReaderDispatchPtr = Pointer<RasterReaderDispatch>;
using VectorReaderDispatchPtr = Pointer<VectorReaderDispatch>;

class DataConnection;
using DataConnectionPtr = Pointer<DataConnection>;

/// Makes the connections of one format. A plug-in has one factory for each of its rows in the
/// table.
///
/// Ownership: lives until the process ends.
/// Threads:   may be called on any thread, and on several at once.
class VEXG_EXPORT DataConnectionFactory {
 public:
  /// True when the format can be used on this machine.
  virtual bool IsAvailable() = 0;
  /// True when the format recognises the source. Changes nothing, and is quick: it is asked of
  /// every format for a source of unknown format.
  virtual bool CanConnect(const Array<String>& connStrings) = 0;
  /// Opens an existing source.
  /// @param geoRef,metadata  replace what the source itself says of its place and its metadata; may
  ///                  be empty.
  /// @return empty on a failure.
  virtual DataConnectionPtr Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                                    const MetadataPtr& metadata) = 0;
  /// Makes a new source; the strings come without the format's key. Empty on a failure.
  virtual DataConnectionPtr CreateRaster(const Array<String>& connStrings,
                                         const RasterDef& def) = 0;
  /// Makes a new vector source, likewise.
  virtual DataConnectionPtr CreateVector(const Array<String>& connStrings,
                                         const VectorDef& def) = 0;
  virtual ~DataConnectionFactory() = default;
};

/// An open source.
///
/// Ownership: its readers belong to it, and go with it.
/// Threads:   those of the file; the proxies of mt_connection.h may be used on any.
class VEXG_EXPORT DataConnection {
 public:
  using PointerRoot = DataConnection;
  static const unsigned TypeCode;

  /// Opens; arguments as for DataConnectionFactory::Connect.
  virtual bool Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                       const MetadataPtr& metadata) = 0;
  /// Closes the source. Its readers are not to be used after that.
  virtual void Disconnect() = 0;
  /// True while the source is open.
  virtual bool IsConnected() = 0;
  /// The strings that this connection answers to.
  virtual Array<String> ConnectionStrings() = 0;
  /// Its identity in the catalog: the same for every connection to one source.
  virtual lumo::URI URI() = 0;
  /// A DataSourceKind.
  virtual std::int32_t DataSourceType() = 0;
  /// Code of the pixel or coordinate type.
  virtual std::int32_t DataType() = 0;
  /// True when pixels, or shapes, can be written.
  virtual bool CanWrite() = 0;
  /// Fills `store` from the source's own metadata through the definition file `mdfPath`.
  virtual bool GetMetadata(const String& mdfPath, const LockableMetadataImplPtr& store) = 0;
  virtual ~DataConnection() = default;

  /// True for the code of a class below that this object belongs to, for casts between Pointers.
  bool IsA(unsigned typeCode) const;
};

/// An open raster source: its description, and the reader of its pixels.
///
///     const DataConnectionPtr open = GetGlobalDataManager().Connect(ConnStrings({path}), {}, {});
///     const RasterDataConnectionPtr source(open);  // empty for a vector source
///     if (!source) return false;
///     const RasterReaderPtr<float> reader = source->RasterReaderDispatch()->Get<float>();
///     if (!reader) return false;                   // of another pixel type
class VEXG_EXPORT RasterDataConnection : public DataConnection {
 public:
  static const unsigned TypeCode;

  /// The reader of the source's pixel type, in a dispatch that the connection keeps.
  virtual RasterReaderDispatchPtr RasterReaderDispatch() = 0;
  /// The description of the source.
  virtual lumo::RasterDef RasterDef() = 0;
  /// Makes a new source and opens it.
  virtual bool CreateRaster(const Array<String>& connStrings, const lumo::RasterDef& def) = 0;
  /// A Pointer to this connection that doesn't own it.
  virtual DataConnectionPtr SelfPointer() = 0;
};
using RasterDataConnectionPtr = Pointer<RasterDataConnection>;

/// An open vector source.
class VEXG_EXPORT VectorDataConnection : public DataConnection {
 public:
  static const unsigned TypeCode;

  /// The reader of the source's coordinate type, in a dispatch that the connection keeps.
  virtual VectorReaderDispatchPtr VectorReaderDispatch() = 0;
  /// The description of the source.
  virtual lumo::VectorDef VectorDef() = 0;
  /// Makes a new source and opens it.
  virtual bool CreateVector(const Array<String>& connStrings, const lumo::VectorDef& def) = 0;
  /// A Pointer to this connection that doesn't own it.
  virtual DataConnectionPtr SelfPointer() = 0;
};
using VectorDataConnectionPtr = Pointer<VectorDataConnection>;

}  // namespace lumo
