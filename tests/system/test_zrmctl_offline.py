"""zrmctl check and zrmctl try: what needs no agent."""

import json
import os
import pty
import subprocess

import pytest
from conftest import AGENT_VARIABLES, PATIENCE, PROGRAM

CLIENT = os.environ.get("ZRM_CLIENT", os.path.join(os.path.dirname(PROGRAM), "zrmctl"))
FORMAT = (
    'A , "%d-%d-%d %d:%d:%d %s %64[^:]: %256[^\\n]" , '
    "year month day hour minute second type source description"
)
FITS = "2026-11-20 07:03:09 ERROR payment: Card declined"


def environment(**more):
    plain = {k: v for k, v in os.environ.items() if k not in (*AGENT_VARIABLES, "COLUMNS")}
    return {**plain, "LC_ALL": "C.UTF-8", **more}


def run(*arguments, given=b"", status=0, **more):
    """Runs zrmctl; its standard output and standard error."""
    done = subprocess.run(
        [CLIENT, *map(str, arguments)],
        input=given,
        capture_output=True,
        timeout=PATIENCE,
        env=environment(**more),
    )
    assert done.returncode == status, (done.stdout, done.stderr)
    return done.stdout.decode(), done.stderr.decode()


def on_terminal(*arguments, columns):
    """What zrmctl writes to a terminal of so many columns."""
    master, slave = pty.openpty()
    process = subprocess.Popen(
        [CLIENT, *map(str, arguments)],
        stdin=subprocess.DEVNULL,
        stdout=slave,
        stderr=slave,
        env=environment(COLUMNS=str(columns), NO_COLOR="1", TERM="xterm"),
    )
    os.close(slave)
    written = b""
    try:
        while block := os.read(master, 4096):
            written += block
    except OSError:  # the terminal's other side is closed
        pass
    os.close(master)
    process.wait(PATIENCE)
    return written.decode().replace("\r\n", "\n")


@pytest.fixture
def log(tmp_path):
    def make(*lines, name="app.log"):
        path = tmp_path / name
        path.write_bytes(b"".join(os.fsencode(line) + b"\n" for line in lines))
        return path

    return make


# ---------------------------------------------------------------------------------- check


def test_every_line_is_judged_with_number_and_reason(log):
    watched = log("Oct  5 07:03:09 web1 app: text\n")
    config = log(f"# logs\n{watched} ;N ;S\n\n/none ;N\n{watched}\nrelative.log", name="logs.conf")
    assert run("check", config, status=1) == (
        f"    2  accepted  {watched} ;N ;S\n"
        "    4  refused   /none ;N\n"
        "                 The file cannot be used: No such file or directory.\n"
        f"    5  refused   {watched}\n"
        f"                 Duplicate {watched} entry found; entry ignored.\n"
        "    6  refused   relative.log\n"
        "                 Absolute path name of log file must be specified for log ."
        " Ignoring remainder of line.\n"
        "1 accepted, 3 refused\n",
        "",
    )


def test_a_configuration_without_faults_ends_with_0(log):
    watched = log(FITS)
    line = f"{watched} ;N ;U ;{FORMAT}"
    expected = (f"    1  accepted  {line}\n1 accepted, 0 refused\n", "")
    assert run("check", log(line, name="logs.conf")) == expected
    assert run("check", "-", given=f"{line}\n".encode()) == expected


def test_check_as_json(log):
    watched = log(FITS)
    out, err = run("check", "-", "--json", given=f"{watched}\n/none\n".encode(), status=1)
    answer = json.loads(out)
    assert [(line["line"], line["verdict"], line["cause"]) for line in answer["lines"]] == [
        (1, "accepted", None),
        (2, "refused", "file"),
    ]
    assert (answer["accepted"], answer["refused"], err) == (1, 1, "")


def test_a_configuration_without_logs_is_noted():
    assert run("check", "-", given=b"# none\n") == (
        "0 accepted, 0 refused\n",
        "zrmctl: without an accepted line the agent monitors the files of the syslog configuration"
        " instead\n",
    )


