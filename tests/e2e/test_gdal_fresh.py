# SPDX-License-Identifier: MIT
"""Levels beside files of every format know whether they match their image."""

import os
import shutil
import unittest

import numpy
from osgeo import gdal

from mask_case import write_mask_beside
from mask_twin import disc
from orin_e2e import info, random_pixels, read_pixels, run
from test_gdal_formats import COLUMNS, Formats, ROWS, write


class Freshness(Formats):
    def assertStates(self, state, name):
        self.assertEqual({2: state, 4: state},
                         {level["level"]: level["state"] for level in info(name)["levels"]})

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


if __name__ == "__main__":
    unittest.main()
