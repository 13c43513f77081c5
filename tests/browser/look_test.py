"""How the page looks, to eyes and to what reads it aloud, and what it costs to load."""
import json
import os
import shutil
from urllib.parse import urlsplit

from page import CLOUDS, PageTest, REMOTE, SERVER, post, write

AXE = os.environ["AXE"]
PICTURES = os.environ["PICTURES"]
WIRE = 150 * 1024
LOOKS = {"light": (1280, 800, "light"), "dark": (1280, 800, "dark"),
         "phone": (390, 780, "light"), "phone-dark": (390, 780, "dark")}


class Look(PageTest):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        folder = f"{REMOTE}/look"
        shutil.rmtree(folder, ignore_errors=True)
        os.mkdir(folder)
        os.chmod(folder, 0o777)
        for name in ("Holidays 2025", "Letters"):
            os.mkdir(f"{folder}/{name}")
        for number, name in enumerate(("Budget.ods", "Inventory of the cellar, second and last edition.pdf",
                                       "film.mkv", "notes.txt", "photo 1.jpg", "photo 2.jpg", "photo 10.jpg")):
            write(f"{folder}/{name}", b"x" * (7 ** (number + 2) // 3))

    def show(self, look):
        width, height, scheme = LOOKS[look]
        self.browser.devtools("Emulation.setDeviceMetricsOverride", width=width, height=height,
                              deviceScaleFactor=1, mobile=width < 500)
        self.browser.devtools("Emulation.setEmulatedMedia", features=[
            {"name": "prefers-color-scheme", "value": scheme},
            {"name": "prefers-reduced-motion", "value": "reduce"}])

    def check(self, name):
        """In each look: a picture to keep, and nothing that axe-core complains of."""
        for look in LOOKS:
            with self.subTest(view=name, look=look):
                self.show(look)
                self.browser.screenshot(f"{PICTURES}/{name}-{look}.png")
                with open(AXE, encoding="utf-8") as file:
                    self.browser.run(file.read())
                found = self.browser.run("return axe.run().then((result) => result.violations)")
                self.assertEqual([f"{one['id']}: {node['html'][:200]} {node['failureSummary']}"
                                  for one in found for node in one["nodes"]], [])
                self.assertLessEqual(*self.browser.run(
                    "return [document.documentElement.scrollWidth, innerWidth]"))

    def test_the_page_before_a_connection_is_chosen(self):
        self.open()
        self.check("connections")

    def test_a_folder_with_a_choice(self):
        self.open(SERVER, "/look")
        self.choose("film.mkv", "notes.txt")
        self.check("folder")

    def test_an_empty_folder(self):
        self.open(SERVER, "/look/Letters")
        self.check("empty")

    def test_uploads_that_run_wait_are_done_and_have_failed(self):
        b = self.browser
        b.devtools("Network.enable")
        self.open(SERVER, "/look")
        os.mkdir(f"{REMOTE}/look/closed", 0o755)
        for name, size in (("closed.bin", 100), ("holiday film.mkv", 60_000_000), ("second.mkv", 9_000_000),
                           ("third.mkv", 9_000_000)):
            write(f"/tmp/{name}", b"x" * size)
        post("mkdir", connection=SERVER, path="/look/open")
        self.open(SERVER, "/look/closed")
        b.type("#choose-files-input", "/tmp/closed.bin")
        b.wait("return document.querySelector('[data-state=failed]')")
        b.click("#crumbs li:nth-child(2) button")
        self.wait_for_folder()
        b.devtools("Network.emulateNetworkConditions", offline=False, latency=0,
                   downloadThroughput=-1, uploadThroughput=2_000_000)
        b.type("#choose-files-input",
               "/tmp/holiday film.mkv\n/tmp/second.mkv\n/tmp/third.mkv")
        b.wait("return /left/.test(document.querySelector('[data-state=running] .detail')?.textContent)")
        self.check("uploads")
        b.click("#cancel-uploads")
        b.devtools("Network.emulateNetworkConditions", offline=False, latency=0,
                   downloadThroughput=-1, uploadThroughput=-1)
        b.wait("return !document.querySelector('[data-state=running]')")
        b.click("[aria-label^=Dismiss]")

    def test_dialogues(self):
        b = self.browser
        self.open(SERVER, "/look")
        self.choose("film.mkv")
        for name, button, there in (("add", "#add-connection", "dialog input"),
                                    ("copy", "#copy", "dialog .choices button"),
                                    ("delete", "#delete", "dialog .danger"),
                                    ("rename", "#rename", "dialog input")):
            self.show("light")
            b.click(button)
            b.wait("return document.querySelector(arguments[0])", there)
            self.check(f"dialogue-{name}")
            b.press("Escape")
            b.wait("return !document.querySelector('dialog')")

    def test_a_failure(self):
        self.open(SERVER, "/nothing here")
        self.browser.wait("return document.querySelector('.notice')")
        self.check("failure")

    def test_the_tab_key_goes_through_all_in_the_order_of_the_page(self):
        b = self.browser
        self.show("light")
        self.open(SERVER, "/look")
        b.run("document.querySelector('#connections button').focus()")
        seen = []
        while len(seen) < 60:
            b.press("Tab")
            at = b.run("""const one = document.activeElement;
                return one === document.body ? null : one.id || one.textContent || one.ariaLabel""")
            if at is None or at in seen:
                break
            seen.append(at)
        inside = [one for one in seen if one in (
            "add-connection", "disconnect", "choose-files", "new-folder", "grid")]
        self.assertEqual(inside, ["add-connection", "disconnect", "choose-files", "new-folder", "grid"])
        self.assertEqual(b.run("""return [...document.querySelectorAll('button, input, select, progress')]
            .filter((one) => !one.hidden && !(one.ariaLabel || one.textContent || one.labels?.length))
            .map((one) => one.outerHTML)"""), [])

    def test_the_first_view_is_small_and_asks_no_other_host(self):
        b = self.browser
        self.show("light")
        connections = [
            {"id": f"sftp://somebody@server-{at}.example.com:22", "alias": f"Server {at}", "cloud": False,
             "protocol": "sftp", "protocol_name": "SFTP", "account": "somebody",
             "uri": f"sftp://server-{at}.example.com", "state": "connected"} for at in range(20)]
        folder = f"{REMOTE}/thousand"
        os.makedirs(folder, exist_ok=True)
        for number in range(1000):
            write(f"{folder}/picture from the holidays {number}.jpg", b"")
        b.devtools("Network.enable")
        b.devtools("Network.setCacheDisabled", cacheDisabled=True)
        b.log("performance")
        self.open(SERVER, "/thousand")
        sizes, hosts = {}, set()
        for line in b.log("performance"):
            message = json.loads(line["message"])["message"]
            parameters = message["params"]
            if message["method"] == "Network.loadingFinished":
                sizes[parameters["requestId"]] = parameters["encodedDataLength"]
            elif message["method"] == "Network.requestWillBeSent":
                url = parameters["request"]["url"]
                hosts.add(urlsplit(url).hostname)
        self.assertEqual(hosts - {None, "new-tab-page", "new-tab-page-third-party"}, {"127.0.0.1"})
        wire = sum(sizes.values()) + len(json.dumps(connections))
        print(f"first view: {wire} bytes in {len(sizes)} answers", flush=True)
        self.assertLess(wire, WIRE)
        b.devtools("Network.setCacheDisabled", cacheDisabled=False)
