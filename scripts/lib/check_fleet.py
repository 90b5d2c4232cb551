"""Compares the files for fleets with each other and with a real scrape. Called by scripts/check-fleet: METRICS NDJSON COMMAND...
"""

import json
import pathlib
import re
import sys

import yaml

gProblems = []


def problem(aText):
    gProblems.append(aText)


def names_in(aExpression):
    """Names of metrics in an expression. What stands in quotes is a label's value."""
    return set(re.findall(r"\btavik[a-z0-9_:]*", re.sub(r'"[^"]*"', "", aExpression)))


def read_scrape(aPath):
    """Type and label names of each metric of a scrape."""
    lTypes, lLabels = {}, {}
    for lLine in pathlib.Path(aPath).read_text().splitlines():
        if lLine.startswith("# TYPE "):
            _, _, lName, lType = lLine.split()
            lTypes[lName] = lType
        elif lLine and not lLine.startswith("#"):
            lName = re.match(r"\w+", lLine).group()
            lLabels[lName] = set(re.findall(r'[{,](\w+)="', lLine))
    return {lName: (lType, lLabels.get(lName, set())) for lName, lType in lTypes.items()}


def check_rules(aMetrics):
    """Each name in the rules exists; each alert has a runbook and three cases. Returns what recording rules add."""
    lRecorded = set()
    lAlerts = []
    for lFile in ("recording.yml", "alerts.yml"):
        for lGroup in yaml.safe_load(pathlib.Path("deploy/prometheus", lFile).read_text())["groups"]:
            for lRule in lGroup["rules"]:
                if "record" in lRule:
                    lRecorded.add(lRule["record"])
                else:
                    lAlerts.append(lRule)
                for lName in names_in(lRule["expr"]) - aMetrics - lRecorded - {"tavik"}:
                    problem(f"deploy/prometheus/{lFile}: no metric and no earlier rule has the name {lName}")
    for lAlert in lAlerts:
        check_alert(lAlert)
    lNames = {lAlert["alert"] for lAlert in lAlerts}
    for lKind, lFiles in (("runbook", "docs/runbooks/Tavik*.md"), ("test", "deploy/prometheus/tests/*.yml")):
        for lPath in pathlib.Path().glob(lFiles):
            if lPath.stem not in lNames:
                problem(f"{lPath}: a {lKind} of no alert")
    if not lAlerts:
        problem("deploy/prometheus/alerts.yml has no alert")
    return lRecorded


def check_alert(aAlert):
    lName = aAlert["alert"]
    lRunbook = pathlib.Path("docs/runbooks", lName + ".md")
    if aAlert.get("annotations", {}).get("runbook_url") != str(lRunbook):
        problem(f"{lName}: runbook_url is not {lRunbook}")
    lText = lRunbook.read_text() if lRunbook.exists() else ""
    for lNeeded in (f"# {lName}\n", "## What it means\n", "## How to see it\n", "## What to do\n", "## When it is silent\n"):
        if lNeeded not in lText:
            problem(f"{lRunbook}: has no line {lNeeded.strip()!r}")
    for lCommand in set(re.findall(r"^    tavik (?:--json )?(\w+)", lText, re.M)) - set(sys.argv[3:]):
        problem(f"{lRunbook}: tavik has no command {lCommand}")
    lTests = pathlib.Path("deploy/prometheus/tests", lName + ".yml")
    lCases = yaml.safe_load(lTests.read_text())["tests"] if lTests.exists() else []
    lByName = {lCase.get("name"): lCase for lCase in lCases}
    for lCaseName in ("fires", "near miss", "absent"):
        lCase = lByName.get(lCaseName)
        lChecks = [lOne for lOne in (lCase or {}).get("alert_rule_test", []) if lOne["alertname"] == lName]
        if not lChecks or not lCase.get("input_series"):
            problem(f"{lTests}: no case {lCaseName!r} with series and a check of this alert")
        elif lCaseName != "absent" and any(bool(lOne["exp_alerts"]) != (lCaseName == "fires") for lOne in lChecks):
            problem(f"{lTests}: the case {lCaseName!r} expects the opposite of its name")


