// Conditions, chosen from the columns and fields. Their text form is COLUMN OPERATOR VALUE.

import { button, fill, h, select } from "./dom.js";

const FORM =
  /^\s*([A-Z]+|field\.[^\s=!<>~']+)\s*(!=|[<>]?=|<|>|contains\b|starts\b|matches\b|in\b)\s*([^]*)$/;
const NAMES = {
  ENTRYSRC: "Source",
  ENTRYDESC: "Description",
  ENTRYTYPE: "Type",
  ENTRYCLASS: "Class",
  ENTRYSYS: "System",
  ENTRYTIME: "Time",
};
const WORDS = {
  "=": "is",
  "!=": "is not",
  contains: "contains",
  starts: "starts with",
  matches: "matches",
  in: "is one of",
  ">=": "at least",
  "<=": "at most",
  "<": "less than",
  ">": "more than",
};
const FIRST = ["ENTRYSRC", "ENTRYDESC", "ENTRYTYPE", "ENTRYCLASS", "ENTRYSYS", "ENTRYTIME"];

const FIELD = "field."; // before the name of a field, in place of a column
const NUMBER = /^-?(?:\d+\.?\d*|\.\d+)(?:[eE]-?\d+)?$/;
const OF_TEXT = ["contains", "starts", "matches"];

const quote = (text) => `'${text.replaceAll("'", "''")}'`;

function unquote(text) {
  const inner = /^'((?:[^']|'')*)'\s*$/.exec(text);
  return inner ? inner[1].replaceAll("''", "'") : null;
}

/** The parts of a condition; null when its text alone can be shown and kept as it is. */
function parse(text) {
  const match = FORM.exec(text);
  if (!match) return null;
  const [, column, operator, value] = match;
  // A field is compared as a number or as text; only a value that cannot be the other keeps that.
  if (column.startsWith(FIELD)) {
    const inner = unquote(value);
    const isText = inner !== null && (!NUMBER.test(inner) || OF_TEXT.includes(operator));
    const plain = isText ? inner : NUMBER.test(value.trim()) ? value.trim() : null;
    return plain ? { column, operator, value: plain } : null;
  }
  if (operator === "in") {
    const list = /^\[([^]*)\]\s*$/.exec(value);
    const items = list && list[1].match(/'(?:[^']|'')*'|-?\d+/g);
    const values = items && items.map((item) => unquote(item) ?? item);
    // In one input a comma in an item looks like one between items, and outer blanks are lost.
    return values?.every((item) => item && item === item.trim() && !item.includes(","))
      ? { column, operator, value: values.join(", ") }
      : null;
  }
  const plain = unquote(value) ?? (/^-?\d+\s*$/.test(value) ? value.trim() : null);
  // An input that is left empty is not a condition yet.
  return plain ? { column, operator, value: plain } : null;
}

/** A list of conditions that a person edits. */
export class Conditions {
  #rows = [];
  #columns;
  #change;

  /** columns: those of /api/v1/columns; change() after every edit. */
  constructor(columns, texts, change) {
    this.#columns = columns;
    this.#change = change;
    this.list = h("div", { className: "stack-small" });
    this.suggestions = h("datalist", { id: "fields-of-the-log" });
    this.element = h(
      "fieldset",
      {},
      h("legend", {}, "Conditions (all must hold)"),
      this.list,
      this.suggestions,
      button("Add a condition", () => {
        this.#add(this.#chosen({ column: "ENTRYDESC", operator: "contains", value: "" })).focus();
        this.#change();
      }),
    );
    for (const text of texts) {
      const parts = parse(text);
      this.#add(parts ? this.#chosen(parts) : this.#raw(text));
    }
    this.#drawEmpty();
  }

  /** Offers names of fields: those of /api/v1/fields. */
  suggest(fields) {
    fill(
      this.suggestions,
      fields.map(({ name, example }) => h("option", { value: name, label: `${name}: ${example}` })),
    );
  }

  /** The conditions as texts; one without a value yet is left out. */
  get texts() {
    return this.#rows.filter((row) => !row.isBlank()).map((row) => row.text());
  }

