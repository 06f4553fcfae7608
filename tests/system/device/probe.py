"""The probe package of the tests, in the device for as long as a test case that needs it runs."""

import os
import shutil

import device

BUILD = os.environ["WEBAPI_BUILD"]
API = "ZOVA.Test.Probe"
SOURCES = os.path.join(os.path.dirname(os.path.dirname(os.path.abspath(__file__))), "probe")
PLACES = {
    f"{BUILD}/bin/{API}.so": f"/usr/lib/zova/webapi/{API}.so",
    f"{SOURCES}/{API}.lib": f"{device.FOLDER}/{API}.lib",
}


def install(case):
    """Until the class cleanup of the test case."""
    for source, place in PLACES.items():
        shutil.copyfile(source, place)
        case.addClassCleanup(os.unlink, place)


class ProbeTestCase(device.DeviceTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        install(cls)
