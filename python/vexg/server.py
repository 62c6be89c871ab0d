"""A server of jobs in a process of its own, and rasters that it opens (docs/protocol.md)."""

import json
import mmap
import os
import pathlib
import secrets
import select
import shutil
import socket
import struct
import subprocess
import threading
import time
import xml.etree.ElementTree as ElementTree
from collections import OrderedDict

import numpy

from . import _values
from ._jobs import ArrayNode, Draft, Results
from .errors import Error

_PATIENCE = 30.0  # seconds that a server that was started gets to come
_LOOK = 0.05  # seconds between two looks at a job that runs
_KEPT = 64  # rasters that are kept open
_PIECE = 32 << 20  # bytes of pixels that travel at once
_ORDER_WORDS = {0: "BIP", 1: "BIL", 2: "BSQ"}


class Server:
    """A server that this process starts, or one that runs already. It ends with the context.

        with vexg.Server() as server:
            scene = vexg.open("scene.tif", server=server)
    """

    def __init__(self, name=None, *, roots=(), start=None):
        """
        Args:
            name: of the server; by default one of its own.
            roots: folders that jobs may reach; all by default.
            start: whether one is started; by default where no name is given.
        """
        self.name = name or f"python-{os.getpid()}-{secrets.token_hex(4)}"
        self._process = None
        if start if start is not None else name is None:
            arguments = [str(_program()), "serve", "-q", self.name]
            for root in roots:
                arguments += ["--root", os.fspath(root)]
            # In a session of its own, so that Ctrl-C ends a job and not the server.
            self._process = subprocess.Popen(arguments, stdin=subprocess.DEVNULL, start_new_session=True)
        try:
            self._door = ServerDoor(self.name, self._process)
        except BaseException:
            self.close()
            raise

    def jobs(self):
        """The jobs that it is running, as a table."""
        from . import _tables

        draft = Draft()
        draft.step("jobs", "ListJobsCommand", {})
        found = self._door.run(draft).values("jobs")
        return _tables.table({
            "job": found["Jobs"], "client": found["Clients"], "seconds": found["Seconds"],
            "progress": found["Progress"], "commands": found["Commands"]}, None)

    def close(self):
        """Ends the server where this process has started it, and the connection."""
        door = getattr(self, "_door", None)
        if door is not None:
            door.end()
        process, self._process = self._process, None
        if process is None:
            return
        try:
            _tell(self.name, "@QUIT")
        except (OSError, Error):
            process.terminate()
        try:
            process.wait(10)
        except subprocess.TimeoutExpired:
            process.kill()
            process.wait()

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.close()

    def __repr__(self):
        return f"<vexg.Server {self.name}>"


def _program():
    """The program vexg: $VEXG_PROGRAM, that of the package, that beside the library, or in PATH."""
    given = os.environ.get("VEXG_PROGRAM")
    places = [pathlib.Path(given)] if given else []
    places.append(pathlib.Path(__file__).parent / "native" / "bin" / "vexg")
    if os.environ.get("VEXG_LIBRARY"):
        places.append(pathlib.Path(os.environ["VEXG_LIBRARY"]).absolute().parent.parent / "bin" / "vexg")
    for place in places:
        if place.is_file():
            return place
    found = shutil.which("vexg")
    if found is None:
        raise Error("the program vexg can't be found; $VEXG_PROGRAM may name it")
    return found


def _pipe_path(name):
    runtime = os.environ.get("XDG_RUNTIME_DIR", "")
    if runtime.startswith("/") and os.path.isdir(runtime):
        return f"{runtime}/vexg/{name}"
    return f"/tmp/vexg-{os.geteuid()}/{name}"


def _connect(name, process=None, patience=0.0):
    """A connection to a pipe, waited for as long as `patience` says."""
    deadline = time.monotonic() + patience
    while True:
        pipe = socket.socket(socket.AF_UNIX, socket.SOCK_STREAM)
        try:
            pipe.connect(_pipe_path(name))
            return pipe
        except OSError as fault:
            pipe.close()
            if process is not None and process.poll() is not None:
                raise Error(f"the server {name} ended with the code {process.returncode}") from None
            if time.monotonic() > deadline:
                raise Error(f"the server {name} can't be reached: {fault.strerror}") from None
            time.sleep(0.01)


