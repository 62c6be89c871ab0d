#include "fx/segment_share.h"

#include <fstream>
#include <random>

#include "foundation/fault.h"
#include "fx/seam_zone.h"
#include "fx/seamless_segmentation.h"
#include "fx/watershed.h"
#include "support/file_bytes.h"
#include "support/noise_scene.h"
#include "support/temporary_directory.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

using Labels = std::vector<std::int32_t>;

/// Holds the outputs of a segmentation; empty where it fails.
struct Made {
  Labels labels;
  std::string tree;
  bool operator==(const Made&) const = default;
};

/// Segments rasters of the test, in one run or in shares.
class SegmentShareTest : public testing::Test {
 protected:
  static SegmentRequest RequestOf(double mergeValue) {
    SegmentRequest request;
    request.stretch = {0, 800, 0, 800};
    request.limits = ClipLimits::Of(0, 800, 40, 800);
    request.mergeValue = mergeValue;
    request.sums = Form::kExact;
    return request;
  }

  std::string FileOf(unsigned round, unsigned share) const {
    return (directory_.Path() / (std::to_string(round) + "-" + std::to_string(share) + ".share"))
        .string();
  }
  std::vector<std::string> FilesOf(unsigned rounds, unsigned count) const {
    std::vector<std::string> files;
    for (unsigned i = 0; i < rounds * count; ++i) files.push_back(FileOf(i / count, i % count));
    return files;
  }

  /// Merges what shares have made, or all of it where there are none.
  template <typename T>
  Made Merge(const MemoryPtr<T>& segment, const MemoryPtr<T>& merge, SegmentRequest request,
             const SegmentShares* shares) const {
    const std::string tree = (directory_.Path() / ("tree")).string();
    if (!request.tree.empty()) request.tree = tree;
    const MemoryPtr<std::int32_t> labels(
        new MemoryTestRaster<std::int32_t>(segment->Samples(), segment->Lines(), 1));
    SeamlessSegmentation<T> whole(segment, merge, labels, request, {}, shares);
    if (!whole.Run()) return {};
    return {labels->pixels, request.tree.empty() ? "" : test::FileBytes(tree)};
  }

  template <typename T>
  Made InShares(const MemoryPtr<T>& segment, const MemoryPtr<T>& merge,
                const SegmentRequest& request, unsigned count, const std::string& key = "k") const {
    for (unsigned round = 0; round < kSegmentRounds; ++round) {
      const SegmentShares done(key, count, FilesOf(round, count));
      for (unsigned share = count; share-- > 0;) {
        SegmentShare<T> work(segment, merge, request, done);
        EXPECT_TRUE(work.Run(share, FileOf(round, share))) << TakeFault().ToUTF8();
      }
    }
    const SegmentShares done(key, count, FilesOf(kSegmentRounds, count));
    return Merge<T>(segment, merge, request, &done);
  }

  /// A segmentation in shares makes what one run makes.
  template <typename T>
  void Check(const MemoryPtr<T>& segment, const MemoryPtr<T>& merge, SegmentRequest request,
             unsigned stripLines, const char* what) const {
    request.tileBytes =
        static_cast<unsigned>(stripLines * segment->Samples() * segment->Bands() * sizeof(T));
    const Made wanted = Merge<T>(segment, merge, request, nullptr);
    ASSERT_FALSE(wanted.labels.empty());
    for (const unsigned count : {1U, 2U, 3U, 7U}) {
      const ThreadLimit limit(count % 3 + 1);
      EXPECT_TRUE(InShares<T>(segment, merge, request, count) == wanted)
          << what << ", " << segment->Samples() << " by " << segment->Lines() << " in " << count
          << " shares, strips of " << stripLines;
    }
  }

  /// In each order and form of merging.
  template <typename T>
  void CheckAll(const MemoryPtr<T>& segment, const MemoryPtr<T>& merge) const {
    SegmentRequest request = RequestOf(300);
    Check<T>(segment, merge, request, 5, "by schedule");
    request.leastPixels = 9;
    Check<T>(segment, merge, request, 64, "and small ones");
    request.order = MergeOrder::kLocal;
    request.bordersOnly = true;
    Check<T>(segment, merge, request, 5, "borders of rounds and small ones");
    request = RequestOf(300);
    request.tree = "tree";
    Check<T>(segment, merge, request, 3, "with a tree");
    request.order = MergeOrder::kLocal;
    Check<T>(segment, merge, request, 8, "with a tree of rounds");
    request = RequestOf(300);
    request.isRigorous = true;
    Check<T>(segment, merge, request, 5, "rigorously");
    request = RequestOf(0);
    request.algorithm = SegmentAlgorithm::kIntensity;
    request.order = MergeOrder::kLocal;
    Check<T>(segment, merge, request, 2, "basins");
  }

  test::TemporaryDirectory directory_;
};

