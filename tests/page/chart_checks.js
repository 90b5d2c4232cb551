// What the chart makes of a timeline document, looked at by its pixels: run in the page by check_chart.py. Each check is named by
// what it promises and gives back what is wrong, or nothing.

const { arrayOf, makeModel, findBlind, whyBlind } = await import("/model.js");
const { layOut, drawLanes, xOf, gutter, columnPixels, leastCellWidth } = await import("/lanes.js");
const { drawCounters } = await import("/counters.js");
const { makeGrid } = await import("/grid.js");
const { families, kinds, kindOf, worstOf } = await import("/kinds.js");
const { strengthOf, familyColor, mix, readColors } = await import("/palette.js");

const minute = 60000;
const start = Date.parse("2026-03-04T00:00:00Z");
const at = (minutes) => new Date(start + minutes * minute).toISOString();
const columns = 60;
const usualWidth = 1000;

const port = (number, name) => ({ wwpn: `50:00:00:00:00:00:00:${number}`, wwnn: null, fcId: null, name });
const initiator = { wwpn: "10:00:00:00:00:00:00:01", wwnn: null, host: "host7" };
const ports = [port("a1", "array7 ctrl-A port 0"), port("a2", "array7 ctrl-B port 0"), port("b1", "array9 port 0"), port("b2", "array9 port 1")];

/** An hour in columns of a minute: a run without a break, and what a check adds. */
function makeDocument(more = {}) {
  return { from: at(0), to: at(60), columns, runs: [{ from: at(-60), to: at(60) }], gaps: [], coverage: [], marks: [], links: [], rows: [], remotePorts: ports, ...more };
}
const row = (kind, owner, cells) => ({ kind, initiator, remotePort: owner, cells });

function show(document, { width = usualWidth, ...more } = {}) {
  const options = { filter: { families: null, text: "" }, before: null, unfolded: new Set(), now: start + 60 * minute, ...more };
  const model = makeModel(document, options);
  const layout = layOut(model, width);
  const canvas = window.document.createElement("canvas");
  drawLanes(canvas, model, layout, null, []);
  const ratio = canvas.width / width;
  const data = canvas.getContext("2d").getImageData(0, 0, canvas.width, canvas.height).data;
  const pixel = (x, y) => {
    const place = 4 * (Math.round(y * ratio) * canvas.width + Math.round(x * ratio));
    return `#${[0, 1, 2].map((part) => data[place + part].toString(16).padStart(2, "0")).join("")}`;
  };
  const rowOf = (key) => layout.rows.find(({ lane }) => lane.key === key);
  const columnAt = (column) => xOf(layout, model, start + column * (60 / model.columns) * minute);
  return { model, layout, canvas, pixel, rowOf, columnAt, height: canvas.height / ratio };
}

/** The colors of a row's pixels from x to x + length. */
const across = (shown, y, x, length) => Array.from({ length }, (_, step) => shown.pixel(x + step, y));
const down = (shown, x, y, length) => Array.from({ length }, (_, step) => shown.pixel(x, y + step));
const keysOf = (shown) => shown.model.lanes.map((lane) => lane.key);
const same = (one, other) => (JSON.stringify(one) === JSON.stringify(other) ? "" : `${JSON.stringify(one)} in place of ${JSON.stringify(other)}`);
/** The longest stretch of lines of one color from the coverage lane down, five pixels wide: short where it is hatched. */
function blankest(shown, x) {
  let [most, length, last] = [0, 0, ""];
  for (let y = shown.layout.coverage.y + 1; y < shown.height - 2; ++y) {
    const colors = new Set(across(shown, y, x + 4, 5)).size > 1 ? "" : shown.pixel(x + 4, y);
    length = colors === "" || colors !== last ? 0 : length + 1;
    last = colors;
    most = Math.max(most, length);
  }
  return most;
}

