"""Warping, beside gdalwarp on the same grid."""

import shutil
import subprocess
import unittest

from support import DATA, FolderTest, gdal_pixels, needs_data, needs_gdal, write_orva


@needs_data
class Warp(FolderTest):
    scene = DATA / "landsat7_u16_tiled.tif"

    def by_gdal(self, *options):
        file = self.folder / "gdal.tif"
        subprocess.run(["gdalwarp", "-q", "-overwrite", "-et", "0", *options, self.scene, file], check=True)
        return file

    @needs_gdal
    @unittest.skipUnless(shutil.which("gdalwarp"), "needs gdalwarp")
    def test_pixels_are_those_of_gdalwarp(self):
        for system, names in (("EPSG:4326", {"near": "nearest", "bilinear": "linear"}), ("EPSG:32724", {"near": "nearest"})):
            for theirs, ours in names.items():
                with self.subTest(system=system, resampling=ours):
                    grid = self.by_gdal("-t_srs", system, "-r", theirs)
                    made = self.folder / "made.tif"
                    self.fine("warp", self.scene, made, "--to", grid, "--method", "rigorous", "--resampling", ours,
                              "--overwrite")
                    self.assertEqual(gdal_pixels(made), gdal_pixels(grid))

    @needs_gdal
    @unittest.skipUnless(shutil.which("gdalwarp"), "needs gdalwarp")
    def test_polynomials_differ_in_few_pixels(self):
        grid = self.by_gdal("-t_srs", "EPSG:4326", "-r", "near")
        made = self.folder / "made.tif"
        self.fine("warp", self.scene, made, "--to", grid)
        exact, fitted = gdal_pixels(grid), gdal_pixels(made)
        self.assertEqual(len(exact), len(fitted))
        # Those whose position lies within the error of the fit of a pixel's edge.
        differing = sum(a != b for a, b in zip(exact[::2], fitted[::2]))
        self.assertLess(differing, 0.02 * len(exact) / 2)

    def test_the_grid_covers_the_scene(self):
        made = self.folder / "made.tif"
        self.fine("warp", self.scene, made, "--to", "EPSG:4326", "--pixel-size", "0.001", "--no-data", "9")
        told = self.fine("info", made)
        self.assertIn("91 samples, 91 lines, 6 bands", told)
        self.assertIn("no data        9", told)

    def test_complaints_leave_no_file(self):
        made = self.folder / "made.tif"
        self.fails(2, "neither a file nor a coordinate system: nonsense", "warp", self.scene, made, "--to", "nonsense")
        self.fails(2, "--pixel-size", "warp", self.scene, made, "--to", self.scene, "--pixel-size", "3")
        self.fails(1, "no geo-reference", "warp", write_orva(self.folder / "bare.dat", 4, 4, 1), made, "--to",
                   "EPSG:4326")
        self.fails(1, "can't be carried", "warp", self.scene, made, "--to", "EPSG:4326", "--pixel-size", "1e-15")
        self.assertFalse(made.exists())


if __name__ == "__main__":
    unittest.main()
