"""Rasters: sources and views, which read nothing until somebody asks for pixels."""

import math
import os
import warnings

import numpy

from . import _formula, _values
from ._description import Described
from ._doors import job_node, local
from ._jobs import ArrayNode, Draft, Node, files_of, source_node
from ._pixels import Pixels
from ._views import Views
from ._watch import watch
from .errors import Error


class Raster(Described, Pixels, Views, _formula.Arithmetic):
    """A raster of bands, lines and samples: a source, or a view on others.

    Making one reads no pixels, and costs nothing but its checks. `shape`, `dtype` and so on are
    asked for at their first use. Bands, lines and samples count from 0; arrays have bands first.

        scene = vexg.open("scene.tif")
        red = scene[2]                                  # a view of one band
        block = scene.read(window=((0, 512), (0, 512)))
        small = scene[:, ::8, ::8]                      # pixels: an array

    Threads: any; several may read one raster at the same time.
    """

    def __init__(self, node, door=local):
        self._node = node
        self._door = door
        self._info = None
        self._is_closed = False

    def _chain(self):
        """The node of the raster, which a formula makes at its first use."""
        if self._is_closed:
            raise Error("the raster is closed")
        return self._node

    def _view(self, command, inputs, output="URI"):
        """The raster that a command shows of this one."""
        inputs = (("SrcURI", self._chain()),) + tuple(
            (name, _values.text_of(value)) for name, value in inputs.items() if value is not None)
        return self._shown(Node(command, inputs, output))

    def _shown(self, node):
        """The raster of a node at the same door."""
        return Raster(node, self._door)

    def _describe(self):
        if self._info is None:
            # Opening may take long, and a mask looks at all pixels: an interrupt is to come out of it.
            node = self._chain()
            self._info = watch(lambda task: self._door.describe(node))
        return self._info

    def close(self):
        """Lets go of the files. The raster can't be used any more; views on it keep them open."""
        if not self._is_closed and self._node is not None:
            self._door.close(self._node)
        self._is_closed = True

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.close()

    def __getstate__(self):
        return {"_node": self._chain(), "_door": self._door, "_info": None, "_is_closed": False}

    def __setstate__(self, state):
        self.__dict__.update(state)

    def __dask_tokenize__(self):
        stamps = []
        for file in files_of(self._chain()):
            try:
                stat = os.stat(file)
                stamps.append((file, stat.st_size, stat.st_mtime_ns))
            except OSError:
                stamps.append((file,))
        return type(self).__name__, self._chain().document(), tuple(stamps)

    def _job(self, command, inputs, *, progress=False, label="", uri="URI", door=None):
        """Runs one command on it, and gives its outputs as a dictionary."""
        draft = Draft()
        draft.step("work", command, {uri: job_node(self._chain()), **inputs})
        results = watch(lambda task: self._door.run(draft, task), progress, label or command)
        return results.values("work")

    def stats(self, *, extended=False, progress=False):
        """The statistics of its valid pixels: a pandas DataFrame with a row for each band, or a list
        of dictionaries where pandas is not there.

        Args:
            extended: True to compute those between bands too; see covariance.
            progress: True for a bar, or a function that gets the fraction done.
        """
        from . import _tables

        command = "GetExtendedRasterStatsCommand" if extended else "GetBasicRasterStatsCommand"
        found = self._job(command, {"Wait": "Always"}, progress=progress, label="statistics")
        # The extremes are pixels, whose text has the digits of their type.
        columns = {"min": self._pixels_of(found["Min"]), "max": self._pixels_of(found["Max"])}
        others = {"mean": "Mean", "std": "Std", "sum": "Sum", "rms": "RMS", "count": "Count"}
        columns.update({name: found[output].tolist() for name, output in others.items()})
        return _tables.table(columns, "band")

    def _pixels_of(self, numbers):
        return numbers.astype(self.dtype).tolist()

    def covariance(self, *, progress=False):
        """The covariances of its bands, an array of bands by bands over pixels that are valid in both."""
        return self._job("GetExtendedRasterStatsCommand", {"Wait": "Always"}, progress=progress,
                         label="covariances")["Cov"].reshape(self.count, self.count)

    def histogram(self, bins=None, range=None, *, progress=False):
        """The histograms of its bands: a list of pairs of counts and edges, as numpy.histogram gives
        them.

        Args:
            bins: how many; by default 256, or fewer of whole numbers. A whole number v stands for all from
                v up to v + 1, so that the last edge is 1 above the largest value.
            range: the smallest and the largest value that counts; all by default.
        """
        from . import _tables

        inputs = {"BinCount": bins, "Wait": "Always"}
        if range is not None:
            inputs["LowerBound"], inputs["UpperBound"] = range
        else:
            stats = self._job("GetBasicRasterStatsCommand", {"Wait": "Always"}, progress=progress, label="statistics")
            inputs["Lowest"], inputs["Highest"] = stats["Min"], stats["Max"]
        found = self._job("FitRasterHistogramCommand", inputs, progress=progress, label="histograms")
        return _tables.histograms_of(found["Histograms"], self.dtype)

    def pyramid(self, levels=None, *, progress=False):
        """Builds its reduced levels, with the statistics, in a file beside it, and shows them.

        Args:
            levels: how many; by default until a level is small.
        """
        from . import _saving

        _saving.build_pyramid(self, levels, progress)
        return self

    def polygons(self, band=0, *, min_size=None, progress=False):
        """Its areas of equal value as Polygons."""
        from . import vectors

        return vectors.polygonize(self, band=band, min_size=min_size, progress=progress)

    def zonal(self, shapes, stats=("count", "min", "max", "mean", "std", "sum"), *, layer=None, where=None,
              bands=None, weights=None, progress=False, **options):
        """Figures of the valid pixels inside each shape of a vector file: a DataFrame with its fields.

        Args:
            stats: of count, min, max, mean, std, sum, median, majority, minority, variety and p10 and
                so on.
            weights: "coverage" to weigh a pixel by the share of it that lies inside.
        """
        from . import vectors

        return vectors.zonal(self, shapes, stats, layer, where, bands, weights, progress, options)

    def segment(self, **options):
        """Its segments; see vexg.segment."""
        from . import segments

        return segments.segment(self, **options)

    def view(self, *others, labels=None, classes=None, shapes=None, browser=True):
        """Shows it in the browser, as `vexg view` does, until the Viewer that it gives is closed.

        Args:
            others: further rasters beside it.
            labels: segments over them: a file of labels, a tree, or a raster of a file.
            classes: a map of classes over them, likewise.
            shapes: a vector file over them.
            browser: whether the page is opened; its address is viewer.address.
        """
        from ._viewer import Viewer

        return Viewer((self, *others), labels=labels, classes=classes, shapes=shapes, browser=browser)

    def save(self, file, *, overwrite=False, progress=False, format=None, nodata=None, cog=False, **options):
        """Writes it to a file, which is there whole or not at all, and opens that.

        Args:
            overwrite: whether a file that is there may be replaced.
            format: the key of the format; by default that of the name's ending.
            nodata: a value for pixels that are not valid; by default that of the raster, or one that
                is free where the format needs one.
            cog: True for a cloud-optimised GeoTIFF.
            options: inputs of CreateRasterCommand by Python names, such as interleave="bsq".
        """
        from . import _saving

        if cog:
            options["layout"] = "COG"
        return _saving.save(self, file, overwrite, progress, format, nodata, options)

    def to_dask(self, chunks="auto"):
        """A dask array of it, whose blocks are read without a lock.

        Args:
            chunks: a number for lines and samples, or as dask takes it; by default blocks of the
                source.
        """
        import dask.array

        if chunks == "auto":
            chunks = (self.count,) + self._good_chunks(32 << 20)
        elif isinstance(chunks, int):
            chunks = (self.count, chunks, chunks)
        return dask.array.from_array(self, chunks=chunks, lock=False, asarray=False, name=None,
                                     meta=numpy.empty((0, 0, 0), dtype=self.dtype))

    def map_blocks(self, function, *, chunks="auto", dtype=None, **options):
        """A dask array of what a function makes of each block."""
        return self.to_dask(chunks).map_blocks(function, dtype=dtype, **options)

    def to_xarray(self, chunks=None, *, masked=False):
        """An xarray DataArray of it, with its coordinates, read when its values are asked for.

        Args:
            chunks: as of to_dask; by default the pixels are read as they are asked for, without dask.
            masked: True for floating-point numbers with NaN where pixels are not valid.
        """
        from . import _xarray

        return _xarray.data_array(self, chunks, masked)


