# SPDX-License-Identifier: MIT
"""Levels know whether they match their image, whatever other programs do to it."""

import itertools
import os
import re
import shutil
import signal
import subprocess
import time
import unittest
import warnings

import numpy
from osgeo import gdal
import rasterio

from orin_e2e import (Case, TOOL, info, nearest, random_pixels, read_pixels, run, write_tiff)

warnings.filterwarnings("ignore", category=rasterio.errors.NotGeoreferencedWarning)

PLACES = ("--internal", "--external")


def states(path):
    """{level: state} as `info` tells it."""
    return {level["level"]: level["state"] for level in info(path)["levels"]}


def edit(path, value=None):
    """Changes one pixel with rasterio, as another program would."""
    with rasterio.open(path, "r+") as dataset:
        window = rasterio.windows.Window(7, 5, 1, 1)
        pixel = dataset.read(1, window=window)
        pixel = pixel ^ 1 if value is None else numpy.full_like(pixel, value)
        dataset.write(pixel, 1, window=window)


def contents(path):
    with open(path, "rb") as file:
        return file.read()


def stamp(path):
    status = os.stat(path)
    return status.st_size, status.st_mtime_ns


def bytes_read(*command):
    """Bytes that the tool reads from files, the program and its libraries apart."""
    trace = subprocess.run(["strace", "-f", "-y", "-e", "trace=read,pread64", TOOL, *command],
                           capture_output=True, text=True, check=True,
                           env=dict(os.environ, ORIN_PREFERENCES="/dev/null", LC_ALL="C"))
    calls = re.findall(r"\d+<[^>]*\.(?:tif|ovr|msk)>.* = (\d+)$", trace.stderr, re.M)
    return sum(map(int, calls))


class FreshCase(Case):
    def setUp(self):
        super().setUp()
        self.file = self.path("scene.tif")
        self.pixels = random_pixels((2, 601, 803), numpy.uint8, 1)

    def write(self, *options):
        write_tiff(self.file, self.pixels, "Byte", options)

    def build(self, *arguments):
        self.assertRan(run("build", self.file, "--levels", "2,4", *arguments))

    def assertStates(self, two, four, path=None):
        self.assertEqual({2: two, 4: four}, states(path or self.file))


