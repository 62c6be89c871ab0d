"""Which pixels of a raster verbs work on: areas, masks and no-data values, beside plain arithmetic."""

import json
import sqlite3
import unittest

from support import DATA, FolderTest, PipeTest, gdal_pixels, needs_data, needs_gdal, read_npy, read_png, run

SCENE = DATA / "landsat7_olinda.tif"
LEFT, TOP, SIZE, WIDTH, HEIGHT, BANDS = 288776.25, 9120760.75, 28.5, 349, 352, 6
ALL = WIDTH * HEIGHT
FIELDS = {1: (60, 40, 159, 99), 2: (140, 80, 199, 159)}  # two rectangles of pixels that overlap
RECT = (60, 40, 199, 159)


def box(left, top, right, bottom):
    """The corners on the map of all of these pixels."""
    return LEFT + left * SIZE, TOP - (bottom + 1) * SIZE, LEFT + (right + 1) * SIZE, TOP - top * SIZE


def inside(x, y, fields=(1, 2)):
    return any(FIELDS[n][0] <= x <= FIELDS[n][2] and FIELDS[n][1] <= y <= FIELDS[n][3] for n in fields)


def within(rect):
    return lambda x, y: rect[0] <= x <= rect[2] and rect[1] <= y <= rect[3]


def feature(number, rect):
    west, south, east, north = box(*rect)
    off = 0.3 * SIZE  # within the pixels at the borders, all of which belong to the region
    ring = [(west + off, north - off), (east - off, north - off), (east - off, south + off), (west + off, south + off)]
    return {"type": "Feature", "properties": {"n": number},
            "geometry": {"type": "Polygon", "coordinates": [[*ring, ring[0]]]}}


