// Runs the tests of the page. See check.
import { makeWorld, runTests, cleanUp } from "./support.mjs";
import { searchTests } from "./search.mjs";
import { pageTests } from "./pages.mjs";
import { hostileTests } from "./hostile.mjs";
import { brokenTests } from "./broken.mjs";
import { rightsTests } from "./rights.mjs";
import { timing } from "./timing.mjs";

const options = process.argv.slice(2);
const rows = options[0] === "--rows" ? Number(options.splice(0, 2)[1]) : 0;
const shots = options[0] === "--shots" ? options.splice(0, 2)[1] : null;
for (const signal of ["SIGINT", "SIGTERM"])
    process.on(signal, () => cleanUp().finally(() => process.exit(1)));

let failed = 1;
try {
    const world = makeWorld(rows || 6000);
    if (rows) {
        await timing(world, rows);
        failed = 0;
    } else {
        const tests = { ...searchTests(world), ...pageTests(world, shots), ...hostileTests(world), ...brokenTests(world), ...rightsTests(world) };
        failed = await runTests(Object.fromEntries(Object.entries(tests).filter(([name]) => name.includes(options[0] ?? ""))));
    }
} finally {
    await cleanUp();
}
process.exitCode = failed ? 1 : 0;
