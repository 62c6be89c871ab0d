#include <algorithm>
#include <cmath>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <queue>
#include <random>

#include "commands/catalog.h"
#include "foundation/fault.h"
#include "mosaic/footprint_file.h"
#include "mosaic/ring_simplifier.h"
#include "mosaic/scene_border.h"
#include "support/file_bytes.h"
#include "support/file_size_limit.h"
#include "support/placed_raster.h"
#include "support/run_command.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::FileBytes;
using Polygon = Polygon2D<std::uint32_t>;

Contour2D<std::uint32_t> Box(std::uint32_t x0, std::uint32_t y0, std::uint32_t x1, std::uint32_t y1,
                             bool isHole = false) {
  Contour2D<std::uint32_t> ring{{{x1, y1}, {x0, y1}, {x0, y0}, {x1, y0}, {x1, y1}}, isHole};
  if (isHole) std::reverse(ring.points.begin(), ring.points.end());
  return ring;
}

class Footprint : public testing::Test {
 protected:
  std::string Path(const char* name = "a_footprint.msf") const {
    return (directory_.Path() / name).string();
  }
  test::TemporaryDirectory directory_;
};

template <typename T>
void Append(std::string& bytes, T value) {
  char number[sizeof(T)];
  std::memcpy(number, &value, sizeof(T));
  bytes.append(number, sizeof(T));
}

/// A footprint file of one polygon with a hole, by the description of the format.
template <typename T>
std::string ExpectedFile(T label, unsigned typeCode) {
  std::string bytes = "MOSAIC51";
  bytes.push_back(0);
  Append(bytes, static_cast<std::uint16_t>(typeCode));
  Append(bytes, std::uint16_t{13});
  Append(bytes, std::uint32_t{1});
  bytes.resize(1024);
  Append(bytes, label);
  Append(bytes, std::uint32_t{2});
  Append(bytes, std::uint32_t{20});
  bytes.push_back(0);
  bytes.push_back(1);
  for (const std::uint32_t start : {0U, 5U}) Append(bytes, start);
  for (const auto& ring : {Box(0, 0, 9, 9), Box(2, 2, 4, 4, true)}) {
    for (const auto& point : ring.points) {
      Append(bytes, point.x);
      Append(bytes, point.y);
    }
  }
  return bytes;
}

/// The same with every number in the other byte order.
template <typename T>
std::string Swapped(std::string bytes) {
  bytes[8] = 1;
  std::size_t at = 9;
  const auto swap = [&](std::size_t size, std::size_t count = 1) {
    for (; count-- > 0; at += size) std::reverse(&bytes[at], &bytes[at] + size);
  };
  swap(2, 2);
  swap(4);
  at = 1024;
  swap(sizeof(T));
  swap(4, 2);
  at += 2;
  swap(4, 22);
  return bytes;
}

template <typename T>
void CheckFile(const std::string& path, unsigned typeCode) {
  SCOPED_TRACE(typeCode);
  {
    MosaicFootPrintPolygonWriter<T> writer{URI(String(path)), 0};
    EXPECT_FALSE(fs::exists(path));  // until it is whole
    ASSERT_TRUE(writer.Write(Polygon({Box(0, 0, 9, 9), Box(2, 2, 4, 4, true)}, 7)));
    ASSERT_TRUE(writer.Close());
  }
  const std::string expected = ExpectedFile<T>(T(7), typeCode);
  ASSERT_EQ(FileBytes(path), expected);
  for (const std::string& bytes : {expected, Swapped<T>(expected)}) {
    std::ofstream(path, std::ios::binary) << bytes;
    const Polygon read = ReadFootprint<T>(path);
    ASSERT_TRUE(read.IsValid());
    EXPECT_EQ(read.Label(), 7);
    EXPECT_EQ(read.Measure(PolygonMeasure::kSignedArea), 81 - 4);
    EXPECT_TRUE(read.Rings()[1].hole);
  }
  fs::remove(path);
}

TEST_F(Footprint, FilesHaveTheFormOfEachType) {
  CheckFile<std::uint8_t>(Path(), 1);
  CheckFile<std::int16_t>(Path(), 2);
  CheckFile<std::int32_t>(Path(), 3);
  CheckFile<float>(Path(), 4);
  CheckFile<double>(Path(), 5);
  CheckFile<std::uint16_t>(Path(), 12);
  CheckFile<std::uint32_t>(Path(), 13);
  CheckFile<std::int8_t>(Path(), 99);
}

