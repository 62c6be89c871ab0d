"""Pyramids on the command line: building, using and deleting them, and builds that are cut short."""

import json
import os
import random
import shutil
import signal
import subprocess
import unittest

from support import FolderTest, PipeTest, needs_gdal, read_npy, read_png, run, start, write_orva

SAMPLES, LINES, BANDS = 301, 200, 3


def every(pixels, level, samples=SAMPLES, lines=LINES, bands=BANDS):
    """Every 2^level-th pixel of every 2^level-th line."""
    step = 1 << level
    return b"".join(pixels[(y * step * samples + x * step) * bands:][:bands]
                    for y in range(lines >> level) for x in range(samples >> level))


class Pyramids(PipeTest, FolderTest):
    def setUp(self):
        super().setUp()
        self.pixels = random.Random(5).randbytes(SAMPLES * LINES * BANDS)
        self.file = write_orva(self.folder / "scene", SAMPLES, LINES, BANDS, self.pixels)
        self.pyramid = self.folder / "scene.pyr"

    def level(self, level, *options):
        self.fine("read", self.file, "--level", level, "-o", self.folder / "out.npy", "--overwrite", *options)
        return read_npy(self.folder / "out.npy")

    def test_a_raster_that_is_open_without_its_pyramid_says_so(self):
        self.fine("pyramid", "build", self.file)
        pyramid = f'PyramidConnStr="Pyramid|{self.pyramid}"'
        for first, second, notes in (("", pyramid, 1), (pyramid, pyramid, 0), (pyramid, "", 0)):
            job = self.folder / "job.xml"
            job.write_text(
                f'<Job><Command Name="a" ID="OpenRasterCommand"><Input ConnStr="{self.file}" {first}/></Command>'
                f'<Command Name="b" ID="OpenRasterCommand"><DependsOn Name="a"/><Input ConnStr="{self.file}" {second}/>'
                "</Command></Job>")
            self.assertEqual(self.fine("run", "-q", job).count("Note="), notes, (first, second))

    def build(self, *options):
        """Levels of picked pixels."""
        self.fine("pyramid", "build", self.file, "--resampling", "nearest", *options)

    def files(self):
        return sorted(path.name for path in self.folder.iterdir())

    def test_levels_are_built_read_and_deleted(self):
        self.serve("test", "--root", str(self.folder))
        for server in ([], ["--server", "test"]):
            with self.subTest(server):
                self.build("--levels", "1-3", *server)
                self.assertEqual(self.files(), ["scene", "scene.hdr", "scene.pyr"])
                for level in (1, 2, 3):
                    shape = (LINES >> level, SAMPLES >> level, BANDS)
                    self.assertEqual(self.level(level, *server), ("|u1", shape, every(self.pixels, level)))
                info = json.loads(self.fine("pyramid", "info", self.file, "--json", *server))
                self.assertEqual((info["type"], info["method"], info["pyramid"]), ("ORVA", "Nearest", str(self.pyramid)))
                self.assertEqual(info["levels"], [{"level": level, "samples": SAMPLES >> level, "lines": LINES >> level}
                                                  for level in (1, 2, 3)])
                self.assertEqual(json.loads(self.fine("info", self.file, "--json"))["pyramidLevels"], [1, 3])
                (self.folder / "out.npy").unlink()
                self.fails(1, "no pixels at level 4", "read", self.file, "--level", "4", "-o", self.folder / "out.npy")
                self.fine("pyramid", "delete", self.file, *server)
                self.assertEqual(self.files(), ["scene", "scene.hdr"])
                self.fails(1, "there is no pyramid", "pyramid", "info", self.file)

    def test_statistics_come_with_it(self):
        before = self.fine("stats", self.file, "--json")
        self.fine("pyramid", "build", self.file)
        time = self.file.stat().st_mtime_ns
        self.file.write_bytes(bytes(len(self.pixels)))
        os.utime(self.file, ns=(time, time))  # unnoticed: what is told now is out of the pyramid
        after = json.loads(self.fine("stats", self.file, "--json"))
        for want, got in zip(json.loads(before)["bands"], after["bands"]):
            for name in ("count", "min", "max", "sum", "sum2"):
                self.assertEqual(got[name], want[name])

    def test_a_picture_is_made_from_the_smallest_level_that_is_large_enough(self):
        """Of means of means, of picks of picks, and of means of 64 picks at least."""
        none = ((301, None), (200, None))
        fit = ((150, 1), (76, 1), (75, 2), (30, 3))
        for built, shown, levels in (
                ("average", "average", none + fit), ("nearest", "nearest", none + fit), ("mode", "nearest", none + fit),
                ("average", "nearest", none + tuple((size, None) for size, _ in fit)),
                ("nearest", "average", none + ((150, None), (19, None), (18, 1), (9, 2), (5, 2), (4, 3)))):
            self.fine("pyramid", "build", self.file, "--levels", "1-3", "--tile", "16", "--resampling", built)
            for size, level in levels:
                job = self.fine("quicklook", self.file, self.folder / "out.png", "--size", size, "--resampling", shown,
                                "--print-job")
                self.assertEqual('Input Level="' in job, level is not None, (built, shown, size))
                if level is not None:
                    self.assertIn(f'Input Level="{level}"', job, (built, shown, size))
        self.build("--levels", "1-3", "--tile", "16")
        self.fine("quicklook", self.file, self.folder / "out.png", "--size", 75, "--stretch", "none", "--resampling", "nearest")
        self.assertEqual(read_png(self.folder / "out.png"), (75, 50, 3, every(self.pixels, 2)))

    def test_levels_are_means_unless_pixels_are_codes(self):
        def mean(x, y, band):
            total = sum(self.pixels[((4 * y + v) * SAMPLES + 4 * x + u) * BANDS + band] for v in range(4) for u in range(4))
            return (total + 8) // 16

        self.fine("pyramid", "build", self.file, "--levels", "1-2")
        self.assertEqual(json.loads(self.fine("pyramid", "info", self.file, "--json"))["method"], "Average")
        want = bytes(mean(x, y, band) for y in range(LINES >> 2) for x in range(SAMPLES >> 2) for band in range(BANDS))
        self.assertEqual(self.level(2)[2], want)
        query = f'<Job><Command Name="a" ID="OpenRasterCommand"><Input ConnStr="{self.file}" PyramidConnStr="Pyramid|' \
                f'{self.pyramid}"/><Output URI="$a"/></Command><Command Name="b" ID="QueryRasterCommand"><DependsOn Name="a"/>' \
                '<Input URI="$a"/></Command></Job>'
        self.assertIn('PyramidResamplingMethod="Linear"', self.fine("run", "-q", "-", stdin=query))
        labels = write_orva(self.folder / "labels", 40, 30, 1, bytes(range(240)) * 20, data_type="Int32")
        self.fine("pyramid", "build", labels, "--levels", "1")
        self.assertEqual(json.loads(self.fine("pyramid", "info", labels, "--json"))["method"], "Nearest")
        self.fine("pyramid", "build", labels, "--levels", "1", "--resampling", "mode")
        self.assertEqual(json.loads(self.fine("pyramid", "info", labels, "--json"))["method"], "Mode")
        self.fails(2, "exclude", "pyramid", "build", labels, "--resampling", "mode", "--method", "Cubic", "--type", "DRIVER")

    @needs_gdal
    def test_a_driver_takes_means_as_well(self):
        tiff = self.folder / "scene.tif"
        self.fine("copy", self.file, tiff)
        for options, want in (([], "average"), (["--resampling", "nearest"], "nearest"), (["--method", "Cubic"], "cubic")):
            self.fine("pyramid", "build", tiff, "--type", "DRIVER", "--levels", "1", *options)
            code = subprocess.run(["gdaladdo", "-q", "-ro", "-r", want, "--config", "COMPRESS_OVERVIEW", "NONE",
                                   shutil.copy(tiff, self.folder / "peer.tif"), "2"], capture_output=True, check=True)
            self.assertEqual(code.returncode, 0)
            made, peer = (subprocess.run(["gdalinfo", "-checksum", f"{name}.ovr"], capture_output=True, text=True,
                                         check=True).stdout for name in (tiff, self.folder / "peer.tif"))
            self.assertEqual([line for line in made.splitlines() if "Checksum" in line],
                             [line for line in peer.splitlines() if "Checksum" in line], want)
            self.fine("pyramid", "delete", tiff)
            (self.folder / "peer.tif.ovr").unlink()

    def looks(self, file=None):
        """Whether the pyramid beside a raster is used, and what is said."""
        code, out, err = run("info", "--json", str(file or self.file))
        self.assertEqual(code, 0, err)
        return json.loads(out)["hasPyramid"], err

    def test_one_that_was_not_built_from_the_raster_as_it_is_is_left_out(self):
        other = self.folder / "other"
        write_orva(other, SAMPLES, LINES, BANDS, bytes(len(self.pixels)))
        os.utime(other, (1e9, 1e9))
        changes = {
            "an older file of the same size": lambda: shutil.copy2(other, self.file),
            "an older file under the name": lambda: (shutil.copy(other, self.folder / "new"),
                                                     os.utime(self.folder / "new", (9e8, 9e8)),
                                                     os.replace(self.folder / "new", self.file)),
            "a nanosecond": lambda: os.utime(self.file, ns=(self.file.stat().st_mtime_ns - 1,) * 2),
            "a byte": lambda: self.file.write_bytes(self.pixels + b"x"),
        }
        for name, change in changes.items():
            with self.subTest(name):
                self.fine("pyramid", "build", self.file)
                self.assertEqual(self.looks(), (True, ""))
                change()
                used, err = self.looks()
                self.assertFalse(used)
                self.assertEqual(err, f"vexg: warning: {self.pyramid} was built from another state of the raster "
                                      "and is not used; vexg pyramid build makes it anew\n")
                # Who names it gets it, or is refused.
                job = f'<Job><Command Name="a" ID="OpenRasterCommand"><Input ConnStr="{self.file}" ' \
                      f'PyramidConnStr="Pyramid|{self.pyramid}"/></Command></Job>'
                self.assertIn('Result="Success"', self.fine("run", "-q", "-", stdin=job))

    def test_one_that_moves_with_its_raster_stays_its_pyramid(self):
        self.fine("pyramid", "build", self.file)
        away = self.folder / "away"
        away.mkdir()
        for name in self.files():
            if name != "away":
                shutil.copy2(self.folder / name, away / name)
        self.assertEqual(self.looks(away / "scene"), (True, ""))
        self.fine("stats", self.file, "--save")  # the header changes, not the pixels
        self.assertEqual(self.looks(), (True, ""))

    def test_one_that_can_not_be_read_is_left_out_unless_it_is_named(self):
        self.fine("pyramid", "build", self.file)
        whole = self.pyramid.read_bytes()
        for content, why in ((b"VEXGPYRAMID01\n".ljust(9000, b"\0"), "the header is damaged"),
                             (whole[:5000], "the file is cut off"), (b"Dear all", "isn't a whole pyramid")):
            self.pyramid.write_bytes(content)
            used, err = self.looks()
            self.assertFalse(used)
            self.assertEqual(err, f"vexg: warning: {self.pyramid}: {why}; it is not used\n")
            self.fails(1, why, "pyramid", "info", self.file, "--output", self.pyramid)
        os.remove(self.pyramid)
        self.fine("pyramid", "build", self.file)
        write_orva(self.file, SAMPLES, LINES, BANDS - 1, self.pixels)
        used, err = self.looks()
        self.assertFalse(used)
        self.assertIn("scene.pyr is of a raster of another size and is not used", err)

    def test_what_can_not_be_is_refused(self):
        for words, options in (("--levels", ["--levels", "3-1"]), ("--levels", ["--levels", "1-32"]),
                               ("--levels", ["--levels", "a"]), ("--method", ["--method", "Cubic"])):
            self.fails(2, words, "pyramid", "build", self.file, *options)
        letter = self.folder / "letter"
        letter.write_text("Dear all")
        self.fails(1, "no pyramid: it stays", "pyramid", "build", self.file, "--output", letter)
        self.assertEqual(letter.read_text(), "Dear all")
        self.fails(1, "No such file", "pyramid", "delete", self.file, "--output", self.folder / "none")
        self.pyramid.write_bytes(b"VEXGPYRAMID01\n".ljust(9000, b"\0"))
        self.build()  # makes it good again
        self.assertEqual(self.level(1)[2], every(self.pixels, 1))

    def test_the_printed_job_builds_it(self):
        job = self.fine("pyramid", "build", self.file, "--levels", "2", "--resampling", "nearest", "--print-job")
        self.assertEqual(self.files(), ["scene", "scene.hdr"])
        self.assertEqual(self.fine("run", "-", stdin=job).count('Result="Success"'), 3)
        self.assertEqual(self.level(2)[2], every(self.pixels, 2))

    @needs_gdal
    def test_a_driver_keeps_its_own(self):
        tiff = self.folder / "scene.tif"
        self.fine("copy", self.file, tiff)
        self.fine("pyramid", "build", tiff, "--type", "DRIVER", "--levels", "1-2")
        self.assertEqual(self.files(), ["scene", "scene.hdr", "scene.tif", "scene.tif.ovr"])
        info = json.loads(self.fine("pyramid", "info", tiff, "--json"))
        self.assertEqual((info["type"], [level["samples"] for level in info["levels"]]), ("DRIVER", [151, 76]))
        told = subprocess.run(["gdalinfo", tiff], check=True, capture_output=True, text=True).stdout
        self.assertIn("Overviews: 151x100, 76x50", told)
        self.fine("pyramid", "delete", tiff)
        self.assertEqual(self.files(), ["scene", "scene.hdr", "scene.tif"])


