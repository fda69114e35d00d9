# SPDX-License-Identifier: MIT
"""The programs of examples/ do what README and docs/embedding.md say."""

import os
import pathlib
import struct
import subprocess
import tempfile
import unittest

ROOT = pathlib.Path(__file__).resolve().parents[2]


def tiff_bytes(width, height):
    """A grey TIFF of one strip, by hand: the examples need no other program."""
    entries = [(256, 3, width), (257, 3, height), (258, 3, 8), (259, 3, 1), (262, 3, 1),
               (273, 4, 8), (277, 3, 1), (278, 3, height), (279, 4, width * height)]
    pixels = bytes((x * 7 + y * 13) % 256 for y in range(height) for x in range(width))
    pixels += b"\0" * (len(pixels) % 2)
    directory = struct.pack("<H", len(entries))
    for tag, kind, value in entries:
        directory += struct.pack("<HHI", tag, kind, 1)
        directory += struct.pack("<HH", value, 0) if kind == 3 else struct.pack("<I", value)
    return struct.pack("<2sHI", b"II", 42, 8 + len(pixels)) + pixels + directory + b"\0" * 4


class Examples(unittest.TestCase):
    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.folder = pathlib.Path(scratch.name)

    def run_example(self, name, *arguments):
        program = pathlib.Path(os.environ["ORIN_EXAMPLES"]) / f"example_{name}"
        return subprocess.run([program, *map(str, arguments)], cwd=self.folder, text=True,
                              capture_output=True, timeout=60, check=False)

    def image(self, width=600, height=400, name="scene.tif"):
        path = self.folder / name
        path.write_bytes(tiff_bytes(width, height))
        return path

    def test_readme_prints_the_quick_start(self):
        program = (ROOT / "examples/quickstart.cpp").read_text().split("\n", 1)[1]
        self.assertIn(f"```cpp\n{program}```", (ROOT / "README.md").read_text())

    def test_quick_start_builds_levels(self):
        before = self.image().read_bytes()
        answer = self.run_example("quickstart")
        self.assertEqual(("done=1\n", ""), (answer.stdout, answer.stderr))
        self.assertGreater((self.folder / "scene.tif").stat().st_size, len(before))

    def test_quick_start_says_why_it_does_not(self):
        answer = self.run_example("quickstart")
        self.assertEqual("done=0\n", answer.stdout)
        self.assertEqual("scene.tif: cannot be opened: No such file or directory.\n", answer.stderr)

    def test_progress_is_shown_level_by_level(self):
        answer = self.run_example("progress", self.image())
        self.assertEqual(0, answer.returncode, answer.stderr)
        self.assertIn("  0 %  Generating overview level: 2\n", answer.stdout)
        answer = self.run_example("progress", self.folder / "scene.tif")
        self.assertIn("No processing required.", answer.stdout)

    def test_stopping_is_no_failure_and_the_next_run_finishes(self):
        image = self.image(3000, 2000)
        stopped = self.run_example("progress", image, 0)
        self.assertEqual((1, "stopped; the next run goes on with the levels that are missing\n"),
                         (stopped.returncode, stopped.stderr))
        self.assertEqual(0, self.run_example("progress", image).returncode)

    def test_reasons_are_told_apart(self):
        (self.folder / "notes.txt").write_text("no raster\n")
        for name, code, text in [
                ("missing.tif", 2, "missing.tif: cannot be opened: No such file or directory.\n"),
                ("notes.txt", 2, "notes.txt: is not a raster file of a known format. If another "
                 "program reads it, make a TIFF of it: gdal_translate notes.txt OUT.tif\n"),
                (self.image(20, 10, "small.tif").name, 3,
                 "small.tif: an image of 20 x 10 pixels needs no levels.\n")]:
            answer = self.run_example("progress", name)
            self.assertEqual((code, text), (answer.returncode, answer.stderr))

    def test_an_array_gets_a_level(self):
        self.assertEqual(" 15  35  55\n 70  80  90\n", self.run_example("array").stdout)


if __name__ == "__main__":
    unittest.main()
