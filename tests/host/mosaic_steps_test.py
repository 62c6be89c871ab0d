"""Footprints, tables and seams of a mosaic of real scenes, beside numpy's."""

import json
import os
import pathlib
import signal
import struct
import subprocess
import time
import unittest

from support import DATA, FolderTest, VEXG, gdal_pixels, needs_data, needs_gdal, use_system_python

try:
    import numpy as np
except ImportError:
    use_system_python()
    np = None

needs_numpy = unittest.skipIf(np is None, "no numpy")
SCENES = [DATA / f"mosaic_{name}.tif" for name in "abc"]

JOB = """<Job><Reasons/>
<Command Name="open" ID="OpenRasterCommand"><Input ConnStr="{mosaic}"/><Output URI="$m"/></Command>
<Command Name="stats" ID="MosaicStatsCommand"><Input MosaicURI="$m"/><Input Level="0"/><DependsOn Name="open"/></Command>
<Command Name="seams" ID="MosaicAutoSeamGenCommand"><Input MosaicURI="$m"/><DependsOn Name="stats"/></Command>
</Job>"""


def read_rings(file):
    """The rings of a footprint or seam file, each an array of vertices."""
    data = pathlib.Path(file).read_bytes()
    assert data[:8] == b"MOSAIC51"
    rings, at = [], 1024
    for _ in range(struct.unpack_from("<I", data, 13)[0]):
        count, coordinates = struct.unpack_from("<II", data, at + 1)
        at += 9 + count
        starts = [*struct.unpack_from(f"<{count}I", data, at), coordinates // 2]
        points = np.frombuffer(data, "<u4", coordinates, at + 4 * count).reshape(-1, 2).astype(float)
        at += 4 * count + 4 * coordinates
        rings += [points[a:b] for a, b in zip(starts, starts[1:])]
    assert at == len(data)
    return rings


def fill(rings, shape):
    """True for the pixels whose centre lies in an odd number of rings."""
    inside = np.zeros(shape, bool)
    for line in range(shape[0]):
        y, crossings = line + 0.5, []
        for ring in rings:
            p, q = ring[:-1], ring[1:]
            cut = (p[:, 1] <= y) != (q[:, 1] <= y)
            crossings += list(p[cut, 0] + (y - p[cut, 1]) / (q[cut, 1] - p[cut, 1]) * (q[cut, 0] - p[cut, 0]))
        crossings.sort()
        for a, b in zip(crossings[::2], crossings[1::2]):
            inside[line, max(0, int(np.ceil(a - 0.5))):max(0, int(np.ceil(b - 0.5)))] = True
    return inside


def distribution(values):
    counts = np.bincount(values - values.min())
    return np.cumsum(counts) / counts.sum(), values.min(), values.max()


def matched(values, reference):
    """The table of a histogram matching."""
    part, *_ = distribution(values)
    of, low, high = distribution(reference)
    steps = np.linspace(low, high, len(of))
    k = np.clip(np.searchsorted(of, part, "left"), 1, None)
    share = (part - of[k - 1]) / np.maximum(of[k] - of[k - 1], 1e-300)
    return np.where(part <= of[0], low, steps[k - 1] + share * (steps[k] - steps[k - 1]))


@needs_data
@needs_gdal
@needs_numpy
class MosaicSteps(FolderTest):
    def setUp(self):
        super().setUp()
        self.mosaic = self.folder / "m.vmosaic"
        infos = [json.loads(self.fine("info", "--json", scene)) for scene in SCENES]
        self.shapes = [(info["lines"], info["samples"]) for info in infos]
        origins = [info["geoRef"]["tieMap"] for info in infos]
        size = [abs(value) for value in infos[0]["geoRef"]["pixelSize"]]
        left, top = min(x for x, _ in origins), max(y for _, y in origins)
        self.places = [(round((top - y) / size[1]), round((x - left) / size[0])) for x, y in origins]
        self.shape = tuple(max(at[i] + shape[i] for at, shape in zip(self.places, self.shapes)) for i in (0, 1))
        scenes = [{"file": str(scene),
                   "header": {"size": shape[::-1], "bands": 3, "pixel_type": "Byte",
                              "grid": {"origin": origin, "pixel_size": size}}}
                  for scene, shape, origin in zip(SCENES, self.shapes, origins)]
        self.mosaic.write_text(json.dumps({
            "vmosaic": 1, "pixel_type": "Byte", "bands": 3, "no_data": 0, "scenes": scenes,
            "grid": {"origin": [left, top], "pixel_size": size, "size": self.shape[::-1],
                     "coordinate_system": "EPSG:31985"}}))
        self.job = self.folder / "job.xml"
        self.job.write_text(JOB.format(mosaic=self.mosaic))

    def placed(self, scene):
        """The pixels of a scene on the grid of the mosaic, by line, sample, band."""
        (line, sample), (lines, samples) = self.places[scene], self.shapes[scene]
        pixels = np.zeros((*self.shape, 3), int)
        pixels[line:line + lines, sample:sample + samples] = np.frombuffer(
            gdal_pixels(SCENES[scene]), "u1").reshape(lines, samples, 3)
        return pixels

    def check_seams(self):
        scenes = json.loads(self.mosaic.read_text())["scenes"]
        shown = sum(fill(read_rings(self.folder / scene["seam"]), self.shape).astype(int) for scene in scenes)
        covered = np.zeros(self.shape, bool)
        for scene, shape, (line, sample) in zip(scenes, self.shapes, self.places):
            covered[line:line + shape[0], sample:sample + shape[1]] |= fill(
                read_rings(self.folder / scene["footprint"]), shape)
        self.assertGreater(covered.sum(), 70000)
        self.assertLess((covered != (shown > 0)).sum(), 0.001 * covered.sum())
        self.assertLess((shown > 1).sum(), 0.001 * covered.sum())

    def test_footprints_tables_and_seams_of_real_scenes(self):
        self.fine("run", self.job)
        pixels = [self.placed(i) for i in range(3)]
        definition = json.loads(self.mosaic.read_text())
        for scene, image, shape, (line, sample) in zip(definition["scenes"], pixels, self.shapes, self.places):
            valid = (image[line:line + shape[0], sample:sample + shape[1]] != 0).any(-1)
            outline = fill(read_rings(self.folder / scene["footprint"]), shape)
            self.assertLess((outline != valid).sum(), 0.01 * valid.sum())
        self.check_seams()

        base = self.folder / definition["tables"]
        items = np.frombuffer(base.with_suffix(".mlh").read_bytes()[1024:],
                              [("low", "<f8"), ("high", "<f8"), ("bins", "<u4"), ("", "<u4")]).reshape(3, 3)
        tables = np.memmap(base.with_suffix(".mlt"), "<f8", "r", 1024).reshape(3, 3, 65536)
        self.assertLess(os.stat(base.with_suffix(".mlt")).st_blocks * 512, 1 << 19)  # of 4.5 MiB
        for scene, band in np.ndindex(3, 3):
            values, reference = pixels[scene][..., band], pixels[0][..., band]
            both = (values != 0) & (reference != 0)
            lines, samples = self.shapes[scene]
            alone = scene == 0 or both.sum() / (lines * samples) <= 0.1
            values, reference = (values[values != 0], reference[reference != 0]) if alone else (
                values[both], reference[both])
            table = matched(values, reference)
            item = items[scene, band]
            self.assertEqual((item["low"], item["high"], item["bins"]), (values.min(), values.max(), len(table)))
            np.testing.assert_allclose(tables[scene, band, :len(table)], table, atol=1e-9)
            self.assertFalse(tables[scene, band, len(table):].any())
            if not alone:  # the means of both agree then
                mean = tables[scene, band][values - values.min()].mean()
                self.assertLess(abs(mean - reference.mean()), 0.5)

    def test_a_run_that_was_killed_is_gone_on_with(self):
        for hundredths in (4, 8, 12, 20, 30, 45):
            with subprocess.Popen([VEXG, "run", self.job], stdout=subprocess.DEVNULL) as killed:
                time.sleep(hundredths / 100)
                killed.send_signal(signal.SIGKILL)
        self.fine("run", self.job)
        self.check_seams()
        left = [file.name for file in self.folder.iterdir() if ".tmp" in file.name or file.name.endswith(".lock")]
        self.assertEqual(left, [])


if __name__ == "__main__":
    unittest.main()
