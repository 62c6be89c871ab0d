"""Outputs: files that appear when they are whole, or not at all."""

import os
import pathlib
import shutil
import socket
import tempfile

import numpy

from . import _values
from ._doors import job_node
from ._jobs import Draft, Node, files_of, name_of, named_inputs, source_node
from ._watch import watch
from .errors import Error

_SIDES = (".hdr", ".aux.xml", ".ovr", ".msk", ".msk.ovr", ".pyr")
_SHAPE_SIDES = (".shx", ".dbf", ".prj", ".cpg", ".qpj", ".qix", ".sbn", ".sbx")
_FORMATS = {
    ".tif": "TIFF", ".tiff": "TIFF", ".png": "PNG", ".jpg": "JPEG", ".jpeg": "JPEG", ".bmp": "BMP",
    ".gif": "GIF", ".img": "Erdas", ".ntf": "NITF", ".nitf": "NITF", ".jp2": "JPEG2000", ".dat": "ORVA",
    ".bin": "ORVA", ".orva": "ORVA",
}  # fmt: skip


class Staged:
    """A file in the making, in a hidden folder beside its place.

        with Staged("out.tif", False, inputs) as staged:
            ...                        # makes staged.work
            staged.commit(task)        # moves it, and what lies beside it, to its place

    Without a commit nothing stays. What is there already is moved aside first, and back where a move
    fails.
    """

    def __init__(self, file, overwrite, inputs):
        """
        Args:
            inputs: files that may not be replaced.
        """
        self.target = pathlib.Path(os.path.abspath(name_of(file)))
        if "|" in str(self.target):
            raise ValueError(f"{file}: a name can't hold a bar")
        folder = self.target.parent
        if not folder.is_dir():
            raise Error(f"{folder}: there is no such folder")
        if self.target.is_dir():
            raise Error(f"{file}: is a folder")
        for other in inputs:
            if self.target.exists() and os.path.exists(other) and os.path.samefile(self.target, other):
                raise Error(f"{file}: is an input of the work")
        self._older = [path for path in self._family() if path.exists()]
        if self._older and not overwrite:
            raise Error(f"{self._older[0]}: is there already; overwrite=True replaces it")
        remove_abandoned(folder)
        try:
            self._folder = pathlib.Path(tempfile.mkdtemp(prefix=_mark() + "-", dir=folder))
        except OSError as fault:
            raise Error(f"{file}: can't be written: {fault.strerror}") from None
        self.work = self._folder / self.target.name

    def _family(self):
        """The files that go with the target, itself first."""
        yield self.target
        for ending in _SIDES:
            yield self.target.with_name(self.target.name + ending)
        if self.target.suffix.lower() == ".shp":
            for ending in _SHAPE_SIDES:
                yield self.target.with_suffix(ending)

    def __enter__(self):
        return self

    def __exit__(self, *_):
        shutil.rmtree(self._folder, ignore_errors=True)

    def commit(self, task=None):
        """Moves the files to their places. Raises Error, with everything as it was, where one can't be
        moved, or the task was aborted."""
        made = sorted(path for path in self._folder.iterdir() if path.is_file())
        if self.work not in made:
            raise Error(f"{self.target}: was not made")
        if task is not None and not task.begin_commit():
            raise Error("aborted")
        aside = self._folder / ".old"
        aside.mkdir()
        moved = []
        try:
            for path in self._older:
                self._move(path, aside / path.name, moved)
            # The file itself goes last: until then nobody takes what is there for the output.
            for path in [other for other in made if other != self.work] + [self.work]:
                self._move(path, self.target.parent / path.name, moved)
        except BaseException as fault:
            for source, place in reversed(moved):
                os.replace(place, source)
            if isinstance(fault, OSError):
                raise Error(f"{self.target}: can't be put in its place: {fault.strerror}") from None
            raise

    @staticmethod
    def _move(source, place, moved):
        os.replace(source, place)
        moved.append((source, place))


def _mark():
    """The beginning of the names of hidden folders of this process."""
    return f".vexg-{socket.gethostname()}-{os.getpid()}"


def remove_abandoned(folder):
    """Removes the hidden folders of processes of this machine that have ended."""
    ours = f".vexg-{socket.gethostname()}-"
    for path in pathlib.Path(folder).glob(".vexg-*"):
        process = path.name[len(ours):].split("-")[0] if path.name.startswith(ours) else ""
        if not process.isdigit() or (path / ".old").exists():
            continue
        try:
            os.kill(int(process), 0)
        except ProcessLookupError:
            shutil.rmtree(path, ignore_errors=True)
        except OSError:
            pass


def format_of(file, format):
    """The key of the format of a file that is made."""
    if format is not None:
        return format
    ending = pathlib.Path(os.fspath(file)).suffix.lower()
    if ending not in _FORMATS:
        raise Error(f"{file}: the name's ending tells no format; give format, one of vexg.formats()")
    return _FORMATS[ending]


def save(raster, file, overwrite, progress, format, nodata, options):
    """Writes a raster; see Raster.save."""
    from . import raster as rasters

    making = _Making(raster, format_of(file, format), nodata, named_inputs("CreateRasterCommand", options))
    staged = Staged(file, overwrite, files_of(raster._chain()))

    def make(task):
        with staged:
            making.make(str(staged.work), task)
            staged.commit(task)

    watch(make, progress, os.path.basename(os.fspath(file)))
    made = rasters.Raster(source_node(staged.target, None if format is None else format), raster._door)
    return raster._saved_as(made) if hasattr(raster, "_saved_as") else made


