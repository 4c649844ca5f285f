"""Sums test reports (GoogleTest's and pytest's XML) into the line "N passed, N failed, N skipped".

A report that was expected and is missing or broken, as of a program that crashed, is one failure.
"""

import sys
import xml.etree.ElementTree as ElementTree
from pathlib import Path


def outcome(case):
    for child in case:
        if child.tag in ("failure", "error"):
            return "failed", ""
        if child.tag == "skipped":
            return "skipped", child.get("message") or (child.text or "").strip()
    if case.get("status") == "notrun":
        return "skipped", "disabled"
    return "passed", ""


def main(reports):
    counts = {"passed": 0, "failed": 0, "skipped": 0}
    lines = []
    for report in map(Path, reports):
        try:
            cases = list(ElementTree.parse(report).iter("testcase"))
        except (OSError, ElementTree.ParseError) as error:
            counts["failed"] += 1
            lines.append(f"failed: {report.stem} ended without a report ({error})")
            continue
        for case in cases:
            result, reason = outcome(case)
            counts[result] += 1
            if result != "passed":
                name = f"{report.stem}: {case.get('classname')}.{case.get('name')}"
                lines.append(f"{result}: {name} {reason}".rstrip())
    print()
    print("\n".join(lines + [", ".join(f"{count} {name}" for name, count in counts.items())]))
    return 1 if counts["failed"] or not counts["passed"] else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
