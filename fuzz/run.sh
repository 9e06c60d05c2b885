#!/usr/bin/env bash
# Runs every fuzzer of a build folder for a while, one after the other, and stops at the first finding.
#
#   fuzz/run.sh BUILD_FOLDER OUTPUT_FOLDER [FUZZER...]
#
# FUZZ_SECONDS (30) is the time of each. Seeds and dictionaries are read from this folder and never written: new inputs go
# to OUTPUT_FOLDER/corpus/<fuzzer>, from where the next run goes on, findings to OUTPUT_FOLDER/findings and logs to
# OUTPUT_FOLDER/log. Exit status: 0 nothing found, 1 a finding, 2 a wrong call.
set -euo pipefail

if [[ $# -lt 2 || ! -r $1/fuzzers.txt ]]; then
    echo "usage: fuzz/run.sh BUILD_FOLDER OUTPUT_FOLDER [FUZZER...]" >&2
    exit 2
fi
here=$(cd "$(dirname "$0")" && pwd)
build=$1 out=$2
shift 2
seconds=${FUZZ_SECONDS:-30}
if [[ $# -gt 0 ]]; then fuzzers=("$@"); else mapfile -t fuzzers <"$build/fuzzers.txt"; fi
if [[ ${#fuzzers[@]} -eq 0 ]]; then
    echo "fuzz: there is no fuzzer to run" >&2
    exit 2
fi

export ASAN_OPTIONS=${ASAN_OPTIONS:-detect_leaks=1:strict_string_checks=1}
export UBSAN_OPTIONS=${UBSAN_OPTIONS:-print_stacktrace=1}

# The number after a word in the log: the first or the last of them.
first_after() { grep -oP "$1\s*\K[0-9]+" "$2" | head -n 1 || true; }
last_after() { grep -oP "$1\s*\K[0-9]+" "$2" | tail -n 1 || true; }

mkdir -p "$out/findings" "$out/log"
for name in "${fuzzers[@]}"; do
    corpus=$out/corpus/$name log=$out/log/$name.log
    mkdir -p "$corpus"
    args=(-max_total_time="$seconds" -timeout=25 -rss_limit_mb=4096 -print_final_stats=1
          -artifact_prefix="$out/findings/$name-")
    [[ -r $here/$name.dict ]] && args+=(-dict="$here/$name.dict")
    args+=("$corpus")
    [[ -d $here/corpus/$name ]] && args+=("$here/corpus/$name")

    status=0
    "$build/bin/$name" "${args[@]}" >"$log" 2>&1 </dev/null || status=$?
    if [[ $status -ne 0 ]]; then
        tail -n 60 "$log"
        echo "$name: FOUND something (status $status); the input is in $out/findings, the whole log is $log"
        exit 1
    fi
    before=$(first_after 'INITED cov:' "$log") after=$(last_after ' cov:' "$log")
    printf '%-28s %10s runs  %5s new inputs  coverage %s (+%s)\n' "$name" \
        "$(last_after 'stat::number_of_executed_units:' "$log")" "$(last_after 'stat::new_units_added:' "$log")" \
        "${after:-0}" "$((${after:-0} - ${before:-0}))"
done
