// Runs the program kelosyslog on the machine that the page shows. The page knows no other way to the logs.
//
// Arguments are an array that no shell reads, and a value is joined to its option with "=": whatever it begins with, it stays a
// value. Reading and changing alike use the rights of the person, or root's where Cockpit's administrative access is on.
import { _ } from "./texts.js";

const cockpit = window.cockpit;
const NOTHING = 1; // exit status: nothing matched

export class ProgramError extends Error {
    // `problem` is Cockpit's word for what happened to the process: "not-found", "access-denied", "cancelled" ...
    constructor(message, status, problem) {
        super(message);
        this.status = status;
        this.problem = problem;
    }
    get isCancelled() { return this.problem === "cancelled"; }
}

// The error that ended the program. What no JSON is comes from another program, such as the shell of a login.
function lastError(message) {
    const lines = message.split("\n").filter(line => line !== "").map(line => {
        try {
            return JSON.parse(line);
        } catch {
            return { code: "", text: line };
        }
    });
    return lines.findLast(line => line.code !== "note") ?? { code: "", text: "" };
}

// What the program said, in words for the page.
function explain(error) {
    const { code, text } = lastError(error.message || "");
    if (error.problem === "not-found")
        return _("The program kelosyslog is not installed on this machine.");
    if (error.problem && error.problem !== "access-denied" && error.exit_status === null)
        return _("The connection to the machine was lost.");
    if (error.problem === "access-denied" || code === "permission" || /permission denied|operation not permitted/i.test(text))
        return `${text}\n${_("You need more rights: switch on administrative access in Cockpit. To read, the group adm is enough.")}`.trim();
    return text || error.problem || _("The program failed without a message.");
}

// Runs it to its end. Resolves with its output, also if nothing matched; rejects with a ProgramError. `onData` gets the output
// in pieces instead. When `signal` fires, the process is ended.
export function run(args, { onData, signal } = {}) {
    const process = cockpit.spawn(["kelosyslog", "--errors=json", ...args], { err: "message", superuser: "try" });
    if (onData)
        process.stream(onData);
    const cancel = () => process.close("cancelled");
    if (signal?.aborted)
        cancel();
    signal?.addEventListener("abort", cancel);
    return new Promise((resolve, reject) => {
        process.then(resolve, (error, output) => {
            if (error.exit_status === NOTHING)
                resolve(output ?? "");
            else
                reject(new ProgramError(explain(error), error.exit_status, error.problem));
        });
    }).finally(() => signal?.removeEventListener("abort", cancel));
}

const parseLines = text => text.split("\n").filter(line => line !== "").map(line => JSON.parse(line));

export const records = async (args, options) => parseLines(await run([...args, "--output=jsonl"], options));

// One JSON value; null if there was none.
export async function json(args, options) {
    const text = await run([...args, "--output=json"], options);
    return text.trim() === "" ? null : JSON.parse(text);
}

// Hands records over as they come, until `signal` fires or the program ends.
export function follow(args, take, signal) {
    let rest = "";
    return run([...args, "--follow", "--output=jsonl"], {
        signal,
        onData: data => {
            const lines = (rest + data).split("\n");
            rest = lines.pop();
            const found = lines.filter(line => line !== "").map(line => JSON.parse(line));
            if (found.length)
                take(found);
        },
    });
}
