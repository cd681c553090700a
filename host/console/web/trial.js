// What a trial of lines makes of them: the fields in place, the columns, and what does not fit.

import { h, table } from "./dom.js";
import { ENTRY_COLUMNS, plural, stamp } from "./format.js";

// The parts of the time share a colour; the other fields have one each.
const COLOURS = { system: "f1", source: "f2", type: "f3", class: "f4", description: "f5" };

/** A text with a mark at a byte of it. */
export function markedAt(text, position) {
  const at = new Offsets(text);
  if (position === null || position === undefined) return h("pre", {}, text);
  return h(
    "pre",
    {},
    at.slice(0, position),
    h("mark", { className: "stop" }, at.slice(position) || " "),
  );
}

/** Byte offsets of a text in UTF-8, which is what the agent counts. */
class Offsets {
  constructor(text) {
    this.bytes = new TextEncoder().encode(text);
  }

  slice(from, to) {
    return new TextDecoder().decode(this.bytes.slice(from, to));
  }
}

/** The names in a format; without one, those in the lines. */
export function fieldNames({ directives, lines }) {
  const named = directives.length > 0 ? directives : lines.flatMap(({ fields }) => fields);
  return [...new Set(named.map((one) => one.field ?? one.name).filter(Boolean))];
}

function colourOf(names, name) {
  return names.includes(name) ? COLOURS[name] || "f0" : "forgotten";
}

export function coverage({ lines, matched, percent }, names) {
  const bar = h("span", {});
  bar.style.width = `${percent}%`;
  return h(
    "section",
    { className: "panel" },
    h("p", { className: "verdict", role: "status" }, `${percent}% of the lines fit`),
    h("div", { className: `meter ${matched < lines ? "low" : ""}`, "aria-hidden": "true" }, bar),
    h("p", { className: "quiet" }, `${matched} of ${plural(lines, "line")}`),
    h(
      "div",
      { className: "legend", "aria-label": "Fields", role: "group" },
      names.map((name) => h("span", { className: `swatch ${colourOf(names, name)}` }, name)),
    ),
  );
}

export function linesPanel(answer, names) {
  return h(
    "section",
    { className: "panel flush" },
    h("h2", {}, "Lines"),
    h(
      "ul",
      { className: "lines" },
      answer.lines.map((one) =>
        h(
          "li",
          {},
          coloured(one, names),
          !one.matched &&
            h(
              "p",
              { className: "why bad" },
              one.failed_at === null ? "" : `Stops at column ${one.failed_at + 1}: `,
              one.reason,
            ),
        ),
      ),
    ),
  );
}

/** A line with its fields marked in place, and the place where it stops fitting. */
function coloured(one, names) {
  const at = new Offsets(one.line);
  const parts = [];
  let done = 0;
  for (const { from, to, name } of [...one.fields].sort((a, b) => a.from - b.from)) {
    if (from < done) continue;
    parts.push(
      at.slice(done, from),
      h("mark", { className: colourOf(names, name), title: name || "skipped" }, at.slice(from, to)),
    );
    done = to;
  }
  if (one.matched || one.failed_at === null) parts.push(at.slice(done));
  else {
    const stop = Math.max(done, one.failed_at);
    parts.push(
      at.slice(done, stop),
      h(
        "mark",
        { className: "stop", title: "The line stops fitting here" },
        at.slice(stop) || " (line ends)",
      ),
    );
  }
  return h("pre", {}, parts);
}

export function columnsPanel(answer) {
  const rows = answer.lines
    .filter((one) => one.row)
    .slice(0, 20)
    .map((one) => one.row);
  if (rows.length === 0) return null;
  const columns = ENTRY_COLUMNS.map(([, label]) => ({
    label,
    className: label === "Description" ? "wide break" : label === "Time" ? "fit whole" : "fit",
  }));
  return h(
    "section",
    { className: "panel flush" },
    h(
      "h2",
      {},
      rows.length < answer.coverage.matched
        ? `Resulting columns of the first ${rows.length} lines`
        : "Resulting columns",
    ),
    table(
      "Resulting columns",
      columns,
      rows.map((row) =>
        ENTRY_COLUMNS.map(([name]) => (name === "ENTRYTIME" ? stamp(row[name]) : row[name] || "–")),
      ),
      { className: "cards" },
    ),
  );
}
