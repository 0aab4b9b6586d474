#!/usr/bin/env python3
"""Writes the error-message file mrvconf.ini (UTF-16LE with byte-order mark)
from its readable UTF-8 source mrvconf.txt.

Source lines: "number,level,text"; lines starting with "#" and blank lines are
skipped. The numbers must be unique positive integers in ascending order, the
levels positive integers, and the texts non-empty.

usage: make_mrvconf.py [--check] [SOURCE [TARGET]]
  --check   write nothing; exit 1 when TARGET is not what SOURCE gives
"""
import pathlib
import sys

ROOT = pathlib.Path(__file__).resolve().parent.parent
DEFAULT_SOURCE = ROOT / "data" / "System" / "mrvconf.txt"
DEFAULT_TARGET = ROOT / "data" / "System" / "mrvconf.ini"


def read_messages(source):
    messages = []
    for line_no, line in enumerate(source.read_text(encoding="utf-8").splitlines(), 1):
        if not line.strip() or line.startswith("#"):
            continue
        where = f"{source}:{line_no}"
        parts = line.split(",", 2)
        if len(parts) != 3:
            sys.exit(f"{where}: expected number,level,text")
        number, level, text = parts
        if not number.isdigit() or int(number) <= 0:
            sys.exit(f"{where}: the number must be a positive integer")
        if not level.isdigit() or int(level) <= 0:
            sys.exit(f"{where}: the level must be a positive integer")
        if not text.strip():
            sys.exit(f"{where}: the text is empty")
        if messages and int(number) <= messages[-1][0]:
            sys.exit(f"{where}: numbers must be unique and ascending")
        messages.append((int(number), int(level), text))
    if not messages:
        sys.exit(f"{source}: no messages")
    return messages


def render(messages, source_name):
    # The loader skips everything before the section header and stops at the
    # first line that is not a message, so the section has no blank lines.
    lines = [f"; Generated from {source_name} by scripts/make_mrvconf.py; edit that file.",
             "[ERROR MESSAGES]"]
    lines += [f"{number},{level},{text}" for number, level, text in messages]
    lines.append("[END]")
    return "\ufeff".encode("utf-16-le") + ("\r\n".join(lines) + "\r\n").encode("utf-16-le")


def main(argv):
    check = "--check" in argv
    paths = [a for a in argv if a != "--check"]
    if len(paths) > 2 or any(a.startswith("-") for a in paths):
        sys.exit(__doc__)
    source = pathlib.Path(paths[0]) if paths else DEFAULT_SOURCE
    target = pathlib.Path(paths[1]) if len(paths) > 1 else DEFAULT_TARGET
    data = render(read_messages(source), source.name)
    if check:
        if not target.exists() or target.read_bytes() != data:
            print(f"{target} is out of date: run scripts/make_mrvconf.py", file=sys.stderr)
            return 1
        return 0
    target.write_bytes(data)
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
