// Which ready formats read some lines, and the tables to write for them.

import { post } from "./api.js";
import { copyable } from "./copyable.js";
import { empty, failure, fill, h } from "./dom.js";

/** The formats that fit the lines, or that the agent makes for them. */
export async function showSuggestion(element, lines, log, signal) {
  try {
    draw(element, await post("/api/v1/suggest", { lines, log }, signal));
  } catch (error) {
    if (error.name === "AbortError") return;
    fill(
      element,
      h(
        "div",
        { className: "panel" },
        failure(error, () => showSuggestion(element, lines, log, signal)),
      ),
    );
  }
}

function draw(element, { ready, proposal }) {
  const choices = proposal ? [proposal, ...ready] : ready;
  if (choices.length === 0) {
    fill(
      element,
      h(
        "div",
        { className: "panel" },
        empty(
          "No format fits",
          "No ready format reads these lines, and they have no common shape.",
        ),
      ),
    );
    return;
  }
  fill(
    element,
    choices.map((choice) => choicePanel(choice)),
  );
}

function choicePanel(choice) {
  const bar = h("span", {});
  bar.style.width = `${choice.percent}%`;
  const name = choice.formats.join(", ") || choice.description;
  return h(
    "section",
    { className: "panel", "aria-label": name },
    h("h2", {}, name),
    choice.formats.length > 0 && h("p", { className: "quiet" }, choice.description),
    h("p", { className: "verdict" }, `${choice.percent}% of the lines fit`),
    h(
      "div",
      { className: `meter ${choice.percent < 100 ? "low" : ""}`, "aria-hidden": "true" },
      bar,
    ),
    h(
      "p",
      { className: "quiet" },
      `Of the entries ${choice.percent_time}% have a time, ${choice.percent_type}% a type, ` +
        `${choice.percent_source}% a source.`,
    ),
    choice.fits_equally.length > 0 &&
      h("p", { className: "quiet" }, `Fits equally: ${choice.fits_equally.join(", ")}.`),
    copyable(choice.table, "Table", "Put it into zrm.toml. The agent notices the change."),
  );
}