TEST_F(SegmentShareTest, ScenesHaveTheSegmentsAndTheTreeOfOneRun) {
  CheckAll<std::uint8_t>(MakeScene<std::uint8_t>(61, 75, 2, 3),
                         MakeScene<std::uint8_t>(61, 75, 3, 4));
  const auto shorts = MakeScene<std::uint16_t>(90, 44, 1, 5);
  CheckAll<std::uint16_t>(shorts, shorts);
  const auto floats = MakeScene<float>(50, 66, 3, 6);
  CheckAll<float>(floats, floats);
  const auto column = MakeScene<float>(1, 90, 1, 7);
  CheckAll<float>(column, column);
  const auto line = MakeScene<std::uint8_t>(70, 1, 1, 8);
  CheckAll<std::uint8_t>(line, line);
}

/// Levels as they are, by the mean of the one band: plateaus that wind through all shares, up and
/// down, with a way down at an end, or none; and an image of one level.
TEST_F(SegmentShareTest, PlateausThatWindThroughAllSharesDrainAsInOneRun) {
  const auto make = [](unsigned samples, unsigned lines, const auto& levelAt) {
    const MemoryPtr<float> scene(new MemoryTestRaster<float>(samples, lines, 1));
    for (unsigned y = 0; y < lines; ++y) {
      for (unsigned x = 0; x < samples; ++x) {
        scene->pixels[std::size_t{y} * samples + x] = static_cast<float>(levelAt(x, y));
      }
    }
    return scene;
  };
  const auto snake = [](unsigned samples, unsigned lines, bool hasOutlet) {
    return [=](unsigned x, unsigned y) {
      if (hasOutlet && y == 0 && x == samples - 1) return 50;
      const bool isWall = x % 2 == 1 && y != (x % 4 == 1 ? lines - 1 : 0);
      return isWall ? 90 : 60;
    };
  };
  SegmentRequest request = RequestOf(0);
  request.algorithm = SegmentAlgorithm::kIntensity;
  for (const bool hasOutlet : {true, false}) {
    const auto scene = make(21, 40, snake(21, 40, hasOutlet));
    Check<float>(scene, scene, request, 4, "snake");
  }
  const auto flat = make(17, 23, [](unsigned, unsigned) { return 70; });
  Check<float>(flat, flat, request, 4, "flat");
  std::mt19937 random(11);
  for (unsigned image = 0; image < 30; ++image) {  // few levels make large plateaus
    const unsigned levels = 2 + image % 3;
    const auto scene = make(1 + image * 7 % 40, 9 + image % 31,
                            [&](unsigned, unsigned) { return 50 + random() % levels; });
    for (std::size_t i = 0; i < scene->states.size(); ++i) {
      if (image % 4 == 0 && random() % 12 == 0) scene->states[i] = 1;
    }
    Check<float>(scene, scene, request, 3, "few levels");
  }
}

TEST_F(SegmentShareTest, FilesThatAreNotThoseOfAllSharesAreRefusedByName) {
  const auto scene = MakeScene<std::uint8_t>(40, 60, 1, 9);
  const SegmentRequest request = RequestOf(300);
  const Made wanted = InShares<std::uint8_t>(scene, scene, request, 3);
  ASSERT_FALSE(wanted.labels.empty());
  const SegmentShares done("k", 3, FilesOf(kSegmentRounds, 3));
  const auto isRefused = [&](const std::string& file, const SegmentShares& shares) {
    EXPECT_TRUE(Merge<std::uint8_t>(scene, scene, request, &shares).labels.empty()) << file;
    EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr(file));
  };
  for (const unsigned round : {1U, 2U}) {
    const std::string file = FileOf(round, 1);
    const std::string good = test::FileBytes(file);
    std::string flipped = good;
    for (const std::size_t at :
         {std::size_t{40}, std::size_t{60}, std::size_t{90}, good.size() / 2, good.size() - 3}) {
      if (round == 1 && at > 90) continue;  // those are of the cells, which merging doesn't need
      flipped = good;
      flipped[at] = static_cast<char>(flipped[at] ^ 1);
      std::ofstream(file, std::ios::binary) << flipped;
      isRefused(file, done);
    }
    for (const std::string& other :
         {good.substr(0, good.size() - 1), std::string(), test::FileBytes(FileOf(round, 0)),
          test::FileBytes(FileOf(0, 1))}) {
      std::ofstream(file, std::ios::binary) << other;
      isRefused(file, done);
    }
    std::remove(file.c_str());
    isRefused(file, done);
    std::ofstream(file, std::ios::binary) << good;
  }
  isRefused(FileOf(1, 0), SegmentShares("another", 3, FilesOf(kSegmentRounds, 3)));
  EXPECT_TRUE(Merge<std::uint8_t>(scene, scene, request, &done) == wanted);
  std::remove(FileOf(0, 2).c_str());
  SegmentShare<std::uint8_t> second(scene, scene, request, SegmentShares("k", 3, FilesOf(1, 3)));
  EXPECT_FALSE(second.Run(0, FileOf(1, 0)));
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr(FileOf(0, 2)));
}

}  // namespace
}  // namespace lumo
