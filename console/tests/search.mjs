// The page of logs: searching, filtering, paging, the live view.
import { expect, until, visit, loaded, store, processes } from "./support.mjs";

const texts = locator => locator.allTextContents();
const hashOf = page => decodeURIComponent(new URL(page.url()).hash);
const ids = inner => inner.evaluate(() => [...document.querySelectorAll("tr.log")].map(row => row.log.id));

export const searchTests = world => ({
    "search, filter, exclude, link": () => visit(world, async ({ page, frame, inner }) => {
        await loaded(frame);
        await frame.locator("main").press("/");
        await page.keyboard.type('"disk full" alice');
        await page.keyboard.press("Enter");
        await until("only hits", async () => { await loaded(frame); return (await texts(frame.locator("td.c-msg"))).every(text => /disk full/.test(text) && /alice/.test(text)); });
        expect("marked", await frame.locator("mark").first().textContent(), "alice");
        expect("rows and count", await frame.locator("tr.log").count(), parseInt(await frame.locator("#count strong").textContent()));
        const host = await frame.locator("td.c-host").first().textContent();
        await frame.locator("tr.log").first().click();
        await frame.getByRole("button", { name: `Without Host ${host}` }).click();
        await until("the host is left out", async () => { await loaded(frame); return !(await texts(frame.locator("td.c-host"))).includes(host); });
        expect("the address holds the search", hashOf(page), `#/logs?q="disk full" alice&hostNot=${host}`);
        await page.goBack();
        await until("the way back", async () => { await loaded(frame); return (await texts(frame.locator("td.c-host"))).includes(host); });
        await frame.locator("tr.log").first().click();
        await frame.getByRole("button", { name: `Only Host ${host}` }).click();
        await until("only the host", async () => { await loaded(frame); return (await texts(frame.locator("td.c-host"))).every(text => text === host); });
        await frame.getByRole("button", { name: "Clear all filters" }).first().click();
        await until("no filter", async () => { await loaded(frame); return await frame.locator("tr.log").count() >= 100; });
        await frame.getByRole("combobox", { name: "Severity" }).selectOption("err");
        await until("errors only", async () => { await loaded(frame); return (await texts(frame.locator("td.c-prio"))).every(text => ["Error", "Critical"].includes(text)); });
        await (await inner()).evaluate(() => window.cockpit.location.go(["logs"], { q: "/fail(ed/" }));
        await frame.getByText("missing )").waitFor();
    }),

    "pages without a gap or a double row, while logs arrive": () => visit(world, async ({ frame, inner }) => {
        await loaded(frame);
        const f = await inner();
        for (let round = 0; round < 4; round++) {
            const had = (await ids(f)).length;
            store(world, Array.from({ length: 20 }, (_, i) => ["info", "web1", "noise", `arrival ${round} ${i}`]));
            await f.evaluate(() => document.scrollingElement.scrollTo(0, document.scrollingElement.scrollHeight));
            await until("the next page", async () => (await ids(f)).length > had);
        }
        const shown = await ids(f);
        expect("rows", shown.length >= 900, true);
        // Ids in this log are without gaps and in the order of the arrivals, which is that of time.
        expect("consecutive", shown.every((id, i) => i === 0 || id === shown[i - 1] - 1), true);
    }),

    "an opened log: fields, whole message, context": () => visit(world, async ({ frame, inner }) => {
        await loaded(frame);
        store(world, [["err", "db1", "long", "begin " + "x".repeat(65000) + " the end"], ["info", "db1", "after", "what came next"]]);
        await frame.getByRole("button", { name: "Search", exact: true }).click();
        const row = frame.locator("tr.log", { hasText: "begin xxx" });
        await row.focus();
        await row.press("Enter");
        await frame.getByRole("button", { name: /Show all 63/ }).click();
        await until("the whole message", async () => (await frame.locator("pre.whole").textContent()).endsWith("the end"));
        await frame.getByRole("button", { name: "Show what came before and after" }).click();
        await frame.locator(".lines .this").waitFor();
        const lines = await texts(frame.locator(".lines li"));
        expect("logs around", [lines.length, lines.at(-1).includes("what came next")], [10, true]);
        await row.press("j");
        expect("the next row has the focus", await (await inner()).evaluate(() => document.activeElement.previousElementSibling?.className), "opened");
    }),

    "drag to zoom, columns, times, saved searches": () => visit(world, async ({ page, frame }) => {
        await loaded(frame);
        const box = await frame.locator(".u-over").boundingBox();
        await page.mouse.move(box.x + box.width * .5, box.y + 40);
        await page.mouse.down();
        await page.mouse.move(box.x + box.width * .6, box.y + 40, { steps: 4 });
        await page.mouse.up();
        await until("the time is narrower", () => /since=\d+&until=\d+/.test(hashOf(page)));
        await loaded(frame);
        const before = await frame.locator("time").first().getAttribute("title");
        await frame.getByText("Columns", { exact: true }).click();
        await frame.getByLabel("Facility").check();
        await frame.getByLabel("Program", { exact: true }).last().uncheck();
        expect("columns", await texts(frame.locator("table.logs th")), ["Time", "Severity", "Facility", "Host", "Message"]);
        await page.keyboard.press("Escape");
        await frame.getByText("Saved", { exact: true }).click();
        await frame.getByRole("button", { name: "Save this search" }).click();
        await frame.getByLabel("Name").fill("noon");
        await frame.getByRole("button", { name: "Save", exact: true }).click();
        const saved = hashOf(page);
        await frame.getByRole("button", { name: /Remove the filter 20/ }).click();
        await until("the time is wide", () => !/since/.test(hashOf(page)));
        await frame.getByText("Saved", { exact: true }).click();
        await frame.getByRole("button", { name: "noon", exact: true }).click();
        await until("the saved search", () => hashOf(page) === saved);
        await loaded(frame);
        await frame.getByLabel("Settings").click();
        await frame.getByLabel("Times in UTC").check();
        await loaded(frame);
        expect("an hour less in UTC", Date.parse(before) - Date.parse(await frame.locator("time").first().getAttribute("title")), 3600000);
    }, { timezoneId: "Africa/Lagos" }),

    "export": () => visit(world, async ({ page, frame }) => {
        await loaded(frame);
        await frame.getByText("Export", { exact: true }).click();
        const [download] = await Promise.all([page.waitForEvent("download"), frame.getByRole("button", { name: "JSON, one object a line" }).click()]);
        const stream = await download.createReadStream();
        let lines = 0;
        for await (const piece of stream)
            lines += piece.toString("latin1").split("\n").length - 1;
        expect("exported", lines, Number((await frame.locator("#count strong").textContent()).replace(/\D/g, "")));
    }),

    "live view: arrival, held, pause, off": () => visit(world, async ({ frame, inner }) => {
        await loaded(frame);
        await frame.locator("main").press("l");
        await until("one follower", () => processes(world).filter(line => line.includes("--follow")).length === 1);
        const begin = performance.now();
        store(world, [["crit", "nas", "live", "first of all"]]);
        await frame.locator("tr.new", { hasText: "first of all" }).waitFor();
        const took = performance.now() - begin;
        await frame.locator("tr.log").first().click();
        store(world, [["info", "nas", "live", "held one"]]);
        await frame.getByRole("button", { name: "1 new log" }).waitFor();
        await frame.locator("#news").click();
        await frame.locator("tr.new", { hasText: "held one" }).waitFor();
        await frame.locator("tr.log.open").click();
        await frame.getByRole("button", { name: "Pause" }).click();
        store(world, [["info", "nas", "live", "paused one"], ["info", "nas", "live", "paused two"]]);
        await frame.getByRole("button", { name: "2 new logs" }).waitFor();
        await frame.getByRole("button", { name: "Go on" }).click();
        await frame.locator("tr.new", { hasText: "paused two" }).waitFor();
        const shown = await ids(await inner());
        expect("each log once", new Set(shown).size, shown.length);
        await frame.locator("#live").click();
        await until("no follower", () => processes(world).length === 0);
        return `first live row ${took.toFixed(0)} ms after its storing began`;
    }),
});
