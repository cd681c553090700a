// Makes a situation, or changes one.

import { get, post, request, situationPath, withQuery } from "../api.js";
import { Conditions } from "../conditions.js";
import { debounce, field, fill, h, select } from "../dom.js";
import { COMPARISONS, SEVERITIES } from "../format.js";
import { explainPanel, previewPanel } from "../situation-tools.js";
import { notThere } from "./situations.js";

const BLANK = {
  name: "",
  text: "",
  severity: "warning",
  log: null,
  when: [],
  frequency: null,
  period: null,
  context: 0,
  runbook: null,
  labels: {},
};
// Not edited here, and not to be lost.
const KEPT = ["labels", "group_by", "max_groups", "distinct", "then", "resolve_after", "cooldown"];
const ANY = "*"; // no log has this path
const UNITS = [
  ["s", "seconds"],
  ["m", "minutes"],
  ["h", "hours"],
  ["d", "days"],
];

export async function show(element, name, query) {
  const given = async () => {
    try {
      return name ? await get(situationPath(name)) : { ...BLANK, log: query.get("log") };
    } catch (error) {
      if (error.status === 404) return null;
      throw error;
    }
  };
  const [situation, { logs }, { columns }] = await Promise.all([
    given(),
    get("/api/v1/logs"),
    get("/api/v1/columns"),
  ]);
  if (!situation) {
    fill(element, notThere(name));
    return;
  }
  new Form(element, name, situation, logs.map(({ log }) => log).sort(), columns);
}

class Form {
  constructor(element, name, situation, logs, columns) {
    this.name = name;
    this.kept = Object.fromEntries(
      KEPT.filter((key) => situation[key] !== undefined).map((key) => [key, situation[key]]),
    );
    this.version = situation.version;
    const changed = () => this.changed();
    if (situation.log && !logs.includes(situation.log)) logs.unshift(situation.log);
    this.fields = {
      name: field(
        "Name",
        h("input", {
          value: situation.name,
          required: true,
          disabled: Boolean(name),
          autocomplete: "off",
          oninput: changed,
        }),
        name ? "" : "Short, and not used yet, for example ssh-bruteforce",
      ),
      text: field(
        "Text",
        h("input", { value: situation.text, autocomplete: "off", oninput: changed }),
        "Shown to people when it is raised; {count}, {ENTRYSYS} and the like stand for what it has",
      ),
      runbook: field(
        "Runbook",
        h("input", {
          type: "url",
          value: situation.runbook || "",
          autocomplete: "off",
          oninput: changed,
        }),
        "The address of a page that says what to do",
      ),
      context: field(
        "Entries before it",
        h("input", {
          type: "number",
          min: 0,
          max: 100,
          value: situation.context,
          oninput: changed,
        }),
        "How many earlier lines of the log an event keeps, for logs of [[log]]",
      ),
      absent: field(
        "Missed after",
        h("input", {
          value: situation.absent || "",
          autocomplete: "off",
          placeholder: "1h",
          oninput: changed,
        }),
        "Raise it when no such entry has come for this long, rather than for each entry",
      ),
      severity: field("Severity", select(SEVERITIES, situation.severity, { onchange: changed })),
      log: field(
        "Log",
        select(
          [["", "Choose a log"], ...logs, [ANY, "Any log"]],
          situation.log || (name ? ANY : ""),
          {
            onchange: () => {
              changed();
              this.#suggest();
            },
          },
        ),
      ),
    };
    this.conditions = new Conditions(columns, situation.when, changed);
    this.repeats = this.#repeats(situation, changed);
    this.preview = previewPanel(() => ({ definition: this.definition }));
    this.explain = explainPanel(
      () => ({ definition: this.definition }),
      () => (this.fields.log.control.value ? this.definition.log : undefined),
    );
    this.problem = h("p", { className: "problem", role: "alert" });
    this.save = h("button", { className: "primary" }, name ? "Save changes" : "Create situation");
    fill(
      element,
      h("div", { className: "head" }, h("h1", {}, name ? `Edit ${name}` : "New situation")),
      h(
        "div",
        { className: "split" },
        h(
          "form",
          {
            className: "panel",
            noValidate: true,
            onsubmit: (event) => {
              event.preventDefault();
              this.#save();
            },
          },
          h("div", { className: "fields" }, this.fields.name, this.fields.text),
          h("div", { className: "fields" }, this.fields.log, this.fields.severity),
          this.conditions.element,
          this.repeats.element,
          h("div", { className: "fields" }, this.fields.absent),
          h("div", { className: "fields" }, this.fields.context, this.fields.runbook),
          this.problem,
          h(
            "p",
            { className: "actions" },
            this.save,
            h("a", { className: "button", href: "#/situations" }, "Cancel"),
          ),
        ),
        h("div", { className: "stack" }, this.preview.element, this.explain.element),
      ),
    );
    this.check = debounce(() => this.#validate(), 350);
    this.#validate();
    this.#suggest();
  }

  #repeats(situation, changed) {
    const [, operator, count] = /^\s*(\S+)\s+(\d+)/.exec(situation.frequency || "") || [
      null,
      ">=",
      "5",
    ];
    const [, length, unit] = /^(\d+)\s*([smhd])/.exec(situation.period || "") || [null, "60", "s"];
    const isOn = h("input", {
      type: "checkbox",
      checked: Boolean(situation.frequency),
      onchange: () => {
        draw();
        changed();
      },
    });
    const compare = select(COMPARISONS, operator, { "aria-label": "How often", onchange: changed });
    const times = h("input", {
      type: "number",
      min: 0,
      value: count,
      "aria-label": "Times",
      oninput: changed,
    });
    const period = h("input", {
      type: "number",
      min: 1,
      value: length,
      "aria-label": "Period",
      oninput: changed,
    });
    const units = select(UNITS, unit, { "aria-label": "Unit of the period", onchange: changed });
    const more = h("div", { className: "inline" }, compare, times, "times within", period, units);
    const problem = h("p", { className: "problem", hidden: true });
    const draw = () => {
      more.hidden = !isOn.checked;
    };
    draw();
    return {
      element: h(
        "fieldset",
        {},
        h("legend", {}, "Frequency"),
        h("label", { className: "check" }, isOn, "Raise depending on how often such entries come"),
        more,
        problem,
      ),
      get value() {
        return isOn.checked
          ? {
              frequency: `${compare.value} ${times.value}`,
              period: `${period.value}${units.value}`,
            }
          : { frequency: null, period: null };
      },
      setProblem(text) {
        problem.textContent = text;
        problem.hidden = !text;
      },
    };
  }

