"""Mosaics by the command line: one raster of many scenes, beside GDAL and numpy."""

import json
import os
import pathlib
import random
import shutil
import signal
import subprocess
import threading
import time
import unittest

from support import DATA, FolderTest, VEXG, needs_data, run, use_system_python

try:
    import numpy as np
    from osgeo import gdal, osr
    gdal.UseExceptions()
except ImportError:
    use_system_python()
    np = None

needs_modules = unittest.skipIf(np is None, "no numpy or GDAL module")
SCENES = [str(DATA / f"mosaic_{name}.tif") for name in "abc"]


def pixels(file):
    """Bands, lines, samples."""
    data = gdal.Open(str(file)).ReadAsArray()
    return data if data.ndim == 3 else data[None]


@needs_modules
class MosaicTest(FolderTest):
    def vexg(self, *arguments):
        code, out, err = run(*map(str, arguments))
        self.assertEqual(code, 0, (arguments, err))
        return out

    def fails(self, says, *arguments):
        """It fails with one line that says so."""
        code, _, err = run(*map(str, arguments))
        self.assertGreater(code, 0, arguments)
        self.assertEqual(len(err.strip().splitlines()), 1, err)
        self.assertIn(says, err)

    def path(self, name):
        return str(pathlib.Path(self.folder) / name)

    def scene(self, name, values, x=0, y=0, no_data=None, epsg=32633, size=10, kind=None):
        """A GeoTIFF whose upper left corner lies x and y pixels from a common one."""
        kind = kind or {"uint8": gdal.GDT_Byte, "int16": gdal.GDT_Int16, "uint16": gdal.GDT_UInt16,
                        "float32": gdal.GDT_Float32}[values.dtype.name]
        bands, lines, samples = values.shape
        path = self.path(name)
        data = gdal.GetDriverByName("GTiff").Create(path, samples, lines, bands, kind)
        if epsg:
            system = osr.SpatialReference()
            system.ImportFromEPSG(epsg)
            data.SetProjection(system.ExportToWkt())
            data.SetGeoTransform((500000 + x * size, size, 0, 5400000 - y * size, 0, -size))
        for band in range(bands):
            data.GetRasterBand(band + 1).WriteArray(values[band])
            if no_data is not None:
                data.GetRasterBand(band + 1).SetNoDataValue(no_data)
        data = None
        return path

    def whole(self, mosaic, *more):
        out = self.path("whole.tif")
        self.vexg("copy", mosaic, out, "--overwrite", "--quiet", *more)
        return pixels(out)

    @needs_data
    def test_the_first_scene_with_a_pixel_shows_it(self):
        mosaic = self.path("M.vmosaic")
        self.vexg("mosaic", "create", mosaic, *SCENES)
        shown = self.whole(mosaic)
        place = gdal.Open(self.path("whole.tif")).GetGeoTransform()
        expected = np.zeros_like(shown)
        for scene in reversed(SCENES):
            own = gdal.Open(scene).GetGeoTransform()
            x, y = round((own[0] - place[0]) / place[1]), round((own[3] - place[3]) / place[5])
            values = pixels(scene)
            there = (values != 0).any(0)
            expected[:, y:y + values.shape[1], x:x + values.shape[2]][:, there] = values[:, there]
        np.testing.assert_array_equal(shown, expected)
        # Statistics, pyramids and pictures are those of any raster; a mosaic of mosaics is as well.
        band = json.loads(self.vexg("stats", mosaic, "--json"))["bands"][1]
        self.assertAlmostEqual(band["mean"], expected[1][(expected != 0).any(0)].mean(), 6)
        self.vexg("pyramid", "build", mosaic, "--levels", "1-2", "--resampling", "nearest")
        level = self.whole(mosaic, "--level", "1")
        np.testing.assert_array_equal(level, expected[:, ::2, ::2][:, :level.shape[1], :level.shape[2]])
        nested = self.path("N.vmosaic")
        self.vexg("mosaic", "create", nested, mosaic)
        np.testing.assert_array_equal(self.whole(nested), expected)
        self.fails("is a file of the input", "mosaic", "create", mosaic, mosaic, "--overwrite")
        text = pathlib.Path(nested).read_text()
        pathlib.Path(nested).write_text(text.replace("M.vmosaic", "N.vmosaic"))
        self.fails("the mosaic is a scene of itself", "info", nested)

    @needs_data
    def test_a_mosaic_of_one_scene_is_its_warp(self):
        for resampling in ("nearest", "linear", "cubic"):
            options = ["--resampling", resampling, "--pixel-size", "0.0003"]
            self.vexg("mosaic", "create", self.path("M.vmosaic"), SCENES[1], "--grid", "EPSG:4326", *options,
                      "--overwrite")
            self.vexg("warp", SCENES[1], self.path("warped.tif"), "--to", "EPSG:4326", *options, "--overwrite")
            np.testing.assert_array_equal(self.whole(self.path("M.vmosaic")), pixels(self.path("warped.tif")))

    @needs_data
    def test_pixels_are_the_same_in_any_part_after_all_steps(self):
        mosaic = self.path("M.vmosaic")
        self.vexg("mosaic", "create", mosaic, *SCENES, "--grid", "EPSG:4326", "--resampling", "linear",
                  "--feather", "15")
        for step in ("footprints", "match", "seams"):
            self.vexg("mosaic", step, mosaic)
        shown = self.whole(mosaic)
        chance = random.Random(5)
        for _ in range(8):
            left, right = sorted(chance.sample(range(shown.shape[2]), 2))
            top, bottom = sorted(chance.sample(range(shown.shape[1]), 2))
            part = self.whole(mosaic, "--rect", f"{left},{top},{right},{bottom}")
            np.testing.assert_array_equal(part, shown[:, top:bottom + 1, left:right + 1])
        info = json.loads(self.vexg("mosaic", "info", mosaic, "--json"))
        self.assertTrue(all(scene["footprint"] and scene["seam"] for scene in info["scenes"]))
        self.vexg("mosaic", "build", self.path("built.tif"), *SCENES, "--grid", "EPSG:4326", "--resampling",
                  "linear", "--feather", "15")
        np.testing.assert_array_equal(pixels(self.path("built.tif")), shown)
        self.assertEqual([name for name in os.listdir(self.folder) if name.startswith(".")], [])
        # Layers of both kinds, whose areas are those of the pixels.
        self.vexg("mosaic", "export", mosaic, self.path("shapes.gpkg"))
        layers = gdal.OpenEx(self.path("shapes.gpkg"))
        self.assertEqual([layers.GetLayer(i).GetName() for i in range(2)], ["footprints", "seams"])
        area = sum(shape.GetField("area") for shape in layers.GetLayer(1))
        side = gdal.Open(self.path("whole.tif")).GetGeoTransform()[1]
        self.assertAlmostEqual(area / side ** 2 / (shown != 0).any(0).sum(), 1, 1)
        self.fails("one layer", "mosaic", "export", mosaic, self.path("shapes.geojson"))
        self.vexg("mosaic", "export", mosaic, self.path("seams.geojson"), "--layer", "seams")
        self.vexg("mosaic", "show", mosaic, self.path("shown.png"))
        lines = pixels(self.path("shown.png"))
        self.assertGreater(((lines[0] == 255) & (lines[1] == 255) & (lines[2] == 0)).sum(), 300)
        self.assertGreater(((lines[0] == 0) & (lines[1] == 255) & (lines[2] == 255)).sum(), 300)

    def test_a_pair_of_known_gain_and_offset_is_matched(self):
        chance = np.random.default_rng(3)
        yy, xx = np.mgrid[:300, :500]
        ground = 90 + 30 * np.sin(xx / 40) + 25 * np.cos(yy / 31) + chance.normal(0, 3, (2, 300, 500))
        left = np.clip(np.rint(ground[:, :, :300]), 1, 255).astype(np.uint8)
        right = np.clip(np.rint(ground[:, :, 200:] * 0.8 + 14), 1, 255).astype(np.uint8)
        scenes = [self.scene("l.tif", left, no_data=0), self.scene("r.tif", right, x=200, no_data=0)]
        mosaic = self.path("M.vmosaic")
        self.vexg("mosaic", "create", mosaic, *scenes)
        self.vexg("mosaic", "seams", mosaic)
        before = self.whole(mosaic).astype(float)
        self.vexg("mosaic", "match", mosaic)
        after = self.whole(mosaic).astype(float)
        # Right of the seam, in the middle of the overlap, the other scene is shown, as the left one has it there.
        place = np.s_[100:200, 255:295]
        for band in range(2):
            self.assertEqual(np.abs(before[band][100:200, 200:245] - left[band][100:200, 200:245]).max(), 0)
            wrong = before[band][place].mean() - left[band][place].mean()
            step = after[band][place].mean() - left[band][place].mean()
            self.assertGreater(abs(wrong), 2)
            self.assertLess(abs(step), 0.5)  # the noise has 3

    def test_floating_point_scenes_and_levels(self):
        yy, xx = np.mgrid[:256, :256]
        ground = ((xx + 2 * yy) / 1000).astype(np.float32)[None]
        scenes = [self.scene("a.tif", ground, no_data=-1),
                  self.scene("b.tif", ground * np.float32(2) + 1, x=128, no_data=-1)]
        for scene in scenes:
            self.vexg("pyramid", "build", scene, "--levels", "1-3", "--resampling", "nearest")
        mosaic = self.path("M.vmosaic")
        self.vexg("mosaic", "create", mosaic, *scenes, "--match-by", "scenes")
        before = self.whole(mosaic)
        self.vexg("mosaic", "match", mosaic)
        after = self.whole(mosaic)
        np.testing.assert_array_equal(after[0][:, :256], before[0][:, :256])  # matched to itself
        np.testing.assert_allclose(after[0][:, 256:], ground[0][:, 128:], atol=2e-4)
        self.assertGreater(len(np.unique(after[0][:, 256:])), 500)  # no bands
        np.testing.assert_array_equal(self.whole(mosaic, "--level", "2"), after[:, ::4, ::4])

    def test_scenes_come_from_lists_patterns_and_items(self):
        value = np.full((1, 4, 4), 1, np.uint8)
        for i in range(3):
            self.scene(f"s{i}.tif", value + i, x=4 * i)
        folder = pathlib.Path(self.folder)
        (folder / "list.txt").write_text("# scenes\ns2.tif\n\n  s0.tif\n")
        item = lambda i: {"type": "Feature", "stac_version": "1.0.0", "id": f"i{i}", "properties": {}, "assets": {
            "image": {"href": f"./s{i}.tif", "type": "image/tiff; application=geotiff", "roles": ["data"]},
            "thumbnail": {"href": "x.png", "roles": ["thumbnail"]}}}
        items = {"type": "FeatureCollection", "features": [item(1), item(2)]}
        (folder / "items.json").write_text(json.dumps(items))
        for words, order in [([self.path("s*.tif")], [0, 1, 2]), ([self.path("list.txt")], [2, 0]),
                             ([self.path("s[12].tif"), self.path("s0.tif")], [1, 2, 0]),
                             ([self.path("items.json")], [1, 2])]:
            mosaic = self.path("M.vmosaic")
            self.vexg("mosaic", "create", mosaic, *words, "--overwrite")
            files = [scene["file"] for scene in json.loads(self.vexg("mosaic", "info", mosaic, "--json"))["scenes"]]
            self.assertEqual(files, [self.path(f"s{i}.tif") for i in order])
        items["features"][0]["assets"]["more"] = {"href": "s0.tif", "roles": ["data"]}
        (folder / "items.json").write_text(json.dumps(items))
        self.fails("choose one by --asset: image, more", "mosaic", "create", mosaic, self.path("items.json"),
                   "--overwrite")
        self.vexg("mosaic", "create", mosaic, self.path("items.json"), "--overwrite", "--asset", "image")
        self.fails("no file has such a name", "mosaic", "create", mosaic, self.path("x*.tif"), "--overwrite")

    def test_what_cannot_be_joined_is_said_in_one_line(self):
        value = np.full((2, 20, 20), 9, np.uint8)
        good = self.scene("good.tif", value)
        mosaic = self.path("M.vmosaic")
        pathlib.Path(self.path("torn.tif")).write_bytes(pathlib.Path(good).read_bytes()[:100])
        for name, says in [(self.scene("type.tif", value.astype(np.int16)), "2 bands of type Int16"),
                           (self.scene("bands.tif", value[:1]), "1 bands of type Byte"),
                           (self.scene("nowhere.tif", value, epsg=0), "nowhere.tif"),
                           (self.path("torn.tif"), "torn.tif"), (self.path("gone.tif"), "gone.tif: no such file"),
                           (good, "the scene is there twice")]:
            self.fails(says, "mosaic", "create", mosaic, good, name)
            self.assertFalse(os.path.exists(mosaic), name)
        other = self.scene("other.tif", value + 1, x=10)
        self.vexg("mosaic", "create", mosaic, good, other)
        whole, text = self.whole(mosaic), pathlib.Path(mosaic).read_text()
        for change, says in [(lambda: shutil.move(other, other + ".away"), "other.tif: "),
                             (lambda: self.scene("other.tif", value.astype(np.int16), x=10), "2 bands of type Int16"),
                             (lambda: self.scene("other.tif", value, epsg=0), "other.tif: "),
                             (lambda: pathlib.Path(other).write_bytes(b"no raster"), "other.tif")]:
            change()
            for verb in (["mosaic", "match", mosaic], ["info", mosaic], ["mosaic", "seams", mosaic]):
                self.fails(says, *verb)
            self.assertEqual(pathlib.Path(mosaic).read_text(), text)
        shutil.move(other + ".away", other)
        np.testing.assert_array_equal(self.whole(mosaic), whole)
        # One that has changed its size is looked at anew.
        self.scene("other.tif", np.full((2, 20, 30), 7, np.uint8), x=10)
        self.assertEqual(self.whole(mosaic)[0][5, 25], 7)
        for cut in (len(text) // 2, 40, 0):
            pathlib.Path(mosaic).write_text(text[:cut])
            self.fails("M.vmosaic: ", "info", mosaic)
        pathlib.Path(mosaic).write_text(text.replace('"resampling"', '"resampled"', 1))
        self.fails("resampled: there is no such field; did you mean resampling?", "mosaic", "info", mosaic)

    def test_a_step_that_ends_early_leaves_what_stood(self):
        chance = np.random.default_rng(1)
        scenes = [self.scene(f"s{i}.tif", chance.integers(1, 255, (3, 700, 700), dtype=np.uint8), x=500 * i, no_data=0)
                  for i in range(3)]
        mosaic = self.path("M.vmosaic")
        self.vexg("mosaic", "create", mosaic, *scenes, "--feather", "9")
        for step in ("footprints", "match", "seams"):
            before = self.whole(mosaic)
            for wait in (0.02, 0.08, 0.2):
                for end in (signal.SIGKILL, signal.SIGINT):
                    process = subprocess.Popen([VEXG, "mosaic", step, mosaic, "--quiet"], stdout=subprocess.PIPE,
                                               stderr=subprocess.PIPE, text=True)
                    time.sleep(wait)
                    process.send_signal(end)
                    _, err = process.communicate(timeout=60)
                    self.assertLessEqual(len(err.strip().splitlines()), 1, err)
                    shown = self.whole(mosaic)
                    if process.returncode != 0:
                        self.assertEqual(shown.shape, before.shape)
            self.vexg("mosaic", step, mosaic)
        self.assertFalse(os.path.exists(mosaic + ".lock"))
        self.vexg("mosaic", "info", mosaic)
        out = self.path("built.tif")
        for wait in (0.1, 0.3):
            process = subprocess.Popen([VEXG, "mosaic", "build", out, *scenes, "--quiet"], stderr=subprocess.PIPE)
            time.sleep(wait)
            process.kill()
            process.communicate()
        self.vexg("mosaic", "build", out, *scenes, "--overwrite")
        self.assertEqual([name for name in os.listdir(self.folder) if name.startswith(".")], [])

    def test_two_runs_at_once_keep_each_others_work(self):
        scenes = [self.scene(f"s{i}.tif", np.full((1, 80, 80), 50 + i, np.uint8), x=50 * i, no_data=0)
                  for i in range(4)]
        mosaic = self.path("M.vmosaic")
        self.vexg("mosaic", "create", mosaic, *scenes)
        runs = [threading.Thread(target=self.vexg, args=("mosaic", step, mosaic))
                for step in ("match", "footprints", "seams")]
        for thread in runs:
            thread.start()
        for thread in runs:
            thread.join()
        info = json.loads(self.vexg("mosaic", "info", mosaic, "--json"))
        self.assertTrue(info["tables"])
        self.assertTrue(all(scene["footprint"] and scene["seam"] for scene in info["scenes"]))

    def test_one_document_does_all(self):
        value = np.full((1, 60, 60), 80, np.uint8)
        scenes = [self.scene(f"s{i}.tif", value + i, x=30 * i, no_data=0) for i in range(2)]
        out = self.path("out.tif")
        document = self.vexg("mosaic", "build", out, *scenes, "--feather", "5", "--print-job")
        self.assertEqual(document.count("<Job"), 1)
        self.assertFalse(os.path.exists(out))
        pathlib.Path(self.path("job.xml")).write_text(document)
        self.vexg("run", self.path("job.xml"))
        by_job = pixels(out)
        self.vexg("mosaic", "build", self.path("again.tif"), *scenes, "--feather", "5")
        np.testing.assert_array_equal(pixels(self.path("again.tif")), by_job)
        self.assertIn("MosaicAutoSeamGenCommand", document)


if __name__ == "__main__":
    unittest.main()
