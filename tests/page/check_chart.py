"""What the chart makes of documents that are made up: tests/page/chart_checks.js, one promise a check."""
import os

from browser import require


def check_chart(browser):
    with open(os.path.join(os.path.dirname(__file__), "chart_checks.js"), encoding="utf-8") as file:
        body = file.read()
    browser.open("#now")
    for media, scheme in (("", "light"), ("", "dark"), ("print", "light")):
        browser.media(media, scheme)
        results = browser.driver.execute_async_script(
            f"const done = arguments[0]; (async () => {{ {body} }})().then(done, (e) => done([['the checks run', String(e)]]));")
        require("no check of the chart ran", len(results) > 10)
        # On paper patterns are in the place of colors: what looks at single colors does not hold there.
        wrong = [f"{name}: {what}" for name, what in results if what and (media == "" or "on paper" in name)]
        require(f"the chart, {media or scheme}: " + "; ".join(wrong), not wrong)
    browser.media()
    print(f"page: the chart keeps {len(results)} promises, in light, in dark and on paper", flush=True)
