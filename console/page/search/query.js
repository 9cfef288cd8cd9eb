// What is searched for: kept in the page's address, turned into options of the program. An address only shapes a search; it names
// no database, changes nothing and starts no live view.
import { _, SEVERITIES } from "../base/texts.js";

export const ranges = () => [["15min", _("Last 15 minutes")], ["1h", _("Last hour")], ["6h", _("Last 6 hours")],
                             ["24h", _("Last 24 hours")], ["7d", _("Last 7 days")], ["30d", _("Last 30 days")], ["all", _("All time")]];
const SECONDS = { "15min": 900, "1h": 3600, "6h": 21600, "24h": 86400, "7d": 604800, "30d": 2592000 };
const DEFAULTS = { q: "", host: "", prog: "", prio: "", fac: "", hostIs: "", progIs: "", hostNot: [], progNot: [], range: "24h", since: "", until: "", log: "" };
const LONGEST = 4000; // characters of a value

const isSeverity = text => text === "" || text.replace(/^!/, "").split("..").every(part => SEVERITIES.includes(part));
const isTime = text => /^\d{1,12}$/.test(text);

// Out of the address: unknown names and values that cannot be meant are left out.
export function read(options) {
    const query = { ...DEFAULTS };
    for (const key of Object.keys(DEFAULTS)) {
        const isGood = value => typeof value === "string" && value.length <= LONGEST && !value.includes("\0");
        if (Array.isArray(DEFAULTS[key]))
            query[key] = [options[key]].flat().filter(value => isGood(value) && value !== "");
        else if (isGood(options[key]))
            query[key] = options[key];
    }
    if (!(query.range in SECONDS) && query.range !== "all")
        query.range = DEFAULTS.range;
    for (const key of ["since", "until"])
        query[key] = isTime(query[key]) ? query[key] : "";
    if (!isSeverity(query.prio))
        query.prio = "";
    if (!/^[\w.@-]*$/.test(query.log) || query.log.startsWith("-"))
        query.log = "";
    return query;
}

// Into the address: only what differs from the start.
export const write = query => Object.fromEntries(Object.entries(query).filter(([key, value]) => key in DEFAULTS && String(value) !== String(DEFAULTS[key])));
export const hasFilter = query => ["q", "host", "prog", "prio", "fac", "hostIs", "progIs", "hostNot", "progNot"].some(key => String(query[key]).trim() !== "");
export const withoutFilters = query => ({ ...DEFAULTS, log: query.log });

// Begin and end in seconds; the begin is null for all time.
export function period(query, now) {
    if (query.since || query.until)
        return { since: query.since ? Number(query.since) : null, until: query.until ? Number(query.until) : now };
    return { since: query.range === "all" ? null : now - SECONDS[query.range], until: now };
}

export function filterOptions(query) {
    const options = [];
    if (query.q.trim() !== "")
        options.push("--grep=" + query.q);
    for (const [key, option] of [["host", "--host="], ["prog", "--program="], ["hostIs", "--host-is="], ["progIs", "--program-is="],
                                 ["prio", "--priority="], ["fac", "--facility="], ["log", "--log="]]) {
        if (query[key].trim() !== "")
            options.push(option + query[key]);
    }
    for (const [key, option] of [["hostNot", "--host-is-not="], ["progNot", "--program-is-not="]])
        options.push(...query[key].map(value => option + value));
    return options;
}

export function timeOptions(query, now) {
    const { since, until } = period(query, now);
    return [...since === null ? [] : ["--since=@" + since], ...query.until ? ["--until=@" + until] : []];
}
export const options = (query, now) => [...filterOptions(query), ...timeOptions(query, now)];

// The query with one value to have, or with one more to leave out.
export function only(query, key, value) {
    return key === "prio" ? { ...query, prio: `${value}..${value}` } : key === "fac" ? { ...query, fac: value } : { ...query, [key]: "", [key + "Is"]: value };
}
export function without(query, key, value) {
    return key === "prio" || key === "fac" ? { ...query, [key]: "!" + value }
        : { ...query, [key + "Not"]: [...query[key + "Not"].filter(other => other !== value), value] };
}

// The words of a keyword that can be marked in a message: no exclusions, no regexes, no wildcards.
export function words(keyword) {
    const found = [];
    for (const [, minus, phrase, word] of keyword.matchAll(/(-?)(?:"((?:\\.|[^"])*)"?|(\S+))/g)) {
        const text = phrase ?? word;
        if (!minus && text && text !== "OR" && !/^\/.*\/$/.test(text) && !/[*?]/.test(text))
            found.push(text);
    }
    return found;
}
