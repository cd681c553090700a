#!/usr/bin/python3
"""Writes login records as the system does (utmpx): `record(...)` gives the bytes."""

import ipaddress
import platform
import struct
import time

# Where programs of 32 and 64 bits share the files, the session and the time have 32 bits.
IS_SHARED = platform.machine() in ("x86_64", "i686", "ppc64", "s390x", "mips64", "sparc64", "riscv64")
LAYOUT = struct.Struct("@hi32s4s32s256shh" + ("iii16s20x" if IS_SHARED else "lll16s20x0l"))
assert LAYOUT.size == (384 if IS_SHARED else 400)

EMPTY, RUN_LVL, BOOT_TIME, NEW_TIME, OLD_TIME, INIT_PROCESS, LOGIN_PROCESS, USER_PROCESS, DEAD_PROCESS = range(9)


def record(user="", line="", type=USER_PROCESS, id="", pid=0, host="", address=None, session=0, exit=0, when=None):
    """One record; texts are cut to their field and padded with NULs."""
    packed = ipaddress.ip_address(address).packed if address else b""
    return LAYOUT.pack(
        type,
        pid,
        line.encode(),
        id.encode(),
        user.encode(),
        host.encode(),
        0,
        exit,
        session,
        int(time.time()) if when is None else when,
        0,
        packed,
    )
