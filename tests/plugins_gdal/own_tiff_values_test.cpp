#include <functional>

#include "plugins_gdal/tiff_comparison.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

using test::ExpectSame;
using test::Make;

/// Each case stores statistics in another way, or something that isn't statistics of all pixels.
TEST(OwnTiff, StoredStatisticsAreThoseOfGdal) {
  const test::TemporaryDirectory directory;
  const auto set = [](GDALDatasetH file, const char* name, const char* text, int band = 2) {
    GDALSetMetadataItem(GDALGetRasterBand(file, band), name, text, nullptr);
  };
  const auto compute = [](GDALDatasetH file, bool isApproximate) {
    double n = 0;
    GDALComputeRasterStatistics(GDALGetRasterBand(file, 1), isApproximate, &n, &n, &n, &n, nullptr,
                                nullptr);
  };
  using Store = std::function<void(GDALDatasetH)>;
  const struct {
    const char* name;
    bool isOwn;
    Store store;
  } cases[] = {
      {"computed", true, [&](GDALDatasetH file) { compute(file, false); }},
      {"approximate", true, [&](GDALDatasetH file) { compute(file, true); }},
      {"some are missing", true, [&](GDALDatasetH file) { set(file, "STATISTICS_MEAN", "3"); }},
      {"odd texts", true,
       [&](GDALDatasetH file) {
         compute(file, false);
         set(file, "STATISTICS_MEAN", " +1e400 and more");
         set(file, "STATISTICS_STDDEV", "-1.#IND");
         set(file, "STATISTICS_MINIMUM", "  3.5");
         set(file, "STATISTICS_MAXIMUM", "260");
         set(file, "STATISTICS_APPROXIMATE", "Off");
         set(file, "STATISTICS_VALID_PERCENT", "97.3");
         set(file, "STATISTICS_MEAN", "7", 1);  // beside the others of this band
       }},
      {"marks in a text", true, [&](GDALDatasetH file) { set(file, "STATISTICS_MEAN", "<&>"); }},
      {"another item", false, [&](GDALDatasetH file) { set(file, "SENSOR", "here"); }},
      {"an alpha band", false,
       [](GDALDatasetH file) {
         GDALSetRasterColorInterpretation(GDALGetRasterBand(file, 2), GCI_AlphaBand);
       }},
      {"a histogram", true,
       [&](GDALDatasetH file) {
         compute(file, false);
         GUIntBig counts[] = {1, 2, 3};
         GDALSetDefaultHistogramEx(GDALGetRasterBand(file, 2), -0.5, 2.5, 3, counts);
       }},
  };
  int number = 0;
  for (const GDALDataType type : {GDT_Byte, GDT_Int16, GDT_Float32}) {
    for (const auto& each : cases) {
      for (const int how : {0, 1, 2}) {  // beside the file, in the file, in both
        SCOPED_TRACE(std::string(each.name) + " " + std::to_string(how));
        const std::string path =
            (directory.Path() / ("v" + std::to_string(number++) + "x.tif")).string();
        const bool hasNoData = number % 3 == 0;
        Make(path, {type, {}, 3, 32633, hasNoData ? "7" : nullptr}, number);
        const auto store = [&](unsigned flags, const Store& body) {
          GDALDatasetH const file = GDALOpenEx(path.c_str(), flags, nullptr, nullptr, nullptr);
          body(file);
          GDALClose(file);
        };
        if (how != 0) store(GDAL_OF_RASTER | GDAL_OF_UPDATE, each.store);
        if (how == 2) {
          store(GDAL_OF_RASTER, [&](GDALDatasetH file) { set(file, "STATISTICS_MAXIMUM", "9"); });
        } else if (how == 0) {
          store(GDAL_OF_RASTER, each.store);
        }
        EXPECT_EQ(ExpectSame(path), each.isOwn);
      }
    }
  }
}

/// GDAL keeps names, units, meanings and scales of bands in a tag of the file.
TEST(OwnTiff, DetailsOfBandsAreThoseOfGdal) {
  const test::TemporaryDirectory directory;
  using Store = std::function<void(GDALRasterBandH)>;
  const struct {
    bool isOwn;
    Store store;
  } cases[] = {
      {true, [](GDALRasterBandH band) { GDALSetDescription(band, "near infrared, 30 m"); }},
      {true, [](GDALRasterBandH band) { GDALSetRasterUnitType(band, "W/(m2 sr um)"); }},
      {true, [](GDALRasterBandH band) { GDALSetRasterScale(band, 2.75e-05); }},
      {true, [](GDALRasterBandH band) { GDALSetRasterScale(band, 1); }},
      {true, [](GDALRasterBandH band) { GDALSetRasterOffset(band, -0.2); }},
      {true, [](GDALRasterBandH band) { GDALSetRasterColorInterpretation(band, GCI_BlueBand); }},
      {false, [](GDALRasterBandH band) { GDALSetDescription(band, "<a & b>"); }},
      {false, [](GDALRasterBandH band) { GDALSetRasterColorInterpretation(band, GCI_HueBand); }},
  };
  int number = 0;
  for (const auto& each : cases) {
    for (const char* const photometric : {"PHOTOMETRIC=MINISBLACK", "PHOTOMETRIC=RGB"}) {
      for (const int bandNumber : {1, 2, 3}) {
        SCOPED_TRACE(std::to_string(number) + photometric);
        const std::string path =
            (directory.Path() / ("d" + std::to_string(number++) + "x.tif")).string();
        Make(path, {GDT_Byte, {photometric}, 4, 32633}, number);
        GDALDatasetH const file =
            GDALOpenEx(path.c_str(), GDAL_OF_RASTER | GDAL_OF_UPDATE, nullptr, nullptr, nullptr);
        each.store(GDALGetRasterBand(file, bandNumber));
        GDALClose(file);
        EXPECT_EQ(ExpectSame(path), each.isOwn);
      }
    }
  }
}

}  // namespace
}  // namespace lumo
