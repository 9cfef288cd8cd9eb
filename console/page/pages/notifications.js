// How notifications go: the channels, what waits, and a test.
import { _, fill, plural } from "../base/texts.js";
import { el, button, toast } from "../base/dom.js";
import { json, run } from "../base/program.js";
import { moment } from "../base/format.js";
import { card, cardWith, table, label, alert, empty, faint } from "../base/parts.js";

const ORDER = ["mail", "sms", "push_mobile", "push_msn", "push_skype", "desktop"];
const channelName = name => ({ mail: _("Mail"), sms: _("SMS"), push_mobile: _("Push to mobile devices"), push_msn: _("Push to MSN"),
                               push_skype: _("Push to Skype"), desktop: _("Desktop") })[name] ?? name;
const time = seconds => seconds ? moment(seconds) : "";

function channelState(channel) {
    if (!channel.enabled)
        return label("grey", _("off"));
    return channel.problem ? el("span", {}, label("red", _("fails")), el("div", {}, faint(channel.problem), channel.next ? faint(" " + fill(_("Next attempt: $0"), time(channel.next))) : ""))
        : label("green", _("works"));
}

export async function notifications(root, signal) {
    async function draw() {
        const [status, list] = await Promise.all([json(["notify", "status"], { signal }), json(["notify", "list"], { signal })]);
        const problem = el("div");
        const act = (args, done) => run(["notify", ...args]).then(async () => { await draw(); toast(done); }, error => problem.replaceChildren(alert("danger", error.message)));
        const names = [...ORDER.filter(name => name in status.channels), ...Object.keys(status.channels).filter(name => !ORDER.includes(name))];
        const failed = (list ?? []).filter(entry => entry.state === "failed");
        root.replaceChildren(problem,
            card(_("Channels"), table(_("Channels"), [_("Channel"), _("State"), ""], names.map(name => [channelName(name), channelState(status.channels[name]),
                el("div", { class: "actions" }, button(_("Send a test"), "secondary", () => act(["test", name], fill(_("A test was handed to the channel $0."), channelName(name))),
                   { disabled: !status.channels[name].enabled, "aria-label": fill(_("Send a test through $0"), channelName(name)) }))])),
                 el("p", { class: "faint" }, _("/etc/keloinfo.conf on the server sets the channels up; keloinfo.conf(5) describes it."))),
            cardWith(_("Waiting and given up"), [
                button(_("Deliver now"), "secondary", () => act(["retry"], _("The delivery has begun.")), { disabled: status.waiting === 0 }),
                button(_("Take all up again"), "secondary", () => act(["retry", "--all"], _("They are tried again.")), { disabled: status.failed === 0 })],
                (list ?? []).length === 0 ? empty(_("Nothing waits"), _("Every notification was delivered."))
                    : table(_("Notifications"), [_("Time"), _("State"), _("Subject"), _("Reason")], list.map(entry => [
                        time(entry.time), entry.state === "failed" ? label("red", _("given up")) : label("orange", _("waits")),
                        entry.title ?? entry.id, entry.problem ?? entry.reason]))),
            failed.length ? faint(plural("$0 notification was given up.", "$0 notifications were given up.", failed.length)) : "");
    }
    await draw();
}
