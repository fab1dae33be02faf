#!/usr/bin/env python3
"""Compares two cdbdump binaries on many CDBs: every end-to-end source, every
example and the generated sources of compare_builds.py, compiled plainly and
with -s, the CDBs of cdbdump's fuzz corpus, and mutated copies of those images
(a byte changed, with and without the checksum made right again, or the file
cut short). Every mode (text, --check, --json, --annotate, --source,
--header) runs on every image, and --diff and --compat, plain and with
--json, on neighbouring pairs; the exit status, standard output and standard
error must agree.

    bench/compare_cdbdump.py QECFG OLD_CDBDUMP NEW_CDBDUMP [--generated N] [--mutations M]

Prints the counts and the first differences; exit status 1 when any differ.
"""
import argparse
import concurrent.futures
import os
import random
import struct
import subprocess
import sys
import tempfile

HERE = os.path.dirname(os.path.abspath(__file__))
sys.path.insert(0, HERE)
import compare_builds as builds  # noqa: E402  (the sources and generator of the compiler's comparison)

SINGLE = ([], ["--check"], ["--json"], ["--annotate"], ["--source"], ["--header"])
PAIRS = (["--diff"], ["--compat"], ["--diff", "--json"], ["--compat", "--json"])
CORPUS = os.path.join(HERE, "..", "fuzz", "corpus", "cdbdump")


def compile_all(qecfg, items, out_dir):
    images = []
    env = dict(os.environ, ZU_CDB_FORCE_EMPTY_TIMESTAMP="1")
    for i, (name, src) in enumerate(items):
        src_path = os.path.join(out_dir, "%d.src" % i)
        with open(src_path, "wb") as fh:
            fh.write(src)
        for flag in ([], ["-s"]):
            out = os.path.join(out_dir, "%d%s.cdef" % (i, flag[0] if flag else ""))
            if subprocess.run([qecfg] + flag + [src_path, out], env=env, capture_output=True).returncode == 0:
                images.append(("%s %s" % (name, " ".join(flag) or "plain"), out))
    return images


def fix_checksum(b):
    order = ">" if b[8:12] == b"\x66\x6d\x74\x31" else "<"
    words = struct.unpack(order + "%dI" % (len(b) // 4), bytes(b))
    s = words[0]
    for w in words[2:]:
        s ^= w
    b[4:8] = struct.pack(order + "I", s)


def mutate_all(images, per_image, out_dir):
    mutated = []
    for i, (name, path) in enumerate(images):
        data = open(path, "rb").read()
        rnd = random.Random(i)
        for m in range(per_image):
            b = bytearray(data)
            kind = m % 3
            if kind == 2:
                b = b[:rnd.randrange(len(b))]
            else:
                pos = rnd.randrange(len(b))
                b[pos] = rnd.choice([0, 0xff, b[pos] ^ (1 << rnd.randrange(8)), rnd.randrange(256)])
                if kind == 1 and len(b) % 4 == 0 and len(b) >= 80:
                    fix_checksum(b)
            out = os.path.join(out_dir, "m%d_%d.cdef" % (i, m))
            with open(out, "wb") as fh:
                fh.write(b)
            mutated.append(("%s mutation %d" % (name, m), out))
    return mutated


def run(binary, args):
    p = subprocess.run([binary] + args, capture_output=True, timeout=120)
    return (p.returncode, p.stdout, p.stderr)


def compare(old, new, args, label):
    a, b = run(old, args), run(new, args)
    if a == b:
        return None
    what = [k for k, x, y in zip(("status", "stdout", "stderr"), a, b) if x != y]
    return "%s %s: %s differ" % (label, " ".join(args), ", ".join(what))


def main():
    ap = argparse.ArgumentParser()
    ap.add_argument("qecfg")
    ap.add_argument("old")
    ap.add_argument("new")
    ap.add_argument("--generated", type=int, default=200)
    ap.add_argument("--mutations", type=int, default=6)
    ap.add_argument("--jobs", type=int, default=2)
    args = ap.parse_args()
    items = [x for x in builds.corpus_sources() if x[0].endswith(".src")]
    for seed in range(args.generated):
        items.append(("generated/%d" % seed, ("\n".join(builds.Source(random.Random(seed)).text()) + "\n").encode()))
    with tempfile.TemporaryDirectory(prefix="cdbdump-compare-") as tmp:
        images = compile_all(os.path.abspath(args.qecfg), items, tmp)
        images += [("corpus/" + f, os.path.join(CORPUS, f)) for f in sorted(os.listdir(CORPUS))]
        images += mutate_all(images, args.mutations, tmp)
        jobs = []
        for i, (label, path) in enumerate(images):
            for mode in SINGLE:
                jobs.append((mode + [path], label))
            partner = images[(i + 1) % len(images)][1]
            for mode in PAIRS:
                jobs.append((mode + [path, partner], label + " vs next"))
        with concurrent.futures.ThreadPoolExecutor(args.jobs) as ex:
            results = list(ex.map(lambda j: compare(args.old, args.new, j[0], j[1]), jobs))
    diffs = [r for r in results if r]
    print("%d images, %d runs compared, %d differ" % (len(images), len(jobs), len(diffs)))
    for d in diffs[:30]:
        print(d)
    return 1 if diffs else 0


if __name__ == "__main__":
    sys.exit(main())