def _send(pipe, text):
    message = text.encode() + b"\0"
    pipe.sendall(struct.pack("<I", len(message)) + message)


def _tell(name, text):
    with _connect(name) as pipe:
        _send(pipe, text)


def _ask(name, text, *, process=None, patience=0.0, look=None):
    """The answer to a message.

    Args:
        look: is called now and then while the answer is not there.
    """
    with _connect(name, process, patience) as pipe:
        try:
            _send(pipe, text)
            data = bytearray()
            while len(data) < 4 or len(data) < 4 + struct.unpack_from("<I", data)[0]:
                while look is not None and not select.select([pipe], [], [], _LOOK)[0]:
                    look()
                piece = pipe.recv(1 << 20)
                if not piece:
                    raise Error(f"the server {name} has gone")
                data += piece
        except OSError as fault:
            raise Error(f"the server {name} has gone: {fault.strerror}") from None
    return bytes(data[4:]).split(b"\0", 1)[0].decode()


def _left_open(result):
    """The URIs that an aborted job has opened, and whose closing did not run any more."""
    opened, closed = {}, set()
    for command in ElementTree.fromstring(result).findall("Command"):
        name, returned = command.get("Name", ""), command.find("Return")
        if command.get("Result") != "Success":
            continue
        if name.endswith("finish") or ".CloseRasterCommand" in name or name.startswith("close."):
            closed.add(name)
        elif returned is not None:
            uri = returned.get("URI") or returned.get("PyramidURI")
            if uri is not None:
                opened[name] = _values.value_of(uri, "URI")
    return [uri for name, uri in reversed(opened.items())
            if "close." + name.partition(".")[0] not in closed
            and not (name.endswith("target") and name[:-6] + "finish" in closed)]


class _Memory:
    """A block of named memory that a server fills, or by which it is watched."""

    def __init__(self, size):
        self.name = f"vexg-python-{os.getpid()}-{secrets.token_hex(8)}"
        self.size = size
        self._path = f"/dev/shm/{self.name}"
        descriptor = os.open(self._path, os.O_RDWR | os.O_CREAT | os.O_EXCL, 0o600)
        try:
            os.posix_fallocate(descriptor, 0, size)
            self.map = mmap.mmap(descriptor, size)
        except BaseException:
            os.unlink(self._path)
            raise
        finally:
            os.close(descriptor)

    def close(self):
        """Gives it back."""
        os.unlink(self._path)
        self.map = None

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.close()


