"""The notebooks of the user guide run from their first cell to their last, and show what they tell of."""

import concurrent.futures
import os
import shutil
import unittest

from support import SCENE, SOURCE, FolderTest, needs, needs_data

import vexg
from samples import write_mtl, write_samples

NOTEBOOKS = sorted((SOURCE / "docs" / "notebooks").glob("*.ipynb"))


@needs_data
@needs("nbclient", "nbformat", "ipykernel", "pandas", "dask", "xarray")
class NotebooksTest(FolderTest):
    def shown(self, name, folder):
        """Runs a notebook in a folder with its inputs; gives what its cells show, as texts, by their source."""
        import nbclient
        import nbformat

        shutil.copy(SCENE, folder / "scene.tif")
        write_mtl(folder / "scene_MTL.txt")
        write_samples(folder / "samples.geojson", vexg.open(SCENE))
        write_samples(folder / "checks.geojson", vexg.open(SCENE), seed=2)
        book = nbformat.read(SOURCE / "docs" / "notebooks" / name, 4)
        nbclient.NotebookClient(book, timeout=60, resources={"metadata": {"path": str(folder)}},
                                kernel_name="python3", shutdown_kernel="immediate").execute(
            env={**os.environ, "PYDEVD_DISABLE_FILE_VALIDATION": "1", "IPYTHONDIR": str(self.folder / ".ipython")})
        found = {}
        for cell in book.cells:
            if cell.cell_type == "code":
                found[cell.source] = "".join(output.get("text", "") + output.get("data", {}).get("text/plain", "")
                                             for output in cell.outputs)
        return found

    def test_none_has_outputs(self):
        import nbformat

        self.assertGreater(len(NOTEBOOKS), 2)
        for file in NOTEBOOKS:
            book = nbformat.read(file, 4)
            nbformat.validate(book)
            for cell in book.cells:
                if cell.cell_type == "code":
                    self.assertEqual((cell.outputs, cell.execution_count), ([], None), file.name)

    def test_they_run(self):
        made = {"1-scene.ipynb": {"coarse.tif"}, "2-reflectance.ipynb": {"ndvi.tif", "green.tif"},
                "3-classes.ipynb": {"landcover.tif", "landcover.gpkg"}, "4-server.ipynb": {"ratio.tif", "ratio.xml"}}
        self.assertEqual(sorted(made), [file.name for file in NOTEBOOKS])
        folders = {name: self.folder / name[0] for name in made}
        for folder in folders.values():
            folder.mkdir()
        # Side by side: most of the time is that of processes that start.
        with concurrent.futures.ThreadPoolExecutor(len(made)) as pool:
            runs = {name: pool.submit(self.shown, name, folder) for name, folder in folders.items()}
        for name, files in made.items():
            with self.subTest(name):
                cells = runs[name].result()
                left = {path.name for path in folders[name].iterdir()}
                self.assertLessEqual(files, left)
                self.assertEqual([file for file in left if file.startswith(".")], [])
                # A cell that ends in a value shows it; others end in a statement, or close something.
                for line in [source.splitlines()[-1] for source, text in cells.items() if not text]:
                    self.assertRegex(line, r"^(import |server\.close|[a-z_, ]+ = )", name)
                self.assertNotIn("False", cells.values())


if __name__ == "__main__":
    unittest.main()