  get definition() {
    const { name, text, severity, log, context, runbook, absent } = this.fields;
    return {
      name: name.control.value.trim(),
      text: text.control.value,
      severity: severity.control.value,
      log: [ANY, ""].includes(log.control.value) ? null : log.control.value,
      when: this.conditions.texts,
      ...this.repeats.value,
      context: Number(context.control.value),
      runbook: runbook.control.value.trim() || null,
      absent: absent.control.value.trim() || null,
      ...this.kept,
    };
  }

  changed() {
    this.explain.update();
    this.check();
  }

  /** The names of the chosen log's fields; they only save typing. */
  async #suggest() {
    const { log } = this.definition;
    try {
      const { fields } = log ? await get(withQuery("/api/v1/fields", { log })) : { fields: [] };
      this.conditions.suggest(fields);
    } catch {
      this.conditions.suggest([]);
    }
  }

  #missing() {
    const { name } = this.definition;
    if (!this.fields.log.control.value) return "Choose a log to see what it would have done.";
    return name ? "" : "Give it a name to see what it would have done.";
  }

  async #validate() {
    const missing = this.#missing();
    if (missing) {
      this.#show([]);
      this.preview.clear(missing);
      return true;
    }
    try {
      const body = this.definition;
      const { problems } = await post("/api/v1/situations/validate", body);
      const ours = problems.filter((problem) => !(this.name && problem.field === "name"));
      this.#show(ours);
      if (ours.length > 0)
        this.preview.clear("Correct what is marked to see what it would have done.");
      else this.preview.update();
      return ours.length === 0;
    } catch (error) {
      this.problem.textContent = error.message;
      return false;
    }
  }

  /** Puts each problem beside its field. */
  #show(problems) {
    this.problem.textContent = "";
    for (const one of Object.values(this.fields)) one.setProblem("");
    this.repeats.setProblem("");
    for (const { field: place, detail } of this.conditions.setProblems(problems)) {
      const key = place.replace(/^definition\./, "");
      if (this.fields[key]) this.fields[key].setProblem(detail);
      else if (key === "frequency" || key === "period") this.repeats.setProblem(detail);
      else this.problem.textContent = detail;
    }
  }

  async #save() {
    const { name } = this.definition;
    const log = this.fields.log.control.value;
    if (!name) this.fields.name.setProblem("A situation needs a name.");
    if (!log) this.fields.log.setProblem("Choose the log to watch.");
    if (!name || !log) {
      this.fields[name ? "log" : "name"].control.focus();
      return;
    }
    this.save.disabled = true;
    try {
      // Refused if somebody else has changed it since.
      const change = { ...this.definition, version: this.version };
      if (this.name) await request("PUT", situationPath(this.name), change);
      else await post("/api/v1/situations", this.definition);
      location.hash = `#/situations?name=${encodeURIComponent(name)}`;
    } catch (error) {
      this.#show([{ field: error.field, detail: error.message }]);
    }
    this.save.disabled = false;
  }
}
