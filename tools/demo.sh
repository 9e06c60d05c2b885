#!/bin/sh
# Shows the main job on the schema that ships: load it, explain it, change it, see what a change may not do, and put names
# into their normal form by it.
#
#   tools/demo.sh DIRBASE     DIRBASE is the path of the tool
#
# Everything is done on a copy in a temporary folder, which is removed at the end.
set -eu

if [ $# -ne 1 ] || [ ! -x "$1" ]; then
    echo "usage: $0 DIRBASE, the path of the built tool" >&2
    exit 2
fi
dirbase=$(cd "$(dirname "$1")" && pwd)/$(basename "$1")
root=$(cd "$(dirname "$0")/.." && pwd)
unset DIRBASE_SCHEMA

work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
trap 'exit 1' HUP INT TERM

heading()
{
    printf '\n== %s\n\n' "$1"
}

# Shows a command as one would type it, and runs it.
run()
{
    echo "\$ dirbase $*"
    "$dirbase" "$@"
}

# The same for a command that must find fault.
run_refused()
{
    status=0
    run "$@" 2>&1 || status=$?
    echo "(exit status $status)"
    [ "$status" -eq 1 ]
}

cd "$root"

heading 'The schema that ships loads, and is whole'
run schema check --schema share/schema

heading 'What inetOrgPerson comes to: its superclasses, and where each attribute is from (abridged)'
run schema show inetOrgPerson --schema share/schema >"$work/shown"
sed -e '16,$ { /telephone/b' -e '/userPass/b' -e '/file/!d' -e '}' "$work/shown"

cd "$work"

heading 'A new attribute type, with the way it is kept in the store, and a class that uses it'
cp -R "$root/share/schema" before
cp -R "$root/share/schema" schema
chmod -R u+w schema
cat >badge.at <<'END'
attributeTypes {
    ( 1.3.6.1.4.1.32473.1.1 NAME ( 'demoBadge' 'demoBadgeNumber' ) DESC 'Number on the badge of a guest'
        SUP name SINGLE-VALUE )
}
XANattributeTypes {
    ( 1.3.6.1.4.1.32473.1.1 DBNAME ( 'demo_badge' 'demo_badge' ) ACCESS-CLASS SENSITIVE LENGTH 32 EQUALITY )
}
END
cat >guest.oc <<'END'
objectClasses {
    ( 1.3.6.1.4.1.32473.2.1 NAME 'demoGuest' DESC 'Guest of the house' SUP person STRUCTURAL MUST demoBadge )
}
END
cat badge.at guest.oc
echo
run schema modify --schema schema add badge.at
run schema modify --schema schema add guest.oc

heading 'What changed on disk: one file, the one that takes additions'
diff -r -u --label before --label after before schema | grep -v '^diff' || true

heading 'The attribute type, with what it inherits, and how the server holds its values'
run schema show demoBadge --schema schema

heading 'How the two directories differ'
run_refused schema diff before schema

heading 'Attribute types by a property: those of the configuration'
run schema list config --schema schema

heading 'While the class uses it, the attribute type stays'
run_refused schema modify --schema schema delete badge.at

heading 'And the schema still loads, with one attribute type and one class more'
run schema check --schema schema

heading 'One DN in five spellings, and one that is refused'
cat >names <<'END'
cn=Bob Smith,o=Acme\, Inc.,c=us
CN = Bob Smith , O="Acme, Inc." ; C=us
commonName=Bob Smith, organizationName=Acme\2C Inc., countryName=us
2.5.4.3=Bob Smith,oid.2.5.4.10=Acme\, Inc.,2.5.4.6=us
cn=#0409426F6220536D697468,o=Acme\2c Inc.,c=us
cn=Bob Smith,o=Acme, Inc.,c=us
END
cat names
echo
run_refused dn normalize --schema schema - <names
