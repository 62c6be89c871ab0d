#include <cmath>
#include <filesystem>
#include <map>
#include <random>

#include "commands/catalog.h"
#include "fx/attribute_columns.h"
#include "fx/region_kinds.h"
#include "raster/pixel_value.h"
#include "support/file_bytes.h"
#include "support/run_command.h"
#include "support/temporary_directory.h"
#include "support/test_rasters.h"
#include "tasks/parallel.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::FileBytes;
using test::RunCommand;

/// Pixels and states in memory, stored in blocks of any height.
template <typename T>
class PixelRaster final : public TestRaster<T> {
 public:
  PixelRaster(unsigned samples, unsigned lines, unsigned bands)
      : TestRaster<T>(samples, lines, bands),
        pixels(std::size_t{samples} * lines * bands),
        states(pixels.size()) {}

  std::size_t At(unsigned x, unsigned y, unsigned band) const {
    return (std::size_t{y} * this->Samples() + x) * this->Bands() + band;
  }
  lumo::TileDimensions TileDimensions() const override { return {64, blockHeight}; }
  bool CanWrite() const override { return true; }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& block, Array<unsigned char>& state) override {
    const auto width = static_cast<unsigned>(rect.Width());
    const auto height = static_cast<unsigned>(rect.Height());
    const ArrayDims dims = BlockDims(interleave, width, height, bands.GetCount());
    if (isBroken || !block.Resize(dims) || !state.Resize(dims)) return false;
    std::vector<T> bip;
    std::vector<unsigned char> bipStates;
    for (unsigned y = rect.top; y <= rect.bottom; ++y) {
      for (unsigned x = rect.left; x <= rect.right; ++x) {
        for (const unsigned band : bands) {
          bip.push_back(pixels[At(x, y, band)]);
          bipStates.push_back(states[At(x, y, band)]);
        }
      }
    }
    return ConvertInterleave(bip.data(), Interleave::BIP, block.GetData(), interleave, width,
                             height, bands.GetCount(), sizeof(T)) &&
           ConvertInterleave(bipStates.data(), Interleave::BIP, state.GetData(), interleave, width,
                             height, bands.GetCount(), 1);
  }

  bool PutSubRect(const SubRect& rect, const Array<unsigned>& /*bands*/, Interleave /*interleave*/,
                  Array<T>& block, Array<unsigned char>& /*state*/) override {
    const T* from = block.GetData();
    for (unsigned y = rect.top; y <= rect.bottom; ++y) {
      const std::size_t count = std::size_t{rect.Width()} * this->Bands();
      std::copy_n(from, count, &pixels[At(rect.left, y, 0)]);
      from += count;
    }
    return true;
  }

  std::vector<T> pixels;  // pixel-interleaved
  std::vector<unsigned char> states;
  unsigned blockHeight = 1;
  bool isBroken = false;
};

template <typename T>
using PixelRasterPtr = Pointer<PixelRaster<T>>;

template <typename T>
PixelRasterPtr<T> MakeRaster(unsigned samples, unsigned lines, unsigned bands) {
  const PixelRasterPtr<T> raster(new PixelRaster<T>(samples, lines, bands));
  catalog::Add(raster);
  return raster;
}

std::string UriOf(const Object& object) {
  return "[" + object.GetURI().ToUTF8() + "] ";
}

/// An image with pixels that do not count in all ways, and labels of patches, some far apart.
template <typename T, typename L>
struct Scene {
  Scene(unsigned width, unsigned height, unsigned bands, double most, unsigned seed)
      : image(MakeRaster<T>(width, height, bands)), labels(MakeRaster<L>(width, height, 1)) {
    std::mt19937 random(seed);
    std::uniform_real_distribution<double> value(std::is_signed_v<T> ? -most : 0, most);
    for (T& pixel : image->pixels) pixel = static_cast<T>(value(random));
    for (unsigned y = 0; y < height; ++y) {
      for (unsigned x = 0; x < width; ++x) {
        const unsigned patch = (y + random() % 2) / 7 * 9 + (x + random() % 3) / 8;
        labels->pixels[labels->At(x, y, 0)] = static_cast<L>(patch % 5 == 4 ? patch * 499 : patch);
        if (random() % 23 == 0) labels->states[labels->At(x, y, 0)] = 1;
        const unsigned kind = random() % 16;
        for (unsigned band = 0; band < bands; ++band) {
          unsigned char& state = image->states[image->At(x, y, band)];
          if (kind == 0) state = PixelValueState::Masked;                   // in all
          if (kind == 1 && band == 1) state = PixelValueState::Masked;      // in one
          if (kind == 2 && band == 0) state = PixelValueState::NoData;      // in one
          if (kind == 3 && band == 2) state = PixelValueState::OutsideROI;  // in one
        }
      }
    }
  }

