#include <cmath>
#include <fstream>
#include <optional>
#include <tiffio.h>

#include "block_trials.h"

namespace lumo {
namespace {

using test::Model;
using test::Peer;

template <typename T>
const T& Pick(std::mt19937& random, const std::vector<T>& from) {
  return from[random() % from.size()];
}

/// A raster of any options that go together.
RasterDef RandomDef(std::mt19937& random) {
  RasterDef def;
  def.format = "TIFF";
  def.samples = 1 + random() % 150;
  def.lines = 1 + random() % 150;
  def.bands = 1 + random() % 4;
  def.interleave = Pick(random, std::vector{Interleave::BIP, Interleave::BSQ});
  def.dataType = Pick(random, std::vector{1U, 2U, 3U, 4U, 5U, 6U, 9U, 12U, 13U, 99U});
  CreationOptions& wanted = def.creation;
  do {
    wanted = {};
    wanted.compression = static_cast<BlockCompression>(1 + random() % 6);  // those without losses
    wanted.predictor = static_cast<BlockPredictor>(random() % 5);
    wanted.layout = static_cast<FileLayout>(random() % 2);
    wanted.tile = Pick(random, std::vector{0U, 16U, 32U, 64U, 512U});
    wanted.bigTiff = static_cast<BigTiffChoice>(1 + random() % 3);
    if (random() % 3 == 0) wanted.level = 1 + random() % 8;
  } while (!FindCreationMisfit(def).empty() || wanted.LosesValues());
  const bool hasNoData = random() % 2 == 0;
  for (unsigned band = 0; hasNoData && band < def.bands; ++band) def.noData[band] = 101;
  return def;
}

/// Expects what libtiff alone reads of the first image of a file, block by block.
template <typename T>
void ExpectByLibtiff(const std::string& path, Model<T>& model) {
  TIFF* const file = TIFFOpen(path.c_str(), "r");
  ASSERT_NE(file, nullptr);
  std::uint32_t width = 0, height = 0;
  std::uint16_t planar = 1;
  const bool isTiled = TIFFIsTiled(file) != 0;
  if (isTiled) {
    TIFFGetField(file, TIFFTAG_TILEWIDTH, &width);
    TIFFGetField(file, TIFFTAG_TILELENGTH, &height);
  } else {
    width = model.samples;
    TIFFGetFieldDefaulted(file, TIFFTAG_ROWSPERSTRIP, &height);
  }
  TIFFGetFieldDefaulted(file, TIFFTAG_PLANARCONFIG, &planar);
  const bool byPixel = planar == PLANARCONFIG_CONTIG;
  const unsigned depth = byPixel ? model.bands : 1;
  std::vector<T> block(std::size_t{width} * height * depth);
  std::size_t wrong = 0;
  for (unsigned plane = 0; plane < model.bands / depth; ++plane) {
    for (unsigned top = 0; top < model.lines; top += height) {
      for (unsigned left = 0; left < model.samples; left += width) {
        const auto number = isTiled
                                ? TIFFComputeTile(file, left, top, 0, static_cast<uint16_t>(plane))
                                : TIFFComputeStrip(file, top, static_cast<uint16_t>(plane));
        const auto got = isTiled ? TIFFReadEncodedTile(file, number, block.data(), -1)
                                 : TIFFReadEncodedStrip(file, number, block.data(), -1);
        ASSERT_GT(got, 0);
        for (unsigned y = top; y < std::min(top + height, model.lines); ++y) {
          for (unsigned x = left; x < std::min(left + width, model.samples); ++x) {
            for (unsigned i = 0; i < depth; ++i) {
              const T& value = block[(std::size_t{y - top} * width + x - left) * depth + i];
              if (!(value == model.At(x, y, plane + i))) ++wrong;
            }
          }
        }
      }
    }
  }
  EXPECT_EQ(wrong, 0U) << "by libtiff";
  TIFFClose(file);
}

/// Makes the next level by the plain formula, out of doubles.
template <typename T>
Model<T> MeansOf(Model<T>& below, const std::optional<T>& noData) {
  RasterDef def;
  def.samples = (below.samples + 1) / 2;
  def.lines = (below.lines + 1) / 2;
  def.bands = below.bands;
  Model<T> level(def, T{});
  for (unsigned band = 0; band < def.bands; ++band) {
    for (unsigned y = 0; y < def.lines; ++y) {
      for (unsigned x = 0; x < def.samples; ++x) {
        double sum = 0;
        int count = 0;
        for (unsigned row = 2 * y; row < std::min(2 * y + 2, below.lines); ++row) {
          for (unsigned column = 2 * x; column < std::min(2 * x + 2, below.samples); ++column) {
            const T value = below.At(column, row, band);
            if (noData && value == *noData) continue;
            sum += static_cast<double>(value);
            ++count;
          }
        }
        T& mean = level.At(x, y, band);
        if (count == 0) {
          mean = *noData;
        } else if constexpr (std::is_integral_v<T>) {
          mean = static_cast<T>(std::floor(sum / count + 0.5));
        } else {
          mean = static_cast<T>(sum / count);
        }
      }
    }
  }
  return level;
}

template <typename T>
void ExpectLevels(const std::string& path, Model<T>& model, const std::optional<T>& noData) {
  const Peer peer(path);
  Model<T> level = model;
  for (int i = 0; i < GDALGetOverviewCount(peer.Band(0)); ++i) {
    level = MeansOf(level, noData);
    for (unsigned band = 0; band < model.bands; ++band) {
      const auto pixels = Peer::Pixels(peer.Band(band, i));
      ASSERT_EQ(pixels.size(), std::size_t{level.samples} * level.lines);
      std::size_t wrong = 0;
      for (std::size_t k = 0; k < pixels.size(); ++k) {
        const double want = static_cast<double>(level.values[band * pixels.size() + k]);
        if (std::abs(pixels[k].real() - want) > 1e-5 * std::abs(want)) ++wrong;
      }
      EXPECT_EQ(wrong, 0U) << "level " << i + 1 << " band " << band;
    }
  }
}

TEST(PackedPixels, AreWhatWasWrittenWithAnyOptions) {
  for (unsigned seed = 0; seed < 120; ++seed) {
    std::mt19937 random(seed);
    const RasterDef def = RandomDef(random);
    const CreationOptions& wanted = def.creation;
    SCOPED_TRACE(testing::Message()
                 << "seed " << seed << ": " << def.samples << " x " << def.lines << " x "
                 << def.bands << " type " << def.dataType << " "
                 << FormatValue(wanted.compression).ToUTF8() << " predictor "
                 << FormatValue(wanted.predictor).ToUTF8() << " "
                 << FormatValue(wanted.layout).ToUTF8() << " tile " << *wanted.tile
                 << (def.interleave == Interleave::BIP ? " BIP" : " BSQ"));
    const test::Trial trial{static_cast<int>(random() % 5), seed, random() % 2 == 0};
    DispatchType(TwelveTypes{}, def.dataType, [&]<typename T>() {
      std::optional<T> noData;
      T fill{};
      if (!def.noData.empty()) {
        if constexpr (std::is_arithmetic_v<T>)
          fill = T{101};
        else
          fill.real = 101;
        noData = fill;
      }
      test::TryBlocks<T>(def, fill, trial, [&](const std::string& path, Model<T>& model) {
        ExpectByLibtiff(path, model);
        if constexpr (std::is_arithmetic_v<T>) {
          if (wanted.layout == FileLayout::kCog) ExpectLevels(path, model, noData);
        }
      });
      return true;
    });
    if (HasFailure()) return;
  }
}

/// Writes noise of which some runs of pixels aren't valid, in one band or in all.
/// @return a byte for each pixel, 255 where it is valid.
template <typename T>
std::vector<double> WriteWithHoles(const RasterDataConnectionPtr& made, const RasterDef& def,
                                   std::mt19937& random) {
  std::vector<double> valid(std::size_t{def.samples} * def.lines, 255);
  test::Block<T> block{{0, 0, def.samples - 1, def.lines - 1}, {}, {}, {}};
  for (unsigned band = 0; band < def.bands; ++band) block.bands.push_back(band);
  block.pixels.resize(valid.size() * def.bands);
  for (T& pixel : block.pixels) pixel = static_cast<T>(random() % 100);  // no-data is 101
  block.state.resize(block.pixels.size());
  const unsigned onlyBand = random() % 2 == 0 ? random() % def.bands : def.bands;
  std::size_t at = 0;
  std::vector<bool> holes(valid.size());
  for (std::size_t i = 1; i < holes.size(); ++i) holes[i] = holes[i - 1] != (random() % 20 == 0);
  test::VisitBlock(test::ReaderOf<T>(made)->RasterDef().interleave, block.rect, block.bands,
                   [&](unsigned x, unsigned y, unsigned band) {
                     const std::size_t pixel = std::size_t{y} * def.samples + x;
                     const bool isHole =
                         holes[pixel] && (onlyBand == def.bands || onlyBand == band);
                     block.state[at++] = isHole ? PixelValueState::Masked : 0;
                     if (isHole) valid[pixel] = 0;
                   });
  EXPECT_TRUE(block.Write(*test::ReaderOf<T>(made))) << TakeFault().ToUTF8();
  return valid;
}

TEST(PackedPixels, TheMaskSaysWhatWasNotValidWithAnyOptions) {
  const test::TemporaryDirectory directory;
  for (unsigned seed = 0; seed < 60; ++seed) {
    std::mt19937 random(seed);
    RasterDef def = RandomDef(random);
    if (seed % 4 == 0) def.creation.compression = BlockCompression::kNone;
    const bool isPlain = def.creation.compression == BlockCompression::kNone;
    if (isPlain) def.creation = {}, def.tileWidth = def.tileHeight = 16 * (1 + random() % 4);
    const std::string path = (directory.Path() / ("m" + std::to_string(seed) + ".tif")).string();
    SCOPED_TRACE(path);
    DispatchType(EightTypes{}, def.dataType, [&]<typename T>() {
      auto made = test::CreateSource({path}, def);
      EXPECT_TRUE(made) << TakeFault().ToUTF8();
      if (!made) return false;
      const std::vector<double> valid = WriteWithHoles<T>(made, def, random);
      EXPECT_EQ(test::Release(made), "");
      const Peer peer(path);
      const auto mask = Peer::Pixels(GDALGetMaskBand(peer.Band(0)));
      EXPECT_TRUE(std::equal(mask.begin(), mask.end(), valid.begin(), valid.end(),
                             [](const auto& a, double b) { return a.real() == b; }));
      return true;
    });
  }
}

TEST(PackedPixels, OptionsThatDontFitAreRefusedBeforeAnythingIsMade) {
  const struct {
    const char* name;
    unsigned dataType;
    unsigned bands;
    std::map<std::string, std::string> texts;
    const char* format;
    const char* want;
  } cases[] = {
      {"predictor 3 of whole numbers",
       12,
       1,
       {{"Compress", "ZSTD"}, {"Predictor", "3"}},
       "TIFF",
       "predictor 3 is for floating-point numbers"},
      {"JPEG of 16 bits", 12, 1, {{"Compress", "JPEG"}}, "TIFF", "JPEG packs one or three bands"},
      {"JPEG of two bands", 1, 2, {{"Compress", "JPEG"}}, "TIFF", "JPEG packs one or three bands"},
      {"WebP of one band", 1, 1, {{"Compress", "WebP"}}, "TIFF", "WebP packs three or four bands"},
      {"a level alone", 1, 1, {{"Level", "5"}}, "TIFF", "a level belongs to"},
      {"a level of LZW", 1, 1, {{"Compress", "LZW"}, {"Level", "5"}}, "TIFF", "has no levels"},
      {"a level too high",
       1,
       1,
       {{"Compress", "DEFLATE"}, {"Level", "13"}},
       "TIFF",
       "levels from 1 to 12"},
      {"a predictor alone", 1, 1, {{"Predictor", "2"}}, "TIFF", "a predictor belongs to"},
      {"a predictor of LZMA",
       1,
       1,
       {{"Compress", "LZMA"}, {"Predictor", "2"}},
       "TIFF",
       "takes no predictor"},
      {"strips of a COG", 1, 1, {{"Layout", "COG"}, {"Tile", "strip"}}, "TIFF", "has tiles"},
      {"levels of another file",
       1,
       1,
       {{"Overviews", "Mode"}},
       "TIFF",
       "cloud-optimised file alone"},
      {"another format", 1, 1, {{"Compress", "ZSTD"}}, "ORVA", "the format is ORVA"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    RasterDef def;
    def.format = c.format;
    def.dataType = c.dataType;
    def.samples = def.lines = 8;
    def.bands = c.bands;
    def.interleave = Interleave::BIP;
    std::string fault;
    const auto textOf = [&](const char* input) {
      return c.texts.count(input) != 0 ? c.texts.at(input) : std::string();
    };
    ASSERT_TRUE(ReadCreationOptions(textOf, def.creation, fault)) << fault;
    EXPECT_THAT(FindCreationMisfit(def), testing::HasSubstr(c.want));
    if (def.format != "TIFF") continue;
    const test::TemporaryDirectory directory;
    EXPECT_FALSE(test::CreateSource({(directory.Path() / "made.tif").string()}, def));
    EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr(c.want));
    EXPECT_TRUE(std::filesystem::is_empty(directory.Path()));
  }
}

}  // namespace
}  // namespace lumo
