// One log: its state, its rates, and its ledger.

import { get, withQuery } from "../api.js";
import { drawRates } from "../charts.js";
import { empty, failure, fill, h, loading, sentence, table } from "../dom.js";
import { followPairs, rangesPanel, tableName, tableOf } from "../following.js";
import { bytes, number, plural, stamp, time } from "../format.js";
import { again, formatOf, isFile, judge, judgeUnmonitored } from "../logstate.js";

const EVERY = 10000;
const CHART_EVERY = 60000;
const SKIPPED = [
  { label: "Time", className: "fit" },
  { label: "From byte", className: "num" },
  { label: "To byte", className: "num" },
  { label: "Unread before", className: "num" },
  { label: "Noticed", className: "wide" },
];

export async function show(element, path) {
  const report = h(
    "a",
    { className: "button", href: withQuery("#/reports", { log: path }), hidden: true },
    "Report on this log",
  );
  const trial = h(
    "a",
    { className: "button", href: withQuery("#/try", { log: path }), hidden: true },
    "Try a format on it",
  );
  const state = h("div", { className: "panel" }, loading());
  const chart = h("div", {}, loading("Loading the last 24 hours"));
  const rates = h(
    "section",
    { className: "panel" },
    h("h2", {}, "Entries and events per minute, last 24 hours"),
    chart,
  );
  const ledger = h("div", { className: "stack" });
  fill(
    element,
    h(
      "div",
      { className: "head" },
      h("h1", { className: "path" }, path),
      h(
        "div",
        { className: "push" },
        report,
        trial,
        h("a", { className: "button", href: "#/logs" }, "All logs"),
      ),
    ),
    state,
    rates,
    ledger,
  );
  let endChart = () => {};
  let isDrawn = false;
  const load = async () => {
    try {
      const {
        logs: [log],
        unmonitored: [other],
        configuration,
        tables,
      } = await get(withQuery("/api/v1/logs", { log: path }));
      rates.hidden = report.hidden = !log;
      trial.hidden = !"US".includes(log?.row.LOGTYPE ?? " ");
      if (log) {
        drawState(state, log, configuration, tableOf(path, tables));
        drawLedger(ledger, log);
      } else {
        drawUnmonitored(state, other, configuration);
        fill(ledger);
      }
      isDrawn = true;
    } catch (error) {
      if (error.status === 404) {
        fill(
          state,
          empty(
            "This log is not monitored",
            error.message.includes("[[log]]")
              ? sentence(error.message)
              : "Add a [[log]] table for it to zrm.toml, or a line to the log configuration.",
            h("a", { className: "button", href: "#/logs" }, "All logs"),
          ),
        );
        fill(ledger);
        rates.hidden = report.hidden = trial.hidden = true;
        isDrawn = false;
      } else if (!isDrawn) fill(state, failure(error, load));
    }
  };
  let isCharted = false;
  const loadChart = async () => {
    try {
      const answer = await get(withQuery("/api/v1/rates", { log: path }));
      const [series] = answer.logs;
      endChart();
      endChart = () => {};
      if (!series)
        fill(
          chart,
          h(
            "p",
            { className: "hint" },
            "No entries in the last 24 hours. Entries are counted at the end of each minute.",
          ),
        );
      else endChart = await drawRates(chart, answer, series);
      isCharted = Boolean(series);
    } catch (error) {
      if (!isCharted)
        fill(
          chart,
          h(
            "p",
            { className: "hint" },
            error.status === 409
              ? "The history is off, so rates are not kept. Set enabled = true under [history]."
              : error.message,
          ),
        );
    }
  };
  const scheme = matchMedia("(prefers-color-scheme: dark)");
  scheme.addEventListener("change", loadChart);
  await Promise.all([load(), loadChart()]);
  const timer = setInterval(() => !document.hidden && load(), EVERY);
  const chartTimer = setInterval(() => !document.hidden && loadChart(), CHART_EVERY);
  return () => {
    clearInterval(timer);
    clearInterval(chartTimer);
    scheme.removeEventListener("change", loadChart);
    endChart();
  };
}

