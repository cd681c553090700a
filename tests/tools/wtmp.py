#!/usr/bin/python3
"""Writes login records as the system does (utmpx of 64-bit x86): `record(...)` gives the bytes."""

import ipaddress
import struct
import time

LAYOUT = struct.Struct("<h2xi32s4s32s256shhiii16s20x")
assert LAYOUT.size == 384

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
