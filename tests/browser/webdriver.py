"""Browsers as tests drive them, by the protocols that Debian's packages bring: Chromium through
chromedriver, Firefox through its own Marionette. Both know the same commands."""
import base64
import json
import os
import shutil
import socket
import subprocess
import tempfile
import time
import urllib.error
import urllib.request

PATIENCE = float(os.environ.get("PATIENCE", 30))  # seconds
ELEMENT = "element-6066-11e4-a52e-4f735466cecf"
KEYS = {"Enter": "\ue007", "Escape": "\ue00c", "Tab": "\ue004", "Space": " ", "Home": "\ue011",
        "End": "\ue010", "PageDown": "\ue00f", "PageUp": "\ue00e", "Up": "\ue013", "Down": "\ue015",
        "Delete": "\ue017", "Backspace": "\ue003", "F2": "\ue032", "Shift": "\ue008",
        "Control": "\ue009"}


class Failed(Exception):
    pass


def eventually(condition, what):
    """What a condition gives once it gives anything that counts as true."""
    end = time.monotonic() + PATIENCE
    while True:
        result = condition()
        if result:
            return result
        if time.monotonic() > end:
            raise AssertionError(f"not within {PATIENCE} seconds: {what}")
        time.sleep(0.05)


class Browser:
    """What both have. A subclass brings command(name, parameters)."""

    def __init__(self):
        self.folder = tempfile.mkdtemp()
        self.downloads = os.path.join(self.folder, "downloads")
        os.mkdir(self.downloads)

    def run(self, script, *arguments):
        """The value of a script's `return`; a promise is waited for."""
        return self.command("execute", {"script": script, "args": list(arguments)})

    def wait(self, script, *arguments):
        """Until a script gives what counts as true; one that fails looks for what is not there yet."""
        def condition():
            try:
                return self.run(script, *arguments)
            except Failed:
                return None
        try:
            return eventually(condition, f"{script} {arguments}")
        except AssertionError as error:
            raise AssertionError(f"{error}\n{self.text()}") from None

    def text(self):
        return self.run("return document.body?.innerText ?? ''")

    def element(self, selector):
        """One that is shown, or the one that the selector names."""
        script = """const all = [...document.querySelectorAll(arguments[0])];
            return all.find((one) => one.checkVisibility?.()) ?? all[0]"""
        return self.wait(script, selector)

    def click(self, selector):
        self.command("click", {"element": self.element(selector)[ELEMENT]})

    def type(self, selector, text):
        self.command("type", {"element": self.element(selector)[ELEMENT], "text": text})

    def press(self, *keys):
        """At once: press("Shift", "Down")."""
        codes = [KEYS.get(key, key) for key in keys]
        actions = [{"type": "keyDown", "value": code} for code in codes]
        actions += [{"type": "keyUp", "value": code} for code in reversed(codes)]
        self.command("actions", {"actions": [{"type": "key", "id": "keys", "actions": actions}]})

    def screenshot(self, path):
        with open(path, "wb") as file:
            file.write(base64.b64decode(self.command("screenshot", {})))

    def downloaded(self, name):
        """The path of a file once the browser has all of it."""
        path = os.path.join(self.downloads, name)
        return eventually(
            lambda: os.path.exists(path) and os.path.getsize(path) > 0 and
            not [one for one in os.listdir(self.downloads) if one.endswith((".crdownload", ".part"))]
            and path, f"the download of {name}: {os.listdir(self.downloads)}")

    def close(self):
        self.process.terminate()
        self.process.wait()
        shutil.rmtree(self.folder, ignore_errors=True)