  /** Puts problems beside their conditions; gives back those of other fields. */
  setProblems(problems) {
    for (const row of this.#rows) row.setProblem("");
    const shown = this.#rows.filter((row) => !row.isBlank());
    return problems.filter((problem) => {
      const match = /^(?:definition\.)?(?:when|where)(?:\[(\d+)\])?/.exec(problem.field);
      const row = match && shown[Number(match[1] ?? 0)];
      row?.setProblem(problem.detail);
      return !row;
    });
  }

  #drawEmpty() {
    if (this.#rows.length === 0)
      fill(
        this.list,
        h("p", { className: "hint" }, "No conditions: every entry of the log matches."),
      );
  }

  #add(row) {
    if (this.#rows.length === 0) fill(this.list);
    const number = this.#rows.length + 1;
    const problem = h("p", { className: "problem", hidden: true });
    row.setProblem = (detail) => {
      problem.textContent = detail;
      problem.hidden = !detail;
      row.input.toggleAttribute("aria-invalid", false);
      if (detail) row.input.setAttribute("aria-invalid", "true");
    };
    row.element.append(
      button(
        "Remove",
        () => {
          this.#rows.splice(this.#rows.indexOf(row), 1);
          row.element.remove();
          this.#drawEmpty();
          this.#change();
          this.element.querySelector(":scope > button").focus();
        },
        { "aria-label": `Remove condition ${number}` },
      ),
      problem,
    );
    this.#rows.push(row);
    this.list.append(row.element);
    return row.input;
  }

  #chosen({ column, operator, value }) {
    const known = [...this.#columns].sort(
      (a, b) => (FIRST.indexOf(a.name) + 1 || 99) - (FIRST.indexOf(b.name) + 1 || 99),
    );
    const changed = () => this.#change();
    const isField = () => columnBox.value === FIELD;
    const columnBox = select(
      [...known.map(({ name }) => [name, NAMES[name] ?? name]), [FIELD, "Field"]],
      column.startsWith(FIELD) ? FIELD : column,
      {
        "aria-label": "Column",
        onchange: () => {
          offer();
          changed();
        },
      },
    );
    const fieldBox = h("input", {
      className: "mono field-name",
      value: column.startsWith(FIELD) ? column.slice(FIELD.length) : "",
      placeholder: "name of the field",
      list: this.suggestions.id,
      "aria-label": "Field",
      spellcheck: false,
      autocomplete: "off",
      oninput: changed,
    });
    const operatorBox = h("select", {
      "aria-label": "Operator",
      onchange: () => {
        hint();
        changed();
      },
    });
    const input = h("input", {
      className: "value",
      value,
      "aria-label": "Value",
      spellcheck: false,
      autocomplete: "off",
      oninput: changed,
    });
    const isNumber = () => known.find(({ name }) => name === columnBox.value)?.type === "number";
    const offer = () => {
      const before = operatorBox.value || operator;
      const usable = Object.keys(WORDS).filter((key) => !isNumber() || !OF_TEXT.includes(key));
      fill(
        operatorBox,
        usable.map((key) => h("option", { value: key }, WORDS[key])),
      );
      operatorBox.value = usable.includes(before) ? before : "=";
      if (isField()) columnBox.after(fieldBox);
      else fieldBox.remove();
      hint();
    };
    const hint = () => {
      input.placeholder =
        operatorBox.value === "in"
          ? "one, two, three"
          : operatorBox.value === "matches"
            ? "a regular expression"
            : isNumber()
              ? "a number"
              : "text";
    };
    offer();
    const isBare = (text) =>
      isNumber() || (isField() && NUMBER.test(text.trim()) && !OF_TEXT.includes(operatorBox.value));
    const write = (text) => (isBare(text) ? text.trim() : quote(text));
    const fieldName = () => {
      const name = fieldBox.value.trim();
      return /^[^\s=!<>~']+$/.test(name) ? name : quote(name);
    };
    return {
      element: h(
        "div",
        { className: "condition", role: "group", "aria-label": "Condition" },
        columnBox,
        isField() && fieldBox,
        operatorBox,
        input,
      ),
      input,
      isBlank: () => input.value === "",
      text: () => {
        const items = input.value.split(",").map((item) => item.trim());
        const list = items.every(isBare) ? items : items.map(quote);
        const wanted = operatorBox.value === "in" ? `[${list.join(", ")}]` : write(input.value);
        const name = isField() ? FIELD + fieldName() : columnBox.value;
        return `${name} ${operatorBox.value} ${wanted}`;
      },
    };
  }

  #raw(text) {
    const input = h("input", {
      className: "mono",
      value: text,
      "aria-label": "Condition",
      spellcheck: false,
      oninput: () => this.#change(),
    });
    return {
      element: h("div", { className: "condition raw" }, input),
      input,
      isBlank: () => input.value.trim() === "",
      text: () => input.value.trim(),
    };
  }
}
