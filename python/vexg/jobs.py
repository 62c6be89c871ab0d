"""Job documents of rasters, for a server, a cluster or `vexg run`."""

import os

from ._doors import local
from ._jobs import ArrayNode, Draft, Results
from ._saving import format_of
from ._watch import watch
from .errors import Error


def job(raster, output=None, *, format=None, folder=None):
    """The job that makes a raster from its sources, as a document.

    Args:
        output: the file that the job writes it to. By default the job opens the raster, for a client
            that asks for its pixels, and does nothing else.
        format: the key of the format of the output; by default that of the name's ending.
        folder: where files in between are made, such as segments; the current one by default.
    """
    return Job(raster, output, format, folder)


class Job:
    """A job document.

    Attributes:
        document: its text.
    """

    def __init__(self, raster, output, format, folder):
        draft, workspaces = Draft(), []
        node = raster._chain()
        self._collect(node, draft, workspaces, set())
        if output is not None:
            draft.step("target", "CreateRasterCommand", {
                "ConnStr": os.path.abspath(os.fspath(output)), "SrcURI": node, "Details": "All",
                "Format": format_of(output, format)}, {"URI": "target"})
            draft.step("make", "CopyRasterCommand", {"SrcURI": node, "DstURI": "$target", "Invalid": "NoData"})
            draft.step("finish", "CloseRasterCommand", {"URI": "$target"})
        self._draft = draft
        self.document = draft.write([] if output is not None else [node], closes=output is not None)
        for workspace in workspaces:
            place = os.path.join(os.path.abspath(os.fspath(folder or ".")), os.path.basename(workspace.folder))
            self.document = self.document.replace(workspace.folder + "/", place + ".")

    def _collect(self, node, draft, workspaces, done):
        """Adds the jobs that made the files that a chain stands on, each once."""
        for each in node.everything():
            if isinstance(each, ArrayNode):
                raise Error("an array in memory can't be part of a document; save it first")
            if each.keep is not None:
                workspaces.extend([each.keep, *each.keep.parts])
            for recipe in each.recipe:
                if id(recipe) in done:
                    continue
                done.add(id(recipe))
                for below in recipe.nodes():
                    self._collect(below, draft, workspaces, done)
                draft.extend(recipe, f"m{len(done)}.")

    def save(self, file):
        """Writes the document to a file."""
        with open(file, "w", encoding="utf-8") as out:
            out.write(self.document)

    def run(self, *, server=None, progress=False):
        """Runs it, and gives the outputs of its steps by name, as dictionaries."""
        door = local if server is None else server._door
        text = watch(lambda task: door.run_document(self.document, task), progress, "job")
        results = Results(text, self._draft)
        return {name: results.values(name) for name, *_ in self._draft.steps}

    def __str__(self):
        return self.document

    def __repr__(self):
        return f"<vexg.Job of {self.document.count('<Command ')} commands>"
