# SPDX-License-Identifier: MIT
"""The GDAL library is loaded for the first file that needs it, and a TIFF never does."""

import os
import re
import subprocess
import unittest

import numpy
from osgeo import gdal

from orin_e2e import TOOL, Case, random_pixels, run, write_tiff

MODULE = "orin-overviews-gdal.so"
OLD_MODULE = os.environ["ORIN_OLD_MODULE"]


class OnDemand(Case):
    def setUp(self):
        super().setUp()
        self.tiff = self.path("image.tif")
        write_tiff(self.tiff, random_pixels((3, 60, 80), numpy.uint8, 1), "Byte")
        self.png = self.path("image.png")
        gdal.Translate(self.png, self.tiff, format="PNG")

    def libraries(self, *arguments):
        """Whether module and library are opened by a run of the tool, and its exit code."""
        log = self.path("trace")
        answer = subprocess.run(
            ["strace", "-f", "-e", "trace=open,openat", "-o", log, TOOL, *arguments],
            capture_output=True, text=True, timeout=240)
        with open(log, encoding="utf-8") as lines:
            opened = [line for line in lines if re.search(r'\.so[.0-9]*"', line)]
        self.assertTrue(any("libtiff" in line for line in opened), "nothing was traced")
        return ([any(name in line for line in opened) for name in (MODULE, "libgdal.so")],
                answer.returncode)

    def test_a_tiff_never_loads_it(self):
        self.assertEqual(([False, False], 0), self.libraries("info", self.tiff))
        for place in ("--internal", "--external"):
            self.assertEqual(([False, False], 0),
                             self.libraries("build", self.tiff, place, "--levels", "2"))
            self.assertEqual(([False, False], 0), self.libraries("info", self.tiff))
            self.assertEqual(([False, False], 0), self.libraries("clean", self.tiff))

    def test_what_is_no_file_and_a_tiff_that_is_damaged_do_not_load_it(self):
        damaged = self.path("damaged.tif")
        with open(damaged, "wb") as file:
            file.write(b"II*\0" + bytes(4))
        for name in (damaged, self.path("missing.png"), self.folder):
            loaded, code = self.libraries("info", name)
            self.assertEqual([False, False], loaded, name)
            self.assertNotEqual(0, code, name)

    def test_other_formats_load_it(self):
        self.assertEqual(([True, True], 0), self.libraries("info", self.png))

    def with_module(self, make):
        """The tool's answer for the PNG and for the TIFF when `make` put another module first."""
        folder = self.path("first")
        os.mkdir(folder)
        make(os.path.join(folder, MODULE))
        environment = {"LD_LIBRARY_PATH": folder}
        tiff = run("info", self.tiff, environment=environment)
        self.assertRan(tiff)
        answer = run("info", self.png, environment=environment)
        self.assertNotEqual(0, answer.returncode)
        self.assertEqual("", answer.stdout)
        return answer.stderr

    def test_a_damaged_module_is_named_with_the_reason_and_the_way_out(self):
        def make(path):
            with open(path, "wb") as file:
                file.write(b"no library")
        told = self.with_module(make)
        self.assertRegex(told, r"image\.png: .*" + re.escape(MODULE) + ": file too short")
        self.assertIn("Install", told)

    def test_a_module_of_another_version_is_refused(self):
        told = self.with_module(lambda path: os.symlink(OLD_MODULE, path))
        self.assertRegex(told, re.escape(MODULE) + ": is of version 0.0.0-old, and this program")


if __name__ == "__main__":
    unittest.main()
