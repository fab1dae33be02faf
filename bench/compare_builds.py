#!/usr/bin/env python3
"""Compares two qecfg binaries on many sources: every end-to-end source, every
example, the fuzz corpora, and generated sources (valid ones from many seeds,
and mutated ones so that the error paths are taken too). Each source is
compiled plainly, with -s and with -d 3; the exit status, standard output,
standard error and the output file's bytes must agree.

    bench/compare_builds.py OLD_QECFG NEW_QECFG [--generated N] [--jobs J]

Sources that hold a NUL byte are left out (the reader refuses them now).
Prints the counts, and the first differences; exit status 1 when any differ.
"""
import argparse
import concurrent.futures
import os
import random
import shutil
import subprocess
import sys
import tempfile

ROOT = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))
MODES = ([], ["-s"], ["-d", "3"])

TYPES = ["Int32", "UInt32", "Int64", "UInt64", "Float32", "Float64", "String", "Binary", "RH",
         "Int32Array", "UInt32Array", "Int64Array", "UInt64Array", "Float32Array", "Float64Array",
         "StringArray", "BinaryArray", "RHArray", "SD", "SDArray", "None", "SBS", "Bogus"]
ELEMENT_TYPES = ["Int32", "UInt32", "Int64", "UInt64", "Float32", "Float64", "String", "Binary", "RH",
                 "Int32Array", "StringArray", "BinaryArray", "RHArray"]
CLASS_SD = ["DefineSDDefinition", "UndefineSDDefinition", "OnlineSDDefinition", "OfflineSDDefinition",
            "ResetSDDefinition"]


def value_of(rnd, dt):
    base = dt[:-5] if dt.endswith("Array") else dt
    choices = {
        "Int32": ["0", "-5", "123456", "2147483647"],
        "UInt32": ["0", "7", "4000000000"],
        "Int64": ["-9000000000", "42", "9223372036854775807"],
        "UInt64": ["18000000000", "3"],
        "Float32": ["1.5e3", "0.25", "-2"],
        "Float64": ["0x1p-3", "3.25", "1e-5"],
        "String": ['"some text"', "plain"],
        "Binary": ["0x00ff10aa", "0x", "ab\\101"],
        "RH": ["anything"],
    }.get(base, ["1"])
    if rnd.random() < 0.02:
        return rnd.choice(["x1", "1e40", "0x0g", "-1", "a,b"])
    return rnd.choice(choices)


