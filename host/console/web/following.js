// How a log of a [[log]] table is followed: its generation, its position, what rotations cost it.

import { h, table } from "./dom.js";
import { bytes, number, plural, time } from "./format.js";

const STATES = {
  reading: "reading the file of this name",
  finishing: "finishing a rotated file; the next one follows",
  missing: "reading a file that has lost this name; no file has it now",
  waiting: "waiting for a file",
  "not a file": "waiting: what has this name is not a regular file",
  taken: "waiting: the file of this name is still read as another log",
};
const RANGES = [
  { label: "Time", className: "fit" },
  { label: "What", className: "fit" },
  { label: "From byte", className: "num" },
  { label: "To byte", className: "num" },
  { label: "Bytes", className: "num" },
  { label: "File", className: "wide break" },
];

/** The table of the configuration that follows a log, of those that name or match it. */
export const tableOf = (log, tables) => tables.find(({ files }) => files.includes(log));

export const tableName = ({ line }) => `[[log]] at line ${line}`;

/** The facts as pairs of name and value. `ofFile`: false for a log that is not a file. */
export function followPairs(follow, ofFile) {
  if (!ofFile)
    return [
      ["State", follow.state === "reading" ? "reading" : "waiting"],
      follow.problem && ["Problem", follow.problem],
      follow.cut_entries > 0 && ["Entries judged by their beginning", number(follow.cut_entries)],
    ].filter(Boolean);
  return [
    ["State", STATES[follow.state] ?? follow.state],
    follow.problem && ["Problem", follow.problem],
    ["Generation", follow.generation ?? "none yet"],
    ["Generations read", number(follow.generations)],
    ["Position", `byte ${number(follow.position)}`],
    ["Behind", bytes(follow.behind)],
    ["Recovered from copies", bytes(follow.recovered_bytes)],
    ["Lost in rotations", bytes(follow.lost_bytes)],
    follow.cut_entries > 0 && ["Entries judged by their beginning", number(follow.cut_entries)],
  ].filter(Boolean);
}

/** What was recovered and lost, the latest first. */
export function rangesPanel({ recovered = [], lost = [] }) {
  const ranges = [
    ...recovered.map((one) => ({ ...one, what: "Recovered", level: "good" })),
    ...lost.map((one) => ({ ...one, what: "Lost", level: "bad" })),
  ].sort((a, b) => b.time.localeCompare(a.time));
  return h(
    "section",
    { className: "panel flush" },
    h("h2", {}, "Recovered and lost in rotations"),
    ranges.length === 0
      ? h("p", { className: "loading" }, "Nothing was lost, and nothing had to be recovered.")
      : table(
          "Recovered and lost",
          RANGES,
          ranges.map((one) => [
            time(one.time),
            h("span", { className: `state ${one.level}` }, one.what),
            number(one.from),
            one.from === one.to ? "unknown" : number(one.to),
            one.from === one.to ? "unknown" : number(one.to - one.from),
            one.source ?? null,
          ]),
          { className: "cards" },
        ),
  );
}

/** What each table matches, and which files it passes over. */
export function tablesPanel(tables) {
  return h(
    "section",
    { className: "panel flush", "aria-label": "Tables" },
    h("h2", {}, "Tables of the configuration"),
    h("ul", { className: "lines" }, tables.map(tableItem)),
  );
}

function tableItem(one) {
  const files = one.files.length;
  const ofFiles = one.path.some((path) => path.startsWith("/"));
  return h(
    "li",
    {},
    h(
      "p",
      {},
      h("b", {}, tableName(one)),
      files > 0 &&
        ofFiles &&
        h("span", { className: "quiet" }, ` follows ${plural(files, "file")}`),
    ),
    h("p", { className: "mono break" }, one.path.join(", ")),
    files === 0 && h("p", { className: "why warn" }, "No file that can be followed matches now."),
    one.problem && h("p", { className: "why warn" }, one.problem),
    one.passed_over_count > 0 && passedOver(one),
  );
}

function passedOver({ line, passed_over: files, passed_over_count: count }) {
  const more = count - files.length;
  return h(
    "details",
    { "data-key": `table-${line}` },
    h("summary", {}, `Passes over ${plural(count, "file")}`),
    files.map(({ file, reason }) =>
      h(
        "p",
        {},
        h("span", { className: "mono break" }, file),
        " ",
        h("span", { className: "quiet" }, reason),
      ),
    ),
    more > 0 && h("p", { className: "quiet" }, `and ${number(more)} more`),
  );
}
