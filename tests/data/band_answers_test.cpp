#include "data/band_answers.h"

#include <gtest/gtest.h>

#include "data/data_manager.h"
#include "support/fake_source.h"

namespace lumo {
namespace {

TEST(BandAnswers, AreThoseOfTheSourceInAnyOrderAndAfterChanges) {
  constexpr unsigned kBands = 10000;
  unsigned offset = 0, calls = 0;
  const auto ask = [&](unsigned first, unsigned count) {
    ++calls;
    std::vector<unsigned> answers;
    for (unsigned band = first; band < std::min(first + count, kBands); ++band) {
      answers.push_back(band + offset);
    }
    return answers;
  };
  BandAnswers<unsigned> answers;
  const auto walk = [&](unsigned from, unsigned to) {
    for (unsigned band = from; band < to; ++band) ASSERT_EQ(answers.Get(band, ask), band + offset);
  };
  walk(0, kBands);
  EXPECT_LT(calls, 100u);

  // An answer out of its turn, or to few questions, comes from the source itself.
  offset = 7;
  walk(100, 100 + answers.kPatience);
  walk(5, 6);

  walk(0, 5000);
  offset = 9;
  answers.Forget();
  walk(5000, kBands);
  EXPECT_EQ(answers.Get(kBands, ask), 0u);  // there is no such band
}

TEST(BandAnswers, OfAProxyAreThoseOfItsPlugIn) {
  test::FakeFormat format("EXTERNAL");
  format.fake.bands = 5000;
  Array<String> strings{ArrayDims(2)};
  strings[0] = String("EXTERNAL");
  strings[1] = String("x");
  const RasterDataConnectionPtr source(
      GetGlobalDataManager().Connect(strings, GeoRefPtr(), MetadataPtr()));
  ASSERT_TRUE(source);
  const auto reader = source->RasterReaderDispatch()->Get<std::int16_t>();
  ASSERT_TRUE(reader);
  unsigned stats = 0, noData = 0, palettes = 0;
  for (unsigned band = 0; band < format.fake.bands; ++band) {
    stats += reader->StatsExist(band) ? band + 1 : 0;
    noData += reader->HasNoDataValue(band) ? band + 1 : 0;
    palettes += reader->HasPalette(band) ? band + 1 : 0;
  }
  EXPECT_EQ(stats, 2u);  // band 1 alone
  EXPECT_EQ(noData, 3u);
  EXPECT_EQ(palettes, 1u);
}

}  // namespace
}  // namespace lumo
