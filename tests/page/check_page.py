#!/usr/bin/python3
"""Looks at the page of a running sensor in a real browser. Saves a picture of each view.

  check_page.py demo URL PICTURE-FOLDER COMMAND...               every view with few events; the command makes one more
  check_page.py large URL PICTURE-FOLDER AXE-SCRIPT EPISODES     every view with at least so many episodes
"""
import subprocess
import sys

from browser import Browser
from check_demo import check_demo
from check_large import check_large


def main(how, url, pictures, *rest):
    browser = Browser(url, pictures)
    try:
        if how == "demo":
            check_demo(browser, lambda: subprocess.run(rest, check=True, stdout=subprocess.DEVNULL))
        else:
            check_large(browser, rest[0], int(rest[1]))
    finally:
        browser.quit()
    print(f"page: every view works with the {how} history; pictures in {pictures}")


main(*sys.argv[1:])
