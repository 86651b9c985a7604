#!/usr/bin/env python3
"""A mutation run over qsd/: does the test suite notice a planted fault?

Each mutant in mutants.txt changes one line of one source file. For each, the
file is changed, the tool and the test programs are rebuilt in build/mutants
(a debug build without sanitizers: faster, and a fault must show in a test,
not in a sanitizer report), and the test programs run from the fastest to the
slowest until one fails. A mutant that no program notices has survived: the
suite misses that fault.

    tools/mutants/run.py            # every mutant
    tools/mutants/run.py 3 7 12     # those numbers only
    tools/mutants/run.py --list     # the numbered list, nothing run

The source file is restored after every mutant, also on Ctrl-C or a crash of
this script; it refuses to start while qsd/ has changes of its own, so that
what it restores is what was committed.
"""

import argparse
import os
import signal
import subprocess
import sys
import time
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
LIST = Path(__file__).resolve().parent / "mutants.txt"
BUILD = ROOT / "build" / "mutants"
BIN = BUILD / "bin"
LOGS = BUILD / "logs"

# The test programs from the fastest to the slowest: a fault is usually caught
# by its own subsystem's unit tests in seconds, and the end-to-end and
# robustness programs run only for what those let through. Programs not named
# here run after these, in name order.
ORDER = [
    "test_text",
    "test_config",
    "test_envfile",
    "test_seeding",
    "test_driver",
    "test_installer",
    "test_fileops",
    "test_platform",
    "test_tool",
]
UNIT_SECONDS = 180
SLOW_PROGRAMS = {"test_tool"}
SLOW_SECONDS = 900
BUILD_SECONDS = 1800


class Mutant:
    def __init__(self, number, fields, line_no):
        self.number = number
        self.file = fields.get("file", "")
        self.original = fields.get("from", "")
        self.replacement = fields.get("to", "")
        self.why = fields.get("why", "")
        self.line_no = line_no


def parse_list(text):
    """Blocks separated by blank lines, each of `file:`, `from:`, `to:` and
    `why:` lines; `#` starts a comment line. One space after the colon is
    part of the syntax, the rest of the line (its indentation too) is the
    value."""
    mutants = []
    fields = {}
    start = 0

    def close():
        if not fields:
            return
        missing = [k for k in ("file", "from", "to", "why") if k not in fields]
        if missing:
            sys.exit(f"mutants.txt:{start}: block lacks {', '.join(missing)}")
        mutants.append(Mutant(len(mutants) + 1, dict(fields), start))
        fields.clear()

    for n, line in enumerate(text.splitlines(), 1):
        if line.startswith("#"):
            continue
        if not line.strip():
            close()
            continue
        key, colon, value = line.partition(":")
        if not colon or key not in ("file", "from", "to", "why"):
            sys.exit(f"mutants.txt:{n}: expected file:, from:, to: or why:, got {line!r}")
        if key in fields:
            sys.exit(f"mutants.txt:{n}: {key}: given twice in one block")
        if not fields:
            start = n
        fields[key] = value[1:] if value.startswith(" ") else value
    close()
    return mutants


def mutate(text, mutant):
    """The mutated text, or None when `from` does not stand exactly once in
    exactly one line (the source moved on: the mutant is stale)."""
    lines = text.split("\n")
    hits = [i for i, line in enumerate(lines) if mutant.original in line]
    if not mutant.original or len(hits) != 1:
        return None
    line = lines[hits[0]]
    if line.count(mutant.original) != 1:
        return None
    lines[hits[0]] = line.replace(mutant.original, mutant.replacement)
    return "\n".join(lines)


def run_logged(cmd, log, seconds):
    """Runs cmd in a process group of its own, output to log; on the time
    limit or Ctrl-C the whole group goes (the tests start the tool, which
    starts the loader). Returns the exit status, or None on the time limit."""
    log.write(f"$ {' '.join(str(c) for c in cmd)}\n")
    log.flush()
    proc = subprocess.Popen(cmd, cwd=ROOT, stdout=log, stderr=subprocess.STDOUT,
                            stdin=subprocess.DEVNULL, start_new_session=True)
    try:
        return proc.wait(timeout=seconds)
    except subprocess.TimeoutExpired:
        log.write(f"\n*** time limit of {seconds}s reached\n")
        return None
    finally:
        if proc.poll() is None:
            try:
                os.killpg(proc.pid, signal.SIGKILL)
            except ProcessLookupError:
                pass
            proc.wait()


