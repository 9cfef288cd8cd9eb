// The search field, the filters and the menus above the table.
import { _, SEVERITIES, severityName, fill } from "../base/texts.js";
import { el, button, field, choice, visible } from "../base/dom.js";
import { moment, toField, fromField } from "../base/format.js";
import { json } from "../base/program.js";
import * as query from "./query.js";

const severityChoices = () => [["", _("All severities")], ...SEVERITIES.slice(0, 7).map((level, i) =>
    [i === 0 ? "emerg..emerg" : level, i === 0 ? severityName(level) : fill(_("$0 and worse"), severityName(level))])];

export class Toolbar {
    // `go` is called with the next query when the person has asked for it.
    constructor(go, menus) {
        this.go = go;
        this.text = el("input", { type: "search", id: "q", spellcheck: "false", autocomplete: "off",
                                  placeholder: _('Words, "a phrase", one OR other, -without, /regex/') });
        this.range = choice([...query.ranges(), ["custom", _("From … to …")]], { onchange: () => this.rangeChosen() });
        this.prio = choice(severityChoices(), { onchange: () => this.submit() });
        this.host = this.input("host", _("All hosts"));
        this.prog = this.input("prog", _("All programs"));
        this.from = el("input", { type: "datetime-local", step: 1, onchange: () => this.submit() });
        this.to = el("input", { type: "datetime-local", step: 1, onchange: () => this.submit() });
        this.times = el("span", { class: "times", hidden: true }, field(_("From"), this.from), "–", field(_("To"), this.to));
        this.chips = el("div", { class: "chips" });
        this.element = el("form", { class: "card toolbar", role: "search", onsubmit: event => { event.preventDefault(); this.submit(); } },
            el("div", { class: "search-line" }, field(_("Search messages"), this.text),
               el("button", { type: "submit", class: "pf-v6-c-button pf-m-primary" }, el("span", { class: "pf-v6-c-button__text" }, _("Search")))),
            el("div", { class: "filters" }, field(_("Time"), this.range), this.times, field(_("Severity"), this.prio),
               field(_("Host"), this.host), field(_("Program"), this.prog), el("div", { class: "menus" }, menus)),
            this.chips);
    }

    // A field with the values of the database to choose from, asked for when it is first used.
    input(column, placeholder) {
        const list = el("datalist", { id: "values-" + column });
        const input = el("input", { type: "text", list: list.id, placeholder, spellcheck: "false", autocomplete: "off", onchange: () => this.submit() });
        input.addEventListener("focus", () => json(["values", column, "--lines=500"]).then(
            values => list.replaceChildren(...(values ?? []).filter(value => value !== "").map(value => el("option", { value }))), () => {}), { once: true });
        this.element?.append(list);
        (this.lists ??= []).push(list);
        return input;
    }

    rangeChosen() {
        const isCustom = this.range.value === "custom";
        this.times.hidden = !isCustom;
        if (!isCustom)
            return this.submit();
        const { since, until } = query.period(this.query, Math.floor(Date.now() / 1000));
        this.from.value = toField(since ?? until - 86400);
        this.to.value = toField(until);
        this.from.focus();
    }

    submit() {
        const isCustom = this.range.value === "custom";
        const time = input => isCustom && input.value ? String(fromField(input.value) ?? "") : "";
        this.go({ ...this.query, q: this.text.value, prio: this.prio.value, host: this.host.value.trim(), prog: this.prog.value.trim(),
                  range: isCustom ? "24h" : this.range.value, since: time(this.from), until: time(this.to) });
    }

    show(current) {
        this.query = current;
        this.element.append(...this.lists);
        this.text.value = current.q;
        this.host.value = current.host;
        this.prog.value = current.prog;
        const isCustom = Boolean(current.since || current.until);
        this.range.value = isCustom ? "custom" : current.range;
        this.times.hidden = !isCustom;
        this.from.value = current.since ? toField(Number(current.since)) : "";
        this.to.value = current.until ? toField(Number(current.until)) : "";
        this.prio.querySelector("[data-own]")?.remove();
        if (![...this.prio.options].some(option => option.value === current.prio))
            this.prio.append(el("option", { value: current.prio, "data-own": true }, current.prio.startsWith("!")
                ? fill(_("not $0"), severityName(current.prio.slice(1))) : severityName(current.prio.split("..")[0])));
        this.prio.value = current.prio;
        this.showChips(current);
    }

    showChips(current) {
        const chip = (text, next) => el("span", { class: "pf-v6-c-label pf-m-outline" }, el("span", { class: "pf-v6-c-label__content" },
            el("span", { class: "pf-v6-c-label__text" }, visible(text)),
            el("button", { type: "button", class: "chip-x", "aria-label": fill(_("Remove the filter $0"), text), onclick: () => this.go(next) }, "×")));
        const chips = [];
        for (const [key, name] of [["hostIs", _("host")], ["progIs", _("program")], ["fac", _("facility")], ["log", _("log")]])
            if (current[key])
                chips.push(chip(`${name}: ${current[key]}`, { ...current, [key]: "" }));
        for (const [key, name] of [["hostNot", _("host")], ["progNot", _("program")]])
            for (const value of current[key])
                chips.push(chip(fill(_("$0: not $1"), name, value), { ...current, [key]: current[key].filter(other => other !== value) }));
        if (current.since || current.until)
            chips.push(chip(`${current.since ? moment(Number(current.since)) : ""} – ${current.until ? moment(Number(current.until)) : _("now")}`, { ...current, since: "", until: "" }));
        if (query.hasFilter(current))
            chips.push(button(_("Clear all filters"), "link", () => this.go(query.withoutFilters(current)), { class: "pf-m-inline" }));
        this.chips.replaceChildren(...chips);
    }
}
