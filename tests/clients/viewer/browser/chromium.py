# SPDX-License-Identifier: Apache-2.0
"""A headless Chromium, driven over its debugging pipe (https://chromedevtools.github.io/devtools-protocol/) with
nothing but Python's own library: JSON with a NUL behind each message, to descriptor 3 and from descriptor 4.

Everything has a deadline, what the browser has said on standard error is in what a failure says, and no browser
outlives its `with`."""

import base64
import fcntl
import json
import os
import select
import shutil
import signal
import subprocess
import tempfile
import time
from pathlib import Path
from types import TracebackType
from typing import Any, Callable, Optional, Type

DEADLINE = 60.0  # seconds that one answer may take; no test is judged by it

FLAGS = ("--headless=new", "--no-sandbox", "--remote-debugging-pipe", "--use-angle=swiftshader",
         "--enable-unsafe-swiftshader", "--no-first-run", "--disable-background-networking",
         "--disable-component-update", "--disable-sync", "--disable-extensions", "--disable-dev-shm-usage",
         "--password-store=basic", "--force-color-profile=srgb", "--host-resolver-rules=MAP * ~NOTFOUND")


class BrowserError(Exception):
    """The browser has not done, or not answered, what it was asked."""


class ScriptError(BrowserError):
    """A script in the page has thrown."""


class Chromium:
    """The browser and its pipe; `with Chromium() as browser: browser.open(...)`."""

    def __init__(self, program: str = "chromium", deadline: float = DEADLINE) -> None:
        self.deadline = deadline
        self.folder = Path(tempfile.mkdtemp(prefix="chromium."))
        self.errors = (self.folder / "stderr").open("w+b")
        commands, self.commands = high_pipe()
        self.answers, answers = high_pipe()
        # a shell puts them where the browser looks for them, whatever their numbers here
        line = f'exec "$0" "$@" 3<&{commands} 4>&{answers}'
        self.process = subprocess.Popen(
            ["bash", "-c", line, program, *FLAGS, f"--user-data-dir={self.folder / 'profile'}", "about:blank"],
            pass_fds=(commands, answers), stdin=subprocess.DEVNULL, stdout=self.errors, stderr=self.errors,
            start_new_session=True, env={**os.environ, "HOME": str(self.folder)})
        os.close(commands)
        os.close(answers)
        self.received = b""
        self.last = 0
        self.pages: "dict[str, Page]" = {}

    def __enter__(self) -> "Chromium":
        return self

    def __exit__(self, kind: Optional[Type[BaseException]], error: Optional[BaseException],
                 trace: Optional[TracebackType]) -> None:
        self.close()

    def close(self) -> None:
        """Ends the browser, and removes what it has left; again does nothing."""
        if not self.errors.closed:
            os.close(self.commands)  # at its end the browser goes by itself
            try:
                self.process.wait(5)
            except subprocess.TimeoutExpired:
                pass
            try:
                os.killpg(self.process.pid, signal.SIGKILL)
            except ProcessLookupError:
                pass
            self.process.wait()
            os.close(self.answers)
            self.errors.close()
            shutil.rmtree(self.folder, ignore_errors=True)

    def failure(self, sentence: str) -> BrowserError:
        lines = (self.folder / "stderr").read_text(errors="replace").splitlines()
        said = [line for line in lines if "dbus/" not in line]  # there is none in a container
        return BrowserError("\n".join([sentence, *(["the browser's last words:"] + said[-15:] if said else [])]))

    def call(self, method: str, session: Optional[str] = None, /, **arguments: Any) -> Any:
        """The result of a command; its events are handed to their pages meanwhile."""
        self.last += 1
        number = self.last
        message = {"id": number, "method": method, "params": arguments}
        if session:
            message["sessionId"] = session
        until = time.monotonic() + self.deadline
        self.send(json.dumps(message).encode() + b"\0", method, until)
        while True:
            answer = self.receive(method, until)
            if answer.get("id") != number:
                self.hand_on(answer)
            elif "error" in answer:
                raise self.failure(f"{method}: {answer['error'].get('message')}")
            else:
                return answer["result"]

    def send(self, message: bytes, method: str, until: float) -> None:
        os.set_blocking(self.commands, False)
        while message:
            if not select.select([], [self.commands], [], max(0.0, until - time.monotonic()))[1]:
                raise self.failure(f"{method}: the browser takes no more commands")
            try:
                message = message[os.write(self.commands, message):]
            except BrokenPipeError:
                raise self.failure(f"{method}: the browser has ended") from None

    def receive(self, method: str, until: float) -> Any:
        while b"\0" not in self.received:
            if not select.select([self.answers], [], [], max(0.0, until - time.monotonic()))[0]:
                raise self.failure(f"{method}: no answer within {self.deadline:g} s")
            more = os.read(self.answers, 1 << 20)
            if not more:
                raise self.failure(f"{method}: the browser has ended")
            self.received += more
        message, _, self.received = self.received.partition(b"\0")
        return json.loads(message)

    def hand_on(self, event: Any) -> None:
        page = self.pages.get(event.get("sessionId", ""))
        if page:
            page.take(event.get("method", ""), event.get("params", {}))

    def open(self, address: "str | Path", width: int = 1000, height: int = 700, dark: bool = False,
             phone: bool = False, script: str = "") -> "Page":
        """A page of its own, loaded: of a file's path, or an address. `script` runs in it before its own do."""
        address = address.resolve().as_uri() if isinstance(address, Path) else address
        target = self.call("Target.createTarget", url="about:blank", newWindow=False)["targetId"]
        session = self.call("Target.attachToTarget", targetId=target, flatten=True)["sessionId"]
        page = self.pages[session] = Page(self, target, session)
        for domain in ("Page", "Runtime", "Network", "Log"):
            page.call(f"{domain}.enable")
        page.call("Emulation.setDeviceMetricsOverride", width=width, height=height, deviceScaleFactor=1, mobile=phone)
        page.call("Emulation.setTouchEmulationEnabled", enabled=phone)
        page.call("Emulation.setEmulatedMedia",
                  features=[{"name": "prefers-color-scheme", "value": "dark" if dark else "light"}])
        if script:
            page.call("Page.addScriptToEvaluateOnNewDocument", source=script)
        gone = page.call("Page.navigate", url=address)
        if "errorText" in gone:
            raise self.failure(f"{address}: {gone['errorText']}")
        page.wait_for("document.readyState === 'complete'")
        return page


