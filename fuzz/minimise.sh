#!/usr/bin/env bash
# Keeps of what the fuzzers have found the few small inputs that reach code which the seeds don't reach.
#
#   fuzz/minimise.sh BUILD_FOLDER OUTPUT_FOLDER [FUZZER...]
#
# The folders are those of fuzz/run.sh. An input that is kept goes to corpus/<fuzzer> beside the seeds, under the name
# that the fuzzer gives it, 40 hexadecimal digits; those of an earlier run are chosen anew. Inputs are cut at 256 bytes,
# and only code counts that was not reached before, not how often: the corpus is for reading, too.
set -euo pipefail

if [[ $# -lt 2 || ! -r $1/fuzzers.txt ]]; then
    echo "usage: fuzz/minimise.sh BUILD_FOLDER OUTPUT_FOLDER [FUZZER...]" >&2
    exit 2
fi
here=$(cd "$(dirname "$0")" && pwd)
build=$1 out=$2
shift 2
if [[ $# -gt 0 ]]; then fuzzers=("$@"); else mapfile -t fuzzers <"$build/fuzzers.txt"; fi

work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
for name in "${fuzzers[@]}"; do
    kept=$here/corpus/$name found=$out/corpus/$name
    mkdir -p "$kept" "$found" "$work/$name"
    find "$kept" -regextype posix-egrep -regex '.*/[0-9a-f]{40}' -exec mv -t "$work/$name" {} +
    if ! "$build/bin/$name" -merge=1 -use_counters=0 -max_len=256 "$kept" "$work/$name" "$found" \
        >"$work/log" 2>&1 </dev/null; then
        tail -n 20 "$work/log"
        exit 1
    fi
    printf '%-28s %4s inputs  %6s bytes\n' "$name" "$(find "$kept" -type f | wc -l)" \
        "$(find "$kept" -type f -printf '%s\n' | awk '{ sum += $1 } END { print sum + 0 }')"
done
