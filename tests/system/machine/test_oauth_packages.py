"""The list of packages of the OAuth server that the system tests run against."""

import json
import pathlib
import re
import subprocess
import tempfile
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[3]
SOURCES = PROJECT / "tests/system/oauth"


class OAuthPackages(unittest.TestCase):
    def test_each_has_an_exact_version_and_a_checksum_and_names_no_registry(self):
        text = (SOURCES / "package-lock.json").read_text(encoding="utf-8")
        wanted = json.loads((SOURCES / "package.json").read_text(encoding="utf-8"))["dependencies"]
        packages = json.loads(text)["packages"]
        self.assertEqual(wanted, packages.pop("")["dependencies"])
        for name, version in wanted.items():
            self.assertEqual(version, packages[f"node_modules/{name}"]["version"])
        for name, package in packages.items():
            with self.subTest(name):
                self.assertRegex(package["version"], r"\A\d+\.\d+\.\d+(-[\w.]+)?\Z")
                self.assertRegex(package["integrity"], r"\Asha512-[A-Za-z0-9+/=]{88}\Z")
                self.assertNotIn("resolved", package)
        self.assertEqual([], [url for url in re.findall(r"https?://[^/\"]+", text) if "registry" in url])

    def test_a_folder_that_has_them_is_left_alone(self):
        with tempfile.TemporaryDirectory() as folder:
            # npm would fail without a network or a home; it is not even started.
            pathlib.Path(folder, "installed").write_bytes((SOURCES / "package-lock.json").read_bytes())
            result = subprocess.run([SOURCES / "install", folder], env={"PATH": "/usr/bin:/bin"}, capture_output=True,
                                    text=True, check=False)
            self.assertEqual((0, "", ""), (result.returncode, result.stdout, result.stderr))
            self.assertEqual({"installed", "lock"}, {path.name for path in pathlib.Path(folder).iterdir()})


if __name__ == "__main__":
    unittest.main()
