# SPDX-License-Identifier: MIT
"""The command line: what it refuses, and how it says so."""

import os
import unittest

from orin_cli import Case, run


class WrongUsage(Case):
    def refuse(self, *arguments):
        """Standard error of a command line that is refused before any file is touched."""
        answer = run(*arguments)
        self.assertRan(answer, 2)
        self.assertEqual("", answer.stdout)
        self.assertTrue(answer.stderr.startswith("orin-overviews: "), answer.stderr)
        self.assertIn("Try: orin-overviews", answer.stderr)
        return answer.stderr

    def test_nothing_asked(self):
        self.assertIn("a sub-command is needed", self.refuse())
        self.assertIn("a FILE is needed", self.refuse("build"))
        self.assertIn("a FILE is needed", self.refuse("info"))

    def test_an_unknown_method_is_answered_with_the_methods_there_are(self):
        problem = self.refuse("build", "a.tif", "--method", "cub")
        for method in ("nearest", "average", "mode", "bilinear", "bicubic"):
            self.assertIn(method, problem)

    def test_options_that_exclude_each_other(self):
        problem = self.refuse("build", "a.tif", "--internal", "--external")
        self.assertIn("--internal: cannot be used together with --external", problem)
        problem = self.refuse("build", "a.tif", "--levels", "2", "--factor", "2")
        self.assertIn("--levels: cannot be used together with --factor", problem)

    def test_values_that_are_none(self):
        self.assertIn('not "4"', self.refuse("build", "a.tif", "--factor", "4"))
        self.assertIn('"2;4"', self.refuse("build", "a.tif", "--levels", "2;4"))
        self.assertIn('"5-3"', self.refuse("build", "a.tif", "--channels", "5-3"))
        self.assertIn("--levels", self.refuse("build", "a.tif", "--levels"))

    def test_unknown_arguments_are_named(self):
        self.assertIn("--fast", self.refuse("build", "--fast", "a.tif"))
        self.assertIn("b.tif", self.refuse("info", "a.tif", "b.tif"))


class Answers(Case):
    def test_help_names_every_option(self):
        answer = run("build", "--help")
        self.assertRan(answer, 0)
        for option in ("--levels", "--factor", "--method", "--channels", "--internal", "--external",
                       "--co", "--force", "--quiet"):
            self.assertIn(option, answer.stdout)
        self.assertEqual("", answer.stderr)
        self.assertIn("--json", run("info", "--help").stdout)
        everywhere = run("--help").stdout
        for option in ("--levels", "--internal", "--external", "--quiet"):
            self.assertIn(option, run("clean", "--help").stdout)
        for word in ("build", "info", "clean", "--verbose", "--log-file", "--version"):
            self.assertIn(word, everywhere)

    def test_version(self):
        answer = run("--version")
        self.assertRan(answer, 0)
        self.assertRegex(answer.stdout, r"^Orin Overviews \d+\.\d+\.\d+\n$")


class FilesThatCannotBeOpened(Case):
    def test_the_reason_is_given_and_the_code_is_four(self):
        text = self.path("notes.txt", "no raster\n")
        missing = self.path("missing.tif")
        for file, reason in ((missing, "No such file or directory"),
                             (self.folder, "is a directory"), (text, "is not a raster file")):
            for command in ("build", "info"):
                with self.subTest(file=file, command=command):
                    answer = run(command, file)
                    self.assertRan(answer, 4)
                    self.assertEqual("", answer.stdout)
                    self.assertTrue(answer.stderr.startswith(f"orin-overviews: {file}: "),
                                    answer.stderr)
                    self.assertIn(reason, answer.stderr)
                    self.assertEqual(1, answer.stderr.count(f"{file}: "))

    def test_each_of_several_files_is_reported(self):
        first, second = self.path("one.tif"), self.path("two.tif")
        answer = run("build", first, second)
        self.assertRan(answer, 1)
        self.assertIn(first, answer.stderr)
        self.assertIn(second, answer.stderr)


class LogFile(Case):
    def test_messages_go_there_too_with_their_time(self):
        log = self.path("orin.log")
        answer = run("build", self.path("missing.tif"), "--log-file", log)
        self.assertRan(answer, 4)
        with open(log, encoding="utf-8") as file:
            self.assertRegex(file.read(),
                             r"^\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d\.\d{3}\S+ error: .*missing\.tif")

    def test_a_log_file_that_cannot_be_written_is_an_error(self):
        answer = run("--log-file", self.folder, "info", "a.tif")
        self.assertRan(answer, 5)
        self.assertIn(f"{self.folder}: the log file cannot be written", answer.stderr)
        self.assertTrue(os.path.isdir(self.folder))


if __name__ == "__main__":
    unittest.main()
