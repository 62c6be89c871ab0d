"""Segments, what they are like, and their classes."""

import colorsys
import os

import numpy

from . import _tables, _values
from ._doors import job_node
from ._jobs import Draft, Node, named_inputs
from ._watch import watch
from ._workspace import Workspace
from .errors import Error
from .raster import Raster, door_of
from .vectors import Polygons, _vector_file, class_field

_ALGORITHMS = {"sobel": 1, "mean": 2}
_MERGES = {"schedule": 1, "rigorous": 2}
_KINDS = {"spectral": "SpectralFXA", "texture": "TextureFXA", "entropy": "EntropyFXA", "shape": "SpatialFXA"}


def segment(raster, *, merge=None, merge_value=None, flat=None, flat_value=None, algorithm="sobel",
            merge_by="schedule", merge_on=None, tree=False, progress=False, **options):
    """Divides a raster into segments of alike pixels: a watershed of its gradients, whose basins are
    merged while their bands are alike (docs/segmentation.md).

    Args:
        merge: the percentage of all merges to do.
        merge_value: the cost up to which segments are merged, in place of `merge`.
        flat: the percentage of the pixels whose gradients are one flat level.
        flat_value: gradients up to this one are one flat level, in place of `flat`.
        algorithm: "sobel" or "mean", how gradients are found.
        merge_by: "schedule" or "rigorous".
        merge_on: another raster whose bands drive merging; the raster itself by default.
        tree: True, or the name of a file, to keep all merges for other costs.
        options: further inputs of FxTileSegmentMergeCommand by Python names, such as min_size=20.
    """
    for name, given in (("merge", merge), ("flat", flat)):
        if given is not None and not 0 <= given <= 100:
            raise ValueError(f"{name}: 0 to 100 percent, and not {given}")
    if merge is not None and merge_value is not None:
        raise TypeError("merge and merge_value exclude each other")
    if flat is not None and flat_value is not None:
        raise TypeError("flat and flat_value exclude each other")
    number, by = _choice("algorithm", algorithm, _ALGORITHMS), _choice("merge_by", merge_by, _MERGES)
    further = named_inputs("FxTileSegmentMergeCommand", options)
    workspace = Workspace()
    if tree:
        tree = workspace.path("segments.tree") if tree is True else os.path.abspath(os.fspath(tree))
        further.update(named_inputs("FxTileSegmentMergeCommand", {"tree": tree}))
    image = job_node(raster._chain())
    driver = image if merge_on is None else job_node(merge_on._chain())
    draft = Draft()
    draft.step("target", "CreateRasterCommand", {
        "ConnStr": workspace.path("segments.dat"), "SrcURI": image, "Format": "ORVA", "Details": "Told",
        "NoDataValue": [0], "DataType": "Int32", "Bands": 1}, {"URI": "target"})
    in_tree = tree and merge is not None
    draft.step("fit", "FitSegmentationCommand", {
        "SegmentURI": image, "SegmentAlgorithm": number, "SegmentValue": flat_value, "SegmentPercent": flat,
        "MergeURI": driver, "MergePercent": None if in_tree else merge},
        {"MinGradient": "least", "MaxGradient": "most", "StretchValue": "levels", "SegmentValue": "flat",
         "MergeValue": "cost"})
    cost = {"MergePercent": merge} if in_tree else {"MergeValue": "$cost" if merge_value is None else merge_value}
    draft.step("make", "FxTileSegmentMergeCommand", {
        "SegmentURI": image, "SegmentAlgorithm": number, "SegmentValue": "$flat", "MinGradient": "$least",
        "MaxGradient": "$most", "MergeURI": driver, "StretchValue": "$levels", "LambdaEstimate": False,
        "LabelURI": "$target", "MergeAlgorithm": by, **cost, "Seamless": True, "Sums": "Exact", **further})
    draft.step("finish", "CloseRasterCommand", {"URI": "$target"})
    results = watch(lambda task: raster._door.run(draft, task), progress, "segments")
    if results.text("finish", "Fault"):
        raise Error(results.text("finish", "Fault"), "CloseRasterCommand", "finish")
    return Segments(workspace.source("segments.dat", [draft]), raster, tree or None)


