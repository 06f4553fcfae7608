"""A client of the web API over HTTP."""

import http.client
import json
import urllib.parse

import device


class Response:
    """Status, header lines in the order in which they came, and body of one answer."""

    def __init__(self, status, headers, body):
        self.status = status
        self.headers = headers
        self.body = body

    def values(self, name):
        return [value for key, value in self.headers if key.lower() == name.lower()]

    def json(self):
        return json.loads(self.body)

    def code(self):
        """The error number, 0 for a success."""
        answer = self.json()
        return 0 if answer["success"] is True else answer["error"]["code"]


def request(method, query="", body=None, headers=None, path=None, url=None):
    """One exchange on a connection of its own. `query` and `body` go out as they are."""
    # A test may have put another web server in front.
    url = urllib.parse.urlsplit(url or device.URL)
    connection = http.client.HTTPConnection(url.hostname, url.port, timeout=device.TIME_LIMIT)
    try:
        target = url.path if path is None else path
        connection.putrequest(method, target + ("?" + query if query else ""), skip_accept_encoding=True)
        for name, value in (headers or {}).items():
            connection.putheader(name, value)
        if body is not None and not any(name.lower() == "content-length" for name in headers or {}):
            connection.putheader("Content-Length", str(len(body)))
        connection.endheaders(body)
        answer = connection.getresponse()
        return Response(answer.status, answer.getheaders(), answer.read())
    finally:
        connection.close()


def quoted(text):
    """A text in the notation that makes it a text whatever it looks like."""
    return json.dumps(text, ensure_ascii=False)


class Client:
    """One visitor with cookies, as a browser keeps them."""

    def __init__(self):
        self.cookies = {}
        self.token = None

    def headers(self):
        headers = {}
        if self.cookies:
            headers["Cookie"] = "; ".join(f"{name}={value}" for name, value in self.cookies.items())
        if self.token:
            headers["X-Zova-Token"] = self.token
        return headers

    def call(self, api, method, version=1, post=False, **parameters):
        pairs = urllib.parse.urlencode({"api": api, "version": version, "method": method, **parameters})
        if post:
            response = request("POST", body=pairs.encode(), headers={
                **self.headers(), "Content-Type": "application/x-www-form-urlencoded"})
        else:
            response = request("GET", pairs, headers=self.headers())
        self.take_cookies(response)
        return response

    def take_cookies(self, response):
        for line in response.values("Set-Cookie"):
            name, _, value = line.split(";")[0].partition("=")
            self.cookies[name] = value

    def login(self, account, **parameters):
        return self.call("ZOVA.Core.Session", "login", post=True, account=account, passwd=quoted(device.PASSWORD),
                         **parameters)


def logged_in(account):
    client = Client()
    response = client.login(account)
    if response.code() != 0:
        raise AssertionError(f"{account} cannot log in: {response.body!r}")
    return client
