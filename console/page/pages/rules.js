// The rules of notification: which there are, how often they would have fired, and changing them.
import { _, fill, severityName, SEVERITIES } from "../base/texts.js";
import { el, button, field, choice } from "../base/dom.js";
import { json, run } from "../base/program.js";
import { ask } from "../base/dialog.js";
import { cardWith, table, label, alert, empty } from "../base/parts.js";
import { firings } from "./rule_firings.js";

export const describe = rule => rule.type === "severity" ? fill(_("Severity $0 and worse"), severityName(SEVERITIES[rule.severity]))
    : rule.type === "eps" ? fill(_("$0 logs a second and more"), rule.eps) : fill(_("Messages that contain “$0”"), rule.keyword);

// What the form describes, as the program's option.
const optionOf = { severity: rule => "--severity=" + SEVERITIES[rule.severity], eps: rule => "--eps=" + rule.eps, keyword: rule => "--keyword=" + rule.keyword };

function form(rule) {
    const name = el("input", { type: "text", required: true, maxlength: 100, value: rule?.name ?? "", readonly: Boolean(rule) });
    const type = choice([["severity", _("By severity")], ["keyword", _("By a text in the message")], ["eps", _("By logs a second")]], { onchange: () => showValue() });
    const inputs = {
        severity: choice(SEVERITIES.slice(0, 7).map((level, i) => [String(i), fill(_("$0 and worse"), severityName(level))])),
        keyword: el("input", { type: "text", maxlength: 500, value: rule?.keyword ?? "" }),
        eps: el("input", { type: "number", min: 1, max: 2147483647, step: 1, value: rule?.eps || 100 }),
    };
    type.value = rule?.type ?? "severity";
    inputs.severity.value = String(rule?.severity ?? 2);
    const value = el("div");
    const result = el("div");
    const current = () => ({ name: name.value, type: type.value, severity: Number(inputs.severity.value), keyword: inputs.keyword.value, eps: Number(inputs.eps.value) });
    function showValue() {
        inputs.keyword.required = type.value === "keyword";
        inputs.eps.required = type.value === "eps";
        value.replaceChildren(field({ severity: _("Fires for"), keyword: _("Text, as it is written"), eps: _("Logs a second") }[type.value], inputs[type.value], true));
        result.replaceChildren();
    }
    showValue();
    const test = button(_("Test with the last day"), "secondary", async () => {
        result.replaceChildren(el("p", { class: "faint" }, _("Counting …")));
        result.replaceChildren(await firings(current()).then(text => alert("info", text), error => alert("danger", error.message)));
    });
    return { content: [field(_("Name"), name, true), field(_("Kind"), type, true), value, el("div", { class: "actions" }, test), result], current };
}

export async function rules(root, signal) {
    const tested = new Map(); // name: element with the result of the last test
    async function draw() {
        const list = await json(["rules", "list"], { signal }) ?? [];
        const problem = el("div");
        const change = args => run(["rules", ...args]).then(draw, error => problem.replaceChildren(alert("danger", error.message)));
        const edit = rule => {
            const { content, current } = form(rule);
            ask({ title: rule ? fill(_("Change the rule $0"), rule.name) : _("Add a rule"), verb: rule ? _("Change") : _("Add"), content,
                  act: () => { const wanted = current(); return run(["rules", rule ? "set" : "add", optionOf[wanted.type](wanted), "--", wanted.name]).then(draw); } });
        };
        const remove = rule => ask({ title: fill(_("Remove the rule $0?"), rule.name), verb: _("Remove"), kind: "danger",
            content: el("p", {}, _("No notification is sent for it any more.")), act: () => run(["rules", "remove", "--", rule.name]).then(draw) });
        const test = async rule => {
            const box = tested.get(rule.name) ?? el("div", { class: "faint" });
            tested.set(rule.name, box);
            box.textContent = _("Counting …");
            box.textContent = await firings(rule).catch(error => error.message);
        };
        root.replaceChildren(problem, cardWith(_("Rules of notification"), [
            button(_("Test all with the last day"), "secondary", () => { list.forEach(test); drawTable(); }), button(_("Add a rule"), "primary", () => edit(null))],
            el("div", { id: "rules" })));
        function drawTable() {
            root.querySelector("#rules").replaceChildren(list.length === 0 ? empty(_("No rules yet"), _("A rule notifies you of errors, of a text in a message, or of too many logs a second."))
                : table(_("Rules"), [_("Rule"), _("Fires at"), _("State"), ""], list.map(rule => [
                    el("strong", {}, rule.name), el("div", {}, el("span", {}, describe(rule)), tested.get(rule.name)),
                    label(rule.enabled ? "green" : "grey", rule.enabled ? _("on") : _("off")),
                    el("div", { class: "actions" }, button(_("Test"), "link", () => { test(rule); drawTable(); }, { "aria-label": fill(_("Test $0"), rule.name) }),
                       button(_("Change"), "link", () => edit(rule), { "aria-label": fill(_("Change $0"), rule.name) }),
                       button(_("Remove"), "link", () => remove(rule), { "aria-label": fill(_("Remove $0"), rule.name) }),
                       button(rule.enabled ? _("Switch off") : _("Switch on"), "secondary", () => change([rule.enabled ? "disable" : "enable", "--", rule.name]),
                              { "aria-label": fill(rule.enabled ? _("Switch off $0") : _("Switch on $0"), rule.name) }))])));
        }
        drawTable();
    }
    await draw();
}
