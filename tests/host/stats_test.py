"""Statistics, histograms and calibration, beside reference facts, GDAL and plain arithmetic."""

import array
import json
import math
import pathlib
import random
import re
import shutil
import subprocess
import unittest
from xml.etree import ElementTree

from support import DATA, FolderTest, needs_data, needs_gdal, read_npy, read_png, run, start, table, write_orva


class RasterTest(FolderTest):
    def stats(self, *arguments):
        return json.loads(self.fine("stats", "--json", *arguments))["bands"]

    def values(self, file, band, *options):
        """The valid pixels of a band, by vexg read; all of them with NaN in the others' place."""
        self.fine("read", file, "--bands", band, "-o", self.folder / "v.npy", "--mask", self.folder / "m.npy",
                  "--overwrite", *options)
        kind, _, data = read_npy(self.folder / "v.npy")
        _, _, mask = read_npy(self.folder / "m.npy")
        codes = {"|u1": "B", "<u2": "H", "<i2": "h", "<f4": "f", "<f8": "d"}
        pixels = array.array(codes[kind])
        pixels.frombytes(data)
        return [math.nan if state else float(value) for value, state in zip(pixels, mask)]


@needs_data
class Stats(RasterTest):
    def test_agree_with_the_reference_facts(self):
        facts = {}
        for row in table("| file | band | valid"):
            facts.setdefault(row["file"], []).append(row)
        for file, rows in facts.items():
            if file.endswith(".jpg"):
                continue  # decoders differ
            with self.subTest(file):
                bands = self.stats(DATA / file)
                self.assertEqual([band["band"] for band in bands], [int(row["band"]) for row in rows])
                for band, row in zip(bands, rows):
                    self.assertEqual(band["count"], int(row["valid pixels"]))
                    if band["count"] == 0:
                        self.assertEqual({band[name] for name in band if name not in ("band", "count")}, {None})
                        continue
                    self.assertEqual((band["min"], band["max"]), (float(row["min"]), float(row["max"])))
                    for name, fact in (("mean", "mean"), ("std", "deviation")):
                        want = float(row[fact])
                        self.assertLessEqual(abs(band[name] - want), 1e-12 * abs(want) + 1e-300, name)

    def test_sums_and_covariances_agree_with_exact_arithmetic(self):
        for file in ("rgb1.tif", "landsat7_f32_strip.tif"):
            with self.subTest(file):
                bands = self.stats(DATA / file, "--extended")
                pixels = [self.values(DATA / file, band["band"]) for band in bands]
                for i, band in enumerate(bands):
                    valid = [value for value in pixels[i] if value == value]
                    sums = math.fsum(valid), math.fsum(value * value for value in valid)
                    self.assertAlmostEqual(band["sum"] / sums[0], 1, delta=1e-13)
                    self.assertAlmostEqual(band["sum2"] / sums[1], 1, delta=1e-13)
                    self.assertAlmostEqual(band["rms"], math.sqrt(sums[1] / len(valid)), delta=1e-9 * band["rms"])
                    for j in range(len(bands)):
                        pairs = [(x, y) for x, y in zip(pixels[i], pixels[j]) if x == x and y == y]
                        n = len(pairs)
                        mean_x = math.fsum(x for x, _ in pairs) / n
                        mean_y = math.fsum(y for _, y in pairs) / n
                        cov = math.fsum((x - mean_x) * (y - mean_y) for x, y in pairs) / (n - 1)
                        products = math.fsum(x * y for x, y in pairs)
                        self.assertAlmostEqual(band["sumXY"][j] / products, 1, delta=1e-13)
                        self.assertAlmostEqual(band["cov"][j] / cov, 1, delta=1e-10)

    def test_of_chosen_bands_are_those_of_all(self):
        every = self.stats(DATA / "landsat7_olinda.tif")
        some = self.stats(DATA / "landsat7_olinda.tif", "--bands", "4,0")
        self.assertEqual(some, [every[4], every[0]])

    def test_between_chosen_bands_are_those_of_all(self):
        every = self.stats(DATA / "landsat7_olinda.tif", "--extended")
        order = [3, 2, 1, 5]
        some = self.stats(DATA / "landsat7_olinda.tif", "--bands", ",".join(map(str, order)), "--extended")
        for band, got in zip(order, some):
            for name in ("sumXY", "cov"):
                self.assertEqual(got[name], [every[band][name][other] for other in order])
            self.assertAlmostEqual(got["cov"][order.index(band)] / got["std"] ** 2, 1, delta=1e-12)

    def test_no_valid_pixel_has_none(self):
        table = self.fine("stats", DATA / "all-nodata.tif", "--extended").splitlines()
        self.assertEqual(table[2].split(), ["0", "0"] + ["-"] * 7)
        self.assertEqual(table[-1].split(), ["3"] + ["-"] * 4)
        band = self.stats(DATA / "all-nodata.tif", "--extended")[0]
        self.assertEqual((band["count"], band["min"], band["cov"]), (0, None, [None] * 4))
        zeros = write_orva(self.folder / "zeros.dat", 3, 2, 1)
        self.assertEqual(self.stats(zeros)[0]["max"], 0)

    def test_percentiles_of_valid_pixels_are_those_of_their_order(self):
        for file, options in (("landsat7_f32_strip.tif", ["--bands", "1"]), ("float_raster_with_nodata.tif", []),
                              ("dem_int16.tif", ["--rect", "3,5,60,71", "-q"]), ("rgb1.tif", ["--bands", "2,0"])):
            with self.subTest(file):
                plain = self.stats(DATA / file, *options)
                found = self.stats(DATA / file, *options, "--median", "--percentiles", "0,2.5,98,100,2.5")
                for before, band in zip(plain, found, strict=True):
                    self.assertEqual({name: band[name] for name in before}, before)
                    self.assertEqual(list(band)[len(before):], ["median", "p0", "p2.5", "p98", "p100"])
                    area = options if "--rect" in options else []
                    valid = sorted(v for v in self.values(DATA / file, band["band"], *area) if v == v)
                    for name, percent in (("median", 50), ("p0", 0), ("p2.5", 2.5), ("p98", 98), ("p100", 100)):
                        self.assertAlmostEqual(band[name], quantile(valid, percent), delta=1e-12 * abs(band[name]))
        code, out, _ = run("stats", str(DATA / "all-nodata.tif"), "--median")
        self.assertEqual((code, out.splitlines()[1].split()[-1], out.splitlines()[2].split()[-1]), (0, "median", "-"))
        self.assertIsNone(self.stats(DATA / "all-nodata.tif", "--median")[0]["median"])
        for text in ("101", "-1", "x", "", "1,,2", "nan", "1e1x"):
            self.fails(2, "--percentiles", "stats", DATA / "rgb1.tif", f"--percentiles={text or ','}", "--json")

    def test_save_stores_them_where_the_format_keeps_them(self):
        for name in ("landsat7_u16_tiled.tif", "float_nan.tif", "landsat7.img", "flat.dat"):
            with self.subTest(name):
                file = self.folder / name
                if name == "flat.dat":
                    self.fine("copy", DATA / "rgb1.tif", file)
                else:
                    shutil.copy(DATA / name, file)
                first = self.stats(file, "--save")
                self.assertEqual(self.stats(file), first)
                if file.suffix == ".dat":
                    self.assertIn("statistics", (self.folder / "flat.dat.hdr").read_text())
                elif shutil.which("gdalinfo"):
                    out = subprocess.run(["gdalinfo", file], capture_output=True, text=True, check=True).stdout
                    means = [float(text) for text in re.findall(r"STATISTICS_MEAN=(\S+)", out)]
                    self.assertEqual(means, [band["mean"] for band in first])

    def test_complaints(self):
        cases = [
            ((DATA / "complex64.tif",), 1, "statistics are of real numbers"),
            ((DATA / "rgb1.tif", "--bands", "3"), 2, "no band 3"),
            ((DATA / "rgb1.tif", "--bands", "0", "--save"), 2, "leave --bands out"),
            ((self.folder / "none.tif",), 1, "none.tif"),
        ]
        for arguments, want, words in cases:
            with self.subTest(words):
                code, out, err = run("stats", *map(str, arguments))
                self.assertEqual((code, out), (want, ""))
                self.assertIn(words, err)
                self.assertEqual(err.count("\n"), 1)


