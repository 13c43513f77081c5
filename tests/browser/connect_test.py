"""Connections: made by form, taken down, and what a remote side asks on the way."""
import os
import subprocess
import urllib.error

from page import DAV, PageTest, post, read

TOOLS = f"{os.environ['SOURCE']}/tests/support/servers/remote"
TOOL = f"{os.environ['BUILD']}/tools/zyrovfs/zyrovfs"
FTP = "ftp://remo@127.0.0.1:2121"


def remote(*arguments):
    subprocess.run([TOOLS, *arguments], check=True, stdout=subprocess.DEVNULL)


def connections_are(browser, text):
    browser.wait("return document.querySelector('#connections').textContent.includes(arguments[0])", text)


class Connect(PageTest):
    def setUp(self):
        try:
            post("forget", connection=FTP)
        except urllib.error.HTTPError:
            pass

    def choose_kind(self, protocol):
        b = self.browser
        b.click("#add-connection")
        b.wait("return document.querySelector('dialog select')")
        b.run("""const kind = document.querySelector('dialog select');
            kind.value = arguments[0];
            kind.dispatchEvent(new Event('change'))""", protocol)

    def fill(self, **fields):
        """Each by the text of its label."""
        for label, value in fields.items():
            script = """const label = [...document.querySelectorAll('dialog:last-of-type label')]
                .find((one) => one.textContent === arguments[0].replace('_', ' '));
                label.control.value = ''; return label.control.id"""
            self.browser.type("#" + self.browser.run(script, label), value)

    def problem(self):
        return self.browser.wait("return document.querySelector('dialog .problem').textContent")

    def fill_ftp(self, password):
        self.fill(Server="127.0.0.1", Port="2121", User_name="remo", Password=password, Name="New <i>")

    def test_a_form_adds_a_connection_and_it_is_deleted_again(self):
        b = self.browser
        self.open()
        self.choose_kind("ftp")
        self.fill_ftp("first-secret")
        b.press("Enter")
        self.wait_for_folder()
        self.assertIn("hello.txt", self.names())
        connections_are(b, "New <i>")
        b.click("#forget-connected")
        self.accept()
        b.wait("return !document.querySelector('#connections').textContent.includes('New <i>')")
        self.assertEqual(b.run("return document.body.dataset.view"), "connections")

    def test_what_is_missing_or_refused_is_told_and_the_form_stays_as_it_was(self):
        b = self.browser
        self.open()
        self.choose_kind("ftp")
        # The kind has the focus, and in a list Enter sends nothing.
        b.click("dialog .primary")
        self.assertEqual(self.problem(), "Server: fill this in.")
        self.fill_ftp("wrong")
        b.press("Enter")
        b.wait("return document.querySelector('dialog .problem').textContent.length > 30")
        self.assertEqual(b.run("return document.querySelector('dialog input').value"), "127.0.0.1")
        self.fill(Password="first-secret")
        b.press("Enter")
        self.wait_for_folder()

    def test_a_connection_is_taken_down_and_made_again(self):
        b = self.browser
        self.open(DAV)
        b.click("#disconnect")
        b.wait("return document.body.dataset.view === 'disconnected'")
        connections_are(b, "Disconnected")
        b.wait("return document.activeElement.id === 'connect'")
        b.press("Enter")
        self.wait_for_folder()
        self.assertIn("hello.txt", self.names())

    def test_a_password_that_has_changed_is_asked_for(self):
        b = self.browser
        self.open()
        self.choose_kind("ftp")
        self.fill_ftp("first-secret")
        b.press("Enter")
        self.wait_for_folder()
        b.click("#disconnect")
        b.wait("return document.body.dataset.view === 'disconnected'")
        remote("password", "second-secret")
        try:
            b.click("#connect")
            b.wait("return document.querySelector('dialog h2').textContent === 'Password'")
            self.fill(Password="second-secret")
            b.press("Enter")
            self.wait_for_folder()
        finally:
            remote("password", "first-secret")

    def test_a_saved_account_is_connected_by_choosing_it(self):
        b = self.browser
        subprocess.run([TOOL, "profile", "add", "--user", "amy", "--protocol", "ftp", "--hostname",
                        "127.0.0.1", "--port", "2121", "--account", "remo", "--alias", "Kept",
                        "--password-file", "/tmp/password"], check=True, stdout=subprocess.DEVNULL)
        self.open()
        b.click("#add-connection")
        b.click("dialog .choices button")
        self.wait_for_folder()
        self.assertEqual(b.run("return document.querySelector('#crumbs').textContent"), "Kept")
        subprocess.run([TOOL, "profile", "delete", FTP, "--user", "amy"], check=True,
                       stdout=subprocess.DEVNULL)

    def test_an_unknown_certificate_is_shown_and_kept_when_it_is_trusted(self):
        b = self.browser
        subprocess.run(["openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt",
                        "ec_paramgen_curve:P-256", "-nodes", "-days", "2", "-subj", "/CN=stranger",
                        "-addext", "subjectAltName=DNS:localhost", "-keyout", "/srv/tls/x.key",
                        "-out", "/srv/tls/x.crt"], check=True, stderr=subprocess.DEVNULL)
        with open("/srv/tls/server.pem", "wb") as file:
            file.write(read("/srv/tls/x.key") + read("/srv/tls/x.crt"))
        remote("restart", "dav")
        self.open()
        self.choose_kind("davs")
        self.fill(Server="localhost", Port="8443", User_name="remo", Password="first-secret")
        b.press("Enter")
        b.wait("return document.querySelectorAll('dialog').length === 2")
        shown = b.run("return document.querySelector('dialog:last-of-type').textContent")
        for words in ("not trusted", "Issued to", "stranger", "localhost", "Valid to"):
            self.assertIn(words, shown)
        self.accept()
        b.wait("return document.querySelectorAll('dialog').length === 0 ||"
               " document.querySelector('dialog .problem').textContent !== ''")
        self.assertTrue(os.path.exists("/usr/zyro/etc/zyrovfs/4001/ssl/localhost:8443"))
        remote("certificate", "/srv/tls/server", "localhost")
        remote("restart", "dav")

    def test_a_changed_host_key_is_shown_as_changed_and_its_token_goes_back(self):
        b = self.browser
        self.open()
        self.choose_kind("ftp")
        self.fill_ftp("first-secret")
        # Debian's own backend cannot ask this, so the box's answer is put in its place.
        b.run("""const real = window.fetch;
            window.fetch = async (url, options) => {
                if (!String(url).endsWith('/add') || JSON.parse(options.body).accept === 'the token') {
                    return real(url, options);
                }
                return new Response(JSON.stringify({ error: { status: 409, meaning: 'x', trust: {
                    kind: 'host_key', host: '<b>host</b>', fingerprint: 'SHA256:abc', changed: true,
                    token: 'the token' } } }), { status: 409 });
            }""")
        b.press("Enter")
        b.wait("return document.querySelectorAll('dialog').length === 2")
        shown = b.run("return document.querySelector('dialog:last-of-type').textContent")
        for words in ("CHANGED", "SHA256:abc", "<b>host</b>", "listening"):
            self.assertIn(words, shown)
        self.accept()
        self.wait_for_folder()
