// Events: live, with filter, pause, and the detail of one.

import { get, post, withQuery } from "../api.js";
import { button, debounce, empty, failure, field, fill, h, link, select } from "../dom.js";
import { briefTime, describe, number, plural, SEVERITIES, time } from "../format.js";
import { explained, rowList } from "../explain.js";
import { silencedFacts, silenceLink } from "../silenced.js";
import { EventStream } from "../stream.js";
import { WindowedList } from "../windowed.js";

const PAGE = 200;
const MOST = 20000; // kept in the page; older ones are in the history

/** What the event has of its entry beside the columns. */
function entryOf({ entry, entry_cut: isCut, fields, context }) {
  return [
    context && [h("h3", {}, "Entries before it"), h("pre", {}, context.join("\n"))],
    entry && [
      h("h3", {}, isCut ? "Beginning of the entry" : "Entry"),
      h("pre", { className: "entry" }, entry),
    ],
    fields && [h("h3", {}, "Fields"), rowList(fields)],
  ];
}

const logOf = (event) =>
  event.log ??
  (event.row?.ULOGPATH || event.row?.LOGPATH || "") +
    (event.row?.ULOGNAME || event.row?.LOGNAME || "");

/** What the event says of its group and its episode, as names and values. */
function episodeOf({ state, episode, group, reason }) {
  return [
    ...Object.entries(group ?? {}),
    ...(state ? [["State", reason ? `${state}: ${reason}` : state]] : []),
    ...(episode
      ? [
          ["Episode", String(episode.id)],
          ["Entries", number(episode.count)],
          ["First entry", time(episode.first, true)],
          ["Last entry", time(episode.last, true)],
        ]
      : []),
  ];
}

export async function show(element, query) {
  const page = new EventsPage(element, query);
  await page.start();
  return () => page.end();
}

class EventsPage {
  constructor(element, query) {
    this.all = []; // newest first
    this.waiting = [];
    this.arrived = [];
    this.isPaused = false;
    this.next = null; // older events are before this one
    this.wanted = Object.fromEntries(
      ["situation", "log", "severity", "text"].map((key) => [key, query.get(key) || ""]),
    );
    this.#build(element);
  }

  #build(element) {
    const again = () => this.choose();
    this.situation = select([["", "All situations"]], "", { onchange: again });
    this.log = select([["", "All logs"]], "", { onchange: again });
    this.severity = select([["", "All severities"], ...SEVERITIES], "", { onchange: again });
    this.text = h("input", {
      type: "search",
      placeholder: "any text",
      maxLength: 80,
      value: this.wanted.text,
      oninput: debounce(again, 300),
    });
    this.state = h("p", { className: "state", role: "status" }, "Connecting");
    this.pause = button("Pause", () => this.#togglePause(), { "aria-pressed": "false" });
    this.newer = button(
      "",
      () => {
        this.list.element.scrollTop = 0;
        this.list.element.focus();
      },
      { hidden: true },
    );
    this.count = h("p", { className: "quiet" });
    this.trouble = h("p", { className: "why bad trouble", role: "status" });
    this.list = new WindowedList({
      label: "Events, newest first",
      row: (event) => this.#row(event),
      className: (event) => (event.silenced ? "silenced" : ""),
      end: () => this.#older(),
      choose: (event, isEntered) => this.#open(event, isEntered),
    });
    this.list.element.addEventListener("scroll", () => {
      if (this.list.isAtTop) this.newer.hidden = true;
    });
    this.detail = h("aside", {
      className: "panel detail",
      "aria-label": "Event",
      hidden: true,
      tabIndex: -1,
    });
    this.body = h("div", { className: "stack" }, this.list.element);
    this.split = h("div", { className: "events" }, this.body, this.detail);
    fill(
      element,
      h(
        "div",
        { className: "head" },
        h("h1", {}, "Events"),
        this.state,
        this.count,
        h("div", { className: "push" }, this.newer, this.pause),
        this.trouble,
      ),
      h(
        "div",
        { className: "toolbar", role: "group", "aria-label": "Filter" },
        field("Situation", this.situation),
        field("Log", this.log),
        field("Severity", this.severity),
        field("Text", this.text),
      ),
      this.split,
    );
  }

  async start() {
    this.#offer(); // the lists of the filter may come late
    await this.restart();
  }

