"""vexg beside public tools that do the same work; see peers.sh."""

import argparse
import multiprocessing
import os
import pathlib
import shutil
import statistics
import subprocess
import sys
import time

import class_peers
import mosaic_peers
import opening_peers
import python_peers
import segment_peers

BANDS = 6
TYPES = ("Byte", "UInt16", "Float32")
LAYOUTS = {
    "tiled": ["TILED=YES"],
    "strips": [],
    "by band": ["INTERLEAVE=BAND"],
}


# Files as the peers make them, without compression.
PLAIN = ["--compress", "none"]


def make_scene(path, size, type_name, options):
    """A scene of noise on slopes; the same pixels for every layout."""
    # In a process of its own: who starts a peer is small, so that the peer's peak memory is its own.
    import numpy
    from osgeo import gdal, osr
    gdal.UseExceptions()
    kind = numpy.dtype(type_name.lower() if type_name != "Byte" else "uint8")
    code = gdal.GetDataTypeByName(type_name)
    driver = gdal.GetDriverByName("ENVI" if options is None else "GTiff")
    out = driver.Create(str(path), size, size, BANDS, code, ["INTERLEAVE=BIP"] if options is None else options)
    out.SetGeoTransform((600000, 30, 0, 5000000, 0, -30))
    system = osr.SpatialReference()
    system.ImportFromEPSG(32633)
    out.SetProjection(system.ExportToWkt())
    top = {"Byte": 255, "UInt16": 4095, "Float32": 1.0}[type_name]
    random = numpy.random.default_rng(1)
    x = numpy.linspace(0, 1, size, dtype=numpy.float32)[None, :]
    step = 256
    for y in range(0, size, step):
        lines = min(step, size - y)
        slope = numpy.linspace(y, y + lines, lines, dtype=numpy.float32)[:, None] / size
        block = numpy.empty((BANDS, lines, size), kind)
        for band in range(BANDS):
            noise = random.random((lines, size), dtype=numpy.float32)
            block[band] = (0.05 + 0.3 * x + 0.3 * slope + 0.3 * noise) * top * (1 - band / 10)
        out.WriteArray(block, 0, y)
    del out
    pathlib.Path(f"{path}.aux.xml").unlink(missing_ok=True)


class Bench:
    def __init__(self, options):
        self.options = options
        self.work = pathlib.Path(options.work)
        self.work.mkdir(parents=True, exist_ok=True)
        self.vexg = str(pathlib.Path(options.vexg).resolve())

    def scene(self, type_name, layout, size=None):
        size = size or self.options.size
        if layout == "ORVA":
            path = self.work / f"{type_name}-{size}-orva.dat"
            if not path.exists():
                source = self.scene(type_name, "strips", size)
                subprocess.run([self.vexg, "copy", source, path, "--format", "ORVA", "-q"], check=True)
            return path
        path = self.work / f"{type_name}-{size}-{layout.replace(' ', '-')}{'.dat' if layout == 'flat' else '.tif'}"
        if not path.exists():
            print(f"making {path}", file=sys.stderr)
            options = None if layout == "flat" else LAYOUTS[layout]
            maker = multiprocessing.get_context("spawn").Process(
                target=make_scene, args=(path, size, type_name, options))
            maker.start()
            maker.join()
            if maker.exitcode != 0:
                raise SystemExit(f"{path} could not be made")
        return path

    def real_scene(self):
        """The real scene that ./demo and the tests use."""
        places = [pathlib.Path("../shared/data/landsat7_olinda.tif"), pathlib.Path("build/demo/L7_ETMs.tif")]
        for path in places:
            if path.exists():
                return path
        raise SystemExit("run ./demo first, which fetches the real scene")

    def once(self, command, env=None):
        """Seconds and peak memory in MiB of a command."""
        start = time.perf_counter()
        process = subprocess.Popen([str(word) for word in command], stdout=subprocess.DEVNULL,
                                   env={**os.environ, **(env or {})})
        _, status, usage = os.wait4(process.pid, 0)
        process.returncode = os.waitstatus_to_exitcode(status)
        seconds = time.perf_counter() - start
        if process.returncode != 0:
            raise SystemExit(f"{command} ended with {process.returncode}")
        return seconds, usage.ru_maxrss / 1024

    def compare(self, what, ours, peers, aim=None, clean=()):
        """Runs commands in turn; prints the median of each and the ratio of ours to each peer.
        `peers` is a dictionary of name to command, or to a list of commands run one after the other."""
        times = {name: [] for name in ["vexg", *peers]}
        peak = 0
        for _ in range(self.options.runs):
            for name, command in [("vexg", ours), *peers.items()]:
                for path in clean:
                    pathlib.Path(path).unlink(missing_ok=True)
                steps = command if isinstance(command[0], (list, tuple)) else [command]
                runs = [self.once(step) for step in steps]
                times[name].append(sum(seconds for seconds, _ in runs))
                if name == "vexg":
                    peak = max([peak, *(memory for _, memory in runs)])
        for path in clean:
            pathlib.Path(path).unlink(missing_ok=True)
        median = {name: statistics.median(values) for name, values in times.items()}
        text = f"{what:<34} vexg {median['vexg']:7.3f} s {peak:5.0f} MiB"
        aims = aim if isinstance(aim, dict) else {name: aim for name in peers}
        for name in peers:
            ratio = median["vexg"] / median[name]
            bound = aims.get(name)
            verdict = "" if bound is None else f" (aim {bound}{'' if ratio <= bound else ', MISSED'})"
            text += f"   {name} {median[name]:7.3f} s  ratio {ratio:5.2f}{verdict}"
        print(text, flush=True)
        return median["vexg"], peak


