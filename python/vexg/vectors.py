"""Polygons of rasters, and tables of shapes."""

import os
import pathlib
import struct

import numpy

from . import _tables
from ._doors import job_node, local
from ._jobs import Draft, Node, files_of, named_inputs
from ._saving import Staged
from ._watch import watch
from ._workspace import Workspace
from .errors import Error

_RULES = {"Pixels": "Center", "ScanRules": "Steady", "Coordinates": "Map"}


class Polygons:
    """The areas of equal value of a raster as polygons, found at their first use.

    Attributes:
        crs: the coordinate system of the coordinates; None where they are pixels.
    """

    def __init__(self, raster, band, min_size, field="label", names=()):
        self._raster = raster
        self._inputs = {"Band": int(band), "MinSize": min_size, "Field": field}
        self._names = names
        self._found = None
        self._progress = False
        self.crs = raster.crs

    def _find(self):
        """The labels of all polygons, and what wkb_of takes."""
        if self._found is None:
            workspace = Workspace()
            file = workspace.path("areas.fxv")
            self._raster._job("PolygonizeCommand", {"Vectors": file, **self._inputs},
                              progress=self._progress, label="polygons")
            self._found = read_fxv(file)
        return self._found

    def __len__(self):
        return len(self._find()[0])

    @property
    def labels(self):
        """The value of each polygon."""
        return self._find()[0]

    @property
    def wkb(self):
        """The polygons as WKB, in the order of their labels, each a bytes object."""
        data, offsets = self.wkb_column()
        ends = offsets.tolist()
        return [data[start:end] for start, end in zip(ends, ends[1:])]

    def wkb_column(self):
        """The polygons as WKB in one piece, as columns of Arrow have them: the bytes, and an array of one
        offset more than there are polygons, between which each lies."""
        _, *rings = self._find()
        return wkb_of(*rings, self._raster._grid())

    @property
    def __geo_interface__(self):
        """All polygons as a GeoJSON feature collection, in the raster's coordinate system."""
        field = self._inputs["Field"]
        features = [{"type": "Feature", "properties": {field: int(label)},
                     "geometry": _tables.coordinates_of(shape)} for label, shape in zip(self.labels, self.wkb)]
        return {"type": "FeatureCollection", "features": features}

    def to_table(self):
        """A GeoDataFrame where geopandas is installed; else a DataFrame with a column of WKB, or a list of
        dictionaries."""
        columns = {self._inputs["Field"]: self.labels}
        if self._names:
            columns["name"] = [self._names[label] if label < len(self._names) else "" for label in self.labels]
        return _tables.geo_table(columns, self.wkb, self.crs)

    def to_file(self, file, *, overwrite=False, progress=False):
        """Writes them to a vector file, in the format of the name's ending: .gpkg, .fgb, .shp, .fxv."""
        staged = Staged(file, overwrite, files_of(self._raster._chain()))

        def make(task):
            with staged:
                draft = Draft()
                draft.step("make", "PolygonizeCommand", {
                    "URI": job_node(self._raster._chain()), "Vectors": str(staged.work),
                    "Layer": staged.target.stem, **self._inputs})
                self._raster._door.run(draft, task)
                staged.commit(task)

        watch(make, progress, "polygons")
        return os.fspath(staged.target)

    def __repr__(self):
        return f"<vexg.Polygons of {self._raster!r}>"


def polygonize(raster, *, band=0, min_size=None, progress=False):
    """The areas of equal value of a raster; see Raster.polygons."""
    raster._bands_of(band, raster.count)
    found = Polygons(raster, band, min_size)
    if progress:
        found._progress = progress
        found._find()
    return found


def read_fxv(file):
    """The polygons of an FXV file (docs/file-formats.md): their labels, how many rings each has, how many
    vertices each ring has, the outer one of a polygon first, and the x and y of all vertices, in pixels."""
    data = pathlib.Path(file).read_bytes()
    if data[:5] != b"FXV50":
        raise Error(f"{file}: is no file of polygons")
    order = ">" if data[5] else "<"
    head, view, at = struct.Struct(order + "3i").unpack_from, memoryview(data), 1024
    (count,) = struct.unpack_from(order + "i", data, 10)
    labels, rings, sizes, pieces = [], [], [], []
    for _ in range(count):
        label, ring_count, numbers = head(data, at)
        labels.append(label)
        rings.append(ring_count)
        at += 12 + ring_count
        if ring_count == 1:
            sizes.append(numbers >> 1)
        else:
            starts = struct.unpack_from(f"{order}{ring_count}i", data, at)
            sizes.extend(end - start for start, end in zip(starts, (*starts[1:], numbers >> 1)))
        at += 4 * ring_count
        pieces.append(view[at:at + 4 * numbers])
        at += 4 * numbers
    points = numpy.frombuffer(b"".join(pieces), order + "i4").reshape(-1, 2)
    return numpy.array(labels, dtype="int64"), numpy.array(rings, dtype="int64"), numpy.array(sizes, dtype="int64"), points


