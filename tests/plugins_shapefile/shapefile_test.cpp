#include <filesystem>
#include <fstream>
#include <gdal.h>
#include <ogr_api.h>

#include "data/mt_connection.h"
#include "georef/std_georef.h"
#include "support/coordsys_support.h"
#include "support/raster_sources.h"
#include "support/sample_data.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::Strings;

VectorDataConnectionPtr OpenShapes(const std::vector<std::string>& pieces) {
  return VectorDataConnectionPtr(
      GetGlobalDataManager().Connect(Strings(pieces), GeoRefPtr(), MetadataPtr()));
}

VectorReaderPtr<double> ReaderOf(const VectorDataConnectionPtr& source) {
  return source ? source->VectorReaderDispatch()->Get<double>() : VectorReaderPtr<double>();
}

std::string Release(VectorDataConnectionPtr& source) {
  TakeFault();
  DataConnectionPtr connection(source);
  source = VectorDataConnectionPtr();
  GetGlobalDataManager().ReleaseConnection(connection);
  return TakeFault().ToUTF8();
}

struct Shape {
  std::int32_t geometry = 0;
  std::vector<unsigned> ends;
  std::vector<double> vertices;
  friend bool operator==(const Shape&, const Shape&) = default;
};

Shape Read(VectorReader<double>& reader, std::int32_t feature) {
  Shape shape;
  unsigned parts = 0, vertices = 0;
  EXPECT_TRUE(reader.GetFeatureInfo(feature, &shape.geometry, &parts, &vertices));
  shape.ends.resize(parts);
  shape.vertices.resize(2 * std::size_t{vertices});
  EXPECT_TRUE(reader.ReadGeometryT1(feature, shape.vertices.data(), shape.ends.data()));
  return shape;
}

constexpr auto kPoint = static_cast<std::int32_t>(VectorGeometry::kPoint);
constexpr auto kLine = static_cast<std::int32_t>(VectorGeometry::kLine);
constexpr auto kPolygon = static_cast<std::int32_t>(VectorGeometry::kPolygon);

/// Makes a shapefile by GDAL alone; one text of GDAL's for each shape.
void MakeShapes(const std::string& path, OGRwkbGeometryType type,
                const std::vector<std::string>& shapes) {
  GDALAllRegister();
  GDALDatasetH const file = GDALCreate(GDALGetDriverByName("ESRI Shapefile"), path.c_str(), 0, 0, 0,
                                       GDT_Unknown, nullptr);
  OGRLayerH const layer = GDALDatasetCreateLayer(file, "made", nullptr, type, nullptr);
  for (std::string text : shapes) {
    OGRFeatureH const feature = OGR_F_Create(OGR_L_GetLayerDefn(layer));
    OGRGeometryH geometry = nullptr;
    char* at = text.data();
    ASSERT_EQ(OGR_G_CreateFromWkt(&at, nullptr, &geometry), OGRERR_NONE);
    OGR_F_SetGeometryDirectly(feature, geometry);
    ASSERT_EQ(OGR_L_CreateFeature(layer, feature), OGRERR_NONE);
    OGR_F_Destroy(feature);
  }
  GDALClose(file);
}

TEST(Shapefile, ReadsTheSample) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const std::string path = test::SampleData("box.shp");
  for (const std::vector<std::string>& pieces :
       {std::vector<std::string>{path}, std::vector<std::string>{"Shapefile", path}}) {
    const auto source = OpenShapes(pieces);
    ASSERT_TRUE(source) << TakeFault().ToUTF8();
    EXPECT_EQ(source->DataSourceType(), static_cast<int>(DataSourceKind::kVector));
    EXPECT_EQ(source->DataType(), 5);
    EXPECT_EQ(source->URI().ToUTF8(), fs::canonical(path));
    const VectorDef def = source->VectorDef();
    EXPECT_EQ(def.geometry, VectorGeometry::kPolygon);
    EXPECT_EQ(def.features, 1U);
    EXPECT_EQ(def.format.ToUTF8(), "Shapefile");
    ASSERT_TRUE(def.geoRef);
    EXPECT_FALSE(def.geoRef->CoordinateSystem().IsEmpty());

    const Shape shape = Read(*ReaderOf(source), 0);
    EXPECT_EQ(shape.geometry, kPolygon);
    ASSERT_FALSE(shape.ends.empty());
    EXPECT_EQ(ReaderOf(source)->Vertices(), static_cast<int>(shape.ends.back()));
    // The header of the file has the box of its shapes: eight bytes each, from byte 36 on.
    std::ifstream in(path, std::ios::binary);
    in.seekg(36);
    double box[4];
    in.read(reinterpret_cast<char*>(box), sizeof box);
    EXPECT_EQ(def.bounds.minX, box[0]);
    EXPECT_EQ(def.bounds.minY, box[1]);
    EXPECT_EQ(def.bounds.maxX, box[2]);
    EXPECT_EQ(def.bounds.maxY, box[3]);
    double minX = 1e300, maxY = -1e300;
    for (std::size_t i = 0; i < shape.vertices.size(); i += 2) {
      minX = std::min(minX, shape.vertices[i]);
      maxY = std::max(maxY, shape.vertices[i + 1]);
    }
    EXPECT_EQ(minX, box[0]);
    EXPECT_EQ(maxY, box[3]);
  }
}