def stats(bench):
    for type_name, aim in (("Byte", 1.0), ("UInt16", 0.9), ("Float32", 0.5)):
        for layout in ("tiled", "strips", "by band", "ORVA"):
            scene = bench.scene(type_name, layout)
            peer = bench.scene(type_name, "flat") if layout == "ORVA" else scene
            side = f"{peer}.aux.xml"
            basic, _ = bench.compare(f"statistics {type_name} {layout}", [bench.vexg, "stats", scene],
                                     {"gdalinfo -stats": ["gdalinfo", "-stats", peer]}, aim, [side])
        extended, _ = bench.compare(f"extended statistics {type_name} ORVA",
                                    [bench.vexg, "stats", scene, "--extended"], {})
        print(f"{'':<34} {extended / basic:.2f} of the basic ones (aim 3)")
        several, _ = bench.compare(f"one worker {type_name} ORVA",
                                   ["env", "LUMO_THREADS_HINT=1", bench.vexg, "stats", scene], {})
        print(f"{'':<34} two workers are {several / basic:.2f} times as fast (aim 1.6)")


def hist(bench):
    for type_name, aim in (("Byte", 1.0), ("UInt16", None), ("Float32", None)):
        for layout in ("tiled", "strips", "by band", "ORVA"):
            scene = bench.scene(type_name, layout)
            peer = bench.scene(type_name, "flat") if layout == "ORVA" else scene
            bench.compare(f"histogram {type_name} {layout}", [bench.vexg, "hist", scene, "--json"],
                          {"gdalinfo -hist": ["gdalinfo", "-hist", peer]}, aim, [f"{peer}.aux.xml"])


RASTERIO_SCRIPT = """
import sys, numpy, rasterio
source, target, gain, offset = sys.argv[1], sys.argv[2], float(sys.argv[3]), float(sys.argv[4])
with rasterio.open(source) as src:
    profile = src.profile
    profile.update(dtype="float32")
    with rasterio.open(target, "w", **profile) as out:
        height = profile.get("blockysize", 256)
        height = max(height, 256) // height * height
        for y in range(0, src.height, height):
            window = rasterio.windows.Window(0, y, src.width, min(height, src.height - y))
            dn = src.read(window=window).astype(numpy.float32)
            r = dn * numpy.float32(gain) + numpy.float32(offset)
            out.write(numpy.maximum(r, 0), window=window)
"""


