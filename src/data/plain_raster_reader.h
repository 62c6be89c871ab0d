#pragma once

#include "data/raster_reader.h"
#include "raster/raster_enums.h"

namespace lumo {

/// A reader that answers for a source without pyramid, statistics, histograms, palettes and no-data
/// values, which can't be written: a plug-in overrides what its source has more. What remains are
/// RasterDef and ReadPixels.
///
///     class Reader final : public PlainRasterReader<float> {
///      public:
///       using PlainRasterReader::PlainRasterReader;
///       lumo::RasterDef RasterDef() override { return def_; }
///       bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
///                       const Array<unsigned>& bands, unsigned level, float* pixels,
///                       unsigned char* state) override;
///       …
///     };
///
/// examples/plugins/plane_plugin.cpp is a whole plug-in.
template <typename T>
class PlainRasterReader : public RasterReader<T> {
 public:
  using RasterReader<T>::RasterReader;

  bool OpBool() override { return true; }
  std::int32_t ReaderType() override { return 0; }
  /// Size and bands come from RasterDef; each level would halve the size.
  unsigned Samples(unsigned level) override { return this->RasterDef().samples >> level; }
  unsigned Lines(unsigned level) override { return this->RasterDef().lines >> level; }
  unsigned Bands() override { return this->RasterDef().bands; }

  /// No levels.
  std::int32_t PyramidType() override { return 0; }
  std::int32_t PyramidResamplingMethod() override { return 0; }
  std::int32_t PyramidLevelMin() override { return 0; }
  std::int32_t PyramidLevelMax() override { return 0; }
  bool PyramidExists() override { return false; }
  bool PyramidBuild(std::int32_t, std::int32_t, std::int32_t, const TileDimensions&) override {
    return false;
  }
  bool PyramidRebuild() override { return false; }
  bool PyramidDelete() override { return false; }
  bool PyramidRefresh() override { return false; }

  /// No statistics or histograms, and no room for any.
  std::int32_t StatsMask() override { return lumo::StatsMask::None; }
  bool StatsExist(unsigned) override { return false; }
  RasterBandStats<T> ReadStats(unsigned) override { return {}; }
  bool CanWriteStats() override { return false; }
  bool WriteStats(const Array<RasterBandStats<T>>&) override { return false; }
  Array<RasterBandHistogram<T>> Histogram(unsigned) override { return {}; }
  bool CanWriteHistogram() override { return false; }
  bool WriteHistogram(const Array<RasterBandHistogram<T>>&) override { return false; }

  /// All pixels count, and none stands for a colour.
  bool HasNoDataValue(unsigned) override { return false; }
  T NoDataValue(unsigned) override { return T(); }
  bool CanInheritNoDataValues() override { return false; }
  void InheritNoDataValues(const lumo::RasterDef&) override {}

  bool HasPalette(unsigned) override { return false; }
  lumo::Palette Palette(unsigned) override { return {}; }
  bool WritePalette(unsigned, const lumo::Palette&) override { return false; }
  bool DeletePalette(unsigned) override { return false; }

  /// Nothing can be written.
  bool CanWritePixels(unsigned) override { return false; }
  bool WritePixels(unsigned, unsigned, unsigned, unsigned, const Array<unsigned>&, unsigned,
                   const T*, const unsigned char*) override {
    return false;
  }
};

/// The connection of a reader that is made once the source is open: a plug-in's own derives from it
/// and has to open the source and to say what it is.
class VEXG_EXPORT PlainRasterConnection : public RasterDataConnection {
 public:
  /// Nothing is opened here: the factory of the plug-in makes the connection and calls SetOpened.
  bool Connect(const Array<String>&, const GeoRefPtr&, const MetadataPtr&) override {
    return false;
  }
  void Disconnect() override { dispatch_ = RasterReaderDispatchPtr(); }
  /// True from SetOpened to Disconnect.
  bool IsConnected() override { return bool(dispatch_); }
  Array<String> ConnectionStrings() override { return connStrings_; }
  lumo::URI URI() override { return uri_; }
  std::int32_t DataSourceType() override {
    return static_cast<std::int32_t>(DataSourceKind::kRaster);
  }
  std::int32_t DataType() override;
  bool CanWrite() override { return false; }
  bool GetMetadata(const String&, const LockableMetadataImplPtr&) override { return false; }
  RasterReaderDispatchPtr RasterReaderDispatch() override;
  lumo::RasterDef RasterDef() override;
  bool CreateRaster(const Array<String>&, const lumo::RasterDef&) override { return false; }
  DataConnectionPtr SelfPointer() override { return DataConnectionPtr(this, true); }

 protected:
  /// Takes over what the source is once it is open.
  /// @param uri  the same for every connection to one source.
  template <typename T>
  void SetOpened(const Array<String>& connStrings, const lumo::URI& uri,
                 const RasterReaderPtr<T>& reader) {
    connStrings_ = connStrings;
    uri_ = uri;
    dispatch_.Reset(new lumo::RasterReaderDispatch(reader));
  }

 private:
  Array<String> connStrings_;
  lumo::URI uri_;
  RasterReaderDispatchPtr dispatch_;
};

}  // namespace lumo
