// Builds elements. Texts become text nodes, never markup: a log cannot add elements to the page.

export function el(name, attributes = {}, ...children) {
    const element = document.createElement(name);
    for (const [key, value] of Object.entries(attributes)) {
        if (key.startsWith("on"))
            element.addEventListener(key.slice(2), value);
        else if (value !== false && value !== null && value !== undefined)
            element.setAttribute(key, value === true ? "" : value);
    }
    element.append(...children.flat(4).filter(child => child !== null && child !== undefined && child !== false));
    return element;
}

// Control characters, characters that change the direction of writing or that nobody sees, and the mark of a broken byte.
const HIDDEN = /[\u0000-\u001f\u007f-\u009f\u00ad\u061c\u200b-\u200f\u2028-\u202e\u2060-\u2069\ufeff\ufff9-\ufffb]/g;
const SIGNS = { "\n": "↵", "\t": "⇥", "\r": "␍", "\u001b": "␛" };

// A text from outside as nodes: what could mislead a reader becomes visible.
export function visible(text) {
    const parts = [];
    let from = 0;
    for (const hit of text.matchAll(HIDDEN)) {
        const code = "U+" + hit[0].codePointAt(0).toString(16).toUpperCase().padStart(4, "0");
        parts.push(text.slice(from, hit.index), el("span", { class: "sign", title: code }, SIGNS[hit[0]] ?? code));
        from = hit.index + hit[0].length;
    }
    parts.push(text.slice(from));
    return parts.filter(part => part !== "");
}

// The same, with the words of a search marked.
export function marked(text, words) {
    if (words.length === 0)
        return visible(text);
    const pattern = new RegExp(words.map(word => word.replace(/[.*+?^${}()|[\]\\]/g, "\\$&")).join("|"), "gi");
    const parts = [];
    let from = 0;
    for (const hit of text.matchAll(pattern)) {
        parts.push(...visible(text.slice(from, hit.index)), el("mark", {}, visible(hit[0])));
        from = hit.index + hit[0].length;
    }
    return [...parts, ...visible(text.slice(from))];
}

export function button(text, kind, onclick, attributes = {}) {
    const { class: more = "", ...rest } = attributes;
    return el("button", { type: "button", class: `pf-v6-c-button pf-m-${kind} ${more}`.trim(), onclick, ...rest },
              el("span", { class: "pf-v6-c-button__text" }, text));
}

// A text field or a list to choose from, with a label that is only read aloud unless `isShown`.
export function field(label, control, isShown = false) {
    control.setAttribute("aria-label", label); // without the choices of a list
    return el("label", { class: "field" }, el("span", { class: isShown ? "field-name" : "for-readers" }, label),
              el("span", { class: "pf-v6-c-form-control" }, control));
}
export const choice = (options, attributes = {}) =>
    el("select", attributes, options.map(([value, text]) => el("option", { value }, text)));

let toastTimer;
export function toast(text) {
    const box = document.getElementById("toast");
    box.textContent = text;
    clearTimeout(toastTimer);
    toastTimer = setTimeout(() => { box.textContent = ""; }, 4000);
}

// Works without a secure connection, where browsers offer no clipboard.
export async function copy(text, done) {
    try {
        await navigator.clipboard.writeText(text);
    } catch {
        const area = el("textarea", { class: "for-readers", "aria-hidden": "true" });
        area.value = text;
        document.body.append(area);
        area.select();
        document.execCommand("copy");
        area.remove();
    }
    toast(done);
}
