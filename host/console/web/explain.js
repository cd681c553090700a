// What a situation makes of an entry, in words.

import { h, table } from "./dom.js";
import { reachText, stamp } from "./format.js";

/** The explanations of an answer, and how far the log was read for them. */
export function explained(answer, options) {
  const reach = reachText(answer);
  return [
    answer.warnings.map(({ text }) => h("p", { className: "why warn" }, text)),
    reach && h("p", { className: "why warn" }, reach),
    ...answer.explanations.map((one) => explanation(one, options)),
  ];
}

/** Without its columns where the page already shows them. */
function explanation(one, { withColumns = true } = {}) {
  if (!one.row) {
    return h(
      "div",
      { className: "stack" },
      h("p", { className: "verdict fails" }, "No entry"),
      one.line && h("pre", {}, one.line),
      h("p", {}, one.reason || one.decision),
    );
  }
  const verdict = one.raised
    ? "Would be raised"
    : one.matches
      ? "Matches, not raised"
      : "Does not match";
  return h(
    "div",
    { className: "stack" },
    h("p", { className: `verdict ${one.raised || one.matches ? "holds" : "fails"}` }, verdict),
    h("p", {}, one.decision),
    one.conditions.length > 0 &&
      table(
        "Conditions",
        [
          { label: "Holds", className: "fit lead" },
          { label: "Condition", className: "wide" },
          { label: "The entry has", className: "wide" },
        ],
        one.conditions.map((condition) => [
          h(
            "span",
            { className: condition.holds ? "holds" : "fails" },
            condition.holds ? "holds" : "fails",
          ),
          h("code", {}, condition.condition),
          h("code", {}, String(condition.value)),
        ]),
        { className: "cards" },
      ),
    withColumns && h("details", {}, h("summary", {}, "Columns of the entry"), rowList(one.row)),
  );
}

const TIMES = new Set(["ENTRYTIME", "TIMESTAMP"]);

/** Every column of a row with its value. */
export function rowList(row) {
  return h(
    "dl",
    { className: "pairs" },
    Object.entries(row).map(([name, value]) => [
      h("dt", { className: "mono" }, name),
      h(
        "dd",
        {},
        value === ""
          ? h("span", { className: "quiet" }, "blank")
          : TIMES.has(name)
            ? `${stamp(value)} (${value})`
            : String(value),
      ),
    ]),
  );
}
