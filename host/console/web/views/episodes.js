// Episodes: which situations last now, and who works on them.

import { get, post, request, withQuery } from "../api.js";
import { button, confirm, empty, failure, field, fill, h, loading, select, table } from "../dom.js";
import { ago, number, time } from "../format.js";
import { silenceLink } from "../silenced.js";

const EVERY = 5000;
const WHO = "zrm-who"; // the name that was typed last, for the next time
const STATES = [
  ["open", "Open"],
  ["resolved", "Resolved"],
  ["", "All"],
];

const COLUMNS = [
  { label: "State", className: "fit lead" },
  { label: "Severity", className: "fit" },
  { label: "Situation", className: "wide break" },
  { label: "Since", className: "fit whole" },
  { label: "Entries", className: "num" },
  { label: "Acknowledged", className: "wide break" },
  {
    label: "Actions",
    className: "fit last whole",
    head: h("span", { className: "unseen" }, "Actions"),
  },
];

const groupText = (group) =>
  Object.entries(group)
    .map(([name, value]) => `${name}=${value}`)
    .join(" ");

function stateOf({ state, acknowledged }) {
  if (state === "resolved") return ["", "Resolved"];
  return acknowledged ? ["warn", "Acknowledged"] : ["bad", "Open"];
}

export async function show(element) {
  const page = new EpisodesPage(element);
  await page.load();
  const timer = setInterval(() => !document.hidden && page.load(), EVERY);
  return () => clearInterval(timer);
}

class EpisodesPage {
  constructor(element) {
    this.state = select(STATES, "open", { onchange: () => this.load() });
    this.note = h("div", { role: "alert" });
    this.form = h("section", { className: "panel", "aria-label": "Acknowledge", hidden: true });
    this.list = h("section", { className: "panel flush", "aria-label": "Episodes" }, loading());
    fill(
      element,
      h("div", { className: "head" }, h("h1", {}, "Episodes")),
      h(
        "div",
        { className: "toolbar", role: "group", "aria-label": "Filter" },
        field("State", this.state),
      ),
      this.note,
      this.form,
      this.list,
    );
  }

  async load() {
    const state = this.state.value;
    try {
      const answer = await get(withQuery("/api/v1/episodes", { state }));
      const content = JSON.stringify([state, answer]);
      // Buttons stay while nothing is new: somebody may be using them.
      if (state !== this.state.value || content === this.drawn) return;
      this.#draw(answer);
      this.drawn = content;
    } catch (error) {
      if (!this.drawn)
        fill(
          this.list,
          error.status === 409
            ? empty(
                "The history is off",
                "Episodes are kept in the history. Set enabled = true under [history] in the " +
                  "agent's configuration and restart it.",
              )
            : failure(error, () => this.load()),
        );
    }
  }

  #draw({ episodes, next }) {
    const focused = this.list.contains(document.activeElement)
      ? document.activeElement.dataset.key
      : null;
    if (episodes.length === 0)
      fill(
        this.list,
        empty(
          this.state.value === "open" ? "No open episode" : "No episode",
          "A situation with resolve_after has an episode from its first event until nothing more " +
            "has come for that long.",
        ),
      );
    else
      fill(
        this.list,
        table(
          "Episodes",
          COLUMNS,
          episodes.map((episode) => this.#cells(episode)),
          { className: "cards" },
        ),
        next !== null &&
          h("p", { className: "note" }, `The latest ${number(episodes.length)} are shown.`),
      );
    if (focused) this.list.querySelector(`[data-key="${CSS.escape(focused)}"]`)?.focus();
  }

  #cells(episode) {
    const [level, text] = stateOf(episode);
    const by = episode.acknowledged;
    return [
      h("span", { className: `state ${level}` }, text),
      h("span", { className: `severity ${episode.severity}` }, episode.severity),
      h(
        "div",
        {},
        h(
          "a",
          { href: withQuery("#/events", { situation: episode.situation }) },
          episode.situation,
        ),
        ` ${groupText(episode.group)}`,
        h("p", { className: "why" }, episode.log, episode.reason && `; ${episode.reason}`),
      ),
      h("span", { title: `The latest entry ${ago(episode.last)}` }, time(episode.raised)),
      number(episode.count),
      by && h("div", {}, by.note, h("p", { className: "why" }, `${by.who}, ${time(by.time)}`)),
      h("div", { className: "actions" }, this.#actions(episode)),
    ];
  }

  #actions(episode) {
    if (episode.state !== "open") return null;
    const change = episode.acknowledged
      ? button("Withdraw", () => this.#withdraw(episode), {
          "aria-label": `Withdraw the acknowledgement of episode ${episode.id}`,
          "data-key": `withdraw ${episode.id}`,
        })
      : button("Acknowledge", () => this.#openForm(episode), {
          "aria-label": `Acknowledge episode ${episode.id}`,
          "data-key": `acknowledge ${episode.id}`,
        });
    return [change, silenceLink(episode, episode.log, "Silence")];
  }

  #openForm(episode) {
    const row = (label, value, properties = {}) =>
      field(label, h("input", { value, autocomplete: "off", maxLength: 1024, ...properties }));
    const rows = {
      who: row("Your name", localStorage.getItem(WHO) || "", { required: true }),
      note: row("Note", ""),
    };
    const problem = h("div", { role: "alert" });
    fill(
      this.form,
      h("h2", {}, `Acknowledge ${episode.situation} ${groupText(episode.group)}`),
      h(
        "form",
        {
          onsubmit: (event) => {
            event.preventDefault();
            this.#acknowledge(episode, rows, problem);
          },
        },
        h(
          "p",
          { className: "hint" },
          "Others see that you work on it. Sinks and alerts do not change.",
        ),
        h("div", { className: "toolbar form" }, Object.values(rows)),
        problem,
        h(
          "p",
          { className: "actions" },
          h("button", { className: "primary" }, "Acknowledge"),
          button("Cancel", () => (this.form.hidden = true)),
        ),
      ),
    );
    this.form.hidden = false;
    (rows.who.control.value ? rows.note : rows.who).control.focus();
  }

  async #acknowledge(episode, rows, problem) {
    for (const row of Object.values(rows)) row.setProblem("");
    fill(problem);
    const who = rows.who.control.value.trim();
    try {
      const note = rows.note.control.value.trim();
      await post(`/api/v1/episodes/${episode.id}/ack`, { who, note });
    } catch (error) {
      const row = rows[error.field];
      if (row) row.setProblem(error.message);
      else fill(problem, h("p", { className: "problem" }, error.message));
      return;
    }
    localStorage.setItem(WHO, who);
    this.form.hidden = true;
    await this.load();
  }

  async #withdraw(episode) {
    const isMeant = await confirm(
      "Withdraw this acknowledgement?",
      `${episode.acknowledged.who} has acknowledged it: ${episode.acknowledged.note || "no note"}.`,
      "Withdraw",
    );
    if (!isMeant) return;
    fill(this.note);
    try {
      await request("DELETE", `/api/v1/episodes/${episode.id}/ack`);
    } catch (error) {
      fill(this.note, h("p", { className: "problem" }, error.message));
    }
    await this.load();
  }
}
