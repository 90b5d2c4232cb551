"""Checks the Grafana dashboard of deploy/ as far as that is possible without Grafana.

  check_dashboard.py shape QUERIES     its shape by dashboard-schema.yml, ids, grid, variables, legends; writes its queries to the file
                                       QUERIES as recording rules, so that promtool can parse them
  check_dashboard.py ask URL           asks the Prometheus at URL as Grafana would: each variable has values, each query series, each
                                       label of a legend is one of these
"""

import itertools
import json
import pathlib
import re
import sys
import urllib.error
import urllib.parse
import urllib.request

import jsonschema
import yaml

gBoard = json.loads(pathlib.Path("deploy/grafana/tavik.json").read_text())
gProblems = []


def problem(aText):
    gProblems.append(f"deploy/grafana/tavik.json: {aText}")


def list_targets():
    return [(lPanel, lTarget) for lPanel in gBoard["panels"] for lTarget in lPanel["targets"]]


def list_variables():
    return {lVariable["name"]: lVariable for lVariable in gBoard["templating"]["list"]}


def fill_in(aQuery, aValues):
    """The query with Grafana's variables replaced."""
    lValues = {"__rate_interval": "1m", **aValues}
    return re.sub(r"\$(\w+)", lambda aMatch: lValues.get(aMatch.group(1), aMatch.group()), aQuery)


# ---- its shape ----


def check_schema():
    lSchema = yaml.safe_load(pathlib.Path("scripts/lib/dashboard-schema.yml").read_text())
    jsonschema.Draft7Validator.check_schema(lSchema)
    for lError in jsonschema.Draft7Validator(lSchema).iter_errors(gBoard):
        problem("/".join(str(lStep) for lStep in lError.absolute_path) + f": {lError.message}")


def check_unique(aWhat, aNames):
    for lName in {lName for lName in aNames if aNames.count(lName) > 1}:
        problem(f"{aWhat} {lName} is there twice")


def check_grid():
    lUsed = {}
    for lPanel in gBoard["panels"]:
        lAt = lPanel["gridPos"]
        if lAt["x"] + lAt["w"] > 24:
            problem(f"{lPanel['title']}: ends at column {lAt['x'] + lAt['w']} of 24")
        for lCell in itertools.product(range(lAt["x"], lAt["x"] + lAt["w"]), range(lAt["y"], lAt["y"] + lAt["h"])):
            if lUsed.setdefault(lCell, lPanel["title"]) != lPanel["title"]:
                problem(f"{lPanel['title']}: lies over {lUsed[lCell]} at column {lCell[0]}, row {lCell[1]}")
                break


def check_variables():
    lTexts = [lTarget["expr"] for _, lTarget in list_targets()] + [json.dumps(gBoard)]
    lUsed = {lName for lText in lTexts for lName in re.findall(r"\$\{?(\w+)", lText)}
    lKnown = set(list_variables()) | {"__rate_interval", "__all"}
    for lName in lUsed - lKnown:
        problem(f"the variable ${lName} is not defined")
    for lName in set(list_variables()) - lUsed:
        problem(f"the variable ${lName} is used nowhere")
    for lPanel, lTarget in list_targets():
        for lName, lVariable in list_variables().items():
            # Several values become a regular expression, which "=" would take for a text.
            if lVariable.get("multi") and re.search(rf'(?<!=~)"\${lName}"', lTarget["expr"]):
                problem(f"{lPanel['title']}: ${lName} may have several values: match it with =~")


def check_shape(aQueries):
    check_schema()
    if gProblems:
        return  # the rest needs the shape
    check_unique("the panel id", [lPanel["id"] for lPanel in gBoard["panels"]])
    check_unique("the panel", [lPanel["title"] for lPanel in gBoard["panels"]])
    check_unique("the variable", [lVariable["name"] for lVariable in gBoard["templating"]["list"]])
    for lPanel in gBoard["panels"]:
        check_unique(f"{lPanel['title']}: the query", [lTarget["refId"] for lTarget in lPanel["targets"]])
    check_grid()
    check_variables()
    lRules = [{"record": f"query{lIndex}", "expr": fill_in(lTarget["expr"], {"instance": ".*"})}
              for lIndex, (_, lTarget) in enumerate(list_targets())]
    pathlib.Path(aQueries).write_text(yaml.safe_dump({"groups": [{"name": "dashboard", "rules": lRules}]}))


# ---- what a Prometheus answers ----


def ask(aUrl, aPath, **aParameters):
    lUrl = f"{aUrl}/api/v1/{aPath}?{urllib.parse.urlencode(aParameters)}"
    try:
        with urllib.request.urlopen(lUrl, timeout=10) as lAnswer:
            return json.load(lAnswer)["data"]
    except urllib.error.HTTPError as lEx:
        problem(f"{aPath} {aParameters}: {lEx.read().decode()}")
        return None


def find_values(aUrl, aVariable):
    """What Grafana offers for a variable: the choice of all, and one of several."""
    lMetric, lLabel = re.match(r"label_values\((.*), (.*)\)$", aVariable["query"]).groups()
    lValues = ask(aUrl, f"label/{lLabel}/values", **{"match[]": lMetric}) or []
    if not lValues:
        problem(f"the variable ${aVariable['name']} has no value")
    # As Grafana writes them into a query: escaped for the regular expression and for the text.
    lEscaped = [re.sub(r"([\\^$*+?.()|{}\[\]])", r"\\\\\1", lValue) for lValue in lValues]
    return [aVariable.get("allValue", ".*"), "(" + "|".join(lEscaped) + ")"]


def check_query(aUrl, aPanel, aTarget, aValues, aNow):
    lWhat = f"{aPanel['title']}, {aTarget['refId']}, with {aValues}"
    lData = ask(aUrl, "query_range", query=fill_in(aTarget["expr"], aValues), start=aNow - 600, end=aNow, step=1)
    if lData is None:
        return
    if not lData["result"]:
        problem(f"{lWhat}: no series in ten minutes")
    for lLabel in re.findall(r"{{(\w+)}}", aTarget["legendFormat"]):
        if any(lLabel not in lSeries["metric"] for lSeries in lData["result"]):
            problem(f"{lWhat}: no label {lLabel} for the legend")


def check_answers(aUrl):
    lVariables = {lName: find_values(aUrl, lVariable) for lName, lVariable in list_variables().items() if lVariable["type"] == "query"}
    lNow = float(ask(aUrl, "query", query="time()")["result"][1])
    for lChoice in zip(*lVariables.values()):
        for lPanel, lTarget in list_targets():
            check_query(aUrl, lPanel, lTarget, dict(zip(lVariables, lChoice)), lNow)


def main():
    {"shape": check_shape, "ask": check_answers}[sys.argv[1]](sys.argv[2])
    for lText in gProblems:
        print(f"check-fleet: {lText}", file=sys.stderr)
    return 1 if gProblems else 0


if __name__ == "__main__":
    sys.exit(main())
