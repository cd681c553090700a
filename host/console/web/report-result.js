// What a report has found: its entries, the files that were read, and what is missing.

import { button, empty, fill, h, visible } from "./dom.js";
import { bytes, ENTRY_COLUMNS, plural, reachText, stamp } from "./format.js";

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

function compare(a, b, { name, up }) {
  const order =
    typeof a[name] === "number"
      ? a[name] - b[name]
      : a[name] < b[name]
        ? -1
        : a[name] > b[name]
          ? 1
          : 0;
  return up ? order : -order;
}

// What a log holds must neither steer a terminal nor be a formula to a spreadsheet.
function csvOf(rows) {
  const cell = (value) => {
    const text = visible(String(value));
    const safe = typeof value === "string" && /^[=+\-@\t]/.test(text) ? `'${text}` : text;
    return /[",\r\n]/.test(safe) ? `"${safe.replaceAll('"', '""')}"` : safe;
  };
  const names = Object.keys(rows[0]);
  return [names, ...rows.map((row) => names.map((name) => row[name]))]
    .map((row) => `${row.map(cell).join(",")}\r\n`)
    .join("");
}

export class ReportResult {
  /** Draws an answer in place of what the element has. */
  constructor(element, answer) {
    this.answer = answer;
    this.sort = null;
    const files = filesElement(answer);
    if (answer.rows.length === 0) {
      fill(
        element,
        h("div", { className: "panel" }, empty("No entries", emptyText(answer))),
        files,
      );
      return;
    }
    const all = h("input", { type: "checkbox", onchange: () => this.#drawTable(all.checked) });
    this.holder = h("div", {
      className: "panel flush",
      tabIndex: 0,
      role: "region",
      "aria-label": "Entries",
    });
    fill(element, this.#head(all), files, this.holder);
    this.#drawTable(false);
  }

  #head(all) {
    const { rows, truncated, complete } = this.answer;
    const json = () => `${visible(JSON.stringify(rows, null, 2))}\n`;
    return h(
      "div",
      { className: "head" },
      h("h2", { role: "status" }, plural(rows.length, "entry", "entries")),
      truncated && h("p", { className: "why warn" }, limitText(this.answer)),
      !truncated && !complete && h("p", { className: "why warn" }, missingText(this.answer)),
      h(
        "div",
        { className: "push" },
        h("label", { className: "check" }, all, "All columns"),
        button("CSV", () => this.#download("csv", "text/csv", csvOf(rows)), {
          "aria-label": "Download as CSV",
        }),
        button("JSON", () => this.#download("json", "application/json", json()), {
          "aria-label": "Download as JSON",
        }),
      ),
    );
  }

  #drawTable(isWhole) {
    const { rows } = this.answer;
    const shown = isWhole
      ? Object.keys(rows[0]).map((name) => [name, name])
      : ENTRY_COLUMNS.filter(([name]) => rows.some((row) => row[name] !== ""));
    const sorted = this.sort ? [...rows].sort((a, b) => compare(a, b, this.sort)) : rows;
    const head = shown.map(([name, label]) => {
      const isSorted = this.sort?.name === name;
      return h(
        "th",
        {
          scope: "col",
          className: name.endsWith("DESC") ? "" : "fit",
          role: "columnheader",
          "aria-sort": isSorted ? (this.sort.up ? "ascending" : "descending") : "none",
        },
        button(
          `${label}${isSorted ? (this.sort.up ? " ▲" : " ▼") : ""}`,
          () => {
            this.sort = { name, up: isSorted ? !this.sort.up : true };
            this.#drawTable(isWhole);
            this.holder.querySelector(`[data-name="${name}"]`).focus();
          },
          { "data-name": name },
        ),
      );
    });
    fill(
      this.holder,
      h(
        "table",
        { role: "table", className: isWhole ? "" : "cards sortable" },
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
                    className: name.endsWith("DESC")
                      ? "wide break"
                      : name === "ENTRYTIME"
                        ? "fit whole"
                        : "fit",
                  },
                  name === "ENTRYTIME" ? stamp(row[name]) : String(row[name]),
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
