"""The work that rasters do: numbers, files, segments and classes, here and in a server."""

import json
import os
import pickle
import struct
import subprocess
import unittest
import urllib.request

from support import DATA, SCENE, VEXG, FolderTest, needs, needs_data

import numpy

import vexg
from samples import write_samples


def rows_of(table):
    """The rows of a table of either kind as dictionaries."""
    return table if isinstance(table, list) else table.to_dict("records")


@needs_data
class NumbersTest(FolderTest):
    def test_statistics_and_histograms_as_numpy_has_them(self):
        for file in ("RGB.byte.tif", "landsat7_f32_strip.tif", "dem_int16.tif", "landsat7_u16_tiled.tif"):
            with self.subTest(file):
                raster = vexg.open(DATA / file)
                block = raster.read(masked=True).astype("float64")
                seen = []
                rows = rows_of(raster.stats(progress=seen.append))
                self.assertEqual(seen[-1], 1.0)
                for row, values in zip(rows, block):
                    valid = values.compressed()
                    self.assertEqual((row["min"], row["max"], row["count"]), (valid.min(), valid.max(), valid.size))
                    numpy.testing.assert_allclose((row["mean"], row["std"], row["sum"]),
                                                  (valid.mean(), valid.std(ddof=1), valid.sum()), rtol=1e-9)
                flat = block.reshape(raster.count, -1)
                both = ~numpy.ma.getmaskarray(flat).any(axis=0)
                if file != "RGB.byte.tif":  # whose bands are valid in different places
                    numpy.testing.assert_allclose(raster.covariance(), numpy.atleast_2d(numpy.cov(flat.data[:, both])),
                                                  rtol=1e-9)
                for (counts, edges), values in zip(raster.histogram(), block):
                    numpy.testing.assert_array_equal(counts, numpy.histogram(values.compressed(), edges)[0])
                    self.assertEqual(counts.sum(), values.count())
        band = vexg.open(SCENE).read(2)
        counts, edges = vexg.open(SCENE).histogram(bins=10, range=(50, 100))[2]
        numpy.testing.assert_array_equal(counts, numpy.histogram(band[band <= 100], edges)[0])

    def test_a_page_shows_rasters_of_files(self):
        scene = vexg.open(SCENE)
        with scene.view(vexg.open(DATA / "mosaic_a.tif"), browser=False) as viewer:
            host, _, key = viewer.address.partition("/#")
            request = urllib.request.Request(host + "/api/scene", headers={"X-Vexg-Key": key})
            with urllib.request.urlopen(request, timeout=20) as answer:
                names = [raster["name"] for raster in json.load(answer)["rasters"]]
            self.assertEqual(names, ["landsat7_olinda.tif", "mosaic_a.tif"])
            self.assertNotIn(key, viewer._repr_html_().partition("</a>")[0].partition(">")[2])
        with self.assertRaises(OSError):
            urllib.request.urlopen(request, timeout=20)
        with self.assertRaisesRegex(vexg.Error, "save the raster first"):
            scene[0].view(browser=False)
        with self.assertRaisesRegex(vexg.Error, "another size|labels|none.tif"):
            scene.view(labels=self.folder / "none.tif", browser=False)

    def test_zones_and_shapes(self):
        scene = vexg.open(SCENE)
        labels = numpy.zeros(scene.shape[1:], dtype="int32")
        labels[20:90, 30:140] = 4
        labels[150:300, 200:260] = 9
        made = vexg.from_array(labels, like=scene).with_nodata(0)
        file = made.polygons().to_file(self.folder / "zones.gpkg")
        found = {row["label"]: row for row in rows_of(scene.zonal(file, ["mean", "count"], bands=[3]))}
        band = scene.read(3)
        for label in (4, 9):
            self.assertEqual(found[label]["count"], (labels == label).sum())
            self.assertAlmostEqual(found[label]["mean"], band[labels == label].mean(), 6)
        back = vexg.rasterize(file, scene, field="label", dtype="int32")
        numpy.testing.assert_array_equal(back.read(0), labels)
        inside = scene.region(file).read(0, masked=True)
        numpy.testing.assert_array_equal(inside.mask, labels == 0)
        with self.assertRaises(TypeError):
            scene.zonal(file, wieghts=1)

    def test_polygons_have_the_areas_of_their_pixels(self):
        chance = numpy.random.default_rng(5)
        labels = chance.integers(1, 5, (60, 70)).repeat(3, axis=0).repeat(3, axis=1).astype("int32")
        raster = vexg.from_array(labels, transform=(2, 0, 100, 0, -2, 900), crs="EPSG:32633")
        areas = {}
        for label, shape in zip(raster.polygons().labels.tolist(), raster.polygons().wkb):
            areas[label] = areas.get(label, 0) + area_of(shape)
        for label in range(1, 5):
            self.assertEqual(areas[label], 4 * (labels == label).sum())
        data, offsets = raster.polygons().wkb_column()
        self.assertEqual([data[a:b] for a, b in zip(offsets, offsets[1:])], raster.polygons().wkb)
        told = raster.polygons().__geo_interface__
        self.assertEqual(len(told["features"]), len(raster.polygons()))
        corners = numpy.array(told["features"][0]["geometry"]["coordinates"][0])
        self.assertTrue((corners.min(axis=0) >= (100, 540)).all() and (corners.max(axis=0) <= (520, 900)).all())

    @needs("geopandas")
    def test_geopandas(self):
        labels = numpy.kron(numpy.arange(1, 13).reshape(3, 4), numpy.ones((9, 9))).astype("int32")
        raster = vexg.from_array(labels, transform=(2, 0, 100, 0, -2, 900), crs="EPSG:32633")
        frame = raster.polygons().to_table()
        self.assertEqual(sorted(frame.area), [324.0] * 12)
        self.assertEqual(frame.crs.to_epsg(), 32633)


