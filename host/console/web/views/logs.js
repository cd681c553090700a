// The monitored logs: which are in trouble and why, and what comes in.

import { get, post, viewModule, withQuery } from "../api.js";
import { sparkline } from "../charts.js";
import { button, debounce, empty, failure, fill, h, loading, say, select, table } from "../dom.js";
import { tableName, tableOf, tablesPanel } from "../following.js";
import { ago, briefTime, bytes, describe, number, rate, rateText } from "../format.js";
import { again, formatOf, judge, judgeUnmonitored } from "../logstate.js";

const EVERY = 5000;
const MINUTE = 60000;
const LATEST_EVENTS = 100; // of which one row for each situation is made
const MOST_RAISED = 8;
const TAKES_A_WHILE = 1500; // until a refresh shows
const ORDER = { bad: 0, warn: 1, idle: 2, good: 3 };

const COLUMNS = [
  { label: "State", className: "fit lead" },
  { label: "Log", className: "wide" },
  { label: "Kind", className: "fit tail" },
  { label: "Entries/min", className: "num" },
  { label: "Last 24 h", className: "fit" },
  { label: "Entries", className: "num" },
  { label: "Rejected", className: "num" },
  { label: "Size", className: "num" },
  { label: "Last entry", className: "fit" },
];

export async function show(element, query) {
  if (query.get("log")) {
    const detail = await viewModule("log");
    return detail.show(element, query.get("log"));
  }
  const page = new LogsPage(element);
  await page.load();
  return page.begin();
}

class LogsPage {
  logs = null;
  #rates = new Map(); // by log: entries of the last minutes
  #days = new Map(); // by log: entries of 24 hours
  #seen = new Map(); // by log: [{at, lines}] of the answers of the last minutes
  #askedRates = -Infinity;
  #newest = null;
  #tables = "";

