"""Segmentation that ends early: of the disk, by an interrupt or by a kill. Nothing passes for a whole output."""

import random
import resource
import signal
import subprocess
import time
import unittest

from support import FolderTest, start, write_orva

KINDS = {
    "cheapest first": ["--tree", "scene.tree"],
    "in rounds": ["--order", "local", "--tree", "scene.tree"],
    "small ones at the end": ["--order", "local", "--min-size", "30"],
    "tiles": ["--tiled", "--tile-memory", "20000"],
}


class SegmentEndsTest(FolderTest):
    def setUp(self):
        super().setUp()
        self.scene = write_orva(self.folder / "scene.dat", 300, 200, 2, random.Random(4).randbytes(120_000))
        self.bare = self.files()

    def files(self):
        """All files, those in hidden folders too."""
        return {str(path.relative_to(self.folder)): path.read_bytes() for path in self.folder.rglob("*") if path.is_file()}

    def begin(self, kind, limit=None):
        words = [self.folder / word if word.startswith("scene.") else word for word in KINDS[kind]]
        set_limit = (lambda: resource.setrlimit(resource.RLIMIT_FSIZE, (limit, limit))) if limit else None
        return start("segment", self.scene, self.folder / "labels.tif", "--merge-value", "900", *words, "-q",
                     stdout=subprocess.DEVNULL, preexec_fn=set_limit)

    def whole(self, kind):
        process = self.begin(kind)
        self.assertEqual((process.communicate()[1], process.returncode), ("", 0))
        made = self.files()
        for name in made.keys() - self.bare.keys():
            (self.folder / name).unlink()
        return made

    def test_a_full_disk_at_every_pass(self):
        for kind in KINDS:
            sizes = [len(data) for name, data in self.whole(kind).items() if name not in self.bare]
            # The work file has a byte a pixel; tree and labels are larger.
            for part in range(1, 8):
                limit = max(sizes) * part // 8
                with self.subTest(kind, limit=limit):
                    process = self.begin(kind, limit)
                    line = process.communicate()[1]
                    self.assertEqual(process.returncode, 1, line)
                    self.assertEqual((line[:6], line.count("\n")), ("vexg: ", 1))
                    self.assertEqual(self.files(), self.bare)

    def test_a_killed_run(self):
        for kind in KINDS:
            wanted = self.whole(kind)
            for number in range(6):
                with self.subTest(kind, number=number):
                    process = self.begin(kind)
                    time.sleep(0.03 + 0.04 * number)
                    process.send_signal(signal.SIGKILL if number % 2 else signal.SIGINT)
                    process.communicate()
                    left = self.files()
                    for name in wanted:
                        self.assertIn(left.get(name), (None, wanted[name]), name)
                    if process.returncode not in (0, -signal.SIGKILL):
                        self.assertEqual(left, self.bare)
                    for name in wanted.keys() - self.bare.keys():
                        (self.folder / name).unlink(missing_ok=True)
                    # The next run clears away what was left, and makes all.
                    self.assertEqual(self.whole(kind), wanted)


if __name__ == "__main__":
    unittest.main()
