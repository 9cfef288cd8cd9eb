// How soon the page shows what a click asks for. Printed, not judged: the machine decides.
import { visit, loaded, until, store, processes, bash } from "./support.mjs";

const median = values => [...values].sort((a, b) => a - b)[Math.floor(values.length / 2)];

// From the request in the page to the frame after its rows, in milliseconds. `done` is asked in the page itself.
const measure = (inner, start, done) => inner.evaluate(async ([startText, doneText]) => {
    const isDone = new Function("return " + doneText)();
    const begin = performance.now();
    new Function("(" + startText + ")()")();
    while (!isDone())
        await new Promise(next => requestAnimationFrame(next));
    await new Promise(next => requestAnimationFrame(next));
    return performance.now() - begin;
}, [String(start), String(done)]);

const searchFor = options => `() => { document.querySelector("table.logs").setAttribute("aria-busy", "true"); window.cockpit.location.go(["logs"], ${JSON.stringify(options)}); }`;
const rowsShown = `() => !document.querySelector("table.logs[aria-busy]")`;
const counted = `() => !document.querySelector("table.logs[aria-busy]") && document.getElementById("stop").hidden`;

export async function timing(world, rows) {
    const results = [];
    const note = (what, times) => results.push([what, ...times.map(time => `${time.toFixed(0)} ms`)]);
    // The index for keywords is there, as on a server that has been searched before.
    bash('"$1" --root "$2" db index --build >/dev/null', world.program, world.root);
    await visit(world, async ({ frame, inner }) => {
        await loaded(frame);
        const f = await inner();
        const opening = [];
        for (let i = 0; i < 3; i++) {
            await f.evaluate(() => window.cockpit.location.go(["events"]));
            await frame.locator("main .card").first().waitFor();
            opening.push(await measure(f, `() => window.cockpit.location.go(["logs"])`, `() => document.querySelector("tr.log") && !document.querySelector("table.logs[aria-busy]")`));
        }
        note("the newest page", [median(opening)]);
        for (const [what, options] of [["a host", { host: "nas" }], ["errors", { prio: "err" }], ["a frequent word, a week", { q: "failed", range: "7d" }],
                                       ["a rare word, all time", { q: `plan-${Math.floor(rows / 200) * 100 + 90}`, range: "all" }], ["a word that never occurs, all time", { q: "neverthere", range: "all" }], ["all time, no filter", { range: "all" }]]) {
            const first = [], all = [];
            for (let i = 0; i < 3; i++) {
                await f.evaluate(() => window.cockpit.location.go(["logs"], { q: "x" + Math.random(), range: "15min" }));
                await new Promise(done => setTimeout(done, 200));
                await loaded(frame);
                const both = await Promise.all([measure(f, searchFor(options), rowsShown), measure(f, "() => {}", counted)]);
                first.push(both[0]);
                all.push(both[1]);
            }
            note(what, [median(first), median(all)]);
        }
        const pages = [];
        for (let i = 0; i < 5; i++)
            pages.push(await measure(f, `() => { window.had = document.querySelectorAll("tr.log").length; document.scrollingElement.scrollTo(0, 1e9); }`, `() => document.querySelectorAll("tr.log").length > window.had`));
        note("a further page", [median(pages)]);
        await f.evaluate(() => window.cockpit.location.go(["logs"], { range: "15min" }));
        await loaded(frame);
        await frame.locator("#live").click();
        await until("a follower", () => processes(world).some(line => line.includes("--follow")));
        const arrivals = [];
        for (let i = 0; i < 5; i++) {
            const begin = performance.now();
            store(world, [["info", "nas", "live", `arrival ${i}`]]);
            await frame.locator("tr.new", { hasText: `arrival ${i}` }).waitFor();
            arrivals.push(performance.now() - begin);
        }
        note("a live row, from the begin of its storing", [median(arrivals)]);
    });
    console.log(`${rows} logs; median; until the rows are shown, and until they are counted and drawn over time`);
    for (const [what, ...times] of results)
        console.log(`  ${what.padEnd(45)} ${times.join("   ")}`);
}
