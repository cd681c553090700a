"""What layers.py must find, in small trees that are wrong in one way each."""

import json
import subprocess
import sys
from pathlib import Path

import pytest

PROGRAM = Path(__file__).with_name("layers.py")


@pytest.fixture
def tree(tmp_path):
    files = {
        "src/CMakeLists.txt": "add_subdirectory(base)\nadd_subdirectory(logs)\n",
        "src/base/CMakeLists.txt": "zrm_layer(zrm_base\n  SOURCES\n  Text.cpp\n)\n",
        "src/base/Text.h": "",
        "src/base/Text.cpp": '#include "base/Text.h"\n\n#include <string>\n',
        "src/logs/CMakeLists.txt": "zrm_layer(zrm_logs\n  BELOW zrm_base\n  SOURCES\n  Log.cpp\n)\n",
        "src/logs/Log.h": '#include "base/Text.h"\n',
        "src/logs/Log.cpp": '#include "logs/Log.h"\n',
        "host/CMakeLists.txt": "add_subdirectory(base)\n",
        "host/base/CMakeLists.txt": "zrm_layer(zrm_host_base\n  BELOW zrm_base\n  SOURCES\n)\n",
        "host/base/Say.h": '#include "base/Text.h"\n',
    }
    for name, text in files.items():
        (tmp_path / name).parent.mkdir(parents=True, exist_ok=True)
        (tmp_path / name).write_text(text)
    return tmp_path


def faults(tree, *arguments):
    result = subprocess.run(
        [sys.executable, PROGRAM, "--root", tree, *arguments], capture_output=True, text=True
    )
    lines = result.stderr.splitlines()
    assert result.returncode == (1 if lines else 0), result.stderr
    return lines


def test_a_tree_in_order_is_printed_lowest_layer_first(tree):
    result = subprocess.run(
        [sys.executable, PROGRAM, "--root", tree], capture_output=True, text=True
    )
    assert result.stderr == ""
    assert result.stdout.split() == ["src/base", "src/logs", "src/base", "host/base", "src/base"]


def test_an_include_from_above_is_found(tree):
    (tree / "src/base/Text.h").write_text('#include "logs/Log.h"\n')
    assert 'layers: src/base/Text.h: "logs/Log.h" is in src/logs, not below src/base' in faults(tree)


def test_an_include_of_a_layer_that_is_not_named_is_found(tree):
    (tree / "host/base/Say.h").write_text('#include "logs/Log.h"\n')
    assert faults(tree) == [
        'layers: host/base/Say.h: "logs/Log.h" is in src/logs, not below host/base'
    ]


def test_the_agent_does_not_include_the_host(tree):
    (tree / "src/logs/Log.h").write_text('#include "host/base/Say.h"\n')
    assert faults(tree) == [
        'layers: src/logs/Log.h: "host/base/Say.h" is in host/base, not below src/logs'
    ]


def test_a_file_that_does_not_exist_is_found(tree):
    (tree / "src/logs/Log.h").write_text('#include "base/Gone.h"\n')
    assert faults(tree) == ['layers: src/logs/Log.h: "base/Gone.h" is not a file of src/ or host/']


def test_layers_in_a_circle_are_found(tree):
    (tree / "src/base/CMakeLists.txt").write_text("zrm_layer(zrm_base\n  BELOW zrm_logs\n)\n")
    assert faults(tree) == ["layers: src/base/CMakeLists.txt: zrm_logs is not below zrm_base"]


def test_files_in_a_circle_are_found(tree):
    (tree / "src/base/Text.h").write_text('#include "base/Other.h"\n')
    (tree / "src/base/Other.h").write_text('#include "base/Text.h"\n')
    assert "layers: src/base/Other.h: is in, or includes, a cycle of files" in faults(tree)


def test_a_folder_that_is_not_listed_is_found(tree):
    (tree / "src/new").mkdir()
    (tree / "src/new/New.h").write_text("")
    assert faults(tree) == ["layers: src/CMakeLists.txt: new is not listed"]


@pytest.mark.parametrize("directory", ["/b/layers/src/logs", "{tree}/src"])
def test_a_compiler_that_finds_more_is_found(tree, directory):
    command = f"c++ -I/b/layers/src/base -I{directory.format(tree=tree)} -c Text.cpp"
    entry = {"file": str(tree / "src/base/Text.cpp"), "command": command}
    (tree / "commands.json").write_text(json.dumps([entry]))
    [fault] = faults(tree, "--commands", tree / "commands.json")
    assert fault.startswith("layers: src/base/Text.cpp: the compiler's directories differ: ")


def test_a_compiler_that_finds_what_it_may_is_right(tree):
    command = "c++ -I/b/layers/src/base -isystem /usr/include/x -c Text.cpp"
    entry = {"file": str(tree / "src/base/Text.cpp"), "command": command}
    (tree / "commands.json").write_text(json.dumps([entry]))
    assert faults(tree, "--commands", tree / "commands.json") == []
