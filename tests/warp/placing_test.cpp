#include <cmath>

#include "georef/affine_link.h"
#include "georef/std_rpc_georef.h"
#include "mosaic/overlap_raster.h"
#include "pyramid/exact_levels.h"
#include "support/pyramid_scene.h"
#include "support/run_command.h"
#include "views/band_stack_raster.h"
#include "views/skip_raster.h"
#include "views/spatial_subset_raster.h"
#include "views/spectral_subset_raster.h"

// The pixels of a view, a level or an overlap lie where it lies in the source, whatever the model.

namespace lumo::test {
namespace {

using Pixel = std::int32_t;
using Source = RasterPtr<Pixel>;
constexpr unsigned kSamples = 301, kLines = 210;

RpcGeoRef MakeCamera() {
  RpcCoefficients rpc;
  rpc.lineOffset = 104.25;
  rpc.sampleOffset = 150.75;
  rpc.latitudeOffset = 45;
  rpc.longitudeOffset = 10;
  rpc.heightOffset = 50;
  rpc.lineScale = 105;
  rpc.sampleScale = 150;
  rpc.latitudeScale = 0.1;
  rpc.longitudeScale = 0.15;
  rpc.heightScale = 100;
  rpc.sampleNumerator = {0.001, 1.01, 0.02, 0.001, 0.003, 0, 0, 0.002};
  rpc.lineNumerator = {-0.002, 0.03, -0.98, 0.002, 0.001, 0, 0, 0, 0.004};
  rpc.sampleDenominator = rpc.lineDenominator = {1, 0.001, -0.002};
  RpcGeoRef camera;
  camera.SetCoefficients(rpc);
  return camera;
}

template <typename Grid>
GeoRefPtr MakeGridOf(double sizeY, double degrees, double tieX, double tieY) {
  const GeoRefPtr grid(new Grid);
  grid->SetPixelSize(20, sizeY);
  grid->SetRotation(degrees);
  grid->SetTieMap(500000, 5000000);
  grid->SetTiePixel(tieX, tieY);
  return grid;
}

struct Model {
  const char* name;
  GeoRefPtr geoRef;
};

std::vector<Model> MakeModels() {
  const GeoRefPtr both = MakeGridOf<StdRpcGeoRef>(30, 0, 0, 0);
  dynamic_cast<StdRpcGeoRef&>(*both).SetRpc(MakeCamera());
  const GeoRefPtr turnedBoth = MakeGridOf<StdRpcGeoRef>(30, 200, 12, 3);
  dynamic_cast<StdRpcGeoRef&>(*turnedBoth).SetRpc(MakeCamera());
  return {{"plain", MakeGridOf<StdGeoRef>(30, 0, 0, 0)},
          {"tied inside", MakeGridOf<StdGeoRef>(30, 0, 40.5, 17.25)},
          {"south up", MakeGridOf<StdGeoRef>(-30, 0, 3, 4)},
          {"turned", MakeGridOf<StdGeoRef>(30, 33, 0, 0)},
          {"turned, tied inside", MakeGridOf<StdGeoRef>(-30, 120, 7, 9)},
          {"camera", GeoRefPtr(MakeCamera().Clone())},
          {"grid and camera", both},
          {"turned grid and camera", turnedBoth}};
}

/// How far, in pixels of the source, a pixel of the view lies from the source's pixel that it
/// shows.
double Miss(const GeoRef& source, const GeoRef& view, double x, double y, double sx, double sy) {
  Array<double> point{ArrayDims(1, 2)};
  point[0] = x;
  point[1] = y;
  if (!view.PixelToMap(point) || !InvertPixelToMap(source, point)) return HUGE_VAL;
  const double miss = std::hypot(point[0] - sx, point[1] - sy);
  const auto* const both = dynamic_cast<const StdRpcGeoRef*>(&source);
  const auto* const viewBoth = dynamic_cast<const StdRpcGeoRef*>(&view);
  if (both == nullptr) return miss;
  if (viewBoth == nullptr) return HUGE_VAL;
  return std::max(miss, Miss(both->Rpc(), viewBoth->Rpc(), x, y, sx, sy));
}

/// Each pixel of the ramp shows its place.
void ExpectPlaced(const Source& source, const Source& view) {
  ASSERT_TRUE(view && view->IsValid());
  ASSERT_GT(view->Samples() * view->Lines(), 0u);
  const RasterDef def = view->GetRasterDef();
  const GeoRefPtr full = source->GetRasterDef().geoRef;
  ASSERT_TRUE(def.geoRef);
  EXPECT_EQ(def.geoRef->GetType(), full->GetType());
  EXPECT_EQ(def.geoRef->Samples(), view->Samples());
  EXPECT_EQ(def.geoRef->Lines(), view->Lines());
  double worst = 0;
  for (const unsigned y : {0U, view->Lines() / 2, view->Lines() - 1})
    for (const unsigned x : {0U, view->Samples() / 3, view->Samples() - 1}) {
      Array<Pixel> pixels;
      Array<unsigned char> state;
      ASSERT_TRUE(
          view->GetSubRect({x, y, x, y}, MakeArray<unsigned>({0}), Interleave::BIP, pixels, state));
      worst = std::max(worst, Miss(*full, *def.geoRef, x, y, pixels[0] % 1000, pixels[0] / 1000));
    }
  EXPECT_LT(worst, 0.001);  // the inverse of a camera is good to a ten thousandth
}

TEST(Placing, EveryViewAndLevelLiesWhereItsPixelsLie) {
  for (const Model& model : MakeModels()) {
    PyramidScene scene;
    scene.Fake().samples = kSamples;
    scene.Fake().lines = kLines;
    scene.Fake().geoRef = CloneOf(model.geoRef);
    scene.Fake().geoRef->SetDimensions(kSamples, kLines);
    const Source source = scene.Open<Pixel>();
    ASSERT_TRUE(PyramidScene::Build(*source, 1, 6, 16));
    const auto subset = [](const Source& of, const SubRect& rect) {
      return Source(new SpatialSubsetRaster<Pixel>(of, rect, Form::kExact));
    };
    const auto skip = [](const Source& of, unsigned x, unsigned y) {
      return Source(new SkipRaster<Pixel>(of, x, y, true));
    };
    const SubRect rect(37, 21, 290, 188);
    const struct {
      const char* name;
      Source view;
    } views[] = {
        {"the raster", source},
        {"a part", subset(source, rect)},
        {"a part of a part", subset(subset(source, rect), {11, 7, 200, 100})},
        {"every third pixel of every second line", skip(source, 3, 2)},
        {"skips in a part", skip(subset(source, rect), 2, 5)},
        {"a part of skips", subset(skip(source, 4, 3), {5, 6, 40, 41})},
        {"bands", Source(new SpectralSubsetRaster<Pixel>(source, MakeArray<unsigned>({0, 1})))},
        {"a stack", Source(new BandStackRaster<Pixel>(MakeArray<Source>({source, source})))},
        {"an overlap with itself", Source(new OverlapRaster<Pixel, Pixel>(source, source))},
        {"an overlap with a part",
         Source(new OverlapRaster<Pixel, Pixel>(source, subset(source, rect)))},
        {"the overlap of a part",
         Source(new OverlapRaster<Pixel, Pixel>(subset(source, rect), source))},
    };
    for (const auto& v : views) {
      SCOPED_TRACE(testing::Message() << model.name << ", " << v.name);
      ExpectPlaced(source, v.view);
      const ExactLevels exactly(true);
      for (const unsigned number : {1U, 3U}) {
        SCOPED_TRACE(testing::Message() << "level " << number);
        ExpectPlaced(source, v.view->PyramidLevel(number));
      }
    }
    // 301 and 210 pixels at level 6 are 4 and 3; the told form has 75 and 70 times the size.
    const ExactLevels exactly(true);
    ExpectPlaced(source, source->PyramidLevel(6));
  }
}

TEST(Placing, AnOverlapCountsAllThatIsCommon) {
  for (const Model& model : MakeModels()) {
    SCOPED_TRACE(model.name);
    PyramidScene scene;
    scene.Fake().samples = kSamples;
    scene.Fake().lines = kLines;
    scene.Fake().geoRef = CloneOf(model.geoRef);
    scene.Fake().geoRef->SetDimensions(kSamples, kLines);
    const Source source = scene.Open<Pixel>();
    OverlapRaster<Pixel, Pixel> self(source, source);
    EXPECT_EQ(self.Samples(), kSamples);
    EXPECT_EQ(self.Lines(), kLines);
    EXPECT_EQ(self.PixelCount(0, IPC()), std::uint64_t{kSamples} * kLines);
    const Source part(new SpatialSubsetRaster<Pixel>(source, {101, 50, 130, 69}, Form::kExact));
    OverlapRaster<Pixel, Pixel> withPart(source, part);
    EXPECT_EQ(withPart.PixelCount(0, IPC()), 30u * 20);
    EXPECT_EQ(withPart.Min(0, IPC()), 50101);
    EXPECT_EQ(withPart.Max(0, IPC()), 69130);
  }
}

TEST(Placing, TheCommandsTakeItAsAWord) {
  PyramidScene scene;
  scene.Fake().samples = kSamples;
  scene.Fake().lines = kLines;
  scene.Fake().geoRef = MakeGridOf<StdGeoRef>(30, 0, 8, 16);
  scene.Fake().dataType = kDataTypeOf<Pixel>;
  const std::string uri = "[fake://source] ";
  const auto opened =
      RunCommand("OpenRasterCommand",
                 {{"ConnStr", "EXTERNAL|x"}, {"PyramidConnStr", "Pyramid|" + scene.Path()}});
  ASSERT_TRUE(opened.Succeeded()) << opened.reason;
  ASSERT_TRUE(
      RunCommand("BuildRasterPyramidCommand", {{"URI", uri},
                                               {"PyramidType", "ORVA"},
                                               {"PyramidResamplingMethod", "Nearest"},
                                               {"PyramidLevelMin", "1"},
                                               {"PyramidLevelMax", "6"},
                                               {"PyramidCanBuild", "1"},
                                               {"TileDimensions", "16 16 0 0 0 0 0 Invariable"}})
          .Succeeded());
  const auto geoRefOf = [](const std::string& of) {
    return ParseValue<GeoRefPtr>(
        String(RunCommand("GetRasterGeoRefCommand", {{"URI", of}}).outputs.at("GeoRef")));
  };
  const struct {
    const char* placing;
    double size, tie;
  } levels[] = {{"Told", 20 * 75, 8 * 4.0 / 301}, {"Exact", 20 * 64, 8 / 64.0}};
  for (const auto& want : levels) {
    const auto level = RunCommand("GetRasterPyramidCommand",
                                  {{"URI", uri}, {"Level", "6"}, {"Placing", want.placing}});
    ASSERT_TRUE(level.Succeeded()) << level.reason;
    const GeoRefPtr geoRef = geoRefOf(level.outputs.at("PyramidURI"));
    EXPECT_EQ(geoRef->PixelSizeX(), want.size);
    EXPECT_EQ(geoRef->TiePixelX(), want.tie);
    RunCommand("CloseRasterCommand", {{"URI", level.outputs.at("PyramidURI")}});
  }
  for (const auto& [placing, tie] : std::map<std::string, double>{{"Told", 8}, {"Exact", 0}}) {
    const auto part = RunCommand("CreateSpatialSubsetRasterCommand",
                                 {{"SrcURI", uri}, {"SubRect", "8 16 9 17"}, {"Placing", placing}});
    ASSERT_TRUE(part.Succeeded()) << part.reason;
    const GeoRefPtr geoRef = geoRefOf(part.outputs.at("URI"));
    EXPECT_EQ(geoRef->TieMapX(), 500000);
    EXPECT_EQ(geoRef->TiePixelX(), tie);
    RunCommand("CloseRasterCommand", {{"URI", part.outputs.at("URI")}});
  }
  RunCommand("CloseRasterCommand", {{"URI", uri}});
}

/// Bands in lines or tiles, that counts what is read of it.
class CountingRaster final : public TestRaster<Pixel> {
 public:
  CountingRaster(unsigned samples, unsigned lines, unsigned tile)
      : TestRaster(samples, lines, 2), tile_(tile), ramp_(samples, lines, 2) {}
  RasterDef GetRasterDef() const override {
    RasterDef def = TestRaster::GetRasterDef();
    def.tileWidth = def.tileHeight = tile_;
    return def;
  }
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<Pixel>& pixels, Array<unsigned char>& state) override {
    for (unsigned y = rect.top / tile_; y <= rect.bottom / tile_; ++y) {
      tiles += rect.right / tile_ - rect.left / tile_ + 1;
    }
    most = std::max(most, rect.Width() * rect.Height());
    return ramp_.GetSubRect(rect, bands, interleave, pixels, state);
  }
  unsigned tiles = 0;  // decoded
  unsigned most = 0;   // pixels read at once