  PixelRasterPtr<T> image;
  PixelRasterPtr<L> labels;
};

/// The values of a region in a band, as the formulas have them, pixel by pixel.
struct SlowValues {
  std::vector<double> pixels;
  double texture[5] = {};  // sums of range, mean, variance, entropy, entropy over n

  double Mean() const {
    double sum = 0;
    for (const double pixel : pixels) sum += pixel;
    return sum / static_cast<double>(pixels.size());
  }
  double Deviation() const {
    double sum = 0;
    for (const double pixel : pixels) sum += (pixel - Mean()) * (pixel - Mean());
    return std::sqrt(sum / static_cast<double>(pixels.size()));
  }
  double Texture(unsigned i) const { return texture[i] / static_cast<double>(pixels.size()); }
};

template <typename T>
void AddSlowWindow(const PixelRaster<T>& image, int x, int y, unsigned band, int reach,
                   SlowValues& to) {
  std::vector<double> values;
  const auto middle = static_cast<double>(
      image.pixels[image.At(static_cast<unsigned>(x), static_cast<unsigned>(y), band)]);
  double min = middle, max = middle, sum = 0;
  for (int v = y - reach; v <= y + reach; ++v) {
    for (int u = x - reach; u <= x + reach; ++u) {
      if (u < 0 || v < 0 || u >= static_cast<int>(image.Samples()) ||
          v >= static_cast<int>(image.Lines())) {
        continue;
      }
      const std::size_t at = image.At(static_cast<unsigned>(u), static_cast<unsigned>(v), band);
      if (image.states[at] != 0) continue;
      values.push_back(static_cast<double>(image.pixels[at]));
      sum += values.back();
      min = std::min(min, values.back());
      max = std::max(max, values.back());
    }
  }
  const auto n = static_cast<double>(values.size());
  if (values.empty()) return;
  double squares = 0;
  double bins[3] = {};
  for (const double value : values) {
    squares += (value - sum / n) * (value - sum / n);
    if (max > min) ++bins[static_cast<int>((value - min) / ((max - min) / 2))];
  }
  to.texture[0] += max - min;
  to.texture[1] += sum / n;
  if (values.size() > 1) to.texture[2] += squares / (n - 1);
  if (!(max > min)) return;
  for (const double bin : bins) {
    if (bin == 0) continue;
    to.texture[3] -= bin / 3 * std::log(bin / 3);
    to.texture[4] -= bin / n * std::log(bin / n);
  }
}

template <typename T, typename L>
std::map<std::pair<std::uint32_t, unsigned>, SlowValues> SlowRegions(const Scene<T, L>& scene,
                                                                     int reach) {
  std::map<std::pair<std::uint32_t, unsigned>, SlowValues> regions;
  const PixelRaster<T>& image = *scene.image;
  for (unsigned y = 0; y < image.Lines(); ++y) {
    for (unsigned x = 0; x < image.Samples(); ++x) {
      unsigned char any = 0, all = 7;
      for (unsigned band = 0; band < image.Bands(); ++band) {
        any |= image.states[image.At(x, y, band)];
        all &= image.states[image.At(x, y, band)];
      }
      const std::size_t at = scene.labels->At(x, y, 0);
      if (scene.labels->states[at] != 0 || (any & 5) != 0 || (all & 2) != 0) continue;
      for (unsigned band = 0; band < image.Bands(); ++band) {
        SlowValues& to = regions[{static_cast<std::uint32_t>(scene.labels->pixels[at]), band}];
        to.pixels.push_back(static_cast<double>(image.pixels[image.At(x, y, band)]));
        AddSlowWindow(image, static_cast<int>(x), static_cast<int>(y), band, reach, to);
      }
    }
  }
  return regions;
}

class RegionValues : public testing::Test {
 protected:
  std::string File(const char* name) const { return (directory_.Path() / name).string(); }

