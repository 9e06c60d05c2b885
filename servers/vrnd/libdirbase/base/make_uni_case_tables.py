#!/usr/bin/env python3
"""Makes uni_case_tables.inc, the case tables of uni_case.h, from uni_case_mappings.txt.

    make_uni_case_tables.py            writes uni_case_tables.inc beside this script
    make_uni_case_tables.py --check    writes nothing; status 1 when the file is not what would be written

The mappings are Unicode's; what the tables leave out of them, and why, are the rules below. The tables decide how
directories have stored and compared text since the first server, so a mapping that newer Unicode versions add belongs
on a list here, not in the tables.
"""
import pathlib
import re
import sys

HERE = pathlib.Path(__file__).resolve().parent
MAPPINGS = HERE / "uni_case_mappings.txt"
TABLES = HERE / "uni_case_tables.inc"

# What is covered: one table from U+0000, and ranges in rising order.
TABLE_SIZE = 0x200
RANGES = {
    "upper": [(0x03A0, 0x03CE), (0x0430, 0x045F), (0x0490, 0x04CC), (0x1E00, 0x1FFC), (0xFF40, 0xFF5A)],
    "lower": [(0x0380, 0x03AB), (0x0400, 0x042F), (0x0490, 0x04CB), (0x1E00, 0x1FF7), (0xFF20, 0xFF3A)],
}

# Characters that stay as they are although Unicode maps them: the mapping came after the tables were first used, or it
# leads to a character of another length or out of the covered ranges.
UNMAPPED = {
    "upper": """
        00B5 0131 017F 0180 0195 019A 019B 019E 01BF 0450 045D 04C6 04CA 1EFB 1EFD 1EFF 1F78 1F79 1FBE
    """,
    "lower": """
        0181 0186 0189 018A 018F 0190 0193 0194 0196 0197 019C 019D 019F 01A6 01A9 01AE 01B1 01B2 01B7 01F6 01F7
        0400 040D 04C0 04C5 04C9 1EFA 1EFC 1EFE
    """,
}

# Greek letters with iota subscript have a title case form (with the iota beside the capital) and no single upper case
# one: their title case stands for it. (first, last, difference)
TITLE_CASE_AS_UPPER = [
    (0x1F80, 0x1F87, 8),
    (0x1F90, 0x1F97, 8),
    (0x1FA0, 0x1FA7, 8),
    (0x1FB3, 0x1FB3, 9),
    (0x1FC3, 0x1FC3, 9),
    (0x1FF3, 0x1FF3, 9),
]


def read_mappings():
    """{"upper" or "lower": {character: difference}} as the file gives them."""
    mappings = {"upper": {}, "lower": {}}
    current = None
    for number, line in enumerate(MAPPINGS.read_text(encoding="ascii").splitlines(), 1):
        line = line.split("#")[0].strip()
        if not line:
            continue
        if section := re.fullmatch(r"\[(upper|lower)\]", line):
            current = mappings[section[1]]
            continue
        run = re.fullmatch(r"([0-9A-F]{4,5})(?:-([0-9A-F]{4,5})(/2)?)? ([+-][0-9]+)", line)
        if not run or current is None:
            sys.exit(f"{MAPPINGS.name}:{number}: can't be read: {line}")
        first, last = int(run[1], 16), int(run[2] or run[1], 16)
        for character in range(first, last + 1, 2 if run[3] else 1):
            current[character] = int(run[4])
    return mappings


def apply_rules(direction, mapping):
    """The mapping as the tables hold it, still without regard to what they cover."""
    kept = dict(mapping)
    if direction == "upper":
        for first, last, difference in TITLE_CASE_AS_UPPER:
            kept.update({character: difference for character in range(first, last + 1)})
    for character in UNMAPPED[direction].split():
        kept.pop(int(character, 16), None)
    return {character: difference for character, difference in kept.items() if -128 <= difference <= 127}


def utf8_length(character):
    return 1 if character < 0x80 else 2 if character < 0x800 else 3


def entries(mapping, first, last):
    result = [mapping.get(character, 0) for character in range(first, last + 1)]
    for character, difference in enumerate(result, first):
        # Folding in place rests on this.
        if utf8_length(character) != utf8_length(character + difference):
            sys.exit(f"U+{character:04X} would change its length in UTF-8")
    return result


def array(declaration, values):
    lines = [f"{declaration} = {{"]
    for start in range(0, len(values), 16):
        lines.append("    " + ", ".join(str(value) for value in values[start:start + 16]) + ",")
    return lines + ["};", ""]


def tables():
    lines = ["// Made by make_uni_case_tables.py; changes belong there.", ""]
    mappings = read_mappings()
    for direction, title in (("upper", "Upper"), ("lower", "Lower")):
        mapping = apply_rules(direction, mappings[direction])
        lines += array(f"constexpr std::int8_t Uni{title}Table[{TABLE_SIZE}]", entries(mapping, 0, TABLE_SIZE - 1))
        records = []
        for first, last in RANGES[direction]:
            name = f"{direction}_{first:04X}"
            lines += array(f"static constexpr std::int8_t {name}[{last - first + 1}]", entries(mapping, first, last))
            records.append(f"    {{0x{first:04X}, 0x{last:04X}, {name}}},")
        lines += [f"constexpr UniCaseRange Uni{title}Range[] = {{", *records, "    {0, 0, nullptr},", "};", ""]
    return "\n".join(lines[:-1]) + "\n"


def main(arguments):
    if arguments == ["--check"]:
        if TABLES.read_text(encoding="ascii") != tables():
            sys.exit(f"{TABLES.name} is not what {MAPPINGS.name} and the rules give")
    elif not arguments:
        TABLES.write_text(tables(), encoding="ascii")
    else:
        sys.exit(__doc__)


main(sys.argv[1:])
