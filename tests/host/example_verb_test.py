"""The verb of the examples, in the host that is built with it."""

import json
import subprocess
import unittest

from support import BUILD, DATA, FolderTest, gdal_pixels, needs_data, needs_gdal

HOST = BUILD / "examples" / "vexg_example_host"
SCENE = DATA / "landsat7_olinda.tif"
LEFT, TOP, SIZE = 288776.25, 9120760.75, 28.5


@needs_data
@needs_gdal
class ExampleVerb(FolderTest):
    def run_host(self, *arguments):
        return subprocess.run([HOST, *map(str, arguments)], capture_output=True, text=True, timeout=60)

    def test_a_verb_of_its_own_has_all_that_verbs_have(self):
        ring = [[LEFT + (x + 0.01) * SIZE, TOP - (y + 0.01) * SIZE] for x, y in ((10, 20), (60, 20), (60, 50), (10, 50))]
        shapes = self.folder / "shapes.geojson"
        shapes.write_text(json.dumps({
            "type": "FeatureCollection", "crs": {"type": "name", "properties": {"name": "urn:ogc:def:crs:EPSG::31985"}},
            "features": [{"type": "Feature", "properties": {},
                          "geometry": {"type": "Polygon", "coordinates": [[*ring, ring[0]]]}}]}))
        made = self.folder / "clipped.tif"
        done = self.run_host("clip", SCENE, made, "--by", shapes)
        self.assertEqual((done.returncode, done.stdout), (0, ""), done.stderr)
        # The scan of regions is inclusive; what surely lies inside and outside is looked at.
        for window, valid in (((11, 21, 48, 28), True), ((0, 0, 100, 18), False), ((63, 0, 100, 100), False)):
            text = ["-srcwin", *map(str, window)]
            mask = gdal_pixels(made, *text, "-b", "mask,1")
            self.assertEqual(set(mask), {255 if valid else 0}, window)
            if valid:
                self.assertEqual(gdal_pixels(made, *text), gdal_pixels(SCENE, *text))
        again = self.run_host("clip", SCENE, made, "--by", shapes)
        self.assertEqual(again.returncode, 2)
        self.assertIn("--overwrite", again.stderr)
        self.assertIn("--by FILE", self.run_host("clip", "--help").stdout)
        job = self.run_host("clip", SCENE, self.folder / "other.tif", "--by", shapes, "--print-job").stdout
        self.assertIn('ID="CreateROIRasterCommand"', job)


if __name__ == "__main__":
    unittest.main()
