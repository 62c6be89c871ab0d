#pragma once

#include <filesystem>
#include <functional>
#include <random>

#include "gdal_peer.h"
#include "support/temporary_directory.h"

namespace lumo::test {

/// The raster that a file should hold, element by element in the order of bands, lines, samples.
template <typename T>
struct Model {
  Model(const RasterDef& def, T fill)
      : samples(def.samples),
        lines(def.lines),
        bands(def.bands),
        values(std::size_t{def.samples} * def.lines * def.bands, fill) {}
  T& At(unsigned x, unsigned y, unsigned band) {
    return values[(std::size_t{band} * lines + y) * samples + x];
  }
  unsigned samples, lines, bands;
  std::vector<T> values;
};

inline SubRect RandomRect(std::mt19937& random, const RasterDef& def) {
  const auto side = [&](unsigned size) {
    unsigned first = random() % size, last = random() % size;
    if (random() % 3 == 0) first = 0;
    if (random() % 3 == 0) last = size - 1;
    return std::minmax({first, last});
  };
  const auto [left, right] = side(def.samples);
  const auto [top, bottom] = side(def.lines);
  return {left, top, right, bottom};
}

inline std::vector<unsigned> RandomBands(std::mt19937& random, const RasterDef& def) {
  std::vector<unsigned> bands(def.bands);
  for (unsigned i = 0; i < def.bands; ++i) bands[i] = i;
  if (random() % 2 == 0) return bands;
  std::shuffle(bands.begin(), bands.end(), random);
  bands.resize(1 + random() % def.bands);
  return bands;
}

template <typename T>
void ExpectBlock(RasterReader<T>& reader, Model<T>& model, Block<T> block) {
  ASSERT_TRUE(block.Read(reader)) << TakeFault().ToUTF8();
  std::size_t at = 0, wrong = 0;
  VisitBlock(reader.RasterDef().interleave, block.rect, block.bands,
             [&](unsigned x, unsigned y, unsigned band) {
               if (!(block.pixels[at++] == model.At(x, y, band))) ++wrong;
             });
  EXPECT_EQ(wrong, 0U);
}

/// Expects the pixels of a file, as GDAL alone reads it.
template <typename T>
void ExpectPixels(const Peer& peer, const Model<T>& model) {
  ASSERT_TRUE(peer);
  for (unsigned band = 0; band < model.bands; ++band) {
    const auto pixels = Peer::Pixels(peer.Band(band));
    std::size_t wrong = 0;
    for (std::size_t i = 0; i < pixels.size(); ++i) {
      if (!SameValue(pixels[i], AsComplex(model.values[band * pixels.size() + i]))) ++wrong;
    }
    EXPECT_EQ(wrong, 0U) << "band " << band;
  }
}

/// How a raster is written.
struct Trial {
  int writes;            ///< rectangles here and there
  unsigned seed;         ///< of the rectangles and the values
  bool isWhole = false;  ///< all of it is written first, in strips of lines
};

/// Writes and reads blocks here and there, lets the raster go, and looks at it through GDAL.
/// @param look  looks at the finished file once more.
template <typename T>
void TryBlocks(
    const RasterDef& def, T fill, const Trial& trial,
    const std::function<void(const std::string& path, Model<T>& model)>& look = nullptr) {
  const TemporaryDirectory directory;
  const std::string path = (directory.Path() / "made.tif").string();
  std::mt19937 random(trial.seed);
  Model<T> model(def, fill);
  auto made = CreateSource({path}, def);
  ASSERT_TRUE(made) << TakeFault().ToUTF8();
  {
    const auto writer = ReaderOf<T>(made);
    ASSERT_TRUE(writer);
    const auto write = [&](const SubRect& rect, const std::vector<unsigned>& bands) {
      Block<T> block{rect, bands, {}, {}};
      VisitBlock(writer->RasterDef().interleave, block.rect, block.bands,
                 [&](unsigned x, unsigned y, unsigned band) {
                   T value{};
                   if constexpr (std::is_arithmetic_v<T>) {
                     value = static_cast<T>(random() % 100 + 1);
                   } else {
                     value.real = static_cast<decltype(value.real)>(random() % 100 + 1);
                     value.imag = static_cast<decltype(value.imag)>(random() % 100);
                   }
                   block.pixels.push_back(value);
                   model.At(x, y, band) = value;
                 });
      block.state.assign(block.pixels.size(), 0);
      return block.Write(*writer);
    };
    std::vector<unsigned> all(def.bands);
    for (unsigned i = 0; i < def.bands; ++i) all[i] = i;
    for (unsigned top = 0; trial.isWhole && top < def.lines; top += 7) {
      const SubRect rect{0, top, def.samples - 1, std::min(top + 6, def.lines - 1)};
      ASSERT_TRUE(write(rect, all)) << TakeFault().ToUTF8();
    }
    for (int i = 0; i < trial.writes; ++i) {
      ASSERT_TRUE(write(RandomRect(random, def), RandomBands(random, def))) << TakeFault().ToUTF8();
      ExpectBlock<T>(*writer, model, {RandomRect(random, def), RandomBands(random, def), {}, {}});
    }
  }
  ASSERT_EQ(Release(made), "");
  ExpectPixels(Peer(path), model);
  if (look != nullptr) look(path, model);
}

}  // namespace lumo::test
