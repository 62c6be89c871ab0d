"""A scene becomes a map of classes by a recipe, in stages that outlive a broken run."""

import json
import signal
import subprocess
import time
import unittest

from field_scene import CLASSES, FieldScene
from support import VEXG, needs_gdal

STAGES = ["calibrated.tif", "segments.tif", "attributes.spectral.fxa", "attributes.index.fxa", "attributes.shape.fxa",
          "classes.tif", "scores.fxa", "classes.gpkg", "classes.qml", "accuracy.json"]


@needs_gdal
class AnalyzeTest(FieldScene):
    def setUp(self):
        super().setUp()
        self.results = self.folder / "results"

    def recipe(self, **parts):
        recipe = {"calibrate": {"quantity": "radiance", "gain": [0.5], "offset": [1]},
                  "segment": {"mergePercent": 90},
                  "attributes": {"spectral": True, "shape": True, "indices": {"contrast": "(b2-b0)/(b2+b0)"}},
                  "classify": {"samples": "train.geojson", "field": "cover", "neighbors": 3,
                               "use": ["mean_b0", "mean_b1", "mean_contrast"], "colors": {"water": "#0000ff"}},
                  "polygons": "classes.gpkg",
                  "accuracy": {"samples": "check.geojson", "field": "cover"}, **parts}
        path = self.folder / "recipe.json"
        path.write_text(json.dumps(recipe, indent=1))
        return ("analyze", self.folder / "scene.tif", "--recipe", path, "-o", self.results)

    def contents(self, folder):
        return {p.name: p.read_bytes() for p in folder.iterdir() if p.is_file() and p.name not in ("analysis.json", "classes.gpkg")}

    def test_a_recipe_makes_all_and_one_document_does_the_same(self):
        table = self.fine(*self.recipe(), "-q")
        self.assertIn("overall", table)
        report = json.loads((self.results / "accuracy.json").read_text())
        self.assertGreater(report["overall"]["share"], 0.95)
        self.assertEqual([c["class"] for c in report["classes"]], sorted(CLASSES))
        made = self.contents(self.results)
        self.assertLessEqual({s for s in STAGES if s != "classes.gpkg"}, set(made))
        colors = json.loads(subprocess.run(["gdalinfo", "-json", self.results / "classes.tif"], check=True, capture_output=True,
                                           text=True).stdout)["bands"][0]["colorTable"]["entries"]
        self.assertEqual(colors[1 + sorted(CLASSES).index("water")][:3], [0, 0, 255])
        first = self.results.rename(self.folder / "first")
        document = self.fine(*self.recipe(), "--print-job")
        self.assertFalse(self.results.exists())
        self.results.mkdir()
        (self.folder / "job.xml").write_text(document)
        self.fine("run", self.folder / "job.xml")
        again = self.contents(self.results)
        for name, data in self.contents(first).items():
            if name != "accuracy.json":
                self.assertEqual(again[name] == data, True, name)

    def test_a_recipe_keeps_a_tree(self):
        self.fine(*self.recipe(segment={"mergePercent": 90, "tree": True}, attributes={"spectral": True},
                               classify={"samples": "train.geojson", "field": "cover"}), "-q")
        cut = self.folder / "cut.tif"
        self.fine("segment", "cut", self.results / "segments.tree", cut, "--merge-percent", 90, "-q")
        self.assertEqual(cut.read_bytes(), (self.results / "segments.tif").read_bytes())
        self.fails(2, '"schedule", and without "tiled"', *self.recipe(segment={"tree": True, "tiled": True}))

    def test_a_run_goes_on_from_what_is_whole(self):
        verb = self.recipe()
        self.fine(*verb, "-q")
        before = self.contents(self.results)
        times = lambda: {name: (self.results / name).stat().st_mtime_ns for name in STAGES}
        old = times()
        self.assertIn("overall", self.fine(*verb, "-q"))
        self.assertEqual(times(), old)
        (self.results / "classes.tif").unlink()
        (self.results / "accuracy.json").unlink()
        self.fine(*verb, "-q")
        new = times()
        self.assertEqual([n for n in STAGES[:5] if new[n] != old[n]], [])
        self.assertEqual([n for n in STAGES[5:] if new[n] == old[n]], [])
        self.assertEqual(self.contents(self.results), before)
        # Other settings make anew what depends on them, with leave.
        other = self.recipe(classify={"samples": "train.geojson", "field": "cover", "method": "pca"})
        self.fails(1, "classes.tif: was not made from these files by these settings; give --overwrite", *other)
        self.assertEqual(self.contents(self.results), before)
        self.fine(*other, "-q", "--overwrite")
        self.assertEqual([n for n in STAGES[:5] if times()[n] != new[n]], [])
        self.assertNotEqual((self.results / "scores.fxa").read_bytes(), before["scores.fxa"])
        # A file of the user's own is not replaced, nor taken for one of ours.
        (self.results / "segments.tif").write_bytes(b"mine")
        self.fails(1, "segments.tif: was not made", *other)
        self.assertEqual((self.results / "segments.tif").read_bytes(), b"mine")

    def test_a_killed_run_leaves_nothing_that_passes_for_whole(self):
        verb = self.recipe()
        self.fine(*verb, "-q")
        whole = self.contents(self.results)
        for number in range(12):
            subprocess.run(["rm", "-r", self.results], check=True)
            process = subprocess.Popen([VEXG, *map(str, verb), "-q"], stdout=subprocess.DEVNULL, stderr=subprocess.PIPE)
            time.sleep(0.02 + 0.03 * number)
            process.send_signal(signal.SIGKILL if number % 2 else signal.SIGINT)
            process.communicate()
            if self.results.exists():
                for name, data in self.contents(self.results).items():
                    if name in whole:
                        self.assertEqual(data == whole[name], True, name)
            self.fine(*verb, "-q")
            self.assertEqual(self.contents(self.results), whole)

    def test_a_recipe_to_start_from_runs(self):
        for more in ((), ("--training", self.folder / "train.geojson", "--class-field", "cover")):
            text = self.fine("analyze", "--init", self.folder / "scene.tif", *more)
            (self.folder / "start.json").write_text(text)
            folder = self.folder / f"start{len(more)}"
            self.fine("analyze", self.folder / "scene.tif", "--recipe", self.folder / "start.json", "-o", folder, "-q")
            self.assertTrue((folder / "classes.gpkg").exists())

    def test_what_is_wrong_has_a_line(self):
        wrong = lambda part, **fields: {part: fields}
        for code, words, parts in (
                (2, 'line 12: segment.mergePersent: there is no "mergePersent" here; did you mean', wrong("segment", mergePersent=9)),
                (2, "segment.mergePercent: a percentage", wrong("segment", mergePercent=101)),
                (2, "segment.bands[1]: a whole number from 0 to 2", wrong("segment", bands=[0, 3])),
                (2, 'classify: either "rules" or "samples"', wrong("classify", field="cover")),
                (2, "classify.use: there is no attribute \"mean_b9\"", wrong("classify", samples="train.geojson", field="cover",
                                                                               use=["mean_b9"])),
                (2, "classify.colors.sea: no sample is of this class", wrong("classify", samples="train.geojson", field="cover",
                                                                   colors={"sea": "blue"})),
                (1, "klass", wrong("classify", samples="train.geojson", field="klass")),
                (1, "gone.geojson", wrong("accuracy", samples="gone.geojson", field="cover")),
                (2, "accuracy: a sample is of class \"0\", which the map lacks", wrong("accuracy", samples="check.geojson", field="number")),
                (2, "polygons: no vector format", {"polygons": "classes.txt"}),
                (2, "calibrate: --offset: radiance needs it", wrong("calibrate", quantity="radiance", gain=[1]))):
            with self.subTest(words):
                self.fails(code, words, *self.recipe(**parts))
                self.assertFalse(self.results.exists())


if __name__ == "__main__":
    unittest.main()
