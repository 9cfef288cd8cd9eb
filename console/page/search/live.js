// New logs as they arrive. One process of the program follows; it ends with the live view, the page or the connection.
import { follow } from "../base/program.js";
import * as query from "./query.js";

const OVERLAP = 200; // logs that may have come since the table was filled
const MOST_WAITING = 5000;

export class Live {
    // `arrived` gets new logs, oldest first; `waits` is told how many wait during a pause; `failed` gets an error.
    constructor({ arrived, waits, failed }) {
        Object.assign(this, { arrived, waits, failed });
        this.waiting = [];
        this.dropped = 0;
    }

    get isOn() { return Boolean(this.cancel); }

    start(current, newestId) {
        this.stop();
        this.newest = newestId;
        const cancel = this.cancel = new AbortController();
        follow(["search", ...query.filterOptions(current), `--lines=${OVERLAP}`, "--max-message=1000"], logs => this.take(logs), cancel.signal)
            .then(() => this.isOn && this.cancel === cancel && this.failed(new Error("")), error => {
                if (!error.isCancelled && this.cancel === cancel)
                    this.failed(error);
            });
    }

    stop() {
        this.cancel?.abort();
        this.cancel = null;
        this.waiting = [];
        this.dropped = 0;
        this.isPaused = false;
    }

    // Each log once, whatever the follower began with. `isHeld` says whether the reader must not be disturbed.
    take(logs) {
        const fresh = logs.filter(log => log.id > this.newest);
        if (fresh.length === 0)
            return;
        this.newest = fresh[fresh.length - 1].id;
        this.waiting.push(...fresh);
        const surplus = this.waiting.length - MOST_WAITING;
        if (surplus > 0) {
            this.waiting.splice(0, surplus);
            this.dropped += surplus;
        }
        if (this.isPaused || this.isHeld?.())
            this.waits(this.waiting.length + this.dropped);
        else if (!this.frame)
            this.frame = requestAnimationFrame(() => { this.frame = 0; this.release(); });
    }

    release() {
        this.dropped = 0;
        const logs = this.waiting.splice(0);
        if (logs.length)
            this.arrived(logs);
    }
}
