#include "georef/std_rpc_georef.h"

namespace lumo {

const unsigned StdRpcGeoRef::TypeCode = kStdRpc;

StdRpcGeoRef::StdRpcGeoRef() {
  type_ = kStdRpc;
  rpc_.type_ = kStdRpc;
}

void StdRpcGeoRef::SetDimensions(unsigned samples, unsigned lines) {
  StdGeoRef::SetDimensions(samples, lines);
  rpc_.SetDimensions(samples, lines);
}

void StdRpcGeoRef::SetRpc(const RpcGeoRef& rpc) {
  rpc_ = rpc;
  rpc_.type_ = kStdRpc;
}

void StdRpcGeoRef::Write(std::ostream& out) const {
  rpc_.Write(out);
  StdGeoRef::Write(out);
}

void StdRpcGeoRef::Read(std::istream& in) {
  rpc_.Read(in);
  StdGeoRef::Read(in);
}

}  // namespace lumo