class Chromium(Browser):
    port = 9515

    def __init__(self, width=1280, height=800):
        super().__init__()
        self.process = subprocess.Popen(
            ["chromedriver", f"--port={self.port}"], stdout=subprocess.DEVNULL,
            stderr=subprocess.DEVNULL)
        self.base = f"http://127.0.0.1:{self.port}"
        eventually(self.is_ready, "chromedriver")
        # The tests run as root on a machine of their own.
        arguments = ["--headless=new", "--no-sandbox", "--disable-gpu", "--no-first-run",
                     "--disable-background-networking", "--disable-component-update",
                     f"--user-data-dir={self.folder}/profile", f"--window-size={width},{height}"]
        capabilities = {
            "goog:chromeOptions": {
                "args": arguments,
                "prefs": {"download.default_directory": self.downloads}},
            "goog:loggingPrefs": {"browser": "ALL", "performance": "ALL"}}
        answer = self.ask("POST", "/session", {"capabilities": {"alwaysMatch": capabilities}})
        self.base += f"/session/{answer['sessionId']}"

    def is_ready(self):
        try:
            return self.ask("GET", "/status")["ready"]
        except OSError:
            return False

    def ask(self, method, path, body=None):
        request = urllib.request.Request(
            self.base + path, method=method, data=None if body is None else json.dumps(body).encode())
        try:
            with urllib.request.urlopen(request, timeout=120) as answer:
                return json.load(answer)["value"]
        except urllib.error.HTTPError as error:
            raise Failed(json.load(error)["value"]["message"]) from error

    def command(self, name, parameters):
        element = parameters.get("element")
        method, path = {
            "go": ("POST", "/url"),
            "execute": ("POST", "/execute/sync"),
            "click": ("POST", f"/element/{element}/click"),
            "type": ("POST", f"/element/{element}/value"),
            "actions": ("POST", "/actions"),
            "screenshot": ("GET", "/screenshot"),
        }[name]
        return self.ask(method, path, parameters if method == "POST" else None)

    def go(self, url):
        self.command("go", {"url": url})

    def devtools(self, command, **parameters):
        return self.ask("POST", "/goog/cdp/execute", {"cmd": command, "params": parameters})

    def log(self, kind):
        """What has come since it was last asked for: "browser" or "performance"."""
        return self.ask("POST", "/se/log", {"type": kind})

    def close(self):
        self.ask("DELETE", "")
        super().close()


class Firefox(Browser):
    port = 2828

    def __init__(self):
        super().__init__()
        profile = os.path.join(self.folder, "profile")
        os.mkdir(profile)
        settings = {"browser.download.folderList": 2, "browser.download.dir": self.downloads,
                    "browser.download.useDownloadDir": True, "marionette.port": self.port,
                    "browser.download.alwaysOpenPanel": False, "app.update.enabled": False,
                    "network.captive-portal-service.enabled": False,
                    "network.connectivity-service.enabled": False,
                    "datareporting.policy.dataSubmissionEnabled": False}
        with open(os.path.join(profile, "user.js"), "w", encoding="utf-8") as file:
            for name, value in settings.items():
                file.write(f"user_pref({json.dumps(name)}, {json.dumps(value)});\n")
        self.process = subprocess.Popen(
            ["firefox-esr", "--headless", "--marionette", "--no-remote", "--profile", profile],
            stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL,
            env={**os.environ, "HOME": self.folder})
        self.wire = eventually(self.connect, "Firefox")
        self.number = 0
        self.rest = b""
        self.read()
        self.tell("WebDriver:NewSession", {})

    def connect(self):
        try:
            return socket.create_connection(("127.0.0.1", self.port), timeout=120)
        except OSError:
            return None

    def read(self):
        """One message: its length, a colon, JSON."""
        while b":" not in self.rest:
            self.rest += self.receive()
        length, rest = self.rest.split(b":", 1)
        while len(rest) < int(length):
            rest += self.receive()
        self.rest = rest[int(length):]
        return json.loads(rest[:int(length)])

    def receive(self):
        bytes_ = self.wire.recv(65536)
        if not bytes_:
            raise Failed("Firefox has gone")
        return bytes_

    def tell(self, name, parameters):
        self.number += 1
        message = json.dumps([0, self.number, name, parameters]).encode()
        self.wire.sendall(b"%d:%s" % (len(message), message))
        _, _, error, result = self.read()
        if error:
            raise Failed(error["message"])
        return result

    def command(self, name, parameters):
        parameters = dict(parameters)
        if "element" in parameters:
            parameters["id"] = parameters.pop("element")
        full = {"execute": "WebDriver:ExecuteScript", "click": "WebDriver:ElementClick",
                "type": "WebDriver:ElementSendKeys", "actions": "WebDriver:PerformActions",
                "screenshot": "WebDriver:TakeScreenshot"}[name]
        return self.tell(full, parameters)["value"]

    def go(self, url):
        self.tell("WebDriver:Navigate", {"url": url})
