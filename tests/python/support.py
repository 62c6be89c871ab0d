"""What the tests of the Python package have in common."""

import os
import pathlib
import sys
import tempfile
import unittest

try:
    import numpy  # noqa: F401
except ImportError:
    # The system's Python has numpy where the one that was called has not.
    if sys.executable != "/usr/bin/python3" and os.path.exists("/usr/bin/python3"):
        os.execv("/usr/bin/python3", ["/usr/bin/python3", *sys.argv])
    raise

SOURCE = pathlib.Path(os.environ["VEXG_SOURCE"])
BUILD = pathlib.Path(os.environ["VEXG_BUILD"])
DATA = pathlib.Path(os.environ.get("VEXG_DATA", SOURCE / "../shared/data")).resolve()
VEXG = BUILD / "bin" / "vexg"

if not os.environ.get("VEXG_INSTALLED"):
    sys.path.insert(0, str(SOURCE / "python"))
    os.environ["PYTHONPATH"] = str(SOURCE / "python")  # for processes that a test starts
    os.environ.setdefault("VEXG_LIBRARY", str(BUILD / "lib" / "libvexg.so"))

needs_data = unittest.skipUnless((DATA / "README.md").exists(), "no sample data")
SCENE = DATA / "landsat7_olinda.tif"


def needs(*modules):
    """Leaves a test out where a module isn't installed, and says so."""
    import importlib.util

    missing = [name for name in modules if importlib.util.find_spec(name) is None]
    return unittest.skipIf(missing, f"python3-{', python3-'.join(missing)} is not installed")


class FolderTest(unittest.TestCase):
    """A test with a folder of its own for outputs."""

    def setUp(self):
        super().setUp()
        made = tempfile.TemporaryDirectory()
        self.addCleanup(made.cleanup)
        self.folder = pathlib.Path(made.name)

    def left(self):
        """The names of all that lies in the folder."""
        return sorted(path.name for path in self.folder.iterdir())
