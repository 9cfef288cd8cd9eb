#!/usr/bin/python3
"""Passes requests on to a server, and drops the answer of every second one after the server has carried it out.

usage: lossy.py PORT SERVER_HOST SERVER_PORT; prints a line for each answer that it drops.
"""
import http.client
import http.server
import itertools
import sys

numbers = itertools.count(1)


class Passing(http.server.BaseHTTPRequestHandler):
    protocol_version = "HTTP/1.1"

    def log_message(self, *_):
        pass

    def do_POST(self):
        body = self.rfile.read(int(self.headers["Content-Length"]))
        server = http.client.HTTPConnection(sys.argv[2], int(sys.argv[3]))
        server.request("POST", self.path, body, {"Authorization": self.headers["Authorization"]})
        answer = server.getresponse()
        text = answer.read()
        server.close()
        if answer.status == 200 and next(numbers) % 2 == 1:
            print("dropped an answer for", body.count(b"\n"), "rows", flush=True)
            self.close_connection = True
            self.connection.close()
            return
        self.send_response(answer.status)
        self.send_header("Content-Length", str(len(text)))
        self.end_headers()
        self.wfile.write(text)


http.server.ThreadingHTTPServer(("127.0.0.1", int(sys.argv[1])), Passing).serve_forever()
