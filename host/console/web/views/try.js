// Try a format: what a format makes of lines, while it is typed.

import { get, post } from "../api.js";
import { copyable } from "../copyable.js";
import { button, debounce, empty, failure, field, fill, h, select } from "../dom.js";
import { showSuggestion } from "../suggest.js";
import { columnsPanel, coverage, fieldNames, linesPanel, markedAt } from "../trial.js";

const START =
  'A , "%d-%d-%d %d:%d:%d %s %64[^:]: %256[^\\n]" , ' +
  "year month day hour minute second type source description";
const SAMPLE =
  "2026-11-20 07:03:09 ERROR payment: Card declined for order 4711\n" +
  "2026-11-20 07:03:10 INFO web: Request served";
const MOST_LINES = 200;
const SOME_LOG = "/path/to/the.log";
const RULES = [
  ["table", "Text log of a [[log]] table"],
  ["syslog", "Syslog file of a [[log]] table"],
  ["log_config", "Line of the log configuration"],
];

export async function show(element, query) {
  const { logs, tables, configuration } = await get("/api/v1/logs");
  const rules = tables.length > 0 || !configuration ? "table" : "log_config";
  new TryPage(element, logs, rules, query.get("log") || "");
}

/** The rules by which the agent judges the lines of a log. */
function rulesOf(log) {
  if (!log.ledger?.follow) return "log_config";
  return log.row.LOGTYPE === "S" ? "syslog" : "table";
}

class TryPage {
  constructor(element, logs, rules, log) {
    const known = logs.find((one) => one.log === log);
    const again = debounce(() => this.#try(), 250);
    this.rules = field(
      "Judge as",
      select(RULES, known ? rulesOf(known) : rules, {
        onchange: () => {
          this.#showRules();
          this.#try();
        },
      }),
    );
    this.timezone = field(
      "Time zone",
      h("input", { type: "text", spellcheck: false, placeholder: "local time", oninput: again }),
      "What times without a zone mean: UTC, or a name such as Europe/Berlin.",
    );
    this.format = field(
      "Format",
      h("textarea", {
        rows: 3,
        spellcheck: false,
        value: known?.row.LOGTYPE === "U" ? known.row.FORMATTER : START,
        oninput: again,
      }),
      'A , "the layout of a line with a directive for each part" , a name for each directive. ' +
        "%d is a number, %s a word, %[^:] text up to a colon, %[^\\n] the rest; %*s is skipped.",
    );
    this.lines = field(
      "Lines",
      h("textarea", {
        rows: 6,
        spellcheck: false,
        wrap: "off",
        value: log ? "" : SAMPLE,
        oninput: () => {
          this.#forgetSuggestion();
          again();
        },
      }),
      "One entry per line, as in the log.",
    );
    this.log = select(logs.map((one) => one.log).sort(), log || undefined, {
      "aria-label": "Log",
      onchange: () => this.#judgeAs(logs.find((one) => one.log === this.log.value)),
    });
    this.count = select(["10", "50", "200"], "50", { "aria-label": "How many lines" });
    this.suggested = h("div", { className: "stack", role: "region", "aria-label": "Suggestion" });
    this.result = h("div", { className: "stack", role: "region", "aria-label": "Result" });
    fill(
      element,
      h("div", { className: "head" }, h("h1", {}, "Try a format")),
      h(
        "div",
        { className: "panel" },
        h("div", { className: "fields" }, this.rules, this.timezone),
        this.format,
        this.lines,
        h(
          "p",
          { className: "actions" },
          button("Which format fits?", () => this.#suggest()),
          h("span", { className: "hint" }, "Tries the ready formats on these lines."),
        ),
        logs.length > 0 &&
          h(
            "div",
            { className: "inline" },
            h("span", { className: "quiet" }, "or take the last"),
            this.count,
            h("span", { className: "quiet" }, "lines of"),
            this.log,
            button("Take them", () => this.#take()),
          ),
      ),
      this.suggested,
      this.result,
    );
    this.#showRules();
    if (log) this.#take();
    else this.#try();
  }

  #judgeAs(log) {
    this.rules.control.value = rulesOf(log);
    this.#showRules();
  }

  #showRules() {
    const rules = this.rules.control.value;
    this.format.hidden = rules === "syslog";
    this.timezone.hidden = rules === "log_config";
  }

  /** What the request says of the rules, and the format where they need one. */
  #asked() {
    const rules = this.rules.control.value;
    const format = this.format.control.value;
    if (rules === "log_config") return { rules, format };
    const asked = {
      rules: "table",
      timezone: this.timezone.control.value.trim() || undefined,
      log: this.takenFrom, // whose table may have a time zone
    };
    return rules === "syslog" ? { ...asked, type: "syslog" } : { ...asked, format };
  }

