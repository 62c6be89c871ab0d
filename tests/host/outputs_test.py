"""Files that verbs make: whole or not at all, whatever stands in their way, ends them or fails."""

import hashlib
import json
import os
import pathlib
import random
import re
import shutil
import signal
import struct
import subprocess
import sys
import time
import unittest

from support import (BUILD, SANITIZED, SOURCE, VEXG, FolderTest, PipeTest, gdal_pixels, needs_gdal, run, start,
                     write_orva)

SIDES = [".hdr", ".aux.xml", ".ovr", ".msk"]
GAINS = ["--gain", "1", "--offset", "0"]
SUPERVISOR = BUILD / "bin" / "vexg_fault_supervisor"
needs_faults = unittest.skipUnless(SUPERVISOR.exists(), "no supervisor of system calls")


class OutputTest(FolderTest):
    def setUp(self):
        super().setUp()
        self.inputs = self.folder / "in"
        self.output = self.folder / "out"
        self.inputs.mkdir(), self.output.mkdir()

    def scene(self, samples=40, lines=30):
        """A scene with a place on the earth."""
        place = "georeference = Std -9999 0 0 0 0 0.1 0.1 10 50 0 0 {} {} 0 EPSG:4326|\n".format(samples, lines)
        pixels = random.Random(18).randbytes(samples * lines * 3)
        return write_orva(self.inputs / "scene", samples, lines, 3, pixels, more=place)

    def verbs(self, scene):
        """Every verb that makes files: its arguments but for the outputs, and their names."""
        yield "copy", [], ["o.tif"]
        yield "copy", [], ["o.dat"]
        yield "warp", ["--to", "EPSG:3857"], ["o.tif"]
        yield "calibrate", GAINS, ["o.tif"]
        yield "quicklook", [], ["o.png"]
        yield "read", [], ["o.npy"]
        yield "read", [], ["o.npy", "m.npy"]
        yield "hist", [], ["o.png"]

    @staticmethod
    def line(verb, scene, options, outputs, *more):
        first, *second = outputs
        front = ["radiance"] if verb == "calibrate" else []
        named = ["-o", first] if verb in ("read", "hist") else [first]
        masks = ["--mask", second[0]] if second else []
        return [str(word) for word in [verb, *front, scene, *named, *masks, *options, *more]]

    def state(self):
        return {str(path.relative_to(self.folder)): hashlib.sha256(path.read_bytes()).hexdigest()
                for path in sorted(self.folder.rglob("*")) if path.is_file()}

    def clear(self):
        shutil.rmtree(self.output)
        self.output.mkdir()

    def made(self):
        return sorted(path.name for path in self.output.iterdir())


@needs_gdal
class OpenAtTheEnd(FolderTest):
    """What a job has made and not closed is finished with it, or given up where it failed."""

    def test_a_job_that_closes_nothing(self):
        write_orva(self.folder / "in.dat", 4, 3, 1, bytes(range(12)))
        job = self.fine("copy", self.folder / "in.dat", self.folder / "out.tif", "--print-job")
        job = re.sub(r'<Command ID="CloseRasterCommand".*?</Command>', "", job, flags=re.DOTALL)
        self.assertEqual(run("run", "-", stdin=job.replace("CopyRasterCommand", "CopyNothing"))[0], 1)
        self.assertEqual({p.name for p in self.folder.iterdir()}, {"in.dat", "in.dat.hdr"})
        self.assertEqual(run("run", "-", stdin=job)[0], 0)
        self.assertEqual(gdal_pixels(self.folder / "out.tif"), bytes(range(12)))


