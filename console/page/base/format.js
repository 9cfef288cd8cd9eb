// Numbers, sizes and times as people read them. Times are seconds since 1970.
import { _, fill, language, plural } from "./texts.js";
import { setting } from "./settings.js";

export const number = value => Number(value).toLocaleString(language());

export function bytes(value) {
    const units = ["B", "KiB", "MiB", "GiB", "TiB"];
    let unit = 0;
    for (; value >= 1024 && unit < units.length - 1; ++unit)
        value /= 1024;
    return `${value.toLocaleString(language(), { maximumFractionDigits: unit && value < 100 ? 1 : 0 })} ${units[unit]}`;
}

// The seconds of an ISO time, as the program writes it.
export const instant = text => Date.parse(text) / 1000;

// "2026-01-31 12:30:59", in local time or UTC as the person has chosen. The same in every language, so that it can be pasted.
export function moment(seconds) {
    const shifted = new Date((seconds - (setting("utc") ? 0 : new Date(seconds * 1000).getTimezoneOffset() * 60)) * 1000);
    return Number.isNaN(shifted.getTime()) ? "–" : shifted.toISOString().slice(0, 19).replace("T", " ");
}
export const zone = () => setting("utc") ? "UTC" : Intl.DateTimeFormat().resolvedOptions().timeZone || _("local time");
export const clock = seconds => moment(seconds).slice(11);
export const today = () => moment(Date.now() / 1000).slice(0, 10);
// The time alone for today, else with the day; the year only when it is another one.
export function shortMoment(seconds) {
    const text = moment(seconds), now = today();
    return text.slice(0, 10) === now ? text.slice(11) : text.slice(0, 4) === now.slice(0, 4) ? text.slice(5) : text;
}

export function age(seconds) {
    const steps = [[86400, "$0 day", "$0 days"], [3600, "$0 hour", "$0 hours"], [60, "$0 minute", "$0 minutes"]];
    const past = Math.max(0, Math.round(Date.now() / 1000 - seconds));
    for (const [length, one, many] of steps) {
        if (past >= length)
            return fill(_("$0 ago"), plural(one, many, Math.floor(past / length)));
    }
    return _("just now");
}

// A change in percent with its sign; "new" where nothing was before.
export function change(before, now) {
    if (before === 0)
        return now === 0 ? "±0 %" : _("new");
    const percent = Math.round((now - before) / before * 100);
    return `${percent > 0 ? "+" : percent < 0 ? "−" : "±"}${number(Math.abs(percent))} %`;
}

// A text of the machine's clock for fields of the type datetime-local, and back.
export const toField = seconds => moment(seconds).replace(" ", "T");
export function fromField(text) {
    const value = Date.parse(setting("utc") ? text + "Z" : text);
    return Number.isNaN(value) ? null : Math.floor(value / 1000);
}
