"""The package as it is installed: its README, its examples, and where its library comes from."""

import os
import pathlib
import re
import subprocess
import sys
import tarfile
import unittest

from support import ProcessTest, plain_environment

PACKAGE = pathlib.Path(__file__).parents[2] / "bindings" / "python"


class PackageTest(ProcessTest):
    def test_the_readme_runs_from_top_to_bottom(self) -> None:
        blocks = re.findall(r"^```python\n(.*?)^```", (PACKAGE / "README.md").read_text(), re.MULTILINE | re.DOTALL)
        code = "".join(blocks).replace("https://collector.example.com/events", self.collector.url)
        settings = f"import corvane\ncorvane.set_documents_directory({self.directory!r})\ncorvane.upload_in_process()\n"
        out = self.finish(self.start(code, preamble=settings), errors=None)
        self.assertIn("DeliveryReport(delivered=Count(events=1, documents=1)", out)
        data = self.collector.documents[0]["data"]["events"][0]["data"]
        self.assertEqual((data["screen"], data["event"]["eventPath"]), ({"name": "home", "depth": 0}, "/root/player"))

    @unittest.skipUnless("CORVANE_COLLECTOR" in os.environ, "CORVANE_COLLECTOR names the example collector")
    def test_what_the_examples_record_comes_back_as_a_table(self) -> None:
        command = [os.environ["CORVANE_COLLECTOR"], "--port", "0", "--directory", self.directory]
        with subprocess.Popen(command, stdout=subprocess.PIPE, text=True, env=plain_environment()) as collector:
            self.addCleanup(collector.kill)
            assert collector.stdout
            url = collector.stdout.readline().strip()
            where = ["--directory", os.path.join(self.directory, "d")]
            self.assertIn("6 events delivered, 0 documents pending", self.example("record.py", url, "--events", "5", *where))
            collector.terminate()
        documents = os.path.join(self.directory, "documents.ndjson")
        lines = self.example("table.py", documents, "--event", "Play", "--csv").splitlines()
        self.assertEqual(len(lines), 6)
        self.assertIn("track.title", lines[0].split(","))
        self.assertIn("that was all", self.example("table.py", documents))

    def example(self, name: str, *arguments: str) -> str:
        command = [sys.executable, str(PACKAGE / "examples" / name), *arguments]
        done = subprocess.run(command, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True, cwd=self.directory)
        self.assertEqual(done.returncode, 0, done.stderr)
        return done.stdout

    def test_a_library_that_cannot_be_used_is_named_on_import(self) -> None:
        for library in ("/nonexistent.so", "libc.so.6"):
            environment = {**os.environ, "CORVANE_LIBRARY": library}
            command = [sys.executable, "-c", "import corvane"]
            done = subprocess.run(command, stderr=subprocess.PIPE, text=True, env=environment)
            self.assertRegex(done.stderr, "ImportError: the library of Corvane cannot be used: .*(nonexistent|undefined symbol)")

    def test_a_source_distribution_has_what_it_takes_to_build_it(self) -> None:
        code = "import sys; sys.path.insert(0, 'backend'); import corvane_build; print(corvane_build.build_sdist(sys.argv[1]))"
        command = [sys.executable, "-c", code, self.directory]
        name = subprocess.run(command, check=True, stdout=subprocess.PIPE, text=True, cwd=PACKAGE).stdout.strip()
        with tarfile.open(os.path.join(self.directory, name)) as archive:
            names = {entry.partition("/")[2] for entry in archive.getnames()}
        for expected in ("PKG-INFO", "pyproject.toml", "backend/corvane_build.py", "corvane/py.typed",
                         "library/CMakeLists.txt", "library/corvane/c/corvane.h", "library/cmake/Export.h.in"):  # fmt: skip
            self.assertIn(expected, names)
        self.assertFalse([entry for entry in names if "__pycache__" in entry or entry.endswith(".so")])


if __name__ == "__main__":
    unittest.main()
