"""The views that stand on a raster."""

import os

import numpy

from . import _formula, _values
from ._doors import job_node
from ._jobs import Draft, Node
from ._pixels import rect_of
from .errors import Error


class Views:
    """The ways to show a raster differently. None reads pixels as it is made."""

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
            from .raster import transform_points

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
        from .raster import stack

        return stack(self, *others, dtype=dtype)

    def level(self, number):
        """Shows a level of its pyramid; 0 is the raster itself."""
        if number == 0:
            return self
        if number not in self.levels:
            raise Error(f"there is no level {number}; there are {self.levels or 'none'}")
        node = Node("GetRasterPyramidCommand", (("URI", self._chain()), ("Level", str(int(number))),
                                                ("Placing", "Exact")), "PyramidURI")
        return self._shown(node)

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
        return self._shown(Node("CreateMaskedRasterCommand", (("SrcURI", self._chain()), ("MaskURI", mask))))

    def region(self, shapes, layer=None, where=None, coordinates="Map"):
        """Shows it without the pixels outside the shapes of a vector file.

        Args:
            layer: by its name or number; all by default.
            where: "FIELD=VALUE": only records with that value.
            coordinates: "Map" or "Pixel".
        """
        inputs = [("Vectors", os.path.abspath(os.fspath(shapes)))]
        inputs += [("Layer", str(layer))] if layer is not None else []
        inputs += [("Where", where)] if where is not None else []
        shape = Node("CreateGeometryROIDefCommand",
                     tuple(inputs) + (("ScanRules", "Steady"), ("Coordinates", coordinates)))
        return self._shown(Node("CreateROIRasterCommand", (("SrcURI", self._chain()), ("ROIDefURI", shape))))

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
            metadata: the header of the scene, from which constants are taken that are not given: the MTL of
                a Landsat scene, or one that `vexg calibrate --from-metadata` takes.
            constants: gain, offset, irradiance, k1, k2 (a number, or one for each band), sun_elevation in
                degrees, distance in astronomical units, scale; metadata_bands, the numbers of the bands in
                an MTL where that has more.
        """
        from . import _calibration

        return _calibration.calibrate(self, quantity, metadata, constants)
