#pragma once

#include "data/dc_srv.h"
#include "data/open_sources.h"
#include "data/raster_reader.h"
#include "data/vector_reader.h"

// The proxies behind which every open source stands: each call goes to the source's own thread and
// is waited for. What can't be asked, because there is no thread, no connection or no reader of the
// type, answers 0, false or empty.
//
// Threads: any number of threads may use one proxy.

namespace lumo {

/// Keeps the source's thread for both proxies, and hands each operation to it.
/// @tparam Base  RasterDataConnection or VectorDataConnection.
template <typename Base>
class MtConnection : public Base {
 public:
  MtConnection();
  ~MtConnection() override;
  MtConnection(const MtConnection&) = delete;
  MtConnection& operator=(const MtConnection&) = delete;

  /// Opens a source on the thread; one that is open there is let go first. The metadata stays
  /// behind: the source gets an empty one.
  bool Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
               const MetadataPtr& metadata) override;
  /// Closes the source and lets go of its readers; the thread stays for the next one.
  void Disconnect() override;
  bool IsConnected() override;
  /// An array with ArrayErrorInvalidArray stored when there is no thread.
  Array<String> ConnectionStrings() override;
  lumo::URI URI() override;
  std::int32_t DataSourceType() override;
  std::int32_t DataType() override;
  bool CanWrite() override;
  bool GetMetadata(const String&, const LockableMetadataImplPtr&) override { return false; }
  DataConnectionPtr SelfPointer() override { return DataConnectionPtr(this, true); }

  /// The source's thread; null when it could not be started.
  DcSrv* Server() { return running_ ? &server_ : nullptr; }

  /// The files of the open source, as they were just before it was opened, or after it was made.
  SourceStamp Stamp();

 protected:
  /// Lets go of the readers of the last source.
  virtual void ForgetReaders() = 0;

  /// Gives the result of `open`, which opens or makes a source in place of the one that is open.
  template <typename Open>
  bool Exchange(const Array<String>& connStrings, bool made, const Open& open);

 private:
  DcSrv server_;
  bool running_;
  std::mutex sourceMutex_;
  std::unique_ptr<OpenSource> source_;  // null while nothing is open
};

extern template class VEXG_EXPORT MtConnection<RasterDataConnection>;
extern template class VEXG_EXPORT MtConnection<VectorDataConnection>;

/// A raster source on a thread of its own.
class VEXG_EXPORT MtRasterDataConnection final : public MtConnection<RasterDataConnection> {
 public:
  ~MtRasterDataConnection() override;
  RasterReaderDispatchPtr RasterReaderDispatch() override;
  lumo::RasterDef RasterDef() override;
  bool CreateRaster(const Array<String>& connStrings, const lumo::RasterDef& def) override;

 private:
  void ForgetReaders() override;

  std::mutex mutex_;
  RasterReaderDispatchPtr dispatch_;  // made at the first use
};

/// A vector source on a thread of its own.
class VEXG_EXPORT MtVectorDataConnection final : public MtConnection<VectorDataConnection> {
 public:
  ~MtVectorDataConnection() override;
  VectorReaderDispatchPtr VectorReaderDispatch() override;
  lumo::VectorDef VectorDef() override;
  bool CreateVector(const Array<String>& connStrings, const lumo::VectorDef& def) override;

 private:
  void ForgetReaders() override;

  std::mutex mutex_;
  VectorReaderDispatchPtr dispatch_;
};

}  // namespace lumo
