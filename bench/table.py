"""Results as a table: on the terminal, and in a Markdown file between two marks."""

import os
import platform
import re
import subprocess
from pathlib import Path

BEGIN, END = "<!-- bench: begin -->", "<!-- bench: end -->"
COLUMNS = ["case", "figure", "target", "CPU s", "wall s", "resident MB", "plain C", "of plain C"]


def number(value):
    if value is None:
        return ""
    if isinstance(value, int) or abs(value) >= 1000:
        return f"{value:,.0f}"
    return f"{value:.3g}"


def verdict(result):
    """Whether the figure reaches its target; None where there is none."""
    if result.get("target") is None:
        return None
    if result.get("less"):
        return result["figure"] < result["target"]
    return result["figure"] >= result["target"]


def cells(result):
    target = ""
    if result.get("target") is not None:
        state = "reached" if verdict(result) else "FALLS SHORT"
        target = f"{'<' if result.get('less') else '>='} {number(result['target'])}, {state}"
    ratio = result.get("plain C") and not result.get("less") and result["figure"] / result["plain C"]
    return [
        result["case"],
        f"{number(result['figure'])} {result['unit']}",
        target,
        number(result.get("cpu")),
        number(result.get("wall")),
        number(result.get("resident")),
        number(result.get("plain C")),
        number(ratio) if ratio else "",
    ]


def change(result, saved):
    before = saved.get(result["case"], {}).get("figure")
    return f" ({100 * (result['figure'] - before) / before:+.0f}%)" if before else ""


def show(result, saved):
    name, figure, target, *rest = cells(result)
    named = [f"{key} {value}" for key, value in zip(COLUMNS[3:], rest) if value]
    print(f"{name:<44} {figure}{change(result, saved)}", f"[{target}]" if target else "", flush=True)
    print(f"{'':<44} {' | '.join(named)}", flush=True)


def machine():
    def first(command, pattern):
        try:
            text = subprocess.run(command, capture_output=True, text=True, check=False).stdout
        except OSError:
            return "unknown"
        found = re.search(pattern, text, re.M)
        return found.group(1).strip() if found else "unknown"

    memory = re.search(r"MemTotal:\s*(\d+)", Path("/proc/meminfo").read_text()).group(1)
    return (
        f"{first(['lscpu'], r'^Model name:(.*)$')}, {os.cpu_count()} CPUs, "
        f"{int(memory) // 1048576} GB; Linux {platform.release()}; "
        f"{first(['c++', '--version'], r'^(.*)$')}"
    )


def markdown(results, runs, busy):
    lines = [
        f"Machine: {machine()}.",
        "",
        f"Each figure is the median of {runs} runs. Load average of one minute before the first "
        f"run {busy[0]:.2f}, after the last {busy[1]:.2f} (the benchmark itself included).",
        "",
        "| " + " | ".join(COLUMNS) + " |",
        "|" + "---|" * len(COLUMNS),
    ]
    lines += ["| " + " | ".join(cells(result)) + " |" for result in results]
    return "\n".join(lines)


def write_markdown(path, text, begin=BEGIN, end=END):
    """Puts the text between the marks of the file; at its end where it has none."""
    path = Path(path)
    whole = path.read_text() if path.exists() else ""
    section = f"{begin}\n{text}\n{end}"
    if begin in whole and end in whole:
        head, rest = whole.split(begin, 1)
        whole = head + section + rest.split(end, 1)[1]
    else:
        whole = f"{whole.rstrip()}\n\n{section}\n".lstrip()
    path.write_text(whole)
