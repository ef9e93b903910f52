#!/usr/bin/env python3
"""Checks that a library exports exactly the names listed in a file, one name a line: a shared
library's dynamic symbols (--nm), or a Windows DLL's export table (--objdump), whose ordinals must
also be those of the export table (--ordinals src/tables/exports.tsv)."""
import argparse
import re
import subprocess
import sys

# nm letters of defined code and data symbols
CODE_AND_DATA = set("TtDdBbRrVvWwiuGgSs")


def dynamic_symbols(nm, library):
    output = subprocess.run([nm, "-D", "--defined-only", library], check=True, capture_output=True, text=True).stdout
    exported = set()
    for line in output.splitlines():
        fields = line.split()
        if len(fields) >= 3 and fields[-2] in CODE_AND_DATA:
            exported.add(fields[-1])
    return exported


def dll_exports(objdump, library):
    """The DLL's exported names with their ordinals, from its export directory."""
    output = subprocess.run([objdump, "-p", library], check=True, capture_output=True, text=True).stdout
    base = re.search(r"^Export Address Table -- Ordinal Base (\d+)$", output, re.M)
    table = output.split("[Ordinal/Name Pointer] Table", 1)
    if not base or len(table) < 2:
        return {}
    exported = {}
    for line in table[1].splitlines()[1:]:
        match = re.match(r"\s*\[\s*(\d+)\] (\S+)$", line)
        if not match:
            break
        exported[match.group(2)] = int(base.group(1)) + int(match.group(1))
    return exported


def table_ordinals(path):
    """Ordinal by name of the rows of exports.tsv that have one."""
    ordinals = {}
    with open(path, encoding="utf-8") as f:
        for line in f:
            fields = line.rstrip("\n").split("\t")
            if not line.startswith("#") and len(fields) > 1 and fields[0].isdigit():
                ordinals[fields[1]] = int(fields[0])
    return ordinals


def main():
    parser = argparse.ArgumentParser(description=__doc__)
    tool = parser.add_mutually_exclusive_group(required=True)
    tool.add_argument("--nm")
    tool.add_argument("--objdump")
    parser.add_argument("--library", required=True)
    parser.add_argument("--expected", required=True)
    parser.add_argument("--ordinals", help="exports.tsv, whose ordinals a DLL must have")
    args = parser.parse_args()

    problems = []
    if args.nm:
        exported = dynamic_symbols(args.nm, args.library)
    else:
        by_name = dll_exports(args.objdump, args.library)
        exported = set(by_name)
        if args.ordinals:
            for name, ordinal in sorted(table_ordinals(args.ordinals).items()):
                if name in by_name and by_name[name] != ordinal:
                    problems.append(f"ordinal: {name} has {by_name[name]}, the table says {ordinal}")
    with open(args.expected, encoding="utf-8") as f:
        expected = {line.strip() for line in f if line.strip()}

    problems += [f"missing: {name}" for name in sorted(expected - exported)]
    problems += [f"extra: {name}" for name in sorted(exported - expected)]
    for problem in problems:
        print(problem)
    print(f"{len(exported)} exported, {len(expected)} expected")
    return 1 if problems or not expected else 0


if __name__ == "__main__":
    sys.exit(main())
