"""Small changes to the module, and which of them no test notices. Run by scripts/mutants.

A mutant is one operator, bound or constant changed, found in clang's syntax tree, so that a template's bracket or an
include is never taken for an operator. A mutant that doesn't compile doesn't count. One that makes a test fail, crash
or run into its time limit is noticed. What is left is printed with its line: a missing case, or code that has no effect.
"""

import argparse
import json
import os
import pathlib
import random
import shlex
import shutil
import subprocess
import sys

from clang.cindex import CursorKind, Index, TokenKind

ROOT = pathlib.Path(__file__).resolve().parent.parent
PLACE = ROOT / "build/mutants"
TREE, BUILD = PLACE / "tree", PLACE / "build"
OPERATORS = {
    "+": "-", "-": "+", "*": "+", "/": "*", "%": "/", "<": "<=", "<=": "<", ">": ">=", ">=": ">", "==": "!=", "!=": "==",
    "&&": "||", "||": "&&", "<<": ">>", ">>": "<<", "&": "|", "|": "&", "+=": "-=", "-=": "+=",
}
# From the quickest to the most thorough.
TESTS = [
    ["picturezor_tests", "--gtest_brief=1", "--gtest_fail_fast"],
    ["picturezor_checksums", "TREE/tests/trust/checksums.txt"],
    ["picturezor_load_tests", "--gtest_brief=1", "--gtest_fail_fast"],
    ["picturezor_exchange_tests", "--gtest_brief=1", "--gtest_fail_fast"],
    ["picturezor_fault_tests", "--gtest_brief=1", "--gtest_fail_fast"],
]
TARGETS = [command[0] for command in TESTS]


def run(command, seconds=None, **more):
    """Whether it ends well within its time."""
    try:
        return subprocess.run(command, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, timeout=seconds, **more).returncode == 0
    except subprocess.TimeoutExpired:
        return False


def copy_tree():
    shutil.rmtree(TREE, ignore_errors=True)
    for name in subprocess.check_output(["git", "ls-files", "-z"], cwd=ROOT, text=True).split("\0"):
        if name and (ROOT / name).is_file():
            (TREE / name).parent.mkdir(parents=True, exist_ok=True)
            shutil.copy2(ROOT / name, TREE / name)


def build():
    return run(["cmake", "--build", BUILD, "-j", str(os.cpu_count()), "--target", *TARGETS])


def changes_of(file, arguments):
    """Pairs of a range of characters and what to put there."""
    text = file.read_bytes()
    unit = Index.create().parse(str(file), args=arguments)
    for cursor in unit.cursor.walk_preorder():
        place = cursor.extent.start
        if place.file is None or place.file.name != str(file):
            continue
        if cursor.kind in {CursorKind.BINARY_OPERATOR, CursorKind.COMPOUND_ASSIGNMENT_OPERATOR}:
            operands = list(cursor.get_children())
            if len(operands) != 2:
                continue
            after, before = operands[0].extent.end.offset, operands[1].extent.start.offset
            for token in cursor.get_tokens():
                at = token.extent.start.offset
                if after <= at < before and token.kind == TokenKind.PUNCTUATION and token.spelling in OPERATORS:
                    yield at, at + len(token.spelling), OPERATORS[token.spelling]
                    break
        elif cursor.kind == CursorKind.INTEGER_LITERAL:
            start, end = place.offset, cursor.extent.end.offset
            literal = text[start:end].decode(errors="replace")
            # A literal from a macro has another spelling there.
            if literal.isdigit():
                yield start, end, str(int(literal) + 1)
        elif cursor.kind == CursorKind.CXX_BOOL_LITERAL_EXPR:
            literal = text[place.offset : cursor.extent.end.offset].decode(errors="replace")
            if literal in {"true", "false"}:
                yield place.offset, cursor.extent.end.offset, "false" if literal == "true" else "true"


def all_changes(names):
    commands = {entry["file"]: entry for entry in json.loads((BUILD / "compile_commands.json").read_text())}
    for name in names:
        file = TREE / name
        if str(file) not in commands:
            sys.exit(f"{name} isn't compiled")
        words = shlex.split(commands[str(file)]["command"])
        arguments = [word for word in words if word.startswith(("-I", "-D", "-std"))]
        for change in sorted(set(changes_of(file, arguments))):
            yield name, *change


def first_notice():
    """The test that notices, or None."""
    for program, *arguments in TESTS:
        command = [str(BUILD / program)] + [word.replace("TREE", str(TREE)) for word in arguments]
        if not run(command, 900, cwd=TREE):
            return program
    return None


def main():
    parser = argparse.ArgumentParser(description="Tells which small changes to src/ no test notices.")
    parser.add_argument("--count", type=int, default=100, help="how many changes to try (100)")
    parser.add_argument("--seed", type=int, default=1, help="chooses them (1)")
    parser.add_argument("files", nargs="*", metavar="FILE", help="of src/; all .cpp files by default")
    options = parser.parse_args()
    if options.count < 1:
        parser.error("--count is 1 or more")

    copy_tree()
    # Unoptimised tests take longer than optimised ones take to compile.
    configured = run(["cmake", "-S", TREE, "-B", BUILD, "-DCMAKE_BUILD_TYPE=Release", "-DCMAKE_CXX_FLAGS_RELEASE=-O1",
                      "-DPICTUREZOR_CLI=OFF", "-DPICTUREZOR_BENCH=OFF"])
    if not configured or not build():
        sys.exit("The project doesn't build.")
    if notice := first_notice():
        sys.exit(f"{notice} fails without a change.")

    names = options.files or sorted(str(file.relative_to(TREE)) for file in (TREE / "src").rglob("*.cpp"))
    changes = list(all_changes(names))
    random.seed(options.seed)
    chosen = random.sample(changes, min(options.count, len(changes)))
    noticed = refused = 0
    for number, (name, start, end, new) in enumerate(chosen, 1):
        print(f"{number} of {len(chosen)}", end="\r", file=sys.stderr, flush=True)
        file = TREE / name
        whole = file.read_bytes()
        line = whole.count(b"\n", 0, start) + 1
        what = f"{name}:{line}: '{whole[start:end].decode()}' becomes '{new}' in: {whole.splitlines()[line - 1].decode().strip()}"
        file.write_bytes(whole[:start] + new.encode() + whole[end:])
        try:
            if not build():
                refused += 1
            elif notice := first_notice():
                noticed += 1
            else:
                print(what, flush=True)
        finally:
            file.write_bytes(whole)
    tried = len(chosen) - refused
    print(f"{noticed} of {tried} noticed; {refused} more don't compile; {len(changes)} changes could be tried")


main()
