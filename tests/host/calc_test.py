"""Expressions on bands, beside plain arithmetic in Python."""

import json
import math
import struct
import subprocess
import unittest

from support import DATA, FolderTest, gdal_pixels, needs_data, needs_gdal, run

SCENE = DATA / "landsat7_olinda.tif"
WIDTH, HEIGHT, SIDE = 349, 352, 40

NAMES = {name: getattr(math, name) for name in ("acos", "asin", "atan", "atan2", "ceil", "cos", "exp", "floor", "log",
                                                "log10", "log2", "pow", "sin", "sqrt", "tan")}
NAMES.update(abs=abs, min=min, max=max, where=lambda condition, then, other: then if condition else other)

# Read alike by Python, but for ^, && and ||.
EXPRESSIONS = [
    "(b3-b2)/(b3+b2)",
    "b0 + b1*b2 - b3/7 - -b4",
    "-b0^2 + 2^(b1/100)^1.5",
    "where(b3 > b2 && b0 >= 60 || b4 == 30, sqrt(b3) * 2, min(b0, b1, b2) - max(b3, b4))",
    "(b0 < b1) + 2 * (b1 <= b2) + 4 * (b2 != b3)",
    "atan2(b0 - 60, b1 - 60) + sin(b2) * cos(b3) + tan(b4/200)",
    "asin(b0/256) + acos(b1/256) + atan(b2)",
    "floor(b0/7) + ceil(b1/7) + exp(-b2/50) + log(b3+1) + log2(b0+1) + log10(b1+1) + pow(b4+1, 0.25)",
    "1/(b1-b2)",  # not everywhere
    "log(b3 - 60)",
    "abs(b0-b1)/3e-2*.5",
]


def in_python(text):
    for ours, theirs in (("^", "**"), ("&&", " and "), ("||", " or ")):
        text = text.replace(ours, theirs)
    return compile(text, text, "eval")