@needs_data
@needs_gdal
class Areas(PipeTest, FolderTest):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.pixels = gdal_pixels(SCENE)

    def setUp(self):
        super().setUp()
        self.region = self.folder / "fields.geojson"
        far = feature(3, (-50, 400, -40, 410))
        self.region.write_text(json.dumps({
            "type": "FeatureCollection", "features": [*(feature(n, rect) for n, rect in FIELDS.items()), far],
            "crs": {"type": "name", "properties": {"name": "urn:ogc:def:crs:EPSG::31985"}}}))

    def value(self, x, y, band):
        return self.pixels[(y * WIDTH + x) * BANDS + band]

    def values(self, band, counts):
        return [self.value(x, y, band) for y in range(HEIGHT) for x in range(WIDTH) if counts(x, y)]

    def stats(self, *options, file=SCENE):
        return json.loads(self.fine("stats", file, "--json", "-q", *options))["bands"]

    def test_statistics_and_histograms_are_of_the_pixels_that_count(self):
        def masked(x, y):
            return self.value(x, y, 5) in (20, 21, 22)

        cases = [
            (("--region", self.region), inside),
            (("--region", f"{self.region}:fields"), inside),
            (("--region", self.region, "--where", "n=2"), lambda x, y: inside(x, y, (2,))),
            (("--region", self.region, "--rect", "100,0,348,90"), lambda x, y: inside(x, y) and x >= 100 and y <= 90),
            (("--rect", "7,9,30,50"), within((7, 9, 30, 50))),
            (("--bbox", ",".join(map(str, box(7, 9, 30, 50)))), within((7, 9, 30, 50))),
            (("--bbox", ",".join(map(str, (box(7, 9, 30, 50)[0] - 1, *box(7, 9, 30, 50)[1:3],
                                           box(7, 9, 30, 50)[3] + 1e9)))), within((6, 0, 30, 50))),
            (("--mask-band", "5", "--mask-values", "20,21,22"), lambda x, y: not masked(x, y)),
            (("--mask-band", "5", "--mask-values", "20,21,22", "--mask-inverse", "--region", self.region),
             lambda x, y: masked(x, y) and inside(x, y)),
        ]
        for options, counts in cases:
            with self.subTest(options=options):
                bands = self.stats(*options)
                for band in range(BANDS):
                    values = self.values(band, counts)
                    told = bands[band]
                    self.assertEqual((told["count"], told["min"], told["max"], told["sum"]),
                                     (len(values), min(values), max(values), sum(values)))
                told = json.loads(self.fine("hist", SCENE, "--json", "-q", "--bands", "3", *options))["bands"][0]
                values = self.values(3, counts)
                self.assertEqual(told["counts"], [values.count(v) for v in range(256)])
        no_data = self.stats("--no-data", "66,67", "--region", self.region)
        for band in range(BANDS):
            values = [v for v in self.values(band, inside) if v not in (66, 67)]
            self.assertEqual((no_data[band]["count"], no_data[band]["sum"]), (len(values), sum(values)))

    def test_says_how_large_the_area_is(self):
        for options, line in (
                (("--region", self.region), "60,40 to 199,159, 10,400 of 122,848 pixels"),
                (("--rect", "62,39,256,193"), "62,39 to 256,193, 30,225 of 122,848 pixels")):
            code, _, err = run("stats", SCENE, "--progress", "none", "--bands", "0", *options)
            self.assertEqual((code, err), (0, f"vexg: {SCENE}: {line}\n"))

    def test_read_and_quicklook_show_the_area(self):
        array, mask, picture = (self.folder / name for name in ("a.npy", "m.npy", "q.png"))
        self.fine("read", SCENE, "-o", array, "--mask", mask, "--region", self.region, "--bands", "2", "-q")
        width, height = RECT[2] - RECT[0] + 1, RECT[3] - RECT[1] + 1
        _, shape, pixels = read_npy(array)
        states = read_npy(mask)[2]
        self.assertEqual(shape, (height, width, 1))
        self.fine("quicklook", SCENE, picture, "--region", self.region, "--bands", "2", "--stretch", "none", "-q")
        shown_width, shown_height, channels, shown = read_png(picture)
        self.assertEqual((shown_width, shown_height), (width, height))
        for y in range(height):
            for x in range(width):
                at, place = y * width + x, (RECT[0] + x, RECT[1] + y)
                self.assertEqual(pixels[at], self.value(*place, 2))
                self.assertEqual(states[at], 0 if inside(*place) else 4)
                self.assertEqual(shown[(at + 1) * channels - 1], 255 if inside(*place) else 0)

    def test_files_hold_the_area_in_its_place(self):
        count, total = (f(self.values(0, inside)) for f in (len, sum))
        made = self.folder / "made.tif"
        self.fine("copy", SCENE, made, "--region", self.region, "-q")
        told = self.stats(file=made)[0]
        self.assertEqual((told["count"], told["sum"]), (count, total))
        out = self.fine("transform", made, "--inverse", stdin=f"{LEFT + 60 * SIZE} {TOP - 40 * SIZE}\n")
        for number in out.split():
            self.assertAlmostEqual(float(number), 0, places=5)
        # A value that the file says is no data goes into what is made; so does one that a format needs.
        self.fine("copy", SCENE, made, "--no-data", "66", "--region", self.region, "-q", "--overwrite")
        values = [v for v in self.values(0, inside) if v != 66]
        again = self.stats(file=made)[0]
        self.assertEqual((again["count"], again["sum"]), (len(values), sum(values)))
        orva = self.folder / "made.dat"
        self.fine("copy", SCENE, orva, "--no-data", "66", "-q")
        self.assertRegex(self.fine("info", orva), r"no data +66")
        calibrated = self.folder / "radiance.tif"
        self.fine("calibrate", "radiance", SCENE, calibrated, "--gain", ",".join("1" * BANDS), "--offset",
                  ",".join("1" * BANDS), "--region", self.region, "-q")
        told = self.stats(file=calibrated)[0]
        self.assertEqual((told["count"], told["sum"]), (count, total + count))
        warped = self.folder / "warped.tif"
        self.fine("warp", SCENE, warped, "--to", SCENE, "--region", self.region, "--source-no-data", "66", "-q")
        told = self.stats(file=warped)[0]
        self.assertEqual((told["count"], told["sum"]), (len(values), sum(values)))
        self.assertRegex(self.fine("info", warped), rf"size +{WIDTH} samples, {HEIGHT} lines")

    def test_levels_show_the_area_in_their_own_pixels(self):
        copy = self.folder / "scene.dat"
        self.fine("copy", SCENE, copy, "-q")
        self.fine("pyramid", "build", copy, "-q")
        array, mask, whole = (self.folder / name for name in ("a.npy", "m.npy", "w.npy"))
        self.fine("read", copy, "-o", whole, "--level", "1", "--bands", "0", "-q")
        self.fine("read", copy, "-o", array, "--mask", mask, "--level", "1", "--bands", "0", "--region", self.region,
                  "-q")
        _, (lines, samples, _), pixels = read_npy(whole)
        self.assertEqual(read_npy(array)[1], (60, 70, 1))
        _, _, part = read_npy(array)
        states = read_npy(mask)[2]
        for y in range(60):
            for x in range(70):
                self.assertEqual(part[y * 70 + x], pixels[(y + 20) * samples + x + 30])
                self.assertEqual(states[y * 70 + x], 0 if inside(2 * (x + 30), 2 * (y + 20)) else 4)
        # A picture is made of a level of the views, and shows the same.
        picture = self.folder / "q.png"
        self.fine("quicklook", copy, picture, "--size", "70", "--region", self.region, "--bands", "0", "--stretch",
                  "none", "-q")
        width, height, channels, shown = read_png(picture)
        self.assertEqual((width, height), (70, 60))
        for y in range(60):
            for x in range(70):
                if inside(2 * (x + 30), 2 * (y + 20)):
                    self.assertEqual(shown[(y * 70 + x) * channels], part[y * 70 + x])
                    self.assertEqual(shown[(y * 70 + x + 1) * channels - 1], 255)
                else:
                    self.assertEqual(shown[(y * 70 + x + 1) * channels - 1], 0)

    def test_polygons_are_those_of_the_area(self):
        made = self.folder / "made.gpkg"
        self.fine("polygonize", SCENE, made, "--region", self.region, "--mask-band", "0", "--mask-values", "60", "-q")
        wanted = set(self.values(0, inside)) - {60, 255}  # the largest number is no label
        with sqlite3.connect(made) as file:
            self.assertEqual({row[0] for row in file.execute("select label from made")}, wanted)

    def test_refuses_what_lies_outside_and_what_does_not_go_together(self):
        cases = [(("--region", self.region, "--where", "n=3"), "no pixel of the raster lies inside"),
                 (("--region", self.region, "--rect", "0,0,9,9"), "no pixel of the rectangle lies inside"),
                 (("--region", self.folder / "none.gpkg"), "none.gpkg"),
                 (("--region", f"{self.region}:none"), 'no layer "none"'),
                 (("--region", ""), "empty"),
                 (("--bbox", "0,0,10,10"), "outside the raster"),
                 (("--bbox", "10,0,0,10"), "west below east"),
                 (("--bbox", "1,2,3,nan"), "--bbox"),
                 (("--rect", "0,0,349,1"), "349 by 352"),
                 (("--rect", "0,0,1,1", "--bbox", "0,0,1,1"), "exclude"),
                 (("--bbox-crs", "EPSG:4326"), "--bbox"),
                 (("--where", "n=1"), "--region"),
                 (("--mask-band", "6", "--mask-values", "1"), "no band 6"),
                 (("--mask-band", "1"), "--mask-values"),
                 (("--mask-band", "1", "--mask-values", "256"), "can't be 256"),
                 (("--no-data", "0.5"), "can't be 0.5"),
                 (("--region", self.region, "--save"), "--save")]
        for options, words in cases:
            code, out, err = run("stats", SCENE, "-q", *options)
            self.assertNotEqual(code, 0, options)
            self.assertEqual((out, err.count("\n")), ("", 1), options)
            self.assertIn(words, err)
        made = self.folder / "made.tif"
        code, _, err = run("copy", SCENE, self.region, "--format", "TIFF", "--region", self.region, "--overwrite")
        self.assertIn("input", err)
        self.assertTrue(self.region.read_text().startswith("{"))
        self.assertNotEqual(run("copy", SCENE, made, "--region", self.region, "--where", "n=3")[0], 0)
        self.assertFalse(made.exists())

    def test_the_printed_job_does_the_same(self):
        options = ("--region", self.region, "--no-data", "66", "--mask-band", "5", "--mask-values", "20,21")
        job = self.folder / "job.xml"
        job.write_text(self.fine("stats", SCENE, "--bands", "0,4", *options, "-q", "--print-job"))
        result = self.fine("run", job)
        for band, told in zip((0, 4), self.stats("--bands", "0,4", *options)):
            self.assertIn(str(told["sum"]).removesuffix(".0"), result)
            values = [v for v in (self.value(x, y, band) for y in range(HEIGHT) for x in range(WIDTH)
                                  if inside(x, y) and self.value(x, y, 5) not in (20, 21)) if v != 66]
            self.assertEqual(told["sum"], sum(values))

    def test_a_server_gives_the_same_and_keeps_nothing_open(self):
        options = ("--region", self.region, "--no-data", "66", "--mask-band", "5", "--mask-values", "20,21")
        here = self.stats(*options)
        self.serve()
        self.assertEqual(self.stats(*options, "--server", "test"), here)
        self.fine("copy", SCENE, self.folder / "made.tif", *options, "-q", "--server", "test")
        self.assertEqual(json.loads(self.fine("open", "test", "--json")), [])

    def test_map_points_become_pixels(self):
        point = "-34.9 -8.0\n"
        direct = self.fine("transform", SCENE, "--inverse", "--from", "EPSG:4326", stdin=point)
        map_point = self.fine("transform", "--from", "EPSG:4326", "--to", "EPSG:31985", stdin=point)
        easting, northing = map(float, map_point.split())
        x, y = map(float, direct.split())
        self.assertAlmostEqual(x, (easting - LEFT) / SIZE, places=4)  # the file's grid is a little off
        self.assertAlmostEqual(y, (TOP - northing) / SIZE, places=4)
        back = self.fine("transform", SCENE, "--to", "EPSG:4326", stdin=direct)
        for got, want in zip(back.split(), point.split()):
            self.assertAlmostEqual(float(got), float(want), places=9)
        for wrong in (("--to", "EPSG:4326", "--inverse"), ("--from", "EPSG:4326")):
            self.assertEqual(run("transform", SCENE, *wrong, stdin=point)[0], 2)


if __name__ == "__main__":
    unittest.main()
