"""The package as others get it: the stubs, the symbols of the C interface, and the wheel."""

import importlib.util
import os
import pathlib
import shutil
import subprocess
import sys
import unittest

from support import BUILD, SCENE, SOURCE, VEXG, FolderTest, needs, needs_data


class DeclarationsTest(unittest.TestCase):
    def test_stubs_are_those_of_the_commands(self):
        told = subprocess.run([VEXG, "commands", "--json"], check=True, capture_output=True).stdout
        made = subprocess.run([sys.executable, SOURCE / "scripts" / "python_stubs"], input=told, check=True,
                              capture_output=True).stdout.decode()
        self.assertEqual(made, (SOURCE / "python" / "vexg" / "commands.pyi").read_text(),
                         "vexg commands --json | scripts/python_stubs > python/vexg/commands.pyi")

    def test_symbols_of_the_c_interface(self):
        """The library exports the functions that src/c/vexg.symbols lists, and no others with C names."""
        if os.environ.get("VEXG_SANITIZE"):
            self.skipTest("a sanitizer exports more")
        listed = subprocess.run(["nm", "-D", "--defined-only", BUILD / "lib" / "libvexg.so"], check=True,
                                capture_output=True, text=True).stdout
        names = {line.split()[-1] for line in listed.splitlines()}
        lines = (SOURCE / "src" / "c" / "vexg.symbols").read_text().splitlines()
        wanted = {line for line in lines if line and not line.startswith("#")}
        self.assertEqual({name for name in names if not name.startswith("_")}, wanted)
        header = (SOURCE / "src" / "c" / "vexg.h").read_text()
        for name in wanted:
            self.assertIn(f" {name}(", header.replace("*", " "))


@unittest.skipUnless(shutil.which("abidiff") and shutil.which("cc"), "abigail-tools is not installed")
class InterfaceTest(FolderTest):
    def test_the_c_interface_is_that_of_programs_that_are_there(self):
        header = (SOURCE / "src" / "c" / "vexg.h").read_text()
        free = "VEXG_C_EXPORT void vexg_free(char* text);"
        cases = (("as it is", free, free, 0), ("function added", free, free + "\nVEXG_C_EXPORT int vexg_new(int a);", 0),
                 ("function gone", free, "", 1), ("argument", "int threads,", "long threads,", 1),
                 ("result", "int vexg_close(", "char* vexg_close(", 1), ("member", "uint64_t size;", "uint32_t size;", 1),
                 ("order of members", "left, top, right", "top, left, right", 1),
                 ("constant", "VEXG_BSQ = 2", "VEXG_BSQ = 3", 1), ("number", "#define VEXG_ABI 1", "#define VEXG_ABI 2", 1))
        for name, old, new, status in cases:
            with self.subTest(name):
                self.assertIn(old, header)
                file = self.folder / "vexg.h"
                file.write_text(header.replace(old, new))
                done = subprocess.run([sys.executable, SOURCE / "scripts" / "abi", "--header", file], text=True,
                                      stdout=subprocess.PIPE, stderr=subprocess.STDOUT)
                self.assertEqual(done.returncode, status, done.stdout)
                self.assertEqual("differs from vexg.abixml" in done.stdout, status == 1)


@needs_data
@needs("build", "wheel", "setuptools", "venv", "pip")
@unittest.skipIf(os.environ.get("VEXG_SANITIZE"), "a sanitizer would have to be in Python too")
class WheelTest(FolderTest):
    def test_a_wheel_installs_and_passes_its_tests(self):
        tree = self.folder / "tree"
        left_out = shutil.ignore_patterns("build", "*.egg-info", "__pycache__")
        shutil.copytree(SOURCE / "python", tree / "python", ignore=left_out)
        shutil.copy(SOURCE / "CMakeLists.txt", tree)
        environment = {name: value for name, value in os.environ.items() if name not in ("PYTHONPATH", "VEXG_LIBRARY")}
        environment["PIP_DISABLE_PIP_VERSION_CHECK"] = "1"

        def run(*command, **options):
            done = subprocess.run(list(map(str, command)), env=environment, cwd=self.folder, capture_output=True,
                                  text=True, **options)
            self.assertEqual(done.returncode, 0, done.stdout + done.stderr)
            return done.stdout

        # Nothing of the tree is looked at any more once the wheel is there.
        run(sys.executable, "-m", "build", "--no-isolation", "--wheel", "--outdir", self.folder, tree / "python")
        (wheel,) = self.folder.glob("vexg-*.whl")
        self.assertRegex(wheel.name, r"^vexg-[0-9.]+-py3-none-\w+\.whl$")
        shutil.rmtree(tree)
        run(sys.executable, "-m", "venv", "--system-site-packages", self.folder / "venv")
        python = self.folder / "venv" / "bin" / "python"
        run(python, "-m", "pip", "install", "--no-index", "--no-build-isolation", wheel)
        environment["VEXG_INSTALLED"] = "1"
        tests = pathlib.Path(__file__).parent
        run(python, tests / "work_test.py")
        where = run(python, "-c", f"import vexg; vexg.open(r'{SCENE}'); print(vexg.__file__)")
        self.assertTrue(where.startswith(str(self.folder)))
        if importlib.util.find_spec("xarray") is not None:  # it finds the engine by its entry point
            run(python, "-c", f"import xarray; xarray.open_dataset(r'{SCENE}', engine='vexg').band_data[0, :5].values")


if __name__ == "__main__":
    unittest.main()
