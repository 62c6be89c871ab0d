"""Every example of the documents is run, or compiled, as it stands there."""

import os
import pathlib
import re
import shutil
import subprocess
import tempfile
import unittest

from support import BUILD, DATA, SOURCE, PipeTest, needs_data, run


def blocks(document, language):
    text = (SOURCE / document).read_text()
    return re.findall(rf"^```{language}\n(.*?)^```", text, re.DOTALL | re.MULTILINE)


def without_times(result):
    result = re.sub(r'(CPU|Wall)="\d+[a-z]+"', r'\1=""', result)
    result = re.sub(r"<\?xml.*?\?>", "", result)
    return re.sub(r">\s+<", "><", result).strip()


class Documents(PipeTest):
    def test_the_worked_example_gives_what_it_says(self):
        job, result, _ = blocks("docs/job-documents.md", "xml")
        self.assertEqual(job, (SOURCE / "examples/jobs/sum.xml").read_text())
        self.assertEqual(job, blocks("README.md", "xml")[0])
        self.assertEqual(without_times(run("run", "-", stdin=job)[1]), without_times(result))

    def test_the_first_job_of_the_readme_runs(self):
        two_commands, first_job, _, _, _, transform, _ = blocks("README.md", "sh")
        for line in two_commands.splitlines():
            self.assertTrue(os.access(SOURCE / line.split()[0], os.X_OK), line)
        script = "set -e\n" + first_job.replace("build/release", str(BUILD)) + "wait\n" + transform
        shell = subprocess.run(["bash", "-c", script], cwd=SOURCE, capture_output=True, text=True, timeout=60)
        self.assertEqual(shell.returncode, 0, shell.stderr)
        self.assertEqual(shell.stdout.count("<JobResult>"), 2)
        self.assertEqual(shell.stdout.count('"Sum": 45'), 1)
        longitude, latitude = map(float, shell.stdout.splitlines()[-1].split())
        self.assertAlmostEqual(longitude, -(34 + 54 / 60 + 58.20 / 3600), 5)  # of the scene's corner, as gdalinfo has it
        self.assertAlmostEqual(latitude, -(7 + 56 / 60 + 59.36 / 3600), 5)

    @needs_data
    def test_the_raster_verbs_of_the_readme_run(self):
        script = "set -e\n" + "".join(blocks("README.md", "sh")[2:5]).replace("build/release", str(BUILD))
        with tempfile.TemporaryDirectory() as folder:
            shutil.copy(DATA / "landsat7_olinda.tif", pathlib.Path(folder) / "scene.tif")
            shell = subprocess.run(["bash", "-c", script], cwd=folder, capture_output=True, text=True, timeout=60)
            self.assertEqual(shell.returncode, 0, shell.stderr)
            self.assertEqual(sorted(path.name for path in pathlib.Path(folder).iterdir()),
                             ["areas.csv", "areas.gpkg", "both.tif", "cloud.tif", "fields.csv", "fields.shape.fxa", "fields.spectral.fxa",
                              "geographic.tif", "histogram.svg", "labels.tif", "layers.tif", "layers.tif.aux.xml", "part.npy", "part.tif",
                              "ratio.tif",
                              "reflectance.tif", "scene.dat", "scene.dat.hdr", "scene.png", "scene.tif", "scene.tif.pyr",
                              "segments.tif", "small.tif"])

    def test_programs_compile(self):
        compiler = os.environ["VEXG_CXX"]
        for document in sorted(SOURCE.glob("docs/*.md")):
            for program in blocks(document, "cpp"):
                if "#include" in program:
                    source = program
                else:
                    includes = ['"foundation/environment.h"', '"foundation/library.h"', '"commands/job_parser.h"', '"commands/job_result.h"']
                    head = "".join(f"#include {name}\n" for name in includes)
                    source = head + "void f(const lumo::String& document) {\n" + program + "(void)result; }\n"
                with self.subTest(document.name), tempfile.NamedTemporaryFile("w", suffix=".cpp") as file:
                    file.write(source)
                    file.flush()
                    compiled = subprocess.run(
                        [compiler, "-std=c++20", "-fsyntax-only", f"-I{SOURCE}/src", file.name],
                        capture_output=True, text=True)
                    self.assertEqual(compiled.returncode, 0, compiled.stderr)

    def test_the_reference_of_the_commands_is_up_to_date(self):
        made = (BUILD / "docs/commands.md").read_text()
        self.assertEqual((SOURCE / "docs/commands.md").read_text(), made,
                         "copy docs/commands.md from the build folder")

    def test_links_lead_somewhere(self):
        for document in [SOURCE / "README.md", SOURCE / "CONTRIBUTING.md", *SOURCE.glob("docs/**/*.md")]:
            for link in re.findall(r"\]\(([^)#:]+)\)", document.read_text()):
                self.assertTrue((document.parent / link).exists(), f"{document.name}: {link}")


if __name__ == "__main__":
    unittest.main()
