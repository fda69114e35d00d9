# SPDX-License-Identifier: MIT
"""The progress bar, on a terminal that the test plays."""

import fcntl
import os
import pty
import re
import struct
import subprocess
import termios
import unittest

from orin_cli import Case, TOOL, environment, write_raster


class ProgressBar(Case):
    def setUp(self):
        super().setUp()
        self.file = write_raster(self.path("scene.tif"), 6000, 6000, channels=3)

    def on_terminal(self, *arguments, columns=60, **changes):
        """Exit code, standard output, and all that was written to a terminal as standard error."""
        master, slave = pty.openpty()
        fcntl.ioctl(slave, termios.TIOCSWINSZ, struct.pack("HHHH", 24, columns, 0, 0))
        tool = subprocess.Popen([TOOL, "build", self.file, *arguments], stdin=subprocess.DEVNULL,
                                stdout=subprocess.PIPE, stderr=slave, env=environment(**changes))
        os.close(slave)
        seen = b""
        while True:
            try:
                some = os.read(master, 4096)
            except OSError:  # the other end was closed
                break
            if not some:
                break
            seen += some
        os.close(master)
        output, _ = tool.communicate(timeout=120)
        return tool.returncode, output.decode(), seen.decode()

    def test_it_grows_over_the_whole_run_and_is_gone_at_the_end(self):
        code, output, seen = self.on_terminal()
        self.assertEqual(0, code, seen)
        frames = [frame for frame in seen.replace("\x1b[K", "").split("\r") if "%" in frame]
        percents = [int(re.search(r"(\d+)%$", frame).group(1)) for frame in frames]
        self.assertGreaterEqual(len(percents), 1)
        self.assertEqual(sorted(percents), percents)
        levels = [int(re.search(r"scene\.tif: level (\d+) ", frame).group(1)) for frame in frames]
        self.assertEqual(sorted(levels), levels)
        for frame in frames:
            self.assertLess(len(frame), 60)
        self.assertTrue(seen.endswith("\r\x1b[K"), repr(seen[-40:]))
        self.assertEqual(f"{self.file}: levels built: 2, 4, 8, 16, 32 (NEAREST, inside the file)\n",
                         output)

    def test_quiet_draws_none(self):
        code, output, seen = self.on_terminal("--quiet")
        self.assertEqual((0, "", ""), (code, output, seen))

    def test_a_terminal_that_cannot_draw_gets_lines(self):
        code, output, seen = self.on_terminal(TERM="dumb")
        self.assertEqual((0, ""), (code, seen))
        self.assertIn("level 32 done\n", output)


if __name__ == "__main__":
    unittest.main()
