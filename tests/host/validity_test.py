"""Which pixels are valid, and what else a raster tells of itself, through every verb that makes one.

The counts come from GDAL's masks, of files that GDAL's programs made.
"""

import json
import pathlib
import struct
import subprocess
import tempfile
import unittest

from support import DATA, FolderTest, gdal_checksums, needs_data, needs_gdal, read_npy, run

FORMATS = ["tif", "img", "ntf", "png", "jp2", "bmp", "dat"]
RADIANCE = ["radiance", "--gain", "2", "--offset", "1"]


def gdal(program, *arguments):
    subprocess.run([program, "-q", *map(str, arguments)], check=True, capture_output=True)


@needs_data
@needs_gdal
class ValidityTest(FolderTest):
    @classmethod
    def setUpClass(cls):
        """Sources that tell in each way which pixels are valid, made once."""
        made = tempfile.TemporaryDirectory()
        cls.addClassCleanup(made.cleanup)
        cls.made = pathlib.Path(made.name)
        cls.sources = {}
        part = cls.made / "alpha.tif"  # 240 x 173, 13,787 of them not transparent
        gdal("gdal_translate", "-srcwin", 100, 1050, 240, 173, DATA / "alpha.tif", part)
        inside = ["--config", "GDAL_TIFF_INTERNAL_MASK", "YES"]
        cls.sources["alpha"] = part
        for name, *arguments in (("mask", *inside, "-b", 1, "-b", 2, "-b", 3, "-mask", 4, part),
                                 ("msk", "-b", 1, "-mask", 4, part),
                                 ("value", "-b", 1, "-a_nodata", 0, "-srcwin", 0, 0, 200, 150, DATA / "RGB.byte.tif"),
                                 ("both", *inside, "-b", 1, "-mask", 4, "-a_nodata", 255, part),
                                 ("none", "-b", 1, part)):
            cls.sources[name] = cls.made / (name + ".tif")
            gdal("gdal_translate", *arguments, cls.sources[name])
        cls.wanted = {name: cls.source_counts(name) for name in cls.sources}

    def translate(self, name, *arguments):
        path = self.folder / (name + ".tif")
        gdal("gdal_translate", *arguments, path)
        return path

    @classmethod
    def masks(cls, path, bands):
        """GDAL's mask of each band, in one go."""
        raw = cls.made / "masks.raw"
        chosen = [word for band in range(bands) for word in ("-b", f"mask,{band + 1}")]
        gdal("gdal_translate", "-of", "ENVI", "-co", "INTERLEAVE=BSQ", *chosen, path, raw)
        data = raw.read_bytes()
        size = len(data) // bands
        return [data[band * size:(band + 1) * size] for band in range(bands)]

    @classmethod
    def source_counts(cls, name):
        """The valid pixels of each band but an alpha band. Of "both", GDAL's mask hides the no-data value: pixels that
        have it are not valid either."""
        path = cls.sources[name]
        masks = cls.masks(path, 3 if name in ("alpha", "mask") else 1)
        if name == "both":
            bare = cls.made / "bare.tif"
            gdal("gdal_translate", "-mask", "none", "-a_nodata", 255, path, bare)
            masks = [bytes(a and b for a, b in zip(masks[0], cls.masks(bare, 1)[0]))]
        return [len(mask) - mask.count(0) for mask in masks]

    def counts(self, path, bands=1):
        """The valid pixels of bands: as GDAL counts them, or of a file of our own as we do."""
        if path.suffix != ".dat":
            return [len(mask) - mask.count(0) for mask in self.masks(path, bands)]
        self.fine("read", path, "-o", self.folder / "p.npy", "--mask", self.folder / "m.npy", "--bands",
                  ",".join(map(str, range(bands))), "--overwrite")
        _, shape, data = read_npy(self.folder / "m.npy")
        self.assertEqual((*shape, 1)[2], bands)  # lines, samples and, of several, bands
        return [data[band::bands].count(0) for band in range(bands)]

    def check(self, name, target, said):
        """The file has as many valid pixels in each band but the alpha band."""
        wanted = self.wanted[name]
        self.assertEqual(self.counts(target, len(wanted)), wanted, said)

    def test_copies_keep_it_in_every_format(self):
        for name in self.sources:
            wanted = self.wanted[name]
            for ending in FORMATS + ["gif", "jpg"]:
                if (ending == "bmp" and name == "alpha") or (ending in ("gif", "jpg") and len(wanted) > 1):
                    continue  # formats of one or three bands
                with self.subTest(name=name, ending=ending):
                    target = self.folder / f"copy.{ending}"
                    code, out, err = run("copy", self.sources[name], target, "--overwrite")
                    self.assertEqual(code, 0, err)
                    self.check(name, target, err)
                    self.assertNotIn("does not keep which pixels", err)

    def test_alpha_stays_alpha_where_there_is_such_a_thing(self):
        for ending, stays in (("tif", True), ("png", True), ("jp2", True), ("img", False), ("ntf", False)):
            with self.subTest(ending=ending):
                target = self.folder / f"copy.{ending}"
                code, out, err = run("copy", self.sources["alpha"], target, "--overwrite")
                info = subprocess.run(["gdalinfo", target], capture_output=True, text=True).stdout
                self.assertEqual("ColorInterp=Alpha" in info, stays)
                self.assertEqual("the alpha band" in err, not stays)
        plain = self.translate("plain", "-b", 1, "-b", 2, "-b", 3, "-b", 1, "-colorinterp_4", "undefined",
                               "-co", "ALPHA=NO", self.sources["alpha"])
        self.fine("copy", plain, self.folder / "plain2.tif")
        self.assertEqual(self.counts(self.folder / "plain2.tif"), [240 * 173])
        # PNG takes the fourth band for alpha, as it takes the second of two.
        for bands, last in ((("--bands", "0,1,2,3"), 3), (("--bands", "2,0"), 1)):
            target = self.folder / "plain.png"
            code, out, err = run("copy", plain, target, *bands, "--strict")
            self.assertEqual((code, out, target.exists()), (1, "", False), err)
            self.assertIn(f"band {last} as such, which is an alpha band there", err.splitlines()[-1])

    def test_calibrated_pixels_keep_it(self):
        for name in self.sources:
            for ending, kind in (("tif", "Single"), ("tif", "Int16"), ("img", "Byte"), ("img", "Double"),
                                 ("ntf", "Int16"), ("dat", "Single"), ("dat", "Int16"), ("tif", "Byte")):
                with self.subTest(name=name, ending=ending, kind=kind):
                    target = self.folder / f"made.{ending}"
                    code, out, err = run("calibrate", RADIANCE[0], self.sources[name], target, *RADIANCE[1:],
                                         "--type", kind, "--overwrite")
                    self.assertEqual(code, 0, err)
                    if "does not keep which pixels" not in err:
                        self.check(name, target, err)

    def test_warped_pixels_keep_it_and_those_outside_are_not_valid(self):
        for name in self.sources:
            if name == "both":
                continue  # GDAL's mask hides its no-data value
            peer = self.folder / "peer.tif"
            gdal("gdalwarp", "-overwrite", "-t_srs", "EPSG:4326", "-dstalpha", "-et", 0, self.sources[name], peer)
            mask = self.masks(peer, 1)[0]
            wanted = len(mask) - mask.count(0)
            for ending in ("tif", "img", "png", "dat", "ntf", "jp2"):
                with self.subTest(name=name, ending=ending):
                    target = self.folder / f"made.{ending}"
                    code, out, err = run("warp", self.sources[name], target, "--to", peer, "--overwrite",
                                         "--method", "rigorous")
                    self.assertEqual(code, 0, err)
                    self.assertAlmostEqual(self.counts(target)[0], wanted, delta=wanted * 0.002, msg=err)

    def test_what_is_burnt_in_collides_with_nothing(self):
        code, out, err = run("copy", self.sources["msk"], self.folder / "o.dat")
        self.assertEqual(code, 0)
        self.assertRegex(err, "have the no-data value")
        value = json.loads(self.fine("info", "--json", self.folder / "o.dat"))["noData"][0]
        self.fine("read", self.sources["msk"], "-o", self.folder / "p.npy", "--mask", self.folder / "m.npy")
        pixels, states = read_npy(self.folder / "p.npy")[2], read_npy(self.folder / "m.npy")[2]
        self.assertNotIn(value, {pixel for pixel, state in zip(pixels, states) if state == 0})
        # Where every value is in use, the loss is said, and a failure when that is asked for.
        raw = self.folder / "all.raw"
        raw.write_bytes(bytes(range(256)) * 2)
        (self.folder / "all.hdr").write_text(
            "ENVI\nsamples = 32\nlines = 16\nbands = 1\ndata type = 1\ninterleave = bsq\nbyte order = 0\n")
        (self.folder / "half.raw").write_bytes(b"\xff" * 256 + bytes(256))
        (self.folder / "half.hdr").write_text((self.folder / "all.hdr").read_text())
        vrt = self.folder / "all.vrt"
        vrt.write_text(
            '<VRTDataset rasterXSize="32" rasterYSize="16"><VRTRasterBand dataType="Byte" band="1"><SimpleSource>'
            '<SourceFilename relativeToVRT="1">all.raw</SourceFilename></SimpleSource></VRTRasterBand><MaskBand>'
            '<VRTRasterBand dataType="Byte"><SimpleSource><SourceFilename relativeToVRT="1">half.raw'
            "</SourceFilename></SimpleSource></VRTRasterBand></MaskBand></VRTDataset>")
        full = self.translate("full", "--config", "GDAL_TIFF_INTERNAL_MASK", "YES", vrt)
        code, out, err = run("copy", full, self.folder / "full.dat")
        self.assertEqual(code, 0)
        self.assertIn("does not keep which pixels are valid: of band 0 there are 512, and were 256", err)
        code, out, err = run("copy", full, self.folder / "strict.dat", "--strict")
        self.assertEqual((code, len(err.strip().splitlines())), (1, 1), err)
        self.assertFalse((self.folder / "strict.dat").exists())
        self.fine("copy", full, self.folder / "strict.tif", "--strict")

    def test_no_data_values_of_64_bits_keep_their_digits(self):
        low = -(2 ** 63)
        values = [low, low + 1, 5, 2 ** 62 + 1] * 250
        (self.folder / "w.raw").write_bytes(struct.pack("<1000q", *values))
        (self.folder / "w.vrt").write_text(
            '<VRTDataset rasterXSize="40" rasterYSize="25"><VRTRasterBand dataType="Int64" band="1" '
            'subClass="VRTRawRasterBand"><SourceFilename relativetoVRT="1">w.raw</SourceFilename>'
            f"<NoDataValue>{low + 1}</NoDataValue></VRTRasterBand></VRTDataset>")
        source = self.translate("w", self.folder / "w.vrt")
        for step in ("a.tif", "b.dat", "c.tif"):
            self.fine("copy", source, self.folder / step, "--strict")
            source = self.folder / step
        self.assertEqual(self.counts(source), [750])
        info = subprocess.run(["gdalinfo", source], capture_output=True, text=True).stdout
        self.assertIn(f"NoData Value={low + 1}", info)

    def test_a_no_data_value_that_no_pixel_can_have_is_refused(self):
        for value in ("-9999", "256", "1.5", "nan"):
            code, out, err = run("warp", self.sources["none"], self.folder / "o.tif", "--to", "EPSG:4326",
                                 "--no-data", value)
            self.assertEqual((code, len(err.strip().splitlines())), (2, 1), err)
            self.assertIn("a pixel of type Byte can't be", err)
            self.assertFalse((self.folder / "o.tif").exists())