class FormulaRaster(Raster):
    """A raster that formulas make, one for each band. A formula of formulas is one formula, so that
    what stands in between is not rounded, nor computed twice."""

    def __init__(self, formulas, door, type_word="Single"):
        """
        Args:
            formulas: for each band the pieces of it, as Arithmetic._parts gives them.
        """
        super().__init__(None, door)
        self._formulas = formulas
        self._type_word = type_word

    def _parts(self):
        return self._formulas if self._type_word in ("Single", "Double") else super()._parts()

    def astype(self, dtype):
        # A formula of another type, so that nothing is rounded twice.
        is_same = self._type_word == _values.type_word(dtype)
        if is_same or self._type_word not in ("Single", "Double"):
            return super().astype(dtype)
        return FormulaRaster(self._formulas, self._door, _values.type_word(dtype))

    def _chain(self):
        if self._node is None:
            self._node = _formula.node_of(self._formulas, self._type_word)
        return super()._chain()

    def __reduce__(self):
        return Raster, (self._chain(), self._door)

    def __repr__(self):
        return super().__repr__().replace("FormulaRaster", "Raster")


def open(file, *, format=None, subdataset=None, server=None):
    """Opens a raster file of any format that vexg reads, with the pyramid file beside it.

    Args:
        file: its path or address; "FILE|NAME=VALUE" with pieces for its format.
        format: the key of its format; detected by default.
        subdataset: which of the rasters in the file: its number, from 1, or the end of its name.
        server: a Server that opens and reads it, in place of this process.
    """
    pieces = {} if subdataset is None else {"subdataset": subdataset}
    raster = Raster(source_node(file, format, **pieces), server._door if server is not None else local)
    raster._describe()
    return raster


