"""Every view with the demonstration's events, and everything that a person can do in the timeline."""
from datetime import datetime, timedelta, timezone

from selenium.webdriver.common.keys import Keys

from browser import require
from check_cells import check_cells, check_command
from palette import LEAST, closest

TIMELINE = "#timeline;range=15m"
# Where the chart shows the highest count of a port, seen from the middle of the chart: made from the same document as the chart.
HIGHEST_CELL = """
const [minutes, wwpn, done] = arguments;
const canvas = document.getElementById('chart');
Promise.all(['model', 'lanes', 'grid'].map((name) => import(`/${name}.js`))).then(async ([m, l, g]) => {
  const now = Date.now(), wide = canvas.clientWidth;
  const grid = g.makeGrid(now - minutes * 60000, now, wide - l.gutter(wide), l.columnPixels);
  const query = `from=${new Date(grid.from).toISOString()}&to=${new Date(grid.to).toISOString()}&columns=${grid.columns}`;
  const model = m.makeModel(await (await fetch(`/api/v1/timeline?${query}`)).json(), {filter: {families: null, text: ''}, before: null, unfolded: new Set(), now});
  const layout = l.layOut(model, wide), row = layout.rows.find(({lane}) => lane.key === wwpn);
  const [column] = [...row.lane.cells].sort(([, one], [, other]) => other.count - one.count)[0];
  const x = l.xOf(layout, model, (m.spanOf(model, column)[0] + m.spanOf(model, column)[1]) / 2);
  done([Math.round(x - wide / 2), Math.round(row.y + row.height / 2 - layout.height / 2)]);
});"""


def check_now(browser):
    browser.open("#now")
    browser.wait_text("headline", "COLLECTING")
    browser.wait_text("ports", "queue-full")
    browser.wait_text("live", "Live")
    host = browser.text("host")
    browser.open("#events")
    browser.wait("the host's name above another view", lambda: host != "" and browser.text("host") == host)
    browser.open("#now")
    browser.wait_text("ports", "queue-full")
    browser.wait_text("open-troubles", "queue is full")
    browser.wait_text("open-troubles", "queue is full")
    browser.wait("the disks of an open trouble", lambda: "sda" in browser.text("open-troubles"))
    for what, name in (("port", "array7 ctrl-A port 0"), ("LUNs", "LUNs 0-3"), ("multipath device", "mpatha"), ("mount", "/srv/orders")):
        require(f"an open trouble does not name its {what}", name in browser.text("open-troubles"))
    require("an open trouble does not say what to look at", "What to look at next" in browser.text("open-troubles"))
    worst = browser.run("return [...document.querySelectorAll('#open-troubles .trouble')].map((e) => e.className.includes('level-3'))")
    require("the worst trouble does not stand first", worst == sorted(worst, reverse=True))


def open_timeline(browser, address=TIMELINE):
    browser.open(address)
    browser.wait("the chart", lambda: browser.colors("chart") > 5)
    browser.wait("the overview", lambda: browser.colors("overview") > 2)


def check_reachable(browser):
    """With the keyboard alone: Tab comes to the views, the ranges, the filter, the overview and the chart, and shows where it is."""
    open_timeline(browser)
    browser.run("document.activeElement.blur(); getSelection().removeAllRanges()")
    passed = []
    while "chart" not in passed:
        require(f"Tab does not come to the chart: {passed}", len(passed) < 60)
        browser.press(Keys.TAB)
        passed.append(browser.run("const e = document.activeElement; return e.id || e.dataset.view || e.dataset.minutes || e.dataset.family || e.tagName"))
    missing = [name for name in ("paths", "60", "43200", "pause", "load", "find", "overview") if name not in passed]
    require(f"Tab passes over {missing}", not missing)
    require("the focus is not to be seen", browser.run("return getComputedStyle(document.activeElement).outlineStyle") != "none")


def check_presets(browser):
    open_timeline(browser)
    for minutes, name in ((15, "15m"), (60, "1h"), (360, "6h"), (1440, "24h"), (10080, "7d"), (43200, "30d")):
        browser.run(f"document.querySelector('[data-minutes=\"{minutes}\"]').click()")
        browser.wait(f"the range {name} in the address", lambda: f";range={name}" in browser.address() + ";")
        browser.wait_loaded()
        pressed = browser.run("return [...document.querySelectorAll('#ranges [aria-pressed=true]')].map((e) => e.textContent)")
        require(f"the button of {name} is not the one that is pressed: {pressed}", pressed == [name])
        require(f"{name} is not live", browser.text("pause") == "Live")
    browser.keys("chart", Keys.BACKSPACE)
    browser.wait("the range before", lambda: ";range=7d" in browser.address())