  /** A try with the previous lines would be wrong by now; one asked for meanwhile follows. */
  async #take() {
    this.isTaking = true;
    this.#forgetSuggestion();
    this.abort?.abort();
    this.lines.setProblem("");
    try {
      const answer = await post("/api/v1/try", {
        ...this.#asked(),
        log: this.log.value,
        last: Number(this.count.value),
      });
      if (answer.lines.length === 0 && !answer.accepted) {
        this.#draw(answer);
        return;
      }
      this.lines.control.value = answer.lines.map((one) => one.line).join("\n");
      this.takenFrom = this.log.value;
      this.lines.setProblem(answer.lines.length === 0 ? "This log has no lines yet." : "");
      this.#draw(answer);
    } catch (error) {
      this.lines.setProblem(error.message);
      this.isAsked = true;
    } finally {
      this.isTaking = false;
      if (this.isAsked) this.#try();
    }
  }

  #suggest() {
    const lines = this.lines.control.value.split("\n").slice(0, MOST_LINES);
    const log = this.takenFrom || SOME_LOG;
    this.#forgetSuggestion();
    this.suggesting = new AbortController();
    return showSuggestion(this.suggested, lines, log, this.suggesting.signal);
  }

  /** A suggestion is about the lines as they were. */
  #forgetSuggestion() {
    this.suggesting?.abort();
    fill(this.suggested);
  }

  async #try() {
    this.isAsked = this.isTaking;
    if (this.isTaking) return;
    const lines = this.lines.control.value
      .split("\n")
      .filter((line) => line !== "")
      .slice(0, MOST_LINES);
    const asked = this.#asked();
    this.abort?.abort();
    this.abort = new AbortController();
    if (asked.format?.trim() === "" || lines.length === 0) {
      fill(
        this.result,
        h(
          "div",
          { className: "panel" },
          empty("Nothing to try", "Type a format, and paste lines or take them from a log."),
        ),
      );
      return;
    }
    try {
      this.#draw(await post("/api/v1/try", { ...asked, lines }, this.abort.signal));
    } catch (error) {
      if (error.field === "timezone") {
        this.timezone.setProblem(error.message);
      } else if (error.name !== "AbortError")
        fill(
          this.result,
          h(
            "div",
            { className: "panel" },
            failure(error, () => this.#try()),
          ),
        );
    }
  }

  #draw(answer) {
    this.timezone.setProblem("");
    this.format.setProblem(answer.accepted ? "" : `The format cannot be used: ${answer.reason}`);
    if (!answer.accepted) {
      fill(
        this.result,
        h(
          "section",
          { className: "panel" },
          h("h2", {}, "Where the format stops"),
          markedAt(this.format.control.value, answer.position),
        ),
      );
      return;
    }
    const names = fieldNames(answer);
    if (answer.lines.length === 0) fill(this.result, this.#configuration(answer));
    else
      fill(
        this.result,
        coverage(answer.coverage, names),
        linesPanel(answer, names),
        columnsPanel(answer),
        this.#configuration(answer),
      );
  }

  #configuration(answer) {
    const isTable = Boolean(answer.table);
    if (!isTable && !answer.configuration_line) return null;
    const path = this.takenFrom || SOME_LOG;
    const text = isTable
      ? answer.table.trimEnd().replace(`'${SOME_LOG}'`, () => tomlString(path))
      : answer.configuration_line.replace(/^\S+/, () => path);
    return h(
      "section",
      { className: "panel" },
      h("h2", {}, isTable ? "Table for zrm.toml" : "Line for the agent's configuration"),
      copyable(text, isTable ? "Table" : "Configuration line", this.#advice(isTable)),
    );
  }

  #advice(isTable) {
    if (isTable)
      return "Put it into zrm.toml with the log's own path. The agent notices the change.";
    return this.takenFrom
      ? "Put it in the log configuration in place of the log's current line, then press " +
          "“Re-read configuration” under Logs."
      : "Put the log's own path in front, add the line to the log configuration, then " +
          "press “Re-read configuration” under Logs.";
  }
}

const tomlString = (text) => (text.includes("'") ? JSON.stringify(text) : `'${text}'`);