def test_the_host_configuration(tmp_path):
    path = tmp_path / "zrm.toml"
    path.write_text("[history]\nkeep_days = 3\n")
    assert run("check", "--host", path) == (f"{path} can be used\n", "")
    for content, note in (
        ("\n", " is empty: a running agent does not load it\n"),
        ("[agent]", " has no newline after its last line: a running agent does not load it; add the newline\n"),
    ):
        (tmp_path / "unfinished.toml").write_text(content)
        unfinished = str(tmp_path / "unfinished.toml")
        assert run("check", "--host", unfinished) == (f"{unfinished} can be used\n", f"zrmctl: {unfinished}{note}")
        assert json.loads(run("check", "--host", unfinished, "--json")[0]) == {
            "accepted": True,
            "problems": [],
            "notes": [unfinished + note.rstrip("\n")],
        }
    assert json.loads(run("check", "--host", path, "--json")[0]) == {
        "accepted": True,
        "problems": [],
        "notes": [],
    }
    path.write_text("[history]\nkeep_days = 0\nkept = 1\n")
    out, err = run("check", "--host", path, status=1)
    assert out == ""
    places = [line.split(" ", 1)[1].rsplit(f"{path}:", 1)[1][:1] for line in err.splitlines()]
    assert places == ["2", "3"]
    assert "history.keep_days: " in err
    answer = json.loads(run("check", "--host", path, "--json", status=1)[0])
    assert answer["accepted"] is False
    assert [f"zrmctl: {problem}" for problem in answer["problems"]] == err.splitlines()


def test_what_cannot_be_checked(tmp_path):
    either = "zrmctl: check: name either a log configuration or --host FILE\n"
    assert run("check", status=2) == ("", either)
    assert run("check", "a", "--host", "b", status=2) == ("", either)
    missing = tmp_path / "missing"
    refusal = ("", f"zrmctl: cannot read {missing}: No such file or directory\n")
    assert run("check", missing, status=2) == refusal
    assert run("check", "--host", missing, status=2) == refusal
    assert run("check", tmp_path, status=2) == (
        "",
        f"zrmctl: cannot read {tmp_path}: Is a directory\n",
    )
    assert run("check", "-", given=b"#" * (16 * 1024 * 1024 + 1), status=2) == (
        "",
        "zrmctl: - is larger than 16 MiB, the most that is read\n",
    )


# ---------------------------------------------------------------------------------- try


def test_columns_or_the_place_where_a_line_stops_fitting(log):
    path = log(FITS, "2026-11-20 07:03 x", "no time here")
    assert run("try", FORMAT, path) == (
        f"    1  {FITS}\n"
        "       ENTRYTIME   2026-11-20 07:03:09\n"
        "       ENTRYSRC    payment\n"
        "       ENTRYTYPE   ERROR\n"
        "       ENTRYDESC   Card declined\n"
        "    2  2026-11-20 07:03 x\n"
        "                       ^\n"
        '       The text ":" of the format is expected here.\n'
        "    3  no time here\n"
        "       ^\n"
        "       A number for %d is expected here.\n"
        "\n"
        "1 of 3 lines fit (33.3 %)\n"
        f"{path} ;N ;U ;{FORMAT}\n",
        "",
    )


def test_the_finished_line_is_one_that_the_check_accepts(log):
    path = log(FITS)
    line = run("try", FORMAT, path)[0].splitlines()[-1]
    assert run("check", "-", given=f"{line}\n".encode())[0].endswith("\n1 accepted, 0 refused\n")


def test_the_place_where_a_format_is_refused(log):
    path = log(FITS)
    assert run("try", 'A , "%d %q" , year', path, status=1) == (
        'A , "%d %q" , year\n'
        "         ^\n"
        "Invalid convcode or receiving variable size specified for code q.  Directive is  %q\n",
        "",
    )


def test_no_line_fits_or_there_is_none(log):
    out, _ = run("try", FORMAT, "-", given=b"x\n", status=1)
    assert out.endswith(f"\n0 of 1 lines fit (0.0 %)\n/path/to/the.log ;N ;U ;{FORMAT}\n")
    path = log()
    assert run("try", FORMAT, path, status=1) == (
        f"0 of 0 lines fit (0.0 %)\n{path} ;N ;U ;{FORMAT}\n",
        f"zrmctl: {path} has no lines to try the format on\n",
    )


