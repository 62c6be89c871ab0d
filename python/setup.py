"""Puts the library, its plug-ins and data into the package: one wheel for all versions of Python.

$VEXG_BUILD names the folder of the build, which is build/release of the tree by default. With
VEXG_WHEEL=pure nothing of a build is put in, for systems on which the library is installed.
"""

import os
import pathlib
import re
import shutil
import subprocess
import tempfile

from setuptools import setup
from setuptools.command.build_py import build_py
from setuptools.dist import Distribution
from wheel.bdist_wheel import bdist_wheel

TREE = pathlib.Path(__file__).resolve().parent.parent
BUILD = pathlib.Path(os.environ.get("VEXG_BUILD", TREE / "build" / "release"))
PURE = os.environ.get("VEXG_WHEEL") == "pure"


def version():
    """The version of the library."""
    return re.search(r"project\(vexg VERSION (\S+)", (TREE / "CMakeLists.txt").read_text())[1]


def copy_native(place):
    """Installs the build, and copies what the package needs of it."""
    with tempfile.TemporaryDirectory() as prefix:
        subprocess.run(["cmake", "--install", BUILD, "--prefix", prefix, "--strip"], check=True,
                       stdout=subprocess.DEVNULL)
        installed = pathlib.Path(prefix)
        (library,) = [path for path in installed.glob("**/libvexg.so.*") if not path.is_symlink()]
        short = ".".join(library.name.split(".")[:4])  # libvexg.so.0.1, which plug-ins ask for
        shutil.rmtree(place, ignore_errors=True)
        (place / "lib").mkdir(parents=True)
        (place / "bin").mkdir()
        shutil.copy2(library, place / "lib" / short)
        shutil.copytree(library.parent / "vexg", place / "lib" / "vexg")
        shutil.copytree(installed / "share" / "vexg", place / "share" / "vexg")
        shutil.copy2(installed / "bin" / "vexg", place / "bin" / "vexg")


class BuildWithLibrary(build_py):
    """Copies the library beside the sources of the package."""

    def run(self):
        super().run()
        if not PURE:
            copy_native(pathlib.Path(self.build_lib) / "vexg" / "native")


class PlatformWheel(bdist_wheel):
    """Names a wheel with libraries after the platform, and none after a version of Python."""

    def finalize_options(self):
        super().finalize_options()
        self.root_is_pure = PURE

    def get_tag(self):
        return "py3", "none", "any" if PURE else super().get_tag()[2]


class PlatformDistribution(Distribution):
    """Tells that there are libraries in the package."""

    def has_ext_modules(self):
        return not PURE


setup(version=version(), distclass=PlatformDistribution,
      cmdclass={"build_py": BuildWithLibrary, "bdist_wheel": PlatformWheel})
