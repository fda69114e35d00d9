# SPDX-License-Identifier: MIT
"""Levels inside ERDAS Imagine files (.img) that are built anew: until the new pixels take their
place the old ones stay, whole and valid, and the file does not keep the room of both."""

import hashlib
import os
import random
import shutil
import subprocess
import time
import unittest

import numpy
from osgeo import gdal

from orin_e2e import TOOL, info, kill_build, overview_sizes, random_pixels, read_pixels, run
from test_hfa import Hfa, all_valid, write

KILLS = 16
LEVELS = ("--levels", "2,4,8")
OLD, NEW = "nearest", "average"
LAYOUTS = {"plain": (), "compressed": ("COMPRESSED=YES",)}


def levels_of(dataset):
    """[pixels of shape (rows, columns)] of every level of every channel; nothing is remembered."""
    answer = []
    for channel in range(dataset.RasterCount):
        band = dataset.GetRasterBand(channel + 1)
        for index in range(band.GetOverviewCount()):
            level = band.GetOverview(index)
            level.FlushCache()
            answer.append(level.ReadAsArray())
    return answer


def hash_of(channels):
    """Of a level: of all of its channels."""
    return hashlib.sha256(b"".join(pixels.tobytes() for pixels in channels)).hexdigest()


class Rebuilt(Hfa):
    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((3, 700, 900), numpy.uint8, 9)
        self.pixels[:, :, 400:] //= 64  # something to compress

    def write_with_levels(self, layout):
        """The file with old levels. {method: levels} of both methods, as levels_of gives them."""
        expected = {}
        for method in (NEW, OLD):
            write(self.file, self.pixels, "Byte", LAYOUTS[layout])
            self.assertRan(run("build", self.file, *LEVELS, "--method", method))
            expected[method] = levels_of(gdal.Open(self.file))
        return expected

    def rebuild(self, method=NEW, file=None):
        return run("build", file or self.file, *LEVELS, "--method", method, "--force")

    def assertLevels(self, expected, file=None):
        for one, other in zip(expected, levels_of(gdal.Open(file or self.file)), strict=True):
            self.assertSamePixels(one, other)

    def assertEachIsOneOf(self, expected, found):
        """Each of the levels found is the old one or the new one, whole, and all of its channels
        are of the same."""
        self.assertEqual(len(expected[OLD]), len(found))
        count = len(found) // len(self.pixels)
        for number in range(count):
            hashes = [hash_of(levels[number::count]) for levels in (found, *expected.values())]
            self.assertIn(hashes[0], hashes[1:], number)


class Room(Rebuilt):
    def test_ten_rebuilds_leave_the_file_as_large_as_it_was(self):
        for layout in LAYOUTS:
            with self.subTest(layout):
                expected = self.write_with_levels(layout)
                first = os.path.getsize(self.file)
                for number in range(10):
                    method = (NEW, OLD)[number % 2]
                    self.assertRan(self.rebuild(method))
                    self.assertLessEqual(os.path.getsize(self.file), 1.02 * first, number)
                    self.assertLevels(expected[method])
                    self.assertEqual([2, 4, 8], all_valid(self.file))
                self.assertSamePixels(self.pixels, read_pixels(self.file))
                self.assertEqual(["scene.img"], os.listdir(self.folder))
                os.remove(self.file)

    def test_single_levels_and_channels_do_not_add_up(self):
        expected = self.write_with_levels("compressed")
        first = os.path.getsize(self.file)
        for level in (4, 2, 8, 4, 2, 8):
            for channel in (2, 1):
                self.assertRan(run("build", self.file, "--levels", level, "--channels", channel,
                                   "--method", OLD, "--force"))
                self.assertLessEqual(os.path.getsize(self.file), 1.02 * first)
        self.assertSamePixels(expected[OLD][0], levels_of(gdal.Open(self.file))[0])

    def test_what_a_killed_rebuild_appended_is_gone_after_the_next(self):
        self.write_with_levels("plain")
        first = os.path.getsize(self.file)
        with open(self.file, "ab") as file:
            file.write(b"x" * 300000)
        self.assertRan(self.rebuild())
        self.assertLessEqual(os.path.getsize(self.file), 1.02 * first)

    def test_levels_of_another_program_are_replaced_in_their_room(self):
        for layout, options in LAYOUTS.items():
            with self.subTest(layout):
                write(self.file, self.pixels, "Byte", options)
                dataset = gdal.Open(self.file, gdal.GA_Update)
                dataset.BuildOverviews("AVERAGE", [2, 4, 8])
                del dataset
                first = os.path.getsize(self.file)
                self.assertRan(self.rebuild(OLD))
                self.assertLessEqual(os.path.getsize(self.file), 1.05 * first)
                self.assertEqual(["NEAREST"] * 3,
                                 [level["method"] for level in info(self.file)["levels"]])
                os.remove(self.file)

    def test_removed_levels_keep_their_room_while_somebody_reads_them(self):
        write(self.file, self.pixels, "Byte")
        before = os.path.getsize(self.file)
        self.assertRan(run("build", self.file, *LEVELS))
        reader = gdal.Open(self.file)
        levels = levels_of(reader)
        self.assertEqual(9, len(levels))
        self.assertRan(run("clean", self.file))
        self.assertEqual([], info(self.file)["levels"])
        for old, pixels in zip(levels, levels_of(reader), strict=True):
            self.assertSamePixels(old, pixels)
        self.assertSamePixels(self.pixels, reader.ReadAsArray())
        del reader
        self.assertRan(run("build", self.file, "--levels", "16"))
        self.assertRan(run("clean", self.file))
        self.assertLess(os.path.getsize(self.file), before + 4096)
        self.assertSamePixels(self.pixels, read_pixels(self.file))


