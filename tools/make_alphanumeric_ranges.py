#!/usr/bin/python3
"""Writes frame/alphanumeric_ranges.inc: the code points of the Unicode general categories L, M and N
as closed ranges in rising order, from the Unicode data that ships with Python."""

import sys
import unicodedata


def ranges():
    first = None
    for code in range(sys.maxunicode + 2):
        inside = code <= sys.maxunicode and unicodedata.category(chr(code))[0] in "LMN"
        if inside and first is None:
            first = code
        elif not inside and first is not None:
            yield first, code - 1
            first = None


rows = [f"{{0x{a:X}, 0x{b:X}}}," for a, b in ranges()]
print(f"// Unicode {unicodedata.unidata_version}: made by tools/make_alphanumeric_ranges.py.")
line = ""
for row in rows:
    if len(line) + len(row) + 1 > 100:
        print(line)
        line = ""
    line += (" " if line else "") + row
print(line)
