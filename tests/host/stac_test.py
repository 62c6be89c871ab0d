"""STAC items, world files, and what class rasters keep."""

import json
import subprocess
import unittest

from creation_test import Creation, by_gdal, has_gdal_python
from support import DATA, needs_data, run

# The fields that STAC 1.0.0 and its extensions ask for in an item, written from their texts.
ITEM = {
    "type": "object",
    "required": ["type", "stac_version", "stac_extensions", "id", "geometry", "properties", "links", "assets"],
    "properties": {
        "type": {"const": "Feature"},
        "stac_version": {"const": "1.0.0"},
        "stac_extensions": {"type": "array", "uniqueItems": True, "items": {
            "pattern": "^https://stac-extensions.github.io/(projection|raster|classification)/v1.1.0/schema.json$"}},
        "id": {"type": "string", "minLength": 1},
        "bbox": {"type": "array", "minItems": 4, "maxItems": 4, "items": {"type": "number"}},
        "properties": {
            "type": "object", "required": ["datetime", "proj:epsg", "proj:shape"],
            "properties": {
                "datetime": {"pattern": r"^\d{4}-\d\d-\d\dT\d\d:\d\d:\d\dZ$"},
                "proj:epsg": {"type": ["integer", "null"]},
                "proj:shape": {"type": "array", "minItems": 2, "maxItems": 2, "items": {"type": "integer"}},
                "proj:transform": {"type": "array", "minItems": 6, "maxItems": 6, "items": {"type": "number"}}}},
        "links": {"type": "array"},
        "assets": {"type": "object", "minProperties": 1, "additionalProperties": {
            "type": "object", "required": ["href", "type", "roles", "raster:bands"],
            "properties": {"raster:bands": {"type": "array", "minItems": 1, "items": {
                "type": "object",
                "properties": {
                    "data_type": {"enum": ["int8", "int16", "int32", "int64", "uint8", "uint16", "uint32", "uint64",
                                           "float32", "float64", "cfloat32", "cfloat64"]},
                    "nodata": {"oneOf": [{"type": "number"}, {"enum": ["nan", "inf", "-inf"]}]},
                    "scale": {"type": "number"}, "offset": {"type": "number"}, "unit": {"type": "string"},
                    "classification:classes": {"type": "array", "minItems": 1, "items": {
                        "required": ["value", "description"],
                        "properties": {"value": {"type": "integer"}, "description": {"type": "string"},
                                       "color_hint": {"pattern": "^[0-9A-F]{6}$"}}}}}}}}}}},
}

CLASSES = """
d = gdal.GetDriverByName('GTiff').Create(sys.argv[1], 40, 30, 1, gdal.GDT_Byte)
band = d.GetRasterBand(1)
colors = gdal.ColorTable()
for i, c in enumerate([(0, 0, 0), (0, 0, 255), (34, 139, 34)]):
    colors.SetColorEntry(i, c + (255,))
band.SetRasterColorTable(colors)
band.WriteArray((np.arange(1200) % 3).astype(np.uint8).reshape(30, 40))
band.SetCategoryNames(['none', 'open water', 'wood'])
band.SetDescription('cover')
table = gdal.RasterAttributeTable()
table.CreateColumn('Value', gdal.GFT_Integer, gdal.GFU_MinMax)
table.CreateColumn('Owner', gdal.GFT_String, gdal.GFU_Generic)
for i, name in enumerate(['nobody', 'the state', 'a farmer']):
    table.SetValueAsInt(i, 0, i)
    table.SetValueAsString(i, 1, name)
band.SetDefaultRAT(table)
d = None
print(json.dumps(1))
"""

LOOK = """
d = gdal.Open(sys.argv[1])
band = d.GetRasterBand(1)
table, colors = band.GetDefaultRAT(), band.GetRasterColorTable()
print(json.dumps({
    'names': band.GetCategoryNames(), 'description': band.GetDescription(), 'unit': band.GetUnitType(),
    'scale': band.GetScale(), 'offset': band.GetOffset(),
    'colors': [colors.GetColorEntry(i) for i in range(3)] if colors else None,
    'columns': [table.GetNameOfCol(i) for i in range(table.GetColumnCount())] if table else None,
    'rows': [[table.GetValueAsString(r, c) for c in range(table.GetColumnCount())]
             for r in range(table.GetRowCount())] if table else None}))
"""


