// How the server is: what needs attention first, then each part of it.
import { _, fill } from "../base/texts.js";
import { el } from "../base/dom.js";
import { json } from "../base/program.js";
import { number, bytes, moment, age } from "../base/format.js";
import { card, alert, table, label, facts, faint, empty } from "../base/parts.js";

const SECONDS = 10;
const STATES = { good: "green", running: "green", "nearly full": "orange", locked: "orange", silent: "orange", none: "grey", unknown: "grey" };
const stateName = state => ({ good: _("good"), running: _("running"), "nearly full": _("nearly full"), full: _("full"), locked: _("locked"), silent: _("silent"),
                              none: _("never ran"), unknown: _("unknown"), stopped: _("stopped"), died: _("died"), missing: _("missing"),
                              damaged: _("damaged"), unreadable: _("unreadable") })[state] ?? state;
const stateLabel = state => label(STATES[state] ?? "red", stateName(state));
const time = seconds => seconds === null ? null : `${moment(seconds)} (${age(seconds)})`;
const count = value => value === null ? null : number(value);
const size = value => value === null ? null : bytes(value);

function receiving({ syslog_ng: daemon, receiver }) {
    return [
        card("syslog-ng", facts([[_("State"), stateLabel(daemon.state)], [_("Problem"), daemon.problem], [_("Running since"), time(daemon.since)],
            [_("Received"), count(daemon.received)], [_("Dropped"), count(daemon.dropped)], [_("Above the rate limit"), count(daemon.above_rate)]])),
        card(_("Receiver"), facts([[_("State"), stateLabel(receiver.state)], [_("Waits"), receiver.waiting], [_("Running since"), time(receiver.started)],
            [_("Logs a second"), receiver.state === "running" ? number(receiver.eps) : null], [_("Received"), count(receiver.received)], [_("Stored"), count(receiver.stored)],
            [_("Set aside"), receiver.rejected + receiver.overlong || null], [_("Notifications lost"), receiver.lost_notifications || null],
            [_("Message spool"), receiver.spool.folder && fill(_("$0, $1 not stored yet"), receiver.spool.folder, bytes(receiver.spool.unread_bytes))]])),
    ];
}

function listening(list) {
    if (list.length === 0)
        return null;
    return card(_("Where devices can send to"), table(_("Where devices can send to"), [_("Protocol"), _("Address"), ">" + _("Port"), _("Form"), _("State"), ">" + _("Connections"), ">" + _("Dropped")],
        list.map(socket => [socket.protocol.toUpperCase() + (socket.encryption ? " + " + socket.encryption : ""), socket.address, String(socket.port), socket.form,
            socket.open === null ? stateLabel("unknown") : socket.open ? label("green", _("open")) : label("red", _("closed")),
            socket.connections === null ? "" : number(socket.connections), socket.kernel_drops === null ? "" : number(socket.kernel_drops)])));
}

const databases = list => card(_("Databases"), table(_("Databases"), [_("Database"), _("State"), ">" + _("Rows"), ">" + _("Size"), ">" + _("Index"), _("Oldest"), _("Newest")],
    list.map(database => [el("span", { title: database.path }, database.name),
        el("span", {}, stateLabel(database.state), database.problem && el("div", {}, faint(database.problem))),
        database.rows === null ? "" : (database.rows_estimated ? "≈ " : "") + number(database.rows), size(database.size_bytes), size(database.index_bytes),
        database.first === null ? "" : moment(database.first), database.last === null ? "" : moment(database.last)])));

const volumes = list => card(_("Volumes"), list.length === 0 ? empty(_("No volume can be read"), "") : list.map(volume => el("div", { class: "volume" },
    el("div", { class: "volume-head" }, el("strong", {}, fill(_("$0 of $1 free"), bytes(volume.free_bytes), bytes(volume.size_bytes))), stateLabel(volume.state)),
    el("meter", { min: 0, max: 100, value: 100 - volume.free_percent, class: volume.state === "good" ? "other" : "error", "aria-label": _("Used") }),
    faint(volume.folders.join(", ")))));

function draw(root, status) {
    root.replaceChildren(...status.well ? [alert("success", _("All is well"))] : status.attention.map(text => alert("warning", text)),
        el("div", { class: "halves" }, receiving(status)), listening(status.listening) ?? "", databases(status.databases), volumes(status.volumes),
        faint(fill(_("As of $0"), moment(status.time))));
}

export async function state(root, signal) {
    draw(root, await json(["status"], { signal }));
    const timer = setInterval(async () => {
        if (document.hidden)
            return;
        try {
            draw(root, await json(["status"], { signal }));
        } catch (error) {
            if (!signal.aborted)
                root.prepend(alert("danger", error.message));
        }
    }, SECONDS * 1000);
    signal.addEventListener("abort", () => clearInterval(timer));
}
