// The monitored logs: which are in trouble and why, and what comes in.

import { get, viewModule, withQuery } from "../api.js";
import { sparkline } from "../charts.js";
import { button, debounce, empty, failure, fill, h, loading, select, table } from "../dom.js";
import { ago, briefTime, bytes, number, rate, rateText } from "../format.js";
import { judge, kindOf } from "../logstate.js";

const EVERY = 5000;
const ORDER = { bad: 0, warn: 1, idle: 2, good: 3 };

const COLUMNS = [
  { label: "State", className: "fit" }, { label: "Log", className: "wide" }, { label: "Kind", className: "fit" },
  { label: "Entries/min", className: "num" }, { label: "Last 24 h", className: "fit" }, { label: "Entries", className: "num" },
  { label: "Rejected", className: "num" }, { label: "Size", className: "num" }, { label: "Last entry", className: "fit" },
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
  constructor(element) {
    this.counts = h("p", { className: "counts", role: "status" });
    this.text = h("input", { type: "search", placeholder: "Find a log", "aria-label": "Find a log", oninput: debounce(() => this.draw(), 100) });
    this.which = select([["", "All states"], ["bad", "In trouble"], ["warn", "To look at"], ["good", "Running"]], "", { "aria-label": "State", onchange: () => this.draw() });
    this.list = h("section", { className: "panel flush", "aria-label": "Monitored logs" }, loading());
    this.lately = h("section", { className: "panel flush", "aria-label": "Raised lately" });
    fill(element,
      h("div", { className: "head" }, h("h1", {}, "Logs"), this.counts,
        h("div", { className: "push" }, this.text, this.which,
          button("Re-read configuration", () => dispatchEvent(new Event("zrm-refresh")), { title: "As SIGHUP does: new logs are taken up, removed ones are left" }))),
      this.list, this.lately);
    this.logs = null;
    this.rates = new Map();
  }

  async load() {
    try {
      const answer = await get("/api/v1/logs");
      this.logs = answer.logs;
    } catch (error) {
      if (!this.logs) fill(this.list, failure(error, () => this.load()));
      return;
    }
    this.draw();
    await Promise.all([this.#loadRates(), this.#loadEvents()]);
  }

  begin() {
    const timer = setInterval(() => !document.hidden && this.load(), EVERY);
    return () => clearInterval(timer);
  }

  async #loadRates() {
    try {
      const rates = await get("/api/v1/rates");
      this.rates = new Map(rates.logs.map((log) => [log.log, log]));
      this.draw();
    } catch {
      this.rates = new Map(); // the table stands without them
    }
  }

  async #loadEvents() {
    try {
      const { events } = await get("/api/v1/events?limit=6");
      this.#drawEvents(events);
    } catch (error) {
      fill(this.lately, h("h2", {}, "Raised lately"), h("p", { className: "loading" }, error.status === 409
        ? "The history is off, so events are not kept. [history] in the configuration switches it on."
        : error.message));
    }
  }

  #drawEvents(events) {
    fill(this.lately, h("h2", {}, "Raised lately"), events.length === 0
      ? h("p", { className: "loading" }, "No situation has been raised yet. ", h("a", { href: "#/situations" }, "Look at the situations"), " to see what would be.")
      : h("ul", { className: "list" }, events.map((event) => h("li", {},
        h("span", { title: event.raised }, briefTime(event.raised)),
        h("span", { className: `severity ${event.severity}` }, event.severity),
        h("a", { href: withQuery("#/events", { situation: event.situation }) }, event.situation),
        h("span", { className: "what" }, event.row?.UENTRYDESC || event.row?.ENTRYDESC || "")))));
  }

  draw() {
    const judged = this.logs.map((log) => ({ ...log, ...judge(log) }));
    const counted = (level) => judged.filter((log) => log.level === level).length;
    fill(this.counts, h("span", {}, h("b", {}, number(judged.length)), ` ${judged.length === 1 ? "log" : "logs"}`),
      counted("bad") > 0 && h("span", { className: "state bad" }, `${counted("bad")} in trouble`),
      counted("warn") > 0 && h("span", { className: "state warn" }, `${counted("warn")} to look at`),
      h("span", { className: "state good" }, `${counted("good")} running`));
    if (judged.length === 0) {
      fill(this.list, empty("No log is monitored", "The agent reads its logs from the file of log_config in its configuration, one path per line. Write one, then re-read the configuration.", h("a", { className: "button", href: "#/try" }, "Make a line for a log")));
      return;
    }
    const word = this.text.value.toLowerCase();
    const shown = judged
      .filter((log) => log.log.toLowerCase().includes(word) && (!this.which.value || log.level === this.which.value))
      .sort((a, b) => ORDER[a.level] - ORDER[b.level] || a.log.localeCompare(b.log));
    if (shown.length === 0) {
      fill(this.list, empty("None of these", "No log fits what is looked for."));
      return;
    }
    const focused = document.activeElement?.closest?.("td a")?.getAttribute("href");
    fill(this.list, table("Monitored logs, those in trouble first", COLUMNS, shown.map((log) => this.#cells(log)), { className: "cards" }));
    if (focused) this.list.querySelector(`a[href="${CSS.escape(focused)}"]`)?.focus();
  }

  #cells(log) {
    const series = this.rates.get(log.log);
    const perMinute = series ? rate(series.entries) : null;
    const last = log.ledger?.last_entry;
    return [
      h("span", { className: `state ${log.level}` }, log.state),
      h("div", {}, h("a", { className: "break", href: withQuery("#/logs", { log: log.log }) }, log.log),
        log.why && h("p", { className: `why ${log.level}` }, [log.why, log.more].filter(Boolean).join(" "))),
      kindOf(log.row), h("span", { title: "Mean of the last five minutes" }, rateText(perMinute)),
      series ? sparkline(series.entries, `Entries over 24 hours, now ${rateText(perMinute)} per minute`) : "–",
      number(log.ledger?.lines ?? log.row.NUMEVENTS), number(log.ledger?.format_errors ?? log.row.NUMERRORS),
      bytes(log.row.LOGSIZE), h("span", { title: last || "" }, last ? ago(last) : "–"),
    ];
  }
}

