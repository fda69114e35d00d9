# SPDX-License-Identifier: MIT
"""Levels beside files of every format know whether they match their image."""

import os
import shutil
import unittest

import numpy
from osgeo import gdal

from mask_case import write_mask_beside
from mask_twin import disc
from orin_e2e import info, nearest, random_pixels, read_pixels, run
from test_gdal_formats import COLUMNS, Formats, ROWS, write


class Freshness(Formats):
    def assertStates(self, state, name):
        self.assertEqual({2: state, 4: state},
                         {level["level"]: level["state"] for level in info(name)["levels"]})


class Beside(Freshness):
    def build(self, name):
        self.assertRan(run("build", name, "--levels", "2,4", "--method", "nearest"))
        self.assertStates("current", name)

    def check_rebuilt(self, name):
        """The image was edited."""
        self.assertStates("stale", name)
        answer = run("build", name, "--levels", "2,4", "--method", "nearest")
        self.assertIn("levels built: 2, 4", answer.stdout)
        self.assertStates("current", name)
        self.check_levels(name, read_pixels(name))

    def replace(self, name, write_new):
        """The library deletes side-cars with what it overwrites; other programs do not."""
        os.mkdir("new")
        write_new(os.path.join("new", name))
        for file in os.listdir("new"):
            os.replace(os.path.join("new", file), file)
        os.rmdir("new")

    def test_of_side_cars_survives_a_touch_and_a_copy_but_no_edit(self):
        formats = (("PNG", "rgb.png", ()), ("JP2OpenJPEG", "photo.jp2", ()),
                   ("ENVI", "cube.envi", (".hdr",)), ("MRF", "tiles.mrf", (".idx", ".ppg")),
                   ("HFA", "scene.img", ()))
        pixels = random_pixels((3, ROWS, COLUMNS), numpy.uint8, 1)
        for driver, name, others in formats:
            with self.subTest(format=driver):
                write(name, driver, pixels, "Byte")
                if driver == "HFA":
                    self.assertRan(run("build", name, "--levels", "2,4", "--external"))
                else:
                    self.build(name)
                os.utime(name)
                self.assertStates("current", name)
                os.mkdir("copy")
                stem = os.path.splitext(name)[0]
                for file in (name, name + ".ovr", *(stem + other for other in others)):
                    shutil.copyfile(file, os.path.join("copy", file))
                self.assertStates("current", os.path.join("copy", name))
                shutil.rmtree("copy")
                self.replace(name, lambda path: write(path, driver, 255 - pixels, "Byte"))
                if driver == "HFA":
                    self.assertStates("stale", name)
                else:
                    self.check_rebuilt(name)

    def test_of_one_pixel_edited_in_place(self):
        for driver, name in (("ENVI", "cube.envi"), ("EHdr", "heights.bil")):
            write(name, driver, random_pixels((1, ROWS, COLUMNS), numpy.int16, 1), "Int16")
            self.build(name)
            dataset = gdal.Open(name, gdal.GA_Update)
            pixel = dataset.GetRasterBand(1).ReadAsArray(7, 5, 1, 1)
            dataset.GetRasterBand(1).WriteArray(pixel ^ 1, 7, 5)
            del dataset
            self.check_rebuilt(name)

    def test_of_a_header_that_is_written_again_is_kept(self):
        write("cube.envi", "ENVI", random_pixels((1, ROWS, COLUMNS), numpy.int16, 1), "Int16")
        self.build("cube.envi")
        with open("cube.hdr", "a", encoding="utf-8") as header:
            header.write("description = {another text}\n")
        self.assertStates("current", "cube.envi")

    def test_of_virtual_rasters_depends_on_their_text_and_their_sources(self):
        pixels = random_pixels((3, ROWS, COLUMNS), numpy.uint8, 1)
        write("image.tif", "GTiff", pixels, "Byte")
        gdal.Translate("inner.vrt", "image.tif")
        gdal.Translate("outer.vrt", "inner.vrt")
        self.build("outer.vrt")
        os.utime("outer.vrt")
        self.assertStates("current", "outer.vrt")
        for suffix in ("", ".ovr"):
            shutil.copyfile("outer.vrt" + suffix, "copy.vrt" + suffix)
        self.assertStates("current", "copy.vrt")
        dataset = gdal.Open("image.tif", gdal.GA_Update)
        dataset.GetRasterBand(1).WriteArray(255 - pixels[0])
        del dataset
        self.check_rebuilt("outer.vrt")
        self.replace("outer.vrt", lambda path: gdal.Translate(
            path, os.path.abspath("image.tif"), scaleParams=[[0, 255, 0, 100]]))
        self.check_rebuilt("outer.vrt")

    def test_an_added_mask_file_makes_levels_stale(self):
        write("rgb.png", "PNG", random_pixels((3, ROWS, COLUMNS), numpy.uint8, 1), "Byte")
        self.build("rgb.png")
        write_mask_beside("rgb.png", disc(COLUMNS, ROWS))
        self.assertStates("stale", "rgb.png")


