"""Every view with a large history and beside it a damaged one that was set aside: answers in time, charts with something in
them, accessible in light and dark, at all widths, and on paper. Keeps a picture of each."""
import os

from browser import require
from check_cells import check_table

MOST_MILLISECONDS = 1000
SET_ASIDE = "a damaged history was set aside as"
UNWRITABLE = "does not work:"
VIEWS = {
    "now": ("#now", "headline", "COLLECTING"),
    "timeline": ("#timeline;range=30d", "range-text", " to "),
    "paths": ("#paths", "paths-text", "with trouble"),
    "compare": ("#compare;mark=firmware-9.1", "compare-rates", "queue-full"),
    "events": ("#events;since=30d", "events-text", "newest 1,000"),
}
WIDTHS = (360, 768, 2560)  # beside the 1280 of all other checks


def show(browser, view):
    address, name, part = VIEWS[view]
    browser.open(address)
    browser.wait_text(name, part)
    if view == "now":
        browser.wait("the remote ports", lambda: "array7" in browser.text("ports"))
        browser.wait_text("notes", SET_ASIDE)
    if view == "paths":
        browser.wait("the drawing", lambda: browser.run("return document.querySelectorAll('#paths-map .route').length") > 20)
        require("a path with trouble is not marked", browser.run("return document.querySelectorAll('.trouble-chip').length") > 0)
    if view == "timeline":
        browser.wait("the chart", lambda: browser.colors("chart") > 20)
        browser.wait("the overview", lambda: browser.colors("overview") > 4)


def check_times(browser, episodes):
    document, _ = browser.ask("/api/v1/events?limit=1")
    number = document["episodes"][0]["episode"]
    require(f"the history has {number} episodes, fewer than {episodes}", number >= episodes)
    for path in ("status", "events", "ports?since=30d", "paths", "timeline?from=30d&columns=240", "timeline?from=24h&columns=100",
                 f"explain?subject={number}"):
        _, took = browser.ask(f"/api/v1/{path}")
        print(f"page: {took:7.1f} ms  /api/v1/{path}", flush=True)
        require(f"{path} took {took:.0f} ms, more than {MOST_MILLISECONDS}", took <= MOST_MILLISECONDS)


def check_hatching(browser):
    """Where Tavik did not run, every row is hatched: in its column no row is blank from top to bottom."""
    show(browser, "timeline")
    blank = browser.driver.execute_async_script(
        "const done = arguments[0];"
        "fetch('/api/v1/timeline?from=30d&columns=1').then((r) => r.json()).then((d) => {"
        "  const c = document.getElementById('chart'), ratio = c.width / c.clientWidth;"
        "  const gutter = Math.round(Math.min(240, Math.max(96, c.clientWidth * 0.2)));"
        "  const [from, to] = [Date.parse(d.from), Date.parse(d.to)];"
        "  const middle = (Date.parse(d.runs[0].to) + Date.parse(d.runs[1].from)) / 2;"
        "  const x = gutter + (middle - from) / (to - from) * (c.clientWidth - gutter);"
        "  const p = c.getContext('2d').getImageData(Math.round((x - 4) * ratio), 30 * ratio, 8 * ratio, c.height - 30 * ratio);"
        "  let blank = 0, most = 0;"
        "  for (let y = 0; y < p.height; ++y) { const s = new Set();"
        "    for (let i = 0; i < p.width; ++i) { const o = 4 * (y * p.width + i); s.add(p.data[o] << 16 | p.data[o+1] << 8 | p.data[o+2]); }"
        "    blank = s.size > 1 ? 0 : blank + 1; most = Math.max(most, blank); }"
        "  done(most); });")
    require(f"{blank} lines of the outage are not hatched", blank <= 6)


def check_views(browser, checker):
    for scheme in ("light", "dark"):
        browser.media(scheme=scheme)
        for view in VIEWS:
            show(browser, view)
            browser.check_accessible(f"{view}, {scheme}", checker)
            browser.picture(f"{view}-{scheme}")
            browser.check_quiet(f"{view}, {scheme}")
    browser.media()


def check_widths(browser):
    for width in WIDTHS:
        browser.resize(width)
        for view in VIEWS:
            show(browser, view)
            browser.check_quiet(f"{view} at {width} pixels")
            browser.picture(f"{view}-{width}")
    browser.resize(1280)


def check_paper(browser):
    show(browser, "timeline")
    require("the chart has no colors on a screen", browser.most_saturated("chart") > 60)
    browser.media(media="print")
    browser.wait("patterns in place of colors", lambda: browser.most_saturated("chart") <= 8)
    require("the chart is blank on paper", browser.colors("chart") > 5)
    for name in ("ranges", "pause", "cell-text"):
        require(f"{name} is on paper", not browser.find(name).is_displayed())
    for name, what in (("legend", "load"), ("letters", "queue-full")):
        require(f"what the {name} say is not on paper", browser.find(name).is_displayed() and what in browser.text(name))
    require("the host's name is not on paper", browser.text("host") != "")
    browser.picture("timeline-paper")
    browser.media()
    browser.wait("colors again", lambda: browser.most_saturated("chart") > 60)


def check_notes(browser):
    """Notes, and outputs that do not work, are in Now as in `tavik status`, each once, and are gone when their cause is."""
    notes = "return [...document.querySelectorAll('#notes li')].map((line) => line.textContent)"

    def told():
        status = browser.ask("/api/v1/status")[0]
        return [f"Note: {text}" for text in status["unknown"]] + [f"Output: {warning['text']}" for warning in status["warnings"]]
    browser.open("#now")
    for text in (SET_ASIDE, UNWRITABLE):
        browser.wait_text("notes", text)
    browser.wait("the notes of the document", lambda: browser.run(notes) == told())
    browser.wait("the remote ports", lambda: "array7" in browser.text("ports"))
    for text in (SET_ASIDE, UNWRITABLE):
        require(f"'{text}' is not there once", browser.text("view-now").count(text) == 1)
    parts = browser.driver.execute_async_script("import('/troubles.js').then((m) => arguments[0](m.noteBox(['a', '<i>a</i>']).children.length))")
    require("a note's text is read as markup", parts == 1)
    for path in browser.ask("/api/v1/status")[0]["damagedHistories"]:
        os.remove(path)
    browser.open("#now")
    browser.wait("the remote ports", lambda: "array7" in browser.text("ports"))
    browser.wait("the notes of the document", lambda: browser.run(notes) == told())
    require("the note stays", SET_ASIDE not in browser.text("view-now"))


def check_large(browser, checker, episodes):
    browser.open("#now")
    check_times(browser, episodes)
    check_hatching(browser)
    check_table(browser)
    check_views(browser, checker)
    check_widths(browser)
    check_paper(browser)
    check_notes(browser)
