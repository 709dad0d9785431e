// The server's clock. Times of links are the server's local time, whatever zone the browser is in;
// so they are calculated with as if they were UTC, and never meet the browser's own zone.

const SECOND = 1000;
const DAY = 24 * 60 * 60 * SECOND;
const UNITS = [
  ["year", 365 * DAY],
  ["day", DAY],
  ["hour", 60 * 60 * SECOND],
  ["minute", 60 * SECOND],
];
const relative = new Intl.RelativeTimeFormat("en", {numeric: "auto"});

let offset = Date.now() - performance.now();

// "2026-12-31 23:59:59" in milliseconds; NaN for anything else.
export const parse = (text) => Date.parse(text.replace(" ", "T") + "Z");

export const toField = (milliseconds) => new Date(milliseconds).toISOString().slice(0, 19);

// To be told of every `now` that the server sends.
export function setNow(text) {
  const now = parse(text);
  if (!Number.isNaN(now)) {
    offset = now - performance.now();
  }
}

export const now = () => offset + performance.now();

export const inDays = (days) => toField(now() + days * DAY);

// "2026-12-31 23:59": the seconds are for the form.
export const shown = (text) => text.slice(0, 16);

// "in 3 days", "2 hours ago"
export function distance(text) {
  const away = parse(text) - now();
  for (const [unit, length] of UNITS) {
    if (Math.abs(away) >= length) {
      return relative.format(Math.round(away / length), unit);
    }
  }
  return away < 0 ? "just now" : "in less than a minute";
}
