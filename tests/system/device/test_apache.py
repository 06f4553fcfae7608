"""Apache with the settings that the project ships: all that holds behind the device's own web server, and the
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
    server_type = webserver.Apache
    # See `servercases.LateAnswers`.
    answers_early = False


class ApacheExchange(Served, servercases.Exchange):
    pass


class ApacheLateAnswers(Served, servercases.LateAnswers):
    pass


class ApacheSecrets(Served, servercases.Secrets):
    pass


class ApachePlaces(Served, test_web_server.Places):
    pass


class ApacheHostProcess(Served, test_web_server.HostProcess):
    pass


class ApacheParallel(Served, test_web_server.Parallel):
    pass


class ApacheBadInput(Served, test_bad_input.BadInputThroughTheWebServer):
    # Those that a web server could stumble over itself.
    rows = bad_input.SIZES + bad_input.CUT_BODIES
    watched = device.WRITTEN


class ApacheStored(Served, test_uploads.Stored):
    pass


class ApacheLarge(Served, test_uploads.Large):
    large = 100 << 20


class ApacheRefused(Served, test_uploads.Refused):
    pass


class ApacheDeferred(Served, test_uploads.Deferred):
    pass


class ApacheBrokenOffUploads(Served, test_uploads.BrokenOffUploads):
    pass


class ApacheDownloads(Served, test_downloads.Downloads):
    large = 100 << 20
    # One line reaches the client, the last one.
    types = ["video/mp4"]
    # Apache judges the conditions once more, and each of them by itself.
    tag_beside_date = 412


class ApacheFastDownloads(Served, test_downloads.FastDownloads):
    large = 100 << 20
    types = ["video/mp4"]
    tag_beside_date = 412


if __name__ == "__main__":
    unittest.main()
