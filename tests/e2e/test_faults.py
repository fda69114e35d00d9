# SPDX-License-Identifier: MIT
"""Every system call of a build fails once, in every way that it can: the tool says which file and
why, and ends with an error; the image is intact, no level lies, and the next run finishes."""

import errno
import functools
import os
import shutil
import unittest

import numpy

import disklog
from mask_case import write_mask_beside
from mask_twin import disc
from orin_e2e import Case, info, overview_sizes, random_pixels, read_pixels, run, write_tiff

FAULTS = {
    "pwrite": (errno.ENOSPC, errno.EIO, "short", errno.EINTR),
    "fsync": (errno.EIO,),
    "ftruncate": (errno.EIO,),
    "open": (errno.EACCES, errno.EINTR, errno.EMFILE),
    "pread": (errno.EIO, errno.EINTR),
    "rename": (errno.EACCES, errno.EINVAL),
    "unlink": (errno.EACCES,),
    "flock": (errno.EIO, errno.ENOLCK),
    "close": (errno.EIO,),
}
READING = ("open", "pread", "close")
PASSED_OVER = ("short", errno.EINTR, errno.ENOLCK)  # the work goes on all the same


class Faults(Case):
    def setUp(self):
        super().setUp()
        self.method = None  # any
        self.pixels = random_pixels((1, 40, 50), numpy.uint8, 8)
        self.original = os.path.join(self.folder, "original")
        os.mkdir(self.original)
        write_tiff(os.path.join(self.original, "image.tif"), self.pixels, "Byte",
                   ["TILED=YES", "BLOCKXSIZE=16", "BLOCKYSIZE=16"])

    def copy(self, name):
        """A folder with a copy of the original; the image in it."""
        folder = self.path(name)
        shutil.copytree(self.original, folder)
        return folder, os.path.join(folder, "image.tif")

    @staticmethod
    def levels(image):
        return {50 // columns: read_pixels(image, index)
                for index, (columns, _) in enumerate(overview_sizes(image))}

    def valid(self, image):
        """Those of the run: the ones that it rebuilds may be valid as well."""
        return {entry["level"] for entry in info(image)["levels"]
                if self.method in (None, entry["method"])
                and all(channel["valid"] for channel in entry["channels"])}

    def undisturbed(self, arguments):
        """The calls that a run makes, and the levels that it ends with."""
        folder, image = self.copy("undisturbed")
        calls = self.path("calls")
        self.assertRan(disklog.run(folder, arguments[0], image, *arguments[1:], calls=calls))
        return disklog.calls_in(calls), self.levels(image)

    def check(self, arguments, fault, expected):
        """One run with one fault, then one without. `expected`: the levels at the end.

        \\returns the exit code of the first"""
        folder, image = self.copy(fault.replace(" ", "-"))
        call, _, reason = fault.split()
        answer = disklog.run(folder, arguments[0], image, *arguments[1:], fault=fault)
        self.assertSamePixels(self.pixels, read_pixels(image))
        levels = self.levels(image)
        self.assertIn(answer.returncode, (0, 4, 5), answer.stderr)
        if answer.returncode == 0:
            self.assertEqual(sorted(expected), sorted(levels))
        else:
            self.assertIn(f"orin-overviews: {image}: ", answer.stderr)
            # Of a file that it cannot open the library says no more than that it built nothing.
            is_opening = call in ("open", "pread") and "could not be built" in answer.stderr
            self.assertIn("built" if is_opening else os.strerror(int(reason)), answer.stderr)
        for level in self.valid(image) if expected else ():
            self.assertSamePixels(expected[level], levels[level])
        self.assertRan(disklog.run(folder, arguments[0], image, *arguments[1:]))
        self.assertSamePixels(self.pixels, read_pixels(image))
        finished = self.levels(image)
        self.assertEqual(sorted(expected), sorted(finished))
        for level, pixels in expected.items():
            self.assertSamePixels(pixels, finished[level])
        shutil.rmtree(folder)
        if reason in map(str, PASSED_OVER):
            self.assertEqual(0, answer.returncode)
        return answer.returncode

    @staticmethod
    def faults(calls):
        """All that are tried. Every call that changes something fails, and for all reasons the
        first and the last one from each place in the program. Of calls that only read no others
        fail, and the reasons take turns."""
        places = {}
        for call, number, place in calls:
            places.setdefault((call, place), []).append(number)
        ends = {(call, numbers[end]) for (call, _), numbers in places.items() for end in (0, -1)}
        turn = 0
        for call, number, _ in calls:
            reasons = FAULTS.get(call, ())
            is_end = (call, number) in ends
            if call in READING:
                turn += is_end
                reasons = reasons[turn % len(reasons):][:is_end]
            elif not is_end:
                reasons = reasons[:1]
            for reason in reasons:
                yield f"{call} {number} {reason}"

    def check_all(self, *arguments):
        calls, expected = self.undisturbed(arguments)
        codes = disklog.check_at_once(self, {
            fault: functools.partial(self.check, arguments, fault, expected)
            for fault in self.faults(calls)})
        return {fault.split()[0] for fault, code in codes.items() if code}

    def test_of_a_build_inside_the_file(self):
        failed = self.check_all("build", "--levels", "2,4")
        self.assertLessEqual({"pwrite", "fsync", "open", "flock"}, failed)

    def test_of_a_build_beside_the_file(self):
        failed = self.check_all("build", "--levels", "2", "--external")
        # The file is new: nothing is cut off.
        self.assertLessEqual({"open", "pwrite", "fsync", "rename", "flock"}, failed)
        self.assertNotIn("ftruncate", failed)

    def test_of_a_rebuild_whose_level_moves_twice(self):
        """It fits nowhere: it goes to the file's end and comes down again."""
        self.method = "AVERAGE"
        self.pixels[:, ::2, ::2] = 7  # all that nearest neighbour takes
        image = os.path.join(self.original, "image.tif")
        write_tiff(image, self.pixels, "Byte", ["COMPRESS=DEFLATE"])
        self.assertRan(run("build", image, "--levels", "2", "--method", "nearest"))
        failed = self.check_all("build", "--levels", "2", "--method", "average", "--force")
        self.assertLessEqual({"pwrite", "fsync", "open", "flock"}, failed)

    def test_of_a_masked_build_of_two_channels_beside_the_file(self):
        image = os.path.join(self.original, "image.tif")
        valid = disc(50, 40)
        self.pixels = random_pixels((2, 40, 50), numpy.uint8, 8) * valid
        write_tiff(image, self.pixels, "Byte", ["TILED=YES", "BLOCKXSIZE=16", "BLOCKYSIZE=16"])
        write_mask_beside(image, valid)
        failed = self.check_all("build", "--levels", "2", "--external")
        self.assertLessEqual({"open", "pwrite", "fsync", "rename"}, failed)

    def test_of_removing_levels(self):
        self.assertRan(run("build", os.path.join(self.original, "image.tif"), "--levels", "2,4"))
        failed = self.check_all("clean")
        self.assertLessEqual({"pwrite", "fsync", "ftruncate", "open", "flock"}, failed)


if __name__ == "__main__":
    unittest.main()
