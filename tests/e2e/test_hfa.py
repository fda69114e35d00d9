# SPDX-License-Identifier: MIT
"""ERDAS Imagine files (.img): levels inside the file, read back by other programs."""

import os
import pathlib
import random
import shutil
import subprocess
import time
import unittest

import numpy
from osgeo import gdal
import rasterio

from mask_case import write_mask_beside
from mask_twin import disc, level_validity, masks_of_levels
from orin_e2e import (Case, NUMPY_TYPES, TOOL, info, kill_build, nearest, overview_sizes,
                      random_pixels, read_pixels, run)

SOMEBODY = {"user": 65534} if os.geteuid() == 0 else {}  # the superuser may write to anything
KILLS = 20


def write(path, pixels, type_name, options=(), no_data=None):
    """Writes pixels of shape (channels, rows, columns) as an .img file."""
    dataset = gdal.GetDriverByName("HFA").Create(str(path), pixels.shape[2], pixels.shape[1],
                                                 pixels.shape[0],
                                                 gdal.GetDataTypeByName(type_name), list(options))
    for index, channel in enumerate(pixels):
        if no_data is not None:
            dataset.GetRasterBand(index + 1).SetNoDataValue(no_data)
        dataset.GetRasterBand(index + 1).WriteArray(channel)
    dataset.FlushCache()
    del dataset


def all_valid(path):
    """Factors of the levels all of whose channels are valid."""
    return [level["level"] for level in info(path)["levels"]
            if all(channel["valid"] for channel in level["channels"])]


