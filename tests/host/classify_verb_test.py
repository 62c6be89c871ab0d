"""The chain from a scene to a map of classes with a known accuracy, on made fields of known classes."""

import json
import subprocess
import unittest
from xml.etree import ElementTree

from field_scene import CLASSES, FieldScene
from support import gdal_pixels, needs_gdal


@needs_gdal
class ClassifyVerbTest(FieldScene):
    def setUp(self):
        super().setUp()
        self.fine("segment", self.folder / "scene.tif", self.folder / "segments.tif", "--merge-percent", 90, "-q")
        self.fine("attributes", self.folder / "scene.tif", self.folder / "segments.tif", "-o", self.folder / "fields",
                  "--spectral", "--shape", "-q")

    def classify(self, *more):
        return ("classify", self.folder / "segments.tif", self.folder / "map.tif", "--attributes", self.folder / "fields", *more)

    def training(self):
        return ("--training", self.folder / "train.geojson", "--class-field", "cover")

    def accuracy(self):
        return json.loads(self.fine("accuracy", self.folder / "map.tif", "--reference", self.folder / "check.geojson",
                                    "--class-field", "cover", "--json"))

    def test_nearest_examples_find_the_fields(self):
        self.fine(*self.classify(*self.training(), "--neighbors", 3, "--use", "mean_b0,mean_b1,mean_b2", "--polygons",
                                 self.folder / "map.geojson", "--scores", self.folder / "scores.fxa", "-q"))
        report = self.accuracy()
        self.assertEqual([c["class"] for c in report["classes"]], sorted(CLASSES))  # from the map itself
        self.assertGreater(report["overall"]["share"], 0.95)
        info = json.loads(subprocess.run(["gdalinfo", "-json", self.folder / "map.tif"], check=True, capture_output=True,
                                         text=True).stdout)["bands"][0]
        self.assertEqual(info["noDataValue"], 4)
        self.assertEqual(info["colorTable"]["count"] >= 4, True)
        text = subprocess.run(["gdalinfo", self.folder / "map.tif"], check=True, capture_output=True, text=True).stdout
        for number, name in enumerate(["unclassified", *sorted(CLASSES)]):
            self.assertIn(f"{number}: {name}", text)
        values = {f["properties"]["class"] for f in json.loads((self.folder / "map.geojson").read_text())["features"]}
        self.assertLessEqual(values, {0, 1, 2, 3})
        self.assertEqual((self.folder / "scores.fxa").read_bytes()[:9], b"FXA50\x01\x00\x03\x00")
        self.assertEqual({p.name for p in self.folder.iterdir() if p.name.startswith("map.tif")} - {"map.tif.aux.xml"}, {"map.tif"})
        # A picture of it, with its names beside.
        for more, wide in (((), 120), (("--legend",), 200)):
            self.fine("quicklook", self.folder / "map.tif", self.folder / "map.png", "--overwrite", "-q", *more)
            picture = json.loads(subprocess.run(["gdalinfo", "-json", self.folder / "map.png"], check=True, capture_output=True,
                                                text=True).stdout)
            width, channels, data = picture["size"][0], len(picture["bands"]), gdal_pixels(self.folder / "map.png")
            self.assertEqual(width > wide, wide == 200)
            beside = {tuple(data[(y * width + x) * channels:][:3]) for y in range(120) for x in range(120, width)}
            entries = {tuple(entry[:3]) for entry in info["colorTable"]["entries"][:4]}
            self.assertEqual(entries <= beside, wide == 200)
        self.fails(1, "--legend: the picture is in no palette", "quicklook", self.folder / "scene.tif", self.folder / "x.png", "--legend")
        # A copy keeps the names.
        self.fine("copy", self.folder / "map.tif", self.folder / "copy.tif", "-q")
        self.assertIn("1: forest", subprocess.run(["gdalinfo", self.folder / "copy.tif"], check=True, capture_output=True,
                                                  text=True).stdout)

    def test_components_find_the_fields(self):
        self.fine(*self.classify(*self.training(), "--method", "pca", "--polygons", self.folder / "map.gpkg", "-q"))
        self.assertGreater(self.accuracy()["overall"]["share"], 0.95)
        style = ElementTree.parse(self.folder / "map.qml").getroot()
        self.assertEqual([(c.get("value"), c.get("label")) for c in style.iter("category")],
                         [(str(i), name) for i, name in enumerate(["unclassified", *sorted(CLASSES)])])
        self.assertEqual(len({s.find("layer/prop[@k='color']").get("v") for s in style.iter("symbol")}), 4)
        self.fails(2, "--neighbors goes with", *self.classify(*self.training(), "--method", "pca", "--neighbors", 3))

    def test_rules_find_the_fields(self):
        rules = {"classes": [{"name": "water", "color": "#0000ff"}, {"name": "forest", "color": "green"}, {"name": "town"}],
                 "rules": [
                     {"class": "water", "tests": [{"attribute": "mean_b2", "atMost": 50, "membership": "linear", "tolerance": 10}]},
                     {"class": "forest", "tests": [{"attribute": "mean_b2", "atLeast": 105}]},
                     {"class": "town", "tests": [{"attribute": "mean_b0", "between": [80, 200]}]}]}
        (self.folder / "rules.json").write_text(json.dumps(rules))
        self.fine(*self.classify("--rules", self.folder / "rules.json", "-q"))
        report = self.accuracy()
        self.assertEqual([c["class"] for c in report["classes"]], ["water", "forest", "town"])
        self.assertGreater(report["overall"]["share"], 0.95)
        table = json.loads(subprocess.run(["gdalinfo", "-json", self.folder / "map.tif"], check=True, capture_output=True,
                                          text=True).stdout)["bands"][0]["colorTable"]["entries"]
        self.assertEqual((table[1][:3], table[2][:3]), ([0, 0, 255], [0, 128, 0]))

    def test_what_is_wrong_has_one_line(self):
        rules = self.folder / "wrong.json"
        good = {"classes": [{"name": "a"}], "rules": [{"class": "a", "tests": [{"attribute": "area", "atLeast": 1}]}]}
        for words, text in (
                ("wrong.json: line 2 is no JSON", '{"classes": [],\n "rules": [}'),
                ("wrong.json: line 1: \"rules\" is missing", json.dumps({"classes": [{"name": "a"}]})),
                ("wrong.json: line 1: classes[0]: \"name\" is missing", json.dumps({**good, "classes": [{"color": "red"}]})),
                ("wrong.json: line 1: rules[0].class: there is no class", json.dumps({**good, "rules": [{"class": "b", "tests": good["rules"][0]["tests"]}]})),
                ("wrong.json: line 1: rules[0].tests[0].attribute: there is no attribute \"aera\"; did you mean",
                 json.dumps(good).replace('"area"', '"aera"')),
                ("wrong.json: line 13: rules[0].tests[0].atLeast: a number is expected", json.dumps(good, indent=1).replace("atLeast\": 1", 'atLeast": "x"')),
                ("there is no \"wieght\" here", json.dumps(good).replace('"atLeast"', '"wieght": 1, "atLeast"'))):
            rules.write_text(text)
            with self.subTest(words):
                self.fails(2, words, *self.classify("--rules", rules))
        self.fails(2, "either --rules or --training", *self.classify())
        self.fails(2, "--use: there is no attribute", *self.classify(*self.training(), "--use", "mean_b9"))
        self.fails(1, "cove", *self.classify("--training", self.folder / "train.geojson", "--class-field", "cove"))
        self.fails(1, "there are no attributes of this name", "classify", self.folder / "segments.tif", self.folder / "map.tif",
                   "--attributes", self.folder / "none", *self.training())
        self.fails(1, "labels are of type Int32", "classify", self.folder / "scene.tif", self.folder / "map.tif", "--attributes",
                   self.folder / "fields", *self.training())
        self.fine("segment", self.folder / "scene.tif", self.folder / "few.tif", "--merge-percent", 99, "-q")
        self.fine("attributes", self.folder / "scene.tif", self.folder / "few.tif", "-o", self.folder / "few", "--shape", "-q")
        self.fails(1, "they are of other labels", *self.classify(*self.training(), "--attributes", self.folder / "few"))
        self.assertFalse((self.folder / "map.tif").exists())

    def test_a_constant_band_says_nothing(self):
        self.fine("calc", self.folder / "flat.tif", "b0; b1*0+7; b2", self.folder / "scene.tif", "--type", "Byte", "-q")
        self.fine("attributes", self.folder / "flat.tif", self.folder / "segments.tif", "-o", self.folder / "flat", "--spectral",
                  "-q")
        for method in ("knn", "pca"):
            self.fine("classify", self.folder / "segments.tif", self.folder / "map.tif", "--attributes", self.folder / "flat",
                      *self.training(), "--method", method, "--use", "mean_b0,mean_b1,std_b1,mean_b2", "-q", "--overwrite")
            self.assertGreater(self.accuracy()["overall"]["share"], 0.9)
        self.fails(1, "the attributes are the same for all regions", "classify", self.folder / "segments.tif",
                   self.folder / "none.tif", "--attributes", self.folder / "flat", *self.training(), "--method", "pca", "--use",
                   "mean_b1,std_b1")
        self.assertFalse((self.folder / "none.tif").exists())


if __name__ == "__main__":
    unittest.main()
