// Elements of the page. Texts go in as text nodes and attribute values alone: nothing of a link,
// whoever wrote it, is ever read as markup.

import {harmless} from "./visible_text.js";

export const byId = (id) => document.getElementById(id);

// element("td", {class: "code", role: "cell"}, "text", otherElement). A property that is a function
// is a listener for the event of its name.
export function element(tag, properties = {}, ...children) {
  const made = document.createElement(tag);
  for (const [name, value] of Object.entries(properties)) {
    if (typeof value === "function") {
      made.addEventListener(name, value);
    } else if (value !== undefined && value !== null) {
      made.setAttribute(name, value);
    }
  }
  made.append(...children);
  return made;
}

// A part of a button's name that only screen readers need: which link it is about.
export const unseen = (text) => element("span", {class: "unseen"}, text);

// A text that somebody else wrote, within a sentence: its direction ends where it ends.
export const isolated = (text) => element("bdi", {}, harmless(text));

// Shows a text, or hides the element without one.
export function say(target, text) {
  target.textContent = text;
  target.hidden = text === "";
}

// A field's mistake, told beside it in the element that its id and "-error" name; an empty text takes
// the mistake back.
export function tellMistake(field, text) {
  say(byId(field + "-error"), text);
  if (text === "") {
    byId(field).removeAttribute("aria-invalid");
  } else {
    byId(field).setAttribute("aria-invalid", "true");
  }
}

// A button that cannot be used now keeps the focus, and says that it cannot.
export function setUsable(button, usable) {
  button.setAttribute("aria-disabled", String(!usable));
}

export const isUsable = (button) => button.getAttribute("aria-disabled") !== "true";
