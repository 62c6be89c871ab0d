"""Physical values: the constants of scenes, and the view of the command that calibrates."""

import math
import os
import warnings

from ._jobs import Draft, Node
from ._values import type_word
from ._watch import watch
from .errors import Error

_BANDS = {"gain": "Gain", "offset": "Offset", "irradiance": "SolarIrradiance", "k1": "K1", "k2": "K2",
          "reflectance_gain": "ReflectanceGain", "reflectance_offset": "ReflectanceOffset"}
_SCENE = {"sun_elevation": "SunElevation", "distance": "EarthSunDistance"}
_NEEDED = {
    "radiance": ("gain", "offset"),
    "reflectance": ("gain", "offset", "irradiance", "sun_elevation", "distance"),
    "temperature": ("gain", "offset", "k1", "k2"),
}
_OF_RADIANCE = ("gain", "offset", "irradiance", "distance")
_OF_REFLECTANCE = ("reflectance_gain", "reflectance_offset")


def calibrate(raster, quantity, metadata, metadata_bands, dtype, scale, unit, constants):
    """The raster of a quantity; see Raster.calibrate."""
    if quantity not in _NEEDED:
        raise ValueError(f"{quantity!r} is none of {', '.join(_NEEDED)}")
    for name in constants:
        if name not in _BANDS and name not in _SCENE:
            raise TypeError(f"there is no constant {name!r}; there are {', '.join((*_BANDS, *_SCENE))}")
    if metadata_bands is not None and metadata is None:
        raise TypeError("metadata_bands goes with metadata")
    constants = {name: value for name, value in constants.items() if value is not None}
    told = {} if metadata is None else _told(raster, quantity, metadata, metadata_bands, constants)
    needed = _needed(quantity, constants, told)
    taken = {**told, **constants}
    missing = [name for name in needed if name not in taken]
    if missing:
        raise Error(_why_missing(quantity, missing, metadata, told))
    values = {name: _for_bands(name, taken[name], raster.count, told.get("names")) if name in _BANDS
              else float(taken[name]) for name in needed}
    _check(values)
    inputs = {"Quantity": quantity.capitalize()}
    for name, value in values.items():
        # Without irradiances gains and offsets make reflectance.
        input = {**_BANDS, **_SCENE}[name]
        inputs[input.removeprefix("Reflectance") if name in _OF_REFLECTANCE else input] = value
    if quantity == "temperature":
        inputs["Unit"] = str(unit).capitalize()
    inputs.update({"ScaleFactor": float(scale), "DataType": type_word(dtype)})
    return raster._view("CreateCalibratedRasterCommand", inputs)


def _needed(quantity, constants, told):
    """The names of the constants that the quantity is computed of: where metadata have factors that make
    reflectance, and nothing is given that goes with radiance, these."""
    if quantity != "reflectance":
        return _NEEDED[quantity]
    own = [name for name in _OF_REFLECTANCE if name in constants]
    others = [name for name in _OF_RADIANCE if name in constants]
    if own and others:
        raise TypeError(f"{own[0]} goes without {others[0]}")
    if not own and (others or "reflectance_gain" not in told):
        return _NEEDED[quantity]
    if told.get("is_sun_in"):
        if "sun_elevation" in constants:
            raise TypeError("sun_elevation is in the reflectances of the metadata")
        return _OF_REFLECTANCE
    return (*_OF_REFLECTANCE, "sun_elevation")


def _why_missing(quantity, missing, metadata, told):
    if metadata is None:
        return f"{quantity} needs {', '.join(missing)}, which are not given"
    if told.get("doubt"):
        names = told.get("names")
        return f"{metadata}: {told['doubt']}" + (
            f"; metadata_bands says which of {', '.join(names)} these are" if names else "")
    return f"{metadata} does not tell {', '.join(missing)}, which {quantity} needs"


def _check(values):
    if not 0 < values.get("sun_elevation", 90) <= 90:
        raise ValueError("sun_elevation: the sun stands 0 to 90 degrees above the horizon, and not on it")
    for value in (values.get("distance", 1.0), *values.get("irradiance", ())):
        if not value > 0:
            raise ValueError("distance and irradiance are above 0")


def _for_bands(name, value, count, bands):
    """A value for each band; one number counts for all."""
    values = [float(each) for each in value] if hasattr(value, "__len__") else [float(value)]
    if len(values) == 1:
        values *= count
    if len(values) != count:
        raise ValueError(f"{name}: there are {len(values)} values for {count} bands")
    for band, each in enumerate(values):
        if not math.isfinite(each):
            raise Error(f"{name} of band {bands[band] if bands and len(bands) == count else band} is not known")
    return values


def _told(raster, quantity, metadata, bands, constants):
    """The constants that metadata tell for the bands of a raster, by their names here, with names, the
    bands that they are of, and doubt, why these aren't known."""
    draft = Draft()
    draft.step("source", "FindMetadataSourceCommand", {"Name": os.fspath(metadata), "Folder": os.getcwd()})
    source = watch(lambda task: raster._door.run(draft, task)).values("source")["ConnStr"]
    draft = Draft()
    draft.step("constants", "GetMetadataCalibrationCommand", {
        "URI": Node("CreateMetadataCommand", (("ConnStr", "|".join(source)),)),
        "RasterURI": raster._chain(), "Quantity": quantity.capitalize(),
        "Bands": None if bands is None else [str(band) for band in bands],
        "SunElevation": constants.get("sun_elevation") if quantity == "radiance" else None})
    found = watch(lambda task: raster._door.run(draft, task)).values("constants")
    if found.get("Warning"):
        warnings.warn(f"{metadata}: {found['Warning']}", stacklevel=5)
    told = {name: found[output].tolist() for name, output in _BANDS.items() if output in found}
    told.update({name: found[output] for name, output in _SCENE.items() if output in found})
    return {**told, "names": found.get("BandNames"), "doubt": found.get("Doubt"),
            "is_sun_in": found.get("ReflectanceSun", False)}