function drawState(element, log, configuration, source) {
  const { level, state, why } = judge(log);
  const { row } = log;
  const ledger = log.ledger || {};
  const follow = ledger.follow;
  const pairs = [
    ["Kind", formatOf(row, source)],
    [
      "Configured by",
      source ? tableName(source) : follow ? "a [[log]] table" : "log configuration",
    ],
    ["Status", row.MONSTATUS],
    ["Monitored since", stamp(row.MONTIME)],
    isFile(row) && ["File changed", stamp(row.LOGMODDATE)],
    isFile(row) && ["Size", bytes(row.LOGSIZE)],
    ["Read", `${bytes(ledger.bytes_read)} in ${plural(ledger.lines ?? 0, "line")}`],
    ["Entries", number(ledger.rows ?? row.NUMEVENTS)],
    ["Rejected lines", number(ledger.format_errors ?? row.NUMERRORS)],
    typeof ledger.percent_parsed === "number" && ["Parsed", `${ledger.percent_parsed}%`],
    ["Without a time", number(ledger.without_time)],
    isFile(row) && ["Truncations", number(ledger.truncations)],
    !follow && ["Skipped", bytes(ledger.skipped_bytes)],
    ["Restarts of the monitor", number(ledger.restarts)],
    ["Last entry", time(ledger.last_entry)],
    ["Debug log", row.DEBUGMODE === "Y" ? "every entry is copied to it" : "off"],
  ].filter(Boolean);
  if (row.FORMATTER)
    pairs.push([row.LOGTYPE === "E" ? "Command" : "Format", h("code", {}, row.FORMATTER)]);
  fill(
    element,
    h("p", {}, h("span", { className: `state ${level}` }, state)),
    why && h("p", { className: `why ${level}` }, why),
    level === "bad" && h("p", { className: "hint" }, again(configuration, Boolean(follow))),
    facts(pairs),
    follow && h("h2", {}, "Following"),
    follow && facts(followPairs(follow, isFile(row))),
  );
}

const facts = (pairs) =>
  h(
    "dl",
    { className: "facts" },
    pairs.map(([name, value]) => h("div", {}, h("dt", {}, name), h("dd", {}, value))),
  );

function drawUnmonitored(element, log, configuration) {
  const { level, state, why } = judgeUnmonitored(log);
  fill(
    element,
    h("p", {}, h("span", { className: `state ${level}` }, state)),
    h("p", { className: `why ${level}` }, why),
    h(
      "p",
      { className: "hint" },
      `It is on line ${log.line} of the log configuration. ${again(configuration)}`,
    ),
  );
}

function drawLedger(element, log) {
  const { rejected = [], shapes = [], skipped = [], follow } = log.ledger || {};
  fill(
    element,
    follow && rangesPanel(follow),
    h(
      "section",
      { className: "panel flush" },
      h("h2", {}, "Latest rejected lines"),
      rejected.length === 0
        ? h("p", { className: "loading" }, "Every line fits the format.")
        : table(
            "Rejected lines",
            [
              { label: "Time", className: "fit" },
              { label: "Line", className: "wide" },
              { label: "Reason", className: "wide" },
            ],
            [...rejected]
              .reverse()
              .map((one) => [
                time(one.time),
                h("pre", {}, one.line),
                h("span", { className: "why bad" }, one.reason),
              ]),
            { className: "cards" },
          ),
    ),
    shapes.length > 0 &&
      h(
        "section",
        { className: "panel flush" },
        h("h2", {}, "Shapes of rejected lines"),
        table(
          "Shapes of rejected lines",
          [
            { label: "Lines", className: "number" },
            { label: "Shape", className: "wide" },
          ],
          shapes.map((one) => [number(one.count), h("pre", {}, one.shape)]),
          { className: "cards" },
        ),
      ),
    skipped.length > 0 &&
      h(
        "section",
        { className: "panel flush" },
        h("h2", {}, "Skipped by truncations"),
        table(
          "Skipped ranges",
          SKIPPED,
          [...skipped]
            .reverse()
            .map((one) => [
              time(one.time),
              number(one.from),
              number(one.to),
              one.unread === null ? "unknown" : number(one.unread),
              one.regrown ? "found after it had grown again" : "found while it was shorter",
            ]),
          { className: "cards" },
        ),
      ),
  );
}
