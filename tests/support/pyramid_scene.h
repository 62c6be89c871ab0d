#pragma once

#include <filesystem>

#include "raster/raster_def.h"
#include "support/fake_source.h"
#include "support/raster_sources.h"
#include "support/temporary_directory.h"
#include "views/sources/catalog_raster_ref.h"

namespace lumo::test {

/// A ramp out of a fake plug-in, and a path for its pyramid.
class PyramidScene {
 public:
  FakeBehaviour& Fake() { return format_.fake; }
  std::string Path() const { return (directory_.Path() / "ramp.pyr").string(); }
  std::filesystem::path Directory() const { return directory_.Path(); }

  /// Opens the ramp with its pyramid file, which need not be there yet.
  template <typename T>
  RasterPtr<T> Open() {
    Fake().dataType = kDataTypeOf<T>;
    const DataConnectionPtr source(OpenSource({"EXTERNAL", "x"}));
    if (!source) return {};
    RasterDef def = RasterDataConnectionPtr(source)->RasterDef();
    def.format = "Pyramid";
    const std::vector<std::string> names{"Pyramid", Path()};
    const DataConnectionPtr pyramid(std::filesystem::exists(Path()) ? OpenSource(names)
                                                                    : CreateSource(names, def));
    return RasterPtr<T>(MakeReaderRaster(source, pyramid));
  }

  /// Builds the pyramid to its end.
  static AsyncPtr Build(BasicRaster& raster, unsigned levelMin, unsigned levelMax, unsigned side,
                        const AsyncCallbackPtr& callback = {}) {
    PyramidDef def;
    def.levelMin = levelMin;
    def.levelMax = levelMax;
    def.resamplingMethod = PyramidResamplingMethod::kNearest;
    const AsyncPtr build = raster.PyramidBuild(def, TileDimensions{side, side}, callback);
    if (build) build->WaitFinished();
    return build;
  }

  /// How many files lie in the directory.
  std::size_t CountFiles() const {
    return static_cast<std::size_t>(
        std::distance(std::filesystem::directory_iterator(directory_.Path()),
                      std::filesystem::directory_iterator()));
  }

 private:
  TemporaryDirectory directory_;
  FakeFormat format_{"EXTERNAL"};
};

/// Reads a level and compares each pixel with the one of the ramp that it is to be a copy of.
/// @param masked  which pixels of the ramp are, by sample and line.
template <typename T, typename Masked>
void ExpectLevelOfRamp(Raster<T>& raster, unsigned number, const Masked& masked) {
  const RasterPtr<T> level = raster.PyramidLevel(number);
  ASSERT_TRUE(level) << number;
  ASSERT_EQ(level->Samples(), raster.Samples() >> number);
  ASSERT_EQ(level->Lines(), raster.Lines() >> number);
  if (level->Samples() == 0 || level->Lines() == 0) return;
  Array<unsigned> bands{ArrayDims(raster.Bands())};
  for (unsigned i = 0; i < bands.GetCount(); ++i) bands[i] = i;
  Array<T> pixels;
  Array<unsigned char> state;
  ASSERT_TRUE(level->GetSubRect({0, 0, level->Samples() - 1, level->Lines() - 1}, bands,
                                Interleave::BIP, pixels, state))
      << number << TakeFault().ToUTF8();
  std::size_t at = 0;
  for (unsigned y = 0; y < level->Lines(); ++y)
    for (unsigned x = 0; x < level->Samples(); ++x)
      for (unsigned band = 0; band < raster.Bands(); ++band, ++at) {
        ASSERT_EQ(pixels[at], RampValue<T>(x << number, y << number, band))
            << "level " << number << " at " << x << ' ' << y << " band " << band;
        ASSERT_EQ(state[at], masked(x << number, y << number) ? 2 : 0) << number << ' ' << at;
      }
}

template <typename T>
void ExpectLevelOfRamp(Raster<T>& raster, unsigned number) {
  ExpectLevelOfRamp(raster, number, [](unsigned, unsigned) { return false; });
}

}  // namespace lumo::test
