// The line that says what was done. It stays until the next one or until it is dismissed: nobody
// has to be quick to read it or to take something back. Its element is always there and only its
// content changes, which is what screen readers listen for.

import {byId} from "./dom.js";

const PAUSE = 50;

let takeBack = null;
let timer;

// `content` is a text, or a list of texts and elements; `undo` is what the button Undo does, and
// without it there is none.
export function show(content, undo = null) {
  takeBack = undo;
  byId("notice").classList.add("shown");
  byId("undo").hidden = undo === null;
  byId("dismiss").hidden = false;
  byId("notice-text").replaceChildren();
  clearTimeout(timer);
  // Set a moment later it is read out, the same one twice too.
  timer = setTimeout(() => byId("notice-text").replaceChildren(...[content].flat()), PAUSE);
}

export function hide() {
  takeBack = null;
  clearTimeout(timer);
  byId("notice").classList.remove("shown");
  byId("undo").hidden = true;
  byId("dismiss").hidden = true;
  byId("notice-text").replaceChildren();
}

// `leave` puts the focus elsewhere once a button of the notice has vanished.
export function start(leave) {
  byId("undo").addEventListener("click", () => {
    const undo = takeBack;
    hide();
    leave();
    undo?.();
  });
  byId("dismiss").addEventListener("click", () => {
    hide();
    leave();
  });
}
