// The parts that pages are put together from.
import { el, visible } from "./dom.js";
import { _ } from "./texts.js";

export const card = (title, ...children) =>
    el("section", { class: "card" }, el("div", { class: "card-head" }, el("h2", {}, title)), ...children);
// With buttons at the right of the title.
export const cardWith = (title, actions, ...children) =>
    el("section", { class: "card" }, el("div", { class: "card-head" }, el("h2", {}, title), el("span", { class: "actions" }, actions)), ...children);

const asNodes = cell => cell === null || cell === undefined ? [] : typeof cell === "object" ? [cell] : visible(String(cell));
export const num = text => el("span", { class: "num" }, text);
export const faint = text => el("span", { class: "faint" }, visible(text));

// `heads` are texts; a head that begins with ">" is of a column of numbers. A cell is a text or an element.
export function table(label, heads, rows) {
    const isNumber = heads.map(head => head.startsWith(">"));
    const names = heads.map(head => head.replace(/^>/, ""));
    return el("div", { class: "scroll" }, el("table", { class: "grid", "aria-label": label },
        el("thead", {}, el("tr", {}, names.map((name, i) => name === ""
            ? el("td", {}) : el("th", { scope: "col", class: isNumber[i] && "right" }, name)))),
        el("tbody", {}, rows.map(cells => el("tr", {}, cells.map((cell, i) =>
            el("td", { class: isNumber[i] && "right", "data-name": names[i] }, asNodes(cell))))))));
}

// Names and values, one below the other; what has no value is left out.
export const facts = pairs => el("dl", { class: "facts" }, pairs.filter(([, value]) => value !== null && value !== undefined && value !== "")
    .map(([name, value]) => [el("dt", {}, name), el("dd", {}, asNodes(value))]));

export const label = (colour, text) => el("span", { class: `pf-v6-c-label pf-m-${colour} pf-m-compact` },
    el("span", { class: "pf-v6-c-label__content" }, el("span", { class: "pf-v6-c-label__text" }, text)));

// kind: danger, warning, success or info.
export const alert = (kind, text, ...more) => el("div", { class: `notice pf-m-${kind}`, role: kind === "danger" ? "alert" : "status" },
    el("span", { class: "notice-sign", "aria-hidden": "true" }, { danger: "✖", warning: "!", success: "✓", info: "i" }[kind]),
    el("div", {}, text.split("\n").map(line => el("p", {}, visible(line))), more));

export const empty = (title, text, ...actions) => el("div", { class: "empty" }, el("p", { class: "empty-title" }, title), text && el("p", { class: "faint" }, text), actions);

export const working = () => el("div", { class: "working", role: "status" }, el("span", { class: "spinner", "aria-hidden": "true" }), _("Loading …"));

// A list of names with bars; a click on a name calls `choose` with it.
export function bars(entries, choose) {
    const most = Math.max(1, ...entries.map(entry => entry.count));
    return el("ol", { class: "bars" }, entries.map(entry => el("li", {},
        el("button", { type: "button", class: "pf-v6-c-button pf-m-link pf-m-inline bar-name", title: entry.hint, onclick: () => choose(entry) }, visible(entry.name)),
        el("meter", { min: 0, max: most, value: entry.count, class: entry.kind, "aria-label": entry.name }),
        el("span", { class: "num" }, entry.text), entry.note && el("span", { class: `num faint ${entry.noteKind ?? ""}` }, entry.note))));
}
