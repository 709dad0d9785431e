// The dialogs about one link, and the questions. All are <dialog> elements shown as modal: the
// browser keeps the focus inside.

import * as api from "./api.js";
import * as clock from "./clock.js";
import {byId, element, isolated, isUsable, say, setUsable} from "./dom.js";
import * as notice from "./notice.js";
import * as texts from "./texts.js";

let wanted = 0;                 // what somebody asked to see last
const openings = new WeakMap(); // by dialog, how often it was opened and closed

const current = (dialog) => openings.get(dialog) ?? 0;
const turn = (dialog) => openings.set(dialog, current(dialog) + 1);

export const isAnyOpen = () => document.querySelector("dialog[open]") !== null;

// For what is shown once an answer has come: the function returned says whether it is still wanted,
// or whether something else was asked for or opened meanwhile.
export function want() {
  const mine = ++wanted;
  return () => mine === wanted && !isAnyOpen();
}

// Whether the dialog is still open as it is now: not closed since, nor opened for something else.
export function stillOpen(dialog) {
  const opening = current(dialog);
  return () => dialog.open && opening === current(dialog);
}

// `comeBack` puts the focus where it belongs once the dialog is closed; without it the browser
// gives it back to the element that had it.
export function open(dialog, comeBack = undefined) {
  wanted++;
  turn(dialog);
  dialog.addEventListener("close", () => {
    turn(dialog);
    comeBack?.();
  }, {once: true});
  dialog.showModal();
}

// Takes the key from the browser, which closes two dialogs with one press where the second was not
// opened by a press of its own. The last function that a dialog was given counts.
export function onEscape(dialog, leave) {
  dialog.onkeydown = (event) => {
    if (event.key === "Escape") {
      event.preventDefault();
      leave();
    }
  };
}

export function start() {
  for (const button of document.querySelectorAll("dialog [data-close]")) {
    button.addEventListener("click", () => button.closest("dialog").close());
  }
  for (const dialog of document.querySelectorAll("dialog")) {
    onEscape(dialog, () => dialog.close());
  }
  byId("copy-address").addEventListener("click", copyShownAddress);
  byId("address").addEventListener("focus", () => byId("address").select());
}

// ---- the address ----

// The server's own answer, or, where it does not know its name, what this page's address suggests.
export const addressOf = (answer) =>
    answer.url || new URL("/sharing/" + answer.link.hash, location.origin).href;

export const guessed = (answer) => answer.url
    ? ""
    : "The server does not know its own address; this one is made from the address of this page.";

// Puts the text that a promise ends with into the clipboard; false where the browser does not allow
// it, as on pages that came without HTTPS. The clipboard gets the promise, because some browsers
// allow this only while a button is being pressed.
export async function copy(promise) {
  const blob = promise.then((text) => new Blob([text], {type: "text/plain"}));
  blob.catch(() => {}); // is met below
  try {
    await navigator.clipboard.write([new ClipboardItem({"text/plain": blob})]);
    return true;
  } catch {
    // Older browsers take no promise.
  }
  const text = await promise;
  try {
    await navigator.clipboard.writeText(text);
    return true;
  } catch {
    return false;
  }
}

async function copyShownAddress() {
  const field = byId("address");
  const copied = await copy(Promise.resolve(field.value));
  if (copied) {
    byId("address-status").textContent = "The address is copied.";
    return;
  }
  field.focus();
  field.select();
  byId("address-status").textContent = "The browser does not let this page copy. The address is \
selected: copy it with the keyboard (Ctrl+C) or the context menu.";
}

// Shows the address of a link, from an answer of the methods create, get and set.
export function showAddress(answer, {heading, status = "", selected = false, comeBack}) {
  byId("address-heading").replaceChildren(...heading);
  byId("address").value = addressOf(answer);
  byId("address-status").textContent = status;
  say(byId("address-note"), guessed(answer));
  showQr(answer);
  open(byId("address-dialog"), comeBack);
  if (selected) {
    byId("address").focus();
  }
}

// As an image, where nothing that a text from elsewhere might hold can run.
function showQr(answer) {
  const image = byId("qr");
  const svg = answer.qr_svg ?? "";
  image.hidden = svg === "";
  byId("no-qr").hidden = svg !== "";
  if (svg === "") {
    image.removeAttribute("src");
    return;
  }
  image.src = "data:image/svg+xml;charset=utf-8," + encodeURIComponent(svg);
  image.alt = "QR code of the address " + addressOf(answer);
}

