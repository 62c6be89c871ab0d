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