@needs_data
@needs_gdal
class Details(FolderTest):
    VRT = """<VRTDataset rasterXSize="20" rasterYSize="20">{place}<Metadata><MDI key="SENSOR">X/Y</MDI>
<MDI key="a/b">c|d</MDI></Metadata><VRTRasterBand dataType="Byte" band="1"><Description>red one</Description>
<UnitType>K</UnitType><Offset>-3.5</Offset><Scale>0.1</Scale><Metadata><MDI key="wave">0.65</MDI></Metadata>
<SimpleSource><SourceFilename>{data}/landsat7_rgb.png</SourceFilename><SourceBand>1</SourceBand><SrcRect xOff="0"
yOff="0" xSize="20" ySize="20"/><DstRect xOff="0" yOff="0" xSize="20" ySize="20"/></SimpleSource></VRTRasterBand>
<VRTRasterBand dataType="Byte" band="2"><Description>green</Description></VRTRasterBand></VRTDataset>"""
    OF_BANDS = ["SENSOR=X/Y", "a/b=c|d", "Description = red one", "Unit Type: K", "Offset: -3.5,   Scale:0.1",
                "wave=0.65", "Description = green"]

    def source(self, place=""):
        vrt = self.folder / "s.vrt"
        vrt.write_text(self.VRT.format(place=place, data=DATA))
        path = self.folder / "s.tif"
        gdal("gdal_translate", vrt, path)
        return path

    def info(self, path):
        return subprocess.run(["gdalinfo", path], capture_output=True, text=True, check=True).stdout

    def test_copies_keep_what_a_raster_tells_or_say_so(self):
        places = {
            "points": ("<GCPList Projection='EPSG:4326'><GCP Id='1' Pixel='0' Line='0' X='10' Y='20'/><GCP Id='2' "
                       "Pixel='20' Line='0' X='11' Y='20.5'/><GCP Id='3' Pixel='0' Line='20' X='10' Y='19'/>"
                       "</GCPList>", ["(20,0) -> (11,20.5,0)"], "the ground control points"),
            "sheared": ("<SRS>EPSG:32618</SRS><GeoTransform>100,2,0.7,200,0.1,-3</GeoTransform>",
                        ["200, 0.1, -3", 'ID["EPSG",32618]]'], "the sheared grid"),
            "system": ("<SRS>EPSG:32618</SRS>", ['ID["EPSG",32618]]'], "the coordinate system"),
        }
        for name, (place, tokens, words) in places.items():
            source = self.source(place)
            for ending in ("tif", "img", "ntf", "jp2", "png", "dat"):
                with self.subTest(name=name, ending=ending):
                    target = self.folder / f"o.{ending}"
                    code, out, err = run("copy", source, target, "--overwrite")
                    self.assertEqual(code, 0, err)
                    if ending == "dat":
                        for kind in ("names", "units", "scales", "offsets", "metadata items"):
                            self.assertIn(kind, err)
                        self.assertIn(words, err)
                        continue
                    info = self.info(target)
                    for token in self.OF_BANDS:
                        self.assertIn(token, info)
                    self.assertEqual(all(token in info for token in tokens), words not in err, err)
                    if ending not in ("ntf", "png"):  # PNG takes the second of two bands for alpha
                        self.assertEqual(err, "")

    def test_parts_and_other_orders_of_bands_go_with_them(self):
        source = self.source("<GCPList Projection='EPSG:4326'><GCP Id='1' Pixel='7' Line='9' X='10' Y='20'/>"
                             "</GCPList>")
        self.fine("copy", source, self.folder / "o.tif", "-q", "--rect", "5,6,15,16", "--bands", "1,0", "--strict")
        info = self.info(self.folder / "o.tif")
        self.assertIn("(2,3) -> (10,20,0)", info)
        self.assertLess(info.index("Description = green"), info.index("Description = red one"))

    def test_no_false_alarms(self):
        for name, ending in (("rotated.tif", "img"), ("float_nan.tif", "img"), ("rpc_scene.tif", "tif"),
                             ("test_esri_wkt.tif", "ntf"), ("landsat7_olinda.tif", "img"), ("rotated.tif", "png")):
            with self.subTest(name=name, ending=ending):
                code, out, err = run("copy", DATA / name, self.folder / f"o.{ending}", "--overwrite", "--strict")
                self.assertEqual((code, err), (0, ""))


