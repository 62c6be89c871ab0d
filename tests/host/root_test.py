"""Every road out of the folders that a server is kept to, tried from inside."""

import ctypes
import os
import pathlib
import shutil
import subprocess
import unittest

import vexg_client
from support import DATA, FolderTest, PipeTest, needs_data, needs_gdal, read_npy, run, write_orva

SECRET = bytes(range(200, 216))  # 4 by 4 pixels


def gdal(*arguments):
    subprocess.run(list(map(str, arguments)), check=True, capture_output=True)


class Hdf5:
    """As much of the HDF5 library as it takes to write files that name others."""

    def __init__(self):
        self.library = ctypes.CDLL("libhdf5_serial.so.103")
        self.library.H5open()
        for name in ("H5Fcreate", "H5Screate_simple", "H5Pcreate", "H5Dcreate2"):
            getattr(self.library, name).restype = ctypes.c_int64
        self.byte = self.constant("H5T_NATIVE_UINT8_g")
        self.plan = self.constant("H5P_CLS_DATASET_CREATE_ID_g")

    def constant(self, name):
        return ctypes.c_int64.in_dll(self.library, name)

    def write(self, path, external=None, link=None, source=None):
        h5, i64 = self.library, ctypes.c_int64
        file = i64(h5.H5Fcreate(str(path).encode(), 2, i64(0), i64(0)))
        size = (ctypes.c_uint64 * 2)(4, 4)
        space = i64(h5.H5Screate_simple(2, size, None))
        plan = i64(h5.H5Pcreate(self.plan))
        if external:
            self.good(h5.H5Pset_external(plan, str(external).encode(), i64(0), ctypes.c_uint64(16)))
        if source:
            self.good(h5.H5Pset_virtual(plan, space, str(source).encode(), b"band", space))
        if link:
            self.good(h5.H5Lcreate_external(str(link).encode(), b"/band", file, b"band", i64(0), i64(0)))
        else:
            data = i64(h5.H5Dcreate2(file, b"band", self.byte, space, i64(0), plan, i64(0)))
            self.good(data.value)
            if not external and not source:
                self.good(h5.H5Dwrite(data, self.byte, i64(0), i64(0), i64(0), SECRET))
            h5.H5Dclose(data)
        h5.H5Fclose(file)

    @staticmethod
    def good(result):
        assert result >= 0


