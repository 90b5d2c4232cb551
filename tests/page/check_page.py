#!/usr/bin/python3
"""Looks at the page of a running sensor in a real browser: every view, the keyboard alone, no message in the console, no
request to elsewhere, charts that are not blank, several widths. Saves a picture of each view.

  check_page.py URL PICTURE-FOLDER
"""
import os
import sys
import time

from selenium import webdriver
from selenium.webdriver.chrome.options import Options
from selenium.webdriver.chrome.service import Service
from selenium.webdriver.common.keys import Keys

PATIENCE = 30


def wait_for(what, condition):
    """The condition's value once it is true; ends the check where it is not in time."""
    end = time.monotonic() + PATIENCE
    while time.monotonic() < end:
        value = condition()
        if value:
            return value
        time.sleep(0.1)
    sys.exit(f"page: waited {PATIENCE} s for {what}")


def require(what, holds):
    if not holds:
        sys.exit(f"page: {what}")


def start_browser():
    options = Options()
    for argument in ("--headless", "--no-sandbox", "--disable-gpu", "--no-first-run", "--disable-background-networking",
                     "--disable-component-update", "--disable-sync", "--disable-quic", "--window-size=1280,800"):
        options.add_argument(argument)
    options.set_capability("goog:loggingPrefs", {"browser": "ALL"})
    return webdriver.Chrome(service=Service("/usr/bin/chromedriver"), options=options)


def colors_of_chart(browser):
    """How many different colors the chart has."""
    return browser.execute_script(
        "const c = document.getElementById('chart'), d = c.getContext('2d').getImageData(0, 0, c.width, c.height).data;"
        "const s = new Set(); for (let i = 0; i < d.length; i += 4) s.add(d[i] << 16 | d[i + 1] << 8 | d[i + 2]);"
        "return s.size;")


def text_of(browser, name):
    return browser.find_element("id", name).text


def check(browser, url, pictures):
    browser.get(url + "#now")
    wait_for("the state", lambda: text_of(browser, "headline").startswith("COLLECTING"))
    wait_for("the remote ports", lambda: "queue-full" in text_of(browser, "ports"))
    wait_for("the stream", lambda: text_of(browser, "live") == "Live")
    browser.save_screenshot(os.path.join(pictures, "now.png"))

    browser.get(url + "#timeline;range=15m")
    wait_for("the chart", lambda: "live" in text_of(browser, "range-text"))
    require("the chart is blank", colors_of_chart(browser) > 5)
    chart = browser.find_element("id", "chart")
    chart.send_keys("]")
    wait_for("a cell with events", lambda: "queue-full" in text_of(browser, "cell-text"))
    chart.send_keys(Keys.ENTER)
    wait_for("the episodes of the cell", lambda: "queue-full" in text_of(browser, "panel-episodes"))
    require("the panel names no command", "tavik events --since" in text_of(browser, "panel-command"))
    require("the panel has not got the focus",
            browser.execute_script("return document.activeElement.id") == "panel-title")
    browser.save_screenshot(os.path.join(pictures, "timeline.png"))

    browser.get(url + "#events;kind=queue-full;since=1h")
    wait_for("the episodes", lambda: "queue-full" in text_of(browser, "events"))
    require("the filter lets other kinds through", "plogi" not in text_of(browser, "events"))
    browser.save_screenshot(os.path.join(pictures, "events.png"))

    for width in (360, 768, 2560):
        browser.set_window_size(width, 800)
        browser.get(url + "#timeline;range=15m")
        wait_for(f"the chart at {width}", lambda: colors_of_chart(browser) > 5)
        wide = browser.execute_script("return document.documentElement.scrollWidth - document.documentElement.clientWidth")
        require(f"at {width} pixels the page is {wide} pixels too wide", wide <= 0)

    requests = browser.execute_script("return performance.getEntriesByType('resource').map((entry) => entry.name)")
    foreign = [request for request in requests if not request.startswith(url)]
    require(f"requests to elsewhere: {foreign}", not foreign)
    # Reading the chart's colors back makes the browser remark on that, not on the page.
    messages = [message for message in browser.get_log("browser") if message["source"] != "rendering"]
    require(f"messages in the console: {messages}", not messages)


def main(url, pictures):
    os.makedirs(pictures, exist_ok=True)
    browser = start_browser()
    try:
        check(browser, url, pictures)
    finally:
        browser.quit()
    print(f"page: every view works; pictures in {pictures}")


main(*sys.argv[1:])