def quantile(values, percent):
    """Between the two values next to the rank (n - 1) p / 100, of values in their order."""
    rank = (len(values) - 1) * percent / 100
    low = int(rank)
    part = rank - low
    return values[low] if part == 0 else values[low] + part * (values[low + 1] - values[low])


class Percentiles(RasterTest):
    """Of every pixel type in three bands, and of more different numbers than are kept one by one."""

    def test_all_pixel_types(self):
        chance = random.Random(11)
        for kind, code in (("Byte", "B"), ("Int16", "h"), ("UInt16", "H"), ("Int32", "i"), ("UInt32", "I"),
                           ("Int64", "q"), ("UInt64", "Q"), ("Single", "f"), ("Double", "d")):
            with self.subTest(kind):
                samples = 30_000 if code == "f" else 500
                bits = 8 * array.array(code).itemsize
                if code in "fd":
                    draw = lambda: chance.gauss(0, 1e20) if chance.random() < 0.95 else chance.choice((-3.5, 0.0, -0.0))
                else:
                    low = -(1 << (bits - 1)) if code.islower() else 0
                    draw = lambda: low + chance.getrandbits(chance.choice((bits, bits // 2)))
                pixels = array.array(code, (draw() for _ in range(3 * samples * 10)))
                if code in "fd":
                    pixels[0], pixels[3], pixels[6] = math.nan, math.inf, -math.inf
                file = write_orva(self.folder / kind, samples, 10, 3, pixels.tobytes(), kind)
                bands = self.stats(file, "--percentiles", "0,1,37.5,50,100")
                for i, band in enumerate(bands):
                    valid = sorted(value for value in pixels[i::3] if math.isfinite(value))
                    for percent in (0, 1, 37.5, 50, 100):
                        want = float(quantile(valid, percent))
                        self.assertAlmostEqual(band[f"p{percent:g}"], want, delta=1e-12 * abs(want), msg=percent)


@needs_data
class Hist(RasterTest):
    def hist(self, *arguments):
        return json.loads(self.fine("hist", "--json", *arguments))["bands"]

    def test_counts_every_valid_value_once(self):
        cases = [("rgb1.tif", []), ("landsat7_u16_tiled.tif", ["--bands", "2,5", "--bins", "40"]),
                 ("dem_int16.tif", ["--bin-size", "7"]), ("rgb1.tif", ["--bin-size", "2.5"]),
                 ("rgb1.tif", ["--bins", "100", "--lower", "-5", "--upper", "300"]), ("float_raster_with_nodata.tif", ["--bins", "7"]),
                 ("landsat7_f32_strip.tif", ["--bands", "1"]), ("float_nan.tif", ["--bins", "1"]),
                 ("landsat7_f32_strip.tif", ["--lower", "0.25", "--upper", "0.5", "--bins", "10"]),
                 ("dem_int16.tif", ["--lower", "10", "--upper", "19"]), ("all-nodata.tif", [])]
        for file, options in cases:
            with self.subTest(file=file, options=options):
                for band in self.hist(DATA / file, *options):
                    low, high, size = band["min"], band["max"], band["binSize"]
                    counts = [0] * len(band["counts"])
                    for value in self.values(DATA / file, band["band"]):
                        if low <= value <= high:
                            at = min(int((value - low) / size), len(counts) - 1)
                            at -= value < low + at * size
                            at += at + 1 < len(counts) and value >= low + (at + 1) * size
                            counts[at] += 1
                    self.assertEqual(band["counts"], counts)
                    self.assertLessEqual(low + size * (len(counts) - 1), high)

    def test_plots_tell_bands_units_and_counts(self):
        """Bars of an SVG have the heights of the counts; a PNG shows the same at the same places."""
        scene, plot = self.folder / "scene.tif", self.folder / "h.svg"
        subprocess.run(["gdal_translate", "-q", DATA / "rgb1.tif", scene], check=True)
        subprocess.run(["gdal_edit.py", "-colorinterp_1", "undefined", "-units", "K & <C>", scene], check=True)
        bands = self.hist(scene, "--bins", "16")
        self.fine("hist", scene, "--bins", "16", "-o", plot)
        root = ElementTree.parse(plot).getroot()
        space = "{http://www.w3.org/2000/svg}"
        texts = [text.text for text in root.iter(space + "text")]
        for band in bands:
            self.assertTrue(any(text.startswith(f"scene.tif, band {band['band']}") for text in texts), texts)
        self.assertEqual(texts.count("pixel value (K & <C>)"), len(bands))
        self.assertEqual(sum(text.endswith("pixels") for text in texts), len(bands))
        bars = [[tuple(map(float, place.split(","))) for place in area.get("points").split()]
                for area in root.iter(space + "polygon")]
        self.assertEqual(len(bars), len(bands))
        self.fine("hist", scene, "--bins", "16", "--bands", "0", "-o", self.folder / "h.png")
        width, height, channels, pixels = read_png(self.folder / "h.png")
        self.assertEqual((width, height), (2 * int(root.get("width")), 2 * int(root.get("height")) // len(bands)))
        for band, bar in zip(bands, bars):
            counts, base = band["counts"], bar[0][1]
            heights = [base - y for _, y in bar[1:-1]]
            unit = max(heights) / max(counts)
            for i, count in enumerate(counts):
                for tall in heights[2 * i:2 * i + 2]:
                    self.assertAlmostEqual(tall, max(count * unit, 0.75 if count else 0), delta=0.02)
                if band["band"] != 0:
                    continue
                middle = round(bar[1 + 2 * i][0] + bar[2 + 2 * i][0])  # in pixels, of which a unit has two
                column = [pixels[(y * width + middle) * channels:][:3] for y in range(height)]
                blue = sum(1 for y in range(round(2 * (base - max(heights))), round(2 * base) - 1)
                           if column[y][2] > column[y][0] + 60)
                self.assertAlmostEqual(blue, max(0, 2 * heights[2 * i] - 1), delta=2)
        code, _, err = run("hist", str(scene), "-o", str(plot))
        self.assertEqual(code, 2)
        self.assertIn("--overwrite", err)

    def test_save_stores_them(self):
        file = self.folder / "rgb1.tif"
        shutil.copy(DATA / "rgb1.tif", file)
        self.fine("hist", file, "--save", "--json")
        self.assertIn("Histograms", pathlib.Path(f"{file}.aux.xml").read_text())

    def test_complaints(self):
        # Faults that show without the raster are a wrong command line; the command refuses the rest.
        for options, want, words in ((["--bins", "9", "--bin-size", "1"], 2, "exclude"),
                                     (["--bin-size", "0"], 2, "above 0"),
                                     (["--lower", "9", "--upper", "3"], 1, "is above the upper"),
                                     (["--lower", "1.5"], 1, "can't be 1.5"), (["--upper", "nan"], 1, "can't be nan"),
                                     (["--lower", "300", "--upper", "400"], 1, "no value that the pixels can have"),
                                     (["--bin-size", "1e-9"], 1, "more than 16777216 bins")):
            with self.subTest(words):
                code, out, err = run("hist", str(DATA / "rgb1.tif"), *options)
                self.assertEqual((code, out), (want, ""))
                self.assertIn(words, err)


@needs_data
class Calibrate(RasterTest):
    CONSTANTS = {
        "radiance": [], "reflectance": ["--irradiance", "1969,1840,1551", "--sun-elevation", "61.5",
                                        "--distance", "1.0128"],
        "temperature": ["--k1", "607.76", "--k2", "1260.56"],
    }

    def want(self, quantity, value, band):
        r = value * (0.775, 0.796, 0.619)[band] - 6.2
        if not r > 0:
            return 0.0
        if quantity == "reflectance":
            sine = math.sin(61.5 * math.pi / 180)
            return r * 3.141592653589 * 1.0128 ** 2 * 2 / (sine * (1969, 1840, 1551)[band])
        return 2 * (1260.56 / math.log(607.76 / r + 1) if quantity == "temperature" else r)

    def test_follow_the_formulas(self):
        for quantity, constants in self.CONSTANTS.items():
            for source, type_name in (("rgb1.tif", "Double"), ("landsat7_rgb.png", "Single")):
                with self.subTest(quantity=quantity, source=source, type=type_name):
                    out = self.folder / "out.tif"
                    self.fine("calibrate", quantity, DATA / source, out, "--gain", "0.775,0.796,0.619",
                              "--offset", "-6.2", "--scale", "2", "--type", type_name, "--overwrite", *constants)
                    for band in range(3):
                        delta = 1e-12 if type_name == "Double" else 1e-7
                        for got, dn in zip(self.values(out, band), self.values(DATA / source, band)):
                            if dn != dn:
                                self.assertNotEqual(got, got)
                                continue
                            want = self.want(quantity, dn, band)
                            self.assertLessEqual(abs(got - want), delta * want)

    def test_whole_numbers_keep_the_low_bits(self):
        source = write_orva(self.folder / "dn.dat", 4, 1, 1, bytes([0, 100, 200, 250]))
        out = self.folder / "out.dat"
        self.fine("calibrate", "radiance", source, out, "--gain", "1.5", "--offset", "-0.5", "--type", "Byte")
        self.assertEqual(self.values(out, 0), [0, 149, 299 - 256, 374 - 256])

    def test_complaints_leave_nothing_behind(self):
        base = ["--gain", "1", "--offset", "0"]
        cases = [
            (["radiance", "--gain", "1"], 2, "--offset: radiance needs it"),
            (["radiance", "--gain", "1,2", "--offset", "0"], 2, "2 values for 3 bands"),
            (["radiance", *base, "--k1", "3"], 2, "no use for it"),
            (["reflectance", *base, "--irradiance", "5", "--sun-elevation", "0", "--distance", "1"], 2, "horizon"),
            (["radiance", *base, "--type", "Word"], 2, "--type"),
            (["radiance", *base, "--type", "Byte", "--scale", "0.5"], 2, "would be cut to 0"),
            (["radiance", *base, "--format", "PNG"], 1, "out.tif"),
        ]
        for (quantity, *options), want, words in cases:
            with self.subTest(words):
                code, out, err = run("calibrate", quantity, str(DATA / "rgb1.tif"), str(self.folder / "out.tif"),
                                     *options)
                self.assertEqual((code, out), (want, ""))
                self.assertIn(words, err)
                self.assertEqual(list(self.folder.iterdir()), [])

    SCENE = ("band names = {Red, Near infrared}\ngains = {0.5, 0.25}\noffsets = {-1, 2}\n"
             "solar irradiances = {1551, 1036}\nsun elevation = 30\nacquisition time = 2010-07-06T11:30:00Z\n")

    def calibrate(self, quantity, source, metadata, *options):
        """Exit code, what was said, and the values of the first pixel."""
        out = self.folder / "out.dat"
        code, printed, err = run("calibrate", quantity, str(source), str(out), "--type", "Double", "--overwrite",
                                 "--progress", "none", "--from-metadata", str(metadata), *options)
        self.assertEqual(printed, "")
        return code, err, [self.values(out, band)[0] for band in range(2)] if code == 0 else []

    def test_constants_come_from_metadata(self):
        source = write_orva(self.folder / "dn.dat", 2, 1, 2, bytes([100, 200, 9, 8]), more=self.SCENE)
        code, said, values = self.calibrate("radiance", source, source)
        self.assertEqual((code, values), (0, [49, 52]), said)
        self.assertIn("dn.dat: taken --gain 0.5,0.25 --offset -1,2\n", said)
        distance = 1.0167  # of the aphelion
        code, said, values = self.calibrate("reflectance", source, f"ORVA:{source}.hdr", "--gain", "1")
        self.assertEqual(code, 0, said)
        self.assertIn("taken --offset -1,2 --irradiance 1551,1036 --sun-elevation 30 --distance 1.016", said)
        for value, radiance, irradiance in zip(values, (99, 202), (1551, 1036)):
            self.assertAlmostEqual(value / (math.pi * radiance * distance ** 2 / (irradiance * 0.5)), 1, delta=2e-4)

    def test_metadata_that_do_not_do(self):
        source = write_orva(self.folder / "dn.dat", 2, 1, 2, bytes(4), more=self.SCENE)
        low = write_orva(self.folder / "low.dat", 1, 1, 2, more=self.SCENE.replace("tion = 30", "tion = -3"))
        three = write_orva(self.folder / "three.dat", 2, 1, 3)
        before = sorted(self.folder.iterdir())
        for quantity, scene, metadata, words in (
                ("temperature", source, source, "dn.dat: it doesn't tell --k1, which temperature needs"),
                ("reflectance", source, low, "low.dat: --sun-elevation: the sun stands"),
                ("radiance", three, source, "dn.dat: --gain: there are 2 values for 3 bands"),
                ("radiance", source, three, "three.dat: it doesn't tell --gain"),
                ("radiance", source, self.folder / "none.dat.hdr", "none.dat.hdr: No such file"),
                ("radiance", source, "scene.txt", "scene.txt: the name doesn't tell what metadata")):
            with self.subTest(words):
                code, said, _ = self.calibrate(quantity, scene, metadata)
                self.assertNotEqual(code, 0)
                self.assertIn(words, said)
                self.assertEqual(sorted(self.folder.iterdir()), before)

    @needs_gdal
    def test_print_job_is_the_work_done(self):
        out = self.folder / "out.tif"
        arguments = ["calibrate", "radiance", str(DATA / "rgb1.tif"), str(out), "--gain", "2", "--offset", "1"]
        job = self.folder / "job.xml"
        job.write_text(self.fine(*arguments, "--print-job"))
        self.assertFalse(out.exists())
        self.fine("run", job)
        by_job = out.read_bytes()
        self.fine(*arguments, "--overwrite")
        self.assertEqual(out.read_bytes(), by_job)



class Together(RasterTest):
    """Programs that store different things of one raster at once, and that make one pyramid."""

    SAVES = [["stats"], ["hist", "--bands", "0"], ["hist", "--bands", "1"], ["hist", "--bands", "2"]]

    def test_saves_keep_each_other(self):
        pixels = bytes(range(250)) * 12
        file = write_orva(self.folder / "scene", 100, 10, 3, pixels)
        rasters = [file]
        if shutil.which("gdal_translate"):
            self.fine("copy", file, self.folder / "scene.tif")
            rasters.append(self.folder / "scene.tif")
        for raster in rasters:
            with self.subTest(raster.name):
                runs = [start(*save, "--save", "-q", str(raster)) for save in self.SAVES]
                for process in runs:
                    _, err = process.communicate(timeout=60)
                    self.assertEqual((process.returncode, err), (0, ""))
                self.check(raster)

    def check(self, raster):
        beside = [raster.with_name(raster.name + end) for end in (".hdr", ".aux.xml")]
        text = "".join(path.read_text() for path in beside if path.exists())
        histograms = text.count("<HistItem>") or text.count(" Dynamic ")
        statistics = text.count("STATISTICS_MEAN") or text[text.index("\nstatistics"):].split("}")[0].count(",") + 1
        self.assertEqual((histograms, statistics), (3, 3))

    def test_of_two_builders_one_wins_whole(self):
        file = write_orva(self.folder / "scene", 300, 200, 3, bytes(180000))
        for _ in range(3):
            runs = [start("pyramid", "build", "-q", "--levels", levels, str(file)) for levels in ("1", "1-2", "1-3")]
            ends = [(process.communicate(timeout=60)[1], process.returncode) for process in runs]
            winners = [i for i, (_, code) in enumerate(ends) if code == 0]
            self.assertTrue(winners)
            for err, code in ends:
                self.assertEqual("another program has built it meanwhile" in err, code == 1)
            last = json.loads(self.fine("info", "--json", file))["pyramidLevels"][1]
            self.assertIn(last - 1, winners)
            self.assertEqual(sorted(path.name for path in self.folder.iterdir()), ["scene", "scene.hdr", "scene.pyr"])


class Waiting(FolderTest):
    """Commands that compute over one raster at the same time."""

    def job(self, wait):
        raster = write_orva(self.folder / "raster", 2000, 2000, 2)
        commands = "".join(
            f'<Command Name="h{i}" ID="CalculateRasterHistogramCommand"><DependsOn Name="o"/>'
            f'<Input URI="$r" LowerBound="0" UpperBound="255" BinCount="{i + 1}" {wait}/></Command>'
            for i in range(4))
        for name in ("GetBasicRasterStatsCommand", "GetExtendedRasterStatsCommand"):
            commands += (f'<Command Name="{name}" ID="{name}"><DependsOn Name="o"/>'
                         f'<Input URI="$r" {wait}/></Command>')
        path = self.folder / "job.xml"
        path.write_text(f'<Job><Command Name="o" ID="OpenRasterCommand"><Input ConnStr="{raster}"/>'
                        f'<Output URI="$r"/></Command>{commands}</Job>')
        return path

    def test_they_wait_their_turn(self):
        out = self.fine("run", "-q", "--json", self.job('Wait="Always"'))
        returned = {command["name"]: command["return"] for command in json.loads(out)["commands"]}
        self.assertIn("Cov", returned["GetExtendedRasterStatsCommand"])
        self.assertEqual(returned["GetBasicRasterStatsCommand"]["Count"], [4000000, 4000000])
        self.fails_in_part("run", "-q", self.job('Wait="Alwayz"'), words="did you mean Always?")

    def fails_in_part(self, *arguments, words):
        code, _, err = run(*map(str, arguments))
        self.assertEqual(code, 1)
        self.assertIn(words, err)


if __name__ == "__main__":
    unittest.main()
