"""Segmentation: labels to the number beside the shared cases and a plain form, and the verb segment."""

import collections
import itertools
import json
import random
import struct
import unittest

import segment_peer as peer
from support import DATA, FolderTest, needs_data, needs_gdal, gdal_pixels, read_png, run, write_orva

GRID = """georeference = Std -9999 0 0 0 0 28.5 28.5 288776.3 9120760.8 0 0 90 70 0 EPSG:31985|
coordinate system string = {EPSG:31985}
"""
TYPES = {"Byte": "B", "Int16": "h", "UInt32": "I", "Single": "f"}


class Job:
    """A document of segmentations, each of a file of its own."""

    def __init__(self):
        self.steps = []

    def add(self, command, inputs, output=""):
        behind = f'<DependsOn Name="s{len(self.steps) - 1}"/>' if self.steps else ""
        texts = "".join(f'<Input {key}="{int(value) if isinstance(value, bool) else value}"/>'
                        for key, value in inputs.items())
        output = f'<Output URI="{output}"/>' if output else ""
        self.steps.append(f'<Command ID="{command}" Name="s{len(self.steps)}">{behind}{output}{texts}</Command>')

    def segment(self, image, labels, arguments, merge=None, **target):
        self.add("OpenRasterCommand", {"ConnStr": image}, "$in")
        if merge:
            self.add("OpenRasterCommand", {"ConnStr": merge}, "$by")
        inputs = {"SegmentURI": "$in", "MergeURI": "$by" if merge else "$in", **arguments}
        if not arguments["LambdaEstimate"]:
            self.add("CreateRasterCommand", {"ConnStr": labels, "SrcURI": "$in", "Format": "ORVA", "Bands": 1,
                                             "DataType": "Int32", "HasNoDataValue": "1:1 [0] ", **target}, "$target")
            inputs["LabelURI"] = "$target"
        self.add("FxTileSegmentMergeCommand", inputs)
        if "LabelURI" in inputs:
            self.add("CloseRasterCommand", {"URI": "$target"})
        self.add("CloseRasterCommand", {"URI": "$in"})

    def text(self):
        return f'<Job Checks="Strict"><Reasons/>{"".join(self.steps)}</Job>'


