# SPDX-License-Identifier: MIT
"""How levels are stored: what --co refuses, and how it says so."""

import os
import unittest

from orin_cli import Case, contents, run, write_raster


class WrongUsage(Case):
    def refuse(self, *options):
        """The problem with `--co` options, found before any file is looked at."""
        arguments = [argument for option in options for argument in ("--co", option)]
        answer = run("build", "a.tif", *arguments)
        self.assertRan(answer, 2)
        self.assertEqual("", answer.stdout)
        self.assertTrue(answer.stderr.startswith("orin-overviews: --co: "), answer.stderr)
        self.assertIn("Try: orin-overviews build --help", answer.stderr)
        return answer.stderr

    def test_an_unknown_key_is_answered_with_the_keys_there_are(self):
        for option in ("BLOCKSIZE=256", "COMPRESS", "=LZW"):
            problem = self.refuse(option)
            self.assertIn(f'"{option}"', problem)
            for key in ("COMPRESS=", "PREDICTOR=", "TILE=", "LEVEL=", "QUALITY=", "BIGTIFF="):
                self.assertIn(key, problem)

    def test_a_wrong_value_is_answered_with_the_right_ones(self):
        self.assertIn("NONE, DEFLATE, LZW, ZSTD", self.refuse("COMPRESS=ZIP"))
        self.assertIn("1, 2, 3, NO, STANDARD, FLOAT", self.refuse("PREDICTOR=4"))
        self.assertIn("YES, NO, IF_NEEDED, IF_SAFER", self.refuse("BIGTIFF=MAYBE"))
        self.assertIn("multiple of 16", self.refuse("TILE=100"))
        self.assertIn("from 1 to 22", self.refuse("LEVEL=23"))
        self.assertIn("from 1 to 100", self.refuse("QUALITY=0"))

    def test_options_that_contradict_each_other(self):
        self.assertIn("LEVEL", self.refuse("COMPRESS=LZW", "LEVEL=6"))
        self.assertIn("QUALITY", self.refuse("QUALITY=6", "COMPRESS=ZSTD"))
        self.assertIn("PREDICTOR", self.refuse("COMPRESS=JPEG", "PREDICTOR=2"))

    def test_part_of_a_level_is_not_stored_again_in_another_form(self):
        answer = run("build", "a.tif", "--force", "--channels", "1", "--co", "COMPRESS=LZW")
        self.assertRan(answer, 2)
        self.assertIn("--co: cannot be used together with --force and --channels", answer.stderr)

    def test_one_option_takes_one_value_and_the_file_may_follow(self):
        file = write_raster(self.path("scene.tif"), 600, 500)
        self.assertRan(run("build", "--co", "COMPRESS=LZW", "--co", "TILE=64", file), 0)
        self.assertRan(run("build", file, "--co"), 2)


class OptionsThatDoNotFit(Case):
    def test_the_file_and_the_option_are_named_and_nothing_is_written(self):
        file = write_raster(self.path("scene.tif"), 600, 500, 2, "UInt16")
        before = contents(file)
        for options, word in ((["COMPRESS=JPEG"], "COMPRESS=JPEG"),
                              (["COMPRESS=WEBP"], "COMPRESS=WEBP"),
                              (["COMPRESS=LZW", "PREDICTOR=3"], "PREDICTOR=3"),
                              (["QUALITY=80"], "QUALITY=80"), (["LEVEL=9"], "LEVEL=9")):
            for place in ("--internal", "--external"):
                with self.subTest(options=options, place=place):
                    arguments = [part for option in options for part in ("--co", option)]
                    answer = run("build", file, place, *arguments)
                    self.assertRan(answer, 2)
                    self.assertTrue(answer.stderr.startswith(f"orin-overviews: {file}"))
                    self.assertIn(f"{word} cannot be used", answer.stderr)
                    self.assertEqual(before, contents(file))
                    self.assertEqual(["scene.tif"], os.listdir(self.folder))


if __name__ == "__main__":
    unittest.main()
