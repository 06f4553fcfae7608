"""The measured processes: one call each of a bare program or of front.cgi, started as the web server starts it."""

import collections
import json
import os
import resource
import subprocess
import time
import urllib.parse
import urllib.request

HOST_FOLDER = "/usr/zova/zovaman/webapi"
PROGRAM_FOLDER = "/usr/lib/zova-bench"
EXPECTED = {"data": {"greeting": "Hello, world"}, "success": True}

# What the web server sets for a request of a browser, so that each process has an environment of the usual size.
ENVIRONMENT = {
    "PATH": "/usr/bin:/bin",
    "SERVER_SOFTWARE": "lighttpd",
    "GATEWAY_INTERFACE": "CGI/1.1",
    "SERVER_PROTOCOL": "HTTP/1.1",
    "SERVER_NAME": "127.0.0.1",
    "SERVER_ADDR": "127.0.0.1",
    "SERVER_PORT": "8080",
    "REMOTE_ADDR": "127.0.0.1",
    "REMOTE_PORT": "50000",
    "REQUEST_SCHEME": "http",
    "REQUEST_METHOD": "GET",
    "REDIRECT_STATUS": "200",
    "DOCUMENT_ROOT": "/usr/share/zova/www",
    "HTTP_HOST": "127.0.0.1:8080",
    "HTTP_USER_AGENT": "Mozilla/5.0 (X11; Linux x86_64; rv:128.0) Gecko/20100101 Firefox/128.0",
    "HTTP_ACCEPT": "application/json, text/plain, */*",
    "HTTP_ACCEPT_LANGUAGE": "en-US,en;q=0.5",
    "HTTP_ACCEPT_ENCODING": "gzip, deflate",
}


class Call:
    """One process: its program, the path under which the web server offers it, what the client sends, and the answer
    that has to come; None for one that is another each time."""

    def __init__(self, program, query, cookie=None, form="", expected=EXPECTED, token=None, link=None):
        self.program = program
        self.query = query
        self.cookie = cookie
        self.token = token
        self.link = link
        self.form = form.encode()
        self.expected = expected

    def environment(self):
        environment = dict(ENVIRONMENT, QUERY_STRING=self.query, SCRIPT_FILENAME=self.program,
                           SCRIPT_NAME=self.path(), REQUEST_URI=self.url())
        if self.cookie:
            environment["HTTP_COOKIE"] = self.cookie
        if self.token:
            environment["HTTP_AUTHORIZATION"] = "Bearer " + self.token
        if self.link:
            environment["HTTP_X_SHARING_ID"] = self.link
        if self.form:
            environment.update(REQUEST_METHOD="POST", CONTENT_TYPE="application/x-www-form-urlencoded",
                               CONTENT_LENGTH=str(len(self.form)))
        return environment

    def path(self):
        return "/bench/" + os.path.basename(self.program)

    def url(self):
        return self.path() + "?" + self.query

    def run(self, tool=()):
        """Runs the process under the tool and gives what it wrote."""
        done = subprocess.run([*tool, self.program], cwd=os.path.dirname(self.program), env=self.environment(),
                              input=self.form, stdout=subprocess.PIPE, stderr=subprocess.PIPE, check=False)
        if done.returncode != 0:
            raise RuntimeError(f"{self.program} ended with {done.returncode}: {done.stderr.decode()}")
        return done.stdout

    def check(self):
        """Ends the measurement unless the process gives the right answer."""
        self.check_output(self.run())

    def check_output(self, output):
        body = output.partition(b"\r\n\r\n")[2]
        if json.loads(body) != self.expected:
            raise RuntimeError(f"{self.program} answered {output.decode()}")

    def expected_text(self):
        """The body of the right answer as all programs write it: compact, members sorted."""
        return json.dumps(self.expected, sort_keys=True, separators=(",", ":"))


# Seconds.
Times = collections.namedtuple("Times", ("wall", "processor"))


def processor_time_of_children():
    usage = resource.getrusage(resource.RUSAGE_CHILDREN)
    return usage.ru_utime + usage.ru_stime


def times_of(call):
    """Wall-clock and processor time of the whole process, which has to give the right answer."""
    processor = processor_time_of_children()
    begin = time.perf_counter()
    output = call.run()
    times = Times(time.perf_counter() - begin, processor_time_of_children() - processor)
    call.check_output(output)
    return times


def front(api, method, parameters, cookie=None, expected=EXPECTED, token=None, link=None):
    pairs = {"api": api, "version": 1, "method": method, **parameters}
    return Call(HOST_FOLDER + "/front.cgi", urllib.parse.urlencode(pairs), cookie, expected=expected, token=token,
                link=link)


def session_cookie(session):
    return "id=" + session


def calls(session):
    """The measured calls by name. `session` is the id of a login session."""
    query = json.dumps({"api": "ZOVA.Bench.Small", "version": 1, "method": "hello", "name": "world"},
                       separators=(",", ":"))
    return {
        "bare C": Call(PROGRAM_FOLDER + "/bare_c_cgi", ""),
        "bare C++": Call(PROGRAM_FOLDER + "/bare_cpp_cgi", urllib.parse.quote(query)),
        "front, open": front("ZOVA.Bench.Small", "hello", {"name": "world"}),
        "front, session": front("ZOVA.Bench.Login", "hello", {"name": "world"}, session_cookie(session)),
    }


def login_call(account, password):
    return front("ZOVA.Core.Session", "login", {"account": account, "passwd": password}, expected=None)


def log_in(url, account, password):
    """The id of a fresh login session of the account."""
    pairs = {"api": "ZOVA.Core.Session", "version": 1, "method": "login", "account": account, "passwd": password}
    with urllib.request.urlopen(url, urllib.parse.urlencode(pairs).encode(), timeout=30) as reply:
        answer = json.load(reply)
    if not answer.get("success"):
        raise RuntimeError(f"{account} cannot log in: {answer}")
    return answer["data"]["sid"]
