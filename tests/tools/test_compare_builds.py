# SPDX-License-Identifier: MIT
"""The comparison of two builds of the tool passes equal ones and finds a planted difference."""
import os
import pathlib
import subprocess
import tempfile
import unittest

SCRIPT = pathlib.Path(os.environ["ORIN_SCRIPTS"]) / "compare-builds"
TOOL = os.environ["ORIN_TOOL"]


class CompareBuilds(unittest.TestCase):
    def compare(self, new):
        done = subprocess.run([SCRIPT, TOOL, new, "--only", "palette"], capture_output=True,
                              text=True, check=False)
        self.assertEqual("", done.stderr)
        return done.returncode, done.stdout

    def other_tool(self, *lines):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        path = pathlib.Path(folder.name) / "tool"
        path.write_text("\n".join(["#!/bin/sh", *lines]) + "\n")
        path.chmod(0o755)
        return path

    def test_a_build_equals_itself(self):
        code, output = self.compare(TOOL)
        self.assertEqual(0, code, output)
        self.assertIn("0 differences", output)
        self.assertNotIn(" 0 successful", output)

    def test_one_byte_more_is_found(self):
        tool = self.other_tool(f'"{TOOL}" "$@"; code=$?', 'printf x >> "$2"', "exit $code")
        code, output = self.compare(tool)
        self.assertEqual(1, code, output)
        self.assertIn("step 1", output)
        self.assertIn("bytes, differ from byte", output)

    def test_another_exit_code_is_found(self):
        code, output = self.compare(self.other_tool(f'"{TOOL}" "$@"', "exit 7"))
        self.assertEqual(1, code, output)
        self.assertIn("exit codes 0 and 7", output)


if __name__ == "__main__":
    unittest.main()
