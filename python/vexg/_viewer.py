"""The page of `vexg view` on rasters of this process."""

import os
import subprocess

from ._jobs import files_of, source_node
from .errors import Error


class Viewer:
    """A page that shows rasters, until it is closed, or this process ends.

        viewer = scene.view(labels="segments.tif")
        viewer.address                              # where the page is; it holds the key
        viewer.close()
    """

    def __init__(self, rasters, *, labels=None, classes=None, shapes=None, browser=True):
        from .server import _program

        arguments = [str(_program()), "view", *(file_of(raster) for raster in rasters)]
        for option, given in (("--labels", labels), ("--classes", classes), ("--shapes", shapes)):
            if given is not None:
                arguments += [option, os.fspath(given) if isinstance(given, (str, os.PathLike)) else file_of(given)]
        if not browser:
            arguments.append("--no-browser")
        # In a session of its own, so that Ctrl-C ends a cell and not the page.
        self._process = subprocess.Popen(arguments, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                                         stderr=subprocess.PIPE, text=True, start_new_session=True)
        self.address = self._process.stdout.readline().strip()
        if not self.address:
            fault = self._process.communicate()[1].strip()
            raise Error(fault.removeprefix("vexg: ") or "the viewer did not start")

    def close(self):
        """Ends the page's server."""
        if self._process.poll() is None:
            self._process.terminate()
        self._process.communicate()

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.close()

    def __del__(self):
        if getattr(self, "_process", None) is not None and self._process.poll() is None:
            self._process.terminate()

    def __repr__(self):
        return f"<vexg.Viewer {self.address}>"

    def _repr_html_(self):
        return f"<a href='{self.address}' target='_blank' rel='noreferrer'>{self.address.partition('#')[0]}</a>"


def file_of(raster):
    """The file that a raster is. Raises Error for one that is computed, which has none."""
    node = raster._chain()
    files = files_of(node)
    if node.command != "OpenRasterCommand" or len(files) != 1 or node is not source_node(files[0]):
        raise Error("the viewer shows files; save the raster first")
    return files[0]
