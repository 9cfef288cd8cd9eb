// Every page: what it shows, changes on a click, accessibility in both styles and both widths, both languages, pictures.
import fs from "node:fs";
import { expect, until, visit, loaded, accessible, bash, sql, source } from "./support.mjs";

const NAMES = ["logs", "overview", "events", "rules", "notifications", "archives", "retention", "state"];

const quiet = inner => inner.evaluate(() => new Promise(done => requestAnimationFrame(() => requestAnimationFrame(done))));

export const pageTests = (world, shots) => ({
    "every page: accessible, light and dark, wide and narrow": () => visit(world, async ({ page, frame, inner, go }) => {
        await loaded(frame);
        const f = await inner();
        const style = async name => {
            await f.evaluate(wanted => window.dispatchEvent(new CustomEvent("cockpit-style", { detail: { style: wanted } })), name);
            await quiet(f);
        };
        for (const name of NAMES) {
            await go(name);
            await frame.locator(name === "logs" ? "tr.log" : "main .card").first().waitFor();
            if (name === "logs") {
                await loaded(frame);
                await frame.locator("tr.log").nth(2).click();
                await frame.getByRole("button", { name: "Show what came before and after" }).click();
                await frame.locator(".lines .this").waitFor();
            }
            if (name === "rules") {
                await frame.getByRole("button", { name: "Test all" }).click();
                await until("the results", async () => await frame.getByText(/^Would (not )?have fired/).count() === 4);
            }
            if (name === "overview")
                await frame.locator(".bars meter.error").first().waitFor();
            await accessible(name, f);
            if (shots && name !== "logs")
                await page.screenshot({ path: `${shots}/${name}.png` });
            await style("dark");
            await accessible(name + ", dark", f);
            await style("light");
            await page.setViewportSize({ width: 400, height: 800 });
            await quiet(f);
            expect(`${name} fits a narrow screen`, await f.evaluate(() => document.documentElement.scrollWidth <= innerWidth), true);
            await page.setViewportSize({ width: 1280, height: 800 });
        }
        if (shots) {
            await go("logs", { q: "fail", prio: "warning" });
            await until("the hits", async () => { await loaded(frame); return (await frame.locator("td.c-msg").first().textContent()).toLowerCase().includes("fail"); });
            await style("dark");
            await page.screenshot({ path: `${shots}/logs-dark.png` });
            await style("light");
            await go("logs");
            await until("all logs", async () => { await loaded(frame); return await frame.locator("tr.log").count() >= 100; });
            await page.screenshot({ path: `${shots}/logs.png` });
        }
    }),

    "rules: add, test, change, switch, remove": () => visit(world, async ({ frame }) => {
        const rules = () => bash('"$1" --root "$2" rules list -o json', world.program, world.root);
        const row = name => frame.locator("tr", { hasText: name });
        await frame.getByRole("button", { name: "Add a rule" }).click();
        await frame.getByLabel("Name").fill("a $(touch x) 'rule'");
        await frame.getByRole("combobox", { name: "Kind" }).selectOption("keyword");
        await frame.getByLabel("Text, as it is written").fill("pending) sectors");
        await frame.getByRole("button", { name: "Test with the last day" }).click();
        const wanted = Number(sql(world, "SELECT count(*) FROM logs WHERE msg LIKE '%pending) sectors%' AND utcsec >= unixepoch() - 86400"));
        await frame.getByText(`Would have fired ${wanted} times`).waitFor();
        await frame.getByRole("button", { name: "Add", exact: true }).click();
        await row("a $(touch x) 'rule'").getByText("pending) sectors").waitFor();
        await frame.getByRole("button", { name: "Change a $(touch x) 'rule'" }).click();
        await frame.getByRole("combobox", { name: "Kind" }).selectOption("eps");
        await frame.getByRole("spinbutton", { name: "Logs a second" }).fill("77");
        await frame.getByRole("button", { name: "Change", exact: true }).last().click();
        await row("77 logs a second").waitFor();
        await frame.getByRole("button", { name: "Switch off a $(touch x) 'rule'" }).click();
        await row("a $(touch x) 'rule'").getByText("off", { exact: true }).waitFor();
        expect("switched off in the file", /a \$\(touch x\) 'rule'.*"enabled":false/.test(rules()), true);
        await frame.getByRole("button", { name: "Add a rule" }).click();
        await frame.getByLabel("Name").fill("critical");
        await frame.getByRole("button", { name: "Add", exact: true }).click();
        await frame.locator("dialog").getByText("'critical' exists").waitFor();
        await frame.getByRole("button", { name: "Cancel" }).click();
        await frame.getByRole("button", { name: "Remove a $(touch x) 'rule'" }).click();
        await frame.getByRole("button", { name: "Remove", exact: true }).last().click();
        await until("the rule is gone", () => !rules().includes("touch"));
    }, { hash: "#/rules" }),

    "notifications, archives, retention: changes on a click": () => visit(world, async ({ frame, go }) => {
        await frame.getByRole("button", { name: "Send a test through Desktop" }).click();
        await frame.getByRole("cell", { name: /test/i }).first().waitFor();
        await go("archives");
        await frame.getByRole("button", { name: /Search in printer_/ }).click();
        await until("only the printer", async () => { await loaded(frame); return (await frame.locator("td.c-host").allTextContents()).every(text => text === "printer"); });
        await go("archives");
        await frame.getByRole("button", { name: "Archive now" }).click();
        await frame.getByText(/would archive \d+ logs/).waitFor();
        await frame.getByRole("button", { name: "Archive", exact: true }).click();
        await until("a second archive", async () => await frame.locator("tbody tr").count() === 2);
        await go("retention");
        await frame.getByText("Logs are kept without a limit").waitFor();
        fs.writeFileSync(world.root + "/etc/kelosyslog/retention.conf", 'keep="3650d"\n');
        await go("state");
        await go("retention");
        await frame.getByRole("button", { name: "Follow it now" }).click();
        await frame.locator("dialog").getByText(/rule:/).waitFor();
        await frame.getByRole("button", { name: "Cancel" }).click();
        fs.rmSync(world.root + "/etc/kelosyslog/retention.conf");
    }, { hash: "#/notifications" }),

    "German": async () => {
        // Each text of the page has a translation.
        const texts = new Set();
        for (const file of fs.readdirSync(source + "/console/page", { recursive: true }).filter(name => name.endsWith(".js") && !/vendor|po\./.test(name)))
            for (const [, , text, , one] of fs.readFileSync(`${source}/console/page/${file}`, "utf8").matchAll(/\b_\((["'])(.+?)\1\)|\bplural\((["'])(.+?)\3/g))
                texts.add(text ?? one);
        let translated;
        Function("cockpit", fs.readFileSync(source + "/console/page/po.de.js", "utf8"))({ locale: dictionary => { translated = dictionary; } });
        expect("texts without a translation", [...texts].filter(text => !translated[text]?.[1]), []);
        await visit(world, async ({ page, frame }) => {
            await frame.getByRole("link", { name: "Regeln" }).click();
            await frame.getByText("Benachrichtigungsregeln").waitFor();
            if (shots)
                await page.screenshot({ path: `${shots}/rules-de.png` });
        }, { locale: "de-DE" });
    },
});
