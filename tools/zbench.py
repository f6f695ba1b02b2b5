"""The tool chain as its tests see it: parse, optimize, execute, dump, compare.

Programs are found in a build folder; each can be named by an environment variable instead (ZOPT, ICRUN, ICDUMP,
ICPARSE). Nothing here judges what a program prints: `difference` tells where two runs part, the caller decides.
"""
import os
import subprocess
from dataclasses import dataclass
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent
INCLUDE = ROOT / "tools" / "include"

# Well above what any test program needs; an optimizer that makes a loop endless shall not hang the bench.
MAX_STEPS = 400_000_000
TIME_LIMIT = 120
# For tests of what is told of a loop as it is written.
LOOPS_STAY = "--debug:skip=cd-unroll-by-request+cd-unroll-completely-for-speed+cd-unroll-for-speed"


class Trouble(Exception):
    """A tool did not do its work: the text says which one, on what, and what it said."""


@dataclass(frozen=True)
class Outcome:
    """What one execution did. `errors` holds the executor's own messages and statistics, never compared."""
    status: int
    output: str
    errors: str = ""


def run(command, limit=TIME_LIMIT):
    """Runs `command`; a timeout or a missing program is Trouble, a status is not."""
    command = [str(word) for word in command]
    try:
        done = subprocess.run(command, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                              timeout=limit)
    except subprocess.TimeoutExpired:
        raise Trouble(f"no end after {limit} s: {' '.join(command)}") from None
    except OSError as error:
        raise Trouble(f"{command[0]}: {error.strerror}") from None
    decode = lambda text: text.decode("utf-8", "backslashreplace")
    return Outcome(done.returncode, decode(done.stdout), decode(done.stderr))


def last_line(outcome):
    """The message to quote of a tool that failed."""
    lines = (outcome.errors + outcome.output).strip().splitlines()
    return lines[-1] if lines else "no message"


class Tools:
    """Where the programs of the tool chain are, and one call for each."""

    def __init__(self, build=None, zopt=None, icrun=None, icdump=None, icparse=None):
        build = Path(build) if build else ROOT / "build"
        place = lambda given, variable, default: Path(given or os.environ.get(variable) or default)
        self.zopt = place(zopt, "ZOPT", build / "zopt")
        self.icrun = place(icrun, "ICRUN", build / "icrun")
        self.icdump = place(icdump, "ICDUMP", build / "icdump")
        self.icparse = place(icparse, "ICPARSE", ROOT / "tools" / "icparse")

    @staticmethod
    def add_options(parser):
        parser.add_argument("--build", metavar="DIR", help="folder of the programs (build)")
        for name in ("zopt", "icrun", "icdump", "icparse"):
            parser.add_argument(f"--{name}", metavar="PROGRAM", help=f"the {name} to use")

    @classmethod
    def of(cls, options):
        return cls(options.build, options.zopt, options.icrun, options.icdump, options.icparse)

    def parse(self, sources, unit, words=()):
        """One C source, or several that make a unit, to an I-file."""
        sources = sources if isinstance(sources, list) else [sources]
        done = run([self.icparse, "-I", INCLUDE, *sources, "-o", unit, *words])
        if done.status != 0:
            raise Trouble(f"{sources[0]}: parser status {done.status}: {last_line(done)}")

    def optimize(self, unit, out, words=()):
        Path(out).unlink(missing_ok=True)
        done = run([self.zopt, *words, unit, out])
        if done.status != 0:
            raise Trouble(f"optimizer status {done.status}: {last_line(done)}")
        if not Path(out).exists():
            raise Trouble("the optimizer left no output")

    def execute(self, unit, words=()):
        return run([self.icrun, "--max-steps", MAX_STEPS, *words, unit])

    def dump(self, unit, words=()):
        done = run([self.icdump, *words, unit])
        if done.status != 0:
            raise Trouble(f"{unit}: dump status {done.status}: {last_line(done)}")
        return done.output


def difference(want, got):
    """None when both outcomes are equal, or one line that tells where they first part."""
    wanted, printed = want.output.splitlines(), got.output.splitlines()
    for number, (left, right) in enumerate(zip(wanted, printed), 1):
        if left != right:
            return f"line {number}: {right!r} instead of {left!r}"
    if want.status != got.status:
        return f"status {got.status} instead of {want.status}: {last_line(got)}"
    if len(wanted) != len(printed):
        return f"{len(printed)} lines instead of {len(wanted)}"
    return None if want.output == got.output else "line ends differ"