def area_of(wkb):
    """The area of a polygon of WKB, by the formula of shoelaces."""
    rings = struct.unpack_from("<I", wkb, 5)[0]
    at, total = 9, 0.0
    for ring in range(rings):
        count = struct.unpack_from("<I", wkb, at)[0]
        x, y = numpy.frombuffer(wkb, "<f8", 2 * count, at + 4).reshape(-1, 2).T
        assert x[0] == x[-1] and y[0] == y[-1]
        area = abs((x[:-1] * y[1:] - x[1:] * y[:-1]).sum()) / 2
        total += area if ring == 0 else -area
        at += 4 + 16 * count
    return total


@needs_data
class SavingTest(FolderTest):
    def test_files_hold_what_was_put_in(self):
        scene = vexg.open(SCENE)
        for name, raster in (("a.tif", scene), ("a.dat", scene), ("b.img", scene[2]), ("c.png", scene.bands(2, 1, 0)),
                             ("d.tif", vexg.open(DATA / "RGB.byte.tif")), ("e.tif", scene[0] / 3 - 20),
                             ("f.tif", vexg.open(DATA / "alpha.tif"))):
            with self.subTest(name):
                made = raster.save(self.folder / name)
                numpy.testing.assert_array_equal(made.read(masked=True).filled(0), raster.read(masked=True).filled(0))
                self.assertEqual(made.dtype, raster.dtype)
                self.assertEqual(made.nodata is None, raster.nodata is None and name != "e.tif")
                numpy.testing.assert_allclose(made.bounds, raster.bounds)
        self.assertFalse([name for name in self.left() if name.startswith(".")])
        self.assertEqual(vexg.open(self.folder / "a.tif").details.get("Bands/0/Description"), None)

    def test_pixels_that_are_not_valid_stay_so(self):
        scene = vexg.open(SCENE)
        ratio = (scene[3] - scene[2]) / (scene[3] - 60)  # 60 divides by 0
        made = ratio.save(self.folder / "ratio.tif")
        self.assertTrue(numpy.isnan(made.nodata))
        numpy.testing.assert_array_equal(made.read(masked=True).mask, scene.read([3]) == 60)
        masked = scene[0].mask(60, 61)
        for name in ("masked.tif", "masked.dat"):
            kept = masked.save(self.folder / name)
            numpy.testing.assert_array_equal(kept.read(masked=True).mask, numpy.isin(scene.read([0]), (60, 61)))
        self.assertEqual(masked.save(self.folder / "chosen.dat", nodata=2).nodata, 2)
        full = vexg.from_array(numpy.arange(256, dtype="uint8").reshape(1, 16, 16)).mask(7)
        with self.assertRaisesRegex(vexg.Error, "no value is free"):
            full.save(self.folder / "full.dat")
        self.assertNotIn("full.dat", self.left())

    def test_refusals_leave_everything_as_it_was(self):
        scene = vexg.open(SCENE)
        first = scene.save(self.folder / "a.tif")
        before = (self.folder / "a.tif").read_bytes()
        cases = {
            "taken": lambda: scene.save(self.folder / "a.tif"),
            "input": lambda: first[0].save(self.folder / "a.tif", overwrite=True),
            "no such folder": lambda: scene.save(self.folder / "no" / "a.tif"),
            "tells no format": lambda: scene.save(self.folder / "a.xyz"),
            "bands of PNG": lambda: scene.save(self.folder / "six.png"),
            "complex PNG": lambda: vexg.open(DATA / "complex64.tif").save(self.folder / "complex.png"),
        }
        os.link(self.folder / "a.tif", self.folder / "link.tif")
        cases["input by another name"] = lambda: first[0].save(self.folder / "link.tif", overwrite=True)
        for name, call in cases.items():
            with self.subTest(name), self.assertRaises(vexg.Error):
                call()
        with self.assertRaises(TypeError):
            scene.save(self.folder / "b.tif", no_such_option=1)
        self.assertEqual((self.folder / "a.tif").read_bytes(), before)
        self.assertEqual(self.left(), ["a.tif", "link.tif"])

    def test_a_replaced_file_is_read_anew(self):
        scene = vexg.open(SCENE)
        file = self.folder / "a.tif"
        old = scene[0].save(file)
        old.pyramid(1)
        numpy.testing.assert_array_equal(old.read(), scene.read([0]))
        new = scene[1].save(file, overwrite=True)
        numpy.testing.assert_array_equal(new.read(), scene.read([1]))
        numpy.testing.assert_array_equal(vexg.open(file).read(), scene.read([1]))
        self.assertEqual((new.levels, self.left()), ([], ["a.tif"]))  # the pyramid was of other pixels

    def test_files_written_block_by_block(self):
        scene = vexg.open(SCENE)
        pixels = scene.read(order="C")
        for name in ("a.tif", "a.dat"):
            with vexg.create(self.folder / name, like=scene, dtype="float32", nodata=-1) as out:
                self.assertEqual((out.shape, out.dtype), (scene.shape, numpy.dtype("float32")))
                for rows, columns in scene.blocks((100, 90)):
                    block = scene.read(window=(rows, columns)) / numpy.float32(4)
                    out.write(numpy.ma.masked_equal(block, 15), (rows, columns))
                out[2, 5:7, 10:20] = numpy.zeros((2, 10))
                self.assertNotIn(name, self.left())
            want = pixels / numpy.float32(4)
            want[want == 15] = -1
            want[2, 5:7, 10:20] = 0
            made = vexg.open(self.folder / name)
            numpy.testing.assert_array_equal(made.read(), want)
            numpy.testing.assert_allclose(made.bounds, scene.bounds)
        self.assertEqual(vexg.create(self.folder / "b.tif", shape=(1, 3, 4), transform=(1, 0, 5, 0, -1, 9),
                                     crs="EPSG:32633").close().bounds, (5, 6, 9, 9))
        with self.assertRaises(ZeroDivisionError), vexg.create(self.folder / "c.tif", shape=(1, 3, 4)) as out:
            out.write(numpy.zeros((3, 4), "uint8"))
            1 / 0
        with vexg.create(self.folder / "d.dat", shape=(2, 3, 4)) as out:
            for kind, wrong in ((ValueError, (numpy.zeros((2, 3, 5), "uint8"),)),
                                (TypeError, (numpy.zeros((2, 3, 4)),)),
                                (vexg.Error, (numpy.zeros((2, 2, 2), "uint8"), ((2, 4), (0, 2)))),
                                (IndexError, (numpy.zeros((1, 3, 4), "uint8"), None, 2)),
                                (ValueError, (numpy.ma.masked_all((2, 3, 4), "uint8"),))):
                with self.assertRaises(kind):
                    out.write(*wrong)
        with self.assertRaisesRegex(vexg.Error, "closed"):
            out.write(numpy.zeros((2, 3, 4), "uint8"))
        self.assertEqual(self.left(), ["a.dat", "a.dat.hdr", "a.tif", "b.tif", "d.dat", "d.dat.hdr"])

    def test_options_of_the_format(self):
        sizes = {}
        for compress in ("none", "deflate", "ZSTD"):
            file = self.folder / f"{compress}.tif"
            cog = vexg.open(SCENE).save(file, cog=True, compress=compress, predictor="auto")
            numpy.testing.assert_array_equal(cog.read(), vexg.open(SCENE).read())
            self.assertIn(b"LAYOUT=IFDS_BEFORE_DATA", file.read_bytes()[:400])
            sizes[compress] = file.stat().st_size
        self.assertLess(max(sizes["deflate"], sizes["ZSTD"]), 0.9 * sizes["none"])
        made = vexg.open(SCENE).save(self.folder / "a.dat", interleave="bsq")
        self.assertEqual(made._describe()["interleave"], "BSQ")


