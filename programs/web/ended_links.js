// Removing the links that have ended: says how many there are before it does it. The button works
// only while the number that it names is that of exactly the links it would remove.

import * as api from "./api.js";
import {attempt, open} from "./dialogs.js";
import {byId, say, setUsable, tellMistake} from "./dom.js";
import * as texts from "./texts.js";
import {harmless} from "./visible_text.js";

const PAUSE = 300;
const FIELDS = {project_name: "ended-project", owner_user: "ended-owner"}; // by the API's names

let counting = 0;
let timer;
let counted = null; // the scope whose number the button names
let removing = false;

// What both the question and the removal are about.
function scope() {
  const settings = {};
  const project = byId("ended-project").value.trim();
  const owner = byId("ended-owner").value.trim();
  if (project !== "") {
    settings.project_name = project;
  }
  if (!byId("ended-owner-field").hidden && owner !== "") {
    settings.owner_user = owner;
  }
  return settings;
}

function buttonName({project_name, owner_user}, number) {
  const links = texts.plural(number, "link", "links");
  const ofProject = project_name ? ` of the project “${harmless(project_name)}”` : "";
  if (byId("ended-owner-field").hidden) {
    return `Remove ${links} of yours${ofProject}`;
  }
  return `Remove ${links} of ${owner_user ? harmless(owner_user) : "everybody"}${ofProject}`;
}

function tellMistakes(error) {
  for (const [name, field] of Object.entries(FIELDS)) {
    tellMistake(field, error?.field === name ? texts.describe(error) : "");
  }
}

// The number is not known, or not any more.
function forget() {
  counting++;
  counted = null;
  clearTimeout(timer);
  setUsable(byId("ended-yes"), false);
  byId("ended-yes").textContent = "Remove";
}

async function count() {
  forget();
  const mine = counting;
  const asked = scope();
  byId("ended-count").textContent = "Counting…";
  let text;
  let number = 0;
  let mistake = null;
  try {
    number = (await api.link("delete_expired", {...asked, dry_run: true})).deleted;
    text = number === 0 ? "There are none now." : `Now ${texts.plural(number, "link", "links")}.`;
  } catch (error) {
    mistake = error.field in FIELDS ? error : null;
    text = mistake ? "Not counted: a field needs another look." : texts.describe(error);
  }
  if (mine !== counting) {
    return;
  }
  tellMistakes(mistake);
  byId("ended-count").textContent = text;
  if (number > 0 && !removing) {
    counted = asked;
    byId("ended-yes").textContent = buttonName(asked, number);
    setUsable(byId("ended-yes"), true);
  }
}

function remove(done) {
  const settings = counted;
  attempt({
    dialog: byId("ended-dialog"),
    button: byId("ended-yes"),
    problem: byId("ended-problem"),
    act: () => {
      removing = true;
      return api.link("delete_expired", settings);
    },
    after: (answer) => done(answer.deleted),
    release: () => {
      removing = false;
      count();
    },
  });
}

// `done` is called with the number of links that were removed.
export function start(done) {
  for (const id of Object.values(FIELDS)) {
    byId(id).addEventListener("input", () => {
      forget();
      byId("ended-count").textContent = "Counting…";
      timer = setTimeout(count, PAUSE);
    });
  }
  byId("ended-form").addEventListener("submit", (event) => {
    event.preventDefault();
    remove(done);
  });
}

// Starts with the account's own links, of administrators too: everybody's is a choice to be made.
export function ask(account, project) {
  byId("ended-project").value = project;
  byId("ended-owner-field").hidden = !account.administrator;
  byId("ended-owner").value = account.user;
  say(byId("ended-problem"), "");
  tellMistakes(null);
  removing = false;
  open(byId("ended-dialog"));
  count();
}
