"""The constants of calibration in the MTL file of a Landsat scene."""

import math
import pathlib
import re

from .errors import Error


def is_mtl(file):
    """Whether a file is the MTL of a scene, by its name."""
    return pathlib.Path(file).name.upper().endswith("MTL.TXT")


def constants_of(file, bands, count):
    """The constants for some bands, by the names of Raster.calibrate.

    An MTL has factors to radiance (L = M Q + A) and to reflectance, but no irradiances. Reflectance is
    pi L d^2 / (E sin(elevation)), so that E = pi d^2 M_radiance / M_reflectance (USGS, Landsat 8-9
    Calibration and Validation Algorithm Description Document).

    Args:
        bands: the numbers of the scene's bands in the MTL, such as [1, 2, 3, 4, 5, 7]; None where all
            bands with reflectance are those of the raster.
        count: bands of the raster.
    """
    try:
        text = pathlib.Path(file).read_text(encoding="utf-8", errors="replace")
    except OSError as fault:
        raise Error(f"{file}: {fault.strerror}") from None
    found = dict(re.findall(r"^\s*(\w+)\s*=\s*\"?([^\"\n]*?)\"?\s*$", text, re.MULTILINE))

    def number(name):
        try:
            return float(found[name])
        except (KeyError, ValueError):
            return None

    if bands is None:
        named = re.findall(r"^\s*REFLECTANCE_MULT_BAND_(\w+)\s*=", text, re.MULTILINE)
        bands = list(dict.fromkeys(named))
        if len(bands) != count:
            raise Error(f"{file}: has the bands {', '.join(bands) or 'of no reflectance'}, and the raster has {count}; "
                        "give metadata_bands, which of them these are")
    bands = [str(band) for band in bands]
    if len(bands) != count:
        raise ValueError(f"metadata_bands names {len(bands)} bands, and the raster has {count}")
    distance = number("EARTH_SUN_DISTANCE")
    constants = {"sun_elevation": number("SUN_ELEVATION"), "distance": distance}
    for name, key in (("gain", "RADIANCE_MULT_BAND_{}"), ("offset", "RADIANCE_ADD_BAND_{}"),
                      ("k1", "K1_CONSTANT_BAND_{}"), ("k2", "K2_CONSTANT_BAND_{}")):
        constants[name] = [number(key.format(band)) for band in bands]
    if distance is not None:
        factors = [(number(f"RADIANCE_MULT_BAND_{band}"), number(f"REFLECTANCE_MULT_BAND_{band}")) for band in bands]
        constants["irradiance"] = [math.pi * distance**2 * a / b if a and b else None for a, b in factors]
    return {name: value for name, value in constants.items()
            if value is not None and not (isinstance(value, list) and None in value)}