  async #offer() {
    const offer = (list, value) => {
      if ([...list.options].every((one) => one.value !== value))
        list.append(h("option", { value }, value));
    };
    for (const key of ["situation", "log", "severity"]) {
      offer(this[key], this.wanted[key]);
      this[key].value = this.wanted[key];
    }
    const [situations, logs] = await Promise.allSettled([
      get("/api/v1/situations"),
      get("/api/v1/logs"),
    ]);
    for (const { name } of situations.value?.situations || []) offer(this.situation, name);
    for (const { log } of logs.value?.logs || []) offer(this.log, log);
  }

  end() {
    this.stream?.stop();
    this.abort?.abort();
    cancelAnimationFrame(this.frame);
    this.list.resize.disconnect();
  }

  get filter() {
    return {
      situation: this.situation.value,
      log: this.log.value,
      severity: this.severity.value,
      text: this.text.value,
    };
  }

  /** Takes the filter as it is now. */
  choose() {
    // For a reload, and the way back.
    history.replaceState(null, "", withQuery("#/events", this.filter));
    this.restart();
  }

  async restart() {
    this.stream?.stop();
    this.abort?.abort();
    this.abort = new AbortController();
    const abort = this.abort;
    this.waiting = [];
    this.arrived = [];
    this.next = null;
    fill(this.body, this.list.element);
    let answer;
    try {
      answer = await this.#search(null, abort.signal);
    } catch (error) {
      if (error.name !== "AbortError") this.#fail(error);
      return;
    }
    this.all = answer.events;
    this.next = answer.next;
    this.#draw();
    const after = Math.max(answer.newest || 0, answer.events[0]?.id || 0);
    this.stream = new EventStream(this.filter, after, {
      event: (event) => this.#arrive(event),
      state: (...state) => this.#setState(...state),
      again: () => this.#verify(abort.signal),
    });
  }

  /** A page of events before this one. A search for a text takes the agent several requests. */
  async #search(before, signal) {
    const events = [];
    let next = before;
    let newest;
    do {
      const answer = await get(
        withQuery("/api/v1/events", { ...this.filter, before: next, limit: PAGE - events.length }),
        signal,
      );
      newest ??= answer.newest;
      events.push(...answer.events);
      next = answer.next;
      if (next !== null && events.length < PAGE)
        this.count.textContent = `Searching before event ${number(next)} …`;
    } while (next !== null && events.length < PAGE);
    return { events, next, newest };
  }

  /** An agent that returns with another history numbers its events anew; so the list is cleared. */
  async #verify(signal) {
    const [latest] = this.all;
    if (!latest) return;
    try {
      const kept = await get(`/api/v1/events/${latest.id}`, signal);
      if (kept.raised !== latest.raised) this.restart();
    } catch (error) {
      if (error.status === 404) this.restart();
    }
  }

  #fail(error) {
    this.#setState("refused", error);
    fill(
      this.body,
      error.status === 409
        ? empty(
            "The history is off",
            "Without it the agent keeps no events, and there are none to show. " +
              "Set enabled = true under [history] in its configuration and restart it.",
          )
        : failure(error, () => this.restart()),
    );
  }

  #setState(state, detail) {
    const texts = {
      connecting: ["", "Connecting"],
      live: ["good", "Live"],
      waiting: ["bad", `Not live; next try in ${detail?.seconds} s`],
      refused: ["bad", detail?.status === 409 ? "History off" : "Not live"],
    };
    const [level, text] = this.isPaused && state === "live" ? ["warn", "Paused"] : texts[state];
    this.streamState = state;
    this.state.className = `state ${level}`;
    this.state.textContent = text;
    // While it is tried again, the reason stays.
    if (state !== "connecting")
      this.trouble.textContent =
        state === "waiting" && detail.error?.status > 0
          ? `New events do not appear by themselves: ${detail.error.message.replace(/\.$/, "")}.`
          : "";
  }

  // Events that come close together are drawn together, once per frame.
  #arrive(event) {
    this.arrived.push(event);
    // A page out of sight draws no frame.
    if (this.arrived.length > 2 * MOST) this.arrived.splice(0, MOST);
    this.frame ??= requestAnimationFrame(() => {
      this.frame = null;
      this.#take(this.arrived.splice(0).reverse());
    });
  }

  #take(events) {
    if (this.isPaused) {
      this.waiting = events.concat(this.waiting).slice(0, MOST);
      this.pause.textContent = `Resume (${plural(this.waiting.length, "new event")})`;
      return;
    }
    this.all = events.concat(this.all);
    if (this.all.length > MOST) {
      this.all.length = MOST;
      this.next = null;
    }
    if (!this.list.isAtTop && events.length > 0) {
      this.newer.hidden = false;
      this.newer.textContent = "New events above";
    }
    if (this.list.items.length === 0 && events.length > 0) fill(this.body, this.list.element);
    this.list.prepend(events, MOST);
    this.#drawCount();
  }

  #togglePause() {
    this.isPaused = !this.isPaused;
    this.pause.textContent = this.isPaused ? "Resume" : "Pause";
    this.pause.setAttribute("aria-pressed", String(this.isPaused));
    if (!this.isPaused) this.#take(this.waiting.splice(0));
    this.#setState(this.streamState);
  }

  #draw() {
    this.list.reset(this.all);
    if (this.all.length > 0) fill(this.body, this.list.element);
    else if (Object.values(this.filter).some(Boolean)) {
      fill(
        this.body,
        empty(
          "No matches",
          "No event in the history matches the filter. New ones appear here at once.",
          button("Show all events", () => {
            for (const control of [this.situation, this.log, this.severity, this.text])
              control.value = "";
            this.choose();
          }),
        ),
      );
    } else
      fill(
        this.body,
        empty(
          "No events yet",
          "An entry that meets a situation raises an event, which appears here at once.",
          h("a", { className: "button", href: "#/situations" }, "Situations"),
        ),
      );
    this.#drawCount();
  }

  #drawCount() {
    const more = this.next !== null ? "+" : "";
    this.count.textContent = `${number(this.list.items.length)}${more} shown`;
  }

  async #older() {
    if (this.next === null || this.isLoadingOlder) return;
    this.isLoadingOlder = true;
    const abort = this.abort;
    try {
      const { events, next } = await this.#search(this.next, abort.signal);
      this.all = this.all.concat(events);
      this.next = this.all.length < MOST ? next : null;
      this.list.append(events);
    } catch {
      if (abort !== this.abort) return; // another list by now; else scrolling on asks again
    } finally {
      this.isLoadingOlder = false;
    }
    this.#drawCount();
  }

  #row(event) {
    return [
      h("span", { title: time(event.raised, true) }, briefTime(event.raised)),
      h("span", { className: `severity ${event.severity}` }, event.severity),
      h("span", { title: event.situation }, event.situation),
      h("span", {}, describe(event)),
    ];
  }

  #open(event, isEntered) {
    const why = h("div", {});
    const explain = button("Why was it raised?", async () => {
      fill(why, h("p", { className: "loading" }, "Asking …"));
      try {
        const answer = await post("/api/v1/explain", {
          situation: event.situation,
          event: event.id,
        });
        fill(why, explained(answer, { withColumns: false }));
      } catch (error) {
        fill(why, failure(error));
      }
    });
    fill(
      this.detail,
      h(
        "div",
        { className: "head" },
        h("h2", {}, `Event ${event.id}`),
        h(
          "div",
          { className: "push" },
          button("Close", () => this.#close()),
        ),
      ),
      h("pre", {}, describe(event)),
      h(
        "dl",
        { className: "pairs" },
        [
          [
            "Situation",
            h("a", { href: withQuery("#/situations", { name: event.situation }) }, event.situation),
          ],
          ["Severity", h("span", { className: `severity ${event.severity}` }, event.severity)],
          ["Raised", time(event.raised, true)],
          ...(event.runbook ? [["Runbook", link(event.runbook)]] : []),
          ...Object.entries(event.labels ?? {}),
          ["Log", logOf(event)],
          ...episodeOf(event),
          ...silencedFacts(event),
        ].map(([name, value]) => [h("dt", {}, name), h("dd", {}, value)]),
      ),
      h("p", { className: "actions" }, event.row && explain, silenceLink(event, logOf(event))),
      why,
      entryOf(event),
      event.row && [h("h3", {}, "Columns"), rowList(event.row)],
    );
    this.detail.hidden = false;
    this.split.classList.add("open");
    if (isEntered || matchMedia("(max-width: 960px)").matches) this.detail.focus();
  }

  #close() {
    this.detail.hidden = true;
    this.split.classList.remove("open");
    this.list.element.focus();
  }
}
