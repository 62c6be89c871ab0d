"""Trees that scripts/lint finds fault with, and those that it lets pass."""

import os
import pathlib
import shutil
import subprocess
import tempfile
import unittest

LINT = pathlib.Path(os.environ["VEXG_SOURCE"]) / "scripts" / "lint"


class Lint(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.tree = pathlib.Path(folder.name)
        (self.tree / "scripts").mkdir()
        shutil.copy(LINT, self.tree / "scripts" / "lint")
        self.put(".clang-format", "BasedOnStyle: Google\n")
        self.put("src/room/header.h", 3 * "/// Says it.\n" + 7 * "int a;\n")

    def put(self, path, text):
        (self.tree / path).parent.mkdir(parents=True, exist_ok=True)
        (self.tree / path).write_text(text)

    def lint(self):
        run = subprocess.run([self.tree / "scripts" / "lint"], capture_output=True, text=True, check=False)
        return run.returncode, run.stdout + run.stderr

    def test_first_words_are_found_where_they_are_comments(self):
        for path, text, line in (
                ("src/room/body.cpp", "int a;\n\n// What it is.\n", 3),
                ("plugins/p/a.h", "int a;  ///< What it is\n", 1),
                ("tests/room/a_test.cpp", 'const char* a = "x";  // What\n', 1),
                ("plugins/p/CMakeLists.txt", "# What it has.\n", 1),
                ("src/room/other.cpp", "// Whatever, and says What.\n", 0),
                ("src/room/text.cpp", 'const char* a = "// What";\n', 0),
                ("build/made.cpp", "// What it is.\n", 0)):
            with self.subTest(path):
                self.put(path, text)
                code, said = self.lint()
                self.assertEqual(code, 1 if line else 0, said)
                if line:
                    self.assertIn(f"{path}:{line}:", said)
                (self.tree / path).unlink()

    def test_the_share_counts_public_headers_without_blank_lines(self):
        code, said = self.lint()
        self.assertIn("30.0 %", said)
        self.assertEqual(code, 0, said)
        self.put("src/room/header_body.h", 50 * "int b;\n")
        self.put("src/room/more.h", "int c;  ///< of it\n\nint d;\n")
        self.assertIn("33.3 %", self.lint()[1])
        self.put("src/room/more.h", "int c;\n")
        code, said = self.lint()
        self.assertIn("27.3 %", said)
        self.assertEqual(code, 1, said)


if __name__ == "__main__":
    unittest.main()
