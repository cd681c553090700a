"""zrmctl run by a test, on a pipe or on a terminal."""

import fcntl
import os
import pty
import struct
import subprocess
import termios
from pathlib import Path

from conftest import PATIENCE, PROGRAM

ZRMCTL = str(Path(PROGRAM).with_name("zrmctl"))


def environment(**more):
    clean = {k: v for k, v in os.environ.items() if not k.startswith("ZRM_")}
    for name in ("COLUMNS", "NO_COLOR"):
        clean.pop(name, None)
    return {**clean, "LC_ALL": "C.UTF-8", "TERM": "xterm", **more}


def run(arguments, width=None, **variables):
    """(status, standard output, standard error) of zrmctl, on a terminal of that width or not."""
    if width is None:
        done = subprocess.run(
            [ZRMCTL, *arguments],
            stdin=subprocess.DEVNULL,
            capture_output=True,
            env=environment(**variables),
            timeout=PATIENCE,
        )
        return done.returncode, done.stdout.decode(), done.stderr.decode()
    ours, its = pty.openpty()
    fcntl.ioctl(its, termios.TIOCSWINSZ, struct.pack("HHHH", 24, width, 0, 0))
    with subprocess.Popen(
        [ZRMCTL, *arguments],
        stdin=subprocess.DEVNULL,
        stdout=its,
        stderr=subprocess.PIPE,
        env=environment(**variables),
    ) as process:
        os.close(its)
        output = b""
        try:
            while piece := os.read(ours, 65536):
                output += piece
        except OSError:  # the other end is closed
            pass
        os.close(ours)
        errors = process.stderr.read().decode()
    return process.returncode, output.decode().replace("\r\n", "\n"), errors
