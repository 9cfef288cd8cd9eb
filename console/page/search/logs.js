// The page of logs: puts the search field, the histogram, the table and the live view together.
import { _, fill, plural } from "../base/texts.js";
import { el, button } from "../base/dom.js";
import { alert, empty } from "../base/parts.js";
import { records } from "../base/program.js";
import { onChoice } from "../base/settings.js";
import * as query from "./query.js";
import { Toolbar } from "./toolbar.js";
import { Histogram } from "./histogram.js";
import { LogTable } from "./table.js";
import { Live } from "./live.js";
import { columnMenu } from "./columns.js";
import { savedMenu } from "./saved.js";
import { exportMenu } from "./export.js";

const cockpit = window.cockpit;
const FIRST = 100;        // logs of the first page: what a screen shows, soon
const PAGE = 200;         // logs of the next ones
const MOST = 5000;        // rows that a browser scrolls well
const MOST_LIVE = 1000;

export class LogsPage {
    constructor() {
        this.live = new Live({ arrived: logs => this.arrived(logs), waits: count => this.showNews(count), failed: error => this.liveFailed(error) });
        this.live.isHeld = () => document.scrollingElement.scrollTop > 300 || Boolean(this.table.body.querySelector("tr.opened"));
        this.liveButton = button(_("Live"), "secondary", () => this.toggleLive(), { id: "live", "aria-pressed": "false", title: _("Show new logs as they arrive (l)") });
        this.pauseButton = button(_("Pause"), "secondary", () => this.togglePause(), { id: "pause", hidden: true, title: _("Let new logs wait (p)") });
        this.toolbar = new Toolbar(next => this.go(next), [
            savedMenu(() => this.query, next => this.go(next)), columnMenu(),
            exportMenu(() => query.options(this.query, this.now), error => this.tell(error)), this.pauseButton, this.liveButton]);
        this.histogram = new Histogram((since, until) => this.go({ ...this.query, since: String(since), until: String(until) }), () => this.stop());
        this.table = new LogTable(this, () => this.older());
        this.table.news.addEventListener("click", () => this.showWaiting());
        this.problem = el("div", { id: "problem" });
        this.element = el("div", {}, this.toolbar.element, this.problem, this.histogram.element, this.table.element);
        onChoice(name => ["columns", "utc"].includes(name) && this.element.isConnected && this.table.redraw());
        onChoice(name => name === "utc" && this.element.isConnected && this.show(this.query));
    }

    // Another search: through the address, so that the browser's way back works.
    go(next) {
        const options = query.write(next);
        const isSame = JSON.stringify(options) === JSON.stringify(query.write(this.query));
        if (isSame)
            this.show(next);
        else
            cockpit.location.go(["logs"], options);
    }

    show(next) {
        this.stopLive();
        this.query = next;
        this.toolbar.show(next);
        this.load();
    }

    hide() {
        this.cancel?.abort();
        this.stopLive();
    }

    // Ends what runs; what is shown stays.
    stop() {
        this.cancel?.abort();
        this.histogram.stop.hidden = true;
        this.histogram.count.textContent = _("Stopped");
        this.table.setBusy(false);
    }

    async load() {
        this.cancel?.abort();
        const cancel = this.cancel = new AbortController();
        this.now = Math.floor(Date.now() / 1000);
        this.canGoOn = false;
        this.problem.replaceChildren();
        this.table.setBusy(true);
        this.histogram.stop.hidden = false;
        const isCurrent = () => this.cancel === cancel && !cancel.signal.aborted;
        const page = this.fetch(FIRST, null, cancel.signal).then(logs => {
            this.table.fill(logs);
            this.table.setBusy(false);
            this.afterPage(logs.length < FIRST);
        });
        const counts = this.histogram.load(this.query, this.now, cancel.signal);
        const results = await Promise.allSettled([page, counts]);
        if (!isCurrent())
            return;
        this.histogram.stop.hidden = true;
        const failure = results.find(result => result.status === "rejected")?.reason;
        if (failure) {
            if (results[0].status === "rejected")
                this.table.body.replaceChildren();
            this.table.setBusy(false);
            this.histogram.failed();
            this.tell(failure);
        }
    }

    // Logs, newest first: the newest ones, or the ones before an id.
    fetch(count, beforeId, signal) {
        return records(["search", "--reverse", "--lines=" + count, "--max-message=1000",
                        ...beforeId === null ? [] : ["--before-id=" + beforeId], ...query.options(this.query, this.now)], { signal });
    }

    async older() {
        const last = this.table.oldestId;
        if (!this.canGoOn || last === null)
            return;
        this.canGoOn = false;
        const signal = this.cancel.signal;
        try {
            const logs = await this.fetch(PAGE, last, signal);
            this.table.append(logs);
            this.afterPage(logs.length < PAGE);
        } catch (error) {
            if (!error.isCancelled)
                this.tell(error);
        }
    }

    afterPage(isEnd) {
        const shown = this.table.rows.length;
        const isFull = shown >= MOST;
        this.canGoOn = !isEnd && !isFull;
        this.table.more.hidden = !this.canGoOn;
        this.table.note.textContent = shown === 0 ? "" : isFull ? fill(_("$0 are shown. Narrow the search to see older ones."), plural("$0 log", "$0 logs", shown))
            : isEnd ? _("These are all logs that match.") : "";
        if (shown === 0)
            this.table.showNothing(query.hasFilter(this.query)
                ? empty(_("No logs match"), _("Widen the time or remove a filter."), button(_("Clear all filters"), "link", () => this.go(query.withoutFilters(this.query))),
                        this.query.range !== "all" && button(_("Search all time"), "link", () => this.go({ ...this.query, range: "all", since: "", until: "" })))
                : empty(_("No logs in this time"), _("Devices send their logs to this server over UDP or TCP. “State” shows where it listens."),
                        button(_("Search all time"), "link", () => this.go({ ...this.query, range: "all", since: "", until: "" }))));
    }

    toggleLive() {
        if (this.live.isOn) {
            this.stopLive();
            return;
        }
        // A live view goes on from now: with an end in the past nothing would come.
        if (this.query.until)
            this.go({ ...this.query, since: "", until: "" });
        this.live.start(this.query, this.table.newestId);
        this.showLive();
    }

    togglePause() {
        this.live.isPaused = !this.live.isPaused;
        if (!this.live.isPaused)
            this.showWaiting();
        this.showLive();
    }

    stopLive() {
        this.live.stop();
        this.showLive();
    }

    showLive() {
        this.liveButton.setAttribute("aria-pressed", String(this.live.isOn));
        this.pauseButton.hidden = !this.live.isOn;
        this.pauseButton.firstChild.textContent = this.live.isPaused ? _("Go on") : _("Pause");
        this.table.news.hidden = true;
    }

    liveFailed(error) {
        this.stopLive();
        this.tell(error.message ? error : new Error(_("The live view ended. Switch it on again.")));
    }

    arrived(logs) {
        this.table.prepend(logs.slice(-MOST_LIVE).reverse(), MOST_LIVE);
        this.table.news.hidden = true;
    }

    showNews(count) {
        this.table.news.firstChild.textContent = plural("$0 new log", "$0 new logs", count);
        this.table.news.hidden = false;
    }

    showWaiting() {
        this.live.release();
        document.scrollingElement.scrollTo({ top: 0 });
    }

    tell(error) {
        if (!error.isCancelled && error.name !== "AbortError")
            this.problem.replaceChildren(alert("danger", error.message));
    }
}
