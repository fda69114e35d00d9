# SPDX-License-Identifier: MIT
"""Runs the tool on files that mean harm: it must end by itself, soon, and in little memory."""

import os
import resource
import subprocess
import threading

TOOL = os.environ["ORIN_TOOL"]
IS_SANITIZED = os.environ.get("ORIN_SANITIZE", "") != ""   # takes several times the memory and time
MOST_MEMORY = 256 << 10   # KiB
INFO_SECONDS, BUILD_SECONDS = 30, 120   # far above what they take, also on a busy machine
SOME_FAILED, NOT_UP_TO_DATE, CANNOT_OPEN, CANNOT_BUILD = 1, 3, 4, 5


class Ended:
    """How a run ended: exit code (negative: by that signal), text, and peak memory in KiB.

    The system counts what the starting process had before; so that must stay below the limit.
    """

    def __init__(self, code, out, error, memory):
        self.code, self.out, self.error, self.memory = code, out, error, memory


def run(*arguments, seconds, address_space=None):
    """The tool's run, killed (and so ended by a signal) when it takes longer than that.

    \\param address_space  bytes that it may have; as many as it wants when it is left out
    """
    def limit():
        resource.setrlimit(resource.RLIMIT_AS, (address_space, address_space))

    environment = dict(os.environ, ORIN_PREFERENCES="/dev/null", LC_ALL="C")
    process = subprocess.Popen([TOOL, *map(str, arguments)], stdin=subprocess.DEVNULL,
                               stdout=subprocess.PIPE, stderr=subprocess.PIPE, env=environment,
                               preexec_fn=limit if address_space else None)
    timer = threading.Timer(seconds * (5 if IS_SANITIZED else 1), process.kill)
    timer.start()
    errors = []
    reader = threading.Thread(target=lambda: errors.append(process.stderr.read()))
    reader.start()
    out = process.stdout.read()
    reader.join()
    _, status, usage = os.wait4(process.pid, 0)
    own = resource.getrusage(resource.RUSAGE_SELF).ru_maxrss
    assert own < MOST_MEMORY, "the test takes too much memory to see what the tool takes"
    timer.cancel()
    process.returncode = os.waitstatus_to_exitcode(status)
    process.stdout.close()
    process.stderr.close()
    return Ended(process.returncode, out.decode(errors="replace"),
                 errors[0].decode(errors="replace"), usage.ru_maxrss)


def fault(ended, path, refused):
    """What is wrong with the end of a run on `path`, or None.

    \\param refused  the exit code of a refusal, which needs at least one line that names the file
    """
    if ended.code < 0:
        return f"ended by signal {-ended.code}"
    if ended.memory > MOST_MEMORY and not IS_SANITIZED:
        return f"took {ended.memory >> 10} MiB"
    if ended.code in (0, NOT_UP_TO_DATE):
        return None
    if ended.code != refused:
        return f"exit code {ended.code}: {ended.error}"
    lines = ended.error.splitlines()
    if not lines or not all(str(path) in line or line.startswith("Delete") for line in lines):
        return f"refused without saying which file: {ended.error!r}"
    if refused == CANNOT_OPEN and len(lines) > 1:
        return f"refused in {len(lines)} lines: {ended.error!r}"
    return None
