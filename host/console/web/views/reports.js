// Reports: what a log held between two times.

import { get, postForLines, withQuery } from "../api.js";
import { Conditions } from "../conditions.js";
import { button, empty, failure, field, fill, h, select } from "../dom.js";
import { bytes, offsetOf, plural } from "../format.js";
import { ReportColumns } from "../report-columns.js";
import { ReportResult } from "../report-result.js";

const HOUR = 3600 * 1000;
const PRESETS = [
  ["hour", "Last hour"],
  ["day", "Last 24 hours"],
  ["today", "Today"],
  ["yesterday", "Yesterday"],
  ["night", "Last night, 22 to 6"],
  ["week", "Last 7 days"],
  ["own", "Other times"],
];

function window(preset, now = new Date()) {
  const midnight = new Date(now);
  midnight.setHours(0, 0, 0, 0);
  const at = (days, hours = 0) => {
    const date = new Date(midnight);
    date.setDate(date.getDate() + days);
    date.setHours(hours);
    return date;
  };
  switch (preset) {
    case "hour":
      return [new Date(now - HOUR), now];
    case "today":
      return [midnight, now];
    case "yesterday":
      return [at(-1), new Date(midnight - 1000)];
    case "night":
      return [at(-1, 22), at(0, 6)];
    case "week":
      return [new Date(now - 7 * 24 * HOUR), now];
    default:
      return [new Date(now - 24 * HOUR), now];
  }
}

/** What an input of type datetime-local takes. */
function local(date) {
  const shifted = new Date(date - date.getTimezoneOffset() * 60000);
  return shifted.toISOString().slice(0, 19);
}

export async function show(element, query) {
  const [{ logs, time }, { columns }] = await Promise.all([
    get("/api/v1/logs"),
    get("/api/v1/columns"),
  ]);
  if (logs.length === 0) {
    fill(
      element,
      h("h1", {}, "Reports"),
      empty(
        "No log is monitored",
        "A report reads a log that the agent monitors.",
        h("a", { className: "button", href: "#/logs" }, "Logs"),
      ),
    );
    return () => {};
  }
  const page = new ReportPage(
    element,
    logs.map(({ log }) => log).sort(),
    columns,
    query.get("log"),
  );
  const offset = offsetOf(logs[0].row.TIMESTAMP, time);
  if (offset !== -new Date().getTimezoneOffset()) page.setZone(offset);
  return () => page.end();
}

class ReportPage {
  #progress = null; // of the run under way

