"""What the tests of the command line have in common."""

import os
import pathlib
import subprocess
import tempfile
import unittest

SOURCE = pathlib.Path(os.environ["VEXG_SOURCE"])
BUILD = pathlib.Path(os.environ["VEXG_BUILD"])
VEXG = BUILD / "bin" / "vexg"
EXAMPLES = BUILD / "lib" / "libvexg_example_commands.so"


def start(*arguments, **options):
    """Starts vexg with the library of example commands."""
    options.setdefault("stdout", subprocess.PIPE)
    options.setdefault("stderr", subprocess.PIPE)
    return subprocess.Popen(
        [VEXG, "--load", EXAMPLES, *arguments], stdin=subprocess.PIPE, text=True, **options
    )


def run(*arguments, stdin=""):
    """Runs vexg to its end: exit code, standard output, standard error."""
    process = start(*arguments)
    out, err = process.communicate(stdin, timeout=60)
    return process.returncode, out, err


class PipeTest(unittest.TestCase):
    """A test with a directory of pipes of its own and, from serve() on, a server."""

    def setUp(self):
        self.runtime = tempfile.TemporaryDirectory()
        self.addCleanup(self.runtime.cleanup)
        os.environ["XDG_RUNTIME_DIR"] = self.runtime.name
        self.server = None

    def serve(self, name="test", **options):
        self.server = start("serve", name, **options)
        self.addCleanup(self.stop)
        self.server.stderr.readline()
        return self.server

    def stop(self):
        if self.server.poll() is None:
            self.server.terminate()
        self.server.communicate(timeout=60)

    def pipes(self):
        directory = pathlib.Path(self.runtime.name) / "vexg"
        return sorted(entry.name for entry in directory.iterdir()) if directory.exists() else []
