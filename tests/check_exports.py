#!/usr/bin/env python3
"""Compares the symbols a built libkt48api exports with the manifest, both ways.

Every `present` entry must be exported with its linkage (a plain name for
c and data, the demangled signature for c++); every exported symbol must
be a `present` entry; a `pending` entry must not be exported yet. Pending
entries are reported by family: they are what is left to build.
"""
import collections
import subprocess
import sys


def manifest(path):
    entries = {}
    for number, raw in enumerate(open(path, encoding="utf-8"), 1):
        line = raw.rstrip("\n")
        if not line.strip() or line.startswith("#"):
            continue
        fields = line.split("\t")
        if len(fields) != 4 or fields[0] not in ("c", "c++", "data") or fields[1] not in ("present", "pending"):
            sys.exit(f"{path}:{number}: malformed entry: {line!r}")
        kind, status, family, symbol = fields
        if symbol in entries:
            sys.exit(f"{path}:{number}: duplicate entry {symbol!r}")
        entries[symbol] = (kind, status, family)
    return entries


def exported(library):
    """(kind, demangled name) of every defined dynamic symbol."""
    out = subprocess.run(["nm", "-D", "--defined-only", library], check=True,
                         capture_output=True, text=True).stdout
    raw = []
    for line in out.splitlines():
        parts = line.split()
        if len(parts) >= 3:
            raw.append((parts[1], parts[2]))
    names = [name.split("@")[0] for _, name in raw]
    demangled = subprocess.run(["c++filt"], input="\n".join(names), check=True,
                               capture_output=True, text=True).stdout.splitlines()
    symbols = {}
    for (letter, _), name, plain in zip(raw, names, demangled):
        if name in ("_init", "_fini") or name.startswith(("__odr_asan", "__asan", "__ubsan")):
            continue  # the linker's and the sanitizers' own
        if letter in "WVu" and plain.startswith(("std::", "void std::", "char* std::")):
            continue  # standard-library template code a build did not inline, not our interface
        kind = "data" if letter in "BDGRSbdgrsV" else "func"
        symbols[plain] = (kind, name != plain)
    return symbols


def main():
    if len(sys.argv) != 3:
        sys.exit("usage: check_exports.py MANIFEST LIBRARY")
    entries = manifest(sys.argv[1])
    symbols = exported(sys.argv[2])
    errors = []
    for symbol, (kind, status, family) in sorted(entries.items()):
        found = symbols.get(symbol)
        if status == "present":
            if found is None:
                errors.append(f"missing: {kind} {symbol}")
            elif kind == "data" and found[0] != "data":
                errors.append(f"not an object: {symbol}")
            elif kind != "data" and found[0] != "func":
                errors.append(f"not a function: {symbol}")
            elif kind == "c" and found[1]:
                errors.append(f"C++ linkage where C is wanted: {symbol}")
            elif kind == "c++" and not found[1]:
                errors.append(f"C linkage where C++ is wanted: {symbol}")
        elif found is not None:
            errors.append(f"exported but marked pending: {symbol}")
    for symbol in sorted(set(symbols) - set(entries)):
        errors.append(f"exported but not in the manifest: {symbol}")

    pending = collections.Counter(f for _, (_, s, f) in entries.items() if s == "pending")
    present = sum(1 for _, (_, s, _) in entries.items() if s == "present")
    print(f"{present} present, {sum(pending.values())} pending")
    for family, count in pending.items():
        print(f"  pending {family}: {count}")
    for e in errors:
        print("ERROR " + e)
    return 1 if errors else 0


if __name__ == "__main__":
    sys.exit(main())