@needs_data
@needs_gdal
class Calc(FolderTest):
    def bands(self, *options):
        """The pixels of the scene, each a tuple of its bands."""
        data = gdal_pixels(SCENE, *options)
        return list(struct.iter_unpack("6B", data))

    def made(self, expression, *options, source=SCENE, name="made.tif"):
        file = self.folder / name
        self.fine("calc", file, expression, source, "--overwrite", "-q", *options)
        return file

    def test_results_are_those_of_plain_arithmetic(self):
        part = ("-srcwin", "100", "80", str(SIDE), str(SIDE))
        made = self.made(";".join(EXPRESSIONS), "--rect", f"100,80,{99 + SIDE},{79 + SIDE}", "--type", "Double")
        got = struct.iter_unpack(f"{len(EXPRESSIONS)}d", gdal_pixels(made))
        code = [in_python(text) for text in EXPRESSIONS]
        invalid = 0
        for pixel, results in zip(self.bands(*part), got, strict=True):
            variables = {f"b{band}": float(value) for band, value in enumerate(pixel)}
            for text, program, result in zip(EXPRESSIONS, code, results):
                try:
                    wanted = float(eval(program, {**NAMES, **variables}))
                except (ZeroDivisionError, ValueError):
                    wanted = math.nan
                if math.isnan(wanted):
                    invalid += 1
                    self.assertTrue(math.isnan(result), (text, pixel, result))
                else:
                    self.assertTrue(math.isclose(result, wanted, rel_tol=1e-14, abs_tol=1e-14),
                                    (text, pixel, result, wanted))
        self.assertGreater(invalid, 10)

    def test_indices_take_bands_by_their_roles(self):
        roles = ("--blue", "0", "--green", "b1", "--red", "2", "--nir", "a_b3", "--a", str(SCENE))
        made = self.made("NDVI=ndvi; ndwi; S=savi; EVI=evi", *roles)
        got = struct.iter_unpack("4f", gdal_pixels(made))
        for (blue, green, red, nir, *_), results in zip(self.bands(), got, strict=True):
            def over(upper, lower):
                return struct.unpack("f", struct.pack("f", upper / lower))[0] if lower else math.nan
            wanted = (over(nir - red, nir + red), over(green - nir, green + nir),
                      over(1.5 * (nir - red), nir + red + 0.5), over(2.5 * (nir - red), nir + 6 * red - 7.5 * blue + 1))
            for ours, theirs in zip(results, wanted):
                self.assertTrue(ours == theirs or math.isnan(ours) and math.isnan(theirs), (results, wanted))
        info = subprocess.run(["gdalinfo", made], capture_output=True, text=True, check=True).stdout
        for name in ("NDVI", "S", "EVI"):
            self.assertIn(f"Description = {name}\n", info)
        self.assertEqual(info.count("Description ="), 3)
        self.assertIn("Origin = (288776.25", info)

    def test_integers_are_rounded_and_nothing_wraps(self):
        made = self.made("b0 * 2.5 - 100", "--type", "Byte")
        values = gdal_pixels(made)
        no_data = fits = 0
        for (first, *_), value in zip(self.bands(), values, strict=True):
            exact = first * 2.5 - 100
            rounded = math.floor(exact + 0.5) if exact >= 0 else math.ceil(exact - 0.5)
            if 0 <= rounded <= 255:
                self.assertEqual(value, rounded)
                fits += 1
            else:
                no_data += 1
        self.assertGreater(min(no_data, fits), 100)
        counted = json.loads(self.fine("stats", made, "--json"))["bands"][0]["count"]
        self.assertEqual(counted, fits)

    def test_what_is_not_valid_stays_so_in_all_rasters(self):
        """No-data values, regions and rectangles hold for each raster."""
        box = "120,90,199,169"
        made = self.made("b0 + a_b3", "--a", str(SCENE), "--no-data", "60,61", "--rect", box)
        whole = self.bands("-srcwin", "120", "90", "80", "80")
        for (first, _, _, fourth, *_), (result,) in zip(whole, struct.iter_unpack("f", gdal_pixels(made)), strict=True):
            if first in (60, 61) or fourth in (60, 61):
                self.assertTrue(math.isnan(result))
            else:
                self.assertEqual(result, first + fourth)

    def test_rasters_that_lie_elsewhere_are_named(self):
        moved = self.folder / "moved.tif"
        subprocess.run(["gdal_translate", "-q", "-a_ullr", "288876.25", "9120760.75", "298822.75", "9110728.75", SCENE,
                        moved], check=True)
        code, _, err = run("calc", self.folder / "o.tif", "b0 - a_b0 + b_b0", SCENE, "--a", moved, "--b", SCENE, "-q")
        self.assertEqual(code, 0, err)
        self.assertRegex(err, r"\Avexg: warning: [^\n]*moved.tif: not where [^\n]*landsat7_olinda.tif lies;[^\n]*\n\Z")

    def test_bad_expressions_make_nothing(self):
        small = self.folder / "small.tif"
        self.fine("copy", SCENE, small, "--rect", "0,0,9,9", "-q")
        file = self.folder / "none.tif"
        for words, *options in (
                ('"(b3-b9)/2", position 5, "b9": there is no such band; there are b0 to b5', "(b3-b9)/2"),
                ('position 7, the end: ")" is missing here', "(b3-b2"),
                ('position 4, "0": division by 0', "b3/0"),
                ("no band has the role nir", "ndvi"),
                ("an expression takes rasters of one size", "b0-a_b0", "--a", str(small)),
                ("none of", "b0", "--type", "UInt64"),
                ("there is no band \"b6\"", "ndvi", "--red", "6", "--nir", "3"),
                ("--mask-band goes with one raster", "b0", "--a", str(SCENE), "--mask-band", "0", "--mask-values", "0"),
                ("no such file", "b0", "--a", str(self.folder / "nothing.tif"))):
            code = 2 if "--mask-band" in options or "--type" in options else 1
            self.fails(code, words, "calc", file, options[0], SCENE, *options[1:], "-q")
            self.assertFalse(file.exists())


if __name__ == "__main__":
    unittest.main()
