"""The package's contents, unpacked into a directory: nothing of this machine changes."""

import gzip
import io
import platform
import re
import stat
import subprocess
import tarfile
import time
from pathlib import Path

import pytest
from conftest import PACKAGE, quoted, run, wait_until

ROOT = Path(__file__).resolve().parents[2]
READY = [file for folder in ("formats", "rules") for file in (ROOT / folder).glob("*.toml")]
FILES = {
    "etc/zrm/zrm.toml",
    "lib/systemd/system/zrmagent.service",
    "usr/bin/zrmctl",
    "usr/sbin/zrmagent",
    "usr/share/bash-completion/completions/zrmctl",
    "usr/share/doc/zrmagent/changelog.gz",
    "usr/share/doc/zrmagent/copyright",
    "usr/share/man/man1/zrmctl.1.gz",
    "usr/share/man/man5/zrm.toml.5.gz",
    "usr/share/man/man8/zrmagent.8.gz",
} | {f"usr/share/zrm/{file.parent.name}/{file.name}" for file in READY}
PROGRAMS = {"usr/bin/zrmctl", "usr/sbin/zrmagent"}


@pytest.fixture(scope="module")
def root(tmp_path_factory):
    directory = tmp_path_factory.mktemp("root")
    run("dpkg-deb", "--extract", PACKAGE, directory)
    return directory


@pytest.fixture(scope="module")
def control(tmp_path_factory):
    directory = tmp_path_factory.mktemp("control")
    run("dpkg-deb", "--control", PACKAGE, directory)
    return directory


def field(name):
    return run("dpkg-deb", "--field", PACKAGE, name).strip()


def test_every_file_is_roots_and_only_programs_run():
    archive = subprocess.check_output(["dpkg-deb", "--fsys-tarfile", PACKAGE])
    found = set()
    with tarfile.open(fileobj=io.BytesIO(archive)) as members:
        for member in members:
            name = member.name.removeprefix("./")
            assert (member.uid, member.gid) == (0, 0), name
            if member.isfile():
                found.add(name)
                assert member.mode == (0o755 if name in PROGRAMS else 0o644), name
            else:
                assert member.isdir() and member.mode == 0o755, name
    assert found == FILES


def test_the_operators_files_survive_an_upgrade(control):
    assert (control / "conffiles").read_text().split() == ["/etc/zrm/zrm.toml"]


def test_it_says_what_it_needs():
    depends = {entry.split()[0] for entry in field("Depends").split(", ")}
    assert {"adduser", "procps", "libc6", "libsqlite3-0", "libssl3", "libre2-9", "libarchive13"} <= depends
    assert field("Recommends") == "ca-certificates"


@pytest.mark.parametrize("program", sorted(PROGRAMS))
def test_the_programs_are_hardened(root, program):
    path = root / program
    assert "DYN (Position-Independent Executable file)" in run("readelf", "-hW", path)
    assert "GNU_RELRO" in run("readelf", "-lW", path)
    dynamic = run("readelf", "-dW", path)
    assert "BIND_NOW" in dynamic and "Flags: NOW PIE" in dynamic
    imported = run("readelf", "-W", "--dyn-syms", path)
    assert "__stack_chk_fail" in imported  # stack protector
    assert re.search(r"__\w+_chk\b", imported)  # the C library's checked calls
    assert "__glibcxx_assert_fail" in imported
    if platform.machine() == "x86_64":
        code = run("objdump", "-d", "--no-show-raw-insn", path)
        assert code.count("endbr64") > 1000  # indirect branches end there


@pytest.mark.parametrize("page", sorted(name for name in FILES if "/man/" in name))
def test_manual_pages_are_without_complaint(root, page):
    text = gzip.decompress((root / page).read_bytes()).decode()
    assert re.search(r"^\.SH \"?NAME", text, re.M)
    complaints = run("man", "--warnings", "-E", "UTF-8", "-l", "-Tutf8", "-Z", root / page)
    assert "warning:" not in complaints


def test_maintainer_scripts_are_plain_shell(control):
    for name in ("postinst", "prerm", "postrm"):
        script = control / name
        assert stat.S_IMODE(script.stat().st_mode) == 0o755
        run("dash", "-n", script)
        assert script.read_text().startswith("#!/bin/sh\nset -e\n")


def test_the_unit_is_what_systemd_takes(root, tmp_path):
    text = (root / "lib/systemd/system/zrmagent.service").read_text()
    for line in (
        "Type=notify",
        "User=zrm",
        "SupplementaryGroups=adm systemd-journal",
        "StateDirectory=zrm",
        "ExecReload=/bin/kill -HUP $MAINPID",
        "Restart=always",
        "MemoryMax=1G",
        "TasksMax=4096",
        "NoNewPrivileges=yes",
        "ProtectSystem=strict",
    ):
        assert f"\n{line}\n" in text
    assert "\nExecStart=/usr/sbin/" in text
    unit = tmp_path / "zrmagent.service"
    unit.write_text(text.replace("ExecStart=", f"ExecStart={root}"))
    output = run("systemd-analyze", "verify", "--man=no", unit)
    assert [line for line in output.splitlines() if "zrmagent" in line] == []


ISO = "%Y-%m-%dT%H:%M:%S.000000+00:00"


def adapted(root, directory):
    """The packaged configuration with its directories moved, and the example situation in use."""
    for name in ("syslog", "auth.log", "dpkg.log"):
        (directory / name).write_text("the line before\n")
    text = (root / "etc/zrm/zrm.toml").read_text()
    assert "# [[situation]]\n" in text
    head, _, example = text.partition("# [[situation]]\n")
    example = "[[situation]]\n" + re.sub("^# ", "", example, flags=re.M)
    text = head + example
    for old, new in (
        ('"/var/lib/zrm"', quoted(directory / "state")),
        ("127.0.0.1:7186", "127.0.0.1:0"),
        ("/var/log/", f"{directory}/"),
    ):
        assert old in text
        text = text.replace(old, new)
    (directory / "zrm.toml").write_text(text)
    return directory / "zrm.toml"


def test_the_packaged_configuration_works(root, tmp_path, service):
    config = adapted(root, tmp_path)
    agent = service(root / "usr/sbin/zrmagent", "--config", config)
    assert agent.message() == "READY=1"
    said = wait_until(lambda: re.search(r"HTTP at (\S+?)/?,", agent.errors()), "HTTP")
    client = [root / "usr/bin/zrmctl", "--config", config, "--url", said.group(1)]
    assert "zrmagent" in run(*client, "status")

    def all_run():
        logs = run(*client, "logs")
        return all(name in logs for name in ("syslog", "auth.log", "dpkg.log"))

    wait_until(all_run, "three logs")
    events = ""
    for _ in range(60):  # the log may be opened behind the first of them
        with open(tmp_path / "auth.log", "a", encoding="utf-8") as log:
            for number in range(5):
                stamp = time.strftime(ISO, time.gmtime())
                log.write(
                    f"{stamp} web1 sshd[412]: Failed password for root from 203.0.113.7 {number}\n"
                )
        events = run(*client, "events", "--json", status=None)
        if "ssh-bruteforce" in events:
            break
        time.sleep(0.5)
    assert "ssh-bruteforce" in events and '"web1"' in events
    assert agent.stop() == 0
    assert agent.message() == "STOPPING=1"
    assert stat.S_IMODE((tmp_path / "state/api-token").stat().st_mode) == 0o600
