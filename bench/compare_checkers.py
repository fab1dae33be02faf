#!/usr/bin/env python3
"""Compares two qecfg-check binaries on the sources bench/compare_builds.py
uses: every end-to-end source, example and corpus file, and generated and
mutated sources. Each source is checked as it is and with -Werror; the exit
status, standard output and standard error must agree.

    bench/compare_checkers.py OLD_QECFG_CHECK NEW_QECFG_CHECK [--generated N] [--jobs J]

Prints the counts and the first differences; exit status 1 when any differ.
"""
import argparse
import concurrent.futures
import os
import random
import shutil
import subprocess
import sys
import tempfile

from compare_builds import Source, corpus_sources, mutate

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
    ap = argparse.ArgumentParser()
    ap.add_argument("old")
    ap.add_argument("new")
    ap.add_argument("--generated", type=int, default=2000)
    ap.add_argument("--jobs", type=int, default=2)
    args = ap.parse_args()
    args.old, args.new = os.path.abspath(args.old), os.path.abspath(args.new)
    items = corpus_sources()
    for seed in range(args.generated):
        rnd = random.Random(seed)
        lines = Source(rnd).text()
        items.append(("generated/%d" % seed, ("\n".join(lines) + "\n").encode()))
        items.append(("mutated/%d" % seed, ("\n".join(mutate(rnd, lines)) + "\n").encode()))
    scratch = tempfile.mkdtemp(prefix="qecfg-check-compare-")
    differing, statuses = [], {}
    try:
        with concurrent.futures.ThreadPoolExecutor(args.jobs) as ex:
            futures = [ex.submit(compare, args, item, os.path.join(scratch, str(i))) for i, item in enumerate(items)]
            for f in futures:
                d, status = f.result()
                differing += d
                statuses[status] = statuses.get(status, 0) + 1
    finally:
        shutil.rmtree(scratch, ignore_errors=True)
    print("sources: %d (by status of the first run: %s), runs per binary: %d, differing runs: %d"
          % (len(items), ", ".join("%s: %d" % kv for kv in sorted(statuses.items())), len(items) * len(MODES),
             len(differing)))
    for d in differing[:20]:
        print(d)
    return 1 if differing else 0


if __name__ == "__main__":
    sys.exit(main())
