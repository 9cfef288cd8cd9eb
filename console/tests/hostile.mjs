// Texts and addresses of people who mean harm: nothing of them acts, and what could mislead is visible.
import { expect, until, visit, loaded, store } from "./support.mjs";

const script = "<script>top.document.title='pwned';document.title='pwned'</script>";
const image = "\"><img src=x onerror=\"document.title='pwned'\">";
const TEXTS = [
    [script, script],
    [image, image],
    ["<a href=\"javascript:alert(1)\">click</a>", "<a href=\"javascript:alert(1)\">click</a>"],
    ["\u001b[31mred\u001b[0m bell\u0007", "␛[31mred␛[0m bellU+0007"],
    ["user \u202eexe.txt\u2069 zero\u200bwidth", "user U+202Eexe.txtU+2069 zeroU+200Bwidth"],
    [Buffer.concat([Buffer.from("bytes "), Buffer.from([0xff, 0xfe, 0xc3, 0x28]), Buffer.from(" end")]), /^bytes .+ end$/],
    ["Grüße 日本語 🗄️", /^Grüße 日本語 🗄/],
    ["y".repeat(65536), /^y{400}( …)?$/],
];
const NAMES = [["<b>host</b>", "<i>prog</i>"], ["!a,b*", "x?,y"], ["--help", "-rf"]];
const ADDRESSES = [
    "#/logs?db=/etc/passwd&table=x&root=/", "#/logs?q=" + encodeURIComponent(script), "#/logs?host=" + encodeURIComponent("--db=/etc/passwd"),
    "#/logs?prio=" + encodeURIComponent("err; touch /tmp/x") + "&range=constructor&since=now&until=" + "9".repeat(40), "#/logs?log=" + encodeURIComponent("../../../etc/passwd"),
    "#/logs?log=--version", "#/__proto__", "#/constructor?toString=1", "#/" + encodeURIComponent(image), "#/logs?q=%00a", "#/logs?q=a&q=b&host=c&host=d",
];

export const hostileTests = world => ({
    "hostile logs": () => visit(world, async ({ page, frame, inner }) => {
        await loaded(frame);
        const f = await inner();
        const before = await f.evaluate(() => document.querySelectorAll("script, img, a").length);
        store(world, [...TEXTS.map(([text]) => ["err", "hostile", "text", text]), ...NAMES.map(([host, name]) => ["warning", host, name, "named"])]);
        await f.evaluate(() => window.cockpit.location.go(["logs"], { host: "hostile" }));
        await until("the logs", async () => { await loaded(frame); return await frame.locator("tr.log").count() === TEXTS.length; });
        const shown = (await frame.locator("td.c-msg").allTextContents()).reverse();
        TEXTS.forEach(([, wanted], i) => expect(`text ${i}`, wanted instanceof RegExp ? wanted.test(shown[i]) : shown[i] === wanted, true));
        // Opened and in their context, too.
        for (let i = 0; i < TEXTS.length; i++) {
            await frame.locator("tr.log").nth(i).click();
            await frame.getByRole("button", { name: "Show what came before and after" }).last().click();
        }
        await until("the contexts", async () => await frame.locator(".lines .this").count() === TEXTS.length);
        expect("elements that texts could have made", await f.evaluate(() => document.querySelectorAll("script, img, a").length), before);
        // Values that the program's filters would read otherwise.
        for (const [host, name] of NAMES) {
            await f.evaluate(() => window.cockpit.location.go(["logs"], { q: "named" }));
            await until("the named ones", async () => { await loaded(frame); return await frame.locator("tr.log").count() === NAMES.length; });
            await frame.locator("tr.log", { has: frame.locator("td.c-host", { hasText: host }) }).click();
            await frame.getByRole("button", { name: `Only Host ${host}`, exact: true }).click();
            await until(`only ${host}`, async () => { await loaded(frame); return await frame.locator("tr.log").count() === 1; });
            await frame.locator("tr.log").click();
            await frame.getByRole("button", { name: `Without Program ${name}`, exact: true }).click();
            await frame.getByText("No logs match").waitFor();
        }
        expect("titles", [await page.title(), await f.title()].includes("pwned"), false);
    }),

    "hostile addresses": () => visit(world, async ({ page, frame, inner }) => {
        await loaded(frame);
        const f = await inner();
        await f.evaluate(() => {
            window.started = [];
            const spawn = window.cockpit.spawn;
            window.cockpit.spawn = (args, options) => { window.started.push(args); return spawn(args, options); };
        });
        for (const address of ADDRESSES) {
            await page.evaluate(hash => { location.hash = hash; }, address);
            await loaded(frame);
        }
        const started = await f.evaluate(() => window.started);
        expect("only reading", started.filter(args => args[0] !== "kelosyslog" || args[1] !== "--errors=json" || !["search", "count", "status", "stats", "values"].includes(args[2])), []);
        expect("no database, root or file", started.flat().filter(arg => /^--(db|root|table|to|log|follow)/.test(arg)), []);
        expect("each argument is an option with its value", started.flatMap(args => args.slice(args[2] === "stats" || args[2] === "values" ? 4 : 3)).filter(arg => !/^--[a-z-]+(=|$)/s.test(arg)), []);
        expect("title", await page.title() === "pwned", false);
    }),
});
