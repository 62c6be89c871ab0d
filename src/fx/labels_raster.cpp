#include "fx/labels_raster.h"

#include <algorithm>

#include "foundation/fault.h"
#include "views/view_command.h"

namespace lumo {

template <typename T>
RasterDef LabelsRaster<T>::GetRasterDef() const {
  if (!parent_) return {};
  RasterDef def = parent_->GetRasterDef();
  def.dataType = kDataTypeOf<std::int32_t>;
  return def;
}

template <typename T>
bool LabelsRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                 Interleave interleave, Array<std::int32_t>& pixels,
                                 Array<unsigned char>& state) {
  Array<T> labels;
  if (!parent_ || !parent_->GetSubRect(rect, bands, interleave, labels, state)) return false;
  if (!pixels.Resize(labels.GetDims())) return false;
  std::copy(labels.begin(), labels.end(), pixels.begin());
  return true;
}

template class LabelsRaster<std::uint8_t>;
template class LabelsRaster<std::int8_t>;
template class LabelsRaster<std::uint16_t>;
template class LabelsRaster<std::int16_t>;

namespace {

const CommandDeclaration kLabels{
    "CreateLabelsRasterCommand",
    "Feature extraction",
    "Shows a raster of whole numbers of 8 or 16 bits as labels of type Int. A command of this "
    "library's own.",
    {SourceInput()},
    PublishedOutputs()};

class CreateLabelsRasterCommand final : public ViewCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (!source) return Fail();
    BasicRasterPtr view;
    const bool isNarrow =
        DispatchType(TypeList<std::uint8_t, std::int8_t, std::uint16_t, std::int16_t>{},
                     source->DataType(), [&]<typename T>() {
                       view.Reset(new LabelsRaster<T>(RasterPtr<T>(source)));
                       return true;
                     });
    if (!isNarrow) return Fail("SrcURI: the pixels are no whole numbers of 8 or 16 bits");
    return Publish(view);
  }
};

const CommandFactoryT<CreateLabelsRasterCommand> createLabelsRasterFactory(kLabels);

}  // namespace
}  // namespace lumo
