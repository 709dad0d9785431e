// The table of links. Its roles are written out, because browsers take a table that is laid out as
// cards for no table.

import {byId, element, isolated, unseen} from "./dom.js";
import * as texts from "./texts.js";

const COLUMNS = [
  {label: "No.", sort: "id", ascendingFirst: false},
  {label: "Title"},
  {label: "Project", sort: "project_name", ascendingFirst: true},
  {label: "Address", sort: "hash", ascendingFirst: true},
  {label: "Owner", sort: "owner_uid", ascendingFirst: true, administrators: true},
  {label: "State"},
  {label: "Uses", sort: "use_count", ascendingFirst: false},
  {label: "Ends", sort: "expire_at", ascendingFirst: true},
  {label: "Actions"},
];

export class LinkTable {
  // `on` has a function for every action on a link (edit, copy, qr, visitors, toggle, remove), and
  // `sort`, which takes the column's name and whether to descend.
  constructor(on) {
    this.on = on;
    this.columns = COLUMNS;
  }

  setAdministrator(administrator) {
    this.columns = COLUMNS.filter((column) => administrator || !column.administrators);
  }

  render(links, view) {
    const focused = document.activeElement?.dataset;
    const [row, action, sort] = [focused?.row, focused?.action, focused?.sort];
    byId("columns").replaceChildren(...this.columns.map((column) => this.heading(column, view)));
    byId("rows").replaceChildren(...links.map((link) => this.row(link)));
    if (sort) {
      byId("columns").querySelector(`[data-sort="${sort}"]`)?.focus();
    } else if (row) {
      this.focus(Number(row), action);
    }
  }

  // Shows a link that has changed in its place.
  update(link) {
    const shown = byId("rows").querySelector(`tr[data-link="${link.id}"]`);
    if (!shown) {
      return;
    }
    const action = shown.contains(document.activeElement) ? document.activeElement.dataset.action
                                                          : undefined;
    shown.replaceWith(this.row(link));
    if (action) {
      this.focus(link.id, action);
    }
  }

  // False when the row is not there.
  focus(id, action) {
    const button = byId("rows").querySelector(`[data-row="${id}"][data-action="${action}"]`);
    button?.focus();
    return Boolean(button);
  }

  // The link below the one named, or above the last one: where to go on once it is gone.
  neighbour(id) {
    const shown = byId("rows").querySelector(`tr[data-link="${id}"]`);
    const beside = shown?.nextElementSibling ?? shown?.previousElementSibling;
    return beside ? Number(beside.dataset.link) : undefined;
  }

  heading(column, view) {
    const properties = {role: "columnheader", scope: "col"};
    if (!column.sort) {
      return element("th", properties, column.label);
    }
    properties.class = "sortable";
    const sorted = view.sort === column.sort;
    if (sorted) {
      properties["aria-sort"] = view.descending ? "descending" : "ascending";
    }
    const descending = sorted ? !view.descending : !column.ascendingFirst;
    return element("th", properties, element("button", {
      type: "button",
      "data-sort": column.sort,
      click: () => this.on.sort(column.sort, descending),
    }, column.label));
  }

  row(link) {
    const cells = {
      "No.": () => this.cell("No.", {}, String(link.id)),
      Title: () => this.title(link),
      Project: () => this.cell("Project", {class: "wraps"}, isolated(link.project_name)),
      Address: () => this.cell("Address", {class: "code"}, link.hash),
      Owner: () => this.cell("Owner", {class: "wraps"}, isolated(texts.owner(link))),
      State: () => this.state(link),
      Uses: () => this.cell("Uses", {class: "count"}, texts.uses(link)),
      Ends: () => this.end(link),
      Actions: () => this.actions(link),
    };
    return element("tr", {role: "row", "data-link": link.id},
                   ...this.columns.map((column) => cells[column.label]()));
  }

  cell(label, properties, ...content) {
    return element("td", {role: "cell", "data-label": label, ...properties},
                   element("div", {}, ...content));
  }

  title(link) {
    const name = texts.linkName(link);
    const button = this.button(link, "edit", "text", unseen("Edit "), isolated(name));
    const content = element("div", {}, button);
    const path = texts.path(link);
    if (path) {
      content.append(element("span", {class: "below"}, isolated(path)));
    }
    content.append(element("span", {class: "below"}, texts.protection(link)));
    return element("th", {role: "rowheader", scope: "row", "data-label": "Title"}, content);
  }

  state(link) {
    const shown = [element("span", {class: "badge " + link.state},
                           texts.STATE_NAMES[link.state] ?? link.state)];
    if (link.state === "not_yet") {
      shown.push(element("span", {class: "below"}, "begins ",
                         element("span", {class: "whole"}, texts.start(link))));
    }
    return this.cell("State", {}, ...shown);
  }

  end(link) {
    const shown = [texts.end(link)];
    if (link.expire_at !== "") {
      shown.push(element("span", {class: "below"}, texts.distance(link)));
    }
    return this.cell("Ends", {class: "whole"}, ...shown);
  }

  actions(link) {
    const name = texts.linkName(link);
    const small = (action, label, about = " ") =>
        this.button(link, action, "small", label, unseen(about + name));
    return element("td", {role: "cell", class: "last", "data-label": "Actions"},
                   element("div", {class: "actions"},
                           small("copy", "Copy", " address of "),
                           small("qr", "QR", " code of "),
                           small("visitors", "Visitors", " of "),
                           small("toggle", link.enabled ? "Disable" : "Enable"),
                           small("remove", "Delete")));
  }

  button(link, action, kind, ...label) {
    return element("button", {
      type: "button",
      class: kind,
      "data-row": link.id,
      "data-action": action,
      click: (event) => this.on[action](link, event.currentTarget),
    }, ...label);
  }
}
