"""Settings of the API reference: sphinx-build python/reference OUT."""

import pathlib
import re
import sys

TREE = pathlib.Path(__file__).resolve().parent.parent.parent
sys.path.insert(0, str(TREE / "python"))

project = "vexg"
release = re.search(r"project\(vexg VERSION (\S+)", (TREE / "CMakeLists.txt").read_text())[1]
extensions = ["sphinx.ext.autodoc", "sphinx.ext.napoleon"]
autodoc_member_order = "bysource"
napoleon_numpy_docstring = False
html_theme = "alabaster"
html_sidebars = {"**": ["localtoc.html", "searchbox.html"]}
