"""What vexg says of rasters: info, formats, transform FILE."""

import json
import math
import os
import re
import shutil
import subprocess
import unittest

from support import DATA, FolderTest, PipeTest, needs_data, needs_gdal, run, table, write_orva

TYPES = {"Byte": "Byte", "Int16": "Int16", "UInt16": "UInt16", "Float32": "Single",
         "CFloat32": "ComplexSingle", "CFloat64": "ComplexDouble"}


@needs_data
class Info(FolderTest):
    def test_agrees_with_the_facts_of_the_sample_data(self):
        facts = table("| file | size")
        listed = json.loads(self.fine("info", "--json", *(DATA / fact["file"] for fact in facts)))
        self.assertEqual(len(listed), len(facts))
        for fact, info in zip(facts, listed):
            with self.subTest(fact["file"]):
                self.assertEqual(info["file"], str(DATA / fact["file"]))
                self.assertEqual(f'{info["samples"]} x {info["lines"]}', fact["size"])
                self.assertEqual(info["bands"], int(fact["bands"]))
                self.assertEqual(info["dataType"], TYPES[fact["type"]])
                no_data = {"None": None, "nan": "nan"}.get(fact["no-data"])
                if re.match(r"[-\d]", fact["no-data"]):
                    no_data = float(fact["no-data"])
                self.assertEqual(info["noData"], [no_data] * info["bands"])
                self.check_place(fact["georeference"], info["geoRef"])

    def check_place(self, fact, geo_ref):
        size = re.match(r"([\d.]+), -([\d.]+) (.*)", fact)
        if fact == "none":
            self.assertIsNone(geo_ref)
        elif "RPC" in fact:
            self.assertEqual(geo_ref["type"], "Rpc")
        elif size:
            self.assertEqual(geo_ref["type"], "Std")
            for value, want in zip(geo_ref["pixelSize"], size.groups()):
                self.assertAlmostEqual(value, float(want), delta=float(want) * 1e-5)
            self.assertEqual((geo_ref["tiePixel"], geo_ref["rotation"]), ([0.0, 0.0], 0.0))
            self.assertTrue(geo_ref["coordSys"])

    @needs_gdal
    def test_corners_are_those_of_gdalinfo(self):
        for name in ("landsat7_olinda.tif", "RGB.byte.tif", "rotated.tif", "alpha.tif"):
            theirs = json.loads(subprocess.run(["gdalinfo", "-json", DATA / name], capture_output=True,
                                               text=True, check=True).stdout)["cornerCoordinates"]
            ours = json.loads(self.fine("info", "--json", DATA / name))["geoRef"]
            for corner in ("upperLeft", "upperRight", "lowerLeft", "lowerRight"):
                # gdalinfo rounds to the third digit.
                for value, want in zip(ours["corners"][corner], theirs[corner]):
                    self.assertAlmostEqual(value, want, delta=6e-4, msg=name)

    def test_the_text_says_the_same(self):
        text = self.fine("info", DATA / "landsat7_olinda.tif")
        for words in ("349 samples, 352 lines, 6 bands", "Byte", "28.5 28.5", "upperLeft"):
            self.assertIn(words, text)

    @needs_gdal
    def test_tells_how_pixels_lie_in_the_file(self):
        """Blocks and codecs as GDAL tells them, of files that are read by our own reader and by GDAL."""
        plain, made = DATA / "landsat7_olinda.tif", self.folder / "made"
        for ending, driver, options in (
                (".tif", "GTiff", []), (".tif", "GTiff", ["BLOCKYSIZE=23", "COMPRESS=LZW", "PREDICTOR=2"]),
                (".tif", "GTiff", ["TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=96", "COMPRESS=DEFLATE"]),
                (".tif", "GTiff", ["COMPRESS=ZSTD", "BLOCKYSIZE=352"]), (".tif", "GTiff", ["COMPRESS=PACKBITS"]),
                (".tif", "COG", ["COMPRESS=LERC", "BLOCKSIZE=128"]), (".img", "HFA", ["COMPRESSED=YES"]), (".img", "HFA", []),
                (".jp2", "JP2OpenJPEG", ["BLOCKXSIZE=128", "BLOCKYSIZE=128"]), (".png", "PNG", [])):
            with self.subTest(driver=driver, options=options):
                file = made.with_suffix(ending)
                bands = ["-b", "1", "-b", "2", "-b", "3"]
                subprocess.run(["gdal_translate", "-q", *bands, "-of", driver, *(word for option in options for word in ("-co", option)),
                                plain, file], check=True)
                theirs = json.loads(subprocess.run(["gdalinfo", "-json", file], capture_output=True, text=True, check=True).stdout)
                ours = json.loads(self.fine("info", "--json", file))
                self.assertEqual(ours["blockSize"], theirs["bands"][0]["block"])
                parts = (theirs, theirs["bands"][0])
                codec = next((part["metadata"]["IMAGE_STRUCTURE"]["COMPRESSION"] for part in parts
                              if "COMPRESSION" in part["metadata"].get("IMAGE_STRUCTURE", {})), None)
                self.assertEqual(ours["compression"], codec or ("none" if driver in ("GTiff", "HFA") else None))
                width, height = ours["blockSize"]
                block = f"{width} x {height}" if width < 349 else f"strips of {height} lines" if height > 1 else "single lines"
                self.assertRegex(self.fine("info", file), rf"  blocks +{block}\n")
                # A copy is told of as it lies itself.
                copy = self.folder / "copy.tif"
                self.fine("copy", file, copy, "--overwrite", "--tile", "256", "--compress", "deflate", "-q")
                self.assertEqual([json.loads(self.fine("info", "--json", copy))[name] for name in ("blockSize", "compression")],
                                 [[256, 256], "DEFLATE"])
                for path in self.folder.iterdir():
                    path.unlink()

    def test_goes_on_after_a_bad_file(self):
        code, out, err = run("info", "--json", str(DATA / "rgb1.tif"), "nowhere", str(DATA / "rgb2.tif"))
        self.assertEqual((code, len(json.loads(out)), err.count("\n")), (1, 2, 1))


