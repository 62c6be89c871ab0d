"""Pixels of vexg.Raster are those that GDAL and numpy give, however they are asked for."""

import random
import subprocess
import unittest
import warnings

from support import DATA, SCENE, VEXG, FolderTest, needs, needs_data

import numpy

import vexg
from samples import MTL_BANDS, MTL_SUN, write_mtl


@needs_data
class ReadTest(FolderTest):
    @needs("osgeo")
    def test_sample_data_as_gdal_reads_it(self):
        from osgeo import gdal

        gdal.UseExceptions()
        for file in sorted(DATA.glob("*.tif")) + [DATA / "landsat7.img", DATA / "landsat7_rgb.png"]:
            with self.subTest(file.name):
                source = gdal.Open(str(file))
                want = source.ReadAsArray().reshape(source.RasterCount, source.RasterYSize, source.RasterXSize)
                raster = vexg.open(file)
                self.assertEqual(raster.shape, want.shape)
                self.assertEqual(raster.dtype, want.dtype)
                numpy.testing.assert_array_equal(raster.read(), want)
                block = raster.read(masked=True)
                for band in range(raster.count):
                    mask = source.GetRasterBand(band + 1).GetMaskBand().ReadAsArray() == 0
                    if source.GetRasterBand(band + 1).GetMaskFlags() & gdal.GMF_ALPHA and band == raster.count - 1:
                        continue  # an alpha band is valid itself
                    numpy.testing.assert_array_equal(block.mask[band], mask)
                geo = source.GetGeoTransform(can_return_null=True)
                if geo is not None and raster.transform is not None:
                    a, b, c, d, e, f = raster.transform
                    numpy.testing.assert_allclose((c, a, b, f, d, e), geo, rtol=1e-8, atol=1e-7)

    def test_any_window_bands_order_and_step(self):
        """Blocks at random are the same as cut from all of the raster by numpy."""
        seed = 7
        chance = random.Random(seed)
        for file in ("landsat7_olinda.tif", "landsat7_u16_tiled.tif", "landsat7_f32_strip.tif", "alpha.tif"):
            raster = vexg.open(DATA / file)
            whole = raster.read(order="C")
            bands, lines, samples = raster.shape
            for turn in range(60):
                top, left = chance.randrange(lines), chance.randrange(samples)
                bottom, right = chance.randint(top + 1, lines), chance.randint(left + 1, samples)
                chosen = [chance.randrange(-bands, bands) for _ in range(chance.randint(1, bands + 1))]
                order = chance.choice([None, "C", "BSQ", "BIL", "BIP"])
                masked = chance.random() < 0.5
                with self.subTest(seed=seed, file=file, turn=turn):
                    window = (top, bottom), (left, right)
                    want = whole[numpy.array(chosen)][:, top:bottom, left:right]
                    got = raster.read(chosen, window, order=order, masked=masked)
                    numpy.testing.assert_array_equal(numpy.asarray(got), want)
                    if order == "C":
                        self.assertTrue(got.flags.c_contiguous)
                    out = self.memory_of(want, chance)
                    self.assertIs(raster.read(chosen, window, out=out), out)
                    numpy.testing.assert_array_equal(out, want)
                    rows = slice(chance.randint(-lines, lines), None, chance.choice([-7, -1, 1, 2, 3, 16]))
                    columns = slice(None, chance.randint(-samples, samples), chance.choice([-2, 1, 5, 8]))
                    band = chance.choice([chance.randrange(bands), slice(None), slice(None, None, -1), chosen])
                    numpy.testing.assert_array_equal(raster[band, rows, columns], whole[band, rows, columns])
                    numpy.testing.assert_array_equal(raster[band, top], whole[band, top])

    @staticmethod
    def memory_of(want, chance):
        """An array of the shape and type, in some order of its memory or with gaps."""
        axes = chance.choice([(0, 1, 2), (1, 2, 0), (1, 0, 2), None])
        if axes is None:
            return numpy.zeros((want.shape[0], want.shape[1] * 2, want.shape[2]), want.dtype)[:, ::2]
        return numpy.zeros([want.shape[axis] for axis in axes], want.dtype).transpose(numpy.argsort(axes))

    def test_steps_from_levels_of_the_pyramid(self):
        """Slices with a pyramid are those without one, also where only some come from a level."""
        copy = vexg.open(SCENE).save(self.folder / "scene.dat")
        whole = copy.read(order="C")
        self.assertEqual(copy.levels, [])
        first = copy[0].read()  # a view that keeps the file open without a pyramid
        copy.pyramid(levels=3)
        numpy.testing.assert_array_equal(copy[0].read(), first)
        self.assertEqual(copy.levels, [1, 2, 3])
        for rows, columns in [(slice(None, None, 8), slice(None, None, 8)), (slice(4, None, 4), slice(8, 300, 4)),
                              (slice(3, None, 4), slice(None, None, 4)), (slice(None, None, 2), slice(None, None, 4)),
                              (slice(None, None, -2), slice(0, None, 2)), (slice(0, None, 16), slice(0, None, 16))]:
            numpy.testing.assert_array_equal(copy[1:4, rows, columns], whole[1:4, rows, columns])
        level = copy.level(2)
        numpy.testing.assert_array_equal(level.read(), whole[:, ::4, ::4][:, :level.height, :level.width])
        self.assertGreater(copy._level_for(range(0, 352, 4), range(4, 300, 4)), 0)  # it was used above

    def test_large_blocks_in_pieces(self):
        """A block of many pieces has every line in its place, in all orders."""
        lines, samples = 3001, 1777
        ramp = numpy.arange(3 * lines * samples, dtype="int32").reshape(3, lines, samples)
        for axes in ((0, 1, 2), (1, 2, 0), (1, 0, 2)):
            stored = numpy.ascontiguousarray(ramp.transpose(axes)).transpose(numpy.argsort(axes))
            raster = vexg.from_array(stored)
            for order in ("BSQ", "BIL", "BIP"):
                numpy.testing.assert_array_equal(raster.read([2, 0], ((5, lines), (1, samples)), order=order),
                                                 ramp[[2, 0], 5:, 1:])
            numpy.testing.assert_array_equal(raster.read(masked=True, order="BIL").data, ramp)

    def test_rasterio_windows(self):
        class Window:  # the attributes of rasterio.windows.Window
            col_off, row_off, width, height = 10, 20, 30, 40

        raster = vexg.open(SCENE)
        numpy.testing.assert_array_equal(raster.read(window=Window()), raster[:, 20:60, 10:40])
        numpy.testing.assert_array_equal(raster.read(2, (slice(20, None), slice(None, 7))), raster[2, 20:, :7])


