#include <random>
#include <thread>

#include "foundation/fault.h"
#include "georef/std_georef.h"
#include "raster/interleave.h"
#include "regions/pixel_address_roi_def.h"
#include "regions/projected_geometry_roi.h"
#include "regions/rasterized_pixel_address_roi.h"
#include "regions/region_states.h"
#include "regions/region_support.h"
#include "support/placed_raster.h"

namespace lumo {
namespace {

using test::AddShape;
using test::MakeShapes;
using test::Ring;
using test::RowsOf;
using Rows = std::vector<std::string>;

Ring Square(double left, double top, double right, double bottom) {
  return {{left, top}, {right, top}, {right, bottom}, {left, bottom}};
}

ROIDefPtr RegionOf(const GeometryPtr& geometry, const ScanOptions& options = {}) {
  return ROIDefPtr(new GeometryROIDef(geometry, options));
}

ROIDefPtr GroupOf(const std::vector<ROIDefPtr>& list) {
  Array<ROIDefPtr> children{ArrayDims(static_cast<unsigned>(list.size()))};
  std::copy(list.begin(), list.end(), children.begin());
  return ROIDefPtr(new GroupROIDef(children));
}

PixelAddressROIDefPtr PixelsOf(const Ring& pixels, const GeoRefPtr& geoRef = {}) {
  PixelAddressROIDefPtr region(new PixelAddressROIDef);
  region->SetGeoRef(geoRef);
  Array<Point2D<unsigned>> points{ArrayDims(static_cast<unsigned>(pixels.size()))};
  for (unsigned i = 0; i < points.GetCount(); ++i) {
    points[i] = {static_cast<unsigned>(pixels[i].x), static_cast<unsigned>(pixels[i].y)};
  }
  EXPECT_TRUE(region->SetAddresses(points));
  return region;
}

TEST(RasterizedGeometryROI, TakesHolesOutOfTheirRecordAlone) {
  const auto shapes = MakeShapes({});
  AddShape(*shapes, {Square(0, 0, 6, 4), Square(1, 1, 4, 3)});
  AddShape(*shapes, {Square(2, 1, 3, 2)});
  const RasterizedROIPtr region = RasterizeOn(RegionOf(shapes), 8, 5, GeoRefPtr());
  const Rows want{"######..", "#.#.##..", "#...##..", "######..", "........"};
  EXPECT_EQ(RowsOf(*region, {0, 0, 7, 4}), want);
  EXPECT_EQ(RowsOf(*region, {1, 1, 3, 2}), Rows({".#.", "..."}));

  ROIHitInfoPtr info;
  ASSERT_TRUE(region->HitTest({2, 1}, info));
  const Pointer<GeometryROIHitInfo> hit(info);
  ASSERT_TRUE(hit);
  EXPECT_EQ(hit->Kind(), kGeometryHit);
  EXPECT_EQ(hit->Record(), 0U);  // the outer ring is asked though a hole lies there
  EXPECT_EQ(hit->Part(), 0U);
  EXPECT_TRUE(info->ROIDef() == region->ROIDef());
  EXPECT_FALSE(region->HitTest({7, 1}, info));
  EXPECT_FALSE(info);
}

TEST(RasterizedGeometryROI, AddsUpInAMaskOfItsSize) {
  const RasterizedROIPtr one = RasterizeOn(RegionOf(MakeShapes({Square(0, 0, 2, 2)})), 4, 4, {});
  const RasterizedROIPtr other = RasterizeOn(RegionOf(MakeShapes({Square(1, 1, 3, 3)})), 4, 4, {});
  Array<unsigned char> mask;
  std::uint64_t count = 0;
  ASSERT_TRUE(one->Mask({0, 0, 3, 3}, mask, count));
  EXPECT_EQ(count, 4U);
  ASSERT_TRUE(other->Mask({0, 0, 3, 3}, mask, count));
  EXPECT_EQ(count, 3U);
  EXPECT_EQ(CountMarks(mask.GetData(), 16), 7U);
  ASSERT_TRUE(other->Mask({0, 0, 2, 3}, mask, count));
  EXPECT_EQ(count, 4U);
}

TEST(RasterizedGeometryROI, AnswersBelowItsGridToo) {
  const RasterizedROIPtr region =
      RasterizeOn(RegionOf(MakeShapes({Square(0, -90000, 3, 90000)})), 3, 3, GeoRefPtr());
  for (const unsigned line : {2U, 1500U, 70000U, 89999U, 90000U, 1000U}) {
    EXPECT_EQ(RowsOf(*region, {0, line, 3, line})[0], line < 90000 ? "###." : "....") << line;
    ROIHitInfoPtr info;
    EXPECT_EQ(region->HitTest({2, line}, info), line < 90000);
  }
}

TEST(RasterizedGeometryROI, ShowsEveryChangeAtTheNextCall) {
  const auto shapes = MakeShapes({Square(0, 0, 2, 2)});
  const RasterizedROIPtr region = RasterizeOn(RegionOf(shapes), 6, 2, {});
  const SubRect all(0, 0, 5, 1);
  EXPECT_EQ(RowsOf(*region, all), Rows({"##....", "##...."}));
  std::uint32_t part = 0;
  const std::uint32_t added = AddShape(*shapes, {Square(4, 0, 5, 1)});
  EXPECT_EQ(RowsOf(*region, all), Rows({"##..#.", "##...."}));
  ASSERT_TRUE(shapes->AddPart(added, false, part, test::PointsOf(Square(5, 0, 6, 2))));
  EXPECT_EQ(RowsOf(*region, all), Rows({"##..##", "##...#"}));
  ASSERT_TRUE(shapes->SetCoordinates(0, 0, test::PointsOf(Square(1, 0, 3, 2))));
  EXPECT_EQ(RowsOf(*region, all), Rows({".##.##", ".##..#"}));
  ASSERT_TRUE(shapes->RemovePart(added, part));
  ASSERT_TRUE(shapes->RemoveRecord(0));
  EXPECT_EQ(RowsOf(*region, all), Rows({"....#.", "......"}));
}

TEST(RasterizedGeometryROI, FindsRecordsOfManyWithoutLosingAny) {
  // More records than stay scanned: a raster with one pixel in each square of 3 by 3.
  const auto shapes = MakeShapes({});
  constexpr unsigned kSide = 120;
  for (unsigned y = 0; y < kSide; ++y)
    for (unsigned x = 0; x < kSide; ++x)
      AddShape(*shapes, {{{3.0 * x + 1, 3.0 * y + 2}}}, true, kPointsRecord);
  ASSERT_GT(shapes->RecordCount(), RasterizedGeometry::kCacheLimit);
  const RasterizedROIPtr region = RasterizeOn(RegionOf(shapes), 3 * kSide, 3 * kSide, {});
  for (const SubRect& rect : {SubRect(0, 0, 359, 359), SubRect(100, 50, 163, 113)}) {
    const Rows rows = RowsOf(*region, rect);
    for (unsigned y = 0; y < rect.Height(); ++y)
      for (unsigned x = 0; x < rect.Width(); ++x)
        ASSERT_EQ(rows[y][x] == '#', (rect.left + x) % 3 == 1 && (rect.top + y) % 3 == 2);
  }
  ROIHitInfoPtr info;
  ASSERT_TRUE(region->HitTest({3 * 7 + 1, 3 * 5 + 2}, info));
  EXPECT_EQ(Pointer<GeometryROIHitInfo>(info)->Record(), 5 * kSide + 7);
}

TEST(RasterizedGeometryROI, FailsWithTheShapeThatCannotBeCarried) {
  const auto shapes = MakeShapes({Square(0, 0, 2, 2), {{1, 1}, {std::nan(""), 5}, {3, 3}}});
  const RasterizedROIPtr region = RasterizeOn(RegionOf(shapes), 6, 6, {});
  Array<unsigned char> mask;
  std::uint64_t count = 0;
  std::uint32_t part = 0;
  ASSERT_TRUE(shapes->AddPart(0, false, part, test::PointsOf({{HUGE_VAL, 0}, {1, 1}})));
  for (int again = 0; again < 2; ++again) {
    EXPECT_FALSE(region->Mask({0, 0, 5, 5}, mask, count));
    EXPECT_NE(TakeFault().ToUTF8().find("record 0, part 1"), std::string::npos);
  }
  ASSERT_TRUE(shapes->RemovePart(0, part));
  EXPECT_FALSE(region->Mask({0, 0, 5, 5}, mask, count));
  EXPECT_NE(TakeFault().ToUTF8().find("record 1, part 0"), std::string::npos);
  Array<unsigned char> states{ArrayDims(6, 6)};
  EXPECT_FALSE(FillRegionStates(*region, 0, {0, 0, 5, 5}, Interleave::None, 1, states));
  const auto onMap = RegionOf(GeometryPtr(new MemoryGeometry(test::MakeCoordSys("EPSG:32725"))),
                              {ScanRules::kTold, ShapeCoordinates::kMap});
  AddShape(static_cast<MemoryGeometry&>(*GeometryROIDefPtr(onMap)->Geometry()),
           {Square(0, 0, 1, 1)});
  EXPECT_FALSE(RasterizeOn(onMap, 6, 6, GeoRefPtr())->Mask({0, 0, 5, 5}, mask, count));
  EXPECT_NE(TakeFault().ToUTF8().find("no geo-reference"), std::string::npos);
}

TEST(RasterizedGeometryROI, CarriesShapesToTheRastersMap) {
  // The same polygon in longitude and latitude, in UTM, and in pixels.
  const GeoRefPtr grid = MakeGrid(300000, 9110000, 30, 200, 150, "EPSG:32725");
  const Ring pixels{{20, 10}, {180, 40}, {120, 140}, {30, 90}};
  const CoordSys geographic = test::MakeCoordSys("EPSG:4326");
  GeoRefPtr longLat(new StdGeoRef);
  longLat->SetCoordinateSystem(geographic);
  Ring onMap, onGlobe;
  for (const Point2D<double>& pixel : pixels) {
    double x = 0, y = 0;
    ASSERT_TRUE(grid->PixelToMap(pixel.x, pixel.y, x, y));
    onMap.push_back({x, y});
    double pair[] = {x, y};
    Array<double> carried(pair, ArrayDims(1, 2));
    ASSERT_TRUE(grid->MapToMap(carried, *longLat));
    onGlobe.push_back({pair[0], pair[1]});
  }
  const auto regionIn = [](const char* system, const Ring& ring, ShapeCoordinates coordinates) {
    Pointer<MemoryGeometry> geometry(
        new MemoryGeometry(system != nullptr ? test::MakeCoordSys(system) : CoordSys()));
    AddShape(*geometry, {ring});
    return RegionOf(geometry, {ScanRules::kSteady, coordinates});
  };
  const SubRect all(0, 0, 199, 149);
  const auto rows = [&](const ROIDefPtr& region) {
    return RowsOf(*RasterizeOn(region, 1, 1, grid), all);
  };
  const Rows want = rows(regionIn(nullptr, pixels, ShapeCoordinates::kTold));
  EXPECT_EQ(want[70].substr(0, 5), ".....");
  EXPECT_EQ(want[70].substr(60, 5), "#####");
  EXPECT_EQ(rows(regionIn("EPSG:32725", pixels, ShapeCoordinates::kPixel)), want);
  // Carried vertices differ from those in pixels by rounding, which the steady scan bears.
  EXPECT_EQ(rows(regionIn("EPSG:32725", onMap, ShapeCoordinates::kTold)), want);
  EXPECT_EQ(rows(regionIn(nullptr, onMap, ShapeCoordinates::kMap)), want);
  EXPECT_EQ(rows(regionIn("EPSG:4326", onGlobe, ShapeCoordinates::kTold)), want);

  const RasterizedROIPtr projected =
      RasterizeOn(regionIn("EPSG:4326", onGlobe, ShapeCoordinates::kTold), 1, 1, grid);
  EXPECT_EQ(projected->Samples(), 200U);
  ROIHitInfoPtr info;
  ASSERT_TRUE(projected->HitTest({62, 70}, info));
  EXPECT_TRUE(info->ROIDef() == projected->ROIDef());
}

TEST(RasterizedPixelAddressROI, IsMovedWhereTheGridsDifferByTheirOrigin) {
  const GeoRefPtr own = MakeGrid(1000, 2000, 10, 20, 20);
  const PixelAddressROIDefPtr region = PixelsOf({{0, 0}, {3, 1}, {4, 1}}, own);
  const struct {
    double x, y;
    Rows want;
  } cases[] = {
      {1000, 2000, {"#......", "...##..", "......."}},
      {1020, 1990, {".##....", ".......", "......."}},  // 2 pixels right, 1 down of the own grid
      {980, 2010, {".......", "..#....", ".....##"}},
  };
  for (const auto& c : cases) {
    const GeoRefPtr grid = MakeGrid(c.x, c.y, 10, 7, 3);
    RasterizedPixelAddressROI form(region, 1, 1, grid);
    EXPECT_EQ(form.IsShifted(), c.x != 1000);
    EXPECT_FALSE(form.IsProjected());
    EXPECT_EQ(RowsOf(form, {0, 0, 6, 2}), c.want);
    for (unsigned y = 0; y < 3; ++y) {
      for (unsigned x = 0; x < 7; ++x) {
        ROIHitInfoPtr info;
        EXPECT_EQ(form.HitTest({x, y}, info), c.want[y][x] == '#');
        EXPECT_EQ(RowsOf(form, {x, y, x, y})[0][0], c.want[y][x]);
        if (info) {
          EXPECT_EQ(info->Kind(), kPixelHit);
        }
      }
    }
  }
  const RasterizedROIPtr plain = RasterizeOn(region, 9, 9, GeoRefPtr());
  plain->SetOffset(-1, 1);
  EXPECT_EQ(RowsOf(*plain, {0, 0, 6, 1}), Rows({"....##.", "......."}));
}

TEST(ProjectedPixelAddressROI, CarriesPixelsToAnotherGrid) {
  // A disc of pixels of 30 m, on a grid of 20 m in another zone.
  const GeoRefPtr own = MakeGrid(790000, 9110000, 30, 400, 400, "EPSG:32724");
  Ring pixels;
  for (int y = 0; y < 400; ++y)
    for (int x = 0; x < 400; ++x)
      if (std::hypot(x + 0.5 - 250, y + 0.5 - 240) < 110) pixels.push_back({1.0 * x, 1.0 * y});
  const PixelAddressROIDefPtr region = PixelsOf(pixels, own);
  double corner[] = {100, 100};
  Array<double> points(corner, ArrayDims(1, 2));
  const GeoRefPtr target(new StdGeoRef);
  target->SetCoordinateSystem(test::MakeCoordSys("EPSG:32725"));
  ASSERT_TRUE(own->PixelToMap(points) && own->MapToMap(points, *target));
  const GeoRefPtr grid = MakeGrid(corner[0], corner[1], 20, 500, 480, "EPSG:32725");
  RasterizedPixelAddressROI form(region, 1, 1, grid);
  ASSERT_TRUE(form.IsProjected());
  const auto check = [&](double radius) {
    const Rows rows = RowsOf(form, {0, 0, 499, 479});
    unsigned inside = 0;
    for (unsigned y = 0; y < 480; y += 3) {
      for (unsigned x = 0; x < 500; x += 3) {
        double place[] = {x + 0.5, y + 0.5};
        Array<double> carried(place, ArrayDims(1, 2));
        ASSERT_TRUE(grid->PixelToPixel(carried, *own));
        const double distance = std::hypot(place[0] - 250, place[1] - 240);
        if (std::abs(distance - radius) < 2) continue;
        ASSERT_EQ(rows[y][x] == '#', distance < radius) << x << ", " << y;
        ROIHitInfoPtr info;
        ASSERT_EQ(form.HitTest({x, y}, info), distance < radius);
        inside += distance < radius;
      }
    }
    EXPECT_GT(inside, 100U);
    EXPECT_EQ(RowsOf(form, {200, 250, 249, 299}).front(), rows[250].substr(200, 50));
  };
  check(110);
  Ring fewer;
  for (const Point2D<double>& pixel : pixels)
    if (std::hypot(pixel.x + 0.5 - 250, pixel.y + 0.5 - 240) < 50) fewer.push_back(pixel);
  Array<Point2D<unsigned>> changed{ArrayDims(static_cast<unsigned>(fewer.size()))};
  for (unsigned i = 0; i < changed.GetCount(); ++i) {
    changed[i] = {static_cast<unsigned>(fewer[i].x), static_cast<unsigned>(fewer[i].y)};
  }
  ASSERT_TRUE(region->SetAddresses(changed));
  check(50);
}

TEST(RasterizedGroupROI, CountsPixelsOfSeveralChildrenOnce) {
  const auto shapes = MakeShapes({Square(0, 0, 3, 2)});
  const ROIDefPtr pixels = PixelsOf({{2, 0}, {4, 1}});
  const ROIDefPtr group = GroupOf({RegionOf(shapes), pixels});
  const RasterizedROIPtr form = RasterizeOn(group, 6, 3, GeoRefPtr());
  EXPECT_EQ(RowsOf(*form, {0, 0, 5, 2}), Rows({"###...", "###.#.", "......"}));
  ROIHitInfoPtr info;
  ASSERT_TRUE(form->HitTest({2, 0}, info));
  EXPECT_EQ(info->Kind(), kGeometryHit);
  ASSERT_TRUE(form->HitTest({4, 1}, info));
  EXPECT_TRUE(info->ROIDef() == pixels);

  Array<ROIDefPtr> fewer{ArrayDims(1)};
  fewer[0] = pixels;
  GroupROIDefPtr(group)->SetChildren(fewer);
  EXPECT_EQ(RowsOf(*form, {0, 0, 5, 2}), Rows({"..#...", "....#.", "......"}));
  const RasterizedROIPtr moved = RasterizeOn(GroupOf({group, RegionOf(shapes)}), 6, 3, {});
  moved->SetOffset(1, 0);
  EXPECT_EQ(RowsOf(*moved, {0, 0, 5, 2}), Rows({"##....", "##.#..", "......"}));
}

/// Regions of each kind on a raster of 97 by 83.
std::vector<RasterizedROIPtr> AllForms() {
  std::mt19937 random(5);
  Ring points;
  for (int i = 0; i < 60; ++i) points.push_back({1.0 * (random() % 97), 1.0 * (random() % 83)});
  const auto shapes = MakeShapes({{{-5, 3}, {60.2, 10.7}, {93, 120}, {20, 61}}});
  AddShape(*shapes, {{{50, -3}, {99, 20}, {99, 60}}, {{70, 20}, {90, 25}, {85, 30}}});
  const ROIDefPtr pixels = PixelsOf(points);
  const ROIDefPtr lines = RegionOf(MakeShapes({{{3, 3}, {80, 20}, {20, 82}}}, kPolylineRecord));
  std::vector<RasterizedROIPtr> forms;
  for (const ROIDefPtr& region : {RegionOf(shapes), pixels, lines, GroupOf({pixels, lines})}) {
    forms.push_back(RasterizeOn(region, 97, 83, GeoRefPtr()));
  }
  return forms;
}

TEST(FillRegionStates, GivesThePixelsOfTheMaskAtEveryLevelAndInterleave) {
  for (const RasterizedROIPtr& form : AllForms()) {
    for (const unsigned level : {0U, 1U, 3U}) {
      const unsigned width = (97 + (1U << level) - 1) >> level;
      const unsigned height = (83 + (1U << level) - 1) >> level;
      const SubRect full(0, 0, (width << level) - 1, (height << level) - 1);
      const Rows mask = RowsOf(*form, full);
      for (const SubRect& rect :
           {SubRect(0, 0, width - 1, height - 1), SubRect(2, 1, width / 2, height / 3)}) {
        std::vector<bool> want;  // a level pixel is inside with any of its pixels
        for (unsigned y = rect.top; y <= rect.bottom; ++y) {
          for (unsigned x = rect.left; x <= rect.right; ++x) {
            bool any = false;
            for (unsigned dy = 0; dy < 1U << level; ++dy)
              for (unsigned dx = 0; dx < 1U << level; ++dx)
                any = any || mask[(y << level) + dy][(x << level) + dx] == '#';
            want.push_back(any);
          }
        }
        Array<unsigned char> levelMask;
        std::uint64_t count = 0;
        ASSERT_TRUE(MaskAtLevel(*form, level, rect, levelMask, count));
        EXPECT_TRUE(std::equal(want.begin(), want.end(), levelMask.begin()));
        EXPECT_EQ(count, static_cast<std::uint64_t>(std::count(want.begin(), want.end(), true)));
        for (const Interleave order :
             {Interleave::None, Interleave::BIP, Interleave::BIL, Interleave::BSQ}) {
          const unsigned bands = order == Interleave::None ? 1 : 3;
          const std::size_t w = rect.Width(), h = rect.Height();
          Array<unsigned char> states(BlockDims(order, rect.Width(), rect.Height(), bands));
          for (unsigned i = 0; i < states.GetCount(); ++i) {
            states[i] = static_cast<unsigned char>(i % 8);
          }
          ASSERT_TRUE(FillRegionStates(*form, level, rect, order, bands, states));
          for (std::size_t y = 0; y < h; ++y) {
            for (std::size_t x = 0; x < w; ++x) {
              for (std::size_t b = 0; b < bands; ++b) {
                const std::size_t at = order == Interleave::BIL   ? (y * bands + b) * w + x
                                       : order == Interleave::BSQ ? (b * h + y) * w + x
                                                                  : (y * w + x) * bands + b;
                ASSERT_EQ(states[at], (at % 8 & 3) | (want[y * w + x] ? 0 : 4));
              }
            }
          }
        }
      }
    }
  }
}

TEST(FillRegionStates, TellsBlocksWhollyInsideOrOutside) {
  const RasterizedROIPtr form =
      RasterizeOn(RegionOf(MakeShapes({Square(100, 100, 400, 400)})), 500, 500, GeoRefPtr());
  EXPECT_EQ(form->Cover(WindowOf({100, 100, 399, 399})), RegionCover::kInside);
  EXPECT_EQ(form->Cover(WindowOf({100, 100, 400, 399})), RegionCover::kPartly);
  EXPECT_EQ(form->Cover(WindowOf({0, 0, 99, 499})), RegionCover::kOutside);
  EXPECT_EQ(form->Cover(WindowOf({25, 25, 99, 99}, 2)), RegionCover::kInside);
  for (const SubRect& rect : {SubRect(120, 130, 300, 390), SubRect(401, 0, 499, 499)}) {
    Array<unsigned char> states{ArrayDims(rect.Height(), rect.Width())};
    std::fill(states.begin(), states.end(), static_cast<unsigned char>(rect.left == 120 ? 7 : 3));
    ASSERT_TRUE(FillRegionStates(*form, 0, rect, Interleave::BIP, 1, states));
    EXPECT_EQ(std::count(states.begin(), states.end(), rect.left == 120 ? 3 : 7),
              static_cast<long>(states.GetCount()));
  }
}

TEST(MeasureRegion, GivesPixelsAndBounds) {
  for (const RasterizedROIPtr& form : AllForms()) {
    const Rows mask = RowsOf(*form, {0, 0, 96, 82});
    std::uint64_t pixels = 0;
    unsigned left = 97, top = 83, right = 0, bottom = 0;
    for (unsigned y = 0; y < 83; ++y) {
      for (unsigned x = 0; x < 97; ++x) {
        if (mask[y][x] != '#') continue;
        ++pixels;
        left = std::min(left, x), right = std::max(right, x);
        top = std::min(top, y), bottom = std::max(bottom, y);
      }
    }
    RegionExtent extent;
    ASSERT_TRUE(MeasureRegion(*form, {0, 0, 96, 82}, IPC(), extent));
    EXPECT_EQ(extent.pixels, pixels);
    EXPECT_EQ(extent.bounds, SubRect(left, top, right, bottom));
  }
  const RasterizedROIPtr far =
      RasterizeOn(RegionOf(MakeShapes({Square(9000, 5000, 9001, 5001)})), 9500, 5100, GeoRefPtr());
  RegionExtent extent;
  ASSERT_TRUE(MeasureRegion(*far, {0, 0, 9499, 5099}, IPC(), extent));
  EXPECT_EQ(extent.pixels, 1U);
  EXPECT_EQ(extent.bounds, SubRect(9000, 5000, 9000, 5000));
}

TEST(RasterizedROI, MayBeAskedOnSeveralThreadsWhileItsDefinitionChanges) {
  const auto shapes = MakeShapes({Square(0, 0, 60, 60)});
  const PixelAddressROIDefPtr pixels = PixelsOf({{3, 3}});
  const RasterizedROIPtr form =
      RasterizeOn(GroupOf({RegionOf(shapes), pixels}), 64, 64, GeoRefPtr());
  std::atomic<bool> failed{false};
  const auto ask = [&] {
    for (int i = 0; i < 300; ++i) {
      Array<unsigned char> states{ArrayDims(64, 64)};
      std::fill(states.begin(), states.end(), PixelValueState::OutsideROI);
      ROIHitInfoPtr info;
      if (!FillRegionStates(*form, 0, {0, 0, 63, 63}, Interleave::BSQ, 1, states) ||
          !form->HitTest({5, 5}, info) || states[5 * 64 + 5] != PixelValueState::Valid) {
        failed = true;
      }
    }
  };
  std::thread one(ask), other(ask);
  for (unsigned i = 0; i < 300; ++i) {
    std::uint32_t part = 0;
    const std::uint32_t record = AddShape(*shapes, {Square(i % 50, 61, i % 50 + 3, 63)});
    shapes->SetCoordinates(record, part, test::PointsOf(Square(1, 61, 2, 63)));
    Array<Point2D<unsigned>> address{ArrayDims(1)};
    address[0] = {i % 64, 63};
    pixels->SetAddresses(address);
    if (i % 3 != 0) shapes->RemoveRecord(record);
  }
  one.join();
  other.join();
  EXPECT_FALSE(failed);
}

}  // namespace
}  // namespace lumo
