"""What each step of the optimizer changed in each function, out of its debug file (--print_debug).

The debug file holds a dump of the function in work behind every row of the pipeline. Two dumps are compared without the
numbers of blocks and the lists of their edges, which follow from the branches. Steps on loops work on a form of their own
(U*2(p, i) for *(p + i), tests at both ends of loops): the first and the last of them show its coming and going, too.
"""
import difflib
import re
from dataclasses import dataclass

FUNCTION = re.compile(r"=+ FUNCTION (.+)\(\) \[")
LEFT = re.compile(r"\t*-+ EXITING (?:(reading|output)|step (\d+)):? '(.*)' -+$")
BLOCK = re.compile(r"BB\d+:(?: (\S+))?\tpred:")
STATEMENT = re.compile(r" +\d+\t.*")


@dataclass(frozen=True)
class Step:
    name: str     # as --list_passes has it, behind its number; rows ahead of all steps and behind them have a word instead
    before: list  # lines: the statements behind their source lines, and a line for the head of each block
    after: list


def read_dump(lines, at):
    """The dump of a function that begins behind line `at`, or nothing where there is none."""
    dump = []
    for line in lines[at + 1:]:
        block = BLOCK.match(line)
        if block:
            dump.append(f"{block[1] or 'block'}:")
        elif dump and STATEMENT.fullmatch(line):
            if not line.endswith("\tSSA_PHI;"):  # of a form that stands for a few steps alone
                dump.append(line.replace("\t", "  "))
        elif line.strip():
            break
    return dump


def read_steps(text):
    """The steps that changed each function by its name, in the order in which they ran."""
    lines, found, last, function = text.splitlines(), {}, {}, None
    for at, line in enumerate(lines):
        if start := FUNCTION.match(line):
            function = start[1]
        elif (left := LEFT.match(line)) and function:
            dump = read_dump(lines, at)
            if not dump:
                continue
            steps = found.setdefault(function, [])
            if last.get(function, dump) != dump:
                steps.append(Step(f"{left[1] or left[2]} {left[3]}", last[function], dump))
            last[function] = dump
    return found


def difference(step, context=1):
    """The lines of a step's diff: ' ', '-' or '+' ahead of each, and '...' for lines left out."""
    lines = list(difflib.unified_diff(step.before, step.after, lineterm="", n=context))[2:]
    return ["..." if line.startswith("@@") else line for line in lines]
