// Numbers, sizes and times as people read them.

const whole = new Intl.NumberFormat("en", { maximumFractionDigits: 0 });
const short = new Intl.NumberFormat("en", { notation: "compact", maximumFractionDigits: 1 });

// What of an entry is shown first, in this order.
export const ENTRY_COLUMNS = [
  ["ENTRYTIME", "Time"],
  ["ENTRYSYS", "System"],
  ["ENTRYSRC", "Source"],
  ["ENTRYTYPE", "Type"],
  ["ENTRYCLASS", "Class"],
  ["ENTRYDESC", "Description"],
];

export const number = (value) =>
  value === null || value === undefined ? "–" : whole.format(value);
export const compact = (value) =>
  value === null || value === undefined ? "–" : short.format(value);

export function bytes(value) {
  if (value === null || value === undefined || value < 0) return "–";
  const units = ["B", "kB", "MB", "GB", "TB"];
  let unit = 0;
  while (value >= 1000 && unit < units.length - 1) {
    value /= 1000;
    unit += 1;
  }
  return `${value >= 100 || unit === 0 ? Math.round(value) : value.toFixed(1)} ${units[unit]}`;
}

const two = (value) => String(value).padStart(2, "0");

/** A time as this browser's local date and time. */
export function time(value, withMilliseconds = false) {
  if (!value) return "–";
  const date = value instanceof Date ? value : new Date(value);
  if (Number.isNaN(date.getTime())) return String(value);
  const day = [date.getFullYear(), two(date.getMonth() + 1), two(date.getDate())].join("-");
  const text = `${day} ${clock(date)}`;
  return withMilliseconds ? `${text}.${String(date.getMilliseconds()).padStart(3, "0")}` : text;
}

export const clock = (date) =>
  `${two(date.getHours())}:${two(date.getMinutes())}:${two(date.getSeconds())}`;

/** The time alone when it is of today. */
export function briefTime(value) {
  if (!value) return "–";
  const text = time(value);
  return text.startsWith(time(new Date()).slice(0, 10)) ? text.slice(11) : text.slice(5);
}

/** A 16-digit time stamp as date and time; it is the local time of the agent's machine. */
export function stamp(value) {
  const parts = /^([01])(\d\d)(\d\d)(\d\d)(\d\d)(\d\d)(\d\d)/.exec(value || "");
  if (!parts || /^0+$/.test(value)) return value ? "–" : "";
  const [, century, year, month, day, hour, minute, second] = parts;
  return `${century === "1" ? 20 : 19}${year}-${month}-${day} ${hour}:${minute}:${second}`;
}

/** How far an answer has read the logs; empty where it has read everything. */
export function reachText({ complete, reached, reason }) {
  if (complete) return "";
  const missing = reached ? ` Entries before ${stamp(reached)} are missing.` : "";
  return `Not everything was read: ${reason}.${missing}`;
}

/** Minutes by which the agent's local time is ahead of UTC, from one moment in both forms. */
export function offsetOf(value, utc) {
  const shown = Date.parse(`${stamp(value).replace(" ", "T")}Z`);
  return Math.round((shown - Date.parse(utc)) / 900000) * 15; // zones lie quarters of an hour apart
}

export function ago(value) {
  if (!value) return "never";
  const seconds = Math.max(0, (Date.now() - new Date(value).getTime()) / 1000);
  if (seconds < 10) return "just now";
  if (seconds < 90) return `${Math.round(seconds)} s ago`;
  if (seconds < 5400) return `${Math.round(seconds / 60)} min ago`;
  if (seconds < 129600) return `${Math.round(seconds / 3600)} h ago`;
  return `${Math.round(seconds / 86400)} days ago`;
}

export const plural = (count, one, many = `${one}s`) =>
  `${number(count)} ${count === 1 ? one : many}`;

/** Entries per minute over the last minutes that are known. */
export function rate(values, minutes = 5) {
  const known = values.filter((value) => value !== null).slice(-minutes);
  if (known.length === 0) return null;
  return known.reduce((sum, value) => sum + value, 0) / known.length;
}

export function rateText(value) {
  if (value === null) return "–";
  return value > 0 && value < 10 ? value.toFixed(1) : number(value);
}

export const SEVERITIES = ["critical", "major", "minor", "warning", "info"];

/** How a frequency compares, in words. */
export const COMPARISONS = [
  [">=", "at least"],
  ["<=", "at most"],
  ["=", "exactly"],
  [">", "more than"],
  ["<", "fewer than"],
];

export function frequencyText(frequency, period) {
  const [, operator, count] = /^\s*(\S+)\s+(\d+)/.exec(frequency) || [];
  const words = new Map(COMPARISONS).get(operator);
  return words
    ? `${words} ${plural(Number(count), "match", "matches")} within ${period}`
    : `${frequency} within ${period}`;
}

/**
 * What an event says in one line: the text that its situation makes of it, or else its group and
 * the text of its entry, or what came of an episode.
 */
export function describe(event) {
  if (event.text) return event.state === "resolved" ? `Resolved: ${event.text}` : event.text;
  const group = Object.entries(event.group ?? {}).map(([name, value]) => `${name}=${value}`);
  const text = event.row
    ? event.row.UENTRYDESC || event.row.ENTRYDESC
    : [event.state, event.reason, `${event.episode?.count ?? 0} entries`]
        .filter(Boolean)
        .join(", ");
  return [...group, text].join(" ");
}
