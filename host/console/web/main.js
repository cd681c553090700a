// The frame of the page: token, views, connection.

import { get, signals, takeTokenFromTabs, token, viewModule } from "./api.js";
import { button, failure, field, fill, h, loading } from "./dom.js";

const VIEWS = [
  ["logs", "Logs"],
  ["events", "Events"],
  ["episodes", "Episodes"],
  ["situations", "Situations"],
  ["silences", "Silences"],
  ["reports", "Reports"],
  ["try", "Try a format"],
];
const CHECK_EVERY = 5000;
const LONGEST_PAUSE = 20000;

const main = document.getElementById("view");
const link = document.getElementById("link");
const banner = document.getElementById("banner");
let leave = null; // ends the current view
let visit = 0; // a view that comes late finds another number

function address() {
  const [path, query = ""] = location.hash.replace(/^#\/?/, "").split("?");
  return { name: path || "logs", query: new URLSearchParams(query) };
}

function drawNavigation(current) {
  fill(
    document.getElementById("nav"),
    VIEWS.map(([name, label]) =>
      h("a", { href: `#/${name}`, "aria-current": name === current ? "page" : null }, label),
    ),
  );
}

async function show(isFirst = false) {
  const here = address();
  const number = ++visit;
  leave?.();
  leave = null;
  if (!token.get()) {
    askForToken("");
    return;
  }
  const [name, label] = VIEWS.find(([key]) => key === here.name) || VIEWS[0];
  drawNavigation(name);
  document.title = `${label} · zrmagent`;
  fill(main, loading());
  try {
    const view = await viewModule(name);
    if (number !== visit) return;
    const element = h("div", { className: `view view-${name}` });
    fill(main, element);
    if (!isFirst) main.focus({ preventScroll: true });
    scrollTo(0, 0);
    const end = await view.show(element, here.query);
    if (number !== visit) end?.();
    else leave = end || null;
  } catch (error) {
    if (number === visit && error.status !== 401)
      fill(
        main,
        failure(error, () => show()),
      );
  }
}

// ------------------------------------------------------------------ token

function askForToken(problem) {
  visit += 1;
  leave?.();
  leave = null;
  document.title = "Token · zrmagent";
  fill(document.getElementById("nav"));
  const input = h("input", {
    type: "password",
    autocomplete: "off",
    required: true,
    spellcheck: false,
  });
  const row = field(
    "API token",
    input,
    "The contents of the agent's token file. The agent prints the file's path when it starts.",
  );
  row.setProblem(problem);
  const form = h(
    "form",
    {
      className: "panel token",
      onsubmit: (event) => {
        event.preventDefault();
        token.set(input.value.trim());
        show();
        check();
      },
    },
    h("h1", {}, "Sign in"),
    row,
    h("p", { className: "actions" }, h("button", { className: "primary" }, "Open the console")),
  );
  fill(main, form);
  input.focus();
}

signals.addEventListener("refused", () => {
  if (!token.get()) return;
  token.clear();
  setLink("", "");
  askForToken("The agent refused this token. Its token file has the current one.");
});

// ------------------------------------------------------------------ connection

let isLost = false;
let pause = CHECK_EVERY;
let timer = 0;

function setLink(state, text) {
  link.dataset.state = state;
  if (link.textContent !== text) link.textContent = text; // it is read aloud
}

signals.addEventListener("lost", () => {
  if (isLost) return;
  isLost = true;
  pause = 1000;
  setLink("lost", "Connection lost");
  fill(
    banner,
    h(
      "p",
      { className: "banner lost" },
      "The connection to the agent is lost. The page shows the last known state and keeps trying. ",
      button("Try now", () => check()),
    ),
  );
  schedule();
});

signals.addEventListener("found", () => {
  if (!isLost) return;
  isLost = false;
  pause = CHECK_EVERY;
  fill(banner, h("p", { className: "banner found" }, "The connection to the agent is back."));
  setTimeout(() => !isLost && fill(banner), 4000);
  dispatchEvent(new Event("zrm-regained"));
  check();
});

function schedule() {
  clearTimeout(timer);
  timer = setTimeout(check, pause);
  if (isLost) pause = Math.min(pause * 2, LONGEST_PAUSE);
}

async function check() {
  clearTimeout(timer);
  if (token.get()) {
    try {
      const status = await get("/api/v1/status");
      document.getElementById("node").textContent = status.node || "";
      const troubles = problems(status);
      setLink(
        troubles.length > 0 ? "trouble" : "up",
        troubles.length > 0 ? troubles[0] : "Connected",
      );
      link.title = troubles.join("\n");
    } catch (error) {
      if (error.status && error.status !== 401) setLink("trouble", error.message);
    }
  }
  schedule();
}

function problems(status) {
  const found = [];
  if (status.history?.problem) found.push(`History: ${status.history.problem}`);
  for (const sink of status.sinks || []) {
    if (sink.state === "failing")
      found.push(`Sink ${sink.name || sink.type}: ${sink.error || "failing"}`);
  }
  return found;
}

// ------------------------------------------------------------------ start

document.getElementById("skip").addEventListener("click", (event) => {
  event.preventDefault();
  main.focus();
});
addEventListener("hashchange", () => {
  token.takeFromAddress();
  show();
});
token.takeFromAddress();
if (!token.get()) await takeTokenFromTabs();
show(true);
check();
