// Beside a situation: what it would have done, and what it makes of a line.

import { get, post } from "./api.js";
import { button, failure, field, fill, h, select } from "./dom.js";
import { explained } from "./explain.js";
import { number, plural, reachText, stamp } from "./format.js";

const DAY = 24 * 3600 * 1000;

/** How often it would have been raised. `subject()` is the situation or definition. */
export function previewPanel(subject) {
  const result = h("div", { role: "status", className: "stack" });
  let abort = null;
  const update = async () => {
    abort?.abort();
    abort = new AbortController();
    const mine = abort;
    fill(result, h("p", { className: "quiet" }, "Reading the last 24 hours …"));
    try {
      const now = Date.now();
      const answer = await post(
        "/api/v1/backtest",
        { ...subject(), from: new Date(now - DAY).toISOString(), to: new Date(now).toISOString() },
        mine.signal,
      );
      drawPreview(result, answer);
    } catch (error) {
      if (error.name !== "AbortError") fill(result, h("p", { className: "quiet" }, error.message));
    }
  };
  return {
    element: h(
      "section",
      { className: "panel", "aria-label": "Preview" },
      h("h2", {}, "Preview"),
      result,
    ),
    update,
    clear: (text) => {
      abort?.abort();
      fill(result, h("p", { className: "quiet" }, text));
    },
  };
}

function drawPreview(result, answer) {
  const times = [...answer.raised_at].reverse();
  fill(
    result,
    h(
      "p",
      { className: "verdict" },
      `Would have been raised ${plural(answer.raised, "time")} in the last 24 hours`,
      answer.episode_count > 0 && `, in ${plural(answer.episode_count, "episode")}`,
    ),
    h(
      "p",
      { className: "quiet" },
      `${number(answer.matched)} of ${plural(answer.entries, "entry", "entries")} matched.`,
      !answer.complete && ` ${reachText(answer)}`,
    ),
    times.length > 0 &&
      h(
        "details",
        {},
        h("summary", {}, "When"),
        h(
          "ul",
          {},
          times.slice(0, 50).map((one) => h("li", {}, stamp(one))),
          times.length > 50 &&
            h("li", { className: "quiet" }, `and ${number(answer.raised - 50)} more`),
        ),
      ),
  );
}

/** Explains what the situation makes of a pasted line, or of the log's last entries. `log()` is the
 *  situation's log, null for any, undefined while none is chosen; `update()` after a change. */
export function explainPanel(subject, log) {
  const which = field("Log it comes from", select([]));
  const update = async () => {
    which.hidden = log() !== null;
    if (which.hidden || which.control.options.length > 0) return;
    try {
      const { logs } = await get("/api/v1/logs");
      fill(
        which.control,
        logs.map((one) => h("option", { value: one.log }, one.log)),
      );
    } catch (error) {
      which.setProblem(error.message);
    }
  };
  const input = h("textarea", {
    rows: 3,
    spellcheck: false,
    placeholder: "Paste a line of the log",
  });
  const row = field("Line", input);
  const result = h("div", { role: "status", className: "stack" });
  const ask = async (what) => {
    row.setProblem("");
    const path = log() ?? (log() === null ? which.control.value : "");
    if (!path) {
      row.setProblem("Choose a log first: its kind says how a line is read.");
      return;
    }
    fill(result, h("p", { className: "quiet" }, "Asking …"));
    try {
      const answer = await post("/api/v1/explain", { ...subject(), log: path, ...what });
      fill(
        result,
        explained(answer),
        answer.explanations.length === 0 && h("p", {}, "The log has no entries yet."),
      );
    } catch (error) {
      fill(result, failure(error));
    }
  };
  update();
  const element = h(
    "section",
    { className: "panel", "aria-label": "Explain" },
    h("h2", {}, "Try a line"),
    which,
    row,
    h(
      "p",
      { className: "actions" },
      button("Explain", () =>
        input.value.trim()
          ? ask({ line: input.value.split("\n")[0] })
          : row.setProblem("Paste a line first."),
      ),
      button("Explain the last 3 entries", () => ask({ last: 3 })),
    ),
    result,
  );
  return { element, update };
}
