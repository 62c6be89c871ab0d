"""A made scene: fields of known classes, samples on half of them to learn from and on the others to check with."""

import json
import random
import subprocess

from support import FolderTest

SIDE, FIELD, TOP = 120, 15, 50
# Reflectance of three bands, and the noise on it.
CLASSES = {"water": (30, 20, 10), "forest": (40, 70, 120), "town": (120, 110, 90)}


class FieldScene(FolderTest):
    def setUp(self):
        super().setUp()
        chance = random.Random(9)
        fields = {(r, c): chance.choice(list(CLASSES)) for r in range(SIDE // FIELD) for c in range(SIDE // FIELD)}
        self.known = [[fields[y // FIELD, x // FIELD] for x in range(SIDE)] for y in range(SIDE)]
        bands = []
        for band in range(3):
            rows = [" ".join(str(max(0, CLASSES[self.known[y][x]][band] + round(chance.gauss(0, 4)))) for x in range(SIDE))
                    for y in range(SIDE)]
            path = self.folder / f"b{band}.asc"
            path.write_text(f"ncols {SIDE}\nnrows {SIDE}\nxllcorner 0\nyllcorner {TOP - SIDE / 2}\ncellsize 0.5\n" + "\n".join(rows))
            bands.append(path)
        subprocess.run(["gdalbuildvrt", "-q", "-separate", self.folder / "scene.vrt", *bands], check=True)
        subprocess.run(["gdal_translate", "-q", "-ot", "Byte", "-a_srs", "EPSG:4326", self.folder / "scene.vrt",
                        self.folder / "scene.tif"], check=True)
        self.write_samples("train.geojson", [(r, c) for r, c in fields if (r + c) % 2 == 0], chance)
        self.write_samples("check.geojson", [(r, c) for r, c in fields if (r + c) % 2 == 1], chance)

    def write_samples(self, name, fields, chance):
        features = []
        for r, c in fields:
            x, y = c * FIELD + chance.randint(4, 10), r * FIELD + chance.randint(4, 10)
            features.append({"type": "Feature", "properties": {"cover": self.known[y][x], "number": list(CLASSES).index(self.known[y][x])},
                             "geometry": {"type": "Point", "coordinates": [(x + 0.5) / 2, TOP - (y + 0.5) / 2]}})
        (self.folder / name).write_text(json.dumps({"type": "FeatureCollection", "features": features}))