class Edited(FreshCase):
    def test_one_pixel_makes_every_level_stale_and_build_makes_them_current_again(self):
        layouts = itertools.product(("NONE", "DEFLATE", "LZW", "ZSTD"), ("YES", "NO"), PLACES)
        for codec, tiled, place in layouts:
            with self.subTest(codec=codec, tiled=tiled, place=place):
                self.file = self.path(f"{codec}{tiled}{place}.tif")
                self.write(f"COMPRESS={codec}", f"TILED={tiled}")
                self.build(place)
                self.assertStates("current", "current")
                edit(self.file)
                self.assertStates("stale", "stale")
                answer = run("build", self.file, "--levels", "2,4", place)
                self.assertIn("levels built: 2, 4", answer.stdout)
                self.assertIn("Rebuilding levels 2, 4: they no longer match the image.",
                              answer.stderr)
                self.assertStates("current", "current")
                now = read_pixels(self.file)
                self.assertSamePixels(nearest(now, 1, 2, (803, 601)), read_pixels(self.file, 0))

    def test_an_edit_that_is_taken_back_makes_them_current_again(self):
        self.write("TILED=YES")
        self.build("--external")
        edit(self.file)
        self.assertStates("stale", "stale")
        edit(self.file)
        self.assertStates("current", "current")

    def test_a_stale_level_is_not_valid_and_no_source_of_another(self):
        for place in PLACES:
            with self.subTest(place=place):
                self.file = self.path(f"between{place}.tif")
                self.write()
                self.assertRan(run("build", self.file, "--levels", "2", place))
                edit(self.file, 99)
                level = info(self.file)["levels"][0]
                self.assertEqual({False}, {channel["valid"] for channel in level["channels"]})
                self.assertRegex(run("info", self.file).stdout, r"\n2 .* stale +Orin")
                self.assertRan(run("build", self.file, "--levels", "4", place))
                self.assertStates("stale", "current")
                expected = nearest(read_pixels(self.file), 1, 4, (803, 601))
                self.assertSamePixels(expected, read_pixels(self.file, 1))

    def test_channels_of_an_older_image_are_not_passed_off_as_those_of_the_new_one(self):
        self.write("INTERLEAVE=BAND")
        one = ("build", self.file, "--levels", "2", "--external", "--channels", "1")
        self.assertRan(run("build", self.file, "--levels", "2", "--external"))
        edit(self.file)
        self.assertRan(run(*one))
        level = info(self.file)["levels"][0]
        self.assertEqual([True, False], [channel["valid"] for channel in level["channels"]])
        self.assertRan(run("build", self.file, "--levels", "2", "--external"))
        level = info(self.file)["levels"][0]
        self.assertEqual([True, True], [channel["valid"] for channel in level["channels"]])

    def test_the_external_mask_is_data_of_the_image(self):
        self.write("TILED=YES")
        mask = numpy.full((601, 803), 255, numpy.uint8)
        with rasterio.Env(GDAL_TIFF_INTERNAL_MASK=False), rasterio.open(self.file, "r+") as dataset:
            dataset.write_mask(mask)
        self.assertTrue(os.path.exists(self.file + ".msk"))
        self.build("--external")
        self.assertStates("current", "current")
        mask[300:, :] = 0
        with rasterio.Env(GDAL_TIFF_INTERNAL_MASK=False), rasterio.open(self.file, "r+") as dataset:
            dataset.write_mask(mask)
        self.assertStates("stale", "stale")

    def test_so_is_the_internal_mask(self):
        self.write("TILED=YES")
        mask = numpy.full((601, 803), 255, numpy.uint8)
        with rasterio.Env(GDAL_TIFF_INTERNAL_MASK=True), rasterio.open(self.file, "r+") as dataset:
            dataset.write_mask(mask)
        self.build("--external")
        mask[300:, :] = 0
        with rasterio.Env(GDAL_TIFF_INTERNAL_MASK=True), rasterio.open(self.file, "r+") as dataset:
            dataset.write_mask(mask)
        self.assertFalse(os.path.exists(self.file + ".msk"))
        self.assertStates("stale", "stale")

    def test_a_tile_that_was_left_out_counts(self):
        dataset = gdal.GetDriverByName("GTiff").Create(
            self.file, 1000, 1000, 1, gdal.GDT_Byte, ["TILED=YES", "SPARSE_OK=TRUE"])
        dataset.GetRasterBand(1).WriteArray(self.pixels[0], 190, 390)
        del dataset
        self.build("--external")
        self.assertStates("current", "current")
        edit(self.file, 1)  # in a tile that was not stored
        self.assertStates("stale", "stale")