class Page:
    """One page; `requests` are the addresses that it has asked for, `complaints` its errors and those of the policy."""

    def __init__(self, browser: Chromium, target: str, session: str) -> None:
        self.browser, self.target, self.session = browser, target, session
        self.requests: "list[str]" = []
        self.complaints: "list[str]" = []

    def call(self, method: str, **arguments: Any) -> Any:
        return self.browser.call(method, self.session, **arguments)

    def take(self, method: str, event: Any) -> None:
        if method == "Network.requestWillBeSent":
            self.requests.append(event["request"]["url"])
        elif method in ("Network.webSocketCreated", "Network.webTransportCreated"):
            self.requests.append(event["url"])
        elif method == "Runtime.exceptionThrown":
            self.complaints.append(thrown(event["exceptionDetails"]))
        elif method == "Log.entryAdded" and event["entry"]["level"] == "error":
            self.complaints.append(event["entry"]["text"])
        elif method == "Runtime.consoleAPICalled" and event["type"] in ("error", "assert"):
            self.complaints.append(" ".join(str(part.get("value", part.get("description"))) for part in event["args"]))
        elif method == "Inspector.targetCrashed":
            self.complaints.append("the page has crashed")

    def evaluate(self, expression: str) -> Any:
        """The value of an expression of JavaScript, of a promise what it resolves to."""
        answer = self.call("Runtime.evaluate", expression=expression, awaitPromise=True, returnByValue=True)
        if "exceptionDetails" in answer:
            raise ScriptError(f"{expression}: {thrown(answer['exceptionDetails'])}")
        return answer["result"].get("value")

    def bytes_of(self, expression: str) -> bytes:
        """The bytes of a typed array."""
        return base64.b64decode(self.evaluate(
            f"(async () => {{ const array = await ({expression}); let text = '';"
            " for (const byte of new Uint8Array(array.buffer, array.byteOffset, array.byteLength))"
            " text += String.fromCharCode(byte); return btoa(text); })()"))

    def wait_for(self, condition: "str | Callable[[], bool]") -> None:
        """Until it holds: an expression of JavaScript, or a function, which sees what the page has told meanwhile."""
        until = time.monotonic() + self.browser.deadline
        while not (self.evaluate(condition) if isinstance(condition, str) else self.evaluate("0") or condition()):
            if time.monotonic() > until:
                raise self.browser.failure(f"it never came to this: {condition}")
            time.sleep(0.02)

    def screenshot(self) -> bytes:
        """A PNG of what is seen."""
        return base64.b64decode(self.call("Page.captureScreenshot", format="png")["data"])

    def press(self, key: str) -> None:
        """A key, down and up: " ", "ArrowRight", "h"."""
        text = {"text": key} if len(key) == 1 else {}
        stroke = {"key": key, "code": "Space" if key == " " else f"Key{key.upper()}" if text else key}
        self.call("Input.dispatchKeyEvent", type="keyDown" if text else "rawKeyDown", **stroke, **text)
        self.call("Input.dispatchKeyEvent", type="keyUp", **stroke)

    def heap_bytes(self) -> int:
        """What JavaScript holds, after its garbage is collected."""
        self.call("HeapProfiler.collectGarbage")
        return int(self.call("Runtime.getHeapUsage")["usedSize"])

    def close(self) -> None:
        self.browser.call("Target.closeTarget", targetId=self.target)
        del self.browser.pages[self.session]


def thrown(details: Any) -> str:
    return str(details.get("exception", {}).get("description") or details.get("exception", {}).get("value")
               or details.get("text"))


def high_pipe() -> "tuple[int, int]":
    """A pipe whose ends have numbers that nobody uses by name."""
    ends = os.pipe()
    moved = tuple(fcntl.fcntl(end, fcntl.F_DUPFD_CLOEXEC, 20) for end in ends)
    for end in ends:
        os.close(end)
    return moved[0], moved[1]
