# SPDX-License-Identifier: MIT
"""What the tool prints: suggestions, names that steer terminals, and ends that are not its own."""

import os
import resource
import subprocess
import unittest

from orin_cli import Case, TOOL, environment, run, write_raster


class Suggestions(Case):
    def refuse(self, *arguments):
        answer = run(*arguments)
        self.assertRan(answer, 2)
        return answer.stderr

    def test_the_nearest_known_word_is_named(self):
        self.assertIn("Did you mean --method?", self.refuse("build", "a.tif", "--metod", "mode"))
        self.assertIn("Did you mean average?", self.refuse("build", "a.tif", "--method", "avrage"))
        self.assertIn("Did you mean build?", self.refuse("bulid", "a.tif"))
        self.assertNotIn("Did you mean", self.refuse("build", "a.tif", "--fast"))

    def test_levels_behind_the_file_are_told_their_option(self):
        file = write_raster(self.path("a.tif"), 600, 500)
        problem = self.refuse("build", file, "2", "4", "8")
        self.assertIn("levels are given as --levels 2,4,8", problem)
        self.assertIn("levels are given as --levels 2,4", self.refuse("clean", file, "2,4"))

    def test_a_file_may_be_a_number(self):
        os.chdir(self.folder)
        self.addCleanup(os.chdir, "/")
        write_raster("2", 600, 500)
        self.assertRan(run("build", "2"), 0)


class Names(Case):
    NAME = "a\x1b[31m\x07\norin-overviews: b.tif: levels built\x9b.tif".encode("latin-1")

    def answer(self, *arguments):
        """All bytes that a command on a file of that name prints, and its log."""
        log = self.path("log")
        done = subprocess.run([TOOL, "--log-file", log, *arguments],
                              cwd=self.folder, env=environment(), capture_output=True,
                              timeout=60, check=False)
        with open(log, "rb") as lines:
            return done.stdout, done.stderr, lines.read()

    def test_are_printed_without_what_steers_a_terminal_or_forges_a_line(self):
        file = write_raster(self.path("plain.tif"), 600, 500)
        os.rename(file, os.path.join(self.folder.encode(), self.NAME))
        name = self.NAME
        for arguments in (["build", name], ["build", name, "--external", "--force"],
                          ["info", name], ["clean", name], ["build", name + b"x"],
                          ["info", name + b"x"], ["build", name, "--internal", "--levels", "1"],
                          ["build", name, b"--" + name]):
            for said in self.answer(*arguments):
                self.assertNotIn(b"\x1b", said, arguments)
                self.assertNotIn(b"\x07", said, arguments)
                self.assertNotIn(b"\x9b", said, arguments)
                self.assertNotIn(b"\norin-overviews: b.tif", said, arguments)
        stdout, _, _ = self.answer("info", name)
        self.assertTrue(stdout.startswith(b"a\\x1b[31m\\x07\\norin-overviews"), stdout)


class Ends(Case):
    def setUp(self):
        super().setUp()
        self.file = write_raster(self.path("scene.tif"), 1003, 777)

    def test_a_reader_that_went_away_is_named_and_no_build_is_lost(self):
        for command in (["build"], ["info"]):
            reader, writer = os.pipe()
            os.close(reader)
            answer = subprocess.run([TOOL, *command, self.file], stdout=writer,
                                    stderr=subprocess.PIPE, text=True, env=environment(),
                                    timeout=60, check=False)
            os.close(writer)
            self.assertEqual(5, answer.returncode, answer.stderr)
            self.assertIn("The output cannot be written: Broken pipe.", answer.stderr)
        self.assertIn("already up to date: 2, 4", run("build", self.file).stdout)

    def test_a_user_without_threads_is_told_what_to_do(self):
        os.chmod(self.folder, 0o777)
        os.chmod(self.file, 0o666)

        def alone():
            resource.setrlimit(resource.RLIMIT_NPROC, (1, 1))
            if os.geteuid() == 0:
                os.setgroups([])
                os.setgid(65534)
                os.setuid(65534)

        try:
            answer = subprocess.run([TOOL, "build", self.file], capture_output=True, text=True,
                                    env=environment(OMP_NUM_THREADS=2), timeout=60, check=False,
                                    preexec_fn=alone)
        except PermissionError:
            self.skipTest("the tool lies where other users cannot run it")
        self.assertEqual(5, answer.returncode, answer.stderr)
        self.assertIn(f"{self.file}: The system allows no more threads.", answer.stderr)
        self.assertRan(run("build", self.file), 0)


if __name__ == "__main__":
    unittest.main()