@needs_gdal
class Roots(PipeTest, FolderTest):
    def setUp(self):
        super().setUp()
        self.inside, self.outside = self.folder / "in", self.folder / "out"
        self.inside.mkdir()
        self.outside.mkdir()

    def tiff(self, path, *options, pixels=SECRET):
        raw = write_orva(self.folder / "raw", 4, 4, 1, pixels)
        gdal("gdal_translate", "-q", *options, self.envi(raw), path)
        return path

    def envi(self, raw):
        """A header with which GDAL reads a flat file."""
        raw.with_name("raw.hdr").write_text(
            "ENVI\nsamples = 4\nlines = 4\nbands = 1\ndata type = 1\ninterleave = bsq\n")
        return raw

    def read(self, source, *more, server=True):
        out = self.folder / "block.npy"
        code, _, err = run("read", source, "-o", out, "--overwrite", *more,
                           *(["--server", "test"] if server else []))
        return code, err, read_npy(out)[2] if code == 0 else b""

    def refused(self, source, *more):
        """The server refuses what a program without roots reads."""
        self.assertEqual(self.read(source, *more, server=False)[0], 0, source)
        code, err, pixels = self.read(source, *more)
        self.assertEqual((code, pixels), (1, b""), source)
        self.assertIn("allowed here", err)
        self.assertEqual(err.count("\n"), 1)

    def submit(self, job):
        client = vexg_client.Client("test")
        try:
            return client.submit(job)
        finally:
            client.close()

    def snapshot(self):
        return {path: (path.stat().st_mtime_ns, path.read_bytes())
                for path in self.outside.rglob("*") if path.is_file()}

    def test_files_that_name_others(self):
        self.serve("test", "--root", self.inside, "--allow", "indirect", "--allow", "virtual",
                   "--allow", "network")
        self.tiff(self.outside / "secret.tif")
        (self.outside / "secret.raw").write_bytes(SECRET)
        h5 = Hdf5()
        h5.write(self.outside / "secret.h5")
        before = self.snapshot()

        # Erdas: pixels in a file of another name.
        self.tiff(self.inside / "aaaaaaaaaaaa.img", "-of", "HFA", "-co", "USE_SPILL=YES")
        spilled = self.inside / "aaaaaaaaaaaa.ige"
        self.assertTrue(spilled.exists())
        spilled.rename(self.outside / "secre.ige")
        image = self.inside / "aaaaaaaaaaaa.img"
        image.write_bytes(image.read_bytes().replace(b"aaaaaaaaaaaa.ige", b"../out/secre.ige"))
        self.refused(image)

        # A side file that names overviews.
        named = self.tiff(self.inside / "named.tif")
        named.with_name("named.tif.aux.xml").write_text(
            '<PAMDataset><Metadata domain="OVERVIEWS"><MDI key="OVERVIEW_FILE">'
            f'{self.outside}/secret.tif</MDI></Metadata></PAMDataset>')
        self.refused(named)

        # Side files that are links.
        gdal("gdaladdo", "-q", "-ro", "-r", "nearest", self.outside / "secret.tif", "2")
        linked = self.tiff(self.inside / "linked.tif")
        (self.inside / "linked.tif.ovr").symlink_to(self.outside / "secret.tif.ovr")
        self.refused(linked)
        gdal("gdalinfo", "-stats", self.outside / "secret.tif")
        aux = self.tiff(self.inside / "aux.tif")
        (self.inside / "aux.tif.aux.xml").symlink_to(self.outside / "secret.tif.aux.xml")
        self.refused(aux)
        flat = write_orva(self.inside / "flat", 4, 4, 1, SECRET)
        flat.with_name("flat.hdr").rename(self.outside / "flat.hdr")
        flat.with_name("flat.hdr").symlink_to(self.outside / "flat.hdr")
        self.assertEqual(self.read(flat, server=False)[0], 0)
        self.assertEqual(self.read(flat)[0], 1)

        # HDF5: external storage, external links, virtual datasets, names with ://.
        for kind, target in (("external", "secret.raw"), ("source", "secret.h5"), ("link", "secret.h5")):
            for name in (self.outside / target, f"../out/{target}"):
                h5.write(self.inside / f"{kind}.h5", **{kind: name})
                code, err, pixels = self.read(self.inside / f"{kind}.h5")
                self.assertEqual((code, pixels), (1, b""), kind)
                self.assertIn("allowed here", err)
        self.refused(f'HDF5:"{self.outside}/secret.h5"://band', "--input-format", "HDF5")
        self.refused(f'HDF5:{self.outside}/secret.h5://band', "--input-format", "HDF5")

        # Names of files inside files, and of the system's own.
        shutil.make_archive(str(self.outside / "packed"), "zip", self.outside, "secret.tif")
        for name in (f"/vsizip/{self.outside}/packed.zip/secret.tif",
                     f"/vsisubfile/0_9999,{self.outside}/secret.tif"):
            code, err, pixels = self.read(name, "--input-format", "TIFF")
            self.assertEqual((code, pixels), (1, b""), name)
        (self.inside / "root").symlink_to("/proc/self/root")
        self.refused(f"{self.inside}/root{self.outside}/secret.tif")
        self.refused(f"{self.inside}/../out/secret.tif")
        (self.inside / "folder").symlink_to(self.outside)
        self.refused(self.inside / "folder" / "secret.tif")

        after = self.snapshot()
        self.assertEqual({path: after[path] for path in before}, before)

    def test_sources_of_virtual_rasters(self):
        self.serve("test", "--root", self.inside)
        secret = self.tiff(self.outside / "secret.tif")
        (self.outside / "secret.raw").write_bytes(SECRET)
        near = self.tiff(self.inside / "near.tif")
        warped = self.inside / "warped.vrt"
        gdal("gdalwarp", "-q", "-of", "VRT", "-to", "SRC_METHOD=NO_GEOTRANSFORM", "-ts", "4", "4", near, warped)

        def virtual(name, source, relative=0, kind="SimpleSource"):
            path = self.inside / name
            path.write_text(f"""<VRTDataset rasterXSize="4" rasterYSize="4"><VRTRasterBand dataType="Byte" band="1"><{kind}>
                <SourceFilename relativeToVRT="{relative}">{source}</SourceFilename><SourceBand>1</SourceBand>
                <SrcRect xOff="0" yOff="0" xSize="4" ySize="4"/><DstRect xOff="0" yOff="0" xSize="4" ySize="4"/>
                </{kind}></VRTRasterBand></VRTDataset>""")
            return path

        for source in (virtual("plain.vrt", near), virtual("beside.vrt", "near.tif", 1), virtual("nested.vrt", "plain.vrt", 1)):
            self.assertEqual(self.read(source), (0, "", SECRET), source)
        self.assertEqual(self.read(warped)[0], 0)
        outside = virtual("outside.vrt", secret)
        linked = self.inside / "linked.tif"
        linked.symlink_to(secret)
        raw = self.inside / "raw.vrt"
        raw.write_text(f"""<VRTDataset rasterXSize="4" rasterYSize="4"><VRTRasterBand dataType="Byte" band="1"
            subClass="VRTRawRasterBand"><SourceFilename>{self.outside / "secret.raw"}</SourceFilename></VRTRasterBand></VRTDataset>""")
        for source in (outside, virtual("up.vrt", "../out/secret.tif", 1), virtual("link.vrt", linked),
                       virtual("mean.vrt", secret, kind="ComplexSource"), virtual("deep.vrt", outside), raw):
            self.refused(source)
        # Names that are no files: memory, addresses, files inside others, and a raster that names itself.
        self.memory = ctypes.create_string_buffer(SECRET)
        place = ctypes.addressof(self.memory)
        for source in (f"MEM:::DATAPOINTER={place},PIXELS=4,LINES=4", "/vsicurl/http://localhost:1/x.tif",
                       f"/vsisubfile/0,{near}", "WMS:http://localhost:1/?", "loop.vrt"):
            with self.subTest(source):
                code, err, pixels = self.read(virtual("loop.vrt", source, int(source == "loop.vrt")))
                self.assertEqual((code, pixels, err.count("\n")), (1, b"", 1), err)

    def test_nothing_is_written_outside(self):
        self.serve("test", "--root", self.inside)
        target = self.outside / "target"
        source = self.tiff(self.inside / "source.tif", pixels=bytes(range(16)))
        target.write_bytes(b"as it was")
        before = self.snapshot()
        (self.inside / "made.tif").symlink_to(target)
        (self.inside / "new.tif").symlink_to(self.outside / "new.tif")
        for out in (self.inside / "made.tif", self.inside / "new.tif", self.outside / "plain.tif"):
            result = self.submit(
                f'<Job><Reasons/><Command Name="c" ID="CreateRasterCommand"><Input ConnStr="{out}" Format="TIFF"'
                ' Samples="4" Lines="4" Bands="1" DataType="Byte"/><Output URI="$u"/></Command>'
                '<Command Name="d" ID="CloseRasterCommand"><DependsOn Name="c"/><Input URI="$u"/></Command></Job>')
            self.assertEqual(result["c"]["Result"], "Failed", out)
            self.assertIn("allowed here", result["c"]["Reason"])
        # A driver's overviews, and statistics, go into side files.
        (self.inside / "source.tif.ovr").symlink_to(self.outside / "made.ovr")
        (self.inside / "source.tif.aux.xml").symlink_to(self.outside / "made.xml")
        os.chmod(source, 0o444)
        run("pyramid", "build", source, "--type", "DRIVER", "--server", "test")
        run("stats", source, "--save", "--server", "test")
        (self.inside / "source.tif.pyr").symlink_to(self.outside / "made.pyr")
        run("pyramid", "build", source, "--overwrite", "--server", "test")
        for folder in (self.outside, f"{self.inside}/../out"):
            result = self.submit(
                f'<Job><Reasons/><Command Name="t" ID="CreateTempRasterCommand"><Input Directory="{folder}"'
                ' Samples="4" Lines="4" Bands="1" DataType="Byte"/></Command></Job>')
            self.assertEqual(result["t"]["Result"], "Failed")
        self.assertEqual(self.snapshot(), before)

    def test_metadata_addresses(self):
        self.serve("test", "--root", self.inside, "--allow", "network")
        secret = self.outside / "secret.xml"
        secret.write_text("<Dimap_Document><a>secret</a></Dimap_Document>")
        shutil.copy(secret, self.inside / "plain.xml")
        (self.inside / "link.xml").symlink_to(secret)

        def read(kind, name):
            return self.submit(
                '<Job><Reasons/><Command Name="m" ID="CreateMetadataCommand">'
                f'<Input ConnStr="PLEIADESDIM|{name}|{kind}"/></Command></Job>')["m"]

        self.assertEqual(read("XmlUrl", f"file://{self.inside}/plain.xml")["Result"], "Success")
        for name in (secret, self.inside / "link.xml"):
            self.assertIn("allowed here", read("XmlFile", name)["Reason"])
        for name in (f"file://{secret}", f"file:{secret}", f"file://localhost{secret}",
                     f"FILE://{secret}", f"file://{self.inside}/link.xml",
                     f"file://{self.inside}/%2e%2e/out/secret.xml"):
            result = read("XmlUrl", name)
            self.assertEqual(result["Result"], "Failed", name)
            self.assertRegex(result["Reason"], "allowed here|no address")

    def test_the_kernel_keeps_the_server_too(self):
        self.serve("test", "--root", self.inside)
        status = pathlib.Path(f"/proc/{self.server.pid}/status").read_text()
        # A kernel without Landlock is told of in the first line that serve() has read.
        self.assertIn("NoNewPrivs:\t1", status)

    @needs_data
    def test_the_server_still_has_what_it_needs(self):
        self.serve("test", "--root", self.inside)
        scene = shutil.copy(DATA / "RGB.byte.tif", self.inside / "scene.tif")
        for verb in (["info"], ["stats"], ["metadata"]):
            here, there = (run(*verb, scene, *more) for more in ([], ["--server", "test"]))
            self.assertEqual(here, there)
        code, _, err = run("warp", scene, self.inside / "warped.tif", "--to", "EPSG:4326", "--server", "test")
        self.assertEqual((code, err), (0, ""))
        code, _, err = run("pyramid", "build", scene, "--server", "test")
        self.assertEqual((code, err), (0, ""))
        code, _, err = run("segment", scene, self.inside / "labels.tif", "--server", "test", "-q")  # with a working file
        self.assertEqual((code, err), (0, ""))

    def test_inside_everything_opens(self):
        odd = self.inside / "vsi_scenes"
        odd.mkdir()
        self.serve("test", "--root", self.inside)
        scene = self.tiff(odd / "scene.tif")
        gdal("gdaladdo", "-q", "-ro", scene, "2")
        self.assertEqual(self.read(scene)[2], SECRET)
        (self.inside / "link.tif").symlink_to(scene)
        self.assertEqual(self.read(self.inside / "link.tif")[2], SECRET)
        h5 = Hdf5()
        h5.write(odd / "data.h5")
        (odd / "pixels.raw").write_bytes(SECRET)
        h5.write(odd / "external.h5", external=odd / "pixels.raw")
        for strings in (f'HDF5|HDF5:"{odd}/data.h5"://band', f"{odd}/data.h5", f"HDF5|{odd}/external.h5",
                        f"TIFF|{scene}|NUM_THREADS=1", f"TIFF|{scene}|GEOREF_SOURCES=PAM"):
            result = self.submit(
                f"<Job><Reasons/><Command Name='o' ID='OpenRasterCommand'><Input ConnStr='{strings}'/>"
                "<Output URI='$r'/></Command></Job>")
            self.assertEqual(result["o"]["Result"], "Success", (strings, result["o"].get("Reason")))
        result = self.submit(
            '<Job><Reasons/><Command Name="t" ID="CreateTempRasterCommand"><Input Samples="4" Lines="4" Bands="1"'
            ' DataType="Byte"/></Command></Job>')
        self.assertEqual(result["t"]["Result"], "Success")
        code, out, err = run("transform", "--from", "EPSG:4326", "--to", "EPSG:32618", stdin="-75 40\n")
        self.assertEqual((code, err), (0, ""))


if __name__ == "__main__":
    unittest.main()
