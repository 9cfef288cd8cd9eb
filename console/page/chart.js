// Logs over time as stacked bars: errors and worse, warnings, the rest. Dragging over it asks for that time.
import uPlot from "./vendor/uplot.js";
import { _ } from "./base/texts.js";
import { moment, number } from "./base/format.js";

const HEIGHT = 150;
const CLASSES = ["other", "warning", "error"]; // from the bottom
const className = kind => ({ error: _("Errors and worse"), warning: _("Warnings"), other: _("Other") })[kind];
// Steps of the axis of counts, which are whole numbers.
const WHOLE = Array.from({ length: 13 }, (_step, power) => [1, 2, 5].map(step => step * 10 ** power)).flat();
const short = value => value >= 1e6 ? `${value / 1e6}M` : value >= 1e3 ? `${value / 1e3}k` : value;

// A bucket is { time, count, error, warning }, sorted by time. Where the severities are unknown, error and warning are missing.
export class Chart {
    constructor(box, onZoom) {
        this.box = box;
        this.onZoom = onZoom;
        // In the next frame: an error of the observer itself would make Cockpit report a failure of the page.
        this.observer = new ResizeObserver(() => requestAnimationFrame(() => box.clientWidth && this.plot?.setSize({ width: box.clientWidth, height: HEIGHT })));
        this.observer.observe(box);
        this.redraw = () => this.last && this.show(...this.last);
        window.addEventListener("theme", this.redraw);
    }

    end() {
        this.clear();
        this.observer.disconnect();
        window.removeEventListener("theme", this.redraw);
    }

    clear() {
        this.plot?.destroy();
        this.plot = null;
        this.last = null;
    }

    show(buckets, span, since, until) {
        this.clear();
        this.last = [buckets, span, since, until];
        const value = { error: bucket => bucket.error ?? 0, warning: bucket => bucket.warning ?? 0,
                        other: bucket => bucket.count - (bucket.error ?? 0) - (bucket.warning ?? 0) };
        const style = getComputedStyle(document.documentElement);
        const ink = style.getPropertyValue("--ink-faint");
        const colours = Object.fromEntries(CLASSES.map(kind => [kind, style.getPropertyValue("--bar-" + kind)]));
        const kinds = buckets.some(bucket => bucket.error !== undefined) ? CLASSES : ["other"];
        const nameOf = kind => kinds.length === 1 ? _("Logs") : className(kind);
        // The highest stack is drawn first, the lower ones over it.
        const stacks = kinds.map((_kind, top) => buckets.map(bucket => kinds.slice(0, top + 1).reduce((sum, kind) => sum + value[kind](bucket), 0))).reverse();
        const order = [...kinds].reverse();
        this.plot = new uPlot({
            width: this.box.clientWidth || 600, height: HEIGHT, padding: [8, 4, 0, 0],
            cursor: { y: false, drag: { setScale: false }, points: { show: false } },
            scales: { x: { time: true, range: (_u, min, max) => [Math.min(since ?? min, min), Math.max(until, max + span)] },
                      y: { range: (_u, _min, max) => [0, Math.max(max * 1.08, 1)] } },
            axes: [{ stroke: ink, grid: { show: false }, ticks: { show: false }, size: 30, values: (_u, times, _a, _b, step) => times.map(time => this.axisTime(time, step)) },
                   { stroke: ink, grid: { stroke: style.getPropertyValue("--line"), width: 1 }, ticks: { show: false }, size: 52, incrs: WHOLE, values: (_u, values) => values.map(short) }],
            series: [{ label: _("Time"), value: (_u, time) => time === null ? "–" : moment(time) },
                     ...order.map(kind => ({ label: nameOf(kind), fill: colours[kind], stroke: colours[kind], width: 0, points: { show: false },
                                             paths: uPlot.paths.bars({ size: [0.85, 28], align: 1 }),
                                             value: (_u, _v, _s, at) => at === null ? "–" : number(value[kind](buckets[at])) }))],
            hooks: { setSelect: [plot => this.selected(plot)] },
        }, [buckets.map(bucket => bucket.time), ...stacks], this.box);
    }

    axisTime(time, step) {
        const text = moment(time);
        return step >= 86400 ? text.slice(5, 10) : step >= 60 ? text.slice(11, 16) : text.slice(11);
    }

    selected(plot) {
        const { left, width } = plot.select;
        if (width > 4)
            this.onZoom(Math.floor(plot.posToVal(left, "x")), Math.ceil(plot.posToVal(left + width, "x")));
    }
}