 private:
  unsigned tile_;
  RampRaster<Pixel> ramp_;
};

TEST(SkipRaster, DecodesEachTileOnce) {
  const struct {
    unsigned samples, lines, tile, skipX, skipY, tiles;
  } cases[] = {
      {700, 500, 64, 3, 2, 11 * 8},     // all tiles
      {700, 500, 1, 1, 7, 71 * 700},    // lines: those shown
      {640, 640, 16, 5, 50, 40 * 12},   // rows of tiles without a line are passed over
      {20000, 600, 512, 2, 3, 40 * 2},  // more than is read at once
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.samples << " by " << c.lines << ", tiles of " << c.tile);
    auto* const counting = new CountingRaster(c.samples, c.lines, c.tile);
    const Source source(counting);
    SkipRaster<Pixel> view(source, c.skipX, c.skipY, true);
    Array<Pixel> pixels;
    Array<unsigned char> state;
    const SubRect all(0, 0, view.Samples() - 1, view.Lines() - 1);
    ASSERT_TRUE(view.GetSubRect(all, MakeArray<unsigned>({1, 0}), Interleave::BSQ, pixels, state));
    EXPECT_EQ(counting->tiles, c.tiles);
    EXPECT_LE(counting->most, 10'000'000u);
    std::size_t at = 0;
    for (const unsigned band : {1U, 0U}) {
      for (unsigned y = 0; y < view.Lines(); ++y)
        for (unsigned x = 0; x < view.Samples(); ++x) {
          ASSERT_EQ(pixels[at++], RampValue<Pixel>(x * c.skipX, y * c.skipY, band));
        }
    }
    // A block without bands is the first of them.
    ASSERT_TRUE(view.GetSubRect({0, 0, 2, 1}, MakeArray<unsigned>({1, 0}), Interleave::None, pixels,
                                state));
    EXPECT_EQ(pixels.GetDims(), ArrayDims(2, 3));
    EXPECT_EQ(pixels[5], RampValue<Pixel>(2 * c.skipX, c.skipY, 1));
  }
}

}  // namespace
}  // namespace lumo::test