  template <typename T, typename L>
  test::CommandOutcome Compute(const Scene<T, L>& scene, const std::string& sums, int kernel) {
    std::map<std::string, std::string> inputs{{"SrcURI", UriOf(*scene.image)},
                                              {"LabelURI", UriOf(*scene.labels)},
                                              {"SpectralFXA", File("spectral")},
                                              {"TextureFXA", File("texture")},
                                              {"MeansFXA", File("means")},
                                              {"Values", "spectral|texture|means"},
                                              {"TextureKernelSize", std::to_string(kernel)},
                                              {"Sums", sums}};
    if (sums == "Exact") inputs["EntropyFXA"] = File("entropy");
    return RunCommand("FxComputePixelAttributesCommand", inputs);
  }

  template <typename T, typename L>
  void ExpectFormulas(const Scene<T, L>& scene, const std::string& sums, int kernel,
                      double tolerance) {
    const auto outcome = Compute(scene, sums, kernel);
    ASSERT_TRUE(outcome.Succeeded()) << outcome.reason;
    const SpectralRegionAttributesFile spectral(URI(File("spectral")), false);
    const TextureRegionAttributesFile texture(URI(File("texture")), false);
    const RegionMeansFile means(URI(File("means")), false);
    ASSERT_TRUE(spectral.IsValid() && texture.IsValid() && means.IsValid());
    const auto near = [&](double got, double want) {
      return std::abs(got - want) <= tolerance * std::max(1.0, std::abs(want));
    };
    std::size_t count = 0;
    for (const auto& [key, want] : SlowRegions(scene, kernel / 2)) {
      const auto [label, band] = key;
      const auto n = static_cast<double>(want.pixels.size());
      const auto [min, max] = std::minmax_element(want.pixels.begin(), want.pixels.end());
      const double values[] = {want.Mean(), want.Deviation(), *min, *max, n};
      for (unsigned i = 0; i < 5; ++i) {
        const double got = spectral.Value(label, band, i);
        EXPECT_TRUE(near(got, values[i])) << label << " " << i << ": " << got << " " << values[i];
        const double figure = texture.Value(label, band, i), mean = i < 4 ? want.Texture(i) : n;
        EXPECT_TRUE(near(figure, mean)) << label << " " << i << ": " << figure << " " << mean;
      }
      EXPECT_TRUE(near(means.Value(label, band, 0), values[0]));
      EXPECT_EQ(means.Value(label, band, 1), n);
      ++count;
      if (sums != "Exact") continue;
      const RegionMeansFile entropy(URI(File("entropy")), false);
      EXPECT_TRUE(near(entropy.Value(label, band, 0), want.Texture(4)));
    }
    EXPECT_GT(count, 40U);
  }

  test::TemporaryDirectory directory_;
};

TEST_F(RegionValues, AreThoseOfTheFormulas) {
  ExpectFormulas(Scene<std::uint8_t, std::int32_t>(61, 45, 6, 255, 1), "Exact", 4, 1e-6);
  ExpectFormulas(Scene<std::int8_t, std::uint32_t>(61, 45, 5, 127, 2), "Exact", 3, 1e-6);
  ExpectFormulas(Scene<std::uint16_t, std::int32_t>(61, 45, 4, 65535, 3), "Exact", 5, 1e-6);
  ExpectFormulas(Scene<std::int16_t, std::int32_t>(61, 45, 1, 32767, 4), "Exact", 9, 1e-6);
  ExpectFormulas(Scene<std::uint32_t, std::int32_t>(61, 45, 3, 4294967295.0, 5), "Exact", 3, 1e-6);
  ExpectFormulas(Scene<std::int32_t, std::uint32_t>(61, 45, 3, 2147483647.0, 6), "Exact", 7, 1e-6);
  ExpectFormulas(Scene<float, std::int32_t>(61, 45, 3, 1, 7), "Exact", 5, 1e-6);
  ExpectFormulas(Scene<double, std::int32_t>(61, 45, 3, 1e5, 8), "Exact", 0, 1e-6);
}

TEST_F(RegionValues, AsToldDifferInRoundingAlone) {
  ExpectFormulas(Scene<std::uint8_t, std::int32_t>(61, 45, 3, 20, 1), "Told", 4, 1e-4);
  ExpectFormulas(Scene<float, std::uint32_t>(61, 45, 3, 1, 7), "Told", 3, 1e-3);
}

