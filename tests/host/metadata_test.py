"""What vexg tells of headers and side files: the verb metadata."""

import json
import os
import shutil
import subprocess
import unittest

from support import DATA, FolderTest, PipeTest, needs_data, needs_gdal, run, write_orva


class Metadata(PipeTest, FolderTest):
    def values(self, *arguments):
        return json.loads(self.fine("metadata", "--json", *arguments))["values"]

    def write_orva(self):
        return write_orva(self.folder / "scene.dat", 2, 3, 2, more=(
            "band names = {Red, Near infrared}\ngains = {0.5, 0.25}\nsun elevation = 41.5\n"
            "map points = {1, 1, 100, 50, 3, 1, 100, 70}\nmine = {x, y}\n"))

    def test_gives_numbers_texts_lists_and_rows(self):
        raster = self.write_orva()
        want = {"/Image/Samples/": 2, "/Bands/Names/": ["Red", "Near infrared"], "/mine/": "{x, y}",
                "/Acquisition/SunElevation/": 41.5, "/Radiometry/Gains/": [0.5, 0.25],
                "/CoordSys/MapPoints/": [[0, 0, 50, 100], [2, 0, 70, 100]]}
        for source in (raster, f"{raster}.hdr", f"ORVA:{raster}"):
            values = self.values(source)
            self.assertEqual({path: values[path] for path in want}, want)
            self.assertFalse([path for path in values if "/private/" in path])
        text = self.fine("metadata", "--path", "/CoordSys/", "--path", "/mine", raster)
        self.assertEqual([line.split(None, 1) for line in text.splitlines()],
                         [["/CoordSys/MapPoints/", "0.0, 0.0, 50.0, 100.0; 2.0, 0.0, 70.0, 100.0"], ["/mine", "{x, y}"]])
        shown = self.values("--private", raster)
        self.assertEqual(shown["/private/xx vex parser info/uri/"], f"{raster}.hdr")
        self.fails(1, "nothing at /Nowhere/", "metadata", "--path", "/Nowhere/", raster)

    def test_says_what_bars_hide(self):
        raster = write_orva(self.folder / "bars.dat", 1, 1, 2, more="band names = {a|b, c}\nx|y = 1\n")
        code, out, err = run("metadata", "--json", str(raster))
        self.assertEqual((code, err.count("|")), (0, 3), err)
        self.assertEqual(json.loads(out)["values"]["/Bands/Names/"], "a|b|c")

    def test_a_server_does_the_same_inside_its_folders(self):
        raster = self.write_orva()
        inside = self.folder / "inside"
        inside.mkdir()
        shutil.copy(f"{raster}.hdr", inside / "in.hdr")
        (inside / "link.hdr").symlink_to(f"{raster}.hdr")
        self.serve("test", "--root", str(inside))
        self.assertEqual(self.values("--server", "test", inside / "in.hdr")["/Image/Bands/"], 2)
        for source in (f"{raster}.hdr", inside / "link.hdr"):
            self.fails(1, "outside the folders", "metadata", "--server", "test", source)
        for strings in (f"GML|file://{raster}.hdr|XmlUrl", f"GML|file:{raster}.hdr|XmlUrl",
                        f"PLEIADESDIM|{raster}.hdr|XmlFile", f"TIFF|{raster}"):
            job = self.folder / "job.xml"
            job.write_text(f'<Job><Reasons/><Command Name="c" ID="CreateMetadataCommand">'
                           f'<Input ConnStr="{strings}"/></Command></Job>')
            code, out, _ = run("submit", "--server", "test", str(job))
            self.assertEqual(code, 1, out)
            self.assertRegex(out, "allowed|no address")

    def test_says_what_it_can_not_read(self):
        (self.folder / "cut.xml").write_text("<Dimap_Document><a>")
        (self.folder / "x.png").write_bytes(b"\x89PNG")
        self.fails(1, "line 1", "metadata", self.folder / "cut.xml")
        self.fails(2, "FORMAT:FILE", "metadata", self.folder / "x.png")
        self.fails(1, "o such file", "metadata", self.folder / "none.IMD")
        self.fails(1, "not a file", "metadata", f"DGRPB:{self.folder}")
        self.fails(1, "", "metadata", f"TIFF:{self.folder / 'x.png'}")

    @needs_data
    def test_sample_headers_come_as_they_stand(self):
        """Every line of the two headers is found again, as a value of the same text or number."""
        for name in ("wv03.IMD", "wv03.RPB"):
            values = self.values(DATA / "sidecars" / name)
            flat = [str(element) for value in values.values()
                    for element in (value if isinstance(value, list) else [value])]
            numbers = set()
            for text in flat:
                try:
                    numbers.add(float(text))
                except ValueError:
                    pass
            for line in (DATA / "sidecars" / name).read_text().splitlines():
                text = line.split("=")[-1].strip(" \t;,)\"")
                if not text or text == "(" or "_GROUP" in line or text == "END":
                    continue
                try:
                    self.assertIn(float(text), numbers, line)
                except ValueError:
                    self.assertIn(text, flat, line)

    @needs_data
    @needs_gdal
    def test_agrees_with_gdalinfo(self):
        scene = DATA / "landsat7_olinda.tif"
        theirs = json.loads(subprocess.run(["gdalinfo", "-json", scene], capture_output=True, text=True,
                                           check=True).stdout)
        values = self.values(scene)
        self.assertEqual([values["/Image/Samples/"], values["/Image/Lines/"]], theirs["size"])
        self.assertEqual(values["/Grid/Transform/"], theirs["geoTransform"])
        self.assertEqual(values["/CoordSys/Code/"], 31985)
        # The GML that GDAL puts into a JPEG 2000 file, and a GRIB file.
        jp2 = self.folder / "x.jp2"
        made = subprocess.run(["gdal_translate", "-q", "-of", "JP2OpenJPEG", scene, jp2], capture_output=True)
        if made.returncode == 0:
            domain = "xml:gml.root-instance"
            shown = subprocess.run(["gdalinfo", "-mdd", domain, jp2], capture_output=True, text=True,
                                   check=True).stdout
            end = "</gml:FeatureCollection>"
            (self.folder / "x.gml").write_text(shown[shown.index("<gml:Feature"):shown.rindex(end)] + end)
            grid = self.values(self.folder / "x.gml")
            left, width, _, top, _, height = theirs["geoTransform"]
            self.assertEqual(grid["/CoordSys/Code/"], 31985)
            for value, want in zip(grid["/Grid/Center/"], (left + width / 2, top + height / 2), strict=True):
                self.assertAlmostEqual(value, want, 4)
            self.assertAlmostEqual(grid["/Grid/LineStep/"][1], height, 9)
        grib = self.folder / "x.grb2"
        made = subprocess.run(["gdal_translate", "-q", "-of", "GRIB", DATA / "dem_olinda.tif", grib],
                              capture_output=True)
        if made.returncode == 0:
            values = self.values(grib)
            self.assertEqual((values["/Image/Samples/"], values["/Grib/ReferenceTimes/"]), (111, "0"))


if __name__ == "__main__":
    unittest.main()
