"""vexg: rasters of satellites and aircraft, lazily, as fast as the library below.

    import vexg

    scene = vexg.open("scene.tif")
    ndvi = (scene[3] - scene[2]) / (scene[3] + scene[2])
    ndvi.save("ndvi.tif")

docs/python.md is the guide. Nothing of the library is loaded before its first use.
"""

from ._formula import calc, where
from ._library import library as _library
from .errors import Error
from .raster import Raster, from_array, open, stack, transform_points, view

_LATE = {
    "Polygons": "vectors", "Segments": "segments", "Classes": "segments", "segment": "segments",
    "Server": "server", "mosaic": "mosaics", "job": "jobs", "Job": "jobs", "rasterize": "vectors",
    "open_labels": "segments", "formats": "_saving", "create": "_writing",
}  # fmt: skip


def __getattr__(name):
    import importlib

    if name == "commands":
        return importlib.import_module(".commands", __name__)
    if name == "__version__":
        return _library.version()
    if name in _LATE:
        return getattr(importlib.import_module(f".{_LATE[name]}", __name__), name)
    raise AttributeError(f"module {__name__!r} has no attribute {name!r}")


def __dir__():
    return sorted({*globals(), *_LATE, "commands", "__version__"})


def threads(count=0):
    """Bounds the threads that work at once in this process; 0 takes the bound away. Gives how many there
    are now at most."""
    return _library.thread_limit(count)


__all__ = ["Error", "Raster", "calc", "from_array", "open", "stack", "threads", "transform_points",
           "view", "where", *_LATE]