def check_fold(browser):
    """Ports without an event that is shown are one row of their array, which Enter opens."""
    open_timeline(browser, "#timeline;range=6h;families=load")
    browser.wait_loaded()
    tall = browser.find("chart").size["height"]
    for _ in range(30):
        browser.keys("chart", Keys.ARROW_DOWN)
        if "▸" in browser.text("cell-text"):
            break
    require("there is no row of quiet ports", "▸" in browser.text("cell-text"))
    browser.keys("chart", Keys.ENTER)
    browser.wait("the quiet ports", lambda: browser.find("chart").size["height"] > tall)


def check_keyboard(browser):
    open_timeline(browser)
    browser.keys("chart", "]")
    first = browser.wait("a trouble", lambda: "times" in browser.text("cell-text") and browser.text("cell-text"))
    browser.keys("chart", "]")
    browser.wait("the next trouble", lambda: browser.text("cell-text") != first)
    browser.keys("chart", "[")
    browser.wait("the trouble before", lambda: browser.text("cell-text") == first)
    for there, back in ((Keys.ARROW_DOWN, Keys.ARROW_UP), (Keys.ARROW_RIGHT, Keys.ARROW_LEFT)):
        browser.keys("chart", there)
        browser.wait("another cell", lambda: browser.text("cell-text") != first)
        browser.keys("chart", back)
        browser.wait("the cell before", lambda: browser.text("cell-text") == first)
    browser.keys("chart", "m")
    browser.wait("the command for a mark", lambda: "tavik mark " in browser.text("cell-text"))
    browser.keys("chart", "[")
    browser.keys("chart", Keys.ENTER)
    browser.wait("the episodes of the cell", lambda: browser.find("panel-episodes").find_elements("tag name", "a"))
    browser.wait_text("panel-explanation", "What it means")
    browser.wait_text("panel-explanation", "Evidence")
    require("the panel names no command", "tavik events --since" in browser.text("panel-command"))
    require("the panel has not got the focus", browser.focus() == "panel-title")
    require("the address does not hold the cell", ";cell=" in browser.address() and ";open=1" in browser.address())


def check_address(browser):
    """The same again, from the address alone."""
    sentence = browser.text("panel-sentence")
    title = browser.text("panel-title")
    browser.open(browser.run("return location.hash"))
    browser.wait("the panel again", lambda: browser.text("panel-title") == title)
    browser.wait("the sentence again", lambda: browser.text("panel-sentence") == sentence)
    browser.keys("panel-title", Keys.ESCAPE)
    require("Escape does not close the panel", not browser.find("panel").is_displayed())
    require("the chart has not got the focus back", browser.focus() == "chart")