@needs_data
class ObjectsTest(FolderTest):
    def setUp(self):
        super().setUp()
        self.places = write_samples(self.folder / "samples.geojson", vexg.open(SCENE))

    def check_chain(self, scene):
        """The way from a scene to its map of classes."""
        aoi = scene.clip(window=((20, 340), (10, 330)))
        ndvi = (aoi[3] - aoi[2]) / (aoi[3] + aoi[2])
        segments = vexg.segment(aoi.stack(ndvi), merge=90)
        labels, pixels = segments.read(0), aoi.read(order="C")
        table = segments.attributes("spectral", "shape", bands=[3, 6], geometry=False)
        rows = rows_of(table.reset_index() if not isinstance(table, list) else table)
        self.assertEqual([row["label"] for row in rows], sorted(set(labels.ravel().tolist())))
        for row in rows[::97]:
            inside = pixels[3][labels == row["label"]]
            self.assertEqual(row["count_b3"], inside.size)
            self.assertAlmostEqual(row["mean_b3"], inside.mean(), 3)
            self.assertAlmostEqual(row["area"], inside.size * 28.5 * 28.5, delta=1)
        classes = segments.classify(self.folder / "samples.geojson", neighbors=1, use=["mean_b3", "mean_b6"])
        self.assertEqual(classes.class_names, sorted({name for *_, name in self.places}))
        found = classes.accuracy(self.folder / "samples.geojson")
        self.assertGreater(found.overall, 0.8)
        self.assertEqual(found.matrix.trace() / found.matrix.sum(), found.overall)
        made = classes.save(self.folder / "landcover.tif", overwrite=True)
        numpy.testing.assert_array_equal(made.read(), classes.read())
        self.assertEqual(made.categories, ["unclassified", *classes.class_names])
        self.assertEqual(made.colormap[:3].tolist(), [[0, 0, 0, 255], [230, 69, 69, 255], [54, 179, 90, 255]])
        classes.polygons().to_file(self.folder / "landcover.gpkg", overwrite=True)
        return labels, classes.read()

    def test_from_a_scene_to_its_classes_through_both_doors(self):
        here = self.check_chain(vexg.open(SCENE))
        with vexg.Server() as server:
            there = self.check_chain(vexg.open(SCENE, server=server))
        for a, b in zip(here, there):
            numpy.testing.assert_array_equal(a, b)

    def test_segments_are_those_of_the_program(self):
        file = self.folder / "segments.tif"
        subprocess.run([VEXG, "segment", SCENE, file, "--merge-percent", "80", "--min-size", "9"], check=True,
                       capture_output=True)
        segments = vexg.open(SCENE).segment(merge=80, min_size=9)
        numpy.testing.assert_array_equal(segments.read(), vexg.open(file).read())
        opened = vexg.open_labels(file, vexg.open(SCENE))
        a, b = segments.attributes("texture", geometry=False), opened.attributes("texture", geometry=False)
        self.assertEqual(rows_of(a), rows_of(b))
        with self.assertRaises(TypeError):
            vexg.open(SCENE).segment(minimal_size=3)
        again = pickle.loads(pickle.dumps(segments))
        numpy.testing.assert_array_equal(again.read(), segments.read())

    def test_a_tree_has_the_segments_of_all_costs(self):
        scene = vexg.open(SCENE)
        segments = scene.segment(merge_value=100, tree=True)
        counts = []
        cuts, table = segments.levels([50, 300, 900])
        for value, cut in zip((50, 300, 900), cuts):
            numpy.testing.assert_array_equal(cut.read(), scene.segment(merge_value=value).read())
            counts.append(int(cut.read().max()))
        rows = rows_of(table)
        for level, cut in enumerate(cuts, 1):
            here = [row for row in rows if row["level"] == level]
            numpy.testing.assert_array_equal([row["pixels"] for row in here], numpy.bincount(cut.read().ravel())[1:])
        low, high = cuts[0].read(0), cuts[1].read(0)
        parents = {row["segment"]: row["parent"] for row in rows if row["level"] == 1}
        self.assertTrue(all(parents[low[at]] == high[at] for at in numpy.ndindex(40, 30)))
        numpy.testing.assert_array_equal(segments.cut(percent=100).read().max(), scene.segment(merge=100).read().max())
        found = segments.suggest()
        self.assertEqual(len(found.peaks), len(found.onsets))
        for row in rows_of(found.table)[::20]:
            self.assertEqual(int(segments.cut(row["value"]).read().max()), row["segments"])
        # A cut outlives the segments whose tree it is of, and goes into documents.
        cut = segments.cut(300)
        job = vexg.job(cut, self.folder / "cut.tif", folder=self.folder)
        job.save(self.folder / "cut.xml")
        del segments, cuts
        vexg.open(SCENE)
        self.assertEqual(len(rows_of(cut.attributes("shape", geometry=False))), counts[1])
        want = cut.read()
        ran = subprocess.run([VEXG, "run", self.folder / "cut.xml"], capture_output=True, text=True)
        self.assertEqual(ran.returncode, 0, ran.stderr)
        numpy.testing.assert_array_equal(vexg.open(self.folder / "cut.tif").read(), want)
        for kind, call in ((vexg.Error, lambda: scene.segment(merge=90).cut(1)), (TypeError, lambda: cut.cut()),
                           (ValueError, lambda: cut.cut(percent=101)), (ValueError, lambda: cut.levels([3, 2]))):
            with self.assertRaises(kind):
                call()

    def test_documents_make_the_same_elsewhere(self):
        classes = vexg.open(SCENE).segment(merge=90).classify(self.folder / "samples.geojson")
        job = vexg.job(classes, self.folder / "classes.tif", folder=self.folder)
        job.save(self.folder / "chain.xml")
        with self.assertRaisesRegex(vexg.Error, "array in memory"):
            vexg.job(vexg.from_array(numpy.zeros((2, 3))))
        vexg.job(classes).save(self.folder / "here.xml")
        self.assertIn(os.path.join(os.getcwd(), "vexg-"), (self.folder / "here.xml").read_text())
        ran = subprocess.run([VEXG, "run", self.folder / "chain.xml"], capture_output=True, text=True)
        self.assertEqual(ran.returncode, 0, ran.stderr)
        numpy.testing.assert_array_equal(vexg.open(self.folder / "classes.tif").read(), classes.read())
        view = vexg.job(vexg.open(SCENE)[2].clip(window=((0, 9), (0, 9))), self.folder / "view.tif")
        view.run()
        numpy.testing.assert_array_equal(vexg.open(self.folder / "view.tif").read(), vexg.open(SCENE)[[2], :9, :9])

    def test_mosaics_are_those_of_the_program(self):
        scenes = [DATA / f"mosaic_{name}.tif" for name in "abc"]
        file = self.folder / "built.tif"
        subprocess.run([VEXG, "mosaic", "build", file, *scenes, "--feather", "20"], check=True, capture_output=True)
        mosaic = vexg.mosaic(scenes, feather=20)
        built = vexg.open(file).read(masked=True)
        numpy.testing.assert_array_equal(mosaic.read(masked=True).filled(0), built.filled(0))
        kept = vexg.mosaic(scenes, self.folder / "kept.vmosaic", seams=False, match=False)
        self.assertEqual(kept.shape, mosaic.shape)
        with self.assertRaises(vexg.Error):
            vexg.mosaic(scenes, self.folder / "kept.vmosaic")
        with self.assertRaises(vexg.Error):
            vexg.mosaic(scenes, self.folder / "no.vmosaic", grid="EPSG:4326", pixel_size=-1)
        self.assertFalse((self.folder / "no.vmosaic").exists())


