"""The two ways to the commands and pixels of vexg: the library in this process, and a server."""

import ctypes
import json

from ._jobs import ArrayNode, Draft, Results
from ._library import Block, library
from .errors import Error


class LocalDoor:
    """The library in this process."""

    def run(self, draft, task=None):
        """Runs a job; gives its Results. Raises Error for the first step that failed, or where the
        task was aborted."""
        return Results(self.run_document(draft.write(), task), draft)

    def run_document(self, document, task=None):
        """Runs a job document, and gives the result document."""
        if task is None:
            return library.run(document)
        result = library.run(document, task.abort, task.progress)
        if task.is_aborted:
            raise Error("aborted")
        return result

    def describe(self, node):
        """The description of a raster, as docs/c-door.md tells it."""
        try:
            return json.loads(library.describe(node.document()))
        except Error:
            raise self._explain(node) from None

    def _explain(self, node):
        """The failure of a chain, with the command that failed."""
        try:
            Results(library.run(Draft().write([node])), Draft())
        except Error as failure:
            return failure
        return Error("the raster could not be opened")

    def read(self, node, rect, bands, order, code, pixels, states, task=None):
        """Fills an array with the pixels of a raster.

        Args:
            rect: left, top, right and bottom, inclusive.
            bands: an array of uint32.
            order: of the axes in memory: 0 BIP, 1 BIL, 2 BSQ.
            pixels: an array whose memory is one block in that order.
            states: the same of uint8; None for none.
        """
        block = Block(rect, bands.ctypes.data, bands.size, order, code, 0, pixels.ctypes.data,
                      pixels.nbytes, None if states is None else states.ctypes.data)
        library.read(node.document(), block, None if task is None else ctypes.addressof(task.abort))

    def write(self, uri, rect, bands, order, code, pixels, states):
        """Writes an array to an open raster; arguments as of read."""
        block = Block(rect, bands.ctypes.data, bands.size, order, code, 0, pixels.ctypes.data,
                      pixels.nbytes, None if states is None else states.ctypes.data)
        library.write(f"[{uri}] ".encode(), block)

    def close(self, node):
        """Lets go of a raster that was read."""
        library.close(node.document())

    def close_all(self):
        """Lets go of all rasters that were read; they open again as they are asked for."""
        library.close(None)

    def __reduce__(self):
        return "local"

    def __repr__(self):
        return "in this process"


local = LocalDoor()


def job_node(node):
    """The chain for a job, whose arrays in memory have names of their own: what was computed from
    the pixels of one before doesn't hold any more."""
    return node.with_sources(lambda each: each.fresh() if isinstance(each, ArrayNode) else None)