def calibrate(bench):
    script = bench.work / "calibrate_rasterio.py"
    script.write_text(RASTERIO_SCRIPT)
    target = bench.work / "calibrated.tif"
    for type_name in TYPES:
        for layout in ("tiled", "strips"):
            scene = bench.scene(type_name, layout)
            options = [f"--co={option}" for option in LAYOUTS[layout]]
            bench.compare(
                f"radiance {type_name} {layout}",
                [bench.vexg, "calibrate", "radiance", scene, target, "--gain", "0.5", "--offset", "-3",
                 *PLAIN],
                {"gdal_calc": ["gdal_calc.py", "--quiet", "-A", scene, "--allBands=A", f"--outfile={target}",
                               "--type=Float32", "--calc=maximum(A*0.5-3.0,0)", *options],
                 "rasterio": [sys.executable, script, scene, target, "0.5", "-3"]},
                {"gdal_calc": 0.4, "rasterio": 0.8}, [target])
    scene = bench.scene("UInt16", "ORVA")
    bench.compare("radiance UInt16 ORVA to ORVA",
                  [bench.vexg, "calibrate", "radiance", scene, bench.work / "calibrated.dat", "--gain", "0.5",
                   "--offset", "-3"], {}, None, [bench.work / "calibrated.dat", bench.work / "calibrated.dat.hdr"])


NDVI_SCRIPT = """
import sys, numpy, rasterio
source, target = sys.argv[1:]
with rasterio.open(source) as src:
    profile = src.profile
    profile.update(dtype="float32", count=1)
    with rasterio.open(target, "w", **profile) as out:
        height = profile.get("blockysize", 256)
        height = max(height, 256) // height * height
        for y in range(0, src.height, height):
            window = rasterio.windows.Window(0, y, src.width, min(height, src.height - y))
            red, nir = src.read((3, 4), window=window).astype(numpy.float32)
            out.write((nir - red) / (nir + red), 1, window=window)
"""


def calc(bench):
    """NDVI of two of six bands."""
    script = bench.work / "ndvi_rasterio.py"
    script.write_text(NDVI_SCRIPT)
    target, theirs = bench.work / "ndvi.tif", bench.work / "peer-ndvi.tif"
    for type_name in TYPES:
        for layout in ("tiled", "strips", "by band"):
            scene = bench.scene(type_name, layout)
            ours = [bench.vexg, "calc", target, "(b3 - b2) / (b3 + b2)", scene, "-q", *PLAIN]
            peer = [sys.executable, script, scene, theirs]
            bench.once(ours)
            bench.once(peer)
            subprocess.run(["gdal_calc.py", "--quiet", "-A", target, "-B", theirs, "--type=Float32",
                            f"--outfile={bench.work / 'difference.tif'}", "--calc=abs(A-B)", "--overwrite"], check=True)
            out = subprocess.run(["gdalinfo", "-mm", bench.work / "difference.tif"], capture_output=True, text=True,
                                 check=True).stdout
            if float(out.split("Computed Min/Max=")[1].split()[0].split(",")[1]) > 1e-6:
                raise SystemExit(f"{target} and {theirs} differ")
            bench.compare(
                f"NDVI {type_name} {layout}", ours,
                {"gdal_calc": ["gdal_calc.py", "--quiet", "-A", scene, "--A_band=4", "-B", scene, "--B_band=3",
                               f"--outfile={theirs}", "--type=Float32",
                               "--calc=(A.astype('f4')-B)/(A.astype('f4')+B)",
                               *(f"--co={option}" for option in LAYOUTS[layout])],
                 "rasterio": peer},
                {"gdal_calc": 0.4, "rasterio": 0.8}, [target, theirs])
    (bench.work / "difference.tif").unlink()