class Places(OutputTest):
    def test_nothing_is_replaced_unasked(self):
        scene = self.scene()
        for verb, options, names in self.verbs(scene):
            outputs = [self.output / name for name in names]
            for taken in [output.with_name(output.name + side) for output in outputs for side in ["", *SIDES]]:
                with self.subTest(verb=verb, taken=taken.name):
                    taken.write_text("precious")
                    before = self.state()
                    self.fails(2, "is there already", *self.line(verb, scene, options, outputs))
                    self.assertEqual(self.state(), before)
                    taken.unlink()

    def test_overwriting_replaces_all_of_an_output(self):
        scene = self.scene()
        for verb, options, names in self.verbs(scene):
            with self.subTest(verb=verb, names=names):
                outputs = [self.output / name for name in names]
                self.fine(*self.line(verb, scene, options, outputs))
                fresh = self.state()
                for output in outputs:
                    for side in ["", *SIDES]:
                        output.with_name(output.name + side).write_text("of an older file")
                bystander = self.output / "o.txt"
                bystander.write_text("of nobody's concern")
                self.fine(*self.line(verb, scene, options, outputs, "--overwrite"))
                bystander.unlink()
                self.assertEqual(self.state(), fresh)
                for path in self.output.iterdir():
                    path.unlink()

    def test_a_name_that_appeared_meanwhile_stays(self):
        scene = write_orva(self.inputs / "long", 3000, 2000, 3)
        for names in (["o.npy"], ["o.npy", "m.npy"]):
            with self.subTest(names=names):
                outputs = [self.output / name for name in names]
                process = start(*self.line("read", scene, [], outputs))
                while not any(name.endswith(".part") for name in os.listdir(self.output)):
                    self.assertIsNone(process.poll())
                outputs[-1].write_text("somebody else's")
                out, err = process.communicate(timeout=60)
                self.assertEqual((process.returncode, out), (2, ""))
                self.assertIn("give --overwrite to replace it", err)
                self.assertEqual(self.made(), [outputs[-1].name])
                self.assertEqual(outputs[-1].read_text(), "somebody else's")
                outputs[-1].unlink()

    def test_an_input_is_no_output_by_any_road(self):
        scene = self.scene()
        elsewhere = self.folder / "elsewhere"
        (elsewhere / "deep").mkdir(parents=True)
        (self.inputs / "link").symlink_to(elsewhere / "deep")  # link/.. is elsewhere, not in
        side = self.inputs / "scene.aux.xml"
        side.write_text("<PAMDataset/>")
        inner = self.folder / "inner"
        inner.symlink_to(self.inputs)
        for source, name in ((scene, "o"), (scene.with_name("scene.hdr"), "h"), (side, "s")):
            os.link(source, self.output / f"{name}.png")
            os.link(source, self.output / f"{name}.npy")
            os.link(source, self.output / f"{name}.tif")
            os.link(source, self.output / f"{name}.dat")
        (self.output / "far.png").symlink_to(scene)
        (self.output / "t.png").write_text("old")
        os.link(side, self.output / "t.png.aux.xml")
        copies = [["copy", scene, target] for target in (
            f"{self.output}/../in/scene", inner / "scene", inner / "scene.hdr", inner / "link/../../in/scene",
            inner / "scene.aux.xml", inner / "scene.ovr", self.output / "o.dat", self.output / "h.tif",
            self.output / "s.dat", self.output / "far.png", self.output / "t.png")]
        lines = [line + ["--format", "ORVA"] if not str(line[2]).endswith((".dat", ".tif", ".png")) else line
                 for line in copies]
        for name in "ohs":
            lines += [self.line(verb, scene, options, [self.output / f"{name}{pathlib.Path(names[0]).suffix}"])
                      for verb, options, names in self.verbs(scene)]
        lines.append(["read", scene, "-o", self.output / "new.npy", "--mask", self.output / "o.npy"])
        # Other files that are read.
        grid = self.output / "grid.tif"
        self.fine("warp", scene, grid, "--to", "EPSG:3857")
        os.link(grid, self.output / "grid2.tif")
        lines.append(["warp", scene, self.output / "grid2.tif", "--to", grid])
        told = self.output / "told.tif"
        shutil.copy(grid, told)
        lines.append(["calibrate", "radiance", scene, self.folder / "out" / "told.tif", "--from-metadata", told, *GAINS])
        before = self.state()
        for line in lines:
            with self.subTest(line=line):
                self.fails(2, "file of the input", *line, "--overwrite")
                self.assertEqual(self.state(), before)
        # The same name by a road that leads elsewhere is another file.
        (elsewhere / "scene.tif").write_text("old")
        self.fine("copy", scene, self.inputs / "link/../scene.tif", "--overwrite")
        self.assertNotEqual((elsewhere / "scene.tif").read_text(errors="replace"), "old")

    def test_results_of_jobs_do_not_replace_them(self):
        job = self.output / "job.xml"
        job.write_text("<Job/>")
        os.link(job, self.output / "same.xml")
        for target in (job, self.output / "same.xml"):
            self.fails(2, "file of the input", "run", job, "-o", target)
            self.assertEqual(job.read_text(), "<Job/>")