class NotEdited(FreshCase):
    def setUp(self):
        super().setUp()
        if subprocess.run(["strace", "-o", os.devnull, "true"], check=False).returncode != 0:
            self.skipTest("system calls cannot be traced here")

    def check_answered_at_once(self, path):
        """An answer that had to read the pixels comes at once when it was kept, only then."""
        before = contents(path), os.stat(path).st_mtime_ns
        for _ in range(2):
            self.assertGreater(bytes_read("info", path), self.pixels.size)
        self.assertEqual(before, (contents(path), os.stat(path).st_mtime_ns))
        self.assertRan(run("info", "--update", path))
        self.assertLess(bytes_read("info", path), self.pixels.size / 4)
        self.assertStates("current", "current", path)

    def change_metadata(self, path):
        dataset = gdal.Open(path, gdal.GA_Update)
        dataset.SetMetadataItem("AREA", "a longer text than the directory has space for" * 9)
        dataset.SetGeoTransform([500000, 1, 0, 4000000, 0, -1])
        del dataset

    def test_a_build_is_answered_at_once_and_has_the_recorded_time(self):
        for place in PLACES:
            self.file = self.path(f"new{place}.tif")
            self.write("TILED=YES")
            started = time.time()
            self.assertRan(run("build", self.file, "--levels", "2", place))
            self.assertRan(run("build", self.file, "--levels", "4", place))
            self.assertLess(bytes_read("info", self.file), self.pixels.size / 4)
            self.assertStates("current", "current")
            if place == "--internal":
                self.assertGreaterEqual(os.stat(self.file).st_mtime, started)

    def test_a_copy_and_a_touch_and_metadata_leave_levels_current(self):
        for place in PLACES:
            with self.subTest(place=place):
                self.file = self.path(f"kept{place}.tif")
                self.write("TILED=YES", "COMPRESS=NONE")
                self.build(place)
                copy = self.path(f"copy{place}.tif")
                for suffix in ("", ".ovr") if place == "--external" else ("",):
                    shutil.copyfile(self.file + suffix, copy + suffix)
                self.check_answered_at_once(copy)
                os.utime(self.file)
                self.check_answered_at_once(self.file)
                os.utime(self.file, ns=(1234567890, -987654321))  # before 1970
                self.check_answered_at_once(self.file)
                self.assertEqual(-987654321, os.stat(self.file).st_mtime_ns)
                self.change_metadata(self.file)
                self.check_answered_at_once(self.file)
                answer = run("build", self.file, "--levels", "2,4", place)
                self.assertIn("nothing to do; already up to date: 2, 4", answer.stdout)

    def test_a_renamed_file_keeps_its_levels(self):
        for place in PLACES:
            self.file = self.path(f"old{place}.tif")
            self.write("TILED=YES")
            self.build(place)
            name = self.path(f"new{place}.tif")
            for suffix in ("", ".ovr") if place == "--external" else ("",):
                os.rename(self.file + suffix, name + suffix)
            self.assertStates("current", "current", name)
            if place == "--external":  # a new name changes what the file system tells of the image
                self.assertRan(run("info", "--update", name))
            self.assertLess(bytes_read("info", name), self.pixels.size / 4)

    def test_an_answer_keeps_the_time_and_the_size_of_the_image(self):
        self.write("TILED=YES")
        self.build("--internal")
        os.utime(self.file, ns=(5000, 123456789123456789))
        before = stamp(self.file)
        self.assertStates("current", "current")
        self.assertEqual(before, stamp(self.file))

    def test_levels_beside_the_image_never_touch_it(self):
        self.write("TILED=YES")
        self.build("--internal")
        os.utime(self.file, ns=(5000, 123456789123456789))
        before = contents(self.file)
        self.assertRan(run("build", self.file, "--levels", "8", "--external"))
        self.assertEqual(before, contents(self.file))
        self.assertEqual(123456789123456789, os.stat(self.file).st_mtime_ns)
        self.assertEqual({2: "current", 4: "current", 8: "current"}, states(self.file))
        self.assertEqual([1, 2, 4], [level["sourceLevel"] for level in info(self.file)["levels"]])

    def test_a_file_that_cannot_be_written_is_answered_right(self):
        somebody = {"user": 65534} if os.geteuid() == 0 else {}
        self.write("TILED=YES")
        self.build("--internal")
        os.utime(self.file)
        os.chmod(self.file, 0o444)
        os.chmod(self.folder, 0o755)
        before = contents(self.file)
        answer = run("info", "--json", self.file, **somebody)
        self.assertRan(answer)
        self.assertEqual(2, answer.stdout.count('"state": "current"'))
        self.assertEqual(before, contents(self.file))
        os.chmod(self.file, 0o644)
        edit(self.file)
        os.chmod(self.file, 0o444)
        answer = run("info", "--json", self.file, **somebody)
        self.assertEqual(2, answer.stdout.count('"state": "stale"'))

    def test_a_file_that_another_build_holds_is_answered_right(self):
        self.write("TILED=YES")
        self.build("--internal")
        os.utime(self.file)
        holder = subprocess.Popen(["flock", "-x", self.file, "sleep", "60"])
        self.addCleanup(holder.wait)
        self.addCleanup(holder.terminate)
        while subprocess.run(["flock", "-n", self.file, "true"], check=False).returncode == 0:
            pass
        self.assertStates("current", "current")


