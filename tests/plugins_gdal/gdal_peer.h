#pragma once

#include <algorithm>
#include <complex>
#include <cpl_string.h>
#include <gdal.h>
#include <memory>

#include "support/raster_sources.h"

namespace lumo::test {

/// A file as GDAL alone reads it, band by band and pixel by pixel.
class Peer {
 public:
  explicit Peer(const std::string& path, unsigned flags = GDAL_OF_RASTER) {
    GDALAllRegister();
    dataset_.reset(GDALOpenEx(path.c_str(), flags, nullptr, nullptr, nullptr));
  }
  explicit operator bool() const { return dataset_ != nullptr; }
  GDALDatasetH Dataset() const { return dataset_.get(); }
  unsigned Bands() const { return static_cast<unsigned>(GDALGetRasterCount(Dataset())); }

  /// Overview `overview`, counted from 0; -1 for the band itself.
  GDALRasterBandH Band(unsigned band, int overview = -1) const {
    GDALRasterBandH const full = GDALGetRasterBand(Dataset(), static_cast<int>(band) + 1);
    return overview < 0 ? full : GDALGetOverview(full, overview);
  }

  /// All pixels of a band, one line after the other.
  static std::vector<std::complex<double>> Pixels(GDALRasterBandH band) {
    return Read<std::complex<double>>(band, GDT_CFloat64);
  }
  /// Its mask: 0 where a pixel doesn't count.
  static std::vector<unsigned char> Mask(GDALRasterBandH band) {
    return Read<unsigned char>(GDALGetMaskBand(band), GDT_Byte);
  }

 private:
  template <typename T>
  static std::vector<T> Read(GDALRasterBandH band, GDALDataType type) {
    const int width = GDALGetRasterBandXSize(band), height = GDALGetRasterBandYSize(band);
    std::vector<T> values(static_cast<std::size_t>(width) * static_cast<std::size_t>(height));
    EXPECT_EQ(
        GDALRasterIO(band, GF_Read, 0, 0, width, height, values.data(), width, height, type, 0, 0),
        CE_None);
    return values;
  }

  struct Closer {
    void operator()(GDALDatasetH dataset) const { GDALClose(dataset); }
  };
  std::unique_ptr<void, Closer> dataset_;
};

template <typename T>
std::complex<double> AsComplex(const T& value) {
  if constexpr (std::is_arithmetic_v<T>) {
    return static_cast<double>(value);
  } else {
    return {static_cast<double>(value.real), static_cast<double>(value.imag)};
  }
}

/// Equal, or neither of them a number.
inline bool SameValue(std::complex<double> a, std::complex<double> b) {
  const auto same = [](double x, double y) { return x == y || (x != x && y != y); };
  return same(a.real(), b.real()) && same(a.imag(), b.imag());
}

/// Runs `body` for the pixel type of an open source. False for a source that has none.
template <typename Body>
bool WithType(const RasterDataConnectionPtr& source, Body&& body) {
  if (!source) return false;
  return DispatchType(TwelveTypes{}, static_cast<unsigned>(source->DataType()), [&]<typename T>() {
    body.template operator()<T>(*ReaderOf<T>(source));
    return true;
  });
}

}  // namespace lumo::test
