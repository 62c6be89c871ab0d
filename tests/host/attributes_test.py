"""Values and shapes of the regions of a label raster, beside numpy's."""

import csv
import json
import os
import pathlib
import shutil
import struct
import subprocess
import unittest

from support import DATA, FolderTest, gdal_pixels, needs_data, needs_gdal, run, use_system_python

try:
    import numpy as np
except ImportError:
    use_system_python()
    np = None

SCENE = DATA / "landsat7_olinda.tif"
CASES = DATA / "cases" / "attributes"
needs_numpy = unittest.skipIf(np is None, "no numpy")


def read_fxa(file):
    """Regions by bands by attributes."""
    data = pathlib.Path(file).read_bytes()
    assert data[:5] == b"FXA50"
    bands, attributes = struct.unpack_from("<HH", data, 5)
    return np.frombuffer(data[1024:], "<f4").reshape(-1, bands, attributes)


@needs_data
@needs_gdal
@needs_numpy
class Attributes(FolderTest):
    def setUp(self):
        super().setUp()
        # Fields of a real scene: its fourth band in 8 classes, as labels.
        self.labels = self.folder / "labels.tif"
        subprocess.run(["gdal_translate", "-q", "-b", "4", "-scale", "0", "256", "0", "8", "-ot", "Int32",
                        SCENE, self.labels], check=True)
        info = json.loads(self.fine("info", "--json", SCENE))
        self.shape = info["lines"], info["samples"], info["bands"]
        self.size = [abs(size) for size in info["geoRef"]["pixelSize"]]

    def arrays(self):
        scene = np.frombuffer(gdal_pixels(SCENE), "u1").reshape(self.shape).astype(float)
        labels = np.frombuffer(gdal_pixels(self.labels), "<i4").reshape(self.shape[:2])
        return scene, labels

    def attributes(self, *more, labels=None):
        return self.fine("attributes", SCENE, labels or self.labels, "-o", self.folder / "f", "-q", *more)

    def test_values_of_expressions_are_columns_by_their_names(self):
        table = self.folder / "t.csv"
        self.attributes("--index", "ndvi=(b3-b2)/(b3+b2)", "--index", "twice=b0*2", "--spectral", "--bands", "0", "--table", table)
        scene, labels = self.arrays()
        with np.errstate(all="ignore"):
            ndvi = (scene[..., 3] - scene[..., 2]) / (scene[..., 3] + scene[..., 2])
        rows = list(csv.DictReader(table.read_text().splitlines()))
        self.assertEqual([int(row["label"]) for row in rows], list(np.unique(labels)))
        for row in rows:
            inside = (labels == int(row["label"])) & np.isfinite(ndvi)
            for name, value in (("mean", ndvi[inside].mean()), ("std", ndvi[inside].std()), ("min", ndvi[inside].min()),
                                ("count", inside.sum())):
                self.assertAlmostEqual(float(row[f"{name}_ndvi"]), value, delta=1e-5 * max(1, abs(value)))
            self.assertAlmostEqual(float(row["mean_twice"]), 2 * float(row["mean_b0"]), delta=1e-3)
        for wrong in ("b3+1", "=b3", "a b=b3", "n=b1;m=b2"):
            self.fails(2, "NAME=EXPRESSION", "attributes", SCENE, self.labels, "-o", self.folder / "g", "--index", wrong)
        self.fails(1, "there is no such band", "attributes", SCENE, self.labels, "-o", self.folder / "g", "--index", "n=b9")

    def test_values_are_numpys(self):
        self.attributes("--spectral", "--texture", "--kernel", "4", "--bands", "3,0")
        scene, labels = self.arrays()
        spectral, texture = read_fxa(self.folder / "f.spectral.fxa"), read_fxa(self.folder / "f.texture.fxa")
        entropy = read_fxa(self.folder / "f.entropy.fxa")
        self.assertEqual(len(spectral), labels.max() + 1)
        for at, band in enumerate((3, 0)):
            plane = scene[..., band]
            padded = np.pad(plane, 2, constant_values=np.nan)
            windows = np.lib.stride_tricks.sliding_window_view(padded, (5, 5)).reshape(*plane.shape, 25)
            low, high = np.nanmin(windows, -1), np.nanmax(windows, -1)
            span = high - low
            n = np.isfinite(windows).sum(-1)
            with np.errstate(all="ignore"):
                bins = [((windows - low[..., None]) // (span[..., None] / 2) == i).sum(-1) for i in range(3)]
                told = -sum(np.where(c > 0, c / 3 * np.log(c / 3), 0) for c in bins) * (span > 0)
                shares = -sum(np.where(c > 0, c / n * np.log(c / n), 0) for c in bins) * (span > 0)
            figures = span, np.nanmean(windows, -1), np.nanvar(windows, -1, ddof=1), told
            for label in np.unique(labels):
                inside = labels == label
                values = plane[inside]
                want = values.mean(), values.std(), values.min(), values.max(), values.size
                np.testing.assert_allclose(spectral[label, at], want, 2e-7)
                want = [figure[inside].mean() for figure in figures] + [values.size]
                np.testing.assert_allclose(texture[label, at], want, 2e-6)
                np.testing.assert_allclose(entropy[label, at], (shares[inside].mean(), values.size), 2e-6)

    def test_shapes_fit_the_pixels(self):
        self.attributes("--shape")
        shapes, (_, labels) = read_fxa(self.folder / "f.shape.fxa")[:, 0], self.arrays()
        for label in np.unique(labels):
            inside = np.pad(labels == label, 1)
            down, across = (inside[1:] != inside[:-1]).sum(), (inside[:, 1:] != inside[:, :-1]).sum()
            area, length = inside.sum() * self.size[0] * self.size[1], down * self.size[0] + across * self.size[1]
            np.testing.assert_allclose(shapes[label, :2], (area, length), 2e-7)
            np.testing.assert_allclose(shapes[label, 6], 4 * np.pi * area / length**2, 2e-6)

    def test_a_table_has_a_row_for_each_region(self):
        self.attributes("--spectral", "--shape", "--bands", "3,0", "--table", self.folder / "f.csv")
        spectral, shapes = read_fxa(self.folder / "f.spectral.fxa"), read_fxa(self.folder / "f.shape.fxa")
        with open(self.folder / "f.csv") as file:
            rows = list(csv.DictReader(file))
        self.assertEqual([int(row["label"]) for row in rows], list(np.unique(self.arrays()[1])))
        for row in rows:
            label = int(row["label"])
            got = [float(row[name]) for name in ("mean_b3", "std_b3", "min_b0", "max_b0", "count_b0")]
            want = [*spectral[label, 0, :2], *spectral[label, 1, 2:]]
            self.assertEqual(np.float32(got).tolist(), np.float32(want).tolist())
            self.assertEqual(np.float32(row["area"]), shapes[label, 0, 0])
            self.assertEqual(np.float32(row["hole_to_solid_ratio"]), shapes[label, 0, 13])

    @unittest.skipUnless(shutil.which("ogr2ogr"), "no OGR programs")
    def test_tables_with_polygons_give_the_labels_back(self):
        corners = json.loads(self.fine("info", "--json", SCENE))["geoRef"]["corners"].values()
        xs, ys = [pair[0] for pair in corners], [pair[1] for pair in corners]
        for ending in ("gpkg", "fgb", "shp"):
            table, back = self.folder / f"f.{ending}", self.folder / f"{ending}.tif"
            self.attributes("--shape", "--table", table, "--overwrite")
            subprocess.run(["gdal_rasterize", "-q", "-a", "label", "-ts", str(self.shape[1]), str(self.shape[0]),
                            "-ot", "Int32", "-te", *map(repr, (min(xs), min(ys), max(xs), max(ys))), table, back],
                           check=True)
            self.assertEqual(gdal_pixels(back), gdal_pixels(self.labels), ending)

    def test_storage_and_threads_change_no_bit(self):
        tiled, tiled_labels = self.folder / "t.tif", self.folder / "tl.tif"
        for source, made in ((SCENE, tiled), (self.labels, tiled_labels)):
            subprocess.run(["gdal_translate", "-q", "-ot", "Float32" if made == tiled else "Int32", "-co", "TILED=YES",
                            "-co", "BLOCKXSIZE=64", "-co", "BLOCKYSIZE=48", source, made], check=True)
        plain = self.folder / "p.tif"
        subprocess.run(["gdal_translate", "-q", "-ot", "Float32", SCENE, plain], check=True)
        made = set()
        for scene, labels, threads in ((plain, self.labels, 1), (tiled, tiled_labels, 2), (plain, tiled_labels, 2)):
            os.environ["LUMO_THREADS_HINT"] = str(threads)
            self.addCleanup(os.environ.pop, "LUMO_THREADS_HINT", None)
            self.fine("attributes", scene, labels, "-o", self.folder / "f", "--spectral", "--texture", "--shape",
                      "--overwrite", "-q")
            made.add(b"".join((self.folder / f"f.{kind}.fxa").read_bytes()
                              for kind in ("spectral", "texture", "entropy", "shape")))
        self.assertEqual(len(made), 1)

    def test_the_cases_hold(self):
        for case in sorted(CASES.glob("0*")):
            want = np.load(case / "expected.npz")
            kernel = str(json.loads((case / "case.json").read_text())["kernel"])
            self.fine("attributes", case / "image.tif", case / "labels.tif", "-o", self.folder / "c", "--spectral",
                      "--texture", "--kernel", kernel, "--overwrite", "-q")
            for kind in ("spectral", "texture"):
                np.testing.assert_allclose(read_fxa(self.folder / f"c.{kind}.fxa"), want[kind], 1e-6, 1e-6, case.name)
        for case in sorted(CASES.glob("2*")):
            sizes = json.loads((case / "case.json").read_text())
            job = self.folder / "job.xml"
            job.write_text(
                '<Job><Reasons/><Command Name="c" ID="FxComputeVectorAttributesCommand"><Input '
                f'VectorFXV="{case}/polygons.fxv" SpatialFXA="{self.folder}/v.fxa" '
                f'PixelXSize="{sizes["PixelXSize"]}" PixelYSize="{sizes["PixelYSize"]}"/></Command></Job>')
            self.assertEqual(run("run", str(job))[0], 0)
            np.testing.assert_allclose(read_fxa(self.folder / "v.fxa"), np.load(case / "expected_spatial.npy"), 1e-6)

    def test_narrow_labels_are_labels(self):
        self.attributes("--spectral", "--shape")
        kinds = [self.folder / f"f.{kind}.fxa" for kind in ("spectral", "shape")]
        want = [kind.read_bytes() for kind in kinds]
        for name in ("Byte", "Int16", "UInt16", "UInt32"):
            labels = self.folder / f"{name}.tif"
            subprocess.run(["gdal_translate", "-q", "-ot", name, self.labels, labels], check=True)
            self.attributes("--spectral", "--shape", "--overwrite", labels=labels)
            self.assertEqual([kind.read_bytes() for kind in kinds], want, name)

    def test_files_tell_what_they_hold(self):
        self.attributes("--spectral", "--shape")
        file = self.folder / "f.shape.fxa"
        shapes = read_fxa(file)[:, 0]
        areas = shapes[shapes[:, 14] == 1, 0].astype(float)
        info = json.loads(self.fine("attributes", "info", file, "--json"))
        self.assertEqual((info["bands"], info["records"], info["regions"]), (1, len(shapes), len(areas)))
        self.assertEqual(info["attributes"][:2], ["area", "perimeter"])
        stats = json.loads(self.fine("attributes", "stats", file, "--json"))["attributes"][0]
        self.assertEqual((stats["attribute"], stats["count"]), ("area", len(areas)))
        for name, want in (("mean", areas.mean()), ("std", areas.std(ddof=1)), ("min", areas.min()), ("max", areas.max())):
            self.assertAlmostEqual(stats[name] / want, 1, 9)
        hist = json.loads(self.fine("attributes", "hist", file, "--attribute", "area", "--json"))["histograms"]
        self.assertEqual(len(hist), 1)
        inside = (areas >= hist[0]["lower"]) & (areas <= hist[0]["upper"])
        self.assertEqual((len(hist[0]["counts"]), sum(hist[0]["counts"])), (256, inside.sum()))
        self.assertIn("area", self.fine("attributes", "stats", file))
        self.assertIn("band 0, area", self.fine("attributes", "hist", file))
        self.assertIn("regions", self.fine("attributes", "info", file))

    def test_the_job_that_is_printed_makes_the_same(self):
        options = ("--spectral", "--texture", "--shape", "--bands", "2,1", "--table", self.folder / "f.csv")
        job = self.folder / "job.xml"
        job.write_text(self.attributes(*options, "--print-job"))
        names = [f"f.{kind}" for kind in ("spectral.fxa", "texture.fxa", "entropy.fxa", "shape.fxa", "csv")]
        self.assertFalse((self.folder / names[0]).exists())
        self.fine("run", job)
        made = [(self.folder / name).read_bytes() for name in names]
        self.attributes(*options, "--overwrite")
        self.assertEqual([(self.folder / name).read_bytes() for name in names], made)

    def test_bad_input_ends_in_one_line(self):
        small, real, negative = (self.folder / f"{name}.tif" for name in ("small", "real", "negative"))
        subprocess.run(["gdal_translate", "-q", "-srcwin", "0", "0", "50", "40", self.labels, small], check=True)
        subprocess.run(["gdal_translate", "-q", "-ot", "Float32", self.labels, real], check=True)
        subprocess.run(["gdal_translate", "-q", "-scale", "0", "8", "-1", "7", "-ot", "Int32", self.labels, negative],
                       check=True)
        foreign, short = self.folder / "foreign.fxa", self.folder / "short.fxa"
        foreign.write_bytes(b"x" * 3000)
        self.attributes("--shape")
        short.write_bytes((self.folder / "f.shape.fxa").read_bytes()[:-3])
        (self.folder / "f.shape.fxa").unlink()
        make = lambda *more: ("attributes", SCENE, self.labels, "-o", self.folder / "f", *more)
        before = sorted(self.folder.iterdir())
        for code, words, arguments in (
                (1, "50 x 40", ("attributes", SCENE, small, "-o", self.folder / "f")),
                (1, "not Single", ("attributes", SCENE, real, "-o", self.folder / "f")),
                (1, "label -1", ("attributes", SCENE, negative, "-o", self.folder / "f")),
                (1, "none.tif", ("attributes", SCENE, self.folder / "none.tif", "-o", self.folder / "f")),
                (2, "no band 6", make("--bands", "6")),
                (2, "vector format", make("--table", self.folder / "f.txt")),
                (2, "--output", ("attributes", SCENE, self.labels)),
                (2, "labels.tif", make("--table", self.labels, "--overwrite")),
                (1, "no file of regions", ("attributes", "info", foreign)),
                (1, "within a record", ("attributes", "stats", short)),
                (1, "no file", ("attributes", "hist", self.folder / "none.fxa")),
                (2, "makes no files", ("attributes", "info", short, "-o", self.folder / "f"))):
            with self.subTest(words):
                self.fails(code, words, *arguments)
                self.assertEqual(sorted(self.folder.iterdir()), before)


if __name__ == "__main__":
    unittest.main()
