#!/usr/bin/env python3
"""Writes organisation.ldif: the directory of an invented organisation, always the same.

    share/sample/make_organisation.py > share/sample/organisation.ldif

Names are put together from invented syllables and words; people, houses and numbers are nobody's. (Telephone numbers
are of a range kept for fiction, domains end in .example.)
"""
import base64
import sys

SUFFIX = "o=Quillhaven Works"
MAIL = "quillhaven.example"
COLUMN = 76

FIRST = ("Aldra Bevin Corwen Delwyn Ésme Farrin Gosta Hollis Ineke Jörund Kessa Lorcan Maelis Nialla Orsolya Perrin "
         "Quenna Rówan Sivert Tamsel Ulla Vesna Wystan Xanthe Ysolde Zoë Ambrus Brónagh Ciarnán Dagný").split()
HEAD = "Amber Birch Copper Dapple Elder Fallow Glim Hazel Iver Jorn Kettle Larch Marrow Nettle Otter".split()
TAIL = "brook croft dale fell garth holt ledge mere nook quist rigg stead thwaite wick yard".split()
OUTLANDISH = ["Štěrbák", "Grünquist", "Łośnicki", "Ængström", "Müllerwick", "Ó Branndubh", "Çelebrook",
              "Nøkkestad"]

UNITS = [
    ("Board", "Decides what the works do next"),
    ("Lens Making", "Grinds, polishes and coats lenses"),
    ("Clockwork", "Springs, escapements and everything that ticks"),
    ("Instruments", "Sextants, barometers, theodolites"),
    ("Glass House", "Melts the glass"),
    ("Brass Foundry", "Casts housings and fittings"),
    ("Drawing Office", "Plans, tolerances, templates"),
    ("Quality", "Measures what the others made"),
    ("Repairs, Returns & Spares", "Takes everything back, mends it, and sends it out again"),
    ("Shipping", "Crates, carts and customs papers"),
    ("Accounts", "Counts it"),
    ("Library", "Keeps the patterns of two hundred years"),
    ("Apprentices", "Learns all of the above"),
    ("Küche + Garten", "Feeds everybody"),
]
TITLES = ["Apprentice", "Journeyman", "Master", "Senior Master", "Clerk", "Foreman", "Designer", "Inspector"]
TITLES_DE = ["Lehrling", "Geselle", "Meister", "Altmeister", "Schreiber", "Vorarbeiter", "Gestalter", "Prüfer"]
PLACES = ["Mill Row", "Upper Yard", "Canal Side", "Tower", "Old Barn"]


class Numbers:
    """A small generator of its own, so that no version of a library changes the file."""

    def __init__(self, seed):
        self.state = seed

    def below(self, limit):
        self.state = (self.state * 6364136223846793005 + 1442695040888963407) % 2**64
        return (self.state >> 33) % limit

    def one_of(self, things):
        return things[self.below(len(things))]

    def octets(self, count):
        return bytes(self.below(256) for _ in range(count))


def is_safe(value):
    return all(0x20 <= byte < 0x7F for byte in value) and value[:1] not in (b" ", b":", b"<") and value[-1:] != b" "


def line(kind, value):
    octets = value if isinstance(value, bytes) else value.encode("utf-8")
    text = f"{kind}: {octets.decode()}" if is_safe(octets) else f"{kind}:: {base64.b64encode(octets).decode()}"
    print(text[:COLUMN])
    for at in range(COLUMN, len(text), COLUMN - 1):
        print(" " + text[at:at + COLUMN - 1])


def escaped(value):
    """A value of a DN, by RFC 4514."""
    text = "".join("\\" + c if c in '\\,+"<>;=' else c for c in value)
    return "\\" + text if text[:1] in ("#", " ") else text


def entry(dn, classes, *attributes):
    line("dn", dn)
    for name in classes.split():
        line("objectClass", name)
    for kind, values in attributes:
        for value in values if isinstance(values, list) else [values]:
            line(kind, value)
    print()


def section(text):
    print(f"# ---- {text}\n")


def unit_dn(name):
    return f"ou={escaped(name)},ou=Units,{SUFFIX}"


def picture(numbers):
    return b"\xff\xd8\xff\xe0\x00\x10JFIF\x00\x01" + numbers.octets(60 + numbers.below(60)) + b"\xff\xd9"


