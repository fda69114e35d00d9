# SPDX-License-Identifier: MIT
"""Names beside an image that somebody else has taken: nothing is written through a link, and what
is made is for the eyes of those who may read the image."""

import os
import shutil
import stat
import unittest

import numpy

from orin_e2e import Case, info, keep_files_in_memory, nearest, random_pixels, read_pixels, run, \
    write_tiff

keep_files_in_memory()
NAMES = (".ovr", ".ovr.partial")
NOBODY = 65534


def mode_of(path):
    return stat.S_IMODE(os.stat(path).st_mode)


class Planted(Case):
    def setUp(self):
        super().setUp()
        self.shared = self.path("shared")
        self.private = self.path("private")
        os.mkdir(self.shared)
        os.mkdir(self.private)
        self.file = os.path.join(self.shared, "image.tif")
        self.pixels = random_pixels((2, 90, 120), numpy.uint8, 3)
        write_tiff(self.file, self.pixels, "Byte", ["TILED=YES", "BLOCKXSIZE=32", "BLOCKYSIZE=32"])
        self.victims = {}
        for name, content in (("zeros", bytes(128) + b"a disk image, for instance"),
                              ("empty", b""), ("side-car", self.side_car())):
            self.victims[name] = os.path.join(self.private, name)
            with open(self.victims[name], "wb") as file:
                file.write(content)

    def side_car(self):
        """Of another build: levels 2 and 4."""
        other = self.path("other.tif")
        shutil.copy(self.file, other)
        self.assertRan(run("build", other, "--external", "--levels", "2,4"))
        with open(other + ".ovr", "rb") as file:
            return file.read()

    def state(self):
        """All that somebody else's files are: what stands beside the image, what links lead to."""
        state = {}
        for folder in (self.shared, self.private):
            for name in os.listdir(folder):
                path = os.path.join(folder, name)
                status = os.lstat(path)
                content = None
                if stat.S_ISREG(status.st_mode):
                    with open(path, "rb") as file:
                        content = file.read()
                elif stat.S_ISLNK(status.st_mode):
                    content = os.readlink(path)
                elif stat.S_ISDIR(status.st_mode):
                    content = os.listdir(path)
                state[path] = (status.st_mode, status.st_uid, status.st_nlink, status.st_ino,
                               status.st_mtime_ns, content)
        return state

    def check_untouched(self, plant):
        """With `plant` in the place of each name no command changes anything but its own files, and
        the build says which name is in its way."""
        for extension in NAMES:
            path = self.file + extension
            with self.subTest(extension=extension):
                plant(path)
                before = self.state()
                for arguments in (("build", "--external", "--levels", "2,4,8"),
                                  ("build", "--external", "--levels", "2,4", "--force"),
                                  ("clean", "--levels", "2"), ("clean",)):
                    answer = run(arguments[0], self.file, *arguments[1:])
                    self.assertEqual(before, self.state(), (arguments, answer.stderr))
                    if arguments[0] == "build":
                        self.assertIn(answer.returncode, (4, 5), answer.stderr)
                        self.assertIn(f"{path}: ", answer.stderr)
                        self.assertRegex(answer.stderr, r"(Delete it|Delete the side-car), or move")
                run("info", self.file)
                self.assertEqual(before, self.state())
                self.take_away(path)
                self.assertRan(run("build", self.file, "--external", "--levels", "2"))
                self.assertSamePixels(nearest(self.pixels, 1, 2, (120, 90)),
                                      read_pixels(self.file, 0))
                os.remove(self.file + ".ovr")

    @staticmethod
    def take_away(path):
        if os.path.isdir(path) and not os.path.islink(path):
            shutil.rmtree(path)
        else:
            os.remove(path)

    def test_symbolic_links_are_not_written_through(self):
        for name, victim in self.victims.items():
            with self.subTest(victim=name):
                self.check_untouched(lambda path, victim=victim: os.symlink(victim, path))

    def test_hard_links_are_not_written_through(self):
        for name, victim in self.victims.items():
            with self.subTest(victim=name):
                self.check_untouched(lambda path, victim=victim: os.link(victim, path))

    def test_a_link_that_leads_nowhere_makes_nothing_there(self):
        self.check_untouched(lambda path: os.symlink(os.path.join(self.private, "new"), path))

    def test_a_link_to_a_folder_or_to_itself_is_refused(self):
        self.check_untouched(lambda path: os.symlink(self.private, path))
        self.check_untouched(lambda path: os.symlink(os.path.basename(path), path))

    def test_a_folder_is_refused(self):
        self.check_untouched(os.mkdir)

    def test_a_pipe_is_refused_and_not_waited_for(self):
        self.check_untouched(os.mkfifo)

    def test_files_of_others_who_may_not_read_the_image_are_refused(self):
        if os.geteuid() != 0:
            self.skipTest("only the superuser can make files of others")
        os.chmod(self.file, 0o600)
        for name, victim in self.victims.items():
            def plant(path, victim=victim):
                shutil.copy(victim, path)
                os.chown(path, NOBODY, NOBODY)
            if name == "side-car":
                self.check_untouched(plant)
                continue
            with self.subTest(victim=name):
                plant(self.file + ".ovr.partial")
                before = self.state()
                self.assertRan(run("build", self.file, "--external", "--levels", "2"), 5)
                self.assertEqual(before, self.state())
                os.remove(self.file + ".ovr.partial")

    def test_a_side_car_of_others_who_may_read_the_image_gets_more_levels(self):
        if os.geteuid() != 0:
            self.skipTest("only the superuser can make files of others")
        os.chmod(self.file, 0o644)
        self.assertRan(run("build", self.file, "--external", "--levels", "2"))
        os.chown(self.file + ".ovr", NOBODY, NOBODY)
        self.assertRan(run("build", self.file, "--external", "--levels", "4"))
        self.assertEqual([2, 4], [level["level"] for level in info(self.file)["levels"]])