class Readers(Rebuilt):
    def test_see_the_old_levels_or_the_new_ones(self):
        for layout in LAYOUTS:
            with self.subTest(layout):
                expected = self.write_with_levels(layout)
                first = os.path.getsize(self.file)
                kept = gdal.Open(self.file)
                levels_of(kept)  # from here on it knows where they are
                reads = 0
                with subprocess.Popen([TOOL, "build", self.file, *LEVELS, "--method", NEW,
                                       "--force"], stdout=subprocess.DEVNULL,
                                      env=dict(os.environ, ORIN_PREFERENCES="/dev/null")) as build:
                    while build.poll() is None:
                        self.assertEachIsOneOf(expected, levels_of(gdal.Open(self.file)))
                        for old, pixels in zip(expected[OLD], levels_of(kept), strict=True):
                            self.assertSamePixels(old, pixels)
                        reads += 1
                self.assertGreater(reads, 0)
                for old, pixels in zip(expected[OLD], levels_of(kept), strict=True):
                    self.assertSamePixels(old, pixels)
                self.assertLevels(expected[NEW])
                self.assertGreater(os.path.getsize(self.file), first)  # both are there
                del kept
                self.assertRan(self.rebuild(OLD))
                self.assertLessEqual(os.path.getsize(self.file), 1.02 * first)
                self.assertLevels(expected[OLD])
                os.remove(self.file)


class Failing(Rebuilt):
    def check_honest(self, expected, file):
        """Every level is whole, and the finished ones have the pixels of the method they are said
        to. Finished channels of a level that is not wait for the others: the next run uses them."""
        found = levels_of(gdal.Open(file))
        self.assertEachIsOneOf(expected, found)
        levels = info(file)["levels"]
        for index, level in enumerate(levels):
            if level["state"] == "current":
                made = expected[level["method"].lower()]
                self.assertEqual(hash_of(made[index::3]), hash_of(found[index::3]))
        self.assertSamePixels(self.pixels, read_pixels(file))
        self.assertRan(run("build", file, *LEVELS, "--method", NEW))
        resumed = levels_of(gdal.Open(file))
        self.assertEachIsOneOf(expected, resumed)
        for index, level in enumerate(levels):
            if level["method"] == NEW.upper():
                self.assertEqual(hash_of(expected[NEW][index::3]), hash_of(resumed[index::3]))

    def test_being_killed_at_any_moment(self):
        for layout in LAYOUTS:
            expected = self.write_with_levels(layout)
            first = os.path.getsize(self.file)
            start = time.monotonic()
            self.assertRan(self.rebuild(file=self.copy("undisturbed")))
            duration = time.monotonic() - start
            delays = random.Random(5)
            killed = 0
            for number in range(KILLS // 2):
                with self.subTest(layout=layout, number=number):
                    file = self.copy(f"killed{number}")
                    killed += kill_build(delays.uniform(0, duration), file,
                                         [*LEVELS, "--method", NEW, "--force"])
                    self.check_honest(expected, file)
                    self.assertRan(self.rebuild(file=file))
                    self.assertLevels(expected[NEW], file)
                    self.assertEqual([2, 4, 8], all_valid(file))
                    self.assertLessEqual(os.path.getsize(file), 1.02 * first)
                    shutil.rmtree(os.path.dirname(file))
            self.assertGreater(killed, KILLS // 8, "most builds ended before they could be killed")
            shutil.rmtree(self.path("undisturbed"))

    def copy(self, name):
        """A copy in a folder of its own, under its own name, which the file stores."""
        os.mkdir(self.path(name))
        return shutil.copy(self.file, self.path(name))

    def test_a_full_disk_leaves_the_old_levels(self):
        for layout in LAYOUTS:
            with self.subTest(layout):
                expected = self.write_with_levels(layout)
                size = os.path.getsize(self.file)
                answer = subprocess.run(
                    ["bash", "-c", f'ulimit -f {size // 1024 + 20}; exec "$@"', "bash", TOOL,
                     "build", self.file, *LEVELS, "--method", NEW, "--force"],
                    capture_output=True, text=True, check=False,
                    env=dict(os.environ, ORIN_PREFERENCES="/dev/null", LC_ALL="C"))
                self.assertNotEqual(0, answer.returncode)
                self.assertIn("File too large", answer.stderr)
                self.assertLessEqual(os.path.getsize(self.file), size)
                self.assertLevels(expected[OLD])
                self.assertEqual([2, 4, 8], all_valid(self.file))
                self.assertRan(self.rebuild())
                self.assertLevels(expected[NEW])
                os.remove(self.file)


if __name__ == "__main__":
    unittest.main()
