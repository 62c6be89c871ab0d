"""The version and the address of the maintainers are the same wherever a file has to hold them."""

import re
import unittest

from support import SOURCE, run


def found(file, pattern):
    return re.findall(pattern, (SOURCE / file).read_text(), re.M)


class VersionTest(unittest.TestCase):
    def test_version(self):
        (version,) = found("CMakeLists.txt", r"^project\(vexg VERSION ([0-9.]+)")
        minor = version.rsplit(".", 1)[0]
        self.assertEqual(run("--version")[1].strip(), f"vexg {version}")
        self.assertEqual(found("CITATION.cff", r"^version: (\S+)$"), [version])
        self.assertEqual(found("debian/changelog", r"^vexg \((.*)\)")[0], version)
        self.assertEqual(set(found("debian/control", r"\blibvexg[0-9.]+")), {f"libvexg{minor}"})
        self.assertTrue((SOURCE / "debian" / f"libvexg{minor}.install").exists())
        self.assertEqual(set(found("python/vexg/_library.py", r"libvexg\.so\.([0-9.]+)")), {minor})
        # Above all releases stands what is not released yet, and above that nothing.
        headings = found("CHANGELOG.md", r"^## \[(.*?)\]")
        self.assertEqual(headings[0], "Unreleased")
        self.assertEqual(found("CHANGELOG.md", r"^## (?!\[)"), [])

    def test_maintainers(self):
        addresses = {address for file in ("debian/control", "debian/changelog", "cmake/Package.cmake")
                     for address in found(file, r"[\w.]+@[\w.]+")}
        self.assertEqual(len(addresses), 1, addresses)


if __name__ == "__main__":
    unittest.main()
