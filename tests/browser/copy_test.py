"""What goes from place to place without the browser's bytes: copies, moves, and archives."""
import os
import shutil
import zipfile

from page import CLOUDS, PageTest, REMOTE, SERVER, noise, read, write


class Copy(PageTest):
    def setUp(self):
        self.folder = f"{REMOTE}/copy"
        shutil.rmtree(self.folder, ignore_errors=True)
        os.makedirs(f"{self.folder}/tree/deep")
        for path in ("", "/tree", "/tree/deep"):
            os.chmod(self.folder + path, 0o777)
        self.one = noise(f"{self.folder}/one.bin", 700_000)
        self.two = noise(f"{self.folder}/tree/deep/two <2>.bin", 5000)

    def copy_to_dropbox(self, *names):
        b = self.browser
        self.open(SERVER, "/copy")
        self.choose(*names)
        b.click("#copy")
        b.wait("return document.querySelector('dialog select')")
        b.run("""const choice = document.querySelector('dialog select');
            choice.value = arguments[0];
            choice.dispatchEvent(new Event('change'))""", CLOUDS["dropbox"])
        b.wait("return document.querySelector('dialog .place').textContent === 'In /'")
        self.accept()

    def clear(self):
        b = self.browser
        b.wait("return document.querySelector('#copies [aria-label^=Dismiss]')")
        while b.run("return document.querySelectorAll('#copies li').length"):
            many = b.run("return document.querySelectorAll('#copies li').length")
            b.click("#copies [aria-label^=Dismiss]")
            b.wait("return document.querySelectorAll('#copies li').length < arguments[0]", many)

    def test_a_folder_and_a_file_are_copied_to_a_cloud_in_the_background(self):
        self.copy_to_dropbox("one.bin", "tree")
        self.browser.wait("return document.querySelector('#copies [data-state=done]')")
        self.assertEqual(read("/srv/dropbox/one.bin"), read(self.one))
        self.assertEqual(read("/srv/dropbox/tree/deep/two <2>.bin"), read(self.two))
        self.clear()
        self.open(CLOUDS["dropbox"])
        self.assertTrue({"one.bin", "tree"} <= set(self.names()))

    def test_a_copy_that_fails_says_why(self):
        self.open(SERVER, "/copy")
        os.chmod(self.one, 0o000)
        self.copy_to_dropbox("one.bin")
        text = self.browser.wait("return document.querySelector('#copies [data-state=failed] .detail')"
                                 "?.textContent")
        self.assertGreater(len(text), 20)
        self.clear()

    def test_items_are_moved_into_another_folder(self):
        b = self.browser
        self.open(SERVER, "/copy")
        self.choose("one.bin")
        b.click("#move")
        b.wait("return [...document.querySelectorAll('dialog .choices button')]"
               ".some((one) => one.textContent === 'tree')")
        b.run("[...document.querySelectorAll('dialog .choices button')]"
              ".find((one) => one.textContent === 'tree').click()")
        b.wait("return document.querySelector('dialog .place').textContent === 'In /copy/tree'")
        self.accept()
        self.wait_for_names("tree")
        self.assertTrue(os.path.exists(f"{self.folder}/tree/one.bin"))

    def test_a_selection_and_a_folder_come_down_as_one_zip(self):
        b = self.browser
        write(f"{self.folder}/left out", b"not chosen")
        self.open(SERVER, "/copy")
        self.choose("one.bin", "tree")
        b.click("#download")
        with zipfile.ZipFile(b.downloaded("copy.zip")) as archive:
            self.assertIsNone(archive.testzip())
            files = {name for name in archive.namelist() if not name.endswith("/")}
            self.assertEqual(files, {"one.bin", "tree/deep/two <2>.bin"})
            self.assertEqual(archive.read("tree/deep/two <2>.bin"), read(self.two))

    def test_a_document_of_the_service_is_downloaded_in_a_format_that_is_chosen(self):
        b = self.browser
        b.go("about:blank")
        self.open(SERVER, "/copy")
        b.run("""const real = window.fetch;
            window.asked = [];
            window.fetch = (url, options) => {
                window.asked.push(String(url));
                return String(url).includes('/list') ? Promise.resolve(new Response(JSON.stringify({
                    left_out: 0, entries: [{ name: 'Plan', folder: false, exports: [
                        { format: 'application/pdf', title: 'PDF', extension: 'pdf' },
                        { format: 'text/plain', title: 'Text', extension: 'txt' }] }] })))
                    : real(url, options);
            }""")
        b.click("#refresh")
        self.wait_for_names("Plan")
        self.choose("Plan")
        b.click("#download")
        b.wait("return document.querySelector('dialog option')")
        self.assertEqual(
            b.run("return [...document.querySelectorAll('dialog option')].map((one) => one.text)"),
            ["PDF (.pdf)", "Text (.txt)"])
        b.run("document.querySelector('dialog select').value = 'text/plain'")
        self.accept()
        b.wait("return window.asked.some((url) => url.includes('export=text%2Fplain'))")
        b.click(".notice button")
