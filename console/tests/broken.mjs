// What goes wrong around the page: each has a clear message, and the page goes on when it is over.
import { spawn } from "node:child_process";
import fs from "node:fs";
import { expect, until, visit, loaded, processes } from "./support.mjs";

const search = frame => frame.getByRole("button", { name: "Search", exact: true }).click();
const problem = (frame, text) => frame.locator("#problem", { hasText: text }).waitFor({ state: "attached", timeout: 20000 });

// Holds the database as a program does that excludes all others.
async function lock(world) {
    const shell = spawn("sqlite3", ["-batch", world.database], { stdio: ["pipe", "pipe", "ignore"] });
    shell.stdin.write(".timeout 5000\nPRAGMA locking_mode=EXCLUSIVE; BEGIN EXCLUSIVE; SELECT 'locked';\n");
    await new Promise(done => shell.stdout.on("data", data => data.includes("locked") && done()));
    return () => new Promise(done => { shell.on("exit", done); shell.stdin.end(); });
}

export const brokenTests = world => ({
    "a database that is locked, damaged, missing; no program": () => visit(world, async ({ frame }) => {
        await loaded(frame);
        const unlock = await lock(world);
        await search(frame);
        await frame.locator("#stop").click();
        await until("the stopped search has ended", () => processes(world).length === 0, 5);
        await search(frame);
        await problem(frame, "it is locked by another program");
        await unlock();
        const move = (from, to) => fs.readdirSync(world.root + "/var/log/kelosyslog").filter(name => name.startsWith(from)).forEach(name =>
            fs.renameSync(`${world.root}/var/log/kelosyslog/${name}`, `${world.root}/var/log/kelosyslog/${name.replace(from, to)}`));
        move("logs.db", "kept.db");
        await search(frame);
        await problem(frame, "no such file");
        fs.writeFileSync(world.database, "SQLite format 3\0" + "\xff".repeat(9000), "latin1");
        await search(frame);
        await problem(frame, "the file is cut short");
        fs.rmSync(world.database);
        move("kept.db", "logs.db");
        fs.renameSync(world.home + "/bin/kelosyslog", world.home + "/bin/away");
        await search(frame);
        await problem(frame, "not installed");
        fs.renameSync(world.home + "/bin/away", world.home + "/bin/kelosyslog");
        await search(frame);
        await frame.locator("#problem:empty").waitFor({ state: "attached" });
        await loaded(frame);
        expect("logs again", await frame.locator("tr.log").count() >= 100, true);
    }),

    "a closed tab and a cut connection leave no process": async () => {
        const follows = () => processes(world).some(line => line.includes("--follow"));
        await visit(world, async ({ page, frame }) => {
            await loaded(frame);
            await frame.locator("#live").click();
            await until("a follower", follows);
            await page.close();
            await until("the follower has ended", () => !follows());
        }, { isAlone: true });
        await visit(world, async ({ page, frame, server }) => {
            await loaded(frame);
            await frame.locator("#live").click();
            await until("a follower", follows);
            server.end();
            await page.getByRole("button", { name: "Reconnect" }).waitFor();
            await until("the follower has ended", () => !follows());
        }, { isAlone: true });
    },
});
