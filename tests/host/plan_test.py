"""vexg plan and vexg run --once: a job in parts has the bytes of the single run, whatever is killed."""

import json
import os
import pathlib
import random
import shutil
import signal
import subprocess
import tempfile
import time
import unittest

from field_scene import FieldScene
from support import DATA, VEXG, FolderTest, gdal_pixels, needs_data, needs_gdal, run

needs_make = unittest.skipUnless(shutil.which("make"), "no make")
SCENE = DATA / "landsat7_u16_tiled.tif"
FLOATS = DATA / "landsat7_f32_strip.tif"

# Outputs, and how they are made: @ stands for the output, @NAME for a file beside it.
JOBS = {
    "copy": ("o.tif", "copy", SCENE, "@", "--bands", "3,1"),
    "bands": ("o.tif", "copy", SCENE, "@", "--tile", "64", "--interleave", "bsq", "--compress", "deflate"),
    "strips": ("o.tif", "copy", FLOATS, "@", "--tile", "strip", "--no-data", "none"),
    "levels": ("o.tif", "copy", SCENE, "@", "--cog", "--tile", "64", "--overviews", "mode"),
    "masked": ("o.tif", "warp", SCENE, "@", "--to", "EPSG:4326", "--tile", "64"),
    "cog": ("o.tif", "copy", DATA / "RGB.byte.tif", "@", "--cog"),
    "flat": ("o.dat", "copy", DATA / "RGB.byte.tif", "@"),
    "calc": ("o.tif", "calc", "@", "N=(b3-b2)/(b3+b2);b0", SCENE),
    "calibrate": ("o.tif", "calibrate", "radiance", FLOATS, "@", "--gain", "2", "--offset", "1", "--tile", "64"),
    "warp": ("o.tif", "warp", SCENE, "@", "--to", "EPSG:4326", "--resampling", "cubic"),
    "mosaic": ("o.tif", "mosaic", "build", "@", DATA / "mosaic_a.tif", DATA / "mosaic_b.tif", DATA / "mosaic_c.tif"),
    "matched": ("o.tif", "mosaic", "build", "@", DATA / "mosaic_a.tif", DATA / "mosaic_b.tif", DATA / "mosaic_c.tif",
                "--match-by", "scenes", "--feather", "4", "--tile", "64"),
    "zonal": ("o.csv", "zonal", FLOATS, "ZONES", "-o", "@", "--stats", "mean,std,p10,median"),
    "shares": ("o.csv", "zonal", SCENE, "ZONES", "-o", "@", "--weights", "coverage"),
    "polygons": ("o.fxv", "polygonize", "LABELS", "@"),
    "areas": ("o.geojson", "polygonize", DATA / "dem_int16.tif", "@", "--min-size", "2"),
    "segments": ("o.tif", "segment", FLOATS, "@", "--segment-percent", "30", "--merge-percent", "90", "--min-size", "5"),
    "tree": ("o.tif", "segment", SCENE, "@", "--tree", "@o.tree", "--merge-percent", "95", "--tile", "64"),
    "rounds": ("o.tif", "segment", SCENE, "@", "--order", "local", "--merge-value", "90", "--segment-value", "9"),
    "rigorous": ("o.tif", "segment", FLOATS, "@", "--merge-algorithm", "rigorous", "--merge-value", "20", "--borders"),
    "pyramid": ("o.pyr", "pyramid", "build", FLOATS, "--output", "@", "--levels", "1-5", "--tile", "16"),
    "picked": ("o.pyr", "pyramid", "build", SCENE, "--output", "@", "--levels", "0-3", "--tile", "32", "--resampling",
               "nearest"),
    "attributes": ("o", "attributes", FLOATS, "LABELS", "-o", "@", "--spectral", "--texture", "--shape"),
}