def certificate(numbers):
    body = numbers.octets(140 + numbers.below(60))
    return b"\x30\x82" + len(body).to_bytes(2, "big") + body


def plain(text):
    kept = {"Š": "S", "ě": "e", "á": "a", "ü": "u", "Ł": "L", "ś": "s", "Æ": "Ae", "ö": "o", "Ó": "O", "Ç": "C",
            "ø": "o", "É": "E", "ó": "o", "ë": "e", "ý": "y", " ": "", "ř": "r"}
    return "".join(kept.get(c, c) for c in text)


def people(numbers, count):
    made = []
    taken = set()
    while len(made) < count:
        first = numbers.one_of(FIRST)
        last = numbers.one_of(OUTLANDISH) if numbers.below(9) == 0 else numbers.one_of(HEAD) + numbers.one_of(TAIL)
        uid = (plain(first)[0] + plain(last)).lower()
        if uid in taken:
            continue
        taken.add(uid)
        index = len(made)
        unit = UNITS[index % len(UNITS)][0]
        title = numbers.below(len(TITLES))
        cn = f"{first} {last}"
        base = f"ou=People,{SUFFIX}"
        if index % 17 == 3:
            dn = f"cn={escaped(cn + ', Jr.')},{base}"
            cn = cn + ", Jr."
        elif index % 23 == 5:
            dn = f"cn={escaped(cn)}+employeeNumber={1000 + index},{base}"
        else:
            dn = f"uid={uid},{base}"
        made.append({"dn": dn, "cn": cn, "first": first, "last": last, "uid": uid, "unit": unit, "title": title,
                     "index": index})
    return made


def write_person(numbers, person, boss):
    index = person["index"]
    phone = f"+1 555 01{index // 100:02d} {1000 + index * 7 % 9000:04d}"
    attributes = [
        ("cn", [person["cn"]]),
        ("sn", person["last"]),
        ("givenName", person["first"]),
        ("uid", person["uid"]),
        ("mail", f"{person['uid']}@{MAIL}"),
        ("title", TITLES[person["title"]]),
        ("ou", person["unit"]),
        ("employeeNumber", str(1000 + index)),
        ("employeeType", "apprentice" if person["title"] == 0 else "staff"),
        ("telephoneNumber", phone),
        ("roomNumber", f"{numbers.one_of(PLACES)} {1 + numbers.below(40)}"),
    ]
    if boss is not None:
        attributes.append(("manager", boss["dn"]))
    if index % 4 == 0:
        attributes.append(("title;lang-de", TITLES_DE[person["title"]]))
        attributes.append(("preferredLanguage", "de, en;q=0.5"))
    if index % 5 == 0:
        attributes.append(("description", f"Joined the works in the year {1 + numbers.below(30)} of the new "
                           f"chimney, and has since looked after {numbers.one_of(PLACES)}, where the light is best before noon and "
                           "the swallows nest above the door."))
    if index % 7 == 0:
        attributes.append(("jpegPhoto", picture(numbers)))
    if index % 11 == 0:
        attributes.append(("userCertificate;binary", certificate(numbers)))
    if index % 13 == 0:
        house = f"{1 + numbers.below(90)} {numbers.one_of(PLACES)}"
        attributes.append(("postalAddress", f"{person['cn']}${house}$Quillhaven"))
    if index % 19 == 0:
        attributes.append(("labeledURI", f"https://www.{MAIL}/~{person['uid']} Home page"))
    if index % 29 == 0:
        attributes.append(("x500UniqueIdentifier", f"'{index:08b}'B"))
    classes = "top person organizationalPerson inetOrgPerson"
    if index % 6 == 0:
        classes += " posixAccount"
        attributes += [("uidNumber", str(20000 + index)), ("gidNumber", "100"),
                       ("homeDirectory", f"/home/{person['uid']}"), ("loginShell", "/bin/sh")]
    entry(person["dn"], classes, *attributes)


