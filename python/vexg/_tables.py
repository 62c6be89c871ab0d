"""Tables: pandas where it is installed, else plain lists."""

import csv
import struct

import numpy

from .errors import Error


def _pandas():
    try:
        import pandas
    except ImportError:
        return None
    return pandas


def table(columns, index):
    """A DataFrame of columns, or a list of dictionaries, one for each row.

    Args:
        index: the name of the row numbers; None for none.
    """
    pandas = _pandas()
    if pandas is not None:
        frame = pandas.DataFrame({name: list(values) for name, values in columns.items()})
        if index is not None:
            frame.index.name = index
        return frame
    names = list(columns)
    rows = [dict(zip(names, values)) for values in zip(*columns.values())]
    if index is not None:
        rows = [{index: i, **row} for i, row in enumerate(rows)]
    return rows


def read_csv(file, index=None):
    """The table in a CSV file, indexed by a column."""
    pandas = _pandas()
    if pandas is not None:
        return pandas.read_csv(file, index_col=index)
    with open(file, newline="", encoding="utf-8") as text:
        return [{name: _value(cell) for name, cell in row.items()} for row in csv.DictReader(text)]


def _value(text):
    for kind in (int, float):
        try:
            return kind(text)
        except ValueError:
            continue
    return text


def histograms_of(text, dtype):
    """The pairs of counts and edges in the text of an array of histograms.

    A histogram is: band, sign, size of a bin, how many there are, lower and upper bound, source and an
    array of counts.
    """
    is_byte = numpy.dtype(dtype).itemsize == 1
    found, at = [], text.index("[") + 1
    while True:
        while at < len(text) and text[at] == " ":
            at += 1
        if at >= len(text) or text[at] == "]":
            return found
        end = text.index("[", at)
        head = text[at:end].split(" ")
        close = text.index("]", end)
        # The bounds of 8 bits may be the characters of their values, a blank among them.
        fields = _fields(head, is_byte)
        size, low = float(fields[2]), fields[4]
        counts = numpy.array(text[end + 1:close].split(), dtype="int64")
        found.append((counts, low + size * numpy.arange(counts.size + 1)))
        at = close + 1


def _fields(head, is_byte):
    fields = [field for field in head if field]
    low = fields[4]
    if is_byte and len(low) == 1:
        value = float(ord(low)) if not low.isdigit() or len(low) == 1 else float(low)
    else:
        value = float(low)
    return [*fields[:4], value]


def coordinates_of(wkb):
    """The type and the coordinates of a WKB shape, as GeoJSON has them."""
    shape, _ = _read_shape(wkb, 0)
    return shape


_KINDS = {1: "Point", 2: "LineString", 3: "Polygon", 4: "MultiPoint", 5: "MultiLineString", 6: "MultiPolygon"}


def _read_shape(wkb, at):
    order = "<" if wkb[at] else ">"
    (code,) = struct.unpack_from(order + "I", wkb, at + 1)
    kind, width, at = code % 1000, 3 if code // 1000 in (1, 2) else 2, at + 5

    def points(count, at):
        flat = numpy.frombuffer(wkb, order + "f8", count * width, at).reshape(count, width)
        return [tuple(point) for point in flat[:, :2].tolist()], at + count * width * 8

    def number(at):
        return struct.unpack_from(order + "I", wkb, at)[0], at + 4

    if kind == 1:
        found, at = points(1, at)
        return {"type": "Point", "coordinates": found[0]}, at
    if kind == 2:
        count, at = number(at)
        found, at = points(count, at)
        return {"type": "LineString", "coordinates": found}, at
    if kind == 3:
        count, at = number(at)
        rings = []
        for _ in range(count):
            size, at = number(at)
            ring, at = points(size, at)
            rings.append(ring)
        return {"type": "Polygon", "coordinates": rings}, at
    if kind in (4, 5, 6):
        count, at = number(at)
        parts = []
        for _ in range(count):
            part, at = _read_shape(wkb, at)
            parts.append(part["coordinates"])
        return {"type": _KINDS[kind], "coordinates": parts}, at
    raise Error(f"shapes of kind {kind} can't be read")


def geo_table(columns, wkb, crs):
    """A GeoDataFrame of columns and shapes where geopandas is installed; else a DataFrame with a column of
    WKB, or a list of dictionaries."""
    try:
        import geopandas
    except ImportError:
        return table({**columns, "geometry": wkb}, None)
    shapes = geopandas.GeoSeries(_shapes_of(wkb), crs=crs)
    return geopandas.GeoDataFrame(columns, geometry=shapes)


def _shapes_of(wkb):
    """The shapes of WKB; None for None."""
    import geopandas
    import shapely

    if int(shapely.__version__.partition(".")[0]) >= 2 or geopandas.options.use_pygeos:
        return geopandas.array.from_wkb(numpy.array([*wkb, None], dtype=object)[:-1])
    # Before 2.0 its function makes a reader for each shape, which takes longer than the shape.
    from shapely.geos import WKBReader, lgeos

    read = WKBReader(lgeos).read
    shapes = numpy.empty(len(wkb), dtype=object)
    for i, shape in enumerate(wkb):  # one by one: numpy takes shapes of several parts for sequences
        shapes[i] = None if shape is None else read(shape)
    return geopandas.array.GeometryArray(shapes)


def labelled(labels, columns):
    """A DataFrame of columns indexed by labels, or a list of dictionaries."""
    pandas = _pandas()
    if pandas is None:
        return table({"label": labels.tolist(), **{name: values.tolist() for name, values in columns.items()}}, None)
    return pandas.DataFrame(columns, index=pandas.Index(labels, name="label"))