TEST(Shapefile, ReadsPartsAndHoles) {
  test::TemporaryDirectory directory;
  const struct {
    const char* name;
    OGRwkbGeometryType type;
    std::vector<std::string> shapes;
    std::vector<Shape> want;
  } cases[] = {
      {"polygons",
       wkbPolygon,
       {"MULTIPOLYGON(((0 0,0 9,9 9,9 0,0 0),(2 2,4 2,4 4,2 2)),((20 0,20 5,25 5,20 0)))",
        "POLYGON((1 1,1 2,2 2,1 1))"},
       {{kPolygon, {5, 9, 13}, {0, 0, 0, 9, 9, 9,  9, 0,  0, 0,  2, 2,  4,
                                2, 4, 4, 2, 2, 20, 0, 20, 5, 25, 5, 20, 0}},
        {kPolygon, {4}, {1, 1, 1, 2, 2, 2, 1, 1}}}},
      {"lines",
       wkbLineString,
       {"MULTILINESTRING((0 0,1.5 1),(5 5,6 6,7 5))", "LINESTRING(3 4,5 6)"},
       {{kLine, {2, 5}, {0, 0, 1.5, 1, 5, 5, 6, 6, 7, 5}}, {kLine, {2}, {3, 4, 5, 6}}}},
      {"points",
       wkbPoint,
       {"POINT(1 2)", "POINT(3 4)"},
       {{kPoint, {1}, {1, 2}}, {kPoint, {1}, {3, 4}}}},
      {"heights", wkbPoint25D, {"POINT Z(1 2 9)"}, {{kPoint, {1}, {1, 2}}}},
      {"multipoints", wkbMultiPoint, {"MULTIPOINT(1 2,3 4)"}, {{kPoint, {1, 2}, {1, 2, 3, 4}}}},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    const std::string path = (directory.Path() / (std::string(c.name) + ".shp")).string();
    ASSERT_NO_FATAL_FAILURE(MakeShapes(path, c.type, c.shapes));
    const auto source = OpenShapes({path});
    const auto reader = ReaderOf(source);
    ASSERT_TRUE(reader) << TakeFault().ToUTF8();
    ASSERT_EQ(source->VectorDef().features, c.want.size());
    EXPECT_FALSE(source->VectorDef().geoRef);
    std::vector<double> all;
    std::vector<unsigned> ends;
    for (std::size_t i = 0; i < c.want.size(); ++i) {
      EXPECT_EQ(Read(*reader, static_cast<std::int32_t>(i)), c.want[i]);
      all.insert(all.end(), c.want[i].vertices.begin(), c.want[i].vertices.end());
      ends.push_back(static_cast<unsigned>(all.size() / 2));
    }
    ASSERT_EQ(reader->Vertices(), static_cast<int>(all.size() / 2));
    std::vector<double> vertices(all.size());
    std::vector<unsigned> featureEnds(ends.size());
    ASSERT_TRUE(reader->ReadGeometryT2(vertices.data(), featureEnds.data()));
    EXPECT_EQ(vertices, all);
    EXPECT_EQ(featureEnds, ends);
    std::int32_t geometry = 0;
    unsigned parts = 0, count = 0;
    EXPECT_FALSE(
        reader->GetFeatureInfo(static_cast<int>(c.want.size()), &geometry, &parts, &count));
    EXPECT_FALSE(reader->GetFeatureInfo(-1, &geometry, &parts, &count));
  }
}

VectorDataConnectionPtr Create(const std::string& path, VectorGeometry geometry) {
  VectorDef def;
  def.format = "Shapefile";
  def.geometry = geometry;
  def.geoRef.Reset(new StdGeoRef);
  def.geoRef->SetCoordinateSystem(test::MakeCoordSys("EPSG:31985"));
  const VectorDataConnectionPtr made(new MtVectorDataConnection);
  return made->CreateVector(Strings({path}), def) ? made : VectorDataConnectionPtr();
}