def stitch(tiles, across, excluded, width, height, side):
    """Labels of the whole from tiles (x0, y0, width, height, borders left/right/top/bottom, labels)."""
    whole, given = [[0] * width for _ in range(height)], 0
    column, rows = {}, {}
    for number, (x0, y0, w, h, (left, right, top, bottom), labels) in enumerate(tiles):
        c, r = number % across, number // across
        full = left + w + right
        at = lambda x, y: 0 if excluded[y0 + y][x0 + x] else labels[(y + top) * full + x + left]
        xs = range(w + (1 if right else 0))
        ys = range(h + (1 if bottom else 0))
        there = sorted({0 if excluded[y0 - top + i // full][x0 - left + i % full] else label
                        for i, label in enumerate(labels)} - {0})
        remap, best = {label: 0 for label in there}, collections.Counter()
        for seam in ([[(at(0, y), column.get(y, 0)) for y in ys]] if c else []) + \
                ([[(at(x, 0), rows.get((c, x), 0)) for x in xs]] if r else []):
            for label in sorted({a for a, _ in seam} - {0}):
                counts = collections.Counter(b for a, b in seam if a == label and b)
                if counts:
                    partner = min(counts, key=lambda b: (-counts[b], b))
                    if counts[partner] > best[label]:
                        remap[label], best[label] = partner, counts[partner]
        for label in there:
            if not best[label]:
                given += 1
                remap[label] = given
        new = {(x, y): remap.get(at(x, y), 0) for x in xs for y in ys}
        for (x, y), label in new.items():
            if x < w and y < h:
                whole[y0 + y][x0 + x] = label
        column = {y: new[xs[-1], y] for y in ys}
        rows.update({(c, x): new[x, ys[-1]] for x in xs})
    return whole


def plain(image, invalid, side, border, a):
    """Labels of an image as the command gives them."""
    gradients, excluded = image.sobel() if a["SegmentAlgorithm"] == 1 else image.intensity()
    low, high, top = a["MinGradient"], a["MaxGradient"], a["StretchValue"]
    span = high - low
    floor, ceiling = (peer.cut((a["SegmentValue"] - low) * top / span), peer.cut(span * top / span)) if span > 0 else (0, 0)
    width, height, tiles = image.width, image.height, []
    across, down = -(-width // side), -(-height // side)
    if across * down == 1:
        border = 1
    for r in range(down):
        for c in range(across):
            x0, y0 = c * side, r * side
            w, h = min(side, width - x0), min(side, height - y0)
            sides = (min(border, x0), min(border, width - x0 - w), min(border, y0), min(border, height - y0 - h))
            left, right, over, under = sides
            cells = [(x, y) for y in range(y0 - over, y0 + h + under) for x in range(x0 - left, x0 + w + right)]
            full, tall = left + w + right, over + h + under
            out = [excluded[y][x] for x, y in cells]
            levels = [max(min(peer.cut((gradients[y][x] - low) / span * top) if span else 0, ceiling), floor)
                      for x, y in cells]
            labels, count = peer.flood(levels, out, full, tall)
            if a["MergeValue"] > 0:
                values = [[float(band[y][x]) for x, y in cells] for band in image.bands]
                rigorous = a["MergeAlgorithm"] == 2
                pairs = peer.adjacency(labels, out, full, tall, full - (right == border), tall - (under == border), rigorous)
                if rigorous:
                    bad = [invalid[y][x] for x, y in cells]
                    labels = peer.merge_rigorous(values, bad, labels, out, pairs, a["MergeValue"], count,
                                                 a.get("Sums") == "Exact")
                else:
                    labels = peer.merge_schedule(values, labels, pairs, a["MergeValue"])
            tiles.append((x0, y0, w, h, sides, labels))
    if len(tiles) == 1:
        rows = tiles[0][5]
        return [[0 if excluded[y][x] else rows[y * width + x] for x in range(width)] for y in range(height)]
    return stitch(tiles, across, excluded, width, height, side)


class SegmentTest(FolderTest):
    def segment_all(self, runs):
        """Runs pairs of image and arguments in one job: the labels of each as a list, or what an estimate returns."""
        job = Job()
        for number, (image, arguments) in enumerate(runs):
            job.segment(image, self.folder / f"labels{number}.dat", arguments)
        out = json.loads(self.fine("run", "--json", "-", stdin=job.text()))
        returns = [c["return"] for c in out["commands"] if "LambdaBinSize" in c.get("return", {})]
        results = []
        for number, (_, arguments) in enumerate(runs):
            if arguments["LambdaEstimate"]:
                results.append(returns[number])
                continue
            data = (self.folder / f"labels{number}.dat").read_bytes()
            results.append(list(struct.unpack(f"<{len(data) // 4}i", data)))
        return results

    @needs_data
    @needs_gdal
    def test_shared_cases(self):
        cases = sorted([*DATA.glob("cases/segment/*"), *DATA.glob("cases/merge/3*")])
        self.assertGreater(len(cases), 5)
        tolds = [json.loads((case / "case.json").read_text()) for case in cases]
        results = self.segment_all([(case / "image.tif", told["arguments"]) for case, told in zip(cases, tolds)])
        for case, told, got in zip(cases, tolds, results):
            with self.subTest(case.name):
                if told["arguments"]["LambdaEstimate"]:
                    self.assertAlmostEqual(float(got["LambdaBinSize"]), told["facts"]["lambda_bin_size"], 12)
                else:
                    data = gdal_pixels(case / "expected_labels.tif")
                    self.assertEqual(got, list(struct.unpack(f"<{len(data) // 4}i", data)))

    def make_image(self, name, chance, kind, bands):
        width, height = chance.randint(3, 26), chance.randint(3, 26)
        few = chance.choice([2, 5, 200])
        hole = 0.03 if chance.random() < 0.5 else 0
        pixels = [[[chance.randint(1, few) for _ in range(width)] for _ in range(height)] for _ in range(bands)]
        invalid = [[False] * width for _ in range(height)]
        for y in range(height):
            for x in range(width):
                if chance.random() < hole:
                    invalid[y][x] = True
                    pixels[chance.randrange(bands)][y][x] = 0
        flat = [band[y][x] for y in range(height) for x in range(width) for band in pixels]
        path = write_orva(self.folder / name, width, height, bands,
                          struct.pack(f"<{len(flat)}{TYPES[kind]}", *flat), kind,
                          f"no data values = {{{','.join(['0'] * bands)}}}\n" if hole else "")
        return path, peer.Image(pixels, invalid), invalid

    def test_random_images_beside_the_plain_form(self):
        chance, runs, wanted = random.Random(7), [], []
        for number in range(60):
            kind, bands = chance.choice(list(TYPES)), chance.randint(1, 3)
            path, image, invalid = self.make_image(f"image{number}.dat", chance, kind, bands)
            side = chance.choice([5, 8, 64])
            arguments = {
                "SegmentAlgorithm": chance.choice([1, 2]), "SegmentValue": chance.choice([0, 3, 60]), "MinGradient": 0,
                "MaxGradient": chance.choice([8, 1600]), "StretchValue": chance.choice([8, 255, 1600]),
                "MergeAlgorithm": chance.choice([1, 2]), "MergeValue": chance.choice([0, 0.5, 40, 1e9]),
                "TileMemorySize": side * side * bands * struct.calcsize(TYPES[kind]),
                "TileBorderSize": chance.randint(0, 5), "Sums": chance.choice(["Told", "Exact"]),
                "LambdaEstimate": False}
            if number % 3 == 0:  # strips, and the segments of one tile, numbered anew
                whole = sum(plain(image, invalid, 1000, 1, arguments), [])
                arguments.update(Seamless=True, TileMemorySize=[1, 60, 300, 1000000][number % 4])
                numbers = {0: 0}
                wanted.append([numbers.setdefault(label, len(numbers)) for label in whole])
            else:
                wanted.append(sum(plain(image, invalid, side, arguments["TileBorderSize"], arguments), []))
            runs.append((path, arguments))
        for (path, arguments), got, labels in zip(runs, self.segment_all(runs), wanted):
            with self.subTest(path.name, **arguments):
                self.assertEqual(got, labels)

    def test_limits_of_growth_beside_the_plain_form(self):
        chance, runs, wanted = random.Random(11), [], []
        for number in range(30):
            path, image, invalid = self.make_image(f"image{number}.dat", chance, chance.choice(["Byte", "Single"]), 2)
            limits = chance.choice([{"MinSize": 5}, {"MaxSize": 20}, {"Compactness": 0.7},
                                    {"MinSize": 12, "MaxSize": 30, "Compactness": 2}])
            arguments = {"SegmentAlgorithm": 2, "SegmentValue": 0, "MinGradient": 0, "MaxGradient": 200, "StretchValue": 200,
                         "MergeValue": chance.choice([0, 5, 1000, 1e9]), "LambdaEstimate": False, "Seamless": True,
                         "TileMemorySize": 100, **limits}
            runs.append((path, arguments))
            width, height, values = image.width, image.height, image.intensity()[0]
            out = [hole for row in invalid for hole in row]
            labels, _ = peer.flood([peer.cut(v / 200 * 200) for row in values for v in row], out, width, height)
            pairs = peer.adjacency(labels, out, width, height, width, height, False)
            bands = [[float(v) for row in band for v in row] for band in image.bands]
            labels = peer.merge_schedule(bands, labels, pairs, arguments["MergeValue"], **limits)
            numbers = {0: 0}
            wanted.append([numbers.setdefault(label, len(numbers)) for label in labels])
        for (path, arguments), got, labels in zip(runs, self.segment_all(runs), wanted):
            with self.subTest(path.name, **arguments):
                self.assertEqual(got, labels)

    def test_local_order_beside_the_plain_form(self):
        chance, runs, wanted, cuts = random.Random(31), [], [], {}

        def renumbered(labels):
            numbers = {0: 0}
            return [numbers.setdefault(label, len(numbers)) for label in labels]

        for number in range(30):
            path, image, invalid = self.make_image(f"image{number}.dat", chance, chance.choice(["Byte", "Single"]), 2)
            limits = chance.choice([{}, {}, {"MaxSize": 20}, {"Compactness": 0.7}])
            rounds = chance.choice([1, 2, 3, 12])
            arguments = {"SegmentAlgorithm": 2, "SegmentValue": 0, "MinGradient": 0, "MaxGradient": 200, "StretchValue": 200,
                         "MergeValue": chance.choice([5, 1000, 1e9]), "LambdaEstimate": False, "Seamless": True,
                         "TileMemorySize": chance.choice([1, 100, 100000]), "Order": "Local",
                         **({"Rounds": rounds} if rounds != 12 else {}), **limits}
            if number % 3 == 1:
                arguments.update(MinSize=chance.choice([4, 15, 1000]), MergeValue=chance.choice([0, 5, 1000]))
            if number % 3 == 2:
                arguments["Tree"] = self.folder / f"image{number}.tree"
            runs.append((path, arguments))
            width, height, values = image.width, image.height, image.intensity()[0]
            out = [hole for row in invalid for hole in row]
            labels, _ = peer.flood([peer.cut(v / 200 * 200) for row in values for v in row], out, width, height)
            pairs = peer.adjacency(labels, out, width, height, width, height, False)
            bands = [[float(v) for row in band for v in row] for band in image.bands]
            most, merges = 2147483647 if "Tree" in arguments else arguments["MergeValue"], []
            merged = peer.merge_local(bands, labels, pairs, most, rounds, limits.get("MaxSize", float("inf")),
                                      limits.get("Compactness", 0), merges)
            if "Tree" in arguments:
                merged = peer.cut_nested(labels, merges, arguments["MergeValue"])
                cuts[number] = labels, merges
            labels = renumbered(merged)
            if "MinSize" in arguments:
                pairs = peer.adjacency(labels, out, width, height, width, height, False)
                labels = renumbered(peer.merge_schedule(bands, labels, pairs, 0, MinSize=arguments["MinSize"], **limits))
            wanted.append(labels)
        for (path, arguments), got, labels in zip(runs, self.segment_all(runs), wanted):
            with self.subTest(path.name, **arguments):
                self.assertEqual(got, labels)
        for number, (labels, merges) in list(cuts.items())[:4]:  # a cut of any other cost
            cost = sorted(merge[0] for merge in merges)[len(merges) // 2] if merges else 1
            cut = self.folder / f"cut{number}.tif"
            self.fine("segment", "cut", self.folder / f"image{number}.tree", cut, "--merge-value", repr(cost), "-q")
            self.assertEqual(list(struct.unpack(f"<{len(labels)}i", gdal_pixels(cut))),
                             renumbered(peer.cut_nested(labels, merges, cost)))
            self.fine("segment", "--suggest", self.folder / f"image{number}.tree")
        for words, more in (("--order local goes with", ["--order", "local", "--tiled"]), ("--rounds goes", ["--rounds", 3]),
                            ("--order local goes with", ["--order", "local", "--merge-algorithm", "rigorous"])):
            self.fails(2, words, "segment", path, self.folder / "o.dat", *more)
        self.fails(1, "bytes of memory, and may take 1000", "segment", path, self.folder / "o.dat", "--order", "local",
                   "--merge-value", 100, "--memory", 1000)
        self.assertFalse((self.folder / "o.dat").exists())

    def test_estimate_gathers_the_costs_of_all_tiles(self):
        chance = random.Random(3)
        width = height = 24
        pixels = [[[chance.randint(0, 9) for _ in range(width)] for _ in range(height)]]
        path = write_orva(self.folder / "image.dat", width, height, 1, bytes(v for row in pixels[0] for v in row))
        arguments = {"SegmentAlgorithm": 1, "SegmentValue": 4, "MinGradient": 0, "MaxGradient": 72, "StretchValue": 72,
                     "LambdaEstimate": True}
        (got,) = self.segment_all([(path, arguments)])
        image = peer.Image(pixels, [[False] * width] * height)
        flat = [max(4, min(72, peer.cut(v / 72 * 72))) for row in image.sobel()[0] for v in row]
        labels, _ = peer.flood(flat, [False] * len(flat), width, height)
        pairs = peer.adjacency(labels, [False] * len(flat), width, height, width, height, False)
        schedule = peer.Schedule([[float(v) for row in pixels[0] for v in row]], labels, pairs, 1)
        costs = []
        while (merge := schedule.step()) is not None:
            costs.append(merge[0])
        size = max(costs) / 9999
        self.assertAlmostEqual(float(got["LambdaBinSize"]), size, 12)
        counts = [0] * 10000
        for cost in costs:
            counts[min(9999, int(cost / size))] += 1
        values = got["LambdaHistogram"]["values"] if isinstance(got["LambdaHistogram"], dict) else got["LambdaHistogram"]
        self.assertEqual(values, list(itertools.accumulate(counts)))

    def ask(self, command, inputs, image):
        """What a command returns of a file."""
        job = Job()
        job.add("OpenRasterCommand", {"ConnStr": image}, "$in")
        job.add(command, inputs)
        return json.loads(self.fine("run", "--json", "-", stdin=job.text()))["commands"][-1]["return"]

    def test_histogram_of_gradients(self):
        chance = random.Random(11)
        for kind, most, bins in (("Byte", 255, None), ("Single", 1, 50)):
            rows = [[chance.randint(0, 255) / (255 if kind == "Single" else 1) for _ in range(30)] for _ in range(20)]
            flat = [value for row in rows for value in row]
            path = write_orva(self.folder / f"{kind}.dat", 30, 20, 1, struct.pack(f"<600{TYPES[kind]}", *map(
                int if kind == "Byte" else float, flat)), kind)
            rows = [[peer.as_float(value) for value in row] for row in rows]
            gradients = [g for row in peer.Image([rows], [[False] * 30] * 20).sobel()[0] for g in row]
            top = 8 * most
            got = self.ask("FxTileSegmentHistogramCommand", {
                "SegmentURI": "$in", "HistogramMin": 0, "HistogramMax": top, "SegmentAlgorithm": 1,
                **({"HistogramBins": bins} if bins else {})}, path)
            size = top / bins if bins else 1
            self.assertAlmostEqual(float(got["SegmentBinSize"]), size, 12)
            self.assertEqual(float(got["SegmentMin"]), 0)
            shares = got["SegmentHistogram"]
            self.assertEqual(len(shares), bins or top + 1)
            for i in range(0, len(shares), 7):
                below = sum(int(g / size) <= i for g in gradients) / 600
                self.assertAlmostEqual(shares[i], below, 9, (kind, i))

    def test_variances_of_tiles(self):
        chance, width, height = random.Random(12), 600, 520
        data = bytearray(chance.getrandbits(8) for _ in range(width * height * 2))
        for y in range(height):
            for x in range(512, width):
                data[2 * (y * width + x)] = 0 if x % 2 else 9  # every second pixel of band 0 has no data there
        path = write_orva(self.folder / "two.dat", width, height, 2, bytes(data), more="no data values = {0,0}\n")
        got = self.ask("FxTileVarianceCommand", {"MergeURI": "$in"}, path)
        for column, row in itertools.product(range(2), range(2)):
            left, right = column * 512, min(width, column * 512 + 512) - 1
            over, under = row * 512, min(height, row * 512 + 512) - 1
            self.assertEqual(got["TileSubrects"][column][row], [left, right, over, under])
            total = 0
            for band in range(2):
                values = [v for y in range(over, under + 1) for v in data[2 * (y * width + left) + band:2 * (y * width + right) + 2:2]
                          if v]
                mean = sum(values) / len(values)
                total += sum((v - mean) ** 2 for v in values) / (len(values) - 1) / 2
            self.assertAlmostEqual(got["TileVariances"][column][row] / total, 1, 9)
            self.assertEqual(got["PixelCounts"][column][row], len(values))

    def test_odd_rasters_have_a_stated_result(self):
        nan, inf = float("nan"), float("inf")
        rasters = {
            "one pixel": (1, 1, [5.0]), "one line": (6, 1, [1, 2, 9, 9, 2, 1]), "two lines": (4, 2, [1.0] * 8),
            "constant": (6, 5, [3.0] * 30), "no data": (5, 5, [0.0] * 25), "not finite": (4, 4, [nan, inf, -inf, 1.0] * 4)}
        names, runs = [], []
        for name, (width, height, values) in rasters.items():
            path = write_orva(self.folder / f"{name}.dat", width, height, 1, struct.pack(f"<{len(values)}f", *values),
                              "Single", "no data values = {0}\n")
            for algorithm, merge in itertools.product((1, 2), (0, 10)):
                names.append((name, width * height, name == "no data" or algorithm == 1 and min(width, height) < 3))
                runs.append((path, {"SegmentAlgorithm": algorithm, "SegmentValue": 0, "MinGradient": 0, "MaxGradient": 10,
                                    "StretchValue": 10, "MergeValue": merge, "LambdaEstimate": False}))
        for (name, pixels, has_no_gradient), labels in zip(names, self.segment_all(runs)):
            with self.subTest(name):
                self.assertEqual(len(labels), pixels)
                if has_no_gradient:
                    self.assertEqual(set(labels), {0})
                elif name == "constant":
                    self.assertEqual(set(labels), {1})
                else:
                    self.assertGreaterEqual(min(labels), 1)

    def test_what_does_not_fit_is_refused(self):
        path = write_orva(self.folder / "a.dat", 20, 20, 1, bytes(400))
        other = write_orva(self.folder / "b.dat", 20, 19, 1, bytes(380))
        wide = write_orva(self.folder / "c.dat", 20, 20, 1, bytes(800), "Int16")
        good = {"SegmentAlgorithm": 1, "SegmentValue": 0, "MinGradient": 0, "MaxGradient": 9, "StretchValue": 9,
                "LambdaEstimate": False}
        for number, (words, arguments, merge) in enumerate((
                ("MergeURI: the raster has another size", good, other),
                ("MergeURI: the raster has another pixel type", good, wide),
                ("TileBorderSize", {**good, "TileBorderSize": -1}, None),
                ("TileBorderSize", {**good, "TileMemorySize": 16, "TileBorderSize": 5}, None),
                ("TileMemorySize", {**good, "TileMemorySize": -1}, None),
                ("LabelURI: the raster is not of type Int32", good, {"DataType": "Byte"}),
                ("LabelURI: the raster has more than one band", good, {"Bands": 2, "HasNoDataValue": "1:2 [0 0] "}),
                ("LabelURI: the raster has another size", good, {"Lines": 19}))):
            with self.subTest(words):
                job = Job()
                target = merge if isinstance(merge, dict) else {}
                job.segment(path, self.folder / f"labels{number}.dat", arguments, None if target else merge, **target)
                code, _, err = run("run", "-", stdin=job.text())
                self.assertEqual(code, 1)
                self.assertIn(words, err)

    def test_verb(self):
        width, height = 60, 50
        pixels = bytes(value for y in range(height) for x in range(width)
                       for value in ((200, 20, 30) if x < 30 else (20, 200, 30) if y < 25 else (20, 20, 220)))
        scene = write_orva(self.folder / "scene.dat", width, height, 3, pixels)
        labels = self.folder / "labels.dat"
        self.fine("segment", scene, labels, "--format", "ORVA", "--polygons",
                  self.folder / "fields.geojson", "--quicklook", self.folder / "look.png", "-q")
        got = struct.unpack(f"<{width * height}i", labels.read_bytes())
        fields = {(x < 30, x >= 30 and y < 25): got[y * width + x] for x in (10, 50) for y in (10, 40)}
        self.assertEqual(len(set(fields.values())), 3)
        for y in range(height):
            for x in range(width):
                if abs(x - 29.5) > 2 and abs(y - 24.5) > 2:
                    self.assertEqual(got[y * width + x], fields[x < 30, x >= 30 and y < 25], (x, y))
        shapes = json.loads((self.folder / "fields.geojson").read_text())["features"]
        self.assertEqual({shape["properties"]["label"] for shape in shapes}, set(got))
        picture = read_png(self.folder / "look.png")
        self.assertEqual(picture[:3], (width, height, 3))
        yellow = [picture[3][3 * i:3 * i + 3] == b"\xff\xff\x00" for i in range(width * height)]
        for y in range(height - 1):
            for x in range(width - 1):
                at = y * width + x
                self.assertEqual(yellow[at], got[at] != got[at + 1] or got[at] != got[at + width], (x, y))
        self.fails(2, "is there already", "segment", scene, labels, "--format", "ORVA")
        self.fails(2, "--tile-border goes with --tiled", "segment", scene, labels, "--tile-border", 3)
        self.fails(2, "--memory goes without --tiled", "segment", scene, labels, "--memory", 3, "--tiled")
        self.fails(1, "bytes of memory", "segment", scene, self.folder / "new.dat", "--format", "ORVA", "--merge-value", 9,
                   "--memory", 100)
        self.assertFalse((self.folder / "new.dat").exists())

    def test_a_tree_gives_the_labels_of_every_cost(self):
        chance = random.Random(21)
        pixels = bytes(chance.randint(0, 99) + 40 * (x // 9 % 3) for y in range(70) for x in range(90) for _ in range(2))
        scene = write_orva(self.folder / "scene.dat", 90, 70, 2, pixels, more="no data values = {0,0}\n" + GRID)
        tree, labels = self.folder / "scene.tree", self.folder / "labels.tif"
        self.fine("segment", scene, labels, "--merge-value", 200, "--tree", tree, "-q")
        for name, options in (("own", ["--merge-value", 200]), ("none", []), ("high", ["--merge-value", 3000.5]),
                              ("percent", ["--merge-percent", 60])):
            fresh, cut = self.folder / f"{name}.tif", self.folder / f"{name}.cut.tif"
            more = ["--tree", self.folder / "other.tree"] if name == "percent" else []
            self.fine("segment", scene, fresh, *options, *more, "-q")
            self.fine("segment", "cut", tree, cut, *options, "-q")
            self.assertEqual(cut.read_bytes(), fresh.read_bytes(), name)
        self.assertEqual(labels.read_bytes(), (self.folder / "own.tif").read_bytes())
        self.fine("segment", "levels", tree, "--values", "3000.5,0,200", "-o", self.folder / "l", "-q")
        levels = [gdal_pixels(self.folder / f"l.{i}.tif") for i in (1, 2, 3)]
        for level, name in zip(levels, ("none", "own", "high")):
            self.assertEqual(level, gdal_pixels(self.folder / f"{name}.tif"))
        numbers = [struct.unpack("<6300i", level) for level in levels]
        rows = [line.split(",") for line in (self.folder / "l.csv").read_text().splitlines()]
        self.assertEqual(rows.pop(0), ["level", "mergeValue", "segment", "pixels", "parent"])
        wanted = []
        for i, (value, level) in enumerate(zip(("0", "200", "3000.5"), numbers)):
            upper = dict(zip(level, numbers[i + 1])) if i < 2 else {}
            wanted += [[str(i + 1), value, str(n), str(level.count(n)), str(upper.get(n, ""))]
                       for n in range(1, max(level) + 1)]
            for n, parent in zip(level, numbers[i + 1] if i < 2 else ()):
                self.assertEqual(upper[n], parent)
        self.assertEqual(rows, wanted)
        told = json.loads(self.fine("segment", "--suggest", tree, "--json"))
        self.assertGreater(len(told["levels"]), 10)
        costs = [level["mergeValue"] for level in told["levels"]]
        for one in told["suggested"]:
            self.assertIn(one["mergeValue"], costs)
            self.assertLess(one["onset"], one["mergeValue"])
        table = self.fine("segment", "--suggest", tree).splitlines()
        self.assertEqual([float(row.split()[0]) for row in table[1:]],
                         [float(f"{one['mergeValue']:.6g}") for one in told["suggested"]])
        self.fine("segment", "--suggest", tree, "-o", self.folder / "curve.svg", "-q")
        self.assertEqual((self.folder / "curve.svg").read_text().count(" stroke=\"#1f5a96\""), 2)
        document = self.fine("segment", "levels", tree, "--values", "1,2", "-o", self.folder / "p", "--print-job")
        self.fine("run", "-", stdin=document)
        self.assertTrue((self.folder / "p.2.tif").exists())

    def test_what_a_tree_does_not_go_with_is_refused(self):
        scene = write_orva(self.folder / "scene.dat", 20, 20, 1, bytes(range(200)) * 2)
        tree, out = self.folder / "a.tree", self.folder / "out.dat"
        self.fine("segment", scene, self.folder / "a.dat", "--tree", tree, "-q")
        before = sorted(path.name for path in self.folder.iterdir())
        for code, words, *command in (
                (2, "--tree goes with", scene, out, "--tree", self.folder / "b.tree", "--tiled"),
                (2, "--tree goes with", scene, out, "--tree", self.folder / "b.tree", "--min-size", 3),
                (2, "--tree goes with", scene, out, "--tree", self.folder / "b.tree", "--merge-algorithm", "rigorous"),
                (2, "is there already", scene, out, "--tree", tree),
                (2, "name the labels", "cut", tree), (2, "which tree", "cut"), (2, "a word too many", scene, out, tree),
                (2, "no option that segments", "cut", tree, out, "--segment-value", 4),
                (2, "exclude each other", "cut", tree, out, "--merge-value", 4, "--merge-percent", 4),
                (2, "--values", "cut", tree, out, "--values", "3"), (2, "--values is required", "levels", tree, "-o", out),
                (2, "a tree alone", "--suggest", tree, out), (2, "takes no costs", "--suggest", tree, "--merge-value", 3),
                (1, "isn't a whole tree", "--suggest", scene), (2, "is no cost", "levels", tree, "-o", out, "--values", "3,x"),
                (2, "comes twice", "levels", tree, "-o", out, "--values", "3,1,3"),
                (1, "isn't a whole tree", "cut", scene, out), (1, "no-such", "cut", self.folder / "no-such", out)):
            with self.subTest(words):
                self.fails(code, words, "segment", *command)
        self.assertEqual(sorted(path.name for path in self.folder.iterdir()), before)
        base = {"SegmentAlgorithm": 1, "SegmentValue": 0, "MinGradient": 0, "MaxGradient": 9, "StretchValue": 9,
                "LambdaEstimate": False, "Tree": self.folder / "b.tree"}
        for words, more in (("Tree goes with Seamless", {}), ("without MinSize", {"Seamless": True, "MinSize": 4}),
                            ("Tree goes with Seamless", {"Seamless": True, "MergeAlgorithm": 2}),
                            ("MergePercent: 0 to 100", {"Seamless": True, "MergePercent": 101})):
            job = Job()
            job.segment(scene, self.folder / "l.dat", {**base, **more})
            code, _, err = run("run", "-", stdin=job.text())
            self.assertEqual(code, 1)
            self.assertIn(words, err)

    def test_estimate_agrees_with_what_percentages_do(self):
        chance = random.Random(5)
        scene = write_orva(self.folder / "noise.dat", 40, 40, 1, bytes(chance.randint(0, 255) for _ in range(1600)))
        curves = json.loads(self.fine("segment", "--estimate", scene, "--json"))
        shares = curves["gradients"]["shares"]
        self.assertEqual(shares, sorted(shares))
        self.assertEqual((shares[-1], curves["costs"]["shares"][-1]), (1, 1))
        document = self.fine("segment", scene, self.folder / "l.dat", "--format", "ORVA", "--merge-percent", 100,
                             "--segment-percent", 50, "--print-job")
        self.assertIn('<Input SegmentPercent="50"/>', document)
        self.fine("segment", scene, self.folder / "l.dat", "--format", "ORVA", "--merge-percent", 100, "-q")
        labels = struct.unpack("<1600i", (self.folder / "l.dat").read_bytes())
        self.assertEqual(len(set(labels)), 1)  # all merges are done
        self.fine("segment", "--estimate", scene, "-o", self.folder / "curves.svg", "-q")
        self.assertEqual((self.folder / "curves.svg").read_text().count(" stroke=\"#1f5a96\""), 2)


if __name__ == "__main__":
    unittest.main()
