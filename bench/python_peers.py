"""The Python package beside rasterio and numpy, each in the same process in turn."""

import os
import pathlib
import statistics
import subprocess
import sys

# Runs in a process of its own, and prints the seconds of one row: ours, then the peer's.
CHILD = """
import random, statistics, sys, time
import numpy
what, path, turns = sys.argv[1], sys.argv[2], int(sys.argv[3])
import rasterio
import vexg
from rasterio.windows import Window


def clock():
    return time.process_time() if what == "whole" else time.perf_counter()


def measure(ours, peer, check=True):
    if check:
        a, b = ours(0), peer(0)
        if not numpy.allclose(a, b, rtol=1e-6):
            raise SystemExit(f"{what}: the results differ")
    times = ([], [])
    for turn in range(turns):
        for kept, call in zip(times, (ours, peer)):
            start = clock()
            call(turn)
            kept.append(clock() - start)
    print(*(statistics.median(kept) for kept in times))


scene, source = vexg.open(path), rasterio.open(path)
chance = random.Random(3)


def windows(side, count):
    places = [(chance.randrange(source.height - side), chance.randrange(source.width - side)) for _ in range(count)]

    def ours(turn):
        for y, x in places:
            block = scene.read(window=((y, y + side), (x, x + side)))
        return block

    def peer(turn):
        for y, x in places:
            block = source.read(window=Window(x, y, side, side))
        return block

    return ours, peer


if what in ("whole", "whole wall"):
    # Opened anew for each turn: whoever reads a whole scene does so once.
    def ours(turn):
        scene.close()
        with vexg.open(path) as opened:
            return opened.read()

    def peer(turn):
        with rasterio.open(path) as opened:
            return opened.read()

    source.close()
    measure(ours, peer)
elif what == "window 16":
    measure(*windows(16, 1000))
elif what == "same window 16":
    window = ((100, 116), (100, 116))
    measure(lambda turn: [scene.read(window=window) for _ in range(1000)][-1],
            lambda turn: [source.read(window=Window(100, 100, 16, 16)) for _ in range(1000)][-1])
elif what == "window 512":
    measure(*windows(512, 40))
elif what == "window 512 anew":
    # A file opened anew for each turn, so that no block of it is in the cache of a library.
    ours, peer = windows(512, 40)

    def ours_anew(turn):
        global scene
        scene.close()
        scene = vexg.open(path)
        return ours(turn)

    def peer_anew(turn):
        global source
        source.close()
        source = rasterio.open(path)
        return peer(turn)

    measure(ours_anew, peer_anew)
elif what == "open":
    measure(lambda turn: [vexg.open(path).shape for _ in range(100)][-1],
            lambda turn: [rasterio.open(path).shape for _ in range(100)][-1], False)
elif what == "statistics":
    # Of an array that changes its name with each turn, ours are computed each time, from the file.
    def ours(turn):
        view = scene.clip(window=((0, scene.height), (0, scene.width)))
        table = view.stats()
        return numpy.array([[row["min"], row["max"], row["mean"], row["std"]] for row in
                            (table if isinstance(table, list) else table.to_dict("records"))])

    def peer(turn):
        found = []
        for band in range(source.count):
            values = source.read(band + 1)
            found.append([values.min(), values.max(), values.mean(dtype="f8"), values.std(dtype="f8", ddof=1)])
        return numpy.array(found)

    measure(ours, peer)
elif what == "segments":
    segments = vexg.open_labels(path, vexg.open(path))
    import geopandas  # whose import is not what is measured
    start, used = time.perf_counter(), time.process_time()
    table = segments.attributes("shape", geometry=True)
    print(time.perf_counter() - start, time.process_time() - used, len(table))
"""

IMPORT = """
import time
start, used = time.perf_counter(), time.process_time()
import vexg
print(time.perf_counter() - start, time.process_time() - used)
"""


def child(bench, what, path, turns):
    environment = {**os.environ, "PYTHONPATH": str(pathlib.Path("python").resolve()),
                   "VEXG_LIBRARY": str(pathlib.Path(bench.vexg).parent.parent / "lib" / "libvexg.so")}
    done = subprocess.run([sys.executable, "-c", CHILD, what, path, str(turns)], env=environment, check=True,
                          capture_output=True, text=True)
    return [float(word) for word in done.stdout.split()]


