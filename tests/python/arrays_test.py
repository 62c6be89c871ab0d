"""Rasters in pickles, dask and xarray have the pixels that they have by themselves."""

import multiprocessing
import pickle
import unittest

from support import DATA, SCENE, FolderTest, needs, needs_data

import numpy

import vexg


def index_of(scene):
    """A view of many commands."""
    part = scene.clip(window=((10, 200), (5, 300)))
    return part.stack((part[3] - part[2]) / (part[3] + part[2])).with_nodata(0)


def sum_of(raster):
    """The sum of a raster's valid pixels; called in another process too."""
    return float(raster.read(masked=True).astype("float64").sum())


@needs_data
class PickleTest(unittest.TestCase):
    def test_views_travel_to_other_processes(self):
        view = index_of(vexg.open(SCENE))
        rasters = [view, view[6], vexg.open(DATA / "RGB.byte.tif").mask(3, 4), vexg.open(SCENE).warp("EPSG:4326"),
                   vexg.from_array(numpy.arange(24.0).reshape(2, 3, 4), nodata=5)]
        want = [sum_of(raster) for raster in rasters]
        self.assertEqual([sum_of(pickle.loads(pickle.dumps(raster))) for raster in rasters], want)
        with multiprocessing.get_context("spawn").Pool(2) as pool:
            self.assertEqual(pool.map(sum_of, rasters), want)

    def test_equal_views_are_one(self):
        self.assertIs(index_of(vexg.open(SCENE))._chain(), index_of(vexg.open(SCENE))._chain())


@needs_data
@needs("dask")
class DaskTest(FolderTest):
    def test_blocks_on_threads_and_in_processes(self):
        view = index_of(vexg.open(SCENE))
        want = view.read()
        array = view.to_dask(64)
        self.assertEqual((array.shape, array.dtype), (view.shape, view.dtype))
        self.assertEqual(array.chunks[0], (7,))
        numpy.testing.assert_array_equal(array.compute(scheduler="threads", num_workers=4), want)
        numpy.testing.assert_array_equal(array[6, ::3, 5].compute(scheduler="threads"), want[6, ::3, 5])
        doubled = view.map_blocks(numpy.negative, dtype="float32", chunks=100)
        numpy.testing.assert_array_equal(doubled.compute(scheduler="threads"), -want)
        import multiprocessing.popen_spawn_posix  # noqa: F401

        import dask

        with dask.config.set({"multiprocessing.context": "spawn"}):
            small = view.to_dask((7, 190, 150))
            numpy.testing.assert_array_equal(small.compute(scheduler="processes", num_workers=2), want)

    def test_names_tell_what_is_the_same(self):
        from dask.base import tokenize

        copy = vexg.open(SCENE).save(self.folder / "copy.tif")
        self.assertEqual(tokenize(copy), tokenize(vexg.open(self.folder / "copy.tif")))
        self.assertNotEqual(tokenize(copy), tokenize(copy[0]))
        before = tokenize(copy)
        vexg.open(SCENE).bands(5, 4, 3, 2, 1, 0).save(self.folder / "copy.tif", overwrite=True)
        self.assertNotEqual(before, tokenize(vexg.open(self.folder / "copy.tif")))


@needs_data
@needs("xarray")
class XarrayTest(unittest.TestCase):
    def test_arrays_and_the_engine(self):
        import xarray

        from vexg._xarray import VexgBackend

        for file in ("landsat7_olinda.tif", "RGB.byte.tif", "float_nan.tif"):
            with self.subTest(file):
                raster = vexg.open(DATA / file)
                want = raster.read()
                for array in (raster.to_xarray(), xarray.open_dataset(DATA / file, engine=VexgBackend).band_data):
                    self.assertEqual(array.dims, ("band", "y", "x"))
                    numpy.testing.assert_array_equal(array.values, want)
                    numpy.testing.assert_array_equal(array[-1, ::2, 1:].values, want[-1, ::2, 1:])
                    numpy.testing.assert_array_equal(array.isel(y=[0, 1], x=-1).values, want[:, [0, 1], -1])
                masked = raster.to_xarray(masked=True)
                numpy.testing.assert_array_equal(numpy.isnan(masked.values), raster.read(masked=True).mask)
                numpy.testing.assert_array_equal(masked[0, -1, ::3].values, masked.values[0, -1, ::3])

    @needs("dask", "rasterio")
    def test_coordinates_as_rasterio_has_them(self):
        import rasterio
        import xarray

        from vexg._xarray import VexgBackend

        dataset = xarray.open_dataset(SCENE, engine=VexgBackend, chunks={})
        with rasterio.open(SCENE) as peer:
            x, y = peer.xy([0, peer.height - 1], [0, peer.width - 1])
            numpy.testing.assert_allclose([dataset.x[0], dataset.x[-1]], x)
            numpy.testing.assert_allclose([dataset.y[0], dataset.y[-1]], y)
            numpy.testing.assert_array_equal(dataset.band_data.compute().values, peer.read())
        self.assertIn("SIRGAS 2000 / UTM zone 25S", dataset.spatial_ref.attrs["crs_wkt"])
        self.assertEqual(vexg.open(SCENE).to_xarray(chunks=128).chunks[1], (128, 128, 96))


if __name__ == "__main__":
    unittest.main()
