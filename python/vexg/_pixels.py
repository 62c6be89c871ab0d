"""The pixels of a raster as numpy arrays."""

import math
import operator

import numpy

from . import _values
from ._watch import watch
from .errors import Error

_ORDERS = {"BIP": 0, "BIL": 1, "BSQ": 2}
_AXES = {0: (1, 2, 0), 1: (1, 0, 2), 2: (0, 1, 2)}  # memory's axes among bands, lines, samples
_BACK = {0: (2, 0, 1), 1: (1, 0, 2), 2: (0, 1, 2)}  # bands, lines, samples among memory's axes
_SMALL = 4 << 20  # bytes that are read at once, without a look at interrupts
_NOT_VALID = 7  # the bits of a state byte


class Pixels:
    """The reading of a raster's pixels."""

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

    def __array__(self, dtype=None, copy=None):
        if copy is False:
            raise ValueError("a raster can't be had as an array without a copy")
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
        if level:
            array = self._from_level(level, numbers, rows, columns)
        elif (rows.step, columns.step) == (1, 1):
            array = self.read(numbers, ((rows[0], rows[-1] + 1), (columns[0], columns[-1] + 1)))
        else:
            array = self._every(numbers, rows, columns)
        return array[(slice(None),) + flips]

    def _from_level(self, number, numbers, rows, columns):
        """The pixels at every n-th line and sample from the level of that step. Of a raster whose size is
        no multiple of it the last ones are not in the level."""
        level, step = self.level(number), 2**number
        height = min(len(rows), level.height - rows[0] // step)
        width = min(len(columns), level.width - columns[0] // step)
        if height <= 0 or width <= 0:
            return self._every(numbers, rows, columns)
        top, left = rows[0] // step, columns[0] // step
        inside = level.read(numbers, ((top, top + height), (left, left + width)))
        if (height, width) == (len(rows), len(columns)):
            return inside
        array = numpy.empty((len(numbers), len(rows), len(columns)), dtype=self.dtype)
        array[:, :height, :width] = inside
        if height < len(rows):
            array[:, height:] = self._every(numbers, rows[height:], columns)
        if width < len(columns):
            array[:, :height, width:] = self._every(numbers, rows[:height], columns[width:])
        return array

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
