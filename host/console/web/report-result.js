// What a report has found: its entries, the files that were read, and what is missing.

import { button, empty, fill, h, visible } from "./dom.js";
import { bytes, ENTRY_COLUMNS, plural, reachText, stamp } from "./format.js";
import { FIELD, valueOf } from "./report-columns.js";

const LABELS = new Map(ENTRY_COLUMNS);
const MANY = 8; // columns from which a narrow screen scrolls rather than showing cards

/** Why there may be more entries. */
function limitText({ count, limit, max_rows: most }) {
  return count === limit
    ? `Only the newest ${count} entries are shown. Choose more entries or a shorter period.`
    : `Only the newest ${most} entries of the period were read. ` +
        "Choose a shorter period for the rest.";
}

/** What was not read; empty where everything was. */
function missingText(answer) {
  return answer.files.some(({ problem }) => problem)
    ? "Not every file could be read completely; the list below says why."
    : reachText(answer);
}

/** Why there are no entries. */
function emptyText(answer) {
  if (answer.truncated)
    return (
      `None of the newest ${answer.max_rows} entries of this period meets the conditions; ` +
      "a report on this log reads no more than that. Choose a shorter period."
    );
  return answer.complete
    ? "The log has no entries in this period that meet the conditions."
    : `None of the entries read meets the conditions. ${missingText(answer)}`;
}

function fileState({ read, problem }) {
  if (problem) return `not read completely: ${problem}`;
  return read ? "read" : "nothing of this period";
}

/** The files of a log that is followed, and the lines that were passed over. */
function filesElement({ files, skipped }) {
  if (files.length === 0) return null;
  const readCount = files.filter(({ read, problem }) => read && !problem).length;
  const problems = files.filter(({ problem }) => problem).length;
  const passed = skipped > 0 && `${plural(skipped, "line")} passed over`;
  const summary = [`${readCount} of ${plural(files.length, "file")} read`, passed];
  return h(
    "details",
    { className: "panel", open: problems > 0 },
    h("summary", {}, summary.filter(Boolean).join(", ")),
    h(
      "ul",
      { "aria-label": "Files" },
      files.map((file) =>
        h(
          "li",
          { className: file.problem ? "break why warn" : "break" },
          `${file.file}, ${bytes(file.bytes)}: ${fileState(file)}`,
        ),
      ),
    ),
    skipped > 0 && h("p", { className: "hint" }, "Lines that are not entries were passed over."),
  );
}

const NUMBER = /^-?\d+(?:\.\d+)?$/;

/** The rows in this order; numbers by their value where a column has nothing else. */
function sortedBy({ name, up }, rows) {
  const values = rows.map((row) => valueOf(row, name));
  const areNumbers = values.every((value) => value === "" || NUMBER.test(value));
  const keyOf = (value) => (areNumbers ? (value === "" ? -Infinity : Number(value)) : value);
  const compare = (a, b) => (a.key < b.key ? -1 : a.key > b.key ? 1 : 0);
  return rows
    .map((row, index) => ({ row, key: keyOf(values[index]) }))
    .sort((a, b) => (up ? compare(a, b) : compare(b, a)))
    .map(({ row }) => row);
}

