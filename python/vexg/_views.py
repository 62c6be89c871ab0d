"""The views that stand on a raster."""

import os

import numpy

from . import _values
from ._doors import job_node
from ._jobs import Draft, Node
from ._pixels import rect_of
from .errors import Error

_KERNELS = ("Nearest", "Linear", "Cubic", "Lanczos", "Average", "Mode", "Min", "Max", "Median")


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
        return self._view("CreateConvertedRasterCommand", {"DataType": _values.type_word(dtype)})

    def scale(self, low, high, to=None, *, dtype=None):
        """Shows it with the values from low to high carried to another range; what lies outside is cut to
        that.

        Args:
            to: the ends of the other range; by default all that an integer type holds, or 0 and 1.
            dtype: of the result; that of the raster by default.
        """
        ends = [float(low), float(high)] + ([] if to is None else [float(end) for end in to])
        if low == high or len(ends) not in (2, 4):
            raise ValueError("scale takes the two ends of a range, and those of another one")
        return self._view("CreateConvertedRasterCommand", {
            "Scale": ends, "DataType": _values.type_word(self.dtype if dtype is None else dtype)})

    def unscale(self, dtype="float32"):
        """Shows the values that its pixels stand for by the scales and offsets of its bands."""
        return self._view("CreateConvertedRasterCommand", {"Unscale": "1", "DataType": _values.type_word(dtype)})

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
            resampling: "nearest"; "linear", "cubic" or "lanczos", which are stretched over the area that a
                pixel covers; "average", "mode", "min", "max" or "median" of the pixels in that.
            method: "polynomial", within an eighth of a pixel, or "rigorous".
            nodata: of the result; by default the source's.
        """
        if (to is None) == (like is None):
            raise TypeError("warp takes either a coordinate system or a raster with a grid")
        kernel = "Linear" if resampling == "bilinear" else str(resampling).capitalize()
        if kernel not in _KERNELS:
            raise ValueError(f"resampling is one of {', '.join(_KERNELS).lower()}, and not {resampling!r}")
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
            "ResamplingMethod": "Nearest", "Kernel": kernel, "Grid": "Exact",
            "NoData": nodata})

    def reflectance(self, **constants):
        """Shows top-of-atmosphere reflectance; see calibrate for the constants."""
        return self.calibrate("reflectance", **constants)

    def radiance(self, **constants):
        """Shows at-sensor radiance; see calibrate for the constants."""
        return self.calibrate("radiance", **constants)

    def temperature(self, **constants):
        """Shows brightness temperature; see calibrate for the constants."""
        return self.calibrate("temperature", **constants)

    def calibrate(self, quantity, *, metadata=None, metadata_bands=None, dtype="float32", scale=1.0, unit="kelvin",
                  **constants):
        """Shows a physical quantity: "radiance", "reflectance" or "temperature". The values are those
        of the command that calibrates whole files, and are computed where they are read.

        Args:
            metadata: the metadata of the scene, from which constants are taken that are not given: the MTL
                of a Landsat scene, MTD_MSIL1C.xml of a Sentinel-2 product, and all else that
                `vexg calibrate --from-metadata` takes (docs/metadata.md).
            metadata_bands: which bands of the metadata those of the raster are, such as [4, 3, 2], where
                neither names nor their number tell it.
            dtype: of the result. Values for integers are cut and keep their low bits; astype rounds them, and
                marks those that don't fit.
            scale: a factor on the result.
            unit: of temperatures: "kelvin" or "celsius".
            constants: gain, offset, irradiance, k1, k2 (a number, or one for each band), sun_elevation in
                degrees, distance in astronomical units; reflectance_gain and reflectance_offset in place of
                gain, offset, irradiance and distance.
        """
        from . import _calibration

        return _calibration.calibrate(self, quantity, metadata, metadata_bands, dtype, scale, unit, constants)

    def compare_grid(self, other):
        """Tells how its grid lies in that of another raster: a dictionary with same_size, same_system, and,
        where both have a place that can be carried from one to the other, shift (sample and line of the other
        at which its upper left corner lies), scale (pixels of the other for each of its own, across and down),
        rotation in degrees, clockwise, and largest_offset: how many pixels of the other a place is off at most
        where pixels are taken by their sample and line. None stands for what can't be told."""
        from .raster import door_of

        draft = Draft()
        draft.step("grids", "CompareRasterGridsCommand",
                   {"URI": job_node(self._chain()), "OtherURI": job_node(other._chain())})
        found = door_of([self, other]).run(draft).values("grids")

        def pair(name):
            return (found[name + "X"], found[name + "Y"]) if name + "X" in found else None

        return {"same_size": found["SameSize"], "same_system": found["SameSystem"], "shift": pair("Shift"),
                "scale": pair("Scale"), "rotation": found.get("Rotation"), "largest_offset": found.get("LargestOffset")}
