// What the list shows: filters, order and page. Kept in the address's fragment, which a reload and
// a bookmark keep, and which is never sent to the server.

export const PAGE_SIZES = [25, 50, 100, 500];
export const STATES = ["live", "not_yet", "disabled", "expired", "used_up"];
export const SORTS = ["id", "project_name", "hash", "owner_uid", "use_count", "expire_at"];

const LONGEST_FILTER = 64; // bytes; what the API takes at most

const DEFAULTS = {
  search: "",
  state: "",
  project: "",
  owner: "",
  sort: "id",
  descending: true,
  page: 1,
  size: 50,
};
// The filters, and what the API calls them.
export const ARGUMENTS = {
  search: "search",
  state: "state",
  project: "project_name",
  owner: "owner_user",
};
export const FILTERS = Object.keys(ARGUMENTS);

export const isFiltered = (view) => FILTERS.some((name) => view[name] !== "");

// As much of a text as the API takes, in whole characters.
function cut(text) {
  const {read: units} = new TextEncoder().encodeInto(text, new Uint8Array(LONGEST_FILTER));
  return text.slice(0, units);
}

// Anybody can write a fragment into a link to this page: what is not a choice of the page's is left
// at its default.
export function read(fragment) {
  const given = new URLSearchParams(fragment.replace(/^#/, ""));
  const oneOf = (name, choices, fallback) =>
      choices.includes(given.get(name)) ? given.get(name) : fallback;
  const page = /^[1-9][0-9]{0,5}$/.test(given.get("page") ?? "") ? Number(given.get("page")) : 1;
  return {
    search: cut(given.get("search") ?? DEFAULTS.search),
    state: oneOf("state", STATES, DEFAULTS.state),
    project: cut(given.get("project") ?? DEFAULTS.project),
    owner: cut(given.get("owner") ?? DEFAULTS.owner),
    sort: oneOf("sort", SORTS, DEFAULTS.sort),
    descending: oneOf("order", ["up", "down"], "down") === "down",
    page,
    size: Number(oneOf("size", PAGE_SIZES.map(String), String(DEFAULTS.size))),
  };
}

export function write(view) {
  const kept = new URLSearchParams();
  for (const name of [...FILTERS, "sort", "page", "size"]) {
    if (view[name] !== DEFAULTS[name]) {
      kept.set(name, view[name]);
    }
  }
  if (!view.descending) {
    kept.set("order", "up");
  }
  const fragment = kept.toString();
  history.replaceState(null, "", fragment ? "#" + fragment : location.pathname + location.search);
}

// The view with the next smaller pages, of which one begins with the same link: the links of a page
// may hold more than one answer of the server's does. Nothing when there are none smaller.
export function withSmallerPages(view) {
  const size = PAGE_SIZES.findLast((choice) => choice < view.size);
  return size && {...view, size, page: Math.floor((view.page - 1) * view.size / size) + 1};
}

// The arguments of the API's method "list".
export function query(view) {
  const settings = {
    offset: (view.page - 1) * view.size,
    limit: view.size,
    sort: view.sort,
    descending: view.descending,
  };
  for (const [name, argument] of Object.entries(ARGUMENTS)) {
    if (view[name] !== "") {
      settings[argument] = view[name];
    }
  }
  return settings;
}
