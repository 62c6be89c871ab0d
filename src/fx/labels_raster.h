#pragma once

#include "raster/raster_def.h"
#include "views/computed_raster.h"

namespace lumo {

/// Shows a raster of whole numbers of 8 or 16 bits as one of type Int, as labels are to be. It
/// can't be written, and has statistics of its own. T is std::uint8_t, std::int8_t, std::uint16_t
/// or std::int16_t.
///
/// Ownership: shares the parent, which does not know the view.
/// Threads:   every operation may run on many threads at once; nothing is stored per call.
/// Failure:   over an empty parent IsValid() is false and operations give false, 0 or empty.
template <typename T>
class VEXG_EXPORT LabelsRaster final : public ComputedRaster<std::int32_t> {
 public:
  explicit LabelsRaster(const RasterPtr<T>& parent) : parent_(parent) {}
  ~LabelsRaster() override { StopComputing(); }

  URI GetURI() const override { return DefaultURI("LabelsRaster"); }
  bool IsValid() const override { return parent_ && parent_->IsValid() && Object::IsValid(); }
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override;
  unsigned Samples() const override { return parent_ ? parent_->Samples() : 0; }
  unsigned Lines() const override { return parent_ ? parent_->Lines() : 0; }
  unsigned Bands() const override { return parent_ ? parent_->Bands() : 0; }
  bool HasNoDataValue(unsigned band) const override {
    return parent_ && parent_->HasNoDataValue(band);
  }
  std::int32_t NoDataValue(unsigned band) const override {
    return parent_ ? parent_->NoDataValue(band) : 0;
  }
  lumo::TileDimensions TileDimensions() const override {
    return parent_ ? parent_->TileDimensions() : lumo::TileDimensions();
  }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<std::int32_t>& pixels, Array<unsigned char>& state) override;
  std::uint64_t WriteCount() const override { return parent_ ? parent_->WriteCount() : 0; }

 private:
  RasterPtr<T> parent_;  // the base has no parent: its type is another
};

}  // namespace lumo
