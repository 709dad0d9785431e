"""A real browser for the tests of the pages: Chromium in a profile of its own, driven through its
driver. Pictures of the pages are left in the build's Testing/pictures, or in the folder that
TUVO_SCREENSHOTS names. To be imported in a test program, which it ends as skipped where there is no
browser."""

import atexit
import json
import os
import shutil
import socket
import tempfile
import sys
import time
import unittest
import urllib.parse

import visitor_server as vs

CHROMIUM = "/usr/bin/chromium"
DRIVER = "/usr/bin/chromedriver"
for needed, package in (CHROMIUM, "chromium"), (DRIVER, "chromium-driver"):
    if not os.path.exists(needed):
        vs.skip(f"the package {package} is missing")
try:
    from selenium import webdriver
    from selenium.common.exceptions import WebDriverException
    from selenium.webdriver.chrome.service import Service
    from selenium.webdriver.common.by import By
    from selenium.webdriver.common.keys import Keys  # pylint: disable=unused-import
except ImportError:
    vs.skip("the package python3-selenium is missing")

# The browser and its driver talk to each other by that name.
try:
    socket.getaddrinfo("localhost", 80)
except OSError:
    vs.skip("the name localhost is not known here: no /etc/hosts")

FLAGS = ("--headless", "--no-sandbox", "--disable-gpu", "--disable-quic", "--no-first-run",
         "--disable-background-networking", "--disable-component-update", "--disable-sync",
         "--host-resolver-rules=MAP * ~NOTFOUND, EXCLUDE 127.0.0.1", "--no-proxy-server",
         "--window-size=800,640")
PATIENCE = 120  # seconds
SET_SIZE = "Emulation.setDeviceMetricsOverride"


class _Chrome(webdriver.Chrome):
    """Remembers what was asked of the browser behind the driver's back."""

    def __init__(self, **options):
        self.commands = set()
        super().__init__(**options)

    def execute_cdp_cmd(self, cmd, cmd_args):
        self.commands.add(cmd)
        return super().execute_cdp_cmd(cmd, cmd_args)


class _Running:
    """A browser's process. Starting one takes longer than most tests, so that it is used again,
    cleaned, by whoever needs one next."""

    idle = []

    def __init__(self):
        self.account = None  # that it remembers, as the tests of a page that asks for one have it
        self.profile = tempfile.mkdtemp()
        self.downloads = os.path.join(self.profile, "downloads")
        os.mkdir(self.downloads)
        options = webdriver.ChromeOptions()
        options.binary_location = CHROMIUM
        for flag in FLAGS + ("--user-data-dir=" + self.profile,):
            options.add_argument(flag)
        options.add_experimental_option("prefs", {"download.default_directory": self.downloads,
                                                  "download.prompt_for_download": False})
        options.set_capability("goog:loggingPrefs", {"browser": "ALL", "performance": "ALL"})
        try:
            self.browser = _Chrome(service=Service(DRIVER), options=options)
        except BaseException:
            shutil.rmtree(self.profile, ignore_errors=True)
            raise
        self.browser.set_page_load_timeout(300)
        self.browser.set_script_timeout(300)
        atexit.register(self.end)

    def clean(self):
        """What a page left behind: in a new tab there is no emulation, no script and no page of the
        old one, but it takes as long as all else here, and most tests only choose a size. Cookies,
        storage and cache are of the whole profile. The account that was signed in last is
        remembered."""
        if self.browser.commands <= {SET_SIZE}:
            self.browser.get("about:blank")
            self.browser.execute_cdp_cmd("Emulation.clearDeviceMetricsOverride", {})
        else:
            old = self.browser.current_window_handle
            self.browser.switch_to.new_window("tab")
            new = self.browser.current_window_handle
            self.browser.switch_to.window(old)
            self.browser.close()
            self.browser.switch_to.window(new)
        self.browser.execute_cdp_cmd("Network.clearBrowserCookies", {})
        self.browser.execute_cdp_cmd("Network.clearBrowserCache", {})
        self.browser.execute_cdp_cmd("Storage.clearDataForOrigin",
                                     {"origin": "*", "storageTypes": "all"})
        self.browser.commands.clear()
        for log in "browser", "performance":
            self.browser.get_log(log)
        for name in os.listdir(self.downloads):
            os.unlink(os.path.join(self.downloads, name))

    def end(self):
        self.browser.quit()
        shutil.rmtree(self.profile, ignore_errors=True)


