#!/usr/bin/env python3
"""Checks that a shared library defines exactly the dynamic symbols listed in a file, one name a line."""
import argparse
import subprocess
import sys

# nm letters of defined code and data symbols
CODE_AND_DATA = set("TtDdBbRrVvWwiuGgSs")


def main():
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("--nm", required=True)
    parser.add_argument("--library", required=True)
    parser.add_argument("--expected", required=True)
    args = parser.parse_args()

    output = subprocess.run([args.nm, "-D", "--defined-only", args.library], check=True,
                            capture_output=True, text=True).stdout
    exported = set()
    for line in output.splitlines():
        fields = line.split()
        if len(fields) >= 3 and fields[-2] in CODE_AND_DATA:
            exported.add(fields[-1])
    with open(args.expected, encoding="utf-8") as f:
        expected = {line.strip() for line in f if line.strip()}

    missing, extra = sorted(expected - exported), sorted(exported - expected)
    for name in missing:
        print(f"missing: {name}")
    for name in extra:
        print(f"extra: {name}")
    print(f"{len(exported)} exported, {len(expected)} expected")
    return 1 if missing or extra or not expected else 0


if __name__ == "__main__":
    sys.exit(main())
