"""What a run says, and leaves, where the system gives it less than it needs.

Each verb that writes meets a limit of its process, a full or read-only folder, or an input that may
not be read. It ends well, or in one line with the system's reason and the name that the user gave,
and nothing has changed. What the rights of the tests' user don't allow is skipped.
"""

import os
import pathlib
import resource
import signal
import subprocess
import unittest

from support import BUILD, DATA, SANITIZED, VEXG, FolderTest, needs_data, needs_gdal

NOBODY = 65534
ALLOCATIONS = BUILD / "lib" / "libvexg_failing_allocations.so"
GAINS = ["--gain", "0.77,0.79,0.61", "--offset", "-6.2,-6.4,-5"]

WRITING = {
    "copy": ["copy", "in.tif", "out.tif"],
    "copy to ORVA": ["copy", "in.tif", "out.dat", "--format", "ORVA"],
    "warp": ["warp", "in.tif", "out.tif", "--to", "EPSG:4326"],
    "calibrate": ["calibrate", "radiance", "in.tif", "out.tif", *GAINS],
    "quicklook": ["quicklook", "in.tif", "out.png"],
    "read": ["read", "in.tif", "--bands", "0", "-o", "out.npy"],
    "pyramid": ["pyramid", "build", "in.tif"],
}
READING = {
    "stats": ["stats", "in.tif", "--json"],
    "hist": ["hist", "in.tif"],
    "info": ["info", "in.tif", "--json"],
    "metadata": ["metadata", "in.IMD", "--json"],
}