def memory(bench):
    """Peak memory of one scene and of one four times as large."""
    target = bench.work / "calibrated.tif"
    for verb in (["stats"], ["stats", "--extended"], ["hist"], ["calibrate"], ["pyramid"]):
        peaks = []
        for size in (bench.options.size, 2 * bench.options.size):
            scene = bench.scene("UInt16", "tiled", size)
            command = [bench.vexg, *verb, scene]
            if verb[0] == "calibrate":
                command = [bench.vexg, "calibrate", "radiance", scene, target, "--gain", "0.5", "--offset", "-3",
                 *PLAIN]
            if verb[0] == "pyramid":
                command = [bench.vexg, "pyramid", "build", scene, "--levels", "1-5", "--resampling", "nearest", "-q", "--output",
                           bench.work / "levels.pyr"]
            target.unlink(missing_ok=True)
            peaks.append(bench.once(command)[1])
        print(f"memory {' '.join(verb):<27} {peaks[0]:5.0f} MiB, of a scene four times as large {peaks[1]:5.0f} MiB "
              "(aim 300, and 50 apart)")
    target.unlink(missing_ok=True)
    (bench.work / "levels.pyr").unlink(missing_ok=True)


def pyramid(bench):
    """Levels 1 to 5 with statistics and a histogram, beside what GDAL needs for levels and statistics."""
    for type_name, aim in (("Byte", 1.0), ("UInt16", 1.0), ("Float32", 0.7)):
        for layout in ("tiled", "strips", "by band"):
            scene = bench.scene(type_name, layout)
            levels = ["gdaladdo", "-q", "-ro", "-r", "nearest", scene, "2", "4", "8", "16", "32"]
            bench.compare(f"pyramid {type_name} {layout}",
                          [bench.vexg, "pyramid", "build", scene, "--levels", "1-5", "--resampling", "nearest", "-q"],
                          {"gdaladdo and gdalinfo -stats": [levels, ["gdalinfo", "-stats", scene]],
                           "gdaladdo": levels},
                          {"gdaladdo and gdalinfo -stats": aim, "gdaladdo": 1.0},
                          [f"{scene}{ending}" for ending in (".pyr", ".ovr", ".aux.xml")])


def warp(bench):
    """To longitude and latitude, with all threads and with one, on the grid that gdalwarp chooses. Both write new
    files in tiles of 512 without compression. Ours says by a mask which pixels lie outside the scene, of which
    gdalwarp says nothing; in the last rows both have a no-data value for them."""
    aims = {"near": 0.5, "bilinear": 0.4, "cubic": 0.4}
    words = {"near": "nearest", "bilinear": "linear", "cubic": "cubic"}
    tiles = ["-co", "TILED=YES", "-co", "BLOCKXSIZE=512", "-co", "BLOCKYSIZE=512"]
    for type_name in ("Byte", "UInt16", "Float32"):
        scene = bench.scene(type_name, "tiled")
        grid, made, theirs = (bench.work / name for name in ("grid.tif", "warped.tif", "gdal-warped.tif"))
        subprocess.run(["gdalwarp", "-q", "-overwrite", "-t_srs", "EPSG:4326", scene, grid], check=True)

        def compare(name, method, resampling, ours, theirs_too, threads, aim):
            vexg = [bench.vexg] if threads == "all threads" else ["env", "LUMO_THREADS_HINT=1", bench.vexg]
            peer = ["-multi", "-wo", "NUM_THREADS=ALL_CPUS"] if threads == "all threads" else []
            bench.compare(f"warp {type_name} {name}, {threads}",
                          [*vexg, "warp", scene, made, "--to", grid, "--method", method, "--resampling",
                           words[resampling], "-q", *PLAIN, *ours],
                          {"gdalwarp": ["gdalwarp", "-q", "-t_srs", "EPSG:4326", "-r", resampling, *theirs_too, *peer,
                                        *tiles, scene, theirs]}, {"gdalwarp": aim}, [made, theirs])

        for threads in ("all threads", "one thread"):
            for method, error, of_method in (("polynomial", [], aims), ("rigorous", ["-et", "0"], {"bilinear": 0.5})):
                for resampling, word in words.items():
                    compare(f"{method} {word}", method, resampling, [], error, threads, of_method.get(resampling))
        for resampling, word in words.items():
            compare(f"{word}, no-data", "polynomial", resampling, ["--no-data", "0"], ["-dstnodata", "0"],
                    "all threads", None)


