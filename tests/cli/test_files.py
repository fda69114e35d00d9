# SPDX-License-Identifier: MIT
"""Building levels and listing them, as a script sees it."""

import json
import os
import resource
import signal
import subprocess
import time
import unittest

from orin_cli import Case, TOOL, contents, environment, run, write_raster


def info(file):
    return json.loads(run("info", "--json", file).stdout)


class Build(Case):
    def setUp(self):
        super().setUp()
        self.file = write_raster(self.path("scene.tif"), 1003, 777, channels=3)

    def levels(self):
        return [level["level"] for level in info(self.file)["levels"]]

    def test_a_line_for_each_level_and_a_summary_when_there_is_no_terminal(self):
        answer = run("build", self.file)
        self.assertRan(answer, 0)
        self.assertEqual(f"{self.file}: level 2 done\n{self.file}: level 4 done\n"
                         f"{self.file}: levels built: 2, 4 (NEAREST, inside the file)\n",
                         answer.stdout)
        self.assertEqual("", answer.stderr)

    def test_a_second_build_has_nothing_to_do(self):
        run("build", self.file, "--levels", "2")
        answer = run("build", self.file, "--levels", "4,2")
        self.assertIn("levels built: 4 (NEAREST, inside the file); already up to date: 2",
                      answer.stdout)
        before = contents(self.file)
        answer = run("build", self.file, "--levels", "2,4")
        self.assertRan(answer, 0)
        self.assertEqual(f"{self.file}: nothing to do; already up to date: 2, 4\n", answer.stdout)
        self.assertEqual(before, contents(self.file))

    def test_a_small_image_needs_no_levels(self):
        small = write_raster(self.path("small.tif"), 200, 100)
        answer = run("build", small)
        self.assertRan(answer, 0)
        self.assertEqual(f"{small}: nothing to do: 200 x 100 pixels need no levels\n",
                         answer.stdout)

    def test_quiet_says_nothing_when_all_is_well(self):
        answer = run("build", self.file, "--quiet")
        self.assertRan(answer, 0)
        self.assertEqual(("", ""), (answer.stdout, answer.stderr))
        self.assertEqual([2, 4], self.levels())

    def test_verbose_tells_source_level_blocks_seconds_and_place(self):
        answer = run("--verbose", "build", self.file)
        self.assertRan(answer, 0)
        for told in (r"level 2: NEAREST from the image, \d+ blocks, \d+\.\d\d s, inside the file",
                     r"level 4: NEAREST from level 2, \d+ blocks, \d+\.\d\d s, inside the file"):
            self.assertRegex(answer.stderr, told)
        self.assertEqual("", run("build", self.file, "--levels", "8").stderr)

    def test_levels_below_two_are_wrong_usage(self):
        answer = run("build", self.file, "--levels", "2,1")
        self.assertRan(answer, 2)
        self.assertIn(f"{self.file}: There is no level 1: levels are reduction factors of 2",
                      answer.stderr)
        self.assertEqual([], self.levels())

    def test_a_level_larger_than_the_image_is_skipped_and_wrong_usage(self):
        answer = run("build", self.file, "--levels", "2,2000")
        self.assertRan(answer, 2)
        self.assertIn("Skipping level 2000: it would be empty (the image has 1003 x 777 pixels).",
                      answer.stderr)
        self.assertEqual([2], self.levels())

    def test_and_nothing_is_built_when_forced(self):
        answer = run("build", self.file, "--levels", "2,2000", "--force")
        self.assertRan(answer, 2)
        self.assertIn("Level 2000 would be empty (the image has 1003 x 777 pixels).",
                      answer.stderr)
        self.assertEqual([], self.levels())

    def test_channels_that_do_not_exist_are_wrong_usage(self):
        for channels in ("4", "0"):
            answer = run("build", self.file, "--channels", channels)
            self.assertRan(answer, 2)
            self.assertIn("channels are 1 to 3", answer.stderr)

    def test_complex_pixels_take_nearest_and_average_only(self):
        file = write_raster(self.path("complex.tif"), 600, 500, type_name="CFloat32")
        answer = run("build", file, "--method", "bilinear")
        self.assertRan(answer, 2)
        self.assertIn("Complex pixels take --method nearest or --method average only.",
                      answer.stderr)
        self.assertIn("--method nearest", answer.stderr)

    def test_force_builds_again(self):
        run("build", self.file)
        answer = run("build", self.file, "--force", "--levels", "4")
        self.assertRan(answer, 0)
        self.assertIn("levels built: 4", answer.stdout)

    def test_one_file_that_fails_does_not_stop_the_others(self):
        missing = self.path("missing.tif")
        answer = run("build", missing, self.file)
        self.assertRan(answer, 1)
        self.assertIn(missing, answer.stderr)
        self.assertIn("levels built: 2, 4", answer.stdout)

    def test_a_side_car_is_named_and_the_image_stays_as_it_is(self):
        before = contents(self.file)
        answer = run("build", self.file, "--external")
        self.assertRan(answer, 0)
        self.assertIn(f"levels built: 2, 4 (NEAREST, in {self.file}.ovr)", answer.stdout)
        self.assertEqual("", answer.stderr)
        self.assertEqual(before, contents(self.file))

    def test_a_side_car_beside_levels_inside_is_worth_a_notice(self):
        run("build", self.file, "--levels", "2")
        answer = run("build", self.file, "--levels", "2,4", "--external")
        self.assertRan(answer, 0)
        self.assertIn(f"{self.file}: Levels stand inside the file (2) and in {self.file}.ovr (4). "
                      "Other programs read those inside only.", answer.stderr)