@unittest.skipUnless(has_gdal_python(), "no GDAL for Python")
class Stac(Creation):
    def item(self, source, *options, name="made.tif"):
        made = self.made(source, "--stac", *options, name=name)
        item = json.loads(made.with_suffix(".stac.json").read_text())
        code = "import jsonschema\njsonschema.Draft7Validator.check_schema(json.loads(sys.argv[2]))\n" \
               "jsonschema.validate(json.load(open(sys.argv[1])), json.loads(sys.argv[2]))\nprint(1)"
        by_gdal(code, made.with_suffix(".stac.json"), json.dumps(ITEM))
        self.assertEqual(item["assets"]["data"]["href"], "./" + name)
        return made, item

    @needs_data
    def test_items_tell_where_and_what(self):
        for name, epsg, kind in (("landsat7_olinda.tif", 31985, "uint8"), ("float_nan.tif", None, "float32"),
                                 ("rpc_scene.tif", None, None), ("complex64.tif", None, "cfloat32"),
                                 ("RGB.byte.tif", 32618, "uint8")):
            with self.subTest(name=name):
                made, item = self.item(DATA / name)
                properties, bands = item["properties"], item["assets"]["data"]["raster:bands"]
                if epsg is not None:
                    self.assertEqual(properties["proj:epsg"], epsg)
                if kind is not None:
                    self.assertEqual({band["data_type"] for band in bands}, {kind})
                size = by_gdal("d = gdal.Open(sys.argv[1])\nt = d.GetGeoTransform()\n"
                               "print(json.dumps([d.RasterYSize, d.RasterXSize, t[1], t[2], t[0], t[4], t[5], t[3]]))",
                               made)
                self.assertEqual(properties["proj:shape"], size[:2])
                if epsg is None:
                    continue
                for found, want in zip(properties["proj:transform"], size[2:]):
                    self.assertAlmostEqual(found, want, delta=1e-9 * max(1, abs(want)))
                self.check_footprint(made, item)

    def check_footprint(self, made, item):
        """The corners as PROJ puts them, by GDAL's own program."""
        ring = item["geometry"]["coordinates"][0]
        self.assertEqual(ring[0], ring[-1])
        shape = item["properties"]["proj:shape"]
        points = f"0 0\n0 {shape[0]}\n{shape[1]} {shape[0]}\n{shape[1]} 0\n"
        out = subprocess.run(["gdaltransform", "-t_srs", "EPSG:4326", "-output_xy", made], input=points, check=True,
                             capture_output=True, text=True).stdout
        corners = [tuple(map(float, line.split()[:2])) for line in out.splitlines()]
        for i, corner in enumerate(corners):
            self.assertAlmostEqual(ring[8 * i][0], corner[0], delta=1e-5)
            self.assertAlmostEqual(ring[8 * i][1], corner[1], delta=1e-5)
        west, south, east, north = item["bbox"]
        for x, y in ring:
            self.assertTrue(west <= x <= east and south <= y <= north)

    def test_classes_have_names_and_colours(self):
        source = self.folder / "classes.tif"
        by_gdal(CLASSES, source)
        _, item = self.item(source, "--cog")
        self.assertIn("cloud-optimized", item["assets"]["data"]["type"])
        self.assertEqual(item["assets"]["data"]["raster:bands"][0]["classification:classes"], [
            {"value": 0, "description": "none", "color_hint": "000000"},
            {"value": 1, "description": "open water", "color_hint": "0000FF"},
            {"value": 2, "description": "wood", "color_hint": "228B22"}])
        # A value without a name leaves those behind it theirs.
        by_gdal(CLASSES.replace("'none'", "''"), self.folder / "part.tif")
        _, item = self.item(self.folder / "part.tif", name="named.tif")
        classes = item["assets"]["data"]["raster:bands"][0]["classification:classes"]
        self.assertEqual([(row["value"], row["description"]) for row in classes], [(1, "open water"), (2, "wood")])

    @needs_data
    def test_an_item_that_is_there_stays(self):
        item = self.folder / "made.stac.json"
        item.write_text("mine")
        code, _, err = run("copy", DATA / "dem_int16.tif", self.folder / "made.tif", "--stac")
        self.assertNotEqual(code, 0)
        self.assertIn("made.stac.json", err)
        self.assertEqual(item.read_text(), "mine")
        self.assertFalse((self.folder / "made.tif").exists())


@unittest.skipUnless(has_gdal_python(), "no GDAL for Python")
class Kept(Creation):
    def test_class_rasters_keep_names_colours_and_tables(self):
        source = self.folder / "classes.tif"
        by_gdal(CLASSES, source)
        want = by_gdal(LOOK, source)
        self.assertEqual(want["rows"][1], ["1", "the state"])
        for name, options in (("o.tif", ()), ("o.tif", ("--cog",)), ("o.tif", ("--compress", "none")), ("o.png", ())):
            with self.subTest(name=name, options=options):
                found = by_gdal(LOOK, self.made(source, *options, name=name))
                for key in ("names", "colors", "rows"):
                    self.assertEqual(found[key], want[key], key)

    def test_units_scales_and_names_of_bands_are_in_the_file(self):
        source = self.folder / "scaled.tif"
        by_gdal("d = gdal.GetDriverByName('GTiff').Create(sys.argv[1], 30, 20, 2, gdal.GDT_Int16)\n"
                "for i in (1, 2):\n  b = d.GetRasterBand(i)\n  b.SetDescription('band %d' % i)\n"
                "  b.SetUnitType('K')\n  b.SetScale(0.5 * i)\n  b.SetOffset(-i)\nd = None\nprint(1)", source)
        want = by_gdal(LOOK, source)
        for options in ((), ("--cog",), ("--tile", "strip")):
            with self.subTest(options=options):
                made = self.made(source, *options)
                self.assertEqual(by_gdal(LOOK, made), want)
                made.with_name(made.name + ".aux.xml").unlink(missing_ok=True)
                self.assertEqual(by_gdal(LOOK, made)["scale"], 0.5)
                self.assertIn(b'role="unittype"', made.read_bytes())  # tag 42112

    @needs_data
    def test_world_files(self):
        for name, ending in (("made.tif", ".tfw"), ("made.png", ".pgw")):
            with self.subTest(name=name):
                made = self.made(DATA / "RGB.byte.tif", "--world-file", name=name)
                lines = [float(line) for line in made.with_suffix(ending).read_text().split()]
                a, d, b, e, x, y = lines
                t = by_gdal("print(json.dumps(gdal.Open(sys.argv[1]).GetGeoTransform()))", DATA / "RGB.byte.tif")
                found = [x - a / 2 - b / 2, a, b, y - d / 2 - e / 2, d, e]
                for i in range(6):
                    self.assertAlmostEqual(found[i], t[i], delta=1e-6)
        self.assertIn("takes no world file", self.refused("copy", DATA / "RGB.byte.tif", self.folder / "o.dat",
                                                          "--world-file"))
        self.assertIn("no grid", self.refused("copy", DATA / "rpc_scene.tif", self.folder / "o.tif", "--world-file"))


if __name__ == "__main__":
    unittest.main()