const checks = {
  "where Tavik did not run, every row is hatched"() {
    const shown = show(makeDocument({ runs: [{ from: at(-60), to: at(20) }, { from: at(40), to: at(60) }] }));
    const [dark, light] = [blankest(shown, shown.columnAt(31)), blankest(shown, shown.columnAt(11))];
    return dark <= 3 && light > 15 ? "" : `${dark} lines are blank in the outage, ${light} beside it`;
  },
  "where events were lost, every row is hatched"() {
    const shown = show(makeDocument({ gaps: [{ from: at(20), to: at(40) }] }));
    return blankest(shown, shown.columnAt(31)) <= 3 ? "" : "a row is blank";
  },
  "where Tavik was deaf for a kind, every row is hatched, thinner"() {
    const deaf = ["rscn", "link"].map((kind) => ({ initiator, kind, state: "no_rights", from: at(20), to: at(40) }));
    const shown = show(makeDocument({ coverage: deaf }));
    const blank = blankest(shown, shown.columnAt(31));
    return blank > 3 && blank <= 10 ? same(shown.model.blind.map(({ why }) => why), ["deaf for rscn, link (no rights)"]) : `${blank} lines are blank`;
  },
  async "the hatching goes on through the counters"() {
    const counters = [{ counter: "invalid_crc_count", initiator, remotePort: null, cells: [[5, 3]] }];
    drawCounters(show(makeDocument({ runs: [{ from: at(-60), to: at(20) }, { from: at(40), to: at(60) }], counters })).model, usualWidth);
    await new Promise((done) => { setTimeout(done); });
    const canvas = document.querySelector("#counters canvas");
    const linesAt = (minutes) => {
      const x = gutter(usualWidth) + (minutes / 60) * (usualWidth - gutter(usualWidth));
      const { data } = canvas.getContext("2d").getImageData(x * (canvas.width / usualWidth), 12, 12, canvas.height - 24);
      return new Set(Array.from({ length: canvas.height - 24 }, (_, line) => data.slice(line * 48, (line + 1) * 48).join())).size;
    };
    const [dark, light] = [linesAt(31), linesAt(11)];
    drawCounters(show(makeDocument()).model, usualWidth);
    return dark > 3 && light === 1 ? "" : `${dark} different lines in the outage, ${light} beside it`;
  },
  "the right edge of a run that goes on is not taken for an outage"() {
    return same(findBlind(makeDocument({ runs: [{ from: at(-60), to: at(59) }] }), start, start + 60 * minute, start + 60 * minute), []);
  },
  "an outage that goes on is hatched up to now and no farther"() {
    const blind = findBlind(makeDocument({ runs: [{ from: at(-60), to: at(20) }] }), start, start + 60 * minute, start + 40 * minute);
    return same(blind.map(({ from, to }) => [from, to]), [[start + 20 * minute, start + 40 * minute]]);
  },
  "ports stand by array, the worst array and the worst port first"() {
    const shown = show(makeDocument({ rows: [row("queue-full", ports[0], [[1, 5000, 0]]), row("queue-full", ports[1], [[1, 6000, 0]]),
      row("lun-reset", ports[3], [[2, 1, 0]]), row("queue-full", ports[2], [[2, 10, 0]])] }));
    return same(keysOf(shown).filter((key) => !key.startsWith("head local") && !key.startsWith("initiator")),
      ["head array9", ports[3].wwpn, ports[2].wwpn, "head array7", ports[1].wwpn, ports[0].wwpn]);
  },
  "an array is named by the words up to its number"() {
    const names = ["array7 ctrl-A port 0", "array7 ctrl-A", "Array 7 ctrl-A", "tape1 drive 0", "prod-disks ctrl-a", "disks"];
    return same(names.map((name) => arrayOf({ name })), ["array7", "array7", "Array 7", "tape1", "prod-disks", "disks"]);
  },
  "rows keep their places while time goes on"() {
    const load = [row("queue-full", ports[0], [[1, 10, 0]]), row("queue-full", ports[1], [[1, 9, 0]]), row("queue-full", ports[2], [[1, 5, 0]])];
    const first = show(makeDocument({ rows: load }));
    const worse = [row("bus-reset", ports[1], [[2, 99, 0]]), row("bus-reset", ports[2], [[2, 999, 0]])];
    const next = show(makeDocument({ rows: [...load, ...worse] }), { before: first.model });
    return same(keysOf(next), keysOf(first));
  },
  "quiet ports are folded into one row, and unfolded on demand"() {
    const document = makeDocument({ rows: [row("queue-full", ports[0], [[1, 10, 0]])] });
    const folded = keysOf(show(document)).filter((key) => ports.some(({ wwpn }) => wwpn === key));
    const open = keysOf(show(document, { unfolded: new Set(["array7", "array9"]) })).filter((key) => ports.some(({ wwpn }) => wwpn === key));
    return same([folded.length, open.length], [1, 4]);
  },
  "a cell is never narrower than three pixels"() {
    const shown = show({ ...makeDocument({ rows: [row("queue-full", ports[0], [[1500, 1, 0]])] }), columns: 3000 });
    const place = shown.rowOf(ports[0].wwpn);
    const colored = across(shown, place.y + 9, shown.columnAt(1500) - 4, 12).filter((color) => color !== readColors().ground).length;
    return colored >= 3 && leastCellWidth === 3 ? "" : `${colored} pixels`;
  },
  "one event among millions shows at 30 days, at every width"() {
    const days = 30 * 1440 * minute;
    return [360, 1280, 2560].filter((width) => {
      const grid = makeGrid(start, start + days, width - gutter(width), columnPixels);
      const middle = Math.floor(grid.columns / 2);
      const document = { ...makeDocument({ runs: [], rows: [row("logo", ports[0], [[middle, 1, 0]]), row("queue-full", ports[1], [[1, 5000000, 0]])] }),
        from: new Date(grid.from).toISOString(), to: new Date(grid.to).toISOString(), columns: grid.columns };
      const shown = show(document, { width, now: grid.from });
      const place = shown.rowOf(ports[0].wwpn);
      const wanted = mix(familyColor(kindOf("logo").family), readColors().ground, strengthOf(1, shown.model.most));
      const x = xOf(shown.layout, shown.model, grid.from + middle * grid.width);
      return across(shown, place.y + 3, Math.floor(x) - 2, 16).filter((color) => color === wanted).length < 3;
    }).map((width) => `not on ${width} pixels`).join(", ");
  },
  "columns have room for a cell at every range and width"() {
    const narrow = [5, 15, 60, 1440, 10080, 43200].flatMap((minutes) => [250, 800, 2400].filter((pixels) => {
      const grid = makeGrid(start, start + minutes * minute, pixels, 10);
      return pixels / grid.columns < 3;
    }).map((pixels) => `${minutes} min on ${pixels}`));
    return narrow.join(", ");
  },
  "the hue is that of the family of the most severe kind"() {
    const wrong = kinds.filter((kind) => {
      const shown = show(makeDocument({ rows: [row(kind.name, ports[0], [[30, 100, 0]]), row("adapter-arrival", ports[0], [[30, 1, 0]])] }));
      const place = shown.rowOf(ports[0].wwpn);
      const wanted = mix(familyColor(kind.family), readColors().ground, strengthOf(101, shown.model.most));
      return shown.pixel(shown.columnAt(30) + 2, place.y + 3) !== wanted;
    });
    return wrong.map(({ name }) => name).join(", ");
  },
  "a cell bears the letter of the most severe kind"() {
    const picture = (...names) => {
      const shown = show(makeDocument({ rows: names.map((name) => row(name, ports[0], [[30, 100 / names.length, 0]])) }));
      const place = shown.rowOf(ports[0].wwpn);
      return Array.from({ length: place.height }, (_, line) => across(shown, place.y + line, shown.columnAt(30), 12)).join();
    };
    const alone = picture("queue-full");
    return picture("queue-full", "queue-depth") !== alone ? "queue-depth shows over queue-full"
      : picture("queue-full", "lun-reset") !== picture("lun-reset") ? "lun-reset does not show over queue-full"
        : picture("device-busy") === alone ? "queue-full and device-busy look the same" : "";
  },
  "each family looks different from the others, on a screen and on paper"() {
    const pictures = families.map((family) => {
      const shown = show(makeDocument({ rows: [row(kinds.find((kind) => kind.family === family).name, ports[0], [[30, 100, 0]])] }));
      const place = shown.rowOf(ports[0].wwpn);
      return Array.from({ length: 6 }, (_, line) => across(shown, place.y + place.height - 9 + line, shown.columnAt(30) + 2, 8)).join();
    });
    return same(new Set(pictures).size, families.length);
  },
  "there are five families, and each of the twenty kinds has one and a letter of its own"() {
    return same([families.length, kinds.length, new Set(kinds.map(({ letter }) => letter)).size, new Set(kinds.map(({ family }) => family)).size], [5, 20, 20, 5]);
  },
  "kinds that stop I/O are more severe than those that slow it, and these than news"() {
    return same([worstOf(["queue-full", "plogi"]).name, worstOf(["queue-full", "link"]).name, worstOf(["rscn", "check-condition"]).name], ["queue-full", "link", "check-condition"])
      || kinds.filter((kind, index) => index > 0 && kind.level > kinds[index - 1].level).map(({ name }) => name).join(", ");
  },
  "darkness is the logarithm of the count"() {
    const steps = [9, 99, 999, 9999].map((count) => strengthOf(count, 9999));
    const ways = steps.slice(1).map((step, index) => step - steps[index]);
    return Math.max(...ways) - Math.min(...ways) < 1e-9 && ways[0] > 0 && steps[3] === 1 ? "" : `steps of ${ways}`;
  },
  "a bucket that is spread has a dotted left edge, another has none"() {
    const edge = (spread) => {
      const shown = show(makeDocument({ rows: [row("queue-full", ports[0], [[30, 1000, spread]])] }));
      const place = shown.rowOf(ports[0].wwpn);
      return new Set(down(shown, shown.columnAt(30), place.y + 3, place.height - 8)).size;
    };
    return edge(0) === 1 && edge(500) > 1 ? "" : `${edge(0)} colors without, ${edge(500)} with`;
  },
  "a local port shows where its link was not online"() {
    const shown = show(makeDocument({ links: [{ initiator, from: at(0), to: at(20), state: "Online" }, { initiator, from: at(20), to: at(40), state: "Linkdown" },
      { initiator, from: at(40), to: at(60), state: "Online" }] }));
    const place = shown.rowOf(`initiator ${initiator.wwpn}`);
    const y = place.y + place.height - 2.5;
    const { good, bad } = readColors();
    const thick = shown.pixel(shown.columnAt(30), y - 3);
    return same([shown.pixel(shown.columnAt(10), y), shown.pixel(shown.columnAt(30), y), thick], [good, bad, bad]);
  },
  "a mark has a line through all rows"() {
    const shown = show(makeDocument({ marks: [{ name: "before-zoning", time: at(30.5) }] }));
    const lines = down(shown, Math.round(shown.columnAt(30.5)), shown.layout.marks.y + 4, shown.height - shown.layout.marks.y - 8);
    const other = lines.filter((color) => color === readColors().ground).length;
    return other === 0 ? "" : `${other} lines of ${lines.length} are blank`;
  },
  "the name of a mark ends before the next mark"() {
    const marksAt = (...minutes) => {
      const shown = show(makeDocument({ marks: minutes.map((minute, index) => ({ name: `${index} before-the-new-firmware-of-array7`, time: at(minute) })) }));
      const { ground, line } = readColors();
      const colors = (from, to) => Array.from({ length: 12 }, (_, step) => across(shown, shown.layout.marks.y + 2 + step, from, to - from)).flat();
      return { shown, hasInk: (from, to) => colors(from, to).some((color) => color !== ground && color !== line) };
    };
    const one = marksAt(30.5);
    const x = Math.round(one.shown.columnAt(30.5));
    const wide = Array.from({ length: 400 }, (_, step) => x + 12 + step).filter((place) => one.hasInk(place, place + 1)).length;
    const two = marksAt(30.5, 34.5);
    const next = Math.round(two.shown.columnAt(34.5));
    return wide > 60 && !two.hasInk(next - 3, next - 1) ? "" : `a name alone has ${wide} columns of ink, and runs into the next mark`;
  },
  "what is later than now is not called quiet"() {
    const shown = show(makeDocument(), { now: start + 30 * minute });
    const y = shown.layout.coverage.y + 1;
    return shown.pixel(shown.columnAt(45) + 5, y) === shown.pixel(shown.columnAt(15) + 5, y) ? "the future looks like the past" : "";
  },
  "a filter leaves out other families, and keeps the rows"() {
    const shown = show(makeDocument({ rows: [row("queue-full", ports[0], [[1, 10, 0]]), row("logo", ports[1], [[1, 1, 0]])] }), { filter: { families: ["path"], text: "" } });
    return same([shown.model.total, keysOf(shown).includes("head array7")], [1, true]);
  },
  "a kind that the page does not know shows by its name"() {
    return kindOf("new-kind").says("array7", "twice").includes("new-kind") ? "" : "it does not";
  },
  "why a time is blank is said in words"() {
    const shown = show(makeDocument({ gaps: [{ from: at(20), to: at(40) }] }));
    return same([whyBlind(shown.model, [start + 25 * minute, start + 26 * minute]), whyBlind(shown.model, [start, start + minute])], ["events were lost", ""]);
  },
};

const results = [];
for (const [name, check] of Object.entries(checks)) {
  results.push([name, await Promise.resolve().then(check).catch(String)]);
}
return results;