def test_the_number_of_lines_is_limited(log):
    lines = f"{FITS}\n".encode() * 101
    for arguments, tried in (((), 100), (("--lines", 2), 2), (("--lines", 1000), 101)):
        answer = json.loads(run("try", FORMAT, "-", "--json", *arguments, given=lines)[0])
        assert answer["coverage"] == {"lines": tried, "matched": tried, "percent": 100.0}
    for wrong in ("0", "100001", "x"):
        assert run("try", FORMAT, "-", "--lines", wrong, status=2)[0] == ""


def test_an_endless_file_is_cut_off():
    out, _ = run("try", FORMAT, "/dev/zero", "--lines", 1, status=1)
    assert "0 of " in out


def test_the_last_line_needs_no_line_end():
    out, _ = run("try", FORMAT, "-", given=FITS.encode())
    assert "\n1 of 1 lines fit (100.0 %)\n" in out


def test_log_text_does_not_reach_the_terminal(log):
    path = log(f"{FITS}\x1b[2J\u202e", "\x1b]0;x\x07 no", b"\xff no".decode(errors="surrogateescape"))
    out, _ = run("try", FORMAT, path)
    assert f"    1  {FITS}\\x1b[2J\\u202e\n" in out
    assert "       ENTRYDESC   Card declined\\x1b[2J\\u202e\n" in out
    assert "    2  \\x1b]0;x\\x07 no\n       ^\n" in out
    assert "    3  \N{REPLACEMENT CHARACTER} no\n       ^\n" in out
    config = log("\x1b[31m ;N", name="logs.conf")
    assert "\x1b" not in run("check", config, status=1)[0]
    assert "\x1b" not in run("check", "--json", config, status=1)[0]
    assert "\x1b" not in run("try", 'A , "\x1b%q" , year', path, status=1)[0]


def test_the_caret_is_under_wide_characters(log):
    path = log("日本 x")
    out, _ = run("try", 'A , "%s %d" , type year', path, status=1)
    assert out.splitlines()[:2] == ["    1  日本 x", " " * 12 + "^"]


def test_a_narrow_terminal_shows_the_place(log):
    path = log("word " + "a" * 200 + " end of the line that does not fit")
    out = on_terminal("try", 'A , "%s %300s %d" , type source year', path, columns=40)
    shown, caret, reason = out.splitlines()[:3]
    assert shown[7] == "…" and shown.endswith("…") and len(shown) == 40
    assert shown[caret.index("^") :].startswith("end of the")
    assert reason == "       A number for %d is expected here."


def test_nothing_is_traced_unless_it_is_asked_for(log):
    path = log(FITS, "x")
    assert run("try", FORMAT, path)[1] == ""
    assert "FormatTrial.cpp" in run("try", FORMAT, path, QFW_TRC1="FormatTrial=flow")[1]
    out, err = run("try", FORMAT, path, QFW_TRC1="loud", status=2)
    assert out == "" and err.startswith("zrmctl: QFW_TRC1: ") and "loud" in err


def test_check_shows_what_each_log_table_matches(tmp_path):
    for name in ("a.log", "b.log", "b.log.1", "old.log.gz"):
        (tmp_path / name).write_text("x\n")
    path = tmp_path / "zrm.toml"
    path.write_text(
        f'[[log]]\npath = "{tmp_path}/*.lo*"\nexclude = "a*"\n'
        f'[[log]]\npath = ["{tmp_path}/later", "{tmp_path}/none/*"]\n'
    )
    assert run("check", "--host", path) == (
        f"{path} can be used\n"
        "[[log]] at line 1: 1 file\n"
        f"  {tmp_path}/b.log\n"
        f"  passed over  {tmp_path}/old.log.gz: It is compressed.\n"
        f"  passed over  {tmp_path}/b.log.1: It is an older generation of {tmp_path}/b.log.\n"
        "[[log]] at line 4: 1 file\n"
        f"  {tmp_path}/later  (does not exist yet)\n",
        "",
    )
    answer = json.loads(run("check", "--host", path, "--json")[0])
    assert answer["accepted"]
    assert [table["files"] for table in answer["logs"]] == [[f"{tmp_path}/b.log"], [f"{tmp_path}/later"]]
    assert answer["logs"][0]["passed_over_count"] == 2
    path.write_text("[[log]]\npath = 'app.log'\n")
    assert run("check", "--host", path, status=1)[1] == (
        f"zrmctl: {path}:2: log.path: 'app.log' is not an absolute path; begin it with '/'\n"
    )
