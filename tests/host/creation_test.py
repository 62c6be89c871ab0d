"""How rasters lie in their files: compression, tiles, cloud-optimised files, and what doesn't fit."""

import json
import os
import subprocess
import unittest

from support import DATA, SANITIZED, VEXG, FolderTest, gdal_pixels, needs_data, needs_gdal, run

GDAL_PYTHON = "/usr/bin/python3"


def gdal_says(file):
    out = subprocess.run(["gdalinfo", "-json", "-stats", file], check=True, capture_output=True, text=True)
    return json.loads(out.stdout)


def by_gdal(code, *arguments):
    """Runs a piece of Python that has GDAL; gives what it prints, as JSON."""
    out = subprocess.run([GDAL_PYTHON, "-c", "import json, sys\nimport numpy as np\nfrom osgeo import gdal\n"
                          "gdal.UseExceptions()\n" + code, *arguments],
                         check=True, capture_output=True, text=True)
    return json.loads(out.stdout)


def has_gdal_python():
    code = "import numpy, osgeo_utils.samples.validate_cloud_optimized_geotiff"
    return subprocess.run([GDAL_PYTHON, "-c", code], capture_output=True).returncode == 0


VALIDATE = """
from osgeo_utils.samples.validate_cloud_optimized_geotiff import validate
print(json.dumps(validate(sys.argv[1], full_check=True)[:2]))
"""

# Levels against those of plain numpy, from the raster itself up; -1 marks a mean of nothing.
LEVELS = """
def half(a, valid):
    pad = ((0, a.shape[0] % 2), (0, a.shape[1] % 2))
    a, valid = np.pad(a, pad), np.pad(valid, pad)
    parts = lambda m: [m[y::2, x::2] for y in (0, 1) for x in (0, 1)]
    count = sum(p.astype(int) for p in parts(valid))
    total = sum((p * v) for p, v in zip(parts(a.astype(float)), parts(valid)))
    mean = np.where(count > 0, np.floor(total / np.maximum(count, 1) + 0.5), -1)
    return mean, count > 0
d = gdal.Open(sys.argv[1])
band = d.GetRasterBand(1)
a, valid = band.ReadAsArray().astype(float), band.GetMaskBand().ReadAsArray() != 0
wrong = []
for i in range(band.GetOverviewCount()):
    a, valid = half(a, valid)
    level = band.GetOverview(i)
    made, mask = level.ReadAsArray().astype(float), level.GetMaskBand().ReadAsArray() != 0
    wrong.append([int((mask != valid).sum()), int((made != a)[valid].sum())])
print(json.dumps(wrong))
"""


@needs_gdal
class Creation(FolderTest):
    def check_pixels(self, source, made):
        self.assertEqual(gdal_pixels(made), gdal_pixels(source))

    def made(self, source, *options, name="made.tif"):
        target = self.folder / name
        self.fine("copy", source, target, "--overwrite", "--quiet", *options)
        return target

    def refused(self, *arguments):
        code, out, err = run(*arguments)
        self.assertNotEqual(code, 0)
        self.assertEqual(len(err.splitlines()), 1, err)
        return err


