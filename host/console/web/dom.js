// Elements from code. Text from outside only ever becomes a text node, so markup in it stays text.

/** Makes an element: properties, then children (nodes, texts, lists; null and false skipped). */
export function h(tag, properties = {}, ...children) {
  const element = document.createElement(tag);
  for (const [name, value] of Object.entries(properties)) {
    if (value === null || value === undefined || value === false) continue;
    if (name.startsWith("on")) element.addEventListener(name.slice(2), value);
    else if (name === "title") element.title = visible(String(value));
    else if (name in element && !name.includes("-") && !fixed.has(name)) element[name] = value;
    else element.setAttribute(name, value === true ? "" : value);
  }
  element.append(...nodes(children));
  return element;
}

const fixed = new Set(["list", "form", "role"]);

// Controls, and what changes the direction of text: they would not show, but change what does.
const STEERING =
  // eslint-disable-next-line no-control-regex -- these are what it looks for
  /[\u0000-\u0008\u000b-\u001f\u007f-\u009f\u061c\u200e\u200f\u2028-\u202e\u2066-\u2069]/g;

/** A text with such characters written by number. */
export const visible = (text) =>
  text.replace(STEERING, (one) => `\\u${one.charCodeAt(0).toString(16).padStart(4, "0")}`);

function nodes(children) {
  return children
    .flat(Infinity)
    .filter((child) => child !== null && child !== undefined && child !== false)
    .map((child) => (typeof child === "string" ? visible(child) : child));
}

/** Replaces what an element holds. */
export function fill(element, ...children) {
  element.replaceChildren(...nodes(children));
  return element;
}

/** Fills what is read aloud when it changes; what says the same again is left alone. */
export function say(element, ...children) {
  const next = h("div", {}, ...children);
  if (next.textContent !== element.textContent) element.replaceChildren(...next.childNodes);
}

/** A link to a page elsewhere, which learns nothing of this one; text if it is not http(s). */
export function link(url) {
  return /^https?:\/\//.test(url)
    ? h("a", { href: url, target: "_blank", rel: "noopener noreferrer" }, url)
    : url;
}

const SVG = "http://www.w3.org/2000/svg";

export function svg(tag, attributes = {}, ...children) {
  const element = document.createElementNS(SVG, tag);
  for (const [name, value] of Object.entries(attributes)) element.setAttribute(name, value);
  element.append(...children);
  return element;
}

let lastId = 0;

/** A label and its control, with room for a hint and for what is wrong. */
export function field(label, control, hint = "") {
  control.id ||= `field${++lastId}`;
  const problem = h("p", { className: "problem", id: `${control.id}-problem`, hidden: true });
  const described = [problem.id];
  let note = null;
  if (hint) {
    note = h("p", { className: "hint", id: `${control.id}-hint` }, hint);
    described.push(note.id);
  }
  control.setAttribute("aria-describedby", described.join(" "));
  const element = h(
    "div",
    { className: "field" },
    h("label", { htmlFor: control.id }, label),
    control,
    note,
    problem,
  );
  element.control = control;
  element.setProblem = (text) => {
    problem.textContent = text || "";
    problem.hidden = !text;
    if (text) control.setAttribute("aria-invalid", "true");
    else control.removeAttribute("aria-invalid");
  };
  return element;
}

export function select(options, value, properties = {}) {
  const control = h(
    "select",
    properties,
    options.map((option) => {
      const [key, text] = Array.isArray(option) ? option : [option, option];
      return h("option", { value: key }, text);
    }),
  );
  if (value !== undefined && value !== null) control.value = value;
  return control;
}

export function button(text, action, properties = {}) {
  return h("button", { type: "button", onclick: action, ...properties }, text);
}

/** A table whose roles survive its being laid out as cards on a narrow screen. */
export function table(caption, columns, rows, properties = {}) {
  return h(
    "table",
    { role: "table", ...properties },
    h("caption", { className: "unseen" }, caption),
    h(
      "thead",
      { role: "rowgroup" },
      h(
        "tr",
        { role: "row" },
        columns.map((column) =>
          h(
            "th",
            { role: "columnheader", scope: "col", className: column.className || "" },
            column.head ?? column.label,
          ),
        ),
      ),
    ),
    h(
      "tbody",
      { role: "rowgroup" },
      rows.map((cells) =>
        h(
          "tr",
          { role: "row" },
          cells.map((cell, index) =>
            h(
              "td",
              {
                role: "cell",
                className: `${columns[index].className || ""}${cell === null ? " absent" : ""}`,
                "data-label": columns[index].label,
              },
              cell,
            ),
          ),
        ),
      ),
    ),
  );
}

/** Shown where there is nothing, nothing yet, or an error with what to do about it. */
export function empty(title, text, ...actions) {
  return h(
    "div",
    { className: "empty" },
    h("h2", {}, title),
    h("p", {}, text),
    actions.length > 0 && h("p", { className: "actions" }, actions),
  );
}

export function loading(text = "Loading") {
  return h("p", { className: "loading", role: "status" }, `${text} …`);
}

/** The agent's problems as a sentence. */
export const sentence = (text) =>
  `${text.charAt(0).toUpperCase()}${text.slice(1)}${/[.!?]$/.test(text) ? "" : "."}`;

/** Why something failed; what a lost connection stopped is tried again once it is back. */
export function failure(error, retry) {
  const element = h(
    "div",
    { className: "empty failure", role: "alert" },
    h("h2", {}, error.title || "That did not work"),
    h("p", {}, sentence(error.message)),
    error.cure && h("p", {}, error.cure),
    retry &&
      h(
        "p",
        { className: "actions" },
        button("Try again", () => retry()),
      ),
  );
  if (retry && error.status === 0)
    addEventListener("zrm-regained", () => element.isConnected && retry(), { once: true });
  return element;
}

/** Runs the last of several calls, after a pause in them. */
export function debounce(action, milliseconds) {
  let timer = 0;
  return (...values) => {
    clearTimeout(timer);
    timer = setTimeout(() => action(...values), milliseconds);
  };
}

/** Asks before something that cannot be undone; true when it is meant. */
export function confirm(title, text, verb) {
  return new Promise((resolve) => {
    const dialog = h(
      "dialog",
      { "aria-labelledby": "dialog-title" },
      h("h2", { id: "dialog-title" }, title),
      h("p", {}, text),
      h(
        "p",
        { className: "actions" },
        button("Cancel", () => dialog.close("")),
        button(verb, () => dialog.close("yes"), { className: "danger" }),
      ),
    );
    dialog.addEventListener("close", () => {
      dialog.remove();
      resolve(dialog.returnValue === "yes");
    });
    document.body.append(dialog);
    dialog.showModal();
  });
}