class _Making:
    """The jobs that write a raster into a file."""

    def __init__(self, raster, format, nodata, options):
        self._door = raster._door
        self._node = job_node(raster._chain())
        self._info = raster._describe()
        self._format = format
        self._options = options
        self._no_data = None
        commands = {node.command for node in self._node.everything()}
        self._is_projected = "CreateProjectedRasterCommand" in commands
        bands = self._info["bands"]
        if nodata is not None:
            self._no_data = numpy.full(bands, nodata, dtype=float)
        elif self._node.command == "CreateExpressionRasterCommand" and self._info["type"] in ("Single", "Double"):
            self._no_data = numpy.full(bands, numpy.nan)

    def make(self, work, task):
        """Writes the file, and looks whether it holds what was put in."""
        valid = self._write(work, task, self._no_data)
        pixels = self._info["lines"] * self._info["samples"]
        made = self._look(work, task, False)
        if (valid < pixels).any() and not numpy.array_equal(valid, made["ValidPixels"]):
            if self._no_data is not None and not self._has_plain_no_data():
                raise Error(f"the format {self._format} does not keep which pixels are valid")
            counted = self._look(work, task, True)
            needed = valid != made["ValidPixels"]
            if not counted["HasFreeValue"][needed].all():
                raise Error(f"the format {self._format} does not keep which pixels are valid, and no value is free "
                            "for those that are not")
            fill = numpy.where(needed, counted["FreeValue"], counted["FreeValue"][needed][0])
            os.remove(work)
            valid = self._write(work, task, fill)
            made = self._look(work, task, False)
            if not numpy.array_equal(valid, made["ValidPixels"]):
                raise Error(f"the format {self._format} does not keep which pixels are valid")

    def _has_plain_no_data(self):
        return all(value is None for value in self._info["noData"])

    def _write(self, work, task, no_data):
        draft = Draft()
        draft.step("target", "CreateRasterCommand", {
            "ConnStr": work, "SrcURI": self._node, "Format": self._format,
            "Details": "Bands" if self._is_projected else "All",
            "NoDataValue": None if no_data is None else no_data, **self._options}, {"URI": "target"})
        for band, palette in enumerate(self._info["palettes"]):
            if palette is not None:
                draft.step(f"palette{band}", "SetRasterPaletteCommand",
                           {"URI": "$target", "Band": band, "Palette": self._palette_text(band)})
        draft.step("make", "CopyRasterCommand", {
            "SrcURI": self._node, "DstURI": "$target", "Invalid": "NoData",
            "Blocks": "Told" if self._is_projected else "Stream"})
        draft.step("finish", "CloseRasterCommand", {"URI": "$target"})
        results = self._door.run(draft, task)
        fault = results.text("finish", "Fault")
        if fault:
            raise Error(fault, "CloseRasterCommand", "finish")
        return results.value("make", "ValidPixels")

    def _palette_text(self, band):
        draft = Draft()
        draft.step("palette", "GetRasterPaletteCommand", {"URI": self._node, "Bands": _values.array_text([band])})
        text = self._door.run(draft).text("palette", "Palettes")
        return text[text.index("[") + 1:text.rindex("]")].strip()

    def _look(self, work, task, with_values):
        """The valid pixels of the file. Raises Error where it is another raster than was put in."""
        draft = Draft()
        node = Node("OpenRasterCommand", (("ConnStr", f"{self._format}|{work}"), ("CheckSource", "Compared")))
        draft.step("query", "QueryRasterCommand", {"URI": node})
        draft.step("count", "QueryRasterValidityCommand", {"URI": node, "Values": with_values or None})
        results = self._door.run(draft, task)
        for name, output in (("samples", "Samples"), ("lines", "Lines"), ("bands", "Bands"), ("type", "DataType")):
            if results.value("query", output) != self._info[name]:
                raise Error(f"the format {self._format} did not keep the raster's size, bands or pixel type")
        return results.values("count")


def build_pyramid(raster, levels, progress):
    """Builds the pyramid file of a source; see Raster.pyramid."""
    node = raster._chain()
    inputs = dict(node.inputs)
    name = inputs.get("ConnStr", "").split("|")
    if node.command != "OpenRasterCommand" or len(name) != 1:
        raise Error("a pyramid is built of a file as vexg.open opens it; save the view first")
    info = raster._describe()
    if levels is None:
        side, levels = min(info["samples"], info["lines"]), 1
        while side >> (levels + 1) >= 64:
            levels += 1
    opening = Node("OpenRasterCommand", (("ConnStr", name[0]), ("CheckSource", "Compared"),
                                         ("PyramidConnStr", f"Pyramid|{name[0]}.pyr"), ("PyramidNew", "1")))
    draft = Draft()
    draft.step("build", "BuildRasterPyramidCommand", {
        "URI": opening, "PyramidType": "ORVA", "PyramidResamplingMethod": "Nearest", "PyramidLevelMin": 1,
        "PyramidLevelMax": levels, "PyramidCanBuild": True,
        "TileDimensions": "128 128 0 0 0 0 0 Invariable", "Bins": "Exact"})
    # The raster may be open without a pyramid, for views too: whoever opens it then shares that.
    raster._door.close_all()
    watch(lambda task: raster._door.run(draft, task), progress, "pyramid")
    raster._node = source_node(name[0])
    raster._info = None


def formats(door=None):
    """The formats that can be read or made here, as a table."""
    from . import _tables
    from ._doors import local

    draft = Draft()
    draft.step("list", "ListFormatsCommand", {})
    found = (door or local).run(draft).values("list")
    return _tables.table({
        "format": found["Formats"], "kind": ["raster" if kind == 1 else "vector" for kind in found["Kinds"]],
        "plugin": found["Plugins"], "available": found["Available"]}, None)