@needs_data
class Packing(Creation):
    def test_verbs_pack_unless_told_otherwise(self):
        source = DATA / "landsat7_u16_tiled.tif"
        cases = [
            ((), {"COMPRESSION": "ZSTD", "PREDICTOR": "2"}, [512, 512]),
            (("--compatible",), {"COMPRESSION": "DEFLATE", "PREDICTOR": "2"}, [512, 512]),
            (("--compress", "lzw", "--tile", "128"), {"COMPRESSION": "LZW"}, [128, 128]),
            (("--compress", "lzma", "--compress-level", "3"), {"COMPRESSION": "LZMA"}, [512, 512]),
            (("--compress", "zstd", "--compress-level", "19", "--predictor", "none"),
             {"COMPRESSION": "ZSTD"}, [512, 512]),
            (("--compress", "none", "--tile", "64"), {}, [64, 64]),
        ]
        for options, structure, block in cases:
            with self.subTest(options=options):
                made = self.made(source, *options)
                says = gdal_says(made)
                found = {key: value for key, value in says["metadata"]["IMAGE_STRUCTURE"].items()
                         if key in ("COMPRESSION", "PREDICTOR")}
                self.assertLessEqual(structure.items(), found.items())
                self.assertEqual("COMPRESSION" in found, "COMPRESSION" in structure)
                self.assertEqual(says["bands"][0]["block"], block)
                self.check_pixels(source, made)

    def test_bigtiff_where_it_is_asked_for(self):
        source = DATA / "dem_int16.tif"
        for options, version in (((), 42), (("--bigtiff", "yes"), 43), (("--bigtiff", "no"), 42),
                                 (("--bigtiff", "yes", "--cog"), 43),
                                 (("--bigtiff", "yes", "--compress", "none"), 43)):
            with self.subTest(options=options):
                made = self.made(source, *options)
                self.assertEqual(made.read_bytes()[2], version)
                self.check_pixels(source, made)

    def test_codecs_that_lose_values_say_so(self):
        source = DATA / "RGB.byte.tif"
        for options, loses in ((("--compress", "webp"), False), (("--compress", "jpeg"), True),
                               (("--compress", "webp", "--compress-level", "90"), True)):
            with self.subTest(options=options):
                target = self.folder / "made.tif"
                code, _, err = run("copy", source, target, "--overwrite", *options)
                self.assertEqual(code, 0, err)
                self.assertEqual("the values of pixels exactly" in err, loses, err)
                # A no-data value would not stay one: a mask of all bands says which pixels count.
                masks = "a, b = [gdal.Open(f) for f in sys.argv[1:3]]\n" \
                        "m = [[d.GetRasterBand(i).GetMaskBand().ReadAsArray() for i in (1, 2, 3)] for d in (a, b)]\n" \
                        "print(json.dumps(int((np.min(m[0], 0) != np.min(m[1], 0)).sum())))"
                self.assertEqual(by_gdal(masks, source, target), 0)
                if not loses:
                    self.check_pixels(source, target)
                    continue
                off = by_gdal("a, b = [gdal.Open(f).ReadAsArray().astype(int) for f in sys.argv[1:3]]\n"
                              "print(json.dumps(float(np.abs(a - b).mean())))", source, target)
                self.assertLess(off, 4)
                code, _, err = run("copy", source, self.folder / "strict.tif", "--strict", *options)
                self.assertNotEqual(code, 0)
                self.assertFalse((self.folder / "strict.tif").exists())

    def test_what_does_not_fit_is_one_line_before_any_work(self):
        u16, u8 = DATA / "landsat7_u16_tiled.tif", DATA / "RGB.byte.tif"
        cases = [
            (u16, "o.tif", ("--predictor", "3"), "predictor 3 is for floating-point numbers"),
            (u16, "o.tif", ("--compress", "jpeg"), "JPEG packs one or three bands of bytes"),
            (u8, "o.tif", ("--compress", "none", "--compress-level", "3"), "a level belongs to"),
            (u8, "o.tif", ("--compress", "deflate", "--compress-level", "13"), "levels from 1 to 12"),
            (u8, "o.tif", ("--tile", "100"), "multiple of 16"),
            (u8, "o.tif", ("--cog", "--tile", "strip"), "has tiles"),
            (u8, "o.tif", ("--overviews", "mode"), "cloud-optimised"),
            (u8, "o.dat", ("--compress", "zstd"), "the format is ORVA"),
            (u8, "o.png", ("--cog",), "the format is PNG"),
        ]
        for source, name, options, want in cases:
            with self.subTest(options=options):
                self.assertIn(want, self.refused("copy", source, self.folder / name, *options))
                self.assertFalse((self.folder / name).exists())


