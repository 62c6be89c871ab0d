"""Colours, names and tables of classes, units and scales of bands: through every verb, into every format."""

import json
import unittest

from creation_test import Creation, by_gdal, has_gdal_python
from stac_test import CLASSES, LOOK
from support import run

PLACE = """
from osgeo import osr
d = gdal.Open(sys.argv[1], gdal.GA_Update)
system = osr.SpatialReference()
system.ImportFromEPSG(32633)
d.SetProjection(system.ExportToWkt())
d.SetGeoTransform([300000, 30, 0, 4600000, 0, -30])
d = None
print(1)
"""

SCALED = """
d = gdal.GetDriverByName('GTiff').Create(sys.argv[1], 40, 30, 2, gdal.GDT_Int16)
for i in (1, 2):
    b = d.GetRasterBand(i)
    b.SetDescription('heat of the ground' if i == 1 else 'its error')
    b.SetUnitType('K')
    b.SetScale(0.5 * i)
    b.SetOffset(-i)
    b.WriteArray(np.arange(1200).reshape(30, 40).astype(np.int16) + i)
d = None
print(1)
"""

VERBS = {"copy": lambda source, made: ["copy", source, made],
         "clip": lambda source, made: ["copy", source, made, "--rect", "2,3,30,20"],
         "warp": lambda source, made: ["warp", source, made, "--to", "EPSG:32634"],
         "stack": lambda source, made: ["stack", made, source],
         "mosaic": lambda source, made: ["mosaic", "build", made, source, "--no-matching"]}
FORMATS = {"tiles": ("made.tif", []), "plain": ("made.tif", ["--compress", "none"]), "cog": ("made.tif", ["--cog"]),
           "imagine": ("made.img", [])}
# LOOK at several files by one run.
LOOK_AT_ALL = """
import contextlib, io
found = []
for path in sys.argv[2:]:
    sys.argv[1] = path
    with contextlib.redirect_stdout(io.StringIO()) as said:
        exec(LOOK)
    found.append(json.loads(said.getvalue()))
print(json.dumps(found))
"""
# By format and kind, the one line of a run that loses something.
LOST = {("imagine", "classes"): "the format Erdas does not keep the attribute tables of bands"}


@unittest.skipUnless(has_gdal_python(), "no GDAL for Python")
class Kept(Creation):
    def test_every_verb_keeps_what_bands_say(self):
        for kind, code in {"classes": CLASSES, "scaled": SCALED}.items():
            source = self.folder / f"{kind}.tif"
            by_gdal(code, source)
            by_gdal(PLACE, source)
            cases = []
            for verb, arguments in VERBS.items():
                for form, (name, options) in FORMATS.items():
                    made = self.folder / f"{kind}-{verb}-{form}-{name}"
                    code, _, err = run(*map(str, arguments(source, made)), *options, "-q")
                    lost = LOST.get((form, kind))
                    self.assertEqual((code, err), (0, f"vexg: {made}: note: {lost}\n" if lost else ""), (kind, verb, form))
                    cases.append((made, form, lost))
            want, *found = by_gdal(f"LOOK = {LOOK!r}\n" + LOOK_AT_ALL, "", source, *(made for made, _, _ in cases))
            for (made, form, lost), of in zip(cases, found, strict=True):
                with self.subTest(made.name):
                    for key, value in want.items():
                        if not (lost and key in ("rows", "columns")) and not (form == "imagine" and value is None):
                            self.assertEqual(of[key], value, key)

    def test_means_of_classes_have_no_colours(self):
        source = self.folder / "classes.tif"
        by_gdal(CLASSES, source)
        by_gdal(PLACE, source)
        made = self.folder / "made.tif"
        self.fine("warp", source, made, "--to", "EPSG:32634", "--resampling", "bilinear", "-q")
        self.assertIsNone(by_gdal(LOOK, made)["colors"])

    def test_levels_of_classes_hold_classes(self):
        source = self.folder / "classes.tif"
        by_gdal(CLASSES.replace("40, 30", "1040, 900").replace("1200", "936000").replace("30, 40", "900, 1040"), source)
        by_gdal(PLACE, source)
        made = self.folder / "made.tif"
        for verb in ("copy", "warp", "stack"):
            self.fine(*VERBS[verb](source, made), "--cog", "--tile", "256", "--overwrite", "-q")
            wrong = by_gdal("d = gdal.Open(sys.argv[1])\nb = d.GetRasterBand(1)\na = b.ReadAsArray()\nl = b.GetOverview(0).ReadAsArray()\n"
                            "print(json.dumps(int((l != a[::2, ::2]).sum())))", made)
            self.assertEqual(wrong, 0, verb)
        self.assertEqual(json.loads(self.fine("info", made, "--json"))["hasPalette"], [True])


if __name__ == "__main__":
    unittest.main()
