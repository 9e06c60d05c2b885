#!/bin/sh
# Installs a build into an empty folder, looks at what is there as a stranger would, and lets two programs of somebody
# else's use it: one in C++ that finds it by CMake, one in C that finds it by pkg-config.
#
#   installation.sh BUILD SOURCE VERSION CMAKE CXX CC     CC may be empty
#
# Exit status 77: what was tried is well, but something couldn't be tried (the last lines say what).
set -eu
export LC_ALL=C

build=$1 source=$2 version=$3 cmake=$4 cxx=$5 cc=$6
soname=${version%.*}
unset DESTDIR DIRBASE_SCHEMA LD_LIBRARY_PATH CMAKE_PREFIX_PATH dirbase_DIR

work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
trap 'exit 1' HUP INT TERM
skipped=

fail()
{
    echo "FAILED: $*"
    exit 1
}

# ---- what is where --------------------------------------------------------------------------------------------------

umask 022
"$cmake" --install "$build" --prefix "$work/first" --strip >"$work/log" 2>&1 || fail "$(cat "$work/log")"

# Whoever packages it installs below another root, and everything is the same there.
DESTDIR=$work/stage "$cmake" --install "$build" --prefix /opt/dirbase --strip >"$work/log" 2>&1 ||
    fail "$(cat "$work/log")"
diff -r "$work/first" "$work/stage/opt/dirbase" >"$work/log" || fail "DESTDIR changes it: $(cat "$work/log")"

