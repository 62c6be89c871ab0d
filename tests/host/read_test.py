"""Pixels that leave vexg: read and quicklook."""

import json
import pathlib
import random
import re
import struct
import subprocess
import unittest
import xml.etree.ElementTree as ElementTree
import zlib

from support import (DATA, VEXG, FolderTest, PipeTest, gdal_pixels, needs_data, needs_gdal, read_npy, read_png,
                     run, start, table, write_orva)


def part(data, width, bands, rect):
    """Pixels of a rectangle out of bytes by pixel."""
    left, top, right, bottom = rect
    return b"".join(data[(y * width + left) * bands:(y * width + right + 1) * bands]
                    for y in range(top, bottom + 1))


class Blocks(FolderTest):
    """Rasters larger than one block, against the bytes of the file itself."""

    def setUp(self):
        super().setUp()
        self.size = (3000, 2000, 4)
        width, height, bands = self.size
        self.pixels = random.Random(7).randbytes(width * height * bands)
        self.file = write_orva(self.folder / "large", width, height, bands, self.pixels)

    def read(self, *options):
        self.fine("read", self.file, "-o", self.folder / "out.npy", "--overwrite", "-q", *options)
        return read_npy(self.folder / "out.npy")

    def test_all_orders(self):
        width, height, bands = self.size
        self.assertEqual(self.read(), ("|u1", (height, width, bands), self.pixels))
        planes = b"".join(self.pixels[band::bands] for band in range(bands))
        self.assertEqual(self.read("--interleave", "bsq"), ("|u1", (bands, height, width), planes))
        by_line = b"".join(self.pixels[y * width * bands + band:(y + 1) * width * bands:bands]
                           for y in range(height) for band in range(bands))
        self.assertEqual(self.read("--interleave", "bil"), ("|u1", (height, bands, width), by_line))

    def test_standard_output_and_raw_files_have_the_same_bytes(self):
        def stream(*options):
            with subprocess.Popen([VEXG, "read", self.file, "-o", "-", "-q", *options], stdout=subprocess.PIPE,
                                  stderr=subprocess.PIPE) as process:
                out, err = process.communicate(timeout=60)
            self.assertEqual((process.returncode, err), (0, b""), options)
            return out

        for options in ([], ["--interleave", "bil", "--bands", "3,0"], ["--interleave", "bsq", "--rect", "7,9,2900,1500"]):
            with self.subTest(options):
                self.read(*options)
                npy = (self.folder / "out.npy").read_bytes()
                self.assertEqual(stream(*options), npy)
                raw = self.folder / "out.raw"
                self.fine("read", self.file, "-o", raw, "--overwrite", "-q", *options)
                self.assertEqual(raw.read_bytes(), read_npy(self.folder / "out.npy")[2])
                self.assertEqual(stream("--raw", *options), raw.read_bytes())
        # The mask of bands that come one by one.
        masks = [self.folder / "m1.npy", self.folder / "m2.npy"]
        source = DATA / "rgb1.tif" if DATA.is_dir() else self.file
        for out, mask in zip(("-", self.folder / "out.npy"), masks):
            code = subprocess.run([VEXG, "read", source, "-o", out, "--interleave", "bsq", "--mask", mask, "--overwrite"],
                                  stdout=subprocess.DEVNULL).returncode
            self.assertEqual(code, 0)
        self.assertEqual(masks[0].read_bytes(), masks[1].read_bytes())
        self.assertEqual(sorted(path.name for path in self.folder.iterdir()),
                         ["large", "large.hdr", "m1.npy", "m2.npy", "out.npy", "out.raw"])

    def test_standard_output_that_fails(self):
        with open("/dev/full", "wb") as full:
            process = subprocess.run([VEXG, "read", self.file, "-o", "-"], stdout=full, stderr=subprocess.PIPE)
        self.assertEqual((process.returncode, process.stderr.count(b"\n")), (1, 1))
        self.assertIn(b"standard output can't be written", process.stderr)
        shell = subprocess.run(f"'{VEXG}' read '{self.file}' -o - | head -c 10 | wc -c", shell=True, capture_output=True,
                               text=True, timeout=60)
        self.assertEqual((shell.stdout.strip(), shell.stderr), ("10", ""))
        self.fails(2, "--raw", "read", self.file, "-o", self.folder / "o.npy", "--raw")

    def test_rectangles_and_bands(self):
        width, _, bands = self.size
        rect = (17, 3, 2990, 1998)
        want = part(self.pixels, width, bands, rect)
        self.assertEqual(self.read("--rect", "17,3,2990,1998"), ("|u1", (1996, 2974, 4), want))
        chosen = bytearray(len(want) // 2)
        chosen[0::2], chosen[1::2] = want[3::bands], want[0::bands]
        self.assertEqual(self.read("--rect", "17,3,2990,1998", "--bands", "3,0")[2], bytes(chosen))
        self.assertEqual(self.read("--rect", "5,6,5,6")[1:], ((1, 1, 4), part(self.pixels, width, bands, (5, 6, 5, 6))))

    def test_a_line_as_picture(self):
        self.fine("read", self.file, "-o", self.folder / "out.png", "-q", "--rect", "0,0,99,1")
        self.assertEqual(read_png(self.folder / "out.png"), (100, 2, 4, part(self.pixels, 3000, 4, (0, 0, 99, 1))))

    def test_progress_ends_at_one(self):
        process = start("read", str(self.file), "-o", str(self.folder / "out.npy"), "--progress=json")
        _, err = process.communicate(timeout=60)
        self.assertEqual(json.loads(err.splitlines()[-1])["progress"], 1.0)


@needs_data
@needs_gdal
class Read(PipeTest, FolderTest):
    def test_gives_what_gdal_reads_here_and_by_a_server(self):
        self.serve()
        cases = [
            ("landsat7_u16_tiled.tif", "<u2", 6), ("landsat7_f32_strip.tif", "<f4", 3),
            ("dem_int16.tif", "<i2", 1), ("landsat7.img", "|u1", 6), ("landsat7_rgb.png", "|u1", 3),
            ("complex64.tif", "<c8", 1), ("complex128.tif", "<c16", 1),
        ]
        for name, kind, bands in cases:
            with self.subTest(name):
                here, there = self.folder / "here.npy", self.folder / "there.npy"
                self.fine("read", DATA / name, "-o", here, "--overwrite")
                self.fine("read", DATA / name, "-o", there, "--overwrite", "--server", "test")
                descr, shape, data = read_npy(here)
                self.assertEqual((descr, shape[2]), (kind, bands))
                self.assertEqual(data, gdal_pixels(DATA / name))
                self.assertEqual(here.read_bytes(), there.read_bytes())

    def test_parts_of_tiles(self):
        self.fine("read", DATA / "landsat7_u16_tiled.tif", "-o", self.folder / "o.npy",
                  "-q", "--rect", "60,100,200,300", "--bands", "4,1,1")
        descr, shape, data = read_npy(self.folder / "o.npy")
        self.assertEqual((descr, shape), ("<u2", (201, 141, 3)))
        self.assertEqual(data, gdal_pixels(DATA / "landsat7_u16_tiled.tif", "-srcwin", "60", "100", "141", "201",
                                           "-b", "5", "-b", "2", "-b", "2"))

    def test_states_count_the_valid_pixels(self):
        self.fine("read", DATA / "rgb1.tif", "-o", self.folder / "o.npy", "--mask", self.folder / "m.npy",
                  "--interleave", "bsq")
        _, shape, states = read_npy(self.folder / "m.npy")
        self.assertEqual(shape, (3, 400, 400))
        facts = [row for row in table("| file | band") if row["file"] == "rgb1.tif"]
        for band, fact in enumerate(facts):
            plane = states[band * 160000:(band + 1) * 160000]
            self.assertEqual(plane.count(0), int(fact["valid pixels"]))
            self.assertEqual(plane.count(0) + plane.count(1), 160000)

    def test_16_bits_as_picture(self):
        self.fine("read", DATA / "landsat7_u16_tiled.tif", "-o", self.folder / "o.png", "--bands", "2,1,0")
        data = gdal_pixels(DATA / "landsat7_u16_tiled.tif", "-b", "3", "-b", "2", "-b", "1")
        swapped = bytearray(data)
        swapped[0::2], swapped[1::2] = data[1::2], data[0::2]
        self.assertEqual(read_png(self.folder / "o.png"), (349, 352, 3, bytes(swapped)))

    def test_a_printed_job_fills_memory_that_its_runner_makes(self):
        job = self.fine("read", DATA / "rgb1.tif", "-o", self.folder / "o.npy", "--print-job", "-q", "--rect",
                        "10,20,29,39")
        self.assertFalse((self.folder / "o.npy").exists())
        inputs = {}
        for element in ElementTree.fromstring(job).iter("Input"):
            inputs.update(element.attrib)
        blocks = []
        for what in ("PixelData", "PixelValueState"):
            block = pathlib.Path("/dev/shm") / inputs[f"{what}BufName"]
            block.write_bytes(bytes(int(inputs[f"{what}BufSize"])))
            self.addCleanup(block.unlink)
            blocks.append(block)
        self.fine("run", "-", stdin=job)
        self.assertEqual(blocks[0].read_bytes(), gdal_pixels(DATA / "rgb1.tif", "-srcwin", "10", "20", "20", "20"))


@needs_data
@needs_gdal
class FurtherFormats(FolderTest):
    def test_read_what_gdal_put_into_them(self):
        drivers = subprocess.run(["gdalinfo", "--formats"], capture_output=True, text=True, check=True).stdout
        scene = DATA / "landsat7_u16_tiled.tif"
        for driver, ending, options in (("VRT", "vrt", []), ("netCDF", "nc", []), ("netCDF", "4.nc", ["-co", "FORMAT=NC4"]),
                                        ("Zarr", "zarr", [])):
            if f" {driver} " not in drivers:
                continue
            with self.subTest(driver + ending):
                one = self.folder / f"one.{ending}"
                subprocess.run(["gdal_translate", "-q", "-b", "3", "-of", driver, *options, scene, one], check=True)
                self.assertEqual(json.loads(self.fine("info", one, "--json"))["format"], driver)
                self.fine("read", one, "-o", self.folder / "one.npy", "--overwrite")
                self.assertEqual(read_npy(self.folder / "one.npy")[2], gdal_pixels(scene, "-b", "3"))
                if driver == "netCDF":  # a band is an array of the file
                    many = self.folder / f"many.{ending}"
                    subprocess.run(["gdal_translate", "-q", "-of", driver, *options, scene, many], check=True)
                    self.fine("read", f"{many}|SUBDATASET=2", "-o", self.folder / "two.npy", "--overwrite")
                    self.assertEqual(read_npy(self.folder / "two.npy")[2], gdal_pixels(scene, "-b", "2"))
                    self.fails(1, "name one by", "info", many)


@needs_data
class Quicklook(FolderTest):
    def look(self, *arguments):
        self.fine("quicklook", *arguments[:1], self.folder / "o.png", "--overwrite", *arguments[1:])
        return read_png(self.folder / "o.png")

    @needs_gdal
    def test_shows_pixels_in_the_middle_stretched(self):
        scene = DATA / "landsat7_olinda.tif"  # with overviews
        plain = self.folder / "plain.tif"
        subprocess.run(["gdal_translate", "-q", scene, plain], check=True)
        for file, samples, lines, options in ((plain, 349, 352, []), (scene, 175, 176, ["-oo", "OVERVIEW_LEVEL=0"])):
            width, height, channels, pixels = self.look(file, "--size", "100", "--resampling", "nearest")
            self.assertEqual((width, height, channels), (99, 100, 3))
            source = gdal_pixels(file, "-b", "3", "-b", "2", "-b", "1", *options)
            picked = [source[((2 * y + 1) * lines // 200 * samples + (2 * x + 1) * samples // 198) * 3:][:3]
                      for y in range(100) for x in range(99)]
            for band in range(3):
                values = sorted(pixel[band] for pixel in picked)
                low, high = values[round(9899 * 0.02)], values[round(9899 * 0.98)]
                for i, pixel in enumerate(picked):
                    want = min(max((pixel[band] - low) / (high - low) * 255, 0), 255)
                    self.assertLessEqual(abs(pixels[3 * i + band] - want), 0.5 + 1e-9)

    def test_a_reduced_picture_shows_means_of_the_area_of_its_pixels(self):
        chance = random.Random(5)
        for width, height, size in ((35, 20, 7), (35, 20, 8), (9, 31, 12)):
            pixels = [[chance.randrange(256) for _ in range(width)] for _ in range(height)]
            holes = chance.sample(range(width * height), 200)
            for at in holes:
                pixels[at // width][at % width] = 255
            file = write_orva(self.folder / "flat", width, height, 1, b"".join(map(bytes, pixels)))
            w, h, channels, shown = self.look(file, "--size", size, "--stretch", "none", "--no-data", "255")
            self.assertEqual((w, h), (max(1, round(width * size / max(width, height))),
                                      max(1, round(height * size / max(width, height)))))

            def share(i, count, at, extent):
                return max(0, min((i + 1) / count, (at + 1) / extent) - max(i / count, at / extent))

            for y in range(h):
                for x in range(w):
                    parts = [(share(x, w, i, width) * share(y, h, j, height), pixels[j][i])
                             for j in range(height) for i in range(width) if pixels[j][i] != 255]
                    weight = sum(part for part, _ in parts)
                    at = (y * w + x) * channels
                    if weight < 1e-12:
                        self.assertEqual(shown[at + channels - 1], 0)
                    else:
                        self.assertLessEqual(abs(shown[at] - sum(part * v for part, v in parts) / weight), 0.5 + 1e-6)

    def test_codes_are_not_averaged(self):
        colors = [(255, 0, 0), (0, 128, 0), (10, 20, 30)]
        file = write_indexed_png(self.folder / "codes.png", 8, 8, [0, 2] * 32, colors)
        width, height, _, shown = self.look(file, "--size", "4")
        self.assertEqual((width, height, {shown[i:i + 3] for i in range(0, len(shown), 3)}), (4, 4, {bytes(colors[2])}))
        self.fails(2, "have no mean", "quicklook", file, self.folder / "o.png", "--overwrite", "--size", "4",
                   "--resampling", "average")

    @needs_gdal
    def test_without_a_stretch_shows_values(self):
        width, height, channels, pixels = self.look(DATA / "landsat7_olinda.tif", "--stretch", "none", "--bands", "4")
        self.assertEqual((width, height, channels), (349, 352, 1))
        self.assertEqual(pixels, gdal_pixels(DATA / "landsat7_olinda.tif", "-b", "5"))

    def test_is_transparent_without_data(self):
        _, _, channels, pixels = self.look(DATA / "rgb1.tif", "--stretch", "none")
        self.assertEqual(channels, 4)
        for i in range(0, len(pixels), 4):
            self.assertEqual(pixels[i + 3], 255 if any(pixels[i:i + 3]) else 0)
        _, _, channels, pixels = self.look(DATA / "all-nodata.tif")
        self.assertEqual((channels, set(pixels[3::4])), (4, {0}))

    def test_other_pixel_types_and_sizes(self):
        self.assertEqual(self.look(DATA / "complex64.tif")[:3], (150, 120, 1))
        self.assertEqual(self.look(DATA / "float_nan.tif")[:3], (3, 2, 2))
        self.assertEqual(self.look(DATA / "all-nodata.tif", "--size", "10")[:2], (1, 10))

    def test_palettes_show_their_colours(self):
        colors = [(255, 0, 0), (0, 128, 0), (10, 20, 30)]
        file = write_indexed_png(self.folder / "indexed.png", 3, 2, [0, 1, 2, 2, 1, 0], colors)
        want = b"".join(bytes(colors[i]) for i in (0, 1, 2, 2, 1, 0))
        self.assertEqual(self.look(file), (3, 2, 3, want))


def write_indexed_png(path, width, height, indexes, colors):
    def chunk(kind, body):
        return struct.pack(">I", len(body)) + kind + body + struct.pack(">I", zlib.crc32(kind + body))

    rows = b"".join(b"\0" + bytes(indexes[y * width:(y + 1) * width]) for y in range(height))
    path.write_bytes(b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", struct.pack(">IIBBBBB", width, height, 8, 3, 0, 0, 0))
                     + chunk(b"PLTE", bytes(sum(colors, ()))) + chunk(b"IDAT", zlib.compress(rows)) + chunk(b"IEND", b""))
    return path


class Decimation(FolderTest):
    def test_touches_only_lines_that_it_shows(self):
        # All other lines are missing from the disk's point of view: reading them would still give
        # zeros, so what is asked for is looked at instead.
        file = write_orva(self.folder / "tall", 8, 100000, 1)
        job = self.fine("quicklook", file, self.folder / "o.png", "--size", "50", "--resampling", "nearest",
                        "--print-job")
        rects = re.findall(r'SubRect="(\d+) (\d+) (\d+) (\d+)"', job)
        self.assertEqual([int(rect[1]) for rect in rects], [1000 + 2000 * i for i in range(50)])
        self.assertTrue(all(rect[1] == rect[3] for rect in rects))

    def test_bad_options_are_one_line(self):
        file = write_orva(self.folder / "small", 4, 4, 2)
        for words, options in [("--bands", ["--bands", "0,1"]), ("no band 2", ["--bands", "2"]),
                               ("--stretch", ["--stretch", "98,2"]), ("--stretch", ["--stretch", "x"]),
                               ("--size", ["--size", "0"])]:
            self.fails(2, words, "quicklook", file, self.folder / "o.png", *options)
        for words, options in [("--rect", ["--rect", "0,0,4,0"]), ("--rect", ["--rect", "1,1,0,0"]),
                               ("--rect", ["--rect", "1,2,3"]), ("--bands", ["--bands", "a"]),
                               ("no band 7", ["--bands", "7"]), ("--interleave", ["--interleave", "x"])]:
            self.fails(2, words, "read", file, "-o", self.folder / "o.npy", *options)
        self.fails(2, ".npy, .raw or .png", "read", file, "-o", self.folder / "o.tif")
        wide = write_orva(self.folder / "wide", 4, 4, 5)
        self.fails(2, "a PNG holds", "read", wide, "-o", self.folder / "o.png")


if __name__ == "__main__":
    unittest.main()
