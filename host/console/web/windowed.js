// A list of which only the rows in sight exist, so that its length costs nothing.

import { h } from "./dom.js";

const MARGIN = 8; // rows kept above and below those in sight

/** Rows of one height, newest first. Arrow keys move the chosen row, Enter opens it. */
export class WindowedList {
  items = [];
  #chosen = null;
  #inner = h("div", { className: "windowed-inner", role: "presentation" });
  #scheduled = false;

  /** options: label, row(item) -> children, choose(item), end() once the last rows are in sight */
  constructor(options) {
    this.options = options;
    this.element = h(
      "div",
      {
        className: "windowed",
        tabIndex: 0,
        role: "listbox",
        "aria-label": options.label,
        onscroll: () => this.draw(),
        onkeydown: (event) => this.#key(event),
      },
      this.#inner,
    );
    this.resize = new ResizeObserver(() => this.draw());
    this.resize.observe(this.element);
  }

  get rowHeight() {
    return parseFloat(getComputedStyle(this.element).getPropertyValue("--row")) || 28;
  }

  /** Puts items on top. A reader who has scrolled down keeps the rows in sight. */
  prepend(items, most) {
    const top = this.element.scrollTop;
    this.items = items.concat(this.items);
    if (this.items.length > most) this.items.length = most;
    if (top > 0) {
      this.#size();
      this.element.scrollTop = top + items.length * this.rowHeight;
    }
    this.draw();
  }

  append(items) {
    this.items = this.items.concat(items);
    this.draw();
  }

  reset(items) {
    this.items = items;
    this.#chosen = null;
    this.element.scrollTop = 0;
    this.draw();
  }

  get isAtTop() {
    return this.element.scrollTop < this.rowHeight;
  }

  draw() {
    if (this.#scheduled) return;
    this.#scheduled = true;
    requestAnimationFrame(() => {
      this.#scheduled = false;
      this.#drawNow();
    });
  }

  #size() {
    this.#inner.style.height = `${this.items.length * this.rowHeight}px`;
  }

  #drawNow() {
    this.#size();
    const height = this.rowHeight;
    const first = Math.max(0, Math.floor(this.element.scrollTop / height) - MARGIN);
    const last = Math.min(
      this.items.length,
      first + Math.ceil(this.element.clientHeight / height) + 2 * MARGIN,
    );
    const rows = [];
    for (let index = first; index < last; index += 1)
      rows.push(this.#row(this.items[index], index, height));
    this.#inner.replaceChildren(...rows);
    const isChosenInSight = rows.some((row) => row.id === `event-${this.#chosen?.id}`);
    if (isChosenInSight)
      this.element.setAttribute("aria-activedescendant", `event-${this.#chosen.id}`);
    else this.element.removeAttribute("aria-activedescendant");
    if (last === this.items.length && this.items.length > 0) this.options.end?.();
  }

  #row(item, index, height) {
    const row = h(
      "div",
      {
        id: `event-${item.id}`,
        className: `windowed-row ${this.options.className?.(item) ?? ""}`,
        role: "option",
        "aria-selected": String(item === this.#chosen),
        "aria-posinset": index + 1,
        "aria-setsize": this.items.length,
        onclick: () => this.choose(item),
      },
      this.options.row(item),
    );
    row.style.top = `${index * height}px`;
    return row;
  }

  choose(item) {
    this.#chosen = item;
    this.draw();
    this.options.choose(item);
  }

  #key(event) {
    const page = Math.max(1, Math.floor(this.element.clientHeight / this.rowHeight) - 1);
    const steps = {
      ArrowDown: 1,
      ArrowUp: -1,
      PageDown: page,
      PageUp: -page,
      Home: -Infinity,
      End: Infinity,
    };
    if (event.key === "Enter" && this.#chosen) this.options.choose(this.#chosen, true);
    else if (event.key in steps && this.items.length > 0) this.#move(steps[event.key]);
    else return;
    event.preventDefault();
  }

  #move(step) {
    const from = this.#chosen ? this.items.indexOf(this.#chosen) : -1;
    const index = Math.min(this.items.length - 1, Math.max(0, from + step));
    const top = index * this.rowHeight;
    if (top < this.element.scrollTop) this.element.scrollTop = top;
    const bottom = top + this.rowHeight - this.element.clientHeight;
    if (bottom > this.element.scrollTop) this.element.scrollTop = bottom;
    this.choose(this.items[index]);
  }
}
