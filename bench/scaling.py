"""How the agent's cost grows with lines, with logs and with situations."""

import statistics

import cases
from data import Data

BEGIN, END = "<!-- scaling: begin -->", "<!-- scaling: end -->"


def growing_logs_run(options, data, count):
    """CPU seconds while so many logs grow by the data at once."""
    with cases.Workplace(options) as place:
        logs = [place.log(f"app{number}.log") for number in range(count)]
        with place.agent(logs, cases.situations(1, logs[0], cases.NEVER)) as agent:
            cpu = agent.cpu()
            for log in logs:
                cases.append(data.path, log)
            for log in logs:
                agent.wait_read(log)
            agent.wait_idle()
            return agent.cpu() - cpu


def situations_run(options, data, count):
    choose = lambda log, _: cases.situations(count, log, cases.NEVER)  # noqa: E731
    return cases.throughput_run(options, data, choose, 0)["cpu"]


def rows(options):
    total = options.lines
    for lines in (total // 4, total // 2, total, 2 * total):
        data = Data(options, "syslog", lines)
        yield f"1 log, 1 situation, {lines:,} lines", lines, data, situations_run, 1
    for count in (10, 100):
        data = Data(options, "syslog", total // count)
        yield f"{count} logs that grow at once, {total:,} lines", total, data, growing_logs_run, count
    for count in (10, 100, 1000):
        data = Data(options, "syslog", total)
        yield f"1 log, {count} situations on it, {total:,} lines", total, data, situations_run, count


def run(options):
    """Measures, prints, and gives the table in Markdown."""
    lines = ["| work | CPU s | lines per CPU second | ns per line |", "|---|---|---|---|"]
    for name, count, data, measure, argument in rows(options):
        cpu = statistics.median(measure(options, data, argument) for _ in range(options.runs))
        cells = [name, f"{cpu:.3f}", f"{count / cpu:,.0f}", f"{1e9 * cpu / count:,.0f}"]
        print(" | ".join(cells), flush=True)
        lines.append("| " + " | ".join(cells) + " |")
    return f"Median of {options.runs} runs; none of the situations matches.\n\n" + "\n".join(lines)
