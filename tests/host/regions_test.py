"""Shapes drawn into rasters, and the figures of zones, beside other programs and plain arithmetic."""

import csv
import json
import shutil
import statistics
import subprocess
import unittest

from support import DATA, FolderTest, gdal_pixels, needs_data, needs_gdal

needs_ogr = unittest.skipUnless(shutil.which("ogr2ogr"), "no OGR programs")
SCENE = DATA / "landsat7_olinda.tif"
LEFT, TOP, SIZE, WIDTH, HEIGHT = 288776.25, 9120760.75, 28.5, 349, 352


def polygon(number, *rings):
    """A record of rings in pixels of the scene, which a little takes off the centres of pixels."""
    corners = [[[LEFT + (x + 0.013) * SIZE, TOP - (y + 0.007) * SIZE] for x, y in (*ring, ring[0])] for ring in rings]
    return {"type": "Feature", "properties": {"n": number, "name": f"field {number}", "Count": 7},
            "geometry": {"type": "Polygon", "coordinates": corners}}


SHAPES = [polygon(1, [(20, 30), (120, 10), (150, 140), (40, 160)], [(60, 60), (90, 110), (100, 50)]),
          polygon(2, [(200, 40), (330, 60), (300, 200), (260, 90)]),
          polygon(3, [(10, 250), (200.5, 210.25), (180.75, 340), (60, 300)]),
          polygon(4, [(340, 330), (400, 330), (400, 400), (340, 400)])]  # partly off the scene