def _choice(name, word, choices):
    if word not in choices:
        raise ValueError(f"{name} is one of {', '.join(choices)}, and not {word!r}")
    return choices[word]


def open_labels(file, image, **options):
    """Opens a raster of labels, such as segments that were saved, as the segments of an image."""
    from .raster import open as open_raster

    return Segments(open_raster(file, **options)._node, image)


class Segments(Raster):
    """A raster of the numbers of segments, with the raster that they are of.

    Attributes:
        image: the raster that they are segments of.
        tree: the file of their tree of merges; None without.
    """

    def __init__(self, node, image, tree=None):
        super().__init__(node, door_of([image]))
        self.image = image
        self.tree = tree
        self._records = None  # the attributes that were computed last

    def __getstate__(self):
        return {**super().__getstate__(), "image": self.image, "tree": self.tree, "_records": None}

    def _saved_as(self, made):
        return Segments(made._node, self.image, self.tree)

    def _tree(self):
        if self.tree is None:
            raise Error("there is no tree of these segments; segment(tree=True) keeps one")
        return self.tree

    def cut(self, value=None, *, percent=None):
        """Shows the segments that its tree has at another cost, those of segment with this merge_value; nothing
        is segmented again.

        Args:
            value: the cost up to which segments are merged; 0 for the basins themselves.
            percent: the percentage of all merges to do, in place of `value`.
        """
        if (value is None) == (percent is None):
            raise TypeError("cut takes either a value or percent")
        if not (percent is None or 0 <= percent <= 100) or not (value is None or value >= 0):
            raise ValueError("costs are not below 0, and percentages 0 to 100")
        name, number = ("MergeValue", value) if percent is None else ("MergePercent", percent)
        inputs = (("Tree", self._tree()), (name, _values.number_text(float(number))))
        node = Node("CreateTreeLabelsRasterCommand", inputs)
        node.keep, node.recipe = self._node.keep, self._node.recipe
        return Segments(node, self.image, self.tree)

    def levels(self, values):
        """The segments of its tree at several costs, in ascending order: a list of Segments, and a DataFrame
        with a row for each segment of each level: level from 1 on, cost, segment, its pixels, and the segment
        of the next level that it lies in."""
        values = [float(value) for value in values]
        if not values or sorted(set(values)) != values or values[0] < 0:
            raise ValueError("levels takes costs in ascending order")
        workspace = Workspace()
        file = workspace.path("levels.csv")
        draft = Draft()
        draft.step("levels", "CreateTreeLevelsTableCommand", {"Tree": self._tree(), "MergeValues": values, "Table": file})
        watch(lambda task: self._door.run(draft, task))
        return [self.cut(value) for value in values], _tables.read_csv(file)

    def suggest(self, least_prominence=0.1):
        """Finds costs at which its segments are likely to be whole objects (docs/segmentation.md): a
        Suggestion.

        Args:
            least_prominence: peaks are left out whose prominence is a smaller share of the highest, 0 to 1.
        """
        draft = Draft()
        draft.step("scales", "SuggestSegmentScalesCommand",
                   {"Tree": self._tree(), "LeastProminence": float(least_prominence)})
        return Suggestion(watch(lambda task: self._door.run(draft, task)).values("scales"))

    def attributes(self, *kinds, bands=None, kernel=3, geometry=None, progress=False):
        """What its segments are like: a DataFrame with a row for each label, or a list of dictionaries;
        docs/attributes.md has the formulas.

        Args:
            kinds: of "spectral" (mean, deviation, extremes and count of each band), "texture" and
                "shape"; by default the first and the last.
            bands: of the image; all by default.
            kernel: the side of the windows of textures, in pixels.
            geometry: whether there is a column of their polygons; by default where geopandas is
                installed, which then makes a GeoDataFrame.
        """
        records = self._compute(kinds or ("spectral", "shape"), bands, kernel, progress)
        labels, columns = records.columns()
        if geometry is None:
            geometry = _has_geopandas()
        if not geometry:
            return _tables.labelled(labels, columns)
        table = _tables.geo_table({"label": labels, **columns}, self._shapes_of(labels, progress), self.crs)
        return table if isinstance(table, list) else table.set_index("label")

    def _compute(self, kinds, bands, kernel, progress):
        for kind in kinds:
            if kind not in ("spectral", "texture", "shape"):
                raise ValueError(f"{kind!r} is none of spectral, texture and shape")
        kinds = tuple(dict.fromkeys(kinds))
        image = self.image if bands is None else self.image.bands(bands)
        numbers = range(self.image.count) if bands is None else self.image._bands_of(bands, self.image.count)[0]
        records = _Records(kinds, [int(number) for number in numbers])
        labels = job_node(self._labels_node())
        draft = Draft()
        pixels = [kind for kind in kinds if kind != "shape"]
        if pixels:
            files = {_KINDS[kind]: records.file(kind) for kind in records.kinds if kind != "shape"}
            draft.step("pixels", "FxComputePixelAttributesCommand", {
                "SrcURI": job_node(image._chain()), "LabelURI": labels, "Values": pixels,
                "TextureKernelSize": int(kernel) if "texture" in kinds else None, "Sums": "Exact", **files})
        if "shape" in kinds:
            draft.step("shapes", "FxComputeVectorAttributesCommand", {
                "LabelURI": labels, "SpatialFXA": records.file("shape"), "Parts": "Together",
                **self._pixel_size()})
        watch(lambda task: self._door.run(draft, task), progress, "attributes")
        records.draft = draft
        records.look(self._door)
        self._records = records
        return records

    def _labels_node(self):
        """The node of the labels as numbers of 32 bits."""
        if self.dtype.itemsize < 4:
            return self._view("CreateLabelsRasterCommand", {})._chain()
        return self._chain()

    def _pixel_size(self):
        grid = self._grid()
        if grid is None:
            return {}
        return {"PixelXSize": float(numpy.hypot(grid[1], grid[4])), "PixelYSize": float(numpy.hypot(grid[2], grid[5]))}

    def _shapes_of(self, labels, progress):
        """The shapes of labels as WKB; None for one without pixels."""
        from .vectors import polygonize

        found = polygonize(self, progress=progress)
        shapes = found.wkb
        order = numpy.argsort(found.labels, kind="stable")
        places, ordered = order.tolist(), found.labels[order]
        starts = numpy.searchsorted(ordered, labels, "left").tolist()
        ends = numpy.searchsorted(ordered, labels, "right").tolist()
        return [shapes[places[start]] if end - start == 1 else _joined([shapes[place] for place in places[start:end]])
                for start, end in zip(starts, ends)]

    def classify(self, samples=None, *, field=None, layer=None, method="knn", neighbors=5, use=None, rules=None,
                 progress=False):
        """Gives its segments classes, from samples of known ones; docs/classification.md has the methods.

        Args:
            samples: a vector file of points or shapes, or a GeoDataFrame.
            field: the field with the class of a sample; "class", or the one field of texts, by default.
            method: "knn", the votes of the nearest examples, or "pca", discriminants of the principal
                components.
            neighbors: how many examples vote.
            use: names of attributes that count, such as ["mean_b3", "area"]; by default all of those that
                were computed last, or else the spectral ones and those of shape.
            rules: in place of samples, rows for ClassDefinition, RuleDefinition and AttributeDefinition
                of FxComputeFuzzyClassificationCommand with the names of the classes first.
        """
        if (samples is None) == (rules is None):
            raise TypeError("classify takes either samples or rules")
        records = self._records or self._compute(("spectral", "shape"), None, 3, progress)
        workspace = Workspace()
        work = _Classification(self, records, workspace, method, neighbors)
        if rules is not None:
            work.take_rules(*rules)
        else:
            file = _vector_file(samples, workspace)
            work.take_samples(file, class_field(file, field, self._door), layer, records.rows(use))
        watch(work.make, progress, "classes")
        workspace.parts.append(records.workspace)
        return Classes(workspace.source("classes.tif", [records.draft, work.draft]), self._door, work.names)


