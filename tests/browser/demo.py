"""What the demo shows of the page: a browser logs in, uploads a large file and gets it back."""
import hashlib
import os
import sys
import tempfile
from urllib.parse import urlencode

from webdriver import Chromium, eventually

SIZE = 200 << 20


def digest(path):
    with open(path, "rb") as file:
        return hashlib.file_digest(file, "sha256").hexdigest()


def show(site, connection, kept):
    source = os.path.join(tempfile.mkdtemp(), "holiday film.mkv")
    with open(source, "wb") as file:
        for _ in range(SIZE >> 20):
            file.write(os.urandom(1 << 20))
    browser = Chromium()
    browser.go(f"{site}#{urlencode({'c': connection, 'p': '/'})}")
    browser.wait("return document.body.dataset.view === 'connected'")
    print("logged in as", browser.run("return document.querySelector('#user').textContent"), flush=True)
    browser.type("#choose-files-input", source)
    seen = set()

    def is_done():
        seen.add(browser.run("return document.querySelector('.transfer progress')?.value ?? 0"))
        return browser.run("return Boolean(document.querySelector('.transfer[data-state=done]'))")

    eventually(is_done, "the upload")
    print("the bar stood at", ", ".join(f"{at:.0f} %" for at in sorted(seen)), flush=True)
    browser.wait("return document.querySelector('[aria-label=\"Choose holiday film.mkv\"]')")
    browser.click("[aria-label='Choose holiday film.mkv']")
    browser.click("#download")
    sums = [digest(path) for path in (source, kept, browser.downloaded("holiday film.mkv"))]
    browser.close()
    for sum_, where in zip(sums, ("here", "at the service", "downloaded")):
        print(sum_, where)
    return len(set(sums)) == 1 and len(seen) > 2


if __name__ == "__main__":
    sys.exit(0 if show(*sys.argv[1:]) else 1)
