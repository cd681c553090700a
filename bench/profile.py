#!/usr/bin/python3
"""Instructions by function, as a table, from files that callgrind wrote.

    valgrind --tool=callgrind --callgrind-out-file=OUT build/bin/zrmagent --config FILE
    bench/profile.py docs/performance.md syslog=OUT user=OUT
"""

import re
import subprocess
import sys

import table

MOST = 14
BEGIN, END = "<!-- profile: begin -->", "<!-- profile: end -->"


def shares(path):
    """Function and share of the instructions, the largest first."""
    text = subprocess.run(
        ["callgrind_annotate", path], capture_output=True, text=True, check=True
    ).stdout
    for line in text.splitlines():
        found = re.match(r"\s*[\d,]+ \(\s*([\d.]+)%\)\s+\S+?:(.+?) \[", line)
        if found:
            name = re.sub(r"\(.*", "", found.group(2).replace("(anonymous namespace)::", ""))
            yield name.replace("unsigned int ", ""), float(found.group(1))


def main():
    path, *profiles = sys.argv[1:]
    lines = []
    for profile in profiles:
        name, file = profile.split("=", 1)
        lines += [f"| {name} log: function | share of instructions |", "|---|---|"]
        top = list(shares(file))[:MOST]
        lines += [f"| `{function}` | {share:.1f}% |" for function, share in top]
        lines.append(f"| the other functions | {100 - sum(share for _, share in top):.1f}% |")
        lines.append("")
    table.write_markdown(path, "\n".join(lines).rstrip(), BEGIN, END)


if __name__ == "__main__":
    main()
