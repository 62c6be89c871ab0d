"""Raster files that are written block by block."""

import json

import numpy

from . import _values
from ._doors import local
from ._jobs import Draft, named_inputs, source_node
from ._library import library
from ._pixels import _AXES, rect_of
from ._saving import Staged, format_of
from .errors import Error


def create(file, *, like=None, shape=None, dtype=None, transform=None, crs=None, nodata=None, format=None,
           overwrite=False, **options):
    """Makes a raster file to be written block by block, in a context:

        with vexg.create("out.tif", like=scene, dtype="float32", bands=1) as out:
            for window in scene.blocks():
                out.write(work(scene.read(window=window)), window)

    The file takes its place when the context ends; after an exception there is none.

    Args:
        like: a raster whose size, place, type, no-data values and names it has.
        shape: bands, lines and samples; in place of those of `like`.
        dtype: of the pixels.
        transform: six numbers in the order of rasterio's Affine; crs: the coordinate system for it.
        nodata: of all bands.
        options: further inputs of CreateRasterCommand by Python names, such as bands=1.
    """
    from .raster import geo_ref_text

    inputs = named_inputs("CreateRasterCommand", options)
    if shape is not None:
        bands, lines, samples = (int(extent) for extent in shape)
        inputs.update(Bands=bands, Lines=lines, Samples=samples)
    elif like is None:
        raise TypeError("create takes a shape, or a raster that it is like")
    if dtype is not None or like is None:
        inputs["DataType"] = _values.type_word("uint8" if dtype is None else dtype)
    if transform is not None:
        size = shape[1:] if shape is not None else like.shape[1:]
        inputs["GeoRef"] = geo_ref_text(transform, crs, size)
    if nodata is not None:
        count = inputs.get("Bands") or like.count
        inputs["NoDataValue"] = numpy.full(int(count), nodata, dtype=float)
    return Writer(file, like, inputs, format_of(file, format), overwrite)


class Writer:
    """A raster file in the making; see create."""

    def __init__(self, file, like, inputs, format, overwrite):
        if like is not None and like._door is not local:
            raise Error("a file is written block by block in this process alone")
        self._staged = Staged(file, overwrite, like.files if like is not None else [])
        self._uri = None
        draft = Draft()
        draft.step("make", "CreateRasterCommand", {
            "ConnStr": str(self._staged.work), "Format": format,
            "SrcURI": None if like is None else like._chain(), **inputs})
        try:
            self._uri = local.run(draft).value("make", "URI")
            info = json.loads(library.describe(f"[{self._uri}] ".encode()))
            self.shape = info["bands"], info["lines"], info["samples"]
            self.dtype = _values.DTYPES[info["type"]]
            self._no_data = [None if value is None else float(value) for value in info["noData"]]
        except BaseException:
            self._drop()
            raise

    ndim = 3

    def write(self, array, window=None, bands=None):
        """Writes a block.

        Args:
            array: of bands, lines and samples, or of lines and samples for one band. The pixels that a
                masked array leaves out become no data where the file has a value for it.
            window: as of Raster.read; all by default.
            bands: a number or several; all by default.
        """
        if self._uri is None:
            raise Error("the file is closed")
        rect = rect_of(window, *self.shape[1:])
        if bands is None:
            numbers = numpy.arange(self.shape[0], dtype="uint32")
        else:
            numbers = numpy.atleast_1d(numpy.asarray(bands)).astype("uint32")
        wanted = (numbers.size, rect[3] - rect[1] + 1, rect[2] - rect[0] + 1)
        mask = numpy.ma.getmask(array)
        data = numpy.ma.getdata(array)
        if data.ndim == 2 and numbers.size == 1:
            data = data[None]
        if data.shape != wanted:
            raise ValueError(f"the array has the shape {data.shape}, and the block {wanted}")
        if not numpy.can_cast(data.dtype, self.dtype, "same_kind"):
            raise TypeError(f"an array of {data.dtype} can't be written as {self.dtype}")
        if numbers.max(initial=0) >= self.shape[0]:
            raise IndexError(f"there is no band {numbers.max()}; the file has {self.shape[0]}, from 0")
        data = self._filled(data, mask, numbers)
        memory = next((order for order in (2, 0, 1) if data.transpose(_AXES[order]).flags.c_contiguous), 2)
        block = numpy.ascontiguousarray(data.transpose(_AXES[memory]), dtype=self.dtype)
        local.write(self._uri, rect, numbers, memory, _values.CODES[_values.type_word(self.dtype)], block, None)

    def _filled(self, data, mask, numbers):
        """The pixels with the no-data value where they are masked."""
        if mask is numpy.ma.nomask or not mask.any():
            return data
        values = [self._no_data[number] for number in numbers]
        if None in values:
            raise ValueError("pixels are masked, and the file has no no-data value")
        fill = numpy.array(values, dtype=self.dtype)[:, None, None]
        return numpy.where(mask.reshape(data.shape), fill, data.astype(self.dtype, copy=False))

    def __setitem__(self, key, array):
        key = key if isinstance(key, tuple) else (key,)
        key += (slice(None),) * (3 - len(key))
        bands = numpy.arange(self.shape[0])[key[0]]
        self.write(array, key[1:], bands)

    def close(self):
        """Finishes the file and moves it to its place; gives it as a Raster."""
        from .raster import Raster

        try:
            fault = self._end()
            if fault:
                raise Error(fault, "CloseRasterCommand", "finish")
            self._staged.commit()
        finally:
            self._drop()
        return Raster(source_node(self._staged.target))

    def _end(self):
        """Closes the raster; why it could not be finished."""
        if self._uri is None:
            raise Error("the file is closed")
        draft = Draft()
        draft.step("finish", "CloseRasterCommand", {"URI": _values.uri_text(self._uri)})
        self._uri = None
        return local.run(draft).text("finish", "Fault")

    def _drop(self):
        """Removes what did not get to its place."""
        if self._uri is not None:
            self._end()
        self._staged.__exit__()

    def __enter__(self):
        return self

    def __exit__(self, kind, *_):
        if kind is not None:
            self._drop()
        elif self._uri is not None:
            self.close()