class Browser:
    """A browser that has been nowhere yet, from start() to quit()."""

    def start(self):
        self.running = _Running.idle.pop() if _Running.idle else _Running()
        self.browser = self.running.browser
        self.downloads = self.running.downloads
        return self

    def quit(self):
        self.running.clean()
        _Running.idle.append(self.running)

    def __enter__(self):
        return self.start()

    def __exit__(self, *_):
        self.quit()

    def go(self, address):
        self.browser.get(address)

    # ---- looking ----

    def wait_for(self, look, wanted):
        """A pressed button or link returns before the next page is there."""
        end = time.monotonic() + PATIENCE
        while True:
            late = time.monotonic() > end  # told before the look, which may take long itself
            try:
                seen = look()
                if wanted(seen):
                    return
            except (WebDriverException, AssertionError) as missing:  # between two pages
                seen = missing
            if late:
                raise AssertionError(f"the browser ends up with: {seen}")
            time.sleep(0.05)

    def text(self):
        return self.browser.find_element(By.TAG_NAME, "main").text

    def assert_heading(self, text):
        self.wait_for(lambda: self.browser.find_element(By.TAG_NAME, "h1").text,
                      lambda seen: seen == text)

    def assert_says(self, text):
        self.wait_for(self.text, lambda seen: text in seen)

    def assert_arrives_at(self, address):
        self.wait_for(lambda: self.browser.current_url, lambda seen: seen == address)

    def field(self, label):
        """By its label, as a person finds it: the one that is shown, and in front."""
        found = self.browser.execute_script(
            "const within = [...document.querySelectorAll('dialog[open]')].at(-1) ?? document;"
            "return [...within.querySelectorAll('label')]"
            "    .find((one) => one.textContent.trim().replace(/\\s+/g, ' ') === arguments[0] &&"
            "                   one.checkVisibility({visibilityProperty: true}))?.control", label)
        if found is None:
            raise AssertionError(f"no field is labelled: {label}")
        return found

    def assert_focus(self, look):
        """On what `look` finds; pages give it away a moment after what they do."""
        self.wait_for(lambda: (self.browser.switch_to.active_element, look()),
                      lambda seen: seen[0] == seen[1])

    def assert_text(self, identifier, text):
        """The element of this id says so, perhaps after a moment."""
        self.wait_for(lambda: self.browser.find_element(By.ID, identifier).text,
                      lambda seen: text in seen)

    def style(self, selector, name):
        return self.browser.execute_script(
            "return getComputedStyle(document.querySelector(arguments[0]))[arguments[1]]",
            selector, name)

    def fits_width(self):
        """Nothing has to be scrolled sideways."""
        return self.browser.execute_script(
            "return document.documentElement.scrollWidth <= window.innerWidth")

    def policy_complaints(self):
        """What the pages' Content-Security-Policy refused since this was last asked."""
        return [entry["message"] for entry in self.browser.get_log("browser")
                if "Security Policy" in entry["message"]]

    def hosts(self):
        """The hosts that anything was asked of since this was last asked."""
        found = set()
        for entry in self.browser.get_log("performance"):
            message = json.loads(entry["message"])["message"]
            if message["method"] == "Network.requestWillBeSent":
                address = urllib.parse.urlsplit(message["params"]["request"]["url"])
                if address.scheme not in ("data", "blob", "chrome", "devtools"):
                    found.add(f"{address.hostname}:{address.port}")
        return found

    # ---- doing ----

    def press(self, button):
        self.browser.find_element(By.XPATH, f"//button[.='{button}']").click()

    def picture(self, name):
        os.makedirs(_Result.folder, exist_ok=True)
        self.browser.save_screenshot(os.path.join(_Result.folder, name + ".png"))

    def downloaded(self):
        """Name and content of the file that the browser was sent."""
        for _ in range(PATIENCE * 20):
            names = os.listdir(self.downloads)
            # The browser writes under a hidden name, then under one of its own, before the file's.
            if names and not any(name.startswith(".") or name.endswith(".crdownload")
                                 for name in names):
                path = os.path.join(self.downloads, names[0])
                with open(path, "rb") as file:
                    content = file.read()
                os.unlink(path)
                return names[0], content
            time.sleep(0.05)
        raise AssertionError("nothing was downloaded; the page says: " + self.text())

    def set_scheme(self, scheme):
        """"light" or "dark", as the person's desktop would say."""
        self.browser.execute_cdp_cmd("Emulation.setEmulatedMedia", {
            "features": [{"name": "prefers-color-scheme", "value": scheme}]})

    def set_size(self, width, height):
        """Of the page itself; narrower than the windows that the browser opens."""
        self.browser.execute_cdp_cmd(SET_SIZE, {
            "width": width, "height": height, "deviceScaleFactor": 1, "mobile": False})
        self.wait_for(lambda: self.browser.execute_script("return [innerWidth, innerHeight]"),
                      lambda seen: seen == [width, height])


class _Result(unittest.TextTestResult):
    """Keeps a picture of the page for every test that fails, as it is in that moment."""

    folder = ""

    def keep(self, test):
        test = getattr(test, "test_case", test)  # of a part of a test
        if not hasattr(test, "browser"):
            return
        try:
            os.makedirs(self.folder, exist_ok=True)
            test.browser.save_screenshot(os.path.join(self.folder, test.id() + ".png"))
        except WebDriverException as error:
            print("no picture:", error, file=sys.stderr)

    def addError(self, test, err):
        super().addError(test, err)
        self.keep(test)

    def addFailure(self, test, err):
        super().addFailure(test, err)
        self.keep(test)

    def addSubTest(self, test, subtest, err):
        super().addSubTest(test, subtest, err)
        if err is not None:
            self.keep(test)


def run_tests():
    """Runs the tests of the program, which was started with the build folder and the project's
    folder and perhaps names of tests; the status to end with."""
    _Result.folder = (os.environ.get("TUVO_SCREENSHOTS") or
                      os.path.join(sys.argv[1], "Testing", "pictures"))
    runner = unittest.TextTestRunner(verbosity=2, resultclass=_Result)
    program = unittest.main(argv=sys.argv[:1] + sys.argv[3:], testRunner=runner, exit=False)
    return 0 if program.result.wasSuccessful() else 1
