# SPDX-License-Identifier: MIT
"""Every call that changes an ERDAS Imagine file fails once: other programs see each level in all
channels, of one build, or in none; `info` is true, and the same command finishes."""

import errno
import functools
import os
import shutil
import unittest

import numpy
from osgeo import gdal

import disklog  # first: it says where the files go
from orin_e2e import Case, info, random_pixels, read_pixels, run
from test_hfa import write

SIZE = (140, 90)  # columns, rows
FAULTS = {"pwrite": (errno.EIO, errno.ENOSPC, "short"), "fsync": (errno.EIO,),
          "ftruncate": (errno.EIO,)}
assert disklog.SHIM


class HfaFaults(Case):
    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((3, SIZE[1], SIZE[0]), numpy.uint8, 8)
        self.pixels[:, :, 60:] = 3  # something to compress
        self.original = os.path.join(self.folder, "original")
        os.mkdir(self.original)
        self.file = os.path.join(self.original, "image.img")  # a name that it stores
        write(self.file, self.pixels, "Byte", ["COMPRESSED=YES"])

    def copy(self, name):
        folder = self.path(name)
        shutil.copytree(self.original, folder)
        return folder, os.path.join(folder, "image.img")

    def levels(self, image):
        """{factor: bytes of all channels} as GDAL reads them, no channel having other levels."""
        dataset = gdal.Open(image)
        channels = []
        for number in range(dataset.RasterCount):
            band = dataset.GetRasterBand(number + 1)
            levels = [band.GetOverview(index) for index in range(band.GetOverviewCount())]
            channels.append({round(SIZE[0] / level.XSize): level.ReadAsArray().tobytes()
                             for level in levels})
        for levels in channels:
            self.assertEqual(list(channels[0]), list(levels))
        return {level: b"".join(levels[level] for levels in channels) for level in channels[0]}

    def check(self, arguments, fault, before, expected):
        folder, image = self.copy(fault.replace(" ", "-"))
        answer = disklog.run(folder, arguments[0], image, *arguments[1:], fault=fault)
        self.assertSamePixels(self.pixels, read_pixels(image))
        levels = self.levels(image)
        for level in {*before, *expected}:
            self.assertIn(levels.get(level), [before.get(level), expected.get(level)], level)
        if answer.returncode == 0:
            self.assertEqual(expected, levels)
        else:
            self.assertIn(f"orin-overviews: {image}: ", answer.stderr)
        told = info(image)["levels"]  # which has looked at the exit code
        if all(entry["state"] == "current" for entry in told):
            self.assertEqual(sorted(levels), [entry["level"] for entry in told])
        self.assertRan(disklog.run(folder, arguments[0], image, *arguments[1:]))
        self.assertEqual(expected, self.levels(image))
        self.assertSamePixels(self.pixels, read_pixels(image))
        shutil.rmtree(folder)
        return answer.returncode

    @staticmethod
    def faults(calls):
        """The first and the last call from each place in the program, for every reason."""
        places = {}
        for call, number, place in calls:
            places.setdefault((call, place), []).append(number)
        return sorted({f"{call} {numbers[end]} {reason}"
                       for (call, _), numbers in places.items() for end in (0, -1)
                       for reason in FAULTS.get(call, ())})

    def check_all(self, *arguments):
        folder, image = self.copy("undisturbed")
        calls = self.path("calls")
        self.assertRan(disklog.run(folder, arguments[0], image, *arguments[1:], calls=calls))
        before, expected = self.levels(self.file), self.levels(image)
        faults = self.faults(disklog.calls_in(calls))
        self.assertGreater(len(faults), 10)
        codes = disklog.check_at_once(self, {
            fault: functools.partial(self.check, arguments, fault, before, expected)
            for fault in faults})
        failed = {fault.split()[0] for fault, code in codes.items() if code}
        self.assertLessEqual({"pwrite", "fsync"}, failed)

    def test_of_a_build(self):
        self.check_all("build", "--levels", "2,4", "--method", "nearest")

    def test_of_a_rebuild(self):
        self.assertRan(run("build", self.file, "--levels", "2,4", "--method", "nearest"))
        self.check_all("build", "--levels", "2,4", "--method", "average", "--force")

    def test_of_removing_levels(self):
        self.assertRan(run("build", self.file, "--levels", "2,4,8", "--method", "nearest"))
        self.check_all("clean", "--levels", "2,8")


if __name__ == "__main__":
    unittest.main()
