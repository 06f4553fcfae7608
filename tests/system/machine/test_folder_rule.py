"""The check of the folder rule finds what breaks it."""

import pathlib
import subprocess
import sys
import tempfile
import unittest

SCRIPT = pathlib.Path(__file__).resolve().parents[2] / "folder_rule.py"

GOOD = {
    "src/web/A.cpp": '#include "web/A.h"\n#include "webapi/Public.h"\n#include "seam.h"\n#include <string>\n',
    "src/web/A.h": "",
    "include/webapi/Public.h": '#include "Export.h"\n',
    "include/webapi/Export.h": "",
    "platform/include/seam.h": "#include <json/value.h>\n",
    "platform/reference/zovacgi/R.cpp": '#include "zovacgi/R.h"\n#include "seam.h"\n',
    "platform/reference/zovacgi/R.h": "",
    "packages/P/P.cpp": '#include "P.h"\n#include "../common/C.h"\n#include <webapi/Public.h>\n',
    "packages/P/P.h": "",
    "packages/common/C.h": "",
    "hosts/h/main.cpp": '#include <webapi/Public.h>\n#include <seam.h>\n',
}

BAD = {
    "src includes the reference platform by path": ("src/web/A.cpp", '#include "platform/reference/zovacgi/R.h"'),
    "src includes the reference platform by name": ("src/web/A.cpp", '#include "zovacgi/R.h"'),
    "src includes a package": ("src/web/A.cpp", '#include "packages/P/P.h"'),
    "src includes by a way up": ("src/web/A.cpp", '#include "../../packages/P/P.h"'),
    "a package includes the framework's inside": ("packages/P/P.cpp", "#include <web/A.h>"),
    "a package includes the seam": ("packages/P/P.cpp", "#  include <seam.h>"),
    "the reference platform includes the framework": ("platform/reference/zovacgi/R.cpp", '#include "web/A.h"'),
    "the reference platform includes public headers": ("platform/reference/zovacgi/R.h", "#include <webapi/Public.h>"),
    "a public header includes the inside": ("include/webapi/Public.h", '#include "web/A.h"'),
    "a host includes the reference platform": ("hosts/h/main.cpp", '#include "zovacgi/R.h"'),
    "a host includes the inside": ("hosts/h/main.cpp", '#include "../../src/web/A.h"'),
}


class FolderRule(unittest.TestCase):
    def check(self, files):
        with tempfile.TemporaryDirectory() as folder:
            for name, text in files.items():
                path = pathlib.Path(folder, name)
                path.parent.mkdir(parents=True, exist_ok=True)
                path.write_text(text, encoding="utf-8")
            return subprocess.run([sys.executable, SCRIPT, folder], capture_output=True, text=True, check=False)

    def test_a_project_that_keeps_it_passes(self):
        result = self.check(GOOD)
        self.assertEqual((0, f"{len(GOOD)} files looked at, 0 bad includes\n"), (result.returncode, result.stdout))

    def test_each_way_to_break_it_is_found(self):
        for name, (path, line) in BAD.items():
            with self.subTest(name):
                result = self.check({**GOOD, path: GOOD[path] + line + "\n"})
                self.assertEqual(1, result.returncode)
                self.assertIn(f"{path}: includes ", result.stdout)

    def test_a_folder_without_sources_is_no_pass(self):
        result = self.check({name: text for name, text in GOOD.items() if not name.startswith("packages/")})
        self.assertEqual(1, result.returncode)
        self.assertIn("packages: no source here", result.stdout)


if __name__ == "__main__":
    unittest.main()
