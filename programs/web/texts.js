// How links and errors are put into words.

import {Code} from "./api.js";
import * as clock from "./clock.js";
import {isolated} from "./dom.js";
import {harmless, isVisible} from "./visible_text.js";

export const STATE_NAMES = {
  live: "Live",
  not_yet: "Not yet begun",
  disabled: "Disabled",
  expired: "Expired",
  used_up: "Used up",
};

export const FILE_PROJECT = "file";

const fileName = (path) => path.slice(path.lastIndexOf("/") + 1);

export const path = (link) =>
    link.project_name === FILE_PROJECT && typeof link.app?.path === "string" ? link.app.path : "";

// What a person would call the link; always something that can be seen.
export const linkName = (link) =>
    harmless([link.protect_title, fileName(path(link))].find(isVisible) ?? `Link No. ${link.id}`);

// The name within quotation marks, as content for elements.
export const quoted = (link) => ["“", isolated(linkName(link)), "”"];

// Which link exactly: titles are anybody's choice, and several links may have the same. The owner
// is for those who see the links of others.
export const identity = (link, withOwner) => [
  ` No. ${link.id}, address ${link.hash}`,
  ...(withOwner ? [", owner ", isolated(owner(link))] : []),
  ".",
];

export const owner = (link) => link.owner_user || `account ${link.owner_uid} (gone)`;

export const uses = (link) => link.expire_times === 0
    ? `${link.use_count}, no limit`
    : `${link.use_count} of ${link.expire_times}`;

export const protection = (link) => ({
  none: "Open to anybody",
  password: "With a password",
  user: "For certain accounts",
}[link.protect_type] ?? "");

export const end = (link) => link.expire_at === "" ? "No end" : clock.shown(link.expire_at);

export const start = (link) => clock.shown(link.start_at);

export const distance = (link) => clock.distance(link.expire_at);

export const plural = (count, one, many) => `${count} ${count === 1 ? one : many}`;

export const sentence = (text) => {
  const trimmed = text.trim();
  const start = trimmed.charAt(0).toUpperCase() + trimmed.slice(1);
  return /[.!?]$/.test(start) ? start : start + ".";
};

// Heading and text for an error that concerns the whole page.
export function pageProblem(error) {
  switch (error.code) {
    case Code.NO_ANSWER:
      return ["The server cannot be reached",
              "Check the connection, then try again."];
    case Code.NO_ACCOUNT:
      return ["You are not signed in",
              "The server knows no account for this request. Reload the page and sign in."];
    case Code.NOT_ALLOWED:
      return ["Your account may not do this",
              "Sign in with another account, or ask the administrator of this server."];
    case Code.FOREIGN_SITE:
      return ["The server takes this page for another site’s",
              "The browser’s address for it is not the one that the request arrived under, as \
behind some proxies. Open the page by the server’s own address."];
    case Code.NO_API:
      return ["The server gives no usable answer",
              `${error.message} The web API may not be set up; the web server’s log says more.`];
    default:
      return ["The server refused the request", describe(error)];
  }
}

const consequence = (error) => error.changes
    ? "it is not known whether this was done. Reload the page before you try again."
    : "this could not be read. Try again.";

// One or two sentences for an error that concerns one action.
export function describe(error) {
  switch (error.code) {
    case Code.NO_ANSWER:
      return "The server cannot be reached, so " + consequence(error);
    case Code.NO_API:
      return "The server gives no usable answer, so " + consequence(error);
    case Code.NO_SUCH_LINK:
      return "This link does not exist any more.";
    default:
      return sentence(error.message || "the request failed");
  }
}
