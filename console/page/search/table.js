// The table of logs: rows, their keys, the opened log.
import { _, severityClass } from "../base/texts.js";
import { el, button } from "../base/dom.js";
import { COLUMNS, shownColumns } from "./columns.js";
import { detail } from "./detail.js";
import * as query from "./query.js";

export class LogTable {
    // `page` has the query shown and go(query); `older` is called when the reader comes near the end.
    constructor(page, older) {
        this.page = page;
        this.older = older;
        this.body = el("tbody");
        this.head = el("tr");
        this.table = el("table", { class: "logs", "aria-label": _("Logs, newest first") }, el("thead", {}, this.head), this.body);
        this.note = el("span", { class: "faint" });
        this.more = button(_("Older logs"), "secondary", older, { id: "older", hidden: true });
        this.end = el("div", { class: "table-end" }, this.more, this.note);
        this.news = button("", "primary", () => {}, { id: "news", class: "news", hidden: true });
        this.element = el("section", { class: "card table-card", "aria-label": _("Logs") }, this.news, this.table, this.end);
        this.body.addEventListener("click", event => this.clicked(event));
        this.body.addEventListener("keydown", event => this.key(event));
        this.observer = new IntersectionObserver(entries => entries.some(entry => entry.isIntersecting) && older(), { rootMargin: "800px" });
        this.observer.observe(this.end);
        this.showHead();
    }

    get rows() { return [...this.body.querySelectorAll("tr.log")]; }
    get newestId() { return this.body.querySelector("tr.log")?.log.id ?? 0; }
    get oldestId() { return this.rows.at(-1)?.log.id ?? null; }

    showHead() {
        this.columns = shownColumns();
        this.head.replaceChildren(...this.columns.map(key => el("th", { scope: "col", class: "c-" + key }, COLUMNS[key].name())));
    }

    // After another choice of columns or times: the same logs.
    redraw() {
        this.showHead();
        this.fill(this.rows.map(row => row.log));
    }

    setBusy(isBusy) {
        if (isBusy)
            this.table.setAttribute("aria-busy", "true");
        else
            this.table.removeAttribute("aria-busy");
    }

    make(logs) {
        const words = query.words(this.page.query.q);
        return logs.map(log => {
            const row = el("tr", { class: "log " + severityClass(log.prio), tabindex: 0 },
                this.columns.map(key => el("td", { class: "c-" + key }, COLUMNS[key].cell(log, words))));
            row.log = log;
            return row;
        });
    }

    fill(logs) { this.body.replaceChildren(...this.make(logs)); }
    append(logs) { this.body.append(...this.make(logs)); }

    prepend(logs, most) {
        this.body.querySelector(".nothing")?.remove();
        const rows = this.make(logs);
        rows.forEach(row => row.classList.add("new"));
        this.body.prepend(...rows);
        for (const row of this.rows.slice(most)) {
            if (row.nextElementSibling?.classList.contains("opened"))
                row.nextElementSibling.remove();
            row.remove();
        }
    }

    showNothing(content) {
        this.body.replaceChildren(el("tr", { class: "nothing" }, el("td", { colspan: this.columns.length }, content)));
    }

    clicked(event) {
        const row = event.target.closest("tr.log");
        if (row && !window.getSelection().toString())
            this.toggle(row);
    }

    key(event) {
        const row = event.target;
        if (!row.matches("tr.log") || event.ctrlKey || event.metaKey || event.altKey)
            return;
        const step = { ArrowDown: 1, j: 1, ArrowUp: -1, k: -1 }[event.key];
        const act = step ? () => this.rows[this.rows.indexOf(row) + step]?.focus()
            : event.key === "Enter" || event.key === " " || (event.key === "Escape" && row.classList.contains("open")) ? () => this.toggle(row) : null;
        if (act) {
            act();
            event.preventDefault();
        }
    }

    toggle(row) {
        const isOpen = row.classList.toggle("open");
        if (isOpen)
            row.after(el("tr", { class: "opened" }, el("td", { colspan: this.columns.length }, detail(row.log, this.page))));
        else
            row.nextElementSibling.remove();
    }

    stopWatching() { this.observer.disconnect(); }
}
