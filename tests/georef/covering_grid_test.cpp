#include "georef/covering_grid.h"

#include "support/placed_raster.h"

namespace lumo {
namespace {

using test::MakeCoordSys;

TEST(CoveringGrid, IsTheGridItselfInItsOwnSystem) {
  const GeoRefPtr source = MakeGrid(500000, 5000000, 30, 200, 100, "EPSG:32633");
  const GeoRefPtr same = CoveringGrid(*source, source->CoordinateSystem());
  ASSERT_TRUE(same);
  EXPECT_TRUE(same->IsEqual(source));
  const GeoRefPtr coarse = CoveringGrid(*source, source->CoordinateSystem(), 70);
  EXPECT_EQ(coarse->Samples(), 86U);  // of 85.7
  EXPECT_EQ(coarse->Lines(), 43U);
}

/// Every corner and edge of the source lies inside, and none of the grid's edges is far from it.
TEST(CoveringGrid, HoldsTheSourceInAnotherSystem) {
  const GeoRefPtr source = MakeGrid(300000, 6600000, 100, 3000, 2000, "EPSG:32633");
  const GeoRefPtr grid = CoveringGrid(*source, MakeCoordSys("EPSG:4326"));
  ASSERT_TRUE(grid);
  double least[2] = {1e9, 1e9}, most[2] = {-1e9, -1e9};
  for (double along = 0; along <= 1; along += 1.0 / 512) {
    for (const auto& [x, y] : {std::pair{along, 0.0}, {along, 1.0}, {0.0, along}, {1.0, along}}) {
      Array<double> point{ArrayDims(1, 2)};
      point[0] = x * source->Samples();
      point[1] = y * source->Lines();
      ASSERT_TRUE(source->PixelToPixel(point, *grid));
      for (const int i : {0, 1}) {
        least[i] = std::min(least[i], point[i]);
        most[i] = std::max(most[i], point[i]);
      }
    }
  }
  const double size[2] = {static_cast<double>(grid->Samples()), static_cast<double>(grid->Lines())};
  for (const int i : {0, 1}) {
    EXPECT_NEAR(least[i], 0, 0.6);
    EXPECT_NEAR(most[i], size[i], 0.6);
  }
  EXPECT_NEAR(std::hypot(size[0], size[1]), std::hypot(3000, 2000), 1);
}

TEST(CoveringGrid, LeavesOutWhatCanNotBeCarried) {
  // A globe seen from afar shows one half of the world.
  const CoordSys globe = MakeCoordSys("+proj=ortho +lat_0=0 +lon_0=0 +R=6371000 +type=crs");
  const GeoRefPtr world = MakeGrid(-180, 90, 1, 360, 180, "EPSG:4326");
  const GeoRefPtr seen = CoveringGrid(*world, globe, 10000);
  ASSERT_TRUE(seen);
  EXPECT_NEAR(seen->Samples(), 1274, 3);
  EXPECT_NEAR(seen->TieMapX(), -6371000, 12000);
  const GeoRefPtr back = MakeGrid(170, 10, 1, 10, 10, "EPSG:4326");
  EXPECT_FALSE(CoveringGrid(*back, globe));
  EXPECT_FALSE(CoveringGrid(*world, globe, 1e-4));
  EXPECT_FALSE(CoveringGrid(StdGeoRef(), globe));
}

}  // namespace
}  // namespace lumo
