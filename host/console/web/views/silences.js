// Silences: which events are kept from the sinks, until when and why.

import { get, post, request, withQuery } from "../api.js";
import { button, confirm, empty, failure, field, fill, h, loading, table } from "../dom.js";
import { ago, number, plural, time } from "../format.js";

const EVERY = 5000;
const MATCHERS = [
  ["situation", "Situation"],
  ["log", "Log"],
  ["severity", "Severity"],
  ["node", "Node"],
];
const WHO = "zrm-who"; // the name that was typed last, for the next time

const COLUMNS = [
  { label: "State", className: "fit lead" },
  { label: "Matches", className: "wide break" },
  { label: "Until", className: "fit whole" },
  { label: "Events", className: "num" },
  { label: "Who and why", className: "wide break" },
  { label: "Actions", className: "fit last", head: h("span", { className: "unseen" }, "Actions") },
];

/** What a silence matches, as a text. */
export function matchText(match) {
  const parts = MATCHERS.filter(([key]) => match[key]).map(([key]) => `${key} = ${match[key]}`);
  for (const [name, value] of Object.entries(match.group ?? {})) parts.push(`${name} = ${value}`);
  return parts.join(", ") || "every event";
}

export async function show(element, query) {
  const page = new SilencesPage(element);
  const wanted = [...query.keys()].some((key) => key !== "id");
  if (wanted) page.openForm(query);
  await page.load();
  const timer = setInterval(() => !document.hidden && page.load(), EVERY);
  return () => clearInterval(timer);
}

class SilencesPage {
  constructor(element) {
    this.withExpired = h("input", { type: "checkbox", onchange: () => this.load() });
    this.note = h("div", { role: "alert" });
    this.form = h("section", { className: "panel", "aria-label": "New silence", hidden: true });
    this.list = h("section", { className: "panel flush", "aria-label": "Silences" }, loading());
    fill(
      element,
      h(
        "div",
        { className: "head" },
        h("h1", {}, "Silences"),
        h(
          "div",
          { className: "push" },
          h("label", { className: "check" }, this.withExpired, " Also those that are over"),
          button("New silence", () => this.openForm(new URLSearchParams()), {
            className: "primary",
          }),
        ),
      ),
      this.note,
      this.form,
      this.list,
    );
  }

  async load() {
    try {
      const state = this.withExpired.checked ? "" : "active";
      this.#draw(await get(withQuery("/api/v1/silences", { state })));
    } catch (error) {
      if (!this.isDrawn)
        fill(
          this.list,
          failure(error, () => this.load()),
        );
    }
  }

  #draw({ silences, kept }) {
    this.isDrawn = true;
    const focused = this.list.contains(document.activeElement)
      ? document.activeElement.dataset.key
      : null;
    const off =
      !kept && h("p", { className: "note" }, "The history is off: silences end with the agent.");
    if (silences.length === 0)
      fill(
        this.list,
        off,
        empty(
          "No silence",
          "A silence keeps events from the sinks for a while, during maintenance for example. " +
            "The history still has them.",
        ),
      );
    else
      fill(
        this.list,
        off,
        table(
          "Silences",
          COLUMNS,
          silences.map((silence) => this.#cells(silence)),
          { className: "cards" },
        ),
      );
    if (focused) this.list.querySelector(`[data-key="${CSS.escape(focused)}"]`)?.focus();
  }

  #cells(silence) {
    const isActive = silence.state === "active";
    return [
      h("span", { className: `state ${isActive ? "warn" : ""}` }, isActive ? "Active" : "Over"),
      matchText(silence.match),
      silence.expired ? time(silence.expired) : time(silence.until),
      h(
        "span",
        { title: silence.last ? `The latest ${ago(silence.last)}` : "" },
        number(silence.events),
      ),
      h(
        "div",
        {},
        silence.why,
        h(
          "p",
          { className: "why" },
          `${silence.who}, ${time(silence.created)}`,
          silence.expired && `; expired by ${silence.expired_by || "somebody"}`,
        ),
      ),
      h(
        "div",
        { className: "actions" },
        isActive &&
          button("Expire", () => this.#expire(silence), {
            "aria-label": `Expire silence ${silence.id}`,
            "data-key": `expire ${silence.id}`,
          }),
      ),
    ];
  }

  async #expire(silence) {
    const held = plural(silence.events, "event");
    const isMeant = await confirm(
      "Expire this silence?",
      `It matches ${matchText(silence.match)}, and has held back ${held}. New ones are delivered.`,
      "Expire",
    );
    if (!isMeant) return;
    fill(this.note);
    try {
      const who = localStorage.getItem(WHO) || "";
      await request("DELETE", `/api/v1/silences/${silence.id}`, { who });
    } catch (error) {
      fill(this.note, h("p", { className: "problem" }, error.message));
    }
    await this.load();
  }

  /** The form for a new silence, which begins with what the query names. */
  openForm(query) {
    const text = (label, value, hint, properties = {}) =>
      field(
        label,
        h("input", { value, autocomplete: "off", spellcheck: false, ...properties }),
        hint,
      );
    const rows = Object.fromEntries(
      MATCHERS.map(([key, label]) => [`match.${key}`, text(label, query.get(key) || "")]),
    );
    const groups = [...query.entries()].filter(([key]) => key.startsWith("group."));
    rows["match.group"] = text(
      "Group",
      groups.map(([key, value]) => `${key.slice("group.".length)}=${value}`).join(", "),
      "Values of the event's group, such as ip=10.0.0.7; several with commas between.",
    );
    rows.until = text("Until", "2h", "A time, or how long: 90s, 5m, 2h, 1d.", { required: true });
    rows.who = text("Your name", localStorage.getItem(WHO) || "", "", { required: true });
    rows.why = text("Reason", "", "For others to read.", { required: true });
    const problem = h("div", { role: "alert" });
    fill(
      this.form,
      h("h2", {}, "New silence"),
      h(
        "form",
        {
          onsubmit: (event) => {
            event.preventDefault();
            this.#create(rows, problem);
          },
        },
        h(
          "p",
          { className: "hint" },
          "Events that match all of this are kept from the sinks. * stands for any characters; " +
            "what is empty matches everything.",
        ),
        h("div", { className: "toolbar form" }, Object.values(rows)),
        problem,
        h(
          "p",
          { className: "actions" },
          h("button", { className: "primary" }, "Silence"),
          button("Cancel", () => (this.form.hidden = true)),
        ),
      ),
    );
    this.form.hidden = false;
    (query.size > 0 ? rows.why : rows["match.situation"]).control.focus();
  }

  async #create(rows, problem) {
    for (const row of Object.values(rows)) row.setProblem("");
    fill(problem);
    const match = {};
    for (const [key] of MATCHERS) {
      const pattern = rows[`match.${key}`].control.value.trim();
      if (pattern) match[key] = pattern;
    }
    for (const pair of rows["match.group"].control.value.split(",")) {
      const [name, ...rest] = pair.split("=");
      if (!name.trim()) continue;
      match.group ??= {};
      match.group[name.trim()] = rest.join("=").trim();
    }
    const who = rows.who.control.value.trim();
    try {
      await post("/api/v1/silences", {
        match,
        until: rows.until.control.value.trim(),
        who,
        why: rows.why.control.value.trim(),
      });
    } catch (error) {
      const row = rows[error.field];
      if (row) row.setProblem(error.message);
      else fill(problem, h("p", { className: "problem" }, error.message));
      return;
    }
    localStorage.setItem(WHO, who);
    this.form.hidden = true;
    history.replaceState(null, "", "#/silences");
    await this.load();
  }
}
