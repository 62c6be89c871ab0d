#include "data/plain_raster_reader.h"

namespace lumo {

std::int32_t PlainRasterConnection::DataType() {
  return dispatch_ ? static_cast<std::int32_t>(dispatch_->DataType()) : 0;
}

RasterReaderDispatchPtr PlainRasterConnection::RasterReaderDispatch() {
  return dispatch_ ? dispatch_ : RasterReaderDispatchPtr(new lumo::RasterReaderDispatch);
}

RasterDef PlainRasterConnection::RasterDef() {
  return dispatch_ ? dispatch_->GetBasic()->RasterDef() : lumo::RasterDef();
}

}  // namespace lumo
