// Situations: what is watched for, how often it came, and their life.

import { get, post, request, situationPath, viewModule, withQuery } from "../api.js";
import { button, confirm, empty, failure, fill, h, loading, table } from "../dom.js";
import { ago, number } from "../format.js";

const EVERY = 5000;
export const STATES = {
  running: ["good", "Running"],
  stopped: ["warn", "Stopped"],
  failed: ["bad", "Failed"],
};

const COLUMNS = [
  { label: "State", className: "fit lead" },
  { label: "Situation", className: "wide" },
  { label: "Severity", className: "fit tail" },
  { label: "Log", className: "wide break" },
  { label: "Matched", className: "num" },
  { label: "Raised", className: "num" },
  { label: "Last raised", className: "fit" },
  { label: "Actions", className: "wide last", head: h("span", { className: "unseen" }, "Actions") },
];

export async function show(element, query) {
  if (query.has("new") || query.has("edit"))
    return (await viewModule("situation-form")).show(element, query.get("edit") || "", query);
  if (query.get("name")) return (await viewModule("situation")).show(element, query.get("name"));
  const list = h("section", { className: "panel flush", "aria-label": "Situations" }, loading());
  const note = h("div", { role: "alert" });
  fill(
    element,
    h(
      "div",
      { className: "head" },
      h("h1", {}, "Situations"),
      h(
        "div",
        { className: "push" },
        h("a", { className: "button primary", href: "#/situations?new" }, "New situation"),
      ),
    ),
    note,
    list,
  );
  let isDrawn = false;
  const load = async () => {
    try {
      const { situations } = await get("/api/v1/situations");
      isDrawn = true;
      const focused = list.contains(document.activeElement)
        ? document.activeElement.dataset.key
        : null;
      draw(list, situations, act);
      if (focused) list.querySelector(`[data-key="${CSS.escape(focused)}"]`)?.focus();
    } catch (error) {
      if (!isDrawn) fill(list, failure(error, load));
    }
  };
  const act = async (action) => {
    fill(note);
    try {
      await action();
    } catch (error) {
      fill(note, h("p", { className: "problem" }, error.message));
    }
    await load();
  };
  await load();
  const timer = setInterval(() => !document.hidden && load(), EVERY);
  return () => clearInterval(timer);
}

/** Where a situation was looked for that there is none of. */
export function notThere(name) {
  return [
    h("h1", { className: "unseen" }, name),
    empty(
      "No such situation",
      `No situation is called ${name}. It may have been deleted, or removed from the ` +
        "configuration file.",
      h("a", { className: "button", href: "#/situations" }, "All situations"),
    ),
  ];
}

function draw(element, situations, act) {
  if (situations.length === 0) {
    fill(
      element,
      empty(
        "No situations yet",
        "A situation says which entries are worth an event: a log, conditions on its columns, " +
          "and optionally how often they must come.",
        h("a", { className: "button primary", href: "#/situations?new" }, "New situation"),
      ),
    );
    return;
  }
  const rows = [...situations].sort(
    (a, b) =>
      (a.state === "failed" ? 0 : 1) - (b.state === "failed" ? 0 : 1) ||
      a.name.localeCompare(b.name),
  );
  fill(
    element,
    table(
      "Situations",
      COLUMNS,
      rows.map((situation) => cells(situation, act)),
      { className: "cards" },
    ),
  );
}

function cells(situation, act) {
  const [level, state] = STATES[situation.state] || ["", situation.state];
  return [
    h("span", { className: `state ${level}` }, state),
    h(
      "div",
      {},
      h(
        "a",
        {
          href: withQuery("#/situations", { name: situation.name }),
          "data-key": `open ${situation.name}`,
        },
        situation.name,
      ),
      situation.text && h("p", { className: "why" }, situation.text),
      situation.source === "file" && h("p", { className: "why" }, "From the configuration file"),
      situation.problem && h("p", { className: "why bad" }, situation.problem),
    ),
    h("span", { className: `severity ${situation.severity}` }, situation.severity),
    situation.log || "any log",
    number(situation.counts.matched),
    number(situation.counts.raised),
    h("span", { title: situation.last_raised || "" }, ago(situation.last_raised)),
    actions(situation, act),
  ];
}

/** Stop or start, edit, delete. What the configuration file holds is changed there. */
export function actions(situation, act, gone = () => {}) {
  const { name } = situation;
  const isOurs = situation.source === "api";
  const verb = situation.state === "stopped" ? "start" : "stop";
  return h(
    "div",
    { className: "actions" },
    button(verb === "start" ? "Start" : "Stop", () => act(() => post(situationPath(name, verb))), {
      "aria-label": `${verb === "start" ? "Start" : "Stop"} ${name}`,
      "data-key": `life ${name}`,
    }),
    isOurs &&
      h(
        "a",
        {
          className: "button",
          href: withQuery("#/situations", { edit: name }),
          "aria-label": `Edit ${name}`,
          "data-key": `edit ${name}`,
        },
        "Edit",
      ),
    isOurs &&
      button(
        "Delete",
        async () => {
          if (
            !(await confirm(
              `Delete ${name}?`,
              "It will raise no more events. Events already raised stay in the history.",
              "Delete",
            ))
          )
            return;
          await act(async () => {
            await request("DELETE", situationPath(name));
            gone();
          });
        },
        { "aria-label": `Delete ${name}`, "data-key": `delete ${name}` },
      ),
  );
}
