// Saved searches, kept in this browser, and the link to the present one.
import { _, fill } from "../base/texts.js";
import { el, button, copy } from "../base/dom.js";
import { ask } from "../base/dialog.js";
import { setting, choose } from "../base/settings.js";
import * as query from "./query.js";

const isSearch = entry => typeof entry?.name === "string" && typeof entry?.options === "object" && entry.options !== null;

// `current` gives the query that is shown, `open` shows another.
export function savedMenu(current, open) {
    const list = el("div", { class: "menu-body" });
    const box = el("details", { class: "menu" }, el("summary", { class: "pf-v6-c-button pf-m-secondary" }, _("Saved")), list);
    const close = () => { box.open = false; };
    function save() {
        const name = el("input", { type: "text", required: true, maxlength: 60, value: current().q, "aria-label": _("Name") });
        close();
        ask({ title: _("Save this search"), verb: _("Save"),
              content: el("label", { class: "field" }, el("span", { class: "field-name" }, _("Name")), el("span", { class: "pf-v6-c-form-control" }, name)),
              act: async () => choose("saved", [...searches().filter(entry => entry.name !== name.value), { name: name.value, options: query.write(current()) }]) });
    }
    const searches = () => setting("saved").filter(isSearch);
    box.addEventListener("toggle", () => list.replaceChildren(
        ...searches().map(entry => el("div", { class: "menu-row" },
            button(entry.name, "link", () => { close(); open(query.read(entry.options)); }),
            button("×", "plain", () => { choose("saved", searches().filter(other => other.name !== entry.name)); close(); }, { "aria-label": fill(_("Forget $0"), entry.name) }))),
        searches().length === 0 ? el("p", { class: "faint" }, _("Nothing is saved yet.")) : "",
        button(_("Save this search …"), "link", save),
        button(_("Copy a link to it"), "link", () => { close(); copy(window.parent.location.href, _("The link to this search was copied.")); })));
    return box;
}