TEST_F(Footprint, FilesThatCannotBeUsedAreRefused) {
  const std::string whole = ExpectedFile<std::uint8_t>(1, 1);
  const auto codeOf = [&](const std::string& bytes) {
    std::ofstream(Path(), std::ios::binary) << bytes;
    const Polygon polygon = ReadFootprint<std::uint8_t>(Path());
    EXPECT_EQ(polygon.IsValid(), polygon.GetErrorState().code == 0);
    EXPECT_EQ(polygon.IsValid(), TakeFault().GetLength() == 0);
    return polygon.GetErrorState().code;
  };
  EXPECT_EQ(codeOf(whole), 0U);
  for (std::size_t size = 0; size < whole.size(); size += size < 1024 ? 100 : 1) {
    EXPECT_EQ(codeOf(whole.substr(0, size)), ObjectErrorIO::Code) << size;
  }
  for (const std::size_t at : {0U, 7U, 9U, 11U}) {  // mark and types
    std::string foreign = whole;
    foreign[at] = 'x';
    EXPECT_EQ(codeOf(foreign), ObjectErrorIO::Code) << at;
  }
  std::string none = whole;
  none[13] = 0;
  EXPECT_EQ(codeOf(none), PolygonErrorBadPolygon::Code);
  EXPECT_FALSE((MosaicFootPrintPolygonReader<std::uint8_t>{URI(String(Path()))}.IsValid()));
  EXPECT_EQ((ReadFootprint<std::uint8_t>(Path("no such file")).GetErrorState().code),
            ObjectErrorIO::Code);
}

TEST_F(Footprint, AFailedOrAbandonedWriterLeavesTheOlderFile) {
  const std::string older = ExpectedFile<std::uint8_t>(1, 1);
  std::ofstream(Path(), std::ios::binary) << older;
  const Polygon box({Box(0, 0, 5, 5)}, 1);
  {
    MosaicFootPrintPolygonWriter<std::uint8_t> writer{URI(String(Path()))};
    ASSERT_TRUE(writer.Write(box));
    writer.Abandon();
  }
  {
    const test::FileSizeLimit limit(4096);
    MosaicFootPrintPolygonWriter<std::uint8_t> writer{URI(String(Path())), 1024};
    bool isWritten = true;
    for (int i = 0; i < 1000 && isWritten; ++i) isWritten = writer.Write(box);
    EXPECT_FALSE(isWritten);
    EXPECT_FALSE(writer.Close());
    EXPECT_EQ(TakeFault().ToUTF8().find(Path() + ":"), 0U);
  }
  EXPECT_EQ(FileBytes(Path()), older);
  EXPECT_EQ(std::distance(fs::directory_iterator(directory_.Path()), fs::directory_iterator()), 1);
}

/// The rule of the simplifier by recursion: the farthest vertex splits the ring as long as it is
/// far enough.
void Split(const std::vector<Point2D<std::int32_t>>& ring, std::size_t from, std::size_t to,
           double tolerance, std::vector<Point2D<std::int32_t>>& kept) {
  double most = -1;
  std::size_t at = from;
  for (std::size_t i = from + 1; i < to; ++i) {
    const long sx = ring[to].x - ring[from].x, sy = ring[to].y - ring[from].y;
    const long ux = ring[i].x - ring[from].x, uy = ring[i].y - ring[from].y;
    const long dot = ux * sx + uy * sy, length = sx * sx + sy * sy;
    long nx = 0, ny = 0;
    if (dot > 0) {
      nx = dot >= length ? sx : sx * dot / length;
      ny = dot >= length ? sy : sy * dot / length;
    }
    const double distance = std::pow(double(ux - nx), 2) + std::pow(double(uy - ny), 2);
    if (distance > most) {
      most = distance;
      at = i;
    }
  }
  if (at != from && most >= tolerance) {
    Split(ring, from, at, tolerance, kept);
    Split(ring, at, to, tolerance, kept);
  } else {
    kept.push_back(ring[to]);
  }
}

TEST(RingSimplifier, KeepsWhatTheRuleKeeps) {
  std::mt19937 random(5);
  std::uniform_int_distribution<int> value(0, 12);
  for (unsigned round = 0; round < 200; ++round) {
    SCOPED_TRACE(round);
    std::vector<Point2D<std::int32_t>> ring(4 + round % 40);
    for (auto& point : ring) point = {value(random), value(random)};
    ring.push_back(ring.front());
    for (const double tolerance : {1.1, 3.1, 40.0}) {
      std::vector<Point2D<std::int32_t>> kept{ring.front()};
      Split(ring, 0, ring.size() - 1, tolerance, kept);
      EXPECT_EQ(SimplifyRing(ring, tolerance, 4), kept);
    }
    EXPECT_EQ(SimplifyRing(ring, 0, 4), ring);
    EXPECT_EQ(SimplifyRing(ring, 1e9, ring.size()), ring);
  }
}

