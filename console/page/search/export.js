// The found logs as a file, in the forms that the program writes.
import { _, fill } from "../base/texts.js";
import { el, button, toast } from "../base/dom.js";
import { number } from "../base/format.js";
import { run } from "../base/program.js";

const LARGEST = 256 << 20; // characters that this page holds in memory for a file

const FORMS = [["csv", "csv", "text/csv"], ["spreadsheet", "csv", "text/csv"], ["jsonl", "jsonl", "application/jsonl"], ["short", "txt", "text/plain"]];
const formName = form => ({ csv: _("CSV, unchanged"), spreadsheet: _("CSV for a spreadsheet, without formulas"), jsonl: _("JSON, one object a line"), short: _("Text, one log a line") })[form];

// `options` gives the program's options of the search, `fail` shows an error.
export function exportMenu(options, fail) {
    const list = el("div", { class: "menu-body" });
    const box = el("details", { class: "menu" }, el("summary", { class: "pf-v6-c-button pf-m-secondary", id: "export" }, _("Export")), list);
    let cancel = null;
    async function save(form, ending, type) {
        cancel = new AbortController();
        const parts = [];
        let size = 0;
        list.replaceChildren(el("p", {}, _("Writing …")), button(_("Stop"), "secondary", () => cancel.abort()));
        try {
            await run(["search", ...options(), "--output=" + form], { signal: cancel.signal, onData: data => {
                parts.push(data);
                size += data.length;
                if (size > LARGEST)
                    cancel.abort();
            } });
            const url = URL.createObjectURL(new Blob(parts, { type }));
            el("a", { href: url, download: `logs-${new Date().toISOString().slice(0, 10)}.${ending}` }).click();
            setTimeout(() => URL.revokeObjectURL(url), 60000);
            toast(fill(_("Exported $0 characters."), number(size)));
        } catch (error) {
            if (size > LARGEST)
                fail(new Error(_("Too much for a browser. Narrow the search, or run “kelosyslog search” on the server.")));
            else if (!error.isCancelled)
                fail(error);
        }
        box.open = false;
    }
    box.addEventListener("toggle", () => {
        cancel?.abort();
        list.replaceChildren(...FORMS.map(([form, ending, type]) => button(formName(form), "link", () => save(form, ending, type))));
    });
    return box;
}