class Source:
    def __init__(self, rnd):
        self.r = rnd
        self.lines = []

    def add(self, header, stmts):
        self.lines.append(header)
        self.lines.extend("    %s=%s" % s for s in stmts)

    def element(self, kind, idx, opt=True, indexed=True):
        dt = self.r.choice(ELEMENT_TYPES)
        stmts = [("ElementName", "E%d" % idx), ("Description", "1"), ("DisplayName", "2"),
                 ("ElementIndex", str(idx)), ("DataType", dt)]
        self.r.shuffle(stmts)
        if opt and not dt.startswith("RH") and self.r.random() < 0.3:
            stmts.append(("ValidValue", value_of(self.r, dt)))
            if self.r.random() < 0.5:
                stmts.append(("ValueDisplayName", "4"))
        if not indexed:
            stmts = [s for s in stmts if s[0] != "ElementIndex"]
        self.add(kind, stmts)

    def run(self, kind, n=None):
        indexed = self.r.random() < 0.97
        for i in range(n if n is not None else self.r.randint(1, 3)):
            self.element(kind, i, kind != "ActionOutSDDefinition", indexed)

    def attribute(self, kind, n):
        dynamic = kind.startswith("Dynamic")
        dt = self.r.choice(TYPES[:20])
        stmts = [("Name", "A%d" % n), ("Description", "1"), ("DisplayName", "2"), ("Id", str(n)),
                 ("DataType", dt), ("VarietyRange", "1,%d" % self.r.randint(1, 3))]
        if dynamic:
            stmts.append(("VariableType", self.r.choice(["Counter", "Quantity", "State", "Quantum"])))
        self.r.shuffle(stmts)
        opts = []
        if self.r.random() < 0.4:
            opts.append(("GroupID", str(self.r.randint(0, 9))))
        if self.r.random() < 0.4:
            opts.append(("Properties", "Public" if dynamic else self.r.choice(["Public,ReqdForDefine", "ReadOnly"])))
        sd = dt in ("SD", "SDArray")
        valueless = sd or dt.startswith("RH")
        valid = []
        if not valueless and self.r.random() < 0.5:
            for _ in range(self.r.randint(1, 3)):
                valid.append(("ValidStateValue" if dynamic else "ValidValue", value_of(self.r, dt)))
                if self.r.random() < 0.5:
                    valid.append(("ValueDisplayName", "3"))
        if not valueless and self.r.random() < 0.5:
            if dynamic:
                opts.append(("InitialValue", value_of(self.r, dt)))
            else:
                for _ in range(self.r.randint(1, 3) if dt.endswith("Array") else 1):
                    opts.append(("DefaultValue", value_of(self.r, dt)))
        if dynamic and self.r.random() < 0.5:
            opts.append(("Range", "%s,%s" % (value_of(self.r, dt), value_of(self.r, dt))))
        if dynamic and self.r.random() < 0.6:
            opts.append(("VariableClass", "VC%d" % self.r.randint(0, 3)))
        if dynamic and self.r.random() < 0.3:
            opts += [("Expression", "x>1"), ("ExpressionDescription", "5")]
        self.r.shuffle(opts)
        self.add(kind, stmts + valid + opts)
        if sd:
            self.run("PAttrSDDefinition" if not dynamic else "DAttrSDDefinition")

    def action(self, kind, n):
        stmts = [("Name", "Act%d" % n), ("Description", "1"), ("DisplayName", "2"), ("Id", str(n)),
                 ("VarietyRange", "1,1")]
        if self.r.random() < 0.5:
            stmts.append(("Permission", self.r.choice("qlevdcsoaxz")))
        if self.r.random() < 0.3:
            stmts.append(("Properties", "Public,LongRun"))
        if self.r.random() < 0.3:
            stmts.append(("TimeOut", "30"))
        self.add(kind, stmts)
        if self.r.random() < 0.4:
            self.run("ActionInSDDefinition")
        if self.r.random() < 0.3:
            self.run("ActionOutSDDefinition")

    def klass(self, c):
        self.add("ControlDefinition", [("FileVersion", "1.%d.2.3" % c)])
        stmts = [("Description", "1"), ("DisplayName", "2"), ("Properties", "HasResources,CanDefine"),
                 ("ClassPermTemplate", "t"), ("ResourcePermTemplate", "t")]
        if self.r.random() < 0.8:
            stmts.append(("Name", "Gen.Class%d" % c))
        if self.r.random() < 0.4:
            stmts.append(("Locator", "A%d" % self.r.randint(0, 4)))
        self.add("ResourceClass", stmts)
        n = 0
        for _ in range(self.r.randint(0, 8)):
            what = self.r.random()
            if what < 0.6:
                self.attribute(self.r.choice(["PersistentResourceAttribute", "PersistentClassAttribute",
                                              "DynamicResourceAttribute", "DynamicClassAttribute"]), n)
            elif what < 0.8:
                self.action(self.r.choice(["ClassAction", "ResourceAction"]), n)
            else:
                self.run(self.r.choice(CLASS_SD))
            n += 1

    def text(self):
        for c in range(self.r.randint(1, 3)):
            self.klass(c)
        self.add("ClassToManagerMapping", [("ResourceManager", "Gen.RM"), ("FirstKey", "1"), ("LastKey", "9"),
                                           ("MessageCatalog", "gen.cat"), ("DescriptiveMessageSet", "1")])
        for v in range(self.r.randint(0, 4)):
            self.add("ResourceVariableClass", [("VariableClass", "VC%d" % v), ("ObservationInterval", "60"),
                                               ("ReportingInterval", "60")])
        return self.lines


def mutate(rnd, lines):
    lines = list(lines)
    for _ in range(rnd.randint(1, 3)):
        i = rnd.randrange(len(lines))
        op = rnd.randrange(7)
        if op == 0:
            del lines[i]
        elif op == 1:
            lines.insert(i, lines[rnd.randrange(len(lines))])
        elif op == 2:
            j = rnd.randrange(len(lines))
            lines[i], lines[j] = lines[j], lines[i]
        elif op == 3 and "=" in lines[i]:
            lines[i] = lines[i].split("=")[0] + "=" + rnd.choice(["", "\"", "zz", "1,2,3", "SD", "-1", '""'])
        elif op == 4:
            lines[i] = lines[i].strip()
        elif op == 5:
            lines.insert(i, rnd.choice(["PAttrSDDefinition", "DAttrSDDefinition", "ActionInSDDefinition",
                                        "DefineSDDefinition", "ResourceAction", "Bogus", "    Name=x"]))
        else:
            lines.insert(i, rnd.choice(["# comment", "// c", "    DefaultValue=1", "    Range=1,2"]))
    return lines


