"""Finds libvexg.so, and calls the functions of its C interface (src/c/vexg.h)."""

import atexit
import ctypes
import os
import pathlib
import threading

from .errors import Error

_ABI = 1
_NAMES = ("libvexg.so", "libvexg.so.0.1")


class Rect(ctypes.Structure):
    """A vexg_rect: corners are inclusive."""

    _fields_ = [(name, ctypes.c_uint32) for name in ("left", "top", "right", "bottom")]


class Block(ctypes.Structure):
    """A vexg_block."""

    _fields_ = [
        ("rect", Rect),
        ("bands", ctypes.c_void_p),
        ("band_count", ctypes.c_uint32),
        ("order", ctypes.c_int32),
        ("data_type", ctypes.c_uint32),
        ("reserved", ctypes.c_uint32),
        ("pixels", ctypes.c_void_p),
        ("size", ctypes.c_uint64),
        ("states", ctypes.c_void_p),
    ]


def _candidates():
    """The names under which the library is looked for, the first one first."""
    given = os.environ.get("VEXG_LIBRARY")
    if given:
        yield given
        return
    inside = pathlib.Path(__file__).parent / "native" / "lib"
    for name in _NAMES:
        if (inside / name).exists():
            yield str(inside / name)
    yield from _NAMES


def _load():
    faults = []
    for name in _candidates():
        try:
            return ctypes.CDLL(name)
        except OSError as fault:
            faults.append(str(fault))
    raise Error("libvexg.so can't be loaded: " + "; ".join(faults))


class Library:
    """The functions of the library. Loaded at the first use, so that an import costs nothing, and
    processes may be forked until then."""

    def __init__(self):
        self._lock = threading.Lock()
        self._functions = None
        self._forked = False
        self.before_end = []  # functions that are called before everything is closed
        os.register_at_fork(after_in_child=self._note_fork)

    def _note_fork(self):
        self._lock = threading.Lock()
        self._forked = self._functions is not None

    @property
    def is_loaded(self):
        """Whether the library is in use in this process."""
        return self._functions is not None and not self._forked

    def _get(self):
        if self._functions is not None and not self._forked:
            return self._functions
        with self._lock:
            if self._forked:
                raise Error(
                    "vexg was in use before this process was forked, and its threads stayed behind; "
                    "start processes anew (the methods spawn and forkserver of multiprocessing), or "
                    "fork before the first use"
                )
            if self._functions is None:
                self._functions = self._prepare(_load())
        return self._functions

    def _prepare(self, library):
        text, fault = ctypes.c_char_p, ctypes.POINTER(ctypes.c_void_p)
        abort, block = ctypes.c_void_p, ctypes.c_void_p
        signatures = {
            "vexg_abi": (ctypes.c_int,),
            "vexg_version": (ctypes.c_char_p,),
            "vexg_init": (ctypes.c_int, fault),
            "vexg_run": (ctypes.c_void_p, text, abort, ctypes.c_void_p, fault),
            "vexg_read": (ctypes.c_int, text, block, abort, fault),
            "vexg_write": (ctypes.c_int, text, block, abort, fault),
            "vexg_describe": (ctypes.c_void_p, text, fault),
            "vexg_commands": (ctypes.c_void_p, fault),
            "vexg_close": (ctypes.c_int, text, fault),
            "vexg_thread_limit": (ctypes.c_int, ctypes.c_int, fault),
            "vexg_free": (None, ctypes.c_void_p),
        }
        try:
            for name, (result, *arguments) in signatures.items():
                function = getattr(library, name)
                function.restype, function.argtypes = result, arguments
        except AttributeError as missing:
            raise Error(f"libvexg.so is too old for this package: {missing}") from None
        if library.vexg_abi() != _ABI:
            raise Error(
                f"libvexg.so has the interface {library.vexg_abi()}, and this package is for {_ABI}"
            )
        fault = ctypes.c_void_p()
        if not library.vexg_init(ctypes.byref(fault)):
            raise Error(self._take(library, fault.value))
        atexit.register(self._end)
        return library

    def _end(self):
        """Closes what is open, so that no thread of the library outlives its data."""
        if self.is_loaded:
            for call in self.before_end:
                call()
            self._functions.vexg_close(None, None)

    @staticmethod
    def _take(library, address):
        """The text at an address, which is given back to the library."""
        if not address:
            return "the library gave no reason"
        text = ctypes.string_at(address).decode("utf-8", "replace")
        library.vexg_free(address)
        return text

    def _text(self, name, *arguments):
        library = self._get()
        fault = ctypes.c_void_p()
        address = getattr(library, name)(*arguments, ctypes.byref(fault))
        if not address:
            raise Error(self._take(library, fault.value))
        return self._take(library, address)

    def version(self):
        """The version of the library."""
        return self._get().vexg_version().decode()

    def run(self, document, abort=None, progress=None):
        """Runs a job document, and gives the result document.

        Args:
            abort: a ctypes byte that another thread may set to 1; None for none.
            progress: a ctypes double that gets the fraction done; None for none.
        """
        return self._text("vexg_run", document.encode(), _address(abort), _address(progress))

    def describe(self, raster):
        """The JSON text about the raster that a text names."""
        return self._text("vexg_describe", raster)

    def commands(self):
        """The JSON text of what all commands declare."""
        return self._text("vexg_commands")

    def read(self, raster, block, abort=None):
        """Fills a Block with pixels."""
        library = self._get()
        fault = ctypes.c_void_p()
        if not library.vexg_read(raster, ctypes.addressof(block), abort, ctypes.byref(fault)):
            raise Error(self._take(library, fault.value))

    def write(self, raster, block, abort=None):
        """Writes the pixels of a Block."""
        library = self._get()
        fault = ctypes.c_void_p()
        if not library.vexg_write(raster, ctypes.addressof(block), abort, ctypes.byref(fault)):
            raise Error(self._take(library, fault.value))

    def close(self, raster):
        """Lets go of the raster that a text names; None for all. Nothing where the library is not
        in use."""
        if not self.is_loaded:
            return
        fault = ctypes.c_void_p()
        if not self._functions.vexg_close(raster, ctypes.byref(fault)):
            raise Error(self._take(self._functions, fault.value))

    def thread_limit(self, threads):
        """Bounds the threads; 0 for no bound. Gives how many there are now at most."""
        library = self._get()
        fault = ctypes.c_void_p()
        limit = library.vexg_thread_limit(threads, ctypes.byref(fault))
        if limit == 0:
            raise Error(self._take(library, fault.value))
        return limit


def _address(value):
    return None if value is None else ctypes.addressof(value)


library = Library()
