"""Samples of known classes for the tests, drawn from the bands of the Landsat scene."""

import json
import random


def class_of(pixel):
    """A class that shows in two bands."""
    if pixel[3] < 35:
        return "water"
    return "urban" if pixel[2] > 75 else "green"


def write_samples(file, raster, count=80, seed=1):
    """Writes points of classes to a GeoJSON file; gives their lines, samples and classes."""
    pixels = raster.read(order="C")
    a, b, c, d, e, f = raster.transform
    chance, features, places = random.Random(seed), [], []
    for _ in range(count):
        line, sample = chance.randrange(10, raster.height - 10), chance.randrange(10, raster.width - 10)
        name = class_of(pixels[:, line, sample])
        places.append((line, sample, name))
        x, y = sample + 0.5, line + 0.5
        features.append({"type": "Feature", "properties": {"class": name, "weight": 1.5},
                         "geometry": {"type": "Point", "coordinates": [a * x + b * y + c, d * x + e * y + f]}})
    system = {"type": "name", "properties": {"name": "urn:ogc:def:crs:" + raster.crs.replace(":", "::")}}
    file.write_text(json.dumps({"type": "FeatureCollection", "crs": system, "features": features}))
    return places


# Factors of bands to radiance and reflectance, of the size that those of a Landsat 7 scene have.
MTL_BANDS = {"1": (0.77874, -6.97874, 0.0012, -0.0107), "2": (0.79882, -7.19882, 0.0013, -0.0117),
             "3": (0.62165, -5.62165, 0.0012, -0.0109), "4": (0.96929, -6.06929, 0.0029, -0.0181),
             "5": (0.12622, -1.12622, 0.0018, -0.0158), "7": (0.04390, -0.39390, 0.0017, -0.0154)}
MTL_SUN = 49.62


def write_mtl(file):
    """Writes the metadata of a Landsat 7 scene with the bands 1 to 5 and 7."""
    def section(name, values):
        return [f"  GROUP = {name}", *(f"    {key} = {value}" for key, value in values.items()), f"  END_GROUP = {name}"]

    keys = ("RADIANCE_MULT", "RADIANCE_ADD", "REFLECTANCE_MULT", "REFLECTANCE_ADD")
    factors = {f"{key}_BAND_{band}": values[i] for i, key in enumerate(keys) for band, values in MTL_BANDS.items()}
    lines = ["GROUP = LANDSAT_METADATA_FILE",
             *section("PRODUCT_CONTENTS", {"PROCESSING_LEVEL": '"L1TP"', **{
                 f"FILE_NAME_BAND_{band}": f'"LE07_L1TP_B{band}.TIF"' for band in MTL_BANDS}}),
             *section("IMAGE_ATTRIBUTES", {"SPACECRAFT_ID": '"LANDSAT_7"', "SENSOR_ID": '"ETM"',
                                           "DATE_ACQUIRED": "2000-07-28", "SCENE_CENTER_TIME": '"12:30:00Z"',
                                           "SUN_AZIMUTH": 46.5, "SUN_ELEVATION": MTL_SUN,
                                           "EARTH_SUN_DISTANCE": 1.01535}),
             *section("LEVEL1_RADIOMETRIC_RESCALING", factors), "END_GROUP = LANDSAT_METADATA_FILE", "END"]
    file.write_text("\n".join(lines) + "\n")