  constructor(element, logs, columns, log) {
    this.columns = columns;
    this.result = h(
      "section",
      { className: "stack", "aria-label": "Result" },
      h(
        "div",
        { className: "panel" },
        empty(
          "No report yet",
          "Choose a log and a time, then run the report. Its newest entries come first.",
        ),
      ),
    );
    const first = log && logs.includes(log) ? log : logs[0];
    this.log = field("Log", select(logs, first, { onchange: () => this.#readFields() }));
    this.preset = field("Time", select(PRESETS, "day", { onchange: () => this.#setWindow() }));
    const own = () => {
      this.preset.control.value = "own";
    };
    this.from = field("From", h("input", { type: "datetime-local", step: 1, oninput: own }));
    this.to = field("To", h("input", { type: "datetime-local", step: 1, oninput: own }));
    this.limit = field("Entries at most", select(["100", "1000", "10000"], "1000"));
    this.conditions = new Conditions(columns, [], () => this.conditions.setProblems([]));
    this.shown = new ReportColumns(columns, () => this.report?.draw());
    this.zone = h("p", { className: "hint" });
    this.run = h("button", { className: "primary" }, "Run the report");
    this.#setWindow();
    fill(
      element,
      h("div", { className: "head" }, h("h1", {}, "Reports")),
      h(
        "form",
        {
          className: "panel",
          noValidate: true,
          onsubmit: (event) => {
            event.preventDefault();
            this.#run();
          },
        },
        h("div", { className: "fields" }, this.log, this.preset, this.from, this.to, this.limit),
        this.zone,
        this.conditions.element,
        this.shown.element,
        h("p", { className: "actions" }, this.run),
      ),
      this.result,
    );
    this.#readFields();
  }

  /** The names of the log's fields, for the conditions and to show. */
  async #readFields() {
    const log = this.log.control.value;
    this.shown.forget();
    this.conditions.suggest([]);
    try {
      const { fields } = await get(withQuery("/api/v1/fields", { log }));
      if (log !== this.log.control.value) return;
      this.shown.suggest(fields);
      this.conditions.suggest(fields);
    } catch {
      // They only save typing.
    }
  }

  /** Says whose times are meant, where the agent's machine has others than this browser. */
  setZone(offset) {
    const two = (value) => String(Math.floor(value)).padStart(2, "0");
    const away = Math.abs(offset);
    const zone = `UTC${offset < 0 ? "−" : "+"}${two(away / 60)}:${two(away % 60)}`;
    this.zone.textContent =
      "From and To are in your time zone; " +
      `entries show the local time of the agent's machine (${zone}).`;
  }

  end() {
    this.abort?.abort();
    clearInterval(this.timer);
  }

  #setWindow() {
    if (this.preset.control.value === "own") {
      this.from.control.focus();
      return;
    }
    const [from, to] = window(this.preset.control.value);
    this.from.control.value = local(from);
    this.to.control.value = local(to);
  }

  async #run() {
    this.end();
    this.#setWindow();
    const from = new Date(this.from.control.value);
    const to = new Date(this.to.control.value);
    this.from.setProblem(Number.isNaN(from.getTime()) ? "Enter a start time." : "");
    this.to.setProblem(
      Number.isNaN(to.getTime())
        ? "Enter an end time."
        : to < from
          ? "This is before the start."
          : "",
    );
    if (Number.isNaN(from.getTime()) || Number.isNaN(to.getTime()) || to < from) return;
    this.abort = new AbortController();
    const abort = this.abort; // of this run; another may begin before its answer
    this.report = null;
    this.#showProgress();
    try {
      const body = {
        log: this.log.control.value,
        from: from.toISOString(),
        to: to.toISOString(),
        where: this.conditions.texts,
        limit: Number(this.limit.control.value),
        fields: this.shown.fields,
      };
      const answer = { rows: [] };
      await postForLines("/api/v1/reports", body, abort.signal, (line) => {
        if (line.row) answer.rows.push(line.row);
        else if (line.progress) this.#progress = { ...line.progress, found: answer.rows.length };
        else Object.assign(answer, line.begin, line.end);
      });
      this.report = new ReportResult(this.result, answer, body.fields, this.shown);
    } catch (error) {
      if (abort !== this.abort) return;
      this.#fail(error);
    }
    clearInterval(this.timer);
  }

  #showProgress() {
    const begin = performance.now();
    this.#progress = null;
    const text = () => {
      const seconds = Math.round((performance.now() - begin) / 1000);
      const { read, total, found } = this.#progress ?? {};
      const far =
        total > 0 &&
        `: ${bytes(read)} of ${bytes(total)}, ${plural(found, "entry", "entries")} found`;
      return `Reading the log, ${seconds} s${far || ""}`;
    };
    const elapsed = h("span", {}, text());
    fill(
      this.result,
      h(
        "div",
        { className: "panel" },
        h(
          "p",
          { role: "status", className: "actions" },
          elapsed,
          button("Cancel", () => this.abort.abort()),
        ),
      ),
    );
    this.timer = setInterval(() => {
      elapsed.textContent = text();
    }, 500);
  }

  #fail(error) {
    if (error.name === "AbortError") {
      fill(
        this.result,
        h(
          "div",
          { className: "panel" },
          empty("Cancelled", "Choose a later start or a shorter period, or run it again."),
        ),
      );
      return;
    }
    const rest = error.field
      ? this.conditions.setProblems([{ field: error.field, detail: error.message }])
      : [error];
    for (const key of ["from", "to", "log"])
      if (error.field === key) this[key].setProblem(error.message);
    fill(
      this.result,
      h(
        "div",
        { className: "panel" },
        rest.length > 0
          ? failure(error, () => this.#run())
          : failure(new Error("A condition is invalid; it is marked above.")),
      ),
    );
  }
}
