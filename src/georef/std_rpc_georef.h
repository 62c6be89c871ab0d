#pragma once

#include "georef/rpc_georef.h"
#include "georef/std_georef.h"

namespace lumo {

/// An affine grid, by which it converts, that also carries the camera model of the raster, as
/// scenes come that were resampled to a grid. The camera plays no part in the conversions.
class VEXG_EXPORT StdRpcGeoRef : public StdGeoRef {
 public:
  static const unsigned TypeCode;

  StdRpcGeoRef();

  StdRpcGeoRef* Clone() const override { return new StdRpcGeoRef(*this); }
  void SetDimensions(unsigned samples, unsigned lines) override;
  /// The camera model first, then the grid.
  void Write(std::ostream& out) const override;
  void Read(std::istream& in) override;

  /// The camera model.
  const RpcGeoRef& Rpc() const { return rpc_; }
  /// Takes a copy of a camera model.
  void SetRpc(const RpcGeoRef& rpc);

 private:
  RpcGeoRef rpc_;
};

using StdRpcGeoRefPtr = Pointer<StdRpcGeoRef>;

}  // namespace lumo
