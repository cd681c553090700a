// What a log's row says about it, in an operator's words.

import { number } from "./format.js";

const KINDS = { U: "Text", S: "Syslog", A: "Accounting", E: "Error log" };
export const kindOf = (row) => KINDS[row.LOGTYPE] || row.LOGTYPE || "–";

/** What a log in trouble needs after it is mended. */
export const again = (configuration) => `What is mended is taken up when the log configuration${configuration ? ` ${configuration.file}` : ""} has changed (touch it) and “Re-read configuration” under Logs is pressed.`;
const WHY = [
  ["log open failed", "The file cannot be opened: it is missing, or the agent may not read it."],
  ["format command", "The format of this log cannot be learned. Mend it under “Try a format”."],
  ["log read failed", "Reading failed. Look at the disk and at what writes the file."],
  ["insufficient memory", "There was too little memory to learn the format."],
  ["seek for EOF failed", "The end of the file cannot be found; it may be no plain file."],
  ["child", "The command of this log could not be started."],
  ["pipe", "The command of this log could not be started."],
];

const WARNED = {
  missing: "No file", replaced: "Replaced", without_time: "No times", not_records: "Wrong type",
};

/** {level: "bad" | "warn" | "idle" | "good", state, why, more: where to look} of a log of /api/v1/logs. */
export function judge({ row, ledger }) {
  const status = row.MONSTATUS;
  if (status.startsWith("Error")) {
    const cause = status.replace(/^Error: /, "");
    const why = WHY.find(([part]) => cause.includes(part))?.[1] ?? `The monitor has ended (${cause}). The agent's trace says why.`;
    return { level: "bad", state: "Error", why };
  }
  if (status === "Stopped") return { level: "bad", state: "Stopped", why: "The monitor has stopped. The agent's trace says why." };
  if (status !== "Running") return { level: "idle", state: status || "Unknown", why: "" };
  const warnings = ledger?.warnings ?? [];
  if (warnings.length > 0) {
    return {
      level: "warn",
      state: WARNED[warnings[0].kind] ?? "Warning",
      why: warnings.map(({ text }) => text).join(" "),
    };
  }
  if (row.LOGSIZE === -1 && row.LOGTYPE !== "E") {
    return { level: "warn", state: "No file", why: "The file is not there now. It may have been moved away." };
  }
  const errors = ledger?.format_errors ?? row.NUMERRORS;
  const lines = ledger?.lines ?? row.NUMEVENTS;
  if (errors > 0 && row.LOGTYPE !== "E") {
    const share = lines > 0 ? Math.min(100, Math.round((errors / lines) * 100)) : 100;
    return { level: "warn", state: "Rejects", why: `${number(errors)} ${errors === 1 ? "line does" : "lines do"} not fit the format${lines > 0 ? ` (${share < 1 ? "under 1" : share} %)` : ""}.`, more: "Open the log to see which and why." };
  }
  if (ledger?.skipped_bytes > 0) return { level: "warn", state: "Skipped", why: `${number(ledger.skipped_bytes)} bytes were skipped when the file was truncated.` };
  return { level: "good", state: "Running", why: "" };
}

/** The same of a log that is configured and not monitored. */
export function judgeUnmonitored({ line, reason, cause }) {
  const cures = {
    file: "Make the file, or mend the path.", text: `Mend line ${line} of the log configuration.`, refresh: "", touch: "",
  };
  return { level: "bad", state: "Not read", why: [reason, cures[cause]].filter(Boolean).join(" ") };
}
