// A text with a button that copies it.

import { button, h } from "./dom.js";

/** The text, named by `label`, and behind the button what to do with it. */
export function copyable(text, label, advice) {
  const said = h("span", { role: "status", className: "hint" });
  const code = h("pre", { className: "copyable", tabIndex: 0, "aria-label": label }, text);
  return [
    code,
    h(
      "p",
      { className: "actions" },
      button("Copy", async () => {
        try {
          await navigator.clipboard.writeText(text);
          said.textContent = "Copied.";
        } catch {
          getSelection().selectAllChildren(code);
          said.textContent = "Selected; copy it with the keyboard.";
        }
      }),
      said,
      h("span", { className: "hint" }, advice),
    ),
  ];
}
