# SPDX-License-Identifier: MIT
"""What is on disk between any two system calls of the tool at an ERDAS Imagine file, and after a
power loss that swallowed a write which was not synced: levels are whole, old or new."""

import os
import unittest

import numpy
from osgeo import gdal

import disklog  # first: it says where the files go
from orin_e2e import info, random_pixels, read_pixels, run
from test_hfa import write
from test_replay import Replayed

SIZE = (140, 90)  # columns, rows: two blocks of 64 pixels in level 2, one in level 4
LEVELS = "2,4"
assert disklog.SHIM


class Hfa(Replayed):
    image = "image.img"

    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((3, SIZE[1], SIZE[0]), numpy.uint8, 8)
        self.pixels[:, :, 60:] = 3  # something to compress
        self.file = os.path.join(self.original, self.image)

    def levels(self, image):
        """As other programs see them: in all channels, or in none."""
        dataset = gdal.Open(image)
        channels = []
        for channel in range(dataset.RasterCount):
            band = dataset.GetRasterBand(channel + 1)
            levels = [band.GetOverview(index) for index in range(band.GetOverviewCount())]
            channels.append({round(SIZE[0] / level.XSize): level.ReadAsArray()
                             for level in levels})
        for levels in channels:
            self.assertEqual(list(channels[0]), list(levels))
        return {level: numpy.stack([levels[level] for levels in channels])
                for level in channels[0]}

    def check(self, changes, arguments, expected):
        with self.replay(changes) as image:
            self.assertTold(image)
        super().check(changes, arguments, expected)

    def assertTold(self, image):
        """`info` answers 0 where every level is whole, in the eyes of other programs, too."""
        levels = info(image)["levels"]
        if any(level["state"] in ("stale", "unfinished") for level in levels):
            return  # `info` of the tests has seen that the answer was 3
        self.assertTrue(all(channel["valid"] for level in levels for channel in level["channels"]))
        dataset = gdal.Open(image)
        self.assertEqual({len(levels)}, {dataset.GetRasterBand(channel + 1).GetOverviewCount()
                                         for channel in range(dataset.RasterCount)})

    def states(self, changes):
        """What may be on disk when the tool or the power stops. Left out is what differs only in
        bytes behind the end that the last sync saw: nothing leads there yet."""
        durable = os.path.getsize(self.file)
        appends, written = [], 0
        for change in changes:
            appends.append(change.name == "pwrite" and change.numbers[0] >= durable)
            if change.name == "fsync":
                durable = max(durable, written)
            elif change.name == "pwrite":
                written = max(written, sum(change.numbers[:2]))
            elif change.name == "ftruncate":
                durable = written = change.numbers[0]
        states = {}
        for count in range(len(changes) + 1):
            if count in (0, len(changes)) or (not (appends[count - 1] and appends[count])
                                              and self.is_sample(changes, count)):
                states[f"after {count} calls"] = changes[:count]
        for lost, stop in self.losses(changes):
            if not all(appends[lost:stop]) and self.is_sample(changes, lost):
                states[f"call {lost} lost, before {stop}"] = changes[:lost] + changes[lost + 1:stop]
        self.assertGreater(len(states), 20)
        return states

    @staticmethod
    def is_sample(changes, number):
        """Of many writes between two syncs some six do."""
        first = last = number
        while first > 0 and changes[first - 1].name == "pwrite":
            first -= 1
        while last < len(changes) and changes[last].name == "pwrite":
            last += 1
        return (number - first) % max(1, (last - first) // 6) == 0 or number + 1 >= last


class Build(Hfa):
    arguments = ("build", "--levels", LEVELS, "--method", "nearest")

    def test_inside_the_file(self):
        write(self.file, self.pixels, "Byte")
        self.check_all(self.arguments)

    def test_inside_a_compressed_file(self):
        write(self.file, self.pixels, "Byte", ["COMPRESSED=YES"])
        self.check_all(self.arguments)


class Rebuild(Hfa):
    arguments = ("build", "--levels", LEVELS, "--method", "average", "--force")

    def check_image(self, options):
        write(self.file, self.pixels, "Byte", options)
        self.assertRan(run("build", self.file, "--levels", LEVELS, "--method", "nearest"))
        self.old = self.levels(self.file)
        self.check_all(self.arguments)

    def valid(self, image):
        """Only levels of the rebuild are compared with it; the old ones are valid as well."""
        return [entry["level"] for entry in info(image)["levels"]
                if entry["method"] == "AVERAGE"
                and all(channel["valid"] for channel in entry["channels"])]

    def check(self, changes, arguments, expected):
        with self.replay(changes) as image:
            there = self.levels(image)
            self.assertEqual(sorted(self.old), sorted(there))
            for level, pixels in there.items():  # all channels are of the same build
                self.assertIn(pixels.tobytes(),
                              [self.old[level].tobytes(), expected[level].tobytes()])
            for entry in info(image)["levels"]:
                if entry["method"] == "NEAREST":
                    for number, channel in enumerate(entry["channels"]):
                        self.assertTrue(channel["valid"])
                        self.assertSamePixels(self.old[entry["level"]][number],
                                              there[entry["level"]][number])
        super().check(changes, arguments, expected)

    def test_inside_the_file(self):
        self.check_image([])

    def test_inside_a_compressed_file(self):
        self.check_image(["COMPRESSED=YES"])


class Clean(Hfa):
    def check_image(self, going, staying):
        write(self.file, self.pixels, "Byte")
        self.assertRan(run("build", self.file, "--levels", "2,4,8", "--method", "nearest"))
        made = self.levels(self.file)
        arguments = ("clean", "--levels", going)
        changes = self.record(*arguments)
        size = os.path.getsize(os.path.join(self.recorded, self.image))
        self.assertLess(size, os.path.getsize(self.file))
        self.check_each(self.states(changes), made, going, staying, size)

    def check(self, changes, made, going, staying, size):
        with self.replay(changes) as image:
            self.assertTold(image)
            self.assertSamePixels(self.pixels, read_pixels(image))
            there = self.levels(image)
            self.assertLessEqual(set(staying), set(there))
            for level, pixels in there.items():
                self.assertSamePixels(made[level], pixels)
            self.assertRan(run("clean", image, "--levels", going))
            self.assertEqual(staying, sorted(self.levels(image)))
            self.assertEqual(staying, self.valid(image))
            # Where nothing was left to clean, the next change of the file gives back the space.
            self.assertRan(run("build", image, "--levels", "8", "--method", "nearest", "--force"))
            more = 4608 if 8 in staying else 3 * 4096 + 4608  # level 8, its nodes
            self.assertLessEqual(os.path.getsize(image), size + more)
            self.assertSamePixels(self.pixels, read_pixels(image))

    def test_the_largest_level(self):
        self.check_image("2", [4, 8])

    def test_the_smaller_levels(self):
        self.check_image("4,8", [2])


if __name__ == "__main__":
    unittest.main()
