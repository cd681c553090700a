// One situation: its definition, its counts, a backtest, and why it matches an entry or not.

import { get, situationPath, withQuery } from "../api.js";
import { failure, fill, h, link, loading } from "../dom.js";
import { ago, frequencyText, number, time } from "../format.js";
import { explainPanel, previewPanel } from "../situation-tools.js";
import { actions, notThere, STATES } from "./situations.js";

const EVERY = 5000;

export async function show(element, name) {
  fill(element, loading());
  const page = new SituationPage(element, name);
  await page.load();
  const timer = setInterval(() => !document.hidden && page.refresh(), EVERY);
  return () => clearInterval(timer);
}

class SituationPage {
  constructor(element, name) {
    this.element = element;
    this.name = name;
    this.note = h("div", { role: "alert" });
    this.state = h("span", { className: "state" });
    this.actions = h("div", { className: "push" });
    this.definition = h("section", { className: "panel", "aria-label": "Definition and counts" });
  }

  async load() {
    try {
      this.situation = await get(situationPath(this.name));
    } catch (error) {
      fill(
        this.element,
        error.status === 404 ? notThere(this.name) : failure(error, () => this.load()),
      );
      return;
    }
    const preview = previewPanel(() => ({ situation: this.name }));
    this.#draw();
    fill(
      this.element,
      h("div", { className: "head" }, h("h1", {}, this.name), this.state, this.actions),
      this.note,
      h(
        "div",
        { className: "split" },
        this.definition,
        h(
          "div",
          { className: "stack" },
          preview.element,
          explainPanel(
            () => ({ situation: this.name }),
            () => this.situation.log,
          ).element,
        ),
      ),
    );
    preview.update();
  }

  /** State and counts; what is typed beside them stays. */
  async refresh() {
    if (!this.definition.isConnected) return;
    try {
      this.situation = await get(situationPath(this.name));
    } catch (error) {
      if (error.status === 404)
        fill(this.note, h("p", { className: "problem" }, "This situation no longer exists."));
      return;
    }
    this.#draw();
  }

  #draw() {
    const [level, state] = STATES[this.situation.state] || ["", this.situation.state];
    this.state.className = `state ${level}`;
    this.state.textContent = state;
    fill(this.definition, definition(this.situation));
    if (this.drawnFor === state) return; // a button that has the focus keeps it
    const focused = this.actions.contains(document.activeElement)
      ? document.activeElement.dataset.key
      : null;
    this.drawnFor = state;
    fill(
      this.actions,
      actions(
        this.situation,
        (action) => this.#act(action),
        () => {
          location.hash = "#/situations";
        },
      ),
      h("a", { className: "button", href: "#/situations" }, "All situations"),
    );
    if (focused) this.actions.querySelector(`[data-key="${CSS.escape(focused)}"]`)?.focus();
  }

  async #act(action) {
    fill(this.note);
    try {
      await action();
    } catch (error) {
      fill(this.note, h("p", { className: "problem" }, error.message));
      return;
    }
    if (location.hash.includes("name=")) await this.refresh();
  }
}

const JUDGED = [
  ["group_by", "Judged apart"],
  ["distinct", "Counted"],
  ["then", "Raised by"],
  ["resolve_after", "Over after"],
  ["cooldown", "Pause"],
];

function definition(situation) {
  const { counts } = situation;
  const pairs = [
    ["Text", situation.text || "–"],
    ["Severity", h("span", { className: `severity ${situation.severity}` }, situation.severity)],
    ["Log", situation.log || "any log"],
    [
      "Conditions",
      situation.when.length > 0
        ? situation.when.map((text) => h("div", {}, h("code", {}, text)))
        : "none: every entry",
    ],
    [
      "Frequency",
      situation.frequency
        ? `raised by ${frequencyText(situation.frequency, situation.period)}`
        : situation.absent
          ? `raised when none has come for ${situation.absent}`
          : "every match is raised",
    ],
    ...JUDGED.filter(([key]) => situation[key]).map(([key, name]) => [
      name,
      [situation[key]].flat().join(", "),
    ]),
    ["Entries before it", situation.context || "none"],
    ...(situation.runbook ? [["Runbook", link(situation.runbook)]] : []),
    ...Object.entries(situation.labels ?? {}).map(([name, value]) => [`Label ${name}`, value]),
    [
      "Comes from",
      situation.source === "file"
        ? "the configuration file; change it there"
        : "this console or the API",
    ],
    ["Entries judged", number(counts.offered)],
    ["Matched", number(counts.matched)],
    ["Held back", `${number(counts.discarded)} by the frequency`],
    ["Raised", `${number(counts.raised)} since the agent's start`],
    [
      "Last raised",
      situation.last_raised
        ? `${time(situation.last_raised)} (${ago(situation.last_raised)})`
        : "never",
    ],
  ];
  return [
    situation.problem && h("p", { className: "problem" }, situation.problem),
    h(
      "dl",
      { className: "pairs" },
      pairs.map(([key, value]) => [h("dt", {}, key), h("dd", {}, value)]),
    ),
    h(
      "p",
      {},
      h(
        "a",
        { href: withQuery("#/events", { situation: situation.name }) },
        "Events of this situation",
      ),
    ),
  ];
}