@needs_faults
class Faults(OutputTest):
    """One system call after the other fails."""

    def verbs(self, scene):
        """Those that commit in different ways: with a header, alone, two together."""
        return [("copy", [], ["o.dat"]), ("quicklook", [], ["o.png"]), ("read", [], ["o.npy", "m.npy"])]

    def supervised(self, *line, fault=()):
        report = self.folder / "report.json"
        done = subprocess.run([SUPERVISOR, "--below", self.folder, *fault, "--seconds", "60", "--report", report,
                               "--", VEXG, *line], capture_output=True, text=True)
        if done.returncode == 77:
            self.skipTest(done.stderr.strip())
        result = json.loads(report.read_text())
        report.unlink()
        return result, done.stderr

    def test_moves_that_fail_or_are_cut_off_are_all_or_nothing(self):
        scene = self.scene()
        for verb, options, names in self.verbs(scene):
            outputs = [self.output / name for name in names]
            line = self.line(verb, scene, options, outputs, "--overwrite")
            self.clear()
            self.fine(*line)
            after = self.state()

            def make_old():
                self.clear()
                for output in outputs:
                    output.write_text("old")
                    output.with_name(output.name + ".aux.xml").write_text("old")

            make_old()
            before = self.state()
            calls = self.supervised(*line)[0]["calls"]["rename"]
            self.assertGreaterEqual(calls, 3 * len(outputs))
            for nth in range(1, calls + 1):
                for fault in ("EIO", "kill"):
                    with self.subTest(verb=verb, names=names, nth=nth, fault=fault):
                        make_old()
                        result, err = self.supervised(*line, fault=["--call", "rename", "--nth", str(nth),
                                                                    "--fault", fault])
                        if fault == "EIO":
                            self.assertEqual(result["exit"], 1, err)
                            self.assertEqual(self.state(), before)
                        elif self.state() != after:
                            self.assertEqual(result["end"], "signal")
                            self.fine(*line)  # takes away what was left
                            self.assertEqual(self.state(), after)

    def test_durable_files_are_synced_or_not_made(self):
        scene = self.scene()
        for verb, options, names in self.verbs(scene):
            outputs = [self.output / name for name in names]
            line = self.line(verb, scene, options, outputs, "--overwrite")
            self.clear()
            plain = self.supervised(*line)[0]["calls"].get("sync", 0)
            after = self.state()
            before = {name: what for name, what in after.items() if not name.startswith("out/")}
            calls = self.supervised(*line, "--durable")[0]["calls"]["sync"]
            self.assertEqual(self.state(), after)
            self.assertGreaterEqual(calls, plain + 2, (verb, plain))  # a file and its folder
            for nth in range(1, calls + 1):
                with self.subTest(verb=verb, names=names, nth=nth):
                    self.clear()
                    result, err = self.supervised(*line, "--durable", fault=["--call", "sync", "--nth", str(nth),
                                                                             "--fault", "EIO"])
                    self.assertEqual(result["exit"], 1, err)
                    self.assertEqual(self.state(), before)


class Room(OutputTest):
    def test_packed_pictures_are_not_refused_beforehand(self):
        free = shutil.disk_usage(self.folder).free
        lines = free // (1 << 20) + 1000
        scene = write_orva(self.inputs / "huge", 1 << 20, lines, 1)
        for name, verb in (("o.png", "copy"), ("o.tif", "copy")):
            # An interrupt ends what was let begin.
            process = start(*self.line(verb, scene, [], [self.output / name]))
            while process.poll() is None and not self.made():
                time.sleep(0.01)
            process.send_signal(signal.SIGINT)
            _, err = process.communicate(timeout=60)
            self.assertNotIn("the disk has", err)
            self.assertEqual(self.made(), [])


