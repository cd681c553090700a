#!/usr/bin/python3
"""Writes records of a login accounting log: the 40-byte form that the agent reads.

    accounting.py FILE [--user NAME] [--id TEXT] [--line TEXT] [--pid N] [--type N]
                       [--termination N] [--exit N] [--time SECONDS] [--count N]

appends `--count` equal records to FILE, in one write. Without a time it is now. As a module:
`record(...)` gives the bytes of one record.
"""

import argparse
import struct
import time

# user, id, line; pid, type, termination, exit; time
LAYOUT = struct.Struct("<8s4s12shhhhq")
assert LAYOUT.size == 40


def record(user="", id="", line="", pid=0, type=7, termination=0, exit=0, when=None):
    """The 40 bytes of one record; texts are cut to their field and padded with NULs."""
    return LAYOUT.pack(
        user.encode(),
        id.encode(),
        line.encode(),
        pid,
        type,
        termination,
        exit,
        int(time.time()) if when is None else when,
    )


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("file")
    for text in ("user", "id", "line"):
        parser.add_argument(f"--{text}", default="")
    for number, default in (("pid", 0), ("type", 7), ("termination", 0), ("exit", 0)):
        parser.add_argument(f"--{number}", type=int, default=default)
    parser.add_argument("--time", type=int, dest="when")
    parser.add_argument("--count", type=int, default=1)
    arguments = vars(parser.parse_args())
    path, count = arguments.pop("file"), arguments.pop("count")
    with open(path, "ab", buffering=0) as stream:
        stream.write(record(**arguments) * count)


if __name__ == "__main__":
    main()
