// The form for everything that a link can hold. It sends the fields that hold something else than
// when they were filled: what nobody touched is not written back, neither over what others change
// meanwhile, such as the count of uses, nor in the shape that a field makes of it, which drops line
// feeds.

import * as api from "./api.js";
import * as clock from "./clock.js";
import {ask, onEscape, open, stillOpen} from "./dialogs.js";
import {byId, isUsable, say, setUsable, tellMistake} from "./dom.js";
import {inexactNumber} from "./json_numbers.js";
import * as notice from "./notice.js";
import * as texts from "./texts.js";

const LARGEST_NUMBER = 2147483647;
const LONGEST_TITLE = 255;
const HASH = /^[A-Za-z0-9_-]{3,64}$/;
const FIELDS = ["project_name", "owner_user", "path", "app", "protect_title", "enabled",
                "protect_type", "protect_password", "protect_users", "protect_groups",
                "enable_match_ip", "start_at", "expire_at", "expire_times", "use_count", "auto_gc",
                "hash", "redirect_type", "redirect_uri", "private_data"];

// What a new link holds before anything is typed; the API's own defaults.
const BLANK = {
  id: 0,
  hash: "",
  project_name: texts.FILE_PROJECT,
  owner_user: "",
  enabled: true,
  start_at: "",
  expire_at: "",
  expire_times: 0,
  use_count: 0,
  auto_gc: true,
  enable_match_ip: true,
  protect_type: "none",
  protect_title: "",
  protect_users: [],
  protect_groups: [],
  redirect_type: "none",
  redirect_uri: "",
  app: {},
};

const encoder = new TextEncoder();
const lines = (text) => text.split("\n").map((line) => line.trim()).filter((line) => line !== "");
const isFile = () => byId("project_name").value.trim() === texts.FILE_PROJECT;
const protectType = () =>
    document.querySelector("input[name=protect_type]:checked")?.value ?? "none";

let link = BLANK;   // the one being edited
let inexact;        // a number of its data that the browser cannot hold
let initial = {};   // what the fields held when they were filled
let isSaving = false;
let saved;          // to be called with the answer

class Mistake extends Error {}

// ---- reading ----

// What a field holds, as it holds it.
function raw(field) {
  if (field === "protect_type") {
    return protectType();
  }
  return byId(field).type === "checkbox" ? byId(field).checked : byId(field).value;
}

const rawValues = () => Object.fromEntries(FIELDS.map((field) => [field, raw(field)]));
const isTouched = (field) => raw(field) !== initial[field] || byId(field).validity?.badInput;
const isChanged = () => FIELDS.some(isTouched);

function readNumber(id) {
  const text = byId(id).value.trim();
  const number = Number(text);
  if (!/^[0-9]+$/.test(text) || number > LARGEST_NUMBER) {
    throw new Mistake(`A whole number from 0 to ${LARGEST_NUMBER}, please.`);
  }
  return number;
}

function readTime(id) {
  const field = byId(id);
  if (field.validity.badInput) {
    throw new Mistake("This date is not complete, or there is no such day.");
  }
  // Browsers leave out seconds that are zero.
  return field.value.length === 16 ? field.value + ":00" : field.value;
}

function readObject(id) {
  const text = byId(id).value.trim();
  if (text === "") {
    return {};
  }
  let value;
  try {
    value = JSON.parse(text);
  } catch (error) {
    throw new Mistake("This is no JSON: " + error.message);
  }
  if (value === null || typeof value !== "object" || Array.isArray(value)) {
    throw new Mistake("This is JSON, but not an object: it begins with { and ends with }.");
  }
  const number = inexactNumber(text);
  if (number !== undefined) {
    throw new Mistake(`No browser can keep the number ${number} as it is. Write it as a text, in \
quotation marks, or use the command line.`);
  }
  return value;
}

function readTitle() {
  const title = byId("protect_title").value;
  if (encoder.encode(title).length > LONGEST_TITLE) {
    throw new Mistake(`The title is too long; ${LONGEST_TITLE} bytes are the most.`);
  }
  return title;
}

function readHash() {
  const hash = byId("hash").value.trim();
  if (!HASH.test(hash) && (hash !== "" || link.id !== 0)) {
    throw new Mistake("3 to 64 letters, digits, “-” and “_”, please.");
  }
  return hash;
}