class ReadOnlyFile(Case):
    def setUp(self):
        super().setUp()
        self.file = write_raster(self.path("scene.tif"), 1003, 777)
        os.chmod(self.file, 0o444)
        os.chmod(self.folder, 0o777)

    def build(self, *arguments):
        """A build by a user who cannot write the file: the superuser could, and stands back."""
        user = {"user": 65534} if os.geteuid() == 0 else {}
        try:
            return subprocess.run([TOOL, "build", self.file, *arguments], capture_output=True,
                                  text=True, env=environment(), timeout=60, check=False, **user)
        except PermissionError:
            self.skipTest("the tool lies where other users cannot run it")

    def test_it_gets_a_side_car(self):
        answer = self.build()
        self.assertRan(answer, 0)
        self.assertIn(f"levels built: 2, 4 (NEAREST, in {self.file}.ovr)", answer.stdout)

    def test_levels_inside_are_refused(self):
        answer = self.build("--internal")
        self.assertRan(answer, 5)
        self.assertIn("scene.tif: cannot be opened for writing: Permission denied.", answer.stderr)
        self.assertIn("--external", answer.stderr)


class Info(Case):
    def setUp(self):
        super().setUp()
        self.file = write_raster(self.path("scene.tif"), 1003, 777, channels=2)

    def test_json_tells_all(self):
        self.assertRan(run("build", self.file, "--levels", "2"), 0)
        self.assertRan(run("build", self.file, "--levels", "4", "--external"), 0)
        answer = info(self.file)
        program = run("--version").stdout.strip()
        valid = [{"channel": channel, "present": True, "valid": True} for channel in (1, 2)]
        self.assertEqual({"name": "TIFF", "description": "TIFF / GeoTIFF"}, answer["format"])
        self.assertEqual((1003, 777), (answer["width"], answer["height"]))
        self.assertEqual([{"channel": channel, "type": "uint8"} for channel in (1, 2)],
                         answer["channels"])
        inside, beside = answer["levels"]
        self.assertEqual({"level": 2, "width": 501, "height": 388, "place": "internal",
                          "file": self.file, "method": "NEAREST", "sourceLevel": 1,
                          "program": program, "state": "current",
                          "staleReason": None, "fingerprint": beside["fingerprint"], "mask": False,
                          "channels": valid}, inside)
        self.assertEqual((False, None), (answer["mask"], answer["alphaChannel"]))
        self.assertRegex(inside["fingerprint"], "^[0-9a-f]{32}$")
        self.assertEqual("current", beside["state"])
        found = [beside[key] for key in ("place", "file", "level", "width", "height")]
        self.assertEqual(["side-car", self.file + ".ovr", 4, 250, 194], found)

    def test_the_table_names_every_level(self):
        run("build", self.file)
        lines = run("info", self.file).stdout.splitlines()
        self.assertEqual(f"{self.file}: 1003 x 777 pixels, channels: 2 (uint8), TIFF / GeoTIFF",
                         lines[0])
        self.assertRegex(lines[2], r"^2 +501 x 388 +inside +NEAREST +1 +yes +Orin Overviews")
        self.assertRegex(lines[3], r"^4 +250 x 194 +inside +NEAREST +2 +yes +Orin Overviews")

    def test_it_writes_nothing_when_size_and_time_tell_all(self):
        before = (os.stat(self.file), sorted(os.listdir(self.folder)))
        run("info", self.file)
        self.assertEqual(before[0].st_mtime_ns, os.stat(self.file).st_mtime_ns)
        self.assertEqual(before[1], sorted(os.listdir(self.folder)))

    def test_output_that_cannot_be_written_is_an_error(self):
        with open("/dev/full", "w", encoding="utf-8") as full:
            answer = subprocess.run([TOOL, "info", self.file], stdout=full, stderr=subprocess.PIPE,
                                    text=True, env=environment(), timeout=60, check=False)
        self.assertEqual(5, answer.returncode)
        self.assertIn("The output cannot be written", answer.stderr)


