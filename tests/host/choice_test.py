"""What a name says of a file to make or to read, and which levels are shown of a raster with two sets."""

import os
import shutil
import subprocess
import time
import unittest

from support import DATA, FolderTest, gdal_pixels, needs_data, needs_gdal, read_png, run


@needs_data
@needs_gdal
class Pictures(FolderTest):
    def test_the_ending_decides_the_format(self):
        source = DATA / "landsat7_rgb.png"
        for verb in (["quicklook", source], ["hist", source, "-o"]):
            for name, begin in (("a.png", b"\x89PNG"), ("b.PNG", b"\x89PNG"), ("c.jpg", b"\xff\xd8\xff"),
                                ("d.JPEG", b"\xff\xd8\xff"), ("e.webp", b"RIFF")):
                with self.subTest(verb=verb[0], name=name):
                    self.fine(*verb, self.folder / name, "--overwrite")
                    self.assertTrue((self.folder / name).read_bytes().startswith(begin))
            for name in ("f.gif", "f.tif", "g", "h.png.x"):
                self.fails(2, "named .", *verb, self.folder / name)
                self.assertFalse((self.folder / name).exists())
        self.fails(2, "a picture is named .png, .jpg, .jpeg or .webp", "quicklook", source, self.folder / "a.svg")

    def test_a_webp_shows_what_the_png_does(self):
        """To the bit where there are few colours, and transparent at the same places."""
        labels = self.folder / "labels.tif"
        subprocess.run(["gdal_calc.py", "-A", DATA / "landsat7_rgb.png", "--calc", "A//64*80", "--outfile", labels, "--quiet"],
                       check=True, capture_output=True)
        for source, most, options in ((labels, 0, ["--stretch", "none"]), (DATA / "alpha.tif", 6, []),
                                      (DATA / "landsat7_rgb.png", 6, [])):
            with self.subTest(source=source.name):
                pictures = []
                for name in ("q.png", "q.webp"):
                    self.fine("quicklook", source, self.folder / name, "--overwrite", "--size", "300", *options)
                    pictures.append(gdal_pixels(self.folder / name))
                png, webp = pictures
                width, height, channels, _ = read_png(self.folder / "q.png")
                kept = len(webp) // (width * height)
                self.assertEqual(kept, max(channels, 3) if channels % 2 else 4)
                off = shown = 0
                for i in range(width * height):
                    a, b = png[i * channels:(i + 1) * channels], webp[i * kept:(i + 1) * kept]
                    a = a if channels > 2 else a[:1] * 3 + a[1:]
                    if kept == 4:
                        self.assertEqual(a[3], b[3])
                    if kept == 3 or a[3]:
                        off += sum(abs(x - y) for x, y in zip(a[:3], b[:3]))
                        shown += 3
                self.assertLessEqual(off / shown, most)

    def test_a_jpeg_shows_what_the_png_does_and_white_for_what_is_not_valid(self):
        mask = self.folder / "mask.tif"
        subprocess.run(["gdal_translate", "-q", "-b", "1", "-b", "2", "-b", "3", "-mask", "4", "-srcwin", "100",
                        "1050", "240", "173", DATA / "alpha.tif", mask], check=True)
        code, out, err = run("quicklook", mask, self.folder / "q.jpg")
        self.assertEqual((code, len(err.strip().splitlines())), (0, 1), err)
        self.fine("quicklook", mask, self.folder / "q.png")
        width, height, channels, png = read_png(self.folder / "q.png")
        raw = self.folder / "q.raw"
        subprocess.run(["gdal_translate", "-q", "-of", "ENVI", "-co", "INTERLEAVE=BIP", self.folder / "q.jpg", raw],
                       check=True)
        jpg = raw.read_bytes()
        self.assertEqual((channels, len(jpg)), (4, width * height * 3))
        off = 0
        for i in range(width * height):
            shown = png[i * 4:i * 4 + 3] if png[i * 4 + 3] else b"\xff\xff\xff"
            off += sum(abs(a - b) for a, b in zip(shown, jpg[i * 3:i * 3 + 3]))
        self.assertLess(off / len(jpg), 6)  # a JPEG changes values a little


@needs_data
@needs_gdal
class Names(FolderTest):
    def test_one_of_several_rasters_in_a_file(self):
        file = self.folder / "two.tif"
        for name, append in (("rgb1.tif", "NO"), ("rotated.tif", "YES")):
            subprocess.run(["gdal_translate", "-q", "-co", f"APPEND_SUBDATASET={append}", DATA / name, file], check=True)
        for named in ([f"{file}|SUBDATASET=2"], [file, "--subdataset", "2"]):
            with self.subTest(named=named):
                self.assertIn("10 samples, 15 lines, 1 bands", self.fine("info", *named))
                self.fine("copy", *named[:1], self.folder / "o.tif", *named[1:], "--overwrite")
                self.assertIn("10 samples, 15 lines, 1 bands", self.fine("info", self.folder / "o.tif"))
                before = file.read_bytes()
                self.fails(2, "is a file of the input", "copy", *named[:1], file, *named[1:], "--overwrite")
                self.assertEqual(file.read_bytes(), before)
        self.fails(1, "none of them 7", "info", file, "--subdataset", "7")
        self.fails(2, "NAME=VALUE", "info", f"{file}|oops")
        self.assertIn("10 samples, 15 lines, 1 bands", self.fine("info", DATA / "rotated.tif", "--subdataset", "1"))
        self.fails(1, "is one raster, and holds no 2", "info", DATA / "rotated.tif", "--subdataset", "2")


@needs_data
@needs_gdal
class Levels(FolderTest):
    def test_the_newer_or_finer_ones_are_shown_and_it_is_said(self):
        file = self.folder / "s.tif"
        shutil.copy(DATA / "rgb1.tif", file)
        os.chmod(file, 0o644)
        self.fine("pyramid", "build", file)
        self.fine("quicklook", file, self.folder / "q.png", "--size", "50")
        subprocess.run(["gdaladdo", "-q", "-ro", file, "2", "4"], check=True)
        pyramid, own = file.with_name("s.tif.pyr"), file.with_name("s.tif.ovr")
        now = time.time()
        for older, newer, words in ((pyramid, own, "its own are used"), (own, pyramid, "those of the pyramid file are used")):
            os.utime(older, (now + 100, now + 100))
            os.utime(newer, (now + 200, now + 200))
            for verb in (["quicklook", file, self.folder / "q.png", "--size", "50", "--overwrite"], ["stats", file]):
                code, out, err = run(*verb)
                self.assertEqual((code, len(err.strip().splitlines())), (0, 1), err)
                self.assertIn(words, err)


if __name__ == "__main__":
    unittest.main()
