#include "fx/seamless_segmentation.h"

#include <map>
#include <random>

#include "foundation/fault.h"
#include "fx/seamless_watershed.h"
#include "fx/watershed.h"
#include "support/noise_scene.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

using Labels = std::vector<std::int32_t>;

/// Numbers labels from 1 in the order in which they come; 0 stays.
Labels Renumbered(Labels labels) {
  std::map<std::int32_t, std::int32_t> numbers{{0, 0}};
  for (std::int32_t& label : labels) {
    label = numbers.emplace(label, static_cast<std::int32_t>(numbers.size())).first->second;
  }
  return labels;
}

struct Image {
  std::uint32_t width, height;
  std::vector<std::int32_t> levels;
  std::vector<std::uint8_t> excluded;
};

Image MakeNoise(std::uint32_t width, std::uint32_t height, unsigned levels, bool withHoles,
                unsigned seed) {
  std::mt19937 random(seed);
  Image image{width, height, Labels(std::size_t{width} * height), {}};
  for (std::int32_t& level : image.levels) level = static_cast<std::int32_t>(random() % levels);
  if (!withHoles) return image;
  for (std::size_t i = 0; i < image.levels.size(); ++i) image.excluded.push_back(random() % 9 == 0);
  return image;
}

/// One plateau that winds up and down through all lines, between walls; its only way down is at its
/// end, or nowhere.
Image MakeSnake(std::uint32_t width, std::uint32_t height, bool hasOutlet) {
  Image image{width, height, Labels(std::size_t{width} * height, 5), {}};
  for (std::uint32_t x = 1; x < width; x += 2) {
    for (std::uint32_t y = 0; y < height; ++y) {
      const bool isGap = y == (x % 4 == 1 ? height - 1 : 0);
      if (!isGap) image.levels[std::size_t{y} * width + x] = 9;
    }
  }
  if (hasOutlet) image.levels[width - 1] = 1;
  return image;
}

/// The basins of an image by strips, and their numbers in the order of the whole.
void CheckBasins(const Image& image, std::uint32_t stripLines, unsigned threads) {
  const ThreadLimit limit(threads);
  const std::uint8_t* const excluded = image.excluded.empty() ? nullptr : image.excluded.data();
  Labels wanted(image.levels.size()), got(image.levels.size());
  const std::uint32_t count =
      Watershed().Label(image.levels.data(), excluded, image.width, image.height, wanted.data());
  SeamlessWatershed watershed;
  ASSERT_TRUE(watershed.Begin({image.width, image.height, stripLines}));
  for (unsigned strip = 0; strip < watershed.Strips(); ++strip) {
    const std::size_t line = std::size_t{strip} * stripLines - (strip > 0 ? 1 : 0);
    const std::size_t at = line * image.width;
    ASSERT_TRUE(watershed.AddStrip(
        strip, {image.levels.data() + at, excluded == nullptr ? nullptr : excluded + at}));
  }
  ASSERT_TRUE(watershed.Connect(nullptr));
  ASSERT_EQ(watershed.Count(), count);
  for (unsigned strip = 0; strip < watershed.Strips(); ++strip) {
    ASSERT_TRUE(watershed.Label(strip, got.data() + std::size_t{strip} * stripLines * image.width));
  }
  const std::vector<std::uint32_t> ranks = watershed.TakeRanks();
  for (std::int32_t& label : got) label = static_cast<std::int32_t>(ranks[label]);
  EXPECT_EQ(got, wanted) << image.width << " by " << image.height << ", strips of " << stripLines;
}

TEST(SeamlessWatershed, GivesTheBasinsOfTheWhole) {
  std::vector<Image> images{{7, 5, Labels(35, 3), {}},
                            MakeSnake(21, 40, true),
                            MakeSnake(21, 40, false),
                            MakeSnake(40, 9, true)};
  for (unsigned seed = 0; seed < 12; ++seed) {
    for (const unsigned levels : {2U, 3U, 200U}) {
      images.push_back(MakeNoise(1 + seed * 5, 3 + seed * 11 % 37, levels, seed % 3 == 0, seed));
    }
  }
  images.push_back(MakeNoise(1, 90, 3, true, 3));
  images.push_back(MakeNoise(90, 1, 3, true, 4));
  for (const Image& image : images) {
    for (const std::uint32_t stripLines : {1U, 2U, 7U, 64U}) {
      for (const unsigned threads : {1U, 4U}) CheckBasins(image, stripLines, threads);
    }
  }
}

struct Settings {
  SegmentAlgorithm algorithm = SegmentAlgorithm::kSobel;
  bool isRigorous = false;
  Form sums = Form::kTold;
  double mergeValue = 0;
  bool bordersOnly = false;
  unsigned stripLines = 0;  // 0: one tile, with the processes of tiles
};