  constructor(element) {
    this.counts = h("p", { className: "counts", role: "status" });
    this.text = h("input", {
      type: "search",
      placeholder: "Find a log",
      "aria-label": "Find a log",
      oninput: debounce(() => this.draw(), 100),
    });
    this.which = select(
      [
        ["", "All states"],
        ["bad", "In trouble"],
        ["warn", "With warnings"],
        ["good", "Running"],
      ],
      "",
      { "aria-label": "State", onchange: () => this.draw() },
    );
    this.note = h("div", { role: "status" });
    this.cure = h("p", { className: "hint" });
    this.trouble = h("div", { role: "alert" });
    this.list = h("section", { className: "panel flush", "aria-label": "Logs" }, loading());
    this.tables = h("div", {});
    this.lately = h("section", { className: "panel flush", "aria-label": "Recent events" });
    fill(
      element,
      h(
        "div",
        { className: "head" },
        h("h1", {}, "Logs"),
        this.counts,
        h(
          "div",
          { className: "push" },
          this.text,
          this.which,
          button("Re-read configuration", () => this.#reread(), {
            title: "Same as SIGHUP: starts monitoring added logs and stops monitoring removed ones",
          }),
        ),
      ),
      this.note,
      this.trouble,
      this.cure,
      this.list,
      this.tables,
      this.lately,
    );
  }

  async load() {
    try {
      this.#take(await get("/api/v1/logs"));
    } catch (error) {
      if (!this.logs)
        fill(
          this.list,
          failure(error, () => this.load()),
        );
      return;
    }
    this.draw();
    await Promise.all([this.#loadRates(), this.#loadEvents()]);
  }

  begin() {
    const timer = setInterval(() => !document.hidden && this.load(), EVERY);
    return () => clearInterval(timer);
  }

  #take({ logs, unmonitored, configuration, tables, time }) {
    this.logs = [
      ...logs.map((log) => ({
        ...log,
        ...judge(log),
        format: formatOf(log.row, tableOf(log.log, tables)),
      })),
      ...unmonitored.map((log) => ({ ...log, ...judgeUnmonitored(log), row: null })),
    ];
    this.at = Date.parse(time);
    for (const { log, ledger } of logs) {
      const seen = this.#seen.get(log) || [];
      if (ledger) seen.push({ at: this.at, lines: ledger.lines });
      while (seen[0]?.at < this.at - 5 * MINUTE || seen[0]?.lines > ledger?.lines) seen.shift();
      this.#seen.set(log, seen);
    }
    this.configuration = configuration;
    this.hasTables = tables.length > 0;
    this.isIdle = logs.length === 0 && !this.hasTables;
    say(
      this.trouble,
      configuration?.problem &&
        h(
          "p",
          { className: "panel problem" },
          `The log configuration ${configuration.file} cannot be read: ${configuration.problem}. ` +
            "The agent keeps the logs it has, or uses the system's syslog configuration.",
        ),
      tables
        .filter(({ problem }) => problem)
        .map((one) => h("p", { className: "panel problem" }, `${tableName(one)}: ${one.problem}`)),
    );
    this.#drawTables(tables);
  }

  /** Leaves the panel alone while nothing changes, so that what is opened stays open. */
  #drawTables(tables) {
    const text = JSON.stringify(tables);
    if (text === this.#tables) return;
    this.#tables = text;
    const open = [...this.tables.querySelectorAll("details[open]")].map((one) => one.dataset.key);
    fill(this.tables, tables.length > 0 && tablesPanel(tables));
    for (const one of this.tables.querySelectorAll("details"))
      one.open = open.includes(one.dataset.key);
  }

  async #reread() {
    try {
      await post("/api/v1/refresh");
      fill(
        this.note,
        h(
          "p",
          { className: "hint" },
          "The agent is re-reading its log configuration and looking for new files. " +
            "An unchanged file changes nothing.",
        ),
      );
      setTimeout(() => this.list.isConnected && this.load(), TAKES_A_WHILE);
    } catch (error) {
      fill(this.note, h("p", { className: "problem" }, error.message));
    }
  }

  // The counts of a minute are kept at its end.
  async #loadRates() {
    if (performance.now() - this.#askedRates < MINUTE / 4) return;
    this.#askedRates = performance.now();
    const byLog = ({ logs }) => new Map(logs.map((one) => [one.log, one.entries]));
    try {
      const from = new Date(this.at - 6 * MINUTE).toISOString();
      const [day, latest] = await Promise.all([
        get("/api/v1/rates?step=900"),
        get(withQuery("/api/v1/rates", { from })),
      ]);
      this.#days = byLog(day);
      this.#rates = byLog(latest);
      this.draw();
    } catch {
      // The table stands without them.
    }
  }

  /** Entries per minute: by the history, or else by what this page has seen come. */
  #rateOf(log) {
    const kept = rate((this.#rates.get(log) || []).slice(0, -1)); // the present minute is not over
    if (kept !== null) return kept;
    const seen = this.#seen.get(log) || [];
    const [first, last] = [seen[0], seen.at(-1)];
    return seen.length > 1 ? ((last.lines - first.lines) * MINUTE) / (last.at - first.at) : null;
  }

  async #loadEvents() {
    try {
      const { newest } = await get("/api/v1/events?limit=1");
      if (newest === this.#newest) return;
      const { events } = await get(`/api/v1/events?limit=${LATEST_EVENTS}`);
      this.#newest = newest;
      this.#drawEvents(events);
    } catch (error) {
      fill(
        this.lately,
        h("h2", {}, "Recent events"),
        h(
          "p",
          { className: "loading" },
          error.status === 409
            ? "The history is off, so events are not kept. Set enabled = true under [history]."
            : error.message,
        ),
      );
      this.#newest = null;
    }
  }

  /** One row for each situation, so that a loud one does not hide the others. */
  #drawEvents(events) {
    const bySituation = new Map();
    for (const event of events) {
      const one = bySituation.get(event.situation);
      if (one) one.count += 1;
      else bySituation.set(event.situation, { ...event, count: 1 });
    }
    const shown = [...bySituation.values()].slice(0, MOST_RAISED);
    fill(
      this.lately,
      h("h2", {}, "Recent events"),
      shown.length === 0
        ? h(
            "p",
            { className: "loading" },
            "No events yet. ",
            h("a", { href: "#/situations" }, "See the situations"),
            " for what would raise one.",
          )
        : h(
            "ul",
            { className: "list" },
            shown.map((event) =>
              h(
                "li",
                {},
                h("span", { title: event.raised }, briefTime(event.raised)),
                h("span", { className: `severity ${event.severity}` }, event.severity),
                h(
                  "span",
                  {},
                  h(
                    "a",
                    { href: withQuery("#/events", { situation: event.situation }) },
                    event.situation,
                  ),
                  event.count > 1 &&
                    h(
                      "span",
                      { className: "quiet", title: `Among the latest ${events.length} events` },
                      ` × ${event.count}`,
                    ),
                ),
                h("span", { className: "what" }, describe(event)),
              ),
            ),
          ),
    );
  }

  draw() {
    const judged = this.logs;
    const bad = judged.filter(({ level }) => level === "bad");
    this.cure.textContent =
      bad.length > 0
        ? again(
            this.configuration,
            bad.every(({ ledger }) => ledger?.follow),
          ) + (this.isIdle ? " Without a log to monitor, the agent ends after a minute." : "")
        : "";
    const counted = (level) => judged.filter((log) => log.level === level).length;
    say(
      this.counts,
      h("span", {}, h("b", {}, number(judged.length)), ` ${judged.length === 1 ? "log" : "logs"}`),
      counted("bad") > 0 && h("span", { className: "state bad" }, `${counted("bad")} in trouble`),
      counted("warn") > 0 &&
        h("span", { className: "state warn" }, `${counted("warn")} with warnings`),
      h("span", { className: "state good" }, `${counted("good")} running`),
    );
    if (judged.length === 0) {
      fill(
        this.list,
        empty(
          "No log is monitored",
          this.hasTables
            ? "No [[log]] table matches a file now. The agent waits for one."
            : "Name your logs in [[log]] tables of zrm.toml, then restart the agent: without a " +
                "log it ends after a minute.",
          h("a", { className: "button", href: "#/try" }, "Create a line for a log"),
        ),
      );
      return;
    }
    const word = this.text.value.toLowerCase();
    const shown = judged
      .filter(
        (log) =>
          log.log.toLowerCase().includes(word) &&
          (!this.which.value || log.level === this.which.value),
      )
      .sort((a, b) => ORDER[a.level] - ORDER[b.level] || a.log.localeCompare(b.log));
    if (shown.length === 0) {
      fill(this.list, empty("No matches", "No log matches the search."));
      return;
    }
    const focused = document.activeElement?.closest?.("td a")?.getAttribute("href");
    fill(
      this.list,
      table(
        "Logs, those in trouble first",
        COLUMNS,
        shown.map((log) => this.#cells(log)),
        { className: "cards" },
      ),
    );
    if (focused) this.list.querySelector(`a[href="${CSS.escape(focused)}"]`)?.focus();
  }

  #cells(log) {
    const why =
      log.why &&
      h("p", { className: `why ${log.level}` }, [log.why, log.more].filter(Boolean).join(" "));
    const state = h("span", { className: `state ${log.level}` }, log.state);
    if (!log.row)
      return [
        state,
        h("div", {}, h("span", { className: "break" }, log.log), why),
        ...Array(COLUMNS.length - 2).fill(null),
      ];
    const perMinute = this.#rateOf(log.log);
    const day = this.#days.get(log.log);
    const last = log.ledger?.last_entry;
    return [
      state,
      h(
        "div",
        {},
        h("a", { className: "break", href: withQuery("#/logs", { log: log.log }) }, log.log),
        why,
      ),
      log.format,
      h("span", { title: "Mean of the last five minutes" }, rateText(perMinute)),
      day ? sparkline(day, `Entries over 24 hours, now ${rateText(perMinute)} per minute`) : "–",
      number(log.ledger?.rows ?? log.row.NUMEVENTS),
      number(log.ledger?.format_errors ?? log.row.NUMERRORS),
      bytes(log.row.LOGSIZE),
      h("span", { title: last || "" }, last ? ago(last) : "–"),
    ];
  }
}
