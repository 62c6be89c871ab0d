"""What a raster is: its size, type, place and names."""

import numpy

from . import _values
from ._jobs import files_of
from .errors import Error


class Described:
    """The properties of a raster, all asked for at the first use of one."""

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
        return text.rstrip("\n").split("\n") if text else []

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