TEST(Shapefile, KeepsWhatIsAppended) {
  test::TemporaryDirectory directory;
  const Shape shapes[] = {{kPoint, {1}, {288776.125, 9120760.5}},
                          {kLine, {3}, {1, 2, 3, 4.5, 5, 6}},
                          {kPolygon, {4}, {1, 1, 1, 2, 2, 2, 1, 1}}};
  for (const Shape& shape : shapes) {
    const std::string path =
        (directory.Path() / (std::to_string(shape.geometry) + ".shp")).string();
    auto made = Create(path, static_cast<VectorGeometry>(shape.geometry));
    ASSERT_TRUE(made) << TakeFault().ToUTF8();
    const auto count = static_cast<std::int32_t>(shape.ends[0]);
    ASSERT_TRUE(ReaderOf(made)->CanWriteGeometry(1));
    for (int i = 0; i < 3; ++i) {
      ASSERT_TRUE(ReaderOf(made)->AppendGeometry(shape.geometry, count, shape.vertices.data()))
          << TakeFault().ToUTF8();
    }
    EXPECT_FALSE(fs::exists(path));
    EXPECT_EQ(Read(*ReaderOf(made), 2), shape);
    ASSERT_EQ(Release(made), "");

    auto again = OpenShapes({path});
    ASSERT_TRUE(again) << TakeFault().ToUTF8();
    EXPECT_EQ(again->VectorDef().features, 3U);
    EXPECT_EQ(Read(*ReaderOf(again), 1), shape);
    ASSERT_TRUE(again->VectorDef().geoRef);
    EXPECT_TRUE(
        again->VectorDef().geoRef->CoordinateSystem().IsEqual(test::MakeCoordSys("EPSG:31985")));

    // Other places for the second, and a fourth.
    std::vector<double> moved = shape.vertices;
    for (double& place : moved) place += 10;
    ASSERT_TRUE(ReaderOf(again)->WriteGeometryT1(1, moved.data(), shape.ends.data()))
        << TakeFault().ToUTF8();
    ASSERT_TRUE(ReaderOf(again)->AppendGeometry(shape.geometry, count, moved.data()));
    ASSERT_EQ(Release(again), "");
    again = OpenShapes({path});
    EXPECT_EQ(again->VectorDef().features, 4U);
    EXPECT_EQ(Read(*ReaderOf(again), 0), shape);
    EXPECT_EQ(Read(*ReaderOf(again), 1).vertices, moved);
    EXPECT_EQ(Read(*ReaderOf(again), 3).vertices, moved);
  }
}

TEST(Shapefile, KeepsHeightsOfVerticesThatAreMoved) {
  test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "heights.shp").string();
  ASSERT_NO_FATAL_FAILURE(MakeShapes(path, wkbLineString25D, {"LINESTRING Z(1 2 7,3 4 8)"}));
  auto source = OpenShapes({path});
  const double moved[] = {11, 12, 13, 14};
  const unsigned ends[] = {2};
  ASSERT_TRUE(ReaderOf(source)->WriteGeometryT1(0, moved, ends)) << TakeFault().ToUTF8();
  ASSERT_EQ(Release(source), "");
  GDALDatasetH const file = GDALOpenEx(path.c_str(), GDAL_OF_VECTOR, nullptr, nullptr, nullptr);
  OGRFeatureH const feature = OGR_L_GetFeature(GDALDatasetGetLayer(file, 0), 0);
  EXPECT_EQ(OGR_G_GetX(OGR_F_GetGeometryRef(feature), 1), 13);
  EXPECT_EQ(OGR_G_GetZ(OGR_F_GetGeometryRef(feature), 1), 8);
  OGR_F_Destroy(feature);
  GDALClose(file);
}

TEST(Shapefile, DeletedRecordsDoNotCount) {
  test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "made.shp").string();
  ASSERT_NO_FATAL_FAILURE(MakeShapes(path, wkbPoint, {"POINT(1 1)", "POINT(2 2)", "POINT(3 3)"}));
  GDALDatasetH const file =
      GDALOpenEx(path.c_str(), GDAL_OF_VECTOR | GDAL_OF_UPDATE, nullptr, nullptr, nullptr);
  ASSERT_EQ(OGR_L_DeleteFeature(GDALDatasetGetLayer(file, 0), 1), OGRERR_NONE);
  GDALClose(file);
  const auto source = OpenShapes({path});
  ASSERT_EQ(source->VectorDef().features, 2U);
  EXPECT_EQ(Read(*ReaderOf(source), 1).vertices, (std::vector<double>{3, 3}));
}

