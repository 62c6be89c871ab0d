"""A client of a vexg server in the standard library alone, written from docs/protocol.md."""

import mmap
import os
import pathlib
import socket
import struct
import time
import xml.etree.ElementTree as ElementTree


def pipe_path(name):
    runtime = os.environ.get("XDG_RUNTIME_DIR", "")
    if runtime.startswith("/") and os.path.isdir(runtime):
        return f"{runtime}/vexg/{name}"
    return f"/tmp/vexg-{os.geteuid()}/{name}"


def connect(name, patience=30.0):
    deadline = time.monotonic() + patience
    while True:
        pipe = socket.socket(socket.AF_UNIX, socket.SOCK_STREAM)
        try:
            pipe.connect(pipe_path(name))
            return pipe
        except (FileNotFoundError, ConnectionRefusedError):
            pipe.close()
            if time.monotonic() > deadline:
                raise
            time.sleep(0.01)


def send(pipe, text):
    message = text.encode() + b"\0"
    pipe.sendall(struct.pack("<I", len(message)) + message)


def receive(pipe):
    def exactly(count):
        data = bytearray()
        while len(data) < count:
            piece = pipe.recv(count - len(data))
            if not piece:
                raise ConnectionError("the server closed the pipe")
            data += piece
        return bytes(data)

    (length,) = struct.unpack("<I", exactly(4))
    return exactly(length).split(b"\0", 1)[0].decode()


def ask(name, text, patience=30.0):
    """One exchange: a connection, a message, its answer."""
    with connect(name, patience) as pipe:
        send(pipe, text)
        return receive(pipe)


def tell(name, text):
    """A message without an answer."""
    with connect(name) as pipe:
        send(pipe, text)


class Client:
    def __init__(self, server):
        self.private = ask(server, "@NEW")

    def submit(self, job):
        """The results of the commands by name, each a dictionary with its returns in "return"."""
        root = ElementTree.fromstring(ask(self.private, job))
        results = {}
        for command in root.findall("Command"):
            result = dict(command.attrib)
            returned = command.find("Return")
            result["return"] = dict(returned.attrib) if returned is not None else {}
            results[command.get("Name")] = result
        return results

    def close(self):
        tell(self.private, "@QUIT")


class Channel:
    """A block of named memory with the progress at byte 0 and the abort flag in the last byte."""

    def __init__(self, name, size=16):
        self.path = pathlib.Path("/dev/shm") / name
        self.path.write_bytes(bytes(size))
        with open(self.path, "r+b") as file:
            self.memory = mmap.mmap(file.fileno(), size)
        self.element = f'<ORVAIPC Name="{name}" Size="{size}"/>'

    def progress(self):
        return struct.unpack_from("<f", self.memory, 0)[0]

    def abort(self):
        self.memory[-1] = 1

    def close(self):
        self.memory.close()
        self.path.unlink()
