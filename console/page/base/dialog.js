// Questions before a change. The browser's own dialog keeps the focus inside and closes with Escape.
import { el, button, visible } from "./dom.js";
import { alert } from "./parts.js";
import { _ } from "./texts.js";

// `act` is called by a click on the button `verb`; the dialog closes when its promise resolves, and shows the error else.
export function ask({ title, content, verb, kind = "primary", act }) {
    const problem = el("div");
    const cancel = button(_("Cancel"), "link", () => dialog.close());
    const go = el("button", { type: "submit", class: `pf-v6-c-button pf-m-${kind}` }, el("span", { class: "pf-v6-c-button__text" }, verb));
    const form = el("form", { method: "dialog", onsubmit: event => { event.preventDefault(); submit(); } },
        el("h2", { id: "dialog-title" }, visible(title)), problem, content, el("div", { class: "actions" }, go, cancel));
    const dialog = el("dialog", { "aria-labelledby": "dialog-title", onclose: () => dialog.remove() }, form);
    async function submit() {
        go.disabled = true;
        try {
            await act();
            dialog.close();
        } catch (error) {
            problem.replaceChildren(alert("danger", error.message));
            go.disabled = false;
        }
    }
    document.body.append(dialog);
    dialog.showModal();
}

// A text to read, such as the keys.
export function show(title, content) {
    const close = button(_("Close"), "primary", () => dialog.close());
    const dialog = el("dialog", { "aria-labelledby": "dialog-title", onclose: () => dialog.remove() },
        el("h2", { id: "dialog-title" }, title), content, el("div", { class: "actions" }, close));
    document.body.append(dialog);
    dialog.showModal();
}