@unittest.skipUnless(has_gdal_python(), "no GDAL for Python")
class CloudOptimised(Creation):
    def make(self, code):
        """A raster that GDAL makes; `code` fills the array `a` of three bands and 700 by 1100 pixels."""
        source = self.folder / "source.tif"
        by_gdal("a = np.random.default_rng(3).integers(1, 200, (3, 700, 1100)).astype(np.uint8)\n"
                "d = gdal.GetDriverByName('GTiff').Create(sys.argv[1], 1100, 700, 3, gdal.GDT_Byte,"
                " ['INTERLEAVE=PIXEL'])\nd.SetGeoTransform((500, 30, 0, 9000, 0, -30))\n" + code +
                "\nd.WriteArray(a)\nd = None\nprint(json.dumps(1))", source)
        return source

    def check(self, source, made, *, levels=2):
        self.assertEqual(by_gdal(VALIDATE, made), [[], []])
        self.assertEqual(gdal_says(made)["metadata"]["IMAGE_STRUCTURE"]["LAYOUT"], "COG")
        self.check_pixels(source, made)
        self.assertEqual(by_gdal(LEVELS, made), [[0, 0]] * levels)

    def test_levels_are_means_of_the_pixels_that_count(self):
        no_data = "d.GetRasterBand(1).SetNoDataValue(0)\na[:, 100:333, 77:900] = 0\na[:, ::3, ::2] = 0"
        mask = "gdal.SetConfigOption('GDAL_TIFF_INTERNAL_MASK', 'YES')\nd.CreateMaskBand(2)\n" \
               "m = np.full((700, 1100), 255, np.uint8)\nm[50:401, 300:] = 0\nm[::5, ::2] = 0\n" \
               "d.GetRasterBand(1).GetMaskBand().WriteArray(m)"
        for name, code in (("plain", ""), ("no data", no_data), ("mask", mask)):
            for options in ((), ("--compress", "none")):
                with self.subTest(name=name, options=options):
                    source = self.make(code)
                    self.check(source, self.made(source, "--cog", *options))

    def test_the_format_cog_and_small_tiles(self):
        source = self.make("")
        self.check(source, self.made(source, "--format", "cog", "--tile", "64", name="made.any"), levels=5)

    def test_nearest_and_mode(self):
        source = self.make("a //= 100")
        pick = "d = gdal.Open(sys.argv[1])\na = d.GetRasterBand(1).ReadAsArray()\n" \
               "b = d.GetRasterBand(1).GetOverview(0).ReadAsArray()\n"
        nearest = self.made(source, "--cog", "--overviews", "nearest")
        self.assertEqual(by_gdal(pick + "print(json.dumps(int((a[::2, ::2] != b).sum())))", nearest), 0)
        mode = self.made(source, "--cog", "--overviews", "mode")
        count = "s = sum(a[y::2, x::2].astype(int) for y in (0, 1) for x in (0, 1))\n" \
                "print(json.dumps([int((b != 1)[s >= 3].sum()), int((b != 0)[s <= 1].sum())]))"
        self.assertEqual(by_gdal(pick + count, mode), [0, 0])

    @unittest.skipIf(SANITIZED, "a sanitizer takes memory of its own")
    def test_a_large_raster_of_little_takes_little_memory(self):
        source, made = self.folder / "source.tif", self.folder / "made.tif"
        side = 20_000
        by_gdal("n = int(sys.argv[2])\nd = gdal.GetDriverByName('GTiff').Create(sys.argv[1], n, n, 1, gdal.GDT_Byte,"
                " ['TILED=YES', 'SPARSE_OK=YES'])\na = np.arange(250000, dtype=np.uint8).reshape(500, 500)\n"
                "for x, y in ((0, 0), (n // 2, n // 3), (n - 500, n - 500)):\n"
                "  d.GetRasterBand(1).WriteArray(a, x, y)\nd = None\nprint(json.dumps(1))", source, str(side))
        process = subprocess.Popen([VEXG, "copy", source, made, "--cog", "--quiet"])
        _, status, usage = os.wait4(process.pid, 0)
        process.returncode = status
        self.assertEqual(status, 0)
        self.assertLess(usage.ru_maxrss, 400 << 10)
        self.assertLess(made.stat().st_size, 10 << 20)
        self.assertEqual(by_gdal(VALIDATE, made), [[], []])
        corner = "d = gdal.Open(sys.argv[1])\nn = d.RasterXSize\n" \
                 "a = d.ReadAsArray(n // 2 - 1, n // 3 - 1, 502, 502)\n" \
                 "print(json.dumps([int(a[1:-1, 1:-1].sum()), int(a.sum())]))"
        want = sum(i % 256 for i in range(250_000))
        self.assertEqual(by_gdal(corner, made), [want, want])

    @needs_data
    def test_every_verb_that_makes_a_raster(self):
        scene = DATA / "landsat7_olinda.tif"
        parcels = self.folder / "parcels.geojson"
        parcels.write_text(json.dumps({"type": "Feature", "properties": {}, "geometry": {
            "type": "Polygon", "coordinates": [[[-35, -8], [-34, -8], [-34, -7], [-35, -7], [-35, -8]]]}}))
        made = {verb: self.folder / (verb + ".tif") for verb in ("warp", "calc", "rasterize", "segment")}
        cases = [("warp", scene, made["warp"], "--to", "EPSG:4326"), ("calc", made["calc"], "b0 + 1", scene),
                 ("rasterize", parcels, made["rasterize"], "--like", scene),
                 ("segment", scene, made["segment"], "--quiet")]
        for verb, *arguments in cases:
            with self.subTest(verb=verb):
                target = made[verb]
                self.fine(verb, *arguments, "--cog", "--tile", "128")
                self.assertEqual(by_gdal(VALIDATE, target), [[], []])


if __name__ == "__main__":
    unittest.main()