# From here on it stands elsewhere than where it was put.
prefix=$work/second
mv "$work/first" "$prefix"
lib=$(dirname "$(find "$prefix" -name libdirbase.so)")
libdir=${lib#"$prefix"/}

for file in bin/dirbase include/dirbase/servers/vrnd/libdirbase/dirbase.h share/man/man1/dirbase.1 \
    share/bash-completion/completions/dirbase share/dirbase/schema/schema.list share/dirbase/sample/organisation.ldif \
    "$libdir/pkgconfig/dirbase.pc" "$libdir/cmake/dirbase/dirbaseConfig.cmake" \
    "$libdir/cmake/dirbase/dirbaseConfigVersion.cmake" "$libdir/cmake/dirbase/dirbaseTargets.cmake"; do
    [ -f "$prefix/$file" ] || fail "$file is missing"
done
diff -r "$source/share/schema" "$prefix/share/dirbase/schema" || fail 'the schema files are others'

for name in dirbase dirsibling; do
    [ "$(readlink "$lib/lib$name.so")" = "lib$name.so.$soname" ] || fail "lib$name.so leads elsewhere"
    [ "$(readlink "$lib/lib$name.so.$soname")" = "lib$name.so.$version" ] || fail "lib$name.so.$soname leads elsewhere"
    readelf -d "$lib/lib$name.so.$version" >"$work/dynamic"
    grep -q "SONAME.*\[lib$name.so.$soname\]" "$work/dynamic" || fail "lib$name.so has another SONAME"
    grep -qi symbolic "$work/dynamic" && fail "lib$name.so binds its own calls: nothing can be put in front of it"
done

find "$prefix" ! -type l \( -perm /022 -o ! -perm -444 \) >"$work/log"
find "$prefix" -type f -perm /111 ! -path "$prefix/bin/*" ! -name '*.so.*' >>"$work/log"
[ ! -s "$work/log" ] || fail "wrong permissions: $(cat "$work/log")"
find "$prefix" -xtype l >"$work/log"
[ ! -s "$work/log" ] || fail "links that lead nowhere: $(cat "$work/log")"

# The folder of the build lies in that of the source, mostly; and "first" is where it was put.
for folder in "$source" "$build" "$work"; do
    if grep -rlF -e "$folder" "$prefix" >"$work/log"; then
        fail "a path of this machine ($folder) in: $(cat "$work/log")"
    fi
done

# ---- the tool -------------------------------------------------------------------------------------------------------

[ "$(env -i "$prefix/bin/dirbase" --version)" = "dirbase $version" ] || fail 'the tool has another version'
grep -q "^\.TH .*\"dirbase $version\"" "$prefix/share/man/man1/dirbase.1" || fail 'the manual page has another version'
env -i "$prefix/bin/dirbase" schema check >"$work/log" 2>&1 || fail "the tool: $(cat "$work/log")"
env -i "$prefix/bin/dirbase" ldif check "$prefix/share/dirbase/sample/organisation.ldif" >"$work/log" 2>&1 ||
    fail "the tool: $(cat "$work/log")"
mv "$prefix/share/dirbase/schema/V3.additions" "$work/additions"
if env -i "$prefix/bin/dirbase" schema check >"$work/log" 2>&1; then
    fail 'the tool reads a schema that is not the installed one'
fi
grep -qF "$prefix/share/dirbase/schema/V3.additions" "$work/log" || fail "the tool looks elsewhere: $(cat "$work/log")"
mv "$work/additions" "$prefix/share/dirbase/schema/V3.additions"

# ---- a program in C++, by CMake -------------------------------------------------------------------------------------

# Every installed header, for a compiler that sees the installation alone.
include=$prefix/include/dirbase
(cd "$include" && find . -name '*.h' | sort | sed 's|^\./\(.*\)|#include "\1"|') >"$work/headers.cpp"
"$cxx" -std=c++20 -Wall -Wextra -Werror -fsyntax-only -I "$include" "$work/headers.cpp" || fail 'the headers'

cp -R "$source/tests/install/cxx_consumer" "$source/tests/install/c_consumer" "$work"
{
    "$cmake" -S "$work/cxx_consumer" -B "$work/cxx_build" -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_CXX_COMPILER="$cxx" \
        -DCMAKE_BUILD_TYPE=Debug -DEXPECTED_VERSION="$version" &&
        "$cmake" --build "$work/cxx_build" &&
        "$work/cxx_build/cxx_consumer" "$prefix/share/dirbase/schema"
} >"$work/log" 2>&1 || fail "the C++ consumer: $(cat "$work/log")"

# The program that README.md begins with.
sed -n '/^```cpp$/,/^```$/{/^```/d;p;}' "$source/README.md" >"$work/readme.cpp"
"$cxx" -std=c++20 -Wall -Wextra -Wpedantic -Werror -I "$include" "$work/readme.cpp" -o "$work/readme" \
    -L "$lib" -ldirbase -ldirsibling "-Wl,-rpath,$lib" || fail 'the program of README.md'
(cd "$prefix/share/dirbase/schema" && sed -e '/^#/d' -e '/^$/d' schema.list | xargs "$work/readme") >"$work/log" 2>&1 ||
    fail "the program of README.md: $(cat "$work/log")"
grep -q '^cn is kept in ' "$work/log" || fail "the program of README.md: $(cat "$work/log")"

# ---- a program in C, by pkg-config ----------------------------------------------------------------------------------

if ! command -v pkg-config >/dev/null; then
    skipped="$skipped (no pkg-config: the C consumer wasn't tried)"
else
    export PKG_CONFIG_PATH="$lib/pkgconfig"
    [ "$(pkg-config --modversion dirbase)" = "$version" ] || fail 'the pkg-config file has another version'
    pkg-config --exists "dirbase >= 99" && fail 'the pkg-config file passes for a version that it is not'
    for arguments in '--cflags --libs' '--cflags --libs --static'; do
        flags=$(pkg-config $arguments dirbase) || fail "pkg-config $arguments"
        case $flags in
        *//*) fail "pkg-config $arguments: $flags" ;;
        *-I*-L*-ldirbase*-ldirsibling*) ;;
        *) fail "pkg-config $arguments: $flags" ;;
        esac
    done
    schema=$(pkg-config --variable=schemadir dirbase)
    [ -f "$schema/schema.list" ] || fail "schemadir leads nowhere: $schema"
    if [ -z "$cc" ]; then
        skipped="$skipped (no C compiler: the C consumer wasn't tried)"
    else
        "$cc" -std=c11 -Wall -Wextra -Wpedantic -Werror "$work/c_consumer/main.c" -o "$work/c_program" \
            $(pkg-config --cflags --libs dirbase) || fail 'the C consumer'
        LD_LIBRARY_PATH=$lib "$work/c_program" "$schema" >"$work/log" 2>&1 || fail "the C consumer: $(cat "$work/log")"
    fi
fi

# ---------------------------------------------------------------------------------------------------------------------

find "$prefix" -type f | sed "s|^$prefix/||" | sed -e 's|/[^/]*$||' | sort | uniq -c
if [ -n "$skipped" ]; then
    echo "skipped:$skipped"
    exit 77
fi
