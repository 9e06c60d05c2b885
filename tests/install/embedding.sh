#!/bin/sh
# Runs the program of docs/embedding.md on a copy of the schema, and holds the copy in the page against the file.
#
#   embedding.sh PROGRAM SOURCE
set -eu

program=$1 source=$2
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
trap 'exit 1' HUP INT TERM

sed -n '/^```cpp$/,/^```$/{/^```/d;p;}' "$source/docs/embedding.md" >"$work/quoted.cpp"
if ! diff -u "$source/examples/embedding.cpp" "$work/quoted.cpp"; then
    echo 'docs/embedding.md quotes another program than examples/embedding.cpp'
    exit 1
fi

cp -R "$source/share/schema" "$work/schema"
chmod -R u+w "$work/schema"
"$program" "$work/schema"

# The change went to the file that is listed last, and nothing else was left.
grep -q quillLength "$work/schema/V3.additions"
rm "$work/schema/V3.additions"
cp "$source/share/schema/V3.additions" "$work/schema/"
diff -r "$source/share/schema" "$work/schema"

# What a server does on a folder that holds no schema.
if "$program" "$work" 2>"$work/log"; then
    echo 'the program started without a schema'
    exit 1
fi
grep -q 'no schema that can be used' "$work/log"
