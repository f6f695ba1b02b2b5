#!/usr/bin/env python3
"""Mutants of I-files, changed as programs by icmutate: whatever reads them must end in an orderly manner.

  scripts/fuzz mutants [FILE.if|FILE.c ...] [--count N] [--seed S] [--minutes M] [--jobs J]

Without files the bases are those in tests/fuzz/corpus, and tests/programs parsed. Each mutant is executed, optimized
at two levels of its own, and what came out is dumped and executed. A finding is an end by a signal or an assertion, an
endless run, an output beside a refusal, and an output that cannot be read. Its mutant is kept in the folder of findings.
"""
import argparse
import os
import random
import resource
import subprocess
import sys
import tempfile
import time
from concurrent.futures import ThreadPoolExecutor
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent.parent
sys.path.insert(0, str(ROOT / "tools"))
from zbench import INCLUDE, Tools, Trouble  # noqa: E402

LEVELS = ("off", "0", "1", "2", "3", "4")
SECONDS, MEMORY, STEPS = 20, 6 << 30, 200_000
DEFECT = "has a defect"


def run(command):
    """(status, what was printed); status None for an endless run."""
    limit = lambda: resource.setrlimit(resource.RLIMIT_AS, (MEMORY, MEMORY))
    try:
        done = subprocess.run([str(word) for word in command], stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                              stderr=subprocess.STDOUT, timeout=SECONDS,
                              preexec_fn=None if os.environ.get("ASAN_OPTIONS") else limit)
    except subprocess.TimeoutExpired:
        return None, ""
    return done.returncode, done.stdout.decode("utf-8", "backslashreplace")


def disorderly(status, text):
    """What is wrong with an end, or None."""
    if status is None:
        return f"no end after {SECONDS} s"
    if status < 0:
        return f"signal {-status}"
    if DEFECT in text or "runtime error:" in text or "AddressSanitizer" in text:
        return next((line for line in text.splitlines() if "runtime error:" in line or "ERROR:" in line), DEFECT)
    return None


def judge_output(tools, unit, out, words):
    out.unlink(missing_ok=True)
    status, text = run([tools.zopt, *words, unit, out])
    wrong = disorderly(status, text) or (f"status {status}" if status not in (0, 1) else None)
    if wrong or status == 1:
        return wrong or ("refused, but there is an output" if out.exists() else None)
    status, text = run([tools.icdump, out])
    if status != 0:
        return f"the output cannot be read: {text.strip().splitlines()[-1:]}"
    wrong = disorderly(*run([tools.icrun, "--max-steps", STEPS, out]))
    return wrong and f"executing the output: {wrong}"


def judge(tools, unit, folder, seed):
    """(words, what is wrong) of each finding."""
    wrong = disorderly(*run([tools.icrun, "--max-steps", STEPS, unit]))
    if wrong:
        yield ["icrun"], wrong
    choice = random.Random(seed)
    for level in choice.sample(LEVELS, 2):
        words = [f"--opt_level={level}", *(["--debug:validate"] if seed % 4 == 0 else [])]
        wrong = judge_output(tools, unit, folder / "out.if", words)
        if wrong:
            yield words, wrong


def one(tools, mutate, bases, seed, findings):
    """Findings of the mutant `seed`, which is kept if there are some; None where the writer made none."""
    with tempfile.TemporaryDirectory() as name:
        folder = Path(name)
        unit = folder / "unit.if"
        base = random.Random(seed).choice(bases)
        if run([mutate, seed, base, unit])[0] != 0:
            return None
        found = list(judge(tools, unit, folder, seed))
        if found:
            findings.mkdir(parents=True, exist_ok=True)
            kept = findings / f"mutant{seed}-{base.stem}.if"
            kept.write_bytes(unit.read_bytes())
        return [f"{seed} of {base.name}: {' '.join(words)}: {wrong}" for words, wrong in found]


def parsed(tools, sources, folder):
    def parse(source):
        unit = folder / f"{source.stem}.if"
        try:
            tools.parse(source, unit, ["-w"])
        except Trouble:
            return None
        return unit
    with ThreadPoolExecutor(2) as pool:
        return [unit for unit in pool.map(parse, sources) if unit]


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    Tools.add_options(parser)
    parser.add_argument("files", nargs="*", type=Path)
    parser.add_argument("--mutate", default=os.environ.get("ICMUTATE", ROOT / "build" / "icmutate"))
    parser.add_argument("--count", type=int, default=0, help="mutants (200; with --minutes as many as fit)")
    parser.add_argument("--seed", type=int, default=1)
    parser.add_argument("--minutes", type=float, default=0)
    parser.add_argument("--jobs", type=int, default=2)
    parser.add_argument("--findings", type=Path, default=ROOT / "fuzz-findings", metavar="DIR")
    options = parser.parse_args()
    tools = Tools.of(options)
    corpus = ROOT / "tests" / "fuzz" / "corpus"
    files = options.files or [*sorted(corpus.glob("*.if")), *sorted((ROOT / "tests" / "programs").glob("*.c"))]
    end = time.monotonic() + options.minutes * 60 if options.minutes else float("inf")
    count = options.count or (10**9 if options.minutes else 200)
    made = failed = 0
    with tempfile.TemporaryDirectory() as folder, ThreadPoolExecutor(options.jobs) as pool:
        bases = [f for f in files if f.suffix != ".c"]
        bases += parsed(tools, [f for f in files if f.suffix == ".c"], Path(folder))
        work = lambda seed: None if time.monotonic() > end else one(tools, options.mutate, bases, seed, options.findings)
        for first in range(options.seed, options.seed + count, 64):
            if time.monotonic() > end:
                break
            for found in pool.map(work, range(first, min(first + 64, options.seed + count))):
                made += found is not None
                failed += bool(found)
                for text in found or []:
                    print(f"FAIL {text}", flush=True)
    print(f"{made} mutants, {failed} with findings")
    return 1 if failed or not made else 0


if __name__ == "__main__":
    sys.exit(main())
