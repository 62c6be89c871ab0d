"""Copies of parts and levels lie where their pixels lie, whatever the model of the source."""

import itertools
import math
import shutil
import struct
import subprocess
import unittest

from support import DATA, FolderTest, needs_data, needs_gdal, read_npy, run

CORNERS = ["-a_srs", "EPSG:32633", "-a_ullr"]


@needs_data
@needs_gdal
class Placing(FolderTest):
    def translate(self, name, *options):
        """The scene with a camera, and what the options give it besides."""
        file = self.folder / name
        subprocess.run(["gdal_translate", "-q", *options, DATA / "rpc_scene.tif", file], check=True)
        return file

    def models(self):
        yield "camera", DATA / "rpc_scene.tif"
        yield "grid and camera", self.translate("both.tif", *CORNERS, "300000", "4640000", "310470", "4629440")
        yield "south up", self.translate("up.tif", *CORNERS, "300000", "4629440", "310470", "4640000")
        turned = self.folder / "turned.dat"
        self.fine("copy", self.translate("flat.tif", *CORNERS, "300000", "4640000", "310470", "4636480"), turned)
        header = turned.with_name("turned.dat.hdr")
        lines = header.read_text().splitlines()
        place = next(i for i, line in enumerate(lines) if line.startswith("georeference = "))
        head, numbers = lines[place].split(" = ", 1)
        # A plain grid with a tie pixel, turned by 33 degrees, with oblong pixels.
        lines[place] = head + " = {Std -9999 0 0 0 0 30 10 300000 4640000 40.5 17 349 352 33 EPSG:32633| }"
        if not numbers.startswith("{"):
            lines[place] = lines[place].replace("{", "").replace("}", "")
        header.write_text("\n".join(lines) + "\n")
        yield "turned", turned

    def places(self, file, points):
        lines = "".join(f"{x!r} {y!r}\n" for x, y in points)
        code, out, err = run("transform", str(file), stdin=lines)
        self.assertEqual((code, err), (0, ""), file)
        return [tuple(map(float, line.split()[:2])) for line in out.splitlines()]

    def test_parts_lie_in_their_source(self):
        points = [(0.5, 0.5), (199.5, 0.5), (3.25, 199.75)]
        for name, source in self.models():
            for ending in (".tif", ".dat"):
                with self.subTest(model=name, format=ending):
                    part = self.folder / ("part" + ending)
                    code, _, err = run("copy", str(source), str(part), "-q", "--rect", "100,50,299,249", "--overwrite")
                    # The flat format has no room for further items, which a camera's file may have.
                    self.assertEqual(code, 0, err)
                    self.assertRegex(err, r"\A(vexg: \S+ note: the format ORVA does not keep the metadata items\n)?\Z")
                    wanted = self.places(source, [(x + 100, y + 50) for x, y in points])
                    size = math.dist(*self.places(source, [(0, 0), (1, 0)]))
                    for got, want in zip(self.places(part, points), wanted, strict=True):
                        self.assertLess(math.dist(got, want), 0.001 * size)

    def test_the_camera_of_a_part_counts_from_it(self):
        source = self.translate("both.tif", *CORNERS, "300000", "4640000", "310470", "4629440")
        part = self.folder / "part.tif"
        self.fine("copy", source, part, "-q", "--rect", "100,50,299,249")
        told = subprocess.run(["gdalinfo", part], capture_output=True, text=True, check=True).stdout
        self.assertIn("LINE_OFF=762\n", told)
        self.assertIn("SAMP_OFF=750\n", told)


    def test_copies_of_levels_have_pixels_of_their_size(self):
        scene = self.translate("scene.tif", "-outsize", "1500", "1500", *CORNERS, "300000", "4640000", "345000", "4595000")
        self.fine("pyramid", "build", scene, "--levels", "1-8", "--resampling", "nearest")
        for placing, size in (("", 9000), ('Placing="Told"', 9000), ('Placing="Exact"', 7680)):
            copy = self.folder / f"level{size}.tif"
            copy.unlink(missing_ok=True)
            steps = [("OpenRasterCommand", f'ConnStr="{scene}" PyramidConnStr="Pyramid|{scene}.pyr"', "URI", "$scene"),
                     ("GetRasterPyramidCommand", f'URI="$scene" Level="8" {placing}', "PyramidURI", "$level"),
                     ("CreateRasterCommand", f'ConnStr="{copy}" Format="TIFF" SrcURI="$level"', "URI", "$copy"),
                     ("CopyRasterCommand", 'SrcURI="$level" DstURI="$copy"', "", ""),
                     ("CloseRasterCommand", 'URI="$copy"', "", ""),
                     ("CloseRasterCommand", 'URI="$level"', "", ""),
                     ("CloseRasterCommand", 'URI="$scene"', "", "")]
            job = "".join(
                f'<Command ID="{command}" Name="s{i}">'
                + (f'<DependsOn Name="s{i - 1}"/>' if i else "") + (f'<Output {name}="{variable}"/>' if name else "")
                + f"<Input {inputs}/></Command>" for i, (command, inputs, name, variable) in enumerate(steps))
            document = self.folder / "job.xml"
            document.write_text(f'<?xml version="1.0" encoding="UTF-8" standalone="no" ?><Job>{job}</Job>')
            self.fine("run", document)
            told = subprocess.run(["gdalinfo", copy], capture_output=True, text=True, check=True).stdout
            self.assertIn(f"Pixel Size = ({size}.0", told)
        part = self.folder / "part.tif"
        self.fine("copy", scene, part, "--level", "3", "-q", "--rect", "10,20,59,79")
        told = subprocess.run(["gdalinfo", part], capture_output=True, text=True, check=True).stdout
        self.assertIn("Size is 50, 60", told)
        self.assertIn("Pixel Size = (240.0", told)
        self.assertIn("Origin = (302400.0", told)
        self.fine("read", part, "-o", self.folder / "part.npy")
        self.fine("read", scene, "-o", self.folder / "scene.npy", "-q", "--rect", "80,160,479,639")
        pixels, whole = read_npy(self.folder / "part.npy")[2], read_npy(self.folder / "scene.npy")[2]
        self.assertEqual(pixels, b"".join(whole[y * 400:(y + 1) * 400:8] for y in range(0, 480, 8)))
        printed = self.fine("read", scene, "--level", "8", "-o", self.folder / "o.npy", "--print-job")
        self.assertIn('Placing="Exact"', printed)


