// Light or dark, as Cockpit's menu says; it keeps the choice in the browser's storage.
function apply(style) {
    const wanted = style || localStorage.getItem("shell:style") || "auto";
    const isDark = wanted === "dark" || (wanted === "auto" && matchMedia("(prefers-color-scheme: dark)").matches);
    document.documentElement.classList.toggle("pf-v6-theme-dark", isDark);
    window.dispatchEvent(new CustomEvent("theme"));
}

window.addEventListener("storage", event => event.key === "shell:style" && apply());
window.addEventListener("cockpit-style", event => apply(event.detail?.style));
matchMedia("(prefers-color-scheme: dark)").addEventListener("change", () => apply());
apply();