TEST_F(RegionValues, HaveTheSameBitsForAnyBlocksAndThreads) {
  // Wide lines, so that there are several tiles.
  const Scene<double, std::int32_t> scene(3001, 130, 2, 1e3, 9);
  std::mt19937 random(10);
  for (double& pixel : scene.image->pixels)
    pixel = std::ldexp(pixel, static_cast<int>(random() % 40));
  std::vector<std::string> first;
  const struct {
    unsigned blockHeight, labelBlockHeight, threads;
  } cases[] = {{1, 1, 1}, {32, 128, 2}, {57, 1, 5}, {128, 128, 3}};
  for (const auto& [blockHeight, labelBlockHeight, threads] : cases) {
    const ThreadLimit limit(threads);
    scene.image->blockHeight = blockHeight;
    scene.labels->blockHeight = labelBlockHeight;
    const auto outcome = Compute(scene, "Exact", 5);
    ASSERT_TRUE(outcome.Succeeded()) << outcome.reason;
    std::vector<std::string> bytes;
    for (const char* const name : {"spectral", "texture", "means", "entropy"}) {
      bytes.push_back(FileBytes(File(name)));
    }
    if (first.empty()) first = bytes;
    EXPECT_EQ(bytes, first) << blockHeight << " lines, " << threads << " threads";
  }
}

TEST_F(RegionValues, OfMillionsOfPixelsAreExact) {
  const PixelRasterPtr<std::uint16_t> image = MakeRaster<std::uint16_t>(4096, 4100, 1);
  const PixelRasterPtr<std::uint32_t> labels = MakeRaster<std::uint32_t>(4096, 4100, 1);
  for (std::size_t i = 0; i < image->pixels.size(); ++i) {
    image->pixels[i] = static_cast<std::uint16_t>(i % 2 == 0 ? 10000 - 588 : 10000 + 588);
  }
  const auto outcome = RunCommand("FxComputePixelAttributesCommand", {{"SrcURI", UriOf(*image)},
                                                                      {"LabelURI", UriOf(*labels)},
                                                                      {"Values", "spectral"},
                                                                      {"SpectralFXA", File("s")},
                                                                      {"Sums", "Exact"}});
  ASSERT_TRUE(outcome.Succeeded()) << outcome.reason;
  const SpectralRegionAttributesFile file(URI(File("s")), false);
  const float want[] = {10000, 588, 9412, 10588, 4096.0F * 4100};
  for (unsigned i = 0; i < 5; ++i) EXPECT_EQ(file.Value(0, 0, i), want[i]) << i;
}

TEST_F(RegionValues, LeaveOutWhatIsNotFiniteWhenSumsAreExact) {
  Scene<float, std::int32_t> scene(8, 8, 1, 1, 11);
  std::fill(scene.labels->pixels.begin(), scene.labels->pixels.end(), 3);
  std::fill(scene.labels->states.begin(), scene.labels->states.end(), 0);
  std::fill(scene.image->states.begin(), scene.image->states.end(), 0);
  std::fill(scene.image->pixels.begin(), scene.image->pixels.end(), 2.0F);
  scene.image->pixels[0] = NAN;
  scene.image->pixels[9] = INFINITY;
  const auto outcome = Compute(scene, "Exact", 3);
  ASSERT_TRUE(outcome.Succeeded()) << outcome.reason;
  const SpectralRegionAttributesFile spectral(URI(File("spectral")), false);
  const TextureRegionAttributesFile texture(URI(File("texture")), false);
  const float wantSpectral[] = {2, 0, 2, 2, 62}, wantTexture[] = {0, 2, 0, 0, 62};
  for (unsigned i = 0; i < 5; ++i) {
    EXPECT_EQ(spectral.Value(3, 0, i), wantSpectral[i]) << i;
    EXPECT_EQ(texture.Value(3, 0, i), wantTexture[i]) << i;
  }
}