class CutShort(FolderTest):
    """Builds of a raster that takes its time."""

    def setUp(self):
        super().setUp()
        self.file = write_orva(self.folder / "large", 30000, 20000, 1)
        self.pyramid = self.folder / "large.pyr"

    def build_until_half(self, how):
        process = start("pyramid", "build", str(self.file), "--levels", "1-4", "--progress=json")
        for line in process.stderr:
            if json.loads(line)["progress"] >= 0.3:
                break
        process.send_signal(how)
        _, err = process.communicate(timeout=60)
        return process.returncode, err

    def test_a_killed_build_leaves_no_pyramid_and_an_old_one_as_it_was(self):
        self.build_until_half(signal.SIGKILL)
        self.assertFalse(self.pyramid.exists())
        (rest,) = self.folder.glob("large.pyr.*.tmp")
        self.fails(1, "isn't a whole pyramid", "info", "--input-format", "Pyramid", rest)
        self.fine("pyramid", "build", self.file, "--levels", "3-4")
        before = self.pyramid.read_bytes()
        self.build_until_half(signal.SIGKILL)
        self.assertEqual(self.pyramid.read_bytes(), before)
        self.assertEqual(json.loads(self.fine("pyramid", "info", self.file, "--json"))["levels"][0]["level"], 3)

    def test_an_interrupted_build_leaves_nothing(self):
        code, err = self.build_until_half(signal.SIGINT)
        self.assertEqual(code, 1)
        self.assertIn("interrupted", err)
        self.assertEqual(sorted(path.name for path in self.folder.iterdir()), ["large", "large.hdr"])


if __name__ == "__main__":
    unittest.main()