TEST(Shapefile, RefusesWhatIsNoShape) {
  test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "made.shp").string();
  auto made = Create(path, VectorGeometry::kPolygon);
  ASSERT_TRUE(made);
  const double open[] = {0, 0, 0, 1, 1, 1, 1, 0};
  const struct {
    std::int32_t geometry, count;
  } cases[] = {{kPolygon, 4}, {kPolygon, 2}, {kPolygon, 0}, {kPolygon, -1}, {kLine, 2}, {7, 1}};
  for (const auto& c : cases) {
    EXPECT_FALSE(ReaderOf(made)->AppendGeometry(c.geometry, c.count, open));
    EXPECT_TRUE(TakeFault().ToUTF8().starts_with(path + ": "));
  }
  const double ring[] = {0, 0, 0, 1, 1, 1, 0, 0};
  ASSERT_TRUE(ReaderOf(made)->AppendGeometry(kPolygon, 4, ring));
  const unsigned ends[] = {4}, otherEnds[] = {3};
  EXPECT_FALSE(ReaderOf(made)->WriteGeometryT1(0, open, ends));
  EXPECT_FALSE(ReaderOf(made)->WriteGeometryT1(0, ring, otherEnds));
  EXPECT_EQ(Read(*ReaderOf(made), 0).vertices, std::vector<double>(ring, ring + 8));
  ASSERT_EQ(Release(made), "");
  EXPECT_EQ(OpenShapes({path})->VectorDef().features, 1U);
}

TEST(Shapefile, BrokenFilesFailWithWordsAndSilently) {
  test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "made.shp").string();
  const std::vector<std::string> shapes(100, "POLYGON((1 1,1 2,2 2,3 1,1 1))");
  ASSERT_NO_FATAL_FAILURE(MakeShapes(path, wkbPolygon, shapes));
  std::ifstream in(path, std::ios::binary);
  const std::string whole{std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
  for (const std::size_t size :
       {std::size_t{0}, std::size_t{50}, std::size_t{100}, whole.size() / 2, whole.size() - 20}) {
    SCOPED_TRACE(size);
    std::ofstream(path, std::ios::binary) << whole.substr(0, size);
    TakeFault();
    testing::internal::CaptureStderr();
    const auto source = OpenShapes({path});
    bool isRead = bool(source);
    if (isRead) {
      const auto reader = ReaderOf(source);
      std::vector<double> vertices(2 * 5 * 100);
      std::vector<unsigned> ends(100);
      isRead = reader->ReadGeometryT2(vertices.data(), ends.data());
    }
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
    EXPECT_FALSE(isRead);
    EXPECT_TRUE(TakeFault().ToUTF8().starts_with(path + ": "));
  }
  EXPECT_FALSE(Create((directory.Path() / "missing" / "a.shp").string(), VectorGeometry::kPoint));
  EXPECT_FALSE(Create((directory.Path() / "a.txt").string(), VectorGeometry::kPoint));
  EXPECT_FALSE(Create((directory.Path() / "a.shp").string(), VectorGeometry::kUnknown));
  EXPECT_EQ(std::distance(fs::directory_iterator(directory.Path()), fs::directory_iterator()), 3);
}

TEST(Shapefile, ANewFileTakesThePlaceOfTheOlderOne) {
  test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "made.shp").string();
  ASSERT_NO_FATAL_FAILURE(MakeShapes(path, wkbPoint, {"POINT(1 1)", "POINT(2 2)"}));
  std::ofstream(directory.Path() / "made.qix") << "an index of other shapes";
  auto made = Create(path, VectorGeometry::kLine);
  ASSERT_TRUE(made);
  EXPECT_EQ(OpenShapes({path})->VectorDef().features, 2U);
  const double line[] = {0, 0, 5, 5};
  ASSERT_TRUE(ReaderOf(made)->AppendGeometry(kLine, 2, line));
  ASSERT_EQ(Release(made), "");
  EXPECT_EQ(Read(*ReaderOf(OpenShapes({path})), 0).vertices, std::vector<double>(line, line + 4));
  for (const auto& entry : fs::directory_iterator(directory.Path())) {
    EXPECT_EQ(entry.path().stem(), "made");
    EXPECT_NE(entry.path().extension(), ".qix");
  }
}

}  // namespace
}  // namespace lumo
