// The owner's page: brings the list, the form and the dialogs together.

import * as api from "./api.js";
import * as clock from "./clock.js";
import * as dialogs from "./dialogs.js";
import {byId, element, isUsable, say, setUsable, tellMistake} from "./dom.js";
import * as endedLinks from "./ended_links.js";
import * as linkForm from "./link_form.js";
import {LinkTable} from "./link_table.js";
import * as notice from "./notice.js";
import * as texts from "./texts.js";
import * as viewState from "./view_state.js";

const PAUSE = 300;
const FILTER_FIELDS = {
  search: "filter-search",
  state: "filter-state",
  project: "filter-project",
  owner: "filter-owner",
};

let about = null;                          // what the API says about itself and the account
let view = viewState.read(location.hash);
let loading = null;                        // ends the request for a list that is no longer wanted
let typing;                                // runs while somebody types into a filter
const projects = new Set([texts.FILE_PROJECT]);

const table = new LinkTable({
  sort: (sort, descending) => show({sort, descending, page: 1}),
  edit: (link) => editLink(link),
  copy: (link) => copyAddress(link),
  qr: (link) => showQr(link),
  visitors: (link) => dialogs.showVisitors(link, identity(link), backTo(link.id, "visitors")),
  toggle: (link, button) => toggle(link, button),
  remove: (link) => remove(link),
});

// ---- the list ----

// A view that comes from an address may ask for what this account cannot.
function adopt(found) {
  view = about.account.administrator ? found : {...found, owner: ""};
  viewState.write(view);
  fillFilters();
}

// Shows another part of the list, and remembers it in the address.
function show(changes) {
  view = {...view, ...changes};
  viewState.write(view);
  return load();
}

async function load() {
  loading?.abort();
  const mine = loading = new AbortController();
  byId("rows").setAttribute("aria-busy", "true");
  try {
    const answer = await api.link("list", viewState.query(view), mine.signal);
    if (mine.signal.aborted) {
      return;
    }
    const lastPage = Math.max(1, Math.ceil(answer.total / view.size));
    if (view.page > lastPage) {
      await show({page: lastPage});
      return;
    }
    render(answer, lastPage);
  } catch (error) {
    if (mine.signal.aborted) {
      return;
    }
    const smaller = error.field === "limit" ? viewState.withSmallerPages(view) : null;
    if (smaller) {
      await show(smaller);
    } else {
      showLoadProblem(error);
    }
  } finally {
    if (loading === mine) {
      byId("rows").removeAttribute("aria-busy");
    }
  }
}

function render(answer, lastPage) {
  clock.setNow(answer.now);
  byId("problem").hidden = true;
  showFilterErrors();
  showFrame();
  learnProjects(answer.links);
  table.render(answer.links, view);
  const isEmpty = answer.links.length === 0;
  byId("columns").closest("table").hidden = isEmpty;
  byId("count").textContent = count(answer);
  say(byId("empty"), !isEmpty || answer.total > 0 ? ""
      : viewState.isFiltered(view) ? "No link is like that. Clear the filters to see all."
                                   : "There are no links yet. Make one with “New link”.");
  byId("page").textContent = `Page ${view.page} of ${lastPage}`;
  setUsable(byId("previous"), view.page > 1);
  setUsable(byId("next"), view.page < lastPage);
  byId("page-size").value = String(view.size);
}

// Rows that the server cannot read as links are counted by it, but not listed.
function count(answer) {
  const missing = Math.min(view.size, answer.total - answer.offset) - answer.links.length;
  const found = texts.plural(answer.total, "link", "links");
  return missing > 0 ? `${found}; ${missing} of this page cannot be read and are not shown` : found;
}

function learnProjects(links) {
  links.forEach((link) => projects.add(link.project_name));
  byId("projects").replaceChildren(
      ...[...projects].sort().map((name) => element("option", {value: name})));
}

// From an address; otherwise the fields are what the view is made from.
function fillFilters() {
  for (const [name, id] of Object.entries(FILTER_FIELDS)) {
    byId(id).value = view[name];
  }
}

function showClear() {
  byId("clear-filters").hidden = !viewState.isFiltered(view) &&
      byId("clear-filters") !== document.activeElement;
}

