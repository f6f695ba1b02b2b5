#!/usr/bin/env python3
"""Checks expected.txt by another compiler: clang for a processor whose int has 16 bits, run on the host.

clang lowers each program to its intermediate form for that processor, so that every width, promotion and conversion is
decided for a 16-bit int; the form is then compiled for the host and linked to printing functions of its own. char is
made 16 bits wide and double single precision by respelling them. Programs that need the width of pointers, variable
arguments or the library cannot be judged so; they say "no crosscheck" in a comment.
Not part of the default tests, since it needs clang and llc of one version:  crosscheck.py [NAME]...
"""
import re
import subprocess
import sys
import tempfile
from pathlib import Path

from run import expectations, unexpected

HERE = Path(__file__).resolve().parent
INCLUDE = HERE.parent.parent / "tools" / "include"

# What the language leaves undefined stops a program here: a test must not rest on it.
UNDEFINED = "signed-integer-overflow,shift,integer-divide-by-zero,bounds,float-cast-overflow,unreachable,return,null"
PRINT = r"""
#include <stdint.h>
#include <stdio.h>
#include <string.h>
void put_i16(int v) { printf("%d\n", (int16_t)v); }
void put_i32(int v) { printf("%d\n", v); }
void put_u32(unsigned v) { printf("%u\n", v); }
void put_i64(long long v) { printf("%lld\n", v); }
void put_f32(float v) { printf("%.9g\n", v); }
void put_f64(double v) { printf("%.17g\n", v); }
void put_str(const PUTCHAR *s) { while (*s) putchar(*s++); putchar('\n'); }
short program_main(void);
int main(void) { return (unsigned char)program_main(); }
"""
DECLARE = """
void put_i16(int); void put_i32(long); void put_u32(unsigned long); void put_i64(long long);
void put_f32(float); void put_f64(LONG_DOUBLE); void put_str(const char *);
"""


class NotApplicable(Exception):
    """The other compiler cannot judge the program: it refuses it, or the program does what the language leaves open."""


def for_host(source):
    """The program's text with the target's char and double spelled in types of the other processor."""
    text = re.sub(r"#include <(zrun|string|stdlib|math|stdint)\.h>", "", source)
    return respelled(DECLARE + text)


def expanded(path):
    """The text of a program with the target's headers in it, respelled. Strings become arrays of another type than the
    program's, so it must not print any."""
    words = ["cpp", "-std=c99", "-undef", "-nostdinc", "-P", "-D__wchar_t=int", "-isystem", INCLUDE, path]
    done = subprocess.run(words, stdout=subprocess.PIPE, stderr=subprocess.PIPE, timeout=60)
    if done.returncode != 0:
        raise NotApplicable("the preprocessor refuses it")
    text = respelled(done.stdout.decode())
    if re.search(r"\bunion\b[^{};]*\{[^{}]*\*", text):
        raise NotApplicable("a union holds a pointer")
    text = re.sub(r"^\s*#\s*pragma\s+pack\b.*$", "", text, flags=re.M)  # which the target's parser does not know
    return re.sub(r"\bchar\b", "short", text)


def aligned(record):
    """A structure whose wide members lie as the host aligns them: sizes of structures stand in the lowered form as
    numbers of the other processor, and the host must mean the same."""
    def member(found):
        if re.search(r"long long|long double|u?int64_t", found[2]):
            return f"{found[1]}__attribute__((aligned(8))) {found[2]};"
        if re.search(r"\blong\b|\bfloat\b|\bdouble\b|u?int32_t", found[2]):
            return f"{found[1]}__attribute__((aligned(4))) {found[2]};"
        return found[0]

    return record[1] + re.sub(r"([;{}]?\s*)([\w\s,\[\]]+);", member, record[2])


def respelled(text):
    text = re.sub(r"\b((?:struct|union)\s+\w*\s*\{)([^{}]*\})", aligned, text)
    text = re.sub(r"\blong\s+double\b", "LONG_DOUBLE", text)
    text = re.sub(r"\bdouble\b", "float", text).replace("LONG_DOUBLE", "double")
    if '"' not in re.sub(r"'\"'", "", text):
        text = re.sub(r"\bchar\b", "short", text)
    return re.sub(r"\bmain\b", "program_main", text)