class ArrayTest(unittest.TestCase):
    def test_arrays_go_in_without_a_copy(self):
        chance = numpy.random.default_rng(3)
        for dtype in ("uint8", "int8", "uint16", "int16", "uint32", "int32", "float32", "float64", "uint64", "int64",
                      "complex64", "complex128"):
            plain = (chance.random((3, 40, 50)) * 100).astype(dtype)
            for axes in ((0, 1, 2), (1, 2, 0), (1, 0, 2)):
                stored = numpy.ascontiguousarray(plain.transpose(axes)).transpose(numpy.argsort(axes))
                raster = vexg.from_array(stored)
                self.assertTrue(numpy.shares_memory(raster._node.array, stored))
                numpy.testing.assert_array_equal(raster.read(), plain)
                stored[1, 2, 3] = 7  # is seen, since nothing was copied
                self.assertEqual(raster[1, 2, 3], stored[1, 2, 3])
            numpy.testing.assert_array_equal(vexg.from_array(plain[:, ::2, ::-1]).read(), plain[:, ::2, ::-1])
            swapped = plain.astype(plain.dtype.newbyteorder())
            numpy.testing.assert_array_equal(vexg.from_array(swapped).read(), plain)

    def test_what_changes_is_computed_anew(self):
        array = numpy.ones((1, 20, 30), dtype="float32")
        raster = vexg.from_array(array)
        self.assertEqual(raster.covariance()[0, 0], 0)
        array[0, :, :15] = 3
        self.assertAlmostEqual(raster.covariance()[0, 0], array.var(ddof=1), 6)

    def test_masked_arrays_and_no_data(self):
        array = numpy.ma.masked_equal(numpy.arange(12, dtype="int16").reshape(3, 4), 5)
        array.fill_value = -1
        raster = vexg.from_array(array)
        numpy.testing.assert_array_equal(raster.read(masked=True).mask[0], array.mask)
        self.assertEqual(raster.nodata, -1)
        array.fill_value = 3
        with self.assertRaisesRegex(ValueError, "fill value"):
            vexg.from_array(array)
        nan = numpy.array([[1, numpy.nan], [3, 4]], dtype="float32")
        numpy.testing.assert_array_equal(vexg.from_array(nan, nodata=numpy.nan).read(masked=True).mask[0],
                                         numpy.isnan(nan))

    def test_a_place_for_an_array(self):
        array = numpy.zeros((1, 20, 30), dtype="uint8")
        transform = (10.0, 0.0, 500000.0, 0.0, -20.0, 4500000.0)
        raster = vexg.from_array(array, transform=transform, crs="EPSG:32633")
        self.assertEqual(raster.transform, transform)
        self.assertEqual(raster.crs, "EPSG:32633")
        self.assertEqual(raster.bounds, (500000, 4499600, 500300, 4500000))
        self.assertEqual(vexg.from_array(array, like=raster).bounds, raster.bounds)
        # Turned by 30 degrees: rows and columns as the affine of the place has them.
        c, s = 10 * numpy.cos(numpy.pi / 6), 10 * numpy.sin(numpy.pi / 6)
        turned = vexg.from_array(array, transform=(c, s, 0, s, -c, 0), crs="EPSG:32633")
        numpy.testing.assert_allclose(turned.transform, (c, s, 0, s, -c, 0), atol=1e-12)
        for wrong in ((10, 5, 0, 0, -10, 0), (10, 0, 0, 0, 10, 0), (0, 0, 0, 0, 0, 0)):
            with self.assertRaises(ValueError):
                vexg.from_array(array, transform=wrong)

    def test_what_is_no_raster(self):
        for wrong in (numpy.zeros((2, 2), dtype=object), numpy.zeros((2, 2), dtype="float16"),
                      numpy.zeros((2, 2), dtype="U3"), numpy.array(["a"])):
            with self.assertRaises((TypeError, ValueError)):
                vexg.from_array(wrong)
        for wrong in (numpy.zeros(4), numpy.zeros((0, 3)), numpy.zeros((1, 1, 1, 1))):
            with self.assertRaises(ValueError):
                vexg.from_array(wrong)


