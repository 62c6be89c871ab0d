"""Classification beside public tools: scoring, painting, the whole chain, and how well known classes are found."""

import json
import multiprocessing
import shutil
import struct
import subprocess

ATTRIBUTES = 5  # mean, deviation, minimum, maximum and count of each band

NEAREST = f"""
import numpy, sys
from sklearn.neighbors import KNeighborsClassifier
from sklearn.preprocessing import StandardScaler
data, examples, bands = sys.argv[1], numpy.load(sys.argv[2]), int(sys.argv[3])
values = numpy.fromfile(data, numpy.float32, offset=1024).reshape(-1, bands, {ATTRIBUTES})[:, :, :2].reshape(-1, 2 * bands)
values = StandardScaler().fit_transform(values.astype(numpy.float64))
model = KNeighborsClassifier(5, n_jobs=-1).fit(values[examples[:, 1]], examples[:, 0])
numpy.save(sys.argv[4], model.predict(values))
"""
PAINT = """
import numpy, sys
from osgeo import gdal
labels = gdal.Open(sys.argv[1]).ReadAsArray()
scores = numpy.fromfile(sys.argv[2], numpy.float32, offset=1024).reshape(-1, 6)
classes = numpy.where(scores.max(axis=1) > 0, scores.argmax(axis=1) + 1, 0).astype(numpy.uint8)
classes[0] = 7
painted = numpy.take(classes, labels)
out = gdal.GetDriverByName("GTiff").Create(sys.argv[3], labels.shape[1], labels.shape[0], 1, gdal.GDT_Byte, ["TILED=YES"])
out.GetRasterBand(1).WriteArray(painted)
"""


def array(values, width=0):
    dims = f"2:{len(values) // width} {width} " if width else f"1:{len(values)} "
    return f"{dims}[{' '.join(map(str, values))}] "


def write_job(path, *steps):
    text = "<Job><Reasons/>"
    for number, (command, inputs, *output) in enumerate(steps):
        behind = f'<DependsOn Name="s{number - 1}"/>' if number else ""
        texts = "".join(f'<Input {key}="{value}"/>' for key, value in inputs.items())
        out = f'<Output URI="{output[0]}"/>' if output else ""
        text += f'<Command ID="{command}" Name="s{number}">{behind}{out}{texts}</Command>'
    path.write_text(text + "</Job>")


def make_store(path, numbers, bands, attributes):
    with open(path, "wb") as out:
        out.write((b"FXA50" + struct.pack("<HH", bands, attributes)).ljust(1024, b"\0"))
        numbers.astype("<f4").tofile(out)


def nearest(bench):
    """1,000,000 regions of 4 bands, 8 attributes, 5,000 examples of 6 classes that overlap."""
    import numpy
    random, count, bands = numpy.random.default_rng(3), 1000000, 4
    store, examples_file = bench.work / "million.spectral.fxa", bench.work / "examples.npy"
    classes = random.integers(0, 6, count)
    centres = random.uniform(60, 200, (6, bands))
    values = numpy.empty((count, bands, ATTRIBUTES), numpy.float32)
    values[:, :, 0] = centres[classes] + random.normal(0, 25, (count, bands))
    values[:, :, 1] = random.gamma(4, 3, (count, bands))
    values[:, :, 2:] = values[:, :, :1]
    make_store(store, values, bands, ATTRIBUTES)
    regions = random.choice(numpy.arange(1, count), 5000, replace=False)
    numpy.save(examples_file, numpy.stack([classes[regions], regions], axis=1))
    job, scores, stats = bench.work / "nearest.xml", bench.work / "million.fxc", bench.work / "million.fxas"
    examples = [number for region in regions for number in (classes[region], region)]
    used = [number for band in range(bands) for attribute in (0, 1) for number in (0, attribute, band)]
    write_job(job, ("FxComputeAttributesStatsCommand", {"AttributeFXA": store.resolve(), "StatsFXAS": stats.resolve()}),
              ("FxComputeKNNClassificationCommand", {
                  "ExampleDefinition": array(examples, 2), "Neighbors": 5, "AttributesFXA": store.resolve(),
                  "StatsFXAS": stats.resolve(), "AttributeDefinition": array(used, 3), "ClassFXC": scores.resolve(),
                  "Scores": "Votes"}))
    bench.compare("nearest of 5,000, 1,000,000 regions", [bench.vexg, "run", job], {
        "scikit-learn": ["/usr/bin/python3", "-c", NEAREST, store, examples_file, bands, bench.work / "predicted.npy"]},
                  0.3, [scores, stats])