def corpus_sources():
    found = []
    for sub in ("tests/e2e", "examples", "fuzz/corpus/qecfg", "fuzz/corpus/roundtrip", "tests/cdbdump"):
        for dirpath, _, files in os.walk(os.path.join(ROOT, sub)):
            for f in sorted(files):
                if f.endswith(".src") or sub.startswith("fuzz"):
                    with open(os.path.join(dirpath, f), "rb") as fh:
                        data = fh.read()
                    # The compiler harness's inputs begin with its option byte.
                    if sub == "fuzz/corpus/qecfg":
                        data = data[1:]
                    found.append((os.path.relpath(os.path.join(dirpath, f), ROOT), data))
    return found


def run_one(binary, work, src, mode):
    shutil.rmtree(work, ignore_errors=True)
    os.makedirs(work)
    with open(os.path.join(work, "input.src"), "wb") as fh:
        fh.write(src)
    env = dict(os.environ, ZU_CDB_FORCE_EMPTY_TIMESTAMP="1")
    p = subprocess.run([binary] + mode + ["input.src", "out.cdef"], cwd=work, env=env, capture_output=True,
                       timeout=60)
    out = os.path.join(work, "out.cdef")
    data = open(out, "rb").read() if os.path.exists(out) else None
    return (p.returncode, p.stdout, p.stderr, data)


def compare(args, item, scratch):
    name, src = item
    diffs = []
    for mode in MODES:
        a = run_one(args.old, os.path.join(scratch, "a"), src, mode)
        b = run_one(args.new, os.path.join(scratch, "b"), src, mode)
        if a != b:
            what = [k for k, x, y in zip(("status", "stdout", "stderr", "output"), a, b) if x != y]
            detail = "" if "output" in what else " (%r / %r)" % (a[2][-120:].split(b": ", 1)[-1],
                                                               b[2][-120:].split(b": ", 1)[-1])
            diffs.append("%s %s: %s differ%s" % (name, " ".join(mode) or "plain", ", ".join(what), detail))
    return diffs, a[0] == 0


def arguments():
    """The two binaries (as absolute paths), --generated and --jobs."""
    ap = argparse.ArgumentParser()
    ap.add_argument("old")
    ap.add_argument("new")
    ap.add_argument("--generated", type=int, default=2000)
    ap.add_argument("--jobs", type=int, default=2)
    args = ap.parse_args()
    args.old, args.new = os.path.abspath(args.old), os.path.abspath(args.new)
    return args


def all_sources(generated):
    """The corpus sources, then a generated and a mutated source per seed."""
    items = corpus_sources()
    for seed in range(generated):
        rnd = random.Random(seed)
        lines = Source(rnd).text()
        items.append(("generated/%d" % seed, ("\n".join(lines) + "\n").encode()))
        items.append(("mutated/%d" % seed, ("\n".join(mutate(rnd, lines)) + "\n").encode()))
    return items


def compare_all(args, items, compare_one, prefix):
    """compare_one(args, item, scratch) of every item, in args.jobs threads,
    each with a scratch directory of its own; the results in order."""
    scratch = tempfile.mkdtemp(prefix=prefix)
    try:
        with concurrent.futures.ThreadPoolExecutor(args.jobs) as ex:
            futures = [ex.submit(compare_one, args, item, os.path.join(scratch, str(i)))
                       for i, item in enumerate(items)]
            return [f.result() for f in futures]
    finally:
        shutil.rmtree(scratch, ignore_errors=True)


def main():
    args = arguments()
    items = all_sources(args.generated)
    # A NUL byte is refused on its line since the reader stopped cutting lines
    # there silently: such sources are not compared.
    with_nul = [name for name, src in items if b"\0" in src]
    items = [item for item in items if b"\0" not in item[1]]
    results = compare_all(args, items, compare, "qecfg-compare-")
    differing = [d for diffs, _ in results for d in diffs]
    compiled = sum(ok for _, ok in results)
    print("sources: %d (compiled: %d, refused: %d), runs per binary: %d, differing runs: %d"
          % (len(items), compiled, len(items) - compiled, len(items) * len(MODES), len(differing)))
    if with_nul:
        print("not compared, holding a NUL byte: %d (%s)" % (len(with_nul), ", ".join(with_nul[:5])))
    kinds = {}
    for d in differing:
        kind = d.split(": ", 1)[1]
        kinds[kind] = kinds.get(kind, 0) + 1
    for kind, n in sorted(kinds.items(), key=lambda k: -k[1]):
        print("%6d x %s" % (n, kind))
    for d in differing[:20]:
        print(d)
    return 1 if differing else 0


if __name__ == "__main__":
    sys.exit(main())
