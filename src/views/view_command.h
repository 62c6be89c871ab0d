#pragma once

#include "views/publish_raster.h"

namespace lumo {

/// The input of a command that makes a view: the raster that the view stands on.
inline InputDeclaration SourceInput() {
  return {"SrcURI", Presence::kRequired, ValueKind::kURI, "the raster to stand on"};
}

/// Helps commands that make a view on the raster of SourceInput, one of EightTypes, and put it into
/// the catalog with count 1. A whole command, beside its declaration:
///
///     class CreateVirtualRasterCommand final : public ViewCommand {
///       CommandResult Execute() override { return PublishView<VirtualRaster>(); }
///     };
class ViewCommand : public PublishCommand {
 protected:
  /// Publishes a View<T>, made from the raster and `arguments`.
  /// @param arguments  follow the raster in the constructor of the view.
  template <template <typename> class View, typename... Arguments>
  CommandResult PublishView(const Arguments&... arguments) {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (!source) return Fail();
    BasicRasterPtr view;
    const bool typed = DispatchType(EightTypes{}, source->DataType(), [&]<typename T>() {
      view.Reset(new View<T>(RasterPtr<T>(source), arguments...));
      return true;
    });
    if (!typed) return Fail("SrcURI: there is no such view on this pixel type");
    if (view->IsValid() && (view->Samples() == 0 || view->Lines() == 0)) {
      return Fail("the view would show no pixel of the raster");
    }
    return Publish(view);
  }
};

}  // namespace lumo
