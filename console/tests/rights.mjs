// Cockpit's own login, and what two people of different rights can do: one of the group adm, who reads, and one without rights.
import { execFileSync } from "node:child_process";
import fs from "node:fs";
import { expect, until, serve, openWindow, innerFrame, bash } from "./support.mjs";

// A private /etc with the two people, in a mount namespace: the machine's own stays as it is. $1 is the port.
const SERVER = `unshare --mount --propagation private bash -euc '
    root=$2 home=$3; etc=$root/real-etc
    cp -a /etc "$etc"
    hash=$(openssl passwd -6 test)
    printf "reader:x:4001:4001::%s/reader:/bin/bash\\nguest:x:4002:4002::%s/guest:/bin/bash\\n" "$root" "$root" >>"$etc/passwd"
    printf "reader:%s:19000:0:99999:7:::\\nguest:%s:19000:0:99999:7:::\\n" "$hash" "$hash" >>"$etc/shadow"
    printf "reader:x:4001:\\nguest:x:4002:\\n" >>"$etc/group"
    sed -i "s/^adm:.*/adm:x:4:reader/" "$etc/group"
    mkdir -p "$root"/{reader,guest} "$etc/cockpit"
    chown 4001:4001 "$root/reader"; chown 4002:4002 "$root/guest"
    printf "[WebService]\\nLoginTitle=kelosyslog\\n" >"$etc/cockpit/cockpit.conf"
    mount --bind "$etc" /etc
    mkdir -p "$root/packages"
    cp -r /usr/share/cockpit/. "$root/packages"
    cp -rL "$home/.local/share/cockpit/kelosyslog" "$root/packages/kelosyslog"
    mount --bind "$root/packages" /usr/share/cockpit
    mount --bind "$home/bin" /usr/local/bin
    exec "$1" --no-tls --address=127.0.0.1 --port="$4"' bash "$cockpitServer"`;

function prepare(world) {
    fs.chmodSync(world.root, 0o755);
    // As the package leaves them: the group adm reads.
    bash(`chgrp -R adm "$1/var/log" && chmod -R u=rwX,g=rX,o= "$1/var/log"`, world.root);
}

async function login(address, user) {
    const page = await openWindow();
    await page.goto(`${address}/kelosyslog`);
    await page.fill("#login-user-input", user);
    await page.fill("#login-password-input", "test");
    await page.click("#login-button");
    await until("the page after the login", () => innerFrame(page), 30);
    return page;
}

export const rightsTests = world => ({
    "login: a reader and a person without rights": async () => {
        if (process.getuid() !== 0)
            return "skipped, only root can become other users";
        try {
            execFileSync("unshare", ["--mount", "true"], { stdio: "ignore" });
        } catch {
            return "skipped, no mount namespace can be made";
        }
        prepare(world);
        const { server, address } = await serve(`${SERVER} ${world.root} ${world.home} "$1"`);
        try {
            const reader = await login(address, "reader");
            let frame = reader.frameLocator("iframe[name='cockpit1:localhost/kelosyslog']");
            await frame.locator("tr.log").first().waitFor();
            await innerFrame(reader).evaluate(() => window.cockpit.location.go(["rules"]));
            await frame.getByRole("button", { name: "Switch off critical" }).click();
            await frame.getByText(/need more rights/).waitFor();
            expect("the rule is still on", /"critical".*"enabled":true/.test(bash('"$1" --root "$2" rules list -o json', world.program, world.root)), true);
            expect("complaints", reader.complaints, []);
            await reader.context().close();
            const guest = await login(address, "guest");
            frame = guest.frameLocator("iframe[name='cockpit1:localhost/kelosyslog']");
            await frame.locator("#problem", { hasText: "need more rights" }).waitFor();
            expect("no logs", await frame.locator("tr.log").count(), 0);
            await guest.context().close();
        } finally {
            server.end();
        }
    },
});
