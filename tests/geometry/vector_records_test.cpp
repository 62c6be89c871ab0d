#include "data/vector_records.h"

#include <filesystem>

#include <gtest/gtest.h>

#include "foundation/fault.h"
#include "geometry/ring_touches.h"
#include "support/coordsys_support.h"
#include "support/file_size_limit.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

VectorLayer Polygons() {
  VectorLayer layer;
  layer.name = "fields";
  layer.geometry = VectorGeometry::kPolygon;
  layer.coordSys = test::MakeCoordSys("EPSG:32725");
  layer.fields = {{"label", VectorFieldType::kInteger},
                  {"size", VectorFieldType::kReal},
                  {"kind", VectorFieldType::kText}};
  return layer;
}

/// A square with a hole at (x, 0).
VectorRecord SquareAt(double x) {
  VectorRecord record;
  record.geometry = VectorGeometry::kPolygon;
  record.coordinates = {x,     0, x + 4, 0, x + 4, 4, x,     4, x,     0,
                        x + 1, 1, x + 1, 2, x + 2, 2, x + 2, 1, x + 1, 1};
  record.partEnds = {5, 10};
  record.holes = {0, 1};
  record.values = {std::int64_t{1} << 40, x / 2, std::string("wald µ")};
  return record;
}

class VectorRecords : public testing::Test {
 protected:
  void SetUp() override {
    factory_ = GetVectorRecordFactory();
    ASSERT_NE(factory_, nullptr) << TakeFault().ToUTF8();
  }

  /// The names of all files of the directory.
  std::vector<std::string> Files() const {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(directory_.Path())) {
      names.push_back(entry.path().filename().string());
    }
    return names;
  }

  test::TemporaryDirectory directory_;
  VectorRecordFactory* factory_ = nullptr;
};

TEST_F(VectorRecords, EveryFormatGivesBackWhatItTook) {
  for (const std::string& ending : factory_->SinkEndings()) {
    const std::string path = (directory_.Path() / ("fields" + ending)).string();
    const VectorRecordSinkPtr sink = factory_->Create(path, Polygons());
    ASSERT_TRUE(sink) << ending << TakeFault().ToUTF8();
    EXPECT_FALSE(fs::exists(path)) << "there before it is whole";
    for (int i = 0; i < 3; ++i) ASSERT_TRUE(sink->Write(SquareAt(500000 + 10 * i))) << ending;
    ASSERT_TRUE(sink->Close()) << ending << TakeFault().ToUTF8();
    const VectorRecordSourcePtr source = factory_->Open(path);
    ASSERT_TRUE(source) << ending << TakeFault().ToUTF8();
    ASSERT_EQ(source->LayerCount(), 1U);
    const VectorLayer layer = source->Layer(0);
    EXPECT_EQ(layer.records, 3) << ending;
    ASSERT_TRUE(source->Begin(0, nullptr));
    VectorRecord record;
    unsigned count = 0;
    for (; source->Next(record); ++count) {
      EXPECT_EQ(record.values[record.values.size() - 3], VectorValue(std::int64_t{1} << 40))
          << ending;
      EXPECT_EQ(record.values.back(), VectorValue(std::string("wald µ"))) << ending;
      // A table's shapes are text, and GeoJSON texts on lines are in another system.
      if (ending == ".csv" || ending.starts_with(".geojson") != (ending == ".geojson")) continue;
      EXPECT_EQ(record.holes, SquareAt(0).holes) << ending;
      EXPECT_EQ(record.partEnds, SquareAt(0).partEnds) << ending;
      EXPECT_TRUE(layer.coordSys.IsEqual(Polygons().coordSys)) << ending;
    }
    EXPECT_EQ(count, 3U) << ending;
  }
  const VectorRecordSourcePtr boxed = factory_->Open((directory_.Path() / "fields.gpkg").string());
  ASSERT_TRUE(boxed);
  const MapRect box{500009, 1, 500012, 2};
  ASSERT_TRUE(boxed->Begin(0, &box));
  VectorRecord record;
  EXPECT_TRUE(boxed->Next(record));
  EXPECT_EQ(record.values[1], VectorValue(500010 / 2.0));
  EXPECT_FALSE(boxed->Next(record));
}

TEST_F(VectorRecords, WhatIsNotWholeIsNotThere) {
  for (const std::string& ending : factory_->SinkEndings()) {
    const std::string path = (directory_.Path() / ("given-up" + ending)).string();
    {
      const VectorRecordSinkPtr sink = factory_->Create(path, Polygons());
      ASSERT_TRUE(sink);
      ASSERT_TRUE(sink->Write(SquareAt(0)));
    }
    EXPECT_TRUE(Files().empty()) << ending;
    {
      const VectorRecordSinkPtr sink = factory_->Create(path, Polygons());
      ASSERT_TRUE(sink);
      const test::FileSizeLimit limit(60000);
      bool isWhole = true;
      for (int i = 0; i < 5000 && isWhole; ++i) isWhole = sink->Write(SquareAt(i));
      isWhole = isWhole && sink->Close();
      EXPECT_FALSE(isWhole) << ending;
      EXPECT_NE(TakeFault().ToUTF8().find("given-up"), std::string::npos);
    }
    EXPECT_TRUE(Files().empty()) << ending << ": " << Files().front();
  }
  EXPECT_FALSE(factory_->Create((directory_.Path() / "a.doc").string(), Polygons()));
  EXPECT_FALSE(factory_->Create((directory_.Path() / "none/a.gpkg").string(), Polygons()));
  EXPECT_FALSE(factory_->Open((directory_.Path() / "none.gpkg").string()));
}

TEST(SplitAtTouches, MakesHolesOfLoops) {
  // A hole ring round two squares that touch at (3, 3), and an outer ring that touches itself there
  // around one hole.
  TracedPolygon two;
  two.holes = {0, 1};
  two.starts = {0, 5};
  two.coordinates = {9, 9, 0, 9, 0, 0, 9, 0, 9, 9, 5, 5, 5, 3,
                     3, 3, 3, 1, 1, 1, 1, 3, 3, 3, 3, 5, 5, 5};
  TracedPolygon split;
  ASSERT_TRUE(SplitAtTouches(two, split));
  EXPECT_EQ(split.holes, (std::vector<unsigned char>{0, 1, 1}));
  EXPECT_EQ(split.starts, (std::vector<std::uint32_t>{0, 5, 10}));
  TracedPolygon plain = two;
  plain.holes.resize(1);
  plain.starts.resize(1);
  plain.coordinates.resize(10);
  EXPECT_FALSE(SplitAtTouches(plain, split));

  TracedPolygon pinched;
  pinched.holes = {0};
  pinched.starts = {0};
  pinched.coordinates = {4, 2, 2, 2, 2, 4, 4, 4, 4, 6, 0, 6, 0, 0, 6, 0, 6, 4, 4, 4, 4, 2};
  ASSERT_TRUE(SplitAtTouches(pinched, split));
  EXPECT_EQ(split.holes, (std::vector<unsigned char>{0, 1}));
}

}  // namespace
}  // namespace lumo