class Access(Case):
    """Of a side-car while it is made and afterwards: that of its image."""

    def setUp(self):
        super().setUp()
        self.file = self.path("image.tif")
        write_tiff(self.file, random_pixels((2, 90, 120), numpy.uint8, 3), "Byte")
        self.build = ("build", self.file, "--external", "--levels", "2")

    def check(self, mode, expected, mask=0o022):
        os.chmod(self.file, mode)
        self.assertRan(run(*self.build, umask=mask))
        self.assertEqual(oct(expected), oct(mode_of(self.file + ".ovr")))
        os.remove(self.file + ".ovr")

    def test_is_the_images_whatever_the_mask_of_the_process(self):
        for mode in (0o600, 0o640, 0o644, 0o660, 0o664, 0o666, 0o604):
            with self.subTest(mode=oct(mode)):
                self.check(mode, mode)
                self.check(mode, mode, 0o077)

    def test_lets_its_owner_write_and_nobody_run_it(self):
        self.check(0o755, 0o644)
        if os.geteuid() == 0:  # others cannot build beside what they cannot read
            self.check(0o444, 0o644)
            self.check(0o000, 0o600)

    def test_is_not_widened_by_a_file_that_a_killed_build_left(self):
        os.chmod(self.file, 0o600)
        with open(self.file + ".ovr.partial", "wb") as left:
            left.write(bytes(200))
            os.chmod(left.name, 0o666)
            self.assertRan(run(*self.build))
            self.assertEqual(0o600, mode_of(self.file + ".ovr"))
            self.assertNotEqual(os.fstat(left.fileno()).st_ino,
                                os.stat(self.file + ".ovr").st_ino)

    def test_has_the_images_group_or_none(self):
        if os.geteuid() != 0:
            self.skipTest("only the superuser can give files to any group")
        os.chmod(self.folder, 0o777)
        os.chown(self.file, -1, 12345)
        for mode in (0o640, 0o664):
            os.chmod(self.file, mode)
            self.assertRan(run(*self.build))
            made = os.stat(self.file + ".ovr")
            self.assertEqual((12345, mode), (made.st_gid, stat.S_IMODE(made.st_mode)))
            os.remove(self.file + ".ovr")
        os.chmod(self.file, 0o664)
        self.assertRan(self.run_as_nobody())
        made = os.stat(self.file + ".ovr")
        self.assertEqual(NOBODY, made.st_gid)
        self.assertEqual(oct(0o604), oct(stat.S_IMODE(made.st_mode)))

    def run_as_nobody(self):
        """The build by somebody who does not belong to the image's group."""
        tool = self.path("tool")
        shutil.copy(os.environ["ORIN_TOOL"], tool)
        os.chmod(tool, 0o755)
        import subprocess
        return subprocess.run([tool, *self.build], capture_output=True, text=True, user=NOBODY,
                              group=NOBODY, extra_groups=[], timeout=60, check=False,
                              env=dict(os.environ, ORIN_PREFERENCES="/dev/null", LC_ALL="C"))


if __name__ == "__main__":
    unittest.main()
