// What a log's row says about it, in an operator's words.

import { number } from "./format.js";

const KINDS = {
  U: "Text",
  S: "Syslog",
  A: "Accounting",
  E: "Error log",
  F: "Format",
  J: "Journal",
  C: "Command",
};
const kindOf = (row) => KINDS[row.LOGTYPE] || row.LOGTYPE || "–";

/** What takes a log's entries apart: the format its [[log]] table names, or its kind. */
export const formatOf = (row, table) => {
  const kind = kindOf(row);
  return table && table.format !== kind.toLowerCase() ? table.format : kind;
};

/** False for logs that are read from a command or a library rather than from a file. */
export const isFile = (row) => !"EJC".includes(row.LOGTYPE);

/** What makes the agent take a log up again after its trouble is fixed. */
export const again = (configuration, isFollowed) =>
  isFollowed
    ? "After the fix, change the log's [[log]] table, or restart the agent."
    : `After the fix, change or touch ${configuration?.file ?? "the log configuration"}, ` +
      "then press “Re-read configuration” under Logs.";
const WHY = [
  ["log open failed", "The file cannot be opened: it is missing, or the agent may not read it."],
  ["format command", "The format of this log cannot be used. Correct it under “Try a format”."],
  ["log read failed", "Reading failed. Check the disk and the program that writes the file."],
  ["insufficient memory", "There was not enough memory for the format."],
  ["seek for EOF failed", "The end of the file cannot be found; it may not be a regular file."],
  ["child", "The command of this log could not be started."],
  ["pipe", "The command of this log could not be started."],
];

const WARNED = {
  missing: "No file",
  replaced: "Replaced",
  named_twice: "Named twice",
  failing: "Failing",
  lost: "Lost bytes",
  without_time: "No times",
  not_records: "Wrong type",
  quiet: "Quiet",
  dead: "No file",
  unparsed: "Unparsed",
};

/** The state of a log of /api/v1/logs: {level: "bad" | "warn" | "idle" | "good", state, why, more};
 *  more says where to look. */
export function judge({ row, ledger }) {
  const status = row.MONSTATUS;
  if (status.startsWith("Error")) {
    const cause = status.replace(/^Error: /, "");
    const why =
      WHY.find(([part]) => cause.includes(part))?.[1] ??
      `The monitor has ended (${cause}). The agent's trace says why.`;
    return { level: "bad", state: "Error", why };
  }
  if (status === "Stopped")
    return {
      level: "bad",
      state: "Stopped",
      why: "The monitor has stopped. The agent's trace says why.",
    };
  if (status !== "Running") return { level: "idle", state: status || "Unknown", why: "" };
  const warnings = ledger?.warnings ?? [];
  if (warnings.length > 0) {
    return {
      level: "warn",
      state: WARNED[warnings[0].kind] ?? "Warning",
      why: warnings.map(({ text }) => text).join(" "),
    };
  }
  if (row.LOGSIZE === -1 && isFile(row)) {
    return {
      level: "warn",
      state: "No file",
      why: ledger?.follow
        ? "No file has this name now. The agent reads one as soon as it appears."
        : "The file does not exist now. It may have been moved away.",
    };
  }
  const errors = ledger?.format_errors ?? row.NUMERRORS;
  const lines = ledger?.lines ?? row.NUMEVENTS;
  if (errors > 0 && row.LOGTYPE !== "E") {
    const share = lines > 0 ? Math.min(100, Math.round((errors / lines) * 100)) : 100;
    const those = errors === 1 ? "line does" : "lines do";
    const ofAll = lines > 0 ? ` (${share < 1 ? "under 1" : share}%)` : "";
    return {
      level: "warn",
      state: "Rejects",
      why: `${number(errors)} ${those} not fit the format${ofAll}.`,
      more: "Open the log to see which and why.",
    };
  }
  if (ledger?.skipped_bytes > 0)
    return {
      level: "warn",
      state: "Skipped",
      why: `${number(ledger.skipped_bytes)} bytes were skipped when the file was truncated.`,
    };
  return { level: "good", state: "Running", why: "" };
}

/** The same for a log that is configured but not monitored. */
export function judgeUnmonitored({ line, reason, cause }) {
  const cures = {
    file: "Create the file, or correct the path.",
    text: `Correct line ${line} of the log configuration.`,
    refresh: "",
    touch: "",
  };
  return { level: "bad", state: "Not read", why: [reason, cures[cause]].filter(Boolean).join(" ") };
}
