"""Copies, and what happens to outputs that can't be made."""

import json
import os
import pathlib
import resource
import shutil
import signal
import subprocess
import unittest

from read_test import write_indexed_png
from support import (DATA, EXAMPLES, VEXG, FolderTest, PipeTest, gdal_checksums, gdal_pixels, needs_data,
                     needs_gdal, read_npy, run, start, write_orva)


class CopyTest(FolderTest):
    def setUp(self):
        super().setUp()
        self.output = self.folder / "out"
        self.output.mkdir()

    def info(self, file):
        return json.loads(self.fine("info", "--json", file))

    def pixels(self, file):
        self.fine("read", file, "-o", self.folder / "pixels.npy", "--overwrite")
        return read_npy(self.folder / "pixels.npy")


@needs_data
@needs_gdal
class Copy(PipeTest, CopyTest):
    def test_keeps_pixels_and_place_in_every_format(self):
        cases = [
            ("landsat7_olinda.tif", "o.tif"), ("landsat7_u16_tiled.tif", "o.dat"), ("complex128.tif", "o.tif"),
            ("landsat7_f32_strip.tif", "o.img"), ("rgb1.tif", "o.tif"), ("dem_int16.tif", "o.bin"),
            ("float_raster_with_nodata.tif", "o.tif"), ("landsat7_rgb.png", "o.png"), ("rotated.tif", "o.dat"),
        ]
        for name, output in cases:
            with self.subTest(name=name, output=output):
                target = self.output / output
                self.fine("copy", DATA / name, target, "--overwrite")
                source, copy = self.info(DATA / name), self.info(target)
                for key in ("samples", "lines", "bands", "dataType", "noData"):
                    self.assertEqual(copy[key], source[key], key)
                self.check_place(source["geoRef"], copy["geoRef"])
                self.assertEqual(self.pixels(target), self.pixels(DATA / name))
                if target.suffix in (".tif", ".img", ".png"):
                    self.assertEqual(gdal_checksums(target), gdal_checksums(DATA / name))
        self.assertEqual([path for path in self.output.iterdir() if path.name.startswith(".")], [])

    def check_place(self, source, copy):
        if source is None:
            return
        for key in ("type", "pixelSize", "rotation", "coordSysName"):
            self.assertEqual(copy[key], source[key], key)
        for corner, place in source["corners"].items():
            for value, want in zip(copy["corners"][corner], place):
                self.assertAlmostEqual(value, want, delta=1e-6)

    def test_parts_and_bands_in_any_order(self):
        target = self.output / "part.tif"
        self.fine("copy", DATA / "landsat7_u16_tiled.tif", target, "-q", "--rect", "10,20,109,69", "--bands", "3,0",
                  "--interleave", "bip")
        self.assertEqual(gdal_pixels(target),
                         gdal_pixels(DATA / "landsat7_u16_tiled.tif", "-srcwin", "10", "20", "100", "50", "-b", "4", "-b", "1"))
        whole, copy = self.info(DATA / "landsat7_u16_tiled.tif")["geoRef"], self.info(target)["geoRef"]
        x, y = whole["corners"]["upperLeft"]
        self.assertAlmostEqual(copy["corners"]["upperLeft"][0], x + 10 * 28.5, delta=1e-6)
        self.assertAlmostEqual(copy["corners"]["upperLeft"][1], y - 20 * 28.5, delta=1e-6)

    def test_a_server_makes_the_same_bytes(self):
        self.serve()
        self.fine("copy", DATA / "landsat7_olinda.tif", self.output / "here.dat")
        self.fine("copy", DATA / "landsat7_olinda.tif", self.output / "there.dat", "--server", "test")
        for suffix in (".dat", ".dat.hdr"):
            self.assertEqual((self.output / f"here{suffix}").read_bytes(), (self.output / f"there{suffix}").read_bytes())

    def test_a_printed_job_makes_the_copy(self):
        target = self.output / "o.dat"
        job = self.fine("copy", DATA / "rgb1.tif", target, "--bands", "1", "--print-job")
        self.assertEqual(list(self.output.iterdir()), [])
        self.fine("run", "-", stdin=job)
        self.assertEqual(target.read_bytes(), gdal_pixels(DATA / "rgb1.tif", "-b", "2"))

    def test_palettes_go_along(self):
        colors = [(255, 0, 0), (0, 128, 0), (10, 20, 30)]
        source = write_indexed_png(self.folder / "indexed.png", 3, 2, [0, 1, 2, 2, 1, 0], colors)
        self.fine("copy", source, self.output / "o.tif")
        out = subprocess.run(["gdalinfo", self.output / "o.tif"], capture_output=True, text=True, check=True).stdout
        for color in colors:
            self.assertIn(": " + ",".join(map(str, color)) + ",255", out)

    def test_says_what_the_format_does_not_keep(self):
        code, out, err = run("copy", str(DATA / "rpc_scene.tif"), str(self.output / "o.jpg"))
        self.assertEqual((code, out), (0, ""))
        for line in err.splitlines():
            self.assertIn("note: the format JPEG does not keep", line)

    def test_progress_shows_the_copying(self):
        process = start("copy", str(DATA / "landsat7_olinda.tif"), str(self.output / "o.dat"), "--progress=json")
        _, err = process.communicate(timeout=60)
        steps = [json.loads(line)["progress"] for line in err.splitlines()]
        self.assertEqual((steps, steps[-1]), (sorted(steps), 1.0))


