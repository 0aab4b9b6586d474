#!/usr/bin/env python3
"""Create (or reuse) the demo database: real text that nobody in this project wrote.

The rows are Debian package descriptions: every installed package (with its long
description, from /var/lib/dpkg/status) and then packages of the package lists
(`apt-cache dumpavail`, short description only) up to --rows rows. No network. Writes table packages(id INTEGER PRIMARY KEY, name TEXT,
summary TEXT, description TEXT, section TEXT, installed_size INTEGER).
"""
import argparse
import os
import sqlite3
import subprocess
import sys


def stanzas(text):
    block = {}
    key = None
    for line in text.splitlines():
        if not line.strip():
            if block:
                yield block
            block, key = {}, None
        elif line[0] in " \t" and key:
            block[key] += "\n" + line[1:]
        elif ":" in line:
            key, _, value = line.partition(":")
            block[key] = value.strip()
    if block:
        yield block


def package_texts():
    with open("/var/lib/dpkg/status", encoding="utf-8", errors="replace") as f:
        yield f.read()
    try:
        yield subprocess.run(["apt-cache", "dumpavail"], capture_output=True, text=True,
                             check=True).stdout
    except (OSError, subprocess.CalledProcessError):
        pass


def main():
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("database")
    parser.add_argument("--rows", type=int, default=5000)
    args = parser.parse_args()

    if os.path.exists(args.database):
        with sqlite3.connect(args.database) as db:
            if db.execute("select count(*) from sqlite_master where name='packages'").fetchone()[0]:
                n = db.execute("select count(*) from packages").fetchone()[0]
                print(f"demo database: reusing {args.database} ({n} rows)")
                return 0

    rows, seen = [], set()
    for s in (s for text in package_texts() for s in stanzas(text)):
        name = s.get("Package")
        description = s.get("Description", "")
        if not name or name in seen or not description:
            continue
        seen.add(name)
        summary, _, body = description.partition("\n")
        body = "\n".join("" if l.strip() == "." else l for l in body.splitlines())
        size = s.get("Installed-Size", "")
        rows.append((len(rows) + 1, name, summary, body.strip(), s.get("Section", ""),
                     int(size) if size.isdigit() else None))
        if len(rows) >= args.rows:
            break

    os.makedirs(os.path.dirname(os.path.abspath(args.database)), exist_ok=True)
    tmp = args.database + ".tmp"
    if os.path.exists(tmp):
        os.remove(tmp)
    with sqlite3.connect(tmp) as db:
        db.execute("create table packages(id INTEGER PRIMARY KEY, name TEXT, summary TEXT, "
                   "description TEXT, section TEXT, installed_size INTEGER)")
        db.executemany("insert into packages values (?,?,?,?,?,?)", rows)
    os.replace(tmp, args.database)
    print(f"demo database: wrote {len(rows)} package descriptions to {args.database}")
    return 0


if __name__ == "__main__":
    sys.exit(main())
