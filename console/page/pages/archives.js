// The archives: what there is, searching in one, and making one now.
import { _, fill } from "../base/texts.js";
import { el, button, toast } from "../base/dom.js";
import { json, run } from "../base/program.js";
import { number, bytes, moment, instant } from "../base/format.js";
import { ask } from "../base/dialog.js";
import { cardWith, table, empty } from "../base/parts.js";

const day = text => text ? moment(instant(text)) : "";

export async function archives(root, signal) {
    async function draw() {
        const list = await json(["archive", "--list"], { signal }) ?? [];
        const make = async () => {
            const remove = el("input", { type: "checkbox" });
            const plan = (await run(["archive", "--dry-run"]).catch(error => error.message)).trim();
            ask({ title: _("Archive now"), verb: _("Archive"), content: [
                      el("p", {}, _("All logs of the working log are copied into an archive; devices keep sending meanwhile.")),
                      plan && el("pre", { class: "whole" }, plan), el("label", { class: "check" }, remove, " ", _("Remove the archived logs from the working log"))],
                  act: () => run(["archive", "--yes", ...remove.checked ? ["--remove-archived"] : []]).then(async () => { await draw(); toast(_("The archive is complete.")); }) });
        };
        const total = list.reduce((sum, archive) => sum + archive.size, 0);
        root.replaceChildren(cardWith(list.length ? fill(_("Archives, $0"), bytes(total)) : _("Archives"), [button(_("Archive now …"), "primary", make)],
            list.length === 0 ? empty(_("No archives yet"), _("An archive is a copy of the logs in a file of its own, which can be searched like the working log."))
                : table(_("Archives"), [_("Archive"), _("Device"), _("First log"), _("Last log"), ">" + _("Logs"), ">" + _("Size"), ""], [...list].reverse().map(archive => [
                    archive.name, archive.device || _("all"), day(archive.first), day(archive.last), number(archive.logs), bytes(archive.size),
                    button(_("Search"), "secondary", () => window.cockpit.location.go(["logs"], { log: archive.name.replace(/\.db$/, ""), range: "all" }),
                           { "aria-label": fill(_("Search in $0"), archive.name) })]))));
    }
    await draw();
}
