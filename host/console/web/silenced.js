// What an event shows of the silence that keeps it from the sinks.

import { get, withQuery } from "./api.js";
import { fill, h } from "./dom.js";
import { time } from "./format.js";

const silences = new Map(); // by id: texts that are known or on their way

async function textOf(id) {
  try {
    const silence = await get(`/api/v1/silences/${id}`);
    return `${silence.why} (${silence.who}, until ${time(silence.expired || silence.until)})`;
  } catch (error) {
    silences.delete(id); // so that it is asked for again
    return error.status === 404 ? "The silence has been removed since." : error.message;
  }
}

/** The silence of an event, as names and values; its reason comes when it is known. */
export function silencedFacts({ silenced: id }) {
  if (!id) return [];
  const reason = h("span", {}, "…");
  if (!silences.has(id)) silences.set(id, textOf(id));
  silences.get(id).then((text) => fill(reason, text));
  return [["Silenced", [h("a", { href: "#/silences" }, `by silence ${id}`), ": ", reason]]];
}

/** Leads to a new silence for events like this one. */
export function silenceLink(event, log, text = "Silence events like this") {
  const group = Object.entries(event.group ?? {}).map(([name, value]) => [
    `group.${name}`,
    literal(value),
  ]);
  return h(
    "a",
    {
      className: "button",
      href: withQuery("#/silences", {
        situation: literal(event.situation),
        log: literal(log),
        ...Object.fromEntries(group),
      }),
    },
    text,
  );
}

/** The pattern that matches only this text. */
const literal = (text) => text.replace(/[\\*?]/g, "\\$&");
