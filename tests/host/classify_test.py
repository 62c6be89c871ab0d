"""Classes of regions: scores and painted rasters beside a plain reading of the rules."""

import json
import math
import random
import struct
import unittest

from support import FolderTest, run, write_orva

ALL = 4294967295


def as_float(value):
    return struct.unpack("f", struct.pack("f", value))[0]


def write_regions(path, regions, bands, attributes):
    """A file of regions; `regions` are rows of all values."""
    header = b"FXA50" + struct.pack("<HH", bands, attributes)
    path.write_bytes(header.ljust(1024, b"\0") + b"".join(struct.pack(f"<{bands * attributes}f", *row) for row in regions))


def write_statistics(path, regions, bands, attributes):
    """Mean and deviation of each value over all regions; the fifth value has a deviation of 0."""
    numbers = []
    for i in range(bands * attributes):
        values = [row[i] for row in regions]
        mean = sum(values) / len(values)
        deviation = 0 if i == 4 else math.sqrt(sum((v - mean) ** 2 for v in values) / (len(values) - 1))
        numbers += [mean, deviation, min(values), max(values), len(values)]
    header = b"FXAS50" + struct.pack("<HH", bands, attributes)
    path.write_bytes(header.ljust(1024, b"\0") + struct.pack(f"<{len(numbers)}f", *numbers))
    return [as_float(n) for n in numbers]


def read_scores(path):
    data = path.read_bytes()
    assert data[:5] == b"FXA50"
    bands, classes = struct.unpack_from("<HH", data, 5)
    assert bands == 1
    values = struct.unpack(f"<{(len(data) - 1024) // 4}f", data[1024:])
    return [list(values[i:i + classes]) for i in range(0, len(values), classes)]


def ramp(x, low, high):
    if x < low:
        return 0.0
    if x > high:
        return 1.0
    return 0.5 if low == high else (x - low) / (high - low)


def fall(x, low, high):
    if x < low:
        return 1.0
    if x > high:
        return 0.0
    return 0.5 if low == high else (high - x) / (high - low)


def s_curve(x, low, middle, high):
    if x < low:
        return 0.0
    if x > high:
        return 1.0
    if low == high:
        return 0.5
    return ((x - low) / (middle - low)) ** 2 / 2 if x < middle else 1 - ((high - x) / (high - middle)) ** 2 / 2


def z_curve(x, low, middle, high):
    if x < low:
        return 1.0
    if x > high:
        return 0.0
    if low == high:
        return 0.5
    return 1 - ((x - low) / (middle - low)) ** 2 / 2 if x < middle else ((high - x) / (high - middle)) ** 2 / 2


def membership(x, comparison, a, b, kind, tolerance):
    t = tolerance / 100
    la, ha, lb, hb = (1 - t) * a, (1 + t) * a, (1 - t) * b, (1 + t) * b
    if kind == 0:
        tests = [a <= x <= b, x >= a, x <= a, x <= a or x >= b]
        return float(tests[int(comparison)]) if comparison in (0, 1, 2, 3) else 0.0
    if kind == 1:
        tests = [min(ramp(x, la, ha), fall(x, lb, hb)), ramp(x, la, ha), fall(x, la, ha), max(fall(x, la, ha), ramp(x, lb, hb))]
    elif kind == 2:
        tests = [min(z_curve(x, lb, b, hb), s_curve(x, la, a, ha)), s_curve(x, la, a, ha), z_curve(x, la, a, ha),
                 max(s_curve(x, lb, b, hb), z_curve(x, la, a, ha))]
    else:
        return 0.0
    return tests[int(comparison)] if comparison in (0, 1, 2, 3) else 0.0


def rule_scores(rules, tests, value):
    scores = [0.0] * len(rules)
    for rule, file, attribute, band, comparison, a, b, weight, kind, tolerance in tests:
        scores[int(rule)] += membership(value(int(file), int(attribute), int(band)), comparison, a, b, kind, tolerance) * weight
    return scores


def class_scores(classes, rules, scores, normalize):
    result = [0.0] * len(classes)
    for (index, weight), score in zip(rules, scores):
        result[int(index)] += weight * score
    if normalize:
        result = [s - t if s > t else 0.0 for s, t in zip(result, classes)]
        if sum(result) > 0:
            result = [s / sum(result) for s in result]
    return result


def best(scores):
    top = max(scores)
    return scores.index(top) + 1 if top > 0 else 0


def array(values, width=0):
    dims = f"2:{len(values) // width} {width} " if width else f"1:{len(values)} "
    return f"{dims}[{' '.join(map(repr, values))}] "


