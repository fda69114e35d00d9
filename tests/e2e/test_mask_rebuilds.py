# SPDX-License-Identifier: MIT
"""Masks of levels built again, of interrupted builds, and beside levels of other programs."""

import itertools
import os
import random
import shutil
import subprocess
import time
import unittest

from osgeo import gdal

from mask_case import (MaskCase, SIZE, TILED, WIDTH, HEIGHT, directories_of, picture, write_mask,
                       write_mask_beside)
from mask_twin import disc, level_validity, masks_inside, masks_of_levels
from orin_e2e import TOOL, info, overview_sizes, run, write_tiff


class Again(MaskCase):
    def test_a_second_build_has_nothing_to_do_and_a_forced_one_follows_a_changed_mask(self):
        for place in ("--internal", "--external"):
            file, valid = self.make(place + ".tif", inside=False)
            arguments = ("--levels", "2,3,4", "--method", "bilinear", place)
            self.build(file, *arguments)
            answer = run("build", file, *arguments)
            self.assertRan(answer)
            self.assertIn("nothing to do", answer.stdout)
            other = valid[::-1].copy()
            write_tiff(file, picture(other), "Byte", TILED)  # takes the levels inside away
            write_mask(file, other, False)
            self.build(file, *arguments, "--force")
            self.assert_levels(file, other, "bilinear", 3, place == "--internal")
            holder = file if place == "--internal" else file + ".ovr"
            self.assertEqual(3, directories_of(holder).count(5) + directories_of(holder).count(4))

    def test_levels_from_before_there_was_a_mask_are_built_anew(self):
        for inside, place in itertools.product((True, False), ("--internal", "--external")):
            with self.subTest(inside=inside, place=place):
                valid = disc(WIDTH, HEIGHT)
                file = self.path(f"{inside}{place}.tif")
                write_tiff(file, picture(valid), "Byte", TILED)
                self.build(file, "--levels", "2,3,4", "--method", "bilinear", place)
                write_mask(file, valid, inside)
                listed = info(file)["levels"]
                self.assertFalse(any(c["valid"] for level in listed for c in level["channels"]))
                self.build(file, "--levels", "2,3,4", "--method", "bilinear", place)
                self.assert_levels(file, valid, "bilinear", 3, place == "--internal")

    def test_a_mask_that_did_not_change_is_not_stored_again(self):
        file, _ = self.make("scene.tif", inside=False)
        self.build(file, "--levels", "2", "--external")
        one = os.path.getsize(file + ".ovr")
        single, _ = self.make("single.tif", inside=False, channels=1)
        self.build(single, "--levels", "2", "--external")
        self.assertLess(one, 3 * os.path.getsize(single + ".ovr"))

    def test_levels_of_another_program_give_way_with_their_masks(self):
        file, valid = self.make("scene.tif")
        with masks_inside(True):
            dataset = gdal.Open(file, gdal.GA_Update)
            dataset.BuildOverviews("AVERAGE", [2, 4])
            del dataset
        self.assertEqual([0, 4, 1, 1, 5, 5], directories_of(file))
        self.build(file, "--levels", "2,4", "--method", "nearest", "--force")
        self.assertEqual([0, 4, 1, 5, 1, 5], directories_of(file))
        self.assert_levels(file, valid, "nearest", 3, levels=(2, 4))

    def test_a_level_of_another_program_is_read_with_its_mask(self):
        file, valid = self.make("scene.tif")
        with masks_inside(True):
            dataset = gdal.Open(file, gdal.GA_Update)
            dataset.BuildOverviews("AVERAGE", [2])
            del dataset
        two = masks_of_levels(file)[0]
        self.build(file, "--levels", "4", "--method", "nearest")
        expected = level_validity(two, 2, 4, SIZE, "nearest", 3)
        self.assertTrue((expected == masks_of_levels(file)[1]).all())

    def test_a_level_without_a_mask_goes_by_that_of_the_image(self):
        file, valid = self.make("scene.tif", inside=False)
        dataset = gdal.Open(file, gdal.GA_Update)
        dataset.BuildOverviews("NEAREST", [2])  # no mask levels for a mask file, here
        del dataset
        self.assertEqual([0, 1], directories_of(file))
        self.build(file, "--levels", "4", "--method", "nearest")
        at_centres = valid[1::2, 1::2]
        expected = level_validity(at_centres, 2, 4, SIZE, "nearest", 3)
        self.assertTrue((expected == masks_of_levels(file)[1]).all())

    def test_one_channel_of_a_side_car_at_a_time(self):
        file, valid = self.make("scene.tif")
        for channel in (2, 1, 3):
            self.build(file, "--levels", "2,3,4", "--channels", channel, "--external", "--method",
                       "mode")
        self.assert_levels(file, valid, "mode", 3, as_one=False)


