// Begins the page: its tabs, what the address asks for, the state of the server, the keys.
import "./base/theme.js";
import { _, plural, language } from "./base/texts.js";
import { el, button } from "./base/dom.js";
import { alert, working } from "./base/parts.js";
import { json } from "./base/program.js";
import { setting, choose, onChoice } from "./base/settings.js";
import { show as showDialog } from "./base/dialog.js";
import { LogsPage } from "./search/logs.js";
import * as query from "./search/query.js";
import { overview } from "./pages/overview.js";
import { events } from "./pages/events.js";
import { rules } from "./pages/rules.js";
import { notifications } from "./pages/notifications.js";
import { archives } from "./pages/archives.js";
import { retention } from "./pages/retention.js";
import { state } from "./pages/state.js";

const cockpit = window.cockpit;
const HEALTH_SECONDS = 15;
const PAGES = { overview, events, rules, notifications, archives, retention, state };
const pageName = key => ({ logs: _("Logs"), overview: _("Overview"), events: _("Events"), rules: _("Rules"), notifications: _("Notifications"),
                           archives: _("Archives"), retention: _("Retention"), state: _("State") })[key];
const page = document.getElementById("page");
let logs = null;
let leave = null; // ends what the page that is shown has running

function showTabs(current) {
    document.getElementById("tabs").replaceChildren(el("ul", {}, ["logs", ...Object.keys(PAGES)].map(key => el("li", {},
        el("a", { href: "#/" + key, "aria-current": key === current && "page",
                  onclick: event => { event.preventDefault(); cockpit.location.go([key]); } }, pageName(key))))));
}

async function navigate() {
    const wanted = cockpit.location.path[0];
    const current = Object.hasOwn(PAGES, wanted) ? wanted : "logs";
    showTabs(current);
    leave?.();
    leave = null;
    if (current === "logs") {
        logs ??= new LogsPage();
        page.replaceChildren(logs.element);
        leave = () => logs.hide();
        logs.show(query.read(cockpit.location.options));
        return;
    }
    const root = el("div", { class: "stack" }, working());
    const cancel = new AbortController();
    leave = () => cancel.abort();
    page.replaceChildren(root);
    try {
        await PAGES[current](root, cancel.signal);
    } catch (error) {
        if (!cancel.signal.aborted)
            root.replaceChildren(alert("danger", error.message));
    }
}

async function showHealth() {
    const box = document.getElementById("health");
    try {
        const status = await json(["status"]);
        box.replaceChildren(el("button", { type: "button", class: "pf-v6-c-button pf-m-link pf-m-inline", onclick: () => cockpit.location.go(["state"]) },
            el("span", { class: `dot ${status.well ? "good" : "bad"}`, "aria-hidden": "true" }),
            status.well ? _("All is well") : plural("$0 thing needs attention", "$0 things need attention", status.attention.length)));
    } catch {
        box.replaceChildren();
    }
}

const keys = () => [["/", _("Search field")], ["j, k, ↓, ↑", _("Next and previous log")], ["Enter", _("Open or close a log")],
                    ["l", _("Live on and off")], ["p", _("Pause the live view")], ["?", _("These keys")]];

function showMenu() {
    const zone = value => el("label", {}, el("input", { type: "radio", name: "zone", checked: setting("utc") === value, onchange: () => choose("utc", value) }),
                             value ? _("Times in UTC") : _("Times of this browser"));
    document.getElementById("menu").replaceChildren(el("details", { class: "menu" },
        el("summary", { class: "pf-v6-c-button pf-m-plain", "aria-label": _("Settings") }, "⚙"),
        el("div", { class: "menu-body" }, zone(false), zone(true), button(_("Keys"), "link", showKeys))));
}
const showKeys = () => showDialog(_("Keys"), el("dl", { class: "facts" }, keys().map(([key, what]) => [el("dt", {}, el("kbd", {}, key)), el("dd", {}, what)])));

document.addEventListener("keydown", event => {
    if (event.ctrlKey || event.metaKey || event.altKey || event.target.closest("input, select, textarea, dialog"))
        return;
    const act = { "/": () => document.getElementById("q"), "l": () => document.getElementById("live"), "p": () => document.getElementById("pause") }[event.key]?.();
    if (event.key === "?")
        showKeys();
    else if (event.key === "/")
        act?.focus();
    else if (act && !act.hidden)
        act.click();
    else if (["j", "k"].includes(event.key) && !event.target.closest("tr.log"))
        document.querySelector("tr.log")?.focus();
    else
        return;
    event.preventDefault();
});
// One menu at a time; a click elsewhere and Escape close it.
document.addEventListener("click", event => {
    for (const menu of document.querySelectorAll("details.menu[open]"))
        if (!event.composedPath().includes(menu))
            menu.open = false;
});
document.addEventListener("keydown", event => {
    const menu = event.key === "Escape" && document.querySelector("details.menu[open]");
    if (menu) {
        menu.open = false;
        menu.querySelector("summary").focus();
    }
});

// Who leaves a page has cancelled what it asked for.
window.addEventListener("unhandledrejection", event => event.reason?.isCancelled && event.preventDefault());

document.documentElement.lang = language();
document.title = _("Log server");
document.getElementById("title").textContent = _("Log server");
document.getElementById("tabs").setAttribute("aria-label", _("Log server"));
showMenu();
onChoice(name => name === "utc" && cockpit.location.path[0] !== "logs" && cockpit.location.path.length && navigate());
cockpit.addEventListener("locationchanged", navigate);
navigate();
showHealth();
setInterval(() => document.hidden || showHealth(), HEALTH_SECONDS * 1000);
