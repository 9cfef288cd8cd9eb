// What a person has chosen, kept in this browser: times, columns, saved searches.
const PREFIX = "kelosyslog:";
const DEFAULTS = { utc: false, columns: ["time", "prio", "host", "prog", "msg"], saved: [], wrap: true };
const listeners = new Set();

export function setting(name) {
    try {
        const text = localStorage.getItem(PREFIX + name);
        const value = text === null ? DEFAULTS[name] : JSON.parse(text);
        // Whatever else is in the storage, a list stays a list and a switch a switch.
        return Array.isArray(value) === Array.isArray(DEFAULTS[name]) && typeof value === typeof DEFAULTS[name]
            ? value : DEFAULTS[name];
    } catch {
        return DEFAULTS[name];
    }
}

export function choose(name, value) {
    localStorage.setItem(PREFIX + name, JSON.stringify(value));
    for (const listener of listeners)
        listener(name);
}

export function onChoice(listener) {
    listeners.add(listener);
}
