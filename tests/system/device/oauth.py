"""OAuth 2.0 servers for the tests: a real one in a process of its own, and one that answers what a test tells it."""

import base64
import contextlib
import hashlib
import http.cookiejar
import http.server
import json
import os
import re
import secrets
import select
import ssl
import subprocess
import threading
import urllib.error
import urllib.parse
import urllib.request

import device

SOURCES = os.path.join(os.path.dirname(os.path.dirname(os.path.abspath(__file__))), "oauth")
MODULES = device.PROJECT + "/build/oauth"
BACK = "https://application.test/back"


def make_certificate(folder):
    """Key and certificate for 127.0.0.1, in files of the folder."""
    key, certificate = folder + "/key.pem", folder + "/certificate.pem"
    subprocess.run(["openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256", "-nodes",
                    "-subj", "/CN=127.0.0.1", "-addext", "subjectAltName=IP:127.0.0.1", "-days", "2", "-keyout", key,
                    "-out", certificate], check=True, capture_output=True)
    return key, certificate


class _StopAtApplication(urllib.request.HTTPRedirectHandler):
    """Follows the server to the application's address, which nobody serves."""

    def redirect_request(self, req, fp, code, msg, headers, newurl):
        if newurl.startswith(BACK):
            return None
        return super().redirect_request(req, fp, code, msg, headers, newurl)


class Server:
    """The real server, from start to stop."""

    def __init__(self, folder):
        key, certificate = make_certificate(folder)
        # Its warnings say that it is no server for production.
        self.process = subprocess.Popen(["node", SOURCES + "/server.mjs", MODULES, key, certificate],
                                        stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL)
        ready, _, _ = select.select([self.process.stdout], [], [], device.TIME_LIMIT)
        line = self.process.stdout.readline() if ready else b""
        if not line:
            self.stop()
            raise AssertionError("the OAuth server does not start; has tests/system/oauth/install been run?")
        told = json.loads(line)
        self.address = f"https://127.0.0.1:{told['port']}"
        self.application, self.device = told["application"], told["device"]
        self.context = ssl.create_default_context(cafile=certificate)

    def stop(self):
        self.process.kill()
        self.process.wait(device.TIME_LIMIT)
        self.process.stdout.close()

    def _opener(self):
        return urllib.request.build_opener(urllib.request.HTTPSHandler(context=self.context), _StopAtApplication,
                                           urllib.request.HTTPCookieProcessor(http.cookiejar.CookieJar()))

    def _open(self, opener, path, form=None, client=None):
        request = urllib.request.Request(urllib.parse.urljoin(self.address, path))
        if form is not None:
            request.data = urllib.parse.urlencode(form).encode()
        if client is not None:
            request.add_header("Authorization", "Basic " + basic(client))
        with opener.open(request, timeout=device.TIME_LIMIT) as answer:
            return answer.read().decode()

    def _authorize(self, account, scope, challenge):
        """A person at a browser: logs in as the account and consents. Gives the code that the application receives."""
        opener = self._opener()
        page = self._open(opener, "/auth?" + urllib.parse.urlencode({
            "client_id": self.application["id"], "response_type": "code", "redirect_uri": BACK, "scope": scope,
            "state": "s", "code_challenge": challenge, "code_challenge_method": "S256"}))
        for form in ({"prompt": "login", "login": account, "password": "any"}, {"prompt": "consent"}):
            action = re.search(r'<form autocomplete="off" action="([^"]+)"', page).group(1)
            try:
                page = self._open(opener, action, form)
            except urllib.error.HTTPError as stopped:
                back = urllib.parse.urlsplit(stopped.headers.get("Location", ""))
                stopped.close()
                return urllib.parse.parse_qs(back.query)["code"][0]
        raise AssertionError("the OAuth server gave no code: " + page)

    def token(self, account, scope):
        """An access token of the account for the scopes, by the authorization code flow."""
        verifier = secrets.token_urlsafe(48)
        challenge = base64.urlsafe_b64encode(hashlib.sha256(verifier.encode()).digest()).rstrip(b"=").decode()
        code = self._authorize(account, scope, challenge)
        answer = json.loads(self._open(self._opener(), "/token", {
            "grant_type": "authorization_code", "code": code, "redirect_uri": BACK, "code_verifier": verifier},
            self.application))
        return answer["access_token"]

    def revoke(self, token):
        self._open(self._opener(), "/token/revocation", {"token": token}, self.application)

    def introspect(self, token):
        return json.loads(self._open(self._opener(), "/token/introspection", {"token": token}, self.device))

    def record(self, **changes):
        """How the device asks this server."""
        return {"enabled": True, "endpoint": self.address + "/token/introspection",
                "header": "Authorization: Basic " + basic(self.device),
                "params": "token={access_token}&token_type_hint=access_token",
                "expect": {"sub": "{userName}", "scope": "{scope}"}, **changes}


def basic(client):
    return base64.b64encode(f"{client['id']}:{client['secret']}".encode()).decode()


class _Handler(http.server.BaseHTTPRequestHandler):
    def do_POST(self):
        body = self.rfile.read(int(self.headers.get("Content-Length", 0)))
        self.server.asked.append((self.path, dict(self.headers), body))
        # A device that gives up meanwhile breaks the connection off.
        with contextlib.suppress(OSError):
            self.server.answer(self)

    def log_message(self, *_):
        pass


class ScriptedServer(http.server.ThreadingHTTPServer):
    """A server at a free port that leaves each request to `answer`, a function of the handler. `asked` has what came."""

    daemon_threads = True

    def __init__(self, folder, answer):
        super().__init__(("127.0.0.1", 0), _Handler)
        key, certificate = make_certificate(folder)
        context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        context.load_cert_chain(certificate, key)
        self.socket = context.wrap_socket(self.socket, server_side=True)
        self.answer = answer
        self.asked = []
        threading.Thread(target=self.serve_forever, daemon=True).start()

    def handle_error(self, request, client_address):
        pass

    def stop(self):
        self.shutdown()
        self.server_close()

    def record(self, **changes):
        return {"enabled": True, "endpoint": f"https://127.0.0.1:{self.server_port}/", "params": "token={access_token}",
                "expect": {"user": "{userName}", "scope": "{scope}"}, **changes}


def answering(body, status=200):
    """The answer of a server that always sends this body, bytes or what becomes JSON."""
    data = body if isinstance(body, bytes) else json.dumps(body).encode()

    def answer(handler):
        handler.send_response(status)
        handler.send_header("Content-Length", str(len(data)))
        handler.end_headers()
        handler.wfile.write(data)
    return answer
