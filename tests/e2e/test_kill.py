# SPDX-License-Identifier: MIT
"""A build killed at any moment: the image is intact, no unfinished level is valid, and running the
same command again ends with what an undisturbed run makes."""

import os
import random
import shutil
import time
import unittest

import numpy

from orin_e2e import (Case, info, kill_build, overview_sizes, random_pixels, read_pixels, run,
                      write_tiff)

KILLS = 50


class Killed(Case):
    def check(self, arguments):
        pixels = random_pixels((3, 2400, 2600), numpy.uint8, 9)
        original = self.path("original.tif")
        write_tiff(original, pixels, "Byte", ["TILED=YES", "COMPRESS=DEFLATE", "ZLEVEL=1"])
        undisturbed = self.path("undisturbed.tif")
        shutil.copy(original, undisturbed)
        start = time.monotonic()
        self.assertRan(run("build", undisturbed, *arguments))
        duration = time.monotonic() - start
        count = len(overview_sizes(undisturbed))
        self.assertEqual(4, count)
        expected = [read_pixels(undisturbed, index) for index in range(count)]
        delays = random.Random(4)
        killed = 0
        for number in range(KILLS // 2):
            file = self.path(f"killed{number}.tif")
            shutil.copy(original, file)
            killed += kill_build(delays.uniform(0, duration), file, arguments)
            self.assertSamePixels(pixels, read_pixels(file))
            valid = [entry for entry in info(file)["levels"]
                     if all(channel["valid"] for channel in entry["channels"])]
            for entry in valid:
                index = overview_sizes(file).index((entry["width"], entry["height"]))
                self.assertSamePixels(expected[(2, 4, 8, 16).index(entry["level"])],
                                      read_pixels(file, index))
            self.assertRan(run("build", file, *arguments))
            self.assertEqual(overview_sizes(undisturbed), overview_sizes(file))
            for index in range(count):
                self.assertSamePixels(expected[index], read_pixels(file, index))
            for name in os.listdir(self.folder):
                if name.startswith(f"killed{number}.tif"):
                    os.remove(self.path(name))
        self.assertGreater(killed, KILLS // 8, "most builds ended before they could be killed")

    def test_inside_the_file(self):
        self.check(["--levels", "2,4,8,16", "--method", "nearest"])

    def test_in_a_side_car(self):
        self.check(["--levels", "2,4,8,16", "--method", "nearest", "--external"])


if __name__ == "__main__":
    unittest.main()