def test_programs():
    present = {p.name for p in BIN.glob("test_*") if p.is_file() and os.access(p, os.X_OK)}
    ordered = [name for name in ORDER if name in present]
    return ordered + sorted(present - set(ordered))


def build(log):
    status = run_logged(["cmake", "--build", str(BUILD), "-j", str(os.cpu_count() or 2)], log,
                        BUILD_SECONDS)
    return status == 0


def first_failing(log):
    """The first test program that fails (with why), or None when all pass."""
    for name in test_programs():
        seconds = SLOW_SECONDS if name in SLOW_PROGRAMS else UNIT_SECONDS
        status = run_logged([str(BIN / name), "--gtest_fail_fast", "--gtest_brief=1"], log, seconds)
        if status is None:
            return f"{name} (time limit)"
        if status != 0:
            return name
    return None


def git_clean():
    diff = subprocess.run(["git", "diff", "--quiet", "HEAD", "--", "qsd"], cwd=ROOT)
    return diff.returncode == 0


def configure():
    if (BUILD / "build.ninja").exists():
        return
    subprocess.run(["cmake", "-S", ".", "-B", str(BUILD), "-G", "Ninja",
                    "-DCMAKE_BUILD_TYPE=Debug", "-DZR7_BENCH=OFF"], cwd=ROOT, check=True,
                   stdout=subprocess.DEVNULL)


def main():
    parser = argparse.ArgumentParser(description="Mutation run over qsd/.")
    parser.add_argument("numbers", nargs="*", type=int, help="mutants to run (default: all)")
    parser.add_argument("--list", action="store_true", help="print the numbered list and stop")
    parser.add_argument("--no-baseline", action="store_true",
                        help="skip the check that the unmutated suite passes")
    args = parser.parse_args()

    mutants = parse_list(LIST.read_text())
    if args.list:
        for m in mutants:
            print(f"#{m.number:<3} {m.file}  {m.why}")
        return 0
    unknown = [n for n in args.numbers if not 1 <= n <= len(mutants)]
    if unknown:
        sys.exit(f"no mutant numbered {unknown[0]} (1..{len(mutants)})")
    chosen = [m for m in mutants if not args.numbers or m.number in args.numbers]

    if not git_clean():
        sys.exit("qsd/ has uncommitted changes: commit or stash them first "
                 "(the run restores files to what they hold now)")
    started = time.monotonic()
    configure()
    LOGS.mkdir(parents=True, exist_ok=True)

    if not args.no_baseline:
        with open(LOGS / "baseline.log", "w") as log:
            if not build(log):
                sys.exit(f"the unmutated tree does not build: see {LOGS / 'baseline.log'}")
            failing = first_failing(log)
        if failing:
            sys.exit(f"the unmutated suite fails in {failing}: see {LOGS / 'baseline.log'}")
        print(f"baseline: suite passes ({time.monotonic() - started:.0f}s)", flush=True)

    counts = {"killed": 0, "survived": 0, "stale": 0, "build-failed": 0}
    survivors = []
    try:
        for m in chosen:
            path = ROOT / m.file
            original = path.read_bytes() if path.is_file() else None
            mutated = mutate(original.decode(), m) if original is not None else None
            if mutated is None:
                outcome, by = "stale", ""
            else:
                with open(LOGS / f"{m.number}.log", "w") as log:
                    try:
                        path.write_text(mutated)
                        if not build(log):
                            outcome, by = "build-failed", ""
                        else:
                            killer = first_failing(log)
                            outcome, by = ("killed", killer) if killer else ("survived", "")
                    finally:
                        path.write_bytes(original)
            counts[outcome] += 1
            if outcome == "survived":
                survivors.append(m)
            by_text = f" by {by}" if by else ""
            print(f"#{m.number} {outcome}{by_text}  {m.file}  {m.why}", flush=True)
    except KeyboardInterrupt:
        print("interrupted", flush=True)
    finally:
        clean = git_clean()
        if not clean:
            print("WARNING: qsd/ differs from HEAD after the run", flush=True)

    tried = sum(counts.values())
    print(f"mutants: {counts['killed']} killed of {tried} ({counts['survived']} survived"
          f", {counts['stale']} stale, {counts['build-failed']} build-failed)")
    minutes, seconds = divmod(int(time.monotonic() - started), 60)
    print(f"time: {minutes}m{seconds:02d}s; logs in {LOGS.relative_to(ROOT)}")
    return 1 if survivors or counts["stale"] or counts["build-failed"] or not clean else 0


if __name__ == "__main__":
    sys.exit(main())
