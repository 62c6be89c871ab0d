"""vexg batch: a verb on many files in one process."""

import json
import shutil
import unittest

from support import DATA, FolderTest, needs_data, run


@needs_data
class Batch(FolderTest):
    def setUp(self):
        super().setUp()
        self.names = ("landsat7_olinda.tif", "RGB.byte.tif", "dem_int16.tif")
        self.files = [self.folder / name for name in self.names]
        for name, path in zip(self.names, self.files):
            shutil.copyfile(DATA / name, path)

    def listing(self, *names, end="\n"):
        path = self.folder / "files.txt"
        path.write_text("".join(f"{name}{end}" for name in names))
        return path

    def test_says_of_each_file_what_the_verb_says(self):
        files = self.listing(*self.files)
        lines = self.fine("batch", "info", "--json", "--files-from", files).splitlines()
        self.assertEqual([json.loads(line) for line in lines],
                         [json.loads(self.fine("info", "--json", path)) for path in self.files])
        text = self.fine("batch", "stats", "--files-from", files, "--bands", "0")
        self.assertEqual(text, "\n".join(self.fine("stats", path, "--bands", "0") for path in self.files))

    def test_takes_the_list_in_all_its_forms(self):
        want = self.fine("batch", "info", "--files-from", self.listing(*self.files))
        for end in ("\r\n", "\n\n", "\0"):
            self.assertEqual(self.fine("batch", "info", "--files-from", self.listing(*self.files, end=end)), want)
        text = "".join(f"{path}\n" for path in self.files)
        self.assertEqual(self.fine("batch", "info", "--files-from", "-", stdin=text), want)
        self.assertEqual(self.fine("batch", "info", "--files-from", self.listing()), "")

    def test_names_outputs_after_the_files(self):
        made = self.folder / "made"
        made.mkdir()
        files = self.listing(*self.files)
        self.fine("batch", "copy", "--files-from", files, "{}", f"{made}/{{stem}}.img", "-q")
        self.assertEqual(sorted(path.name for path in made.iterdir() if path.suffix == ".img"),
                         ["RGB.byte.img", "dem_int16.img", "landsat7_olinda.img"])
        shown = json.loads(self.fine("info", "--json", made / "RGB.byte.img"))
        self.assertEqual((shown["samples"], shown["lines"], shown["bands"]), (791, 718, 3))

    def test_a_file_that_fails_is_named_and_the_others_go_on(self):
        absent = self.folder / "absent.tif"
        damaged = self.folder / "damaged.tif"
        damaged.write_bytes(b"II*\0 no more of it")
        files = self.listing(self.files[0], absent, damaged, self.files[1])
        code, out, err = run("batch", "info", "--files-from", str(files), "--json")
        self.assertEqual(code, 1)
        self.assertEqual([json.loads(line)["file"] for line in out.splitlines()],
                         [str(self.files[0]), str(self.files[1])])
        said = err.splitlines()
        self.assertEqual(len(said), 2)
        self.assertIn(str(absent), said[0])
        self.assertIn(str(damaged), said[1])

    def test_refuses_what_is_wrong_for_all_files(self):
        files = self.listing(*self.files)
        self.fails(2, "info has no option --jsn", "batch", "info", "--files-from", files, "--jsn")
        self.fails(2, "there is no verb inf", "batch", "inf", "--files-from", files)
        self.fails(2, "is no verb that works on a file", "batch", "formats", "--files-from", files)
        self.fails(2, "is no verb that works on a file", "batch", "batch", "--files-from", files)
        self.fails(2, "nowhere.txt", "batch", "info", "--files-from", self.folder / "nowhere.txt")
        self.fails(2, "--files-from", "batch", "info")


if __name__ == "__main__":
    unittest.main()
