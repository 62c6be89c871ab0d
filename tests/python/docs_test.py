"""Every block of Python in the documents runs as it stands there."""

import os
import re
import shutil
import subprocess
import sys
import unittest

from support import SCENE, SOURCE, FolderTest, needs, needs_data

import vexg
from samples import write_samples


@needs_data
@needs("pandas", "dask", "xarray")
class DocumentsTest(FolderTest):
    def test_blocks_run(self):
        shutil.copy(SCENE, self.folder / "scene.tif")
        write_samples(self.folder / "samples.geojson", vexg.open(SCENE))
        ran = 0
        for document in ("README.md", "docs/python.md"):
            text = (SOURCE / document).read_text()
            for block in re.findall(r"^```python\n(.*?)^```", text, re.DOTALL | re.MULTILINE):
                with self.subTest(document, block=block.splitlines()[:4]):
                    for made in ("ndvi.tif", "part.tif", "ratio.tif"):
                        (self.folder / made).unlink(missing_ok=True)
                    done = subprocess.run([sys.executable, "-c", block], cwd=self.folder, env=os.environ,
                                          capture_output=True, text=True)
                    self.assertEqual(done.returncode, 0, done.stderr)
                    ran += 1
        self.assertGreater(ran, 6)
        self.assertEqual([path.name for path in self.folder.iterdir() if path.name.startswith(".")], [])


class ReferenceTest(FolderTest):
    @needs("sphinx")
    def test_the_reference_is_made_of_the_docstrings(self):
        made = subprocess.run([sys.executable, "-m", "sphinx", "-W", "--keep-going", "-q", SOURCE / "python" / "reference",
                               self.folder / "html"], capture_output=True, text=True)
        self.assertEqual(made.returncode, 0, made.stderr)
        text = (self.folder / "html" / "index.html").read_text()
        for name in ("vexg.open", "vexg.Raster.read", "vexg.Raster.clip", "vexg.Segments.classify", "vexg.Server.close"):
            self.assertIn(f'id="{name}"', text)


if __name__ == "__main__":
    unittest.main()
