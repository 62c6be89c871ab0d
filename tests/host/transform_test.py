"""Points through vexg transform."""

import math
import shutil
import subprocess
import unittest

from support import run


class Transform(unittest.TestCase):
    def test_gives_the_other_systems_coordinates(self):
        # The central meridian of a UTM zone, and 10 degrees of a sphere of 6378137 m.
        cases = [
            ("EPSG:4326", "EPSG:32618", "-75 0\n", [500000.0, 0.0]),
            ("EPSG:4326", "EPSG:3857", "10 0\n", [math.radians(10) * 6378137.0, 0.0]),
            ("+proj=utm +zone=18 +datum=WGS84", "EPSG:4326", "500000 0\n", [-75.0, 0.0]),
        ]
        for source, target, line, want in cases:
            code, out, err = run("transform", "--from", source, "--to", target, stdin=line)
            self.assertEqual((code, err), (0, ""), source)
            for value, expected in zip(map(float, out.split()), want, strict=True):
                self.assertAlmostEqual(value, expected, places=6)

    @unittest.skipUnless(shutil.which("cs2cs"), "no cs2cs")
    def test_agrees_with_cs2cs_across_datums(self):
        points = [(-5 + i % 50 * 0.1, 50 + i // 50 * 0.2) for i in range(1000)]
        lines = "".join(f"{x!r} {y!r}\n" for x, y in points)
        code, out, err = run("transform", "--from", "EPSG:4326", "--to", "EPSG:27700", stdin=lines)
        self.assertEqual((code, err), (0, ""))
        swapped = "".join(f"{y!r} {x!r}\n" for x, y in points)
        peer = subprocess.run(["cs2cs", "-f", "%.9f", "EPSG:4326", "EPSG:27700"], input=swapped,
                              capture_output=True, text=True, check=True).stdout
        ours = [list(map(float, line.split())) for line in out.splitlines()]
        theirs = [list(map(float, line.split()[:2])) for line in peer.splitlines()]
        self.assertEqual(len(ours), len(theirs))
        for a, b in zip(ours, theirs):
            self.assertLess(math.dist(a, b), 1e-4)

    def test_reads_lines_with_heights_blank_lines_and_points_out_of_reach(self):
        code, out, err = run("transform", "--from", "EPSG:4326", "--to", "EPSG:4326",
                             stdin="1.5 2.25 95.0\n\n  3\t-4  \nnan 5\n1 2")
        self.assertEqual((code, out, err), (0, "1.5 2.25 95.0\n3 -4\nnan nan\n1 2\n", ""))
        code, out, err = run("transform", "--from", "EPSG:4326", "--to", "EPSG:3857",
                             stdin="0 91 7\n")
        self.assertEqual((code, out, err), (0, "nan nan 7\n", ""))
        self.assertEqual(run("transform", "--from", "EPSG:4326", "--to", "EPSG:3857"), (0, "", ""))

    def test_bad_input_is_one_line(self):
        cases = [
            (("--from", "EPSG:4326"), "", "--to is required"),
            (("--from", "nowhere", "--to", "EPSG:4326"), "", '--from: "nowhere" is no coordinate'),
            (("--from", "EPSG:4326", "--to", "EPSG:4326"), "1 2\n1 x\n", "line 2 of the input"),
            (("--from", "EPSG:4326", "--to", "EPSG:4326"), "1\n", "line 1 of the input"),
            (("--from", "EPSG:4326", "--to", "EPSG:4326"), "1 2 3 4\n", "line 1 of the input"),
        ]
        for arguments, stdin, message in cases:
            code, out, err = run("transform", *arguments, stdin=stdin)
            self.assertEqual(code, 2, arguments)
            self.assertIn(message, err)
            self.assertEqual(err.count("\n"), 1, err)
            self.assertEqual(out, "1 2\n" if stdin.startswith("1 2\n") else "")


if __name__ == "__main__":
    unittest.main()