def command(*words):
    done = subprocess.run([str(word) for word in words], stdout=subprocess.PIPE, stderr=subprocess.STDOUT, timeout=120)
    if done.returncode != 0:
        lines = done.stdout.decode("utf-8", "replace").splitlines()
        raise NotApplicable(next((line for line in lines if "error:" in line), f"{words[0]}: {done.returncode}"))


def copies_pointers(form):
    """Whether objects that hold pointers are copied or cleared as a whole, by their size with 16-bit pointers."""
    types = dict(re.findall(r"^(%\S+) = type (.*)$", form, re.M))
    holders = {name for name, body in types.items() if "*" in body}
    while True:
        more = {name for name, body in types.items() if holders & set(re.findall(r"%[\w.]+", body))} - holders
        if not more:
            break
        holders |= more
    copied = set(re.findall(r"bitcast \(?([^()\n]*)\* \S+ to i8\*", form))
    return any(type_[0] == "[" and type_.rstrip("]").endswith("*") or
               holders & set(re.findall(r"%(?:struct|union)[\w.]+", type_)) for type_ in copied)


def executed(folder, char, seconds, words):
    """What folder/p.c prints, lowered with these words too."""
    command("clang", "-target", "msp430", "-std=c99", "-w", "-O0", "-ffp-contract=off", "-fno-builtin", "-fsigned-char",
            "-Xclang", "-cl-single-precision-constant", "-idirafter", INCLUDE, *words,
            "-S", "-emit-llvm", folder / "p.c", "-o", folder / "p.ll")
    form = (folder / "p.ll").read_text()
    if copies_pointers(form):
        raise NotApplicable("objects that hold pointers are copied")
    form = re.sub(r"^target (datalayout|triple).*$", "", form, flags=re.M)
    form = re.sub(r"^attributes .*$", lambda line: re.sub(r'"target-[a-z]+"="[^"]*"', "", line[0]), form, flags=re.M)
    (folder / "p.ll").write_text('target triple = "x86_64-pc-linux-gnu"\n' + form)
    command("llc", "-O0", "-relocation-model=pic", "-filetype=obj", folder / "p.ll", "-o", folder / "p.o")
    command("clang", "-w", f"-DPUTCHAR={char}", folder / "print.c", folder / "p.o", "-lm", "-o", folder / "p")
    try:
        done = subprocess.run([folder / "p"], stdout=subprocess.PIPE, timeout=seconds)
    except subprocess.TimeoutExpired:
        raise NotApplicable("it does not end") from None
    if done.returncode < 0:
        raise NotApplicable(f"it does what the language leaves open (signal {-done.returncode})")
    return done.stdout.decode()


def printed(text, folder, seconds=60):
    """What the program prints by the other compiler; `text` is for the host. Looking for what is undefined makes units
    of bit-fields as wide as can be, which the host lays out in its own way: that is a run of its own."""
    folder = Path(folder)
    (folder / "p.c").write_text(text)
    (folder / "print.c").write_text(PRINT)
    char = "char" if re.search(r"\bchar\b", text) else "short"
    executed(folder, char, seconds, [f"-fsanitize={UNDEFINED}", f"-fsanitize-trap={UNDEFINED}"])
    return executed(folder, char, seconds, ["-ffine-grained-bitfield-accesses"])


def main():
    failed = checked = 0
    expected = expectations()
    sources = [path for path in sorted(HERE.glob("*.c")) if not sys.argv[1:] or path.stem in sys.argv[1:]]
    for source in sources:
        if "no crosscheck" in source.read_text():
            print(f"skip {source.stem}")
            continue
        checked += 1
        try:
            with tempfile.TemporaryDirectory() as folder:
                found = unexpected(expected[source.stem], printed(for_host(source.read_text()), folder))
        except (NotApplicable, subprocess.SubprocessError) as error:
            found = str(error)
        if found:
            failed += 1
            print(f"FAIL {source.stem}: {found}")
    print(f"{checked} programs checked, {failed} differ")
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main())
