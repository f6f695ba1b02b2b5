#!/usr/bin/env python3
"""Time and peak memory of whole runs over generated units, and how both grow.

  bench/whole_process.py [--build DIR] [--zopt PROGRAM] [--level WORD] [--runs N] [--json FILE] [series ...]

Series: the reference unit of over a million nodes; its functions doubled; the size of a function doubled; small functions
doubled; functions doubled that have a static variable each; the cases of one switch doubled. A figure is the best of N
runs, in CPU seconds of the child; memory is its largest resident set less that of an empty unit. The last column is the
time over that of the line before: 2 where it is linear.
"""
import argparse, json, os, resource, subprocess, sys, tempfile


# Of each unit: functions, statements of each, static variables, cases.
SERIES = {
    "reference": [(1000, 120)],
    "functions": [(n, 120) for n in (250, 500, 1000, 2000)],
    "size": [(4, n) for n in (2500, 5000, 10000, 20000)],
    "small": [(n, 2) for n in (2500, 5000, 10000, 20000)],
    "statics": [(n, 2, n) for n in (200, 400, 800, 1600, 3200)],
    "cases": [(1, 2, 0, n) for n in (1500, 3000, 6000, 12000)],
}


def run(cmd):
    """CPU seconds and peak resident bytes of one child."""
    pid = os.fork()
    if pid == 0:
        with open(os.devnull, "w") as null:
            os.dup2(null.fileno(), 1)
        os.execv(cmd[0], cmd)
    _, status, usage = os.wait4(pid, 0)
    if status:
        sys.exit(f"{' '.join(cmd)}: status {status}")
    return usage.ru_utime + usage.ru_stime, usage.ru_maxrss * 1024


def main():
    p = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    p.add_argument("--build", default="build")
    p.add_argument("--zopt")
    p.add_argument("series", nargs="*", metavar="series", help=" ".join(SERIES))
    p.add_argument("--level", default="0")
    p.add_argument("--runs", type=int, default=5)
    p.add_argument("--json")
    a = p.parse_args()
    gen = os.path.abspath(os.path.join(a.build, "bench/gen_unit"))
    zopt = os.path.abspath(a.zopt or os.path.join(a.build, "zopt"))
    work = tempfile.mkdtemp()
    rows = []

    def measure(series, functions, statements, *more):
        unit, out = os.path.join(work, "unit.if"), os.path.join(work, "out.if")
        words = [str(n) for n in (functions, statements, unit, *more)]
        nodes = int(subprocess.run([gen, *words], check=True, capture_output=True, text=True).stdout.split()[0])
        results = [run([zopt, f"--opt_level={a.level}", unit, out]) for _ in range(a.runs)]
        seconds, memory = min(r[0] for r in results), min(r[1] for r in results)
        growth = seconds / rows[-1]["seconds"] if rows and rows[-1]["series"] == series else 0
        rows.append(dict(series=series, functions=functions, statements=statements, more=more, nodes=nodes,
                         seconds=round(seconds, 3), nodes_per_second=round(nodes / max(seconds, 1e-9)),
                         bytes_per_node=round((memory - empty) / nodes, 1), growth=round(growth, 2)))
        print("{series:10} {functions:6} functions of {statements:6} statements {nodes:9} nodes {seconds:7.3f} s "
              "{nodes_per_second:9} nodes/s {bytes_per_node:7} bytes/node {growth:6}".format(**rows[-1]), flush=True)

    tiny = os.path.join(work, "tiny.if")
    subprocess.run([gen, "1", "1", tiny], check=True, capture_output=True)
    empty = run([zopt, f"--opt_level={a.level}", tiny, os.path.join(work, "out.if")])[1]
    for series in a.series or SERIES:
        for arguments in SERIES[series]:
            measure(series, *arguments)
    if a.json:
        with open(a.json, "w") as f:
            json.dump(rows, f, indent=1)


if __name__ == "__main__":
    main()