function readFilters() {
  clearTimeout(typing);
  const changes = {page: 1};
  for (const [name, id] of Object.entries(FILTER_FIELDS)) {
    changes[name] = byId(id).value.trim();
  }
  show(changes);
}

// What is there whatever the list is like: without it nobody could change the filters back.
function showFrame() {
  byId("links").hidden = false;
  byId("new-link").hidden = false;
  byId("columns").closest("table").hidden = byId("rows").childElementCount === 0;
  showClear();
}

// `errors` by the filters' names in the API.
function showFilterErrors(errors = {}) {
  for (const [name, id] of Object.entries(FILTER_FIELDS)) {
    tellMistake(id, errors[viewState.ARGUMENTS[name]] ?? "");
  }
}

function showLoadProblem(error) {
  showFrame();
  const isFilters = Object.values(viewState.ARGUMENTS).includes(error.field);
  byId("problem").hidden = isFilters || byId("problem").hidden;
  showFilterErrors(isFilters ? {[error.field]: texts.describe(error)} : {});
  if (isFilters) {
    byId("count").textContent = "The list is as it was: a filter needs another look.";
  } else {
    showProblem(error);
  }
}

function showProblem(error) {
  const [title, text] = texts.pageProblem(error);
  byId("problem-title").textContent = title;
  byId("problem-text").textContent = text;
  byId("problem").hidden = false;
  byId("problem").scrollIntoView({block: "nearest"});
}

// ---- actions ----

// Where the focus goes once a dialog about a link is closed: the row may have been made anew.
const backTo = (id, action) => () => {
  if (!table.focus(id, action)) {
    byId("links-heading").focus();
  }
};

// The newest state of a link: the list may be hours old.
const newest = (link, settings = {}) => api.link("get", {id: link.id, ...settings});

// In notices and questions: which link it was.
const identity = (link) => texts.identity(link, about.account.administrator);

const said = (link, what) => [...texts.quoted(link), ` ${what}.`, ...identity(link)];

async function editLink(link) {
  const isWanted = dialogs.want();
  try {
    const answer = await newest(link);
    if (isWanted()) {
      const comeBack = backTo(link.id, "edit");
      linkForm.edit(answer.link, about, {inexact: answer.inexact, comeBack});
    }
  } catch (error) {
    notice.show(texts.describe(error));
  }
}

// `isOpen`: whether the form was still there when the answer came.
async function whenSaved(answer, {isNew, isOpen}) {
  const isWanted = isOpen ? dialogs.want() : () => false;
  await load();
  notice.show(said(answer.link, isNew ? "is created" : "is saved"));
  if (!isWanted()) {
    return;
  }
  if (!isNew) {
    backTo(answer.link.id, "edit")();
    return;
  }
  let shown = answer;
  try {
    shown = await newest(answer.link, {qr: true});
  } catch {
    // The address is there without the QR code as well.
  }
  if (isWanted()) {
    dialogs.showAddress(shown, {heading: ["The link is created"],
                                comeBack: () => byId("new-link").focus()});
  }
}

async function copyAddress(link) {
  const isWanted = dialogs.want();
  const asked = newest(link, {qr: true});
  try {
    const copied = await dialogs.copy(asked.then(dialogs.addressOf));
    const answer = await asked;
    if (copied) {
      const doubt = dialogs.guessed(answer);
      notice.show(["The address of ", ...said(answer.link, "is copied"), doubt && " " + doubt]);
      return;
    }
    if (!isWanted()) {
      notice.show(["The address of ", ...said(answer.link, "is not copied")]);
      return;
    }
    dialogs.showAddress(answer, {
      heading: ["Address of ", ...texts.quoted(answer.link)],
      status: "The browser does not let this page copy. The address is selected: copy it with the \
keyboard (Ctrl+C) or the context menu.",
      selected: true,
      comeBack: backTo(link.id, "copy"),
    });
  } catch (error) {
    notice.show(texts.describe(error));
  }
}

