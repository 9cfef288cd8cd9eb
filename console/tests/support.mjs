// What the tests of the page share: a demonstration log below a folder, Cockpit on loopback, a browser, checks.
import { chromium } from "playwright-core";
import { spawn, execFileSync } from "node:child_process";
import { createRequire } from "node:module";
import fs from "node:fs";
import net from "node:net";
import os from "node:os";
import path from "node:path";

export const source = process.env.KELO_SOURCE_DIR;
const program = path.join(process.env.KELO_BIN_DIR, "kelosyslog");
const libraries = ["messages", "demo-log", "cockpit"].map(name => `. ${source}/scripts/lib/${name}.sh`).join("\n");
const axe = fs.readFileSync(createRequire(import.meta.url).resolve("axe-core/axe.min.js"), "utf8");
const folders = [];
const servers = new Set();
let browser;

export const bash = (script, ...values) => execFileSync("bash", ["-euc", libraries + "\n" + script, "bash", ...values], { encoding: "utf8" });
export const sql = (world, statement) => execFileSync("sqlite3", ["-batch", "-cmd", ".timeout 5000", world.database, statement], { encoding: "utf8" });

export async function until(what, condition, seconds = 15) {
    const end = Date.now() + seconds * 1000;
    while (!await condition()) {
        if (Date.now() > end)
            throw new Error(`not within ${seconds} s: ${what}`);
        await new Promise(done => setTimeout(done, 25));
    }
}
export function expect(what, found, wanted) {
    if (JSON.stringify(found) !== JSON.stringify(wanted))
        throw new Error(`${what}: found ${JSON.stringify(found)}, expected ${JSON.stringify(wanted)}`);
}

// A log server of `count` logs below a folder of its own, and a home whose Cockpit shows it.
export function makeWorld(count) {
    const root = fs.mkdtempSync(path.join(os.tmpdir(), "kelosyslog-console."));
    folders.push(root);
    const world = { root, home: root + "/home", database: root + "/var/log/kelosyslog/logs.db", program };
    bash(`demo_log "$1" "$2" "$3"; cockpit_home "$4" ${source}/console/page "$2" "$1"`, root, program, String(count), world.home);
    return world;
}

// Stores log text: [severity, host, program, message], all of now.
export function store(world, logs) {
    const now = new Date(), two = n => String(n).padStart(2, "0");
    const stamp = `${now.getFullYear()}/${two(now.getMonth() + 1)}/${two(now.getDate())} ${two(now.getHours())}:${two(now.getMinutes())}:${two(now.getSeconds())}`;
    const lines = logs.map(([severity, host, name, text]) => Buffer.concat([Buffer.from(`local0 ${severity} ${stamp} ${Math.floor(now / 1000)} 0 +00:00 ${host} 192.0.2.9 ${name} 86 `), Buffer.from(text), Buffer.from("\n")]));
    execFileSync(program, ["parse", "--db", world.database, "-"], { input: Buffer.concat(lines), stdio: ["pipe", "ignore", "ignore"] });
}

// The processes of the program that work on a world.
export const processes = world => execFileSync("ps", ["-eo", "args"], { encoding: "utf8" }).split("\n").filter(line => line.startsWith(`${program} --root ${world.root} `));

async function freePort() {
    const server = net.createServer();
    await new Promise(done => server.listen(0, "127.0.0.1", done));
    const { port } = server.address();
    await new Promise(done => server.close(done));
    return port;
}
const listens = port => new Promise(done => {
    const socket = net.connect(port, "127.0.0.1", () => { socket.destroy(); done(true); }).on("error", () => done(false));
});

// Runs `command` (a bash script that gets the port as $1) as the server of a browser.
export async function serve(command) {
    const port = await freePort();
    const server = spawn("bash", ["-euc", libraries + "\n" + command, "bash", String(port)], { stdio: "ignore", detached: true });
    servers.add(server);
    server.end = () => { servers.delete(server); try { process.kill(-server.pid, "SIGTERM"); } catch { /* it has ended */ } };
    await until("Cockpit listens", () => listens(port));
    return { server, address: `http://127.0.0.1:${port}` };
}

async function launch() {
    browser ??= await chromium.launch({ executablePath: "/usr/bin/chromium", args: ["--no-sandbox", "--disable-gpu", "--disable-quic", "--no-first-run",
        "--disable-background-networking", "--disable-component-update", "--disable-sync", "--force-color-profile=srgb"] });
    return browser;
}

