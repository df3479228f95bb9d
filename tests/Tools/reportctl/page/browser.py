"""A headless Chromium that a test talks to, through a pipe and with nothing but the standard library."""

import base64
import json
import os
import select
import shutil
import subprocess
import tempfile
import time

FLAGS = ["--headless=new", "--no-sandbox", "--disable-gpu", "--disable-quic", "--no-first-run",
         "--disable-dev-shm-usage", "--disable-background-networking", "--disable-component-update",
         "--disable-sync", "--disable-extensions", "--remote-debugging-pipe"]
DEADLINE_S = 60


class Browser:
    """One page. Keeps what the page said to the console, what it threw, and which addresses it asked for."""

    def __init__(self):
        self.profile = tempfile.mkdtemp(prefix="ssr-browser-")
        to_browser, self._write = os.pipe()
        self._read, from_browser = os.pipe()

        def in_child():
            # The browser reads commands from descriptor 3 and writes answers to 4. The pipes themselves may
            # have these numbers, so they are moved first.
            read, write = os.dup(to_browser), os.dup(from_browser)
            high_read, high_write = os.dup2(read, 100), os.dup2(write, 101)
            os.dup2(high_read, 3)
            os.dup2(high_write, 4)

        self.process = subprocess.Popen(["chromium", *FLAGS, "--user-data-dir=" + self.profile],
                                        preexec_fn=in_child,
                                        close_fds=False, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        os.close(to_browser)
        os.close(from_browser)
        os.set_blocking(self._read, True)
        self._buffer = b""
        self._next = 0
        self.complaints = []
        self.requests = []
        target = self.command("Target.createTarget", {"url": "about:blank"})["targetId"]
        self.session = self.command("Target.attachToTarget",
                                    {"targetId": target, "flatten": True})["sessionId"]
        for domain in ("Page", "Runtime", "Log", "Network"):
            self.command(domain + ".enable")

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.process.kill()
        self.process.wait()
        os.close(self._write)
        os.close(self._read)
        shutil.rmtree(self.profile, ignore_errors=True)

    def command(self, method, parameters=None):
        self._next += 1
        message = {"id": self._next, "method": method, "params": parameters or {}}
        if getattr(self, "session", None):
            message["sessionId"] = self.session
        os.write(self._write, json.dumps(message).encode() + b"\0")
        while True:
            answer = self._receive()
            if answer.get("id") == self._next:
                if "error" in answer:
                    raise RuntimeError(f"{method}: {answer['error']}")
                return answer["result"]

    def _receive(self):
        while b"\0" not in self._buffer:
            if not select.select([self._read], [], [], DEADLINE_S)[0]:
                raise TimeoutError("the browser does not answer")
            piece = os.read(self._read, 1 << 16)
            if not piece:
                raise RuntimeError("the browser has ended")
            self._buffer += piece
        text, self._buffer = self._buffer.split(b"\0", 1)
        event = json.loads(text)
        self._keep(event.get("method"), event.get("params", {}))
        return event

    def _keep(self, method, parameters):
        if method == "Runtime.consoleAPICalled" and parameters["type"] in ("error", "warning", "assert"):
            self.complaints.append(str(parameters["args"]))
        elif method == "Runtime.exceptionThrown":
            self.complaints.append(str(parameters["exceptionDetails"]))
        elif method == "Log.entryAdded" and parameters["entry"]["level"] in ("error", "warning"):
            self.complaints.append(parameters["entry"]["text"])
        elif method == "Network.requestWillBeSent":
            self.requests.append(parameters["request"]["url"])

    def look(self, width, height, scheme):
        """From an empty page: a page that is open may load itself anew for another scheme."""
        self._go("about:blank", "location.href === 'about:blank'")
        self.command("Emulation.setDeviceMetricsOverride",
                     {"width": width, "height": height, "deviceScaleFactor": 1, "mobile": width < 600})
        self.command("Emulation.setEmulatedMedia",
                     {"features": [{"name": "prefers-color-scheme", "value": scheme}]})

    def zone(self, name):
        self.command("Emulation.setTimezoneOverride", {"timezoneId": name})

    def open(self, path):
        self._go("about:blank", "location.href === 'about:blank'")
        self.complaints.clear()
        self.requests.clear()
        self._go("file://" + path, "document.documentElement?.dataset.ready === 'yes'")

    def _go(self, url, is_there):
        self.command("Page.navigate", {"url": url})
        self.wait(is_there)

    def value(self, expression):
        answer = self.command("Runtime.evaluate", {"expression": expression, "returnByValue": True})
        if "exceptionDetails" in answer:
            raise RuntimeError(f"{expression}: {answer['exceptionDetails']}")
        return answer["result"].get("value")

    def wait(self, expression):
        end = time.monotonic() + DEADLINE_S
        while not self._holds(expression):
            if time.monotonic() > end:
                raise TimeoutError(expression)
            time.sleep(0.02)

    def _holds(self, expression):
        try:
            return self.value(expression)
        except RuntimeError:  # a new page is just being loaded
            return False

    def screenshot(self, path):
        image = self.command("Page.captureScreenshot", {"captureBeyondViewport": True})["data"]
        with open(path, "wb") as file:
            file.write(base64.b64decode(image))