class PlanTest(FolderTest):
    @classmethod
    def setUpClass(cls):
        """Makes segments of a scene, as labels and as shapes."""
        made = tempfile.TemporaryDirectory()
        cls.addClassCleanup(made.cleanup)
        cls.inputs = {"LABELS": pathlib.Path(made.name) / "labels.tif", "ZONES": pathlib.Path(made.name) / "zones.shp"}
        if FLOATS.exists():
            run("segment", str(FLOATS), str(cls.inputs["LABELS"]), "-q", "--merge-percent", "97")
            run("polygonize", str(cls.inputs["LABELS"]), str(cls.inputs["ZONES"]), "-q")

    def words(self, name, place):
        output, *arguments = JOBS[name]
        return [str(place / (word[1:] or output) if str(word).startswith("@") else self.inputs.get(word, word))
                for word in arguments]

    def single(self, name):
        """Makes a job in one run, and gives the output."""
        place = self.folder / f"{name}.single"
        place.mkdir()
        run(*self.words(name, place), "-q")
        return place / JOBS[name][0]

    def plan(self, name, *options):
        """Plans a job into a folder with its name."""
        place = self.folder / name
        self.fine("plan", "-q", "-o", place, *options, *self.words(name, place))
        return place

    def manifest(self, place):
        return json.loads((place / "manifest.json").read_text())

    def make(self, place, **options):
        text = self.fine("plan", place, "--runner", "make")
        makefile = self.folder / f"{place.name}.mk"
        makefile.write_text(text)
        return subprocess.Popen(["make", "-s", "-j2", "-C", place, "-f", makefile], stdout=subprocess.PIPE,
                                stderr=subprocess.PIPE, text=True, env={**os.environ, "VEXG": str(VEXG)}, **options)

    def made(self, place):
        """Runs a plan to its end by make. The lines that it said."""
        process = self.make(place)
        out, err = process.communicate(timeout=300)
        self.assertEqual((process.returncode, out), (0, ""), err)
        return err

    def assert_same(self, got, want):
        self.assertEqual(got.read_bytes(), want.read_bytes(), got)


