"""Folders for files that results stand on, which go when nothing stands on them any more."""

import os
import shutil
import tempfile
import weakref

from ._jobs import source_node


def _remove(folder, maker):
    """Removes a folder; not in a process that was forked from the one that made it."""
    if os.getpid() == maker:
        shutil.rmtree(folder, ignore_errors=True)


class Workspace:
    """A folder of its own in the system's place for temporary files.

    Attributes:
        folder: its path.
        parts: further workspaces, of files that those in it were made from.
    """

    def __init__(self):
        self.parts = []
        self.folder = tempfile.mkdtemp(prefix="vexg-")
        self._end = weakref.finalize(self, _remove, self.folder, os.getpid())

    def path(self, name):
        """The path of a file in it."""
        return f"{self.folder}/{name}"

    def source(self, name, recipe):
        """The node of a raster in it, which keeps the folder.

        Args:
            recipe: the Drafts that have made it, in their order.
        """
        node = source_node(self.path(name))
        node.keep, node.recipe = self, tuple(recipe)
        return node
