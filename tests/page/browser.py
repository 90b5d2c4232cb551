"""A browser with the page in it, and what the checks ask of it."""
import os
import sys
import time

from selenium import webdriver
from selenium.webdriver.chrome.options import Options
from selenium.webdriver.chrome.service import Service
from selenium.webdriver.common.action_chains import ActionChains

PATIENCE = 40
# Reading a chart's colors back makes the browser remark on that, not on the page.
HARMLESS = ("rendering",)


def fail(what):
    sys.exit(f"page: {what}")


def require(what, holds):
    if not holds:
        fail(what)


def is_stream_limit(message):
    """The sensor has 8 streams, and notices within 15 s that a page is gone: pages that are loaded faster are refused one
    for a while."""
    return "/api/v1/stream" in message and "503" in message


class Browser:
    def __init__(self, url, pictures):
        options = Options()
        for argument in ("--headless", "--no-sandbox", "--disable-gpu", "--no-first-run", "--disable-background-networking",
                         "--disable-component-update", "--disable-sync", "--disable-quic", "--disable-dev-shm-usage",
                         "--window-size=1280,900"):
            options.add_argument(argument)
        options.set_capability("goog:loggingPrefs", {"browser": "ALL"})
        self.driver = webdriver.Chrome(service=Service("/usr/bin/chromedriver"), options=options)
        self.driver.set_script_timeout(120)
        self.url = url
        self.pictures = pictures
        os.makedirs(pictures, exist_ok=True)

    # ---- going places ----

    def open(self, address):
        """A view, loaded from nothing."""
        self.driver.get("about:blank")
        self.driver.get(self.url + address)

    def resize(self, width, height=900):
        self.driver.set_window_size(width, height)

    def media(self, media="", scheme="light"):
        self.driver.execute_cdp_cmd("Emulation.setEmulatedMedia", {
            "media": media, "features": [{"name": "prefers-color-scheme", "value": scheme}]})

    def picture(self, name):
        self.driver.save_screenshot(os.path.join(self.pictures, f"{name}.png"))

    # ---- asking ----

    def wait(self, what, condition):
        """The condition's value once it is true."""
        end = time.monotonic() + PATIENCE
        while time.monotonic() < end:
            value = condition()
            if value:
                return value
            time.sleep(0.05)
        self.picture("failed")
        return fail(f"waited {PATIENCE} s for {what}")

    def run(self, script, *arguments):
        return self.driver.execute_script(script, *arguments)

    def find(self, name):
        return self.driver.find_element("id", name)

    def text(self, name):
        return self.find(name).text

    def wait_text(self, name, part):
        return self.wait(f"\"{part}\" in {name}", lambda: part in self.text(name))

    def wait_loaded(self):
        self.wait("the chart's data", lambda: self.find("chart").get_attribute("aria-busy") == "false")

    def address(self):
        return self.run("return decodeURIComponent(location.hash)")

    def focus(self):
        return self.run("return document.activeElement.id")

    def colors(self, name):
        """How many different colors a canvas has."""
        return self.run(
            "const c = document.getElementById(arguments[0]); if (c.width === 0) return 0;"
            "const d = c.getContext('2d').getImageData(0, 0, c.width, c.height).data;"
            "const s = new Set(); for (let i = 0; i < d.length; i += 4) s.add(d[i] << 16 | d[i + 1] << 8 | d[i + 2]);"
            "return s.size;", name)

    def most_saturated(self, name):
        """How far the most colorful pixel of a canvas is from gray."""
        return self.run(
            "const c = document.getElementById(arguments[0]);"
            "const d = c.getContext('2d').getImageData(0, 0, c.width, c.height).data; let m = 0;"
            "for (let i = 0; i < d.length; i += 4) m = Math.max(m, Math.max(d[i], d[i+1], d[i+2]) - Math.min(d[i], d[i+1], d[i+2]));"
            "return m;", name)

    def ask(self, path):
        """A document of the sensor, and the milliseconds that it took."""
        return self.driver.execute_async_script(
            "const done = arguments[1]; const begin = performance.now();"
            "fetch(arguments[0]).then((r) => r.json()).then((d) => done([d, performance.now() - begin]));", path)

    # ---- doing ----

    def keys(self, name, *keys):
        self.find(name).send_keys(*keys)

    def press(self, *keys):
        """Keys for whatever has the focus."""
        ActionChains(self.driver).send_keys(*keys).perform()

    def click(self, name, place):
        """With the mouse, at a place of an element: [x, y] from its middle."""
        ActionChains(self.driver).move_to_element_with_offset(self.find(name), *place).click().perform()

    def hover(self, name, place):
        ActionChains(self.driver).move_to_element_with_offset(self.find(name), *place).perform()

    def drag(self, name, begin, end, key=None):
        """With the mouse, from one place of an element to another; each is [x, y] from its middle."""
        element = self.find(name)
        actions = ActionChains(self.driver)
        if key:
            actions.key_down(key)
        actions.move_to_element_with_offset(element, *begin).click_and_hold()
        actions.move_to_element_with_offset(element, (begin[0] + end[0]) // 2, end[1])
        actions.move_to_element_with_offset(element, *end).release()
        if key:
            actions.key_up(key)
        actions.perform()

    # ---- what holds in every view ----

    def check_quiet(self, where):
        """No message in the console, no request to elsewhere, nothing wider than the window."""
        messages = [message for message in self.driver.get_log("browser")
                    if message["source"] not in HARMLESS and not is_stream_limit(message["message"])]
        require(f"{where}: messages in the console: {messages}", not messages)
        requests = self.run("return performance.getEntriesByType('resource').map((entry) => entry.name)")
        foreign = [request for request in requests if not request.startswith(self.url)]
        require(f"{where}: requests to elsewhere: {foreign}", not foreign)
        wide = self.run("return document.documentElement.scrollWidth - document.documentElement.clientWidth")
        require(f"{where}: the page is {wide} pixels too wide", wide <= 0)

    def check_accessible(self, where, checker):
        """What the accessibility checker calls serious or critical is an error."""
        with open(checker, encoding="utf-8") as file:
            self.run(file.read())
        result = self.driver.execute_async_script(
            "const done = arguments[0]; axe.run(document, {resultTypes: ['violations']}).then((r) => done(r.violations), (e) => done(String(e)));")
        require(f"{where}: the accessibility checker did not run: {result}", isinstance(result, list))
        grave = [f"{each['id']}: {each['help']}: {[node['html'][:160] for node in each['nodes'][:3]]}"
                 for each in result if each["impact"] in ("serious", "critical")]
        require(f"{where}: not accessible: {grave}", not grave)

    def quit(self):
        self.driver.quit()
