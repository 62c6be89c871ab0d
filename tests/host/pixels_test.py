"""Pixels through named memory, as a client in another language moves them."""

import mmap
import os
import pathlib
import struct
import unittest

from support import DATA, FolderTest, PipeTest, gdal_pixels, needs_data, needs_gdal
from vexg_client import Client

class Block:
    """Named memory of so many bytes."""

    def __init__(self, name, size):
        self.name, self.size = name, size
        self.path = pathlib.Path("/dev/shm") / name
        self.path.write_bytes(b"\xff" * size)
        with open(self.path, "r+b") as file:
            self.memory = mmap.mmap(file.fileno(), size)

    def close(self):
        self.memory.close()
        self.path.unlink()


@needs_data
class Pixels(PipeTest, FolderTest):
    def setUp(self):
        super().setUp()
        self.serve("pixels")
        self.client = Client("pixels")
        self.addCleanup(self.client.close)
        self.blocks = [Block(f"vexg-pixels-{os.getpid()}", 4 * 3 * 2 * 2), Block(f"vexg-states-{os.getpid()}", 4 * 3 * 2)]
        for block in self.blocks:
            self.addCleanup(block.close)

    def move(self, command, uri, rect):
        pixels, states = self.blocks
        return self.client.submit(
            f'<Job><Reasons/><Command Name="move" ID="{command}"><Input URI="{uri}" SubRect="{rect}" '
            f'Bands="1:2 [3 0] " Interleave="BIP" PixelDataBufName="{pixels.name}" '
            f'PixelDataBufSize="{pixels.size}" PixelValueStateBufName="{states.name}" '
            f'PixelValueStateBufSize="{states.size}"/></Command></Job>')["move"]

    def open(self, command, inputs):
        opened = self.client.submit(f'<Job><Reasons/><Command Name="open" ID="{command}"><Input {inputs}/></Command></Job>')
        self.assertEqual(opened["open"]["Result"], "Success", opened)
        return opened["open"]["return"]["URI"]

    @needs_gdal
    def test_come_and_go(self):
        source = DATA / "landsat7_u16_tiled.tif"
        uri = self.open("OpenRasterCommand", f'ConnStr="{source}"')
        moved = self.move("GetRasterSubRectCommand", uri, "345 349 348 351")
        self.assertEqual((moved["Result"], moved["return"]["Return"]), ("Success", "1"))
        pixels, states = self.blocks
        values = struct.unpack("<24H", pixels.memory[:])
        self.assertEqual(states.memory[:], bytes(24))
        whole = struct.unpack(f"<{349 * 352 * 6}H", gdal_pixels(source, interleave="BSQ"))
        at = [whole[(band * 352 + y) * 349 + x] for y in (349, 350, 351) for x in (345, 346, 347, 348) for band in (3, 0)]
        self.assertEqual(list(values), at)

        copy = self.folder / "copy.dat"
        made = self.open("CreateRasterCommand", f'ConnStr="{copy}" SrcURI="{uri}" Format="ORVA"')
        self.assertEqual(self.move("PutRasterSubRectCommand", made, "345 349 348 351")["return"]["Return"], "1")
        self.client.submit(f'<Job><Command Name="c" ID="CloseRasterCommand"><Input URI="{made}"/></Command></Job>')
        written = struct.unpack(f"<{349 * 352 * 6}H", copy.read_bytes())
        self.assertIn("interleave = BSQ", copy.with_name("copy.dat.hdr").read_text())
        stored = [written[(band * 352 + y) * 349 + x] for y in (349, 350, 351) for x in (345, 346, 347, 348) for band in (3, 0)]
        self.assertEqual(stored, at)

    def test_bad_requests_fail_and_the_server_goes_on(self):
        uri = self.open("OpenRasterCommand", f'ConnStr="{DATA / "landsat7_u16_tiled.tif"}"')
        over = self.move("GetRasterSubRectCommand", uri, "346 349 349 351")
        self.assertEqual(over["Result"], "Failed")
        self.assertIn("349 by 352", over["Reason"])
        large = self.move("GetRasterSubRectCommand", uri, "0 0 100 100")
        self.assertIn("too small", large["Reason"])
        self.assertEqual(self.move("GetRasterSubRectCommand", uri, "0 0 3 2")["Result"], "Success")


if __name__ == "__main__":
    unittest.main()