TEST(RingSimplifier, TakesRastersOfAnySize) {
  const std::int32_t far = 2'000'000'000;
  const std::vector<Point2D<std::int32_t>> ring{{0, 0},     {far / 2, 1}, {far, 0}, {far, far / 2},
                                                {far, far}, {1, far},     {0, far}, {0, 0}};
  const std::vector<Point2D<std::int32_t>> kept{{0, 0}, {far, 0}, {far, far}, {0, far}, {0, 0}};
  EXPECT_EQ(SimplifyRing(ring, 1.1, 4), kept);
}

/// Runs the command on scenes of the catalog.
class FootprintCommand : public Footprint {
 protected:
  ~FootprintCommand() override {
    for (const ObjectPtr& raster : rasters_) catalog::Remove(raster);
  }

  std::string Publish(const Pointer<PlacedRaster<std::uint8_t>>& raster) {
    rasters_.push_back(raster);
    catalog::Add(raster);
    return FormatValue(raster->GetURI()).ToUTF8();
  }

  Pointer<PlacedRaster<std::uint8_t>> Scene(unsigned width, unsigned lines,
                                            const PlacedRaster<std::uint8_t>::Value& value) {
    const auto scene = MakePlaced<std::uint8_t>(MakeGrid(0, 0, 1, width, lines), 1, value);
    scene->noData = 0;
    for (std::size_t i = 0; i < scene->pixels.size(); ++i) scene->states[i] = scene->pixels[i] == 0;
    return scene;
  }

  test::CommandOutcome Run(const std::string& uri, const char* smooth,
                           std::map<std::string, std::string> more = {}) {
    more.insert({{"RasterURI", uri},
                 {"Level", "0"},
                 {"SmoothParameter", smooth},
                 {"VectorMSCFP", "[" + Path() + "] "}});
    return test::RunCommand("MosaicFootPrintsCommand", more);
  }

  std::vector<ObjectPtr> rasters_;
};

TEST_F(FootprintCommand, KeepsLargePartsAndLargeHoles) {
  // Two areas of 40 x 40 and 3 x 5; holes of 4 x 4 and of 3 x 5.
  const auto scene = Scene(60, 50, [](unsigned x, unsigned y, unsigned) {
    const bool isHole =
        (x >= 10 && x < 14 && y >= 10 && y < 14) || (x >= 20 && x < 23 && y >= 20 && y < 25);
    const bool isIn = (x < 40 && y < 40 && !isHole) || (x >= 50 && x < 53 && y >= 30 && y < 35);
    return static_cast<std::uint8_t>(isIn ? 9 : 0);
  });
  const auto made = Run(Publish(scene), "0");
  EXPECT_EQ(made.outputs.at("Success"), "1");
  const Polygon footprint = ReadFootprint<std::uint8_t>(Path());
  ASSERT_EQ(footprint.Rings().size(), 2U);
  EXPECT_EQ(footprint.Measure(PolygonMeasure::kSignedArea), 1600 - 16);
  EXPECT_EQ(footprint.Label(), 1);

  scene->noData.reset();  // every pixel counts now
  EXPECT_TRUE(Run(FormatValue(scene->GetURI()).ToUTF8(), "3.1").Succeeded());
  const Polygon frame = ReadFootprint<std::uint8_t>(Path());
  ASSERT_EQ(frame.Rings().size(), 1U);
  EXPECT_EQ(frame.Rings()[0].points.size(), 5U);
  EXPECT_EQ(frame.Measure(PolygonMeasure::kSignedArea), 60 * 50);
}

TEST_F(FootprintCommand, FollowsASlantedBorderWithinTheTolerance) {
  const auto isIn = [](unsigned x, unsigned y) {
    return 3 * y + x > 150 && 5 * x > y && y + 4 * x < 700 && 3 * y < 500 + x;
  };
  const auto scene = Scene(200, 200, [&](unsigned x, unsigned y, unsigned) {
    return static_cast<std::uint8_t>(isIn(x, y) ? 200 : 0);
  });
  double pixels = 0;
  for (unsigned y = 0; y < 200; ++y)
    for (unsigned x = 0; x < 200; ++x) pixels += isIn(x, y) ? 1 : 0;
  const std::string uri = Publish(scene);
  ASSERT_TRUE(Run(uri, "0").Succeeded());
  const Polygon exact = ReadFootprint<std::uint8_t>(Path());
  EXPECT_EQ(exact.Measure(PolygonMeasure::kArea), pixels);
  ASSERT_TRUE(Run(uri, "[3.1] ").Succeeded());
  const Polygon thinned = ReadFootprint<std::uint8_t>(Path());
  EXPECT_LT(thinned.Rings()[0].points.size(), 20U);
  EXPECT_GT(exact.Rings()[0].points.size(), 200U);
  EXPECT_NEAR(thinned.Measure(PolygonMeasure::kArea), pixels, 2 * 600);  // two pixels all round
}

