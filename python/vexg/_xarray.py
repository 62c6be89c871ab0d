"""xarray: rasters as DataArrays, and the engine "vexg" of xarray.open_dataset."""

import os

import numpy
import xarray
from xarray.backends import BackendArray, BackendEntrypoint
from xarray.core import indexing

from .raster import open as open_raster


class _Pixels(BackendArray):
    """The pixels of a raster, read as they are indexed."""

    def __init__(self, raster, masked):
        self._raster = raster
        self._masked = masked
        self.shape = raster.shape
        self.dtype = _masked_type(raster.dtype) if masked else raster.dtype

    def __getitem__(self, key):
        return indexing.explicit_indexing_adapter(key, self.shape, indexing.IndexingSupport.BASIC, self._read)

    def _read(self, key):
        if not self._masked:
            return self._raster[key]
        return _with_nan(self._raster, key, self.dtype)

    def __dask_tokenize__(self):
        return self._raster.__dask_tokenize__(), self._masked


def _masked_type(dtype):
    """The smallest type of floating-point numbers that holds all values of an integer type."""
    return dtype if dtype.kind in "fc" else numpy.dtype("float32" if dtype.itemsize <= 2 else "float64")


def _with_nan(raster, key, dtype):
    """Pixels with NaN where they are not valid."""
    spans = []
    for part, length in zip(key, raster.shape):
        spans.append(part if isinstance(part, slice) else slice(part % length, part % length + 1))
    ranges = [range(*span.indices(length)) for span, length in zip(spans, raster.shape)]
    if not all(ranges):
        array = numpy.empty(tuple(len(each) for each in ranges), dtype=dtype)
    else:
        window = tuple((min(each), max(each) + 1) for each in ranges[1:])
        block = raster.read(list(ranges[0]), window, masked=True)
        array = block.data.astype(dtype)
        array[numpy.ma.getmaskarray(block)] = numpy.nan
        array = array[:, ::ranges[1].step, ::ranges[2].step]
    return array[tuple(slice(None) if isinstance(part, slice) else 0 for part in key)]


def _variable(raster, chunks, masked):
    attributes = {}
    if raster.nodata is not None and not masked:
        attributes["_FillValue"] = raster.nodata
    if any(raster.names):
        attributes["long_name"] = tuple(raster.names)
    if chunks is not None and not masked:
        data = raster.to_dask(chunks)
    else:
        data = indexing.LazilyIndexedArray(_Pixels(raster, masked))
    return xarray.Variable(("band", "y", "x"), data, attributes)


def _coordinates(raster):
    """The coordinates of the middles of the pixels, and the place as rioxarray and GDAL know it."""
    bands, lines, samples = raster.shape
    found = {"band": ("band", numpy.arange(1, bands + 1))}
    place = {}
    grid = raster._grid()
    if grid is not None:
        x0, xx, xy, y0, yx, yy = grid
        place["GeoTransform"] = " ".join(repr(number) for number in grid)
        if xy == 0 and yx == 0:
            found["x"] = ("x", x0 + xx * (numpy.arange(samples) + 0.5))
            found["y"] = ("y", y0 + yy * (numpy.arange(lines) + 0.5))
    if raster.crs_wkt is not None:
        place["crs_wkt"] = place["spatial_ref"] = raster.crs_wkt
    found["spatial_ref"] = ((), 0, place)
    return found


def data_array(raster, chunks, masked):
    """The DataArray of a raster; see Raster.to_xarray."""
    variable = _variable(raster, chunks, masked)
    array = xarray.DataArray(variable, coords=_coordinates(raster))
    return array.chunk(chunks) if chunks is not None and masked else array


class VexgBackend(BackendEntrypoint):
    """Opens rasters of all formats that vexg reads:

    xarray.open_dataset("scene.tif", engine="vexg", chunks={})
    """

    description = "Raster files by vexg"
    open_dataset_parameters = ("filename_or_obj", "drop_variables", "mask_and_scale", "masked", "subdataset", "server")

    def open_dataset(self, filename_or_obj, *, drop_variables=None, masked=False, subdataset=None, server=None,
                     mask_and_scale=None, **_):
        raster = open_raster(os.fspath(filename_or_obj), subdataset=subdataset, server=server)
        variable = _variable(raster, None, masked)
        lines, samples = raster._good_chunks(32 << 20)
        variable.encoding["preferred_chunks"] = {"band": raster.count, "y": lines, "x": samples}
        dataset = xarray.Dataset({"band_data": variable}, coords=_coordinates(raster))
        dataset.set_close(raster.close)
        return dataset.drop_vars([name for name in drop_variables or () if name in dataset])

    def guess_can_open(self, filename_or_obj):
        try:
            ending = os.path.splitext(os.fspath(filename_or_obj))[1].lower()
        except TypeError:
            return False
        return ending in {".tif", ".tiff", ".img", ".vmosaic", ".dat", ".ntf", ".jp2"}
