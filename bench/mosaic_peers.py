"""Mosaics beside otbcli_Mosaic, VRTs and gdalwarp; a section of peers.py."""

import multiprocessing
import shutil
import sys

GAINS = [(1.0, 0), (0.82, 14), (1.15, -6)]
PLACES = [(0, 0), (3200, 300), (1500, 3000)]  # of scenes of 4000 x 4000 pixels, in these


def make_scenes(paths, places, side, gains, tiled):
    """Scenes of one ground, each with a gain and offset of its own and a slanted border of no data."""
    # In a process of its own: who starts a peer is small, so that the peer's peak memory is its own.
    import numpy
    from osgeo import gdal, osr
    gdal.UseExceptions()
    system = osr.SpatialReference()
    system.ImportFromEPSG(32633)
    for number, (path, (left, top), (gain, offset)) in enumerate(zip(paths, places, gains)):
        random = numpy.random.default_rng(number)
        out = gdal.GetDriverByName("GTiff").Create(str(path), side, side, 3, gdal.GDT_Byte,
                                                   ["TILED=YES"] if tiled else [])
        out.SetGeoTransform((500000 + 10 * left, 10, 0, 5400000 - 10 * top, 0, -10))
        out.SetProjection(system.ExportToWkt())
        x = numpy.arange(left, left + side, dtype=numpy.float32)[None]
        y = numpy.arange(top, top + side, dtype=numpy.float32)[:, None]
        ground = 100 + 30 * numpy.sin(x / 170) * numpy.cos(y / 130) + 20 * numpy.sin((x + 2 * y) / 41)
        outside = (y - top) + 0.1 * (x - left) < side * 0.03
        for band in range(3):
            values = (ground + 8 * band + random.normal(0, 4, ground.shape)) * gain + offset
            values = numpy.clip(values, 1, 255).astype(numpy.uint8)
            values[numpy.broadcast_to(outside, values.shape)] = 0
            out.GetRasterBand(band + 1).WriteArray(values)
            out.GetRasterBand(band + 1).SetNoDataValue(0)


def scenes_of(bench, name, places, side, gains, tiled):
    paths = [bench.work / f"{name}-{i:03}.tif" for i in range(len(places))]
    if not all(path.exists() for path in paths):
        print(f"making {paths[0]} and {len(paths) - 1} more", file=sys.stderr)
        maker = multiprocessing.get_context("spawn").Process(
            target=make_scenes, args=(paths, places, side, gains, tiled))
        maker.start()
        maker.join()
        if maker.exitcode != 0:
            raise SystemExit(f"{paths[0]} could not be made")
    return [str(path) for path in paths]


def mosaic(bench):
    side = min(4000, bench.options.size)
    places = [(x * side // 4000, y * side // 4000) for x, y in PLACES]
    scenes = scenes_of(bench, f"mosaic-{side}", places, side, GAINS, False)
    ours, theirs, vrt = (bench.work / f"mosaic-{name}" for name in ("ours.tif", "theirs.tif", "peer.vrt"))
    definition = bench.work / "mosaic.vmosaic"
    otb = {}
    if shutil.which("otbcli_Mosaic"):
        otb["otbcli_Mosaic"] = ["otbcli_Mosaic", "-il", *scenes, "-comp.feather", "large", "-harmo.method", "band",
                                "-harmo.cost", "rmse", "-nodata", "0", "-interpolator", "nn", "-tmpdir", bench.work,
                                "-out", theirs, "uint8"]
    build = [bench.vexg, "mosaic", "build", ours, *scenes, "--overwrite", "-q", "--compress", "none"]
    _, peak = bench.compare("mosaic matched and feathered", [*build, "--feather", "100"], otb, 0.3, [ours, theirs])
    peaks = [peak]
    make_vrt = ["gdalbuildvrt", "-q", "-overwrite", vrt, *scenes]
    _, peak = bench.compare("mosaic plain", [*build, "--no-matching", "--no-seams"],
                            {"gdalbuildvrt + gdal_translate": [make_vrt, ["gdal_translate", "-q", vrt, theirs]]}, 0.7,
                            [ours, theirs])
    peaks.append(peak)
    _, peak = bench.compare("mosaic reprojected",
                            [*build, "--no-matching", "--no-seams", "--grid", "EPSG:4326", "--resampling", "linear"],
                            {"gdalwarp": ["gdalwarp", "-q", "-overwrite", "-r", "bilinear", "-t_srs", "EPSG:4326",
                                          *scenes, theirs]}, 0.5, [ours, theirs])
    peaks.append(peak)

    side, across = 600, 20
    many = scenes_of(bench, "mosaic-many", [(500 * (i % across), 500 * (i // across)) for i in range(200)], side,
                     [(1.0, 0)] * 200, True)
    for step in ([bench.vexg, "mosaic", "create", definition, *many, "--overwrite"],
                 ["gdalbuildvrt", "-q", "-overwrite", vrt, *many]):
        bench.once(step)
    _, peak = bench.compare("mosaic window of 200 scenes",
                            [bench.vexg, "copy", definition, ours, "--rect", "3000,2000,3511,2511", "--overwrite", "-q",
                             "--compress", "none"],
                            {"gdal_translate of a VRT": ["gdal_translate", "-q", "-srcwin", "3000", "2000", "512", "512",
                                                         vrt, theirs]}, 0.5, [ours, theirs])
    peaks.append(peak)
    _, peak = bench.compare("mosaic of 200 scenes", [bench.vexg, "copy", definition, ours, "--overwrite", "-q",
                                                     "--compress", "none"],
                            {"gdal_translate of a VRT": ["gdal_translate", "-q", vrt, theirs]}, None, [ours, theirs])
    peaks.append(peak)
    print(f"{'':<34} peak memory {max(peaks):.0f} MiB (aim 300{'' if max(peaks) <= 300 else ', MISSED'})")
