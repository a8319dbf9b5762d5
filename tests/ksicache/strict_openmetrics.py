"""Reads OpenMetrics from standard input by a strict parser, and prints how many
samples there are of each type; status 77 without python3-prometheus-client."""

import collections
import sys

try:
    from prometheus_client.openmetrics.parser import text_string_to_metric_families
except ImportError:
    sys.exit(77)

samples = collections.Counter()
families = set()
for family in text_string_to_metric_families(sys.stdin.read()):
    assert family.name not in families, family.name
    families.add(family.name)
    assert family.documentation, family.name
    assert family.unit == "" or family.name.endswith("_" + family.unit), family.name
    for ending in ("bytes", "seconds", "ratio"):
        assert family.name.endswith("_" + ending) == (family.unit == ending), family.name
    samples[family.type] += len(family.samples)
print(*(f"{name}={count}" for name, count in sorted(samples.items())))
