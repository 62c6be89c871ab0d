"""What the command line makes of words that aren't quite right, and of odd values."""

import json
import shutil
import unittest

from support import DATA, FolderTest, needs_data, read_npy, run, write_orva

SCENE = DATA / "RGB.byte.tif"  # in UTM zone 18


class Words(FolderTest):
    def test_the_nearest_name_and_the_right_page(self):
        raster = write_orva(self.folder / "raster", 4, 4, 1)
        for words, arguments in (
                ("there is no verb statss; did you mean stats?; see vexg --help", ["statss", raster]),
                ("there is no verb zzz; see vexg --help", ["zzz"]),
                ("stats has no option --bnads; did you mean --bands?; see vexg stats --help",
                 ["stats", raster, "--bnads", "0"]),
                ("stats has no option --bnads; did you mean --bands?", ["stats", raster, "--bnads=0"]),
                ("see vexg stats --help", ["stats"]),
                ('"bilinr" is none of nearest, bilinear, cubic', ["warp", raster, "x.tif", "--to", "4326",
                                                                "--resampling", "bilinr"]),
                ('there is no format "TIFFF"; did you mean TIFF?', ["copy", raster, self.folder / "x.tif",
                                                                    "--format", "TIFFF"]),
                ("did you mean GetBasicRasterStatsCommand?", ["help", "GetBasicRasterStatCommand"])):
            with self.subTest(words):
                self.fails(2, words, *arguments)

    def test_lists_are_parted_by_blanks_or_commas(self):
        raster = write_orva(self.folder / "raster", 2, 2, 3, bytes(range(12)))
        want = None
        for bands in (["2,0"], ["2", "0"], ["2, 0"], ["2 0"], ["2,", "0"]):
            for arguments in (["--bands", *bands, raster], [raster, "--bands", *bands]):
                out = self.folder / "out.npy"
                self.fine("read", *arguments, "-o", out, "--overwrite", "-q", "--rect", "0", "0", "1", "0")
                want = want or read_npy(out)
                self.assertEqual(read_npy(out), want, arguments)
        self.assertEqual(want[2], bytes((2, 0, 5, 3)))

    @needs_data
    def test_what_other_programs_call_it(self):
        def warped(*arguments):
            code, _, err = run("warp", str(SCENE), str(self.folder / "out.tif"), "--overwrite", *arguments)
            self.assertEqual((code, err), (0, ""), arguments)
            info = json.loads(self.fine("info", "--json", self.folder / "out.tif"))
            return (self.folder / "out.tif").read_bytes(), info
        plain = warped("--to", "EPSG:4326", "--resampling", "linear")
        self.assertEqual(warped("--to", "4326", "--resampling", "Bilinear", "--format", "GTiff"), plain)
        metres = warped("--to", "32618", "--pixel-size", "1200")
        for size in ("1200m", "1200 metres", "1.2km"):
            self.assertEqual(warped("--to", "32618", "--pixel-size", size), metres, size)
        self.fine("calibrate", "radiance", SCENE, self.folder / "cal.tif", "--gain", "2", "3", "4", "--offset", "0",
                  "--type", "float32")
        self.assertIn("Single", self.fine("info", self.folder / "cal.tif"))

    @needs_data
    def test_odd_values_are_questioned_and_impossible_ones_refused(self):
        out = self.folder / "out.tif"
        for note, arguments in (
                ("a pixel is 30 degrees wide", ["warp", SCENE, out, "--to", "EPSG:4326", "--pixel-size", "30"]),
                ("its own is zone 18", ["warp", SCENE, out, "--to", "EPSG:32601"]),
                ("150000000 astronomical units",
                 ["calibrate", "reflectance", SCENE, out, "--gain", "1", "--offset", "0", "--irradiance", "1500",
                  "--sun-elevation", "45deg", "--distance", "150000000"])):
            code, _, err = run(*map(str, arguments), "--overwrite")
            self.assertEqual(code, 0, err)
            self.assertRegex(err, r"\Avexg: note: [^\n]+\n\Z")
            self.assertIn(note, err)
        for words, size in (("the unit of the system is Degree", "30m"), ("no pixel is that many", "400"),
                            ('"x" is no size above 0', "x"), ('"-1" is no size above 0', "-1")):
            self.fails(2, words, "warp", SCENE, out, "--to", "EPSG:4326", f"--pixel-size={size}", "--overwrite")

    def test_names_reach_no_terminal_raw(self):
        name = self.folder / "a\nb\tc"
        for verb in ("info", "stats", "hist"):
            self.fails(1, "a\\nb\\tc", verb, name)
        shutil.move(write_orva(self.folder / "raster", 4, 4, 1), name)
        shutil.move(self.folder / "raster.hdr", f"{name}.hdr")
        for verb in ("info", "stats"):
            self.assertIn("a\\nb\\tc\n", self.fine(verb, name))


class Checks(FolderTest):
    def job(self, inner):
        path = self.folder / "job.xml"
        path.write_text(f'<Job><Command Name="s" ID="ExampleSumCommand">{inner}</Command></Job>')
        return path

    def test_jobs_are_strict_unless_lenient(self):
        for inner, words in (('<Input Values="1:1 [1] " Scael="2"/>', "there is no input Scael; did you mean Scale?"),
                             ('<Input Values="1:1 [1] " Scale="two"/>', 'input Scale: "two" is no number'),
                             ('<Input Values="1:1 [1] "/><Output Smu="$x"/>', "did you mean Sum?")):
            path = str(self.job(inner))
            code, out, err = run("run", "-q", "--json", path)
            self.assertEqual(code, 1)
            self.assertIn(words, err)
            self.assertIn(words, json.loads(out)["commands"][0]["reason"])
            self.assertEqual(run("run", "-q", "--lenient", path)[0], 0)


if __name__ == "__main__":
    unittest.main()