class Interrupted(Case):
    def interrupt(self, number, *more):
        """A build of a large file that is sent a signal as soon as its first level is done."""
        file = write_raster(self.path("large.tif"), 6000, 6000, channels=3,
                            options=["TILED=YES", "COMPRESS=DEFLATE"])
        build = subprocess.Popen([TOOL, "build", file, *more, "--levels", "2,3,5"],
                                 stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
                                 env=environment())
        self.assertIn("level 2 done", build.stdout.readline())
        build.send_signal(number)
        build.send_signal(number)  # a second one does nothing worse
        started = time.monotonic()
        _, errors = build.communicate(timeout=60)
        self.assertLess(time.monotonic() - started, 30)
        return file, build.returncode, errors

    def test_the_code_is_130_the_finished_levels_stay_and_the_next_build_goes_on(self):
        for number in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP):
            with self.subTest(signal=number):
                file, code, errors = self.interrupt(number)
                self.assertEqual(130, code, errors)
                self.assertIn(f"{file}: Interrupted. Levels finished: 2", errors)
                self.assertIn(2, [level["level"] for level in info(file)["levels"]])
                answer = run("build", file, "--levels", "2,3,5")
                self.assertRan(answer, 0)
                self.assertIn("already up to date: 2", answer.stdout)
                self.assertEqual([2, 3, 5], [level["level"] for level in info(file)["levels"]])

    def test_the_files_after_it_are_left_alone(self):
        other = write_raster(self.path("other.tif"), 600, 600)
        before = contents(other)
        _, code, _ = self.interrupt(signal.SIGINT, other)
        self.assertEqual(130, code)
        self.assertEqual(before, contents(other))


class DiskFull(Case):
    def test_a_file_that_cannot_grow_ends_with_code_five_and_an_intact_image(self):
        file = write_raster(self.path("scene.tif"), 3000, 3000, channels=3)
        before = contents(file)
        limit = len(before) + 1000000

        def no_more():
            resource.setrlimit(resource.RLIMIT_FSIZE, (limit, limit))

        answer = subprocess.run([TOOL, "build", file], capture_output=True, text=True,
                                env=environment(), preexec_fn=no_more, timeout=120, check=False)
        self.assertEqual(5, answer.returncode, answer.stderr)
        self.assertIn("File too large", answer.stderr)
        self.assertIn("still to do: 2, 4", answer.stderr)
        after = contents(file)
        self.assertEqual(before[8:], after[8:len(before)])
        self.assertEqual([], info(file)["levels"])


if __name__ == "__main__":
    unittest.main()
