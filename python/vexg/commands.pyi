"""All commands of the library, with what they take and give; see commands.py.

Made by scripts/python_stubs from `vexg commands --json`.
"""

from collections.abc import Callable, Sequence
from os import PathLike
from typing import Any, Literal, TypedDict

import numpy
from numpy.typing import ArrayLike, NDArray

from .raster import Raster
from .server import Server

Progress = bool | Callable[[float], object]

def run(command: str, *, server: Server | None = None, progress: Progress = False, **inputs: Any) -> dict[str, Any]: ...

def AbortJobCommand(
    *,
    Job: int,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Raises the abort flag of a job that the server is running; vexg's own.

    Args:
        Job: integer: its number, as ListJobsCommand gives it
    """
    ...

class _AccessMetadataCommandOutputs(TypedDict, total=False):
    URI: str

def AccessMetadataCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _AccessMetadataCommandOutputs:
    """Adds one to the opens of metadata.

    Args:
        URI: URI: the metadata

    Returns:
        URI: URI: the metadata
    """
    ...

class _AccessRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def AccessRasterCommand(
    *,
    SrcURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _AccessRasterCommandOutputs:
    """Adds one to the opens of an open raster.

    Args:
        SrcURI: URI: the raster

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _AccuracyCommandOutputs(TypedDict, total=False):
    Classes: list[str]
    Matrix: NDArray[Any]
    Overall: NDArray[Any]
    Kappa: float
    Producer: NDArray[Any]
    User: NDArray[Any]
    F1: NDArray[Any]
    Outside: int
    NoClass: int

def AccuracyCommand(
    *,
    MapURI: str | Raster,
    Vectors: str | PathLike[str],
    ClassField: str | PathLike[str],
    Layer: str | PathLike[str] | None = None,
    Where: str | PathLike[str] | None = None,
    Classes: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _AccuracyCommandOutputs:
    """Compares a map of classes with samples of known classes. A command of this library's own.

    Args:
        MapURI: URI: the map; its first band counts
        Vectors: text: the file of samples: points, or shapes, which are of the class of most
            of their pixels
        ClassField: text: the field with the class of a sample
        Layer: text: a layer of the file, by its name or its number from 0; the first when
            absent
        Where: text: FIELD=VALUE: only records with that value; all when absent
        Classes: text list: the names of the map's values from 1 on; when absent those that
            the map has, and where it has none the field holds values

    Returns:
        Classes: text list: the classes, in the order of the matrix
        Matrix: integer array: samples: a row for each class that is known, a column for each
            class of the map
        Overall: number array: share of the samples whose class the map has, and the bounds of
            its 95 % interval
        Kappa: number: agreement beyond chance
        Producer: number array: for each class: of its samples the share that the map has, and
            the bounds
        User: number array: for each class: of the samples that it has in the map the share
            that is right, and the bounds
        F1: number array: for each class the harmonic mean of both
        Outside: integer: samples without a pixel that counts
        NoClass: integer: samples on pixels of no class
    """
    ...

def BuildRasterPyramidCommand(
    *,
    URI: str | Raster,
    PyramidType: Literal["None", "ORVA", "DRIVER", "MANUAL"],
    PyramidResamplingMethod: Literal["Unknown", "Impl", "Nearest", "Linear", "Cubic", "Majority"],
    PyramidLevelMin: int,
    PyramidLevelMax: int,
    PyramidCanBuild: bool,
    TileDimensions: str,
    Bins: Literal["Told", "Exact"] | None = None,
    Reduction: Literal["Told", "Average", "Mode"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Builds the pyramid of a raster, with its statistics and a histogram, where it was opened.

    Args:
        URI: URI: the raster
        PyramidType: word: ORVA: a file of the library's own; DRIVER: by the driver of the
            format
        PyramidResamplingMethod: word: Impl, Nearest, Linear, Cubic or Majority; ORVA takes
            every 2^level-th pixel
        PyramidLevelMin: integer: first level; 0 is a copy
        PyramidLevelMax: integer: last level, up to 31
        PyramidCanBuild: boolean: of the description; not read
        TileDimensions: tiles: the levels are stored in squares of this height; of 9 bands and
            more in squares of 256
        Bins: word: of the histogram. Told: each a whole number wide, 256 at most; Exact: 256
            that share the range of the values, or one for each of fewer integers
        Reduction: word: in place of the resampling method. Told: that; Average: means of the
            valid pixels below; Mode: the most frequent ones
    """
    ...

def CalculateRasterHistogramCommand(
    *,
    URI: str | Raster,
    LowerBound: float,
    UpperBound: float,
    BinCount: int | None = None,
    BinSize: float | None = None,
    Bands: ArrayLike | None = None,
    Sign: Literal["Both", "Positive", "Negative"] | None = None,
    Bins: Literal["Told", "Exact"] | None = None,
    Wait: Literal["Told", "Always"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Counts the histograms of bands; GetRasterHistogramCommand then has them.

    Args:
        URI: URI: the raster
        LowerBound: number: smallest value that counts; one that the pixel type can't hold is
            limited to it
        UpperBound: number: largest value that counts; limited as well
        BinCount: integer: how many bins
        BinSize: number: width of a bin, where there is no BinCount
        Bands: integer array: which bands; all when absent, with a BinCount
        Sign: word: Both, Positive (0 and above), Negative; Both when absent
        Bins: word: Told: sizes of bin counts hold one bin less, integers have whole sizes,
            and values behind the last bin do not count; Exact: every value within the bounds
            is in one bin
        Wait: word: Told: a computation that another command runs over the raster makes this
            one fail, or leaves what it sets without effect; Always: it waits its turn
    """
    ...

def CalibrateRasterBrightnessTemperatureCommand(
    *,
    SourceURI: str | Raster,
    CalibratedURI: str | Raster,
    Gain: ArrayLike,
    Offset: ArrayLike,
    K1: ArrayLike,
    K2: ArrayLike,
    ScaleFactor: float | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Computes brightness temperature.

    Args:
        SourceURI: URI: the raster of digital numbers
        CalibratedURI: URI: the raster to write, of the same size and bands
        Gain: number array: for each band
        Offset: number array: for each band
        K1: number array: first thermal constant of each band, in the unit of radiance
        K2: number array in K: second thermal constant of each band
        ScaleFactor: number: factor on the result; 1 when absent
    """
    ...

def CalibrateRasterRadianceCommand(
    *,
    SourceURI: str | Raster,
    CalibratedURI: str | Raster,
    Gain: ArrayLike,
    Offset: ArrayLike,
    ScaleFactor: float | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Computes at-sensor radiance.

    Args:
        SourceURI: URI: the raster of digital numbers
        CalibratedURI: URI: the raster to write, of the same size and bands
        Gain: number array: for each band
        Offset: number array: for each band
        ScaleFactor: number: factor on the result; 1 when absent
    """
    ...

def CalibrateRasterTOAReflectanceCommand(
    *,
    SourceURI: str | Raster,
    CalibratedURI: str | Raster,
    Gain: ArrayLike,
    Offset: ArrayLike,
    SolarIrradiance: ArrayLike,
    SunElevation: float,
    EarthSunDistance: float,
    ScaleFactor: float | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Computes top-of-atmosphere reflectance.

    Args:
        SourceURI: URI: the raster of digital numbers
        CalibratedURI: URI: the raster to write, of the same size and bands
        Gain: number array: for each band
        Offset: number array: for each band
        SolarIrradiance: number array: for each band
        SunElevation: number in degrees: above the horizon
        EarthSunDistance: number in astronomical units: on the day
        ScaleFactor: number: factor on the result; 1 when absent
    """
    ...

class _CloseMetadataCommandOutputs(TypedDict, total=False):
    Fault: str

def CloseMetadataCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CloseMetadataCommandOutputs:
    """Takes one from the opens of metadata.

    Args:
        URI: URI: what to close; nothing happens when it isn't open

    Returns:
        Fault: text: why a new source could not be finished; only then
    """
    ...

class _CloseRasterCommandOutputs(TypedDict, total=False):
    Fault: str

def CloseRasterCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CloseRasterCommandOutputs:
    """Takes one from the opens of a raster.

    Args:
        URI: URI: what to close; nothing happens when it isn't open

    Returns:
        Fault: text: why a new source could not be finished; only then
    """
    ...

class _CloseRasterMaskCommandOutputs(TypedDict, total=False):
    Fault: str

def CloseRasterMaskCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CloseRasterMaskCommandOutputs:
    """Takes one from the opens of a mask.

    Args:
        URI: URI: what to close; nothing happens when it isn't open

    Returns:
        Fault: text: why a new source could not be finished; only then
    """
    ...

class _CompareRasterGridsCommandOutputs(TypedDict, total=False):
    SameSize: bool
    SameSystem: bool
    ShiftX: float
    ShiftY: float
    ScaleX: float
    ScaleY: float
    Rotation: float
    LargestOffset: float

def CompareRasterGridsCommand(
    *,
    URI: str | Raster,
    OtherURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CompareRasterGridsCommandOutputs:
    """Tells how the grid of a raster lies in that of another one. A command of this library's
    own.

    Args:
        URI: URI: the raster
        OtherURI: URI: the other one

    Returns:
        SameSize: boolean: both have as many samples and lines
        SameSystem: boolean: both have one coordinate system, or none
        ShiftX: number: sample of the other raster where the upper left corner of this one
            lies; absent, as all that follow, where one has no place or can't be carried
        ShiftY: number: the line there
        ScaleX: number: pixels of the other raster along the upper edge, for each pixel
        ScaleY: number: the same along the left edge
        Rotation: number: degrees, clockwise, by which the upper edge is turned
        LargestOffset: number: pixels of the other raster by which a place in the raster is
            off at most, when pixels are taken by their sample and line
    """
    ...

class _CopyRasterCommandOutputs(TypedDict, total=False):
    ValidPixels: NDArray[Any]

def CopyRasterCommand(
    *,
    SrcURI: str | Raster,
    DstURI: str | Raster,
    Bands: ArrayLike | None = None,
    Invalid: Literal["Told", "NoData"] | None = None,
    Blocks: Literal["Told", "Stream", "Target"] | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CopyRasterCommandOutputs:
    """Copies the pixels of a raster into another one of the same size and pixel type.

    Args:
        SrcURI: URI: the raster to read
        DstURI: URI: the raster to write
        Bands: integer array: which bands to read, in the order of those written; all when
            absent
        Invalid: word: Told: the values of pixels that aren't valid are copied; NoData: the
            target's no-data value takes their place, where a band has one
        Blocks: word: Told: squares or lines of 8 MiB; Stream: blocks as the source stores
            them, which costs less
        Share: integer array: which of several parts of a raster's lines the source is, from
            0, and of how many
        ShareFile: text: the file to make of ValidPixels, with Share
        ShareFiles: text list: such files of all parts, for a target that has taken the pixels
            out of files already

    Returns:
        ValidPixels: integer array: of each band that was copied
    """
    ...

class _CopyRasterPalettesCommandOutputs(TypedDict, total=False):
    Return: NDArray[numpy.bool_]

def CopyRasterPalettesCommand(
    *,
    SrcURI: str | Raster,
    DstURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CopyRasterPalettesCommandOutputs:
    """Stores the colour tables of all bands of a raster with another one. A command of this
    library's own.

    Args:
        SrcURI: URI: the raster that has them
        DstURI: URI: the raster that gets them

    Returns:
        Return: boolean array: for each band of the first: it has none, or the other source
            took it
    """
    ...

class _CreateAttributeTableCommandOutputs(TypedDict, total=False):
    Regions: int

def CreateAttributeTableCommand(
    *,
    Table: str | PathLike[str],
    SpectralFXA: str | PathLike[str] | None = None,
    TextureFXA: str | PathLike[str] | None = None,
    EntropyFXA: str | PathLike[str] | None = None,
    MeansFXA: str | PathLike[str] | None = None,
    IndexFXA: str | PathLike[str] | None = None,
    IndexNames: str | Sequence[str | PathLike[str]] | None = None,
    SpatialFXA: str | PathLike[str] | None = None,
    LabelURI: str | Raster | None = None,
    Bands: ArrayLike | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateAttributeTableCommandOutputs:
    """Makes a table of the regions of files, a row each. A command of this library's own.

    Args:
        Table: text: the file to make, in the format of its ending; .csv has no shapes
        SpectralFXA: text: columns mean_b0, std_b0 and so on
        TextureFXA: text: columns texture_range_b0 and so on
        EntropyFXA: text: columns texture_entropy_n_b0 and so on
        MeansFXA: text: columns mean_b0 and count_b0; not beside SpectralFXA
        IndexFXA: text: spectral values of named bands: columns mean_NAME, std_NAME and so on
        IndexNames: text list: the names of these bands
        SpatialFXA: text: columns area, perimeter and so on
        LabelURI: URI: the labels, from which the regions get their polygons; none when absent
        Bands: integer array: the numbers by which the bands of the files are called; from 0
            when absent

    Returns:
        Regions: integer: how many rows there are
    """
    ...

class _CreateBandStackRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str
    Warning: str

def CreateBandStackRasterCommand(
    *,
    SrcURI: Sequence[str | Raster],
    Bands: Literal["Told", "Exact"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateBandStackRasterCommandOutputs:
    """Shows the bands of several rasters of one pixel type as one raster.

    Args:
        SrcURI: URI array: the rasters, in order
        Bands: word: Told: names, units and further details are those of the first raster;
            Exact: each band keeps its own, and rasters of another size than the first are
            refused

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
        Warning: text: which rasters lie elsewhere than the first one; absent when none does
    """
    ...

class _CreateCalibratedRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateCalibratedRasterCommand(
    *,
    SrcURI: str | Raster,
    Quantity: Literal["Radiance", "Reflectance", "Temperature"],
    Gain: ArrayLike,
    Offset: ArrayLike,
    SolarIrradiance: ArrayLike | None = None,
    SunElevation: float | None = None,
    EarthSunDistance: float | None = None,
    K1: ArrayLike | None = None,
    K2: ArrayLike | None = None,
    Unit: Literal["Kelvin", "Celsius"] | None = None,
    ScaleFactor: float | None = None,
    DataType: Literal["Byte", "Char", "UInt16", "Int16", "UInt32", "Int32", "Single", "Double"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateCalibratedRasterCommandOutputs:
    """Shows the physical values of a raster of digital numbers: DN * Gain + Offset, and what
    follows from it. A command of this library's own.

    Args:
        SrcURI: URI: the raster to stand on
        Quantity: word: of the values that are shown: Radiance, Reflectance or Temperature
        Gain: number array: for each band
        Offset: number array: for each band
        SolarIrradiance: number array: for each band, with Reflectance; when absent Gain and
            Offset make reflectance, and not radiance, which is divided by the sine of
            SunElevation alone
        SunElevation: number in degrees: above the horizon, with Reflectance; 90 when absent
            with no SolarIrradiance
        EarthSunDistance: number in astronomical units: on the day, with SolarIrradiance
        K1: number array: with Temperature: first thermal constant of each band, in the unit
            of radiance
        K2: number array in K: with Temperature: second thermal constant of each band
        Unit: word: of Temperature: Kelvin, as it is when absent, or Celsius
        ScaleFactor: number: factor on the result; 1 when absent
        DataType: word: pixel type; Single when absent. Values for integers are cut, and keep
            their low bits

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

def CreateClassStyleCommand(
    *,
    Style: str | PathLike[str],
    Field: str | PathLike[str],
    Classes: str | Sequence[str | PathLike[str]],
    Palette: str | Sequence[tuple[str, int, int, int, int]],
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Writes the style by which QGIS shows polygons in the colours, and with the names, of their
    classes. A command of this library's own.

    Args:
        Style: text: the file, with the ending .qml
        Field: text: the field with the number of the class
        Classes: text list: the names of the numbers from 0 on
        Palette: palette: their colours
    """
    ...

class _CreateComplexImagRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateComplexImagRasterCommand(
    *,
    SrcURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateComplexImagRasterCommandOutputs:
    """Shows each band of a complex raster as imaginary part, real and imaginary.

    Args:
        SrcURI: URI: the raster to stand on

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateComplexMagnitudeRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateComplexMagnitudeRasterCommand(
    *,
    SrcURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateComplexMagnitudeRasterCommandOutputs:
    """Shows each band of a complex raster as magnitude, real and imaginary part.

    Args:
        SrcURI: URI: the raster to stand on

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateComplexPhaseRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateComplexPhaseRasterCommand(
    *,
    SrcURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateComplexPhaseRasterCommandOutputs:
    """Shows each band of a complex raster as phase, real and imaginary part.

    Args:
        SrcURI: URI: the raster to stand on

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateComplexPowerRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateComplexPowerRasterCommand(
    *,
    SrcURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateComplexPowerRasterCommandOutputs:
    """Shows each band of a complex raster as logarithm of the magnitude, real and imaginary
    part.

    Args:
        SrcURI: URI: the raster to stand on

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateComplexRealRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateComplexRealRasterCommand(
    *,
    SrcURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateComplexRealRasterCommandOutputs:
    """Shows each band of a complex raster as real part, real and imaginary.

    Args:
        SrcURI: URI: the raster to stand on

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateConvertedRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateConvertedRasterCommand(
    *,
    SrcURI: str | Raster,
    DataType: Literal["Byte", "Char", "UInt16", "Int16", "UInt32", "Int32", "Single", "Double"] | None = None,
    Scale: ArrayLike | None = None,
    Unscale: bool | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateConvertedRasterCommandOutputs:
    """Shows a raster with pixels of another type, or values on another scale. A command of this
    library's own.

    Args:
        SrcURI: URI: the raster to stand on
        DataType: word: pixel type; that of the raster, or Single with Unscale, when absent.
            Values are rounded for an integer type, and what does not fit is not valid
        Scale: number array: LO, HI and the values they become, TO-LO and TO-HI: the ends of
            the range of an integer type or 0 and 1 when these two are absent. What lies
            outside is cut to the range
        Unscale: boolean: values are pixel * scale + offset, as the bands of the raster say;
            false when absent

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateExpressionRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str
    Warning: str

def CreateExpressionRasterCommand(
    *,
    SrcURI: Sequence[str | Raster],
    Expressions: str | PathLike[str],
    Names: str | Sequence[str | PathLike[str]] | None = None,
    Roles: str | Sequence[str | PathLike[str]] | None = None,
    DataType: Literal["Byte", "Char", "UInt16", "Int16", "UInt32", "Int32", "Single", "Double"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateExpressionRasterCommandOutputs:
    """Shows what expressions make of the bands of rasters as a raster, a band for each
    expression. A command of this library's own.

    Args:
        SrcURI: URI array: the rasters, of one size; the bands of the first are b0, b1 and so
            on
        Expressions: text: one for each band, with ; between them, as NAME=EXPRESSION where
            the band gets a name: NDVI=(b3 - b2) / (b3 + b2)
        Names: text list: of the rasters behind the first, whose bands are NAME_b0 and so on;
            a, b, c and so on when absent
        Roles: text list: further names of bands, as ROLE=BAND, such as nir=b3; indices take
            nir, red, green and blue
        DataType: word: pixel type; Single when absent. Results for integers are rounded, and
            what does not fit is not valid

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
        Warning: text: which rasters lie elsewhere than the first one; absent when none does
    """
    ...

class _CreateGeometryROIDefCommandOutputs(TypedDict, total=False):
    URI: str
    Shapes: int

def CreateGeometryROIDefCommand(
    *,
    Vectors: str | Sequence[str | PathLike[str]],
    Layer: str | PathLike[str] | None = None,
    Where: str | PathLike[str] | None = None,
    ScanRules: Literal["Told", "Steady"] | None = None,
    Coordinates: Literal["Told", "Map", "Pixel"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateGeometryROIDefCommandOutputs:
    """Makes a region of interest of the shapes of vector files. A command of this library's own.

    Args:
        Vectors: text list: the files
        Layer: text: a layer of each file, by its name or its number from 0; all layers when
            absent
        Where: text: FIELD=VALUE: only records with that value; all when absent
        ScanRules: word: Told: columns compare as they come out; Steady: equal neighbours
            among the vertices are dropped, and columns compare with a tolerance, so that a
            polygon moved by whole pixels keeps its mask
        Coordinates: word: Told: coordinates are pixels unless the shapes have a coordinate
            system and the raster a geo-reference; Map: they are the map's wherever the raster
            has a geo-reference; Pixel: pixels

    Returns:
        URI: URI: the region
        Shapes: integer: how many records it has
    """
    ...

class _CreateJoinedRowsRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateJoinedRowsRasterCommand(
    *,
    SrcURI: str | Raster,
    Files: str | Sequence[str | PathLike[str]],
    Lines: ArrayLike,
    Names: str | Sequence[str | PathLike[str]] | None = None,
    Blocks: Literal["Told", "Stream", "Target"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateJoinedRowsRasterCommandOutputs:
    """Shows a raster with its pixels out of files that hold its lines already. A command of this
    library's own.

    Args:
        SrcURI: URI: the raster to stand on
        Files: text list: rasters of the source's samples, bands and pixel type, from the
            first line to the last
        Lines: integer array: how many lines each of them has, together those of the source
        Names: text list: the files as a VRT file names them, relative to its place; as in
            Files when absent
        Blocks: word: those of the CopyRasterCommand that will read it: a file that takes
            packed blocks as they are, by RowsURI of CreateRasterCommand, has them in the
            order of that copy

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateLabelsRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateLabelsRasterCommand(
    *,
    SrcURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateLabelsRasterCommandOutputs:
    """Shows a raster of whole numbers of 8 or 16 bits as labels of type Int. A command of this
    library's own.

    Args:
        SrcURI: URI: the raster to stand on

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateMaskedRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateMaskedRasterCommand(
    *,
    SrcURI: str | Raster,
    MaskURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateMaskedRasterCommandOutputs:
    """Shows a raster with the pixels masked that a mask marks.

    Args:
        SrcURI: URI: the raster to stand on
        MaskURI: URI: a mask of CreateRasterMaskCommand

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateMemoryRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateMemoryRasterCommand(
    *,
    Interleave: Literal["None", "BIP", "BIL", "BSQ"] | None = None,
    SrcURI: str | Raster | None = None,
    Samples: int | None = None,
    Lines: int | None = None,
    Bands: int | None = None,
    DataType: Literal["Byte", "Int16", "Int32", "Single", "Double", "ComplexSingle", "ComplexDouble", "UInt16", "UInt32", "Int64", "UInt64", "Char"] | None = None,
    HasNoDataValue: ArrayLike | None = None,
    NoDataValue: ArrayLike | None = None,
    GeoRef: str | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateMemoryRasterCommandOutputs:
    """Makes a raster in memory.

    Args:
        Interleave: word: BIP, BIL, BSQ: the order in memory
        SrcURI: URI: an open raster whose description is the start
        Samples: integer: pixels of a line
        Lines: integer: lines
        Bands: integer: bands
        DataType: word: pixel type
        HasNoDataValue: boolean array: for each band, whether it has a no-data value
        NoDataValue: number array: no-data values of the bands, which have one then
        GeoRef: geo-reference: the geo-reference

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateMetadataCommandOutputs(TypedDict, total=False):
    URI: str

def CreateMetadataCommand(
    *,
    ConnStr: str | Sequence[str | PathLike[str]],
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateMetadataCommandOutputs:
    """Reads what a source says of itself.

    Args:
        ConnStr: text list: the word of the format, the file, and for XML formats XmlFile,
            XmlUrl or XmlString; EMPTY for none

    Returns:
        URI: URI: the metadata
    """
    ...

class _CreateMosaicCommandOutputs(TypedDict, total=False):
    Scenes: int
    Samples: int
    Lines: int

def CreateMosaicCommand(
    *,
    File: str | PathLike[str],
    Scenes: str | Sequence[str | PathLike[str]],
    Place: str | PathLike[str] | None = None,
    LikeURI: str | Raster | None = None,
    CoordSys: str | PathLike[str] | None = None,
    PixelSize: float | None = None,
    Reference: int | None = None,
    Unmatched: ArrayLike | None = None,
    MatchMode: Literal["Overlaps", "Scenes"] | None = None,
    Bins: Literal["Told", "Exact"] | None = None,
    ResamplingMethod: Literal["Unknown", "Impl", "Nearest", "Linear", "Cubic", "Majority"] | None = None,
    FeatherWidth: float | None = None,
    NoData: float | None = None,
    WorkingDirectory: str | PathLike[str] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateMosaicCommandOutputs:
    """Writes the definition file of a mosaic: its scenes, with what their headers say, and its
    grid. A command of this library's own.

    Args:
        File: text: the definition file, whose name ends in .vmosaic; one that is there is
            replaced
        Scenes: text list: files of rasters in their order; of pixels that several have the
            first one's are shown
        Place: text: the path that the file will have once it has been moved; its paths are
            relative to that
        LikeURI: URI: a raster whose grid the mosaic gets
        CoordSys: text: coordinate system of the grid; that of the first scene when absent
        PixelSize: number in units of the system: of the grid; about that of the first scene
            when absent
        Reference: integer: number of the scene, from 0, that others are matched to; 0 when
            absent
        Unmatched: integer array: numbers of scenes that keep their colours
        MatchMode: word: Overlaps: scenes are matched where they overlap with the reference;
            Scenes: as wholes
        Bins: word: bins of the histograms that colours are matched by. Told: those of
            floating-point numbers count hardly a value; Exact: every value
        ResamplingMethod: word: Nearest, Linear or Cubic, for scenes that don't lie on the
            grid
        FeatherWidth: number in pixels of the mosaic: width in which scenes go over into each
            other at seams; 0 when absent
        NoData: number: of pixels that no scene has; that of the first scene that has one when
            absent
        WorkingDirectory: text: folder of footprints, tables and seams; that of the file when
            absent

    Returns:
        Scenes: integer: how many there are
        Samples: integer: of the mosaic
        Lines: integer: of the mosaic
    """
    ...

class _CreateMosaicLabelsCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateMosaicLabelsCommand(
    *,
    MosaicURI: str | Raster,
    Labels: Literal["Seams", "Footprints"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateMosaicLabelsCommandOutputs:
    """Shows by whose polygons the pixels of a mosaic lie, as a raster of labels. A command of
    this library's own.

    Args:
        MosaicURI: URI: the mosaic
        Labels: word: Seams: 1 more than the number of the scene in whose seam polygon, or
            else footprint, a pixel lies, the first of several; Footprints: one number for
            each set of footprints that lie over one another; 0 outside

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateMosaicVectorsCommandOutputs(TypedDict, total=False):
    Footprints: int
    Seams: int

def CreateMosaicVectorsCommand(
    *,
    MosaicURI: str | Raster,
    Vectors: str | PathLike[str],
    Layer: Literal["All", "Footprints", "Seams"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateMosaicVectorsCommandOutputs:
    """Writes the footprints of a mosaic's scenes, and what is shown of each, as polygons to a
    vector file, on the map of the mosaic. A command of this library's own.

    Args:
        MosaicURI: URI: the mosaic
        Vectors: text: the file to create
        Layer: word: All: the layers footprints and seams, of those that there are; Footprints
            or Seams: that one alone

    Returns:
        Footprints: integer: how many were written
        Seams: integer: how many were written
    """
    ...

class _CreateNoDataRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateNoDataRasterCommand(
    *,
    SrcURI: str | Raster,
    NoDataValues: ArrayLike,
    Replace: bool | None = None,
    RemoveAll: bool | None = None,
    Description: Literal["Told", "Exact"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateNoDataRasterCommandOutputs:
    """Shows a raster with values of its pixels as no data.

    Args:
        SrcURI: URI: the raster to stand on
        NoDataValues: number array: the values; the first is the view's no-data value, and is
            written where pixels are no data
        Replace: boolean: whether only these values are no data, and not what the source says;
            not when absent
        RemoveAll: boolean: whether no pixel is no data, and the values have no effect; not
            when absent
        Description: word: Told: what is made like the view has the no-data values of the
            source; Exact: those of the view

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreatePixelAddressROIDefCommandOutputs(TypedDict, total=False):
    URI: str

def CreatePixelAddressROIDefCommand(
    *,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreatePixelAddressROIDefCommandOutputs:
    """Makes a region of interest of single pixels, without any.

    Returns:
        URI: URI: the region
    """
    ...

class _CreateProjectedRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateProjectedRasterCommand(
    *,
    SrcURI: str | Raster,
    GeoRef: str,
    ReprojectionMethod: Literal["Polynomial", "Triangulation", "Rigorous"],
    ResamplingMethod: Literal["Unknown", "Impl", "Nearest", "Linear", "Cubic", "Majority"],
    PyramidURI: str | Raster | None = None,
    PyramidLevel: int | None = None,
    Grid: Literal["Told", "Exact", "Computed"] | None = None,
    Sampling: Literal["Told", "Centred", "Corner"] | None = None,
    Kernel: Literal["Told", "Nearest", "Linear", "Cubic", "Lanczos", "Average", "Mode", "Min", "Max", "Median"] | None = None,
    NoData: float | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateProjectedRasterCommandOutputs:
    """Shows a raster in the grid of another geo-reference.

    Args:
        SrcURI: URI: the raster to stand on
        GeoRef: geo-reference: of type Std: the grid
        ReprojectionMethod: word: Polynomial: fitted to each block, or on an exact grid to its
            fixed squares; Rigorous: a transform of every pixel; Triangulation runs as
            Polynomial
        ResamplingMethod: word: Nearest, Linear or Cubic; others run as Nearest
        PyramidURI: URI: has no effect
        PyramidLevel: integer: has no effect
        Grid: word: Told: all of the raster, with pixels as large as its own, and its
            statistics; Exact: the GeoRef with its own size, where a pixel is the same in
            every block, and statistics of the pixels there
        Sampling: word: Told: linear and cubic weigh from the corners of pixels and round
            toward zero; Centred: they weigh from the centres, round to the nearest, and leave
            out pixels that aren't valid
        Kernel: word: in place of ResamplingMethod and Sampling, on an exact grid. Told:
            those; Nearest; Linear, Cubic (-0.5) and Lanczos are stretched over the area that
            a pixel covers; Average, Mode, Min, Max and Median are of the pixels in it
        NoData: number: the no-data value of all bands, outside the raster too; the raster's
            own when absent

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateROIRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateROIRasterCommand(
    *,
    SrcURI: str | Raster,
    ROIDefURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateROIRasterCommandOutputs:
    """Shows a raster with what lies outside a region of interest marked so.

    Args:
        SrcURI: URI: the raster to stand on
        ROIDefURI: URI: the region

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateRasterCommand(
    *,
    ConnStr: str | Sequence[str | PathLike[str]],
    Format: str | PathLike[str] | None = None,
    Interleave: Literal["None", "BIP", "BIL", "BSQ"] | None = None,
    Details: Literal["Told", "Names", "Bands", "All"] | None = None,
    RowsURI: str | Raster | None = None,
    Categories: str | Sequence[str | PathLike[str]] | None = None,
    SrcURI: str | Raster | None = None,
    Samples: int | None = None,
    Lines: int | None = None,
    Bands: int | None = None,
    DataType: Literal["Byte", "Int16", "Int32", "Single", "Double", "ComplexSingle", "ComplexDouble", "UInt16", "UInt32", "Int64", "UInt64", "Char"] | None = None,
    HasNoDataValue: ArrayLike | None = None,
    NoDataValue: ArrayLike | None = None,
    GeoRef: str | None = None,
    Compress: Literal["Told", "None", "DEFLATE", "ZSTD", "LZW", "LZMA", "WebP", "JPEG"] | None = None,
    Level: int | None = None,
    Predictor: Literal["Told", "Auto", "None", "2", "3"] | None = None,
    Tile: str | PathLike[str] | None = None,
    BigTIFF: Literal["Told", "Auto", "Yes", "No"] | None = None,
    Layout: Literal["Told", "COG"] | None = None,
    Overviews: Literal["Told", "Average", "Nearest", "Mode", "None"] | None = None,
    WorldFile: bool | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateRasterCommandOutputs:
    """Makes a new raster in a data source.

    Args:
        ConnStr: text list: where it is made
        Format: text: key of the format
        Interleave: word: BIP, BIL, BSQ: the order in the source
        Details: word: of the raster in SrcURI, as far as the format has room for them. Told:
            none; Names: the names of bands; Bands: all of the bands and the raster, such as
            units, scales and further items; All: also the place, as control points
        RowsURI: URI: a raster of CreateJoinedRowsRasterCommand that is to be copied into the
            new one: that takes the packed blocks of its files as they are where it packs
            alike, or is a VRT file on them, and the copy has nothing left to do
        Categories: text list: names of the values of the first band, from 0 on
        SrcURI: URI: an open raster whose description is the start
        Samples: integer: pixels of a line
        Lines: integer: lines
        Bands: integer: bands
        DataType: word: pixel type
        HasNoDataValue: boolean array: for each band, whether it has a no-data value
        NoDataValue: number array: no-data values of the bands, which have one then
        GeoRef: geo-reference: the geo-reference
        Compress: word: how the blocks of a TIFF file are packed; Told: not at all
        Level: integer: effort of the compression, of WebP, which loses nothing without it,
            and JPEG the quality; the codec's usual one when absent
        Predictor: word: which differences are packed in the place of values: 2 of whole
            numbers, 3 of floating-point numbers; Auto: those that suit the pixel type; Told:
            none
        Tile: text: side of the tiles of a TIFF file in pixels, a multiple of 16, or strip
        BigTIFF: word: whether a TIFF file may take more than 4 GiB; Auto: where it needs to;
            Told: where it might
        Layout: word: COG: a cloud-optimised TIFF file, with its reduced levels in front;
            Told: pixels alone
        Overviews: word: how a pixel of a level of a COG comes from four: their mean, the
            upper left one, or the most frequent value; Told: the mean; None: no levels
        WorldFile: boolean: whether the grid also lies in a world file beside the raster

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateRasterMaskCommandOutputs(TypedDict, total=False):
    URI: str

def CreateRasterMaskCommand(
    *,
    SrcURI: str | Raster,
    MaskBands: ArrayLike,
    MaskValues: str | PathLike[str],
    Inversed: bool | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateRasterMaskCommandOutputs:
    """Makes a mask of the pixels of a raster that have one of some values.

    Args:
        SrcURI: URI: the raster to stand on
        MaskBands: integer array: the bands whose values are looked at, from 0
        MaskValues: text: an array of arrays, one for each of MaskBands, such as 1:2 [1:2 [0
            255]  1:1 [7] ]: the values that are marked
        Inversed: boolean: whether each plane marks what has none of its values; there is a
            plane for each band of the raster, and one that marks a pixel is enough; not when
            absent

    Returns:
        URI: URI: the mask
    """
    ...

class _CreateSkipRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateSkipRasterCommand(
    *,
    SrcURI: str | Raster,
    SkipX: int,
    SkipY: int,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateSkipRasterCommandOutputs:
    """Shows every n-th pixel and line of a raster as a raster.

    Args:
        SrcURI: URI: the raster to stand on
        SkipX: integer in pixels: step along a line, from 1
        SkipY: integer in lines: step from line to line, from 1

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateSpatialSubsetRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateSpatialSubsetRasterCommand(
    *,
    SrcURI: str | Raster,
    SubRect: str | tuple[int, int, int, int],
    Placing: Literal["Told", "Exact"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateSpatialSubsetRasterCommandOutputs:
    """Shows a rectangle of a raster as a raster.

    Args:
        SrcURI: URI: the raster to stand on
        SubRect: rectangle: pixels of the source; cut to its extent
        Placing: word: Told: the tie pixel of the geo-reference stays where it was; Exact: the
            view lies where its pixels lie in the source

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateSpectralSubsetRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateSpectralSubsetRasterCommand(
    *,
    SrcURI: str | Raster,
    Bands: ArrayLike,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateSpectralSubsetRasterCommandOutputs:
    """Shows bands of a raster, in any order, as a raster.

    Args:
        SrcURI: URI: the raster to stand on
        Bands: integer array: bands of the source, from 0; one may come twice

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateSubsetRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateSubsetRasterCommand(
    *,
    SrcURI: str | Raster,
    SubRect: str | tuple[int, int, int, int] | None = None,
    Bands: ArrayLike | None = None,
    MaskURI: str | Raster | None = None,
    Placing: Literal["Told", "Exact"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateSubsetRasterCommandOutputs:
    """Shows bands of a raster, masked, in a rectangle: each of these only where it is given.

    Args:
        SrcURI: URI: the raster to stand on
        SubRect: rectangle: pixels of the source; cut to its extent
        Bands: integer array: bands of the source, from 0; one may come twice
        MaskURI: URI: a mask of CreateRasterMaskCommand
        Placing: word: see CreateSpatialSubsetRasterCommand

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateTempRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateTempRasterCommand(
    *,
    Directory: str | PathLike[str] | None = None,
    SrcURI: str | Raster | None = None,
    Samples: int | None = None,
    Lines: int | None = None,
    Bands: int | None = None,
    DataType: Literal["Byte", "Int16", "Int32", "Single", "Double", "ComplexSingle", "ComplexDouble", "UInt16", "UInt32", "Int64", "UInt64", "Char"] | None = None,
    HasNoDataValue: ArrayLike | None = None,
    NoDataValue: ArrayLike | None = None,
    GeoRef: str | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateTempRasterCommandOutputs:
    """Makes a raster in a temporary file, which goes away with the raster.

    Args:
        Directory: text: where the file lies; the system's choice when absent
        SrcURI: URI: an open raster whose description is the start
        Samples: integer: pixels of a line
        Lines: integer: lines
        Bands: integer: bands
        DataType: word: pixel type
        HasNoDataValue: boolean array: for each band, whether it has a no-data value
        NoDataValue: number array: no-data values of the bands, which have one then
        GeoRef: geo-reference: the geo-reference

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _CreateTreeLabelsRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str
    Segments: int
    MergeValue: float

def CreateTreeLabelsRasterCommand(
    *,
    Tree: str | PathLike[str],
    MergeValue: float | None = None,
    MergePercent: float | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateTreeLabelsRasterCommandOutputs:
    """Shows the segments of a tree at any cost as a raster of labels, those of a segmentation
    with Seamless and this MergeValue. A command of this library's own.

    Args:
        Tree: text: a file that the input Tree of FxTileSegmentMergeCommand made
        MergeValue: number: cost up to which segments are merged; none unless above 0, as when
            absent
        MergePercent: number: percentage of all merges to do, in place of MergeValue

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
        Segments: integer: how many there are
        MergeValue: number: the cost up to which merges were done
    """
    ...

class _CreateTreeLevelsTableCommandOutputs(TypedDict, total=False):
    Segments: NDArray[Any]

def CreateTreeLevelsTableCommand(
    *,
    Tree: str | PathLike[str],
    MergeValues: ArrayLike,
    Table: str | PathLike[str],
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateTreeLevelsTableCommandOutputs:
    """Makes a table of the segments of a tree at several costs, with the segment of the next
    cost that each lies in. A command of this library's own.

    Args:
        Tree: text: a file that the input Tree of FxTileSegmentMergeCommand made
        MergeValues: number array: costs up to which segments are merged, in ascending order
        Table: text: the file of text to make: level from 1 on, cost, segment, its pixels, and
            the segment of the next level that it lies in, with commas between

    Returns:
        Segments: integer array: how many there are of each level
    """
    ...

class _CreateVirtualRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str

def CreateVirtualRasterCommand(
    *,
    SrcURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _CreateVirtualRasterCommandOutputs:
    """Gives a raster a second identifier.

    Args:
        SrcURI: URI: the raster to stand on

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
    """
    ...

class _DeleteRasterPaletteCommandOutputs(TypedDict, total=False):
    Return: NDArray[numpy.bool_]

def DeleteRasterPaletteCommand(
    *,
    URI: str | Raster,
    Bands: ArrayLike,
    server: Server | None = None,
    progress: Progress = False,
) -> _DeleteRasterPaletteCommandOutputs:
    """Takes the colour tables of bands away from the data source.

    Args:
        URI: URI: the raster
        Bands: integer array: the bands, from 0

    Returns:
        Return: boolean array: for each band given: it has none any more
    """
    ...

class _DeleteRasterPyramidCommandOutputs(TypedDict, total=False):
    Return: bool
    Fault: str

def DeleteRasterPyramidCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _DeleteRasterPyramidCommandOutputs:
    """Removes the pyramid of a raster.

    Args:
        URI: URI: the raster

    Returns:
        Return: boolean: it is gone
        Fault: text: why it is not; only then
    """
    ...

class _DescribeRasterCommandOutputs(TypedDict, total=False):
    Description: str

def DescribeRasterCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _DescribeRasterCommandOutputs:
    """Tells all that a raster says of itself in one text. A command of this library's own.

    Args:
        URI: URI: the raster

    Returns:
        Description: text: a JSON object, as vexg_describe of the C interface gives it
    """
    ...

class _ExtendedQueryRasterCommandOutputs(TypedDict, total=False):
    Samples: int
    Lines: int
    Bands: int
    Interleave: str
    DataType: str
    Format: str
    CanWrite: bool
    StatsMode: str
    PyramidExists: bool
    TileDimensions: str
    PyramidType: str
    PyramidResamplingMethod: str
    PyramidLevelMin: int
    PyramidLevelMax: int
    PyramidCanBuild: bool
    HasNoDataValue: NDArray[numpy.bool_]
    NoDataValue: NDArray[Any]
    HasPalette: NDArray[numpy.bool_]
    StatsExist: NDArray[Any]

def ExtendedQueryRasterCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _ExtendedQueryRasterCommandOutputs:
    """Tells what a raster is, and what it knows of each band.

    Args:
        URI: URI: the raster

    Returns:
        Samples: integer: pixels of a line
        Lines: integer: lines
        Bands: integer: bands
        Interleave: word: BIP, BIL, BSQ, or Unknown: the order in the source
        DataType: word: pixel type
        Format: text: key of the format
        CanWrite: boolean: pixels can be written
        StatsMode: word: which statistics are computed
        PyramidExists: boolean: there are reduced levels to read
        TileDimensions: tiles: blocks of the source
        PyramidType: word: who keeps the pyramid
        PyramidResamplingMethod: word: how its pixels came about
        PyramidLevelMin: integer: first level
        PyramidLevelMax: integer: last level
        PyramidCanBuild: boolean: a pyramid can be built
        HasNoDataValue: boolean array: for each band
        NoDataValue: number array: for each band; 0 where it has none
        HasPalette: boolean array: for each band
        StatsExist: integer array: for each band, the statistics at hand: the sum of 1 min, 2
            max, 4 mean, 8 deviation, 16 sum, 32 sum of squares, 64 root mean square, 128
            products, 256 covariances
    """
    ...

class _FindClassExamplesCommandOutputs(TypedDict, total=False):
    Classes: list[str]
    ExampleDefinition: NDArray[Any]
    Counts: NDArray[Any]
    Outside: int
    Conflicts: int

def FindClassExamplesCommand(
    *,
    LabelURI: str | Raster,
    Vectors: str | PathLike[str],
    ClassField: str | PathLike[str],
    Layer: str | PathLike[str] | None = None,
    Where: str | PathLike[str] | None = None,
    Classes: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _FindClassExamplesCommandOutputs:
    """Finds the regions that samples of known classes hit, as examples of these classes. A
    command of this library's own.

    Args:
        LabelURI: URI: the labels, of type Int32
        Vectors: text: the file of samples, of any shape
        ClassField: text: the field with the class of a sample
        Layer: text: a layer of the file, by its name or its number from 0; the first when
            absent
        Where: text: FIELD=VALUE: only records with that value; all when absent
        Classes: text list: the names of the classes in their order; those of the samples when
            absent

    Returns:
        Classes: text list: the names of the classes
        ExampleDefinition: integer array: rows of class and region, by region
        Counts: integer array: how many examples each class has
        Outside: integer: samples that hit no region
        Conflicts: integer: regions that samples of several classes hit; they are of that of
            most pixels
    """
    ...

class _FindMetadataSourceCommandOutputs(TypedDict, total=False):
    ConnStr: list[str]

def FindMetadataSourceCommand(
    *,
    Name: str | PathLike[str],
    Folder: str | PathLike[str] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _FindMetadataSourceCommandOutputs:
    """Finds the format of a file of metadata by its name and, of XML files, by what stands in
    it.

    Args:
        Name: text: FILE, or FORMAT:FILE
        Folder: text: where a relative name begins; the folder of the process when absent

    Returns:
        ConnStr: text list: what CreateMetadataCommand takes: format and file
    """
    ...

class _FitPCAModelCommandOutputs(TypedDict, total=False):
    PCACoefficients: NDArray[Any]
    Weights: NDArray[Any]
    Thresholds: NDArray[Any]
    Shares: NDArray[Any]

def FitPCAModelCommand(
    *,
    ExampleDefinition: ArrayLike,
    AttributesFXA: str | Sequence[str | PathLike[str]],
    StatsFXAS: str | Sequence[str | PathLike[str]],
    AttributeDefinition: ArrayLike,
    Variance: float | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _FitPCAModelCommandOutputs:
    """Fits the model by which FxComputePCAClassificationCommand scores regions, from examples. A
    command of this library's own.

    Args:
        ExampleDefinition: integer array: rows of class and region, each an example
        AttributesFXA: text list: the files of regions
        StatsFXAS: text list: the files of their statistics, in the same order
        AttributeDefinition: integer array: rows of file, attribute and band
        Variance: number: the share of the variance that the components hold at least, above 0
            to 1; 0.99 when absent

    Returns:
        PCACoefficients: number array: a row for each attribute, a column for each component
        Weights: number array: a row for each component, a column for each class
        Thresholds: number array: the same
        Shares: number array: of the variance, of each component
    """
    ...

class _FitRasterGridCommandOutputs(TypedDict, total=False):
    GeoRef: str
    Samples: int
    Lines: int

def FitRasterGridCommand(
    *,
    URI: str | Raster,
    CoordSys: str | PathLike[str],
    PixelSize: float | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _FitRasterGridCommandOutputs:
    """Finds the grid of a coordinate system that shows all of a raster, for
    CreateProjectedRasterCommand. A command of this library's own.

    Args:
        URI: URI: the raster
        CoordSys: text: the coordinate system: EPSG:n, WKT or PROJ text
        PixelSize: number in units of the system: side of a pixel; about as many pixels as the
            raster has when absent

    Returns:
        GeoRef: geo-reference: the grid, with its size
        Samples: integer: of the grid
        Lines: integer: of the grid
    """
    ...

class _FitRasterHistogramCommandOutputs(TypedDict, total=False):
    Histograms: str

def FitRasterHistogramCommand(
    *,
    URI: str | Raster,
    Bands: ArrayLike | None = None,
    Lowest: ArrayLike | None = None,
    Highest: ArrayLike | None = None,
    LowerBound: float | None = None,
    UpperBound: float | None = None,
    BinCount: int | None = None,
    BinSize: float | None = None,
    Wait: Literal["Told", "Always"] | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _FitRasterHistogramCommandOutputs:
    """Chooses bins for the values of bands, counts them, and gives the histograms. (An addition
    of this library.)

    Args:
        URI: URI: the raster
        Bands: integer array: which bands; all when absent
        Lowest: number array: for each of the bands its smallest value, from which its bins
            begin; the type's for 8 bits
        Highest: number array: for each of the bands its largest value
        LowerBound: number: smallest value that counts, instead of Lowest
        UpperBound: number: largest value that counts, instead of Highest
        BinCount: integer: how many bins; 256 when absent, or fewer of the smallest whole size
            that whole numbers fit into; no more than there are whole numbers
        BinSize: number: width of a bin, instead of BinCount
        Wait: word: Told: a computation that another command runs over the raster makes this
            one fail, or leaves what it sets without effect; Always: it waits its turn
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them

    Returns:
        Histograms: text: array of histograms, one for each of the bands: band, sign, bin
            size, bins, bounds, source and counts; every value within the bounds is in one bin
    """
    ...

class _FitSegmentationCommandOutputs(TypedDict, total=False):
    MinGradient: float
    MaxGradient: float
    StretchValue: float
    SegmentValue: float
    MergeValue: float

def FitSegmentationCommand(
    *,
    SegmentURI: str | Raster,
    SegmentAlgorithm: int,
    SegmentValue: float | None = None,
    SegmentPercent: float | None = None,
    MergeURI: str | Raster | None = None,
    MergePercent: float | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _FitSegmentationCommandOutputs:
    """Finds what FxTileSegmentMergeCommand needs to know of the gradients of a raster, and of
    what merging costs.

    Args:
        SegmentURI: URI: the raster from which the gradients are computed
        SegmentAlgorithm: integer: 1: the largest Sobel gradient of the bands; else the mean
            of the bands
        SegmentValue: number: gradients up to this one are one flat level; the smallest
            gradient when absent
        SegmentPercent: number: percentage of the pixels whose gradients are one flat level,
            instead of SegmentValue
        MergeURI: URI: the raster whose bands drive merging; that of SegmentURI when absent
        MergePercent: number: percentage of all merges to do; MergeValue is their cost
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them

    Returns:
        MinGradient: number: the smallest gradient; 0 with SegmentAlgorithm 1
        MaxGradient: number: the largest gradient
        StretchValue: number: a highest level that keeps integer gradients apart, or 65000
        SegmentValue: number: gradients up to this one are one flat level
        MergeValue: number: cost up to which segments are merged; 0 for none
    """
    ...

def FxComputeAttributesHistogramCommand(
    *,
    AttributeFXA: str | PathLike[str],
    StatsFXAS: str | PathLike[str],
    HistogramFXAH: str | PathLike[str],
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Computes a histogram of each attribute over all regions of a file.

    Args:
        AttributeFXA: text: the file of regions
        StatsFXAS: text: its statistics
        HistogramFXAH: text: the file of histograms to create: 256 bins between the mean less
            and the mean plus two deviations, as far as there are values
    """
    ...

def FxComputeAttributesStatsCommand(
    *,
    AttributeFXA: str | PathLike[str],
    StatsFXAS: str | PathLike[str],
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Computes the statistics of each attribute over all regions of a file.

    Args:
        AttributeFXA: text: the file of regions
        StatsFXAS: text: the file of statistics to create
    """
    ...

def FxComputeFuzzyClassificationCommand(
    *,
    ClassDefinition: ArrayLike,
    RuleDefinition: ArrayLike,
    AttributesFXA: str | Sequence[str | PathLike[str]],
    AttributeDefinition: ArrayLike,
    LabelValues: ArrayLike,
    ClassFXC: str | PathLike[str],
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Scores regions for classes by rules on their attributes.

    Args:
        ClassDefinition: number array: the threshold of each class
        RuleDefinition: number array: rows of 2: the class that a rule feeds, and its weight
            there
        AttributesFXA: text list: the files of regions
        AttributeDefinition: number array: rows of 10, one for each test: rule, file,
            attribute, band; comparison 0 between a and b, 1 at least a, 2 at most a, 3
            outside of a and b; a; b; weight in the rule; membership 0 crisp, 1 linear, 2 an
            S-curve; tolerance in percent
        LabelValues: integer array: the regions to score; all where the first is 4294967295
        ClassFXC: text: the file to create, with a score of each region for each class
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them
    """
    ...

def FxComputeKNNClassificationCommand(
    *,
    ExampleDefinition: ArrayLike,
    Neighbors: int,
    AttributesFXA: str | Sequence[str | PathLike[str]],
    StatsFXAS: str | Sequence[str | PathLike[str]],
    AttributeDefinition: ArrayLike,
    ClassFXC: str | PathLike[str],
    Scores: Literal["Told", "Votes"] | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Scores regions for classes by the votes of the nearest examples.

    Args:
        ExampleDefinition: integer array: rows of class and region, each an example
        Neighbors: integer: how many examples vote
        AttributesFXA: text list: the files of regions
        StatsFXAS: text list: the files of their statistics, in the same order
        AttributeDefinition: integer array: rows of file, attribute and band
        ClassFXC: text: the file to create, with a score of each region for each class
        Scores: word: Told: the squared distance from the mean of the class that wins, 0 for
            the others; Votes: the share of the votes of each class
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them
    """
    ...

def FxComputePCAClassificationCommand(
    *,
    ExampleDefinition: ArrayLike,
    AttributesFXA: str | Sequence[str | PathLike[str]],
    StatsFXAS: str | Sequence[str | PathLike[str]],
    AttributeDefinition: ArrayLike,
    PCACoefficients: ArrayLike,
    Weights: ArrayLike,
    Thresholds: ArrayLike,
    ClassFXC: str | PathLike[str],
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Scores regions for classes by a model of principal components of their attributes.

    Args:
        ExampleDefinition: integer array: rows of class and region, each an example
        AttributesFXA: text list: the files of regions
        StatsFXAS: text list: the files of their statistics, in the same order
        AttributeDefinition: integer array: rows of file, attribute and band
        PCACoefficients: number array: a row for each attribute, a column for each component
        Weights: number array: a row for each component, a column for each class
        Thresholds: number array: the same
        ClassFXC: text: the file to create, with a score of each region for each class
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them
    """
    ...

def FxComputePixelAttributesCommand(
    *,
    SrcURI: str | Raster,
    LabelURI: str | Raster,
    SpectralFXA: str | PathLike[str] | None = None,
    TextureFXA: str | PathLike[str] | None = None,
    TextureKernelSize: int | None = None,
    Sums: Literal["Told", "Exact"] | None = None,
    Values: str | Sequence[str | PathLike[str]] | None = None,
    MeansFXA: str | PathLike[str] | None = None,
    EntropyFXA: str | PathLike[str] | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Computes spectral and texture values of the regions of a label raster.

    Args:
        SrcURI: URI: the image
        LabelURI: URI: the labels, of type Int or UInt and of the image's size
        SpectralFXA: text: the file to create of mean, deviation, minimum, maximum and count;
            required unless Values leaves it out
        TextureFXA: text: the file to create of the means of windows' range, mean, variance
            and entropy, and of the count; required unless Values leaves it out
        TextureKernelSize: integer in pixels: side of the windows, from 0; half of it, rounded
            down, is their reach; required with TextureFXA
        Sums: word: Told: in float, tile after tile; Exact: in integers or doubles until the
            end, with the same bits for any tiles and threads; values that are not finite then
            count for nothing
        Values: text list: of spectral, texture and means: the files that are made; spectral
            and texture when absent
        MeansFXA: text: the file to create of mean and count; with the value means
        EntropyFXA: text: the file to create of the mean entropy of windows over the number of
            their values, and of the count; none when absent, and only with exact sums and the
            value texture
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them
    """
    ...

def FxComputeRegionMeansRasterCommand(
    *,
    SrcURI: str | Raster,
    LabelURI: str | Raster,
    MeansFXA: str | PathLike[str],
    MeansURI: str | Raster,
    Sums: Literal["Told", "Exact"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Computes the means of the regions of a label raster, and a raster that shows them.

    Args:
        SrcURI: URI: the image
        LabelURI: URI: the labels, of type Int and of the image's size
        MeansFXA: text: the file to create of mean and count
        MeansURI: URI: the raster to write, of type Single, with the image's size and bands;
            label 0 becomes 0
        Sums: word: Told: in float, tile after tile; Exact: in integers or doubles until the
            end, with the same bits for any tiles and threads; values that are not finite then
            count for nothing
    """
    ...

def FxComputeVectorAttributesCommand(
    *,
    SpatialFXA: str | PathLike[str],
    VectorFXV: str | PathLike[str] | None = None,
    PixelXSize: float | None = None,
    PixelYSize: float | None = None,
    Parts: Literal["Told", "Together"] | None = None,
    LabelURI: str | Raster | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Computes the shapes of regions from their polygons.

    Args:
        VectorFXV: text: the file of polygons; required unless LabelURI is there
        SpatialFXA: text: the file to create of shapes
        PixelXSize: number in map units: width of a pixel, whose sign does not count; 1 when
            absent
        PixelYSize: number in map units: height of a pixel, whose sign does not count; 1 when
            absent
        Parts: word: of several polygons of one label, as those that touch at a corner alone.
            Told: the values of the last one stay; Together: all their rings are one shape,
            and its hole count counts holes
        LabelURI: URI: the labels, of type Int or UInt, whose polygons are taken as they are
            found, in place of a file; shares are of these alone
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them
    """
    ...

def FxCreateRegionAttributesRasterCommand(
    *,
    LabelURI: str | Raster,
    AttributesFXA: str | Sequence[str | PathLike[str]],
    SelectedAttributes: ArrayLike,
    OutURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Paints attributes of regions into a raster.

    Args:
        LabelURI: URI: the labels, of type Int32
        AttributesFXA: text list: the files of regions
        SelectedAttributes: integer array: rows of file, attribute and band, one for each band
            of the raster
        OutURI: URI: the raster to write, of type Single; label 0 becomes 0
    """
    ...

def FxCreateRegionClassScoresRasterCommand(
    *,
    LabelURI: str | Raster,
    ClassDefinition: ArrayLike,
    RuleDefinition: ArrayLike,
    AttributesFXA: str | Sequence[str | PathLike[str]],
    AttributeDefinition: ArrayLike,
    OutURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Paints the scores of classes into a raster, as rules give them.

    Args:
        LabelURI: URI: the labels, of type Int32
        ClassDefinition: number array: the threshold of each class
        RuleDefinition: number array: rows of 2: the class that a rule feeds, and its weight
            there
        AttributesFXA: text list: the files of regions
        AttributeDefinition: number array: rows of 10, see FxComputeFuzzyClassificationCommand
        OutURI: URI: the raster to write, of type Single, with a band for each class
    """
    ...

def FxCreateRegionClassificationRasterCommand(
    *,
    LabelURI: str | Raster,
    ClassFXC: str | PathLike[str],
    OutURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Paints the class of the best score of each region into a raster.

    Args:
        LabelURI: URI: the labels, of type Int32
        ClassFXC: text: the file of scores
        OutURI: URI: the raster to write, of type Byte: the index of the class and 1, 0 for
            none, and the number of classes and 1 for label 0
    """
    ...

def FxCreateRegionRuleScoresRasterCommand(
    *,
    LabelURI: str | Raster,
    RuleDefinition: ArrayLike,
    AttributesFXA: str | Sequence[str | PathLike[str]],
    AttributeDefinition: ArrayLike,
    OutURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Paints the scores of rules into a raster.

    Args:
        LabelURI: URI: the labels, of type Int32
        RuleDefinition: number array: rows of 2: the class that a rule feeds, and its weight
            there
        AttributesFXA: text list: the files of regions
        AttributeDefinition: number array: rows of 10, see FxComputeFuzzyClassificationCommand
        OutURI: URI: the raster to write, of type Single, with a band for each rule
    """
    ...

def FxRasterToVectorCommand(
    *,
    LabelURI: str | Raster,
    VectorFXV: str | PathLike[str],
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Turns a label raster into polygons.

    Args:
        LabelURI: URI: the label raster, of type Int or UInt; its first band counts
        VectorFXV: text: the FXV file to create
    """
    ...

class _FxTileSegmentHistogramCommandOutputs(TypedDict, total=False):
    SegmentHistogram: NDArray[Any]
    SegmentBinSize: float
    SegmentMin: float

def FxTileSegmentHistogramCommand(
    *,
    SegmentURI: str | Raster,
    HistogramMin: float,
    HistogramMax: float,
    SegmentAlgorithm: int,
    HistogramBins: int | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _FxTileSegmentHistogramCommandOutputs:
    """Counts the gradients of a raster.

    Args:
        SegmentURI: URI: the raster
        HistogramMin: number: smallest gradient that counts
        HistogramMax: number: largest gradient that counts
        SegmentAlgorithm: integer: 1: the largest Sobel gradient of the bands; else the mean
            of the bands
        HistogramBins: integer: how many bins between the two; when absent, bins of width 1,
            or 65000 where these were more than 65001

    Returns:
        SegmentHistogram: number array: cumulative counts of the bins, divided by the last
        SegmentBinSize: number: width of the bins
        SegmentMin: number: always 0
    """
    ...

class _FxTileSegmentMergeCommandOutputs(TypedDict, total=False):
    LambdaHistogram: NDArray[Any]
    LambdaBinSize: float

def FxTileSegmentMergeCommand(
    *,
    SegmentURI: str | Raster,
    SegmentAlgorithm: int,
    SegmentValue: float,
    MinGradient: float,
    MaxGradient: float,
    MergeURI: str | Raster,
    StretchValue: float,
    LambdaEstimate: bool,
    MergeAlgorithm: int | None = None,
    MergeValue: float | None = None,
    LabelURI: str | Raster | None = None,
    TileMemorySize: int | None = None,
    TileBorderSize: int | None = None,
    SegmentBorder: int | None = None,
    Sums: Literal["Told", "Exact"] | None = None,
    Seamless: bool | None = None,
    Memory: int | None = None,
    MinSize: int | None = None,
    MaxSize: int | None = None,
    Compactness: float | None = None,
    Order: Literal["Told", "Local"] | None = None,
    Rounds: int | None = None,
    Tree: str | PathLike[str] | None = None,
    MergePercent: float | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _FxTileSegmentMergeCommandOutputs:
    """Segments a raster into labels, or counts what merging its segments costs.

    Args:
        SegmentURI: URI: the raster from which the gradients are computed
        SegmentAlgorithm: integer: 1: the largest Sobel gradient of the bands; else the mean
            of the bands
        SegmentValue: number: gradients up to this one are one flat level
        MinGradient: number: the gradient that becomes level 0
        MaxGradient: number: the gradient that becomes the highest level
        MergeURI: URI: the raster whose bands drive merging, of the same size and pixel type
        MergeAlgorithm: integer: 1: full lambda schedule; 2: rigorous; others: no merging; 1
            when absent
        MergeValue: number: cost up to which segments are merged; none unless above 0, as when
            absent
        StretchValue: number: the highest level
        LambdaEstimate: boolean: count the costs of merging, and write no raster
        LabelURI: URI: the raster of one band and type Int32 that receives the labels; needed
            without an estimate
        TileMemorySize: integer: bytes of the pixels of a tile; 8388608 when absent
        TileBorderSize: integer: overlap of the tiles on each side, in pixels; 1 when absent
        SegmentBorder: integer: 1: an image of the borders between segments, of 0 and 1,
            instead of labels
        Sums: word: how the rigorous merge adds up. Told: in single precision; Exact: in
            double precision
        Seamless: boolean: the segments are those of one tile as large as the raster, numbered
            in raster order without gaps; TileMemorySize is then that of the strips that are
            read, and changes no label, and there is no TileBorderSize; false when absent
        Memory: integer: bytes that merging may take when Seamless is true: it fails when it
            needs more, before it begins unless Order is Local; half the machine's when absent
        MinSize: integer: with Seamless and MergeAlgorithm 1: segments of fewer pixels join at
            the end the neighbour that costs least, the smallest first; 0 when absent
        MaxSize: integer: with Seamless and MergeAlgorithm 1: segments that have more pixels
            together are not merged, except by MinSize; none when absent
        Compactness: number: with Seamless and MergeAlgorithm 1: costs are divided by the
            length of the common border to the power of this besides, 0 to 10; 0 when absent
        Order: word: with Seamless and MergeAlgorithm 1: the order of merging. Told: the
            cheapest pair anywhere first; Local: in rounds, all pairs at once that cost both
            of their segments least, and less than MergeValue
        Rounds: integer: of Order Local, 1 to 1000; 12 when absent
        Tree: text: with Seamless and MergeAlgorithm 1: the file to make of all merges, from
            which segments of every MergeValue can be made (CreateTreeLabelsRasterCommand);
            none when absent
        MergePercent: number: with Tree: percentage of all merges to do, in place of
            MergeValue
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them

    Returns:
        LambdaHistogram: integer array: cumulative counts of the costs of all merges, in 10000
            bins from 0 on
        LambdaBinSize: number: width of these bins
    """
    ...

class _FxTileVarianceCommandOutputs(TypedDict, total=False):
    TileVariances: NDArray[Any]
    PixelCounts: NDArray[Any]
    TileSubrects: NDArray[Any]

def FxTileVarianceCommand(
    *,
    MergeURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _FxTileVarianceCommandOutputs:
    """Computes the variance of each tile of 512 by 512 pixels.

    Args:
        MergeURI: URI: the raster

    Returns:
        TileVariances: number array: mean of the sample variances of the bands, by tile column
            and tile row
        PixelCounts: integer array: pixels that count, of the last band that has more than one
        TileSubrects: integer array: first and last sample, first and last line of each tile
    """
    ...

class _GetBasicRasterStatsCommandOutputs(TypedDict, total=False):
    Min: NDArray[Any]
    Max: NDArray[Any]
    Mean: NDArray[Any]
    Std: NDArray[Any]
    Sum: NDArray[Any]
    Sum2: NDArray[Any]
    RMS: NDArray[Any]
    Count: NDArray[Any]

def GetBasicRasterStatsCommand(
    *,
    URI: str | Raster,
    Wait: Literal["Told", "Always"] | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _GetBasicRasterStatsCommandOutputs:
    """Gives the statistics of each band, computed where they are not at hand.

    Args:
        URI: URI: the raster
        Wait: word: Told: a computation that another command runs over the raster makes this
            one fail, or leaves what it sets without effect; Always: it waits its turn
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them

    Returns:
        Min: number array: smallest value of each band; 0 in a band without any
        Max: number array: largest value of each band
        Mean: number array: mean of each band
        Std: number array: deviation of each band, as of a sample: divided by n - 1
        Sum: number array: sum of each band
        Sum2: number array: sum of the squares of each band
        RMS: number array: root of the mean of the squares of each band
        Count: number array: values that counted in each band; 0 where statistics were entered
            or stored without it
    """
    ...

class _GetExtendedRasterStatsCommandOutputs(TypedDict, total=False):
    Min: NDArray[Any]
    Max: NDArray[Any]
    Mean: NDArray[Any]
    Std: NDArray[Any]
    Sum: NDArray[Any]
    Sum2: NDArray[Any]
    RMS: NDArray[Any]
    Count: NDArray[Any]
    SumXY: NDArray[Any]
    Cov: NDArray[Any]

def GetExtendedRasterStatsCommand(
    *,
    URI: str | Raster,
    Wait: Literal["Told", "Always"] | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _GetExtendedRasterStatsCommandOutputs:
    """Gives the statistics of each band and between bands, computed where they are not at hand.

    Args:
        URI: URI: the raster
        Wait: word: Told: a computation that another command runs over the raster makes this
            one fail, or leaves what it sets without effect; Always: it waits its turn
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them

    Returns:
        Min: number array: smallest value of each band; 0 in a band without any
        Max: number array: largest value of each band
        Mean: number array: mean of each band
        Std: number array: deviation of each band, as of a sample: divided by n - 1
        Sum: number array: sum of each band
        Sum2: number array: sum of the squares of each band
        RMS: number array: root of the mean of the squares of each band
        Count: number array: values that counted in each band; 0 where statistics were entered
            or stored without it
        SumXY: number array: sums of the products of two bands, bands by bands
        Cov: number array: covariances of two bands, bands by bands
    """
    ...

class _GetMetadataCalibrationCommandOutputs(TypedDict, total=False):
    BandNames: list[str]
    Gain: NDArray[Any]
    Offset: NDArray[Any]
    SolarIrradiance: NDArray[Any]
    ReflectanceGain: NDArray[Any]
    ReflectanceOffset: NDArray[Any]
    ReflectanceSun: bool
    K1: NDArray[Any]
    K2: NDArray[Any]
    SunElevation: float
    EarthSunDistance: float
    BandsFrom: str
    Doubt: str
    Warning: str

def GetMetadataCalibrationCommand(
    *,
    URI: str | Raster,
    RasterURI: str | Raster | None = None,
    Bands: str | Sequence[str | PathLike[str]] | None = None,
    Quantity: Literal["Radiance", "Reflectance", "Temperature"] | None = None,
    SunElevation: float | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _GetMetadataCalibrationCommandOutputs:
    """Gives what metadata say that calibration needs. What they do not say is absent, and NaN
    where they say it of other bands only.

    Args:
        URI: URI: the metadata
        RasterURI: URI: the raster whose bands the lists are of, as far as it can be told
            which bands of the metadata these are; the lists are of the bands of the metadata
            when absent
        Bands: text list: which bands of the metadata those of the raster are: 4, B04,
            6_VCID_1
        Quantity: word: for which the constants are, Radiance, Reflectance or Temperature;
            where it is that, as many bands as have thermal constants are those
        SunElevation: number in degrees: in the place of what the metadata say

    Returns:
        BandNames: text list: of the bands below, in their order
        Gain: number array in W/(m2 sr um): radiance of one count of each band
        Offset: number array in W/(m2 sr um): radiance of count 0 of each band
        SolarIrradiance: number array in W/(m2 um): for each band
        ReflectanceGain: number array: reflectance of one count of each band
        ReflectanceOffset: number array: reflectance of count 0 of each band
        ReflectanceSun: boolean: with ReflectanceGain: the elevation of the sun is in it; else
            it is to be divided by its sine
        K1: number array in W/(m2 sr um): first thermal constant of each band
        K2: number array in K: second thermal constant of each band
        SunElevation: number in degrees: above the horizon
        EarthSunDistance: number in astronomical units: on the day
        BandsFrom: text: what told which bands those of the raster are
        Doubt: text: why that isn't known, or no constants hold for them; the lists are absent
            then, but for names to choose from
        Warning: text: what is odd about it
    """
    ...

class _GetMetadataCommandOutputs(TypedDict, total=False):
    Value: str
    GetResult: bool

def GetMetadataCommand(
    *,
    URI: str | Raster,
    PATH: str | PathLike[str],
    server: Server | None = None,
    progress: Progress = False,
) -> _GetMetadataCommandOutputs:
    """Gives the value at a path.

    Args:
        URI: URI: the metadata
        PATH: text: a path such as /Sensor/Satellite/

    Returns:
        Value: text: the value, or the array of its elements; absent without one
        GetResult: boolean: there is a value
    """
    ...

class _GetPropertiesMetadataCommandOutputs(TypedDict, total=False):
    GetPropertiesResult: bool
    Type: int
    Size: int
    IsArray: bool
    Rows: int
    Cols: int

def GetPropertiesMetadataCommand(
    *,
    URI: str | Raster,
    PATH: str | PathLike[str],
    server: Server | None = None,
    progress: Progress = False,
) -> _GetPropertiesMetadataCommandOutputs:
    """Tells what stands at a path.

    Args:
        URI: URI: the metadata
        PATH: text: a path such as /Sensor/Satellite/

    Returns:
        GetPropertiesResult: boolean: there is something; without it nothing follows
        Type: integer: 1 uchar, 2 short, 3 int, 4 float, 5 double, 7 string, 12 ushort, 13
            uint, 14 long64, 15 ulong64, 0 undefined, 20 a container
        Size: integer: elements; of a container, names in it
        IsArray: boolean: it has rows and columns
        Rows: integer: 0 without
        Cols: integer: 0 without
    """
    ...

class _GetRasterCategoriesCommandOutputs(TypedDict, total=False):
    Categories: list[str]

def GetRasterCategoriesCommand(
    *,
    URI: str | Raster,
    Band: int,
    server: Server | None = None,
    progress: Progress = False,
) -> _GetRasterCategoriesCommandOutputs:
    """Gives the names that the values of a band have. A command of this library's own.

    Args:
        URI: URI: the raster
        Band: integer: from 0

    Returns:
        Categories: text list: of the values from 0 on; empty where it has none
    """
    ...

class _GetRasterGeoRefCommandOutputs(TypedDict, total=False):
    GeoRef: str

def GetRasterGeoRefCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _GetRasterGeoRefCommandOutputs:
    """Tells where the pixels of a raster lie.

    Args:
        URI: URI: the raster

    Returns:
        GeoRef: geo-reference: the geo-reference; Unknown when it has none
    """
    ...

class _GetRasterHistogramCommandOutputs(TypedDict, total=False):
    Histograms: str

def GetRasterHistogramCommand(
    *,
    URI: str | Raster,
    Bands: ArrayLike,
    Wait: Literal["Told", "Always"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _GetRasterHistogramCommandOutputs:
    """Gives the histograms at hand of bands.

    Args:
        URI: URI: the raster
        Bands: integer array: the bands, in the order wanted
        Wait: word: Told: a computation that another command runs over the raster makes this
            one fail, or leaves what it sets without effect; Always: it waits its turn

    Returns:
        Histograms: text: array of histograms: band, sign, bin size, bins, bounds, source and
            counts of each
    """
    ...

class _GetRasterPaletteCommandOutputs(TypedDict, total=False):
    Palettes: str

def GetRasterPaletteCommand(
    *,
    URI: str | Raster,
    Bands: ArrayLike,
    server: Server | None = None,
    progress: Progress = False,
) -> _GetRasterPaletteCommandOutputs:
    """Gives the colour tables of bands.

    Args:
        URI: URI: the raster
        Bands: integer array: the bands, from 0

    Returns:
        Palettes: palette array: one for each band given; empty where it has none
    """
    ...

class _GetRasterPercentilesCommandOutputs(TypedDict, total=False):
    Percentiles: NDArray[Any]

def GetRasterPercentilesCommand(
    *,
    URI: str | Raster,
    Percents: ArrayLike,
    Bands: ArrayLike | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _GetRasterPercentilesCommandOutputs:
    """Gives percentiles of the valid pixels of each band, exactly. A command of this library's
    own.

    Args:
        URI: URI: the raster
        Percents: number array: 0 to 100, 128 of them at most; 50 is the median
        Bands: integer array: from 0; all when absent
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them

    Returns:
        Percentiles: number array: bands by percentages; between the values at the two ranks
            next to (n - 1) p / 100, and nan in a band without a valid pixel
    """
    ...

class _GetRasterPyramidCommandOutputs(TypedDict, total=False):
    PyramidURI: str

def GetRasterPyramidCommand(
    *,
    URI: str | Raster,
    Level: int,
    Placing: Literal["Told", "Exact"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _GetRasterPyramidCommandOutputs:
    """Gives a level of the pyramid of a raster as a raster of its own.

    Args:
        URI: URI: the raster
        Level: integer: halves samples and lines so many times; 0 is the size of the raster
        Placing: word: Told: pixels grow by the whole part of the quotient of the sizes;
            Exact: by 2^Level, as the level's pixel x is the raster's pixel x * 2^Level

    Returns:
        PyramidURI: URI: the level, by which further commands find it
    """
    ...

class _GetRasterSubRectCommandOutputs(TypedDict, total=False):
    Return: bool
    Fault: str

def GetRasterSubRectCommand(
    *,
    URI: str | Raster,
    SubRect: str | tuple[int, int, int, int],
    Bands: ArrayLike,
    Interleave: Literal["None", "BIP", "BIL", "BSQ"],
    PixelDataBufName: str | PathLike[str],
    PixelDataBufSize: int,
    PixelValueStateBufName: str | PathLike[str],
    PixelValueStateBufSize: int,
    server: Server | None = None,
    progress: Progress = False,
) -> _GetRasterSubRectCommandOutputs:
    """Reads a block of pixels into named memory.

    Args:
        URI: URI: the raster
        SubRect: rectangle: the block, pixels of the raster
        Bands: integer array: the bands, in any order
        Interleave: word: BIP, BIL, BSQ: the order in memory; any other word for one band
        PixelDataBufName: text: named memory of the pixels
        PixelDataBufSize: integer in bytes: its size
        PixelValueStateBufName: text: named memory of the states, a byte for each pixel value:
            1 no data, 2 masked, 4 outside the region, 0 valid
        PixelValueStateBufSize: integer in bytes: its size

    Returns:
        Return: boolean: the whole block was read; else the memory means nothing
        Fault: text: why not, where Return is 0
    """
    ...

class _ListFormatsCommandOutputs(TypedDict, total=False):
    Formats: list[str]
    Kinds: NDArray[Any]
    Plugins: list[str]
    Loaded: NDArray[numpy.bool_]
    Available: NDArray[numpy.bool_]
    Faults: list[str]

def ListFormatsCommand(
    *,
    server: Server | None = None,
    progress: Progress = False,
) -> _ListFormatsCommandOutputs:
    """Lists the formats, and which of them can be used here.

    Returns:
        Formats: text list: keys, in the order in which sources are offered to them
        Kinds: integer array: for each: 1 raster, 2 vector
        Plugins: text list: for each, the library that serves it
        Loaded: boolean array: for each, whether its plug-in loads and serves it
        Available: boolean array: for each, whether it can be used on this machine
        Faults: text list: for each, why not; - where there is nothing to say
    """
    ...

class _ListJobsCommandOutputs(TypedDict, total=False):
    Jobs: NDArray[Any]
    Clients: NDArray[Any]
    Seconds: NDArray[Any]
    Progress: NDArray[Any]
    Aborted: NDArray[numpy.bool_]
    Commands: list[str]

def ListJobsCommand(
    *,
    server: Server | None = None,
    progress: Progress = False,
) -> _ListJobsCommandOutputs:
    """Lists the jobs that a server is running, this one among them; vexg's own.

    Returns:
        Jobs: integer array: their numbers, counted from 1; further arrays go along
        Clients: integer array: numbers of the processes that sent them
        Seconds: number array in s: since each began
        Progress: number array: of each, 0 to 1
        Aborted: boolean array: 1: its abort flag is up
        Commands: text list: of each, the classes of the commands that run now, joined by
            commas; - for none
    """
    ...

class _ListOpenObjectsCommandOutputs(TypedDict, total=False):
    URIs: list[str]
    Kinds: list[str]
    Opens: NDArray[Any]
    Clients: NDArray[Any]

def ListOpenObjectsCommand(
    *,
    server: Server | None = None,
    progress: Progress = False,
) -> _ListOpenObjectsCommandOutputs:
    """Lists what is open, by whom, one entry for each object and client; vexg's own.

    Returns:
        URIs: URI array: the objects; further lists go along
        Kinds: text list: raster, metadata or other
        Opens: integer array: how often the client has opened it and not closed it
        Clients: integer array: number of the client's process; 0 where the opens are nobody's
    """
    ...

class _MakeMosaicFootPrintsCommandOutputs(TypedDict, total=False):
    Made: int

def MakeMosaicFootPrintsCommand(
    *,
    MosaicURI: str | Raster,
    Again: bool | None = None,
    SmoothParameter: float | None = None,
    NoData: float | None = None,
    Tolerance: float | None = None,
    MaskURIs: Sequence[str | Raster] | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _MakeMosaicFootPrintsCommandOutputs:
    """Makes the footprints of a mosaic's scenes that have none, and stores them in its
    definition. A command of this library's own.

    Args:
        MosaicURI: URI: the mosaic
        Again: boolean: 1: of all scenes
        SmoothParameter: number in square pixels: how far outlines may lie from the pixels;
            3.1 when absent
        NoData: number: see MosaicFootPrintsCommand
        Tolerance: number in pixel values: see MosaicFootPrintsCommand
        MaskURIs: URI array: for each scene a mask, see MosaicFootPrintsCommand; empty for
            none
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them

    Returns:
        Made: integer: how many footprints were made
    """
    ...

class _MeasureROICommandOutputs(TypedDict, total=False):
    Pixels: int
    SubRect: tuple[int, int, int, int]

def MeasureROICommand(
    *,
    URI: str | Raster,
    ROIDefURI: str | Raster,
    SubRect: str | tuple[int, int, int, int] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _MeasureROICommandOutputs:
    """Tells which pixels of a raster a region of interest covers. A command of this library's
    own.

    Args:
        URI: URI: the raster
        ROIDefURI: URI: the region
        SubRect: rectangle: of the raster, where alone it is looked for; all when absent

    Returns:
        Pixels: integer: how many of the raster are in the region
        SubRect: rectangle: the smallest rectangle with all of them; absent without any
    """
    ...

class _MosaicAutoSeamGenCommandOutputs(TypedDict, total=False):
    Success: bool

def MosaicAutoSeamGenCommand(
    *,
    MosaicURI: str | Raster,
    Sides: Literal["Told", "Exact"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _MosaicAutoSeamGenCommandOutputs:
    """Decides which scene of a mosaic shows which ground: cuts the footprints of its scenes
    along seams through their overlaps.

    Args:
        MosaicURI: URI: the mosaic, of one of eight types
        Sides: word: how the side of a seam that a scene keeps is found where the overlap has
            four corners a, b, c, d: Told: by the distance of its outline from b and from the
            middles of a and b, and of c and d; Exact: of b and c instead of the last, so that
            scenes side by side keep their own

    Returns:
        Success: boolean: the seams were made
    """
    ...

class _MosaicFootPrintsCommandOutputs(TypedDict, total=False):
    Success: bool

def MosaicFootPrintsCommand(
    *,
    RasterURI: str | Raster,
    Level: int,
    SmoothParameter: float,
    VectorMSCFP: str | Raster,
    NoData: float | None = None,
    Tolerance: float | None = None,
    MaskURI: str | Raster | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _MosaicFootPrintsCommandOutputs:
    """Makes the footprint of a scene: polygons around its valid pixels.

    Args:
        RasterURI: URI: the scene, of one of eight types
        Level: integer: the pyramid level whose pixels are looked at; 0, and one that there
            isn't, stand for the scene itself
        SmoothParameter: number in square pixels: how far the outline may lie from the pixels;
            0 keeps it
        VectorMSCFP: URI: the footprint file to create
        NoData: number: pixels that hold it in all bands are outside; those of the scene's own
            no-data values when absent
        Tolerance: number in pixel values: values so close to no data are outside as well
            where they touch the outside; 0 when absent
        MaskURI: URI: a raster of the scene's size; where its first band is 0 or not valid is
            outside

    Returns:
        Success: boolean: the footprint was made
    """
    ...

class _MosaicStatsCommandOutputs(TypedDict, total=False):
    Success: bool

def MosaicStatsCommand(
    *,
    MosaicURI: str | Raster,
    Level: int,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _MosaicStatsCommandOutputs:
    """Makes the tables that match the colours of a mosaic's scenes to those of its reference
    scene.

    Args:
        MosaicURI: URI: the mosaic, of one of eight types
        Level: integer: the pyramid level whose pixels are counted; 0, and one that there
            isn't, stand for the mosaic itself
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them

    Returns:
        Success: boolean: the tables were made
    """
    ...

class _OpenRasterCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str
    Note: str
    Warning: str

def OpenRasterCommand(
    *,
    ConnStr: str | Sequence[str | PathLike[str]],
    PyramidConnStr: str | Sequence[str | PathLike[str]] | None = None,
    PyramidNew: bool | None = None,
    GeoRef: str | None = None,
    Levels: Literal["Told", "Best"] | None = None,
    PyramidCheck: Literal["Told", "Fitting"] | None = None,
    CheckSource: Literal["Told", "Compared"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _OpenRasterCommandOutputs:
    """Opens a raster source. One that is open already is shared.

    Args:
        ConnStr: text list: the source: a file, with or without the key of its format
        PyramidConnStr: text list: a pyramid file that belongs to it; one that isn't there yet
            can be built
        PyramidNew: boolean: 1: a pyramid file that is there is not looked at, only replaced
            by a build
        GeoRef: geo-reference: in place of the source's own
        Levels: word: of a source that has levels of its own beside a pyramid file. Told:
            those of the pyramid file; Best: its own where they are newer, or begin with a
            finer one
        PyramidCheck: word: Told: a pyramid file that can't be read, or is of a raster of
            another size or pixel type, makes the command fail; Fitting: any that was not
            built from the source as it is is left out, with a warning
        CheckSource: word: Told: a source that is open is shared, whatever has become of its
            file; Compared: one whose file is another one now, or has changed its size or
            time, gives a raster of its own, whose URI has a counter behind it

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
        Note: text: what of the inputs had no effect, or which levels are shown where Levels
            is Best and there are two sets of them; only then
        Warning: text: what was found beside the source and left out, and why; only then
    """
    ...

class _PolygonizeCommandOutputs(TypedDict, total=False):
    Polygons: int
    LeftOut: int
    Warning: str

def PolygonizeCommand(
    *,
    URI: str | Raster,
    Vectors: str | PathLike[str],
    Band: int | None = None,
    MaskURI: str | Raster | None = None,
    Layer: str | PathLike[str] | None = None,
    Field: str | PathLike[str] | None = None,
    MinSize: float | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _PolygonizeCommandOutputs:
    """Turns areas of equal value of a raster into polygons of a vector file. A command of this
    library's own.

    Args:
        URI: URI: the raster
        Vectors: text: the file to make, in the format of its ending: .fxv, or one of a vector
            plug-in
        Band: integer: from 0; 0 when absent
        MaskURI: URI: a raster of the same size; where its first band is 0 or not valid,
            pixels do not count
        Layer: text: name of the layer; the file's name without its ending when absent
        Field: text: name of the column of values; label when absent
        MinSize: number in pixels: smaller polygons are left out, which leaves their places
            empty; none when absent
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them

    Returns:
        Polygons: integer: how many were written
        LeftOut: integer: how many were too small
        Warning: text: what the user should know of the result; absent when there is nothing
    """
    ...

class _PutRasterSubRectCommandOutputs(TypedDict, total=False):
    Return: bool
    Fault: str

def PutRasterSubRectCommand(
    *,
    URI: str | Raster,
    SubRect: str | tuple[int, int, int, int],
    Bands: ArrayLike,
    Interleave: Literal["None", "BIP", "BIL", "BSQ"],
    PixelDataBufName: str | PathLike[str],
    PixelDataBufSize: int,
    PixelValueStateBufName: str | PathLike[str],
    PixelValueStateBufSize: int,
    server: Server | None = None,
    progress: Progress = False,
) -> _PutRasterSubRectCommandOutputs:
    """Writes a block of pixels from named memory.

    Args:
        URI: URI: the raster
        SubRect: rectangle: the block, pixels of the raster
        Bands: integer array: the bands, in any order
        Interleave: word: BIP, BIL, BSQ: the order in memory; any other word for one band
        PixelDataBufName: text: named memory of the pixels
        PixelDataBufSize: integer in bytes: its size
        PixelValueStateBufName: text: named memory of the states, a byte for each pixel value:
            1 no data, 2 masked, 4 outside the region, 0 valid
        PixelValueStateBufSize: integer in bytes: its size

    Returns:
        Return: boolean: the whole block was taken
        Fault: text: why not, where Return is 0
    """
    ...

class _QueryAttributesCommandOutputs(TypedDict, total=False):
    Bands: int
    Attributes: int
    Names: list[str]
    Records: int
    Regions: int
    Mean: NDArray[Any]
    Std: NDArray[Any]
    Min: NDArray[Any]
    Max: NDArray[Any]
    Count: NDArray[Any]
    Lower: NDArray[Any]
    Upper: NDArray[Any]
    Bins: NDArray[Any]

def QueryAttributesCommand(
    *,
    AttributeFXA: str | PathLike[str],
    Statistics: bool | None = None,
    Histograms: bool | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _QueryAttributesCommandOutputs:
    """Tells what a file of regions holds, and the statistics and histograms of its attributes. A
    command of this library's own.

    Args:
        AttributeFXA: text: the file of regions
        Statistics: boolean: whether they are computed
        Histograms: boolean: whether they are computed

    Returns:
        Bands: integer: how many there are
        Attributes: integer: how many there are in a band
        Names: text list: of the attributes; numbers where they have none
        Records: integer: one above the largest label
        Regions: integer: of the records, those that hold a region
        Mean: number array: of bands by attributes, over all regions
        Std: number array: deviation of a sample
        Min: number array: smallest value
        Max: number array: largest value
        Count: number array: how many values there are
        Lower: number array: of bands by attributes, the lowest value of the first bin
        Upper: number array: the lowest value of the last bin
        Bins: integer array: of bands by attributes by bins, how many values there are
    """
    ...

class _QueryClassSamplesCommandOutputs(TypedDict, total=False):
    Classes: list[str]
    Counts: NDArray[Any]

def QueryClassSamplesCommand(
    *,
    Vectors: str | PathLike[str],
    ClassField: str | PathLike[str],
    Layer: str | PathLike[str] | None = None,
    Where: str | PathLike[str] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _QueryClassSamplesCommandOutputs:
    """Tells the classes of the samples in a vector file. A command of this library's own.

    Args:
        Vectors: text: the file of samples, of any shape
        ClassField: text: the field with the class of a sample
        Layer: text: a layer of the file, by its name or its number from 0; the first when
            absent
        Where: text: FIELD=VALUE: only records with that value; all when absent

    Returns:
        Classes: text list: the names of the classes, numbers in front of texts
        Counts: integer array: the samples of each
    """
    ...

class _QueryMetadataCommandOutputs(TypedDict, total=False):
    QueryResult: bool

def QueryMetadataCommand(
    *,
    URI: str | Raster,
    PATH: str | PathLike[str],
    server: Server | None = None,
    progress: Progress = False,
) -> _QueryMetadataCommandOutputs:
    """Tells whether there is a value.

    Args:
        URI: URI: the metadata
        PATH: text: a path such as /Sensor/Satellite/

    Returns:
        QueryResult: boolean: there is a value, not a container, at the path
    """
    ...

class _QueryMosaicCommandOutputs(TypedDict, total=False):
    Scenes: list[str]
    Sizes: NDArray[Any]
    OnGrid: NDArray[numpy.bool_]
    Matched: NDArray[numpy.bool_]
    Footprints: list[str]
    Seams: list[str]
    Reference: int
    MatchMode: str
    Bins: str
    ResamplingMethod: str
    FeatherWidth: float
    Tables: str
    WorkingDirectory: str

def QueryMosaicCommand(
    *,
    MosaicURI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _QueryMosaicCommandOutputs:
    """Tells what a mosaic is made of. A command of this library's own.

    Args:
        MosaicURI: URI: the mosaic

    Returns:
        Scenes: URI array: identifiers of the scenes, in their order
        Sizes: integer array: samples and lines of each scene
        OnGrid: boolean array: for each scene, whether it lies on the mosaic's grid
        Matched: boolean array: for each scene, whether it takes part in matching
        Footprints: URI array: for each scene, its footprint file; empty for none
        Seams: URI array: for each scene, its seam file; empty for none
        Reference: integer: number of the scene that others are matched to
        MatchMode: word: Overlaps or Scenes
        Bins: word: Told or Exact
        ResamplingMethod: word: of scenes that don't lie on the grid
        FeatherWidth: number in pixels: across seams
        Tables: text: base of the names of the table files; empty for none
        WorkingDirectory: text: where side files are made
    """
    ...

class _QueryNamesMetadataCommandOutputs(TypedDict, total=False):
    Names: list[str]
    QueryNamesResult: bool

def QueryNamesMetadataCommand(
    *,
    URI: str | Raster,
    PATH: str | PathLike[str],
    DOPRIVATE: int,
    server: Server | None = None,
    progress: Progress = False,
) -> _QueryNamesMetadataCommandOutputs:
    """Lists the values below a path.

    Args:
        URI: URI: the metadata
        PATH: text: a path such as /Sensor/Satellite/
        DOPRIVATE: integer: 0 for the public values, else the private ones

    Returns:
        Names: text list: full paths, in order
        QueryNamesResult: boolean: true for an empty path, else whether a value stands at the
            path itself
    """
    ...

class _QueryRasterCommandOutputs(TypedDict, total=False):
    Samples: int
    Lines: int
    Bands: int
    Interleave: str
    DataType: str
    Format: str
    CanWrite: bool
    StatsMode: str
    PyramidExists: bool
    TileDimensions: str
    PyramidType: str
    PyramidResamplingMethod: str
    PyramidLevelMin: int
    PyramidLevelMax: int
    PyramidCanBuild: bool

def QueryRasterCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _QueryRasterCommandOutputs:
    """Tells what a raster is.

    Args:
        URI: URI: the raster

    Returns:
        Samples: integer: pixels of a line
        Lines: integer: lines
        Bands: integer: bands
        Interleave: word: BIP, BIL, BSQ, or Unknown: the order in the source
        DataType: word: pixel type
        Format: text: key of the format
        CanWrite: boolean: pixels can be written
        StatsMode: word: which statistics are computed
        PyramidExists: boolean: there are reduced levels to read
        TileDimensions: tiles: blocks of the source
        PyramidType: word: who keeps the pyramid
        PyramidResamplingMethod: word: how its pixels came about
        PyramidLevelMin: integer: first level
        PyramidLevelMax: integer: last level
        PyramidCanBuild: boolean: a pyramid can be built
    """
    ...

class _QueryRasterDetailsCommandOutputs(TypedDict, total=False):
    Details: list[str]

def QueryRasterDetailsCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _QueryRasterDetailsCommandOutputs:
    """Tells what a raster says beside its size, type, place and no-data values.

    Args:
        URI: URI: the raster

    Returns:
        Details: text list: texts "name=value", such as "Bands/0/Unit=K"; a bar in one is
            written as a blank
    """
    ...

class _QueryRasterValidityCommandOutputs(TypedDict, total=False):
    ValidPixels: NDArray[Any]
    HasFreeValue: NDArray[numpy.bool_]
    FreeValue: NDArray[Any]

def QueryRasterValidityCommand(
    *,
    URI: str | Raster,
    Values: bool | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _QueryRasterValidityCommandOutputs:
    """Counts the valid pixels of each band of a raster, by reading all of it.

    Args:
        URI: URI: the raster
        Values: boolean: whether to look for a value that no valid pixel has; not when absent

    Returns:
        ValidPixels: integer array: for each band
        HasFreeValue: boolean array: for each band, whether there is a value that none of its
            valid pixels has; false when it was not looked for
        FreeValue: number array: that value, the same for all bands where there is one; 0
            where there is none
    """
    ...

class _QueryVectorsCommandOutputs(TypedDict, total=False):
    Layers: int
    Name: str
    Geometry: str
    Records: int
    Bounds: NDArray[Any]
    CoordSys: str
    Fields: list[str]
    FieldTypes: list[str]

def QueryVectorsCommand(
    *,
    Vectors: str | PathLike[str],
    Layer: int | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _QueryVectorsCommandOutputs:
    """Tells what a layer of a vector file is. A command of this library's own.

    Args:
        Vectors: text: the file
        Layer: integer: its number, from 0; 0 when absent

    Returns:
        Layers: integer: how many the file has
        Name: text: of the layer
        Geometry: text: Point, Line or Polygon; Unknown for shapes of several kinds
        Records: integer: how many there are
        Bounds: number array: min x, min y, max x, max y of all records; absent where they are
            not known
        CoordSys: text: the coordinate system; empty when there is none
        Fields: text list: names of the columns
        FieldTypes: text list: for each column Integer, Real or Text
    """
    ...

class _RasterizeCommandOutputs(TypedDict, total=False):
    URI: str
    DataType: str
    Shapes: int

def RasterizeCommand(
    *,
    Vectors: str | PathLike[str],
    LikeURI: str | Raster,
    Layer: str | PathLike[str] | None = None,
    Where: str | PathLike[str] | None = None,
    Value: float | None = None,
    Field: str | PathLike[str] | None = None,
    Background: float | None = None,
    NoData: float | None = None,
    DataType: Literal["Byte", "Char", "UInt16", "Int16", "UInt32", "Int32", "Single", "Double"] | None = None,
    Pixels: Literal["Told", "Center", "Touched"] | None = None,
    ScanRules: Literal["Told", "Steady"] | None = None,
    Coordinates: Literal["Told", "Map", "Pixel"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _RasterizeCommandOutputs:
    """Shows the shapes of a vector file as a raster on the grid of another one. A command of
    this library's own.

    Args:
        Vectors: text: the file of shapes
        LikeURI: URI: the raster whose grid it gets
        Layer: text: a layer of the file, by its name or its number from 0; the first when
            absent
        Where: text: FIELD=VALUE: only records with that value; all when absent
        Value: number: of all shapes; 1 when absent
        Field: text: the field whose numbers are the values, in place of Value; records
            without one are left out
        Background: number: of the pixels outside; 0 when absent
        NoData: number: in place of Background: the no-data value of the pixels outside
        DataType: word: pixel type; the smallest that holds all values when absent
        Pixels: word: Told: the pixels of the inclusive scan of regions; Center: those whose
            centre lies inside; Touched: those whose area is touched
        ScanRules: word: see CreateGeometryROIDefCommand
        Coordinates: word: see CreateGeometryROIDefCommand

    Returns:
        URI: URI: the raster, by which further commands find it
        DataType: word: its pixel type
        Shapes: integer: how many records it shows
    """
    ...

class _RefreshRasterPyramidCommandOutputs(TypedDict, total=False):
    Return: bool

def RefreshRasterPyramidCommand(
    *,
    URI: str | Raster,
    server: Server | None = None,
    progress: Progress = False,
) -> _RefreshRasterPyramidCommandOutputs:
    """Has a raster show the levels that its pyramid holds by now.

    Args:
        URI: URI: the raster

    Returns:
        Return: boolean: it has a pyramid that could be looked at
    """
    ...

def RemoveMetadataCommand(
    *,
    URI: str | Raster,
    PATH: str | PathLike[str],
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Deletes what stands at a path; nothing when there is nothing.

    Args:
        URI: URI: the metadata
        PATH: text: a path such as /Sensor/Satellite/
    """
    ...

class _SaveRasterHistogramCommandOutputs(TypedDict, total=False):
    Return: bool
    Fault: str

def SaveRasterHistogramCommand(
    *,
    URI: str | Raster,
    Wait: Literal["Told", "Always"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _SaveRasterHistogramCommandOutputs:
    """Stores the histograms of a raster through its data source.

    Args:
        URI: URI: the raster
        Wait: word: Told: a computation that another command runs over the raster makes this
            one fail, or leaves what it sets without effect; Always: it waits its turn

    Returns:
        Return: boolean: they are stored, or the source has no place for them
        Fault: text: why they could not be stored; only then
    """
    ...

class _SaveRasterStatsCommandOutputs(TypedDict, total=False):
    Return: bool
    Fault: str

def SaveRasterStatsCommand(
    *,
    URI: str | Raster,
    Wait: Literal["Told", "Always"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _SaveRasterStatsCommandOutputs:
    """Stores the statistics of a raster through its data source.

    Args:
        URI: URI: the raster
        Wait: word: Told: a computation that another command runs over the raster makes this
            one fail, or leaves what it sets without effect; Always: it waits its turn

    Returns:
        Return: boolean: they are stored, or the source has no place for them
        Fault: text: why they could not be stored; only then
    """
    ...

def SetDefaultTileSizeCommand(
    *,
    URI: str | Raster,
    TileDimensions: str,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Sets the blocks in which a raster is worked on, where it has a use for that.

    Args:
        URI: URI: the raster
        TileDimensions: tiles: the blocks
    """
    ...

class _SetMetadataCommandOutputs(TypedDict, total=False):
    SetResult: bool

def SetMetadataCommand(
    *,
    URI: str | Raster,
    PATH: str | PathLike[str],
    TYPE: int,
    SIZE: int,
    ISARRAY: int,
    VALUE: str | PathLike[str] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _SetMetadataCommandOutputs:
    """Stores a value.

    Args:
        URI: URI: the metadata
        PATH: text: a path such as /Sensor/Satellite/
        TYPE: integer: type code, see GetPropertiesMetadataCommand
        SIZE: integer: elements
        ISARRAY: integer: 0, with a size below 2, for a single value; else VALUE is an array
        VALUE: text: the value; left out for type 0

    Returns:
        SetResult: boolean: the value is stored
    """
    ...

def SetPixelAddressCommand(
    *,
    SrcURI: str | Raster,
    Addrs: ArrayLike,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Replaces the pixels of a region of interest.

    Args:
        SrcURI: URI: the region
        Addrs: integer array: x, y of each pixel, from 0; an odd last number is left out
    """
    ...

def SetRasterBandHistogramCommand(
    *,
    URI: str | Raster,
    RasterBandHistogram: str | PathLike[str],
    Wait: Literal["Told", "Always"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Enters a known histogram of one band.

    Args:
        URI: URI: the raster
        RasterBandHistogram: text: band, sign, bin size, bins, bounds, source and counts
        Wait: word: Told: a computation that another command runs over the raster makes this
            one fail, or leaves what it sets without effect; Always: it waits its turn
    """
    ...

def SetRasterBandStatsCommand(
    *,
    URI: str | Raster,
    RasterBandStats: str | PathLike[str],
    Wait: Literal["Told", "Always"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> dict[str, Any]:
    """Enters known statistics of one band.

    Args:
        URI: URI: the raster
        RasterBandStats: text: band, mask, min, max, mean, deviation, sum, sum of squares,
            root mean square, and the arrays of products and covariances
        Wait: word: Told: a computation that another command runs over the raster makes this
            one fail, or leaves what it sets without effect; Always: it waits its turn
    """
    ...

class _SetRasterPaletteCommandOutputs(TypedDict, total=False):
    Return: bool

def SetRasterPaletteCommand(
    *,
    URI: str | Raster,
    Band: int,
    Palette: str | Sequence[tuple[str, int, int, int, int]],
    server: Server | None = None,
    progress: Progress = False,
) -> _SetRasterPaletteCommandOutputs:
    """Stores the colour table of a band through the data source.

    Args:
        URI: URI: the raster
        Band: integer: the band, from 0
        Palette: palette: the colour table

    Returns:
        Return: boolean: the source took it
    """
    ...

class _SetRasterStatsModeCommandOutputs(TypedDict, total=False):
    StatsMode: str

def SetRasterStatsModeCommand(
    *,
    URI: str | Raster,
    StatsMode: Literal["DoBasic", "DoExtended"],
    Wait: Literal["Told", "Always"] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _SetRasterStatsModeCommandOutputs:
    """Sets which statistics a raster computes.

    Args:
        URI: URI: the raster
        StatsMode: word: DoBasic, or DoExtended: with those between bands
        Wait: word: Told: a computation that another command runs over the raster makes this
            one fail, or leaves what it sets without effect; Always: it waits its turn

    Returns:
        StatsMode: word: the mode from now on
    """
    ...

class _SuggestSegmentScalesCommandOutputs(TypedDict, total=False):
    MergeValues: NDArray[Any]
    Segments: NDArray[Any]
    LocalVariance: NDArray[Any]
    Rates: NDArray[Any]
    Peaks: NDArray[Any]
    Onsets: NDArray[Any]
    Prominences: NDArray[Any]

def SuggestSegmentScalesCommand(
    *,
    Tree: str | PathLike[str],
    LeastProminence: float | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _SuggestSegmentScalesCommandOutputs:
    """Finds costs at which segments of a tree are likely to be whole objects: peaks of the rate
    at which the local variance changes with scale (Dragut, Tiede and Levick 2010). A command
    of this library's own.

    Args:
        Tree: text: a file that the input Tree of FxTileSegmentMergeCommand made
        LeastProminence: number: peaks are left out whose prominence is a smaller share of the
            highest, 0 to 1; 0.1 when absent

    Returns:
        MergeValues: number array: costs of the levels, a quarter of an octave apart
        Segments: number array: how many there are at each level
        LocalVariance: number array: mean over the segments of each level of the standard
            deviation of their values
        Rates: number array: its change from the level before, in percent
        Peaks: number array: costs at the peaks of the rates, the most prominent first
        Onsets: number array: for each peak the cost of the lowest rate in front of it, at
            which its objects are whole yet
        Prominences: number array: how far the rate falls on both sides of each peak, in
            percent
    """
    ...

class _TransformPointsCommandOutputs(TypedDict, total=False):
    Points: NDArray[Any]

def TransformPointsCommand(
    *,
    Points: ArrayLike,
    From: str | PathLike[str],
    To: str | PathLike[str],
    server: Server | None = None,
    progress: Progress = False,
) -> _TransformPointsCommandOutputs:
    """Carries points from one coordinate system to another. A command of this library's own.

    Args:
        Points: number array: x and y of each point: easting and northing, or longitude and
            latitude
        From: text: their coordinate system: EPSG:n, WKT or PROJ text
        To: text: that of the result

    Returns:
        Points: number array: the same points in the other system; nan for one that can't be
            carried
    """
    ...

class _ZonalStatisticsCommandOutputs(TypedDict, total=False):
    Zones: int
    Empty: int

def ZonalStatisticsCommand(
    *,
    URI: str | Raster,
    Vectors: str | PathLike[str],
    Table: str | PathLike[str],
    Layer: str | PathLike[str] | None = None,
    Where: str | PathLike[str] | None = None,
    Bands: ArrayLike | None = None,
    Figures: str | Sequence[str | PathLike[str]] | None = None,
    Weights: Literal["None", "Coverage"] | None = None,
    Pixels: Literal["Told", "Center", "Touched"] | None = None,
    ScanRules: Literal["Told", "Steady"] | None = None,
    Coordinates: Literal["Told", "Map", "Pixel"] | None = None,
    Share: ArrayLike | None = None,
    ShareFile: str | PathLike[str] | None = None,
    ShareFiles: str | Sequence[str | PathLike[str]] | None = None,
    server: Server | None = None,
    progress: Progress = False,
) -> _ZonalStatisticsCommandOutputs:
    """Makes a table of what the pixels inside each shape of a vector file add up to. A command
    of this library's own.

    Args:
        URI: URI: the raster
        Vectors: text: the file of shapes, one zone each
        Table: text: the file to make, in the format of its ending: a row for each record with
            its own fields and, for each band, its figures; .csv has no shapes
        Layer: text: a layer of the file, by its name or its number from 0; the first when
            absent
        Where: text: FIELD=VALUE: only records with that value; all when absent
        Bands: integer array: from 0; all when absent
        Figures: text list: of count, min, max, mean, std, sum, median, majority, minority,
            variety, and p with a percentage, as p10; the first six when absent
        Weights: word: None: each pixel of a zone counts 1; Coverage: the share of it that
            lies inside
        Pixels: word: of zones without weights; see RasterizeCommand
        ScanRules: word: see CreateGeometryROIDefCommand
        Coordinates: word: see CreateGeometryROIDefCommand
        Share: integer array: which share of the work is done, from 0, and of how many; all of
            it when absent, and with ShareFiles
        ShareFile: text: the file to make of a share, with Share; nothing else is given or
            made
        ShareFiles: text list: the files of all shares, in order: the work is taken out of
            them

    Returns:
        Zones: integer: how many rows there are
        Empty: integer: how many of them have no valid pixel in any band
    """
    ...
