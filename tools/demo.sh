#!/bin/sh
# Shows the main job on the data that ships: which entries of an LDIF file a server would take, and why it would refuse
# the others; the forms of an entry; the changes between two files; the schema and the DNs that all this rests on; and
# what a search finds.
#
#   tools/demo.sh DIRBASE     DIRBASE is the path of the tool
#
# Everything is done in a temporary folder, which is removed at the end.
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
    printf '$ dirbase'
    for word; do
        case $word in
        *[!A-Za-z0-9_./:=,+-]*) printf " '%s'" "$word" ;;
        *) printf ' %s' "$word" ;;
        esac
    done
    echo
    "$dirbase" "$@"
}

# The same for a command that must find something.
run_finding()
{
    status=0
    run "$@" 2>&1 || status=$?
    echo "(exit status $status)"
    [ "$status" -eq 1 ]
}

cd "$root/share/sample"

heading 'An organisation of 358 entries: a server would take them all'
run ldif check organisation.ldif

heading 'One entry for each kind of fault: a server would refuse them all (abridged to every third)'
run_finding ldif check --rejects "$work/rejects.ldif" faults.ldif >"$work/found"
sed -e "s|$work/||" "$work/found" |
    awk '/^[0-9]+ entries/ { counts = NR } counts ? NR < counts + 6 || /^\(/ : NR == 1 || NR % 3 == 0'

heading 'The first of the refused entries, as it stood, with the reason'
sed '/^$/q' "$work/rejects.ldif"

heading 'A group in its three forms: LDIF, without its members, and BER as it goes to clients (abridged)'
{ echo 'version: 1'; echo; sed -n '/^dn: cn=Choir,/,/^$/p' organisation.ldif; } >"$work/choir.ldif"
cd "$work"
run ldif print choir.ldif
echo
run ldif print --form no-members choir.ldif
echo
run ldif print --form ber choir.ldif >ber
sed -e '5,$d' ber
echo '...'

heading 'The choir loses a member, is described, and has a room: what a server must be told'
sed -e '/^uniqueMember: uid=vnettlegarth/d' -e 's/^cn: Choir/cn: CHOIR/' \
    -e '/^cn: /a description: Sings in the glass house, for the echo' choir.ldif >choir-new.ldif
cat >>choir-new.ldif <<'END'
dn: cn=Choir Room, ou=Rooms, o=Quillhaven Works
objectClass: room
END
run_finding ldif diff choir.ldif choir-new.ldif

heading 'What an entry may hold is told by the schema, which can be asked, printed, compared and changed'
run schema check --schema "$root/share/schema"
echo
run schema show groupOfUniqueNames --schema "$root/share/schema"

heading 'A change is made whole or not at all: this class has subclasses'
cp -R "$root/share/schema" schema
chmod -R u+w schema
echo "objectClasses { ( 2.5.6.6 NAME 'person' ) }" >person.oc
run_finding schema modify --schema schema delete person.oc

heading 'One DN in four spellings, and one that is refused'
cat >names <<'END'
cn=Bob Smith,o=Acme\, Inc.,c=us
CN = Bob Smith , O="Acme, Inc." ; C=us
2.5.4.3=Bob Smith,oid.2.5.4.10=Acme\2C Inc.,countryName=us
cn=#0409426F6220536D697468,o=Acme\2c Inc.,c=us
cn=Bob Smith,o=Acme, Inc.,c=us
END
cat names
echo
run_finding dn normalize --schema schema - <names

cd "$root/share/sample"

heading 'The first three who work in the glass house or the tower and have an account, but no photograph'
run ldif search --limit 3 organisation.ldif \
    '(&(objectClass=posixAccount)(|(ou=Glass House)(roomNumber=Tower *))(!(jpegPhoto=*)))' cn ou roomNumber

heading 'How many people there are whose name has "ett" in it and ends in "th"'
run ldif search --count --base 'OU = people, o=QUILLHAVEN WORKS' organisation.ldif '(sn=*ett*th)'

heading 'An attribute that the schema lacks: left out of an OR, and the end of an AND'
run ldif search organisation.ldif '(|(cn=Choir)(nickname=*))' cn 2>&1
echo
run_finding ldif search organisation.ldif '(&(cn=Choir)(!(nickname=*)))'