@needs_data
class Parts(PlanTest):
    def test_documents_are_ordinary_and_the_manifest_tells_all_of_them(self):
        place = self.plan("calc", "--parts", "4")
        documents = self.manifest(place)["documents"]
        self.assertEqual([each["document"] for each in documents],
                         [f"part-{i:04}.xml" for i in range(4)] + ["merge.xml"])
        self.assertEqual(documents[-1]["dependsOn"], [each["document"] for each in documents[:-1]])
        for each in documents:
            self.assertEqual(each["inputs"], [{"file": str(SCENE), "size": SCENE.stat().st_size,
                                               "time": SCENE.stat().st_mtime_ns}])
            is_merge = each == documents[-1]
            self.assertEqual((len(each["outputs"]), each["threads"]), (1 if is_merge else 2, 2 if is_merge else 1))
            self.assertGreater(each["memory"], 1 << 26)
        for each in documents:  # they run in any place that runs documents
            self.fine("run", "-q", "-o", self.folder / "result.xml", place / each["document"])
        self.assert_same(place / "o.tif", self.single("calc"))

    def test_parts_do_not_read_an_output_that_is_there_from_before(self):
        place = self.plan("tree", "--parts", "2")
        (place / "o.tree").write_bytes(b"old")
        self.fine("plan", "-q", "--replace", "-o", place, "--parts", "2", *self.words("tree", place), "--overwrite")
        for each in self.manifest(place)["documents"]:
            self.assertNotIn(str(place / "o.tree"), [read["file"] for read in each["inputs"]])

    def test_parts_come_by_their_number_or_their_memory(self):
        for options, parts in ((("--parts", "3"), 3), (("--parts", "9999"), 352),
                               (("--part-memory", "200000"), 3), (("--part-memory", "100000000"), 1)):
            with self.subTest(options):
                shutil.rmtree(self.folder / "copy", ignore_errors=True)
                documents = self.manifest(self.plan("copy", *options))["documents"]
                self.assertEqual(len(documents), parts + 1)

    def test_work_that_cannot_be_divided_is_one_part_and_a_line_says_so(self):
        place = self.folder / "plan"
        shutil.copyfile(SCENE, self.folder / "scene.tif")
        code, out, err = run("plan", "--parts", "4", "-o", str(place), "pyramid", "build", "--type", "DRIVER",
                             str(self.folder / "scene.tif"))
        self.assertEqual((code, out), (0, ""))
        self.assertRegex(err, r"\A(vexg: note: [^\n]+\n)+\Z")
        self.assertEqual([each["document"] for each in self.manifest(place)["documents"]], ["part-0000.xml"])

    def test_segments_of_tiles_are_made_by_the_merge_when_parts_have_found_the_gradients(self):
        place = self.folder / "plan"
        words = ("segment", str(FLOATS), "--tiled", "--tile-memory", "50000", "--segment-percent", "30",
                 "--merge-percent", "90")
        code, _, err = run("plan", "--parts", "2", "-o", str(place), *words, str(place / "o.tif"))
        self.assertEqual(code, 0)
        self.assertRegex(err, r"\Avexg: note: FxTileSegmentMergeCommand [^\n]+ Seamless is not true[^\n]+\n\Z")
        for each in self.manifest(place)["documents"]:
            self.fine("run", "--once", "-q", place / each["document"])
        self.fine(*words, self.folder / "o.tif", "-q")
        self.assert_same(place / "o.tif", self.folder / "o.tif")

    def test_what_a_document_would_lose_is_said_and_complex_numbers_stay_whole(self):
        code, _, err = run("plan", "--parts", "2", "-o", str(self.folder / "a"), "warp", str(SCENE),
                           str(self.folder / "a.dat"), "--to", "EPSG:4326")
        self.assertEqual(code, 0)
        self.assertRegex(err, r"\Avexg: note: the format ORVA keeps [^\n]+\n\Z")
        code, _, err = run("plan", "--parts", "2", "-o", str(self.folder / "b"), "copy", str(DATA / "complex64.tif"),
                           str(self.folder / "b.tif"))
        self.assertEqual(code, 0)
        self.assertRegex(err, r"\Avexg: note: CopyRasterCommand [^\n]+ complex numbers [^\n]+\n\Z")
        self.fine("run", "--once", "-q", self.folder / "b" / "part-0000.xml")
        self.assertTrue((self.folder / "b.tif").exists())

    def test_a_document_of_ones_own_can_be_planned_with_names_of_its_folder(self):
        shutil.copyfile(SCENE, self.folder / "scene.tif")
        job = self.folder / "job.xml"
        job.write_text('<Job><Command Name="a" ID="OpenRasterCommand"><Input ConnStr="scene.tif"/>'
                       '<Output URI="$a"/></Command><Command Name="b" ID="CreateRasterCommand">'
                       '<DependsOn Name="a"/><Input ConnStr="out.tif" SrcURI="$a" Format="TIFF"/>'
                       '<Output URI="$b"/></Command><Command Name="c" ID="CopyRasterCommand">'
                       '<DependsOn Name="b"/><Input SrcURI="$a" DstURI="$b"/></Command></Job>')
        here = os.getcwd()
        os.chdir(self.folder)
        self.addCleanup(os.chdir, here)
        self.fine("run", "-q", "-o", "result.xml", "job.xml")
        os.rename("out.tif", "single.tif")
        self.fine("plan", "job.xml", "--parts", "3", "-o", "plan")
        os.chdir("/")
        for each in self.manifest(self.folder / "plan")["documents"]:
            self.fine("run", "--once", "-q", self.folder / "plan" / each["document"])
        self.assert_same(self.folder / "out.tif", self.folder / "single.tif")

    def test_refuses_what_it_cannot_plan(self):
        place = self.plan("copy", "--parts", "2")
        output = self.folder / "x.tif"
        for words, arguments in (
                ("holds a plan already", ("-o", place, "--parts", "2", "copy", SCENE, output)),
                ("give one of --parts and --part-memory", ("-o", place, "copy", SCENE, output)),
                ("-o is required", ("--parts", "2", "copy", SCENE, output)),
                ("vexg help copy", ("-o", self.folder / "plan", "--parts", "2", "copy", "--help")),
                ("no verb that works by a job", ("-o", self.folder / "f", "--parts", "2", "completion", "bash")),
                ("can't be opened", ("-o", self.folder / "n", "--parts", "2", self.folder / "absent.xml")),
                ("there is no plan here", (self.folder, "--runner", "make"))):
            with self.subTest(words):
                self.fails(2, words, "plan", *arguments)