def view(command, *, server=None, output="URI", **inputs):
    """The raster that a command of the library shows, for those that have no method here. Nothing runs
    before the raster is asked for something.

    Args:
        command: its class, such as "CreateVirtualRasterCommand".
        output: the output that gives the raster.
        inputs: by name; a Raster, or a list of them, where a URI is asked for.
    """
    rasters = [each for value in inputs.values() for each in (value if isinstance(value, (list, tuple)) else [value])
               if isinstance(each, Raster)]
    door = door_of(rasters) if rasters else local if server is None else server._door

    def node_of(value):
        if isinstance(value, Raster):
            return value._chain()
        if isinstance(value, (list, tuple)) and value and isinstance(value[0], Raster):
            return tuple(each._chain() for each in value)
        return _values.text_of(value)

    return Raster(Node(command, tuple((name, node_of(value)) for name, value in inputs.items()), output), door)


def from_array(array, *, like=None, transform=None, crs=None, nodata=None):
    """A raster of a numpy array, which is not copied unless its axes are not in one block of memory.

    Args:
        array: of bands, lines and samples, or of lines and samples. A masked array is copied, with
            its fill value as no data.
        like: a raster of the same size whose place it has.
        transform: six numbers in the order of rasterio's Affine, in place of `like`.
        crs: the coordinate system for `transform`.
        nodata: the value of pixels that are not valid.
    """
    if isinstance(array, numpy.ma.MaskedArray):
        if nodata is None:
            nodata = array.fill_value
            if array.mask is not numpy.ma.nomask and (array.compressed() == nodata).any():
                raise ValueError(f"the fill value {nodata} is that of valid pixels too; give nodata")
        array = array.filled(nodata)
    array = numpy.asarray(array)
    if array.dtype == bool:
        array = array.view("uint8")
    if array.ndim == 2:
        array = array[None]
    if array.ndim != 3 or 0 in array.shape:
        raise ValueError(f"an array of the shape {array.shape} is no raster: it has bands, lines and samples")
    _values.type_word(array.dtype)
    geo_ref = ""
    if like is not None:
        if array.shape[1:] != like.shape[1:]:
            raise ValueError(f"the array has {array.shape[1:]} lines and samples, and the raster {like.shape[1:]}")
        reference = like._describe()["geoRef"]
        geo_ref = reference["text"] if reference else ""
    elif transform is not None:
        geo_ref = geo_ref_text(transform, crs, array.shape[1:])
    return Raster(ArrayNode(array, geo_ref, nodata))


