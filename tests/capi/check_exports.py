#!/usr/bin/env python3
"""Compares the dynamic symbols of the shared libraries with the functions the
public headers mark for export: every marked function is exported and nothing
else is (no internal function, no C++ symbol). Windows DLLs are read from
their export tables, where every name must be plain (no "_name@bytes" of a
decorated __stdcall function)."""
import pathlib
import re
import struct
import subprocess
import sys


def pe_exports(data):
    """The exported names of a PE image (DLL), from its export directory."""
    (pe,) = struct.unpack_from("<I", data, 0x3C)
    if data[pe:pe + 4] != b"PE\0\0":
        raise ValueError("not a PE image")
    sections, optional_size = struct.unpack_from("<H12xH", data, pe + 6)
    optional = pe + 24
    (magic,) = struct.unpack_from("<H", data, optional)
    directories = optional + (96 if magic == 0x10B else 112)
    export_rva, _ = struct.unpack_from("<II", data, directories)
    table = []
    for i in range(sections):
        at = optional + optional_size + 40 * i
        size, rva, raw_size, raw = struct.unpack_from("<IIII", data, at + 8)
        table.append((rva, max(size, raw_size), raw))

    def offset(rva):
        for start, size, raw in table:
            if start <= rva < start + size:
                return rva - start + raw
        raise ValueError(f"address {rva:#x} outside every section")

    if export_rva == 0:
        return set()
    count, _, names = struct.unpack_from("<III", data, offset(export_rva) + 24)
    names = offset(names)
    exported = set()
    for i in range(count):
        (name_rva,) = struct.unpack_from("<I", data, names + 4 * i)
        start = offset(name_rva)
        exported.add(data[start:data.index(b"\0", start)].decode("ascii"))
    return exported


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
    data = pathlib.Path(lib).read_bytes()
    if data[:2] == b"MZ":
        exported |= pe_exports(data)
        continue
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