// ---- the visitors ----

// `about` is the link's identity in words, for the question before all are signed out.
export function showVisitors(link, about, comeBack) {
  byId("visitors-rows").replaceChildren();
  byId("visitors-scroll").hidden = true;
  byId("sign-out").hidden = true;
  byId("sign-out").onclick = () => signOut(link, about);
  byId("visitors-heading").replaceChildren("Visitors of ", ...texts.quoted(link));
  open(byId("visitors-dialog"), comeBack);
  return listVisitors(link, "");
}

// `before` is what has happened since the last time, as a sentence.
async function listVisitors(link, before) {
  byId("visitors-count").textContent = before + "Loading…";
  const isWanted = stillOpen(byId("visitors-dialog"));
  try {
    const answer = await api.link("sessions", {id: link.id});
    if (!isWanted()) {
      return;
    }
    byId("visitors-scroll").hidden = answer.sessions.length === 0;
    byId("sign-out").hidden = answer.total === 0;
    byId("visitors-rows").replaceChildren(...answer.sessions.map(visitorRow));
    byId("visitors-count").textContent = before + visitorsCount(answer);
  } catch (error) {
    if (isWanted()) {
      byId("visitors-count").textContent = before + texts.describe(error);
    }
  }
}

function signOut(link, about) {
  const isWanted = stillOpen(byId("visitors-dialog"));
  ask({
    heading: ["Sign everyone out of ", ...texts.quoted(link), "?"],
    text: [...about, " Whoever is in has to open the link anew, and counts as one more use. Who is \
to stay out needs a link that is disabled, or another password, first."],
    yes: "Sign everyone out",
    act: () => api.link("sign_out", {id: link.id}),
    after: ({signed_out: number}) => {
      const done = texts.plural(number, "visitor is", "visitors are") + " signed out. ";
      if (isWanted()) {
        listVisitors(link, done);
      } else {
        notice.show(done);
      }
    },
    comeBack: () => byId("visitors-close").focus(),
  });
}

function visitorRow(session) {
  const cell = (text) => element("td", {role: "cell", class: "wraps"}, text);
  return element("tr", {role: "row"},
                 element("th", {role: "rowheader", scope: "row"},
                         session.user ? isolated(session.user) : "A stranger"),
                 cell(session.ip), cell(clock.shown(session.expires_at)));
}

function visitorsCount(answer) {
  if (answer.total === 0) {
    return "Nobody is admitted now.";
  }
  const all = texts.plural(answer.total, "visitor is", "visitors are") + " admitted now";
  return answer.total > answer.sessions.length
      ? `${all}; the ${answer.sessions.length} that stay longest are shown.`
      : all + ".";
}

// ---- questions ----

// Asks before something that cannot be taken back. `act` does it and may fail; the dialog stays
// open then, and says why. `heading` and `text` are lists of texts and elements.
export function ask({heading, text, yes, no = "Cancel", act, after, comeBack}) {
  const dialog = byId("question-dialog");
  const button = byId("question-yes");
  const problem = byId("question-problem");
  byId("question-heading").replaceChildren(...heading);
  byId("question-text").replaceChildren(...text);
  say(problem, "");
  button.textContent = yes;
  byId("question-no").textContent = no;
  setUsable(button, true);
  button.onclick = () => attempt({dialog, button, problem, act, after});
  open(dialog, comeBack);
}

// Does what a dialog's button is for and closes the dialog; when it fails the dialog says why. What
// is to be said on the page comes in `after`: under an open dialog no screen reader hears it. The
// answer may come after the dialog was closed, or opened for something else: then it touches none
// of that, and a failure is told on the page.
export async function attempt({
  dialog,
  button,
  problem,
  act,
  after = () => {},
  release = () => setUsable(button, true),
}) {
  if (!isUsable(button)) {
    return;
  }
  const isWanted = stillOpen(dialog);
  setUsable(button, false);
  say(problem, "");
  try {
    const result = await act();
    if (isWanted()) {
      dialog.close();
    }
    after(result);
  } catch (error) {
    if (isWanted()) {
      say(problem, texts.describe(error));
      release();
    } else {
      notice.show(texts.describe(error));
    }
  }
}
