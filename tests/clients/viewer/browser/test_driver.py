# SPDX-License-Identifier: Apache-2.0
"""The driver sees what the tests of pages judge by: each judgement is shown a page that has to fail it."""

import io
import os
import signal
import tempfile
import unittest
from pathlib import Path

from PIL import Image

from chromium import BrowserError, Chromium, ScriptError

BAD_PAGE = """<!doctype html>
<meta http-equiv="Content-Security-Policy" content="script-src 'unsafe-inline'; style-src 'unsafe-inline'">
<link rel=stylesheet href="refused.css">
<body style="margin: 0; background: #102030">
<img src="beside.png"><script>
try { new WebSocket("ws://127.0.0.1:9/socket"); } catch { }
fetch("http://neuralwarp.invalid/of-a-fetch").catch(() => 0);
onkeydown = (event) => (window.pressed = [event.key, event.code]);
setTimeout(() => { throw new Error("thrown later"); });
</script>"""


class DriverTest(unittest.TestCase):
    def setUp(self) -> None:
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.file = Path(folder.name) / "a page & more.html"
        self.file.write_text(BAD_PAGE)
        self.browser = Chromium()
        self.addCleanup(self.browser.close)

    def test_sees_requests_complaints_keys_pixels_and_memory(self) -> None:
        page = self.browser.open(self.file, width=64, height=48)
        requests = (self.file.as_uri(), "beside.png", "ws://127.0.0.1:9/socket", "of-a-fetch")
        page.wait_for(lambda: all(any(wanted in url for url in page.requests) for wanted in requests))
        complaints = ("thrown later", "refused.css")
        page.wait_for(lambda: all(any(wanted in said for said in page.complaints) for wanted in complaints))
        for key, code in (("ArrowLeft", "ArrowLeft"), ("h", "KeyH"), (" ", "Space")):
            page.press(key)
            self.assertEqual(page.evaluate("window.pressed"), [key, code])
        picture = Image.open(io.BytesIO(page.screenshot()))
        self.assertEqual((picture.size, picture.convert("RGB").getpixel((60, 40))), ((64, 48), (0x10, 0x20, 0x30)))
        before = page.heap_bytes()
        page.evaluate("window.kept = Array.from({length: 300000}, (_, i) => ({i})); 0")
        self.assertGreater(page.heap_bytes() - before, 2e6)
        self.assertEqual(page.bytes_of("new Uint16Array([1, 2]).subarray(1)"), b"\2\0")
        with self.assertRaisesRegex(ScriptError, "nothingOfThatName is not defined"):
            page.evaluate("nothingOfThatName + 1")

    def test_waits_for_nothing_and_leaves_nothing(self) -> None:
        page = self.browser.open(self.file)
        self.browser.deadline = 1
        with self.assertRaises(BrowserError):
            page.wait_for("false")
        with self.assertRaisesRegex(BrowserError, "Runtime.evaluate: no answer within 1 s"):
            page.evaluate("(() => { for (;;); })()")
        self.browser.close()
        self.assertIsNotNone(self.browser.process.returncode)
        self.assertFalse(self.browser.folder.exists())

    def test_says_why_there_is_no_browser(self) -> None:
        os.killpg(self.browser.process.pid, signal.SIGKILL)
        with self.assertRaisesRegex(BrowserError, "the browser has ended"):
            self.browser.open(self.file)
        with Chromium("no-such-browser") as missing, \
                self.assertRaisesRegex(BrowserError, "has ended(?s:.)*no-such-browser: .*not found"):
            missing.open(self.file)


if __name__ == "__main__":
    unittest.main()
