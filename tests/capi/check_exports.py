#!/usr/bin/env python3
"""Compares the dynamic symbols of the shared libraries with the functions the
public headers mark for export: every marked function is exported and nothing
else is (no internal function, no C++ symbol)."""
import pathlib
import re
import subprocess
import sys

include = pathlib.Path(sys.argv[1])
libs = sys.argv[2:]
marked = set()
decl = re.compile(r"\b(?:TOVA_API|QTY_API)\b[^;{(]*?\b([A-Za-z_]\w*)\s*\(", re.S)
for header in include.rglob("*.h"):
    text = re.sub(r"/\*.*?\*/", "", header.read_text(), flags=re.S)
    text = re.sub(r"//[^\n]*", "", text)
    text = re.sub(r"^[ \t]*#.*$", "", text, flags=re.M)  # the export macros' own definitions
    for m in decl.finditer(text):
        marked.add(m.group(1))

exported = set()
for lib in libs:
    out = subprocess.run(["nm", "-D", "--defined-only", lib], capture_output=True, text=True, check=True).stdout
    for line in out.splitlines():
        parts = line.split()
        if len(parts) == 3 and parts[1] in "TtWwDdBbRr" and parts[1].isupper():
            exported.add(parts[2])

ignored = {"_init", "_fini", "_edata", "_end", "__bss_start"}
extra = sorted(s for s in exported - marked - ignored if not s.startswith("__"))
missing = sorted(marked - exported)
if extra:
    print("exported but not in the public headers:", *extra, sep="\n  ")
if missing:
    print("declared for export but missing:", *missing, sep="\n  ")
print(f"{len(marked)} marked, {len(exported)} exported")
sys.exit(1 if extra or missing else 0)