class Inside(Freshness):
    """ERDAS Imagine files, whose bytes change with the levels inside them."""

    def setUp(self):
        super().setUp()
        self.file = "scene.img"
        self.pixels = random_pixels((3, ROWS, COLUMNS), numpy.uint8, 1)
        write(self.file, "HFA", self.pixels, "Byte")

    def edit(self):
        dataset = gdal.Open(self.file, gdal.GA_Update)
        band = dataset.GetRasterBand(2)
        band.WriteArray(band.ReadAsArray(7, 5, 1, 1) ^ 1, 7, 5)
        del band, dataset

    def build(self, *arguments):
        return run("build", self.file, "--levels", "2,4", "--method", "nearest", *arguments)

    def check_right(self):
        now = read_pixels(self.file)
        two = nearest(now, 1, 2, (COLUMNS, ROWS))
        for index, level in ((0, two), (1, nearest(two, 2, 4, (COLUMNS, ROWS)))):
            stored = read_pixels(self.file, index)
            self.assertSamePixels(level, stored[:, :level.shape[1], :level.shape[2]])

    def test_one_pixel_makes_levels_stale_and_build_makes_them_current_again(self):
        self.assertRan(self.build())
        self.assertStates("current", self.file)
        self.assertIn("nothing to do", self.build().stdout)
        for _ in range(3):
            self.edit()
            self.assertStates("stale", self.file)
            answer = self.build()
            self.assertIn("levels built: 2, 4", answer.stdout)
            self.assertIn("Rebuilding levels 2, 4: they no longer match the image.",
                          answer.stderr)
            self.assertStates("current", self.file)
            self.check_right()
        self.assertEqual([self.file], os.listdir("."))

    def test_a_touch_and_metadata_leave_levels_current_and_the_time_alone(self):
        self.assertRan(self.build())
        for time in (1234567890123456789, -987654321):
            os.utime(self.file, ns=(5000, time))
            self.assertStates("current", self.file)
            self.assertEqual(time, os.stat(self.file).st_mtime_ns)
        dataset = gdal.Open(self.file, gdal.GA_Update)
        dataset.SetMetadataItem("SENSOR", "camera")
        del dataset
        self.assertStates("current", self.file)
        self.assertIn("nothing to do", self.build().stdout)

    def test_the_pixels_are_read_only_when_size_or_time_have_changed(self):
        """An edit that restores both shows it, as docs/behaviour.md says."""
        self.assertRan(self.build())
        for _ in range(2):
            times = os.stat(self.file)
            self.edit()
            changed = os.stat(self.file)
            os.utime(self.file, ns=(times.st_atime_ns, times.st_mtime_ns))
            self.assertStates("current", self.file)
            os.utime(self.file, ns=(changed.st_atime_ns, changed.st_mtime_ns))
            self.assertStates("stale", self.file)
            self.edit()
            self.assertRan(run("info", "--update", self.file))  # remembers it for the next round
            self.assertStates("current", self.file)

    def test_levels_computed_from_stale_ones_are_not_made(self):
        self.assertRan(run("build", self.file, "--levels", "2", "--method", "nearest"))
        self.edit()
        self.assertRan(run("build", self.file, "--levels", "4", "--method", "nearest"))
        found = {level["level"]: level for level in info(self.file)["levels"]}
        self.assertEqual(("stale", "current"), (found[2]["state"], found[4]["state"]))
        self.assertEqual(1, found[4]["sourceLevel"])
        expected = nearest(read_pixels(self.file), 1, 4, (COLUMNS, ROWS))
        stored = read_pixels(self.file, 1)
        self.assertSamePixels(expected, stored[:, :expected.shape[1], :expected.shape[2]])

    def test_channels_of_an_older_image_are_not_passed_off_as_those_of_the_new_one(self):
        self.assertRan(self.build())
        self.edit()
        self.assertRan(self.build("--channels", "1"))
        for level in info(self.file)["levels"]:
            self.assertEqual([True, False, False],
                             [channel["valid"] for channel in level["channels"]])
        self.assertRan(self.build())
        self.assertStates("current", self.file)
        self.check_right()

    def test_levels_of_another_program_are_unverified_and_what_comes_from_them_too(self):
        dataset = gdal.Open(self.file, gdal.GA_Update)
        dataset.BuildOverviews("NEAREST", [2])
        del dataset
        self.assertRan(run("build", self.file, "--levels", "2,4"))
        self.assertStates("unverified", self.file)
        self.assertRan(self.build("--force"))
        self.assertStates("current", self.file)

    def test_levels_beside_the_file_know_those_inside_it(self):
        self.assertRan(self.build())
        before = os.stat(self.file).st_mtime_ns
        self.assertRan(run("build", self.file, "--levels", "8", "--external"))
        self.assertEqual(before, os.stat(self.file).st_mtime_ns)
        self.assertEqual(["current"] * 3, [level["state"] for level in info(self.file)["levels"]])
        self.edit()
        self.assertEqual(["stale"] * 3, [level["state"] for level in info(self.file)["levels"]])

    def test_a_file_that_cannot_be_written_is_answered_right(self):
        self.assertRan(self.build())
        os.utime(self.file)
        os.chmod(self.file, 0o444)
        os.chmod(".", 0o755)
        before = os.stat(self.file)
        somebody = {"user": 65534} if os.geteuid() == 0 else {}
        answer = run("info", "--json", self.file, **somebody)
        self.assertRan(answer)
        self.assertEqual(2, answer.stdout.count('"state": "current"'))
        self.assertEqual(before.st_mtime_ns, os.stat(self.file).st_mtime_ns)


if __name__ == "__main__":
    unittest.main()
