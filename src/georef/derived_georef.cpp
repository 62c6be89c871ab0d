#include "georef/derived_georef.h"

#include "georef/std_rpc_georef.h"

namespace lumo {
namespace {

/// Changes the camera of a model, if it has one, by `change(RpcGeoRef&)`.
template <typename Change>
void ChangeCamera(GeoRef& model, const Change& change) {
  if (auto* const camera = dynamic_cast<RpcGeoRef*>(&model)) {
    change(*camera);
  } else if (auto* const both = dynamic_cast<StdRpcGeoRef*>(&model)) {
    RpcGeoRef changed(both->Rpc());
    change(changed);
    both->SetRpc(changed);
  }
}

}  // namespace

GeoRefPtr ReducedGeoRef(const GeoRef& model, double factorX, double factorY, unsigned samples,
                        unsigned lines) {
  const GeoRefPtr reduced(model.Clone());
  ChangeCamera(*reduced, [&](RpcGeoRef& camera) { camera.Resample(factorX, factorY); });
  reduced->SetDimensions(samples, lines);
  if (model.GetType() == GeoRef::kRpc) return reduced;
  reduced->SetPixelSize(model.PixelSizeX() * factorX, model.PixelSizeY() * factorY);
  reduced->SetTiePixel(model.TiePixelX() / factorX, model.TiePixelY() / factorY);
  return reduced;
}

GeoRefPtr PartGeoRef(const GeoRef& model, const SubRect& rect, Form form) {
  GeoRefPtr part = model.SubRectGeoRef(rect);
  if (model.GetType() == GeoRef::kRpc || part.IsNull()) return part;
  MoveCamera(*part, rect.left, rect.top);
  if (form == Form::kExact) part->SetTiePixel(0, 0);
  return part;
}

void MoveCamera(GeoRef& model, double x, double y) {
  ChangeCamera(model, [&](RpcGeoRef& camera) {
    camera.SetSubset(camera.SampleOffset() + x / camera.SampleScale(),
                     camera.LineOffset() + y / camera.LineScale(), camera.SampleScale(),
                     camera.LineScale());
  });
}

}  // namespace lumo