def outputs(bench):
    """Packed and cloud-optimised copies, by the same codec and level with all threads on both sides."""
    copy, theirs = bench.work / "packed.tif", bench.work / "gdal-packed.tif"
    gdal = ["gdal_translate", "-q", "-co", "COMPRESS=ZSTD", "-co", "NUM_THREADS=ALL_CPUS"]
    for type_name in ("Byte", "UInt16", "Float32"):
        scene = bench.scene(type_name, "tiled")
        predictor = "3" if type_name == "Float32" else "2"
        tiles = ["-co", "TILED=YES", "-co", "BLOCKXSIZE=512", "-co", "BLOCKYSIZE=512", "-co", "ZSTD_LEVEL=3", "-co",
                 f"PREDICTOR={predictor}"]
        bench.compare(f"copy {type_name} by ZSTD", [bench.vexg, "copy", scene, copy, "-q"],
                      {"gdal_translate": [*gdal, scene, theirs], "the same tiles": [*gdal, *tiles, scene, theirs]},
                      {"gdal_translate": 1.0, "the same tiles": 1.0}, [copy, theirs])
        cog = [*gdal, "-of", "COG", "-co", "PREDICTOR=YES", "-co", "LEVEL=3", "-co", "RESAMPLING=AVERAGE"]
        bench.compare(f"cloud-optimised copy {type_name}", [bench.vexg, "copy", scene, copy, "-q", "--cog"],
                      {"gdal_translate": [*cog, scene, theirs]}, {"gdal_translate": 0.7}, [copy, theirs])