class Suggestion:
    """Costs for Segments.cut at which segments are likely to be whole objects.

    Attributes:
        peaks: costs at which the local variance begins to change less with scale, the most prominent first.
        onsets: for each peak the cost in front of it at which its objects are whole yet.
        prominences: how far the rate falls on both sides of each peak, in percent.
        table: a DataFrame with a row for each cost: how many segments there are, their local variance, and the
            rate at which that changes.
    """

    def __init__(self, found):
        def list_of(name):
            return numpy.asarray(found.get(name, ()), dtype=float).ravel().tolist()

        self.peaks, self.onsets, self.prominences = (list_of(name) for name in ("Peaks", "Onsets", "Prominences"))
        self.table = _tables.table({"value": list_of("MergeValues"), "segments": [int(n) for n in list_of("Segments")],
                                    "local_variance": list_of("LocalVariance"), "rate": list_of("Rates")}, None)

    def __repr__(self):
        return f"<vexg.Suggestion of {len(self.peaks)} costs: {', '.join(f'{value:.4g}' for value in self.peaks[:5])}>"


class _Records:
    """The files of attributes of some segments."""

    def __init__(self, kinds, bands):
        self.kinds = [each for kind in kinds for each in ((kind, "entropy") if kind == "texture" else (kind,))]
        self._bands = bands
        self.workspace = Workspace()
        self.draft = None  # the job that made them
        self._known = {}  # the answers of QueryAttributesCommand

    def file(self, kind):
        """The file of a kind, by the ending of whose name the commands know it."""
        return self.workspace.path(f"segments.{kind}.fxa")

    def look(self, door):
        """Asks what the files hold."""
        draft = Draft()
        for kind in self.kinds:
            draft.step(kind, "QueryAttributesCommand", {"AttributeFXA": self.file(kind)})
        results = door.run(draft)
        self._known = {kind: results.values(kind) for kind in self.kinds}

    def places(self):
        """For each column its name, and the number of its file, attribute and band."""
        for number, kind in enumerate(self.kinds):
            told = self._known[kind]
            for band in range(told["Bands"]):
                for attribute, name in enumerate(told["Names"]):
                    if name == "presence" or (kind == "entropy" and attribute > 0):
                        continue
                    column = name if kind == "shape" else f"{name}_b{self._bands[band]}"
                    yield column, (number, attribute, band)

    def _array(self, kind):
        """The records of a file, an array of labels by bands by attributes."""
        told = self._known[kind]
        flat = numpy.fromfile(self.file(kind), dtype="<f4", offset=1024)
        return flat.reshape(-1, told["Bands"], told["Attributes"])

    def columns(self):
        """The labels that there are, and all columns by name."""
        arrays = [self._array(kind) for kind in self.kinds]
        count = max(len(array) for array in arrays)
        is_there = numpy.zeros(count, dtype=bool)
        for kind, array in zip(self.kinds, arrays):
            names = self._known[kind]["Names"]
            counts = [i for i, name in enumerate(names) if name in ("count", "texture_count", "presence")]
            is_there[:len(array)] |= (array[:, :, counts] > 0).any(axis=(1, 2)) if counts else False
        labels = numpy.flatnonzero(is_there)
        columns = {}
        for name, (number, attribute, band) in self.places():
            values = numpy.zeros(count, dtype="float32")
            values[:len(arrays[number])] = arrays[number][:, band, attribute]
            columns[name] = values[labels]
        return labels, columns

    def rows(self, use):
        """The rows of file, attribute and band of some columns, or all."""
        places = dict(self.places())
        if use is None:
            return list(places.values())
        for name in use:
            if name not in places:
                raise ValueError(f"there is no attribute {name!r}; there are {', '.join(places)}")
        return [places[name] for name in use]

    def files(self):
        """All files in their order."""
        return [self.file(kind) for kind in self.kinds]


