"""Warping, beside gdalwarp on the same grid."""

import array
import re
import shutil
import struct
import subprocess
import unittest

from support import DATA, FolderTest, gdal_pixels, needs_data, needs_gdal, read_npy, write_orva


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
        for system, names in (("EPSG:4326", {"near": "nearest", "bilinear": "bilinear"}), ("EPSG:32724", {"near": "nearest"})):
            for theirs, ours in names.items():
                with self.subTest(system=system, resampling=ours):
                    grid = self.by_gdal("-t_srs", system, "-r", theirs)
                    made = self.folder / "made.tif"
                    self.fine("warp", self.scene, made, "--to", grid, "--method", "rigorous", "--resampling", ours,
                              "--overwrite")
                    self.assertEqual(gdal_pixels(made), gdal_pixels(grid))

    @needs_gdal
    @unittest.skipUnless(shutil.which("gdalwarp"), "needs gdalwarp")
    def test_smaller_pictures_show_all_of_the_source(self):
        """Kernels widen as those of gdalwarp do; its Lanczos kernel rounds in a way of its own."""
        for theirs, ours in {"bilinear": "bilinear", "cubic": "cubic", "average": "average", "min": "min", "max": "max",
                             "med": "median"}.items():
            for times, side in ((10, 34), (3, 116)):  # of pixels that lie in the scene with all of their area
                with self.subTest(resampling=ours, times=times):
                    left, top, pixel = 288776.25000080315, 9120760.750028737, 28.49999999927454
                    far = side * times * pixel
                    grid = self.by_gdal("-te", str(left), str(top - far), str(left + far), str(top), "-ts", str(side),
                                        str(side), "-r", theirs)
                    made = self.folder / "made.tif"
                    self.fine("warp", self.scene, made, "--to", grid, "--resampling", ours, "--overwrite")
                    found, told = (struct.unpack(f"<{len(b) // 2}H", b) for b in (gdal_pixels(made), gdal_pixels(grid)))
                    differing = [abs(a - b) for a, b in zip(found, told, strict=True) if a != b]
                    # Halves are rounded either way, since sums come in another order.
                    self.assertLessEqual(max(differing, default=0), 1)
                    self.assertLess(len(differing), 0.005 * len(told))

    def write_positions(self):
        """A raster on the scene's grid whose bands are the sample and the line of each pixel."""
        flat = self.folder / "flat.dat"
        self.fine("copy", self.scene, flat)
        places = re.findall(r"^(?:georeference|coordinate system string) = .*\n", (self.folder / "flat.dat.hdr").read_text(),
                            re.MULTILINE)
        pixels = array.array("d", (number for line in range(352) for sample in range(349) for number in (sample, line)))
        return write_orva(self.folder / "places.dat", 349, 352, 2, pixels.tobytes(), "Double", "".join(places))

    @unittest.skipUnless(shutil.which("gdaltransform"), "needs gdaltransform")
    def test_positions_are_those_of_gdaltransform(self):
        source = self.write_positions()
        for method, error in (("rigorous", 1e-3), ("polynomial", 0.5)):
            made = self.folder / f"{method}.tif"
            self.fine("warp", source, made, "--to", "EPSG:4326", "--method", method, "--resampling", "bilinear",
                      "--no-data", "-1")
            self.fine("read", made, "--interleave", "bip", "-o", self.folder / "made.npy", "--overwrite")
            kind, shape, data = read_npy(self.folder / "made.npy")
            self.assertEqual((kind, shape[-1]), ("<f8", 2))
            found = list(struct.iter_unpack("<dd", data))
            width = shape[1]
            points = [at for at in range(0, len(found), 13) if found[at][0] >= 0]
            self.assertGreater(len(points), 8000)
            asked = "".join(f"{at % width + 0.5} {at // width + 0.5}\n" for at in points)
            told = subprocess.run(["gdaltransform", "-i", self.scene, made], input=asked, text=True, capture_output=True,
                                  check=True).stdout
            worst = 0.0
            for at, line in zip(points, told.splitlines(), strict=True):
                sample, row, _ = map(float, line.split())
                # Along the border the pixel that isn't there has no weight.
                if 0.5 <= sample <= 348.5 and 0.5 <= row <= 351.5:
                    worst = max(worst, abs(found[at][0] + 0.5 - sample), abs(found[at][1] + 0.5 - row))
            self.assertLess(worst, error, method)

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
