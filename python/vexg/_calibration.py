"""Physical values as formulas, with the arithmetic of the commands that calibrate whole files."""

import math
import os

from . import _formula, _mtl
from ._jobs import Draft, Node
from ._values import type_word
from .errors import Error

# The digits of pi that the commands have.
_PI = "3.141592653589"
_BANDS = {"gain": "Gain", "offset": "Offset", "irradiance": "SolarIrradiance", "k1": "K1", "k2": "K2"}
_SCENE = {"sun_elevation": "SunElevation", "distance": "EarthSunDistance"}
_NEEDED = {
    "radiance": ("gain", "offset"),
    "reflectance": ("gain", "offset", "irradiance", "sun_elevation", "distance"),
    "temperature": ("gain", "offset", "k1", "k2"),
}


def calibrate(raster, quantity, metadata, constants):
    """The raster of a quantity; see Raster.calibrate."""
    from .raster import FormulaRaster

    if quantity not in _NEEDED:
        raise ValueError(f"{quantity!r} is none of {', '.join(_NEEDED)}")
    known = {*_BANDS, *_SCENE, "scale", "dtype", "metadata_bands"}
    for name in constants:
        if name not in known:
            raise TypeError(f"there is no constant {name!r}; there are {', '.join(sorted(known))}")
    scale = float(constants.pop("scale", 1.0))
    word = type_word(constants.pop("dtype", "float32"))
    metadata_bands = constants.pop("metadata_bands", None)
    if metadata is not None:
        told = (_mtl.constants_of(metadata, metadata_bands, raster.count) if _mtl.is_mtl(metadata)
                else constants_of(metadata, raster._door))
        constants = {**told, **constants}
    missing = [name for name in _NEEDED[quantity] if name not in constants]
    if missing:
        raise Error(f"{quantity} needs {', '.join(missing)}, which "
                    + ("are not given" if metadata is None else f"{metadata} does not tell"))
    count = raster.count
    bands = {name: _for_bands(name, constants[name], count) for name in _NEEDED[quantity] if name in _BANDS}
    formulas = []
    for band, parts in enumerate(raster._parts()):
        values = {name: _text(all_bands[band]) for name, all_bands in bands.items()}
        radiance = ("(", *parts, f" * {values['gain']} + {values['offset']})")
        formulas.append(_of_band(quantity, radiance, values, constants, scale))
    return FormulaRaster(formulas, raster._door, word)


def _of_band(quantity, radiance, values, constants, scale):
    if quantity == "radiance":
        value = (f"{_text(scale)} * ", *radiance)
    elif quantity == "reflectance":
        elevation = float(constants["sun_elevation"])
        if not 0 < elevation <= 90:
            raise ValueError("sun_elevation: the sun stands 0 to 90 degrees above the horizon, and not on it")
        if not float(constants["distance"]) > 0 or not float(values["irradiance"].strip("()")) > 0:
            raise ValueError("distance and irradiance are above 0")
        divisor = math.sin(elevation * math.pi / 180.0) * float(values["irradiance"])
        distance = _text(constants["distance"])
        value = ("(", *radiance, f" * {_PI} * {distance} * {distance} * {_text(scale)}) / {_text(divisor)}")
    else:
        value = (f"{values['k2']} / log({values['k1']} / ", *radiance, f" + 1.0) * {_text(scale)}")
    return ("where(", *radiance, " > 0, ", *value, ", 0)")


def _text(number):
    return _formula._number_parts(number)[0]


def _for_bands(name, value, count):
    """A value for each band; one number counts for all."""
    values = [float(value)] * count if isinstance(value, (int, float)) else [float(each) for each in value]
    if len(values) == 1:
        values *= count
    if len(values) != count:
        raise ValueError(f"{name}: there are {len(values)} values for {count} bands")
    return values


_FORMATS = {
    ".imd": "DGIMD", ".rpb": "DGRPB", ".til": "DGTIL", ".tif": "TIFF", ".tiff": "TIFF", ".img": "Erdas",
    ".grb": "GRIB", ".grb2": "GRIB", ".grib": "GRIB", ".grib2": "GRIB", ".hdr": "ORVA",
}  # fmt: skip


def _metadata_source(text):
    """The connection strings of a header: FORMAT:FILE, or a name that tells the format."""
    text = os.fspath(text)
    format, colon, file = text.partition(":")
    if colon and format.isupper() and format.isalnum():
        return f"{format}|{os.path.abspath(file)}"
    ending = os.path.splitext(text)[1].lower()
    format = _FORMATS.get(ending)
    if ending in (".xml", ".gml"):
        with open(text, "rb") as head:
            start = head.read(1 << 16)
        format = ("PLEIADESRPC" if b"<Rational_Function_Model" in start else
                  "PLEIADESDIM" if b"<Dimap_Document" in start else "GML" if b"FeatureCollection" in start else None)
    if format is None:
        raise Error(f"{text}: the name doesn't tell what metadata these are; write FORMAT:FILE, such as DGIMD:{text}")
    return f"{format}|{os.path.abspath(text)}"


def constants_of(metadata, door):
    """The constants that the header of a scene tells, by their names here."""
    node = Node("CreateMetadataCommand", (("ConnStr", _metadata_source(metadata)),))
    draft = Draft()
    draft.step("constants", "GetMetadataCalibrationCommand", {"URI": node})
    found = door.run(draft).values("constants")
    constants = {name: found[output].tolist() for name, output in _BANDS.items() if output in found}
    constants.update({name: found[output] for name, output in _SCENE.items() if output in found})
    return constants
