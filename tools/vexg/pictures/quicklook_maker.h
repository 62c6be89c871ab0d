#pragma once

#include <array>
#include <optional>
#include <vector>

#include "pictures/quicklook_picture.h"

namespace lumo::host {

/// A raster that a picture shows.
struct ShownRaster {
  String uri;  ///< it is open
  RasterInfo info;
  std::string file;  ///< what the user calls it
};

/// A colour and what it means.
struct LegendRow {
  std::string name;
  Color color;
};

/// Labels of the same size as a raster, whose borders are drawn over its picture.
struct Outlines {
  ShownRaster labels;
  std::array<unsigned char, 3> colour{255, 255, 0};  ///< red, green, blue
};

/// The picture that QuicklookMaker makes of a raster.
struct QuicklookRequest {
  ShownRaster raster;
  Array<unsigned> bands;  ///< one, or red, green and blue
  unsigned size = 1024;   ///< pixels of the longer side at most
  QuicklookPicture::Stretch stretch;
  std::optional<Palette> palette;    ///< its colours, instead of the stretch, of one band
  std::vector<Outlines> outlines{};  ///< drawn over it, one after the other
  std::vector<LegendRow> legend{};   ///< drawn beside it
  PictureSampling sampling = PictureSampling::kAverage;
};

/// The bands shown: those that a text asks for, else red, green and blue where there are three or
/// more. Throws HostError for other bands than one or three.
Array<unsigned> ChoosePictureBands(const std::string& text, const RasterInfo& info);

/// How a picture of the bands takes its pixels unless told: averages, but for bands that hold
/// codes.
PictureSampling ChooseSampling(const RasterInfo& info, const Array<unsigned>& bands);

/// Reads a raster, draws the picture and writes it. Throws HostError.
void MakeQuicklook(JobSession& session, const QuicklookRequest& request, const OutputFile& output,
                   ProgressStyle progress);

}  // namespace lumo::host
