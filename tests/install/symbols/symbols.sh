#!/bin/sh
# What the libraries export, held against the lists beside this script: a symbol that is gone breaks programs that are
# linked already, and one that is new stays for good once somebody uses it.
#
#   symbols.sh check BUILD     BUILD is a build folder, such as build/dev. Says what is new and what is gone.
#   symbols.sh update BUILD    takes what is exported now for right, and writes the lists anew
#
# A list has a heading for each header, with the symbols that it declares. Type information and vtables aren't listed:
# they are compiled into whoever uses a class, and which of them a library holds depends on the compiler.
set -eu
export LC_ALL=C

usage()
{
    echo "usage: $0 check|update BUILD" >&2
    exit 2
}
[ $# -eq 2 ] && [ -f "$2/installed_headers.txt" ] || usage
case $1 in check | update) ;; *) usage ;; esac
command=$1
build=$2
lists=$(cd "$(dirname "$0")" && pwd)
root=$(cd "$lists/../../.." && pwd)

work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
trap 'exit 1' HUP INT TERM

# "name header" for everything that an installed header marks as exported: the name in front of the parameters of a
# function or at the end of a variable, or that of a class.
(cd "$root" && xargs awk '
    /^#/ || !/DIRBASE_EXPORT/ { next }
    {
        line = $0
        sub(/^ *\[\[[a-z]*\]\]/, "", line)
        if (line ~ /(class|struct) DIRBASE_EXPORT/) {
            sub(/.*DIRBASE_EXPORT +/, "", line)
            sub(/[^A-Za-z0-9_].*/, "", line)
        } else {
            sub(/ *(\(|;|=|\[|__attribute__).*/, "", line)
            sub(/.*[^A-Za-z0-9_]/, "", line)
        }
        print line, FILENAME
    }') <"$build/installed_headers.txt" >"$work/declared"

# The symbols of a library, grouped: "## header" and below it a symbol a line, those of C++ with their reading. The
# first name in a symbol of C++ is the function, the class that it belongs to, that of an operator's first class, or a
# namespace with the function behind it.
exported()
{
    nm -D --defined-only "$build/lib/$1.so" | awk '$3 !~ /^_ZT[VIS]/ { print $3 }' | sort -u >"$work/symbols"
    c++filt <"$work/symbols" | paste "$work/symbols" - |
        awk -F '\t' -v declared="$work/declared" '
            BEGIN {
                while ((getline line <declared) > 0) {
                    split(line, part, " ")
                    if (!(part[1] in header)) {
                        header[part[1]] = part[2]
                    }
                }
            }
            {
                name = $1
                rest = substr($1, 3)
                for (tries = $1 ~ /^_Z/ ? 2 : 0; tries > 0 && !(name in header); --tries) {
                    if (!match(rest, /^[A-Za-z]*[0-9]+/)) {
                        break
                    }
                    size = substr(rest, 1, RLENGTH)
                    gsub(/[^0-9]/, "", size)
                    name = substr(rest, RLENGTH + 1, size)
                    rest = substr(rest, RLENGTH + 1 + size)
                }
                place = name in header ? header[name] : "no installed header declares these"
                reading = $1 == $2 ? "" : substr("  # " $2, 1, length($1) < 80 ? 118 - length($1) : 38)
                sub(/ +$/, "", reading)
                print place "\t" $1 reading
            }' |
        sort | awk -F '\t' '$1 != last { print (NR > 1 ? "\n" : "") "## " $1; last = $1 } { print $2 }'
}

plain()
{
    sed -e '/^#/d' -e '/^$/d' -e 's/ .*//' "$1" | sort
}

result=0
for library in libdirbase libdirsibling; do
    exported $library >"$work/$library.txt"
    if grep -q '^## no installed' "$work/$library.txt"; then
        echo "$library.so exports what no installed header declares (DIRBASE_HIDDEN hides a member of a class):"
        sed -n '/^## no installed/,/^$/{/^#/d;/^$/d;s/^/    /;p;}' "$work/$library.txt"
        result=1
    fi
    if [ "$command" = update ]; then
        cp "$work/$library.txt" "$lists/$library.txt"
        echo "$lists/$library.txt: $(plain "$lists/$library.txt" | wc -l) symbols"
        continue
    fi
    plain "$lists/$library.txt" >"$work/before"
    plain "$work/$library.txt" >"$work/after"
    if ! cmp -s "$work/before" "$work/after"; then
        echo "$library.so:"
        comm -13 "$work/before" "$work/after" | c++filt | sed 's/^/    new:  /'
        comm -23 "$work/before" "$work/after" | c++filt | sed 's/^/    gone: /'
        result=1
    fi
done
if [ "$command" = check ] && [ $result -ne 0 ]; then
    echo "When that is as it should be: tests/install/symbols/symbols.sh update BUILD. What is gone, or means something"
    echo "else now, asks for another SONAME (the version in CMakeLists.txt)."
fi
exit $result