def main():
    numbers = Numbers(1786)
    staff = people(numbers, 280)
    by_unit = {name: [p for p in staff if p["unit"] == name] for name, _ in UNITS}

    print("version: 1\n")
    print("# The directory of the Quillhaven Works, an organisation that doesn't exist. Made by make_organisation.py.\n"
          "# It is valid against the schema in share/schema.\n")
    entry(SUFFIX, "top organization", ("o", ["Quillhaven Works", "Quillhaven"]),
          ("description", "Lenses, clocks and instruments since the second flood"),
          ("telephoneNumber", "+1 555 0100 1000"), ("postalAddress", "Quillhaven Works$1 Mill Row$Quillhaven"),
          ("l", "Quillhaven"))
    for name, text in [("Units", "What the works consist of"), ("People", "Who works here"),
                       ("Groups", "Who does something together"), ("Roles", "Who does something for all"),
                       ("Rooms", "Where to meet"), ("Devices", "What has a plug"), ("Places", "Where we are"),
                       ("Names", "Other names for what is elsewhere")]:
        entry(f"ou={name},{SUFFIX}", "top organizationalUnit", ("ou", name), ("description", text))

    section("units")
    for name, text in UNITS:
        entry(unit_dn(name), "top organizationalUnit", ("ou", name), ("description", text),
              ("telephoneNumber", f"+1 555 0100 {1100 + len(name)}"))

    section("places")
    for name in PLACES:
        entry(f"l={name},ou=Places,{SUFFIX}", "top locality", ("l", name), ("street", f"{name}, Quillhaven"))
    entry(f"c=ZZ,ou=Places,{SUFFIX}", "top country friendlyCountry", ("c", "ZZ"), ("co", "The Hinterland"))

    section("people; the first of a unit is its head")
    for person in staff:
        head = by_unit[person["unit"]][0]
        write_person(numbers, person, None if head is person else head)

    section("groups")
    for name, _ in UNITS:
        members = by_unit[name]
        entry(f"cn={escaped(name)},ou=Groups,{SUFFIX}", "top groupOfNames", ("cn", name),
              ("owner", members[0]["dn"]), ("member", [person["dn"] for person in members]))
    for name, step in [("Choir", 31), ("Fire Watch", 23), ("Readers' Circle", 41), ("Rowing", 37)]:
        entry(f"cn={name},ou=Groups,{SUFFIX}", "top groupOfUniqueNames", ("cn", name),
              ("uniqueMember", [person["dn"] for person in staff[::step]]))
    entry(f"cn=shell,ou=Groups,{SUFFIX}", "top posixGroup", ("cn", "shell"), ("gidNumber", "100"),
          ("memberUid", [person["uid"] for person in staff[::6]]))

    section("roles, rooms, devices")
    for index, name in enumerate(["Keeper of the Clocks", "First Aid", "Night Porter", "Beekeeper"]):
        entry(f"cn={name},ou=Roles,{SUFFIX}", "top organizationalRole", ("cn", name),
              ("roleOccupant", staff[index * 9]["dn"]), ("telephoneNumber", f"+1 555 0100 {1200 + index}"))
    for index in range(1, 13):
        entry(f"cn=Room {index},ou=Rooms,{SUFFIX}", "top room", ("cn", f"Room {index}"),
              ("roomNumber", str(index)), ("telephoneNumber", f"+1 555 0100 {1300 + index}"),
              ("cn;lang-de", f"Zimmer {index}"))
    for index in range(1, 13):
        name = f"lathe{index:02d}"
        entry(f"cn={name},ou=Devices,{SUFFIX}", "top device ipHost ieee802Device", ("cn", name),
              ("serialNumber", f"QW-{7000 + 13 * index}"), ("ipHostNumber", f"192.0.2.{index}"),
              ("macAddress", f"00:00:5e:00:53:{index:02x}"), ("owner", by_unit["Clockwork"][index % 5]["dn"]))

    section("other names, and what is kept elsewhere")
    entry(f"cn=Director,ou=Names,{SUFFIX}", "top alias extensibleObject", ("cn", "Director"),
          ("aliasedObjectName", staff[0]["dn"]))
    entry(f"ou=Branch Office,{SUFFIX}", "top referral extensibleObject", ("ou", "Branch Office"),
          ("ref", f"ldap://branch.{MAIL}/ou=Branch%20Office,o=Quillhaven%20Works"))


if __name__ == "__main__":
    sys.stdout.reconfigure(encoding="utf-8", newline="\n")
    main()