class Interrupts(PipeTest, OutputTest):
    """An interrupt at any moment: the end comes soon, and the last line tells the truth."""

    MOST_SECONDS = 5 if SANITIZED else 1.5  # of a machine that does much else; 0.2 of one that doesn't

    def cases(self):
        scene = write_orva(self.inputs / "scene", 2500, 2000, 3, random.Random(3).randbytes(15000000))
        self.header = (self.inputs / "scene.hdr").read_bytes()
        yield from ((self.line(verb, scene, options, [self.output / name for name in names]), names)
                    for verb, options, names in (
                        ("copy", [], ["o.dat"]), ("copy", [], ["o.png"]), ("copy", ["--rect", "0,0,1249,999", "-q"], ["o.jp2"]),
                        ("calibrate", GAINS, ["o.tif"]), ("quicklook", ["--size", "2500"], ["o.png"]),
                        ("quicklook", ["--size", "2500"], ["o.jpg"]), ("read", [], ["o.npy", "m.npy"]),
                        ("read", [], ["o.png"]), ("hist", [], ["o.png"])))
        yield ["pyramid", "build", str(scene), "--output", str(self.output / "o.pyr")], ["o.pyr"]
        yield ["stats", str(scene), "--extended"], []
        yield ["stats", str(scene), "--save"], ["scene.hdr"]

    def check_end(self, line, names, delay):
        for path in self.output.iterdir():
            path.unlink()
        header = self.inputs / "scene.hdr"
        header.write_bytes(self.header)
        process = start(*line)
        try:
            process.wait(delay)
        except subprocess.TimeoutExpired:
            pass
        asked = time.monotonic()
        process.send_signal(signal.SIGINT)
        _, err = process.communicate(timeout=60)
        took = time.monotonic() - asked
        written = self.made() + (["scene.hdr"] if header.read_bytes() != self.header else [])
        last = err.splitlines()[-1] if err else ""
        self.assertLess(took, self.MOST_SECONDS, last)
        if process.returncode == 0:
            self.assertTrue(set(names) <= set(written), (names, written))
        elif process.returncode == -signal.SIGINT:  # it had not begun
            self.assertEqual((written, last), ([], ""))
        elif written:
            self.assertEqual(process.returncode, 1)
            self.assertIn("written before", last)
        else:
            self.assertEqual((process.returncode, last), (1, "vexg: interrupted; nothing was written"))
        return process.returncode

    def test_ends_soon_and_tells_the_truth(self):
        seed = 18
        moments = random.Random(seed)
        shared = set(os.listdir("/dev/shm")) if os.path.isdir("/dev/shm") else set()
        for line, names in self.cases():
            self.clear()  # the one before may have come through
            began = time.monotonic()
            code, _, err = run(*line)
            whole = time.monotonic() - began
            self.assertEqual(code, 0, err)
            for _ in range(3):
                delay = moments.random() * whole
                with self.subTest(line=line[:3], delay=delay, seed=seed):
                    self.check_end(line, names, delay)
        if shared:
            left = {name for name in set(os.listdir("/dev/shm")) - shared if name.startswith("vexg-block")}
            self.assertEqual(left, set())

    def test_what_looks_at_no_flag_is_ended_too(self):
        """The packing of a picture by a library, here and in a server."""
        scene = write_orva(self.inputs / "scene", 4000, 3000, 3, random.Random(4).randbytes(36000000))
        self.serve()
        for where in ([], ["--server", "test"]):
            with self.subTest(where=where):
                process = start("copy", str(scene), str(self.output / "o.jp2"), *where, "--progress", "json")
                process.stderr.readline()  # it has begun
                time.sleep(1.5)  # most of its time goes into the packing
                asked = time.monotonic()
                process.send_signal(signal.SIGINT)
                _, err = process.communicate(timeout=60)
                self.assertLess(time.monotonic() - asked, self.MOST_SECONDS)
                self.assertEqual(process.returncode, 1, err)
                self.assertEqual(err.splitlines()[-1], "vexg: interrupted; nothing was written")
                self.assertIn('"ended":"aborted"', err.splitlines()[-2])
                self.assertEqual(self.made(), [])


if __name__ == "__main__":
    unittest.main()