def paint(bench, make_regions):
    """Cells of 4 pixels, a quarter of a million to a million of them."""
    import numpy
    size = bench.options.size
    labels = bench.work / f"regions-{size}-4.tif"
    if not labels.exists():
        maker = multiprocessing.get_context("spawn").Process(target=make_regions, args=(labels, size, 4))
        maker.start()
        maker.join()
    scores, job = bench.work / "cells.fxc", bench.work / "paint.xml"
    out, theirs = bench.work / "painted.tif", bench.work / "painted-by-numpy.tif"
    make_store(scores, numpy.random.default_rng(4).random((size * size // 12, 6)), 1, 6)
    write_job(job, ("OpenRasterCommand", {"ConnStr": labels.resolve()}, "$labels"),
              ("CreateRasterCommand", {"ConnStr": out.resolve(), "SrcURI": "$labels", "Format": "TIFF", "Bands": 1,
                                       "DataType": "Byte"}, "$out"),
              ("FxCreateRegionClassificationRasterCommand", {"LabelURI": "$labels", "ClassFXC": scores.resolve(),
                                                             "OutURI": "$out"}),
              ("CloseRasterCommand", {"URI": "$out"}), ("CloseRasterCommand", {"URI": "$labels"}))
    bench.compare(f"painting {size} x {size}", [bench.vexg, "run", job], {
        "numpy take": ["/usr/bin/python3", "-c", PAINT, labels, scores, theirs]}, 0.3, [out, theirs])


def make_labelled(scene, train, check, real, size):
    """Fields of six classes, each with the pixels of the real scene where it is of that class."""
    import numpy
    from osgeo import gdal, ogr, osr
    from scipy import ndimage, spatial
    from sklearn.cluster import KMeans
    gdal.UseExceptions()
    random = numpy.random.default_rng(8)
    pixels = gdal.Open(str(real)).ReadAsArray().astype(numpy.float32)
    bands, height, width = pixels.shape
    smooth = numpy.stack([ndimage.uniform_filter(band, 5) for band in pixels]).reshape(bands, -1).T
    # Seven classes of the real scene that overlap: the nearest centre of blurred pixels.
    found = KMeans(6, n_init=4, random_state=1).fit_predict(smooth)
    per = [numpy.flatnonzero(found == c) for c in range(6)]
    points = random.random((size * size // 900, 2)) * size
    fields = spatial.cKDTree(points).query(numpy.indices((size, size)).reshape(2, -1).T)[1].reshape(size, size)
    known = random.integers(0, 6, len(points))
    made = numpy.empty((bands, size, size), numpy.float32)
    flat = pixels.reshape(bands, -1)
    shift = random.normal(0, 4, (len(points), bands))  # no two fields of a class are alike
    for c in range(6):
        y, x = numpy.nonzero(known[fields] == c)
        chosen = per[c][random.integers(0, len(per[c]), len(x))]
        made[:, y, x] = flat[:, chosen] + shift[fields[y, x]].T
    made += random.normal(0, 3, made.shape)
    driver = gdal.GetDriverByName("GTiff")
    out = driver.Create(str(scene), size, size, bands, gdal.GDT_Byte, ["TILED=YES"])
    out.SetGeoTransform((600000, 30, 0, 5000000, 0, -30))
    system = osr.SpatialReference()
    system.ImportFromEPSG(32633)
    out.SetProjection(system.ExportToWkt())
    out.WriteArray(numpy.clip(made, 0, 255).astype(numpy.uint8))
    centres = numpy.array(ndimage.center_of_mass(numpy.ones_like(fields), fields, numpy.arange(len(points))))
    names = ["water", "forest", "meadow", "wheat", "soil", "town"]
    for path, first in ((train, 0), (check, 1)):
        target = ogr.GetDriverByName("GPKG").CreateDataSource(str(path))
        layer = target.CreateLayer("samples", system, ogr.wkbPoint)
        layer.CreateField(ogr.FieldDefn("cover", ogr.OFTString))
        layer.CreateField(ogr.FieldDefn("code", ogr.OFTInteger))
        layer.StartTransaction()
        for place in range(first, len(points), 2 if len(points) < 4000 else 40):
            y, x = centres[place]
            if not numpy.isfinite(y) or fields[int(y), int(x)] != place:
                continue
            feature = ogr.Feature(layer.GetLayerDefn())
            feature["cover"], feature["code"] = names[known[place]], int(known[place])
            feature.SetGeometry(ogr.CreateGeometryFromWkt(f"POINT({600000 + 30 * (x + 0.5)} {5000000 - 30 * (y + 0.5)})"))
            layer.CreateFeature(feature)
        layer.CommitTransaction()


def join_samples(out, zones, train):
    """The zones that samples lie in, with the classes of these."""
    from osgeo import ogr
    ogr.UseExceptions()
    zones_file, train_file = ogr.Open(str(zones), 1), ogr.Open(str(train))
    zones_file.ExecuteSQL(f"CREATE SPATIAL INDEX ON \"{zones.stem}\"")
    layer = zones_file.GetLayer()
    target = ogr.GetDriverByName("ESRI Shapefile").CreateDataSource(str(out))
    made = target.CreateLayer(out.stem, layer.GetSpatialRef(), ogr.wkbPolygon)
    for number in range(layer.GetLayerDefn().GetFieldCount()):
        made.CreateField(layer.GetLayerDefn().GetFieldDefn(number))
    made.CreateField(ogr.FieldDefn("code", ogr.OFTInteger))
    for sample in train_file.GetLayer():
        layer.SetSpatialFilter(sample.GetGeometryRef())
        for zone in layer:
            feature = ogr.Feature(made.GetLayerDefn())
            feature.SetFrom(zone)
            feature["code"] = sample["code"]
            made.CreateFeature(feature)
            break


def labelled(bench, size):
    scene, train, check = (bench.work / f"labelled-{size}{end}" for end in (".tif", "-train.gpkg", "-check.gpkg"))
    if not scene.exists():
        real = bench.real_scene()
        maker = multiprocessing.get_context("spawn").Process(target=make_labelled, args=(scene, train, check, real, size))
        maker.start()
        maker.join()
        if maker.exitcode != 0:
            raise SystemExit(f"{scene} could not be made")
    return scene, train, check


def write_recipe(path, train, check, method="knn", use=None):
    recipe = {"segment": {"mergePercent": 90}, "attributes": {"spectral": True},
              "classify": {"samples": str(train.resolve()), "field": "cover", "method": method},
              "accuracy": {"samples": str(check.resolve()), "field": "cover"}}
    if use:
        recipe["classify"]["use"] = use
    path.write_text(json.dumps(recipe))


def chain(bench):
    """From a scene of 6 bands to its map of classes; the model of the peer is trained beforehand."""
    size = bench.options.size
    scene, train, check = labelled(bench, size)
    recipe, results = bench.work / "recipe.json", bench.work / "analysis"
    write_recipe(recipe, train, check)
    peers = {}
    if shutil.which("otbcli_Segmentation"):
        zones, stats, classes = (bench.work / f"otb-{name}" for name in ("zones.shp", "stats.shp", "classes.tif"))
        fields = [f"mean_{band}" for band in range(6)]
        segment = ["otbcli_Segmentation", "-in", scene, "-filter", "watershed", "-filter.watershed.threshold", "0.01",
                   "-filter.watershed.level", "0.1", "-mode", "vector", "-mode.vector.out", zones, "-mode.vector.outmode",
                   "ovw", "-mode.vector.tilesize", "1024"]
        zonal = ["otbcli_ZonalStatistics", "-in", scene, "-inzone", "vector", "-inzone.vector.in", zones, "-out", "vector",
                 "-out.vector.filename", stats]
        model = bench.work / f"otb-model-{size}.txt"
        if not model.exists():
            for step in (segment, zonal):
                bench.once(step)
            samples = bench.work / "otb-train.shp"
            maker = multiprocessing.get_context("spawn").Process(target=join_samples, args=(samples, stats, train))
            maker.start()
            maker.join()
            bench.once(["otbcli_TrainVectorClassifier", "-io.vd", samples, "-io.out", model, "-feat", *fields, "-cfield",
                        "code", "-classifier", "knn"])
        peers["Orfeo ToolBox"] = [segment, zonal,
                                  ["otbcli_VectorClassifier", "-in", stats, "-model", model, "-feat", *fields, "-cfield",
                                   "found"],
                                  ["otbcli_Rasterization", "-in", stats, "-out", classes, "uint8", "-im", scene, "-mode",
                                   "attribute", "-mode.attribute.field", "found"]]
    ours = ["sh", "-c", f"rm -rf {results}; exec {bench.vexg} analyze {scene} --recipe {recipe} -o {results} -q"]
    bench.compare(f"chain, {size} x {size} x 6", ours, peers, 0.2)


def speed(bench, make_regions):
    nearest(bench)
    paint(bench, make_regions)
    chain(bench)


def quality(bench):
    """Accuracy on fields with the pixels of a real scene, beside scikit-learn's on the same attributes."""
    import numpy
    from osgeo import gdal, ogr
    from sklearn.discriminant_analysis import LinearDiscriminantAnalysis
    from sklearn.metrics import accuracy_score, cohen_kappa_score, confusion_matrix, f1_score
    from sklearn.neighbors import KNeighborsClassifier
    from sklearn.preprocessing import StandardScaler
    gdal.UseExceptions()
    scene, train, check = labelled(bench, 900)
    recipe, results = bench.work / "recipe.json", bench.work / "quality"
    use = [f"{name}_b{band}" for band in range(6) for name in ("mean", "std")]

    def samples(path, labels):
        source = ogr.Open(str(path))  # which has to outlive its layer
        rows = [(f["cover"], f.GetGeometryRef().GetX(), f.GetGeometryRef().GetY()) for f in source.GetLayer()]
        return [(name, labels[int((5000000 - y) / 30), int((x - 600000) / 30)]) for name, x, y in rows]

    print("| method | vexg | scikit-learn | report equals sklearn.metrics |")
    print("|---|---|---|---|")
    for method, model in (("knn", KNeighborsClassifier(5)), ("pca", LinearDiscriminantAnalysis())):
        shutil.rmtree(results, ignore_errors=True)
        write_recipe(recipe, train, check, method, use)
        bench.once([bench.vexg, "analyze", scene, "--recipe", recipe, "-o", results, "-q"])
        report = json.loads((results / "accuracy.json").read_text())
        labels = gdal.Open(str(results / "segments.tif")).ReadAsArray()
        stored = numpy.fromfile(results / "attributes.spectral.fxa", numpy.float32, offset=1024).reshape(-1, 6, ATTRIBUTES)
        there = stored[:, 0, 4] > 0
        values = StandardScaler().fit(stored[there, :, :2].reshape(-1, 12)).transform(stored[:, :, :2].reshape(-1, 12))
        known = samples(train, labels)
        regions = sorted({region for _, region in known})
        votes = {region: [name for name, r in known if r == region] for region in regions}
        classes = [max(sorted(set(votes[r])), key=votes[r].count) for r in regions]
        truth = samples(check, labels)
        predicted = model.fit(values[regions], classes).predict(values[[region for _, region in truth]])
        theirs = accuracy_score([name for name, _ in truth], predicted)
        # The report's figures of our own map by the definitions of sklearn.metrics.
        names = [c["class"] for c in report["classes"]]
        painted = gdal.Open(str(results / "classes.tif")).ReadAsArray()
        pairs = [(name, names[number - 1]) for name, number in samples(check, painted)]
        a, b = zip(*pairs)
        same = (numpy.array_equal(confusion_matrix(a, b, labels=names), report["matrix"])
                and abs(accuracy_score(a, b) - report["overall"]["share"]) < 1e-12
                and abs(cohen_kappa_score(a, b) - report["kappa"]) < 1e-12
                and numpy.allclose(f1_score(a, b, labels=names, average=None), [c["f1"] for c in report["classes"]]))
        print(f"| {method} | {report['overall']['share']:.4f} | {theirs:.4f} | {'yes' if same else 'NO'} |", flush=True)
