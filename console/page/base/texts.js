// Texts in the language that Cockpit's menu has chosen: po.js has the translations, Cockpit looks them up.
const cockpit = window.cockpit;

export const _ = text => cockpit.gettext(text);
// One text for the number 1, one for all others; "$0" is the number, which is formatted.
export const plural = (one, many, count) =>
    cockpit.format(cockpit.ngettext(one, many, count), count.toLocaleString(language()));
export const fill = (text, ...values) => cockpit.format(text, ...values);
export const language = () => (cockpit.language || "en").replace("_", "-").slice(0, 2);

export const SEVERITIES = ["emerg", "alert", "crit", "err", "warning", "notice", "info", "debug"];
export const severityName = name => ({
    emerg: _("Emergency"), alert: _("Alert"), crit: _("Critical"), err: _("Error"),
    warning: _("Warning"), notice: _("Notice"), info: _("Info"), debug: _("Debug"),
})[name] ?? name;
// The three classes of severity that the page has colours for.
export const severityClass = name => {
    const at = SEVERITIES.indexOf(name);
    return at < 0 ? "other" : at <= 3 ? "error" : at === 4 ? "warning" : "other";
};