@needs_data
@needs_gdal
class Damage(FolderTest):
    def cut(self, name, share, source):
        path = self.folder / name
        data = source.read_bytes()
        path.write_bytes(data[:int(len(data) * share)])
        return path

    def made(self, name, *options):
        path = self.folder / name
        gdal("gdal_translate", *options, DATA / "landsat7_rgb.jpg", path)
        return path

    def holed(self, name, length, *options):
        path = self.made(name, *options)
        data = bytearray(path.read_bytes())
        middle = len(data) // 2
        data[middle:middle + length] = bytes((i * 37) & 255 for i in range(length))
        path.write_bytes(data)
        return path

    def test_reads_of_damaged_data_fail(self):
        whole = DATA / "landsat7_rgb.jpg"
        nitf = self.made("whole.ntf", "-of", "NITF", "-co", "IC=C3")
        jp2 = self.made("whole.jp2", "-of", "JP2OpenJPEG")
        files = [self.cut("cut.jpg", 0.5, whole), self.cut("cut.ntf", 0.6, nitf), self.cut("cut.jp2", 0.5, jp2),
                 self.holed("holed.tif", 400, "-co", "COMPRESS=PACKBITS"),
                 self.holed("holed2.tif", 3000, "-co", "COMPRESS=JPEG", "-co", "TILED=YES")]
        for path in files:
            for line in (["copy", path, self.folder / "o.tif"], ["stats", path], ["read", path, "-o", self.folder / "o.npy"],
                         ["quicklook", path, self.folder / "o.png"]):
                with self.subTest(path=path.name, verb=line[0]):
                    code, out, err = run(*line)
                    self.assertEqual((code, len(err.strip().splitlines())), (1, 1), err)
                    self.assertIn(path.name, err)
                    self.assertFalse((self.folder / line[-1]).exists() and line[0] != "stats")
        # The lines before the damage can be read.
        self.fine("read", files[0], "-o", self.folder / "top.npy", "-q", "--rect", "0,0,99,19")

    def test_harmless_warnings_stay_so(self):
        data = (DATA / "landsat7_rgb.jpg").read_bytes()
        for name, changed in (("extra.jpg", data[:-2] + b"\x00\x01\x02" + data[-2:]), ("tail.jpg", data + b"junk" * 99)):
            path = self.folder / name
            path.write_bytes(changed)
            self.fine("copy", path, self.folder / (name + ".tif"))
            self.assertEqual(gdal_checksums(self.folder / (name + ".tif")), gdal_checksums(DATA / "landsat7_rgb.jpg"))


if __name__ == "__main__":
    unittest.main()
