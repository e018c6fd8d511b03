#!/usr/bin/env python3
"""panel_tests.py DASHBOARD FILE...: writes tests for `promtool test rules`, in which two hosts have the
metrics of the FILEs: every query of the DASHBOARD has to give something. Refuses a query whose metrics
are in none of the FILEs."""

import json
import re
import sys

SAMPLE = re.compile(r"^([a-z_]+)(?:\{(.*)\})? (\S+)$", re.MULTILINE)
NAME = re.compile(r"\bsecpolicy_[a-z_]+")


def queries_of(dashboard):
    for panel in dashboard["panels"]:
        for target in panel["targets"]:
            yield target["expr"].replace("$instance", ".*")


dashboard, *files = sys.argv[1:]
series = []
for file in files:
    with open(file) as metrics:
        for name, labels, value in SAMPLE.findall(metrics.read()):
            for host in ("a", "b"):
                named = f'{name}{{{labels + "," if labels else ""}instance="{host}",job="node"}}'
                series.append({"series": named, "values": f"{value} {value}"})

with open(dashboard) as page:
    queries = list(queries_of(json.load(page)))
known = {NAME.match(each["series"]).group() for each in series}
unknown = {name for query in queries for name in NAME.findall(query)} - known
if unknown or not queries:
    sys.exit(f"no such metric: {', '.join(sorted(unknown))}")

tests = [{"expr": f"count({query}) > bool 0", "eval_time": "1m",
          "exp_samples": [{"labels": "{}", "value": 1}]} for query in queries]
json.dump({"tests": [{"interval": "1m", "input_series": series, "promql_expr_test": tests}]}, sys.stdout)
