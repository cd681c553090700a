// One situation: what it says, its counts, what it would have done, and why it takes an entry or not.

import { get, situationPath, withQuery } from "../api.js";
import { failure, fill, h, loading } from "../dom.js";
import { ago, number, time } from "../format.js";
import { explainPanel, previewPanel } from "../situation-tools.js";
import { actions, STATES } from "./situations.js";

export async function show(element, name) {
  fill(element, loading());
  const note = h("div", { role: "alert" });
  const load = async () => {
    let situation;
    try {
      situation = await get(situationPath(name));
    } catch (error) {
      fill(element, failure(error, load));
      return;
    }
    const [level, state] = STATES[situation.state] || ["", situation.state];
    const act = async (action) => {
      fill(note);
      try {
        await action();
      } catch (error) {
        fill(note, h("p", { className: "problem" }, error.message));
        return;
      }
      if (location.hash.includes("name=")) await load();
    };
    const preview = previewPanel(() => ({ situation: name }));
    fill(element,
      h("div", { className: "head" }, h("h1", {}, name), h("span", { className: `state ${level}` }, state),
        h("div", { className: "push" }, actions(situation, act, () => { location.hash = "#/situations"; }), h("a", { className: "button", href: "#/situations" }, "All situations"))),
      note, h("div", { className: "split" }, definition(situation),
        h("div", { className: "stack" }, preview.element, explainPanel(() => ({ situation: name }), () => situation.log))));
    preview.update();
  };
  await load();
}

function definition(situation) {
  const { counts } = situation;
  const pairs = [
    ["Text", situation.text || "–"], ["Severity", h("span", { className: `severity ${situation.severity}` }, situation.severity)], ["Log", situation.log || "any log"],
    ["Conditions", situation.when.length > 0 ? situation.when.map((text) => h("div", {}, h("code", {}, text))) : "none: every entry"],
    ["Frequency", situation.frequency ? `raised while ${situation.frequency} matches come within ${situation.period}` : "every match is raised"],
    ["Comes from", situation.source === "file" ? "the configuration file; it is changed there" : "this console or the API"],
    ["Entries judged", number(counts.offered)], ["Matched", number(counts.matched)], ["Held back", `${number(counts.discarded)} by the frequency`], ["Raised", number(counts.raised)],
    ["Last raised", situation.last_raised ? `${time(situation.last_raised)} (${ago(situation.last_raised)})` : "never"],
  ];
  return h("section", { className: "panel" }, situation.problem && h("p", { className: "problem" }, situation.problem),
    h("dl", { className: "pairs" }, pairs.map(([key, value]) => [h("dt", {}, key), h("dd", {}, value)])),
    h("p", {}, h("a", { href: withQuery("#/events", { situation: situation.name }) }, "Its events")));
}
