#include "data/mt_connection.h"

#include "data/access_policy.h"
#include "data/data_manager.h"
#include "data/dc_srv_call.h"
#include "data/format_detection.h"
#include "data/mt_raster_reader_body.h"
#include "data/mt_vector_reader_body.h"

namespace lumo {
namespace {

/// Puts what `open` gives in place of the connection that the thread holds.
template <typename Open>
bool Replace(DcSrvContext& context, Open&& open) {
  DataManager& manager = GetLocalDataManager();
  const MutexLock lock = manager.Lock();
  manager.ReleaseConnection(context.conn);
  context.conn = open(manager);
  FreeLocalDataManager();
  return bool(context.conn);
}

/// A proxy of the reader for the type `code`, in a dispatch; one without a reader for other codes.
template <typename Dispatch, template <typename> typename ReaderPtr,
          template <typename> typename Proxy, typename Types, typename Connection>
Pointer<Dispatch> MakeDispatch(Types types, std::int32_t code, Connection* connection) {
  Pointer<Dispatch> made;
  DispatchType(types, static_cast<unsigned>(code), [&]<typename T>() {
    made.Reset(new Dispatch(ReaderPtr<T>(new Proxy<T>(connection))));
    return true;
  });
  if (!made) made.Reset(new Dispatch);
  return made;
}

}  // namespace

template <typename Base>
MtConnection<Base>::MtConnection() : running_(server_.Start()) {}

template <typename Base>
MtConnection<Base>::~MtConnection() {
  server_.Stop();
}

/// @param made  the source is new: its files are what is there afterwards.
template <typename Base>
template <typename Open>
bool MtConnection<Base>::Exchange(const Array<String>& connStrings, bool made, const Open& open) {
  ForgetReaders();
  auto opening = std::make_unique<OpenSource>(SourceStamp(connStrings));
  const bool isOpen = open();
  if (made) opening = std::make_unique<OpenSource>(SourceStamp(connStrings));
  const std::lock_guard lock(sourceMutex_);
  source_ = isOpen ? std::move(opening) : nullptr;
  return isOpen;
}

template <typename Base>
SourceStamp MtConnection<Base>::Stamp() {
  const std::lock_guard lock(sourceMutex_);
  return source_ != nullptr ? source_->GetStamp() : SourceStamp();
}

template <typename Base>
bool MtConnection<Base>::Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                                 const MetadataPtr&) {
  const FormatDetection* const detection = DetectedScope::Current();
  return Exchange(connStrings, false, [&] {
    return detail::CallServer(Server(), 2, "DcSrvCmdDcConnect", false,
                              [&](DcSrvContext& context, bool& result) {
                                const DetectedScope scope(detection);
                                result = Replace(context, [&](DataManager& manager) {
                                  return manager.ConnectDirect(connStrings, geoRef, MetadataPtr());
                                });
                              });
  });
}

template <typename Base>
void MtConnection<Base>::Disconnect() {
  ForgetReaders();
  detail::CallServer(Server(), 3, "DcSrvCmdDcDisconnect", false,
                     [](DcSrvContext& context, bool& result) {
                       result = bool(context.conn);
                       Replace(context, [](DataManager&) { return DataConnectionPtr(); });
                     });
  const std::lock_guard lock(sourceMutex_);
  source_.reset();
}

template <typename Base>
bool MtConnection<Base>::IsConnected() {
  return detail::CallConnection<bool>(Server(), 4, "DcSrvCmdDcIsConnected",
                                      [](auto& source) { return source.IsConnected(); });
}

template <typename Base>
Array<String> MtConnection<Base>::ConnectionStrings() {
  Array<String> none;
  if (Server() == nullptr) none.SetErrorState(ArrayErrorInvalidArray());
  return detail::CallConnection<Array<String>>(
      Server(), 5, "DcSrvCmdDcConnectionStrings",
      [](auto& source) { return source.ConnectionStrings(); }, none);
}

template <typename Base>
lumo::URI MtConnection<Base>::URI() {
  return detail::CallConnection<lumo::URI>(Server(), 6, "DcSrvCmdDcURI",
                                           [](auto& source) { return source.URI(); });
}

template <typename Base>
std::int32_t MtConnection<Base>::DataSourceType() {
  return detail::CallConnection<std::int32_t>(Server(), 7, "DcSrvCmdDcDataSourceType",
                                              [](auto& source) { return source.DataSourceType(); });
}

template <typename Base>
std::int32_t MtConnection<Base>::DataType() {
  return detail::CallConnection<std::int32_t>(Server(), 8, "DcSrvCmdDcDataType",
                                              [](auto& source) { return source.DataType(); });
}

template <typename Base>
bool MtConnection<Base>::CanWrite() {
  return detail::CallConnection<bool>(Server(), 9, "DcSrvCmdDcCanWrite",
                                      [](auto& source) { return source.CanWrite(); });
}

template class MtConnection<RasterDataConnection>;
template class MtConnection<VectorDataConnection>;

MtRasterDataConnection::~MtRasterDataConnection() {
  Disconnect();
}

void MtRasterDataConnection::ForgetReaders() {
  const std::lock_guard lock(mutex_);
  dispatch_ = RasterReaderDispatchPtr();
}

RasterReaderDispatchPtr MtRasterDataConnection::RasterReaderDispatch() {
  const std::lock_guard lock(mutex_);
  if (!dispatch_) {
    dispatch_ = MakeDispatch<lumo::RasterReaderDispatch, RasterReaderPtr, MtRasterReader>(
        TwelveTypes{}, DataType(), this);
  }
  return dispatch_;
}

RasterDef MtRasterDataConnection::RasterDef() {
  const auto reader = RasterReaderDispatch()->GetBasic();
  return reader ? reader->RasterDef() : lumo::RasterDef();
}

bool MtRasterDataConnection::CreateRaster(const Array<String>& connStrings,
                                          const lumo::RasterDef& def) {
  return Exchange(connStrings, true, [&] {
    return detail::CallServer(Server(), 10, "DcSrvCmdDcrCreateRaster", false,
                              [&](DcSrvContext& context, bool& result) {
                                result = Replace(context, [&](DataManager& manager) {
                                  return manager.CreateRasterDirect(connStrings, def);
                                });
                              });
  });
}

MtVectorDataConnection::~MtVectorDataConnection() {
  Disconnect();
}

void MtVectorDataConnection::ForgetReaders() {
  const std::lock_guard lock(mutex_);
  dispatch_ = VectorReaderDispatchPtr();
}

VectorReaderDispatchPtr MtVectorDataConnection::VectorReaderDispatch() {
  const std::lock_guard lock(mutex_);
  if (!dispatch_) {
    dispatch_ = MakeDispatch<lumo::VectorReaderDispatch, VectorReaderPtr, MtVectorReader>(
        EightTypes{}, DataType(), this);
  }
  return dispatch_;
}

VectorDef MtVectorDataConnection::VectorDef() {
  const auto reader = VectorReaderDispatch()->GetBasic();
  return reader ? reader->VectorDef() : lumo::VectorDef();
}

bool MtVectorDataConnection::CreateVector(const Array<String>& connStrings,
                                          const lumo::VectorDef& def) {
  ForgetReaders();
  if (!MayUseSource(connStrings, true)) return false;
  return Exchange(connStrings, true, [&] {
    return detail::CallServer(Server(), 45, "DcSrvCmdDcrCreateVector", false,
                              [&](DcSrvContext& context, bool& result) {
                                result = Replace(context, [&](DataManager& manager) {
                                  return manager.CreateVectorDirect(connStrings, def);
                                });
                              });
  });
}

}  // namespace lumo
