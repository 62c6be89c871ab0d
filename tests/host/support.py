"""What the tests of the command line have in common."""

import ast
import os
import pathlib
import re
import shutil
import struct
import subprocess
import sys
import tempfile
import unittest
import zlib


def use_system_python():
    """Begins anew in the system's Python, for modules that the one that was called hasn't got."""
    system = "/usr/bin/python3"
    if sys.executable != system and os.path.exists(system):
        os.execv(system, [system, *sys.argv])


SOURCE = pathlib.Path(os.environ["VEXG_SOURCE"])
BUILD = pathlib.Path(os.environ["VEXG_BUILD"])
VEXG = BUILD / "bin" / "vexg"
SANITIZED = os.environ.get("VEXG_SANITIZE", "") != ""
EXAMPLES = BUILD / "lib" / "libvexg_example_commands.so"
DATA = pathlib.Path(os.environ.get("VEXG_DATA", SOURCE / "../shared/data")).resolve()

needs_data = unittest.skipUnless((DATA / "README.md").exists(), "no sample data")
needs_gdal = unittest.skipUnless(shutil.which("gdal_translate"), "no GDAL programs")


def start(*arguments, **options):
    """Starts vexg with the library of example commands."""
    options.setdefault("stdout", subprocess.PIPE)
    options.setdefault("stderr", subprocess.PIPE)
    return subprocess.Popen(
        [VEXG, "--load", EXAMPLES, *arguments], stdin=subprocess.PIPE, text=True, **options
    )


def run(*arguments, stdin=""):
    """Runs vexg to its end: exit code, standard output, standard error."""
    process = start(*arguments)
    out, err = process.communicate(stdin, timeout=60)
    return process.returncode, out, err


def table(heading):
    """The rows of the table of the sample data whose first line begins so, as dictionaries."""
    lines = (DATA / "README.md").read_text().splitlines()
    start = next(i for i, line in enumerate(lines) if line.startswith(heading))
    names = [cell.strip() for cell in lines[start].strip("|").split("|")]
    rows = []
    for line in lines[start + 2:]:
        if not line.startswith("|"):
            break
        rows.append(dict(zip(names, (cell.strip() for cell in line.strip().strip("|").split("|")))))
    return rows


def gdal_pixels(file, *options, interleave="BIP"):
    """The bytes of a raster as GDAL reads it."""
    with tempfile.TemporaryDirectory() as directory:
        raw = pathlib.Path(directory) / "raw"
        subprocess.run(["gdal_translate", "-q", "-of", "ENVI", "-co", f"INTERLEAVE={interleave}",
                        *options, file, raw], check=True, capture_output=True)
        return raw.read_bytes()


def gdal_checksums(file):
    out = subprocess.run(["gdalinfo", "-checksum", file], capture_output=True, text=True, check=True).stdout
    return [int(number) for number in re.findall(r"Checksum=(\d+)", out)]


def read_npy(path):
    """Type, shape and bytes of a .npy file."""
    data = pathlib.Path(path).read_bytes()
    assert data[:8] == b"\x93NUMPY\x01\x00"
    (length,) = struct.unpack_from("<H", data, 8)
    header = ast.literal_eval(data[10:10 + length].decode())
    assert (10 + length) % 64 == 0 and header["fortran_order"] is False
    return header["descr"], header["shape"], data[10 + length:]


def read_png(path):
    """Width, height, channels and the bytes of a PNG; 16-bit channels highest byte first."""
    data = pathlib.Path(path).read_bytes()
    assert data[:8] == b"\x89PNG\r\n\x1a\n"
    at, packed = 8, b""
    while at < len(data):
        length, kind = struct.unpack_from(">I4s", data, at)
        body = data[at + 8:at + 8 + length]
        assert struct.unpack_from(">I", data, at + 8 + length)[0] == zlib.crc32(kind + body)
        if kind == b"IHDR":
            width, height, bits, color = struct.unpack_from(">IIBB", body)
        elif kind == b"IDAT":
            packed += body
        at += 12 + length
    channels = {0: 1, 2: 3, 4: 2, 6: 4}[color]
    pixel = channels * bits // 8
    stride = width * pixel
    raw, rows, before = zlib.decompress(packed), [], bytes(width * pixel)
    for y in range(height):
        filtered = raw[y * (stride + 1):(y + 1) * (stride + 1)]
        before = unfilter(filtered[0], bytearray(filtered[1:]), before, pixel)
        rows.append(before)
    return width, height, channels, b"".join(rows)


def unfilter(kind, line, above, pixel):
    for i in range(len(line) if kind else 0):
        left = line[i - pixel] if i >= pixel else 0
        corner = above[i - pixel] if i >= pixel else 0
        if kind == 4:
            guess = left + above[i] - corner
            near = min((left, above[i], corner), key=lambda value: abs(guess - value))
        else:
            near = (0, left, above[i], (left + above[i]) // 2)[kind]
        line[i] = (line[i] + near) & 255
    return bytes(line)


def write_orva(path, samples, lines, bands, pixels=None, data_type="Byte", more=""):
    """A raster in the flat format; of zeros that take no room on the disk without pixels."""
    path = pathlib.Path(path)
    path.with_name(path.name + ".hdr").write_text(
        f"ORVA\nsamples = {samples}\nlines = {lines}\nbands = {bands}\nheader offset = 0\n"
        f"data type = {data_type}\ninterleave = BIP\nbyte order = little endian\n{more}end = ORVA\n")
    with open(path, "wb") as file:
        if pixels is None:
            file.truncate(samples * lines * bands)
        else:
            file.write(pixels)
    return path


class FolderTest(unittest.TestCase):
    """A test with a folder of its own for outputs."""

    def setUp(self):
        super().setUp()
        made = tempfile.TemporaryDirectory()
        self.addCleanup(made.cleanup)
        self.folder = pathlib.Path(made.name)

    def fine(self, *arguments, stdin=""):
        """The standard output of a run without complaints."""
        code, out, err = run(*map(str, arguments), stdin=stdin)
        self.assertEqual((code, err), (0, ""), arguments)
        return out

    def fails(self, code, words, *arguments, stdin=""):
        """A run that ends with the code, one line that holds the words, and no output."""
        got, out, err = run(*map(str, arguments), stdin=stdin)
        self.assertEqual((got, out), (code, ""), err)
        self.assertRegex(err, r"\Avexg: [^\n]+\n\Z")
        self.assertIn(words, err)


class PipeTest(unittest.TestCase):
    """A test with a directory of pipes of its own and, from serve() on, a server."""

    def setUp(self):
        super().setUp()
        self.runtime = tempfile.TemporaryDirectory()
        self.addCleanup(self.runtime.cleanup)
        os.environ["XDG_RUNTIME_DIR"] = self.runtime.name
        self.server = None

    def serve(self, name="test", *arguments, **options):
        self.server = start("serve", name, *arguments, **options)
        self.addCleanup(self.stop)
        self.server.stderr.readline()
        return self.server

    def stop(self):
        if self.server.poll() is None:
            self.server.terminate()
        self.server.communicate(timeout=60)

    def pipes(self):
        directory = pathlib.Path(self.runtime.name) / "vexg"
        return sorted(entry.name for entry in directory.iterdir()) if directory.exists() else []
