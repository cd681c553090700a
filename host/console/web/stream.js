// The live stream of events. It comes over fetch because an EventSource cannot send the token.

import { open, withQuery } from "./api.js";

const FIRST_PAUSE = 500;
const LONGEST_PAUSE = 15000;

/** Waits, but no longer than until the page has found the agent again. */
function pauseFor(milliseconds) {
  return new Promise((resolve) => {
    const timer = setTimeout(end, milliseconds);
    function end() {
      clearTimeout(timer);
      removeEventListener("zrm-regained", end);
      resolve();
    }
    addEventListener("zrm-regained", end);
  });
}

/** Follows events from the one after `after` until stopped, over lost connections too. */
export class EventStream {
  #abort = new AbortController();
  #last;
  #query;
  #handlers;

  /** handlers: event(event),
   *  state("connecting" | "live" | "waiting" | "refused", detail): detail has
   *  the seconds of waiting and why, or the error of refused; again() when a lost stream
   *  is back */
  constructor(query, after, handlers) {
    this.#query = query;
    this.#last = after;
    this.#handlers = handlers;
    this.#run();
  }

  stop() {
    this.#abort.abort();
  }

  async #run() {
    let pause = FIRST_PAUSE;
    let wasLive = false;
    while (!this.#abort.signal.aborted) {
      let refusal = null;
      try {
        this.#handlers.state("connecting");
        const headers = { Accept: "text/event-stream" };
        if (this.#last !== null && this.#last !== undefined)
          headers["Last-Event-ID"] = String(this.#last);
        const response = await open(withQuery("/api/v1/events/stream", this.#query), {
          headers,
          signal: this.#abort.signal,
        });
        this.#handlers.state("live");
        if (wasLive) this.#handlers.again();
        wasLive = true;
        pause = FIRST_PAUSE;
        await this.#read(response.body.getReader());
      } catch (error) {
        if (this.#abort.signal.aborted) return;
        if (error.status === 401 || error.status === 409 || error.status === 400) {
          this.#handlers.state("refused", error);
          return;
        }
        refusal = error;
      }
      if (this.#abort.signal.aborted) return;
      this.#handlers.state("waiting", { seconds: Math.round(pause / 1000), error: refusal });
      await pauseFor(pause);
      pause = Math.min(pause * 2, LONGEST_PAUSE);
    }
  }

  async #read(reader) {
    const decoder = new TextDecoder();
    let rest = "";
    for (;;) {
      const { done, value } = await reader.read();
      if (done) return;
      const blocks = (rest + decoder.decode(value, { stream: true })).split("\n\n");
      rest = blocks.pop();
      for (const block of blocks) this.#take(block);
    }
  }

  #take(block) {
    const data = [];
    let id = null;
    for (const line of block.split("\n")) {
      if (line.startsWith("data:")) data.push(line.slice(5).trimStart());
      else if (line.startsWith("id:")) id = line.slice(3).trim();
    }
    if (data.length === 0) return;
    const event = JSON.parse(data.join("\n"));
    this.#last = id ?? event.id;
    this.#handlers.event(event);
  }
}