@needs_data
@needs_gdal
@needs_ogr
class Regions(FolderTest):
    def setUp(self):
        super().setUp()
        self.shapes = self.folder / "shapes.geojson"
        self.shapes.write_text(json.dumps({
            "type": "FeatureCollection", "features": SHAPES,
            "crs": {"type": "name", "properties": {"name": "urn:ogc:def:crs:EPSG::31985"}}}))

    def peer(self, *options):
        made = self.folder / "peer.tif"
        made.unlink(missing_ok=True)
        subprocess.run(["gdal_rasterize", "-q", "-ot", "Byte", "-ts", str(WIDTH), str(HEIGHT), "-te",
                        *map(repr, (LEFT, TOP - SIZE * HEIGHT, LEFT + SIZE * WIDTH, TOP)), *options,
                        self.shapes, made], check=True)
        return gdal_pixels(made)

    def test_rasterize_draws_what_other_programs_draw(self):
        made = self.folder / "drawn.tif"
        for rule, option in (("center", []), ("touched", ["-at"])):
            self.fine("rasterize", self.shapes, made, "--like", SCENE, "--field", "n", "--rule", rule, "--overwrite", "-q")
            self.assertEqual(gdal_pixels(made), self.peer("-a", "n", *option), rule)
        self.fine("rasterize", self.shapes, made, "--like", SCENE, "--where", "name=field 2", "--value", "200",
                  "--overwrite", "-q")
        self.assertEqual(gdal_pixels(made), self.peer("-burn", "200", "-where", "n = 2"))
        # The scan of regions is inclusive.
        self.fine("rasterize", self.shapes, made, "--like", SCENE, "--where", "n=2", "--rule", "told", "--overwrite",
                  "-q")
        centres, touched = (self.peer("-burn", "1", "-where", "n = 2", *option) for option in ([], ["-at"]))
        self.assertTrue(sum(centres) < sum(gdal_pixels(made)) < sum(touched))

    def test_rasterize_carries_shapes_to_the_rasters_map(self):
        away = self.folder / "away.fgb"
        subprocess.run(["ogr2ogr", "-q", "-t_srs", "EPSG:4326", away, self.shapes], check=True)
        made = self.folder / "carried.tif"
        self.fine("rasterize", away, made, "--like", SCENE, "--no-data", "255", "--field", "n", "-q")
        want = self.peer("-a", "n", "-init", "255")
        self.assertLess(sum(a != b for a, b in zip(gdal_pixels(made), want)), 3)
        self.assertIn("NoData Value=255", subprocess.run(["gdalinfo", made], capture_output=True, text=True).stdout)

    def rows(self, table):
        with open(table, newline="") as text:
            return list(csv.DictReader(text))

    def test_zonal_gives_the_figures_of_the_pixels_inside(self):
        labels = self.peer("-a", "n")
        band = self.folder / "band.tif"
        subprocess.run(["gdal_translate", "-q", "-b", "4", SCENE, band], check=True)
        pixels = gdal_pixels(band)
        table = self.folder / "zones.csv"
        self.fine("zonal", SCENE, self.shapes, "-o", table, "--stats", "count,min,max,mean,std,sum,median,majority,p90",
                  "--bands", "3,0", "-q")
        rows = self.rows(table)
        self.assertEqual([row["name"] for row in rows], [f"field {n}" for n in (1, 2, 3, 4)])
        for number, row in enumerate(rows, 1):
            inside = sorted(pixel for pixel, label in zip(pixels, labels) if label == number)
            rank = (len(inside) - 1) * 0.9
            low = int(rank)
            modes = statistics.multimode(inside)
            want = {"count": len(inside), "min": inside[0], "max": inside[-1], "mean": statistics.fmean(inside),
                    "std": statistics.stdev(inside), "sum": sum(inside), "median": statistics.median(inside),
                    "majority": min(modes),
                    "p90": inside[low] + (rank - low) * (inside[min(low + 1, len(inside) - 1)] - inside[low])}
            for name, value in want.items():
                self.assertAlmostEqual(float(row[f"b3_{name}"]), value, 9, f"{name} of {number}")
        # The area of a polygon in pixels is the sum of its shares.
        self.fine("zonal", SCENE, self.shapes, "-o", table, "--stats", "count", "--bands", "0", "--weights", "coverage",
                  "--where", "n=2", "--overwrite", "-q")
        corners = [(200, 40), (330, 60), (300, 200), (260, 90)]
        area = abs(sum(a[0] * b[1] - b[0] * a[1] for a, b in zip(corners, corners[1:] + corners[:1]))) / 2
        share = float(self.rows(table)[0]["count_2"])  # beside its own Count
        self.assertAlmostEqual(share, area, 6)

    def test_zonal_keeps_shapes_and_fields_in_every_format(self):
        for ending in ("gpkg", "fgb", "geojson", "shp"):
            table = self.folder / f"zones.{ending}"
            self.fine("zonal", SCENE, self.shapes, "-o", table, "--stats", "count,mean", "--bands", "0", "-q")
            told = json.loads(self.fine("info", "--json", table))["layers"][0]
            self.assertEqual(told["records"], 4, ending)
            self.assertEqual([field["name"] for field in told["fields"]], ["n", "name", "Count", "count_2", "mean"], ending)
            again = self.folder / "again.csv"
            self.fine("zonal", SCENE, table, "-o", again, "--stats", "mean", "--bands", "0", "-q", "--overwrite")
            for row in self.rows(again):
                self.assertAlmostEqual(float(row["mean"]), float(row["mean_2"]), 9)

    def test_the_job_that_is_printed_makes_the_same(self):
        for verb in (["rasterize", self.shapes, self.folder / "a.tif", "--like", SCENE],
                     ["zonal", SCENE, self.shapes, "-o", self.folder / "a.csv"]):
            output = next(word for word in verb if str(word).startswith(str(self.folder / "a.")))
            job = self.folder / "job.xml"
            job.write_text(self.fine(*verb, "--print-job"))
            self.assertFalse(output.exists())
            self.fine("run", job)
            made = output.read_bytes()
            self.fine(*verb, "--overwrite", "-q")
            self.assertEqual(output.read_bytes(), made)

    def test_bad_input_ends_in_one_line(self):
        out, table = self.folder / "o.tif", self.folder / "o.csv"
        plain = self.folder / "plain.tif"
        subprocess.run(["gdal_translate", "-q", "-of", "GTiff", "-co", "PROFILE=BASELINE", "-b", "1",
                        DATA / "landsat7_rgb.png", plain], check=True)
        cut = self.folder / "cut.fgb"
        subprocess.run(["ogr2ogr", "-q", cut, self.shapes], check=True)
        cut.write_bytes(cut.read_bytes()[:-300])
        empty = self.folder / "empty.geojson"
        empty.write_text('{"type":"FeatureCollection","features":[]}')
        draw = lambda shapes, *more: ("rasterize", shapes, out, "--like", SCENE, *more)
        for code, words, arguments in (
                (1, "no such file", draw(self.folder / "none.gpkg")),
                (1, "no shape", draw(empty)),
                (1, "cut.fgb", draw(cut)),
                (1, "did you mean name?", draw(self.shapes, "--where", "nam=x")),
                (1, "no layer \"fields\"", draw(self.shapes, "--layer", "fields")),
                (1, "holds no numbers", draw(self.shapes, "--field", "name")),
                (1, "can't hold all values", draw(self.shapes, "--value", "300", "--type", "Byte")),
                (1, "no geo-reference", ("zonal", plain, self.shapes, "-o", table)),
                (2, "did you mean mean?", ("zonal", SCENE, self.shapes, "-o", table, "--stats", "meen")),
                (2, "no band 6", ("zonal", SCENE, self.shapes, "-o", table, "--bands", "6")),
                (1, "vector format", ("zonal", SCENE, self.shapes, "-o", self.folder / "o.txt"))):
            with self.subTest(words):
                self.fails(code, words, *arguments, "-q")
                self.assertFalse(out.exists() or table.exists())
        self.fails(2, "shapes.geojson", "zonal", SCENE, self.shapes, "-o", self.shapes, "--overwrite")
        self.assertEqual(json.loads(self.shapes.read_text())["features"], SHAPES)


if __name__ == "__main__":
    unittest.main()
