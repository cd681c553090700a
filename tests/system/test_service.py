"""The agent under a service manager."""

import socket

from conftest import PATIENCE


def test_start_and_orderly_end_are_reported_to_the_service_manager(agent):
    address = agent.directory / "notify"
    with socket.socket(socket.AF_UNIX, socket.SOCK_DGRAM) as manager:
        manager.bind(str(address))
        manager.settimeout(PATIENCE)
        log = agent.log()
        agent.situation(log=log)
        agent.environment["NOTIFY_SOCKET"] = str(address)
        agent.start()
        assert manager.recv(100) == b"READY=1"
        agent.refresh()
        assert agent.stop() == 0
        assert manager.recv(100) == b"STOPPING=1"  # and nothing of the refresh before it
