# SPDX-License-Identifier: MIT
"""Side-cars are written channel by channel: whenever a build is killed, no other program sees a
level of which a channel or the mask is missing; a build that is stopped leaves what is finished."""

import functools
import os
import signal
import subprocess
import time
import unittest

import disklog  # first: it says where the files go

import numpy
from osgeo import gdal

from mask_case import write_mask, write_mask_beside
from mask_twin import disc, level_validity, masks_of_levels
from orin_e2e import (READS_ALL_FORMATS, TOOL, info, overview_sizes, random_pixels, read_pixels,
                      run, write_tiff)
from test_replay import Replayed

WIDTH, HEIGHT = 75, 61
LEVELS = (2, 4)
ARGUMENTS = ("build", "--external", "--levels", "2,4", "--method", "nearest")
TILES = ("TILED=YES", "BLOCKXSIZE=16", "BLOCKYSIZE=16")


class Between(Replayed):
    """Every state between two system calls, as another program sees it."""

    def write_image(self, driver, kind):
        """An image of three colours without data outside a disc, as `kind` has it."""
        self.image = "image." + driver.lower()
        file = os.path.join(self.original, self.image)
        self.valid = disc(WIDTH, HEIGHT)
        pixels = numpy.where(self.valid, random_pixels((3, HEIGHT, WIDTH), numpy.uint8, 3) | 1, 0)
        options = TILES if driver == "TIFF" else ()
        if kind == "alpha":
            pixels = numpy.concatenate([pixels, (self.valid * 255)[None]])
            options = (*options, "ALPHA=YES", "PHOTOMETRIC=RGB")
        plain = file if driver == "TIFF" else self.path("plain.tif")
        write_tiff(plain, pixels.astype(numpy.uint8), "Byte", options)
        if driver != "TIFF":
            gdal.Translate(file, plain, format=driver)
            if os.path.exists(file + ".aux.xml"):
                os.remove(file + ".aux.xml")
            if not READS_ALL_FORMATS:
                self.skipTest("this build reads no other formats")
        if kind == "mask":
            write_mask(file, self.valid, True)
        elif kind == "msk":
            write_mask_beside(file, self.valid)

    def seen(self, image):
        """What GDAL shows of the levels: [(pixels, mask)], None for no mask."""
        side_car = image + ".ovr"
        if not os.path.exists(side_car):
            return []
        count = len(overview_sizes(image))
        masks = masks_of_levels(image)
        return [(read_pixels(image, index), masks[index]) for index in range(count)]

    def check_states(self, has_mask, again=9):
        """\\param again  every so many states the build is run again"""
        changes = self.record(*ARGUMENTS)
        whole = self.seen(os.path.join(self.recorded, self.image))
        self.assertEqual(len(LEVELS), len(whole))
        known = self.valid
        for (source, level), (pixels, mask) in zip(((1, 2), (2, 4)), whole):
            known = level_validity(known, source, level, (WIDTH, HEIGHT), "nearest", 1)
            self.assertEqual(has_mask, mask is not None)
            self.assertTrue(((pixels[0] > 0) == known).all() or self.image.endswith(".jpeg"))
            self.assertTrue(mask is None or (mask == known).all())
        counts = disklog.check_at_once(self, {
            f"after {stop} calls": functools.partial(self.check_state, changes[:stop], whole,
                                                     stop % again == 0)
            for stop in range(len(changes) + 1)})
        self.assertEqual({0, 1, 2}, set(counts.values()))

    def check_state(self, changes, whole, is_finished):
        """\returns the number of levels that the state shows"""
        with self.replay(changes) as image:
            there = self.seen(image)
            for (expected, mask), (pixels, own) in zip(whole, there):
                self.assertSamePixels(expected, pixels)
                self.assertTrue((mask is None) == (own is None))
                self.assertTrue(mask is None or (mask == own).all())
            if is_finished:
                self.assertRan(run(ARGUMENTS[0], image, *ARGUMENTS[1:]))
                for (expected, mask), (pixels, own) in zip(whole, self.seen(image)):
                    self.assertSamePixels(expected, pixels)
                    self.assertTrue(mask is None or (mask == own).all())
            return len(there)

    def test_with_a_mask_inside_the_image(self):
        self.write_image("TIFF", "mask")
        self.check_states(True)

    def test_with_a_mask_file(self):
        self.write_image("TIFF", "msk")
        self.check_states(True)

    def test_with_alpha(self):
        self.write_image("TIFF", "alpha")
        self.check_states(False)

    def test_of_a_png_with_a_mask_file(self):
        self.write_image("PNG", "msk")
        self.check_states(True)

    def test_of_a_jpeg_with_a_mask_file(self):
        self.write_image("JPEG", "msk")  # black is not quite black there
        self.check_states(True)


