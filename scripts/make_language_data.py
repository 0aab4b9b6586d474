#!/usr/bin/env python3
"""Builds the shipped language folder (data/Language/).

Always written:
  General/latin1.tbl      the character table, from the Unicode character data
  <Language>/info.txt     character table name and phonetic mode
  <Language>/lang.txt     character translations (UTF-16LE with byte-order mark)
  <Language>/1.dat        an empty phonet rule set where no rule file ships
Written when their sources are given:
  <Language>/stop.txt     --stopwords DIR: the Snowball lists (da.txt, de.txt, ...)
  German/1.dat            --phonet-rules DIR: de_phonet.dat, unchanged

Character table: 256 rows (codes 0-255, ISO-8859-1), eight numbers each:
  1 the code            2 class: 1 letter, 2 digit, 0 other
  3 upper case          4 lower case          5 unused (0)
  6 sound map           7 base letter, case kept
  8 plain map: a letter's base letter in upper case (accent removal)
A case or base letter outside Latin-1 (the upper case of ÿ, ß or µ) keeps the
code itself. The engine reads the sound map and the plain map: an entry of 0
drops the character from a phonetic code and ends a word in accent removal.

Usage: make_language_data.py [--stopwords DIR] [--phonet-rules DIR] OUT_DIR
"""
import argparse
import os
import shutil
import unicodedata

# (folder, stop-word list, phonetic mode, character translations)
LANGUAGES = [
    ("Danish", "da", 1, [("Æ", "-", "AE"), ("Ø", "-", "OE"), ("Å", "-", "AA")]),
    ("English", "en", 1, []),
    ("French", "fr", 1, []),
    ("Spanish", "es", 1, []),
    ("Portuguese", "pt", 1, []),
    ("Italian", "it", 1, []),
    ("German", "de", 2, [("Ä", "-", "AE"), ("Ö", "-", "OE"), ("Ü", "-", "UE"), ("ß", "-", "SS")]),
    ("Dutch", "nl", 1, []),
    ("Swedish", "sv", 1, []),
    ("Norwegian", "no", 1, [("Æ", "-", "AE"), ("Ø", "-", "OE"), ("Å", "-", "AA")]),
    ("Russian", "ru", 1, []),
    ("Other", None, 0, []),
]
TABLE_NAME = "latin1.tbl"

# Letters that sound alike share one entry. Vowels keep five classes (Y joins
# I); voiced and voiceless pairs merge (B/P, D/T, G/K/C/Q, F/V/W, S/Z); M joins
# N; H is silent. Keyed by the upper-case base letter.
SOUND_GROUPS = {
    "A": "A", "E": "E", "I": "I", "Y": "I", "O": "O", "U": "U",
    "B": "B", "P": "B",
    "C": "K", "G": "K", "K": "K", "Q": "K",
    "D": "T", "T": "T",
    "F": "F", "V": "F", "W": "F",
    "S": "S", "Z": "S",
    "M": "N", "N": "N",
    "L": "L", "R": "R", "J": "J", "X": "X",
    "H": None,
}
# Letters without a base letter, or whose sound is not their base letter's.
SOUND_SPECIAL = {
    "Ç": "S", "ß": "S", "Æ": "E", "Ø": "O", "Ð": "T", "Þ": "T",
    "ª": "A", "º": "O", "µ": "N",
}


def is_letter(ch):
    return unicodedata.category(ch).startswith("L")


def base_letter(ch):
    """The letter without its marks, by canonical decomposition."""
    while True:
        d = unicodedata.decomposition(ch)
        if not d or d.startswith("<"):
            return ch
        ch = chr(int(d.split()[0], 16))


def latin1_case(ch, upper):
    mapped = ch.upper() if upper else ch.lower()
    return mapped if len(mapped) == 1 and ord(mapped) < 256 else ch


def table_row(code):
    ch = chr(code)
    if code == 0:
        return [0, 0, 0, 0, 0, 0, 0, 0]
    letter = is_letter(ch)
    digit = "0" <= ch <= "9"
    upper = ord(latin1_case(ch, True))
    lower = ord(latin1_case(ch, False))
    base = base_letter(ch) if letter else ch
    plain = ord(latin1_case(base, True)) if letter else code
    if digit:
        sound = code
    elif not letter:
        sound = 0
    else:
        key = latin1_case(ch, True)
        if key in SOUND_SPECIAL:
            group = SOUND_SPECIAL[key]
        else:
            group = SOUND_GROUPS[latin1_case(base, True)]
        sound = ord(group) if group else 0
    cls = 1 if letter else 2 if digit else 0
    return [code, cls, upper, lower, 0, sound, ord(base), plain]


def write_table(path):
    rows = [" ".join("%3d" % n for n in table_row(c)) for c in range(256)]
    with open(path, "w", encoding="ascii", newline="\n") as f:
        f.write("\n".join(rows) + "\n")


def write_utf16(path, text):
    with open(path, "wb") as f:
        f.write(b"\xff\xfe" + text.encode("utf-16-le"))


EMPTY_RULES = """\
# {name}: no phonet rule set ships for this language.
# info.txt selects the sound map of the character table (phonetic mode 1), so
# this file is read when phonetic search is switched on but its rules are not
# used. To use phonet rules, put them here (ISO-8859-1) and set the phonetic
# mode in info.txt to 2, then rebuild every findex of this language that uses
# phonetic search.
version 1
"""


def main():
    ap = argparse.ArgumentParser(description=__doc__.split("\n")[0])
    ap.add_argument("out", help="the Language folder to write")
    ap.add_argument("--stopwords", help="folder of the Snowball stop-word lists")
    ap.add_argument("--phonet-rules", help="folder of the aspell *_phonet.dat files")
    args = ap.parse_args()

    general = os.path.join(args.out, "General")
    os.makedirs(general, exist_ok=True)
    write_table(os.path.join(general, TABLE_NAME))

    for folder, code, mode, translations in LANGUAGES:
        target = os.path.join(args.out, folder)
        os.makedirs(target, exist_ok=True)
        with open(os.path.join(target, "info.txt"), "w", encoding="ascii", newline="\n") as f:
            f.write("%s %d\n" % (TABLE_NAME, mode))
        write_utf16(os.path.join(target, "lang.txt"),
                    "".join("%s %s %s\n" % t for t in translations))
        if folder == "Other":
            write_utf16(os.path.join(target, "stop.txt"), "")
        elif args.stopwords:
            with open(os.path.join(args.stopwords, code + ".txt"), encoding="utf-8") as f:
                words = [w.strip() for w in f if w.strip()]
            write_utf16(os.path.join(target, "stop.txt"), "\n".join(words) + "\n")
        if folder in ("English", "Other"):
            continue  # English codes with Double Metaphone; Other has no phonetic code
        if folder == "German":
            if args.phonet_rules:
                shutil.copyfile(os.path.join(args.phonet_rules, "de_phonet.dat"),
                                os.path.join(target, "1.dat"))
        else:
            with open(os.path.join(target, "1.dat"), "w", encoding="ascii", newline="\n") as f:
                f.write(EMPTY_RULES.format(name=folder))


if __name__ == "__main__":
    main()
