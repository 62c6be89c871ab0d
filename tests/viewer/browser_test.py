"""The viewer's page in a headless browser. Skipped where npm, node, chromium or their modules aren't there.

With VEXG_PICTURES=DIR the pictures of docs/viewer.md are made in that folder.
"""

import filecmp
import functools
import json
import os
import pathlib
import random
import shutil
import subprocess
import unittest

from viewer import Viewer

from support import BUILD, DATA, SANITIZED, SOURCE, VEXG, FolderTest, needs_data, run, use_system_python

HERE = pathlib.Path(__file__).parent
CHROMIUM = shutil.which("chromium") or shutil.which("chromium-browser")
SCENE = DATA / "landsat7_olinda.tif"

try:
    import numpy
    from osgeo import gdal
    gdal.UseExceptions()
except ImportError:
    use_system_python()
    gdal = None


def npm_folder(package):
    """A folder of the build with the modules of a package's lock file."""
    folder = BUILD / "viewer-npm" / package.relative_to(SOURCE).as_posix().replace("/", "-")
    folder.mkdir(parents=True, exist_ok=True)
    lock, done = package / "package-lock.json", folder / "done"
    if not done.exists() or done.read_bytes() != lock.read_bytes():
        for name in ("package.json", "package-lock.json"):
            shutil.copy(package / name, folder)
        subprocess.run(["npm", "ci", "--ignore-scripts", "--no-audit", "--no-fund", "--fetch-retries=0"], cwd=folder,
                       check=True, capture_output=True, timeout=120)
        done.write_bytes(lock.read_bytes())
    return folder


@functools.cache
def modules(package):
    """npm_folder, or why there is none."""
    if shutil.which("npm") is None or shutil.which("node") is None:
        return None, "npm isn't there"
    try:
        return npm_folder(package), ""
    except (subprocess.SubprocessError, OSError) as fault:
        return None, f"npm ci has failed: {fault}"


@unittest.skipIf(SANITIZED, "of one build is enough")
@unittest.skipUnless(CHROMIUM, "chromium isn't there")
@unittest.skipUnless(gdal, "GDAL for Python isn't there")
@needs_data
class BrowserTest(FolderTest):
    def setUp(self):
        super().setUp()
        self.modules, why = modules(HERE)
        if self.modules is None:
            self.skipTest(why)

    def drive(self, viewer, scenario, **options):
        """What the scenario has found, without any complaint of the page."""
        done = subprocess.run(["node", HERE / "browser.mjs", self.modules, CHROMIUM, viewer.address, scenario,
                               json.dumps(options)], capture_output=True, text=True, timeout=120)
        self.assertTrue(done.stdout, done.stderr)
        found = json.loads(done.stdout)
        self.assertNotIn("error", found, found.get("error"))
        self.assertEqual((found["console"], found["elsewhere"]), ([], []))
        self.assertEqual(found.get("axe", []), [])
        return found


def make_raster(path, bands, georef=(300000, 10, 0, 9100000, 0, -10), epsg=32725):
    """A GeoTIFF of arrays."""
    kind = {"uint8": gdal.GDT_Byte, "uint16": gdal.GDT_UInt16, "uint32": gdal.GDT_UInt32}[str(bands[0].dtype)]
    lines, samples = bands[0].shape
    raster = gdal.GetDriverByName("GTiff").Create(str(path), samples, lines, len(bands), kind, ["TILED=YES"])
    raster.SetGeoTransform(georef)
    from osgeo import osr
    system = osr.SpatialReference()
    system.ImportFromEPSG(epsg)
    raster.SetProjection(system.ExportToWkt())
    for number, band in enumerate(bands, 1):
        raster.GetRasterBand(number).WriteArray(band)
    return raster