@needs_data
@needs_gdal
class Joining(PlanTest):
    def test_packed_blocks_come_into_the_file_as_they_are(self):
        place = self.plan("bands", "--parts", "3")
        parts = [place / f"part-000{i}.tif" for i in range(3)]
        for part in parts:
            self.fine("run", "-q", place / part.with_suffix(".xml").name)
        plain = sum(part.stat().st_size for part in parts)
        for part in parts:  # of the same pixels, packed in another way
            packed = part.with_name("packed.tif")
            self.fine("copy", part, packed, "-q", "--tile", "64", "--interleave", "bsq", "--compress", "deflate",
                      "--compress-level", "1", "--predictor", "2")
            packed.rename(part)
        other = sum(part.stat().st_size for part in parts)
        self.fine("run", "-q", place / "merge.xml")
        self.assertNotAlmostEqual(plain, other, delta=4000)
        self.assertAlmostEqual((place / "o.tif").stat().st_size, other, delta=4000)
        self.assertEqual(gdal_pixels(place / "o.tif"), gdal_pixels(self.single("bands")))

    def test_files_packed_otherwise_are_joined_by_their_pixels(self):
        place = self.plan("bands", "--parts", "3")
        for i in range(3):
            self.fine("run", "-q", place / f"part-000{i}.xml")
        self.fine("copy", place / "part-0001.tif", place / "other.tif", "-q", "--tile", "128")
        (place / "other.tif").rename(place / "part-0001.tif")
        self.fine("run", "-q", place / "merge.xml")
        self.assert_same(place / "o.tif", self.single("bands"))
        (place / "o.tif").unlink()
        whole = (place / "part-0002.tif").read_bytes()
        for name, data in (("cut off", whole[:-200]), ("without pixels", whole[:100]), ("empty", b"")):
            with self.subTest(name):
                (place / "part-0002.tif").write_bytes(data)
                code, _, err = run("run", "-q", str(place / "merge.xml"))
                self.assertEqual(code, 1)
                self.assertIn("part-0002.tif", err)
                (place / "o.tif").unlink()  # of a document that runs without --once

    def test_a_vrt_file_shows_the_files_of_the_parts_and_moves_with_them(self):
        for name, parts in (("masked", 3), ("calc", 4), ("cog", 2)):
            with self.subTest(name):
                place = self.plan(name, "--join", "vrt", "--parts", str(parts))
                for each in self.manifest(place)["documents"]:
                    self.fine("run", "--once", "-q", place / each["document"])
                self.assertFalse((place / "o.tif").exists())
                moved = self.folder / f"{name}.moved"
                place.rename(moved)
                text = (moved / "o.vrt").read_text()
                self.assertIn('<SourceFilename relativeToVRT="1">part-0001.tif</SourceFilename>', text)
                single = self.single(name)
                self.assertEqual(gdal_pixels(moved / "o.vrt"), gdal_pixels(single))
                self.assertEqual(*([[band[item] for item in ("count", "min", "max")] for band in
                                    json.loads(self.fine("stats", file, "--json"))["bands"]]
                                   for file in (moved / "o.vrt", single)))  # as their masks say
        place = self.folder / "named"
        self.fine("plan", "-q", "-o", place, "--parts", "2", "--join", "vrt", "copy", SCENE, place / "x.vrt")
        for each in self.manifest(place)["documents"]:
            self.fine("run", "--once", "-q", place / each["document"])
        self.assertEqual(gdal_pixels(place / "x.vrt"), gdal_pixels(SCENE))
        self.fails(2, "x.vrt: the name's ending tells no format", "plan", "-o", self.folder / "file", "--parts", "2",
                   "copy", SCENE, self.folder / "x.vrt")
        self.fails(2, "--join vrt: no raster of the job is written by lines", "plan", "-o", self.folder / "none",
                   "--parts", "2", "--join", "vrt", "stats", SCENE)