class Refusals(CopyTest):
    def setUp(self):
        super().setUp()
        self.source = write_orva(self.folder / "scene", 4, 4, 3, bytes(range(48)))

    def state(self):
        return {path: path.read_bytes() for path in self.folder.rglob("*") if path.is_file()}

    def test_change_nothing(self):
        (self.output / "there.dat").write_text("precious")
        (self.folder / "link.dat").symlink_to(self.source)
        os.link(self.source, self.folder / "hard.dat")
        (self.folder / "nowhere.dat").symlink_to(self.folder / "absent")
        (self.output / "side.dat.hdr").write_text("precious")
        before = self.state()
        force = ["--overwrite"]
        cases = [
            ("is there already", [self.output / "there.dat"]),
            ("is there already", [self.folder / "nowhere.dat"]),
            ("file of the input", [self.source, "--format", "ORVA"]),
            ("file of the input", [self.source, "--format", "ORVA", *force]),
            ("file of the input", [self.folder / "link.dat", *force]),
            ("file of the input", [self.folder / "hard.dat", *force]),
            ("file of the input", [f"{self.output}/../scene", "--format", "ORVA", *force]),
            ("file of the input", [f"{self.source}.hdr", "--format", "ORVA", *force]),
            ("side.dat.hdr", [self.output / "side.dat"]),
            ("no folder", [self.folder / "no" / "o.dat"]),
            ("is a folder", [self.output, "--format", "ORVA"]),
            ("no file that can be replaced", ["/dev/null", "--format", "ORVA", *force]),
            ("tells no format", [self.output / "o.xyz"]),
            ('no format "X"', [self.output / "o.dat", "--format", "X"]),
            ("--type", [self.output / "o.dat", "--type", "Complex"]),
            ("--rect", [self.output / "o.dat", "--rect", "0,0,4,4"]),
            ("no band 3", [self.output / "o.dat", "--bands", "3"]),
            ("--input-format", [self.output / "o.dat", "--input-format", "X"]),
        ]
        for words, arguments in cases:
            with self.subTest(arguments=arguments):
                self.fails(2, words, "copy", self.source, *arguments)
                self.assertEqual(self.state(), before)
        # The header names the same raster as its file of pixels.
        self.fails(2, "file of the input", "copy", f"{self.source}.hdr", self.source, "--format", "ORVA", *force)
        self.fails(2, "file of the input", "read", self.source, "-o", self.output / "o.npy", "--mask", self.output / "o.npy")
        self.assertEqual(self.state(), before)

    def test_overwriting_replaces_the_whole(self):
        target = self.output / "o.dat"
        target.write_text("old")
        (self.output / "o.dat.aux.xml").write_text("statistics of the old one")
        self.fine("copy", self.source, target, "--overwrite")
        self.assertEqual(target.read_bytes(), self.source.read_bytes())
        self.assertEqual(sorted(path.name for path in self.output.iterdir()), ["o.dat", "o.dat.hdr"])


