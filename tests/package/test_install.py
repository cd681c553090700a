"""Installs the package on this machine for real, runs the agent as its user, and purges it.

Needs root, and a machine that has neither the package nor a user of its name."""

import grp
import pwd
import stat
import subprocess
from pathlib import Path

import pytest
from conftest import PACKAGE, run

STATE = Path("/var/lib/zrm")


def user():
    try:
        return pwd.getpwnam("zrm")
    except KeyError:
        return None


@pytest.fixture
def installed():
    assert user() is None, "the user zrm is someone else's here"
    for path in (STATE, Path("/etc/zrm"), Path("/var/log/zrm")):
        assert not path.exists(), f"{path} is someone else's here"
    try:
        run("dpkg", "--install", PACKAGE)
        if Path("/run/systemd/system").exists():
            run("systemctl", "is-active", "zrmagent")
            run("systemctl", "stop", "zrmagent")  # this test starts its own
        yield
    finally:
        subprocess.run(["dpkg", "--purge", "zrmagent"], check=False)


def test_install_run_upgrade_remove_purge(installed, service):
    account = user()
    assert account.pw_dir == str(STATE)
    assert account.pw_shell == "/usr/sbin/nologin"
    assert account.pw_uid < 1000
    assert "zrm" in grp.getgrnam("adm").gr_mem
    assert "zrm" in grp.getgrnam("systemd-journal").gr_mem
    state = STATE.stat()
    assert (state.st_uid, state.st_gid, stat.S_IMODE(state.st_mode)) == (
        account.pw_uid,
        account.pw_gid,
        0o750,
    )
    config = Path("/etc/zrm/zrm.toml")  # may come to hold secrets
    assert (config.owner(), config.group()) == ("root", "zrm")
    assert stat.S_IMODE(config.stat().st_mode) == 0o640
    enabled = Path("/etc/systemd/system/multi-user.target.wants/zrmagent.service")
    assert enabled.is_symlink()

    agent = service(
        "setpriv",
        "--reuid=zrm",
        "--regid=zrm",
        "--init-groups",
        "/usr/sbin/zrmagent",
        "--config",
        "/etc/zrm/zrm.toml",
    )
    assert agent.message() == "READY=1"
    assert agent.stop() == 0
    assert agent.message() == "STOPPING=1"
    assert (STATE / "api-token").stat().st_uid == account.pw_uid

    own = "# the operator's own\n" + Path("/etc/zrm/zrm.toml").read_text()
    config.write_text(own)
    config.chmod(0o644)
    run("dpkg", "--install", PACKAGE)
    assert Path("/etc/zrm/zrm.toml").read_text() == own
    assert stat.S_IMODE(config.stat().st_mode) == 0o644  # as the operator left it
    assert user() == account

    run("dpkg", "--remove", "zrmagent")
    assert not Path("/usr/sbin/zrmagent").exists()
    assert Path("/etc/zrm/zrm.toml").read_text() == own
    assert (STATE / "api-token").exists()

    run("dpkg", "--purge", "zrmagent")
    assert not STATE.exists()
    assert not Path("/etc/zrm").exists()
    assert not enabled.is_symlink()
    assert user() is None
