# SPDX-License-Identifier: MIT
"""Every system call of a build fails once, in every way that it can: the tool says which file and
why, and ends with an error; the image is intact, no level lies, and the next run finishes."""

import errno
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
PASSED_OVER = ("short", errno.EINTR, errno.ENOLCK)  # the work goes on all the same


class Faults(Case):
    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((1, 40, 50), numpy.uint8, 8)
        self.original = os.path.join(self.folder, "original")
        self.tried = os.path.join(self.folder, "tried")
        os.mkdir(self.original)
        self.image = os.path.join(self.tried, "image.tif")
        write_tiff(os.path.join(self.original, "image.tif"), self.pixels, "Byte",
                   ["TILED=YES", "BLOCKXSIZE=16", "BLOCKYSIZE=16"])

    def start_again(self):
        shutil.rmtree(self.tried, ignore_errors=True)
        shutil.copytree(self.original, self.tried)

    def levels(self):
        return {50 // columns: read_pixels(self.image, index)
                for index, (columns, _) in enumerate(overview_sizes(self.image))}

    def valid(self):
        return {entry["level"] for entry in info(self.image)["levels"]
                if all(channel["valid"] for channel in entry["channels"])}

    def undisturbed(self, arguments):
        """How often a run makes each call, and the levels that it ends with."""
        self.start_again()
        count = self.path("count")
        self.assertRan(disklog.run(self.tried, arguments[0], self.image, *arguments[1:],
                                   count=count))
        return disklog.counts_in(count), self.levels()

    def check(self, arguments, fault, expected):
        """One run with one fault, then one without. `expected`: the levels at the end."""
        self.start_again()
        call, _, reason = fault.split()
        answer = disklog.run(self.tried, arguments[0], self.image, *arguments[1:], fault=fault)
        self.assertSamePixels(self.pixels, read_pixels(self.image))
        levels = self.levels()
        self.assertIn(answer.returncode, (0, 4, 5), answer.stderr)
        if answer.returncode == 0:
            self.assertEqual(sorted(expected), sorted(levels))
        else:
            self.assertIn(f"orin-overviews: {self.image}: ", answer.stderr)
            # Of a file that it cannot open the library says no more than that it built nothing.
            is_opening = call in ("open", "pread") and "could not be built" in answer.stderr
            self.assertIn("built" if is_opening else os.strerror(int(reason)), answer.stderr)
        for level in self.valid() if expected else ():
            self.assertSamePixels(expected[level], levels[level])
        self.assertRan(run(arguments[0], self.image, *arguments[1:]))
        self.assertSamePixels(self.pixels, read_pixels(self.image))
        self.assertEqual(sorted(expected), sorted(self.levels()))
        for level, pixels in expected.items():
            self.assertSamePixels(pixels, self.levels()[level])
        return answer.returncode

    def check_all(self, *arguments, calls=tuple(FAULTS)):
        counts, expected = self.undisturbed(arguments)
        failed = set()
        for call in calls:
            reasons = FAULTS[call]
            for number in range(1, counts[call] + 1):
                # What only reads is called too often for everything: it takes turns.
                is_reading = call in ("open", "pread", "close")
                for reason in reasons[number % len(reasons):][:1] if is_reading else reasons:
                    fault = f"{call} {number} {reason}"
                    with self.subTest(fault):
                        code = self.check(arguments, fault, expected)
                        if reason in PASSED_OVER:
                            self.assertEqual(0, code)
                        if code:
                            failed.add(call)
        return failed

    def test_of_a_build_inside_the_file(self):
        failed = self.check_all("build", "--levels", "2,4")
        self.assertLessEqual({"pwrite", "fsync", "open", "flock"}, failed)

    def test_of_a_build_beside_the_file(self):
        failed = self.check_all("build", "--levels", "2", "--external")
        self.assertLessEqual({"pwrite", "fsync", "ftruncate", "rename", "flock"}, failed)

    def test_of_a_masked_build_of_two_channels_beside_the_file(self):
        image = os.path.join(self.original, "image.tif")
        valid = disc(50, 40)
        self.pixels = random_pixels((2, 40, 50), numpy.uint8, 8) * valid
        write_tiff(image, self.pixels, "Byte", ["TILED=YES", "BLOCKXSIZE=16", "BLOCKYSIZE=16"])
        write_mask_beside(image, valid)
        writing = ("pwrite", "fsync", "ftruncate", "rename", "unlink")
        failed = self.check_all("build", "--levels", "2", "--external", calls=writing)
        self.assertLessEqual({"pwrite", "fsync", "ftruncate", "rename"}, failed)

    def test_of_removing_levels(self):
        self.assertRan(run("build", os.path.join(self.original, "image.tif"), "--levels", "2,4"))
        failed = self.check_all("clean")
        self.assertLessEqual({"pwrite", "fsync", "ftruncate", "open", "flock"}, failed)


if __name__ == "__main__":
    unittest.main()