def geo_ref_text(transform, crs, size):
    """The text of the grid of six numbers in the order of rasterio's Affine. Raises ValueError for one
    that is sheared, which no raster file of ours can have."""
    a, b, c, d, e, f = (float(number) for number in tuple(transform)[:6])
    width, height = math.hypot(a, d), math.hypot(b, e)
    if width == 0 or height == 0 or e * a - b * d >= 0 or abs(a * b + d * e) > 1e-9 * width * height:
        raise ValueError(f"{tuple(transform)[:6]} is no grid of square corners with its first line on top")
    rotation = math.degrees(math.atan2(d, a))
    numbers = (-9999, 0, 0, 0, 0, width, height, c, f, 0, 0)
    text = " ".join(f"{number:.16e}" for number in numbers)
    system = "" if crs is None else getattr(crs, "to_wkt", lambda: str(crs))()
    return f"Std {text} {size[1]} {size[0]} {rotation:.16e} {system}| "


def stack(*rasters, dtype=None):
    """Shows the bands of several rasters of one size as one raster; see Raster.stack."""
    if not rasters:
        raise TypeError("stack takes one raster at least")
    rasters = [raster if isinstance(raster, Raster) else from_array(raster) for raster in rasters]
    sizes = {raster.shape[1:] for raster in rasters}
    if len(sizes) > 1:
        raise Error(f"the rasters have different lines and samples: {sorted(sizes)}")
    wanted = numpy.dtype(dtype) if dtype is not None else numpy.result_type(*(r.dtype for r in rasters))
    rasters = [raster.astype(wanted) for raster in rasters]
    _question_places(rasters)
    return Raster(Node("CreateBandStackRasterCommand", (
        ("SrcURI", tuple(raster._chain() for raster in rasters)), ("Bands", "Exact"))), door_of(rasters))


def _question_places(rasters):
    """Warns where a raster lies elsewhere than the first one by more than a tenth of a pixel."""
    first = rasters[0]
    _, lines, samples = first.shape
    corners = numpy.array([(1, 0, 0), (1, samples, 0), (1, 0, lines)])
    if first._grid() is None:
        return
    x0, xx, xy, y0, yx, yy = first._grid()
    for number, raster in enumerate(rasters[1:], 1):
        if raster._grid() is None:
            continue
        difference = corners @ (numpy.array(raster._grid()) - first._grid()).reshape(2, 3).T
        off = numpy.abs(difference @ numpy.linalg.inv(numpy.array([[xx, xy], [yx, yy]])).T).max()
        if off > 0.1 or raster.crs != first.crs:
            warnings.warn(f"raster {number} of the stack lies elsewhere than the first one; warp carries it there",
                          stacklevel=4)


def door_of(rasters):
    """The door of rasters that take part in one piece of work. Raises Error where they have several."""
    doors = {id(raster._door): raster._door for raster in rasters}
    if len(doors) > 1:
        raise Error("the rasters are open in different processes")
    return next(iter(doors.values()))


def transform_points(points, from_crs, to_crs, *, door=local):
    """Carries points from one coordinate system to another; NaN for one that can't be.

    Args:
        points: an array of x and y, or longitude and latitude, in rows.
    """
    points = numpy.asarray(points, dtype=float).reshape(-1, 2)
    draft = Draft()
    draft.step("points", "TransformPointsCommand",
               {"Points": _values.array_text(points), "From": str(from_crs), "To": str(to_crs)})
    return _values.parse_array(door.run(draft).text("points", "Points"), float)