template <typename T>
Labels Segment(const MemoryPtr<T>& segment, const MemoryPtr<T>& merge, const Settings& settings) {
  SegmentRequest request;
  request.algorithm = settings.algorithm;
  request.stretch = {0, 800, 0, 800};
  request.limits = ClipLimits::Of(0, 800, 40, 800);
  request.mergeValue = settings.mergeValue;
  request.isRigorous = settings.isRigorous;
  request.sums = settings.sums;
  request.bordersOnly = settings.bordersOnly;
  const MemoryPtr<std::int32_t> labels(
      new MemoryTestRaster<std::int32_t>(segment->Samples(), segment->Lines(), 1));
  if (settings.stripLines != 0) {
    request.tileBytes = static_cast<unsigned>(settings.stripLines * segment->Samples() *
                                              segment->Bands() * sizeof(T));
    SeamlessSegmentation<T> whole(segment, merge, labels, request);
    EXPECT_TRUE(whole.Run());
    return labels->pixels;
  }
  if (settings.isRigorous) {
    RasterTileWatershedSegmentLambdaMergeProcess<T> tiles(segment, merge, labels, request);
    EXPECT_TRUE(tiles.RunProcess(tiles.kHere));
  } else {
    RasterTileWatershedSegmentFLSMergeProcess<T> tiles(segment, merge, labels, request);
    EXPECT_TRUE(tiles.RunProcess(tiles.kHere));
  }
  return settings.bordersOnly ? labels->pixels : Renumbered(labels->pixels);
}

/// Segments by strips are those of one tile, for all settings, strips and threads.
template <typename T>
void CheckScene(unsigned samples, unsigned lines, unsigned bands) {
  const auto scene = MakeScene<T>(samples, lines, bands, samples + lines);
  const auto other = MakeScene<T>(samples, lines, bands + 1, 99);
  for (const auto algorithm : {SegmentAlgorithm::kSobel, SegmentAlgorithm::kIntensity}) {
    for (const double mergeValue : {0.0, 300.0, 4000.0}) {
      for (int variant = 0; variant < 4; ++variant) {
        Settings settings{algorithm, variant % 2 == 1, Form::kTold, mergeValue, variant == 2, 0};
        if (variant == 3) settings.sums = Form::kExact;
        const auto& by = variant == 0 ? scene : other;
        const Labels wanted = Segment(scene, by, settings);
        unsigned threads = 1;
        for (const unsigned stripLines : {1U, 7U, 64U, lines}) {
          const ThreadLimit limit(threads);
          threads = threads % 4 + 1;
          settings.stripLines = stripLines;
          ASSERT_EQ(Segment(scene, by, settings), wanted)
              << samples << " by " << lines << ", strips of " << stripLines << ", merging to "
              << mergeValue << ", variant " << variant;
        }
      }
    }
  }
}

TEST(SeamlessSegmentation, GivesTheSegmentsOfOneTile) {
  CheckScene<std::uint8_t>(61, 75, 2);
  CheckScene<std::int16_t>(90, 44, 1);
  CheckScene<std::uint32_t>(33, 70, 1);
  CheckScene<float>(50, 66, 3);
  CheckScene<double>(4, 130, 2);
  CheckScene<std::uint8_t>(1, 30, 1);
  CheckScene<float>(30, 2, 1);
  CheckScene<float>(20, 3, 1);
}

/// Segments in rounds; empty when that fails.
template <typename T>
Labels SegmentInRounds(const MemoryPtr<T>& scene, double mergeValue, unsigned stripLines,
                       std::uint64_t memory, double leastPixels = 0, bool bordersOnly = false) {
  SegmentRequest request;
  request.stretch = {0, 800, 0, 800};
  request.limits = ClipLimits::Of(0, 800, 40, 800);
  request.mergeValue = mergeValue;
  request.order = MergeOrder::kLocal;
  request.memory = memory;
  request.leastPixels = leastPixels;
  request.bordersOnly = bordersOnly;
  request.tileBytes =
      static_cast<unsigned>(stripLines * scene->Samples() * scene->Bands() * sizeof(T));
  const MemoryPtr<std::int32_t> labels(
      new MemoryTestRaster<std::int32_t>(scene->Samples(), scene->Lines(), 1));
  return SeamlessSegmentation<T>(scene, scene, labels, request).Run() ? labels->pixels : Labels();
}

