#!/usr/bin/python3
"""check_metrics.py PAGE DASHBOARD RULES: reads a page of metrics by the grammar of OpenMetrics, and holds the names in a dashboard
and in rules for alerts against it. Prints a line for each thing that is wrong."""
import json
import re
import sys

import yaml
from prometheus_client.openmetrics.parser import text_string_to_metric_families

page, dashboard, rules = (open(file, encoding="utf-8").read() for file in sys.argv[1:])
samples = {}
for family in text_string_to_metric_families(page):
    if not family.documentation:
        print("no help:", family.name)
    for sample in family.samples:
        samples.setdefault(sample.name, set()).update(sample.labels)


def names_in(expression):
    return set(re.findall(r"\bvlserviced_\w+", expression))


def labels_in(expression):
    return set(re.findall(r"(\w+) *(?:=~|!~|!=|=) *\"", expression)) | {
        label for group in re.findall(r"\b(?:by|on) *\(([^)]*)\)", expression) for label in re.split(r"[, ]+", group)}


def hold(place, expression):
    names = names_in(expression)
    for name in names - set(samples):
        print(place + ": there is no metric", name)
    # Whoever collects them adds these.
    known = {"instance", "job"}.union(*(samples.get(name, set()) for name in names))
    for label in labels_in(expression) - known:
        print(place + ": there is no label", label, "in", expression)


panels = json.loads(dashboard)["panels"]
for panel in panels:
    for target in panel["targets"]:
        hold("panel " + panel["title"], target["expr"])

alerts = [rule for group in yaml.safe_load(rules)["groups"] for rule in group["rules"]]
for rule in alerts:
    if set(rule) - {"for"} != {"alert", "expr", "labels", "annotations"} or set(rule["annotations"]) != {"summary", "description"}:
        print("rule", rule.get("alert"), "has keys other than it should")
    hold("rule " + rule["alert"], rule["expr"])

for name in samples:
    if not re.sub(r"_(bucket|count|sum)$", "", name).startswith("vlserviced_"):
        print("a name of its own:", name)
print(len(samples), "names,", len(panels), "panels,", len(alerts), "rules")