class Failures(PipeTest, CopyTest):
    """What breaks half way leaves nothing behind."""

    def limited(self, *arguments):
        """A run in which no file may grow over 64 KiB."""
        def limit():
            signal.signal(signal.SIGXFSZ, signal.SIG_IGN)
            resource.setrlimit(resource.RLIMIT_FSIZE, (1 << 16, 1 << 16))

        process = subprocess.run([VEXG, "--load", EXAMPLES, *arguments], capture_output=True, text=True,
                                 timeout=60, preexec_fn=limit, restore_signals=False)
        return process.returncode, process.stdout, process.stderr

    def test_a_file_that_can_not_grow(self):
        source = write_orva(self.folder / "scene", 1000, 1000, 1, os.urandom(1000000))
        for verb in (["copy", source, self.output / "o.dat"], ["copy", source, self.output / "o.tif"],
                     ["copy", source, self.output / "o.png"]):
            with self.subTest(verb):
                code, out, err = self.limited(*verb)
                self.assertEqual((code, out, err.count("\n")), (1, "", 1), err)
                self.assertNotIn(".part", err)
                self.assertEqual(list(self.output.iterdir()), [])

    def test_a_disk_without_room_is_told_before(self):
        free = shutil.disk_usage(self.folder).free
        side = 1 << 20
        bands = free // side // side + 2
        source = write_orva(self.folder / "huge", side, side, bands)
        for verb in (["copy", source, self.output / "o.dat"], ["read", source, "-o", self.output / "o.npy"]):
            self.fails(1, "bytes, and the disk has", *verb)
        self.assertEqual(list(self.output.iterdir()), [])

    def test_an_interrupt_leaves_nothing(self):
        self.serve()
        source = write_orva(self.folder / "long", 30000, 20000, 1)
        for where in ([], ["--server", "test"]):
            for verb in (["copy", source, self.output / "o.dat"], ["read", source, "-o", self.output / "o.npy"]):
                with self.subTest(verb=verb[0], where=where):
                    process = start(*map(str, verb), *where, "--progress=json")
                    while json.loads(process.stderr.readline())["progress"] == 0.0:
                        pass
                    process.send_signal(signal.SIGINT)
                    out, err = process.communicate(timeout=60)
                    self.assertEqual((process.returncode, out), (1, ""))
                    self.assertIn("vexg: interrupted; nothing was written", err.splitlines()[-1])
                    self.assertEqual(list(self.output.iterdir()), [])
        # The server goes on.
        self.fine("copy", source, self.output / "o.dat", "-q", "--rect", "0,0,9,9", "--server", "test")


class Server(PipeTest, CopyTest):
    def test_keeps_to_its_folders(self):
        inside, outside = self.folder / "inside", self.folder / "outside"
        inside.mkdir(), outside.mkdir()
        scene = write_orva(inside / "scene", 4, 4, 1)
        secret = write_orva(outside / "secret", 4, 4, 1)
        (inside / "link").symlink_to(secret)
        (inside / "link.hdr").symlink_to(f"{secret}.hdr")
        (inside / "away").symlink_to(outside)
        self.serve("test", "--root", str(inside))
        there = ["--server", "test"]
        self.fine("info", scene, *there)
        self.fine("copy", scene, inside / "copy.dat", *there)
        for source in (secret, inside / "link", inside / ".." / "outside" / "secret"):
            self.fails(1, "outside the folders", "info", source, *there)
        for target in (outside / "o.dat", inside / "away" / "o.dat"):
            self.fails(1, "outside the folders", "copy", scene, target, *there)
        self.assertEqual(sorted(path.name for path in outside.iterdir()), ["secret", "secret.hdr"])

    def test_needs_folders_that_are_there(self):
        self.fails(2, "no such directory", "serve", "test", "--root", self.folder / "no")
        self.fails(2, "--allow", "serve", "test", "--allow", "everything")

    @needs_data
    def test_reaches_no_further_than_files_unless_allowed(self):
        archive = pathlib.Path(shutil.make_archive(str(self.folder / "scenes"), "zip", DATA, "rgb1.tif"))
        packed = f"/vsizip/{archive}/rgb1.tif"
        cases = [
            ("network", "network", ["https://localhost:1/scene.tif"]),
            ("network", "network", [DATA / "rgb1.tif", "--input-format", "WMS"]),
            ("virtual", "virtual files", [packed]),
            ("memory", "memory addresses", ["x", "--input-format", "MemoryRaster"]),
            ("indirect", "name other files", [DATA / "rgb1.tif", "--input-format", "Spot"]),
        ]
        self.serve("strict")
        for _, words, source in cases:
            self.fails(1, words + (" are" if words != "network" else ""), "info", *source, "--server", "strict")
        self.stop()
        self.serve("open", *(part for what in ("network", "virtual", "memory", "indirect") for part in ("--allow", what)))
        self.fine("info", packed, "--input-format", "TIFF", "--server", "open")
        for _, _, source in cases[1:2] + cases[3:]:
            code, _, err = run("info", *map(str, source), "--server", "open")
            self.assertEqual(code, 1)
            self.assertNotIn("allowed", err)


if __name__ == "__main__":
    unittest.main()