@needs_data
class Pyramids(PlanTest):
    def test_a_pyramid_has_the_bytes_of_one_run_however_many_shares_there_are(self):
        single = self.single("pyramid")
        for parts in (1, 7, 40):  # of 22 rows of tiles of the first level
            with self.subTest(parts):
                place = self.plan("pyramid", "--parts", str(parts), "--replace")
                documents = self.manifest(place)["documents"]
                self.assertEqual(documents[0]["outputs"], [str(place / "part-0000.share")])
                self.assertEqual(documents[-1]["outputs"], [str(place / "o.pyr")])
                for each in documents:
                    self.assertFalse((place / "o.pyr").exists())
                    self.fine("run", "--once", "-q", place / each["document"])
                self.assert_same(place / "o.pyr", single)
                (place / "o.pyr").unlink()

    def test_levels_that_a_driver_makes_or_that_are_picked_band_by_band_are_one_part(self):
        many = self.folder / "many.tif"
        self.fine("stack", many, SCENE, SCENE, "-q")
        for words, why in ((("--type", "DRIVER"), "the driver of the format makes the levels"),
                           (("--resampling", "nearest", "--output", self.folder / "m.pyr"), "of more than 8 bands")):
            with self.subTest(why):
                place = self.folder / words[1]
                code, _, err = run("plan", "-o", str(place), "--parts", "3", "pyramid", "build", str(many),
                                   *map(str, words))
                self.assertEqual(code, 0)
                self.assertRegex(err, rf"\Avexg: note: BuildRasterPyramidCommand [^\n]+{why}[^\n]+\n\Z")
                self.assertEqual(len(self.manifest(place)["documents"]), 1)