def check_dashboard(aKnown):
    """Each name in its queries exists. check_dashboard.py looks at the rest of it."""
    lPath = pathlib.Path("deploy/grafana/tavik.json")
    lBoard = json.loads(lPath.read_text())
    lQueries = [(lPanel["title"], lTarget["expr"]) for lPanel in lBoard["panels"] for lTarget in lPanel.get("targets", [])]
    lQueries += [(lVariable["name"], lVariable["query"]) for lVariable in lBoard["templating"]["list"] if lVariable["type"] == "query"]
    for lTitle, lExpression in lQueries:
        lNames = names_in(lExpression)
        if not lNames:
            problem(f"{lPath}: {lTitle}: the query names no metric")
        for lName in lNames - aKnown:
            problem(f"{lPath}: {lTitle}: no metric and no rule has the name {lName}")
    if not lQueries:
        problem(f"{lPath}: no query")


def check_collector():
    """The OpenTelemetry snippet: each part that its pipelines name is there, and each part is used."""
    lPath = pathlib.Path("deploy/opentelemetry/tavik.yaml")
    lSnippet = yaml.safe_load(lPath.read_text())
    lUsed = {"extensions": set(lSnippet["service"]["extensions"]), "receivers": set(), "exporters": set()}
    for lPipeline in lSnippet["service"]["pipelines"].values():
        for lPart in ("receivers", "exporters"):
            lUsed[lPart] |= set(lPipeline[lPart])
    for lPart, lNames in lUsed.items():
        if lNames != set(lSnippet[lPart]):
            problem(f"{lPath}: {lPart}: defined are {sorted(lSnippet[lPart])}, used are {sorted(lNames)}")
    for lName, lReceiver in lSnippet["receivers"].items():
        if lReceiver["storage"] not in lSnippet["extensions"]:
            problem(f"{lPath}: {lName}: no extension {lReceiver['storage']}")


def check_metrics_page(aSource, aScrape):
    """docs/metrics.md has one row a metric, with the type and the labels of the scrape."""
    lPath = pathlib.Path("docs/metrics.md")
    if not lPath.exists():
        return
    lRows = {}
    for lLine in lPath.read_text().splitlines():
        lMatch = re.match(r"\| `(tavik_\w+)` \| (\w+) \| ([^|]*) \| ([^|]+) \| ([^|]+) \|$", lLine)
        if lMatch:
            lRows[lMatch.group(1)] = (lMatch.group(2), set(re.findall(r"`(\w+)`", lMatch.group(3))))
    for lName in aSource - lRows.keys():
        problem(f"{lPath}: no row for {lName}")
    for lName in lRows.keys() - aSource:
        problem(f"{lPath}: {lName} is no metric")
    for lName, lScraped in aScrape.items():
        if lName in lRows and lRows[lName] != lScraped:
            problem(f"{lPath}: {lName}: type and labels are {lRows[lName]}, the sensor's are {lScraped}")


def check_lines(aPath):
    """The keys that the snippets for log collectors use are in every line."""
    for lLine in pathlib.Path(aPath).read_text().splitlines():
        lMissing = {"host", "storeId", "seq", "episode", "phase", "kind", "count", "first", "last"} - json.loads(lLine).keys()
        if lMissing:
            problem(f"a line of JSON lacks {sorted(lMissing)}: {lLine}")


def main():
    lSource = set(re.findall(r'"(tavik_\w+)"', pathlib.Path("sensor/metrics/src/Metrics.cpp").read_text()))
    lScrape = read_scrape(sys.argv[1])
    for lName in lScrape.keys() - lSource:
        problem(f"the sensor serves {lName}, which is not in Metrics.cpp")
    for lName in lSource - lScrape.keys():
        problem(f"the sensor does not serve {lName}, which is in Metrics.cpp")
    lRecorded = check_rules(lSource)
    check_dashboard(lSource | lRecorded)
    check_metrics_page(lSource, lScrape)
    check_collector()
    check_lines(sys.argv[2])
    for lText in gProblems:
        print(f"check-fleet: {lText}", file=sys.stderr)
    return 1 if gProblems else 0


sys.exit(main())
