"""Servers on loopback that keep what they receive and can be made to misbehave."""
import http.server
import socket
import threading

from aiosmtpd.controller import Controller
from aiosmtpd.smtp import SMTP, AuthResult


def free_port():
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


class MailServer:
    """SMTP. `mails` holds (sender, recipients, bytes); `refuse` maps a recipient, or "data", to the answer."""

    def __init__(self, **options):
        self.mails, self.refuse, self.port, self.options, self.logins = [], {}, free_port(), options, []

    async def handle_RCPT(self, server, session, envelope, address, rcpt_options):
        if address in self.refuse:
            return self.refuse[address]
        envelope.rcpt_tos.append(address)
        return "250 OK"

    async def handle_DATA(self, server, session, envelope):
        if "data" in self.refuse:
            return self.refuse["data"]
        self.mails.append((envelope.mail_from, envelope.rcpt_tos, envelope.original_content))
        return "250 OK"

    def authenticate(self, server, session, envelope, mechanism, data):
        self.logins.append((data.login, data.password))
        return AuthResult(success=True)

    def start(self):
        handler, options = self, self.options

        class OnPort(Controller):
            def factory(self):
                return SMTP(handler, authenticator=handler.authenticate, **options)

        self.controller = OnPort(self, hostname="127.0.0.1", port=self.port)
        self.controller.start()
        return self

    def stop(self):
        self.controller.stop()


class Silence:
    """Accepts connections and says nothing."""

    def __init__(self, port):
        self.socket = socket.create_server(("127.0.0.1", port))

    def stop(self):
        self.socket.close()


class WebServer:
    """HTTP. `requests` holds (path, headers, body bytes); `answer` is the status of the next ones, and `endless` what follows it
    without end."""

    def __init__(self, tls_context=None):
        self.requests, self.answer, self.endless = [], 200, b""
        owner = self

        class Handler(http.server.BaseHTTPRequestHandler):
            def do_POST(self):
                body = self.rfile.read(int(self.headers["Content-Length"]))
                owner.requests.append((self.path, self.headers, body))
                self.send_response(owner.answer)
                self.flush_headers()
                try:
                    while owner.endless:
                        self.wfile.write(owner.endless)
                    self.end_headers()
                except OSError:
                    self.close_connection = True

            def log_message(self, *arguments):
                pass

        self.server = http.server.ThreadingHTTPServer(("127.0.0.1", 0), Handler)
        if tls_context:
            self.server.socket = tls_context.wrap_socket(self.server.socket, server_side=True)
        self.url = f"http{'s' if tls_context else ''}://127.0.0.1:{self.server.server_address[1]}"
        threading.Thread(target=self.server.serve_forever, daemon=True).start()

    def stop(self):
        self.server.shutdown()
        self.server.server_close()