function readProject() {
  const project = byId("project_name").value.trim();
  if (project === "") {
    throw new Mistake("Every link belongs to a project.");
  }
  return project;
}

// Other members that a file link's data may have stay as they are.
function readPath() {
  const path = byId("path").value;
  if (path === "") {
    throw new Mistake("Which file is to be shared?");
  }
  return link.project_name === texts.FILE_PROJECT ? {...link.app, path} : {path};
}

function readEnd() {
  const end = readTime("expire_at");
  const start = byId("start_at").value;
  if (end !== "" && start !== "" && clock.parse(end) <= clock.parse(start)) {
    throw new Mistake("The end lies behind the beginning.");
  }
  return end;
}

function readOwner() {
  const owner = byId("owner_user").value.trim();
  if (owner === "") {
    throw new Mistake("Every link has an owner.");
  }
  return owner;
}

// A link that is given this protection must not fall back on a password that it once had.
function readPassword() {
  const password = byId("protect_password").value;
  if (password === "") {
    throw new Mistake("Which password is it to have?");
  }
  return password;
}

function readRedirect() {
  const uri = byId("redirect_uri").value.trim();
  if (uri === "" && byId("redirect_type").value !== "none") {
    throw new Mistake("Where does the redirect lead to?");
  }
  return uri;
}

const READERS = {
  project_name: readProject,
  owner_user: readOwner,
  app: () => isFile() ? readPath() : readObject("app"),
  protect_title: readTitle,
  enabled: () => byId("enabled").checked,
  protect_type: protectType,
  protect_password: readPassword,
  protect_users: () => lines(byId("protect_users").value),
  protect_groups: () => lines(byId("protect_groups").value),
  enable_match_ip: () => byId("enable_match_ip").checked,
  start_at: () => readTime("start_at"),
  expire_at: readEnd,
  expire_times: () => readNumber("expire_times"),
  use_count: () => readNumber("use_count"),
  auto_gc: () => byId("auto_gc").checked,
  hash: readHash,
  redirect_type: () => byId("redirect_type").value,
  redirect_uri: readRedirect,
  private_data: () => readObject("private_data"),
};

const fieldOf = (argument) => argument === "app" && isFile() ? "path" : argument;
const isNew = () => link.id === 0;

// What a field that nobody touched has to be looked at for: it may be wrong now that others differ.
const NEEDED = {
  project_name: isNew,
  app: () => isFile() && (isNew() || isTouched("project_name")),
  protect_password: () => protectType() === "password" && link.protect_type !== "password",
  expire_at: () => isTouched("start_at"),
  redirect_uri: () => isTouched("redirect_type"),
};

// Fields that the other choices have put out of sight say nothing.
function counts(argument) {
  switch (argument) {
    case "protect_password":
      return protectType() === "password";
    case "protect_users":
    case "protect_groups":
      return protectType() === "user";
    case "private_data": // never shown, so an empty field means nothing
      return byId("private_data").value.trim() !== "";
    default:
      return true;
  }
}

// What is to be sent, by the API's names, and the mistakes by field.
function read() {
  const settings = {};
  const mistakes = {};
  for (const [argument, value] of Object.entries(READERS)) {
    const touched = isTouched(fieldOf(argument));
    if (!counts(argument) || !(touched || NEEDED[argument]?.())) {
      continue;
    }
    try {
      const found = value();
      if (touched || argument === "project_name") {
        settings[argument] = found;
      }
    } catch (error) {
      if (!(error instanceof Mistake)) {
        throw error;
      }
      mistakes[fieldOf(argument)] = error.message;
    }
  }
  // A password or a list says by itself which protection it means; that shall be the one shown.
  if ("protect_password" in settings || "protect_users" in settings ||
      "protect_groups" in settings) {
    settings.protect_type = protectType();
  }
  if (settings.hash === "") {
    delete settings.hash; // one is drawn
  }
  return {settings, mistakes};
}

// ---- showing ----