class _Classification:
    """The jobs that give segments classes."""

    def __init__(self, segments, records, workspace, method, neighbors):
        if method not in ("knn", "pca"):
            raise ValueError(f"method is knn or pca, and not {method!r}")
        self._door = segments._door
        self._labels = job_node(segments._labels_node())
        self._records = records
        self._workspace = workspace
        self._method = method
        self._neighbors = neighbors
        self._samples = self._rules = self._rows = None
        self.names = []
        self.draft = None  # the job that makes the map

    def take_samples(self, file, field, layer, rows):
        """Has classes come from samples."""
        self._samples = {"Vectors": file, "ClassField": field, "Layer": None if layer is None else str(layer)}
        self._rows = rows

    def take_rules(self, names, classes, rules, tests):
        """Has classes come from rules."""
        self.names = list(names)
        self._rules = {"ClassDefinition": classes, "RuleDefinition": rules, "AttributeDefinition": tests}

    def make(self, task):
        """Makes the raster of classes."""
        if self._samples is not None:
            draft = Draft()
            draft.step("classes", "FindClassExamplesCommand", {"LabelURI": self._labels, **self._samples})
            found = self._door.run(draft, task).values("classes")
            self.names = found["Classes"]
            for name, count in zip(self.names, found["Counts"]):
                if count == 0:
                    raise Error(f"{self._samples['Vectors']}: class {name!r} hits no segment")
        self.draft = draft = Draft()
        draft.step("target", "CreateRasterCommand", {
            "ConnStr": self._workspace.path("classes.tif"), "SrcURI": self._labels, "Format": "TIFF",
            "Details": "Told", "NoDataValue": [len(self.names) + 1], "DataType": "Byte", "Bands": 1,
            "Categories": ["unclassified", *(name.replace("|", "/") for name in self.names)]}, {"URI": "target"})
        draft.step("palette", "SetRasterPaletteCommand", {
            "URI": "$target", "Band": 0,
            "Palette": [("none", 0, 0, 0, 255), *(("class", *_color_of(i), 255) for i in range(len(self.names)))]})
        scores = self._workspace.path("scores.fxc")
        if self._rules is not None:
            draft.step("score", "FxComputeFuzzyClassificationCommand", {
                **self._rules, "AttributesFXA": self._records.files(), "LabelValues": [4294967295],
                "ClassFXC": scores})
        else:
            self._add_scores(draft, scores)
        draft.step("make", "FxCreateRegionClassificationRasterCommand",
                   {"LabelURI": self._labels, "ClassFXC": scores, "OutURI": "$target"})
        draft.step("finish", "CloseRasterCommand", {"URI": "$target"})
        fault = self._door.run(draft, task).text("finish", "Fault")
        if fault:
            raise Error(fault, "CloseRasterCommand", "finish")

    def _add_scores(self, draft, scores):
        draft.step("examples", "FindClassExamplesCommand", {"LabelURI": self._labels, **self._samples},
                   {"ExampleDefinition": "examples"})
        statistics = []
        for i, file in enumerate(self._records.files()):
            statistics.append(self._workspace.path(f"{i}.fxas"))
            draft.step(f"stats{i}", "FxComputeAttributesStatsCommand",
                       {"AttributeFXA": file, "StatsFXAS": statistics[-1]})
        model = {"ExampleDefinition": "$examples", "AttributesFXA": self._records.files(), "StatsFXAS": statistics,
                 "AttributeDefinition": numpy.array(self._rows)}
        if self._method == "knn":
            draft.step("score", "FxComputeKNNClassificationCommand",
                       {**model, "Neighbors": int(self._neighbors), "ClassFXC": scores, "Scores": "Votes"})
            return
        parts = {"PCACoefficients": "coefficients", "Weights": "weights", "Thresholds": "thresholds"}
        draft.step("fit", "FitPCAModelCommand", model, parts)
        draft.step("score", "FxComputePCAClassificationCommand",
                   {**model, **{name: "$" + variable for name, variable in parts.items()}, "ClassFXC": scores})


