"""vexg.dask: a plan on workers of Dask has the bytes of the single run, whatever is killed."""

import json
import os
import pathlib
import random
import signal
import subprocess
import sys
import time
import unittest

from support import DATA, SCENE, VEXG, FolderTest, needs, needs_data

FLOATS = DATA / "landsat7_f32_strip.tif"
JOBS = {
    "calc": ("calc", "@", "(b3-b2)/(b3+b2)", SCENE),
    "warp": ("warp", FLOATS, "@", "--to", "EPSG:4326", "--resampling", "cubic"),
}


def descendants(process):
    """The processes that a process has started, and those that these have."""
    found, parents = [], {}
    for entry in pathlib.Path("/proc").iterdir():
        try:
            fields = (entry / "stat").read_text().rsplit(")", 1)[1].split() if entry.name.isdigit() else None
        except OSError:
            continue
        if fields and fields[0] != "Z":
            parents.setdefault(int(fields[1]), []).append(int(entry.name))
    left = [process]
    while left:
        children = parents.get(left.pop(), [])
        found += children
        left += children
    return found


def command_of(process):
    try:
        return pathlib.Path(f"/proc/{process}/cmdline").read_bytes()
    except OSError:
        return b""


@needs("distributed")
@needs_data
class Dask(FolderTest):
    def vexg(self, *arguments):
        ended = subprocess.run([VEXG, *map(str, arguments)], capture_output=True, text=True, check=False)
        self.assertEqual(ended.returncode, 0, ended.stderr)

    def plan(self, name):
        place = self.folder / name
        self.vexg("plan", "-q", "-o", place, "--parts", 4,
                  *(place / "o.tif" if word == "@" else word for word in JOBS[name]))
        return place

    def start(self, place):
        return subprocess.Popen([sys.executable, "-m", "vexg.dask", place, "--workers", "2", "--vexg", VEXG],
                                stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)

    def end(self, process):
        out, err = process.communicate(timeout=100)
        return process.returncode, out, err

    def test_results_are_those_of_the_single_run_whatever_was_killed(self):
        seed = random.randrange(1 << 30)
        draw = random.Random(seed)
        for name in JOBS:
            with self.subTest(name, seed=seed):
                place = self.plan(name)
                process = self.start(place)
                # Programs at work, and once a worker.
                for victims in (b"run\0--once", b"run\0--once", b"spawn_main", b"run\0--once"):
                    # A worker that dies before the cluster is there ends that; so programs are awaited first.
                    until = time.monotonic() + 60
                    found = []
                    while not found and process.poll() is None and time.monotonic() < until:
                        found = [each for each in descendants(process.pid) if victims in command_of(each)]
                        time.sleep(draw.uniform(0, 0.02))
                    if found:
                        try:
                            os.kill(draw.choice(found), signal.SIGKILL)
                        except ProcessLookupError:
                            pass  # it has ended by itself
                code, _, err = self.end(process)
                self.assertEqual(code, 0, err)
                single = self.folder / f"{name}.tif"
                self.vexg(*(single if word == "@" else word for word in JOBS[name]), "-q")
                self.assertEqual((place / "o.tif").read_bytes(), single.read_bytes())

    def test_a_second_run_does_nothing_and_faults_are_lines(self):
        place = self.plan("calc")
        self.assertEqual(self.end(self.start(place)), (0, "", ""))
        made = {path: path.stat().st_mtime_ns for path in place.glob("*.tif")}
        self.assertEqual(self.end(self.start(place)), (0, "", ""))
        self.assertEqual({path: path.stat().st_mtime_ns for path in place.glob("*.tif")}, made)
        document = place / json.loads((place / "manifest.json").read_text())["documents"][1]["document"]
        document.write_text(document.read_text().replace("0 ", "1 "))
        code, out, err = self.end(self.start(place))
        self.assertEqual((code, out), (1, ""))
        self.assertRegex(err, r"\Avexg: part-0001.xml: is not as it was planned[^\n]*\n"
                              r"merge.xml: left out, as what comes first failed\n\Z")


if __name__ == "__main__":
    unittest.main()