class Rebuilt(Between):
    """The same of levels that are built again by another method: other programs see the old level
    or the new one, never channels of both, nor a mask without its pixels."""

    def check_switches(self, *storing):
        image = os.path.join(self.original, self.image)
        self.assertRan(run(ARGUMENTS[0], image, *ARGUMENTS[1:]))
        old = self.seen(image)
        changes = self.record(*ARGUMENTS[:-1], "average", "--force", *storing)
        new = self.seen(os.path.join(self.recorded, self.image))
        for before, after in zip(old, new, strict=True):
            self.assertFalse(self.are_same(before, after))
        states = disklog.check_at_once(self, {
            f"after {stop} calls": functools.partial(self.state, changes[:stop], old, new)
            for stop in range(len(changes) + 1)})
        self.assertEqual({("old", "old"), ("new", "old"), ("new", "new")}, set(states.values()))

    @staticmethod
    def are_same(one, other):
        (pixels, mask), (other_pixels, other_mask) = one, other
        if (mask is None) != (other_mask is None):
            return False
        return (pixels == other_pixels).all() and (mask is None or (mask == other_mask).all())

    def state(self, changes, old, new):
        """Which of the two each level is."""
        with self.replay(changes) as image:
            there = self.seen(image)
            self.assertEqual(len(old), len(there))
            found = []
            for level, before, after in zip(there, old, new):
                self.assertTrue(self.are_same(level, before) or self.are_same(level, after))
                found.append("old" if self.are_same(level, before) else "new")
            return tuple(found)

    def test_with_a_mask_inside_the_image(self):
        self.write_image("TIFF", "mask")
        self.check_switches()

    def test_with_a_mask_file(self):
        self.write_image("TIFF", "msk")
        self.check_switches("--co", "COMPRESS=LZW")  # another form: no tile is taken over

    def test_with_alpha(self):
        self.write_image("TIFF", "alpha")
        self.check_switches()

    def test_of_a_png_with_a_mask_file(self):
        self.write_image("PNG", "msk")
        self.check_switches()

    def test_of_a_jpeg_with_a_mask_file(self):
        self.write_image("JPEG", "msk")
        self.check_switches()


class Stopped(Replayed):
    """Ctrl-C and a kill in the middle of the second channel, found by the growing file."""

    SIZE = 2600

    def setUp(self):
        super().setUp()
        self.valid = disc(self.SIZE, self.SIZE)
        self.file = self.path("scene.tif")
        pixels = random_pixels((3, self.SIZE, self.SIZE), numpy.uint8, 4) | 1
        write_tiff(self.file, pixels * self.valid, "Byte", ("TILED=YES",))
        write_mask(self.file, self.valid, False)
        self.expected = level_validity(self.valid, 1, 2, (self.SIZE, self.SIZE), "nearest", 1)

    def stop_by(self, number):
        """Stops a build of level 2 when one channel is finished and the next begun."""
        partial = self.file + ".ovr.partial"
        channel = (self.SIZE // 2) ** 2  # bytes that do not compress
        process = subprocess.Popen(
            [TOOL, "build", self.file, *ARGUMENTS[1:-3], "2", *ARGUMENTS[-2:], "--co", "TILE=64"],
            stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL,
            env=dict(os.environ, ORIN_PREFERENCES="/dev/null", OMP_NUM_THREADS="1"))
        while process.poll() is None and (not os.path.exists(partial) or
                                          os.path.getsize(partial) < 1.3 * channel):
            time.sleep(0.001)  # until it has come as far
        process.send_signal(number)
        return process.wait()

    def test_a_killed_build_leaves_no_level(self):
        self.assertEqual(-signal.SIGKILL, self.stop_by(signal.SIGKILL))
        self.assertEqual([], overview_sizes(self.file))
        self.assertEqual([], info(self.file)["levels"])

    def test_readers_meanwhile_see_the_old_level_or_the_new_one(self):
        self.assertRan(run("build", self.file, *ARGUMENTS[1:-3], "2", *ARGUMENTS[-2:]))
        old = read_pixels(self.file, 0).tobytes()
        process = subprocess.Popen(
            [TOOL, "build", self.file, "--external", "--levels", "2", "--force", "--method",
             "average"], stdout=subprocess.DEVNULL,
            env=dict(os.environ, ORIN_PREFERENCES="/dev/null", OMP_NUM_THREADS="1"))
        seen = []
        while process.poll() is None:
            seen.append(read_pixels(self.file, 0).tobytes())
        self.assertEqual(0, process.returncode)
        new = read_pixels(self.file, 0).tobytes()
        self.assertNotEqual(old, new)
        mixed = [pixels for pixels in seen if pixels not in (old, new)]
        self.assertGreater(len(seen), 3)
        self.assertEqual(0, len(mixed), f"{len(mixed)} of {len(seen)} reads")

    def test_a_stopped_build_leaves_the_finished_channel_and_its_mask(self):
        self.assertEqual(130, self.stop_by(signal.SIGINT))
        level = info(self.file)["levels"][0]
        self.assertEqual("unfinished", level["state"])
        valid = [channel["valid"] for channel in level["channels"]]
        self.assertIn(valid, ([True, False, False], [True, True, False]))
        self.assertTrue((masks_of_levels(self.file)[0] == self.expected).all())
        self.assertTrue(((read_pixels(self.file, 0)[0] > 0) == self.expected).all())
        self.assertRan(run("build", self.file, *ARGUMENTS[1:]))
        self.assertTrue((masks_of_levels(self.file)[0] == self.expected).all())


if __name__ == "__main__":
    unittest.main()