/// Segments of rounds are the same for all strips, threads and limits of memory, or there are none.
template <typename T>
void CheckRounds(unsigned samples, unsigned lines, double mergeValue) {
  const auto scene = MakeScene<T>(samples, lines, 2, 77);
  const Labels wanted = SegmentInRounds(scene, mergeValue, lines, SegmentRequest::kNoLimit);
  ASSERT_FALSE(wanted.empty());
  unsigned threads = 1;
  for (const unsigned stripLines : {1U, 7U, 64U}) {
    for (const std::uint64_t memory : {SegmentRequest::kNoLimit, std::uint64_t{4'000'000}}) {
      const ThreadLimit limit(threads);
      threads = threads == 4 ? 1 : threads * 2;
      EXPECT_EQ(SegmentInRounds(scene, mergeValue, stripLines, memory), wanted)
          << samples << " by " << lines << ", merging to " << mergeValue << ", strips of "
          << stripLines << ", memory " << memory;
    }
  }
}

/// Small segments that join at the end: none is left, each lies in one of those without them as a
/// whole or holds some, and strips and threads don't matter; nor do they for the borders.
TEST(SeamlessSegmentation, LocalOrderJoinsSmallSegments) {
  const auto scene = MakeScene<float>(150, 120, 2, 78);
  constexpr std::uint64_t kMemory = SegmentRequest::kNoLimit;
  const Labels plain = SegmentInRounds(scene, 300, 120, kMemory);
  const Labels wanted = SegmentInRounds(scene, 300, 120, kMemory, 40);
  std::map<std::int32_t, unsigned> pixels;
  std::map<std::int32_t, std::int32_t> holder;
  for (std::size_t i = 0; i < wanted.size(); ++i) {
    ++pixels[wanted[i]];
    ASSERT_EQ(holder.emplace(plain[i], wanted[i]).first->second, wanted[i]);
  }
  ASSERT_GT(pixels.size(), 20U);
  ASSERT_GT(holder.size(), pixels.size());
  for (const auto& [label, count] : pixels) {
    EXPECT_TRUE(label == 0 || count >= 40) << label;
  }
  const Labels borders = SegmentInRounds(scene, 300, 120, kMemory, 40, true);
  for (const unsigned stripLines : {1U, 9U, 64U}) {
    const ThreadLimit limit(1 + stripLines % 4);
    EXPECT_EQ(SegmentInRounds(scene, 300, stripLines, kMemory, 40), wanted) << stripLines;
    EXPECT_EQ(SegmentInRounds(scene, 300, stripLines, kMemory, 40, true), borders) << stripLines;
  }
  for (std::size_t i = 0; i + 2 < 150; ++i) {  // of the first line
    const bool isBorder = wanted[i] != wanted[i + 1] || wanted[i] != wanted[i + 150];
    EXPECT_EQ(borders[i], isBorder ? 1 : 0) << i;
  }
  EXPECT_TRUE(SegmentInRounds(scene, 300, 8, 30'000, 40).empty());
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("bytes of memory, and may take 30000"));
}

TEST(SeamlessSegmentation, LocalOrderDependsOnNoStripsThreadsOrMemory) {
  CheckRounds<std::uint8_t>(150, 260, 50);
  CheckRounds<std::uint16_t>(150, 260, 5000);
  CheckRounds<float>(150, 260, 5000);
  CheckRounds<float>(400, 300, 1e9);
  CheckRounds<std::uint8_t>(1, 300, 5000);
}

TEST(SeamlessSegmentation, LocalOrderSaysThatItsMemoryEnds) {
  const auto scene = MakeScene<std::uint8_t>(200, 200, 1, 77);
  EXPECT_TRUE(SegmentInRounds(scene, 5000, 8, 10'000).empty());
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("bytes of memory, and may take 10000"));
}

TEST(SeamlessSegmentation, SaysWhatMergingNeedsBeforeAnythingIsWritten) {
  const auto scene = MakeScene<std::uint8_t>(60, 60, 1, 1);
  const MemoryPtr<std::int32_t> labels(new MemoryTestRaster<std::int32_t>(60, 60, 1));
  SegmentRequest request;
  request.stretch = {0, 800, 0, 800};
  request.limits = {0, 800};
  request.mergeValue = 10;
  request.memory = 1000;
  EXPECT_FALSE(SeamlessSegmentation<std::uint8_t>(scene, scene, labels, request).Run());
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("bytes of memory, and may take 1000"));
  EXPECT_EQ(labels->pixels, Labels(3600, 0));
  // Told bounds: 180 bytes for a segment of 4 bands with its pairs.
  EXPECT_LE(MemoryOfMerging(1000, 4, request), 180'000U);
  request.mergeValue = 0;  // no graph is made
  EXPECT_TRUE(SeamlessSegmentation<std::uint8_t>(scene, scene, labels, request).Run());
}

}  // namespace
}  // namespace lumo