def row(bench, title, what, path, aim, unit="ms", count=1, turns=None, most=None):
    """Prints a row.

    Args:
        aim: the ratio to the peer; None for none.
        most: the milliseconds, or microseconds, that one piece may take; None for any.
        count: pieces of a turn.
    """
    factor = {"s": 1, "ms": 1e3, "us": 1e6}[unit] / count
    ours, peer = child(bench, what, path, turns or bench.options.runs)
    ratio = ours / peer
    parts = []
    if aim is not None:
        parts.append(f"aim {aim}{'' if ratio <= aim else ', MISSED'}")
    if most is not None:
        parts.append(f"at most {most} {unit}{'' if ours * factor <= most else ', MISSED'}")
    print(f"{title:<44} vexg {ours * factor:9.3f} {unit}   rasterio {peer * factor:9.3f} {unit}  ratio {ratio:5.2f} "
          f"({'; '.join(parts)})", flush=True)


def packed(bench, scene):
    """The same scene, packed by DEFLATE."""
    path = scene.with_name(scene.stem + "-deflate.tif")
    if not path.exists():
        subprocess.run(["gdal_translate", "-q", "-co", "COMPRESS=DEFLATE", "-co", "TILED=YES", "-co", "PREDICTOR=2",
                        scene, path], check=True)
    return path


def label_scene(bench):
    """Labels of about 100,000 segments."""
    path = bench.work / "labels-100000.tif"
    if not path.exists():
        subprocess.run([sys.executable, "-c", """
import sys, numpy
from osgeo import gdal
gdal.UseExceptions()
side, cells = 6, 317
labels = numpy.arange(1, cells * cells + 1, dtype="int32").reshape(cells, cells).repeat(side, 0).repeat(side, 1)
labels[::7, 1:] = labels[::7, :-1]  # ragged borders
out = gdal.GetDriverByName("GTiff").Create(sys.argv[1], cells * side, cells * side, 1, gdal.GDT_Int32, ["TILED=YES"])
out.SetGeoTransform((600000, 30, 0, 5000000, 0, -30))
out.WriteArray(labels)
""", path], check=True)
    return path


def python(bench):
    environment = {**os.environ, "PYTHONPATH": str(pathlib.Path("python").resolve())}
    imports = [subprocess.run([sys.executable, "-c", IMPORT], env=environment, check=True, capture_output=True,
                              text=True).stdout.split() for _ in range(11)]
    took, used = (statistics.median(float(each[i]) for each in imports) * 1e3 for i in (0, 1))
    print(f"{'import vexg, with numpy':<44} vexg {took:9.3f} ms, {used:.3f} ms of processor time   (at most 100 ms"
          f"{'' if took <= 100 else ', MISSED'})", flush=True)
    tiled, strips = bench.scene("Byte", "tiled"), bench.scene("UInt16", "strips")
    row(bench, "open a file that was open before", "open", tiled, None, count=100, most=3, turns=5)
    row(bench, "the same window of 16 x 16 x 6", "same window 16", tiled, None, "us", 1000, most=50)
    row(bench, "windows of 16 x 16 x 6 at random", "window 16", tiled, None, "us", 1000)
    row(bench, "windows of 512 x 512 x 6 at random, Byte", "window 512 anew", tiled, 1.0, count=40)
    row(bench, "the same again, from GDAL's cache of blocks", "window 512", tiled, 1.0, count=40)
    row(bench, "windows of 512 x 512 x 6, UInt16 in strips", "window 512 anew", strips, 1.0, count=40)
    for scene in (tiled, strips, bench.scene("Float32", "by band")):
        row(bench, f"all of {scene.stem}, processor", "whole", scene, 0.7)
    row(bench, "all of the first, DEFLATE, wall", "whole wall", packed(bench, tiled), 0.7)
    for scene in (tiled, strips, bench.scene("Float32", "tiled")):
        row(bench, f"statistics of {scene.stem}", "statistics", scene, 0.4)
    seconds, used, count = child(bench, "segments", label_scene(bench), 1)
    print(f"{f'GeoDataFrame of {count:,.0f} segments':<44} vexg {seconds:9.3f} s, {used:.3f} s of processor time   "
          f"(at most 2 s{'' if seconds <= 2 else ', MISSED'})", flush=True)
