"""STAC items, world files, and what class rasters keep."""

import json
import math
import subprocess
import unittest

from creation_test import Creation, by_gdal, has_gdal_python
from support import DATA, needs_data, run

EXTENSIONS = "https://stac-extensions.github.io/"


def fields_of(prefix, fields):
    """An object whose fields of a prefix are these alone."""
    return {"type": "object", "properties": fields, "patternProperties": {f"^(?!{prefix}:)": {}}, "additionalProperties": False}


def named(extension):
    return {"contains": {"const": f"{EXTENSIONS}{extension}/v1.1.0/schema.json"}}


NUMBERS = {"type": "array", "items": {"type": "number"}}
POSITION = {**NUMBERS, "minItems": 2, "maxItems": 3}
PROJECTION = fields_of("proj", {
    "proj:epsg": {"type": ["integer", "null"]},
    "proj:shape": {"type": "array", "minItems": 2, "maxItems": 2, "items": {"type": "integer"}},
    "proj:transform": {**NUMBERS, "oneOf": [{"minItems": 6, "maxItems": 6}, {"minItems": 9, "maxItems": 9}]}})
CLASSIFICATION = fields_of("classification", {"classification:classes": {
    "type": "array", "uniqueItems": True, "minItems": 1, "items": {
        "type": "object", "required": ["value", "description"],
        "properties": {"value": {"type": "integer"}, "description": {"type": "string"}, "name": {"type": "string"},
                       "color_hint": {"type": "string", "pattern": "^([0-9A-Fa-f]{6})$"}}}}})
BAND = {
    "type": "object", "minProperties": 1,
    "properties": {
        "data_type": {"enum": ["int8", "int16", "int32", "int64", "uint8", "uint16", "uint32", "uint64", "float16",
                               "float32", "float64", "cint16", "cint32", "cfloat32", "cfloat64", "other"]},
        "name": {"type": "string"}, "unit": {"type": "string"},
        "nodata": {"oneOf": [{"type": "number"}, {"enum": ["nan", "inf", "-inf"]}]},
        "scale": {"type": "number"}, "offset": {"type": "number"}, "spatial_resolution": {"type": "number"}}}
ASSET = {
    "type": "object", "required": ["href"],
    "properties": {
        "href": {"type": "string", "minLength": 1}, "type": {"type": "string"},
        "roles": {"type": "array", "items": {"type": "string"}},
        "raster:bands": {"type": "array", "minItems": 1, "items": {"allOf": [BAND, CLASSIFICATION]}}}}
# The rules of STAC 1.0.0 and of version 1.1.0 of its three extensions, written from their texts.
ITEM = {
    "type": "object",
    "required": ["type", "stac_version", "stac_extensions", "id", "geometry", "properties", "links", "assets"],
    "properties": {
        "type": {"const": "Feature"},
        "stac_version": {"const": "1.0.0"},
        "stac_extensions": {"type": "array", "uniqueItems": True, "items": {"type": "string", "format": "iri"},
                            "allOf": [named("projection"), named("raster")]},
        "id": {"type": "string", "minLength": 1},
        "properties": {"allOf": [
            {"type": "object", "required": ["datetime"],
             "properties": {name: {"type": "string", "pattern": r"^\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d(\.\d+)?Z$"}
                            for name in ("datetime", "created")}},
            PROJECTION, fields_of("classification", {})]},
        "links": {"type": "array", "items": {"required": ["rel", "href"]}},
        "assets": {"type": "object", "minProperties": 1,
                   "additionalProperties": {"allOf": [ASSET, PROJECTION, CLASSIFICATION, fields_of("raster", {"raster:bands": {}})]}}},
    # An item with a place has a box, of one without there is none.
    "oneOf": [
        {"required": ["bbox"], "properties": {
            "bbox": {**NUMBERS, "oneOf": [{"minItems": 4, "maxItems": 4}, {"minItems": 6, "maxItems": 6}]},
            "geometry": {"type": "object", "required": ["type", "coordinates"], "properties": {
                "type": {"const": "Polygon"},
                "coordinates": {"type": "array", "items": {"type": "array", "minItems": 4, "items": POSITION}}}}}},
        {"not": {"required": ["bbox"]}, "properties": {"geometry": {"type": "null"}}}],
    # Who has classes names their extension.
    "if": {"properties": {"assets": {"additionalProperties": {"properties": {"raster:bands": {"items": {
        "not": {"required": ["classification:classes"]}}}}}}}},
    "then": {}, "else": {"properties": {"stac_extensions": named("classification")}},
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

    @needs_data
    def test_pixels_are_measured_in_metres(self):
        """On the ellipsoid, where a grid is in degrees; by the number of feet in a metre."""
        made = self.folder / "degrees.tif"
        self.fine("warp", DATA / "landsat7_olinda.tif", made, "--to", "EPSG:4326", "-q")
        _, degrees = self.item(made)
        size = by_gdal("d = gdal.Open(sys.argv[1])\nt = d.GetGeoTransform()\n"
                       "print(json.dumps([t[1], -t[5], t[3] + t[5] * d.RasterYSize / 2]))", made)
        a, e2, angle = 6378137.0, 0.00669437999014, math.radians(size[2])
        bent = 1 - e2 * math.sin(angle) ** 2
        want = (math.radians(size[0]) * math.cos(angle) * a / bent ** 0.5 + math.radians(size[1]) * a * (1 - e2) / bent ** 1.5) / 2
        feet = self.folder / "feet.tif"
        subprocess.run(["gdal_translate", "-q", "-a_srs", "EPSG:2263", "-a_ullr", "1000000", "200000", "1000600", "199400",
                        "-outsize", "20", "20", DATA / "RGB.byte.tif", feet], check=True)
        bare = self.folder / "bare.tif"
        subprocess.run(["gdal_translate", "-q", DATA / "landsat7_rgb.png", bare], check=True)
        for item, metres in ((degrees, want), (self.item(DATA / "landsat7_olinda.tif")[1], 28.5),
                             (self.item(feet)[1], 30 * 1200 / 3937), (self.item(bare)[1], None)):
            for band in item["assets"]["data"]["raster:bands"]:
                if metres is None:
                    self.assertNotIn("spatial_resolution", band)
                else:
                    self.assertAlmostEqual(band["spatial_resolution"], metres, delta=1e-6 * metres)

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
