# SPDX-License-Identifier: MIT
"""The room that levels take, and what programs see that have the file open meanwhile."""

import ast
import fcntl
import os
import shutil
import subprocess
import sys
import unittest
import zlib

import numpy
from osgeo import gdal

from mask_case import write_mask
from orin_e2e import (Case, info, keep_files_in_memory, nearest, overview_sizes, random_pixels,
                      read_pixels, run, write_tiff)

keep_files_in_memory()

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


def smooth_pixels(shape):
    """Waves with noise in one half: how well they compress depends on the method."""
    channels, rows, columns = numpy.indices(shape)
    waves = 100 + 60 * numpy.sin(columns / 9 + channels) + 60 * numpy.cos(rows / 7)
    noise = numpy.random.default_rng(4).integers(-30, 31, shape) * (columns > shape[2] // 2)
    return numpy.clip(waves + noise, 1, 255).astype(numpy.uint8)


def write_masked(file, pixels):
    """A file with a mask inside, which hides a quarter."""
    write_tiff(file, pixels, "Byte", ["COMPRESS=DEFLATE"])
    valid = numpy.ones(pixels.shape[1:], bool)
    valid[:valid.shape[0] // 2, :valid.shape[1] // 2] = False
    write_mask(file, valid, inside=True)


def content_of(file):
    """{width: checksums of pixels and masks} of the levels that GDAL lists; 0 is the image."""
    dataset = gdal.Open(file)
    content = {}
    for index in range(dataset.GetRasterBand(1).GetOverviewCount() + 1):
        bands = [dataset.GetRasterBand(number + 1) for number in range(dataset.RasterCount)]
        if index > 0:
            bands = [band.GetOverview(index - 1) for band in bands]
        masks = [band.GetMaskBand() for band in bands]
        content[bands[0].XSize if index > 0 else 0] = [
            zlib.crc32(band.ReadRaster()) for band in bands + masks]
    return content


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

    def rebuild_in_turn(self, file, place, ways, times=10):
        """Rebuilds by the ways in turn. Each time the file is as long as a fresh one that is built
        that way, and reads the same."""
        fresh = {}
        for way in ways:
            copy = self.path("fresh.tif")
            shutil.copy(file, copy)
            self.assertRan(run("build", copy, place, *way))
            made = copy + (".ovr" if place == "--external" else "")
            fresh[way] = os.path.getsize(made), content_of(copy)
            os.remove(copy)
            if made != copy:
                os.remove(made)
        grown = file + (".ovr" if place == "--external" else "")
        for number in range(times + 1):
            way = ways[number % len(ways)]
            self.assertRan(run("build", file, place, "--force", *way))
            size, content = fresh[way]
            self.assertLessEqual(os.path.getsize(grown), 1.1 * size, (number, way))
            self.assertEqual(content, content_of(file), (number, way))
        if grown != file:
            os.remove(grown)

    METHODS = tuple(("--levels", "2,4,8,16", "--method", method)
                    for method in ("average", "nearest", "mode", "bicubic"))

    def test_by_other_methods_in_turn_takes_the_room_of_a_fresh_build(self):
        for number, options in enumerate((
                {"COMPRESS": "DEFLATE", "TILED": "YES", "BLOCKXSIZE": 64, "BLOCKYSIZE": 64},
                {"COMPRESS": "LZW", "BIGTIFF": "YES", "ENDIANNESS": "BIG", "INTERLEAVE": "BAND"},
                {"COMPRESS": "JPEG", "PHOTOMETRIC": "YCBCR", "TILED": "YES"})):
            for place in ("--internal", "--external"):
                with self.subTest(options=options, place=place):
                    file = self.path(f"{number}{place}.tif")
                    write_tiff(file, smooth_pixels((3, 210, 260)), "Byte",
                               [f"{key}={value}" for key, value in options.items()])
                    self.rebuild_in_turn(file, place, self.METHODS)

    def test_of_a_level_that_is_one_tile_takes_the_room_of_a_fresh_build(self):
        for place in ("--internal", "--external"):
            for levels in ("2", "2,4,8,16,32"):
                with self.subTest(place=place, levels=levels):
                    file = self.path("small.tif")
                    write_tiff(file, smooth_pixels((1, 90, 110)), "Byte", ["COMPRESS=DEFLATE"])
                    self.rebuild_in_turn(file, place, tuple(
                        ("--levels", levels, "--method", method)
                        for method in ("bicubic", "nearest", "average", "mode")))

    def test_in_another_form_takes_the_room_of_a_fresh_build(self):
        for place in ("--internal", "--external"):
            with self.subTest(place=place):
                file = self.path("forms.tif")
                write_tiff(file, smooth_pixels((2, 180, 300)), "Byte",
                           ["TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=64"])
                self.rebuild_in_turn(file, place, tuple(
                    ("--levels", "2,4,8", "--co", f"COMPRESS={codec}")
                    for codec in ("DEFLATE", "NONE", "LZW")), times=6)

    def test_with_masks_takes_the_room_of_a_fresh_build(self):
        for place in ("--internal", "--external"):
            with self.subTest(place=place):
                file = self.path("masked.tif")
                write_masked(file, smooth_pixels((1, 300, 320)))
                self.rebuild_in_turn(file, place, self.METHODS, times=6)

    def test_of_some_levels_leaves_the_others_and_no_gap(self):
        file = self.path("some.tif")
        write_tiff(file, smooth_pixels((2, 210, 260)), "Byte", ["COMPRESS=DEFLATE"])
        self.assertRan(run("build", file, *self.LEVELS))
        for number, levels in enumerate(("4", "2", "8,16", "2,16", "4", "2")):
            # Those above a rebuilt level are computed from it, and are built again with it.
            others = [level for level in (2, 4, 8, 16) if level < int(levels.split(",")[0])]
            before = content_of(file)
            self.assertRan(run("build", file, "--levels", levels, "--force", "--method",
                               ("mode", "bicubic", "nearest")[number % 3]))
            after = content_of(file)
            for level in others:
                self.assertEqual(before[260 // level], after[260 // level])
            copy = self.path("fresh.tif")
            self.assertRan(run("clean", shutil.copy(file, copy)))
            for entry in info(file)["levels"]:
                self.assertRan(run("build", copy, "--levels", entry["level"], "--method",
                                   entry["method"].lower()))
            self.assertLessEqual(os.path.getsize(file), 1.1 * os.path.getsize(copy), levels)

    def test_round_a_level_of_another_program_takes_no_more_room_each_time(self):
        file = self.path("between.tif")
        write_tiff(file, smooth_pixels((1, 210, 260)), "Byte", ["COMPRESS=DEFLATE"])
        build = ("build", file, "--levels", "2,8", "--force", "--method")
        self.assertRan(run(*build, "average"))
        made = subprocess.run(["gdaladdo", "-q", file, "4"], check=False)
        self.assertEqual(0, made.returncode)
        other = content_of(file)[65]
        sizes = {}
        for number in range(9):
            method = ("nearest", "bicubic", "average")[number % 3]
            self.assertRan(run(*build, method))
            size = sizes.setdefault(method, os.path.getsize(file))
            self.assertLessEqual(os.path.getsize(file), 1.02 * size, (number, method))
            self.assertEqual(other, content_of(file)[65])
        self.assertLessEqual(max(sizes.values()), 1.1 * min(sizes.values()))

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
        dataset = gdal.Open(file)
        band = dataset.GetRasterBand(1)
        return [zlib.crc32(band.GetOverview(i).ReadRaster())
                for i in range(band.GetOverviewCount())]


class Removed(Case):
    def check(self, file, place, kept):
        """Of levels 2 to 16 only these are left, as if the others had never been."""
        self.assertRan(run("build", file, "--levels", "2,4,8,16", place, "--method", "nearest"))
        removed = ",".join(str(level) for level in (2, 4, 8, 16) if level not in kept)
        before = content_of(file)
        self.assertRan(run("clean", file, "--levels", removed))
        after = content_of(file)
        width = info(file)["width"]
        self.assertEqual({0, *(width // level for level in kept)}, set(after))
        for key, content in after.items():
            self.assertEqual(before[key], content)
        extension = ".ovr" if place == "--external" else ""
        size = os.path.getsize(file + extension)
        self.assertRan(run("clean", file))
        self.assertRan(run("build", file, "--levels", ",".join(map(str, kept)), place,
                           "--method", "nearest"))
        self.assertLessEqual(size, 1.1 * os.path.getsize(file + extension))
        self.assertRan(run("clean", file))

    def test_levels_leave_no_gap_before_the_others(self):
        file = self.path("image.tif")
        for options in (["COMPRESS=DEFLATE"], ["BIGTIFF=YES", "TILED=YES", "BLOCKXSIZE=64",
                                               "BLOCKYSIZE=64"]):
            write_tiff(file, smooth_pixels((1, 210, 260)), "Byte", options)
            size = os.path.getsize(file)
            for place in ("--internal", "--external"):
                for kept in ((4, 8, 16), (2, 8), (16,), (2,)):
                    with self.subTest(options=options, place=place, kept=kept):
                        self.check(file, place, kept)
                        self.assertEqual(size, os.path.getsize(file))

    def test_levels_leave_the_masks_of_the_others(self):
        file = self.path("masked.tif")
        write_masked(file, smooth_pixels((1, 300, 320)))
        for place in ("--internal", "--external"):
            for kept in ((4, 8, 16), (2, 8), (16,)):
                with self.subTest(place=place, kept=kept):
                    self.check(file, place, kept)


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
