"""The bash completion of zrmctl, called as bash calls it."""

import os
import re
import shutil
import subprocess

import pytest
from api import Api
from conftest import PATIENCE, PROGRAM, ROOT, wait_until

SCRIPT = ROOT / "packaging/completion/zrmctl"
CLIENT = os.environ.get("ZRM_CLIENT", os.path.join(os.path.dirname(PROGRAM), "zrmctl"))

ASK = """
source "$1"
COMP_LINE=$2
COMP_POINT=${#COMP_LINE}
shift 2
COMP_WORDS=("$@")
COMP_CWORD=$((${#COMP_WORDS[@]} - 1))
_zrmctl zrmctl "${COMP_WORDS[COMP_CWORD]}" ""
[ ${#COMPREPLY[@]} = 0 ] || printf '%s\\n' "${COMPREPLY[@]}"
"""


def broken(line):
    """The words of a command line as readline splits them."""
    words = re.findall(r"""(?:[^\s=:'"\\]|\\.|'[^']*'?|"[^"]*"?)+|[=:]+""", line)
    return words + [""] if line[-1] in " =:" else words


@pytest.fixture
def complete(tmp_path):
    os.symlink(shutil.which(CLIENT) or CLIENT, tmp_path / "zrmctl")

    def ask(line):
        done = subprocess.run(
            ["bash", "--norc", "-c", ASK, "bash", str(SCRIPT), line, *broken(line)],
            capture_output=True,
            text=True,
            timeout=PATIENCE,
            cwd=tmp_path,
            env={"PATH": f"{tmp_path}:{os.environ['PATH']}", "LC_ALL": "C.UTF-8"},
            check=True,
        )
        assert done.stderr == ""
        return sorted(done.stdout.splitlines())

    return ask


def help_names(*command):
    out = subprocess.run(
        [CLIENT, *command, "--help"], capture_output=True, text=True, timeout=PATIENCE, check=True
    ).stdout
    options = re.findall(r"^  (?:-\w,)?(--[a-z-]+)", out, re.M)
    return sorted(options), sorted(re.findall(r"^  ([a-z]+) {2,}", out, re.M))


def test_commands_and_options_are_those_of_the_program(complete):
    common, commands = help_names()
    assert complete("zrmctl ") == commands
    assert complete("zrmctl -") == common
    shared = set(common) - {"--version"}
    for command in commands:
        assert complete(f"zrmctl {command} -") == sorted({*help_names(command)[0], *shared})
    for command in ("situations", "silence"):
        _, actions = help_names(command)
        assert complete(f"zrmctl {command} ") == actions
        for action in actions:
            options, _ = help_names(command, action)
            assert complete(f"zrmctl {command} {action} x -") == sorted({*options, *shared})


@pytest.mark.parametrize(
    "line, expected",
    [
        ("zrmctl ev", ["events"]),
        ("zrmctl --url http://x:1 rep", ["report"]),
        ("zrmctl --json --config=a.toml rep", ["report"]),
        ("zrmctl events --severity m", ["major", "minor"]),
        ("zrmctl events --severity=m", ["major", "minor"]),
        ("zrmctl report /x --format ", ["csv", "json", "table"]),
        ("zrmctl report --format=", ["csv", "json", "table"]),
        ("zrmctl trace f", ["fine", "flow"]),
        ("zrmctl situations s", ["set", "show", "start", "stop"]),
        ("zrmctl try ", []),
        ("zrmctl refresh ", []),
        ("zrmctl nothing ", []),
    ],
)
def test_words(complete, line, expected):
    assert complete(line) == expected


def test_files(complete, tmp_path):
    (tmp_path / "logs.conf").touch()
    (tmp_path / "a b.log").touch()
    for line in (
        "zrmctl check lo",
        "zrmctl check --host lo",
        "zrmctl --config lo",
        "zrmctl --config=lo",
        "zrmctl try 'A , \"%d\" , year' lo",
    ):
        assert complete(line) == ["logs.conf"], line
    assert complete("zrmctl check a") == ["a b.log"]  # readline quotes file names itself


def test_names_come_from_the_agent(complete, agent):
    log = agent.log()
    agent.listen = "127.0.0.1:0"
    for name in ("disk", "disk full", "a:b", 'it"s'):
        agent.situation(name, log=log)
    agent.start()
    api = Api(agent)
    token = api.token_file
    program = f"zrmctl --url http://127.0.0.1:{api.port} --token-file {token} "

    def offers(line, expected):  # a busy machine takes longer than the completion waits
        wait_until(lambda: complete(line) == expected, lambda: (line, complete(line)))

    offers(f"{program}logs ", [str(log)])
    offers(f"{program}report {str(log)[:-3]}", [str(log)])
    offers(f"{program}events --log ", [str(log)])
    offers(f"{program}situations show d", ["disk", "disk\\ full"])
    offers(f"{program}explain disk\\ f", ["disk\\ full"])
    offers(f"{program}events --situation=di", ["disk", "disk\\ full"])
    offers(f"{program}backtest a:", ["b"])
    assert complete(f"{program}situations add ") == []


def test_without_an_agent_no_names_are_offered(complete):
    assert complete("zrmctl --url http://127.0.0.1:1 --token-file /dev/null logs ") == []
