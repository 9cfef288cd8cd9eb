// How often a rule would have fired in the last day, counted in the stored logs.
import { _, fill, plural, SEVERITIES } from "../base/texts.js";
import { json, records } from "../base/program.js";

const DAY = "--since=-24h";

// A keyword that finds exactly the messages that contain `text`, byte for byte.
export const exactText = text => "/(?-i)" + text.replace(/[\\.+*?()|[\]{}^$/]/g, "\\$&") + "/";

async function matches(rule) {
    if (rule.type === "eps") {
        const seconds = await records(["stats", "eps", "--by=second", DAY]);
        return seconds.filter(second => second.count >= rule.eps).length;
    }
    if (rule.type === "keyword" && rule.keyword === "")
        return 0;
    const found = await json(["count", DAY, rule.type === "severity" ? "--priority=" + SEVERITIES[rule.severity] : "--grep=" + exactText(rule.keyword)]);
    return found?.count ?? 0;
}

export async function firings(rule) {
    const count = await matches(rule);
    return count === 0 ? _("Would not have fired in the last 24 hours.")
        : fill(_("Would have fired $0 in the last 24 hours. The receiver sends at most 10 notifications a minute for it."), plural("$0 time", "$0 times", count));
}
