#!/usr/bin/env python3
"""Compares two qecfg-check binaries on the sources bench/compare_builds.py
uses: every end-to-end source, example and corpus file, and generated and
mutated sources. Each source is checked as it is and with -Werror; the exit
status, standard output and standard error must agree.

    bench/compare_checkers.py OLD_QECFG_CHECK NEW_QECFG_CHECK [--generated N] [--jobs J]

Prints the counts and the first differences; exit status 1 when any differ.
"""
import os
import subprocess
import sys

from compare_builds import all_sources, arguments, compare_all

MODES = ([], ["-Werror"])


def run_one(binary, work, src, mode):
    with open(os.path.join(work, "input.src"), "wb") as fh:
        fh.write(src)
    p = subprocess.run([binary] + mode + ["input.src"], cwd=work, capture_output=True, timeout=60)
    return (p.returncode, p.stdout, p.stderr)


def compare(args, item, scratch):
    name, src = item
    os.makedirs(scratch, exist_ok=True)
    diffs, status = [], None
    for mode in MODES:
        a = run_one(args.old, scratch, src, mode)
        b = run_one(args.new, scratch, src, mode)
        status = a[0] if status is None else status
        if a != b:
            what = [k for k, x, y in zip(("status", "stdout", "stderr"), a, b) if x != y]
            diffs.append("%s %s: %s differ (%r / %r)" % (name, " ".join(mode) or "plain", ", ".join(what),
                                                          a[2][:200], b[2][:200]))
    return diffs, status


def main():
    args = arguments()
    items = all_sources(args.generated)
    results = compare_all(args, items, compare, "qecfg-check-compare-")
    differing = [d for diffs, _ in results for d in diffs]
    statuses = {}
    for _, status in results:
        statuses[status] = statuses.get(status, 0) + 1
    print("sources: %d (by status of the first run: %s), runs per binary: %d, differing runs: %d"
          % (len(items), ", ".join("%s: %d" % kv for kv in sorted(statuses.items())), len(items) * len(MODES),
             len(differing)))
    for d in differing[:20]:
        print(d)
    return 1 if differing else 0


if __name__ == "__main__":
    sys.exit(main())
