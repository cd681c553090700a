"""The Debian package that ./dev package has built."""

import json
import os
import socket
import subprocess
import tempfile
import time
from pathlib import Path

import pytest

PACKAGE = Path(os.environ["ZRM_PACKAGE"])

# On a busy machine; a test that passes never waits this long.
PATIENCE = 60


def run(*command, status=0, **keys):
    """Everything that a command says, which must end with the status; None for any."""
    result = subprocess.run(
        [str(word) for word in command],
        stdin=subprocess.DEVNULL,
        stdout=subprocess.PIPE,
        stderr=subprocess.STDOUT,
        text=True,
        check=False,
        **keys,
    )
    assert status in (None, result.returncode), f"{command}: {result.returncode}\n{result.stdout}"
    return result.stdout


class Service:
    """The agent as a service manager of type notify runs it."""

    def __init__(self, *command):
        self._directory = tempfile.TemporaryDirectory()
        directory = Path(self._directory.name)
        directory.chmod(0o755)  # the agent may have a user of its own
        address = directory / "notify"
        self._socket = socket.socket(socket.AF_UNIX, socket.SOCK_DGRAM)
        self._socket.bind(str(address))
        address.chmod(0o777)
        self._socket.settimeout(PATIENCE)
        self._errors = directory / "stderr"
        self.process = subprocess.Popen(
            [str(word) for word in command],
            stdin=subprocess.DEVNULL,
            stdout=subprocess.DEVNULL,
            stderr=self._errors.open("wb"),
            env={"PATH": os.environ["PATH"], "NOTIFY_SOCKET": str(address)},
        )

    def message(self):
        """The next message to the service manager."""
        try:
            return self._socket.recv(100).decode()
        except TimeoutError:
            pytest.fail(f"no message from the agent\n{self.errors()}")

    def errors(self):
        return self._errors.read_text(encoding="utf-8", errors="replace")

    def stop(self):
        """Ends the agent in order; its exit status."""
        self.process.terminate()
        return self.process.wait(PATIENCE)

    def dispose(self):
        if self.process.poll() is None:
            self.process.kill()
            self.process.wait()
        self._socket.close()
        self._directory.cleanup()


@pytest.fixture
def service():
    """Makes a Service of a command."""
    made = []

    def make(*command):
        made.append(Service(*command))
        return made[-1]

    yield make
    for each in made:
        each.dispose()


def wait_until(condition, what):
    deadline = time.monotonic() + PATIENCE
    while not (value := condition()):
        assert time.monotonic() < deadline, what
        time.sleep(0.05)
    return value


def quoted(value):
    return json.dumps(str(value))