class ClassifyTest(FolderTest):
    BANDS, ATTRIBUTES, REGIONS = 2, 5, 40

    def setUp(self):
        super().setUp()
        chance = self.chance = random.Random(5)
        self.files, self.statistics = [], []
        for number in range(2):
            rows = [[as_float(chance.choice([chance.uniform(-5, 50), 10.0, 0.0])) for _ in range(self.BANDS * self.ATTRIBUTES)]
                    for _ in range(self.REGIONS + number)]
            for row in rows:  # presence
                row[4] = row[9] = float(chance.random() < 0.9)
            path = self.folder / f"{number}.fxa"
            write_regions(path, rows, self.BANDS, self.ATTRIBUTES)
            self.files.append(rows)
            self.statistics.append(write_statistics(path.with_suffix(".fxas"), rows, self.BANDS, self.ATTRIBUTES))
        self.labels = [chance.choice([0, chance.randrange(1, self.REGIONS + 5)]) for _ in range(30 * 20)]
        write_orva(self.folder / "labels.dat", 30, 20, 1, struct.pack("<600i", *self.labels), "Int32",
                   "no data values = {7}\n")
        self.inputs = {"AttributesFXA": "|".join(str(self.folder / f"{n}.fxa") for n in range(2))}

    def run_job(self, *commands, code=0):
        """Runs commands, of name, inputs and perhaps an output variable, one after the other."""
        steps = []
        for number, (command, inputs, *output) in enumerate(commands):
            behind = f'<DependsOn Name="s{number - 1}"/>' if number else ""
            texts = "".join(f'<Input {key}="{value}"/>' for key, value in inputs.items())
            out = f'<Output URI="{output[0]}"/>' if output else ""
            steps.append(f'<Command ID="{command}" Name="s{number}">{behind}{out}{texts}</Command>')
        got, out, err = run("run", "-", "--json", stdin=f'<Job Checks="Strict"><Reasons/>{"".join(steps)}</Job>')
        self.assertEqual(got, code, err)
        return err

    def paint(self, command, inputs, kind, bands):
        """The raster that a command paints, as rows of bands."""
        path = self.folder / f"{command}.dat"
        self.run_job(("OpenRasterCommand", {"ConnStr": self.folder / "labels.dat"}, "$labels"),
                     ("CreateRasterCommand", {"ConnStr": path, "SrcURI": "$labels", "Format": "ORVA", "Bands": bands,
                                              "DataType": kind, "HasNoDataValue": f"1:{bands} [{' '.join('0' * bands)}] "},
                      "$out"),
                     (command, {"LabelURI": "$labels", "OutURI": "$out", **inputs}),
                     ("CloseRasterCommand", {"URI": "$out"}))
        letter = {"Single": "f", "Byte": "B"}[kind]
        data = path.read_bytes()
        values = struct.unpack(f"<{len(data) // struct.calcsize(letter)}{letter}", data)
        return [values[i:i + bands] for i in range(0, len(values), bands)]

    def value(self, region):
        def of(file, attribute, band):
            rows = self.files[file]
            return rows[region][band * self.ATTRIBUTES + attribute] if region < len(rows) else 0.0
        return of

    def make_rules(self):
        chance = self.chance
        classes = [chance.choice([0, 0.2, 1]) for _ in range(3)]
        rules = [(chance.randrange(3), chance.choice([1, 0.5])) for _ in range(5)]
        tests = [(chance.randrange(5), chance.randrange(2), chance.randrange(5), chance.randrange(2), chance.choice([0, 1, 2, 3, 9]),
                  chance.choice([0, 10, 20]), chance.choice([10, 30]), chance.choice([1, 0.25]), chance.choice([0, 1, 2, 5]),
                  chance.choice([0, 10, 50])) for _ in range(12)]
        return classes, rules, tests

    def near(self, got, wanted):
        self.assertEqual(len(got), len(wanted))
        for number, (a, b) in enumerate(zip(got, wanted)):
            self.assertEqual(len(a), len(b))
            for x, y in zip(a, b):
                self.assertAlmostEqual(x, y, delta=1e-6 * max(1, abs(y)), msg=number)

    def test_rules(self):
        for number in range(4):
            classes, rules, tests = self.make_rules()
            inputs = {"ClassDefinition": array(classes), "RuleDefinition": array([v for r in rules for v in r], 2),
                      "AttributeDefinition": array([v for t in tests for v in t], 10), **self.inputs}
            fxc = self.folder / f"{number}.fxc"
            self.run_job(("FxComputeFuzzyClassificationCommand", {**inputs, "ClassFXC": fxc, "LabelValues": f"1:1 [{ALL}] "}))
            rule = [rule_scores(rules, tests, self.value(region)) for region in range(self.REGIONS + 5)]
            score = [class_scores(classes, rules, s, True) for s in rule]
            self.near(read_scores(fxc), score[:self.REGIONS])  # the smaller of the counts
            self.run_job(("FxComputeFuzzyClassificationCommand", {**inputs, "ClassFXC": self.folder / f"few{number}.fxc",
                                                                  "LabelValues": "1:2 [9 3] "}))
            wanted = [[0.0] * 3 for _ in range(10)]
            wanted[3], wanted[9] = score[3], score[9]
            self.near(read_scores(self.folder / f"few{number}.fxc"), wanted)
            seen = [label if label != 7 else 0 for label in self.labels]  # 7 is no data
            self.near(self.paint("FxCreateRegionRuleScoresRasterCommand",
                                 {k: v for k, v in inputs.items() if k != "ClassDefinition"}, "Single", 5),
                      [rule[label] if label else [0.0] * 5 for label in seen])
            self.near(self.paint("FxCreateRegionClassScoresRasterCommand", inputs, "Single", 3),
                      [class_scores(classes, rules, rule[label], False) if label else [0.0] * 3 for label in seen])
            got = self.paint("FxCreateRegionClassificationRasterCommand", {"ClassFXC": fxc}, "Byte", 1)
            stored = read_scores(fxc)
            self.assertEqual([v for v, in got], [
                4 if label == 0 else 0 if label == 7 or label >= self.REGIONS else best(stored[label]) for label in self.labels])
            for path in self.folder.glob("FxCreate*"):
                path.unlink()

    def test_attributes(self):
        chosen = [(0, 2, 1), (1, 0, 0)]
        got = self.paint("FxCreateRegionAttributesRasterCommand",
                         {"SelectedAttributes": array([v for c in chosen for v in c], 3), **self.inputs}, "Single", 2)
        self.near(got, [[self.value(label)(*c) for c in chosen] if label not in (0, 7) else [0.0] * 2 for label in self.labels])

    def z(self, region, chosen):
        result = []
        for file, attribute, band in chosen:
            at = 5 * (band * self.ATTRIBUTES + attribute)
            mean, deviation = self.statistics[file][at:at + 2]
            result.append((self.value(region)(file, attribute, band) - mean) / deviation if deviation else 0.0)
        return result

    def model_inputs(self, chosen, examples):
        return {"ExampleDefinition": array([v for e in examples for v in e], 2),
                "AttributeDefinition": array([v for c in chosen for v in c], 3),
                "StatsFXAS": "|".join(str(self.folder / f"{n}.fxas") for n in range(2)), **self.inputs}

    CHOSEN = [(0, 0, 0), (1, 3, 1), (0, 4, 0), (0, 1, 1)]  # the third has a deviation of 0
    EXAMPLES = [(0, 3), (1, 5), (2, 11), (0, 12), (1, 20), (0, 21), (2, 2)]

    def test_nearest_neighbours(self):
        points = [self.z(region, self.CHOSEN) for _, region in self.EXAMPLES]
        means = []
        for c in range(3):
            rows = [p for p, (k, _) in zip(points, self.EXAMPLES) if k == c]
            means.append([sum(v) / len(rows) for v in zip(*rows)])
        square = lambda a, b: sum((x - y) ** 2 for x, y in zip(a, b))
        for count in (1, 3, 100):
            for form in ("Told", "Votes"):
                fxc = self.folder / f"{count}{form}.fxc"
                self.run_job(("FxComputeKNNClassificationCommand", {**self.model_inputs(self.CHOSEN, self.EXAMPLES),
                                                                    "Neighbors": count, "ClassFXC": fxc, "Scores": form}))
                wanted = [[0.0] * 3 for _ in range(self.REGIONS)]
                for region in range(1, self.REGIONS):
                    z = self.z(region, self.CHOSEN)
                    order = sorted(range(len(points)), key=lambda e: square(z, points[e]))[:count]
                    votes = [sum(self.EXAMPLES[e][0] == c for e in order) for c in range(3)]
                    winner = votes.index(max(votes))
                    if form == "Told":
                        wanted[region][winner] = square(z, means[winner])
                    else:
                        wanted[region] = [v / len(order) for v in votes]
                for (c, region), point in zip(self.EXAMPLES, points):
                    wanted[region] = [0.0] * 3
                    wanted[region][c] = square(point, means[c]) if form == "Told" else 1
                got = read_scores(fxc)
                self.near(got, wanted)
                for c, region in self.EXAMPLES:
                    self.assertEqual(best(got[region]), c + 1)

    def test_an_example_that_is_the_mean_of_its_class_is_of_it(self):
        fxc = self.folder / "one.fxc"
        self.run_job(("FxComputeKNNClassificationCommand",
                      {**self.model_inputs(self.CHOSEN, [(0, 3), (1, 5)]), "Neighbors": 1, "ClassFXC": fxc}))
        scores = read_scores(fxc)
        self.assertEqual([best(scores[3]), best(scores[5])], [1, 2])

    def test_principal_components(self):
        chance = self.chance
        coefficients = [[chance.uniform(-1, 1) for _ in range(2)] for _ in self.CHOSEN]
        weights = [[chance.uniform(-1, 1) for _ in range(3)] for _ in range(2)]
        thresholds = [[chance.uniform(-1, 1) for _ in range(3)] for _ in range(2)]
        fxc = self.folder / "pca.fxc"
        flat = lambda table: array([v for row in table for v in row], len(table[0]))
        inputs = {**self.model_inputs(self.CHOSEN, self.EXAMPLES), "PCACoefficients": flat(coefficients),
                  "Weights": flat(weights), "Thresholds": flat(thresholds)}
        self.run_job(("FxComputePCAClassificationCommand", {**inputs, "ClassFXC": fxc}))
        wanted = [[0.0] * 3 for _ in range(self.REGIONS)]
        for region in range(self.REGIONS):
            if self.files[0][region][4] == 0:
                continue
            z = self.z(region, self.CHOSEN)
            y = [sum(z[i] * coefficients[i][k] for i in range(4)) for k in range(2)]
            wanted[region] = [max(0.0, sum((y[k] - thresholds[k][c]) * weights[k][c] for k in range(2))) for c in range(3)]
        largest = [max(row[c] for row in wanted) for c in range(3)]
        for c, region in self.EXAMPLES:
            wanted[region][c] = largest[c]
        got = read_scores(fxc)
        self.near(got + [[0.0] * 3] * (self.REGIONS - len(got)), wanted)
        err = self.run_job(("FxComputePCAClassificationCommand", {**inputs, "Weights": flat(weights[:1]),
                                                                  "ClassFXC": self.folder / "no.fxc"}), code=1)
        self.assertIn("Weights: the numbers are not 2 rows of 3", err)
        self.assertFalse((self.folder / "no.fxc").exists())

    def test_wrong_definitions_name_row_and_column(self):
        classes, rules, tests = [0], [(0, 1)], [(0, 0, 0, 0, 1, 5, 0, 1, 0, 0)]
        good = {"ClassDefinition": array(classes), "RuleDefinition": array(list(rules[0]), 2),
                "AttributeDefinition": array(list(tests[0]), 10), "LabelValues": f"1:1 [{ALL}] ",
                "ClassFXC": self.folder / "wrong.fxc", **self.inputs}
        for words, change in (
                ("RuleDefinition: row 1, column 0", {"RuleDefinition": array([0, 1, 4, 1], 2)}),
                ("AttributeDefinition: row 0, column 0", {"AttributeDefinition": array([1, *tests[0][1:]], 10)}),
                ("AttributeDefinition: row 0: there is no file 2", {"AttributeDefinition": array([0, 2, *tests[0][2:]], 10)}),
                ("AttributeDefinition: row 0: there is no attribute 5", {"AttributeDefinition": array([0, 0, 5, *tests[0][3:]], 10)}),
                ("AttributeDefinition: row 0: there is no band 2", {"AttributeDefinition": array([0, 0, 0, 2, *tests[0][4:]], 10)}),
                ("AttributeDefinition: the numbers are no rows of 10", {"AttributeDefinition": array([0, 0, 0])}),
                ("ClassDefinition: there is no class", {"ClassDefinition": "1:0 [] "}),
                ("LabelValues: there is no region 99", {"LabelValues": "1:1 [99] "}),
                ("there is no file", {"AttributesFXA": str(self.folder / "gone.fxa")}),
                ("is no file of regions", {"AttributesFXA": str(self.folder / "labels.dat")})):
            with self.subTest(words):
                self.assertIn(words, self.run_job(("FxComputeFuzzyClassificationCommand", {**good, **change}), code=1))
                self.assertFalse((self.folder / "wrong.fxc").exists())
        wrong = {**self.model_inputs(self.CHOSEN, [(0, 3), (1, 400)]), "Neighbors": 1, "ClassFXC": self.folder / "wrong.fxc"}
        self.assertIn("ExampleDefinition: row 1: there is no region 400",
                      self.run_job(("FxComputeKNNClassificationCommand", wrong), code=1))


if __name__ == "__main__":
    unittest.main()
