"""Rasters: sources and views, which read nothing until somebody asks for pixels."""

import math
import operator

import numpy

from . import _formula, _values
from ._doors import job_node, local
from ._jobs import ArrayNode, Draft, Node, files_of, source_node
from ._watch import watch
from .errors import Error

_ORDERS = {"BIP": 0, "BIL": 1, "BSQ": 2}
_AXES = {0: (1, 2, 0), 1: (1, 0, 2), 2: (0, 1, 2)}  # memory's axes among bands, lines, samples
_BACK = {0: (2, 0, 1), 1: (1, 0, 2), 2: (0, 1, 2)}  # bands, lines, samples among memory's axes
_SMALL = 8 << 20  # bytes that are read at once, without a look at interrupts
_NOT_VALID = 7  # the bits of a state byte


class Raster(_formula.Arithmetic):
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

    # Making ------------------------------------------------------------------------------------

    def _chain(self):
        """The node of the raster, which a formula makes at its first use."""
        if self._is_closed:
            raise Error("the raster is closed")
        return self._node

    def _view(self, command, inputs, output="URI"):
        """The raster that a command shows of this one."""
        inputs = (("SrcURI", self._chain()),) + tuple(
            (name, _values.text_of(value)) for name, value in inputs.items() if value is not None)
        return Raster(Node(command, inputs, output), self._door)

    def _describe(self):
        if self._info is None:
            self._info = self._door.describe(self._chain())
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

    # What it is --------------------------------------------------------------------------------

    @property
    def shape(self):
        """Bands, lines and samples."""
        info = self._describe()
        return info["bands"], info["lines"], info["samples"]

    @property
    def dtype(self):
        """The numpy type of the pixels."""
        return _values.DTYPES[self._describe()["type"]]

    ndim = 3

    @property
    def size(self):
        """How many values there are."""
        bands, lines, samples = self.shape
        return bands * lines * samples

    @property
    def nbytes(self):
        """Their bytes."""
        return self.size * self.dtype.itemsize

    def __len__(self):
        return self.shape[0]

    @property
    def count(self):
        """How many bands there are."""
        return self.shape[0]

    @property
    def height(self):
        """How many lines there are."""
        return self.shape[1]

    @property
    def width(self):
        """How many samples a line has."""
        return self.shape[2]

    @property
    def format(self):
        """The key of the format of the source."""
        return self._describe()["format"]

    @property
    def nodata(self):
        """The no-data value of the first band; None when it has none."""
        return self.nodata_values[0]

    @property
    def nodata_values(self):
        """The no-data value of each band; None for one that has none."""
        is_whole = self.dtype.kind in "iu"
        return [None if value is None else int(value) if is_whole and value == int(value) else float(value)
                for value in self._describe()["noData"]]

    @property
    def names(self):
        """The names of the bands; "" for one without."""
        details = self._describe()["details"]
        return [details.get(f"Bands/{band}/Description", "") for band in range(self.count)]

    @property
    def details(self):
        """All that is known beside size, type and place, by paths such as "Bands/0/Unit"."""
        return dict(self._describe()["details"])

    @property
    def categories(self):
        """The names of the values of the first band from 0 on; an empty list for none."""
        text = self._describe()["details"].get("Bands/0/Categories", "")
        return text.split("\n") if text else []

    @property
    def colormap(self):
        """The colours of the values of the first band as an array of red, green, blue and alpha; None
        when it has none."""
        palette = self._describe()["palettes"][0]
        return None if palette is None else numpy.array(palette, dtype="uint8")

    @property
    def transform(self):
        """The six numbers of the grid in the order of rasterio's Affine, (a, b, c, d, e, f): x = a *
        sample + b * line + c, y = d * sample + e * line + f; None without a plain grid."""
        grid = self._grid()
        return None if grid is None else (grid[1], grid[2], grid[0], grid[4], grid[5], grid[3])

    def _grid(self):
        reference = self._describe()["geoRef"]
        return None if reference is None else reference["transform"]

    @property
    def crs(self):
        """The coordinate system: "EPSG:n" where it has a number, else WKT; None without."""
        reference = self._describe()["geoRef"]
        if reference is None or reference["crs"] is None:
            return None
        return f"EPSG:{reference['epsg']}" if reference["epsg"] else reference["crs"]

    @property
    def crs_wkt(self):
        """The coordinate system as WKT 2; None without."""
        reference = self._describe()["geoRef"]
        return None if reference is None else reference["crs"]

    @property
    def bounds(self):
        """Left, bottom, right and top on the map, as a grid with north up has them; of a turned grid
        the box around it. None without a plain grid."""
        corners = self._corners()
        if corners is None:
            return None
        return tuple(corners.min(axis=0)) + tuple(corners.max(axis=0))

    def _corners(self):
        grid = self._grid()
        if grid is None:
            return None
        x0, xx, xy, y0, yx, yy = grid
        _, lines, samples = self.shape
        ends = numpy.array([(0, 0), (samples, 0), (samples, lines), (0, lines)], dtype=float)
        return numpy.stack([x0 + xx * ends[:, 0] + xy * ends[:, 1],
                            y0 + yx * ends[:, 0] + yy * ends[:, 1]], axis=1)

    @property
    def levels(self):
        """The numbers of the reduced levels that can be read: a level halves the one before."""
        pyramid = self._describe()["pyramid"]
        return [] if pyramid is None else list(range(max(pyramid["min"], 1), pyramid["max"] + 1))

    @property
    def files(self):
        """The files that it stands on."""
        return files_of(self._chain())

    @property
    def __geo_interface__(self):
        """The outline as a GeoJSON feature, in the raster's own coordinate system."""
        corners = self._corners()
        if corners is None:
            raise Error("the raster has no plain grid")
        ring = [tuple(corner) for corner in corners.tolist()]
        properties = {"crs": self.crs, "bands": self.count, "dtype": str(self.dtype)}
        return {"type": "Feature", "properties": properties, "bbox": list(self.bounds),
                "geometry": {"type": "Polygon", "coordinates": [ring + ring[:1]]}}

    def __repr__(self):
        if self._is_closed:
            return "<vexg.Raster, closed>"
        try:
            bands, lines, samples = self.shape
            where = f", {self.crs}" if self.crs else ""
            return f"<vexg.{type(self).__name__} {bands} x {lines} x {samples} {self.dtype}{where}>"
        except Error as failure:
            return f"<vexg.{type(self).__name__}: {failure}>"

    def _repr_html_(self):
        from . import _display

        return _display.html_of(self)

    def quicklook(self, size=512, bands=None, stretch=(2, 98)):
        """A picture of it as the bytes of a PNG.

        Args:
            size: pixels of the longer side at most.
            bands: one, or three for red, green and blue; by default those that look natural.
            stretch: the percentiles of the values shown that become black and white.
        """
        from . import _display

        return _display.png_of(self, size, bands, stretch)

    # Values ------------------------------------------------------------------------------------

    def __getstate__(self):
        return {"_node": self._chain(), "_door": self._door, "_info": None, "_is_closed": False}

    def __setstate__(self, state):
        self.__dict__.update(state)

    def __dask_tokenize__(self):
        import os

        stamps = []
        for file in files_of(self._chain()):
            try:
                stat = os.stat(file)
                stamps.append((file, stat.st_size, stat.st_mtime_ns))
            except OSError:
                stamps.append((file,))
        return type(self).__name__, self._chain().document(), tuple(stamps)

    # Pixels ------------------------------------------------------------------------------------

    def read(self, bands=None, window=None, *, out=None, masked=False, order=None, progress=False):
        """Reads pixels into a numpy array.

        Args:
            bands: a number, for an array of lines and samples, or several, in the order wanted; all
                by default.
            window: ((first line, end line), (first sample, end sample)), two slices, or a Window of
                rasterio; all by default.
            out: an array that gets the pixels, of the right shape and the raster's dtype.
            masked: True for a masked array, whose mask tells the pixels that are not valid: those of
                a no-data value, a mask or outside a region.
            order: of the axes in memory. By default that of the source, which costs least: the
                array is a transposed view where that isn't bands first. "C" for a plain array.
            progress: True for a bar, or a function that gets the fraction done.
        """
        info = self._describe()
        numbers, is_one = self._bands_of(bands, info["bands"])
        left, top, right, bottom = rect_of(window, info["lines"], info["samples"])
        shape = (len(numbers), bottom - top + 1, right - left + 1)
        dtype = _values.DTYPES[info["type"]]
        pixels, memory, copy_to = self._memory_for(shape, dtype, out, order, info, is_one)
        states = numpy.empty(_shape_in(shape, memory), dtype="uint8") if masked else None
        self._fill((left, top, right, bottom), numbers, memory, info["code"], pixels, states, progress)
        array = pixels.transpose(_BACK[memory])
        if copy_to is not None:
            copy_to[...] = array[0] if is_one and copy_to.ndim == 2 else array
            array = copy_to if copy_to.ndim == 3 else copy_to[None]
        if masked:
            array = self._masked(array, states.transpose(_BACK[memory]))
        if out is not None and not masked:
            return out
        return array[0] if is_one else array

    def _fill(self, rect, numbers, memory, code, pixels, states, progress):
        node = self._chain()

        def fill(task):
            self._door.read(node, rect, numbers, memory, code, pixels, states, task)

        if pixels.nbytes <= _SMALL and not progress:
            fill(None)
        else:
            watch(fill, progress, "reading")

    @staticmethod
    def _memory_for(shape, dtype, out, order, info, is_one):
        """The array to fill with its axes as in memory, their order, and the array that gets a copy
        of it in the end, or None."""
        if order not in (None, "C", "BSQ", "BIL", "BIP"):
            raise ValueError(f"order is None, \"C\", \"BSQ\", \"BIL\" or \"BIP\", and not {order!r}")
        memory = _ORDERS.get("BSQ" if order == "C" else order or info["interleave"], 2)
        if shape[0] == 1:
            memory = 2
        if out is None:
            return numpy.empty(_shape_in(shape, memory), dtype=dtype), memory, None
        wanted = shape[1:] if is_one and out.ndim == 2 else shape
        if out.shape != wanted:
            raise ValueError(f"out has the shape {out.shape}, and the pixels have {wanted}")
        if out.dtype != dtype:
            raise TypeError(f"out has the dtype {out.dtype}, and the pixels have {dtype}")
        if not out.flags.writeable:
            raise ValueError("out can't be written")
        whole = out if out.ndim == 3 else out[None]
        for memory in (memory, 2, 0, 1):
            block = whole.transpose(_AXES[memory])
            if block.flags.c_contiguous and out.dtype.isnative:
                return block, memory, None
        return numpy.empty(_shape_in(shape, memory), dtype=dtype), memory, out

    def _masked(self, array, states):
        values = self.nodata_values
        result = numpy.ma.masked_array(array, (states & _NOT_VALID) != 0)
        if values and values[0] is not None:
            result.fill_value = values[0]
        return result

    @staticmethod
    def _bands_of(bands, count):
        """The bands as an array, and whether one was named by itself."""
        if bands is None:
            return numpy.arange(count, dtype="uint32"), False
        is_one = isinstance(bands, (int, numpy.integer))
        numbers = [bands] if is_one else list(bands)
        if not numbers:
            raise ValueError("bands names none")
        checked = [operator.index(number) for number in numbers]
        for number in checked:
            if not -count <= number < count:
                raise IndexError(f"there is no band {number}; the raster has {count}, from 0")
        return numpy.array([number % count for number in checked], dtype="uint32"), is_one

    def __array__(self, dtype=None):
        array = self.read(order="C")
        return array if dtype is None else array.astype(dtype, copy=False)

    def __getitem__(self, key):
        """Bands alone give a view: scene[0], scene[[2, 1, 0]], scene[1:3]. With lines and samples the
        pixels are read: scene[0, :512, ::8], as of a numpy array. Steps are taken from a level of
        the pyramid that holds just these pixels, where there is one."""
        if key is Ellipsis:
            return self.read()
        if not isinstance(key, tuple):
            return self.bands(*self._chosen_bands(key))
        if Ellipsis in [part for part in key if part is Ellipsis]:
            at = next(i for i, part in enumerate(key) if part is Ellipsis)
            key = key[:at] + (slice(None),) * (4 - len(key)) + key[at + 1:]
        if len(key) > 3:
            raise IndexError("a raster has three axes: bands, lines and samples")
        key = key + (slice(None),) * (3 - len(key))
        bands, lines, samples = self.shape
        rows, has_rows = _range_of(key[1], lines, "line")
        columns, has_columns = _range_of(key[2], samples, "sample")
        numbers = self._chosen_bands(key[0])
        if not numbers or not rows or not columns:
            array = numpy.empty((len(numbers), len(rows), len(columns)), dtype=self.dtype)
        else:
            array = self._strided(numbers, rows, columns)
        is_band = isinstance(key[0], (int, numpy.integer))
        return array[(0 if is_band else slice(None), slice(None) if has_rows else 0,
                      slice(None) if has_columns else 0)]

    def _chosen_bands(self, key):
        if isinstance(key, slice):
            return list(range(*key.indices(self.count)))
        if isinstance(key, (int, numpy.integer)):
            return [int(self._bands_of(key, self.count)[0][0])]
        if isinstance(key, numpy.ndarray) and key.dtype == bool:
            key = numpy.flatnonzero(key)
        if isinstance(key, (list, numpy.ndarray, range)):
            return [int(band) for band in self._bands_of(list(key), self.count)[0]] if len(key) else []
        raise TypeError(f"{key!r} names no bands: they are chosen by numbers, slices and lists")

    def _strided(self, numbers, rows, columns):
        """The pixels at some lines and samples, each at even distances."""
        flips = (slice(None, None, -1 if rows.step < 0 else 1), slice(None, None, -1 if columns.step < 0 else 1))
        rows = rows if rows.step > 0 else rows[::-1]
        columns = columns if columns.step > 0 else columns[::-1]
        level = self._level_for(rows, columns)
        source, by = (self, 1) if level == 0 else (self.level(level), 2**level)
        window = (rows[0] // by, rows[-1] // by + 1), (columns[0] // by, columns[-1] // by + 1)
        if (rows.step, columns.step) == (by, by):
            array = source.read(numbers, window)
        else:
            array = source._every(numbers, rows, columns)
        return array[(slice(None),) + flips]

    def _every(self, numbers, rows, columns):
        """The pixels at every n-th line and sample, read in strips of a few MiB."""
        array = numpy.empty((len(numbers), len(rows), len(columns)), dtype=self.dtype)
        width = columns[-1] + 1 - columns[0]
        lines = max(1, (4 << 20) // (width * len(numbers) * self.dtype.itemsize))
        together = max(1, lines // rows.step)  # of the lines that are kept
        for first in range(0, len(rows), together):
            part = rows[first:first + together]
            strip = self.read(numbers, ((part[0], part[-1] + 1), (columns[0], columns[-1] + 1)))
            array[:, first:first + len(part)] = strip[:, ::rows.step, ::columns.step]
        return array

    def _level_for(self, rows, columns):
        """The level of the pyramid that holds just the pixels asked for; 0 for none."""
        pyramid = self._describe()["pyramid"]
        step = rows.step
        if pyramid is None or columns.step != step or step < 2 or step & (step - 1):
            return 0
        # Only levels of every n-th pixel hold what a slice of numpy would.
        if pyramid["type"] != "ORVA" or rows[0] % step or columns[0] % step:
            return 0
        level = step.bit_length() - 1
        return level if pyramid["min"] <= level <= pyramid["max"] else 0

    def blocks(self, size=None):
        """The windows that cover it, in the order in which they are best read.

        Args:
            size: lines and samples of a window; by default blocks of the source, of about 4 MiB.
        """
        bands, lines, samples = self.shape
        if size is None:
            size = self._good_chunks()
        for top in range(0, lines, size[0]):
            for left in range(0, samples, size[1]):
                yield (top, min(top + size[0], lines)), (left, min(left + size[1], samples))

    def _good_chunks(self, wanted=4 << 20):
        """Lines and samples of blocks of about so many bytes, in whole tiles of the source."""
        bands, lines, samples = self.shape
        pixel = max(1, bands * self.dtype.itemsize)
        width, height = self._describe()["tiles"]
        if height > 1 and 0 < width < samples:
            side = max(1, int(math.sqrt(wanted / pixel / (width * height))))
            return min(lines, side * height), min(samples, side * width)
        height = max(height, 1)
        return min(lines, max(1, wanted // (pixel * samples * height)) * height), samples

    # Views -------------------------------------------------------------------------------------

    def clip(self, bounds=None, window=None, *, crs=None):
        """Shows a rectangle of it.

        Args:
            bounds: left, bottom, right and top on the map; the pixels are those that it touches.
            window: as of read, in place of bounds.
            crs: the coordinate system of bounds; the raster's own by default.
        """
        if (bounds is None) == (window is None):
            raise TypeError("clip takes either bounds or a window")
        _, lines, samples = self.shape
        rect = rect_of(window, lines, samples) if bounds is None else self._rect_in(bounds, crs)
        return self._view("CreateSpatialSubsetRasterCommand",
                          {"SubRect": " ".join(map(str, rect)), "Placing": "Exact"})

    def _rect_in(self, bounds, crs):
        left, bottom, right, top = (float(bound) for bound in bounds)
        if not (left < right and bottom < top):
            raise ValueError(f"bounds are left, bottom, right and top, and not {bounds}")
        grid = self._grid()
        if grid is None:
            raise Error("the raster has no plain grid; give a window")
        # Points along the sides, since those of another system are bent.
        t = numpy.linspace(0, 1, 21)
        x = numpy.concatenate([left + (right - left) * t, 0 * t + right, left + (right - left) * t, 0 * t + left])
        y = numpy.concatenate([0 * t + bottom, bottom + (top - bottom) * t, 0 * t + top, bottom + (top - bottom) * t])
        points = numpy.stack([x, y], axis=1)
        if crs is not None and str(crs) != self.crs:
            points = transform_points(points, crs, self.crs_wkt, door=self._door)
            if not numpy.isfinite(points).all():
                raise Error("the bounds can't be carried to the raster")
        x0, xx, xy, y0, yx, yy = grid
        pixels = (points - (x0, y0)) @ numpy.linalg.inv(numpy.array([[xx, xy], [yx, yy]])).T
        _, lines, samples = self.shape
        low, high = pixels.min(axis=0), pixels.max(axis=0)
        # A side on the border of pixels, but for rounding, touches those within alone.
        first = numpy.floor(low + 1e-5)
        last = numpy.maximum(numpy.ceil(high - 1e-5) - 1, first)
        if (last < 0).any() or first[0] >= samples or first[1] >= lines:
            raise Error(f"the bounds lie outside the raster, from sample {first[0]:.0f} and line {first[1]:.0f} "
                        f"to {last[0]:.0f} and {last[1]:.0f} of {samples} by {lines}")
        first = numpy.clip(first, 0, (samples - 1, lines - 1)).astype(int)
        last = numpy.clip(last, 0, (samples - 1, lines - 1)).astype(int)
        return int(first[0]), int(first[1]), int(last[0]), int(last[1])

    def bands(self, *bands):
        """Shows some bands of it, in the order given; one may come twice."""
        if len(bands) == 1 and isinstance(bands[0], (list, tuple, range, numpy.ndarray)):
            bands = bands[0]
        numbers, _ = self._bands_of(bands, self.count)
        return self._view("CreateSpectralSubsetRasterCommand", {"Bands": _values.array_text(numbers)})

    def stack(self, *others, dtype=None):
        """Shows the bands of it and those of others, of the same size, as one raster.

        Args:
            dtype: of all; by default the one that numpy would choose, where they differ.
        """
        return stack(self, *others, dtype=dtype)

    def level(self, number):
        """Shows a level of its pyramid; 0 is the raster itself."""
        if number == 0:
            return self
        if number not in self.levels:
            raise Error(f"there is no level {number}; there are {self.levels or 'none'}")
        node = Node("GetRasterPyramidCommand", (("URI", self._chain()), ("Level", str(int(number))),
                                                ("Placing", "Exact")), "PyramidURI")
        return Raster(node, self._door)

    def skip(self, lines, samples=None):
        """Shows every n-th line and sample."""
        return self._view("CreateSkipRasterCommand", {"SkipX": samples or lines, "SkipY": lines})

    def with_nodata(self, *values, keep=False):
        """Shows it with some values as no data.

        Args:
            values: the first is the no-data value of the result; none at all for every pixel valid.
            keep: whether what the source says is no data stays so.
        """
        if not values:
            return self._view("CreateNoDataRasterCommand",
                              {"NoDataValues": "1:1 [0] ", "RemoveAll": "1", "Description": "Exact"})
        return self._view("CreateNoDataRasterCommand",
                          {"NoDataValues": _values.array_text(list(values)), "Replace": not keep,
                           "Description": "Exact"})

    def mask(self, *values, band=0, by=None, inverse=False):
        """Shows it without the pixels where a band has one of some values.

        Args:
            band: the band whose values are looked at.
            by: another raster of the same size that has the band.
            inverse: True to leave out all other pixels instead.
        """
        looked = (by if by is not None else self)[int(band)]
        mask = Node("CreateRasterMaskCommand", (
            ("SrcURI", looked._chain()), ("MaskBands", "1:1 [0] "),
            ("MaskValues", f"1:1 [{_values.array_text(list(values))} ]"),
            ("Inversed", "1" if inverse else "0")))
        return Raster(Node("CreateMaskedRasterCommand", (("SrcURI", self._chain()), ("MaskURI", mask))), self._door)

    def region(self, shapes, layer=None, where=None, coordinates="Map"):
        """Shows it without the pixels outside the shapes of a vector file.

        Args:
            layer: by its name or number; all by default.
            where: "FIELD=VALUE": only records with that value.
            coordinates: "Map" or "Pixel".
        """
        import os

        inputs = [("Vectors", os.path.abspath(os.fspath(shapes)))]
        inputs += [("Layer", str(layer))] if layer is not None else []
        inputs += [("Where", where)] if where is not None else []
        shape = Node("CreateGeometryROIDefCommand",
                     tuple(inputs) + (("ScanRules", "Steady"), ("Coordinates", coordinates)))
        return Raster(Node("CreateROIRasterCommand", (("SrcURI", self._chain()), ("ROIDefURI", shape))), self._door)

    def astype(self, dtype):
        """Shows it with pixels of another type. Results for integers are rounded; values that don't
        fit are not valid."""
        if numpy.dtype(dtype) == self.dtype:
            return self
        return _formula.cast(self, dtype)

    def real(self):
        """Shows the real parts of complex pixels."""
        return self._view("CreateComplexRealRasterCommand", {})

    def imag(self):
        """Shows the imaginary parts of complex pixels."""
        return self._view("CreateComplexImagRasterCommand", {})

    def magnitude(self):
        """Shows the magnitudes of complex pixels."""
        return self._view("CreateComplexMagnitudeRasterCommand", {})

    def phase(self):
        """Shows the phases of complex pixels."""
        return self._view("CreateComplexPhaseRasterCommand", {})

    def warp(self, to=None, *, like=None, pixel_size=None, resampling="nearest", method="polynomial", nodata=None):
        """Shows it in another coordinate system, or on the grid of another raster.

        Args:
            to: "EPSG:n", WKT or a PROJ text.
            like: a raster whose grid it gets, in place of `to`.
            pixel_size: in units of the system; by default there are about as many pixels.
            resampling: "nearest", "linear" or "cubic".
            method: "polynomial", within an eighth of a pixel, or "rigorous".
            nodata: of the result; by default the source's.
        """
        if (to is None) == (like is None):
            raise TypeError("warp takes either a coordinate system or a raster with a grid")
        if like is not None:
            reference = like._describe()["geoRef"]
            grid = reference["text"] if reference and reference["transform"] else None
            if grid is None:
                raise Error("the raster has no plain grid to be taken over")
        else:
            draft = Draft()
            draft.step("grid", "FitRasterGridCommand",
                       {"URI": job_node(self._chain()), "CoordSys": str(to), "PixelSize": pixel_size})
            grid = self._door.run(draft).text("grid", "GeoRef")
        return self._view("CreateProjectedRasterCommand", {
            "GeoRef": grid, "ReprojectionMethod": method.capitalize(),
            "ResamplingMethod": resampling.capitalize(), "Grid": "Exact", "Sampling": "Centred",
            "NoData": nodata})

    def reflectance(self, **constants):
        """Shows top-of-atmosphere reflectance; see calibrate for the constants."""
        return self.calibrate("reflectance", **constants)

    def radiance(self, **constants):
        """Shows at-sensor radiance; see calibrate for the constants."""
        return self.calibrate("radiance", **constants)

    def temperature(self, **constants):
        """Shows brightness temperature in kelvin; see calibrate for the constants."""
        return self.calibrate("temperature", **constants)

    def calibrate(self, quantity, *, metadata=None, **constants):
        """Shows a physical quantity: "radiance", "reflectance" or "temperature". The values are those
        of the commands that calibrate whole files, and are computed where they are read.

        Args:
            metadata: the header of the scene, from which constants are taken that are not given.
            constants: gain, offset, irradiance, k1, k2 (a number, or one for each band),
                sun_elevation in degrees, distance in astronomical units, scale.
        """
        from . import _calibration

        return _calibration.calibrate(self, quantity, metadata, constants)

    # Work --------------------------------------------------------------------------------------

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
        columns = {"min": "Min", "max": "Max", "mean": "Mean", "std": "Std", "sum": "Sum",
                   "rms": "RMS", "count": "Count"}
        return _tables.table({name: found[output] for name, output in columns.items()}, "band")

    def covariance(self, *, progress=False):
        """The covariances of its bands, an array of bands by bands over pixels that are valid in both."""
        return self._job("GetExtendedRasterStatsCommand", {"Wait": "Always"}, progress=progress,
                         label="covariances")["Cov"].reshape(self.count, self.count)

    def histogram(self, bins=None, range=None, *, progress=False):
        """The histograms of its bands: a list of pairs of counts and edges, as numpy.histogram gives
        them.

        Args:
            bins: how many; by default 256, or fewer of whole numbers.
            range: the smallest and the largest value that counts; all by default.
        """
        from . import _tables

        low, high = range if range is not None else (None, None)
        found = self._job("FitRasterHistogramCommand", {"LowerBound": low, "UpperBound": high, "BinCount": bins,
                                                        "Wait": "Always"}, progress=progress, label="histograms")
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

    def _chain(self):
        if self._node is None:
            self._node = _formula.node_of(self._formulas, self._type_word)
        return super()._chain()

    def __reduce__(self):
        return Raster, (self._chain(), self._door)

    def __repr__(self):
        return super().__repr__().replace("FormulaRaster", "Raster")


def _shape_in(shape, memory):
    """The shape of an array of bands, lines and samples with its axes as in memory."""
    return tuple(shape[axis] for axis in _AXES[memory])


def _range_of(key, length, name):
    """The places that an index or a slice names, and whether the axis stays."""
    if isinstance(key, slice):
        return range(*key.indices(length)), True
    try:
        at = operator.index(key)
    except TypeError:
        raise TypeError(f"{key!r} chooses no {name}s: give a number or a slice") from None
    if not -length <= at < length:
        raise IndexError(f"there is no {name} {at}; the raster has {length}, from 0")
    at %= length
    return range(at, at + 1), False


def rect_of(window, lines, samples):
    """Left, top, right and bottom of a window, inclusive. Raises Error for one that is not inside."""
    if window is None:
        return 0, 0, samples - 1, lines - 1
    if hasattr(window, "col_off"):  # a Window of rasterio
        top, left = window.row_off, window.col_off
        bottom, right = top + window.height, left + window.width
    else:
        try:
            rows, columns = window
            top, bottom = _ends_of(rows, lines)
            left, right = _ends_of(columns, samples)
        except (TypeError, ValueError):
            raise ValueError(
                f"a window is ((first line, end), (first sample, end)), and not {window!r}") from None
    if not (top == int(top) and left == int(left) and bottom == int(bottom) and right == int(right)):
        raise ValueError(f"a window has whole lines and samples, and not {window!r}")
    top, left, bottom, right = int(top), int(left), int(bottom), int(right)
    if not (0 <= top < bottom <= lines and 0 <= left < right <= samples):
        raise Error(f"the window of lines {top} to {bottom} and samples {left} to {right} is not inside the "
                    f"raster's {lines} by {samples}")
    return left, top, right - 1, bottom - 1


def _ends_of(part, length):
    if isinstance(part, slice):
        if part.step not in (None, 1):
            raise ValueError("a window has no steps")
        start = 0 if part.start is None else part.start
        stop = length if part.stop is None else part.stop
        return start, stop
    start, stop = part
    return start, stop


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
    return Raster(Node("CreateBandStackRasterCommand", (("SrcURI", tuple(r._chain() for r in rasters)),)),
                  door_of(rasters))


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


