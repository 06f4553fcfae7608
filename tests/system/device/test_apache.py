"""Apache with the settings that the project ships: all that holds behind the device's own web server, and its own sending
of files."""

import unittest

import servercases
import test_bad_input
import test_downloads
import test_uploads
import test_web_server
import webserver


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
    pass


class ApacheStored(Served, test_uploads.Stored):
    pass


class ApacheLarge(Served, test_uploads.Large):
    pass


class ApacheRefused(Served, test_uploads.Refused):
    pass


class ApacheDeferred(Served, test_uploads.Deferred):
    pass


class ApacheBrokenOffUploads(Served, test_uploads.BrokenOffUploads):
    pass


class ApacheDownloads(Served, test_downloads.Downloads):
    # One line reaches the client, the last one.
    types = ["video/mp4"]


class ApacheFastDownloads(Served, test_downloads.FastDownloads):
    types = ["video/mp4"]


if __name__ == "__main__":
    unittest.main()