function fill() {
  const set = (id, value) => {
    byId(id).value = value;
  };
  set("project_name", link.project_name);
  set("owner_user", link.owner_user);
  set("path", texts.path(link));
  set("app", Object.keys(link.app).length === 0 ? "" : JSON.stringify(link.app, null, 2));
  set("protect_title", link.protect_title);
  byId("enabled").checked = link.enabled;
  for (const choice of document.querySelectorAll("input[name=protect_type]")) {
    choice.checked = choice.value === link.protect_type;
  }
  set("protect_password", "");
  set("protect_users", link.protect_users.join("\n"));
  set("protect_groups", link.protect_groups.join("\n"));
  byId("enable_match_ip").checked = link.enable_match_ip;
  set("start_at", link.start_at.replace(" ", "T"));
  set("expire_at", link.expire_at.replace(" ", "T"));
  set("expire_times", String(link.expire_times));
  set("use_count", String(link.use_count));
  byId("auto_gc").checked = link.auto_gc;
  set("hash", link.hash);
  set("redirect_type", link.redirect_type);
  set("redirect_uri", link.redirect_uri);
  set("private_data", "");
  byId("app").readOnly = byId("path").readOnly = inexact !== undefined;
}

// Whatever else is changed, the data is left as it is.
const whyReadOnly = () => `Cannot be changed here: its number ${inexact} is one that no browser \
can keep as it is. The command line can.`;

function showHelp(shareFolders) {
  const made = link.id !== 0;
  byId("app-help").textContent =
      inexact === undefined ? "A JSON object, like {\"album\": 7}." : whyReadOnly();
  byId("path-help").textContent = inexact !== undefined ? whyReadOnly()
      : shareFolders.length === 0
      ? "Its whole path on the server."
      : "Its whole path on the server, below " + shareFolders.join(" or ") + ".";
  byId("protect_password-help").textContent = made && link.protect_type === "password"
      ? "Never shown. Leave it empty to keep the one that the link has; another one signs out \
everybody who is in."
      : "Never shown again; visitors get it from you.";
  byId("protect_users-help").textContent = "One name a line." + (made
      ? " Accounts that are gone are not shown; changing the list drops them." : "");
  byId("protect_groups-help").textContent = "One name a line." + (made
      ? " Groups that are gone are not shown; changing the list drops them." : "");
  byId("private_data-help").textContent = made
      ? "A JSON object for the application, never shown. Leave it empty to keep what the link has; \
{} removes it."
      : "A JSON object for the application, never shown again.";
  byId("hash-help").textContent = made
      ? "Another one makes the address that people have useless."
      : "Leave it empty to have one drawn that nobody can guess.";
  showClock();
}

function showClock() {
  byId("server-clock").textContent =
      "The server’s clock: " + clock.shown(clock.toField(clock.now())).replace("T", " ") + ".";
}

// The page may be hours old, and the machine may have slept.
async function renewClock() {
  const isWanted = stillOpen(byId("link-dialog"));
  try {
    clock.setNow((await api.info()).now);
  } catch {
    return; // what the clock went on to is the best there is
  }
  if (isWanted()) {
    showClock();
  }
}

// Fields that make no sense with the other choices are not there.
function adapt() {
  byId("path-field").hidden = !isFile();
  byId("app-field").hidden = isFile();
  byId("protect_password-field").hidden = protectType() !== "password";
  byId("accounts-fields").hidden = protectType() !== "user";
  byId("redirect_uri-field").hidden = byId("redirect_type").value === "none";
}

function clearMistakes() {
  say(byId("link-summary"), "");
  for (const field of FIELDS) {
    tellMistake(field, "");
  }
}

function isShown(id) {
  return byId(id) !== null && byId(id).closest("[hidden]") === null;
}

// `mistakes` by field; those of no field that is there, and `general`, go into the summary.
function showMistakes(mistakes, general = "") {
  clearMistakes();
  const summary = general === "" ? [] : [general];
  const shown = FIELDS.filter((field) => field in mistakes && isShown(field));
  for (const [field, text] of Object.entries(mistakes)) {
    if (!shown.includes(field)) {
      summary.push(`${field}: ${text}`);
    }
  }
  for (const field of shown) {
    tellMistake(field, mistakes[field]);
  }
  if (shown.length > 0) {
    summary.unshift("The link is not saved: " +
                    texts.plural(shown.length, "field needs", "fields need") + " another look.");
  }
  say(byId("link-summary"), summary.join(" "));
  focusFirst(shown);
}

