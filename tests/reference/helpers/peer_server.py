#!/usr/bin/python3
"""A peer device that answers badly, for tests: peer_server.py DIRECTORY

Listens on free ports of the loopback, and writes to standard output: the port of HTTPS, a port without TLS, and the pin
of its public key. Key and certificate, for the host peer.example and the address 127.0.0.1, are made in DIRECTORY. Ends
by a signal, or after ten minutes.

    /echo       the request as JSON: method, target, headers, body
    /count      length and SHA-256 of the body as JSON
    /status     status 500          /redirect   302 to /echo
    /empty      200 and no body     /interim    100 and 103 before the answer of /echo
    /largest    16 MiB              /large      a byte more
    /endless    bytes without end   /drip       a byte every tenth of a second without end
    /pause      the answer of /echo after 3 s
    /slow       nothing for 30 s    /headers    header lines without end
    /garbage    no HTTP             /close      nothing at all
    /short      less than announced /chunk      a chunked body without its end
    /cut        a body without a length, and an end that TLS does not confirm
    /full       the same, once the buffers between the two have had time to fill
    /early      the answer before the body, which is never read; the connection stays open for 5 s
    /gone       the connection ends before the body is read
"""

import base64
import hashlib
import json
import os
import signal
import socketserver
import ssl
import subprocess
import sys
import threading
import time

MEBI = 1 << 20
CONFIG = """[req]
distinguished_name = name
x509_extensions = more
prompt = no
[name]
CN = peer.example
[more]
subjectAltName = DNS:peer.example, IP:127.0.0.1
basicConstraints = critical, CA:TRUE
"""


def make_certificate(folder):
    """Makes key.pem and certificate.pem; gives the pin of the key."""
    with open(f"{folder}/config", "w", encoding="ascii") as file:
        file.write(CONFIG)
    environment = {**os.environ, "OPENSSL_CONF": f"{folder}/config"}
    subprocess.run(
        ["openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes", "-days", "2",
         "-config", f"{folder}/config", "-keyout", f"{folder}/key.pem", "-out", f"{folder}/certificate.pem"],
        check=True, capture_output=True, env=environment)
    key = subprocess.run(["openssl", "pkey", "-in", f"{folder}/key.pem", "-pubout", "-outform", "der"], check=True,
                         capture_output=True, env=environment).stdout
    return "sha256//" + base64.b64encode(hashlib.sha256(key).digest()).decode()


def answer(body, status="200 OK", more=""):
    return f"HTTP/1.1 {status}\r\nContent-Length: {len(body)}\r\n{more}Connection: close\r\n\r\n".encode() + body


class Gone(Exception):
    """The client left."""


class Handler(socketserver.BaseRequestHandler):
    def setup(self):
        self.data = b""
        if self.server.context is not None:
            self.request.settimeout(60)
            self.request = self.server.context.wrap_socket(self.request, server_side=True,
                                                           suppress_ragged_eofs=False)

    def receive(self):
        data = self.request.recv(65536)
        if not data:
            raise Gone
        return data

    def read_head(self):
        while b"\r\n\r\n" not in self.data:
            self.data += self.receive()
        head, _, self.data = self.data.partition(b"\r\n\r\n")
        lines = head.decode("latin-1").split("\r\n")
        self.method, self.target, _ = lines[0].split(" ", 2)
        self.headers = {name.lower(): value for name, _, value in (line.partition(": ") for line in lines[1:])}

    def pieces(self):
        """The body's bytes as they come."""
        left = int(self.headers.get("content-length", "0"))
        while left > 0:
            piece = self.data or self.receive()
            self.data = b""
            left -= len(piece)
            yield piece

    def echo(self):
        body = b"".join(self.pieces()).decode("latin-1")
        return answer(json.dumps({"method": self.method, "target": self.target, "headers": self.headers,
                                  "body": body}).encode())

    def count(self):
        digest, length = hashlib.sha256(), 0
        for piece in self.pieces():
            digest.update(piece)
            length += len(piece)
        return answer(json.dumps({"length": length, "sha256": digest.hexdigest()}).encode())

    def endless(self, piece, pause):
        self.request.sendall(b"HTTP/1.1 200 OK\r\nConnection: close\r\n\r\n")
        while True:
            self.request.sendall(piece)
            time.sleep(pause)

    def endless_headers(self):
        self.request.sendall(b"HTTP/1.1 200 OK\r\n")
        while True:
            self.request.sendall(b"X-More: " + b"x" * 1000 + b"\r\n")

    def wait_for_the_client_to_leave(self):
        self.request.settimeout(30)
        while self.request.recv(65536):
            pass

    def handle(self):
        if self.server.context is None:
            self.request.sendall(answer(b"{}"))
            return
        self.read_head()
        path = self.target.partition("?")[0]
        if path == "/full":
            time.sleep(0.5)
        if path in ("/early", "/full"):
            self.request.sendall(b'HTTP/1.1 200 OK\r\nContent-Length: 14\r\n\r\n{"early":true}')
            time.sleep(5)
            return
        if path == "/gone":
            os.close(self.request.detach())
            return
        if path == "/count":
            self.request.sendall(self.count())
            return
        echo = self.echo()
        if path == "/pause":
            time.sleep(3)
        answers = {
            "/echo": echo, "/pause": echo, "/empty": answer(b""), "/status": answer(b'{"success":true}', "500 Sorry"),
            "/redirect": answer(b"", "302 Found", "Location: /echo\r\n"),
            "/interim": b"HTTP/1.1 100 Continue\r\n\r\nHTTP/1.1 103 Early Hints\r\nLink: <x>\r\n\r\n" + echo,
            "/largest": answer(b"x" * (16 * MEBI)), "/large": answer(b"x" * (16 * MEBI + 1)),
            "/garbage": b"\x00\x01no HTTP at all\r\n\r\n", "/close": b"",
            "/short": b"HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nten bytes!",
            "/chunk": b"HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\na\r\nten bytes!\r\n",
        }
        if path in answers:
            self.request.sendall(answers[path])
        elif path == "/cut":
            self.request.sendall(b"HTTP/1.1 200 OK\r\nConnection: close\r\n\r\nhalf of it")
            # The descriptor alone: no closing word of TLS.
            os.close(self.request.detach())
        elif path == "/endless":
            self.endless(b"x" * 65536, 0)
        elif path == "/drip":
            self.endless(b"x", 0.1)
        elif path == "/headers":
            self.endless_headers()
        elif path == "/slow":
            self.wait_for_the_client_to_leave()

    def finish(self):
        if self.server.context is None or self.request.fileno() < 0:
            return
        try:
            self.request.unwrap()
        except OSError:
            pass
        self.request.close()


class Server(socketserver.ThreadingTCPServer):
    daemon_threads = True
    block_on_close = False

    def __init__(self, context):
        self.context = context
        super().__init__(("127.0.0.1", 0), Handler)
        threading.Thread(target=self.serve_forever, daemon=True).start()

    def shutdown_request(self, request):
        if request.fileno() >= 0:
            super().shutdown_request(request)

    def handle_error(self, *_):
        """Clients of these tests break off, and do not trust."""


def main():
    folder = sys.argv[1]
    signal.alarm(600)
    pin = make_certificate(folder)
    context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
    context.load_cert_chain(f"{folder}/certificate.pem", f"{folder}/key.pem")
    with_tls, without = Server(context), Server(None)
    print(with_tls.server_address[1], without.server_address[1], pin, flush=True)
    signal.pause()


if __name__ == "__main__":
    main()
