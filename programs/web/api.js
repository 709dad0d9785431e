// The web API. Every request is a POST with a JSON body, reading ones too: values keep their types,
// and nothing of them gets into the web server's log.

import {inexactNumber} from "./json_numbers.js";

const ENTRY = "/webapi/entry.cgi";
const LINK = "TUVO.Sharing.Link";
const INFO = "TUVO.API.Info";
const LONGEST_WAIT = 30000;
const CHANGING_METHODS = ["create", "set", "delete", "delete_expired", "sign_out"];

// Codes of the API that the page treats in a way of their own, and two more for answers that did
// not come from it.
export const Code = {
  NO_ANSWER: -1,
  NO_API: 0,
  NO_ACCOUNT: 105,
  NOT_ALLOWED: 106,
  FOREIGN_SITE: 109,
  NO_SUCH_LINK: 205,
};

// What the document is told when a link turns out to be gone: what it shows is out of date.
export const GONE = "link-gone";

export class ApiError extends Error {
  // `changes`: whether the request was one that changes something.
  constructor(code, message, field = "", changes = false) {
    super(message);
    this.code = code;
    this.field = field;
    this.changes = changes;
  }
}

// The answer of "get" has one member more: `inexact`, a number of the link's that the browser
// cannot hold, as the text that the server sent.
export const link = (method, settings = {}, signal = undefined) =>
    call(LINK, method, settings, signal);
export const info = () => call(INFO, "query", {}, undefined);

async function call(api, method, settings, signal) {
  const changes = CHANGING_METHODS.includes(method) && settings.dry_run !== true;
  const request = JSON.stringify({api, version: 1, method, ...settings});
  const {status, text} = await send(request, changes, signal);
  let answer;
  try {
    answer = JSON.parse(text);
  } catch {
    answer = null; // the web server's own page, or half an answer
  }
  if (answer?.success === true && answer.data !== null && typeof answer.data === "object") {
    return method === "get" ? {...answer.data, inexact: inexactNumber(text)} : answer.data;
  }
  if (answer?.success === false && typeof answer.error?.code === "number") {
    if (answer.error.code === Code.NO_SUCH_LINK) {
      document.dispatchEvent(new Event(GONE));
    }
    throw new ApiError(answer.error.code, String(answer.error.message ?? ""),
                       String(answer.error.field ?? ""), changes);
  }
  throw status === 401
      ? new ApiError(Code.NO_ACCOUNT, "The web server asks for an account.", "", changes)
      : new ApiError(Code.NO_API, `The server answered with the status ${status}.`, "", changes);
}

// The mode stays the default one: with "same-origin", and the page's policy not to send referrers,
// the Fetch standard has browsers send "Origin: null", which the API refuses. The time limit is
// about the whole answer: its body may stop half-way too.
async function send(body, changes, signal) {
  const end = new AbortController();
  const timer = setTimeout(() => end.abort(), LONGEST_WAIT);
  const stop = () => end.abort();
  signal?.addEventListener("abort", stop);
  let response;
  try {
    response = await fetch(ENTRY, {
      method: "POST",
      headers: {"Content-Type": "application/json"},
      body,
      credentials: "same-origin",
      cache: "no-store",
      redirect: "error",
      signal: end.signal,
    });
    return {status: response.status, text: await response.text()};
  } catch {
    throw response === undefined
        ? new ApiError(Code.NO_ANSWER, "The server cannot be reached.", "", changes)
        : new ApiError(Code.NO_API, "The server’s answer broke off.", "", changes);
  } finally {
    clearTimeout(timer);
    signal?.removeEventListener("abort", stop);
  }
}