def check_pointer(browser):
    open_timeline(browser, "#timeline;range=1h")
    before = browser.text("range-text")
    wide = browser.find("chart").size["width"]
    browser.hover("chart", (10, 0))
    browser.wait("the line through the lanes", lambda: browser.find("crosshair").is_displayed())
    browser.wait("its summary", lambda: ":" in browser.text("cell-text"))
    browser.drag("chart", (0, 0), (wide // 4, 0))
    browser.wait("the range of the drag", lambda: "fixed" in browser.text("range-text"))
    browser.wait_loaded()
    browser.drag("chart", (0, 0), (wide // 4, 0), Keys.SHIFT)
    browser.wait("the second range", lambda: browser.find("compare").is_displayed())
    require("the address does not hold the second range", ";compare=" in browser.address())
    address = browser.find("compare-link").get_attribute("href")
    browser.keys("chart", Keys.BACKSPACE)
    browser.wait("the range before", lambda: browser.text("range-text")[:8] == before[:8] and "fixed" not in browser.text("range-text"))
    browser.drag("overview", (-wide // 8, 0), (0, 0))
    browser.wait("the range of the brush", lambda: "fixed" in browser.text("range-text"))
    browser.keys("chart", Keys.BACKSPACE)
    browser.wait("the range before", lambda: "fixed" not in browser.text("range-text"))
    browser.keys("overview", "-")
    browser.wait("a longer range by the overview", lambda: "fixed" in browser.text("range-text"))
    browser.keys("chart", Keys.BACKSPACE)
    return address[address.index("#"):]


def open_highest(browser, wwpn):
    open_timeline(browser, "#timeline;range=6h")
    browser.wait_loaded()
    browser.click("chart", browser.driver.execute_async_script(HIGHEST_CELL, 360, wwpn))


def check_panel(browser):
    """A click on a cell opens all that is known of it."""
    open_highest(browser, "30:00:00:00:00:02:00:00")
    browser.wait_text("panel-sentence", "array7 ctrl-A port 0 answered that its queue is full")
    browser.wait_text("panel-explanation", "What speaks against it")
    browser.wait_text("panel-explanation", "Evidence")
    facts = browser.text("panel-facts")
    for name, part in (("LUNs", "0-3"), ("disks", "sda"), ("multipath devices", "mpatha"), ("mounts", "/srv/orders")):
        require(f"the panel does not name the {name}: {facts}", part in facts)
    check_command(browser)
    open_highest(browser, "30:00:00:00:00:04:00:00")
    browser.wait_text("panel-sentence", "array9 port 0")
    browser.wait_text("panel-facts", "sense key 0x06, ASC 0x29")
    browser.wait_text("panel-facts", "/srv/archive")
    browser.wait_text("panel-explanation", "What to look at next")
    check_command(browser)


def check_filter(browser):
    open_timeline(browser)
    text = "return document.querySelector('#chart-table table').textContent"
    require("no queue-full in the chart's table", "queue-full" in browser.run(text))
    browser.run("document.querySelector('[data-family=load]').click()")
    browser.wait("a table without the family's kinds", lambda: "queue-full" not in browser.run(text))
    require("other families went with it", "plogi" in browser.run(text))
    require("the address does not hold the families", ";families=path,SCSI,fabric,adapter" in browser.address())
    browser.run("document.querySelector('[data-family=load]').click()")
    browser.wait("all kinds", lambda: "queue-full" in browser.run(text))
    browser.keys("find", "no such port")
    browser.wait_text("chart-empty", "Clear the filter")


def check_live(browser, inject):
    """New events are appended while the right edge is now; else a button says how many have come."""
    rows = "return [...document.querySelectorAll('#chart-table tr')].filter((e) => /check-condition/.test(e.textContent)).length"
    open_timeline(browser)
    require("a check condition before it happened", browser.run(rows) == 0)
    inject()
    browser.wait("the new event in the chart", lambda: browser.run(rows) > 0)
    require("a live chart calls events new", not browser.find("missed").is_displayed())
    browser.run("document.getElementById('pause').click()")
    browser.wait_text("pause", "Paused")
    inject()
    browser.wait("how many are new", lambda: "new" in browser.text("missed"))
    browser.run("document.getElementById('missed').click()")
    browser.wait_text("pause", "Live")


def check_pictures(browser):
    """The two of the README."""
    browser.resize(1280, 860)
    open_timeline(browser, "#timeline;range=690m")
    browser.wait_loaded()
    for counter in ("CRC errors", "Loss of sync"):
        browser.wait_text("counters", counter)
    require("a counter's chart is blank", browser.run(
        "return [...document.querySelectorAll('#counters canvas')].every((c) => {"
        "  const d = c.getContext('2d').getImageData(0, 0, c.width, c.height).data; const s = new Set();"
        "  for (let i = 0; i < d.length; i += 4) s.add(d[i] << 24 | d[i + 1] << 16 | d[i + 2] << 8 | d[i + 3]); return s.size > 3; })"))
    browser.picture("day-timeline")
    browser.open("#now")
    browser.wait("the disks of an open trouble", lambda: "sda" in browser.text("open-troubles"))
    browser.wait_text("ports", "array7")
    browser.picture("day-now")
    browser.resize(1280)


def check_edges(browser):
    """The edges of the stretches are those of the minutes that were counted: an end within a minute is that of the minute."""
    begin = datetime.now(timezone.utc).replace(second=0, microsecond=0) - timedelta(hours=3)

    def span(*minutes, seconds=0):
        return [(begin + timedelta(minutes=each, seconds=seconds)).isoformat().replace("+00:00", ".000Z") for each in minutes]
    before, after = "..".join(span(0, 40, seconds=30)), "..".join(span(60, 100, seconds=30))
    browser.open(f"#compare;a={before};b={after}")
    for name, edges in (("Before", span(0, 40)), ("After", span(60, 101))):
        said = browser.driver.execute_async_script("const [edges, done] = arguments; import('/format.js').then((f) => done(f.span(...edges)));", edges)
        browser.wait_text("compare-spans", f"{name}: {said} (")


def check_compare(browser, address):
    browser.open("#compare")
    browser.wait_text("compare-how", "Choose a mark")
    browser.wait_text("compare-mark", "before-storm")
    browser.run("const s = document.getElementById('compare-mark'); s.value = 'before-storm'; s.dispatchEvent(new Event('change'))")
    browser.wait_text("compare-rates", "queue-full")
    require("the address does not hold the mark", browser.address() == "#compare;mark=before-storm")
    browser.open("#compare;mark=before-zoning")
    browser.wait_text("compare-changes", "array7 ctrl-B port 1 from host8")
    require("the state after the mark is not named", "Not Present" in browser.text("compare-changes"))
    require("the command is not named", browser.text("compare-command") == "tavik diff before-zoning")
    document, _ = browser.ask("/api/v1/diff?from=before-zoning")
    different = sum(rate["different"] for rate in document["rates"])
    require("the sum is not that of the document", f"{len(document['changes'])} state" in browser.text("compare-sum")
            and f"{different} rate" in browser.text("compare-sum"))
    browser.open(address)
    browser.wait_text("compare-spans", "After:")
    check_edges(browser)


def check_events(browser):
    browser.open("#events;kind=queue-full;since=1h")
    browser.wait_text("events", "queue-full")
    require("the filter lets other kinds through", "plogi" not in browser.text("events"))
    browser.open("#events;kind=nonsense")
    browser.wait_text("events-text", "nonsense")
    browser.driver.get_log("browser")  # the browser itself remarks on the refusal


def check_without_sensor(browser):
    """The first paint does not wait for data: here they never come."""
    browser.driver.execute_cdp_cmd("Network.enable", {})
    browser.driver.execute_cdp_cmd("Network.setBlockedURLs", {"urls": ["*/api/*"]})
    browser.open("#now")
    browser.wait("the first paint", lambda: browser.run("return performance.getEntriesByName('first-contentful-paint').length"))
    browser.wait_text("headline", "No answer")
    browser.wait_text("troubles", "systemctl status tavik")
    browser.open("#timeline")
    browser.wait_text("chart-problem", "does not answer")
    browser.driver.execute_cdp_cmd("Network.setBlockedURLs", {"urls": []})
    browser.driver.get_log("browser")


def check_palette(browser):
    for scheme, ground in (("light", "#ffffff"), ("dark", "#15171a")):
        colors, pale = browser.driver.execute_async_script(
            "const [scheme, ground, done] = arguments;"
            "Promise.all([import('/kinds.js'), import('/palette.js')]).then(([k, p]) => done(["
            "  Object.fromEntries(k.families.map((f) => [f.name, f[scheme]])),"
            "  Object.fromEntries(k.families.map((f) => [f.name, p.mix(f[scheme], ground, 0.5)]))]));", scheme, ground)
        require("there are not five families", len(colors) == 5)
        for sort, values in (("strong", colors), ("pale", pale)):
            distance, sight, one, other = closest(values)
            require(f"{scheme}: {sort} cells of {one} and {other} look alike {sight} ({distance:.0f})", distance >= LEAST[sort])


def check_demo(browser, inject):
    check_now(browser)
    check_reachable(browser)
    check_presets(browser)
    check_keyboard(browser)
    check_address(browser)
    check_fold(browser)
    check_panel(browser)
    address = check_pointer(browser)
    check_filter(browser)
    check_live(browser, inject)
    check_pictures(browser)
    check_compare(browser, address)
    check_cells(browser)
    browser.open("#paths")
    browser.wait_text("paths-text", "LUNs of 6 with trouble")
    check_palette(browser)
    browser.check_quiet("after all views")
    check_events(browser)
    check_without_sensor(browser)
