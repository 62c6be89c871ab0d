#pragma once

#include <cstring>
#include <string>

#include "data/plain_raster_reader.h"
#include "foundation/fault.h"
#include "mosaic/mosaic_opening.h"

namespace lumo {

/// Reads a mosaic through its source, as what builds pyramids does. A raster that is opened on the
/// source is a MosaicRaster and reads the scenes itself, on the threads of whoever asks.
///
/// The mosaic is opened when pixels are read, and again once its files have changed.
template <typename T>
class MosaicReader final : public PlainRasterReader<T> {
 public:
  MosaicReader(RasterDataConnection* connection, const std::string& path,
               const MosaicDocument& document)
      : PlainRasterReader<T>(connection), path_(path), document_(document) {
    def_ = Open()->GetRasterDef();
  }

  lumo::RasterDef RasterDef() override { return def_; }
  bool HasNoDataValue(unsigned band) override { return Open()->HasNoDataValue(band); }
  T NoDataValue(unsigned band) override { return Open()->NoDataValue(band); }

  bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                  const Array<unsigned>& bands, unsigned level, T* pixels,
                  unsigned char* state) override {
    if (level != 0 || !Refresh()) return false;
    Array<T> values;
    Array<unsigned char> states;
    const SubRect rect(left, top, left + width - 1, top + height - 1);
    if (!Open()->GetSubRect(rect, bands, def_.interleave, values, states)) return false;
    std::memcpy(pixels, values.GetData(), std::size_t{values.GetCount()} * sizeof(T));
    std::memcpy(state, states.GetData(), states.GetCount());
    return true;
  }

 private:
  const MosaicRasterPtr<T>& Open() {
    if (!mosaic_) {
      mosaic_ = MosaicRasterPtr<T>(MakeMosaicRaster(path_, document_, BasicRasterPtr(), URI()));
    }
    return mosaic_;
  }

  /// Opens a definition that has changed. False when it is of another raster by then.
  bool Refresh() {
    if (Open()->IsUpToDate()) return true;
    std::string fault;
    if (!LoadMosaic(path_, document_, fault)) {
      SetFault(fault);
      return false;
    }
    mosaic_ = MosaicRasterPtr<T>();
    const bool isSame = document_.dataType == kDataTypeOf<T> && Open()->IsValid() &&
                        Open()->Samples() == def_.samples && Open()->Lines() == def_.lines &&
                        Open()->Bands() == def_.bands;
    if (!isSame) SetFault(path_ + ": the mosaic has another size, bands or pixel type by now");
    return isSame;
  }

  const std::string path_;
  MosaicDocument document_;
  lumo::RasterDef def_;
  MosaicRasterPtr<T> mosaic_;
};

}  // namespace lumo