class Killed(MaskCase):
    def test_no_valid_level_is_without_its_mask(self):
        for place in ("--internal", "--external"):
            valid = disc(1900, 1700)
            original = self.path("original.tif")
            write_tiff(original, picture(valid), "Byte", ("TILED=YES", "COMPRESS=DEFLATE"))
            write_mask(original, valid, True)
            undisturbed = shutil.copy(original, self.path("undisturbed.tif"))
            arguments = ("--levels", "2,4,8", "--method", "nearest", place)
            start = time.monotonic()
            self.build(undisturbed, *arguments)
            duration = time.monotonic() - start
            expected = masks_of_levels(undisturbed)
            moments = random.Random(7)
            for number in range(10):
                file = shutil.copy(original, self.path(f"{number}{place}.tif"))
                process = subprocess.Popen([TOOL, "build", file, *arguments],
                                           stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
                time.sleep(moments.uniform(0, duration))  # the moment is what is tested
                process.kill()
                process.wait()
                finished = [(entry["width"], entry["height"]) for entry in info(file)["levels"]
                            if all(channel["valid"] for channel in entry["channels"])]
                for size, mask in zip(overview_sizes(file), masks_of_levels(file)):
                    if size in finished:
                        own = [m for m in expected if m.shape == size[::-1]][0]
                        self.assertTrue(mask is not None and (own == mask).all())
                self.build(file, *arguments)
                for own, mask in zip(expected, masks_of_levels(file)):
                    self.assertTrue((own == mask).all())


class MaskFilesThatCannotServe(MaskCase):
    def check(self, name, reason):
        answer = run("build", self.path("scene.tif"), "--levels", "2")
        self.assertRan(answer)
        self.assertIn("scene.tif.msk: is not used as the mask of its image: " + reason,
                      answer.stderr)
        self.assertEqual(1, answer.stderr.count("is not used as the mask"), name)

    def setUp(self):
        super().setUp()
        self.valid = disc(WIDTH, HEIGHT)
        self.file = self.path("scene.tif")
        write_tiff(self.file, picture(self.valid), "Byte", TILED)

    def test_another_size(self):
        write_mask_beside(self.file, self.valid[:-1])
        self.check("size", "it has 203 x 150 pixels")

    def test_no_word_of_how_it_applies(self):
        write_mask_beside(self.file, self.valid, flags=None)
        self.check("flags", "it does not say how it applies")

    def test_a_mask_for_each_channel(self):
        write_mask_beside(self.file, self.valid, flags="0")
        self.check("channel", "only one mask for all channels")

    def test_no_tiff_at_all(self):
        with open(self.file + ".msk", "wb") as mask:
            mask.write(b"mask")
        self.check("tiff", "it is no TIFF")

    def test_a_damaged_one_ends_the_build(self):
        """Nobody knows then which pixels hold data."""
        write_mask_beside(self.file, self.valid)
        os.truncate(self.file + ".msk", 20)
        answer = run("build", self.file, "--levels", "2")
        self.assertNotEqual(0, answer.returncode)
        self.assertIn("scene.tif.msk: cannot be read", answer.stderr)
        self.assertEqual([], overview_sizes(self.file))


if __name__ == "__main__":
    unittest.main()