// What a log holds must neither steer a terminal nor be a formula to a spreadsheet.
function csvOf(rows, columns, fields) {
  const cell = (value) => {
    const text = visible(String(value));
    const safe = typeof value === "string" && /^[=+\-@\t]/.test(text) ? `'${text}` : text;
    return /[",\r\n]/.test(safe) ? `"${safe.replaceAll('"', '""')}"` : safe;
  };
  const names = [...columns, ...fields.map((name) => FIELD + name)];
  return [names, ...rows.map((row) => names.map((name) => valueOf(row, name)))]
    .map((row) => `${row.map(cell).join(",")}\r\n`)
    .join("");
}

function classOf(name) {
  if (name.startsWith(FIELD)) return "break";
  if (name.endsWith("DESC")) return "wide break";
  return name === "ENTRYTIME" ? "fit whole" : "fit";
}

export class ReportResult {
  /** Draws an answer in place of what the element has. asked: the fields that the report was asked
   * for; chosen: the ReportColumns that say what is shown. */
  constructor(element, answer, asked, chosen) {
    this.answer = answer;
    this.asked = asked;
    this.chosen = chosen;
    this.sort = null;
    const files = filesElement(answer);
    if (answer.rows.length === 0) {
      chosen.setAsked(asked);
      fill(
        element,
        h("div", { className: "panel" }, empty("No entries", emptyText(answer))),
        files,
      );
      return;
    }
    this.holder = h("div", {
      className: "panel flush",
      tabIndex: 0,
      role: "region",
      "aria-label": "Entries",
    });
    fill(element, this.#head(), files, this.holder);
    this.draw();
  }

  #head() {
    const { rows, columns, truncated, complete } = this.answer;
    const cut = rows.filter((row) => row.fields_cut).length;
    const json = () => `${visible(JSON.stringify(rows, null, 2))}\n`;
    return h(
      "div",
      { className: "head" },
      h("h2", { role: "status" }, plural(rows.length, "entry", "entries")),
      truncated && h("p", { className: "why warn" }, limitText(this.answer)),
      !truncated && !complete && h("p", { className: "why warn" }, missingText(this.answer)),
      cut > 0 &&
        h(
          "p",
          { className: "why warn" },
          `Not all fields of ${plural(cut, "entry", "entries")} are here: ` +
            "a row has at most 16 KiB of them. Choose fewer fields.",
        ),
      h(
        "div",
        { className: "push" },
        button("CSV", () => this.#download("csv", "text/csv", csvOf(rows, columns, this.asked)), {
          "aria-label": "Download as CSV",
        }),
        button("JSON", () => this.#download("json", "application/json", json()), {
          "aria-label": "Download as JSON",
        }),
      ),
    );
  }

  /** The chosen columns but the usual ones that are blank, then the chosen fields that were asked
   * for. */
  #shown() {
    const { rows } = this.answer;
    const columns = this.chosen.columns.filter(
      (name) => !LABELS.has(name) || rows.some((row) => row[name] !== ""),
    );
    const fields = this.chosen.fields.filter((name) => this.asked.includes(name));
    return [
      ...columns.map((name) => [name, LABELS.get(name) ?? name]),
      ...fields.map((name) => [FIELD + name, name]),
    ];
  }

  /** Draws the table with the columns and fields that are chosen now. */
  draw() {
    this.chosen.setAsked(this.asked);
    const { rows } = this.answer;
    if (rows.length === 0) return;
    const shown = this.#shown();
    const sorted = this.sort ? sortedBy(this.sort, rows) : rows;
    const head = shown.map(([name, label]) => {
      const isSorted = this.sort?.name === name;
      return h(
        "th",
        {
          scope: "col",
          className: classOf(name).startsWith("fit") ? "fit" : "",
          role: "columnheader",
          "aria-sort": isSorted ? (this.sort.up ? "ascending" : "descending") : "none",
        },
        button(
          `${label}${isSorted ? (this.sort.up ? " ▲" : " ▼") : ""}`,
          () => {
            this.sort = { name, up: isSorted ? !this.sort.up : true };
            this.draw();
            this.holder.querySelector(`[data-name="${CSS.escape(name)}"]`).focus();
          },
          { "data-name": name },
        ),
      );
    });
    fill(
      this.holder,
      h(
        "table",
        { role: "table", className: shown.length > MANY ? "" : "cards sortable" },
        h("caption", { className: "unseen" }, `Entries of ${this.answer.log}`),
        h("thead", { role: "rowgroup" }, h("tr", { role: "row" }, head)),
        h(
          "tbody",
          { role: "rowgroup" },
          sorted.map((row) =>
            h(
              "tr",
              { role: "row" },
              shown.map(([name, label]) =>
                h(
                  "td",
                  {
                    role: "cell",
                    "data-label": label,
                    className: classOf(name),
                  },
                  name === "ENTRYTIME" ? stamp(row[name]) : String(valueOf(row, name)),
                ),
              ),
            ),
          ),
        ),
      ),
    );
  }

  #download(ending, type, text) {
    const url = URL.createObjectURL(new Blob([text], { type }));
    const name = this.answer.log.split("/").pop();
    h("a", { href: url, download: `${name}.${ending}` }).click();
    setTimeout(() => URL.revokeObjectURL(url), 1000);
  }
}
