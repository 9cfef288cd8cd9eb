// The log server's own events: what it did, and what went wrong.
import { _ } from "../base/texts.js";
import { el, button, choice, field } from "../base/dom.js";
import { records, follow } from "../base/program.js";
import { moment, instant } from "../base/format.js";
import { cardWith, table, label, empty } from "../base/parts.js";

const PAGE = 200;
const COLOURS = { Error: "red", Warning: "orange", Information: "blue" };
const levelName = level => ({ Error: _("Error"), Warning: _("Warning"), Information: _("Information") })[level] ?? level;

export async function events(root, signal) {
    const level = choice([["", _("All levels")], ["warning", _("Warnings and errors")], ["error", _("Errors")]], { onchange: () => load() });
    const box = el("div");
    const more = button(_("Older events"), "secondary", () => older(), { hidden: true });
    let list = [];
    const filter = () => level.value ? ["--priority=" + level.value] : [];
    function draw() {
        box.replaceChildren(list.length === 0 ? empty(_("No events"), _("The log server notes here when it starts, when a volume is full and when a database is damaged."))
            : table(_("Events"), [_("Time"), _("Level"), _("User"), _("Event")], list.map(event => [
                moment(instant(event.time)), label(COLOURS[event.level] ?? "grey", levelName(event.level)), event.user, event.event])));
    }
    async function load() {
        list = await records(["events", "--lines=" + PAGE, ...filter()], { signal });
        more.hidden = list.length < PAGE;
        draw();
    }
    async function older() {
        const next = await records(["events", "--lines=" + PAGE, "--offset=" + list.length, ...filter()], { signal });
        list.push(...next);
        more.hidden = next.length < PAGE;
        draw();
    }
    await load();
    root.replaceChildren(cardWith(_("The log server's own events"), [field(_("Level"), level)], box, el("div", { class: "table-end" }, more)));
    // New ones show up by themselves; a server without this option shows them at the next visit.
    follow(["events", "--lines=0"], found => {
        const wanted = { "": 0, warning: 1, error: 2 }[level.value];
        list.unshift(...found.filter(event => ["Information", "Warning", "Error"].indexOf(event.level) >= wanted).reverse());
        draw();
    }, signal).catch(() => {});
}