class Formats(FolderTest):
    def test_are_tried(self):
        formats = {entry["format"]: entry for entry in json.loads(self.fine("formats", "--json"))}
        self.assertEqual(len(formats), 30)
        for key in ("VRT", "netCDF", "Zarr"):
            self.assertEqual([formats[key][what] for what in ("loads", "reads", "writes")], [True, True, False], key)
        for key in ("ORVA", "TIFF"):
            self.assertTrue(all(formats[key][what] for what in ("loads", "reads", "writes")), key)
        self.assertFalse(formats["GDBRaster"]["loads"])
        self.assertTrue(formats["GDBRaster"]["fault"])
        self.assertEqual(formats["Shapefile"]["kind"], "vector")
        self.assertEqual(len(self.fine("formats").splitlines()), 31)


@needs_data
class TransformFile(FolderTest):
    def numbers(self, *arguments, points):
        lines = "".join(" ".join(map(repr, point)) + "\n" for point in points)
        return [list(map(float, line.split())) for line in self.fine("transform", *arguments, stdin=lines).splitlines()]

    @needs_gdal
    def test_agrees_with_gdaltransform(self):
        points = [(0.0, 0.0), (10.5, 20.25), (348.0, -3.5), (-7.0, 400.0)]
        # The model turns by an angle in single precision.
        lines = "".join(f"{x} {y}\n" for x, y in points)
        for name in ("landsat7_olinda.tif", "rotated.tif"):
            peer = subprocess.run(["gdaltransform", "-output_xy", DATA / name], input=lines,
                                  capture_output=True, text=True, check=True).stdout
            theirs = [list(map(float, line.split())) for line in peer.splitlines()]
            ours = self.numbers(DATA / name, points=points)
            for a, b in zip(ours, theirs, strict=True):
                self.assertLess(math.dist(a, b), 1e-6, name)
            if name != "rotated.tif":
                for point, back in zip(points, self.numbers(DATA / name, "--inverse", points=ours), strict=True):
                    self.assertLess(math.dist(point, back), 1e-6, name)

    def test_there_is_no_way_back_from_a_rotated_grid_of_oblong_pixels(self):
        code, out, err = run("transform", str(DATA / "rotated.tif"), "--inverse", stdin="100 200\n")
        self.assertEqual((code, out), (1, ""))
        self.assertIn("pixels are not square", err)

    @needs_gdal
    def test_carries_through_a_camera_with_heights(self):
        text = (DATA / "README.md").read_text()
        facts = re.findall(r"^- \(([\d.]+), ([\d.]+), (\d+)\) -> ([\d.]+), ([\d.]+)$", text, re.MULTILINE)
        self.assertEqual(len(facts), 4)
        pixels = [tuple(map(float, fact[:3])) for fact in facts]
        places = [tuple(map(float, fact[3:])) + pixel[2:] for fact, pixel in zip(facts, pixels)]
        ours = self.numbers(DATA / "rpc_scene.tif", points=pixels)
        for got, fact, peer in zip(ours, places, self.gdal_camera(pixels), strict=True):
            self.assertLess(math.dist(got[:2], fact[:2]), 3e-6)  # made at GDAL's 0.1 pixel
            self.assertLess(math.dist(got[:2], peer[:2]), 1e-9)
            self.assertEqual(got[2], fact[2])
        back = self.numbers(DATA / "rpc_scene.tif", "--inverse", points=places)
        for got, peer in zip(back, self.gdal_camera(places, "-i"), strict=True):
            self.assertLess(math.dist(got[:2], peer[:2]), 1e-6)
        # Lines with and without a height may alternate.
        mixed = self.numbers(DATA / "rpc_scene.tif", points=[pixels[0], pixels[0][:2], pixels[1]])
        self.assertEqual((mixed[0], mixed[2]), (ours[0], ours[1]))
        self.assertEqual(len(mixed[1]), 2)

    def gdal_camera(self, points, *options):
        lines = "".join(" ".join(map(repr, point)) + "\n" for point in points)
        peer = subprocess.run(["gdaltransform", "-rpc", "-to", "RPC_PIXEL_ERROR_THRESHOLD=1e-7", *options,
                               DATA / "rpc_scene.tif"], input=lines, capture_output=True, text=True, check=True)
        return [list(map(float, line.split())) for line in peer.stdout.splitlines()]

    def test_says_what_does_not_go(self):
        self.fails(1, "has no geo-reference", "transform", DATA / "landsat7_rgb.png")
        self.fails(2, "--from", "transform", DATA / "rgb1.tif", "--from", "EPSG:4326")
        self.fails(2, "for a file", "transform", "--from", "EPSG:4326", "--to", "EPSG:4326", "--inverse")


