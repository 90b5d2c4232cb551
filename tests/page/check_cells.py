"""What the timeline's cells lead to, and what else shows them: commands that can be run as they are, an address that holds
everything, the table for screen readers."""
import json
import shlex
import subprocess
from datetime import datetime, timedelta, timezone

from browser import require

# The table below the chart, all pages of it, and the sums of its document by kind.
TABLE = """
const done = arguments[0];
const place = document.getElementById('chart-table'), button = (name) => [...place.querySelectorAll('button')].find((e) => e.textContent === name);
const pages = [], sums = {};
for (;;) {
  pages.push([...place.querySelectorAll('tbody tr')].map((line) => [...line.cells].map((cell) => cell.textContent)));
  const next = button('Next page');
  if (next.hidden || next.disabled) { break; }
  next.click();
}
const said = place.querySelector('[role=status]').textContent;
while (!button('Previous page').hidden && !button('Previous page').disabled) { button('Previous page').click(); }
const [, from, to] = decodeURIComponent(location.hash).match(/range=([^.;]+\\.\\d+Z)\\.\\.([^;]+)/).map((text) => Date.parse(text));
const wide = document.getElementById('chart').clientWidth;
Promise.all([import('/grid.js'), import('/lanes.js')]).then(async ([g, l]) => {
  const grid = g.makeGrid(from, to, wide - l.gutter(wide), l.columnPixels);
  const query = `from=${new Date(grid.from).toISOString()}&to=${new Date(grid.to).toISOString()}&columns=${grid.columns}`;
  const answer = await (await fetch(`/api/v1/timeline?${query}`)).json();
  for (const row of answer.rows) { sums[row.kind] = (sums[row.kind] ?? 0) + row.cells.reduce((sum, [, count]) => sum + count, 0); }
  done({ pages, sums, said, marks: answer.marks.filter((mark) => Date.parse(mark.time) >= grid.from && Date.parse(mark.time) <= grid.to).length });
});"""


def past(hours_from, hours_to):
    """A range that does not move, as the address has it."""
    now = datetime.now(timezone.utc)
    return "..".join((now - timedelta(hours=hours)).isoformat(timespec="milliseconds").replace("+00:00", "Z") for hours in (hours_from, hours_to))


def run_command(text, *options):
    """A command of the page, as a person pastes it."""
    words = shlex.split(text)
    require(f"a command that does not begin with tavik: {text}", words[0] == "tavik")
    done = subprocess.run([words[0], *options, *words[1:]], check=False, capture_output=True, text=True)
    require(f"{text}: status {done.returncode}: {done.stderr}", done.returncode == 0)
    return done.stdout


def check_command(browser):
    """The panel's command shows in a terminal what the panel shows."""
    rows = len(browser.find("panel-episodes").find_elements("tag name", "a"))
    episodes = json.loads(run_command(browser.text("panel-command"), "--json"))["episodes"]
    require(f"the panel has {rows} episodes, its command {len(episodes)}", 0 < rows == len(episodes))


def check_mark(browser):
    """The command that m copies can be run, and its mark is in the chart then."""
    browser.driver.execute_cdp_cmd("Browser.grantPermissions", {"permissions": ["clipboardReadWrite", "clipboardSanitizedWrite"]})
    browser.open(f"#timeline;range={past(8, 1)}")
    browser.wait_loaded()
    browser.keys("chart", "]")
    browser.keys("chart", "m")
    command = browser.wait("the command for a mark", lambda: browser.text("cell-text").partition("Copied: ")[2])
    copied = browser.driver.execute_async_script("navigator.clipboard.readText().then(arguments[0], (e) => arguments[0](String(e)));")
    require(f"\"{copied}\" was copied, and not \"{command}\"", copied == command)
    run_command(command)
    browser.open(f"#timeline;range={past(8, 1)}")
    name = shlex.split(command)[2]
    browser.wait(f"the mark {name} in the chart's table", lambda: name in browser.run("return document.querySelector('#chart-table table').textContent"))


def check_state(browser):
    """The address holds range, filter, second range and cell; a page that is opened with it shows the same."""
    address = f"#timeline;range={past(12, 0.5)};families=load,path,fabric;find=array7;compare={past(4, 2)}"
    browser.open(address)
    browser.wait_loaded()
    browser.keys("chart", "]")
    held = browser.wait("the cell in the address", lambda: ";cell=" in browser.address() and browser.address())
    require(f"{held} does not begin with {address}", held.startswith(address))
    said = browser.text("cell-text")
    browser.open(held)
    browser.wait("the same cell", lambda: browser.text("cell-text") == said)
    require("the range is another one", "fixed" in browser.text("range-text"))
    require("the filter's text is another one", browser.run("return document.getElementById('find').value") == "array7")
    pressed = browser.run("return [...document.querySelectorAll('#legend [aria-pressed=true]')].map((e) => e.dataset.family)")
    require(f"the families are {pressed}", pressed == ["load", "path", "fabric"])
    require("the second range is gone", browser.find("compare").is_displayed())
    require("a port that does not match is shown", "array9" not in browser.run("return document.querySelector('#chart-table table').textContent"))


def check_crosshair(browser):
    """The line goes through all lanes, the counters too; its summary has a place that does not move."""
    browser.open("#timeline;range=690m")
    browser.wait_loaded()
    browser.wait_text("counters", "CRC errors")
    line = browser.find("cell-text")
    places = []
    for x in (10, 60):
        browser.hover("chart", (x, 0))
        browser.wait("the line through the lanes", lambda: browser.find("crosshair").is_displayed())
        places.append((line.location["y"], line.size["height"]))
    require(f"the summary moves: {places}", places[0] == places[1])
    short = browser.run("const box = (id) => document.getElementById(id).getBoundingClientRect();"
                        "return [box('crosshair').top - box('chart').top, box('counters').bottom - box('crosshair').bottom];")
    require(f"the line is too short by {short} pixels", max(short) <= 0)


def check_table(browser):
    """The hidden table has the events of the chart, page by page, and shows itself when the keyboard is in it."""
    browser.open(f"#timeline;range={past(29 * 24, 1)}")
    browser.wait_loaded()
    found = browser.driver.execute_async_script(TABLE)
    require("the table has one page", len(found["pages"]) > 1)
    rows = [row for page in found["pages"] for row in page]
    require(f"pages of {sorted({len(page) for page in found['pages'][:-1]})} rows", {len(page) for page in found["pages"][:-1]} == {50})
    require(f"\"{found['said']}\" is said of {len(rows)} rows", found["said"].endswith(f" of {len(rows):,}"))
    sums = {}
    for name, _, what in rows:
        for part in () if name in ("Coverage", "Mark") else what.split(", "):
            kind, count = part.split(" ")
            sums[kind] = sums.get(kind, 0) + int(count.replace(",", ""))
    require(f"the table has {sums}, the chart's document {found['sums']}", sums == found["sums"] and sums)
    require("the table has no row for an outage", any(row[0] == "Coverage" and "did not run" in row[2] for row in rows))
    require("the table's marks are not those of the chart", sum(row[0] == "Mark" for row in rows) == found["marks"] > 0)
    wide = "return document.getElementById('chart-table').getBoundingClientRect().width"
    require("the table is seen without the keyboard", browser.run(wide) <= 1)
    browser.run("document.querySelector('#chart-table .scroll').focus()")
    require("the table is not seen with the keyboard in it", browser.run(wide) > 200)


def check_cells(browser):
    check_mark(browser)
    check_state(browser)
    check_crosshair(browser)
