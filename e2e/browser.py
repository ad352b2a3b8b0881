"""A headless Chromium that is driven through its debugging pipe: pages of files, what they ask for, how they look."""

import base64
import json
import os
import pathlib
import shutil
import subprocess
import tempfile


class Browser:
    def __init__(self):
        self.profile = tempfile.mkdtemp(prefix="tbdaily-browser-")
        commands, self.write_end = os.pipe()
        self.read_end, answers = os.pipe()
        # The browser reads commands from descriptor 3 and answers on 4. It keeps no sandbox of its own for root.
        script = f'exec "$@" 3<&{commands} 4>&{answers}'
        options = ["--headless=new", "--remote-debugging-pipe", "--no-sandbox", "--disable-gpu", "--hide-scrollbars",
                   "--disable-background-networking", "--no-first-run", f"--user-data-dir={self.profile}", "about:blank"]
        self.process = subprocess.Popen(["bash", "-c", script, "bash", "chromium", *options], pass_fds=(commands, answers),
                                        stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        os.close(commands)
        os.close(answers)
        self.number, self.rest, self.events, self.session = 0, b"", [], None
        target = self.call("Target.createTarget", url="about:blank")["targetId"]
        self.session = self.call("Target.attachToTarget", targetId=target, flatten=True)["sessionId"]
        for domain in ("Page", "Network", "Runtime", "Log"):
            self.call(domain + ".enable")

    def close(self):
        self.session = None
        try:
            self.call("Browser.close")
        except EOFError:
            pass
        self.process.wait(timeout=60)
        os.close(self.write_end)
        os.close(self.read_end)
        shutil.rmtree(self.profile, ignore_errors=True)

    def message(self):
        """The next message; waits for it."""
        while b"\0" not in self.rest:
            more = os.read(self.read_end, 1 << 20)
            if not more:
                raise EOFError("the browser has gone")
            self.rest += more
        first, self.rest = self.rest.split(b"\0", 1)
        return json.loads(first)

    def call(self, method, **parameters):
        self.number += 1
        request = {"id": self.number, "method": method, "params": parameters}
        if self.session:
            request["sessionId"] = self.session
        data = json.dumps(request).encode() + b"\0"
        while data:
            data = data[os.write(self.write_end, data):]
        while True:
            message = self.message()
            if message.get("id") == self.number:
                if "error" in message:
                    raise RuntimeError((method, message["error"]))
                return message["result"]
            self.events.append(message)

    def open(self, place, width=1280, scheme="light"):
        """Shows a file on a screen of that width; what it asked for and said is in events from then on."""
        self.call("Emulation.setDeviceMetricsOverride", width=width, height=900, deviceScaleFactor=1, mobile=width < 600)
        self.call("Emulation.setEmulatedMedia", features=[{"name": "prefers-color-scheme", "value": scheme}])
        self.events = []
        self.call("Page.navigate", url=pathlib.Path(place).resolve().as_uri())
        while not any(event["method"] == "Page.loadEventFired" for event in self.events):
            self.events.append(self.message())

    def happened(self, method):
        return [event["params"] for event in self.events if event["method"] == method]

    def value(self, expression):
        """What a script of the test's own finds in the page; a promise is awaited."""
        answer = self.call("Runtime.evaluate", expression=expression, returnByValue=True, awaitPromise=True)
        if "exceptionDetails" in answer:
            raise RuntimeError(answer["exceptionDetails"])
        return answer["result"].get("value")

    def screenshot(self, place):
        """The whole page, as a picture."""
        size = self.call("Page.getLayoutMetrics")["cssContentSize"]
        clip = {"x": 0, "y": 0, "width": size["width"], "height": min(size["height"], 16000), "scale": 1}
        picture = self.call("Page.captureScreenshot", captureBeyondViewport=True, clip=clip)["data"]
        pathlib.Path(place).write_bytes(base64.b64decode(picture))

    def pdf(self):
        return base64.b64decode(self.call("Page.printToPDF", printBackground=True, preferCSSPageSize=True)["data"])
