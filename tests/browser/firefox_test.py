"""The road up and down in the other browser."""

from page import CLOUDS, PageTest, noise, read
from webdriver import Firefox


class InFirefox(PageTest):
    @classmethod
    def setUpClass(cls):
        cls.browser = Firefox()

    def tearDown(self):
        pass

    def test_a_file_goes_up_and_comes_down_again(self):
        b = self.browser
        source = noise("/tmp/fox 🦊.bin", 5_000_000)
        self.open(CLOUDS["dropbox"])
        b.type("#choose-files-input", source)
        b.wait("return document.querySelector('.transfer[data-state=done]')")
        b.wait("return [...document.querySelectorAll('#grid .name span')]"
               ".some((one) => one.textContent === 'fox 🦊.bin')")
        self.choose("fox 🦊.bin")
        b.click("#download")
        self.assertEqual(read(b.downloaded("fox 🦊.bin")), read(source))


