#!/usr/bin/python3
"""Looks at the page of a running sensor in a real browser. Saves a picture of each view.

  check_page.py demo URL PICTURE-FOLDER COMMAND...               every view with the day of the demonstration; the command makes one more event,
                                                               NEW in it is another number each time
  check_page.py large URL PICTURE-FOLDER AXE-SCRIPT EPISODES     every view with at least so many episodes
"""
import itertools
import subprocess
import sys

from browser import Browser
from check_chart import check_chart
from check_demo import check_demo
from check_large import check_large


def main(how, url, pictures, *rest):
    browser = Browser(url, pictures)
    try:
        if how == "demo":
            check_chart(browser)
            numbers = itertools.count(0x44)

            def inject():
                number = hex(next(numbers))
                subprocess.run([part.replace("NEW", number) for part in rest], check=True, stdout=subprocess.DEVNULL)
            check_demo(browser, inject)
        else:
            check_large(browser, rest[0], int(rest[1]))
    finally:
        browser.quit()
    print(f"page: every view works with the {how} history; pictures in {pictures}")


main(*sys.argv[1:])