class LargeScene(BrowserTest):
    """A scene of 4000 x 4000 pixels under 1,000,000 segments."""

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        import tempfile
        made = tempfile.TemporaryDirectory()
        cls.addClassCleanup(made.cleanup)
        cls.scene, cls.labels = pathlib.Path(made.name) / "large.tif", pathlib.Path(made.name) / "labels.tif"
        run_ = numpy.arange(4000, dtype="uint32")
        waves = [((7 + band) * run_ % 1501).astype("uint16") for band in range(3)]
        cls.bands = [numpy.add.outer(waves[band], waves[band - 1][::-1]) for band in range(3)]
        make_raster(cls.scene, cls.bands)
        make_raster(cls.labels, [numpy.add.outer(run_ // 4 * 1000, run_ // 4 + 1)])
        cls.viewer = Viewer(cls.scene, "--labels", cls.labels)
        cls.addClassCleanup(cls.viewer.__exit__)

    def test_the_first_picture_is_there_soon_and_values_are_those_of_gdal(self):
        random.seed(20)
        pixels = [(random.randrange(4000), random.randrange(4000)) for _ in range(50)]
        found = self.drive(self.viewer, "first", pixels=pixels)
        self.assertLess(found["pictureMs"], 8000)
        for (x, y), values in zip(pixels, found["values"], strict=True):
            self.assertEqual([int(value) for value in values], [int(band[y, x]) for band in self.bands], (x, y))

    def test_bands_and_stretch_change_without_a_request(self):
        pixels = [(2000 + 7 * i, 2000 - 5 * i) for i in range(12)]
        found = self.drive(self.viewer, "style", center=(2000, 2000), pixels=pixels)
        self.assertEqual(found["requests"], 0)
        self.assertLess(sorted(found["ms"])[len(found["ms"]) // 2], 100)
        # Of so large a scene every second pixel is counted; the ends are those of its values.
        counted = self.bands[0][::2, ::2]
        low, high = int(counted.min()), int(counted.max())
        for (x, y), color in zip(pixels, found["grey"], strict=True):
            level = 255 * (int(self.bands[0][y, x]) - low) / (high - low)
            self.assertLessEqual(abs(color[0] - min(max(level, 0), 255)), 0.5 + 1e-9, (x, y))
            self.assertEqual(color[0:3] + color[3:], [color[0]] * 3 + [255])
        self.assertGreater(found["dragged"][0], 1200)

    def test_a_million_segments_have_their_borders(self):
        pixels = [(x, y) for x in range(2040, 2056) for y in range(2044, 2052)]
        found = self.drive(self.viewer, "borders", center=(2048, 2048), pixels=pixels)
        for (x, y), color in zip(pixels, found["borders"], strict=True):
            self.assertEqual(color[3] != 0, x % 4 == 3 or y % 4 == 3, (x, y))


class SmallScene(BrowserTest):
    """The sample scene under classes, segments and a second date."""

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        import tempfile
        made = tempfile.TemporaryDirectory()
        cls.addClassCleanup(made.cleanup)
        folder = pathlib.Path(made.name)
        pixels = gdal.Open(str(SCENE)).ReadAsArray().astype("int32")
        index = (pixels[3] - pixels[2]) / (pixels[3] + pixels[2])
        cls.map = numpy.select([index < -0.1, index < 0.1, index < 0.3], [1, 2, 3], 4).astype("uint8")
        source = gdal.Open(str(SCENE))
        raster = make_raster(folder / "classes.tif", [cls.map], source.GetGeoTransform(), 31985)
        colors = gdal.ColorTable()
        cls.colors = [(0, 0, 0, 0), (38, 98, 196, 255), (205, 160, 110, 255), (160, 205, 95, 255), (24, 112, 48, 255)]
        for value, color in enumerate(cls.colors):
            colors.SetColorEntry(value, color)
        raster.GetRasterBand(1).SetColorTable(colors)
        raster.GetRasterBand(1).SetCategoryNames(["", "Water", "Built-up", "Grass", "Forest"])
        del raster
        made_labels = run("segment", str(SCENE), str(folder / "labels.tif"), "--merge-percent", "90", "--tree",
                          str(folder / "segments.tree"))
        assert made_labels[0] == 0, made_labels
        make_raster(folder / "after.tif", list((255 - pixels).astype("uint8")), source.GetGeoTransform(), 31985)
        cls.viewer = Viewer(SCENE, folder / "after.tif", "--classes", folder / "classes.tif", "--labels",
                            folder / "segments.tree")
        cls.addClassCleanup(cls.viewer.__exit__)
        cls.files = folder

    def test_classes_have_a_legend_that_hides_them(self):
        pixels = [(100 + 5 * i, 140 + i) for i in range(20)]
        found = self.drive(self.viewer, "classes", pixels=pixels, axe=True)
        self.assertEqual(found["legend"], ["Water", "Built-up", "Grass", "Forest"])
        for (x, y), before, after in zip(pixels, found["before"], found["after"], strict=True):
            value = int(self.map[y, x])
            self.assertEqual(tuple(before), self.colors[value])
            self.assertEqual(tuple(after), (0, 0, 0, 0) if value == 2 else self.colors[value])
        x, y = pixels[0]
        self.assertIn(["", "Water", "Built-up", "Grass", "Forest"][self.map[y, x]], found["readout"])

        gdal.FileFromMemBuffer("/vsimem/tile.png", self.viewer.ask("/api/picture/2/0/0/0?bands=0")[2])
        picture = gdal.Open("/vsimem/tile.png").ReadAsArray()
        self.assertTrue((picture == numpy.array(self.colors, "uint8")[self.map[:256, :256]].transpose(2, 0, 1)).all())

    def test_pictures_and_prints_are_finer_than_the_screen(self):
        file = self.folder / "view.png"
        found = self.drive(self.viewer, "print", file=str(file), page=os.environ.get("VEXG_PRINT"))
        (size, resolution), after = found["states"]
        self.assertEqual([size, resolution], after)
        saved = gdal.Open(str(file)).ReadAsArray()
        self.assertEqual(saved.shape, (4, 2 * size[1], 2 * size[0]))
        self.assertGreater((saved[3] == 255).mean(), 0.3)
        self.assertGreater(len(numpy.unique(saved[0])), 100)
        self.assertEqual((found["printed"], found["legend"]), (["sheet"], ["Water", "Grass", "Forest"]))
        width, height, line, shown = found["picture"]
        self.assertEqual([width, height], [2 * length for length in size])
        self.assertAlmostEqual(line, shown, 2)
        self.assertRegex(found["scale"], r"^[125]0* k?m$")

    def test_a_segment_that_is_clicked_tells_its_values_and_the_slider_merges(self):
        found = self.drive(self.viewer, "segment", pixel=(174, 173), axe=True)
        self.assertRegex(found["title"], r"^Segment \d+$")
        self.assertEqual(len(found["rows"]), 6)
        cost = self.viewer.get("scales/3")["costs"][-1]
        labels = self.files / "coarse.tif"
        self.fine("segment", "cut", self.files / "segments.tree", labels, "--merge-value", repr(cost), "--overwrite")
        want = len(numpy.unique(gdal.Open(str(labels)).ReadAsArray()))
        self.assertEqual(found["labels"], want)

    def test_a_drawn_region_has_the_statistics_of_the_command_line(self):
        file = self.folder / "region.geojson"
        found = self.drive(self.viewer, "region", ring=[(60, 70), (250, 90), (200, 280), (80, 240)], file=str(file), axe=True)
        _, out, _ = run("stats", str(SCENE), "--region", str(file), "--json", "-q")
        self.assertEqual(found["bands"], json.loads(out)["bands"])
        self.assertEqual(found["cells"][1], str(found["bands"][0]["count"]))

    def test_the_swipe_shows_one_raster_on_each_side(self):
        found = self.drive(self.viewer, "swipe", pixel=(150, 150))
        self.assertEqual(found["left"], found["upper"])
        self.assertEqual(found["right"], found["lower"])
        self.assertNotEqual(found["upper"], found["lower"])

    def test_dark_pages_can_be_read_too(self):
        self.drive(self.viewer, "shapes", axe=True, dark=True)

    @unittest.skipUnless(os.environ.get("VEXG_PICTURES"), "only when asked for")
    def test_pictures_of_the_page(self):
        folder = pathlib.Path(os.environ["VEXG_PICTURES"]).resolve()
        with Viewer(SCENE, "--classes", self.files / "classes.tif", "--labels", self.files / "segments.tree") as viewer:
            self.drive(viewer, "picture", file=str(folder / "view-segments.png"), click=(174, 173), point=(160, 200))
        infrared = self.files / "infrared.tif"
        bands = gdal.Open(str(SCENE)).ReadAsArray()
        make_raster(infrared, [bands[number] for number in (3, 2, 1)], gdal.Open(str(SCENE)).GetGeoTransform(), 31985)
        with Viewer(SCENE, infrared) as viewer:
            self.drive(viewer, "picture", file=str(folder / "view-swipe.png"), keys=["s"], point=(120, 150), dark=True)


class Servers(BrowserTest):
    def test_a_page_says_in_one_line_that_its_server_has_gone(self):
        name = f"paged{os.getpid()}"
        with subprocess.Popen([VEXG, "serve", "--quiet", name]) as server:
            self.addCleanup(server.kill)
            with Viewer("--server", name, SCENE) as viewer:
                found = self.drive(viewer, "serverGone", server=server.pid)
                self.assertEqual(found["notice"], f'the server "{name}" has gone away')
                self.assertEqual(viewer.end(), (3, f'vexg: the server "{name}" has gone away\n'))


class Shapes(BrowserTest):
    def test_many_shapes_come_with_the_view_and_the_page_says_what_it_leaves_out(self):
        file = self.folder / "points.geojson"
        file.write_text(json.dumps({"type": "FeatureCollection", "crs": None, "features": [
            {"type": "Feature", "properties": {}, "geometry": {"type": "Point", "coordinates": [2.03 * x, 2.03 * y]}}
            for y in range(170) for x in range(170)]}))
        with Viewer(DATA / "landsat7_rgb.png", "--shapes", file) as viewer:
            found = self.drive(viewer, "manyShapes", axe=True)
        self.assertEqual(found["counts"][0], 20000)
        self.assertEqual(found["note"], "The 8900 smallest of 28900 shapes in view are not drawn.")
        self.assertTrue(1000 < found["counts"][1] < 20000, found)
        self.assertEqual(found["noteAfter"], "")


class Mosaics(BrowserTest):
    def test_footprints_and_seams_are_drawn(self):
        mosaic = self.folder / "m.vmosaic"
        scenes = [str(DATA / f"mosaic_{name}.tif") for name in "abc"]
        self.fine("mosaic", "create", mosaic, *scenes)
        for step in ("footprints", "seams"):
            self.fine("mosaic", step, mosaic, "-q")
        with Viewer("--mosaic", mosaic) as viewer:
            found = self.drive(viewer, "shapes", axe=True)
            self.assertEqual(found["shapes"], [3, 3])
            self.assertEqual(len(found["layers"]), 3)


class Vendored(unittest.TestCase):
    def test_the_map_library_is_what_npm_makes_of_its_lock_file(self):
        vendor, page = SOURCE / "tools/vexg/viewer/vendor", SOURCE / "tools/vexg/viewer/page"
        folder, why = modules(vendor)
        if folder is None:
            self.skipTest(why)
        shutil.copy(vendor / "ol_parts.js", folder)
        out = folder / "out"
        out.mkdir(exist_ok=True)
        subprocess.run(["npm", "run", "--silent", "build"], cwd=folder, check=True, env={**os.environ, "OUT": str(out)},
                       capture_output=True, timeout=60)
        for name in ("ol.js", "ol.css", "ol.LICENSE.txt"):
            self.assertTrue(filecmp.cmp(out / name, page / name, shallow=False), name)


if __name__ == "__main__":
    unittest.main()