async function showQr(link) {
  const isWanted = dialogs.want();
  try {
    const answer = await newest(link, {qr: true});
    if (isWanted()) {
      dialogs.showAddress(answer, {heading: ["Address of ", ...texts.quoted(answer.link)],
                                   comeBack: backTo(link.id, "qr")});
    }
  } catch (error) {
    notice.show(texts.describe(error));
  }
}

async function toggle(link, button) {
  if (!isUsable(button)) {
    return;
  }
  setUsable(button, false);
  await setEnabled(link, !link.enabled, true);
  setUsable(button, true);
}

// Somebody else may have done it already; then there is nothing of this page's to take back.
async function setEnabled(link, enabled, withUndo) {
  const word = enabled ? "enabled" : "disabled";
  try {
    const before = (await newest(link)).link;
    if (before.enabled === enabled) {
      table.update(before);
      notice.show(said(before, `was ${word} already`));
      return;
    }
    const answer = await api.link("set", {id: link.id, enabled});
    table.update(answer.link);
    const undo = () => {
      setEnabled(answer.link, !enabled, false);
      table.focus(link.id, "toggle");
    };
    notice.show(said(answer.link, `is ${word}${withUndo ? "" : " again"}`), withUndo ? undo : null);
  } catch (error) {
    notice.show(texts.describe(error));
  }
}

function remove(link) {
  const next = table.neighbour(link.id);
  let isGone = false;
  dialogs.ask({
    heading: ["Delete ", ...texts.quoted(link), "?"],
    text: [...identity(link), " Its address stops working for good, and everybody who is admitted \
to it is no longer."],
    yes: "Delete",
    act: async () => {
      await api.link("delete", {id: link.id});
      isGone = true;
      await load();
    },
    after: () => notice.show(said(link, "is deleted")),
    comeBack: () => (isGone ? backTo(next, "edit") : backTo(link.id, "remove"))(),
  });
}

// ---- the beginning ----

function listen() {
  for (const [name, id] of Object.entries(FILTER_FIELDS)) {
    const field = byId(id);
    field.addEventListener(name === "state" ? "change" : "input", () => {
      clearTimeout(typing);
      typing = setTimeout(readFilters, name === "state" ? 0 : PAUSE);
    });
  }
  byId("filters").addEventListener("submit", (event) => {
    event.preventDefault();
    readFilters();
  });
  byId("clear-filters").addEventListener("click", () => {
    Object.values(FILTER_FIELDS).forEach((id) => byId(id).value = "");
    byId("filter-search").focus();
    readFilters();
  });
  const turn = (button, by) => byId(button).addEventListener("click", () => {
    if (isUsable(byId(button))) {
      show({page: view.page + by});
    }
  });
  turn("previous", -1);
  turn("next", 1);
  byId("page-size").addEventListener("change", () => {
    show({size: Number(byId("page-size").value), page: 1});
  });
  byId("new-link").addEventListener("click", () => linkForm.edit(null, about));
  byId("remove-ended").addEventListener("click", () => endedLinks.ask(about.account, view.project));
  byId("try-again").addEventListener("click", async () => {
    await begin();
    if (byId("problem").hidden) {
      byId("links-heading").focus(); // the button is gone
    }
  });
  // An address that is changed by hand, or a bookmark.
  window.addEventListener("hashchange", () => {
    if (about !== null) {
      adopt(viewState.read(location.hash));
      load();
    }
  });
  document.addEventListener(api.GONE, load);
}

async function begin() {
  try {
    about = await api.info();
  } catch (error) {
    showProblem(error);
    return;
  }
  const {user, administrator} = about.account;
  byId("account").textContent =
      `Signed in as ${user}${administrator ? ", who sees everybody’s links" : ""}`;
  byId("links-heading").textContent = administrator ? "All links" : "Your links";
  byId("filter-owner-field").hidden = !administrator;
  table.setAdministrator(administrator);
  clock.setNow(about.now);
  adopt(viewState.read(location.hash));
  await load();
}

dialogs.start();
linkForm.start(whenSaved);
endedLinks.start((deleted) => {
  notice.show(texts.plural(deleted, "link is", "links are") + " removed.");
  load();
});
notice.start(() => byId("links-heading").focus());
listen();
begin();
