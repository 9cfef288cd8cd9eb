// How many logs match, and when they came.
import { _, plural, severityClass } from "../base/texts.js";
import { el, button } from "../base/dom.js";
import { json } from "../base/program.js";
import { zone, instant } from "../base/format.js";
import { Chart } from "../chart.js";
import * as query from "./query.js";

const BUCKETS = 120;
const LONG = 2 * 86400; // from here on the accounting is faster than counting

// The program's counts by severity, in the classes that the chart has colours for.
export function classify(bucket) {
    const result = { time: bucket.time, count: bucket.count, error: 0, warning: 0 };
    for (const [name, count] of Object.entries(bucket.severities ?? {})) {
        const kind = severityClass(name);
        if (kind !== "other")
            result[kind] += count;
    }
    return result;
}

export class Histogram {
    constructor(onZoom, onStop) {
        this.count = el("span", { id: "count", role: "status" });
        this.stop = button(_("Stop"), "secondary", onStop, { id: "stop", hidden: true });
        this.box = el("div", { class: "chart", id: "chart", role: "img", "aria-label": _("Logs over time; drag over it to narrow the time") });
        this.zone = el("span", { class: "faint", title: _("Times are of this zone") });
        this.element = el("section", { class: "card", "aria-label": _("Logs over time") },
            el("div", { class: "card-head" }, this.count, this.stop, el("span", { class: "spacer" }), this.zone), this.box);
        this.chart = new Chart(this.box, onZoom);
    }

    // Counts, unless `signal` fires. Rejects with the program's error.
    async load(current, now, signal) {
        this.zone.textContent = zone();
        this.count.textContent = _("Counting …");
        const { since, until } = query.period(current, now);
        const early = this.early(current, since, until, signal);
        try {
            const found = await json(["count", ...query.options(current, now), `--buckets=${BUCKETS}`], { signal });
            signal.throwIfAborted();
            this.isDone = true;
            this.count.replaceChildren(el("strong", {}, plural("$0 log", "$0 logs", found?.count ?? 0)));
            const buckets = (found?.buckets ?? []).map(classify);
            this.chart.show(buckets, found?.span ?? 60, since ?? buckets[0]?.time, until);
        } finally {
            this.isDone = true;
            await early;
        }
    }

    // Without a filter the accounting knows the counts of a long time at once, though not by severity: shown until the others come.
    async early(current, since, until, signal) {
        this.isDone = false;
        if (query.hasFilter(current) || current.log || since === null || until - since < LONG)
            return;
        try {
            const samples = await json(["stats", "eps", "--by=hour", "--since=@" + since, "--until=@" + until], { signal });
            if (!this.isDone && samples?.length)
                this.chart.show(samples.map(sample => ({ time: instant(sample.time), count: sample.count })), 3600, since, until);
        } catch {
            // The counts themselves follow, or their error is shown.
        }
    }

    failed() {
        this.count.textContent = "";
        this.chart.clear();
    }

    end() { this.chart.end(); }
}
