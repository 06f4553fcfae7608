"""lighttpd, the device's own web server, with requests that no well-behaved client sends."""

import unittest

import servercases
import webserver


class LighttpdExchange(servercases.Exchange):
    server_type = webserver.Lighttpd
    chunked_status = 200
    # It stands behind a proxy, whose header this is; the host program believes it of those that are trusted.
    believes_forwarded = True


class LighttpdEarlyAnswers(servercases.EarlyAnswers):
    server_type = webserver.Lighttpd


class LighttpdSecrets(servercases.Secrets):
    server_type = webserver.Lighttpd


if __name__ == "__main__":
    unittest.main()