def _color_of(index):
    """The colour of a class: hues a golden angle apart, so that neighbours in the list differ."""
    value = 0.9 if index % 2 == 0 else 0.7
    rgb = colorsys.hsv_to_rgb(index * 137.50776405 % 360 / 360, 0.7, value)
    return [int(255 * channel + 0.5) for channel in rgb]


class Classes(Raster):
    """A map of classes, whose values are numbers of classes from 1 on; 0 is no class.

    Attributes:
        class_names: the names of the numbers from 1 on.
    """

    def __init__(self, node, door, class_names):
        super().__init__(node, door)
        self.class_names = list(class_names)

    def __getstate__(self):
        return {**super().__getstate__(), "class_names": self.class_names}

    def _saved_as(self, made):
        return Classes(made._node, self._door, self.class_names)

    def polygons(self, band=0, *, min_size=None, progress=False):
        """Its areas as Polygons with the field class."""
        found = Polygons(self, band, min_size, "class", ["unclassified", *self.class_names])
        if progress:
            found._progress = progress
            found._find()
        return found

    def accuracy(self, samples, *, field=None, layer=None, where=None):
        """Compares it with samples of known classes: an Accuracy.

        Args:
            samples: a vector file of points or shapes, or a GeoDataFrame.
            field: the field with the class of a sample; see Segments.classify.
        """
        workspace = Workspace()
        file = _vector_file(samples, workspace)
        found = self._job("AccuracyCommand", {
            "Vectors": file, "ClassField": class_field(file, field, self._door), "Where": where,
            "Layer": None if layer is None else str(layer),
            "Classes": [name.replace("|", "/") for name in self.class_names]}, uri="MapURI")
        return Accuracy(found)