class ServerDoor:
    """The commands and pixels of a server, by a private pipe of it."""

    def __init__(self, name, process=None):
        self._name = name
        self._process = process
        self._pipe = _ask(name, "@NEW", process=process, patience=_PATIENCE if process is not None else 0.0)
        if self._pipe == "@ERROR":
            raise Error(f"the server {name} takes no client")
        self._lock = threading.Lock()
        self._opened = OrderedDict()  # URIs by node: that of the raster, then all that are open for it

    def __reduce__(self):
        return ServerDoor, (self._name,)

    def __repr__(self):
        return f"in the server {self._name}"

    def end(self):
        """Ends the private server."""
        try:
            _tell(self._pipe, "@QUIT")
        except (OSError, Error):
            pass

    def run(self, draft, task=None):
        """Runs a job; gives its Results."""
        if task is None:
            return Results(self.run_document(draft.write()), draft)
        with _Memory(16) as channel:
            document = draft.write(channel=f'<ORVAIPC Name="{channel.name}" Size="16"/>')
            return Results(self._run_watched(document, task, channel), draft)

    def run_document(self, document, task=None):
        """Runs a job document, and gives the result document."""
        if task is None:
            return _ask(self._pipe, document)
        with _Memory(16) as channel:
            element = f'<ORVAIPC Name="{channel.name}" Size="16"/>'
            return self._run_watched(document.replace("<Reasons/>", "<Reasons/>" + element, 1), task, channel)

    def _run_watched(self, document, task, channel):
        def look():
            (task.progress.value,) = struct.unpack_from("<f", channel.map, 0)
            if task.is_aborted:
                channel.map[-1] = 1

        result = _ask(self._pipe, document, look=look)
        if task.is_aborted:
            self._close_all(_left_open(result))
            raise Error("aborted")
        return result

    def _uri_of(self, node):
        """The URI under which a chain is open at the server."""
        with self._lock:
            if node in self._opened:
                self._opened.move_to_end(node)
                return self._opened[node][0]
            if any(isinstance(each, ArrayNode) for each in node.everything()):
                raise Error("an array in memory can't be read by a server; save it first")
            text = _ask(self._pipe, Draft().write([node], closes=False))
            results = Results(text, Draft())
            steps = [f"n{i}.{each.command}" for i, each in enumerate(node.everything())]
            uris = [results.text(step, each.output) for step, each in zip(steps, node.everything())]
            self._opened[node] = [_values.value_of(uri, "URI") for uri in reversed(uris)]
            dropped = self._opened.popitem(last=False)[1] if len(self._opened) > _KEPT else []
            uri = self._opened[node][0]
        self._close_all(dropped)
        return uri

    def _close_all(self, uris):
        if uris:
            draft = Draft()
            for i, uri in enumerate(uris):
                draft.step(f"close{i}", "CloseRasterCommand", {"URI": _values.uri_text(uri)})
            _ask(self._pipe, draft.write())

    def close(self, node):
        """Lets go of a raster that was read."""
        with self._lock:
            uris = self._opened.pop(node, [])
        self._close_all(uris)

    def close_all(self):
        """Lets go of all rasters that were read; they open again as they are asked for."""
        with self._lock:
            opened, self._opened = self._opened, OrderedDict()
        for uris in opened.values():
            self._close_all(uris)

    def describe(self, node):
        """The description of a raster."""
        draft = Draft()
        draft.step("describe", "DescribeRasterCommand", {"URI": _values.uri_text(self._uri_of(node))})
        return json.loads(self.run(draft).text("describe", "Description"))

    def read(self, node, rect, bands, order, code, pixels, states, task=None):
        """Fills an array with the pixels of a raster; see LocalDoor.read. They travel in pieces of whole
        lines through named memory."""
        uri = self._uri_of(node)
        left, top, right, bottom = rect
        width, count = right - left + 1, bands.size
        line = width * count * pixels.itemsize
        lines = min(max(1, _PIECE // line), bottom - top + 1)
        axis = {0: 0, 1: 0, 2: 1}[order]  # of the lines
        with _Memory(lines * line) as memory, _Memory(lines * width * count) as state_memory:
            for first in range(top, bottom + 1, lines):
                if task is not None and task.is_aborted:
                    raise Error("aborted")
                last = min(first + lines - 1, bottom)
                draft = Draft()
                draft.step("read", "GetRasterSubRectCommand", {
                    "URI": _values.uri_text(uri), "SubRect": f"{left} {first} {right} {last}",
                    "Bands": _values.array_text(bands), "Interleave": _ORDER_WORDS[order],
                    "PixelDataBufName": memory.name, "PixelDataBufSize": memory.size,
                    "PixelValueStateBufName": state_memory.name, "PixelValueStateBufSize": state_memory.size})
                results = self.run(draft)
                if results.text("read", "Return") != "1":
                    raise Error(results.text("read", "Fault", "the block could not be read"))
                place = (slice(None),) * axis + (slice(first - top, last - top + 1),)
                self._take(memory.map, pixels[place])
                if states is not None:
                    self._take(state_memory.map, states[place])

    @staticmethod
    def _take(memory, array):
        array[...] = numpy.frombuffer(memory, array.dtype, array.size).reshape(array.shape)