@needs_data
@needs_gdal
@unittest.skipUnless(shutil.which("gdalwarp"), "needs gdalwarp")
class Poles(FolderTest):
    def test_a_globe_keeps_its_pole(self):
        lines = "".join(f"{x} {y} {1 + (x * 7 + y * 31) % 251}\n" for y, x in itertools.product(range(180), range(360)))
        table, globe = self.folder / "globe.xyz", self.folder / "globe.tif"
        table.write_text(lines)
        subprocess.run(["gdal_translate", "-q", "-ot", "Byte", "-a_srs", "EPSG:4326", "-a_ullr", "-180", "90", "180", "-90",
                        table, globe], check=True)
        for system, corners in (("EPSG:3995", "-9000000 -9000000 9000000 9000000"),
                                ("EPSG:3031", "-5000000 -5000000 5300000 5100000"),
                                ("EPSG:3857", "-20037508 -20037508 20037508 20037508"),
                                ("+proj=moll +lon_0=70 +datum=WGS84", "-18000000 -9000000 18000000 9000000")):
            grid, made = self.folder / "grid.tif", self.folder / "made.tif"
            subprocess.run(["gdalwarp", "-q", "-overwrite", "-et", "0", "-t_srs", system, "-te", *corners.split(),
                            "-ts", "600", "590", globe, grid], check=True)
            self.fine("read", grid, "-o", self.folder / "want.npy", "--overwrite")
            want = read_npy(self.folder / "want.npy")[2]
            for method, most in (("rigorous", 0), ("polynomial", 0.06)):
                with self.subTest(system=system, method=method):
                    self.fine("warp", globe, made, "--to", grid, "--method", method, "--overwrite")
                    self.fine("read", made, "-o", self.folder / "got.npy", "--mask", self.folder / "mask.npy",
                              "--overwrite")
                    got = read_npy(self.folder / "got.npy")[2]
                    differing = sum(a != b for a, b in zip(got, want, strict=True))
                    lost = sum(a == 0 and b != 0 for a, b in zip(got, want))
                    self.assertLessEqual(differing, most * len(want))
                    self.assertLessEqual(lost, 0.001 * most * len(want))


if __name__ == "__main__":
    unittest.main()
