"""Notifications reach a real SMTP server and a real web server, whole, and once."""
import email
import email.policy
import json
import os
import random
import shutil
import ssl
import subprocess
import tempfile
import time
import unittest
import urllib.parse

from notify_servers import MailServer, Silence, WebServer

BIN = os.environ["KELO_BIN_DIR"]
SENDER, ADMIN, NIGHT = "nas@example.org", "admin@example.org", "night@example.org"


class NotifyTest(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.root = folder.name
        self.spool = self.root + "/var/spool/kelonotify"
        os.makedirs(self.root + "/etc")
        os.makedirs(self.spool + "/new")
        self.settings = {"smtp_from": SENDER, "smtp_to": ADMIN, "smtp_server": "127.0.0.1", "desktop_enabled": "no"}
        self.count = 0

    def start(self, server):
        self.settings.update(smtp_mail_enabled="yes", smtp_port=server.port)
        server.start()
        self.addCleanup(server.stop)
        return server

    def write_settings(self, mode=0o600):
        path = self.root + "/etc/keloinfo.conf"
        with open(path, "w") as file:
            file.writelines(f'{key}="{value}"\n' for key, value in self.settings.items())
        os.chmod(path, mode)

    def add(self, channels=("mail",), title="Title", body="Body\n", raw=None):
        self.count += 1
        entry = {"version": 1, "id": f"{self.count:012d}.000000001-7-0", "time": int(time.time()), "tag": "KELOSYSLOG_TEST",
                 "class": "", "language": "enu", "channels": channels, "title": title, "body": body, "values": {}}
        with open(self.spool + "/entry", "wb") as file:
            file.write(json.dumps(entry).encode() if raw is None else raw)
        os.rename(self.spool + "/entry", f"{self.spool}/new/{entry['id']}.json")
        return entry["id"]

    def deliver(self, *options, status=0):
        self.write_settings()
        run = subprocess.run([BIN + "/kelonotify", "--root", self.root, "--timeout", "2", *options],
                             capture_output=True, timeout=60)
        self.assertEqual(run.returncode, status, run.stderr)
        return run.stderr.decode()

    def retry(self, **arguments):
        open(self.spool + "/new/retry", "w").close()
        return self.deliver(**arguments)

    def names(self, folder):
        return sorted(os.listdir(f"{self.spool}/{folder}"))

    def test_no_link_in_the_spool_is_followed(self):
        """The spool belongs to a service, and root works in it, too."""
        self.settings.update(desktop_enabled="yes")
        self.write_settings()
        os.makedirs(self.root + "/usr/kelo/keloman/webman/modules")
        os.symlink(os.path.abspath(os.path.dirname(__file__) + "/../../package"), self.root + "/usr/kelo/keloman/webman/modules/Quillbay")
        for name in ("tmp", "new", "failed", "state", "desktop"):
            shutil.rmtree(self.spool)
            for folder in ("tmp", "new", "failed", "state", "desktop"):
                os.makedirs(f"{self.spool}/{folder}")
            given_up, waits = self.add(channels=["desktop"]), self.add(channels=["desktop"])
            os.rename(f"{self.spool}/new/{given_up}.json", f"{self.spool}/failed/{given_up}.json")
            elsewhere = f"{self.root}/elsewhere-{name}"
            os.rename(f"{self.spool}/{name}", elsewhere)
            os.symlink(elsewhere, f"{self.spool}/{name}")
            before = os.listdir(elsewhere)
            for command in ("kelosyslog notify list", "kelosyslog notify retry --all", "kelosyslog notify test desktop", "kelonotify"):
                subprocess.run([BIN + "/" + command.split()[0], "--root", self.root, *command.split()[1:]], capture_output=True, timeout=60)
                self.assertEqual(os.listdir(elsewhere), before, f"{command} with a link as {name}")

    def test_mail_arrives_whole_whatever_it_holds(self):
        server = self.start(MailServer())
        self.settings.update(smtp_to=f"{ADMIN}, {NIGHT}", smtp_subject_prefix="[nas1]")
        cases = [
            ("plain", "one line\n"),
            ("Grüße, 日本語 🗄️ " * 9, "Köln\tтекст\n\ntrailing blank \n=3D 100% =?\n"),
            ("a\r\nBcc: evil@example.org", ".\r\n.leading\n..two\nFrom me\nQUIT\n"),
            ("=?UTF-8?Q?fake?=", "x" * 10000 + "\n" + "é" * 5000 + "\n"),
            (" ends ", "." * 300 + "\nno line feed at the end"),
        ]
        for title, body in cases:
            self.add(title=title, body=body)
        self.deliver()
        self.assertEqual(len(server.mails), 2 * len(cases))
        for index, (sender, recipients, raw) in enumerate(server.mails):
            title, body = cases[index // 2]
            mail = email.message_from_bytes(raw, policy=email.policy.default)
            expected_body = body.replace("\r", "\\r")
            self.assertEqual(mail["Subject"], "[nas1] " + title.replace("\r\n", "  "))
            self.assertEqual(mail.get_content().replace("\r\n", "\n").rstrip("\n"), expected_body.rstrip("\n"))
            self.assertEqual((sender, recipients), (SENDER, [[ADMIN, NIGHT][index % 2]]))
            self.assertEqual(mail.keys(), ["Date", "From", "To", "Subject", "Message-ID", "Auto-Submitted", "MIME-Version",
                                           "Content-Type", "Content-Transfer-Encoding"])
            self.assertNotRegex(raw, rb"(?<!\r)\n|\r(?!\n)|[^\r\n]{79}")
        self.assertEqual(self.names("new") + self.names("state"), [])

    def test_mail_arrives_once_when_the_server_is_down_refuses_hangs_and_comes_back(self):
        server = self.start(MailServer())
        server.stop()
        self.settings.update(smtp_to=f"{ADMIN}, {NIGHT}", smtp_password="topsecret", smtp_user="")
        entry = self.add()
        log = self.deliver(status=1)
        self.assertIn("Failed to send email.", log)
        self.assertEqual(self.deliver(status=1), "", "an attempt before its time")
        silence = Silence(server.port)
        self.assertNotIn("topsecret", self.retry(status=1))
        silence.stop()
        server.refuse = {"data": "451 later"}
        server.start()
        second = self.add()
        log = self.retry(status=1)
        for target in (ADMIN, NIGHT):
            self.assertEqual(log.count(f"mail:{target}, entry"), 1, "one line an answer, whatever it refuses: " + log)
        self.assertEqual(log.count(": 451 later"), 2, "the server's own words: " + log)
        os.remove(f"{self.spool}/new/{second}.json")
        server.refuse = {NIGHT: "550 nobody"}
        self.retry(status=1)
        self.assertEqual([mail[1] for mail in server.mails], [[ADMIN]])
        server.refuse = {}
        self.retry()
        self.retry()
        self.assertEqual([mail[1] for mail in server.mails], [[ADMIN], [NIGHT]])
        self.assertIn(f"<{entry}.".encode(), server.mails[0][2])

    def test_a_channel_works_again_after_a_retry_and_when_its_time_has_come(self):
        server = self.start(MailServer())
        status = lambda: subprocess.run([BIN + "/kelosyslog", "--root", self.root, "notify", "status"], capture_output=True, text=True).stdout
        for deliver in (self.retry, lambda: self.deliver("--linger", "30")):
            server.stop()
            self.add()
            self.deliver(status=1)
            self.assertRegex(status(), "mail +failing: .*next attempt")
            server.start()
            path = self.spool + "/channels.json"
            with open(path) as file:
                health = json.load(file)
            self.assertGreater(health["targets"]["mail"]["next"], time.time() + 5)
            health["targets"]["mail"]["next"] = int(time.time()) + 2  # nobody waits for all of it here
            with open(path, "w") as file:
                json.dump(health, file)
            deliver()
            self.assertRegex(status(), "mail +on\n")
        self.assertEqual(len(server.mails), 2)

    def test_entries_that_are_old_or_damaged_are_given_up_with_the_reason_and_can_be_retried(self):
        server = self.start(MailServer())
        server.refuse = {ADMIN: "550 no such user"}
        refused = self.add()
        for raw in (b"", b"[" * 5000, b'{"version":2,"time":1}', os.urandom(300), b'{"version":1,"time":1,"id":7}'):
            self.add(raw=raw)
        self.add(channels=["pigeon"])
        os.mkdir(f"{self.spool}/new/folder.json")
        self.deliver("--give-up-after", "0", status=1)
        self.assertEqual(self.names("new"), [])
        self.assertEqual(len(self.names("failed")), 16)
        with open(f"{self.spool}/failed/{refused}.state") as file:
            self.assertIn("550", json.load(file)["targets"]["mail:" + ADMIN]["reason"])
        server.refuse = {}
        subprocess.run([BIN + "/kelosyslog", "--root", self.root, "notify", "retry", refused], check=True)
        self.deliver()
        self.assertEqual(len(server.mails), 1)

    def test_push_and_sms_requests_carry_each_value_encoded_for_its_place(self):
        web = WebServer()
        self.addCleanup(web.stop)
        self.settings.update(
            sms_enabled="yes", sms_url=web.url + "/sms?t=%TITLE%", sms_to="+491, +492", sms_body="to=%NUMBER%&text=%TITLE%",
            sms_header_1="Authorization: Bearer s3cret", pushservice_mobile_enabled="yes",
            pushservice_mobile_url=web.url + "/push", pushservice_mobile_body='{"title":"%TITLE%","message":"%BODY%","100%":"%ID%"}')
        title, body = 'a&to=evil "q" \\ %BODY% ü', 'line\n"},{"x":"\ttab\n'
        entry = self.add(channels=["sms", "push_mobile"], title=title, body=body)
        self.deliver()
        push = next(request for request in web.requests if request[0] == "/push")
        self.assertEqual(json.loads(push[2]), {"title": title, "message": body, "100%": entry})
        sms = [request for request in web.requests if request[0] != "/push"]
        self.assertEqual([urllib.parse.parse_qs(request[2].decode()) for request in sms],
                         [{"to": [number], "text": [title]} for number in ("+491", "+492")])
        self.assertEqual(urllib.parse.parse_qs(sms[0][0].partition("?")[2]), {"t": [title]})
        self.assertEqual(sms[0][1]["Authorization"], "Bearer s3cret")
        web.answer = 503
        self.add(channels=["sms"])
        self.assertNotIn("s3cret", self.deliver(status=1))
        web.answer = 200
        self.retry()
        self.assertEqual(len(web.requests), 6)

    def test_an_answer_without_end_is_left_after_64_kib(self):
        web = WebServer()
        self.addCleanup(web.stop)
        self.settings.update(sms_enabled="yes", sms_url=web.url, sms_to="+491", sms_body="%TITLE%")
        begin = time.monotonic()
        for endless, status in ((b"\r\n" + b"x" * 65536, 0), (b"A: " + b"x" * 1000 + b"\r\n", 1)):
            web.endless = endless
            self.add(channels=["sms"])
            log = self.deliver(status=status)
        self.assertIn("64 KiB", log)
        self.assertLess(time.monotonic() - begin, 2, "it was not left before the time-out")

    def certificate(self, names):
        key, certificate = self.root + "/key.pem", self.root + "/cert.pem"
        subprocess.run(["openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-keyout", key, "-out", certificate, "-days", "2",
                        "-subj", "/CN=nas", "-addext", "subjectAltName=" + names], check=True, capture_output=True)
        context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        context.load_cert_chain(certificate, key)
        return certificate, context

    def test_requests_go_to_a_server_that_is_trusted(self):
        for name, trusted in (("IP:127.0.0.1", False), ("IP:127.0.0.2", True), ("IP:127.0.0.1", True)):
            certificate, context = self.certificate(name)
            web = WebServer(context)
            self.addCleanup(web.stop)
            self.settings.update(sms_enabled="yes", sms_url=web.url, sms_to="+491", sms_body="%TITLE%",
                                 notify_ca_file=certificate if trusted else "")
            self.add(channels=["sms"])
            open(self.spool + "/new/retry", "w").close()
            isGood = trusted and name == "IP:127.0.0.1"
            self.deliver(status=0 if isGood else 1)
            self.assertEqual(len(web.requests), 3 if isGood else 0, (name, trusted))

    def test_mail_goes_encrypted_and_authenticated_to_a_server_that_is_trusted(self):
        certificate, context = self.certificate("IP:127.0.0.1")
        server = self.start(MailServer(tls_context=context, require_starttls=True, auth_required=True))
        self.settings.update(smtp_security="starttls", smtp_user="nas1", smtp_password="pass word")
        self.add()
        self.deliver(status=1)
        self.assertEqual(server.mails, [])
        self.settings.update(notify_ca_file=certificate)
        self.retry()
        self.assertEqual((len(server.mails), server.logins), (1, [(b"nas1", b"pass word")]))

    def test_nothing_is_lost_when_it_is_killed_again_and_again(self):
        server = self.start(MailServer())
        self.settings.update(desktop_enabled="yes")
        self.write_settings(mode=0o644)
        entries = [self.add(channels=["mail", "desktop"]) for _ in range(40)]
        chance, kills = random.Random(7), 0
        deadline = time.monotonic() + 120
        while any(name.endswith(".json") for name in self.names("new")) and time.monotonic() < deadline:
            run = subprocess.Popen([BIN + "/kelonotify", "--root", self.root, "--watch"], stderr=subprocess.DEVNULL)
            try:
                run.wait(chance.uniform(0.02, 0.15))
            except subprocess.TimeoutExpired:
                kills += 1
            run.kill()
            run.wait()
            open(self.spool + "/new/retry", "w").close()
        identities = [email.message_from_bytes(mail[2])["Message-ID"].split(".")[0] for mail in server.mails]
        self.assertEqual(set(identities), {"<" + entry.split(".")[0] for entry in entries})
        self.assertLessEqual(len(identities), len(entries) + kills)
        with open(self.spool + "/desktop/feed.jsonl") as feed:
            self.assertEqual([json.loads(line)["id"] for line in feed], entries)
        run = subprocess.run([BIN + "/kelonotify", "--root", self.root], capture_output=True, text=True)
        self.assertIn("may be read by everybody", run.stderr)

    def test_one_instance_watches_and_delivers_what_comes(self):
        server = self.start(MailServer())
        self.write_settings()
        run = subprocess.Popen([BIN + "/kelonotify", "--root", self.root, "--watch"])
        try:
            for count in (1, 2):
                self.add()
                deadline = time.monotonic() + 30
                while len(server.mails) < count and time.monotonic() < deadline:
                    time.sleep(0.01)
                self.assertEqual(len(server.mails), count)
            self.deliver(status=3)
        finally:
            run.terminate()
        self.assertEqual(run.wait(10), 0)

    def test_rules_are_stored_as_asked_or_refused_and_a_channel_can_be_tested(self):
        server = self.start(MailServer())
        self.write_settings()

        def tool(*words, status=0):
            run = subprocess.run([BIN + "/kelosyslog", "--root", self.root, *words], capture_output=True, text=True)
            self.assertEqual(run.returncode, status, (words, run.stderr))
            return run.stdout

        os.mkdir(self.root + "/etc/kelosyslog")
        hostile = ' "disk=full" # [x] \\ '
        tool("rules", "add", "kw", "--keyword", hostile)
        tool("rules", "add", "busy", "--eps", "2147483647", "--disabled")
        tool("rules", "add", "huge", "--eps", "2147483648", status=2)
        tool("rules", "add", "kw", "--severity", "err", status=2)
        tool("rules", "remove", "kw", "none", status=2)
        with open(self.root + "/etc/kelosyslog/notify.conf", "a") as file:
            file.write('[byhand]\nnotify_type="1"\nnotify_eps="5000000000"\n')
        tool("rules", "enable", "byhand", status=2)
        rules = {rule["name"]: rule for rule in json.loads(tool("rules", "list", "-o", "json"))}
        self.assertEqual((rules["kw"]["keyword"], rules["kw"]["enabled"]), (hostile, True))
        self.assertEqual((rules["busy"]["eps"], rules["byhand"]["eps"]), (2147483647, 5000000000))
        tool("rules", "test", "--eps", "4000000000", status=1)
        tool("rules", "enable", "busy")
        self.assertIn("busy", tool("rules", "test", "--eps", "4000000000"))
        tool("rules", "test", "--text", hostile.strip(), status=1)
        tool("rules", "remove", "kw", "busy", "byhand")
        tool("rules", "list", status=1)
        tool("notify", "test", "sms", status=2)
        tool("notify", "test", "mail")
        self.assertEqual(json.loads(tool("notify", "status", "-o", "json"))["waiting"], 1)
        self.deliver()
        self.assertIn(b"KELOSYSLOG_TEST", server.mails[0][2])


if __name__ == "__main__":
    unittest.main()
