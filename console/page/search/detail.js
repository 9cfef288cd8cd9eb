// One log opened: its whole message, its fields to filter by, and what its host said around it.
import { _, fill, severityClass, severityName } from "../base/texts.js";
import { el, button, visible, marked, copy } from "../base/dom.js";
import { clock, moment, bytes } from "../base/format.js";
import { records } from "../base/program.js";
import { alert } from "../base/parts.js";
import * as query from "./query.js";

const AROUND = 8;
const fieldName = key => ({ id: _("Number"), time: _("Time"), host: _("Host"), ip: _("Address"), prog: _("Program"),
                            prio: _("Severity"), fac: _("Facility"), tag: _("Tag") })[key];

// `page` has the query shown and the function go(query).
export function detail(log, page) {
    const message = el("pre", { class: "whole", tabindex: 0, "aria-label": _("Message") }, marked(log.msg, query.words(page.query.q)));
    const context = el("div", { class: "context" });
    const size = new Blob([log.msg]).size;
    const rest = log.length > size && button(fill(_("Show all $0"), bytes(log.length)), "secondary", async () => {
        const [whole] = await around(log, page, ["--before-id=" + (log.id + 1), "--after-id=" + (log.id - 1)]);
        message.replaceChildren(...visible(whole?.msg ?? log.msg));
        rest.remove();
    });
    const values = { id: String(log.id), time: moment(log.utcsec), host: log.host, ip: log.ip, prog: log.prog, prio: log.prio, fac: log.fac, tag: log.tag };
    return el("div", { class: "detail" }, message,
        el("dl", { class: "fields" }, Object.entries(values).map(([key, value]) => [el("dt", {}, fieldName(key)),
            el("dd", {}, el("span", {}, visible(key === "prio" ? severityName(value) : value)), filters(key, value, page, log))])),
        el("div", { class: "actions" }, rest,
           button(_("Show what came before and after"), "secondary", () => showContext(log, page, context)),
           button(_("Copy as JSON"), "link", () => copy(JSON.stringify(log), _("The log was copied.")))),
        context);
}

// None for bytes that are no text: they cannot be handed to the program as they are.
function filters(key, value, page, log) {
    if (!["host", "prog", "prio", "fac"].includes(key) || value === "" || log[key + "_base64"])
        return null;
    const what = `${fieldName(key)} ${key === "prio" ? severityName(value) : value}`;
    const small = (sign, text, next) => button(sign, "plain", () => page.go(next), { class: "small", title: text, "aria-label": text });
    return el("span", { class: "filter-buttons" },
        small("+", fill(_("Only $0"), what), query.only(page.query, key, value)),
        small("−", fill(_("Without $0"), what), query.without(page.query, key, value)));
}

const around = (log, page, options) => records(["search", ...options, ...page.query.log ? ["--log=" + page.query.log] : []]);

async function showContext(log, page, box) {
    const host = log.host === "" ? [] : ["--host-is=" + log.host];
    const common = ["--lines=" + AROUND, "--max-message=1000", ...host];
    try {
        const [before, after] = await Promise.all([
            around(log, page, ["--before-id=" + log.id, ...common]), around(log, page, ["--after-id=" + log.id, "--oldest", ...common])]);
        box.replaceChildren(el("h2", {}, visible(log.host === "" ? _("Around this log, oldest first") : fill(_("Around this log of $0, oldest first"), log.host))),
            el("ol", { class: "lines" }, [...before, log, ...after].map(other => el("li", { class: `${severityClass(other.prio)} ${other.id === log.id ? "this" : ""}` },
                el("time", { title: moment(other.utcsec) }, clock(other.utcsec)), el("span", { class: "line-prog" }, visible(other.prog)),
                el("span", {}, visible(other.msg.slice(0, 400)))))));
    } catch (error) {
        box.replaceChildren(alert("danger", error.message));
    }
}