def make_labels(path, size):
    """A label raster of blocks of 8 x 8 with single pixels of another label in them."""
    import numpy
    from osgeo import gdal, osr
    gdal.UseExceptions()
    random = numpy.random.default_rng(2)
    labels = numpy.kron(random.integers(0, 4, (size // 8, size // 8)), numpy.ones((8, 8))).astype("int32")
    labels[random.random(labels.shape) < 0.008] = 9
    out = gdal.GetDriverByName("GTiff").Create(str(path), labels.shape[1], labels.shape[0], 1, gdal.GDT_Int32)
    out.SetGeoTransform((500000, 30, 0, 9100000, 0, -30))
    system = osr.SpatialReference()
    system.ImportFromEPSG(32725)
    out.SetProjection(system.ExportToWkt())
    out.GetRasterBand(1).WriteArray(labels)


def polygons(bench):
    """About 250,000 polygons of a label raster of 4000 x 4000."""
    labels = bench.work / f"labels-{bench.options.size}.tif"
    if not labels.exists():
        maker = multiprocessing.get_context("spawn").Process(target=make_labels, args=(labels, bench.options.size))
        maker.start()
        maker.join()
    for ending, driver, aim in (("fxv", "FlatGeobuf", 0.15), ("fgb", "FlatGeobuf", 0.4), ("gpkg", "GPKG", 0.3)):
        made = bench.work / f"polygons.{ending}"
        theirs = bench.work / ("gdal-polygons" + {"FlatGeobuf": ".fgb", "GPKG": ".gpkg"}[driver])
        bench.compare(f"polygons to {ending}", [bench.vexg, "polygonize", labels, made, "-q"],
                      {"gdal_polygonize": ["gdal_polygonize.py", "-q", labels, "-f", driver, theirs]}, aim,
                      [made, theirs])


def make_shapes(path, size, side):
    """side x side five-cornered shapes of a scene, each reaching into its neighbours."""
    from osgeo import ogr, osr
    system = osr.SpatialReference()
    system.ImportFromEPSG(32633)
    out = ogr.GetDriverByName("GPKG").CreateDataSource(str(path))
    layer = out.CreateLayer("shapes", system, ogr.wkbPolygon)
    layer.CreateField(ogr.FieldDefn("class", ogr.OFTInteger))
    layer.StartTransaction()
    step = 30 * size / side
    for number in range(side * side):
        # Off the grid by a little, so that no edge passes through the centre of a pixel.
        x, y = 600000.3712 + number % side * step, 4999999.5831 - number // side * step
        corners = ((0.1, 0), (1.3, 0.1), (1.5, 1.2), (0.4, 1.4), (-0.1, 0.7))
        ring = ", ".join(f"{x + a * step} {y - b * step}" for a, b in (*corners, corners[0]))
        feature = ogr.Feature(layer.GetLayerDefn())
        feature.SetField(0, number % 251)
        feature.SetGeometry(ogr.CreateGeometryFromWkt(f"POLYGON(({ring}))"))
        layer.CreateFeature(feature)
    layer.CommitTransaction()


def make_coast(path, size, vertices):
    """One polygon with a ragged border."""
    import math
    import random
    from osgeo import ogr, osr
    random.seed(4)
    system = osr.SpatialReference()
    system.ImportFromEPSG(32633)
    ring = []
    for number in range(vertices):
        angle = 2 * math.pi * number / vertices
        radius = 14 * size * (0.7 + 0.2 * math.sin(7 * angle) + 0.02 * math.sin(3001 * angle) + 0.001 * random.random())
        ring.append(f"{600000 + 15 * size + radius * math.cos(angle)} {5000000 - 15 * size + radius * math.sin(angle)}")
    out = ogr.GetDriverByName("GPKG").CreateDataSource(str(path))
    layer = out.CreateLayer("coast", system, ogr.wkbPolygon)
    layer.CreateField(ogr.FieldDefn("class", ogr.OFTInteger))
    feature = ogr.Feature(layer.GetLayerDefn())
    feature.SetField(0, 7)
    feature.SetGeometry(ogr.CreateGeometryFromWkt(f"POLYGON(({', '.join([*ring, ring[0]])}))"))
    layer.CreateFeature(feature)


def zones(bench):
    """12,769 polygons that overlap: drawn into a raster, and as zones of six bands."""
    size = bench.options.size
    shapes = bench.work / f"shapes-{size}.gpkg"
    if not shapes.exists():
        maker = multiprocessing.get_context("spawn").Process(target=make_shapes, args=(shapes, size, 113))
        maker.start()
        maker.join()
    scene = bench.scene("Byte", "tiled")
    drawn, theirs = bench.work / "drawn.tif", bench.work / "gdal-drawn.tif"
    ours = [bench.vexg, "rasterize", shapes, drawn, "--like", scene, "--field", "class", "-q", *PLAIN]
    peer = ["gdal_rasterize", "-q", "-a", "class", "-ot", "Byte", "-te", 600000, 5000000 - 30 * size,
            600000 + 30 * size, 5000000, "-ts", size, size, shapes, theirs]
    for path in (drawn, theirs):
        path.unlink(missing_ok=True)
    bench.once(ours)
    bench.once(peer)
    sums = [subprocess.run(["gdalinfo", "-checksum", path], capture_output=True, text=True, check=True)
            .stdout.split("Checksum=")[1].split()[0] for path in (drawn, theirs)]
    if sums[0] != sums[1]:
        raise SystemExit(f"{drawn} and {theirs} differ")
    bench.compare("12,769 polygons to pixels", ours, {"gdal_rasterize": peer}, 0.7, [drawn, theirs])

    one = bench.work / f"one-{size}.gpkg"
    if not one.exists():
        maker = multiprocessing.get_context("spawn").Process(target=make_coast, args=(one, size, 1_000_000))
        maker.start()
        maker.join()
    swap = lambda command: [one if word == shapes else word for word in command]
    bench.compare("1,000,000 vertices to pixels", swap(ours), {"gdal_rasterize": swap(peer)}, 0.7, [drawn, theirs])

    table, other = bench.work / "zones.csv", bench.work / "otb-zones.gpkg"
    peers = {}
    if shutil.which("otbcli_ZonalStatistics"):
        peers["otbcli_ZonalStatistics"] = [
            "otbcli_ZonalStatistics", "-in", scene, "-inzone", "vector", "-inzone.vector.in", shapes, "-out",
            "vector", "-out.vector.filename", other]
    if shutil.which("grass"):
        peers["GRASS"] = grass_zones(bench, shapes, scene)
    bench.compare("12,769 zones of 6 bands", [bench.vexg, "zonal", scene, shapes, "-o", table, "-q"], peers, 0.3,
                  [table, other])
    for stats in (["--weights", "coverage"], ["--stats", "median,p10,p90,majority"]):
        bench.compare(f"zones, {stats[1]}"[:34], [bench.vexg, "zonal", scene, shapes, "-o", table, "-q", *stats], {},
                      clean=[table])


def grass_zones(bench, shapes, scene):
    """r.univar with zones, band after band, of a scene that is linked and shapes that are imported first."""
    place = bench.work / "grass"
    quiet = {"stdout": subprocess.DEVNULL, "stderr": subprocess.DEVNULL, "check": True}
    if not place.exists():
        run = ["grass", place / "PERMANENT", "--exec"]
        subprocess.run(["grass", "-c", scene, "-e", place], **quiet)
        subprocess.run([*run, "r.external", f"input={scene.resolve()}", "output=scene"], **quiet)
        subprocess.run([*run, "v.in.ogr", f"input={shapes.resolve()}", "output=shapes", "-c"], **quiet)
    steps = ["g.region raster=scene.1", "v.to.rast input=shapes output=zones use=cat --overwrite"]
    steps += [f"r.univar -t map=scene.{band + 1} zones=zones output={bench.work.resolve()}/univar{band}.csv --overwrite"
              for band in range(BANDS)]
    return ["sh", "-c", f"grass {place / 'PERMANENT'} --exec sh -c '{' && '.join(steps)}' 2>/dev/null"]


def make_regions(path, size, side):
    """Labels from 1 of ragged cells of about `side` pixels."""
    import numpy
    from osgeo import gdal
    gdal.UseExceptions()
    random = numpy.random.default_rng(3)
    y, x = numpy.mgrid[0:size, 0:size].astype(numpy.float32)
    shift = random.normal(size=(2, 2 * size // side + 3, 2 * size // side + 3)).astype(numpy.float32) * side / 4
    rows, columns = (2 * y / side).astype(int), (2 * x / side).astype(int)
    cells = size // side + 3
    label = (numpy.clip((y + shift[0][rows, columns]) / side + 1, 0, cells).astype(int) * cells
             + numpy.clip((x + shift[1][rows, columns]) / side + 1, 0, cells - 1).astype(int))
    label = numpy.unique(label, return_inverse=True)[1].reshape(size, size).astype(numpy.int32) + 1
    out = gdal.GetDriverByName("GTiff").Create(str(path), size, size, 1, gdal.GDT_Int32, ["TILED=YES"])
    out.SetGeoTransform((600000, 30, 0, 5000000, 0, -30))
    out.WriteArray(label)


REGIONPROPS = """
import sys, skimage.measure
from osgeo import gdal
labels = gdal.Open(sys.argv[1]).ReadAsArray()
skimage.measure.regionprops_table(labels, properties=("label", "area", "perimeter", "convex_area", "solidity",
    "axis_major_length", "axis_minor_length", "orientation", "euler_number"))
"""

MEANS = """
import sys, numpy, scipy.ndimage
from osgeo import gdal
labels = gdal.Open(sys.argv[2]).ReadAsArray()
index = numpy.unique(labels)
for band in gdal.Open(sys.argv[1]).ReadAsArray():
    for value in (scipy.ndimage.mean, scipy.ndimage.standard_deviation, scipy.ndimage.minimum, scipy.ndimage.maximum):
        value(band.astype(float), labels, index)
"""


def attributes(bench):
    """Values and shapes of the regions of a label raster."""
    size = bench.options.size
    scene = bench.scene("Byte", "tiled")
    out, xml = bench.work / "regions", bench.work / "otb-regions.xml"
    made = [f"{out}.{kind}.fxa" for kind in ("spectral", "texture", "entropy", "shape")]
    for side in (36, 4):
        labels = bench.work / f"regions-{size}-{side}.tif"
        if not labels.exists():
            maker = multiprocessing.get_context("spawn").Process(target=make_regions, args=(labels, size, side))
            maker.start()
            maker.join()
        ours = [bench.vexg, "attributes", scene, labels, "-o", out, "-q"]
        name = f"cells of {side} pixels"
        peers = {"scipy.ndimage": ["/usr/bin/python3", "-c", MEANS, scene, labels]}
        if shutil.which("otbcli_ZonalStatistics"):
            peers["otbcli_ZonalStatistics"] = [
                "otbcli_ZonalStatistics", "-in", scene, "-inzone", "labelimage", "-inzone.labelimage.in", labels,
                "-out", "xml", "-out.xml.filename", xml]
        bench.compare(f"spectral, {name}", [*ours, "--spectral"], peers, {"otbcli_ZonalStatistics": 0.3}, [*made, xml])
        peers = {}
        if side == 36:
            peers["regionprops"] = ["/usr/bin/python3", "-c", REGIONPROPS, labels]
        bench.compare(f"shape, {name}", [*ours, "--shape"], peers, 0.05, made)
        if side == 36:
            peers = {"r.neighbors": grass_windows(bench, scene)} if shutil.which("grass") else {}
            bench.compare("texture 5 x 5", [*ours, "--texture", "--kernel", "5"], peers, 0.3, made)


def grass_windows(bench, scene):
    """Four runs of r.neighbors for each band of a scene that is linked first."""
    place = bench.work / f"grass-windows-{bench.options.size}"
    quiet = {"stdout": subprocess.DEVNULL, "stderr": subprocess.DEVNULL, "check": True}
    if not place.exists():
        subprocess.run(["grass", "-c", scene, "-e", place], **quiet)
        subprocess.run(["grass", place / "PERMANENT", "--exec", "r.external", f"input={scene.resolve()}",
                        "output=scene"], **quiet)
    steps = ["g.region raster=scene.1"]
    steps += [f"r.neighbors input=scene.{band + 1} output=w{band}{method} method={method} size=5 --overwrite"
              for band in range(BANDS) for method in ("range", "average", "variance", "diversity")]
    return ["sh", "-c", f"grass {place / 'PERMANENT'} --exec sh -c '{' && '.join(steps)}' 2>/dev/null"]


SECTIONS = {"open": opening_peers.opening, "read": opening_peers.reading, "stats": stats, "hist": hist,
            "calibrate": calibrate, "calc": calc, "pyramid": pyramid, "warp": warp, "outputs": outputs,
            "mosaic": mosaic_peers.mosaic, "polygons": polygons,
            "zones": zones, "segments": segment_peers.speed, "segment-quality": segment_peers.quality,
            "attributes": attributes, "classes": lambda bench: class_peers.speed(bench, make_regions),
            "class-quality": class_peers.quality, "memory": memory,
            "python": python_peers.python}


def main():
    parser = argparse.ArgumentParser()
    parser.add_argument("--vexg", required=True)
    parser.add_argument("--size", type=int, default=4000)
    parser.add_argument("--runs", type=int, default=5)
    parser.add_argument("--work", default="build/peers")
    parser.add_argument("sections", nargs="*", metavar="SECTION", help=", ".join(SECTIONS))
    options = parser.parse_args()
    unknown = [name for name in options.sections if name not in SECTIONS]
    if unknown:
        parser.error(f"there is no section {unknown[0]}; there are {', '.join(SECTIONS)}")
    bench = Bench(options)
    for name in options.sections or SECTIONS:
        SECTIONS[name](bench)


if __name__ == "__main__":
    main()