TEST_F(FootprintCommand, FindsBordersThatAreNoCleanNoData) {
  // A dark frame of values up to 4 with specks, and the same values inside.
  std::mt19937 random(3);
  const unsigned size = 120;
  std::vector<std::uint8_t> values(std::size_t{size} * size);
  for (unsigned y = 0; y < size; ++y) {
    for (unsigned x = 0; x < size; ++x) {
      const bool isFrame = x < 12 || y < 9 || x + y / 4 > 120 || y > 110;
      const bool isLake = x > 40 && x < 70 && y > 30 && y < 60;
      values[y * size + x] =
          static_cast<std::uint8_t>(isFrame  ? (random() % 9 == 0 ? 6 : random() % 5)
                                    : isLake ? random() % 5
                                             : 90);
    }
  }
  const auto scene = MakePlaced<std::uint8_t>(
      MakeGrid(0, 0, 1, size, size), 1,
      [&](unsigned x, unsigned y, unsigned) { return values[y * size + x]; });

  // Brute force: what is reached from the edge through values up to 4, and all that is 0.
  std::vector<char> outside(values.size());
  std::queue<std::pair<int, int>> open;
  const auto visit = [&](int x, int y) {
    if (x < 0 || y < 0 || x >= int(size) || y >= int(size)) return;
    const std::size_t at = std::size_t(y) * size + std::size_t(x);
    if (outside[at] != 0 || values[at] > 4) return;
    outside[at] = 1;
    open.push({x, y});
  };
  for (int i = 0; i < int(size); ++i) {
    visit(i, 0);
    visit(i, int(size) - 1);
    visit(0, i);
    visit(int(size) - 1, i);
  }
  for (; !open.empty(); open.pop()) {
    const auto [x, y] = open.front();
    visit(x + 1, y);
    visit(x - 1, y);
    visit(x, y + 1);
    visit(x, y - 1);
  }
  for (std::size_t i = 0; i < values.size(); ++i) outside[i] = outside[i] != 0 || values[i] == 0;

  SceneBorder border;
  border.noData = 0;
  border.tolerance = 4;
  const LabelMaskPtr mask = MakeBorderMask(RasterPtr<std::uint8_t>(scene), border, {}, IPC());
  ASSERT_TRUE(mask);
  std::vector<unsigned char> states(values.size());
  ASSERT_TRUE(mask->Apply(0, size, states.data()));
  for (std::size_t i = 0; i < values.size(); ++i) {
    ASSERT_EQ(states[i] != 0, outside[i] != 0) << i % size << " " << i / size;
  }

  const std::string uri = Publish(scene);
  EXPECT_TRUE(Run(uri, "0", {{"NoData", "0"}, {"Tolerance", "4"}}).Succeeded());
  const Polygon footprint = ReadFootprint<std::uint8_t>(Path());
  ASSERT_GE(footprint.Rings().size(), 1U);
  EXPECT_NEAR(footprint.Measure(PolygonMeasure::kMinX), 12, 4);  // specks may hang on it
  EXPECT_NEAR(footprint.Measure(PolygonMeasure::kMinY), 9, 4);

  // A mask says it too.
  const auto maskRaster = MakePlaced<std::uint8_t>(
      MakeGrid(0, 0, 1, size, size), 1, [&](unsigned x, unsigned y, unsigned) {
        return static_cast<std::uint8_t>(x >= 20 && x < 50 && y >= 20 && y < 60);
      });
  EXPECT_TRUE(Run(uri, "0", {{"MaskURI", Publish(maskRaster)}}).Succeeded());
  EXPECT_EQ(ReadFootprint<std::uint8_t>(Path()).Measure(PolygonMeasure::kArea), 30 * 40);

  EXPECT_NE(Run(uri, "0", {{"Tolerance", "4"}}).reason.find("no no-data value"), std::string::npos);
}

TEST_F(FootprintCommand, SaysWhyThereIsNone) {
  const auto scene = Scene(100, 100, [](auto...) { return std::uint8_t{1}; });
  const std::string uri = Publish(scene);
  EXPECT_NE(Run("[nothing] ", "0").reason.find("[nothing]"), std::string::npos);
  scene->fails = true;
  const auto failed = Run(uri, "0");
  EXPECT_EQ(failed.result, CommandResult::kFailed);
  EXPECT_EQ(failed.outputs.at("Success"), "0");
  EXPECT_FALSE(fs::exists(Path()));
  scene->fails = false;
  const auto lost = test::RunCommand("MosaicFootPrintsCommand", {{"RasterURI", uri},
                                                                 {"Level", "0"},
                                                                 {"SmoothParameter", "1"},
                                                                 {"VectorMSCFP", "[/no/such] "}});
  EXPECT_EQ(lost.result, CommandResult::kFailed);
  EXPECT_NE(lost.reason.find("/no/such"), std::string::npos);
}

}  // namespace
}  // namespace lumo
