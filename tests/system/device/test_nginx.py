"""nginx with the settings that the project ships: all that holds behind the device's own web server, and the
sending of files by itself."""

import unittest

import bad_input
import device
import servercases
import test_bad_input
import test_downloads
import test_uploads
import test_web_server
import webserver

setUpModule = test_bad_input.setUpModule


class Served(webserver.ServedTestCase):
    server_type = webserver.Nginx
    # See `servercases.LateAnswers`.
    answers_early = False


class NginxExchange(Served, servercases.Exchange):
    pass


class NginxLateAnswers(Served, servercases.LateAnswers):
    pass


class NginxSecrets(Served, servercases.Secrets):
    pass


class NginxPlaces(Served, test_web_server.Places):
    pass


class NginxHostProcess(Served, test_web_server.HostProcess):
    pass


class NginxParallel(Served, test_web_server.Parallel):
    pass


class NginxBadInput(Served, test_bad_input.BadInputThroughTheWebServer):
    # Those that a web server could stumble over itself.
    rows = bad_input.SIZES + bad_input.CUT_BODIES
    watched = device.WRITTEN


class NginxStored(Served, test_uploads.Stored):
    pass


class NginxLarge(Served, test_uploads.Large):
    large = 100 << 20


class NginxRefused(Served, test_uploads.Refused):
    pass


class NginxDeferred(Served, test_uploads.Deferred):
    pass


class NginxBrokenOffUploads(Served, test_uploads.BrokenOffUploads):
    pass


class NginxDownloads(Served, test_downloads.Downloads):
    large = 100 << 20
    # One line reaches the client, the last one with the character set of the first.
    charset = "; charset=UTF-8"
    types = ["video/mp4" + charset]


class NginxFastDownloads(Served, test_downloads.FastDownloads):
    large = 100 << 20
    charset = "; charset=UTF-8"
    types = ["video/mp4" + charset]
    # nginx passes on of the other lines what its settings name.
    own_header = []


if __name__ == "__main__":
    unittest.main()
