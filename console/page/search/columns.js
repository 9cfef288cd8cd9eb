// The columns of the table of logs.
import { _, severityName } from "../base/texts.js";
import { el, visible, marked } from "../base/dom.js";
import { shortMoment, moment } from "../base/format.js";
import { setting, choose } from "../base/settings.js";

const SHOWN_LENGTH = 400; // characters of a message in a row

const timeCell = log => [el("time", { title: moment(log.utcsec) }, shortMoment(log.utcsec))];
const severityCell = log => [el("span", { class: "dot", "aria-hidden": "true" }), severityName(log.prio)];
const messageCell = (log, words) => {
    const isCut = log.msg.length > SHOWN_LENGTH || log.length > new Blob([log.msg]).size;
    return [el("div", { class: "msg" }, marked(log.msg.slice(0, SHOWN_LENGTH), words), isCut && el("span", { class: "faint" }, " …"))];
};

export const COLUMNS = {
    time: { name: () => _("Time"), cell: timeCell },
    prio: { name: () => _("Severity"), cell: severityCell },
    fac: { name: () => _("Facility"), cell: log => visible(log.fac) },
    host: { name: () => _("Host"), cell: log => visible(log.host) },
    ip: { name: () => _("Address"), cell: log => visible(log.ip) },
    prog: { name: () => _("Program"), cell: log => visible(log.prog) },
    tag: { name: () => _("Tag"), cell: log => visible(log.tag) },
    msg: { name: () => _("Message"), cell: messageCell },
};

export function shownColumns() {
    const wanted = setting("columns").filter(key => key in COLUMNS);
    return Object.keys(COLUMNS).filter(key => wanted.includes(key) || key === "msg");
}

// A menu with a box for each column.
export function columnMenu() {
    return el("details", { class: "menu" }, el("summary", { class: "pf-v6-c-button pf-m-secondary" }, _("Columns")),
        el("div", { class: "menu-body" }, Object.entries(COLUMNS).map(([key, column]) => el("label", {},
            el("input", { type: "checkbox", checked: shownColumns().includes(key), disabled: key === "msg", onchange: event =>
                choose("columns", Object.keys(COLUMNS).filter(other => other === key ? event.target.checked : shownColumns().includes(other))) }),
            column.name()))));
}
