# SPDX-License-Identifier: MIT
"""Records the changes that the tool makes to files, plays them back up to any point, and lets
single system calls fail."""

import concurrent.futures
import os

import orin_e2e

SHIM = os.environ["ORIN_DISK_SHIM"]
orin_e2e.keep_files_in_memory()


class Change:
    """One recorded system call that changed something: its name, numbers, paths and bytes."""

    def __init__(self, line, stream):
        head, *paths = line.split('"')
        self.name, *numbers = head.split()
        self.numbers = [int(number) for number in numbers]
        self.paths = paths[::2]
        self.data = b""
        if self.name == "pwrite":
            self.data = stream.read(self.numbers[1])
            stream.read(1)

    def apply(self, move):
        """Does the same to the files that `move` names instead of the recorded ones."""
        paths = [move(path) for path in self.paths]
        if self.name == "create":
            os.close(os.open(paths[0], os.O_WRONLY | os.O_CREAT, 0o666))
        elif self.name == "pwrite":
            with open(paths[0], "r+b") as file:
                file.seek(self.numbers[0])
                file.write(self.data)
        elif self.name == "ftruncate":
            os.truncate(paths[0], self.numbers[0])
        elif self.name == "rename":
            os.rename(*paths)
        elif self.name == "unlink":
            os.remove(paths[0])
        elif self.name != "fsync":
            raise ValueError(self.name)


def run(folder, *arguments, log=None, fault=None, calls=None):
    """Runs the tool with the files of `folder` watched. Paths are prefixes as they are given to it.

    fault: "CALL NUMBER REASON", see the shim."""
    extra = {"LD_PRELOAD": SHIM, "DISK_FOLDER": folder + os.sep, "OMP_NUM_THREADS": "1"}
    for name, value in (("DISK_LOG", log), ("DISK_FAULT", fault), ("DISK_CALLS", calls)):
        if value:
            extra[name] = str(value)
    return orin_e2e.run(*arguments, environment=extra)


def check_at_once(case, checks):
    """Makes the checks, functions by what they check, four at once: most of their time goes into
    starting programs. \\returns what those returned that did not fail"""
    answers = {}
    with concurrent.futures.ThreadPoolExecutor(4) as pool:
        started = {what: pool.submit(check) for what, check in checks.items()}
        for what, check in started.items():
            with case.subTest(what):
                answers[what] = check.result()
    return answers


def changes_in(log):
    """The recorded changes, in their order."""
    changes = []
    with open(log, "rb") as stream:
        for line in iter(stream.readline, b""):
            changes.append(Change(line.decode().rstrip("\n"), stream))
    return changes


def calls_in(path):
    """[("pwrite", 17, "7f3a"), ...]: every call, its number from 1 among those of its name, and
    what tells from where in the program it was made."""
    with open(path, encoding="utf-8") as file:
        return [(name, int(number), place) for name, number, place in map(str.split, file)]
