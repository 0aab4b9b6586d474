#!/usr/bin/env python3
"""Fails when a file of an engine layer includes a header of a layer above it.

The layers, lowest first, are the folders of src/; include/quillmere/ (the
public headers) may be included from anywhere, and platform/ includes nothing
outside itself. Usage: check_layers.py SRC_DIR
"""
import os
import re
import sys

LAYERS = ["platform", "base", "locks", "config", "format", "text", "sources",
          "index", "command", "search", "remote", "api"]
INCLUDE = re.compile(r'^\s*#\s*include\s+"([^"]+)"', re.M)


def main(src):
    faults = []
    for folder, _, files in os.walk(src):
        for name in files:
            if not name.endswith((".h", ".cpp")):
                continue
            path = os.path.join(folder, name)
            layer = os.path.relpath(path, src).split(os.sep)[0]
            if layer not in LAYERS:
                faults.append(f"{path}: not in a layer folder")
                continue
            with open(path, encoding="utf-8", errors="replace") as f:
                text = f.read()
            for header in INCLUDE.findall(text):
                target = header.split("/")[0]
                if target == "quillmere" and layer != "platform":
                    continue
                if target not in LAYERS:
                    faults.append(f"{path}: includes \"{header}\", which is in no layer")
                elif LAYERS.index(target) > LAYERS.index(layer):
                    faults.append(f"{path}: layer {layer} includes \"{header}\" of the higher layer {target}")
    for fault in faults:
        print(fault)
    return 1 if faults else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1] if len(sys.argv) > 1 else "src"))
