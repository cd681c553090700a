// Requests to the agent, with the session's token.

const KEY = "zrm-token";

export const token = {
  get: () => sessionStorage.getItem(KEY) || "",
  set: (value) => sessionStorage.setItem(KEY, value),
  clear: () => sessionStorage.removeItem(KEY),
  /** Takes a token from the address and removes it there. */
  takeFromAddress() {
    const match = /^#token=([^&]*)&?(.*)$/.exec(location.hash);
    if (!match) return;
    if (match[1]) token.set(decodeURIComponent(match[1]));
    history.replaceState(null, "", `${location.pathname}#${match[2] || "/logs"}`);
  },
};

// A tab that is opened from another one asks it for the token. Only pages of this agent hear that.
const tabs = new BroadcastChannel(KEY);
const PATIENCE_WITH_TABS = 300;
tabs.addEventListener("message", ({ data }) => {
  if (data === "ask" && token.get()) tabs.postMessage({ token: token.get() });
});

/** Takes the token of another tab, if there is one. */
export function takeTokenFromTabs() {
  return new Promise((resolve) => {
    setTimeout(resolve, PATIENCE_WITH_TABS);
    tabs.addEventListener(
      "message",
      ({ data }) => {
        if (!data.token) return;
        token.set(data.token);
        resolve();
      },
      { once: true },
    );
    tabs.postMessage("ask");
  });
}

/** Why a request failed, and what to do. */
export class ApiError extends Error {
  constructor(status, problem) {
    super(problem.detail || problem.title || `The agent answered with status ${status}.`);
    this.status = status;
    this.field = problem.field || "";
    if (status === 0) {
      this.title = "The agent does not answer";
      this.cure = "The console reconnects by itself.";
    } else if (status === 404 && !problem.detail) {
      this.title = "Not found";
    } else if (status >= 500) {
      this.title = "The agent could not do that";
      this.cure = "Its trace says why.";
    }
  }
}

/** Events for the page: `lost` and `found` for the connection, `refused` for the token. */
export const signals = new EventTarget();
const signal = (name) => signals.dispatchEvent(new Event(name));

function lost() {
  signal("lost");
  return new ApiError(0, { detail: "The connection to the agent is lost." });
}

/** A view's module. It comes from the agent, as answers do, and fails as they do. */
export const viewModule = (name) =>
  import(`./views/${name}.js`).catch(() => {
    throw lost();
  });

export async function open(path, options = {}) {
  const headers = { Authorization: `Bearer ${token.get()}`, ...options.headers };
  let body;
  if (options.body !== undefined) {
    headers["Content-Type"] = "application/json";
    body = JSON.stringify(options.body);
  }
  let response;
  try {
    response = await fetch(path, {
      method: options.method || "GET",
      headers,
      body,
      signal: options.signal,
      cache: "no-store",
    });
  } catch (error) {
    if (error.name === "AbortError") throw error;
    throw lost();
  }
  signal("found");
  if (response.ok) return response;
  let problem = {};
  try {
    problem = await response.json();
  } catch {
    // An answer without a problem document still has its status.
  }
  if (response.status === 401) signal("refused");
  throw new ApiError(response.status, problem);
}

export async function request(method, path, body, abort) {
  const response = await open(path, { method, body, signal: abort });
  const text = await response.text();
  return text ? JSON.parse(text) : null;
}

export const get = (path, abort) => request("GET", path, undefined, abort);
export const post = (path, body = {}, abort) => request("POST", path, body, abort);

/** Posts a body and takes each line of the answer, an object, as it arrives; the last has `end`. */
export async function postForLines(path, body, abort, take) {
  const headers = { Accept: "application/x-ndjson" };
  const response = await open(path, { method: "POST", headers, body, signal: abort });
  const reader = response.body.getReader();
  const decoder = new TextDecoder();
  let rest = "";
  let isOver = false;
  while (!isOver) {
    const { done, value } = await reader.read().catch((error) => {
      throw error.name === "AbortError" ? error : lost();
    });
    if (done) throw lost();
    const lines = (rest + decoder.decode(value, { stream: true })).split("\n");
    rest = lines.pop();
    for (const line of lines) {
      const object = JSON.parse(line);
      isOver = "end" in object;
      take(object);
    }
  }
}

/** Path and query; lists repeat their key, empty values are left out. */
export function withQuery(path, values) {
  const query = new URLSearchParams();
  for (const [key, value] of Object.entries(values)) {
    for (const one of [value].flat())
      if (one !== "" && one !== null && one !== undefined) query.append(key, one);
  }
  const text = query.toString();
  return text ? `${path}?${text}` : path;
}

export const situationPath = (name, action = "") =>
  `/api/v1/situations/${encodeURIComponent(name)}${action && `/${action}`}`;