@needs_data
class CommandsTest(FolderTest):
    def test_commands_by_their_names(self):
        from vexg import commands

        scene = vexg.open(SCENE)
        found = commands.GetBasicRasterStatsCommand(URI=scene, Wait="Always")
        numpy.testing.assert_allclose(found["Mean"], scene.read().mean(axis=(1, 2)))
        opened = commands.CreateSpatialSubsetRasterCommand(SrcURI=scene, SubRect=(1, 2, 5, 4))["URI"]
        self.assertEqual(commands.QueryRasterCommand(URI=opened)["Samples"], 5)
        commands.CloseRasterCommand(URI=opened)
        with self.assertRaises(vexg.Error) as failure:
            commands.QueryRasterCommand(URI=opened)
        self.assertEqual(failure.exception.command, "QueryRasterCommand")
        self.assertIn("URI", commands.QueryRasterCommand.__doc__)
        for call in (lambda: commands.QueryRasterCommand(), lambda: commands.QueryRasterCommand(URI=opened, Sampels=1)):
            with self.assertRaises(TypeError):
                call()
        with self.assertRaises(AttributeError):
            commands.NoSuchCommand
        self.assertTrue({"CopyRasterCommand", "PolygonizeCommand"} <= set(dir(commands)))

    def test_pictures_in_notebooks(self):
        import base64
        import re
        import zlib

        for raster in (vexg.open(SCENE), vexg.open(DATA / "dem_olinda.tif"), vexg.open(DATA / "complex64.tif"),
                       vexg.open(DATA / "all-nodata.tif")):
            text = raster._repr_html_()
            data = base64.b64decode(re.search(r"base64,([^']*)'", text)[1])
            width, height = struct.unpack_from(">II", data, 16)
            self.assertLessEqual(max(width, height), 256)
            packed = data[data.index(b"IDAT") + 4:-16]
            self.assertEqual(len(zlib.decompressobj().decompress(packed)), height * (1 + 4 * width))


if __name__ == "__main__":
    unittest.main()
