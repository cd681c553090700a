// Charts over time. Chart.js is loaded by the first view that shows one.

import { h, svg } from "./dom.js";
import { clock, number, rateText } from "./format.js";

let library = null;

function load() {
  library ??= new Promise((resolve, reject) => {
    document.head.append(
      h("script", {
        src: "/console/chart.js",
        onload: () => resolve(window.Chart),
        onerror: () => {
          library = null;
          reject(new Error("The chart library could not be loaded."));
        },
      }),
    );
  });
  return library;
}

const colour = (name) => getComputedStyle(document.documentElement).getPropertyValue(name).trim();

function summary(values, label, minuteOf, minutes) {
  const known = values.filter((value) => value !== null);
  if (known.length === 0) return `${label}: no data yet`;
  const most = Math.max(...known);
  const total = known.reduce((sum, value) => sum + value, 0) * minutes;
  const peak = most > 0 ? ` at ${minuteOf(values.indexOf(most))}` : "";
  return `${label}: ${number(total)} in all, at most ${rateText(most)} per minute${peak}`;
}

/** Draws entries and events per minute. Returns what ends the chart. */
export async function drawRates(holder, rates, series) {
  const begin = new Date(rates.start).getTime();
  const minuteOf = (index) => clock(new Date(begin + index * rates.step * 1000)).slice(0, 5);
  const perMinute = (values) =>
    values.map((value) => (value === null ? null : (value * 60) / rates.step));
  // Entries are counted at the end of each minute: the current one is unknown, not zero.
  const entries = perMinute(series.entries.with(-1, null));
  const events = perMinute(series.events);
  const summed = (values, label) => summary(values, label, minuteOf, rates.step / 60);
  const text = `${summed(entries, "Entries")}. ${summed(events, "Events")}.`;
  const canvas = h("canvas", {
    role: "img",
    "aria-label": `Entries and events per minute. ${text}`,
  });
  holder.replaceChildren(
    h("div", { className: "chart" }, canvas),
    h("p", { className: "hint" }, text),
  );
  const Chart = await load();
  if (!canvas.isConnected) return () => {};
  const line = (label, data, name) => ({
    label,
    data,
    borderColor: colour(name),
    backgroundColor: colour(name),
    borderWidth: 1.5,
    pointRadius: ({ dataIndex: at }) =>
      (data[at - 1] ?? null) === null && (data[at + 1] ?? null) === null ? 2 : 0,
    pointHitRadius: 6,
    tension: 0,
  });
  const axis = {
    grid: { color: colour("--line") },
    ticks: { color: colour("--quiet"), maxRotation: 0, autoSkipPadding: 24 },
  };
  const chart = new Chart(canvas, {
    type: "line",
    data: {
      labels: entries.map((_, index) => minuteOf(index)),
      datasets: [
        line("Entries per minute", entries, "--accent"),
        line("Events per minute", events, "--bad"),
      ],
    },
    options: {
      animation: false,
      maintainAspectRatio: false,
      interaction: { mode: "index", intersect: false },
      scales: {
        x: axis,
        y: { ...axis, beginAtZero: true, ticks: { ...axis.ticks, precision: 0 } },
      },
      plugins: {
        legend: { align: "start", labels: { color: colour("--text"), boxWidth: 12, boxHeight: 2 } },
      },
    },
  });
  return () => chart.destroy();
}

/** A line of the sums over 96 quarters of an hour or less, without axes. */
export function sparkline(values, label) {
  const size = Math.max(1, Math.ceil(values.length / 96));
  const sums = [];
  for (let at = 0; at < values.length; at += size) {
    const known = values.slice(at, at + size).filter((value) => value !== null);
    sums.push(
      known.length > 0 ? known.reduce((sum, value) => sum + value, 0) / known.length : null,
    );
  }
  const most = Math.max(1e-9, ...sums.filter((value) => value !== null));
  let path = "";
  let isBroken = true;
  const lone = []; // points without a neighbour, which make no line
  sums.forEach((value, index) => {
    if (value === null) {
      isBroken = true;
      return;
    }
    const x = ((index / Math.max(1, sums.length - 1)) * 118 + 1).toFixed(1);
    const y = (20.5 - (value / most) * 19).toFixed(1);
    path += `${isBroken ? "M" : "L"}${x} ${y}`;
    if (isBroken && (sums[index + 1] ?? null) === null)
      lone.push(svg("circle", { cx: x, cy: y, r: 1.5 }));
    isBroken = false;
  });
  const drawing = svg("svg", {
    class: "spark",
    viewBox: "0 0 120 22",
    preserveAspectRatio: "none",
    role: "img",
    "aria-label": label,
  });
  drawing.append(svg("path", { d: path }), ...lone);
  return drawing;
}