TEST_F(RegionValues, AreShownByTheRasterOfMeans) {
  const Scene<std::uint16_t, std::int32_t> scene(61, 45, 3, 999, 12);
  const PixelRasterPtr<float> shown = MakeRaster<float>(61, 45, 3);
  for (const char* const sums : {"Told", "Exact"}) {
    std::fill(shown->pixels.begin(), shown->pixels.end(), -1.0F);
    const auto outcome =
        RunCommand("FxComputeRegionMeansRasterCommand", {{"SrcURI", UriOf(*scene.image)},
                                                         {"LabelURI", UriOf(*scene.labels)},
                                                         {"MeansFXA", File("means")},
                                                         {"MeansURI", UriOf(*shown)},
                                                         {"Sums", sums}});
    ASSERT_TRUE(outcome.Succeeded()) << outcome.reason;
    const auto regions = SlowRegions(scene, 0);
    for (unsigned y = 0; y < 45; ++y) {
      for (unsigned x = 0; x < 61; ++x) {
        const std::size_t at = scene.labels->At(x, y, 0);
        const auto label = static_cast<std::uint32_t>(scene.labels->pixels[at]);
        for (unsigned band = 0; band < 3; ++band) {
          const auto region = regions.find({label, band});
          const bool isShown =
              label != 0 && scene.labels->states[at] == 0 && region != regions.end();
          EXPECT_NEAR(shown->pixels[shown->At(x, y, band)], isShown ? region->second.Mean() : 0,
                      1e-3);
        }
      }
    }
  }
}

TEST_F(RegionValues, EndInOneLineForBadInput) {
  const Scene<std::uint8_t, std::int32_t> scene(20, 20, 2, 255, 13);
  const PixelRasterPtr<std::int32_t> small = MakeRaster<std::int32_t>(20, 19, 1);
  const PixelRasterPtr<std::int32_t> negative = MakeRaster<std::int32_t>(20, 20, 1);
  negative->pixels[123] = -7;
  const PixelRasterPtr<float> real = MakeRaster<float>(20, 20, 1);
  const PixelRasterPtr<std::int32_t> broken = MakeRaster<std::int32_t>(20, 20, 1);
  broken->isBroken = true;
  const struct {
    std::map<std::string, std::string> changes;  // an empty text takes an input away
    const char* want;
  } cases[] = {{{{"LabelURI", UriOf(*small)}}, "20 x 19"},
               {{{"LabelURI", UriOf(*negative)}}, "label -7 in line 6"},
               {{{"LabelURI", UriOf(*real)}}, "whole numbers"},
               {{{"LabelURI", UriOf(*broken)}}, ""},
               {{{"TextureKernelSize", "-1"}}, "window of -1"},
               {{{"SpectralFXA", UriOf(*scene.image).substr(1, scene.image->GetURI().GetLength())}},
                "SrcURI too"},
               {{{"TextureKernelSize", ""}}, "TextureKernelSize"},
               {{{"SpectralFXA", ""}}, "SpectralFXA"},
               {{{"TextureFXA", File("spectral")}}, "SpectralFXA too"},
               {{{"SpectralFXA", File("nowhere/spectral")}}, "nowhere"},
               {{{"Values", "spectrum"}}, "spectrum"},
               {{{"EntropyFXA", File("e")}, {"Sums", "Told"}}, "EntropyFXA"}};
  for (const auto& c : cases) {
    for (const char* const sums : {"Told", "Exact"}) {
      std::map<std::string, std::string> inputs{
          {"SrcURI", UriOf(*scene.image)},   {"LabelURI", UriOf(*scene.labels)},
          {"SpectralFXA", File("spectral")}, {"TextureFXA", File("texture")},
          {"TextureKernelSize", "3"},        {"Sums", sums}};
      for (const auto& [name, text] : c.changes) {
        if (text.empty()) {
          inputs.erase(name);
        } else {
          inputs[name] = text;
        }
      }
      const auto outcome = RunCommand("FxComputePixelAttributesCommand", inputs);
      EXPECT_FALSE(outcome.Succeeded());
      EXPECT_NE(outcome.reason.find(c.want), std::string::npos) << outcome.reason;
      EXPECT_FALSE(fs::exists(File("spectral")) || fs::exists(File("texture"))) << c.want;
    }
  }
}

class AttributeStatistics : public RegionValues {};

