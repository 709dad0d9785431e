// The form for everything that a link can hold. What it sends is the difference to what it showed
// first: a value that nobody touched is not written back over what others change meanwhile, such as
// the count of uses.

import * as api from "./api.js";
import * as clock from "./clock.js";
import {open} from "./dialogs.js";
import {byId, isUsable, say, setUsable} from "./dom.js";
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
const same = (one, other) => JSON.stringify(one) === JSON.stringify(other);
const isFile = () => byId("project_name").value.trim() === texts.FILE_PROJECT;
const protectType = () =>
    document.querySelector("input[name=protect_type]:checked")?.value ?? "none";

let link = BLANK;   // the one being edited
let initial = {};   // the form's values when it was opened
let saved;          // to be called with the answer

class Mistake extends Error {}

// ---- reading ----

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

function readRedirect() {
  const uri = byId("redirect_uri").value.trim();
  if (uri === "" && byId("redirect_type").value !== "none") {
    throw new Mistake("Where does the redirect lead to?");
  }
  return uri;
}

// By the names of the API; `at` is the field that shows a mistake.
function readers() {
  const all = {
    project_name: readProject,
    owner_user: () => byId("owner_user").value.trim(),
    app: isFile() ? readPath : () => readObject("app"),
    protect_title: readTitle,
    enabled: () => byId("enabled").checked,
    protect_type: protectType,
    enable_match_ip: () => byId("enable_match_ip").checked,
    start_at: () => readTime("start_at"),
    expire_at: readEnd,
    expire_times: () => readNumber("expire_times"),
    use_count: () => readNumber("use_count"),
    auto_gc: () => byId("auto_gc").checked,
    hash: readHash,
    redirect_type: () => byId("redirect_type").value,
    redirect_uri: readRedirect,
  };
  if (protectType() === "password") {
    all.protect_password = () => byId("protect_password").value;
  }
  if (protectType() === "user") {
    all.protect_users = () => lines(byId("protect_users").value);
    all.protect_groups = () => lines(byId("protect_groups").value);
  }
  // Never shown, so an empty field means nothing.
  if (byId("private_data").value.trim() !== "") {
    all.private_data = () => readObject("private_data");
  }
  return all;
}

const fieldOf = (argument) => argument === "app" && isFile() ? "path" : argument;

// The values by name, and the mistakes by field.
function read() {
  const values = {};
  const mistakes = {};
  for (const [argument, value] of Object.entries(readers())) {
    try {
      values[argument] = value();
    } catch (error) {
      if (!(error instanceof Mistake)) {
        throw error;
      }
      mistakes[fieldOf(argument)] = error.message;
    }
  }
  return {values, mistakes};
}

// What is to be sent: what differs from the beginning.
function changes(values) {
  const settings = {};
  for (const [argument, value] of Object.entries(values)) {
    if (!same(value, initial[argument])) {
      settings[argument] = value;
    }
  }
  if (settings.protect_password === "") {
    delete settings.protect_password;
  }
  if (link.id === 0) {
    settings.project_name = values.project_name;
    if (settings.hash === "") {
      delete settings.hash;
    }
  }
  if (settings.owner_user === "") {
    delete settings.owner_user;
  }
  // A password or a list says by itself which protection it means; that shall be the one shown.
  if ("protect_password" in settings || "protect_users" in settings ||
      "protect_groups" in settings) {
    settings.protect_type = values.protect_type;
  }
  return settings;
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
}

function showHelp(shareFolders) {
  const made = link.id !== 0;
  byId("path-help").textContent = shareFolders.length === 0
      ? "Its whole path on the server."
      : "Its whole path on the server, below " + shareFolders.join(" or ") + ".";
  byId("protect_password-help").textContent = made && link.protect_type === "password"
      ? "Never shown. Leave it empty to keep the one that the link has."
      : "Never shown again; visitors get it from you.";
  byId("private_data-help").textContent = made
      ? "A JSON object for the application, never shown. Leave it empty to keep what the link has; \
{} removes it."
      : "A JSON object for the application, never shown again.";
  byId("hash-help").textContent = made
      ? "Another one makes the address that people have useless."
      : "Leave it empty to have one drawn that nobody can guess.";
  byId("server-clock").textContent =
      "The server’s clock: " + clock.shown(clock.toField(clock.now())).replace("T", " ") + ".";
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
    say(byId(field + "-error"), "");
    byId(field).removeAttribute("aria-invalid");
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
    say(byId(field + "-error"), mistakes[field]);
    byId(field).setAttribute("aria-invalid", "true");
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
  const {values, mistakes} = read();
  if (Object.keys(mistakes).length > 0) {
    showMistakes(mistakes);
    return;
  }
  clearMistakes();
  const settings = changes(values);
  if (link.id !== 0 && Object.keys(settings).length === 0) {
    byId("link-dialog").close();
    return;
  }
  setUsable(byId("save-link"), false);
  try {
    const answer = link.id === 0 ? await api.link("create", settings)
                                 : await api.link("set", {id: link.id, ...settings});
    saved(answer, link.id === 0);
  } catch (error) {
    const text = texts.describe(error);
    if (error.field) {
      showMistakes({[fieldOf(error.field)]: text});
    } else {
      showMistakes({}, text);
    }
  } finally {
    setUsable(byId("save-link"), true);
  }
}

// `whenSaved` is called with the API's answer and whether the link is new.
export function start(whenSaved) {
  saved = whenSaved;
  const form = byId("link-form");
  form.addEventListener("submit", save);
  form.addEventListener("input", adapt);
  form.addEventListener("change", adapt);
  for (const button of form.querySelectorAll("[data-days]")) {
    button.addEventListener("click", () => {
      const days = button.dataset.days;
      byId("expire_at").value = days === "" ? "" : clock.inDays(Number(days));
    });
  }
}

// Without a link it is the form for a new one. `about` is what the API says about itself.
export function edit(edited, about, comeBack) {
  link = {...BLANK, owner_user: about.account.user, ...edited};
  byId("link-heading").textContent =
      edited ? "Edit " + texts.linkName(link) : "New link";
  byId("save-link").textContent = edited ? "Save" : "Create link";
  byId("owner_user-field").hidden = !about.account.administrator;
  byId("more").open = false;
  fill();
  clearMistakes();
  showHelp(about.share_folders);
  adapt();
  initial = snapshot();
  open(byId("link-dialog"), comeBack);
  byId(edited ? "protect_title" : isFile() ? "path" : "project_name").focus();
}

// The values as the link has them, in the form that `read` gives them.
function snapshot() {
  return {
    ...link,
    start_at: link.start_at.replace(" ", "T"),
    expire_at: link.expire_at.replace(" ", "T"),
  };
}