class Hfa(Case):
    def setUp(self):
        super().setUp()
        self.file = self.path("scene.img")
        self.pixels = random_pixels((2, 205, 333), numpy.uint8, 1)

    def check_levels(self, file, pixels, levels=(2, 4)):
        """Levels as GDAL reads them: the twin's pixels, the last ones repeated in the surplus."""
        size = (pixels.shape[2], pixels.shape[1])
        self.assertEqual([(-(-size[0] // level), -(-size[1] // level)) for level in levels],
                         overview_sizes(file))
        expected, source = pixels, 1
        for index, level in enumerate(levels):
            expected = nearest(expected, source, level, size)
            source = level
            stored = read_pixels(file, index)
            surplus = [(0, 0)] + [(0, stored.shape[i] - expected.shape[i]) for i in (1, 2)]
            self.assertSamePixels(numpy.pad(expected, surplus, mode="edge"), stored)


class Inside(Hfa):
    def test_every_type_and_compression(self):
        types = ("Byte", "UInt16", "Int16", "UInt32", "Int32", "Float32", "Float64", "CFloat32",
                 "CFloat64")
        for number, type_name in enumerate(types):
            for options in ((), ("COMPRESSED=YES",)):
                with self.subTest(type=type_name, options=options):
                    pixels = random_pixels((2, 205, 333), NUMPY_TYPES[type_name], number)
                    pixels[:, :100] = 3  # something to compress
                    write(self.file, pixels, type_name, options)
                    self.assertRan(run("build", self.file, "--method", "nearest", "--levels",
                                       "2,4"))
                    self.check_levels(self.file, pixels)
                    self.assertSamePixels(pixels, read_pixels(self.file))
                    self.assertEqual(["scene.img"], os.listdir(self.folder))
                    os.remove(self.file)

    def test_signed_bytes_keep_their_sign(self):
        pixels = random_pixels((1, 64, 64), numpy.int8, 1)
        write(self.file, pixels.view(numpy.uint8), "Byte", ["PIXELTYPE=SIGNEDBYTE"])
        self.assertEqual("int8", info(self.file)["channels"][0]["type"])
        self.assertRan(run("build", self.file, "--method", "average", "--levels", "2"))
        blocks = pixels[0].astype(float).reshape(32, 2, 32, 2).mean(axis=(1, 3))
        expected = numpy.trunc(blocks + numpy.copysign(0.5, blocks)).astype(numpy.int8)
        self.assertSamePixels(expected, read_pixels(self.file, 0)[0].view(numpy.int8))

    def test_few_bits_hold_the_largest_value_instead_of_what_is_beyond_it(self):
        pixels = numpy.zeros((2, 64, 300), numpy.uint8)
        pixels[:, :, 150:] = 15
        pixels[1, ::7, ::5] = 9
        wide = self.path("wide.img")
        write(wide, pixels, "Byte")
        write(self.file, pixels, "Byte", ["NBITS=4"])
        for file in (wide, self.file):
            self.assertRan(run("build", file, "--method", "bicubic", "--levels", "2"))
        self.assertGreater(read_pixels(wide, 0).max(), 15)
        self.assertSamePixels(numpy.minimum(read_pixels(wide, 0), 15), read_pixels(self.file, 0))

    def test_sizes_around_tiles_and_thin_images(self):
        for rows, columns in ((1, 300), (2, 2), (3, 129), (127, 128), (129, 65), (130, 3)):
            with self.subTest(rows=rows, columns=columns):
                pixels = random_pixels((1, rows, columns), numpy.uint8, rows)
                write(self.file, pixels, "Byte")
                self.assertRan(run("build", self.file, "--method", "nearest", "--levels", "2"),
                               0 if min(rows, columns) >= 2 else 2)
                if min(rows, columns) >= 2:
                    self.check_levels(self.file, pixels, [2])
                os.remove(self.file)

    def test_info_and_other_programs_list_the_same(self):
        write(self.file, self.pixels, "Byte")
        self.assertRan(run("build", self.file, "--levels", "2,3,6", "--method", "average"))
        levels = info(self.file)["levels"]
        self.assertEqual([(2, 166, 102, "AVERAGE", 1), (3, 111, 68, "AVERAGE", 1),
                          (6, 55, 34, "AVERAGE", 3)],
                         [(level["level"], level["width"], level["height"], level["method"],
                           level["sourceLevel"]) for level in levels])
        with rasterio.open(self.file) as dataset:
            self.assertEqual([2, 3, 6], dataset.overviews(1))
        self.assertIn("Overviews: 167x103, 111x69, 56x35",
                      subprocess.run(["gdalinfo", self.file], capture_output=True, text=True,
                                     check=True).stdout)

    def test_the_second_build_has_nothing_to_do(self):
        write(self.file, self.pixels, "Byte")
        self.assertRan(run("build", self.file))
        before, stamp = pathlib.Path(self.file).read_bytes(), os.stat(self.file).st_mtime_ns
        self.assertIn("nothing to do", run("build", self.file).stdout)
        self.assertEqual(before, pathlib.Path(self.file).read_bytes())
        self.assertEqual(stamp, os.stat(self.file).st_mtime_ns)

    def test_levels_of_another_program_count_and_are_replaced_when_forced(self):
        write(self.file, self.pixels, "Byte")
        dataset = gdal.Open(self.file, gdal.GA_Update)
        dataset.BuildOverviews("AVERAGE", [2])
        del dataset
        self.assertIn("nothing to do", run("build", self.file, "--levels", "2").stdout)
        self.assertEqual((167, 103), tuple(info(self.file)["levels"][0][key]
                                           for key in ("width", "height")))
        self.assertRan(run("build", self.file, "--levels", "2", "--force", "--method", "nearest"))
        self.check_levels(self.file, self.pixels, [2])

    def test_some_channels_alone_need_the_others_to_have_the_level(self):
        write(self.file, self.pixels, "Byte")
        answer = run("build", self.file, "--levels", "2", "--channels", "2")
        self.assertRan(answer, 2)
        self.assertIn("Level 2 would hold the channels named only", answer.stderr)
        self.assertEqual([], info(self.file)["levels"])
        self.assertRan(run("build", self.file, "--levels", "2"))
        self.assertRan(run("build", self.file, "--levels", "2", "--channels", "2", "--force"))
        self.assertEqual([2], all_valid(self.file))

    def test_no_data_stays_no_data(self):
        pixels = random_pixels((1, 200, 200), numpy.int16, 5)
        pixels[:, 40:100, 10:60] = -9999
        write(self.file, pixels, "Int16", no_data=-9999)
        self.assertRan(run("build", self.file, "--levels", "2", "--method", "average"))
        self.assertTrue((read_pixels(self.file, 0)[0, 20:50, 5:30] == -9999).all())

    def test_nan_and_infinities_leave_no_rim(self):
        for value in (float("nan"), float("inf")):
            for type_name in ("Float32", "Float64"):
                with self.subTest(value=value, type=type_name):
                    dtype = NUMPY_TYPES[type_name]
                    pixels = random_pixels((2, 205, 333), dtype, 5) + dtype(9000)
                    pixels[:, 40:101, 10:61] = value
                    write(self.file, pixels, type_name, no_data=value)
                    self.assertRan(run("build", self.file, "--levels", "2,4", "--method",
                                       "average"))
                    self.assertEqual(["scene.img"], os.listdir(self.folder))
                    for index, level in ((0, 2), (1, 4)):
                        stored = read_pixels(self.file, index)
                        hole = ~numpy.isfinite(stored)
                        self.assertTrue(hole[:, 40 // level:100 // level,
                                             12 // level:60 // level].all())
                        self.assertEqual({str(value)}, set(map(str, stored[hole].tolist())))
                        self.assertGreater(stored[~hole].min(), 4000)
                    os.remove(self.file)


class Cleaned(Hfa):
    def setUp(self):
        super().setUp()
        write(self.file, self.pixels, "Byte")
        dataset = gdal.Open(self.file, gdal.GA_Update)
        dataset.SetMetadataItem("SENSOR", "camera")
        del dataset
        self.assertRan(run("build", self.file, "--levels", "2,4", "--method", "nearest"))

    def check_clean(self):
        self.assertEqual([], info(self.file)["levels"])
        self.assertEqual([], overview_sizes(self.file))
        self.assertSamePixels(self.pixels, read_pixels(self.file))
        self.assertEqual({"SENSOR": "camera"}, gdal.Open(self.file).GetMetadata())

    def test_takes_levels_and_their_records_away(self):
        answer = run("clean", self.file)
        self.assertRan(answer)
        self.assertIn("levels removed: 2, 4 (inside the file)", answer.stdout)
        self.check_clean()
        self.assertIn("nothing to do", run("clean", self.file).stdout)
        self.assertRan(run("build", self.file, "--levels", "2,4", "--method", "nearest"))
        self.check_levels(self.file, self.pixels)
        self.assertRan(run("clean", self.file, "--levels", "2,4,8"))
        self.check_clean()

    def test_takes_some_levels_and_leaves_the_rest(self):
        self.assertRan(run("build", self.file, "--levels", "8", "--method", "nearest"))
        for going, staying in ((2, [4, 8]), (8, [4])):
            size = os.path.getsize(self.file)
            answer = run("clean", self.file, "--levels", going)
            self.assertRan(answer)
            self.assertIn(f"levels removed: {going} (inside the file)", answer.stdout)
            self.assertEqual(staying, all_valid(self.file))
            self.assertEqual([-(-333 // level) for level in staying],
                             [columns for columns, _ in overview_sizes(self.file)])
            room = 2 * (-(-333 // going // 64)) * (-(-205 // going // 64)) * 64 * 64
            self.assertLessEqual(os.path.getsize(self.file), size - room)
        level = nearest(nearest(self.pixels, 1, 2, (333, 205)), 2, 4, (333, 205))
        self.assertSamePixels(level, read_pixels(self.file, 0)[:, :51, :83])
        self.assertIn("Overviews: 84x52\n",
                      subprocess.run(["gdalinfo", self.file], capture_output=True, text=True,
                                     check=True).stdout)
        self.assertSamePixels(self.pixels, read_pixels(self.file))
        self.assertEqual({"SENSOR", "ORIN_LEVEL_4"},
                         set(gdal.Open(self.file).GetMetadata()))

    def test_takes_levels_of_other_programs(self):
        dataset = gdal.Open(self.file, gdal.GA_Update)
        dataset.BuildOverviews("AVERAGE", [8])
        del dataset
        self.assertRan(run("clean", self.file))
        self.check_clean()

    def test_a_read_only_file_keeps_them(self):
        os.chmod(self.file, 0o444)
        os.chmod(self.folder, 0o777)
        answer = run("clean", self.file, **SOMEBODY)
        self.assertNotEqual(0, answer.returncode)
        self.assertIn("scene.img: cannot be opened for writing: Permission denied", answer.stderr)
        self.assertEqual([2, 4], all_valid(self.file))


class Beside(Hfa):
    def check_beside(self, file, pixels):
        self.assertTrue(os.path.exists(file + ".ovr"))
        self.assertEqual(["side-car"], [level["place"] for level in info(file)["levels"]])
        size = (pixels.shape[2], pixels.shape[1])
        self.assertSamePixels(nearest(pixels, 1, 2, size), read_pixels(file + ".ovr"))

    def test_external_leaves_the_image_alone(self):
        write(self.file, self.pixels, "Byte")
        before, stamp = pathlib.Path(self.file).read_bytes(), os.stat(self.file).st_mtime_ns
        self.assertRan(run("build", self.file, "--levels", "2", "--external", "--method",
                           "nearest"))
        self.assertEqual(before, pathlib.Path(self.file).read_bytes())
        self.assertEqual(stamp, os.stat(self.file).st_mtime_ns)
        self.check_beside(self.file, self.pixels)
        self.assertSamePixels(nearest(self.pixels, 1, 2, (333, 205)), read_pixels(self.file, 0))

    def test_a_read_only_image_gets_a_side_car(self):
        write(self.file, self.pixels, "Byte")
        os.chmod(self.file, 0o444)
        os.chmod(self.folder, 0o777)
        self.assertRan(run("build", self.file, "--levels", "2", "--method", "nearest", **SOMEBODY))
        self.check_beside(self.file, self.pixels)

    def test_a_copied_image_does_not_touch_the_levels_of_the_original(self):
        write(self.file, self.pixels, "Byte")
        self.assertRan(run("build", self.file, "--levels", "2", "--method", "nearest"))
        original = pathlib.Path(self.file).read_bytes()
        copy = self.path("copy.img")
        shutil.copy(self.file, copy)
        other = 255 - self.pixels
        dataset = gdal.Open(copy, gdal.GA_Update)
        for index, channel in enumerate(other):
            dataset.GetRasterBand(index + 1).WriteArray(channel)
        del dataset
        self.assertEqual([], info(copy)["levels"])
        answer = run("build", copy, "--levels", "2", "--internal")
        self.assertRan(answer, 5)
        self.assertIn("copy.img: holds a list of levels under another file's name", answer.stderr)
        self.assertIn("Use --external", answer.stderr)
        self.assertRan(run("build", copy, "--levels", "2", "--method", "nearest"))
        self.check_beside(copy, other)
        self.assertEqual(original, pathlib.Path(self.file).read_bytes())
        self.assertSamePixels(other, read_pixels(copy))

    def test_a_renamed_image_gets_a_side_car(self):
        write(self.file, self.pixels, "Byte")
        self.assertRan(run("build", self.file, "--levels", "2", "--method", "nearest"))
        renamed = self.path("renamed.img")
        os.rename(self.file, renamed)
        self.assertRan(run("build", renamed, "--levels", "2", "--method", "nearest"))
        self.check_beside(renamed, self.pixels)

    def test_an_image_with_a_mask_gets_a_side_car_with_masks(self):
        valid = disc(333, 205)
        self.pixels[:, ~valid] = 3
        self.pixels[:, valid] = 200
        write(self.file, self.pixels, "Byte")
        write_mask_beside(self.file, valid)
        before = pathlib.Path(self.file).read_bytes()
        answer = run("build", self.file, "--levels", "2", "--internal")
        self.assertRan(answer, 5)
        self.assertIn("scene.img: has a mask or opacity", answer.stderr)
        self.assertFalse(os.path.exists(self.file + ".ovr"))
        self.assertRan(run("build", self.file, "--levels", "2", "--method", "bilinear"))
        self.assertEqual(before, pathlib.Path(self.file).read_bytes())
        expected = level_validity(valid, 1, 2, (333, 205), "bilinear", 1)
        self.assertTrue((expected == masks_of_levels(self.file)[0]).all())
        self.assertEqual({200}, set(read_pixels(self.file, 0)[:, expected].flatten().tolist()))

    def test_a_mask_that_came_later_does_not_keep_levels_inside(self):
        write(self.file, self.pixels, "Byte")
        self.assertRan(run("build", self.file, "--levels", "2,4", "--method", "nearest"))
        write_mask_beside(self.file, disc(333, 205))
        self.assertRan(run("clean", self.file))
        self.assertEqual([], info(self.file)["levels"])
        self.assertSamePixels(self.pixels, read_pixels(self.file))

    def test_an_image_near_the_limit_of_the_format_gets_a_side_car(self):
        write(self.file, self.pixels, "Byte")
        self.assertRan(run("build", self.file, "--levels", "2", "--method", "nearest"))
        os.truncate(self.file, 2000000000)  # a hole: no level fits in front of the limit
        answer = run("build", self.file, "--levels", "4", "--internal")
        self.assertRan(answer, 5)
        self.assertIn("scene.img: would grow beyond the 2 GB", answer.stderr)
        self.assertRan(run("build", self.file, "--levels", "4", "--method", "nearest"))
        self.assertTrue(os.path.exists(self.file + ".ovr"))
        self.assertRan(run("clean", self.file))
        self.assertEqual([], info(self.file)["levels"])

    def test_levels_that_pass_the_limit_together_go_beside_the_file(self):
        write(self.file, self.pixels, "Byte")
        size = 2000000000 - 60000  # level 2 fits in front of the limit, 4 does not
        os.truncate(self.file, size)
        link = self.path("link.img")
        os.symlink("scene.img", link)
        answer = run("build", link, "--levels", "2,4", "--internal")
        self.assertRan(answer, 5)
        self.assertIn("scene.img: would grow beyond the 2 GB", answer.stderr)
        self.assertIn("Use --external", answer.stderr)
        other = self.path("other.img")  # one that has room enough
        write(other, self.pixels, "Byte")
        answer = run("build", link, other, "--levels", "2,4", "--method", "nearest")
        self.assertRan(answer)
        self.check_levels(other, self.pixels)
        self.assertIn("would grow beyond the 2 GB", answer.stderr)
        self.assertIn("beside it instead", answer.stderr)
        self.assertEqual(size, os.path.getsize(self.file))
        self.assertEqual(["link.img", "link.img.ovr", "other.img", "scene.img"],
                         sorted(os.listdir(self.folder)))
        self.assertEqual([(2, "side-car"), (4, "side-car")],
                         [(level["level"], level["place"]) for level in info(link)["levels"]])
        self.assertSamePixels(nearest(self.pixels, 1, 2, (333, 205)), read_pixels(link + ".ovr"))

    def test_a_link_leads_to_the_file(self):
        write(self.file, self.pixels, "Byte")
        link = self.path("link.img")
        os.symlink("scene.img", link)
        self.assertRan(run("build", link, "--levels", "2,4", "--method", "nearest"))
        self.check_levels(self.file, self.pixels)


class Survives(Hfa):
    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((2, 1300, 1400), numpy.uint8, 9)
        self.arguments = ["--levels", "2,4,8", "--method", "nearest"]

    def check_killed(self, original, arguments, kills):
        """Kills builds of copies of a folder's only file, which all have its name."""
        start = time.monotonic()
        self.assertRan(run("build", self.copy_of(original, "undisturbed"), *arguments))
        duration = time.monotonic() - start
        delays = random.Random(4)
        killed = 0
        for number in range(kills):
            file = self.copy_of(original, f"killed{number}")
            killed += kill_build(delays.uniform(0, duration), file, arguments)
            self.assertSamePixels(self.pixels, read_pixels(file))
            expected, source = self.pixels, 1
            for level in (2, 4, 8):
                expected = nearest(expected, source, level, (1400, 1300))
                source = level
                if level in all_valid(file):
                    index = [entry[0] for entry in overview_sizes(file)].index(-(-1400 // level))
                    stored = read_pixels(file, index)
                    self.assertSamePixels(expected,
                                          stored[:, :expected.shape[1], :expected.shape[2]])
            self.assertRan(run("build", file, *self.arguments))
            self.check_levels(file, self.pixels, [2, 4, 8])
            shutil.rmtree(os.path.dirname(file))
        self.assertGreater(killed, kills // 4, "most builds ended before they could be killed")

    def copy_of(self, original, name):
        os.mkdir(self.path(name))
        return shutil.copy(original, self.path(name))  # under its own name, which it stores

    def test_being_killed_at_any_moment(self):
        write(self.file, self.pixels, "Byte")
        self.check_killed(self.file, self.arguments, KILLS)

    def test_a_full_disk(self):
        write(self.file, self.pixels, "Byte")
        before = pathlib.Path(self.file).read_bytes()
        limit = os.path.getsize(self.file) // 1024 + 500
        answer = subprocess.run(
            ["bash", "-c", f'ulimit -f {limit}; exec "$@"', "bash", TOOL, "build", self.file,
             *self.arguments], capture_output=True, text=True, check=False,
            env=dict(os.environ, ORIN_PREFERENCES="/dev/null", LC_ALL="C"))
        self.assertNotEqual(0, answer.returncode)
        self.assertIn("File too large", answer.stderr)
        self.assertEqual([], all_valid(self.file))
        self.assertSamePixels(self.pixels, read_pixels(self.file))
        first = 11 * 11 * 64 * 64  # bytes of level 2 of the first channel, which did fit
        self.assertLess(os.path.getsize(self.file), len(before) + first + 8192)
        self.assertRan(run("build", self.file, *self.arguments))
        self.check_levels(self.file, self.pixels, [2, 4, 8])

    def test_the_second_of_two_builds_at_once_is_refused(self):
        write(self.file, self.pixels, "Byte")
        with subprocess.Popen(["flock", self.file, "cat"], stdin=subprocess.PIPE) as holder:
            while subprocess.run(["flock", "-n", self.file, "true"], check=False).returncode == 0:
                pass
            answer = run("build", self.file, *self.arguments)
            holder.stdin.close()
        self.assertNotEqual(0, answer.returncode)
        self.assertIn("scene.img: another build is writing levels into it: ", answer.stderr)
        self.assertIn(f"(process {holder.pid})", answer.stderr)
        self.assertRan(run("build", self.file, *self.arguments))


if __name__ == "__main__":
    unittest.main()