def wkb_of(rings, sizes, points, grid):
    """Polygons as WKB in one piece (OGC 06-103r4, clause 8), and the offsets of each and of the end.

    Args:
        rings: how many each polygon has.
        sizes: how many vertices each ring has.
        points: x and y of all vertices in pixels.
        grid: the six numbers of a grid; None to keep pixels.
    """
    if len(rings) == 0:
        return b"", numpy.zeros(1, dtype="int64")
    x0, xx, xy, y0, yx, yy = grid if grid is not None else (0, 1, 0, 0, 0, 1)
    points = points.astype(float)
    x, y = points[:, 0].copy(), points[:, 1]
    points[:, 1] = y0 + yx * x + yy * y if yx else y0 + yy * y
    points[:, 0] = x0 + xx * x + xy * y if xy else x0 + xx * x
    # A ring begins with its size, the first of a polygon behind the polygon's head of nine bytes.
    first = numpy.cumsum(rings) - rings
    heads = numpy.zeros(len(sizes), dtype=[("order", "u1"), ("kind", "<u4"), ("rings", "<u4"), ("size", "<u4")])
    heads["order"], heads["kind"], heads["size"] = 1, 3, sizes
    heads["rings"][first] = rings
    is_first = numpy.zeros(len(sizes), dtype=bool)
    is_first[first] = True
    coordinates = memoryview(points.astype("<f8", copy=False).tobytes())
    head_bytes, pieces, at = heads.tobytes(), [], 0
    for ring, (begins, size) in enumerate(zip(is_first.tolist(), (16 * sizes).tolist())):
        pieces.append(head_bytes[13 * ring + (0 if begins else 9):13 * ring + 13])
        pieces.append(coordinates[at:at + size])
        at += size
    lengths = 16 * sizes + numpy.where(is_first, 13, 4)
    offsets = numpy.concatenate([[0], numpy.cumsum(lengths)])
    return b"".join(pieces), offsets[numpy.append(first, len(sizes))]


def _options(command, options):
    """Options by Python names, with the rules that the verbs have."""
    return {**_RULES, **named_inputs(command, options)}


def _vector_file(shapes, workspace):
    """The path of a vector file; a table of geopandas is written to one."""
    if hasattr(shapes, "to_file"):
        file = workspace.path("shapes.gpkg")
        shapes.to_file(file)
        return file
    return os.path.abspath(os.fspath(shapes))


def zonal(raster, shapes, stats, layer, where, bands, weights, progress, options):
    """Figures of the pixels inside shapes; see Raster.zonal."""
    workspace = Workspace()
    table = workspace.path("zones.csv")
    raster._job("ZonalStatisticsCommand", {
        "Vectors": _vector_file(shapes, workspace), "Table": table, "Figures": list(stats),
        "Layer": None if layer is None else str(layer), "Where": where,
        "Bands": None if bands is None else raster._bands_of(bands, raster.count)[0],
        "Weights": None if weights is None else weights.capitalize(),
        **_options("ZonalStatisticsCommand", options)}, progress=progress, label="zones")
    return _tables.read_csv(table)


def rasterize(shapes, like, *, value=None, field=None, background=None, nodata=None, dtype=None, layer=None,
              where=None, **options):
    """Shows the shapes of a vector file as a raster on the grid of another one.

    Args:
        like: the raster whose grid it has.
        value: of all shapes; 1 by default.
        field: the field of numbers that are the values, in place of `value`.
        background: of the pixels outside; 0 by default.
        nodata: in place of `background`: the no-data value of the pixels outside.
        dtype: the smallest that holds all values by default.
        options: inputs of RasterizeCommand by Python names, such as pixels="touched".
    """
    from . import _values
    from .raster import Raster

    workspace = Workspace()
    inputs = {"Vectors": _vector_file(shapes, workspace), "Value": value, "Field": field,
              "Background": background, "NoData": nodata, "Layer": None if layer is None else str(layer),
              "Where": where, "DataType": None if dtype is None else _values.type_word(dtype),
              **_options("RasterizeCommand", options)}
    texts = tuple((name, _values.text_of(each)) for name, each in inputs.items() if each is not None)
    node = Node("RasterizeCommand", (("LikeURI", like._chain()), *texts))
    node.keep = workspace
    return Raster(node, like._door)


def query(file, *, layer=None, door=local):
    """What a layer of a vector file is, as a dictionary: name, geometry, records, fields and so on."""
    draft = Draft()
    draft.step("query", "QueryVectorsCommand", {"Vectors": os.path.abspath(os.fspath(file)), "Layer": layer})
    return door.run(draft).values("query")


def class_field(file, field, door):
    """The field of classes of samples: the one given, else "class" or the one field of texts."""
    if field is not None:
        return field
    told = query(file, door=door)
    names = told.get("Fields", [])
    for name in names:
        if name.lower() == "class":
            return name
    texts = [name for name, kind in zip(names, told.get("FieldTypes", [])) if kind == "Text"]
    if len(texts) == 1:
        return texts[0]
    raise Error(f"{file}: which field has the classes? Give field, one of {', '.join(names) or 'none'}")
