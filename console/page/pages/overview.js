// What a day on the server looked like, and what differs from the day before.
import { _, fill, language, SEVERITIES, severityName, severityClass } from "../base/texts.js";
import { el } from "../base/dom.js";
import { json, records } from "../base/program.js";
import { number, bytes, change, age, moment, instant } from "../base/format.js";
import { card, alert, bars, empty, faint, table, label } from "../base/parts.js";
import { Chart } from "../chart.js";
import { classify } from "../search/histogram.js";

const cockpit = window.cockpit;
const DAY = 86400;
const STEP = 600; // seconds of a bar
const TOP = 10;
const showLogs = options => cockpit.location.go(["logs"], options);

// Sums of the accounting's hours by device: { device: [the day before, the last day] }.
export function compareDays(samples, middle) {
    const devices = new Map();
    for (const sample of samples) {
        const counts = devices.get(sample.device) ?? [0, 0];
        counts[instant(sample.time) < middle ? 0 : 1] += sample.count;
        devices.set(sample.device, counts);
    }
    return devices;
}

const tile = (name, value, note) => el("div", { class: "card tile" }, el("span", { class: "faint" }, name), el("strong", {}, value), note && faint(note));

function tiles(status) {
    const accounting = status.accounting;
    const working = status.databases.find(database => database.name === "logs");
    const rate = value => value === undefined ? "–" : value.toLocaleString(language(), { maximumFractionDigits: value < 1 ? 2 : value < 10 ? 1 : 0 });
    return el("div", { class: "tiles" },
        tile(_("Logs a second"), rate(accounting?.eps_minute), accounting && fill(_("$0 in the last hour"), rate(accounting.eps_hour))),
        tile(_("Logs in the database"), working?.rows ? number(working.rows) : "–", working?.first ? fill(_("since $0"), moment(working.first).slice(0, 10)) : ""),
        tile(_("Size of the database"), bytes(working?.size_bytes ?? 0), status.volumes[0] && fill(_("$0 free"), bytes(status.volumes[0].free_bytes))),
        tile(_("Newest log"), working?.last ? age(working.last) : "–", working?.last ? moment(working.last) : ""));
}

function severityCard(counts) {
    const [before, now] = counts.map(found => new Map((found?.buckets ?? []).map(entry => [entry.value, entry.count])));
    const entries = SEVERITIES.filter(name => now.get(name) || before.get(name)).map(name => ({
        name: severityName(name), value: name, count: now.get(name) ?? 0, kind: severityClass(name), text: number(now.get(name) ?? 0), note: change(before.get(name) ?? 0, now.get(name) ?? 0) }));
    return card(_("Severities of the last 24 hours"), entries.length ? bars(entries, entry => showLogs({ prio: `${entry.value}..${entry.value}` })) : empty(_("No logs yet"), ""));
}

function deviceCard(devices) {
    const entries = [...devices].filter(([, [, now]]) => now > 0).sort((a, b) => b[1][1] - a[1][1]).slice(0, TOP).map(([name, [before, now]]) => ({
        name, count: now, text: number(now), note: change(before, now) }));
    return card(_("Devices of the last 24 hours"), entries.length ? bars(entries, entry => showLogs({ hostIs: entry.name })) : empty(_("No device has sent logs"), ""));
}

// New and silent devices, and those that send far more or fewer logs than the day before.
export function notableChanges(devices) {
    const rows = [];
    for (const [name, [before, now]] of devices) {
        const kind = before === 0 ? "new" : now === 0 ? "silent" : now >= 2 * before && now - before >= 20 ? "more" : now * 2 <= before && before - now >= 20 ? "fewer" : null;
        if (kind)
            rows.push({ name, before, now, kind });
    }
    const rank = { silent: 0, new: 1, more: 2, fewer: 3 };
    return rows.sort((a, b) => rank[a.kind] - rank[b.kind] || Math.abs(b.now - b.before) - Math.abs(a.now - a.before));
}

function changeCard(devices) {
    const names = { silent: [_("silent"), "red"], new: [_("new"), "blue"], more: [_("more"), "orange"], fewer: [_("fewer"), "grey"] };
    const rows = notableChanges(devices).slice(0, TOP);
    return card(_("What changed since yesterday"), rows.length === 0 ? empty(_("Nothing unusual"), _("Every device sends about as many logs as the day before."))
        : table(_("What changed since yesterday"), [_("Device"), _("Change"), ">" + _("The day before"), ">" + _("Last 24 hours")], rows.map(row => [
            el("button", { type: "button", class: "pf-v6-c-button pf-m-link pf-m-inline", onclick: () => showLogs({ hostIs: row.name }) }, row.name),
            label(names[row.kind][1], names[row.kind][0]), number(row.before), number(row.now)])));
}

export async function overview(root, signal) {
    const now = Math.floor(Date.now() / 1000);
    const middle = now - DAY;
    const day = (from, to) => [`--since=@${from}`, `--until=@${to}`];
    // What is slow in a large database comes last, and nothing waits for it.
    const severities = Promise.all([json(["count", "--by=severity", ...day(middle - DAY, middle - 1)], { signal }), json(["count", "--by=severity", ...day(middle, now)], { signal })]);
    severities.catch(() => {});
    const split = json(["count", `--buckets=${DAY / STEP}`, ...day(middle, now)], { signal });
    split.catch(() => {});
    const [status, samples, devices] = await Promise.all([json(["status"], { signal }), records(["stats", "eps", "--by=minute", ...day(middle, now)], { signal }),
                                                          records(["stats", "eps", "--by=hour", "--per-device", ...day(middle - DAY, now)], { signal })]);
    signal.throwIfAborted();
    const box = el("div", { class: "chart" });
    const compared = compareDays(devices, middle);
    const slow = el("div", {}, card(_("Severities of the last 24 hours"), empty(_("Counting …"), "")));
    root.replaceChildren(...status.attention.slice(0, 3).map(text => alert("warning", text)), tiles(status),
        card(_("Logs of the last 24 hours"), box), el("div", { class: "halves" }, deviceCard(compared), slow), changeCard(compared));
    const chart = new Chart(box, (since, until) => showLogs({ since: String(since), until: String(until) }));
    signal.addEventListener("abort", () => chart.end());
    const buckets = new Map();
    for (const sample of samples) {
        const time = Math.floor(instant(sample.time) / STEP) * STEP;
        buckets.set(time, (buckets.get(time) ?? 0) + sample.count);
    }
    chart.show([...buckets].map(([time, count]) => ({ time, count })), STEP, middle, now);
    split.then(found => found && !signal.aborted && chart.show(found.buckets.map(classify), found.span, middle, now), () => {});
    slow.replaceChildren(await severities.then(severityCard, error => alert("danger", error.message)));
}