class UnknownOrigin(FreshCase):
    def test_levels_of_another_program_are_unverified_and_kept(self):
        self.write("TILED=YES")
        subprocess.run(["gdaladdo", "-q", self.file, "2", "4"], check=True)
        self.assertStates("unverified", "unverified")
        self.assertRegex(run("info", self.file).stdout, r"\n2 .* unverified +-")
        answer = run("build", self.file, "--levels", "2,4")
        self.assertIn("nothing to do; kept unverified: 2, 4", answer.stdout)
        self.assertRan(run("build", self.file, "--levels", "2,4", "--force"))
        self.assertStates("current", "current")

    def test_a_level_computed_from_one_is_not_verified_either(self):
        for place in PLACES:
            self.file = self.path(f"from{place}.tif")
            self.write("TILED=YES")
            subprocess.run(["gdaladdo", "-q", self.file, "2"], check=True)
            self.assertRan(run("build", self.file, "--levels", "4", place))
            self.assertStates("unverified", "unverified")

    def test_levels_that_another_program_copied_are_never_called_current_falsely(self):
        self.write("TILED=YES", "COMPRESS=DEFLATE")
        self.build()
        copy = self.path("copy.tif")
        for driver, codec in itertools.product(("GTiff", "COG"), ("DEFLATE", "LZW")):
            with self.subTest(driver=driver, codec=codec):
                options = [f"COMPRESS={codec}"]
                options += ["COPY_SRC_OVERVIEWS=YES", "TILED=YES"] if driver == "GTiff" else []
                gdal.GetDriverByName(driver).CreateCopy(copy, gdal.Open(self.file), 0, options)
                self.assertIn(states(copy)[2], ("unverified", "current"))
                edit(copy)
                self.assertIn(states(copy)[2], ("unverified", "stale"))


class Unseen(FreshCase):
    def test_an_edit_that_restores_size_and_time_is_not_seen_inside(self):
        for place, state in (("--internal", "current"), ("--external", "stale")):
            self.file = self.path(f"restored{place}.tif")
            self.write("COMPRESS=NONE", "TILED=YES")
            self.build(place)
            times = os.stat(self.file)
            edit(self.file)
            os.utime(self.file, ns=(times.st_atime_ns, times.st_mtime_ns))
            self.assertStates(state, state)  # as docs/behaviour.md says


class Interrupted(FreshCase):
    def test_a_build_that_is_killed_leaves_finished_levels_current(self):
        self.pixels = random_pixels((3, 2000, 2000), numpy.uint8, 4)
        for number, place in enumerate(PLACES * 3):
            self.file = self.path(f"killed{number}.tif")
            self.write("TILED=YES", "COMPRESS=DEFLATE")
            build = subprocess.Popen([TOOL, "build", self.file, "--levels", "2,3,4,8", place],
                                     stdout=subprocess.PIPE, text=True)
            build.stdout.readline()
            build.send_signal(signal.SIGKILL)
            build.communicate()
            found = states(self.file)
            self.assertEqual("current", found[2])
            self.assertLessEqual(set(found.values()), {"current", "unfinished"})
            self.assertRan(run("build", self.file, "--levels", "2,3,4,8", place))
            self.assertEqual(dict.fromkeys((2, 3, 4, 8), "current"), states(self.file))

    def test_an_image_that_changes_during_a_build_beside_it_gets_no_valid_level(self):
        self.pixels = random_pixels((1, 6000, 6000), numpy.uint8, 4)
        self.write("TILED=YES", "COMPRESS=DEFLATE")
        build = subprocess.Popen([TOOL, "build", self.file, "--levels", "2", "--external"],
                                 stderr=subprocess.PIPE, text=True)
        while not os.path.exists(self.file + ".ovr.partial") and build.poll() is None:
            pass
        edit(self.file)
        errors = build.communicate()[1]
        self.assertEqual(5, build.returncode, errors)
        self.assertIn(f"{self.file}: was changed by another program", errors)
        self.assertEqual({}, states(self.file))


if __name__ == "__main__":
    unittest.main()