@needs_data
class Once(PlanTest):
    def test_what_is_done_is_not_done_again_and_one_result_that_has_gone_is_made_alone(self):
        place = self.plan("copy", "--parts", "3")
        documents = [each["document"] for each in self.manifest(place)["documents"]]

        def once():
            before = {path.name: path.stat().st_mtime_ns for path in place.glob("*.tif")}
            for document in documents:
                self.fine("run", "--once", "-q", place / document)
            return sorted(path.name for path in place.glob("*.tif")
                          if before.get(path.name) != path.stat().st_mtime_ns)

        self.assertEqual(once(), ["o.tif", "part-0000.tif", "part-0001.tif", "part-0002.tif"])
        self.assertEqual(once(), [])
        (place / "part-0001.tif").unlink()
        self.assertEqual(once(), ["part-0001.tif"])
        (place / "merge.result.json").unlink()
        self.assertEqual(once(), ["o.tif"])
        (place / "part-0002.tif").write_bytes(b"damaged")
        self.assertEqual(once(), ["part-0002.tif"])
        self.assert_same(place / "o.tif", self.single("copy"))

    def test_what_a_killed_run_has_changed_is_made_again(self):
        place = self.plan("mosaic", "--parts", "2")
        documents = [each["document"] for each in self.manifest(place)["documents"]]
        for document in documents:
            if document == "gather.xml":
                (place / "o.tif.vmosaic").write_bytes(b"half of it")
            self.fine("run", "--once", "-q", place / document)
        self.assertIn("gather.xml", documents)
        for want in sorted(self.single("mosaic").parent.iterdir()):
            self.assert_same(place / want.name, want)

    def test_other_inputs_documents_and_orders_are_refused_in_one_line(self):
        scene = self.folder / "scene.tif"
        shutil.copyfile(SCENE, scene)
        place = self.folder / "plan"
        self.fine("plan", "--parts", "2", "-o", place, "copy", scene, self.folder / "o.tif")
        self.fails(2, "part-0000.xml isn't done, which comes first", "run", "--once", place / "merge.xml")
        self.fine("run", "--once", "-q", place / "part-0000.xml")
        text = (place / "part-0001.xml").read_text()
        (place / "part-0001.xml").write_text(text.replace("Exact", "Told"))
        self.fails(2, "is not as it was planned", "run", "--once", place / "part-0001.xml")
        (place / "part-0001.xml").write_text(text)
        os.utime(scene, (1, 1))
        for document in ("part-0000.xml", "part-0001.xml"):
            self.fails(2, "scene.tif: has changed since", "run", "--once", place / document)
        scene.unlink()
        self.fails(2, "scene.tif: is not there any more", "run", "--once", place / "part-0001.xml")
        shutil.copyfile(SCENE, place / "other.xml")
        self.fails(2, "is no document of the plan", "run", "--once", place / "other.xml")
        (place / "manifest.json").write_text('{"version": 1')
        self.fails(2, "is no whole manifest", "run", "--once", place / "part-0001.xml")

    def test_a_part_whose_bytes_have_changed_is_named_and_nothing_is_made_of_it(self):
        place = self.plan("bands", "--parts", "3")
        for i in range(3):
            self.fine("run", "--once", "-q", place / f"part-000{i}.xml")
        part = place / "part-0001.tif"
        data, times = bytearray(part.read_bytes()), part.stat()
        data[len(data) // 2] ^= 1  # of a packed block, which nobody unpacks
        part.write_bytes(data)
        os.utime(part, ns=(times.st_atime_ns, times.st_mtime_ns))
        self.fails(1, "part-0001.tif: is damaged: its bytes are not those that part-0001.xml has made", "run", "--once",
                   "-q", place / "merge.xml")
        self.assertFalse((place / "o.tif").exists())
        part.unlink()
        for document in ("part-0001.xml", "merge.xml"):
            self.fine("run", "--once", "-q", place / document)
        self.assert_same(place / "o.tif", self.single("bands"))

    def test_two_that_run_one_document_leave_it_as_one_does(self):
        place = self.plan("cog", "--parts", "2")
        for document in ("part-0000.xml", "part-0001.xml", "merge.xml"):
            both = [subprocess.Popen([VEXG, "run", "--once", "-q", place / document], stderr=subprocess.PIPE)
                    for _ in range(2)]
            for process in both:
                _, said = process.communicate(timeout=300)
                self.assertEqual((process.returncode, said), (0, b""))
        self.assert_same(place / "o.tif", self.single("cog"))
        self.assertEqual([path for path in place.iterdir() if path.name.startswith(".")], [])

    def test_a_document_without_a_plan_runs_once_too(self):
        job = self.folder / "job.xml"
        output = self.folder / "o.tif"
        job.write_text(self.fine("copy", SCENE, output, "--print-job"))
        self.fine("run", "--once", "-q", job)
        made = output.stat().st_mtime_ns
        self.fine("run", "--once", "-q", job)
        self.assertEqual(output.stat().st_mtime_ns, made)
        job.write_text(job.read_text().replace('Level="1"', "").replace("ZSTD", "DEFLATE"))
        self.fine("run", "--once", "-q", job)
        self.assertNotEqual(output.stat().st_mtime_ns, made)


@needs_data
class Sums(PlanTest):
    def results(self, commands):
        """The values that commands gave, without the names of views, which are new in each process."""
        return [(each["name"], {name: value for name, value in each["return"].items() if name != "URI"})
                for each in commands]

    def test_statistics_and_histograms_have_all_digits_of_the_single_run(self):
        for parts, arguments in ((3, ("stats", FLOATS)), (5, ("stats", FLOATS, "--extended", "--bands", "2,0")),
                                 (4, ("stats", SCENE, "--extended")), (4, ("hist", FLOATS)), (40, ("hist", SCENE)),
                                 (3, ("stats", FLOATS, "--percentiles", "2,50,98.5")), (4, ("stats", SCENE, "--percentiles", "50")),
                                 (3, ("stats", DATA / "all-nodata.tif"))):
            with self.subTest(parts=parts, arguments=arguments):
                place = self.folder / "plan"
                job = self.folder / "job.xml"
                job.write_text(self.fine(*arguments, "--print-job"))
                single = json.loads(self.fine("run", "-q", "--json", job))
                self.fine("plan", "-q", "--replace", "-o", place, "--parts", str(parts), *arguments)
                for each in self.manifest(place)["documents"]:
                    self.fine("run", "--once", "-q", place / each["document"])
                merged = json.loads((place / "merge.result.json").read_text())
                self.assertEqual(self.results(merged["commands"]), self.results(single["commands"]))

    def test_files_of_other_shares_and_damaged_ones_are_refused(self):
        place = self.plan("zonal", "--parts", "2")
        for part in range(2):
            self.fine("run", "--once", "-q", place / f"part-000{part}.xml")
        share, other = place / "part-0001.share", place / "part-0000.share"
        good, times = share.read_bytes(), share.stat()
        flipped = bytearray(good)
        flipped[-3] ^= 1
        for name, data in (("damaged", flipped), ("short", good[:-1]), ("another", other.read_bytes()), ("none", b"")):
            with self.subTest(name):
                share.write_bytes(data)
                os.utime(share, ns=(times.st_atime_ns, times.st_mtime_ns))
                # Without --once, which looks at sizes and times first.
                code, _, err = run("run", "-q", str(place / "merge.xml"))
                self.assertEqual(code, 1)
                self.assertIn("part-0001.share: is no whole file of a share of this work", err)
                self.assertFalse((place / "o.csv").exists())


@needs_data
@needs_make
class Make(PlanTest):
    def kill_some(self, place, kills, draw):
        """Starts a plan and kills all of its processes, some times at random moments."""
        for _ in range(kills):
            process = self.make(place, start_new_session=True)
            time.sleep(draw.uniform(0, 0.25))
            os.killpg(process.pid, signal.SIGKILL)
            process.communicate(timeout=300)

    def test_results_are_those_of_the_single_run_whatever_was_killed(self):
        seed = random.randrange(1 << 30)
        draw = random.Random(seed)
        for name in JOBS:
            with self.subTest(name, seed=seed):
                place = self.plan(name, "--parts", "4")
                self.kill_some(place, 3, draw)
                self.assertEqual(self.made(place), "")
                for want in sorted(self.single(name).parent.iterdir()):
                    self.assert_same(place / want.name, want)
                left = [path.name for path in place.iterdir() if path.name.startswith(".")]
                self.assertEqual(left, [])

    def test_a_second_run_does_nothing_and_what_has_gone_is_made_alone(self):
        place = self.plan("calc", "--parts", "4")
        self.made(place)
        times = {path: path.stat().st_mtime_ns for path in place.iterdir()}
        self.made(place)
        self.assertEqual({path: path.stat().st_mtime_ns for path in place.iterdir()}, times)
        gone = place / "part-0002.tif"
        gone.unlink()
        self.made(place)
        changed = sorted(path.name for path in place.glob("*.tif") if path.stat().st_mtime_ns != times[path])
        self.assertEqual(changed, [gone.name])


@needs_gdal
class Classes(FieldScene):
    def test_a_map_of_classes_and_its_scores_come_by_regions(self):
        self.fine("segment", self.folder / "scene.tif", self.folder / "segments.tif", "--merge-percent", 70, "-q")
        self.fine("attributes", self.folder / "scene.tif", self.folder / "segments.tif", "-o", self.folder / "fields",
                  "--spectral", "--shape", "-q")
        rules = {"classes": [{"name": "water"}, {"name": "other"}],
                 "rules": [{"class": "water", "tests": [{"attribute": "mean_b2", "atMost": 50}]},
                           {"class": "other", "tests": [{"attribute": "mean_b2", "atLeast": 40, "membership": "linear",
                                                         "tolerance": 10}]}]}
        (self.folder / "rules.json").write_text(json.dumps(rules))
        training = ("--training", self.folder / "train.geojson", "--class-field", "cover")
        for name, options in (("knn", training), ("pca", (*training, "--method", "pca")),
                              ("rules", ("--rules", self.folder / "rules.json"))):
            with self.subTest(name):
                place = self.folder / name
                words = ("classify", self.folder / "segments.tif", place / "map.tif", "--attributes",
                         self.folder / "fields", *options)
                self.fine("plan", "-q", "-o", place, "--parts", "3", *words)
                documents = [each["document"] for each in json.loads((place / "manifest.json").read_text())["documents"]]
                self.assertEqual(documents, ["part-0000.xml", "part-0001.xml", "part-0002.xml", "merge.xml"])
                for document in documents:
                    self.fine("run", "--once", "-q", place / document)
                made = {path.name: path.read_bytes() for path in place.glob("map.tif*")}
                for path in place.glob("map.tif*"):
                    path.unlink()
                job = self.folder / "job.xml"
                job.write_text(self.fine(*words, "--print-job"))
                self.fine("run", "-q", "-o", self.folder / "result.xml", job)
                self.assertEqual({path.name: path.read_bytes() for path in place.glob("map.tif*")}, made)


@needs_data
class Runners(PlanTest):
    def test_each_engine_gets_its_form(self):
        place = self.plan("calc", "--parts", "12", "--threads", "2")
        slurm = self.fine("plan", place, "--runner", "slurm")
        subprocess.run(["sh", "-n"], input=slurm, text=True, check=True)
        self.assertIn("--array=1-12 --cpus-per-task=2", slurm)
        snake = self.fine("plan", place, "--runner", "snakemake")
        self.assertEqual(snake.count("\nrule "), 14)
        self.assertEqual(self.fine("plan", place, "--runner", "dask"), f"python3 -m vexg.dask '{place}'\n")

    def test_the_script_for_slurm_submits_arrays_that_depend_on_each_other(self):
        # A program in the place of sbatch runs the array at once.
        place = self.plan("mosaic", "--parts", "3")
        programs = self.folder / "bin"
        programs.mkdir()
        submit = programs / "sbatch"
        submit.write_text('#!/bin/sh\necho "$@" >>"$LOG"\ncat >"$LOG.job"\n'
                          'for word; do case $word in --array=1-*) last=${word#--array=1-};; esac; done\n'
                          'i=1; while [ $i -le $last ]; do SLURM_ARRAY_TASK_ID=$i sh "$LOG.job" || exit 1; '
                          'i=$((i + 1)); done\necho "10$last"\n')
        submit.chmod(0o755)
        log = self.folder / "log"
        ended = subprocess.run(["sh"], input=self.fine("plan", place, "--runner", "slurm"), text=True,
                               capture_output=True, env={**os.environ, "PATH": f"{programs}:{os.environ['PATH']}",
                                                         "LOG": str(log), "VEXG": str(VEXG)})
        self.assertEqual((ended.returncode, ended.stdout, ended.stderr), (0, "101\n", ""))
        first, scenes, gather, parts, merge = log.read_text().splitlines()
        self.assertNotIn("--dependency", first)
        for after, count, stage in ((101, 3, scenes), (103, 1, gather), (101, 3, parts), (103, 1, merge)):
            self.assertIn(f"--dependency=afterok:{after} --array=1-{count}", stage)
        self.assert_same(place / "o.tif", self.single("mosaic"))


if __name__ == "__main__":
    unittest.main()
