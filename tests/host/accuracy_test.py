"""The accuracy of a map: counts, shares, intervals and agreement by their definitions."""

import json
import random
import subprocess
import unittest

from support import FolderTest, needs_gdal

WIDTH = HEIGHT = 40
TOP = 50  # degrees; a pixel is a degree wide and high, from 0 east on


def feature(shape, **properties):
    return {"type": "Feature", "properties": properties, "geometry": shape}


def point(x, y):
    return {"type": "Point", "coordinates": [x + 0.5, TOP - y - 0.5]}


def square(x, y, side):
    corners = [(x, y), (x + side, y), (x + side, y + side), (x, y + side), (x, y)]
    return {"type": "Polygon", "coordinates": [[[a, TOP - b] for a, b in corners]]}


def wilson(hits, count):
    """The bounds between which (p - share)^2 = z^2 p (1 - p) / n, found by halving."""
    z2, share = 1.959963984540054 ** 2, hits / count
    gap = lambda p: (p - share) ** 2 - z2 * p * (1 - p) / count

    def zero(inside, outside):
        for _ in range(200):
            middle = (inside + outside) / 2
            inside, outside = (middle, outside) if gap(middle) <= 0 else (inside, middle)
        return inside
    return zero(share, 0.0), zero(share, 1.0)


@needs_gdal
class AccuracyTest(FolderTest):
    def write_map(self, width, pixels):
        """A map on degrees in which 0 is no data."""
        lines = len(pixels) // width
        (self.folder / "map.asc").write_text(
            f"ncols {width}\nnrows {lines}\nxllcorner 0\nyllcorner {TOP - lines}\ncellsize 1\nNODATA_value 0\n"
            + "\n".join(" ".join(map(str, pixels[y * width:(y + 1) * width])) for y in range(lines)))
        subprocess.run(["gdal_translate", "-q", "-ot", "Byte", "-a_srs", "EPSG:4326", self.folder / "map.asc",
                        self.folder / "map.tif"], check=True)

    def write_samples(self, features):
        (self.folder / "samples.geojson").write_text(json.dumps({"type": "FeatureCollection", "features": features}))
        return self.folder / "samples.geojson"

    def report(self, features, *more):
        return json.loads(self.fine("accuracy", self.folder / "map.tif", "--reference", self.write_samples(features),
                                    "--class-field", "class", "--json", *more))

    def test_points_and_shapes_count_once(self):
        chance = random.Random(3)
        values = [[chance.choice([0, 1, 1, 2, 3]) for _ in range(WIDTH)] for _ in range(HEIGHT)]
        for y in range(20, 30):
            for x in range(20, 30):
                values[y][x] = 2 if (x, y) != (20, 20) else 3
        self.write_map(WIDTH, [v for row in values for v in row])
        names, features, wanted, outside = ["water", "forest", "town"], [], {}, 0
        for _ in range(120):
            x, y, known = chance.randrange(45), chance.randrange(40), chance.choice(names)
            features.append(feature(point(x, y), **{"class": known}))
            if x >= WIDTH or values[y][x] == 0:
                outside += 1
            else:
                key = (known, names[values[y][x] - 1])
                wanted[key] = wanted.get(key, 0) + 1
        features.append(feature(square(20, 20, 10), **{"class": "forest"}))  # nearly all of it is
        wanted["forest", "forest"] = wanted.get(("forest", "forest"), 0) + 1
        features.append(feature(point(1, 1)))  # of no known class
        got = self.report(features, "--classes", ",".join(names))
        matrix = [[wanted.get((a, b), 0) for b in names] for a in names]
        self.assertEqual(got["matrix"], matrix)
        self.assertEqual([c["class"] for c in got["classes"]], names)
        self.assertEqual((got["outside"], got["noClass"]), (outside, 0))
        total, right = sum(map(sum, matrix)), sum(matrix[i][i] for i in range(3))

        def near(share, hits, count):
            low, high = wilson(hits, count)
            for key, value in (("share", hits / count), ("low", low), ("high", high)):
                self.assertAlmostEqual(share[key], value, 9)

        near(got["overall"], right, total)
        rows, columns = [sum(row) for row in matrix], [sum(column) for column in zip(*matrix)]
        chance_share = sum(a * b for a, b in zip(rows, columns)) / total ** 2
        self.assertAlmostEqual(got["kappa"], (right / total - chance_share) / (1 - chance_share), 9)
        for i, c in enumerate(got["classes"]):
            near(c["producer"], matrix[i][i], rows[i])
            near(c["user"], matrix[i][i], columns[i])
            p, u = matrix[i][i] / rows[i], matrix[i][i] / columns[i]
            self.assertAlmostEqual(c["f1"], 2 * p * u / (p + u), 9)
        text = self.fine("accuracy", self.folder / "map.tif", "--reference", self.folder / "samples.geojson", "--class-field",
                         "class", "--classes", ",".join(names))
        self.assertIn(f"{outside} samples are on no pixel that counts", text)

    def test_numbers_are_values_of_the_map(self):
        self.write_map(4, [5, 5, 12, 100])
        got = self.report([feature(point(0, 0), **{"class": 5}), feature(point(1, 0), **{"class": 12}),
                           feature(point(2, 0), **{"class": 12})])
        self.assertEqual(([c["class"] for c in got["classes"]], got["matrix"]), (["5", "12"], [[1, 0], [1, 1]]))
        got = self.report([feature(point(0, 0), **{"class": "a"}), feature(point(3, 0), **{"class": "a"})],
                          "--classes", "x,x,x,x,a")
        self.assertEqual((got["matrix"][4][4], got["noClass"]), (1, 1))

    def test_what_can_not_be_compared(self):
        self.write_map(4, [1, 1, 2, 2])
        samples = self.write_samples([feature(point(0, 0), **{"class": "moor"})])
        verb = ["accuracy", self.folder / "map.tif", "--reference", samples, "--class-field"]
        self.fails(1, "class", *verb, "klass")
        self.fails(1, "moor", *verb, "class", "--classes", "water,forest")
        self.fails(1, "there is no sample", *verb, "class", "--where", "class=none")


if __name__ == "__main__":
    unittest.main()
