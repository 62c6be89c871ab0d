"""Each page of the guide is run as it stands, in a folder with what its first lines name."""

import json
import os
import pathlib
import re
import shutil
import subprocess
import unittest

from support import BUILD, DATA, SOURCE, PipeTest, FolderTest, needs_data, read_png

GUIDE = SOURCE / "docs" / "guide"
FIELDS = [(-34.91, -8.04, "wheat"), (-34.90, -8.04, "maize"), (-34.91, -8.02, "wheat"), (-34.89, -8.03, "maize"),
          (-34.90, -8.01, "wheat"), (-34.88, -8.02, "maize")]


def write_fields(path, fields, side):
    def ring(x, y):
        return [[[x, y], [x + side, y], [x + side, y + side], [x, y + side], [x, y]]]

    path.write_text(json.dumps({"type": "FeatureCollection", "features": [
        {"type": "Feature", "properties": {"name": f"P{i}", "crop": crop},
         "geometry": {"type": "Polygon", "coordinates": ring(x, y)}} for i, (x, y, crop) in enumerate(fields)]}))


@needs_data
class Guide(PipeTest, FolderTest):
    def setUp(self):
        super().setUp()
        shutil.copyfile(DATA / "landsat7_olinda.tif", self.folder / "scene.tif")
        write_fields(self.folder / "parcels.geojson", FIELDS, 0.006)
        write_fields(self.folder / "checks.geojson", [(x + 0.002, y + 0.003, crop) for x, y, crop in FIELDS], 0.002)

    def scenes(self):
        (self.folder / "scenes").mkdir()
        for name, rect in (("west", "0,0,199,351"), ("east", "150,0,348,351")):
            self.fine("copy", self.folder / "scene.tif", self.folder / "scenes" / f"{name}.tif", "--rect", rect, "-q")

    def page(self, name):
        """Runs the blocks of a page; gives what they print."""
        blocks = re.findall(r"^```sh\n(.*?)^```", (GUIDE / name).read_text(), re.DOTALL | re.MULTILINE)
        self.assertTrue(blocks, name)
        environment = dict(os.environ, PATH=f"{BUILD / 'bin'}:{os.environ['PATH']}")
        # A server of a page that fails ends with it.
        script = "set -e\ntrap 'kill $(jobs -p) 2>/dev/null || true' EXIT\n" + "".join(blocks)
        shell = subprocess.run(["bash", "-c", script], cwd=self.folder, env=environment,
                               capture_output=True, text=True, timeout=120)
        self.assertEqual(shell.returncode, 0, shell.stderr)
        return shell.stdout

    def test_every_page_is_run(self):
        run = set(re.findall(r'self\.page\("([^"]+)"\)', pathlib.Path(__file__).read_text()))
        pages = {path.name for path in GUIDE.glob("*.md")}
        self.assertEqual(pages - run, {"README.md", "limits.md"})
        self.assertEqual(set(re.findall(r"\]\(([^)]+\.md)\)", (GUIDE / "README.md").read_text())), pages - {"README.md"})

    def test_look(self):
        out = self.page("look.md")
        self.assertEqual(out.split()[-1], "5000")
        self.assertIn("median", out)
        self.assertEqual(read_png(self.folder / "scene.png")[:3], (349, 352, 3))
        self.assertIn("scene.tif, band 3", (self.folder / "values.svg").read_text())
        self.assertLess((self.folder / "scene.webp").stat().st_size, (self.folder / "scene.png").stat().st_size / 2)
        self.assertTrue((self.folder / "area.jpg").read_bytes().startswith(b"\xff\xd8\xff"))
        _, _, channels, pixels = read_png(self.folder / "parcels.png")
        self.assertEqual((channels, set(pixels[3::4])), (4, {0, 255}))

    def test_parcels(self):
        self.page("parcels.md")
        rows = (self.folder / "parcels.csv").read_text().splitlines()
        self.assertEqual(len(rows), 1 + len(FIELDS))
        self.assertIn("b3_median", rows[0])

    def test_ndvi(self):
        self.page("ndvi.md")
        low, high = (json.loads(self.fine("stats", self.folder / "ndvi.tif", "--json"))["bands"][0][name] for name in ("min", "max"))
        self.assertTrue(-1 <= low < high <= 1, (low, high))

    def test_grid(self):
        self.page("grid.md")
        info = json.loads(self.fine("info", self.folder / "matched.tif", "--json"))
        self.assertEqual((info["samples"], info["lines"]), tuple(json.loads(
            self.fine("info", self.folder / "coarse.tif", "--json"))[name] for name in ("samples", "lines")))

    def test_classes(self):
        self.assertRegex(self.page("classes.md"), r"overall +\d")
        self.assertTrue((self.folder / "crops.gpkg").exists())

    def test_mosaic(self):
        self.scenes()
        self.page("mosaic.md")
        self.assertIn("349 samples, 352 lines", self.fine("info", self.folder / "city.tif"))

    def test_many_files(self):
        self.scenes()
        self.page("many-files.md")
        self.assertEqual(sorted(path.name for path in (self.folder / "small").iterdir()), ["east.png", "west.png"])
        found = [json.loads(line) for line in (self.folder / "stats.jsonl").read_text().splitlines()]
        self.assertEqual([len(file["bands"]) for file in found], [6, 6])

    def test_server(self):
        self.assertIn("not in its folders", self.page("server.md"))
        self.assertIn("median", (self.folder / "stats.txt").read_text())


if __name__ == "__main__":
    unittest.main()
