#include "geometry/area_share.h"

#include <fstream>
#include <random>

#include <gtest/gtest.h>

#include "foundation/fault.h"
#include "geometry/label_vectorizer.h"
#include "support/file_bytes.h"
#include "support/temporary_directory.h"
#include "views/sources/memory_raster.h"

namespace lumo {
namespace {

/// Keeps polygons as texts.
class Texts final : public LabelPolygonSink {
 public:
  static std::string TextOf(double label, const TracedPolygon& polygon) {
    std::string text = std::to_string(label);
    for (const unsigned char hole : polygon.holes) text += hole != 0 ? " h" : " o";
    for (const auto* const numbers : {&polygon.starts, &polygon.coordinates}) {
      for (const std::uint32_t number : *numbers) text += " " + std::to_string(number);
    }
    return text;
  }
  bool Take(double label, TracedPolygon& polygon) override {
    texts.push_back(TextOf(label, polygon));
    return true;
  }
  std::vector<std::string> texts;
};

std::string FirstDifference(std::vector<std::string> got, std::vector<std::string> want) {
  const std::size_t most = std::max(got.size(), want.size());
  got.resize(most);
  want.resize(most);
  for (std::size_t i = 0; i < most; ++i) {
    if (got[i] != want[i]) return std::to_string(i) + ": got " + got[i] + ", want " + want[i];
  }
  return {};
}

class AreaShare : public testing::Test {
 protected:
  template <typename T>
  RasterPtr<T> RasterOf(std::vector<T>& pixels, unsigned width) {
    return RasterPtr<T>(new MemoryRaster<T>("labels", pixels.data(), width,
                                            static_cast<unsigned>(pixels.size() / width), 1,
                                            Interleave::BSQ, GeoRefPtr()));
  }

  template <typename T>
  std::vector<std::string> Whole(const std::vector<T>& pixels, unsigned width) {
    Texts sink;
    LabelVectorizer<T> vectorizer(width, sink);
    for (std::size_t at = 0; at < pixels.size(); at += width) {
      vectorizer.AddLine(pixels.data() + at, nullptr);
    }
    vectorizer.Finish();
    return sink.texts;
  }

  std::vector<std::string> FilesOf(unsigned shares) const {
    std::vector<std::string> files;
    for (unsigned i = 0; i < shares; ++i) {
      files.push_back((directory_.Path() / std::to_string(i)).string());
    }
    return files;
  }

  template <typename T>
  std::vector<std::string> InShares(std::vector<T>& pixels, unsigned width, unsigned shares) {
    const RasterPtr<T> raster = RasterOf(pixels, width);
    const std::vector<std::string> files = FilesOf(shares);
    for (unsigned i = 0; i < shares; ++i) {
      ShareWriter out;
      EXPECT_TRUE(PutAreas<T>(raster, 0, {}, {i, shares}, out, {}));
      EXPECT_TRUE(out.Write(files[i], "areas", {i, shares}));
    }
    std::vector<std::string> texts;
    JoinedAreas areas(files, "areas", raster->Lines());
    double label = 0;
    for (TracedPolygon polygon; areas.Next(label, polygon);) {
      texts.push_back(Texts::TextOf(label, polygon));
    }
    EXPECT_FALSE(areas.HasFailed());
    return texts;
  }

  test::TemporaryDirectory directory_;
};

TEST_F(AreaShare, GivesThePolygonsOfTheWholeInTheirOrder) {
  const unsigned seed = std::random_device()();
  SCOPED_TRACE(seed);
  std::mt19937 random(seed);
  for (unsigned round = 0; round < 200; ++round) {
    const unsigned width = 1 + random() % 12, lines = 1 + random() % 40;
    const unsigned labels = 2 + random() % 4;  // few make areas with arms, many small ones
    std::vector<std::int32_t> pixels(std::size_t{width} * lines);
    for (std::int32_t& pixel : pixels) {
      const bool isExcluded = random() % 9 == 0;
      pixel = isExcluded ? LabelVectorizer<std::int32_t>::kExcluded
                         : static_cast<std::int32_t>(random() % labels);
    }
    const unsigned shares = 1 + random() % 9;
    SCOPED_TRACE(testing::Message() << round << ": " << width << " x " << lines << ", " << shares);
    ASSERT_EQ(FirstDifference(InShares(pixels, width, shares), Whole(pixels, width)), "");
  }
}

TEST_F(AreaShare, AreasWithArmsAreOfTheShareInWhichTheyBegin) {
  // Arms that begin in other shares, an area around all, and one in which another begins.
  const char* const kLines[] = {"1111111", "1020301", "1020301", "1020331", "1022221", "1000201",
                                "1111211", "0444240", "0424240", "0422240", "0444440", "0000000"};
  std::vector<std::uint8_t> pixels;
  for (const char* const line : kLines) {
    for (const char* c = line; *c != '\0'; ++c) pixels.push_back(static_cast<std::uint8_t>(*c));
  }
  for (const unsigned shares : {1U, 2U, 5U, 12U, 20U}) {
    SCOPED_TRACE(shares);
    EXPECT_EQ(FirstDifference(InShares(pixels, 7, shares), Whole(pixels, 7)), "");
  }
}

TEST_F(AreaShare, ADamagedFileAndAnAbortAreFaults) {
  std::vector<std::uint8_t> pixels(64 * 64);
  for (std::size_t i = 0; i < pixels.size(); ++i) pixels[i] = i % 3 == 0 ? 1 : 0;
  InShares(pixels, 64, 2);
  const std::vector<std::string> files = FilesOf(2);
  std::string bytes = test::FileBytes(files[1]);
  bytes[bytes.size() / 2] = static_cast<char>(bytes[bytes.size() / 2] ^ 1);
  std::ofstream(files[1], std::ios::binary) << bytes;
  JoinedAreas areas(files, "areas", 64);
  double label = 0;
  for (TracedPolygon polygon; areas.Next(label, polygon);) continue;
  EXPECT_TRUE(areas.HasFailed());
  EXPECT_NE(TakeFault().ToUTF8().find("is no whole file of a share"), std::string::npos);

  const IPC ipc;
  ipc.abort->Set(true);
  ShareWriter out;
  EXPECT_FALSE(PutAreas<std::uint8_t>(RasterOf(pixels, 64), 0, {}, {0, 1}, out, ipc));
  EXPECT_EQ(TakeFault().ToUTF8(), "the vectorizing was aborted");
}

}  // namespace
}  // namespace lumo
