#!/usr/bin/env python3
"""Time and peak memory of whole runs over generated units, and how both grow.

  bench/whole_process.py [--build DIR] [--level WORD] [--runs N] [--json FILE]

Three series: the reference unit of over a million nodes; functions doubled; the size of one function doubled. A figure is the
best of N runs, in CPU seconds of the child; memory is its largest resident set less that of an empty unit.
"""
import argparse, json, os, resource, subprocess, sys, tempfile


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
    p.add_argument("--level", default="0")
    p.add_argument("--runs", type=int, default=5)
    p.add_argument("--json")
    a = p.parse_args()
    zopt, gen = (os.path.abspath(os.path.join(a.build, x)) for x in ("zopt", "bench/gen_unit"))
    work = tempfile.mkdtemp()
    rows = []

    def measure(series, functions, statements):
        unit = os.path.join(work, f"u{functions}x{statements}.if")
        nodes = int(subprocess.run([gen, str(functions), str(statements), unit], check=True, capture_output=True,
                                   text=True).stdout.split()[0])
        out = os.path.join(work, "out.if")
        results = [run([zopt, f"--opt_level={a.level}", unit, out]) for _ in range(a.runs)]
        seconds, memory = min(r[0] for r in results), min(r[1] for r in results)
        rows.append(dict(series=series, functions=functions, statements=statements, nodes=nodes, seconds=round(seconds, 3),
                         nodes_per_second=round(nodes / max(seconds, 1e-9)), bytes_per_node=round((memory - empty) / nodes, 1)))
        print("{series:10} {functions:6} functions of {statements:6} statements {nodes:9} nodes {seconds:7.3f} s "
              "{nodes_per_second:9} nodes/s {bytes_per_node:7} bytes/node".format(**rows[-1]), flush=True)
        os.unlink(unit)

    empty = 0
    tiny = os.path.join(work, "tiny.if")
    subprocess.run([gen, "1", "1", tiny], check=True, capture_output=True)
    empty = run([zopt, f"--opt_level={a.level}", tiny, os.path.join(work, "out.if")])[1]
    measure("reference", 1000, 120)
    for n in (250, 500, 1000, 2000):
        measure("functions", n, 120)
    for n in (2500, 5000, 10000, 20000):
        measure("size", 4, n)
    if a.json:
        with open(a.json, "w") as f:
            json.dump(rows, f, indent=1)


if __name__ == "__main__":
    main()
