// How long logs stay in the working log: the rule, what following it would remove, and following it now.
import { _, fill } from "../base/texts.js";
import { el, button, toast } from "../base/dom.js";
import { json, run } from "../base/program.js";
import { bytes, moment, number } from "../base/format.js";
import { ask } from "../base/dialog.js";
import { card, cardWith, facts, alert, empty } from "../base/parts.js";

const EXAMPLE = 'keep="90d"             # remove records that are older\nkeep_size="20G"        # remove the oldest while the log has more\n'
    + 'min_free="5%"          # when the volume has less free,\nwhen_full="remove"     # remove the oldest, or "stop" receiving';

export async function retention(root, signal) {
    async function draw() {
        const [status, plan] = await Promise.all([json(["status"], { signal }), run(["retention", "--dry-run"], { signal }).then(text => ({ text: text.trim() }), error => ({ error }))]);
        const rule = status.retention;
        const logs = status.databases.find(database => database.name === "logs");
        const follow = () => ask({ title: _("Follow the rule now?"), verb: _("Remove"), kind: "danger",
            content: el("pre", { class: "whole" }, plan.text || _("Nothing is to be removed.")),
            act: () => run(["retention", "--yes"]).then(async () => { await draw(); toast(_("The rule was followed.")); }) });
        root.replaceChildren(
            rule.receiving_stopped ? alert("danger", _("Receiving is stopped: the volume is too full for the rule.")) : "",
            rule.problem ? alert("warning", rule.problem) : "",
            cardWith(_("The rule"), [button(_("Follow it now …"), "secondary", follow, { disabled: rule.rule === "" })],
                rule.rule === "" ? empty(_("Logs are kept without a limit"), _("A rule in /etc/kelosyslog/retention.conf on the server removes old logs every minute:"),
                                         el("pre", { class: "whole" }, EXAMPLE))
                    : [el("p", { class: "big" }, rule.rule), el("p", { class: "faint" }, _("From /etc/kelosyslog/retention.conf; a timer follows it every minute."))]),
            card(_("The working log"), facts([[_("Size"), bytes(logs?.size_bytes ?? 0)], [_("Logs"), logs?.rows === null || !logs ? null : number(logs.rows)],
                [_("Oldest log"), logs?.first ? moment(logs.first) : null], [_("Newest log"), logs?.last ? moment(logs.last) : null],
                [_("Free on its volume"), status.volumes[0] ? fill(_("$0 of $1"), bytes(status.volumes[0].free_bytes), bytes(status.volumes[0].size_bytes)) : null]])),
            rule.rule === "" ? "" : card(_("What the rule would do now"), plan.error ? alert("danger", plan.error.message) : el("pre", { class: "whole" }, plan.text || _("Nothing is to be removed."))));
    }
    await draw();
}
