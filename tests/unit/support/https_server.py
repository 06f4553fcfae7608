#!/usr/bin/env python3
"""An HTTPS server on a free port of the loopback, for a test: https_server.py DIRECTORY

Writes its port to standard output once it listens, under a certificate of its own for another host, made in DIRECTORY.
Ends by a signal, or after two minutes.

    /echo      the request as JSON: method, path, headers, body
    /nul       a body with a NUL byte in it
    /large     17 MiB
    /redirect  302 to /echo
    /short     less than it announces
    /error     status 500
"""

import http.server
import json
import signal
import ssl
import subprocess
import sys


class Handler(http.server.BaseHTTPRequestHandler):
    def do_POST(self):
        body = self.rfile.read(int(self.headers.get("Content-Length", "0")))
        answers = {
            "/nul": (200, b"ab\0cd"),
            "/large": (200, b"x" * (17 * 1024 * 1024)),
            "/redirect": (302, b"moved"),
            "/short": (200, b"x" * 10),
            "/error": (500, b"sorry"),
        }
        headers = {name.lower(): value for name, value in self.headers.items()}
        echo = {"method": self.command, "path": self.path, "headers": headers, "body": body.decode("latin-1")}
        status, answer = answers.get(self.path, (200, json.dumps(echo).encode()))
        self.send_response(status)
        if status == 302:
            self.send_header("Location", "/echo")
        self.send_header("X-Mark", "from the server")
        self.send_header("Content-Length", str(len(answer) + (90 if self.path == "/short" else 0)))
        self.end_headers()
        try:
            self.wfile.write(answer)
        except OSError:
            pass
        self.close_connection = True

    def log_message(self, *_):
        pass


class Server(http.server.ThreadingHTTPServer):
    def handle_error(self, *_):
        pass


def main():
    directory = sys.argv[1]
    signal.alarm(120)
    key, certificate = directory + "/key.pem", directory + "/certificate.pem"
    subprocess.run(
        ["openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes", "-days", "1",
         "-subj", "/CN=other.example", "-keyout", key, "-out", certificate], check=True, capture_output=True)
    context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
    context.load_cert_chain(certificate, key)
    server = Server(("127.0.0.1", 0), Handler)
    server.socket = context.wrap_socket(server.socket, server_side=True)
    print(server.server_address[1], flush=True)
    server.serve_forever()


main()
