// Which columns and fields a report shows, chosen by a person.

import { button, fill, h } from "./dom.js";
import { ENTRY_COLUMNS } from "./format.js";

const OFFERED = 60; // fields with a box of their own; others are found by typing

const LABELS = new Map(ENTRY_COLUMNS);

/** Before the name of a field, in place of a column; as in conditions. */
export const FIELD = "field.";

/** What a row has in a column or a field. */
export function valueOf(row, name) {
  return name.startsWith(FIELD)
    ? row.fields && Object.hasOwn(row.fields, name.slice(FIELD.length))
      ? row.fields[name.slice(FIELD.length)]
      : ""
    : row[name];
}

export class ReportColumns {
  #columns = new Set(ENTRY_COLUMNS.map(([name]) => name));
  #fields = new Set();
  #seen = []; // fields of the log, the most frequent first
  #change;

  /** columns: those of /api/v1/columns; change() after each choice. */
  constructor(columns, change) {
    this.#change = change;
    this.known = columns.map(({ name }) => name);
    this.columnBoxes = h("div", { className: "choices" });
    this.fieldBoxes = h("div", { className: "choices" });
    this.names = h("datalist", { id: "fields-to-show" });
    this.hint = h("p", { className: "hint", role: "status" });
    this.other = h("input", {
      className: "mono field-name",
      list: this.names.id,
      placeholder: "name of the field",
      "aria-label": "Another field to show",
      spellcheck: false,
      autocomplete: "off",
      onkeydown: (event) => {
        if (event.key === "Enter") {
          event.preventDefault();
          this.#addOther();
        }
      },
    });
    this.element = h(
      "details",
      { className: "chooser" },
      h("summary", {}, "Columns and fields"),
      h(
        "fieldset",
        {},
        h("legend", {}, "Columns"),
        this.columnBoxes,
        h(
          "p",
          { className: "actions" },
          button("All columns", () => this.#setColumns(this.known)),
          button("Usual columns", () => this.#setColumns(LABELS.keys())),
        ),
      ),
      h(
        "fieldset",
        {},
        h("legend", {}, "Fields"),
        this.fieldBoxes,
        this.names,
        h(
          "p",
          { className: "actions" },
          this.other,
          button("Show this field", () => this.#addOther()),
        ),
        this.hint,
      ),
    );
    this.#drawColumns();
    this.suggest([]);
  }

  /** The names of the chosen columns, in their order in the table. */
  get columns() {
    return this.known.filter((name) => this.#columns.has(name));
  }

  /** The names of the chosen fields, in the order of the choice. */
  get fields() {
    return [...this.#fields];
  }

  /** Another log was chosen: its fields are not known yet. */
  forget() {
    this.#fields.clear();
    this.suggest([]);
  }

  /** Offers the fields of the log: those of /api/v1/fields. */
  suggest(fields) {
    this.#seen = fields;
    fill(
      this.names,
      fields.map(({ name, example }) => h("option", { value: name, label: `${name}: ${example}` })),
    );
    this.#drawFields();
  }

  /** Says which of the chosen fields the report shown last was not asked for. */
  setAsked(fields) {
    const missing = this.fields.filter((name) => !fields.includes(name));
    this.hint.textContent =
      missing.length > 0 ? `Run the report again to read ${missing.join(", ")}.` : "";
  }

  #setColumns(names) {
    this.#columns = new Set(names);
    this.#drawColumns();
    this.#change();
  }

  #addOther() {
    const name = this.other.value.trim().replace(/^field\./, "");
    if (!name) return;
    this.#fields.add(name);
    this.other.value = "";
    this.#drawFields();
    this.#change();
  }

  #drawColumns() {
    fill(
      this.columnBoxes,
      this.known.map((name) => this.#box(LABELS.get(name) ?? name, this.#columns, name)),
    );
  }

  #drawFields() {
    const offered = this.#seen.slice(0, OFFERED).map(({ name }) => name);
    const names = [...offered, ...this.fields.filter((name) => !offered.includes(name))];
    fill(
      this.fieldBoxes,
      names.length > 0
        ? names.map((name) => this.#box(name, this.#fields, name))
        : h("p", { className: "hint" }, "No fields were seen in the latest entries of this log."),
    );
  }

  #box(label, chosen, name) {
    const box = h("input", {
      type: "checkbox",
      checked: chosen.has(name),
      onchange: () => {
        if (box.checked) chosen.add(name);
        else chosen.delete(name);
        this.#change();
      },
    });
    return h("label", { className: "check" }, box, label);
  }
}