// A browser window; `complaints` gets the errors of our page, violations of its policy among them.
export async function openWindow(options = {}) {
    const context = await (await launch()).newContext({ viewport: { width: 1280, height: 800 }, locale: "en-US", timezoneId: "UTC", reducedMotion: "reduce", acceptDownloads: true, ...options });
    const page = await context.newPage();
    page.complaints = [];
    page.on("pageerror", error => page.complaints.push(error.message));
    page.on("console", message => message.type() === "error" && /\/kelosyslog\//.test(message.location().url) && page.complaints.push(message.text()));
    page.on("response", answer => answer.status() >= 400 && /\/kelosyslog\//.test(answer.url()) && page.complaints.push(`${answer.status()} ${answer.url()}`));
    return page;
}

// Opens the page of `world` and hands { page, frame, ... } to `use`; afterwards no process is left and the page has not complained.
// Tests that need no browser of their own (`options`) share one, in which the page begins anew.
let shared = null;
export async function visit(world, use, { hash = "#/logs", isAlone = false, ...options } = {}) {
    const isShared = !isAlone && Object.keys(options).length === 0;
    const opened = isShared && shared?.world === world ? await again(shared, hash) : await open(world, hash, options);
    shared = null;
    const { page, server } = opened;
    let isWell = false;
    try {
        const frame = page.frameLocator("iframe[name='cockpit1:localhost/kelosyslog']");
        const inner = async () => { await until("the frame", () => innerFrame(page)); return innerFrame(page); };
        await use({ ...opened, frame, inner, go: async (name, query = {}) => (await inner()).evaluate(([n, q]) => window.cockpit.location.go([n], q), [name, query]) });
        expect("complaints of the page", page.complaints, []);
        isWell = true;
    } catch (error) {
        const picture = path.join(path.dirname(new URL(import.meta.url).pathname), "failed.png");
        await page.screenshot({ path: picture }).catch(() => {});
        throw new Error(`${error.message}\n(${picture}; complaints: ${page.complaints.join("; ")})`);
    } finally {
        if (isShared && isWell) {
            shared = opened;
        } else {
            await page.context().close();
            server.end();
        }
    }
    if (!isShared)
        await until("no process is left", () => processes(world).length === 0);
}

async function open(world, hash, options) {
    const { server, address } = await serve(`cockpit_serve ${world.home} "$1"`);
    const page = await openWindow(options);
    await page.goto(`${address}/kelosyslog${hash}`);
    return { world, server, address, page };
}

async function again(opened, hash) {
    const { page } = opened;
    page.complaints.length = 0;
    await page.evaluate(wanted => { location.hash = wanted; }, hash);
    await innerFrame(page).evaluate(() => { localStorage.removeItem("kelosyslog:columns"); window.isOld = true; location.reload(); }).catch(() => {});
    await until("the page begins anew", () => innerFrame(page)?.evaluate(() => !window.isOld && document.querySelector("#tabs ul") !== null).catch(() => false));
    return opened;
}
export const innerFrame = page => page.frames().find(frame => frame.url().includes("/kelosyslog/index.html"));

export const loaded = async frame => {
    await frame.locator("table.logs:not([aria-busy])").waitFor();
    await frame.locator("#stop").waitFor({ state: "hidden" });
};

export async function accessible(where, inner) {
    await inner.evaluate(axe);
    const found = await inner.evaluate(() => window.axe.run(document, { resultTypes: ["violations"] }));
    expect(`accessibility of ${where}`, found.violations.map(rule => `${rule.id}: ${rule.nodes[0].html.slice(0, 150)}`), []);
}

// Runs the tests one after the other, all of them. Returns how many failed.
export async function runTests(tests) {
    let failed = 0;
    for (const [name, test] of Object.entries(tests)) {
        const begin = performance.now();
        let result = "ok";
        try {
            result = await test() ?? "ok";
        } catch (error) {
            failed++;
            result = `FAILED: ${error.message.slice(0, 1500)}`;
        }
        console.log(`${((performance.now() - begin) / 1000).toFixed(1).padStart(5)} s  ${name}: ${result}`);
    }
    return failed;
}
export async function cleanUp() {
    await browser?.close();
    servers.forEach(server => server.end());
    folders.forEach(folder => fs.rmSync(folder, { recursive: true, force: true }));
}
