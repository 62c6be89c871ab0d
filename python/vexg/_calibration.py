"""Physical values as formulas, with the arithmetic of the commands that calibrate whole files."""

import math
import os

from . import _formula
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
    known = {*_BANDS, *_SCENE, "scale", "dtype"}
    for name in constants:
        if name not in known:
            raise TypeError(f"there is no constant {name!r}; there are {', '.join(sorted(known))}")
    scale = float(constants.pop("scale", 1.0))
    word = type_word(constants.pop("dtype", "float32"))
    if metadata is not None:
        constants = {**constants_of(metadata, raster._door), **constants}
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


def constants_of(metadata, door):
    """The constants that the header of a scene tells, by their names here."""
    node = Node("CreateMetadataCommand", (("ConnStr", os.path.abspath(os.fspath(metadata))),))
    draft = Draft()
    draft.step("constants", "GetMetadataCalibrationCommand", {"URI": node})
    found = door.run(draft).values("constants")
    constants = {name: found[output].tolist() for name, output in _BANDS.items() if output in found}
    constants.update({name: found[output] for name, output in _SCENE.items() if output in found})
    return constants
