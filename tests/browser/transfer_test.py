"""Files on their way up and down."""
import os
import shutil

from page import CLOUDS, DAV, PageTest, REMOTE, SERVER, noise, post, read, write


class Transfer(PageTest):
    def setUp(self):
        self.browser.devtools("Network.enable")
        shutil.rmtree(f"{REMOTE}/up", ignore_errors=True)
        os.mkdir(f"{REMOTE}/up")
        os.chmod(f"{REMOTE}/up", 0o777)
        shutil.rmtree("/tmp/source", ignore_errors=True)
        os.mkdir("/tmp/source")

    def done(self, many):
        self.browser.wait("return document.querySelectorAll('.transfer[data-state=done]').length"
                          " === arguments[0]", many)

    def drop(self, *paths):
        place = self.browser.run("""const box = document.querySelector('#grid').getBoundingClientRect();
            return [box.x + box.width / 2, box.y + box.height / 2]""")
        for kind in ("dragEnter", "dragOver", "drop"):
            self.browser.devtools(
                "Input.dispatchDragEvent", type=kind, x=place[0], y=place[1],
                data={"items": [], "files": list(paths), "dragOperationsMask": 1})

    def up_and_down(self, connection, folder, arrived=lambda source: None):
        """In an empty folder. arrived(source) looks at the other side, before the file is deleted there."""
        b = self.browser
        source = noise("/tmp/source/report ü.bin", 3_000_000)
        self.open(connection, folder)
        b.type("#choose-files-input", source)
        self.done(1)
        self.wait_for_names("report ü.bin")
        arrived(source)
        b.click("#grid .rows > :first-child")
        b.click("#download")
        loaded = b.downloaded("report ü.bin")
        self.assertEqual(read(loaded), read(source))
        os.unlink(loaded)
        b.click("#delete")
        self.accept()
        self.wait_for_names()

    def test_a_file_goes_up_to_each_cloud_and_comes_down_again(self):
        for name, connection in CLOUDS.items():
            with self.subTest(name):
                folder = ("/My Drive" if name == "google" else "") + "/up and down"
                post("mkdir", connection=connection, path=folder)
                self.up_and_down(connection, folder)
                post("delete", connection=connection, path=folder)

    def test_a_file_goes_up_to_a_server_and_comes_down_again(self):
        self.up_and_down(SERVER, "/up", lambda source: self.assertEqual(
            read(f"{REMOTE}/up/report ü.bin"), read(source)))
        self.assertEqual(os.listdir(f"{REMOTE}/up"), [])

    def test_a_dropped_folder_arrives_whole(self):
        os.makedirs("/tmp/source/tree/inner/empty")
        for path in ("a", "inner/b <c>", "inner/none"):
            noise(f"/tmp/source/tree/{path}", 0 if path.endswith("none") else 1000)
        self.open(DAV, "/up")
        self.drop("/tmp/source/tree", noise("/tmp/source/beside", 10))
        self.done(7)
        for folder, _, files in os.walk("/tmp/source"):
            for name in files:
                path = os.path.relpath(os.path.join(folder, name), "/tmp/source")
                self.assertEqual(read(f"{REMOTE}/up/{path}"), read(f"/tmp/source/{path}"), path)
        self.assertTrue(os.path.isdir(f"{REMOTE}/up/tree/inner/empty"))

    def test_a_dropped_folder_of_ten_thousand_files_is_counted_and_the_page_lives(self):
        b = self.browser
        for at in range(100):
            os.makedirs(f"/tmp/source/many/{at}")
            for number in range(100):
                write(f"/tmp/source/many/{at}/{number}", b"x")
        self.open(DAV, "/up")
        b.run("""window.seen = [];
            new MutationObserver(() => {
                const text = document.querySelector('dialog [role=status]')?.textContent;
                if (text) window.seen.push(text);
            }).observe(document.body, { subtree: true, childList: true, characterData: true })""")
        self.drop("/tmp/source/many")
        b.wait("return document.querySelector('#uploads-sum').textContent.includes('10,101 uploads')")
        self.assertIn("files in", "".join(b.run("return window.seen")))
        self.assertLess(b.run("return document.querySelectorAll('.transfer').length"), 60)
        b.click("#cancel-uploads")
        b.wait("return document.querySelector('#cancel-uploads').hidden")

    def test_a_count_is_stopped_and_nothing_goes_up(self):
        b = self.browser
        self.open(DAV, "/up")
        # A folder that the browser never comes to the end of.
        b.run("""DataTransferItem.prototype.webkitGetAsEntry = () => ({
                isDirectory: true, fullPath: '/x', createReader: () => ({ readEntries() {} }) })""")
        self.drop("/tmp/source")
        b.click("dialog button")
        b.wait("return !document.querySelector('dialog')")
        self.assertEqual(os.listdir(f"{REMOTE}/up"), [])

    def test_a_failure_stays_and_that_file_is_tried_again(self):
        b = self.browser
        os.mkdir(f"{REMOTE}/up/closed", 0o755)
        source = noise("/tmp/source/again.bin", 10_000)
        self.open(SERVER, "/up/closed")
        b.type("#choose-files-input", source)
        b.wait("return document.querySelector('.transfer[data-state=failed] .detail').textContent.length > 20")
        self.go_up()
        self.assertTrue(b.run("return Boolean(document.querySelector('.transfer[data-state=failed]'))"))
        os.chmod(f"{REMOTE}/up/closed", 0o777)
        b.click("[aria-label^='Try again']")
        self.done(1)
        self.assertEqual(read(f"{REMOTE}/up/closed/again.bin"), read(source))
        b.click("[aria-label^='Dismiss']")
        b.wait("return !document.querySelector('.transfer')")

    def go_up(self):
        self.browser.click(f"#crumbs li:nth-last-child(2) button")
        self.wait_for_folder()

    def test_one_upload_of_several_is_cancelled_and_the_others_arrive(self):
        b = self.browser
        self.open(DAV, "/up")
        b.devtools("Network.emulateNetworkConditions", offline=False, latency=0,
                   downloadThroughput=-1, uploadThroughput=400_000)
        files = [noise(f"/tmp/source/{name}", size)
                 for name, size in (("a", 40_000_000), ("b", 1000), ("c", 1000))]
        b.type("#choose-files-input", "\n".join(files))
        b.wait("return /MB of|KB of/.test(document.querySelector('.transfer[data-state=running]"
               " .detail')?.textContent)")
        b.click("[aria-label='Cancel: up/a']")
        b.devtools("Network.emulateNetworkConditions", offline=False, latency=0,
                   downloadThroughput=-1, uploadThroughput=-1)
        self.done(2)
        self.wait_for_names("b", "c")

    def test_a_name_that_is_taken_is_asked_about(self):
        b = self.browser
        write(f"{REMOTE}/up/old", b"old")
        os.chmod(f"{REMOTE}/up/old", 0o666)
        files = "\n".join([write("/tmp/source/old", b"new"), write("/tmp/source/fresh", b"fresh")])
        self.open(SERVER, "/up")
        b.type("#choose-files-input", files)
        b.click("dialog [value=skip]")
        self.done(1)
        self.assertEqual(read(f"{REMOTE}/up/old"), b"old")
        b.type("#choose-files-input", files)
        self.accept()
        self.done(3)
        self.assertEqual(read(f"{REMOTE}/up/old"), b"new")

    def test_a_download_of_what_has_gone_is_told_in_words(self):
        b = self.browser
        write(f"{REMOTE}/up/gone", b"x")
        self.open(SERVER, "/up")
        self.wait_for_names("gone")
        post("delete", connection=SERVER, path="/up/gone")
        self.choose("gone")
        b.click("#download")
        b.wait("return document.querySelector('.notice').textContent.includes('gone')")
        b.click(".notice button")
