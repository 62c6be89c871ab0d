"""Shells complete command lines of vexg: what they offer is asked of the shells themselves."""

import os
import pathlib
import pty
import select
import shutil
import subprocess
import tempfile
import time
import unittest

from support import VEXG

# A line as it is typed, and the one word that it can become. A file lies in the folder.
UNIQUE = [("vexg rasteri", "rasterize"), ("vexg pyramid del", "delete"), ("vexg completion fi", "fish"),
          ("vexg read --interl", "--interleave"), ("vexg read --interleave bs", "bsq"),
          ("vexg read x --interleave bs", "bsq"), ("vexg --lenient read --interl", "--interleave"),
          ("vexg help OpenRasterC", "OpenRasterCommand"), ("vexg info sce", "scene.tif"),
          ("vexg copy scene.tif --region sce", "scene.tif")]


class CompletionTest(unittest.TestCase):
    def setUp(self):
        self.folder = pathlib.Path(self.enterContext(tempfile.TemporaryDirectory()))
        (self.folder / "scene.tif").touch()
        self.environment = {"PATH": f"{pathlib.Path(VEXG).parent}:/usr/bin:/bin", "HOME": str(self.folder),
                            "TERM": "xterm"}

    def script(self, shell):
        done = subprocess.run([VEXG, "completion", shell], capture_output=True, text=True, check=True)
        self.assertEqual(done.stderr, "")
        return done.stdout

    @unittest.skipUnless(shutil.which("fish"), "needs fish")
    def test_fish(self):
        (self.folder / "vexg.fish").write_text(self.script("fish"))
        asked = "source vexg.fish\n" + "".join(f'echo "$(complete -C "{line}")|"\n' for line, _ in UNIQUE)
        done = subprocess.run(["fish", "--no-config"], input=asked, capture_output=True, text=True,
                              cwd=self.folder, env=self.environment)
        self.assertEqual(done.stderr, "")
        offered = [[line.split("\t")[0] for line in answer.split("\n") if line]
                   for answer in done.stdout.split("|\n")[:-1]]
        self.assertEqual(offered, [[word] for _, word in UNIQUE])

    @unittest.skipUnless(shutil.which("zsh"), "needs zsh")
    def test_zsh(self):
        # Installed as a package does it: a file of a folder of functions.
        (self.folder / "functions").mkdir()
        (self.folder / "functions" / "_vexg").write_text(self.script("zsh"))
        (self.folder / ".zshrc").write_text(
            "fpath=($HOME/functions $fpath)\nautoload -Uz compinit\ncompinit -u -D\nPROMPT=\n"
            'tell() { print -r -- "[$BUFFER]"; BUFFER= }\nzle -N tell\nbindkey "^T" tell\nprint "[ready]"\n')
        shell, end = pty.fork()
        if shell == 0:
            os.chdir(self.folder)
            os.execve(shutil.which("zsh"), ["zsh", "-i"], {**self.environment, "ZDOTDIR": str(self.folder)})
        self.addCleanup(os.waitpid, shell, 0)
        self.addCleanup(os.close, end)
        self.assertIn("ready", self.answer(end))
        for line, word in UNIQUE:
            os.write(end, f"{line}\t\x14".encode())
            self.assertEqual(self.answer(end).split()[-1], word, line)

    def answer(self, end):
        """The text between brackets that the shell prints next."""
        text, patience = "", time.monotonic() + 60
        while not ("[" in text and text.endswith("]\r\n")):
            if not select.select([end], [], [], max(0, patience - time.monotonic()))[0]:
                self.fail(f"zsh says no more than {text!r}")
            text += os.read(end, 1).decode("latin-1")
        return text[text.rindex("[") + 1:-3]


if __name__ == "__main__":
    unittest.main()