class Accuracy:
    """How a map of classes agrees with samples.

    Attributes:
        classes: their names, in the order of the matrix.
        matrix: samples: a row for each known class, a column for each class of the map.
        overall: the share of the samples whose class the map has.
        overall_interval: the bounds of its 95 % interval.
        kappa: the agreement beyond chance.
        outside: samples without a pixel that counts.
        no_class: samples on pixels of no class.
    """

    def __init__(self, found):
        self.classes = found["Classes"]
        count = len(self.classes)
        self.matrix = numpy.asarray(found["Matrix"]).reshape(count, -1)
        self.overall, *bounds = (float(value) for value in numpy.ravel(found["Overall"]))
        self.overall_interval = tuple(bounds)
        self.kappa = found["Kappa"]
        self.outside = found["Outside"]
        self.no_class = found["NoClass"]
        self._shares = {
            name: numpy.asarray(found[output], dtype=float).reshape(count, -1)[:, 0]
            for name, output in (("producer", "Producer"), ("user", "User"), ("f1", "F1"))}

    @property
    def table(self):
        """The accuracies of each class: of its samples the share that the map has (producer), of those
        that it has in the map the share that is right (user), and the harmonic mean of both."""
        return _tables.table({"class": self.classes, **self._shares}, None)

    def __repr__(self):
        return f"<vexg.Accuracy overall {self.overall:.3f}, kappa {self.kappa:.3f}>"


def _joined(parts):
    """One WKB shape of some polygons."""
    if not parts:
        return None
    return b"\x01\x06\x00\x00\x00" + len(parts).to_bytes(4, "little") + b"".join(parts)


def _has_geopandas():
    try:
        import geopandas  # noqa: F401
    except ImportError:
        return False
    return True
