"""Opening and reading beside public tools: small files, many of them, and compressed scenes."""

import os
import pathlib
import shutil
import statistics
import subprocess
import sys
import time

WINDOWS = """
import random, sys, time
import rasterio
from rasterio.windows import Window
path, count, side = sys.argv[1], int(sys.argv[2]), int(sys.argv[3])
with rasterio.open(path) as source:
    random.seed(3)
    places = [(random.randrange(source.width - side), random.randrange(source.height - side)) for _ in range(count)]
    start = time.perf_counter()
    for x, y in places:
        source.read(window=Window(x, y, side, side))
print(time.perf_counter() - start)
"""

WARM = """
import sys, time
import rasterio
paths = sys.argv[1:]
rasterio.open(paths[0]).close()
start = time.process_time()
for path in paths[1:]:
    with rasterio.open(path) as source:
        source.meta, source.bounds, source.crs.to_wkt()
print((time.process_time() - start) / (len(paths) - 1))
"""


def usage(command):
    """Seconds and seconds of processor time of a command."""
    start = time.perf_counter()
    process = subprocess.Popen([str(word) for word in command], stdout=subprocess.DEVNULL)
    _, status, used = os.wait4(process.pid, 0)
    process.returncode = os.waitstatus_to_exitcode(status)
    if process.returncode != 0:
        raise SystemExit(f"{command} ended with {process.returncode}")
    return time.perf_counter() - start, used.ru_utime + used.ru_stime


def median_usage(bench, command, runs=None):
    both = [usage(command) for _ in range(runs or 4 * bench.options.runs)]
    return [statistics.median(values) for values in zip(*both)]


def tell(what, ours, peer, name, aim, unit="ms"):
    factor = 1000 if unit == "ms" else 1
    ratio = ours / peer
    verdict = "" if ratio <= aim else ", MISSED"
    print(f"{what:<44} vexg {ours * factor:8.2f} {unit}   {name} {peer * factor:8.2f} {unit}  ratio {ratio:5.2f} "
          f"(aim {aim}{verdict})", flush=True)


def small_files(bench, count):
    """Small GeoTIFFs, and the list of them."""
    folder = bench.work / "small"
    folder.mkdir(exist_ok=True)
    scene = bench.scene("Byte", "tiled")
    first = folder / "small0.tif"
    if not first.exists():
        subprocess.run(["gdal_translate", "-q", "-srcwin", "0", "0", "350", "350", "-co", "COMPRESS=DEFLATE", scene,
                        first], check=True)
        pathlib.Path(f"{first}.aux.xml").unlink(missing_ok=True)
    files = [folder / f"small{i}.tif" for i in range(count)]
    for path in files[1:]:
        if not path.exists():
            shutil.copyfile(first, path)
    listing = folder / "files.txt"
    listing.write_text("".join(f"{path}\n" for path in files))
    return files, listing


def opening(bench):
    wall, cpu = median_usage(bench, [bench.vexg, "--version"])
    print(f"{'vexg --version':<44} {wall * 1000:.2f} ms, {cpu * 1000:.2f} of processor time (aim 10)")
    files, listing = small_files(bench, 200)
    ours, peer = median_usage(bench, [bench.vexg, "info", files[0]]), median_usage(bench, ["gdalinfo", files[0]])
    tell("info of a small GeoTIFF", ours[0], peer[0], "gdalinfo", 0.5)
    tell("  processor time", ours[1], peer[1], "gdalinfo", 0.5)
    each = [sum(usage([bench.vexg, "info", path])[1] for path in files)]
    theirs = sum(usage(["gdalinfo", path])[1] for path in files)
    tell("200 small files, a process each: processor", each[0], theirs, "gdalinfo", 0.95, "s")
    batch = median_usage(bench, [bench.vexg, "batch", "info", "--files-from", listing], bench.options.runs)[1]
    tell("  with vexg batch", batch, theirs, "gdalinfo", 0.3, "s")
    one = bench.work / "small" / "one.txt"
    one.write_text(f"{files[0]}\n")
    start = median_usage(bench, [bench.vexg, "batch", "info", "--files-from", one])[1]
    warm = float(subprocess.run(["/usr/bin/python3", "-c", WARM, *files], capture_output=True, text=True,
                                check=True).stdout)
    tell("open, query, geo-reference, close, when warm", (batch - start) / (len(files) - 1), warm, "rasterio", 1.0)


def compressed(bench, type_name, codec, layout):
    scene = bench.scene(type_name, "tiled")
    path = bench.work / f"{type_name}-{bench.options.size}-{codec}-{layout.replace(' ', '-')}.tif"
    options = {"tiled": ["TILED=YES"], "strips": [], "by band": ["TILED=YES", "INTERLEAVE=BAND"]}[layout]
    if not path.exists():
        print(f"making {path}", file=sys.stderr)
        words = [word for option in [f"COMPRESS={codec}", *options] for word in ("-co", option)]
        if codec == "JPEG" and layout != "by band":  # which takes four bands at most
            words += ["-b", "1", "-b", "2", "-b", "3", "-co", "PHOTOMETRIC=YCBCR"]
        subprocess.run(["gdal_translate", "-q", *words, scene, path], check=True)
        pathlib.Path(f"{path}.aux.xml").unlink(missing_ok=True)
    return path


def windows(bench, path, aim):
    program = pathlib.Path(bench.vexg).parent / "windows_bench"
    if not program.exists():
        print(f"{'200 windows of 512':<44} needs a build with -DVEXG_BUILD_BENCH=ON")
        return
    def seconds(command):
        return statistics.median(
            float(subprocess.run([str(word) for word in command], capture_output=True, text=True, check=True).stdout)
            for _ in range(bench.options.runs))
    ours = seconds([program, path, 200, 512, 1])
    peer = seconds(["/usr/bin/python3", "-c", WINDOWS, path, 200, 512])
    tell(f"200 windows of 512, {path.stem}", ours, peer, "rasterio", aim, "s")
    twelve = seconds([program, path, 200, 512, 12])
    print(f"{'  by twelve threads':<44} vexg {twelve:8.2f} s")


def reading(bench):
    for type_name, aim in (("Byte", 0.5), ("UInt16", 0.4), ("Float32", 0.2)):
        scene = bench.scene(type_name, "tiled")
        bench.compare(f"statistics {type_name}", [bench.vexg, "stats", scene], {"gdalinfo -stats": ["gdalinfo", "-stats", scene]},
                      aim, [f"{scene}.aux.xml"])
    for codec in ("DEFLATE", "LZW", "ZSTD", "JPEG"):
        for layout in ("tiled", "strips", "by band"):
            path = compressed(bench, "Byte", codec, layout)
            several, _ = bench.compare(f"statistics Byte {codec} {layout}", [bench.vexg, "stats", path],
                                       {"gdalinfo -stats": ["gdalinfo", "-stats", path]}, 0.6, [f"{path}.aux.xml"])
            one, _ = bench.compare(f"one thread Byte {codec} {layout}",
                                   ["env", "LUMO_THREADS_HINT=1", bench.vexg, "stats", path], {})
            print(f"{'':<34} all threads are {one / several:.2f} times as fast (aim 1.7)")
    for path in (bench.scene("Byte", "tiled"), bench.scene("Byte", "strips"),
                 *(compressed(bench, "Byte", codec, layout)
                   for codec in ("DEFLATE", "LZW", "ZSTD", "JPEG") for layout in ("tiled", "strips"))):
        windows(bench, path, 0.6)
