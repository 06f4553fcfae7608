"""A token server of the measurement's own, which does as little as one can."""

import json
import os
import re
import socket
import ssl
import subprocess
import threading
import time

FOLDER = "/tmp/zova-bench/token-server"


def make_certificate():
    key, certificate = FOLDER + "/key.pem", FOLDER + "/certificate.pem"
    os.makedirs(FOLDER, exist_ok=True)
    subprocess.run(["openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256", "-nodes",
                    "-subj", "/CN=127.0.0.1", "-addext", "subjectAltName=IP:127.0.0.1", "-days", "2", "-keyout", key,
                    "-out", certificate], check=True, capture_output=True)
    return key, certificate


def receive(connection):
    data = connection.recv(1 << 16)
    if not data:
        raise RuntimeError("the request broke off")
    return data


def read_request(connection):
    """The body of the request."""
    data = b""
    while b"\r\n\r\n" not in data:
        data += receive(connection)
    head, _, body = data.partition(b"\r\n\r\n")
    size = int(re.search(rb"\r\ncontent-length: *(\d+)", head, re.IGNORECASE)[1])
    while len(body) < size:
        body += receive(connection)
    return body


class TokenServer:
    """Tells the same answer for one token, and nothing for any other, over TLS for as long as the `with` block lasts.
    `processor_seconds` has the processor time of each request, its handshake included."""

    def __init__(self, token, answer):
        self.asked = f"token={token}".encode()
        self.answer = answer
        self.processor_seconds = []

    def __enter__(self):
        key, certificate = make_certificate()
        self.context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        self.context.load_cert_chain(certificate, key)
        self.listening = socket.create_server(("127.0.0.1", 0))
        self.thread = threading.Thread(target=self._serve)
        self.thread.start()
        return self

    def __exit__(self, *_):
        # Wakes the thread, which a mere close would not.
        self.listening.shutdown(socket.SHUT_RDWR)
        self.thread.join()
        self.listening.close()

    def endpoint(self):
        return f"https://127.0.0.1:{self.listening.getsockname()[1]}/introspect"

    def _serve(self):
        while True:
            try:
                connection, _ = self.listening.accept()
            except OSError:
                return
            connection.settimeout(60)
            begin = time.thread_time()
            with self.context.wrap_socket(connection, server_side=True) as secured:
                known = read_request(secured) == self.asked
                body = json.dumps(self.answer if known else {"active": False}).encode()
                secured.sendall(b"HTTP/1.1 200 OK\r\nContent-Type: application/json\r\nConnection: close\r\n"
                                b"Content-Length: %d\r\n\r\n%s" % (len(body), body))
            self.processor_seconds.append(time.thread_time() - begin)
