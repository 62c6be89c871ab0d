"""Polygons of label rasters, in the files of other programs."""

import json
import pathlib
import re
import resource
import shutil
import struct
import subprocess
import unittest

from support import DATA, FolderTest, PipeTest, VEXG, gdal_pixels, needs_data, needs_gdal, read_npy, run

needs_ogr = unittest.skipUnless(shutil.which("ogrinfo"), "no OGR programs")


@needs_data
@needs_gdal
@needs_ogr
class Polygonize(PipeTest, FolderTest):
    def setUp(self):
        super().setUp()
        # Bright and dark fields of a real scene: its fourth band in 16 classes.
        self.labels = self.folder / "labels.tif"
        subprocess.run(["gdal_translate", "-q", "-b", "4", "-scale", "0", "256", "0", "16", "-ot", "Byte",
                        DATA / "landsat7_olinda.tif", self.labels], check=True)

    def sums(self, file):
        """Records, total area and valid shapes, as another program sees them."""
        layer = file.stem
        column = "geom" if file.suffix == ".gpkg" else "geometry"
        out = subprocess.run(
            ["ogrinfo", "-q", file, "-dialect", "sqlite", "-sql",
             f'SELECT COUNT(*) AS n, SUM(ST_Area({column})) AS area, SUM(ST_IsValid({column})) AS valid '
             f'FROM "{layer}"'], capture_output=True, text=True, check=True).stdout
        if "valid (" not in out:
            self.skipTest("GDAL without SpatiaLite")
        return tuple(float(re.search(rf"{name} \(\w+\) = (\S+)", out)[1]) for name in ("n", "area", "valid"))

    def test_every_format_gives_the_labels_back(self):
        info = json.loads(self.fine("info", "--json", self.labels))
        width, height = info["samples"], info["lines"]
        size = info["geoRef"]["pixelSize"]
        counts = set()
        for ending in ("gpkg", "fgb", "shp", "geojson"):
            made = self.folder / f"fields.{ending}"
            self.fine("polygonize", self.labels, made)
            count, area, valid = self.sums(made)
            counts.add(count)
            self.assertEqual(valid, count)
            self.assertAlmostEqual(area / (width * height * abs(size[0] * size[1])), 1, 9)
            back = self.folder / f"{ending}.tif"
            corners = info["geoRef"]["corners"].values()
            xs, ys = [pair[0] for pair in corners], [pair[1] for pair in corners]
            subprocess.run(["gdal_rasterize", "-q", "-a", "label", "-ts", str(width), str(height), "-ot", "Byte",
                            "-te", *map(repr, (min(xs), min(ys), max(xs), max(ys))), made, back], check=True)
            self.assertEqual(gdal_pixels(back), gdal_pixels(self.labels))
        self.assertEqual(len(counts), 1)

    def test_a_server_makes_them_too_and_info_tells(self):
        self.serve("test", "--root", self.folder)
        made = self.folder / "fields.gpkg"
        self.fine("polygonize", "--server", "test", self.labels, made, "--layer", "bright", "--field", "class",
                  "--min-size", "5")
        plain = self.folder / "plain.fgb"
        self.fine("polygonize", self.labels, plain)
        told = json.loads(self.fine("info", "--json", "--server", "test", made))
        layer = told["layers"][0]
        self.assertEqual((layer["name"], layer["geometry"]), ("bright", "Polygon"))
        self.assertEqual(layer["fields"], [{"name": "class", "type": "Integer"}])
        self.assertIn("UTM_Zone_25S", layer["coordSysName"])
        self.assertLess(layer["records"], json.loads(self.fine("info", "--json", plain))["layers"][0]["records"])
        self.assertIn("bright", self.fine("info", made))
        self.fails(2, "is there already", "polygonize", self.labels, made)
        self.fine("polygonize", self.labels, made, "--overwrite")

    def test_a_mask_leaves_pixels_out(self):
        mask = self.folder / "mask.tif"
        subprocess.run(["gdal_translate", "-q", "-b", "1", "-scale", "60", "61", "0", "1", "-ot", "Byte",
                        DATA / "landsat7_olinda.tif", mask], check=True)
        kept = sum(pixel != 0 for pixel in gdal_pixels(mask))
        made = self.folder / "fields.gpkg"
        self.fine("polygonize", self.labels, made, "--mask", mask)
        size = json.loads(self.fine("info", "--json", self.labels))["geoRef"]["pixelSize"]
        count, area, valid = self.sums(made)
        self.assertEqual(valid, count)
        self.assertAlmostEqual(area / abs(size[0] * size[1]) / kept, 1, 9)
        self.assertLess(kept, len(gdal_pixels(mask)))
        part = self.folder / "part.tif"
        subprocess.run(["gdal_translate", "-q", "-srcwin", "0", "0", "9", "9", mask, part], check=True)
        self.fails(1, "another size", "polygonize", self.labels, made, "--mask", part, "--overwrite")

    def test_bad_input_leaves_nothing(self):
        before = sorted(self.folder.iterdir())
        self.fails(1, "ending", "polygonize", self.labels, self.folder / "fields.doc")
        self.fails(2, "--band", "polygonize", self.labels, self.folder / "fields.gpkg", "--band", "1")
        self.fails(1, "none.tif", "polygonize", self.folder / "none.tif", self.folder / "fields.gpkg")
        self.fails(2, "input", "polygonize", self.labels, self.labels, "--overwrite")
        limited = subprocess.run(
            [VEXG, "polygonize", self.labels, self.folder / "fields.fxv"], capture_output=True, text=True,
            preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_FSIZE, (5000, 5000)))
        self.assertEqual(limited.returncode, 1)
        self.assertIn("fields.fxv", limited.stderr)
        self.assertEqual(sorted(self.folder.iterdir()), before)

    def test_labels_of_other_types(self):
        made = self.folder / "fields.fxv"
        source = self.folder / "odd.tif"
        raw = self.folder / "odd.raw"
        raw.write_bytes(struct.pack("<3I", 1, 2 ** 31, 3))
        vrt = self.folder / "odd.vrt"
        vrt.write_text('<VRTDataset rasterXSize="3" rasterYSize="1"><VRTRasterBand dataType="UInt32" band="1" '
                       'subClass="VRTRawRasterBand"><SourceFilename relativeToVRT="1">odd.raw</SourceFilename>'
                       '<PixelOffset>4</PixelOffset><LineOffset>12</LineOffset><ByteOrder>LSB</ByteOrder>'
                       '</VRTRasterBand></VRTDataset>')
        subprocess.run(["gdal_translate", "-q", vrt, source], check=True)
        code, out, err = run("polygonize", str(source), str(made))
        self.assertEqual((code, out), (0, ""))
        self.assertRegex(err, r"\Avexg: warning: [^\n]*1 polygons[^\n]*\n\Z")
        self.fine("polygonize", source, self.folder / "odd.gpkg")
        self.assertEqual(self.sums(self.folder / "odd.gpkg")[0], 3)


if __name__ == "__main__":
    unittest.main()