function focusFirst(fields) {
  const first = fields.length > 0 ? byId(fields[0]) : null;
  if (first === null) {
    byId("link-summary").scrollIntoView({block: "nearest"});
    return;
  }
  if (byId("more").contains(first)) {
    byId("more").open = true;
  }
  (first.querySelector("input:checked") ?? first).focus();
}

// ---- at work ----

async function save(event) {
  event.preventDefault();
  if (!isUsable(byId("save-link"))) {
    return;
  }
  const {settings, mistakes} = read();
  if (Object.keys(mistakes).length > 0) {
    showMistakes(mistakes);
    return;
  }
  clearMistakes();
  if (!isNew() && Object.keys(settings).length === 0) {
    byId("link-dialog").close();
    return;
  }
  await send(isNew() ? "create" : "set", isNew() ? settings : {id: link.id, ...settings});
}

// When the form was closed meanwhile, or opened for another link, the answer is for the page alone.
async function send(method, settings) {
  const isOpen = stillOpen(byId("link-dialog"));
  const name = texts.quoted(link);
  isSaving = true;
  setUsable(byId("save-link"), false);
  let answer;
  try {
    answer = await api.link(method, settings);
  } catch (error) {
    if (isOpen()) {
      isSaving = false;
      setUsable(byId("save-link"), true);
      refused(error);
    } else {
      notice.show(method === "create" ? ["The new link: ", texts.describe(error)]
                                      : [...name, ": ", texts.describe(error)]);
    }
    return;
  }
  const wasOpen = isOpen();
  if (wasOpen) {
    byId("link-dialog").close();
  }
  saved(answer, {isNew: method === "create", isOpen: wasOpen});
}

function refused(error) {
  const text = texts.describe(error);
  if (error.field) {
    showMistakes({[fieldOf(error.field)]: text});
  } else {
    showMistakes({}, text);
  }
}

// What was typed is not lost by one press. Once it is on its way there is nothing to be lost.
function leave() {
  if (isSaving || !isChanged()) {
    byId("link-dialog").close();
    return;
  }
  ask({
    heading: ["Discard what you changed?"],
    text: ["Nothing of it is saved yet."],
    yes: "Discard",
    no: "Keep editing",
    act: async () => {},
    after: () => byId("link-dialog").close(),
  });
}

// `whenSaved` is called with the API's answer, and with whether the link is new and whether the
// form was still open for it.
export function start(whenSaved) {
  saved = whenSaved;
  const form = byId("link-form");
  form.addEventListener("submit", save);
  form.addEventListener("input", adapt);
  form.addEventListener("change", adapt);
  byId("cancel-link").addEventListener("click", leave);
  onEscape(byId("link-dialog"), leave);
  // Where there is another way than the key, such as a gesture. Browsers let this be held back once.
  byId("link-dialog").addEventListener("cancel", (event) => {
    event.preventDefault();
    leave();
  });
  for (const button of form.querySelectorAll("[data-days]")) {
    button.addEventListener("click", () => {
      const days = button.dataset.days;
      byId("expire_at").value = days === "" ? "" : clock.inDays(Number(days));
    });
  }
}

// Without a link it is the form for a new one. `about` is what the API says about itself; `number`
// is one of the link's that the browser cannot hold.
export function edit(edited, about, {inexact: number, comeBack} = {}) {
  link = {...BLANK, owner_user: about.account.user, ...edited};
  inexact = number;
  byId("link-heading").replaceChildren(
      ...(edited ? ["Edit ", ...texts.quoted(link)] : ["New link"]));
  byId("save-link").textContent = edited ? "Save" : "Create link";
  byId("owner_user-field").hidden = !about.account.administrator;
  byId("more").open = false;
  fill();
  isSaving = false;
  setUsable(byId("save-link"), true);
  clearMistakes();
  showHelp(about.share_folders);
  adapt();
  initial = rawValues();
  open(byId("link-dialog"), comeBack);
  byId(edited ? "protect_title" : isFile() ? "path" : "project_name").focus();
  renewClock();
}
