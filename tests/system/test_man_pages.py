"""The man pages describe every command, option and key, and are well-formed."""

import os
import re
import subprocess

import pytest
from conftest import PATIENCE, PROGRAM, ROOT

CLIENT = os.environ.get("ZRM_CLIENT", os.path.join(os.path.dirname(PROGRAM), "zrmctl"))
PAGES = ROOT / "docs/man"
ACTIONS = {
    "situations": ("list", "show", "add", "set", "remove", "start", "stop", "validate"),
    "silence": ("list", "show", "add", "expire"),
}


def run(*command):
    return subprocess.run(
        [str(word) for word in command],
        capture_output=True,
        text=True,
        timeout=PATIENCE,
        check=True,
    )


def sections(name):
    """The page's parts by their headings, without the macros of fonts."""
    text = (PAGES / name).read_text(encoding="ascii")
    text = re.sub(r"\\f[BIRP]", "", text).replace("\\-", "-")
    parts = re.split(r"^\.S[HS] (.*)\n", text, flags=re.M)
    return dict(zip(parts[1::2], parts[2::2]))


def items(part):
    """The terms that a part describes."""
    return {
        word.strip(",")
        for line in re.findall(r"^\.TP\n(.*)", part, re.M)
        for word in re.sub(r"[\",]| ", " ", re.sub(r"^\.[BI]+ ", "", line)).split()
    }


def help_of(program, *command):
    """The options and the commands that the help lists."""
    out = run(program, *command, "--help").stdout
    options, commands = set(), set()
    for line in out.splitlines():
        if match := re.match(r"  (-[^ :]*)", line):
            options.update(match[1].split(","))
        elif match := re.match(r"  ([a-z]+) {2,}", line):
            commands.add(match[1])
    return options, commands


@pytest.mark.parametrize("name", ["zrmagent.8", "zrmctl.1", "zrm.toml.5"])
def test_pages_are_well_formed(name):
    done = run("groff", "-man", "-ww", "-z", PAGES / name)
    assert (done.stdout, done.stderr) == ("", "")


def test_every_option_of_the_agent():
    options, _ = help_of(PROGRAM)
    assert {"--config", "--trace-file"} <= options
    assert items(sections("zrmagent.8")["OPTIONS"]) >= options


def test_every_common_option_of_the_client():
    options, _ = help_of(CLIENT)
    assert {"--url", "--json"} <= options
    assert items(sections("zrmctl.1")["OPTIONS"]) >= options


def test_every_command_of_the_client_with_its_options():
    _, commands = help_of(CLIENT)
    assert {"logs", "situations", "check", "try"} <= commands
    parts = {heading.split()[0]: part for heading, part in sections("zrmctl.1").items()}
    for command in commands:
        options, _ = help_of(CLIENT, command)
        assert items(parts[command]) >= options - {"-h", "--help"}, command


@pytest.mark.parametrize("command", ACTIONS)
def test_every_action_with_its_options(command):
    _, actions = help_of(CLIENT, command)
    assert actions == set(ACTIONS[command])
    part = sections("zrmctl.1")[f"{command} [action]"]
    assert items(part) >= actions - {"list"}
    for action in actions:
        options, _ = help_of(CLIENT, command, action)
        assert items(part) >= options - {"-h", "--help"}, action


def test_the_page_names_no_option_that_is_not_there():
    known = help_of(CLIENT)[0]
    for command in help_of(CLIENT)[1]:
        known |= help_of(CLIENT, command)[0]
    for command, actions in ACTIONS.items():
        for action in actions:
            known |= help_of(CLIENT, command, action)[0]
    named = {word for part in sections("zrmctl.1").values() for word in items(part)}
    assert {word for word in named if word.startswith("--")} <= known


def documented_keys():
    """The keys of each table in docs/configuration.md by the heading above them. What is said of a
    type of log is about [[log]]."""
    document = (ROOT / "docs/configuration.md").read_text(encoding="utf-8")
    parts = re.split(r"^#{3,4} (.*)\n", document, flags=re.M)
    chapter = ""
    for heading, part in zip(parts[1::2], parts[2::2]):
        chapter = heading if heading.startswith("`[") else chapter
        heading = chapter if chapter == "`[[log]]`" else heading
        table = re.search(r"^\| Key \|.*\n((?:\|.*\n)+)", part, re.M)
        if table:
            cells = [row.split("|")[1] for row in table[1].splitlines()[1:]]
            keys = {key for cell in cells for key in re.findall(r"`([^`]*)`", cell)}
            yield heading, keys


def test_every_key_of_the_configuration():
    parts = sections("zrm.toml.5")
    seen = set()
    for heading, keys in documented_keys():
        name = re.match(r"`?([^`:]*)`?", heading)[1]
        part = parts[name] if name in parts else parts[f"Sinks of type {name}"]
        assert items(part) >= keys, heading
        seen.add(name)
    assert seen == {
        "Top level", "[agent]", "[formats]", "[rules]", "[[log]]", "[http]", "[history]", "[[sink]]", "[[situation]]",
        "jsonl", "webhook", "alertmanager", "syslog", "otlp",
    }  # fmt: skip