@needs_data
@needs_gdal
class ShortageTest(FolderTest):
    def setUp(self):
        super().setUp()
        self.make_inputs(self.folder)

    def make_inputs(self, folder, size=200):
        subprocess.run(["gdal_translate", "-q", "-srcwin", "0", "0", str(size), str(size), "-b", "1",
                        "-b", "2", "-b", "3", DATA / "landsat7_olinda.tif", folder / "in.tif"], check=True)
        (folder / "in.IMD").write_bytes((DATA / "sidecars/wv03.IMD").read_bytes())

    def clear(self):
        for path in [*self.folder.glob("out.*"), *self.folder.glob("in.tif.*")]:
            path.unlink()

    def state(self, folder):
        return {str(path.relative_to(folder)): path.read_bytes()
                for path in folder.rglob("*") if path.is_file()}

    def end(self, command, limits=(), folder=None, environment=None, **options):
        def limit():
            for kind, most in limits:
                resource.setrlimit(kind, (most, most))

        return subprocess.run([VEXG, *command], cwd=folder or self.folder, preexec_fn=limit,
                              env=dict(os.environ, **(environment or {})), capture_output=True,
                              text=True, timeout=60, **options)

    def refused(self, words, command, **options):
        """The run fails in one line with the words, and leaves all as it was."""
        folder = options.get("folder") or self.folder
        before = self.state(folder)
        done = self.end(command, **options)
        self.assertIn(done.returncode, (1, 2), (command, done))
        self.assertRegex(done.stderr, r"\Avexg: [^\n]+\n\Z")
        self.assertIn(words, done.stderr.lower(), command)
        self.assertNotRegex(done.stderr, r"\.(tmp|part)\b")
        self.assertEqual(self.state(folder), before, (command, done.stderr))

    def test_a_file_may_not_grow_so_far(self):
        for name, command in WRITING.items():
            with self.subTest(name):
                self.refused("file too large", command, limits=[(resource.RLIMIT_FSIZE, 8192)])

    def test_too_many_files_are_open(self):
        # Without the verbs of which it is known that they fail here: warp, whose library of
        # projections gives no reason, and pyramid, which leaves one without statistics.
        commands = {**WRITING, **READING}
        for name, command in commands.items():
            if name in ("warp", "pyramid"):
                continue
            with self.subTest(name):
                kinds = set()
                for most in (4, 5, 6, 7, 9, 12, 20):
                    before = self.state(self.folder)
                    done = self.end(command, limits=[(resource.RLIMIT_NOFILE, most)])
                    kinds.add(done.returncode)
                    if done.returncode == 0:
                        break
                    self.assertEqual(self.state(self.folder), before, most)
                    if done.returncode != 127:  # the loader of the program found no descriptor
                        self.assertIn("too many open files", done.stderr.lower(), most)
                self.assertIn(0, kinds)
                self.clear()

    @unittest.skipIf(SANITIZED, "a sanitizer takes its address space at once")
    def test_there_is_little_memory(self):
        for name, command in {**WRITING, **READING}.items():
            for most in (90, 140, 240, 330):
                with self.subTest(name, most=most):
                    before = self.state(self.folder)
                    done = self.end(command, limits=[(resource.RLIMIT_AS, most << 20)])
                    if done.returncode == 0:
                        self.clear()
                        continue
                    self.assertIn(done.returncode, (1, 127), done)
                    if done.returncode == 1:
                        self.assertEqual(done.stderr, "vexg: out of memory\n")
                    self.assertEqual(self.state(self.folder), before)

    @unittest.skipUnless(ALLOCATIONS.exists() and not SANITIZED, "no library of failing allocations")
    def test_one_allocation_fails(self):
        """A few of the many that scripts/faults lets fail."""
        for name, command in {**WRITING, **READING}.items():
            def run(nth):
                return self.end(command, environment={
                    "LD_PRELOAD": str(ALLOCATIONS), "VEXG_ALLOCATIONS_ABOVE": "1024",
                    "VEXG_ALLOCATION_FAILS": str(nth), "VEXG_ALLOCATION_COUNT": str(count)})

            count = self.folder.parent / (self.folder.name + ".count")
            self.addCleanup(count.unlink, missing_ok=True)
            before = self.state(self.folder)
            run(0)
            allocations = int(count.read_text())
            self.clear()
            ends = []
            for nth in (1, *(allocations * sixth // 6 for sixth in (1, 2, 3, 4, 5))):
                with self.subTest(name, nth=nth):
                    done = run(nth)
                    ends.append(done.returncode)
                    self.clear()
                    if done.returncode != 0:
                        self.assertEqual(done.returncode, 1)
                        self.assertRegex(done.stderr, r"(\A|\n)vexg: out of memory\n\Z")
                    self.assertEqual(self.state(self.folder), before)
            # The first comes before the program begins, and the last ones behind its work; a few can be done without.
            self.assertGreater(ends.count(1), len(ends) // 2, name)

    def as_nobody(self):
        if os.geteuid() != 0:
            return {}
        self.folder.chmod(0o755)
        can_run = subprocess.run([VEXG, "--version"], user=NOBODY, capture_output=True).returncode == 0
        if not can_run:
            self.skipTest("another user can't run the program")
        return {"user": NOBODY, "group": NOBODY}

    def test_the_folder_is_read_only(self):
        who = self.as_nobody()
        self.folder.chmod(0o555)
        self.addCleanup(self.folder.chmod, 0o755)
        for name, command in WRITING.items():
            with self.subTest(name):
                self.refused("permission denied", command, **who)

    def test_the_input_may_not_be_read(self):
        who = self.as_nobody()
        (self.folder / "in.tif").chmod(0)
        (self.folder / "in.IMD").chmod(0)
        for name, command in {**WRITING, **READING}.items():
            with self.subTest(name):
                done = self.end(command, **who)
                self.assertEqual(done.returncode, 1, done)
                self.assertRegex(done.stderr, r"\Avexg: [^\n]*in\.(tif|IMD): Permission denied\n\Z")

    @unittest.skipUnless(os.geteuid() == 0, "only root mounts")
    def test_the_disk_is_full(self):
        small = self.folder / "small"
        small.mkdir()
        mounted = subprocess.run(["mount", "-t", "tmpfs", "-o", "size=256k", "none", small], capture_output=True)
        if mounted.returncode != 0:
            self.skipTest("no mount is allowed here")
        self.addCleanup(subprocess.run, ["umount", "-l", small])
        self.make_inputs(small)
        room = os.statvfs(small).f_bavail * os.statvfs(small).f_frsize
        (small / "filler").write_bytes(bytes(room - 4096))
        for name, command in WRITING.items():
            with self.subTest(name):
                before = self.state(small)
                done = self.end(command, folder=small)
                self.assertEqual(done.returncode, 1, done)
                self.assertRegex(done.stderr, r"\Avexg: [^\n]*(No space left on device|the disk has \d+ free)\n\Z")
                self.assertEqual(self.state(small), before)

    def test_nobody_reads_the_output(self):
        """As programs do that write into `head`: the end is that of the signal, without a word."""
        for command in (["stats", "in.tif", "--json"], ["commands"], ["read", "in.tif", "--bands", "0"]):
            with self.subTest(command=command):
                reader, writer = os.pipe()
                os.close(reader)
                try:
                    done = subprocess.run([VEXG, *command], cwd=self.folder, stdout=writer,
                                          stderr=subprocess.PIPE, text=True, timeout=60)
                finally:
                    os.close(writer)
                self.assertEqual((done.returncode, done.stderr), (-signal.SIGPIPE, ""))


if __name__ == "__main__":
    unittest.main()
