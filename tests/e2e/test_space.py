# SPDX-License-Identifier: MIT
"""The room that levels take, and what programs see that have the file open meanwhile."""

import ast
import fcntl
import os
import subprocess
import sys
import unittest

import numpy

from orin_e2e import (Case, info, nearest, overview_sizes, random_pixels, read_pixels, run,
                      write_tiff)

# A program that keeps a file open and opens it anew as well, and reads all levels again and again
# until a line comes in; then tells the checksums that it met, and how often.
READER = """
import select, sys, zlib
from osgeo import gdal
gdal.UseExceptions()
seen = {}
def read(path):
    dataset = gdal.Open(path)
    band = dataset.GetRasterBand(1)
    return dataset, [band.GetOverview(i) for i in range(band.GetOverviewCount())]
kept = read(sys.argv[1])
print("ready", flush=True)
def note(kind, levels):
    for number, level in enumerate(levels):
        try:
            answer = zlib.crc32(level.ReadRaster())
        except RuntimeError as error:
            answer = str(error)
        key = (kind, number, answer)
        seen[key] = seen.get(key, 0) + 1
while not select.select([sys.stdin], [], [], 0)[0]:
    gdal.SetCacheMax(0)
    note("kept", kept[1])
    fresh = read(sys.argv[1])
    note("fresh", fresh[1])
    del fresh
print(repr(seen), flush=True)
"""


class Rebuilt(Case):
    LEVELS = ("--levels", "2,4,8,16")

    def picture(self, **options):
        file = self.path("image.tif")
        pixels = random_pixels((3, 700, 900), numpy.uint8, 3)
        pixels[:, :350] //= 64  # compresses to another size than the rest
        write_tiff(file, pixels, "Byte", [f"{key}={value}" for key, value in options.items()])
        return file, pixels

    def test_ten_times_takes_no_more_room_than_once(self):
        for codec in ("NONE", "DEFLATE"):
            for place in ("--internal", "--external"):
                with self.subTest(codec=codec, place=place):
                    file, pixels = self.picture(COMPRESS=codec, TILED="YES", BLOCKXSIZE=64,
                                                BLOCKYSIZE=64)
                    grown = file + (".ovr" if place == "--external" else "")
                    self.assertRan(run("build", file, *self.LEVELS, place))
                    first = os.path.getsize(grown)
                    for number in range(10):
                        method = ("average", "nearest")[number % 2]
                        self.assertRan(run("build", file, *self.LEVELS, place, "--force",
                                           "--method", method))
                        self.assertLessEqual(os.path.getsize(grown), 1.1 * first, number)
                    self.assertSamePixels(pixels, read_pixels(file))
                    self.assertSamePixels(nearest(pixels, 1, 2, (900, 700)), read_pixels(file, 0))
                    self.assertEqual(4, len(overview_sizes(file)))
                    os.remove(grown)

    def test_however_long_what_its_directories_hold_is(self):
        for name, no_data in (("a", 7), ("b", 32767), ("c", -12345), ("d", -123456)):
            with self.subTest(no_data=no_data):
                file = self.path(name + ".tif")
                pixels = random_pixels((1, 300, 500), numpy.int32, 5)
                write_tiff(file, pixels, "Int32", ["TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=64"],
                           no_data)
                build = ("build", file, "--levels", "2,4", "--external", "--force")
                self.assertRan(run(*build))
                first = os.path.getsize(file + ".ovr")
                for number in range(3):
                    self.assertRan(run(*build))
                    self.assertLessEqual(os.path.getsize(file + ".ovr"), 1.1 * first, number)

    def test_readers_see_the_old_levels_or_the_new_ones(self):
        file, pixels = self.picture(TILED="YES", BLOCKXSIZE=64, BLOCKYSIZE=64)
        self.assertRan(run("build", file, *self.LEVELS, "--method", "nearest"))
        checksums = [self.checksums(file)]
        with subprocess.Popen([sys.executable, "-c", READER, file], stdin=subprocess.PIPE,
                              stdout=subprocess.PIPE, text=True) as reader:
            self.assertEqual("ready\n", reader.stdout.readline())
            for method in ("average", "nearest", "average"):
                self.assertRan(run("build", file, *self.LEVELS, "--force", "--method", method))
                checksums.append(self.checksums(file))
            reader.stdin.write("stop\n")
            reader.stdin.flush()
            seen = ast.literal_eval(reader.stdout.readline())
        allowed = [{sums[level] for sums in checksums} for level in range(4)]
        for (_, level, answer), _ in seen.items():
            self.assertIn(answer, allowed[level])
        self.assertEqual({"kept", "fresh"}, {kind for kind, _, _ in seen})
        self.assertSamePixels(pixels, read_pixels(file))

    @staticmethod
    def checksums(file):
        import zlib
        from osgeo import gdal
        dataset = gdal.Open(file)
        band = dataset.GetRasterBand(1)
        return [zlib.crc32(band.GetOverview(i).ReadRaster())
                for i in range(band.GetOverviewCount())]


class AtOnce(Case):
    def test_the_second_build_says_who_is_at_work_and_changes_nothing(self):
        file = self.path("image.tif")
        write_tiff(file, random_pixels((1, 300, 400), numpy.uint8, 4), "Byte")
        with open(file, "r+b") as held:
            fcntl.flock(held, fcntl.LOCK_EX)
            size = os.path.getsize(file)
            answer = run("build", file, "--levels", "2")
            self.assertRan(answer, 5)
            self.assertIn(f"{file}: another build is writing levels into it: ", answer.stderr)
            self.assertIn(f"(process {os.getpid()})", answer.stderr)
            self.assertEqual(size, os.path.getsize(file))
        self.assertRan(run("build", file, "--levels", "2"))
        self.assertEqual([2], [level["level"] for level in info(file)["levels"]])


if __name__ == "__main__":
    unittest.main()