TEST_F(AttributeStatistics, CountTheRegionsThatAreThere) {
  // Attribute 0 has 1, 2, 4 and what is not finite; 1 is 7 everywhere; 2 says that they are there.
  {
    RegionAttributesFile<float> file(URI(File("a")), 1, 3);
    const float values[] = {1, 99, 2, 4};
    for (unsigned region = 0; region < 4; ++region) {
      file.Value(region, 0, 0) = values[region];
      file.Value(region, 0, 1) = 7;
      file.Value(region, 0, 2) = region == 1 ? 0 : 1;
    }
    ASSERT_TRUE(file.Close());
  }
  ASSERT_TRUE(RunCommand("FxComputeAttributesStatsCommand",
                         {{"AttributeFXA", File("a")}, {"StatsFXAS", File("s")}})
                  .Succeeded());
  ASSERT_TRUE(RunCommand("FxComputeAttributesHistogramCommand", {{"AttributeFXA", File("a")},
                                                                 {"StatsFXAS", File("s")},
                                                                 {"HistogramFXAH", File("h")}})
                  .Succeeded());
  const std::string stats = FileBytes(File("s")).substr(1024);
  float got[15];
  ASSERT_EQ(stats.size(), sizeof got);
  std::memcpy(got, stats.data(), sizeof got);
  const auto deviation = static_cast<float>(std::sqrt(7.0 / 3));
  const float want[] = {7 / 3.0F, deviation, 1, 4, 3, 7, 0, 7, 7, 3, 1, 0, 1, 1, 3};
  for (unsigned i = 0; i < 15; ++i) EXPECT_FLOAT_EQ(got[i], want[i]) << i;
  std::vector<std::uint32_t> counts(3 * 256);
  const std::string bins = FileBytes(File("h")).substr(65536);
  ASSERT_EQ(bins.size(), counts.size() * sizeof(std::uint32_t));
  std::memcpy(counts.data(), bins.data(), bins.size());
  std::vector<std::uint32_t> wanted(3 * 256);
  wanted[0] = wanted[85] = wanted[255] = 1;  // 1, 2 and 4 of 1 to 4, in steps of 3 / 255
  wanted[256] = wanted[512] = 3;             // without a deviation
  EXPECT_EQ(counts, wanted);
}

TEST_F(AttributeStatistics, AreOfWholeFilesOfRegions) {
  std::ofstream(File("foreign")) << std::string(2000, 'x');
  {
    RegionAttributesFile<float> file(URI(File("a")), 2, 3);
    file.Value(0, 0, 2) = 1;
    file.Value(1, 1, 2) = 1;
    ASSERT_TRUE(file.Close());
    RegionAttributesFile<float> few(URI(File("few")), 1, 3);
    few.Value(0, 0, 2) = 1;
    ASSERT_TRUE(few.Close());
  }
  for (const char* const file : {"foreign", "missing"}) {
    const auto outcome = RunCommand("FxComputeAttributesStatsCommand",
                                    {{"AttributeFXA", File(file)}, {"StatsFXAS", File("s")}});
    EXPECT_NE(outcome.reason.find(file), std::string::npos) << outcome.reason;
    EXPECT_FALSE(fs::exists(File("s")) || fs::exists(File("missing")));
  }
  ASSERT_TRUE(RunCommand("FxComputeAttributesStatsCommand",
                         {{"AttributeFXA", File("few")}, {"StatsFXAS", File("s")}})
                  .Succeeded());
  const auto outcome = RunCommand(
      "FxComputeAttributesHistogramCommand",
      {{"AttributeFXA", File("a")}, {"StatsFXAS", File("s")}, {"HistogramFXAH", File("h")}});
  EXPECT_NE(outcome.reason.find("fewer bands"), std::string::npos) << outcome.reason;
  EXPECT_FALSE(fs::exists(File("h")));
  // Columns are read by many at once.
  const AttributeColumns columns(URI(File("a")));
  ASSERT_TRUE(columns.IsValid());
  EXPECT_EQ(columns.Records(), 2U);
  ParallelFor(64, nullptr, [&](unsigned i) {
    std::vector<float> values;
    EXPECT_TRUE(columns.Read(i % 2, 2, values));
    EXPECT_EQ(values, i % 2 == 0 ? std::vector<float>({1, 0}) : std::vector<float>({0, 1}));
  });
  std::vector<float> none;
  EXPECT_FALSE(columns.Read(2, 0, none) || columns.Read(0, 3, none));
  EXPECT_FALSE(AttributeColumns(URI(File("foreign"))).IsValid());
  // A file that ends within a record is cut short.
  fs::resize_file(File("a"), fs::file_size(File("a")) - 4);
  EXPECT_NE(RunCommand("QueryAttributesCommand", {{"AttributeFXA", File("a")}})
                .reason.find("within a record"),
            std::string::npos);
  EXPECT_FALSE(AttributeColumns(URI(File("a"))).IsValid());
}

}  // namespace
}  // namespace lumo