class BadInput(PipeTest, FolderTest):
    """Each bad source fails every verb with one clear line, and a server goes on."""

    def sources(self):
        (self.folder / "empty.tif").touch()
        (self.folder / "junk.tif").write_bytes(bytes(range(256)) * 16)
        (self.folder / "folder.tif").mkdir()
        write_orva(self.folder / "absurd", 4000000000, 4000000000, 4000000000, b"x")
        cases = [("empty.tif", "empty"), ("junk.tif", "no known format"), ("folder.tif", "directory"),
                 ("missing.tif", "no such file"), ("absurd", "absurd.hdr")]
        if os.geteuid() != 0:
            shutil.copyfile(self.folder / "junk.tif", self.folder / "closed.tif")
            (self.folder / "closed.tif").chmod(0)
            cases.append(("closed.tif", "ermission"))
        if (DATA / "README.md").exists():
            whole = (DATA / "landsat7_u16_tiled.tif").read_bytes()
            (self.folder / "head.tif").write_bytes(whole[:100])
            cases.append(("head.tif", "head.tif"))
        return cases

    def test_is_one_line(self):
        self.serve()
        output = self.folder / "out"
        output.mkdir()
        for name, words in self.sources():
            for where in ([], ["--server", "test"]):
                file = self.folder / name
                for verb in (["info"], ["transform"], ["read", "-o", output / "o.npy"],
                             ["copy", output / "o.dat"], ["quicklook", output / "o.png"]):
                    with self.subTest(name=name, verb=verb[0], where=where):
                        arguments = [verb[0], file, *verb[1:], *where]
                        self.fails(1, words, *arguments)
                        self.assertEqual(list(output.iterdir()), [])
        good = write_orva(self.folder / "good", 2, 2, 1)
        self.assertEqual(json.loads(self.fine("info", "--json", "--server", "test", good))["samples"], 2)

    @needs_data
    def test_pixels_that_are_missing_give_no_output(self):
        whole = (DATA / "landsat7_u16_tiled.tif").read_bytes()
        (self.folder / "cut.tif").write_bytes(whole[:len(whole) // 2])
        output = self.folder / "out"
        output.mkdir()
        for verb in (["read", "-o", output / "o.npy"], ["copy", output / "o.dat"]):
            self.fails(1, "cut.tif", verb[0], self.folder / "cut.tif", *verb[1:])
            self.assertEqual(list(output.iterdir()), [])


if __name__ == "__main__":
    unittest.main()