@needs_data
class ViewTest(FolderTest):
    def setUp(self):
        super().setUp()
        self.scene = vexg.open(SCENE)
        self.pixels = self.scene.read(order="C").astype("float64")

    def test_formulas_as_numpy_computes_them(self):
        """Expressions at random have the values of numpy, in doubles and one rounding at the end."""
        seed = 11
        chance = random.Random(seed)
        other = numpy.random.default_rng(seed).normal(size=self.pixels.shape[1:]).astype("float32")
        leaves = [(self.scene[band], self.pixels[band]) for band in range(4)]
        leaves.append((vexg.from_array(other), other.astype("float64")))
        unary = [numpy.negative, numpy.absolute, numpy.sqrt, numpy.exp, numpy.log, numpy.sin, numpy.floor]
        binary = [numpy.add, numpy.subtract, numpy.multiply, numpy.true_divide, numpy.maximum, numpy.minimum]

        def tree(depth):
            if depth == 0 or chance.random() < 0.1:
                if chance.random() < 0.25:
                    number = round(chance.uniform(-4, 4), 3) or 1.5
                    return number, numpy.float64(number)
                return chance.choice(leaves)
            if chance.random() < 0.25:
                ufunc, (a, x) = chance.choice(unary), tree(depth - 1)
                return ufunc(a), ufunc(x)
            ufunc, (a, x), (b, y) = chance.choice(binary), tree(depth - 1), tree(depth - 1)
            return ufunc(a, b), ufunc(x, y)

        for turn in range(40):
            with numpy.errstate(all="ignore"):
                view, want = tree(4)
                if not isinstance(view, vexg.Raster):
                    continue
                want = numpy.broadcast_to(want, self.pixels.shape[1:])
                with self.subTest(seed=seed, turn=turn):
                    got = view.read(masked=True)[0]
                    single = want.astype("float32")
                    finite = numpy.isfinite(single)
                    # A step that isn't finite stays invalid, whatever would come of it.
                    self.assertFalse((~got.mask & ~finite).any())
                    numpy.testing.assert_allclose(got.data[~got.mask], single[~got.mask], rtol=2e-6, atol=1e-30)

    def test_operators_and_bands(self):
        a, b = self.pixels[3], self.pixels[2]
        red, nir = self.scene[2], self.scene[3]
        cases = {
            "difference": ((nir - red) / (nir + red), (a - b) / (a + b)),
            "comparison": ((nir > red) & (red >= 60), (a > b) & (b >= 60)),
            "or and not": (~(nir == red) | (red < 30), ~(a == b) | (b < 30)),
            "reversed": (1 / nir - 2 ** (red / 100), 1 / a - 2 ** (b / 100)),
            "where": (vexg.where(nir > red, nir, -1), numpy.where(a > b, a, -1)),
            "array on the left": (numpy.float32(3) * red, 3 * b),
        }
        for name, (view, want) in cases.items():
            with self.subTest(name):
                numpy.testing.assert_array_equal(view.read()[0], want.astype("float32"))
        numpy.testing.assert_array_equal((self.scene * 2).read(), (self.pixels * 2).astype("float32"))
        numpy.testing.assert_array_equal((self.scene - red).read(), (self.pixels - b).astype("float32"))
        # One view of one source, however it is put together.
        self.assertEqual(((nir - red) / (nir + red))._chain().document().count(b'ID="OpenRasterCommand"'), 1)
        with self.assertRaises(ValueError):
            bool(red > nir)
        with self.assertRaises(ValueError):
            self.scene.bands(0, 1) + self.scene.bands(0, 1, 2)

    def test_calc_types_and_stack(self):
        calc = vexg.calc("NDVI=ndvi; change=abs(b0 - old_b1)", self.scene, nir=3, red=2, old=self.scene)
        a, b = self.pixels[3], self.pixels[2]
        numpy.testing.assert_array_equal(calc.read()[0], ((a - b) / (a + b)).astype("float32"))
        self.assertEqual(calc.names, ["NDVI", "change"])
        rounded = (self.scene[0] / 2).astype("uint8").read(masked=True)[0]
        numpy.testing.assert_array_equal(rounded, numpy.floor(self.pixels[0] / 2 + 0.5))  # halves away from 0
        stack = self.scene.stack(calc)
        self.assertEqual((stack.shape[0], stack.dtype), (8, numpy.dtype("float32")))
        numpy.testing.assert_array_equal(stack.read()[:6], self.pixels.astype("float32"))

    def test_clip_by_bounds(self):
        left, top, size = self.scene.transform[2], self.scene.transform[5], self.scene.transform[0]
        bounds = (left + 10.2 * size, top - 50.5 * size, left + 30 * size, top - 20 * size)
        part = self.scene.clip(bounds)
        numpy.testing.assert_array_equal(part.read(), self.pixels[:, 20:51, 10:30])
        self.assertAlmostEqual(part.bounds[0], left + 10 * size, 6)
        longitude = vexg.transform_points([bounds[:2], bounds[2:]], self.scene.crs, "EPSG:4326")
        wide = self.scene.clip((*longitude[0], *longitude[1]), crs="EPSG:4326")
        self.assertLessEqual(abs(wide.shape[1] - part.shape[1]), 2)
        with self.assertRaisesRegex(vexg.Error, "outside the raster"):
            self.scene.clip((0, 0, 1, 1))
        with self.assertRaises(vexg.Error):
            self.scene.clip(window=((0, 400), (0, 10)))

    def test_views_of_commands_without_a_method(self):
        shown = vexg.view("CreateSubsetRasterCommand", SrcURI=self.scene, SubRect="3 4 10 20", Bands=[2, 0])
        numpy.testing.assert_array_equal(shown.read(), self.pixels[[2, 0], 4:21, 3:11])
        pixel = shown.clip(window=((0, 1), (0, 1)))
        both = vexg.view("CreateBandStackRasterCommand", SrcURI=[self.scene[0], pixel])
        with self.assertRaises(vexg.Error):
            both.read()
        with self.assertRaisesRegex(vexg.Error, "NoSuchCommand"):
            vexg.view("NoSuchCommand", SrcURI=self.scene).shape

    def test_no_data_and_masks(self):
        view = self.scene.with_nodata(60, 70)[0].read(masked=True)[0]
        numpy.testing.assert_array_equal(view.mask, numpy.isin(self.pixels[0], (60, 70)))
        masked = self.scene.mask(60, 70, band=1)[0].read(masked=True)[0]
        numpy.testing.assert_array_equal(masked.mask, numpy.isin(self.pixels[1], (60, 70)))
        turned = self.scene.mask(60, 70, band=1, inverse=True)[0].read(masked=True)[0]
        numpy.testing.assert_array_equal(turned.mask, ~numpy.isin(self.pixels[1], (60, 70)))

    def test_calibration_is_that_of_the_commands(self):
        """Views of physical values have the bits of the files that the program makes."""
        constants = {"radiance": ({"gain": 0.775, "offset": -36.2}, []),
                     "reflectance": ({"gain": [0.775] * 6, "offset": -36.2, "irradiance": 1969, "sun_elevation": 61.5,
                                      "distance": 1.0128},
                                     ["--irradiance", "1969", "--sun-elevation", "61.5", "--distance", "1.0128"]),
                     "temperature": ({"gain": 0.775, "offset": -36.2, "k1": 666.09, "k2": 1282.71},
                                     ["--k1", "666.09", "--k2", "1282.71"])}
        for quantity, (given, options) in constants.items():
            with self.subTest(quantity):
                file = self.folder / f"{quantity}.tif"
                subprocess.run([VEXG, "calibrate", quantity, SCENE, file, "--gain", "0.775", "--offset=-36.2",
                                *options], check=True, capture_output=True)
                numpy.testing.assert_array_equal(self.scene.calibrate(quantity, **given).read(),
                                                 vexg.open(file).read())
        with self.assertRaisesRegex(vexg.Error, "sun_elevation"):
            self.scene.reflectance(gain=1, offset=0, irradiance=1, distance=1)
        with self.assertRaisesRegex(TypeError, "gian"):
            self.scene.radiance(gian=1)

    def test_constants_of_metadata(self):
        """The metadata of a Landsat scene give the reflectance of its own factors (USGS Landsat 8 data users
        handbook, section 5), and all quantities have the bits of the files that the program makes."""
        mtl = self.folder / "scene_MTL.txt"
        write_mtl(mtl)
        got = self.scene.reflectance(metadata=mtl)
        chosen = self.scene.bands(2, 0).reflectance(metadata=mtl, metadata_bands=["B3", 1])
        for band, name in enumerate(MTL_BANDS):
            gain, offset = MTL_BANDS[name][2:]
            want = numpy.maximum(gain * self.pixels[band] + offset, 0) / numpy.sin(numpy.radians(MTL_SUN))
            numpy.testing.assert_allclose(got.read(band), want, rtol=1e-5, atol=1e-7)
        numpy.testing.assert_array_equal(chosen.read(), got.read([2, 0]))
        overridden = self.scene.reflectance(metadata=mtl, sun_elevation=30)
        numpy.testing.assert_allclose(overridden.read(0) * 0.5, got.read(0) * numpy.sin(numpy.radians(MTL_SUN)), rtol=1e-5)
        cases = {"reflectance": ({}, []), "radiance": ({"scale": 10, "dtype": "uint16"}, ["--scale", "10", "--type", "UInt16"])}
        for quantity, (given, options) in cases.items():
            file = self.folder / f"{quantity}.tif"
            subprocess.run([VEXG, "calibrate", quantity, SCENE, file, "--from-metadata", mtl, *options], check=True,
                           capture_output=True)
            numpy.testing.assert_array_equal(self.scene.calibrate(quantity, metadata=mtl, **given).read(),
                                             vexg.open(file).read())
        kelvins = self.scene.temperature(gain=0.775, offset=-36.2, k1=666.09, k2=1282.71)
        celsius = self.scene.temperature(gain=0.775, offset=-36.2, k1=666.09, k2=1282.71, unit="celsius")
        some = kelvins.read() > 0
        numpy.testing.assert_allclose(celsius.read()[some], kelvins.read()[some] - 273.15, atol=1e-3)
        # Radiances of a header whose bands are told in its order.
        raster = vexg.from_array(numpy.full((8, 3, 4), 700, dtype="uint16")).save(self.folder / "wv.tif")
        header, file = DATA / "sidecars" / "wv03.IMD", self.folder / "wv_radiance.tif"
        done = subprocess.run([VEXG, "calibrate", "radiance", self.folder / "wv.tif", file, "--from-metadata", header],
                              capture_output=True, text=True)
        self.assertEqual(done.returncode == 0, works(lambda: raster.radiance(metadata=header)), done.stderr)
        if done.returncode == 0:
            numpy.testing.assert_array_equal(raster.radiance(metadata=header).read(), vexg.open(file).read())

    def test_constants_that_are_missing_or_in_doubt(self):
        mtl = self.folder / "scene_MTL.txt"
        write_mtl(mtl)
        for kind, words, call in (
                (vexg.Error, "metadata_bands", lambda: self.scene.bands(2, 0).reflectance(metadata=mtl)),
                (vexg.Error, "k1", lambda: self.scene.temperature(metadata=mtl)),
                (vexg.Error, "tells? ", lambda: self.scene.reflectance(metadata=self.folder / "scene.foo")),
                (vexg.Error, "no_MTL", lambda: self.scene.reflectance(metadata=self.folder / "no_MTL.txt")),
                (vexg.Error, "no.xml", lambda: self.scene.reflectance(metadata=self.folder / "no.xml")),
                (ValueError, "6 bands", lambda: self.scene.radiance(gain=[1, 2], offset=0)),
                (ValueError, "horizon", lambda: self.scene.reflectance(metadata=mtl, sun_elevation=-3)),
                (ValueError, "above 0", lambda: self.scene.reflectance(gain=1, offset=0, irradiance=0, distance=1,
                                                                       sun_elevation=30)),
                (TypeError, "goes without", lambda: self.scene.reflectance(reflectance_gain=1, gain=1)),
                (TypeError, "metadata", lambda: self.scene.radiance(gain=1, offset=0, metadata_bands=[1]))):
            with self.subTest(words), self.assertRaisesRegex(kind, words):
                call()

    def test_other_types_and_scales(self):
        values = numpy.array([[-3.5, -0.5, 0.49, 0.5, 254.5, 255.4, 255.6, numpy.nan]], dtype="float32")
        made = vexg.from_array(values).astype("uint8").read(masked=True)[0]
        numpy.testing.assert_array_equal(made.mask, [[True, True, False, False, False, False, True, True]])
        numpy.testing.assert_array_equal(made.compressed(), [0, 1, 255, 255])
        levels = numpy.arange(0, 256, 5, dtype="uint8").reshape(1, 4, 13)
        scaled = vexg.from_array(levels).scale(50, 150, (0, 1000), dtype="int16").read()
        numpy.testing.assert_array_equal(scaled, numpy.clip((levels.astype(float) - 50) * 10, 0, 1000))
        whole = vexg.from_array(levels).scale(0, 255, dtype="uint16").read()
        numpy.testing.assert_array_equal(whole, levels.astype("uint16") * 257)
        self.assertEqual(self.scene.astype("int32").dtype, numpy.dtype("int32"))
        with self.assertRaises(ValueError):
            self.scene.scale(3, 3)

    def test_stacks_keep_the_names_of_their_bands(self):
        ndvi = vexg.calc("NDVI=(b3 - b2) / (b3 + b2)", self.scene)
        both = self.scene[3].astype("float32").stack(ndvi)
        self.assertEqual(both.names[1], "NDVI")
        self.assertEqual(ndvi.stack(ndvi, self.scene[0]).names[:2], ["NDVI", "NDVI"])
        size = (numpy.s_[0:50], numpy.s_[0:60])
        with self.assertWarnsRegex(UserWarning, "raster 1 of the stack lies elsewhere"):
            self.scene.clip(window=size).stack(self.scene.clip(window=((0, 50), (9, 69))))
        with warnings.catch_warnings():
            warnings.simplefilter("error")
            self.scene.clip(window=size).stack(self.scene[0].clip(window=size), self.pixels[:, :50, :60])

    def test_grids_compared(self):
        """The affine grids of both tell where one lies in the other."""
        part = self.scene.clip(window=((10, 90), (20, 60)))
        found = self.scene.compare_grid(part)
        self.assertEqual((found["same_size"], found["same_system"]), (False, True))
        numpy.testing.assert_allclose(found["shift"], (-20, -10), atol=1e-6)
        numpy.testing.assert_allclose(found["largest_offset"], numpy.hypot(20, 10), rtol=1e-6)
        half = vexg.from_array(numpy.zeros((1, 5, 7), "uint8"), transform=(57, 0, self.scene.transform[2], 0, -57,
                                                                         self.scene.transform[5]), crs=self.scene.crs)
        numpy.testing.assert_allclose(half.compare_grid(self.scene)["scale"], (2, 2), rtol=1e-9)
        self.assertIsNone(vexg.open(DATA / "complex64.tif").compare_grid(self.scene)["shift"])

    def test_warps_as_the_program_makes_them(self):
        file = self.folder / "warped.tif"
        subprocess.run([VEXG, "warp", SCENE, file, "--to", "EPSG:4326", "--resampling", "linear"], check=True,
                       capture_output=True)
        made, view = vexg.open(file), self.scene.warp("EPSG:4326", resampling="linear")
        self.assertEqual(view.crs, "EPSG:4326")
        numpy.testing.assert_allclose(view.transform, made.transform, rtol=1e-12)
        numpy.testing.assert_array_equal(view.read(masked=True).filled(0), made.read(masked=True).filled(0))
        self.assertEqual(self.scene.warp(like=made).shape, made.shape)

    def test_warps_take_in_the_area_of_a_pixel(self):
        """On a grid of three by three pixels each, the kernels are what numpy makes of these."""
        a, b, c, d, e, f = self.scene.transform
        like = vexg.from_array(numpy.zeros((1, 100, 90), "uint8"), transform=(3 * a, b, c, d, 3 * e, f), crs=self.scene.crs)
        blocks = self.pixels[0, :300, :270].astype(float).reshape(100, 3, 90, 3)
        for name, function in (("average", numpy.mean), ("min", numpy.min), ("max", numpy.max)):
            got = self.scene[0].warp(like=like, resampling=name).read(0)
            self.assertLessEqual(abs(got - function(blocks, axis=(1, 3))).max(), 0.501, name)
        with self.assertRaisesRegex(ValueError, "resampling"):
            self.scene.warp("EPSG:4326", resampling="best")


def works(call):
    """Whether a call raises nothing of ours."""
    try:
        call()
    except (vexg.Error, ValueError):
        return False
    return True


if __name__ == "__main__":
    unittest.main()
